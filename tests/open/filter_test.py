# SPDX-License-Identifier: MIT
"""Filters, convolution, correlation and designs against SciPy's."""
import ctypes
import itertools
import unittest

import numpy as np
import open as lumra
import scipy.signal

C = lumra.constants
ERRORS = {"f32": 2e-6, "f64": 1e-14, "cf32": 2e-6, "cf64": 1e-14}
MODES = ("full", "same", "valid")
noise = lumra.noise
METHODS = {name: C[f"LUMRA_METHOD_{name.upper()}"] for name in ("auto", "direct", "fourier")}
def fir(taps, kind="f32", method="auto", taps_kind="f32"):
    code, taps_code = lumra.type_code(kind), lumra.type_code(taps_kind)
    options = lumra.record("fir", type=code, method=METHODS[method], taps_type=taps_code)
    return lumra.make("fir_create", options, taps, len(taps))


def process(filter, x):
    out = lumra.odd(x)
    lumra.call("fir_process", filter, out, out, len(out))
    return out


def cut(x, longest):
    """Pieces of random lengths, none and one among them."""
    done = 0
    while done < len(x):
        n = int(lumra.random.integers(0, longest + 1))
        yield x[done : done + n]
        done += n


class Fir(lumra.Test):
    def test_streams_in_pieces(self):
        # Up to 64 taps pieces give the bits of the whole; a filter that is loaded in the middle goes on with them, too.
        kinds = [("f32", "f32"), ("f64", "f64")] + [(s, t) for s, r in (("cf32", "f32"), ("cf64", "f64")) for t in (r, s)]
        for (kind, taps_kind), count in itertools.product(kinds, (1, 2, 3, 9, 64, 65, 300, 2000)):
            tolerance = ERRORS[kind]
            h, x = noise(count, lumra.types[taps_kind]), noise(12345, lumra.types[kind])
            exact = scipy.signal.lfilter(h.astype(np.complex128), 1, x)
            expected = exact if np.iscomplexobj(x) else exact.real
            for method in ("auto", "direct", "fourier"):
                what = kind, taps_kind, count, method
                one = fir(h, kind, method, taps_kind)
                whole = process(one, x)
                self.close(expected, whole, tolerance * np.sqrt(count), what)
                for longest in (3, 100, 5000):
                    lumra.call("fir_reset", one)
                    pieces = []
                    for piece in cut(x if longest > 3 else x[:1500], longest):
                        pieces.append(process(one, piece))
                        if len(pieces) == 3:
                            one = lumra.load("fir", lumra.save(one))
                    pieces = np.concatenate(pieces)
                    if method == "direct" or (method == "auto" and count <= 64):
                        self.assertEqual(whole[: len(pieces)].tobytes(), pieces.tobytes(), what)
                    else:
                        self.close(expected[: len(pieces)], pieces, tolerance * np.sqrt(count), what)

    def test_whole_registers_and_what_is_not_finite(self):
        h = noise(5, np.float32)
        for n in range(1, 140):
            x = noise(n, np.float32)
            self.close(scipy.signal.lfilter(h, 1, x), process(fir(h), x), 1e-6, n)
        x = np.zeros(100, np.float32)
        x[50] = np.nan
        self.assertEqual(list(range(50, 55)), list(np.flatnonzero(np.isnan(process(fir(h), x)))))
        long = fir(noise(1000, np.float32))
        process(long, x)
        process(long, np.ones(1 << 17, np.float32))
        self.assertTrue(np.isfinite(process(long, np.ones(100, np.float32))).all())

    def test_states(self):
        filter, x = fir(noise(4, np.float32)), noise(9, np.float32)
        process(filter, x)
        self.state_is_checked(filter)
        loaded = lumra.load("fir", lumra.save(filter))
        self.assertEqual(process(filter, x).tobytes(), process(loaded, x).tobytes())

    def test_refusals(self):
        h, x, handle = noise(4, np.float32), noise(64, np.float32), ctypes.c_void_p()
        for code, changes, count in (
            ("LUMRA_BAD_SIZE_FIELD", {"size": 3}, 4),
            ("LUMRA_UNKNOWN_CHOICE", {"type": 11}, 4),
            ("LUMRA_UNKNOWN_CHOICE", {"taps_type": C["LUMRA_TYPE_F64"]}, 4),
            ("LUMRA_UNKNOWN_CHOICE", {"type": C["LUMRA_TYPE_F32"], "taps_type": C["LUMRA_TYPE_CF32"]}, 4),
            ("LUMRA_UNKNOWN_CHOICE", {"method": 3}, 4),
            ("LUMRA_OUT_OF_RANGE", {}, 0),
            ("LUMRA_OUT_OF_RANGE", {}, 2**24 + 1),
        ):
            self.refused(code, "fir_create", lumra.record("fir", **changes), h, count, handle)
        self.refused("LUMRA_NULL_ARGUMENT", "fir_create", None, None, 4, handle, says="taps")
        self.refused("LUMRA_NULL_ARGUMENT", "fir_create", None, h, 4, None, says="fir")
        filter = fir(h)
        for code, *arguments in (
            ("LUMRA_NULL_ARGUMENT", None, x, x, 4),
            ("LUMRA_WRONG_OBJECT", x, x, x, 4),
            ("LUMRA_OUT_OF_RANGE", filter, x, x, 2**63),
            ("LUMRA_NULL_ARGUMENT", filter, None, x, 4),
            ("LUMRA_NULL_ARGUMENT", filter, x, None, 4),
            ("LUMRA_OVERLAP", filter, x, x[1:], 4),
        ):
            self.refused(code, "fir_process", *arguments)
        lumra.call("fir_process", filter, None, None, 0)


