# SPDX-License-Identifier: MIT
"""Figures of power spectra against NumPy's sums, SciPy's spectra and peaks, and signals whose figures are known."""
import ctypes
import unittest

import numpy as np
import open as lumra
import scipy.signal

WINDOWS = {name[13:].lower(): value for name, value in lumra.constants.items() if name.startswith("LUMRA_WINDOW_")}
NAN, INF = float("nan"), float("inf")


def info_of(points, sides=2, rate=None, centre=0.0, window="rectangular", parameter=0.0, noise_bandwidth=1.0):
    info = lumra.record("spectrum_info", sides=sides, points=points, sample_rate_hz=rate or points, centre_hz=centre)
    info.size, info.noise_bandwidth_bins = ctypes.sizeof(info), noise_bandwidth
    info.window, info.window_parameter = WINDOWS[window], parameter
    return info


def spectrum(x, points, window="hann", parameter=0.0, **what):
    """The frequencies and powers that SciPy finds with a window of the library, and what they are."""
    w, sides = np.empty(points), 2 if np.iscomplexobj(x) else 1
    lumra.call("window_make_f64", WINDOWS[window], parameter, 0, w, points)
    info = info_of(points, sides, window=window, parameter=parameter, **what)
    info.noise_bandwidth_bins = points * np.sum(w**2) / np.sum(w) ** 2
    f, power = scipy.signal.welch(
        x, info.sample_rate_hz, w, noverlap=points // 2, detrend=False, scaling="spectrum", return_onesided=sides == 1
    )
    if sides == 2:
        f, power = np.fft.fftshift(f), np.fft.fftshift(power)
    return f + info.centre_hz, np.ascontiguousarray(power), info


def channel(power, info, centre, bandwidth):
    found = ctypes.c_double()
    lumra.call("channel_power", power, len(power), info, centre, bandwidth, found)
    return found.value


def occupied(power, info, fraction):
    low, high = ctypes.c_double(), ctypes.c_double()
    lumra.call("occupied_bandwidth", power, len(power), info, fraction, low, high)
    return low.value, high.value


def peaks(power, info, room=10, **options):
    found, count = (lumra.records["lumra_peak"] * room)(), ctypes.c_uint64()
    how = lumra.record("find_peaks", **options)
    lumra.call("find_peaks", power, len(power), info, how, ctypes.addressof(found), room, count)
    return [(p.frequency_hz, p.power) for p in found[: count.value]]


def tone(power, info, near=None, harmonics=5):
    figures, lines = lumra.record("tone_figures"), (lumra.records["lumra_harmonic"] * (harmonics - 1))()
    how = lumra.record("tone", harmonics=harmonics, choice=int(near is not None), near_hz=near or 0.0)
    lumra.call("tone", power, len(power), info, how, figures, ctypes.addressof(lines), harmonics - 1)
    return figures, [(line.frequency_hz, line.level_dbc) for line in lines]


def db(ratio):
    return 10 * np.log10(ratio)


