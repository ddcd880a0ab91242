# SPDX-License-Identifier: MIT
"""Recordings of every kind, read, written and analysed; the documentation's examples."""
import datetime
import doctest
import io
import itertools
import json
import os
import pathlib
import pickle
import sys
import tarfile
import tempfile
import unittest
import wave

import numpy as np

import lumra
from support import Test, noise

integers = {"i8": np.int8, "u8": np.uint8, "i16": np.int16, "u16": np.uint16, "i32": np.int32, "u32": np.uint32}


def scaled(x, dtype):
    """Full scale is 1."""
    if x.dtype.kind == "f":
        return x.astype(dtype)
    half = np.iinfo(x.dtype).max / 2
    return ((x - half) / half if x.dtype.kind == "u" else x / (np.iinfo(x.dtype).max + 1.0)).astype(dtype)


class Folder(Test):
    def setUp(self):
        self._folder = tempfile.TemporaryDirectory()
        self.addCleanup(self._folder.cleanup)
        self.folder = pathlib.Path(self._folder.name)

    def pair(self, x, captures, annotations=(), name="r", **about):
        metadata = {
            "global": {"core:datatype": "cf32_le", "core:sample_rate": 1000, "core:version": "1.2.0", **about},
            "captures": captures, "annotations": list(annotations),
        }  # fmt: skip
        (self.folder / f"{name}.sigmf-data").write_bytes(x.tobytes())
        (self.folder / f"{name}.sigmf-meta").write_text(json.dumps(metadata))
        return self.folder / name