class Convolution(lumra.Test):
    def combine(self, function, kind, x, y, mode, method="auto"):
        count = ctypes.c_uint64()
        lumra.call("convolve_size", len(x), len(y), MODES.index(mode), count)
        out = lumra.odd(np.full(count.value, np.nan, x.dtype))
        arguments = x, len(x), y, len(y), MODES.index(mode), METHODS[method], out, len(out)
        lumra.call(f"{function}_{kind}", *arguments)
        return out

    def test_every_mode_and_method(self):
        lengths = [*itertools.product((1, 2, 7, 8, 9, 40), repeat=2), (1000, 64), (64, 1000), (3000, 2900), (20000, 300)]
        for kind, dtype in lumra.types.items():
            for nx, ny in lengths:
                x, y = lumra.odd(noise(nx, dtype)), lumra.odd(noise(ny, dtype))
                functions = ["convolve", "correlate"] + ["convolve_with_real"] * np.iscomplexobj(x)
                for function, mode in itertools.product(functions, MODES):
                    if function == "convolve_with_real":
                        y = y.real.copy()
                    expected = getattr(scipy.signal, function.removesuffix("_with_real"))(x.astype(np.complex128), y, mode)
                    for method in METHODS if nx + ny < 10000 else ("auto", "fourier"):
                        out = self.combine(function, kind, x, y, mode, method)
                        what = function, kind, nx, ny, mode, method
                        self.close(expected if np.iscomplexobj(x) else expected.real, out, 20 * ERRORS[kind], what)

    def test_refusals(self):
        x, out, count = noise(8, np.float32), np.zeros(16, np.float32), ctypes.c_uint64()
        for code, *arguments in (
            ("LUMRA_OUT_OF_RANGE", x, 0, x, 8, 0, 0, out, 16),
            ("LUMRA_OUT_OF_RANGE", x, 8, x, 2**64 - 1, 0, 0, out, 16),
            ("LUMRA_UNKNOWN_CHOICE", x, 8, x, 8, 3, 0, out, 16),
            ("LUMRA_UNKNOWN_CHOICE", x, 8, x, 8, 0, -1, out, 16),
            ("LUMRA_OUT_OF_RANGE", x, 2**27, x, 2**27, 0, 2, out, 16),
            ("LUMRA_NULL_ARGUMENT", None, 8, x, 8, 0, 0, out, 16),
            ("LUMRA_NULL_ARGUMENT", x, 8, None, 8, 0, 0, out, 16),
            ("LUMRA_TOO_LITTLE_ROOM", x, 8, x, 8, 0, 0, out, 14),
            ("LUMRA_NULL_ARGUMENT", x, 8, x, 8, 0, 0, None, 16),
            ("LUMRA_OVERLAP", x, 8, out, 2, 0, 0, out[1:], 9),
        ):
            for function in ("convolve_f32", "correlate_f32"):
                self.refused(code, function, *arguments)
        for code, *arguments in (
            ("LUMRA_OUT_OF_RANGE", 0, 1, 0, count),
            ("LUMRA_UNKNOWN_CHOICE", 1, 1, -1, count),
            ("LUMRA_NULL_ARGUMENT", 1, 1, 0, None),
        ):
            self.refused(code, "convolve_size", *arguments)


