# SPDX-License-Identifier: MIT
"""Recursive filters beside scipy.signal, over any cut of a stream."""
import ctypes
import unittest

import numpy as np
from scipy import signal

import open as lumra

noise = lumra.noise


def filter_of(kind, method="AUTO", b=None, a=None, sos=None):
    method = lumra.constants[f"LUMRA_IIR_{method}"]
    options = lumra.record("iir", type=lumra.type_code(kind), method=method)
    if sos is not None:
        return lumra.make("iir_create_sections", options, np.array(sos, float), len(sos))
    return lumra.make("iir_create", options, np.array(b, float), len(b), np.array(a, float), len(a))


def process(iir, x, cuts=()):
    y = np.empty_like(x)
    for first, last in zip([0, *cuts], [*cuts, len(x)]):
        lumra.call("iir_process", iir, x[first:last], y[first:last], last - first)
    return y


DIRECT = {
    "gain": ([0.5], [2.0]),
    "first order": ([1.0, 0.5], [1.0, -0.9]),
    "more b than a": ([1, 2, 3, 4, 5, 6.0], [1.0, -0.5]),
    "a little more b than a": ([1, 2, 3, 4.0], [1.0, -0.5]),
    "more a than b": ([1.0], [2.0, -1.2, 0.9, -0.3]),
    "no recursion": ([1.0, -2.0, 3.0], [1.0, 0.0]),
    "fourth order": signal.butter(4, 0.2),
    "fifth order": signal.ellip(5, 0.5, 60, 0.3),
    "long": (np.ones(30) / 30, np.r_[1, -0.02 * np.ones(25)]),
}


