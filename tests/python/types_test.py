# SPDX-License-Identifier: MIT
"""What type checkers are told: the stub beside the package, and its uses, right and wrong."""
import os
import pathlib
import subprocess
import sys
import tempfile
import unittest

import lumra

# What the checker of this age cannot reconcile: cached properties, what dataclasses add, and the private modules.
_allowed = r"""
lumra\._.*
lumra\.\w+\.(captures|annotations|frequency|level|density|__post_init__)
"""
_uses = """
import lumra
import numpy as np

recording = lumra.Recording("file", datatype="ci16_le", sample_rate=1e6)
spectrum = lumra.spectrum(recording[100:200], recording.sample_rate, nfft=16, window=("kaiser", 8.0))
power: float = spectrum.channel_power(0.0, 1e3) + spectrum.power.sum() + spectrum.peaks(3)[0].frequency
estimator = lumra.SpectrumEstimator(1e6).add([1, 2]).merge(lumra.SpectrumEstimator(start=2))
y = lumra.lfilter([1], [1, -0.5], np.ones(3))
z, state = lumra.lfilter([1], [1, -0.5], y, zi=[0.0])
levels = lumra.level(y).rms_dbfs + lumra.waterfall(y, nfft=16).level
later = lumra.level(y, compute=False).compute()
parts = [part.real for part in lumra.Channelizer(1.0, [(0.1, 0.2)])(z)]
error = lumra.evm(y, y, align=["gain", "dc"]).gain.real
lumra.spectrum(y, nfft="many")  # type: ignore[call-overload]
lumra.fft(y, norm="none")  # type: ignore[arg-type]
spectrum.power = y  # type: ignore[misc]
lumra.evm(y, y).percent  # type: ignore[attr-defined]
lumra.lfilter([1], [1, -0.5], y).unpacked, lumra.Recording(3)  # type: ignore[arg-type,attr-defined]
"""


class Types(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)

    def check(self, *arguments):
        package = str(pathlib.Path(lumra.__file__).parents[1])
        run = subprocess.run([sys.executable, "-m", *arguments], cwd=self.folder, capture_output=True, text=True,
                             env={**os.environ, "MYPYPATH": package, "PYTHONPATH": package})  # fmt: skip
        self.assertEqual(run.returncode, 0, run.stdout + run.stderr)

    def test_the_stub_is_complete_and_right(self):
        (self.folder / "allowed").write_text(_allowed)
        (self.folder / "settings").write_text("[mypy]\nignore_missing_imports = True\n")  # of optional packages
        self.check("mypy.stubtest", "lumra", "--mypy-config-file", "settings", "--allowlist", "allowed",
                   "--ignore-unused-allowlist")  # fmt: skip

    def test_uses(self):
        (self.folder / "uses.py").write_text(_uses)
        self.check("mypy", "--strict", "--warn-unused-ignores", "uses.py")


if __name__ == "__main__":
    unittest.main()