class Bands(lumra.Test):
    def setUp(self):
        self.random = np.random.default_rng(7)

    def cases(self):
        """Spectra with their steps of cumulated power: the edges of bins inside of the band."""
        for points, sides in ((16, 2), (17, 2), (1000, 2), (16, 1), (17, 1), (1000, 1)):
            info = info_of(points, sides, rate=3.0 * points, centre=1e6, noise_bandwidth=1.5)
            power = self.random.exponential(size=points if sides == 2 else points // 2 + 1)
            middle = points // 2 if sides == 2 else 0
            edges = 1e6 + 3.0 * (np.arange(len(power) + 1) - 0.5 - middle)
            shares = power.copy()
            if sides == 2 and points % 2 == 0:  # the lower half of bin 0 is the upper end
                edges, shares = np.append(edges, edges[-1] + 1.5), np.append(shares, power[0] / 2)
                edges[0], shares[0] = edges[0] + 1.5, power[0] / 2
            if sides == 1:
                edges = np.clip(edges, 1e6, 1e6 + 1.5 * points)
            yield points, sides, power, info, edges, np.append(0, np.cumsum(shares))

    def test_channel_power(self):
        for points, sides, power, info, edges, steps in self.cases():
            low, high = edges[0], edges[-1]
            pairs = np.sort(self.random.uniform(low, high, (50, 2)), axis=1)
            for a, b in [(low, high), (low, low + 0.5), (high - 0.5, high), *pairs]:
                expected = (np.interp(b, edges, steps) - np.interp(a, edges, steps)) / 1.5
                found = channel(power, info, (a + b) / 2, b - a)
                self.assertAlmostEqual(expected, found, delta=1e-8 * steps[-1], msg=(points, sides, a, b))
            first = 1e6 - 3.0 * (points // 2 if sides == 2 else 0)
            whole = channel(power, info, first + 1.5 * (len(power) - 1), 3.0 * len(power))  # from edge to edge of bins
            self.assertAlmostEqual(power.sum() / 1.5, whole, delta=1e-9, msg=(points, sides))
            self.refused("LUMRA_OUT_OF_RANGE", "channel_power", power, len(power), info, high, 3.01, ctypes.c_double())

    def test_occupied_bandwidth(self):
        for points, sides, power, info, edges, steps in self.cases():
            for fraction in (0.01, 0.5, 0.99, 1.0):
                expected = np.interp(np.array([1 - fraction, 1 + fraction]) / 2 * steps[-1], steps, edges)
                np.testing.assert_allclose(occupied(power, info, fraction), expected, rtol=0, atol=1e-7)
        power[:] = 0
        self.assertTrue(np.isnan(occupied(power, info, 0.99)).all())
        power[100:110] = 1  # the narrowest
        np.testing.assert_allclose(occupied(power, info, 1.0), 1e6 + 3 * np.array([99.5, 109.5]), rtol=0, atol=1e-7)
        power[5] = NAN
        self.assertTrue(np.isnan(occupied(power, info, 0.99)).all())

    def test_adjacent_power(self):
        info, power = info_of(1000), self.random.exponential(size=1000)
        power[800] = NAN
        offsets, out = np.array([50.0, 100.5, 250.0, 400.0, 600.0]), np.empty((5, 2))
        for width in (0.0, 20.0):
            lumra.call("adjacent_power", power, 1000, info, 50.0, 40.0, width, offsets, 5, out)
            for offset, pair in zip(offsets, out):
                for side, found in zip((50 - offset, 50 + offset), pair):
                    if abs(side) + (width or 40) / 2 > 500.5:
                        self.assertTrue(np.isnan(found), side)
                    else:
                        expected = db(channel(power, info, side, width or 40.0) / channel(power, info, 50.0, 40.0))
                        np.testing.assert_allclose(found, expected, rtol=1e-9)
        self.assertEqual([False, False, False, False, True], list(np.isnan(out[:, 0])))
        self.assertEqual([False, False, True, False, True], list(np.isnan(out[:, 1])))


class Peaks(lumra.Test):
    def test_interpolation(self):
        """A tone alone, at all fractions of a bin, also across the ends of the band."""
        for window, points in ((w, n) for w in WINDOWS for n in (16, 17, 4096)):
            kaiser, n = window == "kaiser", np.arange(points)
            for parameter in (1.0, 3.0, 5.0, 14.0, min(3.0 * points, 700.0)) if kaiser else (0.0,):
                worst = np.zeros(2)
                for offset in np.append(np.linspace(-0.5, 0.5, 21), 1e-6):
                    frequency = (points // 2 if offset < 0.1 else 2) + offset
                    _, power, info = spectrum(np.exp(2j * np.pi * frequency * n / points), points, window, parameter)
                    found = peaks(power, info, 1)[0]
                    apart = (found[0] - frequency + points / 2) % points - points / 2
                    worst = np.maximum(worst, (abs(apart), abs(db(found[1]))))
                stated = 1e-9 + np.array([0.7, 4]) / points**2 * kaiser
                self.assertTrue((worst <= stated).all(), (window, points, parameter, worst))

    def test_order_threshold_distance_span(self):
        random = np.random.default_rng(3)
        _, power, info = spectrum(random.normal(size=(4096, 2)) @ (1, 1j), 4096, "hann")
        power[[0, -1]] = 0
        every, (bins, _) = sorted(peaks(power, info, 4096)), scipy.signal.find_peaks(power)
        np.testing.assert_allclose([f for f, _ in every], bins - 2048, rtol=0, atol=0.5)
        ranked = sorted(zip(every, bins), key=lambda found: -found[0][1])
        for distance, threshold in ((0, 0), (1, 0), (7.5, 0), (200, 0), (5000, 0), (0, 4e-4), (40, 4e-4)):
            kept = []
            for peak, k in ranked:
                if peak[1] > threshold and all(abs(k - other) >= distance for _, other in kept):
                    kept.append((peak, k))
            for room in (4096, 3, 0):
                found = peaks(power, info, room, distance_hz=distance, threshold=threshold)
                self.assertEqual([peak for peak, _ in kept[:room]], found, (distance, threshold))
        inside = [peak for peak, k in ranked if 2048 + 75 <= k <= 2048 + 125]
        self.assertEqual(inside, peaks(power, info, 4096, centre_hz=100.0, span_hz=50.0))

    def test_tops_and_ends(self):
        info, mirrored = info_of(16), info_of(30, sides=1)
        for what, values, expected in (
            (info, [1, 3, 3, 3, 1, 0, 0, 2, 0, 0, 0, 0, 0, 0, 0, 5], [(7.0, 5), (-6.0, 3), (-1.0, 2)]),
            (info, [4, 4, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 4], [(-8.0, 4)]),
            (info, [1] * 16, []),
            (info, [NAN, 5, 0, 0, INF, 0, 0, 1, NAN, 1, 0, 0, 2, 0, 0, 0], [(-4.0, INF), (4.0, 2)]),
            (mirrored, [2, 3, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 7], [(15.0, 7), (0.0, 2), (7.0, 1)]),
        ):
            found = peaks(np.array(values, float), what)
            self.assertEqual(len(expected), len(found), (values, found))
            for (f, p), (frequency, bin_power) in zip(found, expected):
                self.assertLessEqual(abs(f - frequency), 0.5, values)
                self.assertTrue(bin_power <= p <= 2.5 * bin_power, (values, p))


class Tone(lumra.Test):
    def check(self, figures, expected, tolerance, what):
        for name, value in expected.items():
            found = getattr(figures, name)
            close = found == value or abs(found - value) <= tolerance or (np.isnan(value) and np.isnan(found))
            self.assertTrue(close, (what, name, value, found))

    def test_known_signals(self):
        """Carrier, harmonics, image, offset and noise of known powers, on and off the bins."""
        random, points, rate = np.random.default_rng(5), 4096, 1e6
        n = np.arange(64 * points)
        levels = {2: -50.0, 3: -60.0, 4: -70.0, 5: -65.0}
        for window, parameter in (("session_flat_top", 0), ("hann", 0), ("blackman_harris_7", 0), ("kaiser", 14.0)):
            reach = {"session_flat_top": 5, "hann": 2, "blackman_harris_7": 7, "kaiser": 5}[window]
            for bins, real in ((901.0, False), (-1300.37, False), (801.4, True)):
                if window == "hann" and bins % 1:
                    continue  # it leaks more than the noise
                amplitude, cycles = 0.5, bins / points
                carrier = amplitude**2 / (2 if real else 1)
                x = np.zeros(len(n), complex)
                for order, level in ({1: 0.0} | levels if real else {1: 0.0, -1: -40.0} | levels).items():
                    x += amplitude * 10 ** (level / 20) * np.exp(2j * np.pi * (order * cycles * n + order))
                noise = carrier * 1e-5
                x += np.sqrt(noise / 2) * (random.normal(size=len(n)) + 1j * random.normal(size=len(n)))
                x += np.sqrt(carrier * 1e-3)
                if real:
                    x = x.real + np.sqrt(noise / 2) * random.normal(size=len(n))
                _, power, info = spectrum(x, points, window, parameter, rate=rate, centre=0.0 if real else 5e6)
                figures, lines = tone(power, info)
                within = 1e-5 * (2 * reach + 1) / (points / 2 if real else points)  # noise, in a line
                thd = db(sum(10 ** (level / 10) + within for level in levels.values()))
                others = 10 ** (thd / 10) + 1e-5 + (0 if real else 1e-4)
                what = (window, bins, real)
                self.check(figures, {"frequency_hz": (0 if real else 5e6) + cycles * rate}, 1.0, what)
                self.check(
                    figures,
                    {
                        "thd_db": thd, "snr_db": 50.0, "dc_db": -30.0, "sinad_db": -db(others),
                        "image_db": NAN if real else -40.0, "sfdr_db": 50.0 if real else 40.0,
                        "enob": (-db(others) - 1.76) / 6.02,
                    },
                    0.1, what,
                )  # fmt: skip
                self.assertAlmostEqual(0, db(figures.power / carrier), delta=0.001, msg=what)
                for (frequency, level), (order, expected) in zip(lines, levels.items()):
                    at = order * cycles % 1
                    at = min(at, 1 - at) if real else (at + 0.5) % 1 - 0.5
                    self.assertAlmostEqual((0 if real else 5e6) + at * rate, frequency, delta=5.0, msg=what)
                    self.assertAlmostEqual(db(10 ** (expected / 10) + within), level, delta=0.3, msg=(*what, order))

    def test_lines_that_coincide(self):
        """Powers of single bins of a rectangular window: what counts where, and nothing twice."""
        for what, lines, near, expected in (
            ("harmonic 3 is the image, 4 at 0 Hz, 5 the carrier", {16: 1.0, -16: 0.01, 0: 0.1}, None,
             {"image_db": -20, "dc_db": -10, "thd_db": -INF, "sinad_db": 20, "sfdr_db": 20, "spur_hz": -16.0}),
            ("nothing but 0 Hz", {0: 1.0}, 0.0, {"frequency_hz": 0.0, "dc_db": NAN, "image_db": NAN, "thd_db": NAN}),
            ("0 Hz is no tone", {0: 9.0, 5: 1.0, 10: 0.1}, None, {"frequency_hz": 5.0, "thd_db": -10, "snr_db": INF}),
            ("the nearest", {5: 1.0, -20: 0.1, 25: 0.1}, -14.0, {"frequency_hz": -20.0, "sfdr_db": -10}),
            ("a spur", {5: 1.0, -20: 0.1, -5: 0.05}, None, {"sfdr_db": 10, "spur_hz": -20.0, "image_db": db(0.05),
             "snr_db": db(10 / (64 / 43))}),
            ("silence", {}, None, {"power": 0.0, "frequency_hz": NAN, "snr_db": NAN, "sinad_db": NAN, "dc_db": NAN}),
            ("not a number", {5: 1.0, 28: NAN}, None, {"frequency_hz": 5.0, "power": 1.0, "snr_db": NAN}),
        ):  # fmt: skip
            power, info = np.zeros(64), info_of(64)
            for at, level in lines.items():
                power[round(at) + 32] = level
            figures, _ = tone(power, info, near)
            self.check(figures, expected, 1e-9, what)

    def test_refusals(self):
        def changed(**members):
            info = info_of(16)
            for name, value in members.items():
                setattr(info, name, value)
            return info

        power, info, out = np.ones(16), info_of(16), ctypes.c_double()
        peaks_out, count, figures, two = np.zeros(8), ctypes.c_uint64(), lumra.record("tone_figures"), np.ones(2)
        arguments = {
            "channel_power": (power, 16, info, 0.0, 4.0, out),
            "occupied_bandwidth": (power, 16, info, 0.5, out, ctypes.c_double()),
            "adjacent_power": (power, 16, info, 0.0, 2.0, 0.0, two, 2, peaks_out),
            "find_peaks": (power, 16, info, None, peaks_out, 4, count),
            "tone": (power, 16, info, None, figures, peaks_out, 4),
        }
        for function in arguments:
            lumra.call(function, *arguments[function])
            for code, place, value in (
                ("LUMRA_NULL_ARGUMENT", 0, None),
                ("LUMRA_OUT_OF_RANGE", 1, 15),
                ("LUMRA_OUT_OF_RANGE", 1, 2**64 - 1),
                ("LUMRA_NULL_ARGUMENT", 2, None),
                ("LUMRA_BAD_SIZE_FIELD", 2, changed(size=0)),
                ("LUMRA_UNKNOWN_CHOICE", 2, changed(sides=0)),
                ("LUMRA_OUT_OF_RANGE", 2, changed(points=8)),
                ("LUMRA_OUT_OF_RANGE", 2, changed(points=2**63)),
                ("LUMRA_OUT_OF_RANGE", 2, changed(sample_rate_hz=0.0)),
                ("LUMRA_OUT_OF_RANGE", 2, changed(sample_rate_hz=NAN)),
                ("LUMRA_OUT_OF_RANGE", 2, changed(centre_hz=INF)),
                ("LUMRA_OUT_OF_RANGE", 2, changed(noise_bandwidth_bins=0.0)),
            ):
                self.refused(code, function, *(value if k == place else a for k, a in enumerate(arguments[function])))
        find, how = "find_peaks", lambda **options: lumra.record("find_peaks", **options)
        choose = lambda **options: lumra.record("tone", **options)
        for code, function, place, value in (
            ("LUMRA_OUT_OF_RANGE", "channel_power", 3, NAN),
            ("LUMRA_OUT_OF_RANGE", "channel_power", 3, 1e308),
            ("LUMRA_OUT_OF_RANGE", "channel_power", 4, 0.0),
            ("LUMRA_OUT_OF_RANGE", "channel_power", 4, 16.5),
            ("LUMRA_NULL_ARGUMENT", "channel_power", 5, None),
            ("LUMRA_OUT_OF_RANGE", "occupied_bandwidth", 3, 0.0),
            ("LUMRA_OUT_OF_RANGE", "occupied_bandwidth", 3, NAN),
            ("LUMRA_NULL_ARGUMENT", "occupied_bandwidth", 5, None),
            ("LUMRA_OUT_OF_RANGE", "adjacent_power", 5, -1.0),
            ("LUMRA_NULL_ARGUMENT", "adjacent_power", 6, None),
            ("LUMRA_OUT_OF_RANGE", "adjacent_power", 6, np.array([1.0, NAN])),
            ("LUMRA_OVERLAP", "adjacent_power", 8, power),
            ("LUMRA_UNKNOWN_CHOICE", find, 2, changed(window=10)),
            ("LUMRA_OUT_OF_RANGE", find, 2, changed(window=WINDOWS["kaiser"], window_parameter=701.0)),
            ("LUMRA_BAD_SIZE_FIELD", find, 3, how(size=4)),
            ("LUMRA_OUT_OF_RANGE", find, 3, how(threshold=-1.0)),
            ("LUMRA_OUT_OF_RANGE", find, 3, how(distance_hz=INF)),
            ("LUMRA_OUT_OF_RANGE", find, 3, how(span_hz=1.0, centre_hz=NAN)),
            ("LUMRA_OUT_OF_RANGE", find, 5, 2**64 - 1),
            ("LUMRA_OVERLAP", find, 4, power),
            ("LUMRA_NULL_ARGUMENT", find, 6, None),
            ("LUMRA_OUT_OF_RANGE", "tone", 3, choose(harmonics=0)),
            ("LUMRA_UNKNOWN_CHOICE", "tone", 3, choose(choice=2)),
            ("LUMRA_OUT_OF_RANGE", "tone", 3, choose(choice=1, near_hz=9.0)),
            ("LUMRA_TOO_LITTLE_ROOM", "tone", 6, 3),
            ("LUMRA_OVERLAP", "tone", 5, power),
        ):
            self.refused(code, function, *(value if k == place else a for k, a in enumerate(arguments[function])))


if __name__ == "__main__":
    unittest.main()
