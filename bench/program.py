# SPDX-License-Identifier: MIT
"""`lumra spectrum` on 4 GB of 16-bit integers in the page cache, beside accumulators on samples in memory.

Names are spectrum/who/threads. LUMRA_PROGRAM names the program, LUMRA_LIBRARY the library; scripts/bench runs it.
"""
import os
import pathlib
import shutil
import subprocess
import sys
import tempfile
import time

import numpy as np

from turns import Turns

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "tests" / "open"))
import open as lumra  # noqa: E402

SAMPLES, IN_MEMORY, BLOCK = 1 << 30, 1 << 27, 1 << 22
POINTS = 4096


def room():
    """Why there is too little of it, or nothing."""
    disk = shutil.disk_usage(tempfile.gettempdir()).free
    memory = next(int(line.split()[1]) << 10 for line in open("/proc/meminfo") if line.startswith("MemAvailable"))
    if disk < 5 << 30:
        return f"the file needs 4 GB, and {tempfile.gettempdir()} has {disk >> 30} GB free"
    if memory < 7 << 30:
        return f"file and samples need 6 GB of memory, and {memory >> 30} GB are available"


def command(path, threads):
    return [os.environ["LUMRA_PROGRAM"], "spectrum", path, "--format", "ci16", "--rate", "1M", "--fft", str(POINTS),
            "--threads", str(threads)]  # fmt: skip


def resident_mb(words):
    """The most memory that a process has, of its own pages and of files'."""
    most = 0
    with subprocess.Popen(words, stdout=subprocess.DEVNULL) as process:
        while process.poll() is None:
            status = pathlib.Path(f"/proc/{process.pid}/status").read_text()
            most = max([most, *(int(line.split()[1]) / 1024 for line in status.split("\n") if line.startswith("VmHWM"))])
            time.sleep(0.01)
    return most


def accumulate(samples, threads):
    """As many samples as the file has."""
    average = lumra.create("spectrum", type=lumra.type_code("cf32"), points=POINTS, threads=threads)
    for _ in range(SAMPLES // IN_MEMORY):
        lumra.call("spectrum_add", average, samples, len(samples))


def measure(turns, names, folder):
    path = os.path.join(folder, "long.ci16")
    generator = np.random.default_rng(1)
    block = (generator.standard_normal(2 * BLOCK) * 3000).astype("<i2")
    with open(path, "wb") as file:
        for _ in range(SAMPLES // BLOCK):
            block.tofile(file)
        file.flush()
        os.fsync(file.fileno())  # what is still to be written would disturb
    memory = {names[0]: resident_mb(command(path, 1)), names[1]: resident_mb(command(path, 2))}
    samples = np.tile(block.astype(np.float32).view(np.complex64) / np.float32(32768), IN_MEMORY // BLOCK)
    run = lambda threads: subprocess.run(command(path, threads), stdout=subprocess.DEVNULL, check=True)
    works = (lambda: run(1), lambda: run(2), lambda: accumulate(samples, 1), lambda: accumulate(samples, 2))
    turns.beside(SAMPLES, dict(zip(names, works)), fewest=3, resident_mb=memory)


if __name__ == "__main__":
    with Turns(__doc__) as turns:
        names = [f"spectrum/{who}/{threads}" for who in ("program", "accumulator") for threads in (1, 2)]
        if short := room():
            turns.fail(names, short)
        elif turns.wanted(*names):
            with tempfile.TemporaryDirectory() as folder:
                measure(turns, names, folder)
