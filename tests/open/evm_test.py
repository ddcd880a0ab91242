# SPDX-License-Identifier: MIT
"""Error vectors beside their formulas in NumPy, and alignment beside signals that were delayed by their own formula."""
import ctypes
import unittest

import numpy as np

import open as lumra

GAIN, DELAY, FREQUENCY, DC = 1, 2, 4, 8
TYPES = {"cf32": (np.complex64, np.float32, 1e-6), "cf64": (np.complex128, np.float64, 1e-13)}
rng = np.random.default_rng(21)


def noise(n):
    return rng.standard_normal(n) + 1j * rng.standard_normal(n)


def symbols(n, delay, samples_per_symbol=4, roll_off=0.35, span=24):
    """QPSK with raised cosine pulses, each sample from the pulse's formula at its own time."""
    source = np.random.default_rng(5)
    a = source.choice([-1, 1], 2 * (n + 1300)).view().reshape(-1, 2) @ [1, 1j]
    t = (np.arange(n) - delay + 600) / samples_per_symbol + span
    first, y = np.floor(t).astype(int), np.zeros(n, complex)
    for k in range(-span, span + 1):
        u = t - (first + k)
        below = 1 - (2 * roll_off * u) ** 2
        pulse = np.sinc(u) * np.cos(np.pi * roll_off * u) / np.where(np.abs(below) < 1e-9, 1, below)
        y += a[first + k] * np.where(np.abs(below) < 1e-9, np.pi / 4 * np.sinc(1 / (2 * roll_off)), pulse)
    return y


def white(n, delay):
    """Noise over the whole band that repeats after n samples."""
    bins = np.fft.fft(np.random.default_rng(6).standard_normal(2 * n).view(complex))
    return np.fft.ifft(bins * np.exp(-2j * np.pi * np.fft.fftfreq(n) * delay))


def carried(x, gain, frequency, dc, snr_db):
    """The model, and noise as a fraction of the signal."""
    n = len(x)
    level = np.sqrt(np.mean(np.abs(x) ** 2) / 2) * 10 ** (-snr_db / 20)
    return gain * (x * np.exp(2j * np.pi * frequency * np.arange(n)) + level * noise(n)) + dc


def measure(reference, measured, align=0, kind="cf64", rate=1.0, traces=(None, None, None), threads=1):
    result = lumra.record("evm_result")
    result.size = ctypes.sizeof(result)
    reference, measured = (lumra.odd(np.asarray(x, TYPES[kind][0])) for x in (reference, measured))
    options = lumra.record("evm", align=align, sample_rate_hz=rate, threads=threads)
    lumra.call(f"evm_measure_{kind}", reference, measured, len(reference), options, result, *traces)
    return result


MODEL = ("gain_re", "gain_im", "delay_samples", "frequency_hz", "dc_re", "dc_im")
BLOCK, WINDOW = 245760, 262144


def meter_of(r, y, start=0, cuts=0, **options):
    """A meter of all samples, from random cuts, merges, and states."""
    meter = lumra.create("evm_meter", type=lumra.type_code("cf32" if r.dtype == np.complex64 else "cf64"), start=start, **options)
    if cuts == 0:
        lumra.call("evm_meter_add", meter, lumra.odd(r), lumra.odd(y), len(r))
        return meter
    at = int(rng.integers(0, len(r) + 1))
    if rng.random() < 0.3:
        lumra.call("evm_meter_add", meter, r[:at], y[:at], at)
        lumra.call("evm_meter_add", meter, r[at:], y[at:], len(r) - at)
        return meter
    meter = meter_of(r[:at], y[:at], start, cuts - 1, **options)
    lumra.call("evm_meter_merge", meter, meter_of(r[at:], y[at:], start + at, cuts - 1, **options))
    return lumra.load("evm_meter", lumra.save(meter)) if rng.random() < 0.3 else meter


def read(meter, what="result"):
    found = lumra.record(f"evm_{what}")
    found.size = ctypes.sizeof(found)
    lumra.call(f"evm_meter_{'read' if what == 'result' else 'refine'}", meter, found)
    return found


