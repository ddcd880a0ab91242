# SPDX-License-Identifier: MIT
"""Levels beside NumPy, and the same bits for any cut and any tree of merges."""
import ctypes
import unittest

import numpy as np

import open as lumra

TYPES = {"F32": np.float32, "F64": np.float64, "CF32": np.complex64, "CF64": np.complex128}
ABOVE = np.array([3.0, -np.inf, -10, 0, 8, -0.5, np.inf])
RESOLUTION = 0.0085
rng = np.random.default_rng(11)


def noise(n, dtype):
    x = rng.standard_normal(n) + (1j * rng.standard_normal(n) if np.issubdtype(dtype, np.complexfloating) else 0)
    return x.astype(dtype)


def level_of(kind, x=(), start=0, threads=1):
    level = lumra.create("level", type=lumra.constants[f"LUMRA_TYPE_{kind}"], start=start, threads=threads)
    lumra.call("level_add", level, x if len(x) else None, len(x))
    return level


def read(level):
    result = lumra.record("level_result")
    result.size = ctypes.sizeof(result)
    lumra.call("level_read", level, result)
    return result


def ccdf(level):
    share = np.empty(len(ABOVE))
    lumra.call("level_ccdf", level, ABOVE, share, len(ABOVE))
    return share


def exact_ccdf(kind, x, above=ABOVE):
    share = np.empty(len(above))
    lumra.call(f"ccdf_{kind.lower()}", x, len(x), above, share, len(above))
    return share


def saved(level):
    size = ctypes.c_uint64()
    lumra.call("level_state_size", level, size)
    bytes_ = np.empty(size.value, np.uint8)
    lumra.call("level_save", level, bytes_, bytes_.size)
    return bytes_


def loaded(bytes_):
    handle = ctypes.c_void_p()
    lumra.call("level_load", bytes_, bytes_.size, ctypes.byref(handle))
    return lumra.Object("level", handle.value)


def all_of(level):
    return bytes(read(level)), ccdf(level).tobytes(), saved(level).tobytes()


def tree(kind, x, start):
    """One level of all samples, from random cuts, merges, and states."""
    if len(x) > 700 and rng.random() < 0.95:
        cut = int(rng.integers(0, len(x) + 1))
        level = tree(kind, x[:cut], start)
        lumra.call("level_merge", level, tree(kind, x[cut:], start + cut))
        return loaded(saved(level)) if rng.random() < 0.3 else level
    cut = int(rng.integers(0, len(x) + 1))
    level = level_of(kind, x[:cut], start)
    lumra.call("level_add", level, x[cut:], len(x) - cut)
    return level


