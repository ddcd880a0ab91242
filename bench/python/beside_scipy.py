# SPDX-License-Identifier: MIT
"""The package beside SciPy and NumPy on the same arrays, turn by turn in one process (names: operation/who/size).

scripts/bench runs it with the package on the path. One thread each, but for the rows of threads and processes, of which
the clock tells what they gain, where nobody else uses the machine.
"""
import concurrent.futures
import os
import pathlib
import subprocess
import sys
import tempfile

for _limit in "OPENBLAS_NUM_THREADS", "OMP_NUM_THREADS":
    os.environ[_limit] = "1"
import numpy as np  # noqa: E402
import scipy.fft  # noqa: E402
import scipy.signal  # noqa: E402

import lumra  # noqa: E402

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1]))
from turns import Turns  # noqa: E402


def noise(size, dtype=np.complex64):
    generator = np.random.default_rng(1)
    x = generator.standard_normal(size)
    return (x + 1j * generator.standard_normal(size) if np.dtype(dtype).kind == "c" else x).astype(dtype)


def beside(turns, name, samples, ours, theirs, size=""):
    turns.beside(samples, {f"{name}/lumra{size}": ours, f"{name}/scipy{size}": theirs})


def spectra(turns):
    x = noise(1 << 20)
    for nfft in 256, 1024, 4096, 65536:
        beside(turns, "spectrum", len(x), lambda: lumra.spectrum(x, nfft=nfft, threads=1),
               lambda: scipy.signal.welch(x, window="flattop", nperseg=nfft, detrend=False, return_onesided=False,
                                          scaling="spectrum"), f"/{nfft}")  # fmt: skip


def rates(turns):
    x = noise(1 << 18)
    for up, down in (3, 10), (96, 125), (147, 160), (3, 1):
        # As long as ours: 100 dB beyond half the lower rate, flat to 0.9 of it.
        taps, beta = scipy.signal.kaiserord(100, 0.1 / max(up, down))
        h = scipy.signal.firwin(taps | 1, 0.95 / max(up, down), window=("kaiser", beta)).astype(np.float32)
        beside(turns, "resample", len(x), lambda: lumra.resample(x, down, up),
               lambda: scipy.signal.resample_poly(x, up, down, window=h), f"/{up}x{down}")  # fmt: skip


def recursions(turns):
    b, a = scipy.signal.butter(4, 0.4)
    for dtype in np.float32, np.complex64:
        x, narrow = noise(65536, dtype), (b.astype(np.float32), a.astype(np.float32))
        beside(turns, f"lfilter_{np.dtype(dtype)}", len(x), lambda: lumra.lfilter(*narrow, x),
               lambda: scipy.signal.lfilter(*narrow, x))  # fmt: skip


def transforms(turns):
    for n in 256, 1000, 1024, 4096, 65536, 1009:
        x = noise(n)
        beside(turns, "fft", n, lambda: lumra.fft(x), lambda: scipy.fft.fft(x), f"/{n}")
        real = x.real.copy()
        beside(turns, "rfft", n, lambda: lumra.rfft(real), lambda: scipy.fft.rfft(real), f"/{n}")


def convolutions(turns):
    for n, m in (10_000, 50), (100_000, 1000), (1_000_000, 5000):
        x, h = noise(n), noise(m)
        beside(turns, "convolve", n, lambda: lumra.convolve(x, h), lambda: scipy.signal.oaconvolve(x, h), f"/{n}x{m}")


def calls(turns):
    """What 1000 samples take in Python, and how much of it is not the C function, which is called beside by ctypes.

    Both of that calls, one without samples, cost the same but for the function's work.
    """
    sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "tests" / "open"))
    import open as c

    x, real, out = noise(1000), np.empty(1000, np.float32), np.empty(1000, np.complex64)
    fft = c.create("fft", type=c.type_code("cf32"), points=1000)
    for name, work, bare in (
        ("magnitude", lumra.magnitude, lambda n: c.call("magnitude_cf32", x, real, n)),
        ("power", lumra.power, lambda n: c.call("power_cf32", x, real, n)),
        ("fft", lumra.fft, lambda n: c.call("fft_forward", fft, x, out, n // 1000, None)),
    ):
        names = [f"call/{name}/{what}" for what in ("above", "python", "c", "c_nothing")]
        if turns.wanted(*names):
            works = (lambda: work(x), lambda: bare(1000), lambda: bare(0))
            for whole, function, nothing in zip(*turns.beside(1000, dict(zip(names[1:], works)), always=True).values()):
                turns.keep(names[0], *(t - (f - n) for t, f, n in zip(whole, function, nothing)))


def threads(turns):
    names = [f"threads/{who}" for who in ("one", "two", "both", "after_another")]
    if not turns.wanted(*names):
        return
    x = noise(1 << 24)
    halves = x[: len(x) // 2], x[len(x) // 2 :]
    single = lambda part: lumra.spectrum(part, threads=1)
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        works = (lambda: single(x), lambda: lumra.spectrum(x, threads=2), lambda: list(pool.map(single, halves)),
                 lambda: list(map(single, halves)))  # fmt: skip
        turns.beside(len(x), dict(zip(names, works)))


def processes(turns):
    if not turns.wanted("dask/one", "dask/two", "dask/none_beside_1", "dask/none_beside_2"):
        return
    from distributed import Client

    with tempfile.TemporaryDirectory() as folder:
        path = pathlib.Path(folder) / "long.ci16"
        block = (noise(1 << 20).view(np.float32) * 3000).astype("<i2").tobytes()
        with open(path, "wb") as file:
            for _ in range(256):
                file.write(block)
        recording = lumra.Recording(path, datatype="ci16_le", sample_rate=1e6)
        for workers, name in (1, "dask/one"), (2, "dask/two"):
            with Client(n_workers=workers, threads_per_worker=1, dashboard_address=None, local_directory=folder) as client:
                turns.beside(256 << 20, {
                    name: lambda: lumra.spectrum(recording, client=client),
                    f"dask/none_beside_{workers}": lambda: lumra.spectrum(recording, threads=1),
                })  # fmt: skip


_memory = """
import sys, numpy as np, lumra
def resident(key):
    return int(next(line for line in open("/proc/self/status") if line.startswith(key)).split()[1]) / 1024
x = {opened}
before = resident("RssAnon")
lumra.spectrum(x, {options})
print(f"memory, {name}: {{resident('RssAnon') - before:.0f}} MB after a spectrum, at most "
      f"{{resident('VmHWM') - before:.0f}} MB with mapped pages")
"""


def memory(turns):
    """Prints; nothing of it is timed."""
    if not turns.wanted("memory"):
        return
    with tempfile.TemporaryDirectory() as folder:
        path = os.path.join(folder, "long.cf32")
        with open(path, "wb") as file:
            for _ in range(128):
                file.write(noise(1 << 20).tobytes())
        for name, opened in (("memory map of 1 GB", f"np.memmap({path!r}, np.complex64, 'r')"),
                             ("recording of 1 GB", f"lumra.Recording({path!r}, datatype='cf32_le', sample_rate=1.0)")):
            subprocess.run([sys.executable, "-c", _memory.format(name=name, opened=opened, options="threads=1")], check=True)


if __name__ == "__main__":
    with Turns(__doc__) as turns:
        for subject in spectra, rates, recursions, transforms, convolutions, calls, threads, processes, memory:
            subject(turns)
