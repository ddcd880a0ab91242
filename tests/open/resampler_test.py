# SPDX-License-Identifier: MIT
"""Streams at other rates against the signals that they sample, and against themselves."""
import ctypes
import fractions
import unittest

import numpy as np
import open as lumra

C = lumra.constants
# Output rate and input rate: whole numbers are given as a fraction, others as rates.
RATIOS = [(3, 10), (96, 125), (160, 147), (3, 1), (1, 3), (999, 1000), (1, 100), (40, 1), (1, 1), (1000003, 1250000)]
RATIOS += [(0.977, 1.0), (np.pi, 1.0), (1 / np.pi, 1.0), (1.0, 1009.3)]


def make(ratio, kind="cf64", **options):
    rates = ("up", "down") if isinstance(ratio[0], int) else ("output_rate_hz", "input_rate_hz")
    return lumra.create("resampler", type=lumra.type_code(kind), **dict(zip(rates, ratio)), **options)


def exact(ratio):
    return fractions.Fraction(ratio[0]) / fractions.Fraction(ratio[1])


def number(function, *arguments):
    count = ctypes.c_uint64()
    lumra.call(f"resampler_{function}", *arguments, count)
    return count.value


def rows(samples, count, resampler, function, *arguments):
    """Rows of outputs, which lie apart and are followed by what must stay."""
    out = np.full((len(samples), count + 3), 7, samples.dtype)
    written = ctypes.c_uint64()
    lumra.call(f"resampler_{function}", resampler, *arguments, out, count + 3, count, written)
    assert written.value == count and (out[:, count:] == 7).all()
    return out[:, :count]


def process(resampler, x):
    x = np.atleast_2d(x)
    n, stride = x.shape[1], x.strides[0] // x.itemsize
    return rows(x, number("output_count", resampler, n), resampler, "process", x, stride, n)


def whole(resampler, x):
    x = np.atleast_2d(x)
    return np.hstack([process(resampler, x), rows(x, number("flush_count", resampler), resampler, "flush")])


def figures(resampler):
    read = lumra.record("resampler_figures")
    read.size = ctypes.sizeof(read)
    lumra.call("resampler_get_figures", resampler, read)
    return read


def decibels(gain):
    return 20 * np.log10(np.max(gain) + 1e-30)