class Level(lumra.Test):
    def test_figures(self):
        for kind, dtype in TYPES.items():
            complex_ = np.issubdtype(dtype, np.complexfloating)
            for name, x in {
                "noise": 0.3 * noise(100_001, dtype) + dtype(0.1 - (0.2j if complex_ else 0)),
                "one": np.array([-0.5], dtype),
                "constant envelope": np.exp(1j * np.arange(5000)).astype(dtype) if complex_ else np.ones(5000, dtype),
                "wide range": np.geomspace(1e-18, 1e18, 4000).astype(dtype),
                "zeros between": np.where(np.arange(3000) % 3, noise(3000, dtype), dtype(0)),
            }.items():
                wide = x.astype(complex)
                power = wide.real**2 + wide.imag**2
                level = level_of(kind, lumra.odd(x), 77)
                got, what = read(level), (kind, name)
                rms, peak = np.sqrt(power.mean()), np.abs(wide).max()
                self.close([power.mean(), rms], [got.power, got.rms], 1e-14, what)
                self.close([peak], [got.peak], 1e-15, what)
                self.close([1, wide.mean() / rms], [1, (got.dc_re + 1j * got.dc_im) / rms], 1e-14, what)
                self.close(20 * np.log10([rms, peak]) + 500, np.array([got.rms_db, got.peak_db]) + 500, 1e-14, what)
                self.assertAlmostEqual(20 * np.log10(peak / rms), got.crest_db, 12, what)
                self.assertEqual((len(x), 77 + int(power.argmax())), (got.samples, got.peak_index), what)

                def shares(db):
                    return [(power > power.mean() * 10 ** (a / 10)).mean() for a in db]

                above = ABOVE + 1e-5 if name == "constant envelope" else ABOVE  # not where rounding decides
                np.testing.assert_array_equal(shares(above), exact_ccdf(kind, lumra.odd(x), above), str(what))
                share = ccdf(level)
                self.assertTrue((shares(ABOVE + RESOLUTION) <= share).all() and (share <= shares(ABOVE - RESOLUTION)).all(), what)

    def test_same_bits_for_any_tree(self):
        for kind, dtype in TYPES.items():
            for start in (0, 1023, 2**40 + 5, 2**62 - 20000):
                x = noise(int(rng.integers(1, 9000)), dtype)
                x[len(x) // 3] = x[len(x) // 2] = 100  # the peak, twice
                if start == 1023:
                    x[len(x) // 4 :: 50] = np.nan
                expected = all_of(level_of(kind, x, start))
                for _ in range(8):
                    self.assertEqual(expected, all_of(tree(kind, x, start)), (kind, start, len(x)))

    def test_same_bits_for_any_number_of_threads(self):
        for kind, dtype in TYPES.items():
            x = noise(300_001, dtype)
            x[70_000] = x[250_000] = 100  # the peak, twice
            for nan in (False, True):
                x[200_000 if nan else 0] *= np.nan if nan else 1
                alone, *shared = (level_of(kind, x, 700, threads) for threads in (1, 2, 0))
                for level in shared:
                    self.assertEqual(all_of(alone), all_of(level), (kind, nan))

    def test_order_does_not_matter_where_sums_cancel(self):
        x = np.repeat([1e150, 1.0, -1e150, 1e-3, 1e100, -1e100], 1024)
        level = level_of("F64", x)
        self.assertEqual((1.0 + 1e-3) / 6, read(level).dc_re)

    def test_not_finite_and_silence(self):
        for value, position in ((np.nan, 5), (np.inf, 5), (-np.inf, 2000)):
            x = np.ones(3000, np.float32)
            x[position] = x[2500] = value
            got = read(level_of("F32", x))
            self.assertEqual(str(abs(value)), str(got.power), value)
            self.assertEqual((str(abs(value)), position), (str(got.peak), got.peak_index))
            np.testing.assert_array_equal(np.full(len(ABOVE), value * 0 if np.isnan(value) else 0)[2:6], ccdf(level_of("F32", x))[2:6])
        silent = read(level_of("CF64", np.zeros(2000, complex)))
        self.assertEqual((0, 0, -np.inf, 0), (silent.rms, silent.peak, silent.rms_db, silent.peak_index))
        self.assertTrue(np.isnan(silent.crest_db))
        np.testing.assert_array_equal(np.zeros(6), ccdf(level_of("CF64", np.zeros(2000, complex)))[:6])
        self.assertTrue(np.isnan(exact_ccdf("F32", np.ones(3, np.float32), np.array([np.nan]))[0]))

    def test_refusals(self):
        handle = ctypes.c_void_p()
        out, x, share = ctypes.byref(handle), np.ones(8, np.complex64), np.empty(7)
        level, empty, late = level_of("CF32", x, 5), level_of("CF32", start=2**62), level_of("CF32", start=14)
        result, extent = lumra.record("level_result", size=200), lumra.record("level_extent")
        for code, says, function, *arguments in [
            ("NULL_ARGUMENT", "level is null", "level_create", None, None),
            ("BAD_SIZE_FIELD", "options->size is 4", "level_create", lumra.record("level", size=4), out),
            ("UNKNOWN_CHOICE", "options->type is 8", "level_create", lumra.record("level", type=8), out),
            ("OUT_OF_RANGE", "options->start is", "level_create", lumra.record("level", start=2**62 + 1), out),
            ("OUT_OF_RANGE", "options->threads is 1025", "level_create", lumra.record("level", threads=1025), out),
            ("OUT_OF_RANGE", "options->reserved is 1", "level_create", lumra.record("level", reserved=1), out),
            ("WRONG_OBJECT", "level was freed", "level_add", x, x, 8),
            ("OUT_OF_RANGE", "count of x", "level_add", level, x, 2**62),
            ("NULL_ARGUMENT", "x is null", "level_add", level, None, 8),
            ("OUT_OF_RANGE", "ends at 2^62", "level_add", empty, x, 1),
            ("OVERLAP", "next is level", "level_merge", level, level),
            ("WRONG_OBJECT", "next was freed", "level_merge", level, x),
            ("WRONG_TYPE", "of type 9", "level_merge", level, level_of("F32", start=13)),
            ("OUT_OF_RANGE", "starts at 14; level ends at 13", "level_merge", level, late),
            ("NULL_ARGUMENT", "extent is null", "level_where", level, None),
            ("NULL_ARGUMENT", "result is null", "level_read", level, None),
            ("BAD_SIZE_FIELD", "result->size is 200", "level_read", level, result),
            ("TOO_FEW_SAMPLES", "no samples", "level_ccdf", empty, ABOVE, share, 7),
            ("OVERLAP", "share overlaps", "level_ccdf", level, share, share, 7),
            ("NULL_ARGUMENT", "share is null", "ccdf_cf32", x, 8, ABOVE, None, 7),
            ("TOO_FEW_SAMPLES", "n is 0", "ccdf_cf32", x, 0, ABOVE, share, 7),
            ("TOO_LITTLE_ROOM", "the state needs", "level_save", level, x.view(np.uint8), 64),
        ]:
            self.refused(f"LUMRA_{code}", function, *arguments, says=says)
        lumra.call("level_where", level, extent)
        self.assertEqual((5, 8, 12), (extent.start, extent.samples, extent.type))
        bytes_ = saved(level)
        for k in [*range(100), *range(100, bytes_.size, 37)]:
            damaged = bytes_.copy()
            damaged[k] ^= 1 << k % 8
            self.refused("LUMRA_BAD_STATE", "level_load", damaged, damaged.size, out)
            self.refused("LUMRA_BAD_STATE", "level_load", bytes_[:k].copy(), k, out)
        self.assertIsNone(handle.value)


if __name__ == "__main__":
    unittest.main()
