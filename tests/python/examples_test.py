# SPDX-License-Identifier: MIT
"""The examples find what was put into recordings, and draw it."""
import importlib.util
import os
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest

import numpy as np

import lumra
from support import Test

root = pathlib.Path(__file__).resolve().parents[2]
examples = root / "examples" / "python"


def noise(size, power, seed=1):
    generator = np.random.default_rng(seed)
    return np.sqrt(power / 2) * (generator.standard_normal(size) + 1j * generator.standard_normal(size))


def symbols(size, per_symbol, roll_off=0.25):
    """QPSK of power 1, whose pulses leave each other alone."""
    generator = np.random.default_rng(2)
    dense = np.zeros(size * per_symbol, complex)
    dense[::per_symbol] = (generator.choice([-1, 1], size) + 1j * generator.choice([-1, 1], size)) / np.sqrt(2)
    h = lumra.root_raised_cosine(per_symbol, 1, roll_off, 20)
    return lumra.convolve(dense, lumra.convolve(h, h), "same")


class Examples(Test):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        # Pictures stay where somebody wants to look at them.
        self.folder = pathlib.Path(os.environ.get("LUMRA_PICTURES") or folder.name)

    def run_example(self, name, *arguments, **given):
        """The numbers that follow words of what it prints."""
        picture = self.folder / f"{name}.png"
        done = subprocess.run(
            [sys.executable, examples / f"{name}.py", *map(str, arguments), picture], stdout=subprocess.PIPE, timeout=100,
            check=True, env={**os.environ, "MPLBACKEND": "Agg"}, cwd=self.folder, **given)
        self.assertEqual(picture.read_bytes()[:4], b"\x89PNG")
        self.assertGreater(picture.stat().st_size, 10_000)
        self.printed = done.stdout.decode()

    def number(self, before, after=""):
        found = re.search(f"{before} *(-?[+0-9.]+){after}", self.printed)
        self.assertIsNotNone(found, self.printed)
        return float(found[1])

    def test_calibrated_spectrum(self):
        n = np.arange(500_000)
        x = 0.1 * np.exp(0.5j * np.pi * n) + noise(len(n), 1e-6)
        lumra.write(self.folder / "tone", x.astype(np.complex64), 1e6, frequency=1e8)
        self.run_example("calibrated_spectrum", "tone", -10)
        self.assertAlmostEqual(self.number("power in it:"), -30, delta=0.06)
        self.assertAlmostEqual(self.number("noise:"), -10 - 60 - 60, delta=0.3)
        self.assertAlmostEqual(self.number("peak:"), 100.25, delta=1e-4)

    def test_annotated_waterfall(self):
        x = noise(400_000, 1e-6)
        x[100_000:200_000] += 0.05 * np.exp(0.4j * np.pi * np.arange(100_000))
        marked = {"core:sample_start": 100_000, "core:sample_count": 100_000, "core:freq_lower_edge": 2.4e9 + 150e3,
                  "core:freq_upper_edge": 2.4e9 + 250e3, "core:label": "carrier"}  # fmt: skip
        lumra.write(self.folder / "marked", x, 1e6, frequency=2.4e9, datatype="ci16_le", annotations=[marked])
        self.run_example("annotated_waterfall", "marked")
        self.assertAlmostEqual(self.number("carrier:"), 100)
        self.assertAlmostEqual(self.number("MHz,"), 20 * np.log10(0.05), delta=0.02)

    def test_stream_spectrum(self):
        n = np.arange(250_000)
        x = 0.5 * np.exp(0.02j * np.pi * n) + 0.05 * np.exp(0.9j * np.pi * n)
        raw = np.round(x * 2**15).astype(np.complex128).view(np.float64).astype("<i2").tobytes()
        self.run_example("stream_spectrum", 100_000, input=raw + b"\0")
        self.assertAlmostEqual(self.number("1 s:"), 10 * np.log10(0.2525), delta=0.02)
        self.assertAlmostEqual(self.number("behind the filter: .* peak at"), 1000, delta=0.5)

    def test_burst_evm(self):
        per_symbol = 8
        reference = symbols(800, per_symbol)
        n = np.arange(len(reference))
        received = noise(30_000, 1e-8)
        received[12_345 : 12_345 + len(n)] += 0.2j * (reference + noise(len(n), 4e-4)) * np.exp(2e-3j * np.pi * n)
        lumra.write(self.folder / "reference", reference.astype(np.complex64), 1e6)
        lumra.write(self.folder / "received", received.astype(np.complex64), 1e6)
        self.run_example("burst_evm", "reference", "received", per_symbol)
        self.assertAlmostEqual(self.number("burst at"), 12.345, delta=1e-3)
        self.assertAlmostEqual(self.number("EVM"), 2, delta=0.1)
        self.assertAlmostEqual(self.number("carrier"), 1000, delta=1)

    def test_decode_video(self):
        rate, seconds = 10_000_000, 0.02
        line = np.arange(int(rate * seconds)) * (4.5e6 / 286 / rate)
        across = (line % 1) * 286 / 4.5  # microseconds
        picture = 100 * (across - 10.9) / 52.6 * ((line // 64) % 2 + 0.3)
        units = np.where(across < 4.7, -40, np.where((across < 10.9) | (across > 62), 0, picture))
        x = 0.5 * np.exp(2j * np.pi * np.cumsum(units * 20e3 - 5e5) / rate) + noise(len(line), 1e-4)
        lumra.write(self.folder / "video", x.astype(np.complex64), rate)
        real = os.environ.get("LUMRA_VIDEO_RECORDING")
        if real:
            self.run_example("decode_video", real)
            self.assertGreater(self.number("", " lines"), 700)
            os.replace(self.folder / "decode_video.png", self.folder / "real_video.png")
        self.run_example("decode_video", "video")
        self.assertAlmostEqual(self.number("pulse", " kHz"), 800, delta=20)
        self.assertAlmostEqual(self.number("lines, |us, "), seconds * 4.5e6 / 286 / 262.5, delta=0.01)

    def test_what_the_documentation_shows(self):
        """Blocks of a page follow each other."""
        x = 0.1 * np.exp(0.01j * np.pi * np.arange(100_000)) + noise(100_000, 1e-6)
        lumra.write(self.folder / "recording", x.astype(np.complex64), 1e6, frequency=2.4e9)
        for page in root / "README.md", root / "docs" / "python.md":
            with self.subTest(page.name):
                program = "\n".join(re.findall("```python\n(.*?)```", page.read_text(), re.S))
                done = subprocess.run([sys.executable, "-c", program], stdout=subprocess.PIPE, check=True, cwd=self.folder,
                                      env={**os.environ, "MPLBACKEND": "Agg"})  # fmt: skip
                if page.name == "README.md":
                    self.assertEqual(done.stdout.decode(), "-20.00 dBFS in 100 kHz around 2400.0 MHz\n")
                self.assertGreater((self.folder / "spectrum.png").stat().st_size, 10_000)
                os.replace(self.folder / "spectrum.png", self.folder / f"{page.stem}.png")

    @unittest.skipUnless(importlib.util.find_spec("distributed"), "without Dask")
    def test_cluster_survey(self):
        recordings = self.folder / "recordings"
        recordings.mkdir(exist_ok=True)
        for number in range(3):
            tone = 10 ** (-number / 20) * np.exp(0.1j * np.pi * (number + 1) * np.arange(100_000))
            lumra.write(recordings / f"r{number}", (tone + noise(len(tone), 1e-6)).astype(np.complex64), 1e6)
        self.run_example("cluster_survey", recordings)
        for number in range(3):
            self.assertAlmostEqual(self.number(f"r{number}:"), -number, delta=0.01)


if __name__ == "__main__":
    unittest.main()
