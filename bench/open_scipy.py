# SPDX-License-Identifier: MIT
"""The open interface beside SciPy on the same arrays, in one process and turn by turn (names: operation/who/size).

LUMRA_LIBRARY names the library; scripts/bench runs it.
"""
import pathlib
import sys

import numpy as np
import scipy.signal

from turns import Turns

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "tests" / "open"))
import open as lumra  # noqa: E402


def beside(turns, name, samples, ours, scipys, size=""):
    turns.beside(samples, {f"{name}/lumra{size}": ours, f"{name}/scipy{size}": scipys})


def convolutions(turns):
    for kind in ("f32", "cf32"):
        for nx in (1000, 10_000, 100_000, 1_000_000):
            for ny in (16, 50, 300, 1000, 5000):
                x, y = lumra.noise(nx, lumra.types[kind]), lumra.noise(ny, lumra.types[kind])
                out = np.empty(nx + ny - 1, x.dtype)
                ours = lambda: lumra.call(f"convolve_{kind}", x, nx, y, ny, 0, 0, out, len(out))
                beside(turns, f"convolve_{kind}", nx, ours, lambda: scipy.signal.oaconvolve(x, y), f"/{nx}x{ny}")


def filters(turns):
    b, a = scipy.signal.butter(4, 0.4)
    for kind in ("f32", "cf32"):
        x = lumra.noise(16384, lumra.types[kind])
        out = np.empty_like(x)
        narrow = b.astype(np.float32), a.astype(np.float32)
        options = lumra.record("iir", type=lumra.type_code(kind))
        iir = lumra.make("iir_create", options, b, len(b), a, len(a))
        ours = lambda: lumra.call("iir_process", iir, x, out, len(x))
        beside(turns, f"iir_{kind}", len(x), ours, lambda: scipy.signal.lfilter(*narrow, x))
        for count in (16, 64, 1000):
            h = lumra.noise(count, lumra.types["f32"])
            fir = lumra.make("fir_create", lumra.record("fir", type=lumra.type_code(kind)), h, count)
            ours = lambda: lumra.call("fir_process", fir, x, out, len(x))
            beside(turns, f"fir_{kind}", len(x), ours, lambda: scipy.signal.lfilter(h, np.float32(1), x), f"/{count}")


def windows(turns):
    n = 65536
    out = np.empty(n)
    for name, kind in (("hann", "HANN"), ("flattop", "SESSION_FLAT_TOP"), ("kaiser", "KAISER")):
        shape = lumra.constants[f"LUMRA_WINDOW_{kind}"], 8.6 if name == "kaiser" else 0.0
        named = (name, 8.6) if name == "kaiser" else name
        ours = lambda: lumra.call("window_make_f64", *shape, lumra.constants["LUMRA_PERIODIC"], out, n)
        beside(turns, f"window_{name}", n, ours, lambda: scipy.signal.get_window(named, n))


if __name__ == "__main__":
    with Turns(__doc__) as turns:
        filters(turns)
        windows(turns)
        convolutions(turns)
