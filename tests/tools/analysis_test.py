# SPDX-License-Identifier: MIT
"""The figures of the program against NumPy, SciPy and what was synthesised."""
import csv
import json
import os
import pathlib
import pty
import re
import subprocess
import sys
import tempfile
import unittest
from fractions import Fraction
from math import ceil

import numpy as np
import scipy.signal

RATE, CENTRE = 1e6, 2.4e9
RANDOM = np.random.default_rng(1)


def noise(n, deviation=0.1):
    return (deviation * (RANDOM.standard_normal(n) + 1j * RANDOM.standard_normal(n))).astype(np.complex64)


def tone(n, amplitude, hertz):
    return (amplitude * np.exp(2j * np.pi * hertz / RATE * np.arange(n))).astype(np.complex64)


def db(power):
    return 10 * np.log10(power)


class Analysis(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)

    def run_program(self, line, **options):
        done = subprocess.run(
            [os.environ["LUMRA_PROGRAM"], *line.split()], cwd=self.folder, capture_output=True, check=False, **options
        )
        self.assertEqual(0, done.returncode, (line, done.stderr))
        return done.stdout

    def figures(self, line, **options):
        """The object that the program gives, or a list of several."""
        found = [json.loads(text) for text in self.run_program(line + " --json -", **options).splitlines()]
        return found[0] if len(found) == 1 else found

    def rows(self, line):
        table = list(csv.reader(self.run_program(line + " --csv -").decode().splitlines()))
        return table[0], np.array([[float(x) if x else np.nan for x in row] for row in table[1:]])

    def write(self, name, x, captures=None, **more):
        kind = "cf32_le" if np.iscomplexobj(x) else "rf32_le"
        captures = captures or [{"core:sample_start": 0, "core:frequency": CENTRE}]
        meta = {"global": {"core:datatype": kind, "core:sample_rate": RATE}, "captures": captures, **more}
        (self.folder / f"{name}.sigmf-meta").write_text(json.dumps(meta))
        (self.folder / f"{name}.sigmf-data").write_bytes(x.tobytes())

    def welch(self, x, window, n, overlap):
        name, _, beta = window.partition(":")
        name = "boxcar" if name == "none" else (name, float(beta)) if beta else name
        real = not np.iscomplexobj(x)
        f, p = scipy.signal.welch(
            x.astype(np.float64 if real else np.complex128), RATE, name, n, overlap, detrend=False,
            return_onesided=real, scaling="spectrum",
        )  # fmt: skip
        return (f, p) if real else (np.fft.fftshift(f), np.fft.fftshift(p))

    def test_spectra_are_those_of_welch(self):
        x = noise(20011)
        for samples in (x, np.ascontiguousarray(x.real)):
            self.write("x", samples)
            for window, n, percent in (("none", 64, 0), ("hann", 255, 50), ("kaiser:8.6", 100, 29), ("flattop", 4096, 75)):
                f, p = self.welch(samples, window, n, int(percent / 100 * n))
                line = f"spectrum x --window {window} --fft {n} --overlap {percent}"
                header, rows = self.rows(line + " --cal 30")
                self.assertEqual(["frequency_hz", "level_dbm"], header)
                np.testing.assert_allclose(rows[:, 0], CENTRE + f, rtol=0, atol=1e-5)
                np.testing.assert_allclose(rows[:, 1], 30 + db(p), atol=2e-3)
                found = self.figures(line)
                enbw = found["noise_bandwidth_bins"]
                self.assertAlmostEqual(db(np.sum(p) / enbw), found["total_power_db"], places=4)
                self.assertAlmostEqual(RATE / n * enbw, found["resolution_bandwidth_hz"])
                self.assertEqual((len(samples) - n) // (n - int(percent / 100 * n)) + 1, found["segments"])

    def test_options_of_spectra(self):
        x = noise(40000) + tone(40000, 0.5, 123456.7)
        self.write("x", x)
        for rbw in (100, 1234.5, 60e3):
            found = self.figures(f"spectrum x --rbw {rbw} --window hann")
            self.assertEqual(max(16, np.ceil(1.5 * RATE / rbw)), found["fft_size"])
        f, p = self.welch(x, "hann", 1000, 500)
        header, rows = self.rows("spectrum x --fft 1k --window hann --center 2400.1M --span 100k --hold")
        np.testing.assert_allclose(rows[:, 0], CENTRE + f[np.abs(f - 100e3) <= 50e3 + 1e-3])
        parts = [self.welch(x[k : k + 1000], "hann", 1000, 0)[1] for k in range(0, 39001, 500)]
        inside = np.abs(f - 100e3) <= 50e3 + 1e-3
        np.testing.assert_allclose(rows[:, 2], db(np.max(parts, 0))[inside], atol=1e-3)
        np.testing.assert_allclose(rows[:, 3], db(np.min(parts, 0))[inside], atol=2e-2)
        peak = self.figures("spectrum x")["peaks"][0]
        self.assertAlmostEqual(CENTRE + 123456.7, peak["frequency_hz"], delta=2)
        self.assertAlmostEqual(db(0.25), peak["level_db"], delta=0.03)
        low = self.figures("spectrum x --peaks 3 --center 2.3999G --span 100k")["peaks"]
        self.assertEqual(3, len(low))
        self.assertTrue(all(abs(each["frequency_hz"] - 2.3999e9) <= 50e3 for each in low))
        self.assertTrue(low[0]["level_db"] >= low[1]["level_db"] >= low[2]["level_db"])

    def test_streams_and_intervals(self):
        x = noise(10000)
        (self.folder / "x.cf32").write_bytes(x.tobytes())
        for source in ("x.cf32", "- --format cf32"):
            line = f"spectrum {source} --rate 1M --fft 64 --window none --every 3ms"
            found = self.figures(line, input=x.tobytes())
            self.assertEqual(4, len(found))
            for k, each in enumerate(found):
                part = x[3000 * k : 3000 * (k + 1)]
                _, p = self.welch(part, "none", 64, 32)
                self.assertEqual((len(part) - 64) // 32 + 1, each["segments"])
                self.assertAlmostEqual(db(np.sum(p)), each["total_power_db"], places=4)
        self.assertEqual(3, len(self.figures("spectrum x.cf32 --rate 1M --fft 1001 --every 3ms")))
        found = self.figures("waterfall - --format cf32 --rate 1M --fft 16 --rows 50", input=x.tobytes())
        self.assertTrue(50 <= found["rows"] < 100)
        self.assertAlmostEqual(10000 / RATE, found["rows"] * found["time_step_s"], delta=found["time_step_s"] + 1e-4)

    def test_threads_do_not_change_a_long_spectrum(self):
        x = np.random.default_rng(3).integers(-100, 100, 2 * 9_000_001, dtype=np.int8)
        (self.folder / "x.ci8").write_bytes(x.tobytes())
        line = "spectrum x.ci8 --rate 1M --fft 1000"
        one = self.figures(f"{line} --threads 1")
        self.assertEqual((9_000_001 - 1000) // 500 + 1, one["segments"])
        self.assertEqual(one, self.figures(f"{line} --threads 2"))
        self.assertEqual(one, self.figures("spectrum - --format ci8 --rate 1M --fft 1000", input=x.tobytes()))

    def test_captures_are_averaged_within_one_frequency(self):
        a, b, c = noise(5000), noise(8000, 0.3), noise(5000, 0.2)
        starts = [(0, 1e9), (5000, 2e9), (13000, 1e9)]
        self.write("x", np.concatenate([a, b, c]), [{"core:sample_start": s, "core:frequency": f} for s, f in starts])
        _, p = self.welch(a, "hann", 1000, 500)
        _, q = self.welch(c, "hann", 1000, 500)
        header, rows = self.rows("spectrum x --fft 1000 --window hann")
        np.testing.assert_allclose(rows[:, 1], db((p + q) / 2), atol=1e-3)
        self.assertIn(b"captures 0, 2 alone, at 1 GHz", self.run_program("spectrum x"))
        self.assertEqual(2e9, self.figures("spectrum x --capture 1")["frequency_hz"])
        self.assertIn(b"capture 1 alone", self.run_program("waterfall x --fft 64"))
        header, rows = self.rows("waterfall x --fft 64 --rows 10 --window none --overlap 0")
        self.assertEqual(0.005, rows[0, 0])
        self.assertAlmostEqual(0.000832, rows[1, 0] - rows[0, 0])
        np.testing.assert_allclose(rows[1, 1:], db(self.welch(b[832:1664], "none", 64, 0)[1]), atol=0.01)

    def test_powers_of_channels(self):
        x = noise(200000, 0.01) + tone(200000, 0.5, 100e3) + tone(200000, 0.05, -100e3)
        self.write("x", x)
        found = self.figures("power x --fft 4k --channel 2400.1M:50k --channel 2.4G:1M --adjacent 200k,600k --window hann")
        first, whole = found["channels"]
        self.assertAlmostEqual(db(0.25 + 2e-4 * 0.05), first["power_db"], delta=0.01)
        self.assertAlmostEqual(first["power_db"] - db(50e3), first["density_db_hz"])
        self.assertAlmostEqual(-20, first["adjacent"][0]["lower_dbc"], delta=0.05)
        self.assertAlmostEqual(db(2e-4 * 0.05 / 0.25), first["adjacent"][0]["upper_dbc"], delta=0.3)
        self.assertIsNone(first["adjacent"][1]["upper_dbc"])
        self.assertAlmostEqual(db(np.mean(np.abs(x) ** 2)), whole["power_db"], delta=0.01)
        self.assertAlmostEqual(100e3, found["occupied"]["high_hz"] - CENTRE, delta=1e3)
        silent = np.zeros(1000, np.complex64)
        self.write("x", silent)
        found = self.figures("power x")
        self.assertEqual([None, None], [found["channels"][0]["power_db"], found["occupied"]["low_hz"]])

    def test_tones(self):
        x = tone(100000, 0.5, 100e3) + tone(100000, 0.005, 200e3) + tone(100000, 0.0005, -100e3)
        x += noise(100000, 1e-4) + np.complex64(0.002)
        self.write("x", x)
        found = self.figures("tone x --harmonics 3")
        for key, expected, delta in (
            ("frequency_hz", CENTRE + 100e3, 0.1), ("level_db", db(0.25), 0.01), ("thd_db", -40, 0.05),
            ("image_db", -60, 0.1), ("dc_db", db(4e-6 / 0.25), 0.1), ("snr_db", db(0.25 / 2e-8), 0.1),
            ("sfdr_db", 40, 0.05), ("enob", (found["sinad_db"] - 1.76) / 6.02, 1e-9),
        ):  # fmt: skip
            self.assertAlmostEqual(expected, found[key], delta=delta, msg=key)
        self.assertEqual([2, 3], [each["order"] for each in found["harmonics"]])
        self.assertAlmostEqual(CENTRE + 200e3, self.figures("tone x --at 2400.21M")["frequency_hz"], delta=1)

    def test_levels(self):
        x = noise(30000)
        x[123] = 1.5 - 1j
        self.write("x", x)
        found = self.figures("level x --start 0.1ms")
        power = np.abs(x[100:].astype(np.complex128)) ** 2
        self.assertAlmostEqual(db(np.mean(power)), found["rms_db"], places=6)
        self.assertAlmostEqual(db(np.max(power)), found["peak_db"], places=6)
        self.assertEqual(23, found["peak_index"])
        self.assertAlmostEqual(float(np.mean(x[100:].real)), found["dc_i"], places=8)
        for each in found["ccdf"]:
            most, least = (np.mean(power > np.mean(power) * 10 ** ((each["above_db"] + d) / 10)) for d in (-0.009, 0.009))
            self.assertTrue(least <= each["probability"] <= most, each)
        self.assertEqual(0, found["ccdf"][-1]["probability"])
        header, rows = self.rows("level x --envelope")
        cell = round((rows[1, 0] - rows[0, 0]) * RATE)
        cells = np.abs(x[: len(x) // cell * cell].reshape(-1, cell).astype(np.complex128)) ** 2
        np.testing.assert_allclose(rows[: len(cells), 1], db(cells.mean(1)), atol=1e-3)
        np.testing.assert_allclose(rows[: len(cells), 2], db(cells.max(1)), atol=1e-3)
        (self.folder / "x.ci8").write_bytes(bytes([127, 0, 0, 128, 126, 129, 127, 128]))
        self.assertEqual(3, self.figures("level x.ci8 --rate 1")["clipped"])

    def test_alignment(self):
        n, delay, hertz, gain, dc = 20000, 3.25, 12.5, 0.5 * np.exp(0.3j), 0.01 - 0.02j
        fir = scipy.signal.firwin(101, 0.8)
        r = scipy.signal.lfilter(fir, 1, noise(n + 200, 0.2))[200:]
        spectrum = np.fft.fft(r) * np.exp(-2j * np.pi * np.fft.fftfreq(n) * delay)
        m = gain * np.fft.ifft(spectrum) * np.exp(2j * np.pi * hertz / RATE * np.arange(n)) + dc
        self.write("r", r.astype(np.complex64))
        self.write("m", m.astype(np.complex64))
        found = self.figures("evm --align gain,delay,frequency,dc r m")
        for key, expected, delta in (
            ("delay_samples", delay, 1e-3), ("frequency_hz", hertz, 0.01), ("gain_db", db(0.25), 1e-3),
            ("gain_phase_deg", np.degrees(0.3), 0.05), ("dc_db", db(abs(dc) ** 2), 0.01), ("evm_rms_percent", 0, 1),
        ):  # fmt: skip
            self.assertAlmostEqual(expected, found[key], delta=delta, msg=key)
        found = self.figures("evm --align r m")
        self.assertIsNotNone(found["gain_db"])
        self.assertIsNone(found["delay_samples"])

    def test_alignment_in_constant_memory(self):
        """Of a long recording, which repeats a shorter one with its delay and its carrier."""
        period, times, delay, turns = 500_000, 12, -123.4, 4321
        bins = np.fft.fft(noise(period)) * (np.abs(np.fft.fftfreq(period)) < 0.4)
        late = np.fft.ifft(bins * np.exp(-2j * np.pi * np.fft.fftfreq(period) * delay))
        measured = 0.5j * late * np.exp(2j * np.pi * turns * np.arange(period) / period) + 0.01
        for name, x in (("r", np.fft.ifft(bins)), ("m", measured)):
            self.write(name, np.tile(x.astype(np.complex64), times))
        line = "evm --align gain,delay,frequency,dc r m --json found.json"
        most = []
        for options in ("", f" --samples {period}"):
            # A small process starts the program, whose own memory does not count.
            script = "import resource as r, subprocess, sys; subprocess.run(sys.argv[1:], stdout=2, check=True); " \
                     "print(r.getrusage(r.RUSAGE_CHILDREN).ru_maxrss)"
            command = [sys.executable, "-c", script, os.environ["LUMRA_PROGRAM"], *(line + options).split()]
            # The address sanitizer keeps what is freed, 256 MB of it unless told.
            keeps_little = os.environ | {"ASAN_OPTIONS": "quarantine_size_mb=1"}
            done = subprocess.run(command, cwd=self.folder, env=keeps_little, capture_output=True, check=True)
            most.append(int(done.stdout))
            if not options:
                found = json.loads((self.folder / "found.json").read_text())
        self.assertLess(most[0], most[1] + 25_000)  # KiB; the samples alone would take four times as much
        self.assertAlmostEqual(delay, found["delay_samples"], delta=1e-6)
        self.assertAlmostEqual(turns * RATE / period, found["frequency_hz"], delta=1e-7)
        self.assertAlmostEqual(db(0.25), found["gain_db"], delta=1e-6)
        self.assertAlmostEqual(-40, found["dc_db"], delta=1e-4)

    def read(self, name):
        """Metadata and samples of a recording of cf32_le or rf32_le."""
        meta = json.loads((self.folder / f"{name}.sigmf-meta").read_text())
        kind = {"cf32_le": np.complex64, "rf32_le": np.float32}[meta["global"]["core:datatype"]]
        return meta, np.frombuffer((self.folder / f"{name}.sigmf-data").read_bytes(), kind)

    def is_tone(self, expected, y, what):
        """But for the ends, where the filter sees the recording's edges."""
        self.assertEqual(len(expected), len(y), what)
        held = min(200, len(y) // 4)
        np.testing.assert_allclose(y[held:-held], expected[held:-held], rtol=0, atol=2e-4, err_msg=str(what))

    def test_other_rates(self):
        starts, hertz, n = (0, 60000), 123456.7, 100001
        captures = [{"core:sample_start": s, "core:frequency": CENTRE + s, "core:hw": str(s)} for s in starts]
        edges = [(CENTRE - 4e5, CENTRE + 4e5), (CENTRE - 1e5, CENTRE + 1e5), (CENTRE + 4e5, CENTRE + 5e5)]
        notes = [{"core:sample_start": 59000, "core:sample_count": 2000, "core:freq_lower_edge": a, "core:freq_upper_edge": b}
                 for a, b in edges]  # fmt: skip
        x = tone(n, 0.5, hertz)
        for rate in (500e3, 307200.0, 3e6, 1e6 / 3, RATE):
            for samples in (x, np.ascontiguousarray(x.real)):
                self.write("x", samples, captures, annotations=notes)
                found = self.figures(f"resample x --to {rate!r} --output y --rejection 90")
                meta, y = self.read("y")
                ratio = Fraction(rate) / Fraction(RATE)
                ends = [ceil(length * ratio) for length in (starts[1], n - starts[1])]
                self.assertEqual((n, sum(ends), rate), (found["samples_in"], found["samples_out"], found["rate_hz"]))
                self.assertEqual(rate, meta["global"]["core:sample_rate"])
                self.assertEqual([0, ends[0]], [c["core:sample_start"] for c in meta["captures"]])
                self.assertEqual(captures[1]["core:frequency"], meta["captures"][1]["core:frequency"])
                parts = [x[s] * np.exp(2j * np.pi * hertz * np.arange(k) / rate) for s, k in zip(starts, ends)]
                for part, is_part, s in zip(parts, np.split(y, [ends[0]]), starts):
                    self.is_tone(part if np.iscomplexobj(samples) else part.real, is_part, (rate, s))
                kept = [a for a in meta["annotations"]]
                self.assertEqual(3 if rate >= 800e3 else 2, len(kept), rate)
                if rate != RATE:
                    self.assertEqual(max(edges[0][0], CENTRE - rate / 2), kept[0]["core:freq_lower_edge"])
                self.assertEqual(round(59000 * rate / RATE), kept[0]["core:sample_start"])
                self.assertAlmostEqual(2000 * rate / RATE, kept[0]["core:sample_count"], delta=2)
        self.assertLess(found["ripple_db"], 0.0101)
        (self.folder / "x.cf32").write_bytes(x.tobytes())
        for block in (1, 7001, 100001):
            self.run_program(f"resample x.cf32 --rate 1M --to 300k --output z{block} --block {block}")
        self.assertEqual(self.read("z1")[1].tobytes(), self.read("z7001")[1].tobytes())
        self.run_program("resample - --format cf32 --rate 1M --to 300k --output w --datatype ci16", input=x.tobytes())
        made = (self.folder / "w.sigmf-data").read_bytes()
        self.assertEqual(4 * len(self.read("z1")[1]), len(made))

    def test_channels(self):
        hertz = (-350e3, 150e3)
        starts, lengths = (0, 50000, 60000), (50000, 10000, 90001)
        frequencies = (CENTRE, CENTRE + 1e9, CENTRE)  # most samples have the first
        captures = [{"core:sample_start": s, "core:frequency": f} for s, f in zip(starts, frequencies)]
        n = sum(lengths)
        x = noise(n, 1e-6) + tone(n, 0.5, hertz[0]) + tone(n, 0.1, hertz[1])
        notes = [{"core:sample_start": 70000, "core:sample_count": 1000, "core:freq_lower_edge": CENTRE + 120e3,
                  "core:freq_upper_edge": CENTRE + 400e3}]  # fmt: skip
        self.write("x", x, captures, annotations=notes)
        rates = 100e3, 123456.7
        line = f"channels x --channel 2.39964G:100k --channel {CENTRE + 155e3!r}:{rates[1]!r} --output y"
        self.assertIn(b"captures 0, 2 alone", self.run_program(line))
        figures = self.figures(line)
        for k, (centre, rate, amplitude) in enumerate(zip((2.39964e9, CENTRE + 155e3), rates, (0.5, 0.1))):
            meta, y = self.read(f"y-{k + 1}")
            counts = [ceil(lengths[i] * Fraction(rate) / Fraction(RATE)) for i in (0, 2)]
            self.assertEqual((lengths[0] + lengths[2], sum(counts), rate),
                             tuple(figures[k][key] for key in ("samples_in", "samples_out", "rate_hz")))  # fmt: skip
            self.assertEqual(rate, meta["global"]["core:sample_rate"])
            self.assertEqual([(0, centre), (counts[0], centre)],
                             [(c["core:sample_start"], c["core:frequency"]) for c in meta["captures"]])  # fmt: skip
            for start, part in zip((0, 60000), np.split(y, [counts[0]])):
                first = np.exp(2j * np.pi * hertz[k] / RATE * start)
                times = np.arange(len(part)) / rate
                self.is_tone(amplitude * first * np.exp(2j * np.pi * (CENTRE + hertz[k] - centre) * times), part, centre)
            kept = meta["annotations"]
            self.assertEqual(k, len(kept))
        self.assertEqual(CENTRE + 120e3, kept[0]["core:freq_lower_edge"])
        self.assertEqual(centre + rate / 2, kept[0]["core:freq_upper_edge"])
        self.assertEqual(counts[0] + round(10000 * rate / RATE), kept[0]["core:sample_start"])
        whole = self.read("y-1")[1].tobytes()
        for more in ("--threads 1 --block 1000", "--threads 2 --block 99999"):
            self.run_program(f"{line} {more}")
            self.assertEqual(whole, self.read("y-1")[1].tobytes())

    def test_several_recordings(self):
        for name, deviation in (("a,b", 0.1), ("c", 0.2)):
            self.write(name, noise(5000, deviation))
        levels = [each["rms_db"] for each in self.figures("level a,b c")]
        self.assertAlmostEqual(6.02, levels[1] - levels[0], delta=0.2)
        table = list(csv.reader(self.run_program("power a,b c --csv -").decode().splitlines()))
        self.assertEqual([["recording"], ["a,b"], ["c"]], [row[:1] for row in table])
        self.run_program("spectrum a,b c --plot x.svg")
        svg = (self.folder / "x.svg").read_text()
        self.assertTrue(svg.count(">a,b</") >= 1 and ">c</" in svg)

    def test_pictures_say_what_they_show(self):
        name = "'it's\"a\"`id`\\n{d}_e@x%é''"
        self.write(name, tone(30000, 0.5, 100e3) + noise(30000))
        self.write("zero", np.zeros(30000, np.complex64))
        self.write("marked", noise(30000), annotations=[
            {"core:sample_start": 999, "core:sample_count": 3000, "core:label": "a <burst>"}])  # fmt: skip
        for line, says in (
            ("spectrum", "RBW"), ("spectrum --hold --fft 16k", "lowest to highest"), ("tone", "THD"),
            ("power --channel 2.4001G:100k", "99 % of the power"), ("level", "Gaussian"), ("level --envelope", "RMS"),
            ("waterfall", "ms a row"), ("spectrum --span 1", "Offset from 2.4 GHz"),
        ):  # fmt: skip
            for file, says_too in ((name, name), ("zero", "all samples are zero")):
                self.run_program(f"{line} {file} --plot x.svg")
                text = re.sub(r"<[^>]*>", "", (self.folder / "x.svg").read_text())
                for entity, character in (("&lt;", "<"), ("&gt;", ">"), ("&quot;", '"'), ("&apos;", "'"), ("&amp;", "&")):
                    text = text.replace(entity, character)
                self.assertTrue(says_too in text, (line, file))
                self.assertTrue(file != name or says in text, (line, says))
        for kind, begin, end in (("png", b"\x89PNG", b"IEND\xaeB`\x82"), ("pdf", b"%PDF", b"%%EOF\n")):
            self.run_program(f"waterfall marked --plot x.{kind}")
            picture = (self.folder / f"x.{kind}").read_bytes()
            self.assertTrue(picture.startswith(begin) and picture.endswith(end))
        self.run_program("waterfall marked --plot x.svg")
        self.assertTrue("a &lt;burst>" in (self.folder / "x.svg").read_text())

    def test_help_manual_and_completion_name_every_option(self):
        for kind, file in (("man", "lumra-spectrum.1"), ("bash", "lumra"), ("zsh", "_lumra")):
            self.run_program(f"--generate {kind} .")
            text = (self.folder / file).read_text().replace("\\-", "-")
            for option in re.findall(r"^  (--[a-z]+)", self.run_program("spectrum --help").decode(), re.M):
                self.assertIn(option, text, kind)
        for line in self.run_program("spectrum --help").decode().splitlines():
            self.assertLessEqual(len(line), 80)

    def test_terminals(self):
        self.write("x", noise(1000))
        for settings, styled in (({"TERM": "xterm"}, True), ({"TERM": "dumb"}, False), ({"TERM": "xterm", "NO_COLOR": "1"}, False)):
            master, slave = pty.openpty()
            program = [os.environ["LUMRA_PROGRAM"], "spectrum", "x"]
            environment = {k: v for k, v in os.environ.items() if k not in ("TERM", "NO_COLOR")} | settings
            subprocess.run(program, cwd=self.folder, stdout=slave, env=environment, check=True)
            os.close(slave)
            shown = os.read(master, 65536)
            os.close(master)
            self.assertEqual(styled, b"\x1b[" in shown, settings)
            self.assertLessEqual(max(len(re.sub(rb"\x1b\[\d*m", b"", line)) for line in shown.split(b"\r\n")), 80)


if __name__ == "__main__":
    unittest.main()
