# SPDX-License-Identifier: MIT
"""Channels out of a stream against tones whose samples are known, and streams that are cut, saved and very long."""
import ctypes
import itertools
import unittest
from fractions import Fraction
from math import ceil

import numpy as np
import open as lumra

C = lumra.constants
PRECISION = {"f32": 1e-6, "cf32": 1e-6, "f64": 1e-14, "cf64": 1e-14}


def channelizer(rate, channels, kind="cf32", **changes):
    """Channels are (centre, rate) or (centre, rate, pass band)."""
    records = np.array([[*c, 0.0][:3] for c in channels])
    options = lumra.record("channelizer", type=lumra.type_code(kind), sample_rate_hz=rate, **changes)
    return lumra.make("channelizer_create", options, records, len(channels))


def run(what, made, kind, channels, *arguments):
    """The samples of all channels of a call that takes `arguments` in front."""
    counts, written = np.zeros((2, channels), np.uint64)
    lumra.call(f"channelizer_{what}_counts", made, *arguments[1:], counts)
    out = [lumra.odd(np.zeros(int(n), lumra.types["c" + kind.removeprefix("c")])) for n in counts]
    addresses = np.array([o.ctypes.data for o in out], np.uint64)
    lumra.call("channelizer_" + what.replace("output", "process"), made, *arguments, addresses, counts, written)
    assert (written == counts).all()
    return out


def process(made, kind, channels, x):
    return run("output", made, kind, channels, lumra.odd(x), len(x))


def all_of(made, kind, channels, pieces):
    """The channels of a whole stream."""
    parts = [process(made, kind, channels, piece) for piece in pieces] + [run("flush", made, kind, channels)]
    return [np.concatenate(of_channel) for of_channel in zip(*parts)]


def tone(frequency, times):
    """Exact for any time: both are numbers or fractions."""
    cycles = [float(Fraction(frequency) * t % 1) for t in times] if isinstance(times, list) else frequency * times % 1
    return np.exp(2j * np.pi * np.asarray(cycles))


def held_outputs(made, rate, channel):
    """Outputs of a channel that are in the middle of the stream for good."""
    figures = lumra.record("channelizer_figures", size=ctypes.sizeof(lumra.record("channelizer_figures")))
    lumra.call("channelizer_get_figures", made, channel, figures)
    return figures, int(figures.latency_s * figures.rate_hz) + 2


# Wide channels and a narrow one, on bins and off them, at rates that blocks have and at others, up to the stream's own.
CHANNELS = [(-4e6, 1e6), (1.234567e6, 1.92e6), (2.5e6, 1e5 + 1 / 3), (-1e6 / 3, 9e6), (3e6, 1234567.8), (0, 10e6)]

# Rates that have long blocks of powers of 2, and bands across the end of the stream's.
IN_LONG_BLOCKS = [(-4.7e6, 625e3), (1.234567e6, 1.25e6), (2.5e6, 1e5 + 1 / 3), (4.8e6, 312.5e3), (0, 10e6)]


