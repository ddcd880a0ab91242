# SPDX-License-Identifier: MIT
"""Spectra, waterfalls, levels and error vectors of arrays beside SciPy and plain formulas."""
import copy
import itertools
import pickle
import unittest

import numpy as np
import scipy.signal
from hypothesis import given, settings
from hypothesis import strategies as some

import lumra
from support import Test, close, dtypes, forms, noise

cuts = some.lists(some.integers(0, 3000), max_size=6).map(sorted)


def welch(x, rate, nfft, window, overlap):
    frequency, power = scipy.signal.welch(x, rate, window, nfft, int(overlap * nfft), detrend=False, scaling="spectrum",
                                          return_onesided=np.isrealobj(x))  # fmt: skip
    return (frequency, power) if np.isrealobj(x) else (np.fft.fftshift(frequency), np.fft.fftshift(power))


def merged(parts):
    """Neighbours joined in a tree that leans on the right."""
    while len(parts) > 1:
        last = parts.pop()
        parts[-1].merge(pickle.loads(pickle.dumps(last)))
    return parts[0]


def same(a, b):
    return a is b if b is None else a.tobytes() == b.tobytes()


class Spectra(Test):
    def test_as_welch(self):
        for dtype, (nfft, window, overlap), threads in itertools.product(
            dtypes, [(256, "flattop", 0.5), (100, "hann", 0.75), (33, ("kaiser", 9), 0.3), (16, "boxcar", 0)], (1, None)):
            x = noise(2000, dtype)
            found = lumra.spectrum(x, 5e3, nfft=nfft, window=window, overlap=overlap, hold=True, frequency=1e6, threads=threads)
            frequency, power = welch(x, 5e3, nfft, window, overlap)
            with self.subTest(dtype=dtype, nfft=nfft):
                self.assert_close(found.power, power, close(dtype), float)
                self.assert_close(found.frequency - 1e6, frequency, 1e-9)
                self.assert_close(found.level, 10 * np.log10(found.power), 1e-13)
                one = scipy.signal.get_window(window, nfft)
                enbw = nfft * (one**2).sum() / one.sum() ** 2
                self.assert_close(np.array([found.enbw, found.df, found.rbw]), [enbw, 5e3 / nfft, enbw * 5e3 / nfft], 1e-7)
                self.assert_close(found.density, found.power / found.rbw, 1e-13)
                self.assertTrue((found.min_hold <= found.power).all() and (found.power <= found.max_hold).all())
                self.assertEqual(found.segments, (2000 - nfft) // (nfft - int(overlap * nfft)) + 1)
                self.assertEqual((found.window, found.overlap, found.sample_rate), (window, overlap, 5e3))
            again = pickle.loads(pickle.dumps(found))
            self.assertTrue(same(again.power, found.power) and same(again.frequency, found.frequency))
        self.assertTrue(np.isneginf(lumra.spectrum(np.zeros(64, "F"), nfft=64).level).all())
        self.assertIn("33 bins", repr(lumra.spectrum(np.zeros(64), nfft=64)))
        with self.assertRaises(AttributeError):
            found.power = power
        with self.assertRaises(ValueError):
            found.power[0] = 1

    def test_in_every_form(self):
        x = noise(5000, np.complex64)
        wanted = lumra.spectrum(x, nfft=256)
        for form, make in forms.items():
            with self.subTest(form=form):
                self.assertTrue(same(lumra.spectrum(make(x), nfft=256).power, wanted.power))
                self.assertEqual(lumra.level(make(x)), lumra.level(x))
                self.assertEqual(lumra.ccdf(make(x), [1, 3]).tobytes(), lumra.ccdf(x, [1, 3]).tobytes())

    @settings(max_examples=60, deadline=None)
    @given(cuts, cuts, some.sampled_from(dtypes), some.sampled_from([0, 0.4, 0.9]), some.integers(0, 2**50))
    def test_any_cut_and_merge_has_the_same_bits(self, borders, gaps, dtype, overlap, start):
        x = noise(3000, dtype)
        make = lambda first, origin: lumra.SpectrumEstimator(
            2.0, nfft=48, window="hann", overlap=overlap, hold=True, start=start + first, origin=start + origin,
            real=np.isrealobj(x), threads=1)  # fmt: skip
        whole = make(0, 0)
        for n, part in enumerate(np.split(x, gaps)):
            (whole.gap() if n else whole).add(part)
        edges = sorted({0, *borders, *gaps, 3000})
        parts = []
        for first, end in zip(edges, edges[1:]):
            origin = max((gap for gap in gaps if gap <= first), default=0)
            parts.append(copy.deepcopy(make(first, origin).add(x[first:end])))
        joined = merged(parts)
        self.assertEqual((joined.start, joined.samples, joined.segments), (start, 3000, whole.segments))
        if whole.segments:
            a, b = joined.result(), whole.result()
            self.assertTrue(same(a.power, b.power) and same(a.max_hold, b.max_hold) and same(a.min_hold, b.min_hold))
        level = merged([lumra.LevelMeter(start + first).add(x[first:end]) for first, end in zip(edges, edges[1:])])
        self.assertEqual(level.result(), lumra.LevelMeter(start).add(x).result())

    def test_what_fixes_the_type(self):
        x = noise(100, np.complex128)
        estimator = lumra.SpectrumEstimator(nfft=32)
        estimator.add(np.zeros(0, np.complex64)).add(x).add(x.astype(np.complex64)).add(x.real)
        joined = np.concatenate([x, x.astype(np.complex64), x.real])
        self.assertTrue(same(estimator.result().power, lumra.spectrum(joined, nfft=32).power))
        for merges in ("empty first", "empty last"):
            parts = [lumra.SpectrumEstimator(nfft=32), lumra.SpectrumEstimator(nfft=32).add(x)]
            if merges == "empty last":
                parts = [parts[1], lumra.SpectrumEstimator(nfft=32, start=100)]
            self.assertTrue(same(parts[0].merge(parts[1]).result().power, lumra.spectrum(x, nfft=32).power))

    def test_waterfall_rows_are_means_of_segments(self):
        for dtype, n, rows in itertools.product((np.complex64, np.float64), (3000, 3001, 64), (1, 7, 500)):
            x = noise(n, dtype)
            found = lumra.waterfall(x, 10.0, nfft=64, overlap=0.25, rows=rows, frequency=5.0)
            segments = [welch(x[first : first + 64], 10, 64, "hann", 0)[1] for first in range(0, n - 63, 48)]
            per_row = -(-len(segments) // rows)
            wanted = [np.mean(segments[k : k + per_row], axis=0) for k in range(0, len(segments), per_row)]
            with self.subTest(dtype=dtype, n=n, rows=rows):
                self.assert_close(found.power, wanted, close(dtype))
                self.assert_close(found.time, np.arange(len(wanted)) * per_row * 4.8)
                self.assert_close(found.frequency, 5 + welch(x[:64], 10, 64, "hann", 0)[0])
                self.assert_close(found.level, 10 * np.log10(found.power), 1e-12)

    def test_figures(self):
        n = np.arange(2**16)
        amplitudes = {0.1: 1.0, 0.2: 0.01, -0.1: 0.003, 0.3: 0.001}
        x = sum(a * np.exp(2j * np.pi * f * n) for f, a in amplitudes.items()) + 1e-5 * noise(len(n), complex)
        found = lumra.spectrum(x, 1e6, nfft=4096, window="blackmanharris7", frequency=1e9)
        tone = found.tone()
        for ours, wanted, tolerance in [
            (tone.frequency, 1e9 + 1e5, 1e-3), (tone.power, 1, 1e-4), (tone.image_db, 20 * np.log10(0.003), 0.01),
            (tone.harmonics[0].level_dbc, -40, 0.01), (tone.harmonics[1].frequency, 1e9 + 3e5, 1e-3),
            (tone.thd_db, 10 * np.log10(1e-4 + 1e-6), 0.01), (tone.sfdr_db, 40, 0.01),
            (tone.snr_db, 10 * np.log10(1 / 2e-10), 0.3), (tone.enob, (tone.sinad_db - 1.76) / 6.02, 1e-9),
            (found.tone(frequency=1e9 + 2e5, harmonics=1).power, 1e-4, 1e-8),
            (found.channel_power(1e9 + 2e5, 2e4), 1e-4, 1e-7), (found.peaks(2)[1].power, 1e-4, 1e-7),
            (found.occupied_bandwidth()[1] - found.occupied_bandwidth()[0], 0, 3e3),
        ]:  # fmt: skip
            self.assertLess(abs(ours - wanted), tolerance)
        self.assertEqual(len(found.peaks(2, threshold=1e-3)), 1)
        self.assertEqual(len(found.peaks(10, 1e-7, distance=1.5e5)), 3)
        (offset, lower, upper), far = found.adjacent_power(1e9 + 1e5, 2e4, [1e5, 4.1e5], 1e4)
        self.assertAlmostEqual(upper, -40, 2)
        self.assertEqual(offset, 1e5)
        self.assertTrue(np.isnan(far[2]) and far[1] < -50)


class Levels(Test):
    def test_as_defined(self):
        for dtype in dtypes:
            x = noise(10_000, dtype)
            x[1234] = 9
            found, power = lumra.level(x), np.abs(x.astype(complex)) ** 2
            rms = np.sqrt(power.mean())
            for ours, wanted in [
                (found.rms, rms), (found.peak, 9), (found.papr_db, 20 * np.log10(9 / rms)), (found.dc, x.mean(dtype=complex)),
                (found.rms_dbfs, 20 * np.log10(rms)), (found.peak_dbfs, 20 * np.log10(9)),
            ]:  # fmt: skip
                self.assertLess(abs(ours - wanted), 1e-5)
            self.assertEqual((found.samples, found.peak_index, type(found.dc)), (10_000, 1234, float if x.dtype.kind == "f" else complex))
            above = np.array([[-20.0, 0, 3], [6, 9, 40]])
            self.assert_close(lumra.ccdf(x, above), (power > rms**2 * 10 ** (above[..., None] / 10)).mean(-1), 1e-3)
        self.assertEqual(lumra.level(np.zeros(3)).rms_dbfs, -np.inf)

    def test_error_vectors(self):
        for dtype in (np.complex64, np.complex128):
            x = scipy.signal.lfilter(scipy.signal.firwin(65, 0.6), 1, noise(20_000, complex)).astype(dtype)
            errors = 0.01 * noise(len(x), complex, 5)
            plain = lumra.evm(x, x + errors.astype(dtype))
            reference = np.sqrt(np.mean(np.abs(x) ** 2))
            self.assertLess(abs(plain.rms - np.sqrt(np.mean(np.abs(errors) ** 2)) / reference), 1e-5)
            self.assertLess(abs(plain.peak - np.abs(errors).max() / reference), 1e-5)
            self.assertEqual((plain.gain, plain.delay, plain.frequency, plain.dc, plain.samples), (1, 0, 0, 0, len(x)))
            n, gain, dc, rate = np.arange(len(x)), 0.5 - 1j, 0.1 + 0.2j, 1e6
            changed = gain * np.roll(x, 5) * np.exp(2j * np.pi * 30 * n / rate) + dc + errors
            found = lumra.evm(x, changed, align=("gain", "delay", "frequency", "dc"), sample_rate=rate)
            for ours, wanted, tolerance in [(found.gain, gain, 1e-3), (found.delay, 5, 1e-3), (found.frequency, 30, 0.02),
                                            (found.dc, dc, 1e-3), (found.rms, plain.rms / abs(gain), 2e-4)]:  # fmt: skip
                self.assertLess(abs(ours - wanted), tolerance)
            self.assertEqual((found.rms_percent, found.rms_db), (100 * found.rms, 20 * np.log10(found.rms)))
        self.assertEqual(lumra.evm([1, 2], [1, 2]).rms_db, -np.inf)


class Shown(Test):
    def test_pictures(self):
        try:
            import matplotlib
        except ImportError:
            self.skipTest("no Matplotlib")
        matplotlib.use("Agg")
        x = noise(100_000, np.complex64)
        for nfft, hold, center in [(64, False, 0), (16384, True, 1e12), (64, True, 2.4e9)]:
            found = lumra.spectrum(x, 2e6, nfft=nfft, hold=hold, frequency=center)
            ax = found.plot()
            line = ax.lines[0].get_xydata()
            self.assertEqual(ax.get_ylabel(), "Level (dBFS)")
            self.assertIn(ax.get_xlabel(), ("Frequency (kHz)", "Frequency (MHz)", "Offset from 1000 GHz (MHz)"))
            if nfft == 64:
                self.assert_close(line[:, 1], found.level)
                self.assert_close(line[:, 0] * {"k": 1e3, "M": 1e6}[ax.get_xlabel()[11]], found.frequency)
            low, high = ax.get_ylim()
            self.assertTrue(low < line[:, 1].min() and line[:, 1].max() < high)
            self.assertIs(found.plot(ax), ax)
            rows = lumra.waterfall(x, 2e6, nfft=nfft, frequency=center)
            ax = rows.plot()
            self.assertTrue(same(ax.images[0].get_array().data, rows.level))
            self.assertGreater(ax.get_ylim()[0], ax.get_ylim()[1])  # time runs down
            matplotlib.pyplot.close("all")
        for silent in (lumra.spectrum(np.zeros(64), nfft=16), lumra.waterfall(np.zeros(16), nfft=16)):
            silent.plot().figure.canvas.draw()

    def test_datasets(self):
        try:
            import xarray  # noqa: F401
        except ImportError:
            self.skipTest("no xarray")
        x = noise(1000, np.complex64)
        for found in (lumra.spectrum(x, 2e6, nfft=64, hold=True), lumra.waterfall(x, 2e6, nfft=64, window=("kaiser", 9))):
            data = found.to_xarray()
            self.assertTrue(same(data.power.values, found.power) and same(data.frequency.values, found.frequency))
            self.assertEqual((data.frequency.units, data.attrs["nfft"]), ("Hz", 64))
        self.assertEqual((data.time.units, data.attrs["window"]), ("s", "kaiser:9"))


class Refusals(Test):
    def test_each_names_argument_and_value(self):
        x = noise(100, np.complex64)
        estimator = lumra.SpectrumEstimator(nfft=16).add(x)
        real = lumra.SpectrumEstimator(nfft=16, real=True)
        spectrum = lumra.spectrum(x, 100.0, nfft=32)
        for kind, words, call, arguments, named in [
            (ValueError, "nfft is 128 & 100", lumra.spectrum, [x], dict(nfft=128)),
            (ValueError, "nfft is 4096 & 0", lumra.spectrum, [[]], {}),
            (ValueError, "nfft is 15", lumra.spectrum, [x], dict(nfft=15)),
            (ValueError, "nfft is 15", lumra.waterfall, [x], dict(nfft=15)),
            (TypeError, "nfft is 16.0", lumra.spectrum, [x], dict(nfft=16.0)),
            (ValueError, "sample_rate is 0", lumra.spectrum, [x, 0], dict(nfft=16)),
            (ValueError, "sample_rate is nan", lumra.spectrum, [x, np.nan], dict(nfft=16)),
            (TypeError, "sample_rate is '1'", lumra.spectrum, [x, "1"], dict(nfft=16)),
            (ValueError, "overlap is 1", lumra.spectrum, [x], dict(nfft=16, overlap=1)),
            (ValueError, "threads is 0", lumra.spectrum, [x], dict(nfft=16, threads=0)),
            (ValueError, "threads is 0", lumra.LevelMeter, [], dict(threads=0)),
            (ValueError, "threads is 1025", lumra.evm, [x, x], dict(threads=1025)),
            (ValueError, "window is 'none such'", lumra.spectrum, [x], dict(nfft=16, window="none such")),
            (ValueError, "x is of shape (1, 100)", lumra.spectrum, [x[None]], dict(nfft=16)),
            (TypeError, "client", lumra.spectrum, [x], dict(client=3)),
            (ValueError, "compute is False", lumra.level, [x], dict(compute=False)),
            (ValueError, "rows is 0", lumra.waterfall, [x], dict(rows=0)),
            (ValueError, "start is -1", lumra.SpectrumEstimator, [], dict(start=-1)),
            (ValueError, "origin is 5", lumra.SpectrumEstimator, [], dict(start=4, origin=5)),
            (TypeError, "x is of dtype complex64", real.add, [x], {}),
            (ValueError, "other.start is 99 & 100", estimator.merge, [lumra.SpectrumEstimator(nfft=16, start=99)], {}),
            (ValueError, "other is", estimator.merge, [estimator], {}),
            (TypeError, "other is 3", estimator.merge, [3], {}),
            (ValueError, "", estimator.merge, [lumra.SpectrumEstimator(nfft=32, start=100).add(x)], {}),
            (ValueError, "bandwidth is 200.0", spectrum.channel_power, [0, 200], {}),
            (ValueError, "center is 49.0 & bandwidth is 20.0", spectrum.channel_power, [49, 20], {}),
            (ValueError, "fraction is 0", spectrum.occupied_bandwidth, [0], {}),
            (ValueError, "adjacent_bandwidth is -1", spectrum.adjacent_power, [0, 10, [20], -1], {}),
            (ValueError, "offsets", spectrum.adjacent_power, [0, 10, [-20]], {}),
            (ValueError, "count is -1", spectrum.peaks, [-1], {}),
            (ValueError, "threshold is -1", spectrum.peaks, [1, -1], {}),
            (ValueError, "frequency is 51", spectrum.tone, [51], {}),
            (ValueError, "harmonics is 0", spectrum.tone, [None, 0], {}),
            (ValueError, "x is empty", lumra.level, [[]], {}),
            (ValueError, "x is empty", lumra.ccdf, [[], [0]], {}),
            (TypeError, "above_db", lumra.ccdf, [x, [1j]], {}),
            (ValueError, "other.start is 0 & 3", lumra.LevelMeter().add([1, 2, 3]).merge, [lumra.LevelMeter()], {}),
            (TypeError, "x is of dtype complex64", lumra.LevelMeter().add([1.0]).add, [x], {}),
            (ValueError, "measured is of 3 samples", lumra.evm, [x, x[:3]], {}),
            (ValueError, "align holds 'phase'", lumra.evm, [x, x], dict(align=["phase"])),
            (ValueError, "sample_rate is -1", lumra.evm, [x, x], dict(sample_rate=-1)),
            (lumra.Error, "segment", lumra.SpectrumEstimator().result, [], {}),
            (lumra.Error, "sample", lumra.LevelMeter().result, [], {}),
        ]:  # fmt: skip
            self.refused(kind, words, call, *arguments, **named)

    def test_damaged_states(self):
        for full in (lumra.SpectrumEstimator(nfft=16).add(noise(99, "F")), lumra.LevelMeter().add(noise(99, "F"))):
            *options, saved = full.__getstate__()
            for damaged in (b"1", saved[:-1], saved + b"1", saved[:50] + b"\xff" * 8 + saved[58:]):
                fresh = type(full).__new__(type(full))
                with self.assertRaises(lumra.Error):
                    fresh.__setstate__((*options, damaged))


if __name__ == "__main__":
    unittest.main()
