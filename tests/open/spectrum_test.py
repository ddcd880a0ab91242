# SPDX-License-Identifier: MIT
"""Averaged spectra: SciPy's values, and the same bits however a stream is cut, merged, saved and threaded."""
import ctypes
import multiprocessing
import os
import unittest
from unittest import mock

import numpy as np
import open as lumra
import scipy.signal

C = lumra.constants
TYPES = {
    "f32": (np.float32, 2e-6), "f64": (np.float64, 5e-14), "cf32": (np.complex64, 2e-6), "cf64": (np.complex128, 5e-14),
}  # fmt: skip
WINDOWS = {"HANN": "hann", "SESSION_FLAT_TOP": "flattop", "RECTANGULAR": "boxcar", "KAISER": ("kaiser", 8.0)}
random = np.random.default_rng(11)


def noise(n, kind):
    x = random.standard_normal(n)
    return (x + 1j * random.standard_normal(n) if kind[0] == "c" else x).astype(TYPES[kind][0])


def make(kind="cf32", window="HANN", **options):
    return lumra.create("spectrum", type=C[f"LUMRA_TYPE_{kind.upper()}"], window=C[f"LUMRA_WINDOW_{window}"],
                        window_parameter=8.0, **options)  # fmt: skip


def add(spectrum, x):
    lumra.call("spectrum_add", spectrum, lumra.odd(x), len(x))


def where(spectrum):
    extent = lumra.record("spectrum_extent")
    lumra.call("spectrum_where", spectrum, extent)
    return extent


def read(spectrum, hold=False):
    info = lumra.record("spectrum_info")
    info.size = ctypes.sizeof(info)
    bins = where(spectrum).bins
    rows = [np.full(bins, -1.0) for _ in range(3 if hold else 1)]
    lumra.call("spectrum_read", spectrum, info, *rows, *[None] * (3 - len(rows)), bins)
    return info, *rows


def save(spectrum):
    size = ctypes.c_uint64()
    lumra.call("spectrum_state_size", spectrum, size)
    state = np.zeros(size.value, np.uint8)
    lumra.call("spectrum_save", spectrum, state, len(state))
    return state


def load(state, threads=1):
    handle = ctypes.c_void_p()
    lumra.call("spectrum_load", state, len(state), threads, handle)
    return lumra.Object("spectrum", handle.value)


