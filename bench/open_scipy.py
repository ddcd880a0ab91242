# SPDX-License-Identifier: MIT
"""The open interface beside SciPy on the same arrays, in one process and turn by turn: how many times as fast it is.

LUMRA_LIBRARY names the library; scripts/bench runs it. Times are the processor's, the best of several turns.
"""
import pathlib
import sys
import time

import numpy as np
import scipy.signal

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "tests" / "open"))
import open as lumra  # noqa: E402


def best(works, seconds=0.4):
    """Seconds that each work takes once: the least of many turns, in which one follows the other."""
    least = [np.inf] * len(works)
    end = time.perf_counter() + seconds
    turns = 0
    while turns < 5 or time.perf_counter() < end:
        for k, work in enumerate(works):
            start = time.process_time_ns()
            work()
            least[k] = min(least[k], (time.process_time_ns() - start) * 1e-9)
        turns += 1
    return least


def report(name, samples, ours, scipys):
    """Calls are repeated until they take long enough for the clock."""
    repeat = max(1, 200_000 // samples)
    a, b = best([lambda: [ours() for _ in range(repeat)], lambda: [scipys() for _ in range(repeat)]])
    print(f"{name}: {samples * repeat / a / 1e6:.0f} Msamples/s, {b / a:.1f} of SciPy", flush=True)


def convolutions():
    for kind in ("f32", "cf32"):
        for nx in (1000, 10_000, 100_000, 1_000_000):
            for ny in (16, 50, 300, 1000, 5000):
                x, y = lumra.noise(nx, lumra.types[kind]), lumra.noise(ny, lumra.types[kind])
                out = np.empty(nx + ny - 1, x.dtype)
                ours = lambda: lumra.call(f"convolve_{kind}", x, nx, y, ny, 0, 0, out, len(out))
                report(f"convolve {kind} {nx} x {ny}", nx, ours, lambda: scipy.signal.oaconvolve(x, y))


def filters():
    b, a = scipy.signal.butter(4, 0.4)
    for kind in ("f32", "cf32"):
        x = lumra.noise(16384, lumra.types[kind])
        out = np.empty_like(x)
        narrow = b.astype(np.float32), a.astype(np.float32)
        options = lumra.record("iir", type=lumra.type_code(kind))
        iir = lumra.make("iir_create", options, b, len(b), a, len(a))
        ours = lambda: lumra.call("iir_process", iir, x, out, len(x))
        report(f"IIR of order 4, {kind}", len(x), ours, lambda: scipy.signal.lfilter(*narrow, x))
        for count in (16, 64, 1000):
            h = lumra.noise(count, lumra.types["f32"])
            fir = lumra.make("fir_create", lumra.record("fir", type=lumra.type_code(kind)), h, count)
            ours = lambda: lumra.call("fir_process", fir, x, out, len(x))
            report(f"FIR of {count} taps, {kind}", len(x), ours, lambda: scipy.signal.lfilter(h, np.float32(1), x))


if __name__ == "__main__":
    filters()
    convolutions()
