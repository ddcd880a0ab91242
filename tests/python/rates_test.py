# SPDX-License-Identifier: MIT
"""Records and streams at other rates, and channels, beside tones whose samples are known at any time."""
import copy
import itertools
import pickle
import unittest
from fractions import Fraction

import numpy as np

import lumra
from support import Test, dtypes, forms, noise


def tone(frequency, count, rate, dtype):
    phase = 2 * np.pi * frequency * np.arange(count) / float(rate) + 0.3
    return (np.exp(1j * phase) if np.dtype(dtype).kind == "c" else np.cos(phase)).astype(dtype)


def joined(stream, x, edges):
    """The stream's blocks, with another copy of it in between."""
    blocks = []
    for part in np.split(x, edges):
        blocks.append(stream(part))
        stream = copy.deepcopy(pickle.loads(pickle.dumps(stream)))
    blocks.append(stream.flush())
    return blocks


class Rates(Test):
    def test_samples_lie_where_they_should(self):
        ratios = [(3, 2), (44100, 48000), (10e6, 3e6), (1.0, 1.37), (Fraction(1, 3), 0.1), (np.int32(5), 5), (1e6, 1e3)]
        for (rate_in, rate_out), dtype in itertools.product(ratios, dtypes):
            n = 20_000 if rate_in < 1e6 * rate_out / 1e4 else 300_000
            exact = Fraction(float(rate_out) if isinstance(rate_out, float) else rate_out) / Fraction(
                int(rate_in) if isinstance(rate_in, np.int32) else rate_in)
            frequency = 0.4 * min(float(rate_in), float(rate_out))
            x = tone(frequency, n, rate_in, dtype)
            found = lumra.resample(x, rate_in, rate_out)
            with self.subTest(rates=(rate_in, rate_out), dtype=dtype):
                self.assertEqual((len(found), found.dtype), (-(-n * exact.numerator // exact.denominator), dtype))
                middle = slice(len(found) // 4, 3 * len(found) // 4)
                error = np.abs(found - tone(frequency, len(found), float(Fraction(rate_in) * exact) if not isinstance(rate_in, np.int32) else 5, dtype))
                self.assertLess(error[middle].max(), 1.3e-3)  # 0.01 dB
                beyond = tone(0.55 * float(rate_out), n, rate_in, dtype)
                if rate_out < 0.9 * rate_in:
                    self.assertLess(np.abs(lumra.resample(beyond, rate_in, rate_out))[middle].max(), 2e-5)

    def test_any_axis_form_and_cut(self):
        for dtype, (form, make) in itertools.product((np.float32, np.complex128), forms.items()):
            x = noise((3, 400, 2), dtype)
            with self.subTest(dtype=dtype, form=form):
                found = lumra.resample(make(x), 7, 3, axis=1)
                rows = [[lumra.resample(x[i, :, j], 7, 3) for j in range(2)] for i in range(3)]
                self.assertEqual(found.tobytes(), np.moveaxis(np.array(rows), -1, 1).tobytes())
                parts = joined(lumra.Resampler(7, 3, dtype=dtype), make(x)[0, :, 0], [0, 1, 50, 399])
                self.assertEqual(np.concatenate(parts).tobytes(), rows[0][0].tobytes())
        self.assertEqual(lumra.resample(np.zeros((2, 0)), 3, 2).shape, (2, 0))
        self.assertEqual(lumra.resample([1, 2, 3], 1, 1).tolist(), [1, 2, 3])

    def test_channels(self):
        rate, wanted = 1e6, [(100e3, 62.5e3), (-300e3, 48e3), (12345.6, 1e4)]
        n = np.arange(200_000)
        offsets = [3e3, -5e3, 1e3]
        x = sum(np.exp(2j * np.pi * (center + offset) * n / rate) for (center, _), offset in zip(wanted, offsets))
        for dtype in (np.complex64, np.complex128):
            split = lumra.Channelizer(rate, wanted)
            parts = joined(split, x.astype(dtype), [1000, 1000, 150_000])
            whole = joined(lumra.Channelizer(rate, wanted), x.astype(dtype), [])
            for k, ((_, channel_rate), offset) in enumerate(zip(wanted, offsets)):
                found = np.concatenate([block[k] for block in parts])
                count = -(-200_000 * Fraction(channel_rate) // Fraction(rate))
                self.assertEqual((len(found), found.dtype), (count, dtype))
                self.assertEqual(found.tobytes(), np.concatenate([block[k] for block in whole]).tobytes())
                error = np.abs(found - np.exp(2j * np.pi * offset * np.arange(count) / channel_rate))
                self.assertLess(error[count // 4 : 3 * count // 4].max(), 1.5e-3)
        real = lumra.Channelizer(rate, wanted)
        self.assertEqual([part.dtype for part in real(x.real.astype("f"))], [np.complex64] * 3)
        real.reset()
        self.assertEqual([part.dtype for part in real(x.real)], [np.complex128] * 3)


class Refusals(Test):
    def test_each_names_argument_and_value(self):
        x, stream = np.zeros(9), lumra.Resampler(3, 2)
        split = lumra.Channelizer(1.0, [(0, 0.5)])
        split(np.zeros(3, np.complex64))
        for kind, words, call, arguments, named in [
            (TypeError, "rate_in is '1'", lumra.resample, [x, "1", 1], {}),
            (ValueError, "rate_out is 0", lumra.resample, [x, 1, 0], {}),
            (ValueError, "rate_in is nan", lumra.Resampler, [np.nan, 1], {}),
            (ValueError, "rate_in is 1 & 10000000000", lumra.resample, [x, 1, 10**10], {}),
            (ValueError, "rate_in is Fraction", lumra.resample, [x, Fraction(3**50, 7**49), 1.0], {}),
            (ValueError, "passband is 1", lumra.resample, [x, 3, 2], dict(passband=1)),
            (ValueError, "rejection is 30", lumra.resample, [x, 3, 2], dict(rejection=30)),
            (ValueError, "rejection is 130", lumra.Resampler, [3, 2], dict(rejection=130)),
            (TypeError, "passband is None", lumra.Resampler, [3, 2], dict(passband=None)),
            (ValueError, "axis is 1", lumra.resample, [x, 3, 2], dict(axis=1)),
            (TypeError, "axis is 0.5", lumra.resample, [x, 3, 2], dict(axis=0.5)),
            (TypeError, "dtype is", lumra.Resampler, [3, 2], dict(dtype=int)),
            (TypeError, "x is of dtype float64 & complex64", stream, [x], {}),
            (TypeError, "channels is 3", lumra.Channelizer, [1.0, 3], {}),
            (TypeError, "channels is [1, 2]", lumra.Channelizer, [1.0, [1, 2]], {}),
            (ValueError, "", lumra.Channelizer, [1.0, []], {}),
            (ValueError, "rate", lumra.Channelizer, [1.0, [(0, 2)]], {}),
            (ValueError, "center", lumra.Channelizer, [1.0, [(np.nan, 0.1)]], {}),
            (ValueError, "rejection is 10", lumra.Channelizer, [1.0, [(0, 0.1)]], dict(rejection=10)),
            (TypeError, "x is of dtype float64 & complex64", split, [x], {}),
        ]:  # fmt: skip
            self.refused(kind, words, call, *arguments, **named)


if __name__ == "__main__":
    unittest.main()