class Design(lumra.Test):
    def design(self, name, *arguments, suffix="f64"):
        count = ctypes.c_uint64()
        lumra.call(f"design_{name}_count", *map(float, arguments), count)
        taps = np.full(count.value + 1, 7, lumra.types[suffix])
        lumra.call(f"design_{name}_{suffix}", *map(float, arguments), taps, count.value)
        self.assertEqual(7, taps[-1])
        return taps[:-1]

    def test_kaiser_lowpass(self):
        for rejection, (p, s) in itertools.product(
            (20, 30, 60, 80, 120, 160), ((0.1, 0.12), (0.0, 0.05), (0.01, 0.02), (0.35, 0.45), (0.2, 0.5), (0.2, 0.202))
        ):
            what = rejection, p, s
            taps = self.design("kaiser_lowpass", 1e6, p * 1e6, s * 1e6, rejection)
            np.testing.assert_array_equal(taps, taps[::-1])
            self.assertAlmostEqual(1, taps.sum(), delta=1e-13)
            w = np.unique(np.concatenate([np.linspace(0, 0.5, 20 * len(taps) + 2), [p, s]]))
            gain = np.abs(scipy.signal.freqz(taps, worN=w, fs=1)[1]) if len(taps) < 500 else np.abs(
                scipy.signal.freqz(taps, worN=2**18, fs=1)[1])  # fmt: skip
            w = w if len(taps) < 500 else np.arange(2**18) / 2**19
            deviation = max(np.abs(gain[w <= p] - 1).max(initial=0), gain[w >= s].max())
            # No more taps than Kaiser's formula asks for once it is corrected by what it misses.
            most = scipy.signal.kaiserord(rejection + 6.5, 2 * (s - p))[0] + 2
            self.assertLessEqual(len(taps), most, what)
            self.assertGreater(-20 * np.log10(deviation), rejection - 0.001, what)
            self.assertLess(-20 * np.log10(deviation), rejection + (1.5 if len(taps) > 50 else 30), what)
        single = self.design("kaiser_lowpass", 1.0, 0.1, 0.12, 60, suffix="f32")
        self.close(self.design("kaiser_lowpass", 1.0, 0.1, 0.12, 60), single, 1e-7)

    def test_root_raised_cosine(self):
        for samples, roll_off, span in ((4, 0.22, 40), (8, 0.0, 300), (5, 1.0, 20), (2.5, 0.5, 50), (1, 0.3, 30)):
            what = samples, roll_off, span
            taps = self.design("root_raised_cosine", samples * 1e6, 1e6, roll_off, span)
            self.assertEqual(round(span * samples) + 1, len(taps), what)
            self.assertAlmostEqual(1, np.sum(taps**2), delta=1e-12, msg=what)
            self.close(taps, self.design("root_raised_cosine", samples, 1, roll_off, span, suffix="f32"), 1e-7, what)
            if samples >= 1 + roll_off and samples == int(samples):  # two in a row are 0 at all other symbols
                pair = np.convolve(taps, taps)[(len(taps) - 1) % samples :: samples]
                self.assertLess(np.sort(np.abs(pair))[-2], 0.01, what)

    def test_refusals(self):
        taps, count = np.zeros(8), ctypes.c_uint64()
        for name, *arguments in (
            ("kaiser_lowpass", 0, 0.1, 0.2, 60),
            ("kaiser_lowpass", np.inf, 0.1, 0.2, 60),
            ("kaiser_lowpass", 1, -0.1, 0.2, 60),
            ("kaiser_lowpass", 1, np.nan, 0.2, 60),
            ("kaiser_lowpass", 1, 0.2, 0.2, 60),
            ("kaiser_lowpass", 1, 0.2, 0.6, 60),
            ("kaiser_lowpass", 1, 0.1, 0.2, 201),
            ("kaiser_lowpass", 1, 0.1, 0.1000001, 60),
            ("root_raised_cosine", np.nan, 1, 0.2, 8),
            ("root_raised_cosine", 4, 0, 0.2, 8),
            ("root_raised_cosine", 4, 5, 0.2, 8),
            ("root_raised_cosine", 4, 1, 1.1, 8),
            ("root_raised_cosine", 4, 1, 0.2, 0),
            ("root_raised_cosine", 4, 1, 0.2, 1e9),
        ):
            arguments = [float(a) for a in arguments]
            self.refused("LUMRA_OUT_OF_RANGE", f"design_{name}_count", *arguments, count)
            self.refused("LUMRA_OUT_OF_RANGE", f"design_{name}_f64", *arguments, taps, 8)
        for name, *arguments in (("kaiser_lowpass", 1.0, 0.1, 0.2, 60.0), ("root_raised_cosine", 4.0, 1.0, 0.2, 8.0)):
            self.refused("LUMRA_NULL_ARGUMENT", f"design_{name}_count", *arguments, None)
            self.refused("LUMRA_TOO_LITTLE_ROOM", f"design_{name}_f64", *arguments, taps, 8)
            self.refused("LUMRA_NULL_ARGUMENT", f"design_{name}_f64", *arguments, None, 1000)


if __name__ == "__main__":
    unittest.main()
