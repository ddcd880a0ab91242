# SPDX-License-Identifier: MIT
"""The shared library as another language sees it: functions, records and constants as the C headers declare them.

LUMRA_LIBRARY names the library. `call` runs a function that must succeed, `Test.refused` one that must not. NumPy
arrays, records, ctypes numbers that are written, and None stand for pointers. record("fft", points=64) is a fresh copy
of an options record's initialiser, create("fft", points=64) an object.
"""
import ctypes
import os
import pathlib
import re
import unittest

import numpy as np

_c_types = {
    "int32_t": ctypes.c_int32, "uint32_t": ctypes.c_uint32, "int64_t": ctypes.c_int64, "uint64_t": ctypes.c_uint64,
    "float": ctypes.c_float, "double": ctypes.c_double, "lumra_status": ctypes.c_int32, "void": None,
}  # fmt: skip
_headers = pathlib.Path(__file__).resolve().parents[2] / "include" / "lumra"
_open = sorted(h for h in _headers.glob("*.h") if " qs" not in h.read_text().replace("lumra.h", ""))
_source = re.sub(r"/\*.*?\*/|\\\n", " ", "".join(h.read_text() for h in [_headers / "status.h", *_open]), flags=re.S)


def _constants():
    found = {}
    for body in re.findall(r"enum \w+ \{(.*?)\}", _source, re.S):
        for name, value in re.findall(r"(LUMRA_\w+)\s*=\s*(-?\w+)", body):
            found[name] = int(value, 0)
    return found


def _c_type(text):
    text = text.replace("const ", "").strip()
    if text.startswith("char *"):
        return ctypes.c_char_p
    return ctypes.c_void_p if "*" in text else _c_types[text.split()[0]]


def _record_type(name, body):
    fields = []
    for kind, members in re.findall(r"(\w+)\s+([^;]+);", body):
        for member in members.split(","):
            called, count = re.fullmatch(r"\s*(\w+)(?:\[(\w+)\])?\s*", member).groups()
            fields.append((called, _c_types[kind] * int(count) if count else _c_types[kind]))
    return type(name, (ctypes.Structure,), {"_fields_": fields})


constants = _constants()
for _name, _body in re.findall(r"typedef struct (lumra_\w+) \{(.*?)\}", _source, re.S):
    _c_types[_name] = _record_type(_name, _body)
records = {name: kind for name, kind in _c_types.items() if isinstance(kind, type(ctypes.Structure))}
initialisers = {
    name.lower(): values for name, values in re.findall(r"#define (LUMRA_\w+_OPTIONS)\s+\{(.*?)\}\s*\n", _source, re.S)
}

_library = ctypes.CDLL(os.environ["LUMRA_LIBRARY"])
functions = {}
for _returned, _name, _arguments in re.findall(r"LUMRA_EXPORT ([\w ]+?\*?)\s*(lumra_\w+)\(([^)]*)\);", _source):
    _function = functions[_name[6:]] = getattr(_library, _name)
    _function.restype = _c_type(_returned)
    _function.argtypes = [_c_type(a) for a in _arguments.split(",") if a != "void"]


def record(name, **changes):
    """A copy of the options' initialiser, or an empty record, with some members changed."""
    options = f"lumra_{name}_options"
    made = records.get(options, records.get(f"lumra_{name}"))()
    if options in initialisers:
        made.size = ctypes.sizeof(made)
        values = [v.strip() for v in initialisers[options].split(",")]
        for (member, _), value in list(zip(made._fields_, values))[1:]:
            number = constants.get(value) if value in constants else float(value) if "." in value else int(value)
            setattr(made, member, number)
    for member, value in changes.items():
        setattr(made, member, value)
    return made


def _passed(argument, kind):
    if kind is not ctypes.c_void_p or isinstance(argument, Object):
        return argument
    if isinstance(argument, np.ndarray):
        return argument.ctypes.data
    return ctypes.byref(argument) if isinstance(argument, (ctypes.Structure, ctypes._SimpleCData)) else argument


def run(function, *arguments):
    """What the function returns."""
    kinds = functions[function].argtypes
    return functions[function](*(_passed(a, k) for a, k in zip(arguments, kinds, strict=True)))


def last_error():
    return run("last_error").decode()


def call(function, *arguments):
    status = run(function, *arguments)
    assert status == 0, f"{last_error()} ({status})"


def make(function, *arguments):
    """The object that the function makes, freed with the interpreter's last reference to it."""
    handle = ctypes.c_void_p()
    call(function, *arguments, handle)
    return Object(re.sub("_(create|load).*", "", function), handle.value)


