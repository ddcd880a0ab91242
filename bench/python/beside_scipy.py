# SPDX-License-Identifier: MIT
"""The package beside SciPy and NumPy on the same arrays, turn by turn in one process: how many times as fast it is.

scripts/bench runs it with the package on the path; rows may be chosen by words of their names. One thread each; times are
the processor's, the least of many turns. What two threads or processes gain is by the clock, which other load disturbs.
"""
import concurrent.futures
import os
import pathlib
import subprocess
import sys
import tempfile
import time

for _limit in "OPENBLAS_NUM_THREADS", "OMP_NUM_THREADS":
    os.environ[_limit] = "1"
import numpy as np  # noqa: E402
import scipy.fft  # noqa: E402
import scipy.signal  # noqa: E402

import lumra  # noqa: E402

rows = {}


def row(name):
    def keep(work):
        rows[name] = work
        return work

    return keep


def noise(size, dtype=np.complex64):
    generator = np.random.default_rng(1)
    x = generator.standard_normal(size)
    return (x + 1j * generator.standard_normal(size) if np.dtype(dtype).kind == "c" else x).astype(dtype)


def least(works, seconds=1.0, clock=time.process_time):
    """Seconds of each work: the least of many turns, in which one follows the other."""
    best, end, turns = [np.inf] * len(works), time.perf_counter() + seconds, 0
    while turns < 5 or time.perf_counter() < end:
        for k, work in enumerate(works):
            start = clock()
            work()
            best[k] = min(best[k], clock() - start)
        turns += 1
    return best


def repeated(work, times):
    return lambda: [work() for _ in range(times)]


