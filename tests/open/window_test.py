# SPDX-License-Identifier: MIT
"""Windows against SciPy's."""
import ctypes
import unittest

import numpy as np
import open as lumra
import scipy.signal

SCIPY = {
    "boxcar": "boxcar", "hann": "hann", "hamming": "hamming", "blackman": "blackman", "nuttall": "nuttall",
    "blackmanharris": "blackmanharris", "flattop": "flattop", "kaiser:8.6": ("kaiser", 8.6), "kaiser": ("kaiser", 0),
}  # fmt: skip


def find(name):
    kind, parameter = ctypes.c_int32(), ctypes.c_double()
    lumra.call("window_by_name", name.encode(), kind, parameter)
    return kind.value, parameter.value


class Window(lumra.Test):
    def test_values_and_figures(self):
        for name, peer in SCIPY.items():
            kind, parameter = find(name)
            for span, n in ((s, n) for s in (0, 1) for n in (1, 3, 4, 63, 64, 1000)):
                w = scipy.signal.get_window(peer, n, fftbins=span == 0)
                for suffix, dtype, tolerance in (("f32", np.float32, 1e-7), ("f64", np.float64, 1e-8)):
                    out = lumra.odd(np.full(n, -1, dtype))
                    lumra.call(f"window_make_{suffix}", kind, parameter, span, out, n)
                    self.close(w, out, tolerance, (name, span, n))
                figures = lumra.record("window_quality")
                lumra.call("window_figures", kind, parameter, span, n, figures)
                tone = np.abs(np.sum(w * np.exp(1j * np.pi * np.arange(n) / n))) / np.sum(w)
                for expected, actual in (
                    (np.mean(w), figures.coherent_gain),
                    (n * np.sum(w**2) / np.sum(w) ** 2, figures.noise_bandwidth_bins),
                    (-20 * np.log10(tone), figures.scalloping_loss_db),
                ):
                    self.assertAlmostEqual(expected, actual, delta=1e-6 * (1 + abs(expected)), msg=(name, span, n))

    def test_refusals(self):
        out, kaiser = np.zeros(4), lumra.constants["LUMRA_WINDOW_KAISER"]
        for code, arguments in (
            ("LUMRA_UNKNOWN_CHOICE", (-1, 0.0, 0, out, 4)),
            ("LUMRA_UNKNOWN_CHOICE", (1, 0.0, 2, out, 4)),
            ("LUMRA_OUT_OF_RANGE", (kaiser, np.nan, 0, out, 4)),
            ("LUMRA_OUT_OF_RANGE", (kaiser, 701.0, 0, out, 4)),
            ("LUMRA_OUT_OF_RANGE", (1, 0.0, 0, out, 2**64 - 1)),
            ("LUMRA_NULL_ARGUMENT", (1, 0.0, 0, None, 4)),
        ):
            self.refused(code, "window_make_f64", *arguments)
        self.refused("LUMRA_UNKNOWN_CHOICE", "window_by_name", b"kaiser:x", ctypes.c_int32(), None)


if __name__ == "__main__":
    unittest.main()