def create(kind, **changes):
    return make(f"{kind}_create", record(kind, **changes))


def save(saved):
    size = ctypes.c_uint64()
    call(f"{saved.kind}_state_size", saved, size)
    state = np.zeros(size.value, np.uint8)
    call(f"{saved.kind}_save", saved, state, len(state))
    return state


def sealed(state):
    """A state that was changed, with the checksum that fits."""
    words = np.zeros(-(-(len(state) - 8) // 32) * 4, np.uint64)
    words.view(np.uint8)[: len(state) - 8] = state[:-8]
    total, prime = 0xCBF29CE484222325, 0x100000001B3
    for lane in range(4):
        lane_total = 0xCBF29CE484222325
        for word in words[lane::4].tolist():
            lane_total = (lane_total ^ word) * prime % 2**64
        total = (total ^ lane_total) * prime % 2**64
    return np.concatenate((state[:-8], np.array([total], np.uint64).view(np.uint8)))


def load(kind, state):
    return make(f"{kind}_load", state, len(state))


class Object(ctypes.c_void_p):
    def __init__(self, kind, address):
        super().__init__(address)
        self.kind = kind

    def __del__(self):
        run(f"{self.kind}_free", self.value)


types = {"f32": np.dtype("f4"), "f64": np.dtype("f8"), "cf32": np.dtype("c8"), "cf64": np.dtype("c16")}
random = np.random.default_rng(7)


def type_code(kind):
    return constants[f"LUMRA_TYPE_{kind.upper()}"]


def noise(shape, dtype):
    x = random.standard_normal(shape)
    return (x + 1j * random.standard_normal(shape) if np.dtype(dtype).kind == "c" else x).astype(dtype)


def odd(x):
    """A copy that lies where only its real numbers are aligned."""
    x = np.asarray(x)
    step = x.real.itemsize
    room = np.empty(x.nbytes + 128, np.uint8)
    first = -room.ctypes.data % 64 + step
    copy = room[first : first + x.nbytes].view(x.dtype).reshape(x.shape)
    copy[...] = x
    return copy


class Test(unittest.TestCase):
    def refused(self, code, function, *arguments, says=""):
        """The function fails with that code and a sentence, and no array has changed."""
        arrays = [a for a in arguments if isinstance(a, np.ndarray)]
        before = [a.tobytes() for a in arrays]
        shown = (function, *[a if not isinstance(a, np.ndarray) else a.shape for a in arguments])
        self.assertEqual(constants[code], run(function, *arguments), shown)
        self.assertRegex(last_error(), rf"^lumra_{function}: .*{re.escape(says)}", shown)
        self.assertEqual(before, [a.tobytes() for a in arrays], shown)

    def close(self, expected, actual, tolerance, what=None):
        """Largest difference relative to the largest expected magnitude; NaN only where NaN is expected."""
        expected, actual = np.asarray(expected), np.asarray(actual)
        self.assertEqual(expected.shape, actual.shape, what)
        if expected.size:
            largest = np.abs(expected).max()
            np.testing.assert_allclose(actual, expected, rtol=0, atol=tolerance * largest, err_msg=str(what))

    def state_is_checked(self, saved):
        """States that were cut or changed are refused, rooms that are too small, and what is null."""
        kind, state, none = saved.kind, save(saved), ctypes.c_void_p()
        for k in range(len(state)):
            damaged = state.copy()
            damaged[k] ^= 1 << k % 8
            self.refused("LUMRA_BAD_STATE", f"{kind}_load", damaged, len(state), none)
            self.refused("LUMRA_BAD_STATE", f"{kind}_load", state, k, none)
        self.assertIsNone(none.value)
        self.refused("LUMRA_NULL_ARGUMENT", f"{kind}_load", None, len(state), none, says="bytes is null")
        self.refused("LUMRA_NULL_ARGUMENT", f"{kind}_load", state, len(state), None)
        self.refused("LUMRA_TOO_LITTLE_ROOM", f"{kind}_save", saved, state, len(state) - 1, says="the state needs")
        self.refused("LUMRA_NULL_ARGUMENT", f"{kind}_save", saved, None, len(state), says="bytes is null")
        self.refused("LUMRA_NULL_ARGUMENT", f"{kind}_state_size", saved, None, says="size is null")
        self.refused("LUMRA_NULL_ARGUMENT", f"{kind}_get_type", saved, None, says="type is null")