class Values(lumra.Test):
    def test_scipy_agrees(self):
        for kind, (_, tolerance) in TYPES.items():
            x = noise(20000, kind)
            for window, name in WINDOWS.items():
                for points, overlap in [(256, 0.5), (1000, 0.75), (333, 0.0), (17, 0.9), (20000, 0.0), (64, 0.99),
                                        (16384, 0.9), (17 * 512, 0.3)]:
                    spectrum = make(kind, window, points=points, overlap=overlap, sample_rate_hz=3.0, centre_hz=100.0)
                    add(spectrum, x)
                    info, power = read(spectrum)
                    f, expected = scipy.signal.welch(x.astype(complex if kind[0] == "c" else float), 3.0, name, points,
                                                     int(overlap * points), detrend=False, scaling="spectrum",
                                                     return_onesided=kind[0] != "c")  # fmt: skip
                    if kind[0] == "c":
                        f, expected = np.fft.fftshift(f), np.fft.fftshift(expected)
                    what = (kind, window, points, overlap)
                    self.close(expected, power, tolerance, what)
                    np.testing.assert_allclose(info.first_hz + info.spacing_hz * np.arange(len(power)), f + 100, 1e-12)
                    w = scipy.signal.get_window(name, points)
                    self.assertAlmostEqual(info.noise_bandwidth_bins, points * (w @ w) / w.sum() ** 2, 5, what)
                    self.assertEqual((len(x) - points) // (points - int(overlap * points)) + 1, info.segments)

    def test_extremes(self):
        for kind in TYPES:
            x = noise(3000, kind)
            spectrum = make(kind, points=100, overlap=0.3, hold=1, threads=3)
            add(spectrum, x)
            _, power, high, low = read(spectrum, hold=True)
            one_by_one = []
            for first in range(0, len(x) - 99, 70):
                single = make(kind, points=100)
                add(single, x[first : first + 100])
                one_by_one.append(read(single)[1])
            self.close(np.max(one_by_one, 0), high, 1e-6)
            self.close(np.min(one_by_one, 0), low, 1e-6)
            self.close(np.mean(one_by_one, 0), power, 1e-6)

    def test_a_tone_reads_its_power_and_a_nan_stays(self):
        x = np.exp(2j * np.pi * 0.25 * np.arange(4096)).astype(np.complex64)
        spectrum = make(points=1024, window="SESSION_FLAT_TOP", hold=1)
        add(spectrum, x)
        self.assertAlmostEqual(1, read(spectrum)[1][512 + 256], 6)
        x[2000] = np.nan
        add(spectrum, x)
        add(spectrum, x[:1024])
        for row in read(spectrum, hold=True)[1:]:
            self.assertTrue(np.isnan(row).all())


class Bits(lumra.Test):
    def whole(self, kind, pieces, gaps, **options):
        spectrum = make(kind, **options)
        for piece, gap in zip(pieces, gaps):
            if gap:
                lumra.call("spectrum_gap", spectrum)
            add(spectrum, piece)
        return spectrum

    def tree(self, kind, pieces, gaps, starts, origins, **options):
        """Accumulators of neighbours, merged in a random tree; some go through bytes on the way."""
        if len(pieces) == 1:
            made = make(kind, start=int(starts[0]), origin=int(origins[0]), threads=int(random.integers(0, 4)), **options)
            x = pieces[0]
            while len(x):
                n = int(random.integers(1, len(x) + 1))
                add(made, x[:n])
                x = x[n:]
        else:
            cut = int(random.integers(1, len(pieces)))
            made, other = (
                self.tree(kind, pieces[s], gaps[s], starts[s], origins[s], **options) for s in (slice(cut), slice(cut, None))
            )
            lumra.call("spectrum_merge", made, other)
        return load(save(made)) if random.random() < 0.3 else made

    def test_any_cut_merge_gap_and_number_of_threads(self):
        for trial in range(60):
            kind = list(TYPES)[trial % 4]
            points = int(random.choice([16, 17, 30, 64, 100, 1024])) if trial % 15 < 13 else 17 * 512
            step = points - int(points * (overlap := random.choice([0.0, 0.3, 0.5, 0.9])))
            lengths = random.choice([0, 1, 7, points - 1, points, step, 5 * points, 40 * points], size=12)
            if trial % 10 == 0:
                lengths[3] = 70 * 1024  # enough for threads
            starts = np.concatenate([[0], np.cumsum(lengths)])[:-1]
            gaps = random.random(12) < 0.2
            origins = np.maximum.accumulate(np.where(gaps, starts, 0))
            pieces = [noise(n, kind) for n in lengths]
            options = dict(points=points, overlap=overlap, hold=int(trial % 2))
            expected = self.whole(kind, pieces, gaps, threads=1, **options)
            actual = self.tree(kind, pieces, gaps, starts, origins, **options)
            for field in ("start", "samples", "segments", "origin"):
                self.assertEqual(getattr(where(expected), field), getattr(where(actual), field), (trial, field))
            if where(expected).segments:
                for a, b in zip(read(expected, options["hold"])[1:], read(actual, options["hold"])[1:]):
                    self.assertEqual(a.tobytes(), b.tobytes(), (trial, kind, options, lengths, gaps))
            more = noise(3 * points, kind)
            add(expected, more), add(actual, more)
            self.assertEqual(read(expected)[1].tobytes(), read(actual)[1].tobytes(), trial)

    def test_clear_goes_on_as_a_new_part_of_the_stream(self):
        x = noise(5000, "cf32")
        for cut in (0, 3, 700, 1000, 1024, 2333):
            spectrum = make(points=1000, overlap=0.5)
            add(spectrum, x[:cut])
            lumra.call("spectrum_clear", spectrum)
            add(spectrum, x[cut:])
            extent = where(spectrum)
            self.assertEqual(len(x), extent.start + extent.samples)
            fresh = make(points=1000, overlap=0.5, start=extent.start)
            add(fresh, x[extent.start :])
            self.assertEqual(read(fresh)[1].tobytes(), read(spectrum)[1].tobytes(), cut)
            front = make(points=1000, overlap=0.5)
            add(front, x[: extent.start])
            lumra.call("spectrum_merge", front, spectrum)
            all_of_it = make(points=1000, overlap=0.5)
            add(all_of_it, x)
            self.assertEqual(read(all_of_it)[1].tobytes(), read(front)[1].tobytes(), cut)


def average(kind, points, x):
    spectrum = make(kind, points=points, hold=1)
    add(spectrum, x)
    return spectrum


def saved(kind, points, x):
    return save(average(kind, points, x))


class Builds(lumra.Test):
    """Kernels for different processors keep powers in orders of their own, states do not."""

    def test_a_state_goes_on_with_the_kernels_of_another_processor(self):
        works = [(kind, points, noise(9 * points + 5, kind)) for kind in TYPES for points in (1024, 4096)]
        for kernels in ("baseline", "avx512"):
            with mock.patch.dict(os.environ, LUMRA_KERNELS=kernels):
                with multiprocessing.get_context("spawn").Pool(1) as other:
                    states = other.starmap(saved, [(kind, points, x[: 3 * points + 1]) for kind, points, x in works])
            for (kind, points, x), state in zip(works, states):
                spectrum = load(state)
                add(spectrum, x[3 * points + 1 :])
                alone = average(kind, points, x)
                for expected, actual in zip(read(alone, hold=True)[1:], read(spectrum, hold=True)[1:]):
                    self.close(expected, actual, TYPES[kind][1], (kernels, kind, points))


class Refusals(lumra.Test):
    def test_options(self):
        for code, changes in [
            ("LUMRA_UNKNOWN_CHOICE", dict(type=1)), ("LUMRA_OUT_OF_RANGE", dict(sample_rate_hz=0.0)),
            ("LUMRA_OUT_OF_RANGE", dict(sample_rate_hz=np.inf)), ("LUMRA_OUT_OF_RANGE", dict(centre_hz=np.nan)),
            ("LUMRA_OUT_OF_RANGE", dict(points=15)), ("LUMRA_OUT_OF_RANGE", dict(points=2**27 + 1)),
            ("LUMRA_UNKNOWN_CHOICE", dict(window=10)), ("LUMRA_UNKNOWN_CHOICE", dict(hold=2)),
            ("LUMRA_OUT_OF_RANGE", dict(window=C["LUMRA_WINDOW_KAISER"], window_parameter=701.0)),
            ("LUMRA_OUT_OF_RANGE", dict(overlap=1.0)), ("LUMRA_OUT_OF_RANGE", dict(overlap=np.nan)),
            ("LUMRA_OUT_OF_RANGE", dict(threads=1025)), ("LUMRA_OUT_OF_RANGE", dict(reserved=1)),
            ("LUMRA_OUT_OF_RANGE", dict(start=2**62 + 1)), ("LUMRA_OUT_OF_RANGE", dict(start=4, origin=5)),
            ("LUMRA_BAD_SIZE_FIELD", dict(size=3)),
        ]:  # fmt: skip
            handle = ctypes.c_void_p()
            self.refused(code, "spectrum_create", lumra.record("spectrum", **changes), handle,
                         says=next(iter(changes)))  # fmt: skip
            self.assertIsNone(handle.value)

    def test_calls(self):
        spectrum, other, real = make(points=64), make(points=64, start=40), make("f32", points=64)
        add(spectrum, noise(40, "cf32"))
        info, power = lumra.record("spectrum_info"), np.zeros(64)
        self.refused("LUMRA_BAD_SIZE_FIELD", "spectrum_read", spectrum, info, power, None, None, 64)
        info.size = ctypes.sizeof(info)
        far = make(points=64, start=2**62)
        for code, function, *arguments in [
            ("LUMRA_NULL_ARGUMENT", "spectrum_create", None, None), ("LUMRA_NULL_ARGUMENT", "spectrum_add", None, power, 1),
            ("LUMRA_NULL_ARGUMENT", "spectrum_add", spectrum, None, 1), ("LUMRA_OUT_OF_RANGE", "spectrum_add", far, power, 1),
            ("LUMRA_OUT_OF_RANGE", "spectrum_add", spectrum, power, 2**64 - 1),
            ("LUMRA_OVERLAP", "spectrum_merge", spectrum, spectrum), ("LUMRA_WRONG_TYPE", "spectrum_merge", spectrum, real),
            ("LUMRA_OUT_OF_RANGE", "spectrum_merge", other, spectrum),
            ("LUMRA_OUT_OF_RANGE", "spectrum_merge", spectrum, make(points=64, start=40, origin=3)),
            ("LUMRA_TOO_LITTLE_ROOM", "spectrum_read", spectrum, info, power, None, None, 63),
            ("LUMRA_NULL_ARGUMENT", "spectrum_read", spectrum, info, None, None, None, 64),
            ("LUMRA_WRONG_TYPE", "spectrum_read", spectrum, info, power, np.zeros(64), None, 64),
            ("LUMRA_TOO_FEW_SAMPLES", "spectrum_read", spectrum, info, power, None, None, 64),
            ("LUMRA_WRONG_OBJECT", "spectrum_gap", ctypes.c_void_p(power.ctypes.data)),
            ("LUMRA_TOO_LITTLE_ROOM", "spectrum_save", spectrum, np.zeros(8, np.uint8), 8),
            ("LUMRA_OUT_OF_RANGE", "spectrum_load", power, 64, 2000, ctypes.c_void_p()),
        ]:  # fmt: skip
            self.refused(code, function, *arguments)

    def test_damaged_states(self):
        spectrum = make(points=64, start=100, origin=30)
        add(spectrum, noise(500, "cf32"))
        state, handle = save(spectrum), ctypes.c_void_p()
        for n in (0, 31, 100, len(state) - 1):
            self.refused("LUMRA_BAD_STATE", "spectrum_load", state[:n].copy(), n, 1, handle)
        for place in random.integers(0, len(state), 50):
            damaged = state.copy()
            damaged[place] ^= 1 << random.integers(8)
            self.refused("LUMRA_BAD_STATE", "spectrum_load", damaged, len(damaged), 1, handle)
        # Bytes that were made on purpose, with the right checksum: anything but a crash.
        for _ in range(300):
            made = state.copy()
            made[24 + int(random.integers(0, 200))] ^= 1 << random.integers(8)
            made = lumra.sealed(made)
            if lumra.run("spectrum_load", made, len(made), 1, handle) == 0:
                loaded = lumra.Object("spectrum", handle.value)
                lumra.run("spectrum_add", loaded, noise(300, "cf64"), 300)
                lumra.run("spectrum_merge", loaded, spectrum)


if __name__ == "__main__":
    unittest.main()