class Resampler(lumra.Test):
    def test_cuts_rows_and_threads(self):
        # Same bits for any cut, through saved states, on threads, and in the stream behind a flush.
        for ratio in RATIOS:
            for kind, dtype in lumra.types.items():
                one = make(ratio, kind)
                n = min(20000, int(60000 / float(exact(ratio)))) + 3 * figures(one).latency_samples
                x = lumra.noise((3, n), dtype)
                expected = whole(one, x[0])
                self.assertEqual(-(-n * exact(ratio) // 1), expected.size, ratio)
                self.assertEqual(expected.tobytes(), whole(one, x[0]).tobytes(), (ratio, kind))
                three, done, pieces = make(ratio, kind, channels=3, threads=2), 0, []
                for length in [0, 1, 2, n // 3, 1, 777, n]:
                    piece = x[:, done : done + length]
                    before = number("output_count", three, n - done)
                    pieces.append(process(three, piece))
                    done += piece.shape[1]
                    self.assertEqual(before - pieces[-1].shape[1], number("output_count", three, n - done))
                    three = lumra.load("resampler", lumra.save(three))
                pieces.append(rows(x, number("flush_count", three), three, "flush"))
                together = np.hstack(pieces)
                self.assertEqual(expected.tobytes(), together[0].tobytes(), (ratio, kind))
                self.assertEqual(whole(one, x[2]).tobytes(), together[2].tobytes(), (ratio, kind))

    def test_no_delay_at_both_ends(self):
        # A filter without delay does the same to a reversed stream, whose first sample was the last one.
        for ratio in RATIOS[:9]:
            up, down = ratio
            resampler = make(ratio, "f64", rejection_db=150.0)
            x = lumra.noise(1 + down * (-(-3000 // up) - (-3000 // down)), float)
            forward, reverse = whole(resampler, x)[0], whole(resampler, x[::-1].copy())[0]
            last = (len(x) - 1) * up // down
            self.close(forward[: last + 1], reverse[last::-1], 1e-7, ratio)

    def test_swept_tones(self):
        # Within 0.01 dB up to the pass edge, at exactly the right time; images and aliases are rejected.
        cases = [(ratio, "cf64", 0.9, 100.0) for ratio in RATIOS]
        cases += [((3, 10), "f64", 0.9, 150.0), ((160, 147), "cf64", 0.99, 150.0), ((40, 1), "f64", 0.5, 150.0)]
        cases += [(r, kind, 0.9, 120.0) for r in ((3, 10), (1, 100), (3, 1), (0.977, 1.0)) for kind in ("f32", "cf32")]
        cases += [(r, "cf64", p, 40.0) for r in ((3, 10), (1, 100), (0.977, 1.0), (3, 1), (40, 1)) for p in (0.2, 0.97)]
        for ratio, kind, passband, rejection in cases:
            dtype, what = lumra.types[kind], (ratio, kind, passband, rejection)
            resampler = make(ratio, kind, passband=passband, rejection_db=rejection)
            rate = float(exact(ratio))
            lower, held = min(1, rate), figures(resampler).latency_samples
            n = int(5 * held + 2000 / lower)
            first, last = int(2 * held * rate), int((n - 2 * held) * rate)
            at = np.arange(first, last) / rate  # in input samples
            for f in np.concatenate([lumra.random.uniform(0, passband, 3), [passband]]) * lower / 2:
                y = whole(resampler, np.exp(2j * np.pi * f * np.arange(n)).astype(dtype) if dtype.kind == "c" else
                          np.cos(2 * np.pi * f * np.arange(n)).astype(dtype))[0, first:last]  # fmt: skip
                ideal = np.exp(2j * np.pi * f * at) if dtype.kind == "c" else np.cos(2 * np.pi * f * at)
                gain = np.vdot(ideal, y) / np.vdot(ideal, ideal)
                self.assertLess(abs(20 * np.log10(abs(gain))), 0.01 if ratio != (1, 1) else 1e-12, what)
                self.assertLess(abs(np.angle(gain)), 1e-5, what)
                self.assertLess(decibels(np.abs(y - gain * ideal)), -rejection, what)
            if rate < 1:
                stop = np.concatenate([[1, 1.001, 1.02], lumra.random.uniform(1, min(1.2, 1 / lower), 3)]) * lower / 2
                for f in np.concatenate([stop[stop < 0.5], lumra.random.uniform(lower / 2, 0.5, 3)]):
                    y = whole(resampler, np.cos(2 * np.pi * f * np.arange(n)).astype(dtype))[0, first:last]
                    self.assertLess(decibels(np.abs(y)), -rejection, (what, f))

    def test_positions_stay_exact(self):
        f = 0.123456789
        for ratio in ((160, 147), (44100.1, 48000.7)):
            resampler, rate, done = make(ratio, "cf32"), exact(ratio), 0
            for k in range(10):
                n = np.arange(k * 10**6, (k + 1) * 10**6)
                out = process(resampler, np.exp(2j * np.pi * ((f * n) % 1)).astype(np.complex64))[0]
                done += len(out)
            at = np.array([float((done - j) / rate) for j in range(100, 0, -1)])
            self.close(np.exp(2j * np.pi * f * at), out[-100:], 1e-5, ratio)
            # Only what is held back is missing of a long stream's outputs.
            for n in (10**12, 10**17):
                missing = -(-n * rate // 1) - (done + number("output_count", resampler, n - 10**7))
                self.assertTrue(0 <= missing <= figures(resampler).latency_samples * rate + 1, (ratio, n))

    def test_far_rates(self):
        # Steps in a row: a constant stays, and a tone of thousands of times the output's rate is gone.
        slow = make((1, 10007), "f32")
        n = 3 * figures(slow).latency_samples
        for f, level in ((0.0, 1.0), (0.2, 0.0)):
            y = whole(slow, np.cos(2 * np.pi * f * np.arange(n)).astype(np.float32))[0]
            np.testing.assert_allclose(y[len(y) // 3 : -len(y) // 3], level, rtol=0, atol=1e-5)
        fast, x = make((100003, 1), "f64"), lumra.noise(40, float)
        y, coarse = whole(fast, x)[0], whole(make((3, 1), "f64"), x)[0]
        self.assertEqual(40 * 100003, len(y))
        # Between its samples the interpolated stream is smooth, so that the nearest one is near.
        nearest = y[np.round(np.arange(120) * 100003 / 3).astype(int)]
        self.close(coarse, nearest, 1e-4)

    def test_figures(self):
        far = (1000003, 1250000)
        for ratio, kind, blocks, rate in (((3, 10), 1, 1, 3e6), ((5, 5), 0, 0, 10e6), (far, 2, 1, 8000024.0)):
            read = figures(make(ratio, input_rate_hz=10e6, passband=0.8))
            self.assertEqual((kind, blocks), (read.kind, read.blocks), ratio)
            edges = rate / 2, rate / 2 * (0.8 if kind else 1)
            shown = read.input_rate_hz, read.output_rate_hz, read.stop_edge_hz, read.pass_edge_hz
            np.testing.assert_allclose(shown, (10e6, rate, *edges), rtol=1e-15)
            self.assertEqual(read.latency_samples / 10e6, read.latency_s)
            common = np.gcd(*ratio)
            self.assertEqual((ratio[0] // common, ratio[1] // common), (read.up, read.down))
            self.assertTrue(read.ripple_db < 0.01 and read.longest_block <= 65536)
        options = lumra.record("resampler")
        lumra.call("resampler_get_options", make((3, 10), passband=0.8), options)
        self.assertEqual((3, 10, 0.8, 1), (options.up, options.down, options.passband, options.channels))

    def test_states(self):
        resampler = make((1, 2), "f32", passband=0.1, rejection_db=40.0)
        process(resampler, lumra.noise(9, np.float32))
        self.state_is_checked(resampler)

    def test_what_is_not_finite(self):
        x = lumra.noise(40000, np.float32)
        resampler = make((3, 10), "f32")
        expected = whole(resampler, x)[0]
        x[20000] = np.nan
        spoilt = ~np.isfinite(whole(resampler, x)[0])
        self.assertTrue(0 < spoilt.sum() < 2000)
        self.assertTrue(np.isfinite(expected).all())

    def test_refusals(self):
        handle = ctypes.c_void_p()
        good = {"input_rate_hz": 1.0, "output_rate_hz": 2.0}
        single, double = {"type": C["LUMRA_TYPE_F32"]}, {"type": C["LUMRA_TYPE_F64"]}
        for code, changes in (
            ("LUMRA_BAD_SIZE_FIELD", {"size": 3}),
            ("LUMRA_UNKNOWN_CHOICE", {"type": 11}),
            *(("LUMRA_OUT_OF_RANGE", {name: bad}) for name in good for bad in (0.0, -1.0, np.nan, np.inf, 1e-9, 3e9)),
            ("LUMRA_OUT_OF_RANGE", {"up": 1}),
            ("LUMRA_OUT_OF_RANGE", {"down": 1}),
            ("LUMRA_OUT_OF_RANGE", {"up": 1, "down": 10**9}),
            ("LUMRA_OUT_OF_RANGE", {"up": 2**63, "down": 2**33}),
            ("LUMRA_OUT_OF_RANGE", {"up": 1, "down": 2, "input_rate_hz": -1.0}),
            *(("LUMRA_OUT_OF_RANGE", {"passband": bad}) for bad in (0.0, -0.1, 0.991, np.nan)),
            *(("LUMRA_OUT_OF_RANGE", {"rejection_db": bad, **double}) for bad in (39.0, 151.0, np.nan)),
            ("LUMRA_OUT_OF_RANGE", {"rejection_db": 121.0, **single}),
            ("LUMRA_OUT_OF_RANGE", {"channels": 0}),
            ("LUMRA_OUT_OF_RANGE", {"channels": 1025}),
            ("LUMRA_OUT_OF_RANGE", {"threads": 1025}),
        ):
            self.refused(code, "resampler_create", lumra.record("resampler", **{**good, **changes}), handle)
        self.refused("LUMRA_NULL_ARGUMENT", "resampler_create", None, None)
        x, out, written = np.zeros((2, 3000), np.float32), np.zeros((2, 2000), np.float32), ctypes.c_uint64()
        two = make((1, 2), "f32", channels=2)
        n, room = 3000, number("output_count", two, 3000)
        self.assertGreater(room, 100)
        for code, *arguments in (
            ("LUMRA_NULL_ARGUMENT", None, x, n, n, out, room, room),
            ("LUMRA_WRONG_OBJECT", x, x, n, n, out, room, room),
            ("LUMRA_OUT_OF_RANGE", two, x, n, 2**60 + 1, out, room, room),
            ("LUMRA_OUT_OF_RANGE", two, x, 2**62, n, out, room, room),
            ("LUMRA_NULL_ARGUMENT", two, None, n, n, out, room, room),
            ("LUMRA_TOO_LITTLE_ROOM", two, x, n, n, out, room, room - 1),
            ("LUMRA_OUT_OF_RANGE", two, x, n, n, out, room - 1, room),
            ("LUMRA_NULL_ARGUMENT", two, x, n, n, None, room, room),
            ("LUMRA_OVERLAP", two, x, n, n, x[1:], 2000, room),
        ):
            self.refused(code, "resampler_process", *arguments, written)
        process(two, x)
        left = number("flush_count", two)
        for code, *arguments in (
            ("LUMRA_NULL_ARGUMENT", None, out, left, left),
            ("LUMRA_TOO_LITTLE_ROOM", two, out, left, left - 1),
            ("LUMRA_OUT_OF_RANGE", two, out, left - 1, left),
            ("LUMRA_NULL_ARGUMENT", two, None, left, left),
        ):
            self.refused(code, "resampler_flush", *arguments, written)
        self.assertEqual(left, number("flush_count", two))
        self.refused("LUMRA_OUT_OF_RANGE", "resampler_output_count", two, 2**60, written)
        for function in ("output_count", "flush_count", "get_figures", "get_options"):
            arguments = [5] if function == "output_count" else []
            self.refused("LUMRA_NULL_ARGUMENT", f"resampler_{function}", two, *arguments, None)
            self.refused("LUMRA_NULL_ARGUMENT", f"resampler_{function}", None, *arguments, None)
        self.refused("LUMRA_NULL_ARGUMENT", "resampler_reset", None)
        lumra.call("resampler_reset", two)
        self.assertEqual(0, number("flush_count", two))


if __name__ == "__main__":
    unittest.main()