def beside(name, goal, samples, ours, theirs):
    """Short calls are repeated for the clock."""
    times = max(1, 200_000 // samples)
    a, b = least([repeated(ours, times), repeated(theirs, times)])
    print(f"{name}: {b / a:.2f} of SciPy, {samples * times / a / 1e6:.0f} Msamples/s (goal {goal})", flush=True)


@row("welch")
def _spectra():
    x = noise(1 << 20)
    for nfft in 256, 1024, 4096, 65536:
        beside(f"spectrum {nfft}", 10, len(x), lambda: lumra.spectrum(x, nfft=nfft, threads=1),
               lambda: scipy.signal.welch(x, window="flattop", nperseg=nfft, detrend=False, return_onesided=False,
                                          scaling="spectrum"))  # fmt: skip


@row("resample")
def _rates():
    x = noise(1 << 18)
    for up, down in (3, 10), (96, 125), (147, 160), (3, 1):
        # As long as ours: 100 dB beyond half the lower rate, flat to 0.9 of it.
        taps, beta = scipy.signal.kaiserord(100, 0.1 / max(up, down))
        h = scipy.signal.firwin(taps | 1, 0.95 / max(up, down), window=("kaiser", beta)).astype(np.float32)
        beside(f"resample {up}/{down}", 10, len(x), lambda: lumra.resample(x, down, up),
               lambda: scipy.signal.resample_poly(x, up, down, window=h))  # fmt: skip


@row("lfilter")
def _recursions():
    b, a = scipy.signal.butter(4, 0.4)
    for dtype, goal in (np.float32, 1.5), (np.complex64, 4):
        x, narrow = noise(65536, dtype), (b.astype(np.float32), a.astype(np.float32))
        beside(f"lfilter {np.dtype(dtype)}", goal, len(x), lambda: lumra.lfilter(*narrow, x),
               lambda: scipy.signal.lfilter(*narrow, x))  # fmt: skip


@row("fft")
def _transforms():
    for n in 256, 1000, 1024, 4096, 65536, 1009:
        x = noise(n)
        beside(f"fft {n}", 1, n, lambda: lumra.fft(x), lambda: scipy.fft.fft(x))
        real = x.real.copy()
        beside(f"rfft {n}", 1, n, lambda: lumra.rfft(real), lambda: scipy.fft.rfft(real))


@row("convolve")
def _convolutions():
    for n, m in (10_000, 50), (100_000, 1000), (1_000_000, 5000):
        x, h = noise(n), noise(m)
        beside(f"convolve {n} x {m}", 3, n, lambda: lumra.convolve(x, h), lambda: scipy.signal.oaconvolve(x, h))


@row("calls")
def _calls():
    # What 16 samples take is nearly all call; beside it what a function of SciPy's takes to be called.
    b, a = scipy.signal.butter(4, 0.4)
    for name, work in {
        "magnitude": lumra.magnitude, "power": lumra.power, "fft": lumra.fft, "lfilter": lambda x: lumra.lfilter(b, a, x),
    }.items():
        short, long = noise(16), noise(1000)
        t16, t1000 = least([repeated(lambda: work(short), 10_000), repeated(lambda: work(long), 10_000)])
        print(f"call of {name}: {t16 * 100:.2f} us with 16 samples (goal below 3), {t1000 * 100:.2f} us with 1000", flush=True)


@row("threads")
def _threads():
    x = noise(1 << 24)
    half = x[: len(x) // 2]
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        one, two, both, single = least([
            lambda: lumra.spectrum(x, threads=1), lambda: lumra.spectrum(x, threads=2),
            lambda: list(pool.map(lambda part: lumra.spectrum(part, threads=1), (half, half))),
            lambda: lumra.spectrum(half, threads=1),
        ], 6, time.perf_counter)  # fmt: skip
    print(f"threads=2: {one / two:.2f} of one; two Python threads: {2 * single / both:.2f} of one (goal 1.8)", flush=True)


@row("dask")
def _workers():
    from distributed import Client

    with tempfile.TemporaryDirectory() as folder:
        path = pathlib.Path(folder) / "long.ci16"
        block = (noise(1 << 20).view(np.float32) * 3000).astype("<i2").tobytes()
        with open(path, "wb") as file:
            for _ in range(256):
                file.write(block)
        recording = lumra.Recording(path, datatype="ci16_le", sample_rate=1e6)
        seconds = {}
        for workers in 1, 2:
            with Client(n_workers=workers, threads_per_worker=1, dashboard_address=None, local_directory=folder) as client:
                lumra.spectrum(recording, client=client)
                before, turns = sum(client.run(time.process_time).values()), []
                local, seconds[workers] = least([
                    lambda: lumra.spectrum(recording, threads=1),
                    lambda: turns.append(lumra.spectrum(recording, client=client)),
                ], 10, time.perf_counter)  # fmt: skip
                spent = (sum(client.run(time.process_time).values()) - before) / len(turns)
            (alone,) = least([lambda: lumra.spectrum(recording, threads=1)], 5)
            print(f"dask, {workers} worker(s): {local / seconds[workers]:.2f} of one process without Dask by the clock; "
                  f"the workers' processors {spent:.2f} s, its own {alone:.2f} s", flush=True)  # fmt: skip
        print(f"dask, two workers: {seconds[1] / seconds[2]:.2f} of one (goal 1.7)", flush=True)


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


@row("memory")
def _memory_of_spectra():
    with tempfile.TemporaryDirectory() as folder:
        path = os.path.join(folder, "long.cf32")
        with open(path, "wb") as file:
            for _ in range(128):
                file.write(noise(1 << 20).tobytes())
        for name, opened in (("memory map of 1 GB", f"np.memmap({path!r}, np.complex64, 'r')"),
                             ("recording of 1 GB", f"lumra.Recording({path!r}, datatype='cf32_le', sample_rate=1.0)")):
            subprocess.run([sys.executable, "-c", _memory.format(name=name, opened=opened, options="threads=1")], check=True)


if __name__ == "__main__":
    for name, work in rows.items():
        if len(sys.argv) < 2 or any(word in name for word in sys.argv[1:]):
            work()