class Reading(Folder):
    def test_raw_files_of_every_type(self):
        generator = np.random.default_rng(1)
        for (name, dtype), order, kind in itertools.product([*integers.items(), ("f32", np.float32), ("f64", np.float64)], "<>", "cr"):
            raw = generator.standard_normal(40).astype(dtype) if dtype in (np.float32, np.float64) else generator.integers(
                np.iinfo(dtype).min, np.iinfo(dtype).max, 40, dtype, True)
            path = self.folder / "raw.bin"
            path.write_bytes(raw.astype(np.dtype(dtype).newbyteorder(order)).tobytes())
            datatype = kind + name + ("_le" if order == "<" else "_be") * (name[1:] != "8")
            found = lumra.Recording(path, datatype=datatype, sample_rate=5.0, frequency=7)
            values = scaled(raw, np.float32)
            wanted = values.view(np.complex64) if kind == "c" else values
            with self.subTest(datatype=datatype):
                self.assertEqual(found.read().tobytes(), wanted.tobytes())
                self.assertEqual((found.dtype, found.samples, len(found)), (wanted.dtype, len(wanted), len(wanted)))
                self.assertEqual((found.sample_rate, found.frequency, found.duration), (5, 7, len(wanted) / 5))
                self.assertEqual((found.datatype, found.channels, found.metadata), (datatype, 1, {}))

    def test_what_slices_give(self):
        x = noise(50, np.complex64)
        found = lumra.Recording(self.pair(x, [{"core:sample_start": 0}]))
        for key in (slice(None), slice(3, 9), slice(-5, None), slice(5, 2), slice(-99, 99), slice(60, 70), slice(0, 7, 1)):
            self.assertEqual(found[key].tobytes(), x[key].tobytes())
        self.assertEqual((found[3], found[-1]), (x[3], x[-1]))
        out = np.zeros(20, np.complex64)[::2]
        self.assertIs(found.read(5, out=out), out)
        self.assertEqual(out.tobytes(), x[5:15].tobytes())
        self.assertEqual([len(block) for block in found.blocks(20)], [20, 20, 10])
        self.assertEqual(np.concatenate(list(found.blocks(7))).tobytes(), x.tobytes())
        self.assertEqual(np.asarray(found).tobytes(), x.tobytes())
        self.assertEqual(pickle.loads(pickle.dumps(found))[:].tobytes(), x.tobytes())

    def test_containers(self):
        x = (noise(60, np.complex64) / 8).astype(np.complex64)
        stem = self.pair(x, [{"core:sample_start": 0, "core:frequency": 1e9}])
        archive = self.folder / "a.sigmf"
        with tarfile.open(archive, "w") as tar:
            for suffix in (".sigmf-meta", ".sigmf-data"):
                tar.add(f"{stem}{suffix}", f"r/r{suffix}")
        for path in (stem, str(stem) + ".sigmf-meta", str(stem) + ".sigmf-data", archive, os.fsencode(stem)):
            found = lumra.Recording(path)
            self.assertEqual((found.frequency, found[:].tobytes()), (1e9, x.tobytes()))
        with wave.open(str(self.folder / "w.wav"), "wb") as file:
            file.setnchannels(2), file.setsampwidth(2), file.setframerate(8000)
            file.writeframes(np.arange(-6, 6, dtype="<i2").tobytes())
        self.assertEqual(lumra.Recording(self.folder / "w.wav")[:].tobytes(), (np.arange(-6, 6, dtype="f") / 2**15).tobytes())

    def test_captures_annotations_channels(self):
        x = noise(300, np.complex64).reshape(-1, 2)
        captures = [{"core:sample_start": 0, "core:frequency": 1e6, "core:datetime": "2024-05-06T07:08:09.5Z"},
                    {"core:sample_start": 100, "core:frequency": 2e6}]  # fmt: skip
        marks = [{"core:sample_start": 120, "core:sample_count": 9, "core:label": "burst", "own:field": 1}]
        stem = self.pair(x, captures, marks, **{"core:num_channels": 2})
        found = lumra.Recording(stem, channel=1)
        self.assertEqual((found.channels, found.frequency, found[:].tobytes()), (2, None, x[:, 1].tobytes()))
        when = datetime.datetime(2024, 5, 6, 7, 8, 9, 500000, datetime.timezone.utc)
        self.assertEqual(found.captures, ((0, 100, 1e6, when), (100, 50, 2e6, None)))
        self.assertEqual(found.annotations, (marks[0],))
        self.assertEqual(found.metadata["annotations"], marks)
        second = lumra.Recording(stem, capture=1)
        self.assertEqual((second.samples, second.frequency, second[0]), (50, 2e6, x[100, 0]))
        mark = second.annotations[0]
        self.assertEqual((mark.start, mark.samples, mark.label, mark.comment, mark.low), (20, 9, "burst", "", None))
        self.assertEqual(second.captures, ((0, 50, 2e6, None),))

    def test_analyses_end_segments_at_captures(self):
        x = noise(5000, np.complex64)
        second = "core:datetime"
        for continues, captures in [
            (True, [{second: "2024-01-01T00:00:00Z"}, {second: "2024-01-01T00:00:02.5Z"}]),
            (False, [{second: "2024-01-01T00:00:00Z"}, {second: "2024-01-01T00:00:03Z"}]),
            (False, [{}, {}]),
        ]:  # fmt: skip
            captures = [{"core:sample_start": 2500 * k, "core:frequency": 5e6, **each} for k, each in enumerate(captures)]
            found = lumra.Recording(self.pair(x, captures))
            whole = lumra.SpectrumEstimator(1000, nfft=128, frequency=5e6).add(x[:2500])
            whole = (whole if continues else whole.gap()).add(x[2500:]).result()
            ours = lumra.spectrum(found, nfft=128)
            self.assertEqual((ours.power.tobytes(), ours.segments), (whole.power.tobytes(), whole.segments))
            self.assertEqual((ours.sample_rate, ours.frequency.tobytes()), (1000, whole.frequency.tobytes()))
            first, last = (lumra.waterfall(found, nfft=128, rows=rows) for rows in (1, 7))
            self.assertLess(np.abs(first.power[0] / lumra.spectrum(found, nfft=128, window="hann").power - 1).max(), 1e-12)
            per_row = -(-ours.segments // 7)
            firsts = range(0, 4873, 64) if continues else [*range(0, 2373, 64), *range(2500, 4873, 64)]
            self.assertEqual(list(np.round(last.time * 1000)), list(firsts)[::per_row])
        self.assertEqual(lumra.level(found), lumra.level(x))
        self.assertEqual(lumra.evm(found, x, align=["frequency"]), lumra.evm(x, x, align=["frequency"], sample_rate=1000))
        self.assertLess(np.abs(lumra.ccdf(found, [0, 3]) - lumra.ccdf(x, [0, 3])).max(), 0.002)


class Writing(Folder):
    def test_what_was_written_is_read(self):
        for dtype, datatype in [("F", None), ("D", None), ("f", None), ("d", None), ("F", "ci16_le"), ("f", "ru8"), ("f", "cf32_be")]:
            x = (noise(1000, dtype) / 8)[::-1]
            lumra.write(self.folder / "w", x, 2.5e6, frequency=1e9, datatype=datatype, description="noise",
                        annotations=[{"core:sample_start": 7, "core:label": "seven"}])  # fmt: skip
            found = lumra.Recording(self.folder / "w.sigmf-meta")
            rounding = {"ci16_le": 2**-16, "ru8": 1 / 255}.get(datatype, 0)
            with self.subTest(dtype=dtype, datatype=datatype):
                single = x.astype("F" if found.dtype.kind == "c" else "f")
                self.assertLessEqual(np.abs(found[:] - single).max(), rounding * 1.42 + 1e-7 * (rounding > 0))
                self.assertEqual((found.sample_rate, found.frequency), (2.5e6, 1e9))
                self.assertEqual((found.annotations[0].start, found.annotations[0].label), (7, "seven"))
                self.assertEqual(found.metadata["global"]["core:description"], "noise")
                self.assertEqual(found.datatype, datatype or {"F": "cf32_le", "D": "cf64_le", "f": "rf32_le", "d": "rf64_le"}[dtype])

    def test_both_files_or_none(self):
        path = self.folder / "w"
        (self.folder / "w.sigmf-meta").mkdir()
        for arguments, kind in [(([np.nan], 1), ValueError), (([1], 1), lumra.Error)]:
            with self.assertRaises(kind):
                lumra.write(path, *arguments)
            self.assertEqual(os.listdir(self.folder), ["w.sigmf-meta"])


class Refusals(Folder):
    def test_each_names_argument_and_value(self):
        x = noise(10, np.complex64)
        good = lumra.Recording(self.pair(x, [{"core:sample_start": 0}]))
        raw = self.folder / "raw.iq"
        raw.write_bytes(bytes(10))
        (self.folder / "bad.sigmf-meta").write_text("{")
        (self.folder / "bad.sigmf-data").write_bytes(b"")
        for kind, words, call, arguments, named in [
            (TypeError, "path is 3", lumra.Recording, [3], {}),
            (ValueError, "path is ''", lumra.Recording, [""], {}),
            (ValueError, "path is 'a\\x00b'", lumra.Recording, ["a\0b"], {}),
            (lumra.Error, "none", lumra.Recording, [self.folder / "none"], dict(datatype="cf32", sample_rate=1)),
            (lumra.Error, "bad", lumra.Recording, [self.folder / "bad"], {}),
            (lumra.Error, "raw.iq & 8 bytes each", lumra.Recording, [raw], dict(datatype="cf32", sample_rate=1)),
            (ValueError, "datatype=", lumra.Recording, [raw], {}),
            (ValueError, "sample_rate=", lumra.Recording, [raw], dict(datatype="cf32")),
            (ValueError, "datatype is 'cf33'", lumra.Recording, [raw], dict(datatype="cf33")),
            (TypeError, "datatype is 3", lumra.Recording, [raw], dict(datatype=3)),
            (ValueError, "sample_rate is -1", lumra.Recording, [raw], dict(sample_rate=-1)),
            (ValueError, "frequency is inf", lumra.Recording, [raw], dict(frequency=np.inf)),
            (ValueError, "capture is 1 & has 1", lumra.Recording, [good.path], dict(capture=1)),
            (ValueError, "capture is -1", lumra.Recording, [good.path], dict(capture=-1)),
            (ValueError, "channel is 1 & has 1", lumra.Recording, [good.path], dict(channel=1)),
            (ValueError, "step", good.__getitem__, [slice(0, 5, 2)], {}),
            (TypeError, "index is 'a'", good.__getitem__, ["a"], {}),
            (IndexError, "index is 10", good.__getitem__, [10], {}),
            (ValueError, "start is 11", good.read, [11], {}),
            (ValueError, "count is 6", good.read, [5, 6], {}),
            (ValueError, "out is of shape (4,) & (3,)", good.read, [0, 3, np.zeros(4, "F")], {}),
            (TypeError, "out is of dtype complex128", good.read, [0, 3, np.zeros(3, "D")], {}),
            (ValueError, "count is 0", good.blocks, [0], {}),
            (ValueError, "nfft is 16 & 10", lumra.spectrum, [good], dict(nfft=16)),
            (ValueError, "sample_rate is 0", lumra.write, [self.folder / "w", x, 0], {}),
            (TypeError, "path is 3", lumra.write, [3, x, 1], {}),
            (ValueError, "x is of shape (1, 10)", lumra.write, [self.folder / "w", x[None], 1], {}),
            (ValueError, "x[1] is not finite", lumra.write, [self.folder / "w", [0, np.inf], 1], {}),
            (ValueError, "datatype is 'rf32 & complex64", lumra.write, [self.folder / "w", x, 1], dict(datatype="rf32")),
            (ValueError, "annotations holds {}", lumra.write, [self.folder / "w", x, 1], dict(annotations=[{}])),
            (lumra.Error, "none", lumra.write, [self.folder / "none" / "w", x, 1], {}),
        ]:  # fmt: skip
            self.refused(kind, words, call, *arguments, **named)

    def test_a_file_that_changed(self):
        found = lumra.Recording(self.pair(noise(1000, "F"), [{"core:sample_start": 0}]))
        os.truncate(self.folder / "r.sigmf-data", 100)
        for work in (found.read, lambda: lumra.level(found), lambda: lumra.spectrum(found, nfft=16), lambda: list(found.blocks(99))):
            with self.assertRaisesRegex(lumra.Error, "shorter"):
                work()


class Examples(Folder):
    def test_they_run(self):
        here = os.getcwd()
        self.addCleanup(os.chdir, here)
        os.chdir(self.folder)
        found, runner = [], doctest.DocTestRunner()
        for name in lumra.__all__:
            one = getattr(lumra, name)
            found += doctest.DocTestFinder(recurse=True).find(one, f"lumra.{name}", module=False, globs={})
        report = io.StringIO()
        for each in found:
            runner.run(each, out=report.write)
        self.assertEqual(runner.failures, 0, report.getvalue())
        without = [name for name in lumra.__all__ if callable(getattr(lumra, name)) and not getattr(lumra, name).__doc__]
        self.assertEqual(without, [])
        self.assertGreater(runner.tries, 60)


if __name__ == "__main__":
    sys.exit(unittest.main())