class Channelizer(lumra.Test):
    def test_counts_and_bits(self):
        # ceil(n rate / sample rate) samples, with the same bits for any cut, any number of threads and a loaded state.
        n = 200001
        for kind, channels in itertools.product(lumra.types, (CHANNELS, IN_LONG_BLOCKS)):
            x = lumra.noise(n, lumra.types[kind])
            expected = all_of(channelizer(10e6, channels, kind), kind, len(channels), [x])
            for (_, rate), samples in zip(channels, expected):
                self.assertEqual(ceil(n * Fraction(rate) / 10**7), len(samples), (kind, rate))
            np.testing.assert_array_equal(x, expected[-1])
            made, pieces, done = channelizer(10e6, channels, kind, threads=2), [], 0
            for k in itertools.count():
                length = int(lumra.random.choice([0, 1, 999, 20000, 50000]))
                pieces.append(process(made, kind, len(channels), x[done : done + length]))
                done += length
                if k == 3:
                    made = lumra.load("channelizer", lumra.save(made))
                if done >= n:
                    break
            pieces.append(run("flush", made, kind, len(channels)))
            for c, of_channel in enumerate(zip(*pieces)):
                self.assertEqual(expected[c].tobytes(), np.concatenate(of_channel).tobytes(), (kind, c))
            again = all_of(made, kind, len(channels), [x])  # a flush begins a new stream
            self.assertEqual(expected[3].tobytes(), again[3].tobytes(), kind)

    def test_tones_at_exact_times(self):
        # Every channel holds a tone of its own with the phase that the definition gives; the others' are rejected.
        rate, times = 10e6, np.arange(400000) / 10e6
        for kind, rejection, channels in (
            ("cf32", 80, CHANNELS),
            ("cf64", 120, CHANNELS),
            ("f64", 80, CHANNELS),
            ("cf32", 80, IN_LONG_BLOCKS),
            ("cf64", 120, IN_LONG_BLOCKS),
        ):
            is_real = kind[0] == "f"
            limit = 10 ** (-rejection / 20) + 30 * PRECISION[kind]
            for channel, (centre, own) in enumerate(channels[:-1]):
                frequency = centre + (0.37 * own if centre <= 0 else -0.41 * own)
                # Of a real tone a channel has one half, and the other one at the mirrored frequency.
                x = 2 * tone(frequency, times).real if is_real else tone(frequency, times)
                made = channelizer(rate, channels, kind, rejection_db=rejection)
                samples = all_of(made, kind, len(channels), [x.astype(lumra.types[kind])])
                for k, (other, wanted) in enumerate(channels[:-1]):
                    held = held_outputs(made, rate, k)[1]
                    middle = samples[k][held:-held]
                    self.assertGreater(len(middle), 100)
                    at = np.arange(held, held + len(middle)) / wanted
                    seen = [f for f in (frequency, -frequency)[: 1 + is_real] if abs(f - other) < wanted / 2]
                    if k == channel or not seen:
                        expected = sum(tone(f - other, at) for f in seen) + np.zeros(len(at))
                        self.assertLess(np.abs(middle - expected).max(), (1 + is_real) * limit, (kind, channel, k))

    def test_swept_pass_band_and_rejection(self):
        for rate, centre, own, passband, rejection, kind in (
            (16.0, 3.1, 1.0, 0.9, 80, "cf32"),
            (16.0, -2.0, 1.0, 0.5, 40, "cf64"),
            (16.0, 1.0, 14.0, 0.95, 100, "cf64"),
            (10.0, 1.23, 1.9201, 0.8, 110, "cf32"),
            (10.0, -4.0, 0.012345, 0.5, 80, "cf64"),
            (10.0, 0.0, 9.99, 0.99, 140, "cf64"),
        ):
            what = rate, centre, own, passband, rejection, kind
            # The band edge is not beyond the stream's.
            passband = min(passband, (rate / 2 - abs(centre)) / (own / 2))
            made = channelizer(rate, [(centre, own, passband)], kind, rejection_db=rejection)
            figures, held = held_outputs(made, rate, 0)
            count = 2 * held + 300
            times = np.arange(ceil(count * rate / own)) / rate

            def level(frequency):
                x = tone(frequency, times).astype(lumra.types[kind])
                return np.sqrt(np.mean(np.abs(all_of(made, kind, 1, [x])[0][held : held + 300]) ** 2))

            inside = centre + passband * own / 2 * np.array([-1, -0.999, -0.98, -0.9, -0.5, 0, 0.3, 0.8, 0.995, 1])
            ripple = max(abs(20 * np.log10(level(f))) for f in inside)
            self.assertLess(ripple, figures.ripple_db, what)
            self.assertLess(figures.ripple_db, 0.0101)
            beyond = (rate - own) * np.array([0, 1e-5, 3e-4, 2e-3, 0.01, 0.05, 0.2, 0.45]) + own / 2
            worst = max(level(centre + side * f) for f in beyond for side in (-1, 1))
            self.assertLess(20 * np.log10(worst), -rejection, what)
            told = figures.centre_hz, figures.rate_hz, figures.stop_edge_hz, figures.rejection_db
            self.assertEqual((centre, own, own / 2, rejection), told)

    def test_silence_around_a_stream_changes_nothing(self):
        # Through one filter, two, three and four; those behind the first see what it gives in front of the stream.
        x, silence = lumra.noise(5000, np.complex128), np.zeros(10**6)
        for own in (1e6, 1.2e6, 1e5, 3e4, 1e3, 10.0):
            bare, padded = (all_of(channelizer(10e6, [(1e6, own)], "cf64", rejection_db=120), "cf64", 1, [piece])[0]
                            for piece in (x, np.concatenate((silence, x, silence))))  # fmt: skip
            padded = padded[round(own / 10) :][: len(bare)]
            self.assertLess(np.abs(bare - padded).max(), 1e-6 * np.abs(padded).max(), own)

    def test_the_widest_and_the_narrowest(self):
        # A stream far shorter than a filter gives one sample: its sum times the filter's peak, which is the area of the
        # response. Silence behind the stream is not computed, so that this ends.
        for kind in lumra.types:
            samples = all_of(channelizer(1e8, [(0, 1.0)], kind), kind, 1, [np.ones(1000, lumra.types[kind])])[0]
            np.testing.assert_allclose(samples, [1000 * 0.95e-8], rtol=0.01, err_msg=kind)
        # Where all channels have the whole band nothing is held, before a stream and behind one.
        made, x = channelizer(10e6, [(0, 10e6)]), lumra.noise(1000, np.complex64)
        for _ in range(2):
            made = lumra.load("channelizer", lumra.save(made))
            np.testing.assert_array_equal(x, all_of(made, "cf32", 1, [x[:300], x[300:]])[0])

    def test_a_stream_of_10_to_the_12_samples(self):
        # A tone at a channel's centre stays 1, however long the stream was. Its samples repeat, so that a state with
        # another position is that of a longer stream.
        channels, rate = [(137.0, 125.0), (137.0, 125.0001)], 1000.0
        x = tone(Fraction(137, 1000), list(range(200000)))
        made = channelizer(rate, channels, "cf64", rejection_db=140)
        process(made, "cf64", 2, x)
        counts = np.zeros(2, np.uint64)

        for n in range(1 << 16):  # until a block gives samples, an eighth of those that it takes
            lumra.call("channelizer_output_counts", made, n, counts)
            if counts[0]:
                break
        hop = 8 * int(counts[0])
        state, place = lumra.save(made), 24 + 32 + 24 * 2
        inputs = int(state[place : place + 8].view(np.uint64)[0])
        self.assertEqual(len(x), inputs)
        inputs += 10**12 // (1000 * hop) * 1000 * hop
        state[place : place + 8] = np.array([inputs], np.uint64).view(np.uint8)
        later = lumra.load("channelizer", lumra.sealed(state))
        for samples in process(later, "cf64", 2, x):
            self.assertGreater(len(samples), 20000)
            self.assertLess(np.abs(samples - 1).max(), 1e-6)
        lumra.call("channelizer_flush_counts", later, counts)
        flushed = run("flush", later, "cf64", 2)
        self.assertEqual(list(counts), [len(f) for f in flushed])

    def test_states(self):
        made = channelizer(8.0, [(1.0, 4.0, 0.3), (1.0, 2.5, 0.3)], "cf32", rejection_db=40)
        process(made, "cf32", 2, lumra.noise(300, np.complex64))
        self.state_is_checked(made)

    def test_refusals(self):
        handle, one = ctypes.c_void_p(), [[1.0, 2.0, 0.5]]
        for code, changes, channels, count, says in (
            ("LUMRA_BAD_SIZE_FIELD", {"size": 3}, one, 1, "size"),
            ("LUMRA_UNKNOWN_CHOICE", {"type": 11}, one, 1, "type"),
            *(("LUMRA_OUT_OF_RANGE", {"sample_rate_hz": r}, one, 1, "sample_rate") for r in (0, -1, np.inf, np.nan)),
            *(("LUMRA_OUT_OF_RANGE", {"rejection_db": r}, one, 1, "rejection_db") for r in (39.0, 121.0, np.nan)),
            ("LUMRA_OUT_OF_RANGE", {"threads": 1025}, one, 1, "threads"),
            ("LUMRA_OUT_OF_RANGE", {"reserved": 1}, one, 1, "reserved"),
            ("LUMRA_OUT_OF_RANGE", {}, one, 0, "count"),
            ("LUMRA_OUT_OF_RANGE", {}, one, 4097, "count"),
            ("LUMRA_NULL_ARGUMENT", {}, None, 1, "channels"),
            *(("LUMRA_OUT_OF_RANGE", {}, [[0, r, 0.5]], 1, "rate_hz") for r in (0, -1, 10.1, 1e-9, np.inf, np.nan)),
            *(("LUMRA_OUT_OF_RANGE", {}, [[0, 1, p]], 1, "passband") for p in (-0.1, 1.0, np.nan)),
            *(("LUMRA_OUT_OF_RANGE", {}, [[c, 1, 0.5]], 1, "centre_hz") for c in (5.1, -5.1, np.inf, np.nan)),
            ("LUMRA_OUT_OF_RANGE", {}, [*one, [-4.8, 1, 0.5]], 2, "[1] is from -5.05 to -4.55 Hz; the stream's band"),
        ):  # fmt: skip
            options = lumra.record("channelizer", **{"sample_rate_hz": 10.0, **changes})
            records = None if channels is None else np.array(channels, float)
            self.refused(code, "channelizer_create", options, records, count, handle, says=says)
        options = lumra.record("channelizer", sample_rate_hz=10.0)
        self.refused("LUMRA_NULL_ARGUMENT", "channelizer_create", options, np.array(one), 1, None, says="channelizer")
        made = channelizer(10.0, [(1.0, 5.0), (0.0, 10.0)])
        x, out = lumra.noise(5000, np.complex64), np.zeros(20000, np.complex64)
        counts, second = np.zeros(2, np.uint64), np.array([0, 1], np.uint64)
        lumra.call("channelizer_output_counts", made, 5000, counts)
        self.assertGreater(counts[0], 1000)
        first = out.ctypes.data
        good = np.array([first, first + 8 * 10000], np.uint64)
        for code, *arguments, says in (
            ("LUMRA_NULL_ARGUMENT", None, x, 5000, good, counts, counts, "channelizer"),
            ("LUMRA_WRONG_OBJECT", x, x, 5000, good, counts, counts, "channelizer"),
            ("LUMRA_OUT_OF_RANGE", made, x, 2**60 + 1, good, counts, counts, "2^60"),
            ("LUMRA_NULL_ARGUMENT", made, None, 5000, good, counts, counts, "in is null"),
            ("LUMRA_NULL_ARGUMENT", made, x, 5000, None, counts, counts, "out is null"),
            ("LUMRA_NULL_ARGUMENT", made, x, 5000, good, None, counts, "room is null"),
            ("LUMRA_TOO_LITTLE_ROOM", made, x, 5000, good, counts - second, counts, "room[1] is 4999"),
            ("LUMRA_NULL_ARGUMENT", made, x, 5000, good * second, counts, counts, "out[0] is null"),
            ("LUMRA_OVERLAP", made, x, 5000, np.array([first, first + 8000], np.uint64), counts, counts, "another"),
            ("LUMRA_OVERLAP", made, x, 5000, np.array([x.ctypes.data + 8, first], np.uint64), counts, counts, "in"),
        ):
            self.refused(code, "channelizer_process", *arguments, says=says)
        lumra.call("channelizer_process", made, x, 5000, good, counts, None)  # nothing was taken before
        rooms = np.zeros(2, np.uint64)
        self.refused("LUMRA_TOO_LITTLE_ROOM", "channelizer_flush", made, good, rooms, None, says="room[0] is 0")
        figures = lumra.record("channelizer_figures")
        for code, *arguments in (
            ("LUMRA_OUT_OF_RANGE", made, 2, figures),
            ("LUMRA_NULL_ARGUMENT", made, 0, None),
            ("LUMRA_BAD_SIZE_FIELD", made, 0, figures),
        ):
            self.refused(code, "channelizer_get_figures", *arguments)
        for what in ("output_counts", "flush_counts", "get_count"):
            before = [5] if what == "output_counts" else []
            self.refused("LUMRA_NULL_ARGUMENT", f"channelizer_{what}", made, *before, None)


if __name__ == "__main__":
    unittest.main()