class RecursiveFilter(lumra.Test):
    def test_values_states_and_cuts(self):
        for kind, dtype in lumra.types.items():
            single = kind in ("f32", "cf32")
            for name, (b, a) in DIRECT.items():
                x = noise(1500, dtype)
                order = max(len(b), len(a)) - 1
                zi = noise(order, np.complex128 if np.iscomplexobj(x) else np.float64)
                expected, zf = signal.lfilter(b, a, x.astype(zi.dtype), zi=zi)
                for method in ("AUTO", "IN_ORDER", "BLOCKS") if len(a) <= 17 else ("AUTO",):
                    iir = filter_of(kind, method, b, a)
                    found = ctypes.c_uint64()
                    lumra.call("iir_order", iir, found)
                    self.assertEqual(order, found.value)
                    lumra.call("iir_set_state", iir, zi, order)
                    y = process(iir, x)
                    self.close(expected, y, 1e-7 if single else 1e-13, (kind, name, method))
                    state = np.empty_like(zi)
                    lumra.call("iir_get_state", iir, state, order)
                    if order:
                        self.close(zf, state, 1e-11, (kind, name, method))

                    # The same bits by pieces, in place, with a save and a load between any two of them.
                    lumra.call("iir_set_state", iir, zi, order)
                    pieces = x.copy()
                    for first, last in zip(*(lambda c: (c[:-1], c[1:]))([0, *np.sort(lumra.random.integers(0, 1500, 40)), 1500])):
                        lumra.call("iir_process", iir, pieces[first:last], pieces[first:last], last - first)
                        iir = lumra.load("iir", lumra.save(iir))
                    self.assertEqual(y.tobytes(), pieces.tobytes(), (kind, name, method))

    def test_sections(self):
        for kind, dtype in lumra.types.items():
            for sos in (signal.butter(1, 0.3, output="sos"), signal.cheby1(9, 1, [0.1, 0.102], "band", output="sos")):
                x = noise(4000, dtype)
                wide = x.astype(np.complex128 if np.iscomplexobj(x) else np.float64)
                zi = noise(2 * len(sos), wide.dtype)
                expected, zf = signal.sosfilt(sos, wide, zi=zi.reshape(-1, 2))
                iir = filter_of(kind, sos=sos)
                lumra.call("iir_set_state", iir, zi, zi.size)
                y = process(iir, x, [1, 8, 9, 1000])
                self.close(expected, y, 1e-7 if kind in ("f32", "cf32") else 1e-11, kind)
                state = np.empty_like(zi)
                lumra.call("iir_get_state", iir, state, zi.size)
                self.close(zf.ravel(), state, 1e-10, kind)
                lumra.call("iir_reset", iir)
                self.close(signal.sosfilt(sos, wide), process(iir, x), 2e-7 if x.itemsize <= 8 and dtype != np.float64 else 1e-11)

    def test_method_follows_accuracy(self):
        """Blocks are taken where they are as exact as the recursion in order, for narrow filters of high order, too."""
        method = ctypes.c_int32()
        x = noise(3000, np.float64)
        for kind, order, width in [
            ("F32", 2, 1e-3), ("F64", 4, 0.2), ("F64", 4, 0.01), ("F64", 6, 0.05), ("F64", 8, 0.02),
        ]:  # fmt: skip
            b, a = signal.butter(order, width)
            iir = filter_of(kind, b=b, a=a)
            lumra.call("iir_get_method", iir, method)
            self.assertEqual(lumra.constants["LUMRA_IIR_BLOCKS"], method.value, (kind, order, width))
            if kind == "F64":
                # Beside the same recursion in extended precision, our error is that of the recursion in double precision.
                exact = _in_extended_precision(b, a, x)
                ours = np.abs(process(iir, x) - exact).max()
                scipys = np.abs(signal.lfilter(b, a, x) - exact).max()
                self.assertLess(ours, 5 * scipys, (order, width))
        x = noise(300, np.float64)
        for b, a, wanted in (([1.0], [1.0, -1.5], 1), ([1.0], [1.0, -2.0, 1.0], 2), ([1.0], [1.0, *[0.01] * 17], 1)):
            iir = filter_of("F64", b=b, a=a)  # not stable, but still right; or too long
            lumra.call("iir_get_method", iir, method)
            self.assertEqual(wanted, method.value, a)
            self.close(signal.lfilter(b, a, x), process(iir, x), 1e-9)
        # Blocks cannot hold what grows beyond all numbers within a few of them.
        iir = filter_of("F64", "BLOCKS", [1.0], [1.0, -1e9])
        lumra.call("iir_get_method", iir, method)
        self.assertEqual(1, method.value)

    def test_not_finite_and_silence(self):
        b, a = signal.butter(4, 0.2)
        for method in ("IN_ORDER", "BLOCKS"):
            for place in range(100, 117):
                x = noise(300, np.float32)
                clean = process(filter_of("F32", method, b, a), x)
                x[place] = (np.nan, np.inf)[place % 2]
                iir = filter_of("F32", method, b, a)
                y = process(iir, x, [103, 110])
                np.testing.assert_array_equal(clean[:place], y[:place])
                self.assertFalse(np.isfinite(y[place:]).any())
                lumra.call("iir_reset", iir)
                np.testing.assert_array_equal(clean[:100], process(iir, x[:100]))
            iir = filter_of("F64", method, b, a)
            process(iir, noise(100, np.float64))
            silence = process(iir, np.zeros(40000))
            self.assertFalse(silence[-100:].any())

    def test_bad_arguments(self):
        room, one, method = ctypes.c_void_p(), np.ones(1), ctypes.c_int32()
        out = ctypes.byref(room)

        def options(**changes):
            return lumra.record("iir", **changes)
        for code, says, arguments in [
            ("LUMRA_NULL_ARGUMENT", "out is null", (None, one, 1, one, 1, None)),
            ("LUMRA_BAD_SIZE_FIELD", "options->size is 3", (options(size=3), one, 1, one, 1, out)),
            ("LUMRA_UNKNOWN_CHOICE", "options->type is 11", (options(type=11), one, 1, one, 1, out)),
            ("LUMRA_UNKNOWN_CHOICE", "options->method is 3", (options(method=3), one, 1, one, 1, out)),
            ("LUMRA_OUT_OF_RANGE", "b_count is 0", (None, one, 0, one, 1, out)),
            ("LUMRA_OUT_OF_RANGE", "a_count is 18446744073709551615", (None, one, 1, one, 2**64 - 1, out)),
            ("LUMRA_NULL_ARGUMENT", "b is null", (None, None, 1, one, 1, out)),
            ("LUMRA_NULL_ARGUMENT", "a is null", (None, one, 1, None, 1, out)),
            ("LUMRA_OUT_OF_RANGE", "b[0] is nan", (None, np.array([np.nan]), 1, one, 1, out)),
            ("LUMRA_OUT_OF_RANGE", "a[1] is inf", (None, one, 1, np.array([1, np.inf]), 2, out)),
            ("LUMRA_OUT_OF_RANGE", "a[0] is 0", (None, one, 1, np.zeros(1), 1, out)),
            ("LUMRA_OUT_OF_RANGE", "once divided by a[0]", (None, np.array([1e300]), 1, np.array([1e-300]), 1, out)),
            ("LUMRA_OUT_OF_RANGE", "blocks take 16", (options(method=2), one, 1, np.ones(18), 18, out)),
        ]:
            self.refused(code, "iir_create", *arguments, says=says)
            self.assertIsNone(room.value)
        self.refused("LUMRA_OUT_OF_RANGE", "iir_create_sections", None, one, 0, out, says="count is 0")
        self.refused("LUMRA_OUT_OF_RANGE", "iir_create_sections", None, one, 4097, out, says="count is 4097")

        iir, x = filter_of("F32", b=[1.0], a=[1.0, 0.5]), np.ones(8, np.float32)
        self.refused("LUMRA_NULL_ARGUMENT", "iir_process", None, x, x, 8, says="filter is null")
        self.refused("LUMRA_WRONG_OBJECT", "iir_process", x, x, x, 8, says="another kind")
        self.refused("LUMRA_OUT_OF_RANGE", "iir_process", iir, x, x, 2**63, says="the count of in")
        self.refused("LUMRA_NULL_ARGUMENT", "iir_process", iir, None, x, 8, says="in is null")
        self.refused("LUMRA_NULL_ARGUMENT", "iir_process", iir, x, None, 8, says="out is null")
        self.refused("LUMRA_OVERLAP", "iir_process", iir, x[:7], x[1:], 7, says="out overlaps in")
        lumra.call("iir_process", iir, None, None, 0)
        self.refused("LUMRA_OUT_OF_RANGE", "iir_set_state", iir, one, 2, says="the state has 1 values")
        self.refused("LUMRA_NULL_ARGUMENT", "iir_get_state", iir, None, 1, says="state is null")
        self.refused("LUMRA_NULL_ARGUMENT", "iir_get_method", iir, None, says="method is null")
        self.refused("LUMRA_NULL_ARGUMENT", "iir_order", iir, None, says="order is null")
        self.state_is_checked(iir)
        lumra.run("iir_free", iir.value)
        self.refused("LUMRA_WRONG_OBJECT", "iir_process", iir, x, x, 8, says="was freed")
        iir.value = None


def _in_extended_precision(b, a, x):
    b, a, x = (np.asarray(v, np.longdouble) for v in (b, a, x))
    z, y = np.zeros(len(b), np.longdouble), np.empty_like(x)
    for n, v in enumerate(x):
        y[n] = b[0] * v + z[0]
        z[:-1] = b[1:] * v + z[1:] - a[1:] * y[n]
    return y.astype(float)


if __name__ == "__main__":
    unittest.main()