def chunked(r, y, align, rate):
    """The settled model of records that a meter sees in pieces."""
    n = len(r)
    parts = [min(k, n - WINDOW) for k in range(0, n, WINDOW)]
    first, count = max(parts, key=lambda k: np.sum(np.abs(r[k : k + WINDOW].astype(complex)) ** 2)), WINDOW
    kind = "cf32" if r.dtype == np.complex64 else "cf64"
    begun = measure(r[first : first + count], y[first : first + count], align, kind, rate)
    model = {"delay_samples": begun.delay_samples, "frequency_hz": begun.frequency_hz, "sample_rate_hz": rate}
    for _ in range(8):
        here = slice(first, first + count)
        better = read(meter_of(r[here], y[here], first, 3, align=align, **model), "refinement")
        model |= {name: getattr(better, name) for name in MODEL}
        if better.settled and count == n:
            return model
        middle, count = first + count // 2, min(better.reach, n)
        first = min(max(middle - count // 2, 0), n - count)
    raise AssertionError("the model does not settle")


class Evm(lumra.Test):
    def test_plain_formulas(self):
        n, rate = 5001, 1e6
        r = noise(n)
        y = (0.5 - 0.3j) * r + 0.05 * noise(n) + 0.2j
        for kind, (complex_, real, tolerance) in TYPES.items():
            reference, measured = r.astype(complex_).astype(complex), y.astype(complex_).astype(complex)
            centred = reference - reference.mean()
            fits = {
                0: (1, 0),
                GAIN: (np.vdot(reference, measured) / np.vdot(reference, reference), 0),
                DC: (1, (measured - reference).mean()),
                GAIN | DC: (np.vdot(centred, measured) / np.vdot(centred, centred), None),
            }
            for align, (gain, dc) in fits.items():
                dc = (measured - gain * reference).mean() if dc is None else dc
                rms = np.sqrt(np.mean(np.abs(reference) ** 2))
                z = (measured - dc) / gain
                error = (z - reference) / rms
                magnitude = (np.abs(z) - np.abs(reference)) / rms
                phase = np.angle(z * np.conj(reference))
                traces = np.empty(n, complex_), np.empty(n, real), np.empty(n, real)
                got = measure(r, y, align, kind, rate, traces)
                self.close([np.sqrt(np.mean(np.abs(e) ** 2)) for e in (error, magnitude, phase)] + [np.abs(error).max(), rms],
                           [got.rms, got.magnitude_rms, got.phase_rms, got.peak, got.reference_rms], 1e-13, (kind, align))
                self.close([gain, 1j * dc], [got.gain_re + 1j * got.gain_im, 1j * got.dc_re - got.dc_im], 1e-13, (kind, align))
                self.assertEqual((0, n, np.abs(error).argmax()), (got.first, got.samples, got.peak_index))
                for expected, trace in zip((error, magnitude, phase), traces):
                    self.close(expected, trace, tolerance, (kind, align))

    def test_alignment(self):
        everything = GAIN | DELAY | FREQUENCY | DC
        for signal, n, delay, frequency, align, gain, dc, snr in [
            (symbols, 100_000, 0.37, 0.4, everything, 2j, 0.3, 30),
            (symbols, 100_000, -500, -0.25, everything, 0.01, 0.02j, 30),
            (symbols, 300_000, 499.5, 1e-6, everything, -1, 3 + 3j, 30),
            (white, 100_000, 250.5, -0.0123, everything, 1j, 0.1, 30),
            (white, 1_100_000, -300.5, 0.2, everything, 1j, 0.1, 30),  # in blocks
            (symbols, 100_000, 0.5, 0.5 - 1e-5, DELAY | FREQUENCY | GAIN, 1, 0, 40),
            (symbols, 100_000, -17.2, 0, GAIN | DELAY, 3, 0, 40),
            (symbols, 100_000, 123.456, 0, DELAY, 1, 0, 40),
            (symbols, 100_000, 0, -0.31, FREQUENCY, 1, 0, 40),
            (white, 4001, 0.5, 0, GAIN | DELAY | DC, 1, 1, 40),
            (symbols, 100, 5.25, 0.1, everything, 1j, 0.1, 40),
            (symbols, 64, -3.5, 0, GAIN | DELAY, 1, 0, 40),
        ]:
            reference = signal(n, 0)
            measured = carried(signal(n, delay), gain, frequency, dc, snr)
            for kind in TYPES if n == 100_000 else ("cf64",):
                got, what = measure(reference, measured, align, kind, 1e6), (kind, signal.__name__, n, delay, frequency, align)
                n_term = 1e5 / n  # what noise leaves of short records
                self.assertLess(abs(got.delay_samples - delay), 0.001 * n_term**0.5 + 1e-9, what)
                self.assertLess(abs(got.frequency_hz / 1e6 - frequency), 2e-9 * n_term**1.5 + 1e-15, what)
                self.assertLess(abs(got.gain_re + 1j * got.gain_im - gain), 1e-3 * n_term**0.5 * abs(gain), what)
                self.assertLess(abs(got.dc_re + 1j * got.dc_im - dc), 1e-3 * n_term**0.5 * abs(gain), what)
                spread = 1 if n > 1000 else 1.3
                self.assertLess(got.rms, 10 ** (-snr / 20) * 1.02 * spread, what)
                self.assertGreater(got.rms, 10 ** (-snr / 20) * 0.98 / spread, what)
                skipped = min(32, n // 8) if align & DELAY else 0
                first, last = max(0, int(np.ceil(skipped + delay))), min(n, int(np.floor(n - skipped + delay)))
                if align & DELAY:  # by a sample at the most, where noise moves a whole delay
                    self.assertLessEqual(abs(got.first - first) + abs(got.first + got.samples - last), 2, what)

    def test_errors_lie_in_the_reference(self):
        """The traces of an aligned record are those of the plain formulas on the corrected one."""
        n, frequency, gain, dc = 3000, 0.123, 0.5j, 0.1
        reference = symbols(n, 0)
        impulse = np.zeros(n, complex)
        impulse[1234] = 0.5 - 0.1j
        measured = gain * (symbols(n, 7.5) + impulse) * np.exp(2j * np.pi * frequency * np.arange(n)) + dc
        traces = np.empty(n, complex), np.empty(n), np.empty(n)
        got = measure(reference, measured, 15, traces=traces)
        inside = slice(got.first, got.first + got.samples)
        self.assertEqual(1234, got.peak_index)
        self.close(impulse[inside] / got.reference_rms, traces[0][inside], 0.01)
        for trace in traces:
            self.assertTrue(np.isnan(trace[: inside.start]).all() and np.isnan(trace[inside.stop :]).all())
            self.assertFalse(np.isnan(trace[inside]).any())
        clean = measure(reference, measured - gain * impulse * np.exp(2j * np.pi * frequency * np.arange(n)), 15)
        self.assertLess(clean.rms, 2e-5)

    def test_chunks_have_the_bits_of_the_whole(self):
        n, rate = 400_000, 1e6
        reference = symbols(n, 0)
        for kind, align, delay, frequency in (("cf64", 15, -300.5, 0.2), ("cf32", DELAY | DC, 77.3, 0)):
            r = reference.astype(TYPES[kind][0])
            y = carried(symbols(n, delay), 1 if align & DC else 2j, frequency, 0.1 if align & DC else 0, 30).astype(r.dtype)
            traces = np.empty(n, r.dtype), np.empty(n, r.real.dtype), np.empty(n, r.real.dtype)
            whole = measure(r, y, align, kind, rate, traces)
            model = chunked(r, y, align, rate)
            self.assertEqual(bytes(whole), bytes(read(meter_of(r, y, 0, 3, **model))), (kind, align))
            for first in (0, BLOCK - 8192):  # windows of blocks
                count, begin = min(WINDOW, n - first), min(first, 8192)
                inner = slice(begin, begin + BLOCK)
                errors = tuple(np.empty(count, t.dtype) for t in traces)
                options = lumra.record("evm_meter", type=lumra.type_code(kind), start=first, **model)
                lumra.call("evm_errors", options, r[first : first + count], y[first : first + count], count, *errors)
                for k, (mine, all_of_them) in enumerate(zip(errors, traces)):
                    mine, expected = mine[inner], all_of_them[first : first + count][inner]
                    np.testing.assert_array_equal(np.isnan(expected), np.isnan(mine))
                    self.close(np.nan_to_num(expected), np.nan_to_num(mine) / (1 if k == 2 else whole.reference_rms), TYPES[kind][2])

    def test_same_bits_for_any_number_of_threads(self):
        for align, n in ((GAIN | DC, 70_001), (GAIN | DELAY, 600_000)):
            x, y, results = white(n, 0), carried(white(n, 0.3 if align & DELAY else 0), 0.5 + 0.1j, 0, 0.01, 30), []
            for threads in (1, 2, 0):
                traces = np.empty(n, complex), np.empty(n), np.empty(n)
                results.append((bytes(measure(x, y, align, traces=traces, threads=threads)), *(t.tobytes() for t in traces)))
            self.assertTrue(results[0] == results[1] == results[2], align)

    def test_same_bits_for_any_tree(self):
        reference, measured = noise(500_000), noise(500_000)
        reference[5] = measured[400_000] = 100
        for start, n in ((0, 1), (0, 500_000), (1, 300), (BLOCK - 8193, 300_000), (2**62 - 500_000, 500_000)):
            for options in ({"align": 15, "delay_samples": -2.5, "frequency_hz": 0.1}, {"dc_re": 1.0}):
                r, y = reference[:n], measured[:n]
                whole = meter_of(r, y, start, **options)
                for _ in range(2):
                    tree = meter_of(r, y, start, 4, **options)
                    self.assertEqual(lumra.save(whole).tobytes(), lumra.save(tree).tobytes(), (start, n))
                    self.assertEqual(bytes(read(whole)), bytes(read(tree)), (start, n)) if n > 1 else None

    def test_meters_refuse(self):
        r, tone, result, out = noise(1000), np.exp(0.3j * np.arange(1000)), lumra.record("evm_result", size=200), ctypes.c_void_p()
        meter, late, empty = meter_of(r, r, 7), meter_of(r, r, 1008), meter_of(r[:0], r[:0], 2**62)
        spoilt = np.where(np.arange(1000) == 5, np.nan, r)

        def made(**changes):
            return "evm_meter_create", lumra.record("evm_meter", **changes), out

        refined, fresh = "evm_meter_refine", lumra.record("evm_refinement")
        fresh.size = ctypes.sizeof(fresh)
        for code, says, function, *arguments in [
            ("UNKNOWN_CHOICE", "options->type is 8", *made(type=8)),
            ("UNKNOWN_CHOICE", "options->align is 16", *made(align=16)),
            ("OUT_OF_RANGE", "reserved is 1", *made(reserved=1)),
            ("OUT_OF_RANGE", "start is", *made(start=2**62 + 1)),
            ("OUT_OF_RANGE", "sample_rate_hz is 0", *made(sample_rate_hz=0)),
            ("OUT_OF_RANGE", "gain_re and gain_im make 0", *made(gain_re=0)),
            ("OUT_OF_RANGE", "delay_samples is 502", *made(delay_samples=502)),
            ("OUT_OF_RANGE", "frequency_hz is nan", *made(frequency_hz=np.nan)),
            ("OUT_OF_RANGE", "dc_im inf", *made(dc_im=np.inf)),
            ("WRONG_OBJECT", "meter was freed", "evm_meter_add", r, r, r, 8),
            ("NULL_ARGUMENT", "measured is null", "evm_meter_add", meter, r, None, 8),
            ("OUT_OF_RANGE", "end at 2^62", "evm_meter_add", empty, r, r, 1),
            ("OVERLAP", "next is meter", "evm_meter_merge", meter, meter),
            ("WRONG_TYPE", "other options", "evm_meter_merge", meter, meter_of(r, r, 1007, dc_re=1.0)),
            ("OUT_OF_RANGE", "starts at 1008; meter ends at 1007", "evm_meter_merge", meter, late),
            ("NULL_ARGUMENT", "extent is null", "evm_meter_where", meter, None),
            ("BAD_SIZE_FIELD", "result->size is 200", "evm_meter_read", meter, result),
            ("TOO_FEW_SAMPLES", "none of the samples", refined, meter_of(r[:30], r[:30], delay_samples=100.0), fresh),
            ("OUT_OF_RANGE", "the reference is zero", refined, meter_of(0 * r, r), fresh),
            *[("NO_CONVERGENCE", "unrelated", refined, meter_of(r, x, align=1), fresh) for x in (noise(1000), spoilt, 0 * r)],
            ("NO_CONVERGENCE", "told apart", refined, meter_of(tone, tone, align=3), fresh),
            ("OUT_OF_RANGE", "at most 262144", "evm_errors", lumra.record("evm_meter", delay_samples=1.0), r, r, WINDOW + 1, None, None, None),
            ("OVERLAP", "error overlaps measured", "evm_errors", None, r, tone, 1000, tone, None, None),
            ("TOO_FEW_SAMPLES", "n is 0", "evm_errors", None, r, r, 0, None, None, None),
        ]:
            self.refused(f"LUMRA_{code}", function, *arguments, says=says)
        extent, state = lumra.record("evm_meter_extent"), lumra.save(meter)
        lumra.call("evm_meter_where", meter, extent)
        self.assertEqual((7, 1000, lumra.type_code("cf64")), (extent.start, extent.samples, extent.type))
        for k in [*range(200), *range(200, state.size, 517)]:
            damaged = state.copy()
            damaged[k] ^= 1 << k % 8
            self.refused("LUMRA_BAD_STATE", "evm_meter_load", damaged, damaged.size, out)
            self.refused("LUMRA_BAD_STATE", "evm_meter_load", state[:k].copy(), k, out)
        self.assertIsNone(out.value)

    def test_not_finite_and_silence(self):
        r = noise(1000)
        for value in (np.nan, np.inf):
            spoilt = r.copy()
            spoilt[77] = value
            self.assertFalse(np.isfinite(measure(r, spoilt).rms) or np.isfinite(measure(spoilt, r).rms))
            self.assertEqual(77, measure(r, spoilt).peak_index)
        got = measure(r, 0 * r)
        self.assertEqual((1, 0), (round(got.rms, 14), got.phase_rms))

    def test_refusals(self):
        n = 1000
        r, y, tone, result = noise(n), noise(n), np.exp(0.3j * np.arange(n)), lumra.record("evm_result")
        result.size = ctypes.sizeof(result)
        small, spoilt, room = lumra.record("evm_result", size=4), r.copy(), np.empty(n)
        spoilt[5] = np.nan

        def options(align, **changes):
            return lumra.record("evm", align=align, **changes)
        for code, says, *arguments in [
            ("BAD_SIZE_FIELD", "options->size is 2", r, y, n, options(0, size=2), result, None, None, None),
            ("UNKNOWN_CHOICE", "options->align is 16", r, y, n, options(16), result, None, None, None),
            ("OUT_OF_RANGE", "sample_rate_hz is nan", r, y, n, options(0, sample_rate_hz=np.nan), result, None, None, None),
            ("OUT_OF_RANGE", "sample_rate_hz is 0", r, y, n, options(0, sample_rate_hz=0), result, None, None, None),
            ("OUT_OF_RANGE", "options->threads is 1025", r, y, n, options(0, threads=1025), result, None, None, None),
            ("OUT_OF_RANGE", "options->reserved is 1", r, y, n, options(0, reserved=1), result, None, None, None),
            ("OUT_OF_RANGE", "count of reference", r, y, 2**62, None, result, None, None, None),
            ("NULL_ARGUMENT", "measured is null", r, None, n, None, result, None, None, None),
            ("NULL_ARGUMENT", "result is null", r, y, n, None, None, None, None, None),
            ("BAD_SIZE_FIELD", "result->size is 4", r, y, n, None, small, None, None, None),
            ("OVERLAP", "error overlaps measured", r, y, n, None, result, y, None, None),
            ("OVERLAP", "phase overlaps magnitude", r, y, n, None, result, None, room, room),
            ("TOO_FEW_SAMPLES", "1 samples", r, y, 0, None, result, None, None, None),
            ("TOO_FEW_SAMPLES", "n is 63", r, y, 63, options(DELAY), result, None, None, None),
            ("OUT_OF_RANGE", "the reference is zero", 0 * r, y, n, None, result, None, room, None),
            *[("NO_CONVERGENCE", "seem unrelated", r, y, n, options(align), result, None, room, None) for align in (1, 2, 4, 15)],
            *[("NO_CONVERGENCE", "seem unrelated", r, 0 * y, n, options(align), result, None, None, None) for align in (1, 7)],
            *[("NO_CONVERGENCE", "finite", spoilt, r, n, options(align), result, None, None, None) for align in (1, 2, 4, 15)],
            *[("NO_CONVERGENCE", "told apart", tone, tone, n, options(align), result, None, None, None) for align in (2, 7)],
            ("NO_CONVERGENCE", "told apart", tone**0, tone**0, n, options(GAIN | DC), result, None, None, None),
        ]:
            self.refused(f"LUMRA_{code}", "evm_measure_cf64", *arguments, says=says)
        self.assertEqual(0, result.samples)


if __name__ == "__main__":
    unittest.main()
