# SPDX-License-Identifier: MIT
"""Fourier transforms against SciPy's in double precision."""
import ctypes
import unittest

import numpy as np
import open as lumra
import scipy.fft

TYPES = {dtype: lumra.type_code(kind) for kind, dtype in lumra.types.items()}
NORMS = {"LUMRA_FFT_SCALE_BACKWARD": "backward", "LUMRA_FFT_SCALE_FORWARD": "forward", "LUMRA_FFT_SCALE_BOTH": "ortho"}
PLACES = ("record_step", "record_distance", "spectrum_step", "spectrum_distance")
noise = lumra.noise


def bins_type(dtype):
    return np.result_type(dtype, np.complex64)


def make(dtype, points, scaling="LUMRA_FFT_SCALE_BACKWARD"):
    return lumra.create("fft", type=TYPES[np.dtype(dtype)], points=points, scaling=lumra.constants[scaling])


def definition(x, axis=-1, norm="backward"):
    transform = scipy.fft.fft if x.dtype.kind == "c" else scipy.fft.rfft
    return transform(x.astype(np.result_type(x, "f8")), None, axis, norm)


def where(*places):
    return lumra.record("fft_layout", **dict(zip(PLACES, places, strict=True)))


def layout(record, spectrum, axis, across):
    """Strides of two arrays in elements."""
    return where(*(x.strides[a] // x.itemsize for x in (record, spectrum) for a in (axis, across)))


class Transform(lumra.Test):
    def tolerance(self, x, points):
        return 4 * np.finfo(x.dtype).eps * (1 + np.log2(points))

    def test_sizes_types_and_scalings(self):
        sizes = [*range(1, 41), 64, 1000, 1009, 4096, 10007, 65536, 65537, 131072]
        for dtype, points in ((t, n) for t in TYPES for n in sizes):
            rows = 3
            for scaling, norm in NORMS.items() if points < 20 else [*NORMS.items()][:1]:
                fft = make(dtype, points, scaling)
                x = lumra.odd(noise((rows, points), dtype))
                kept, expected = x.copy(), definition(x, norm=norm)
                out = lumra.odd(np.full(expected.shape, np.nan, bins_type(dtype)))
                lumra.call("fft_forward", fft, x, out, rows, None)
                what = (dtype, points, norm)
                self.close(expected, out, self.tolerance(x, points), what)
                if dtype.kind == "f":  # what does not count
                    real_bins = [0] if points % 2 else [0, -1]
                    self.assertFalse(out[:, real_bins].imag.any())
                    out[:, real_bins] += 1000j
                spectrum, back = out.copy(), lumra.odd(np.full(x.shape, np.nan, dtype))
                lumra.call("fft_backward", fft, out, back, rows, None)
                self.close(kept, back, 2 * self.tolerance(x, points), what)
                np.testing.assert_array_equal(kept, x)
                np.testing.assert_array_equal(spectrum, out)

    def test_unscaled_there_and_back_gives_n_times_the_record(self):
        fft, x = make("c16", 12, "LUMRA_FFT_UNSCALED"), noise(12, "c16")
        lumra.call("fft_forward", fft, x, out := np.empty(12, "c16"), 1, None)
        lumra.call("fft_backward", fft, out, out, 1, None)
        self.close(12 * x, out, 1e-15)

    def test_any_axis_of_any_array(self):
        for dtype, points in ((t, n) for t in TYPES for n in (1, 2, 9, 64)):
            fft = make(dtype, points)
            for axis, others in ((0, (5, 21)), (1, (5, 21)), (2, (5, 21)), (0, (1, 1))):
                shape = list(others)
                shape.insert(axis, points)
                whole = noise([2 * n for n in shape], dtype)
                for x in (whole[::2, ::2, ::2], whole[tuple(slice(n) for n in shape)][::-1, ::-1, ::-1]):
                    expected = definition(x, axis)
                    for order in "CF":
                        out = np.full(expected.shape, np.nan, bins_type(dtype), order)
                        back = np.full(x.shape, np.nan, dtype, order)
                        across, along = [a for a in range(3) if a != axis]
                        for k in range(x.shape[along]):
                            rows = [np.moveaxis(a, along, 0)[k] for a in (x, out, back)]
                            places = [a - (a > along) for a in (axis, across)]
                            there, here = layout(rows[0], rows[1], *places), layout(rows[2], rows[1], *places)
                            lumra.call("fft_forward", fft, *rows[:2], x.shape[across], there)
                            lumra.call("fft_backward", fft, *rows[1:], x.shape[across], here)
                        what = (dtype, points, axis, x.strides, order)
                        self.close(expected, out, self.tolerance(x, points), what)
                        self.close(x, back, 2 * self.tolerance(x, points), what)

    def test_in_place(self):
        for dtype, points in ((t, n) for t in TYPES for n in (1, 2, 15, 16, 131072)):
            fft, rows, bins = make(dtype, points), 3, points // 2 + 1
            x = noise((rows, points), dtype)
            expected = definition(x)
            if dtype.kind == "c":
                for data in (x.copy(), np.asfortranarray(x)):
                    lumra.call("fft_forward", fft, data, data, rows, layout(data, data, 1, 0))
                    self.close(expected, data, self.tolerance(x, points), (dtype, points))
                    lumra.call("fft_backward", fft, data, data, rows, layout(data, data, 1, 0))
                    self.close(x, data, 2 * self.tolerance(x, points), (dtype, points))
            else:
                data = np.full((rows, 2 * bins + 4), 7, dtype)
                data[:, :points] = x
                spectra = data.view(bins_type(dtype))
                lumra.call("fft_forward", fft, data, data, rows, layout(data, spectra, 1, 0))
                self.close(expected, spectra[:, :bins], self.tolerance(x, points), (dtype, points))
                lumra.call("fft_backward", fft, data, data, rows, layout(data, spectra, 1, 0))
                self.close(x, data[:, :points], 2 * self.tolerance(x, points), (dtype, points))
                self.assertTrue((data[:, 2 * bins :] == 7).all())

    def test_rows_read_may_be_one(self):
        x, out = noise(8, "c8"), np.zeros((3, 8), "c8")
        lumra.call("fft_forward", make("c8", 8), x, out, 3, where(1, 0, 1, 8))
        self.close(np.tile(definition(x), (3, 1)), out, 1e-6)

    def test_refused_options(self):
        for code, word, changes in (
            ("LUMRA_UNKNOWN_CHOICE", "type is 8", {"type": 8}),
            ("LUMRA_OUT_OF_RANGE", "points is 0", {"points": 0}),
            ("LUMRA_OUT_OF_RANGE", "points is 134217729", {"points": 2**27 + 1}),
            ("LUMRA_OUT_OF_RANGE", "points is 18446744073709551615", {"points": 2**64 - 1}),
            ("LUMRA_UNKNOWN_CHOICE", "scaling is 4", {"scaling": 4}),
            ("LUMRA_UNKNOWN_CHOICE", "scaling is -1", {"scaling": -1}),
            ("LUMRA_OUT_OF_RANGE", "reserved is 1", {"reserved": 1}),
        ):
            self.refused(code, "fft_create", lumra.record("fft", **changes), ctypes.c_void_p(), says=word)

    def test_refused_rows(self):
        data, real, huge = noise(100, "c8"), make("f4", 8), 2**62
        fft, freed = make("c8", 8), make("c8", 8)
        lumra.run("fft_free", freed)
        at, far = data.ctypes.data, data.ctypes.data + 8 * 50
        for code, word, arguments in (
            ("LUMRA_NULL_ARGUMENT", "fft is null", (None, data, far, 1, None)),
            ("LUMRA_WRONG_OBJECT", "fft was freed", (freed, data, far, 1, None)),
            ("LUMRA_WRONG_OBJECT", "fft was freed", (far, data, far, 1, None)),
            ("LUMRA_OUT_OF_RANGE", "rows", (fft, data, far, 2**64 - 1, None)),
            ("LUMRA_OUT_OF_RANGE", "record_step is 46", (fft, data, far, 1, where(huge, 8, 1, 8))),
            ("LUMRA_OUT_OF_RANGE", "spectrum_distance is -92", (fft, data, far, 2, where(1, 8, 1, -(2**63)))),
            ("LUMRA_NULL_ARGUMENT", "record is null", (fft, None, far, 1, None)),
            ("LUMRA_NULL_ARGUMENT", "spectrum is null", (fft, data, None, 1, None)),
            ("LUMRA_OVERLAP", "each other", (fft, data, far, 2, where(1, 8, 1, 7))),
            ("LUMRA_OVERLAP", "each other", (fft, data, far, 2, where(1, 8, 1, 0))),
            ("LUMRA_OVERLAP", "each other", (fft, data, far, 1, where(1, 8, 0, 8))),
            ("LUMRA_OVERLAP", "each other", (fft, data, far, 3, where(1, 8, 2, 1))),
            ("LUMRA_OVERLAP", "spectrum overlaps record", (fft, data, at + 8, 1, None)),
            ("LUMRA_OVERLAP", "spectrum overlaps record", (fft, far, at + 8 * 43, 1, None)),
            ("LUMRA_OVERLAP", "another layout", (fft, data, at, 1, where(1, 8, 2, 8))),
            ("LUMRA_OVERLAP", "another layout", (fft, data, at, 2, where(1, 8, 1, 9))),
            ("LUMRA_OVERLAP", "another layout", (real, data, at, 2, where(1, 8, 1, 5))),
            ("LUMRA_OVERLAP", "another layout", (real, data, at, 1, where(2, 8, 1, 8))),
            ("LUMRA_OVERLAP", "rows of their own", (real, data, at, 2, None)),
        ):
            self.refused(code, "fft_forward", *arguments, says=word)
        self.refused("LUMRA_OVERLAP", "fft_backward", real, data, at, 2, where(1, 8, 1, 4), says="another layout")
        lumra.call("fft_forward", fft, None, None, 0, None)
        unused = -(2**63)  # distances of a single row
        lumra.call("fft_forward", fft, data, far, 1, where(1, unused, 1, unused))


if __name__ == "__main__":
    unittest.main()
