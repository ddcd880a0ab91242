# SPDX-License-Identifier: MIT
"""The machine that a report was made on, and how much others used it."""
import datetime
import os
import pathlib
import platform
import resource
import subprocess
import time

QUIET = 0.1  # processors that others may keep busy where two threads are timed by the clock

_features = ("avx", "avx2", "fma", "avx512f", "avx512vl", "avx512bw", "amx_tile")
_packages = {
    "MKL": "libmkl-dev", "FFTW": "libfftw3-dev", "VOLK": "libvolk2-dev", "liquid-dsp": "libliquid-dev", "soxr": "libsoxr-dev",
    "libsamplerate": "libsamplerate0-dev", "Eigen": "libeigen3-dev", "NumPy": "python3-numpy", "SciPy": "python3-scipy",
    "Dask": "python3-dask", "google-benchmark": "libbenchmark-dev",
}  # fmt: skip


def _used():
    """Seconds that all processors were busy or taken by the hypervisor, and those of this process and its children."""
    user, nice, system, _, _, interrupts, soft, stolen = map(int, pathlib.Path("/proc/stat").read_text().split()[1:9])
    own = sum(getattr(resource.getrusage(who), part) for who in (resource.RUSAGE_SELF, resource.RUSAGE_CHILDREN)
              for part in ("ru_utime", "ru_stime"))  # fmt: skip
    return (user + nice + system + interrupts + soft + stolen) / os.sysconf("SC_CLK_TCK"), own


class Load:
    """How many processors others keep busy, over all stretches between begin and end."""

    def __init__(self):
        self._elapsed = self._foreign = 0

    def begin(self):
        self._start = time.monotonic(), *_used()

    def end(self):
        wall, busy, own = (now - before for now, before in zip((time.monotonic(), *_used()), self._start))
        self._elapsed += wall
        self._foreign += max(0, busy - own)

    @property
    def others(self):
        return self._foreign / self._elapsed if self._elapsed else 0


def others_now(seconds=2):
    load = Load()
    load.begin()
    time.sleep(seconds)
    load.end()
    return load.others


def _output(*command):
    try:
        return subprocess.run(command, capture_output=True, text=True, check=True).stdout.strip()
    except (OSError, subprocess.CalledProcessError):
        return ""


def _caches():
    sizes = {}
    for index in sorted(pathlib.Path("/sys/devices/system/cpu/cpu0/cache").glob("index*")):
        kind = (index / "type").read_text().strip()
        if kind != "Instruction":
            sizes["L" + (index / "level").read_text().strip()] = int((index / "size").read_text().strip().rstrip("K"))
    return ", ".join(f"{level} {f'{size} KB' if size < 1024 else f'{size / 1024:g} MB'}" for level, size in sizes.items())


def describe(build):
    """Lines of the report by their subject; what the build says of itself comes from its folder."""
    processor = dict(line.split(":", 1) for line in pathlib.Path("/proc/cpuinfo").read_text().split("\n\n")[0].split("\n"))
    processor = {key.strip(): value.strip() for key, value in processor.items()}
    flags = set(processor.get("flags", "").split())
    versions = {name: _output("dpkg-query", "-W", "-f", "${Version}", package) for name, package in _packages.items()}
    compiler = next((line.split("=", 1)[1] for line in (build / "CMakeCache.txt").read_text().split("\n")
                     if line.startswith("CMAKE_CXX_COMPILER:")), "c++")  # fmt: skip
    return {
        "Processor": f"{processor.get('model name', platform.processor())}, family {processor.get('cpu family')}, model "
                     f"{processor.get('model')}, {os.cpu_count()} processors"
                     + (", a virtual machine" if "hypervisor" in flags else ""),
        "Features": ", ".join(f for f in _features if f in flags),
        "Caches": _caches(),
        "System": f"{platform.system()} {platform.release()}, Python {platform.python_version()}",
        "Compiler": _output(compiler, "--version").split("\n")[0],
        "Peers": ", ".join(f"{name} {version}" for name, version in versions.items() if version),
        "VOLK's kernels": "as its profiler chose them" if (pathlib.Path.home() / ".volk/volk_config").exists()
                          else "its own choice: no profile",
        "Date": datetime.datetime.now(datetime.timezone.utc).strftime("%Y-%m-%d %H:%M UTC"),
        "Revision": _output("git", "-C", str(build), "describe", "--always", "--dirty"),
        "Load at the start": "%.2f / %.2f / %.2f in 1 / 5 / 15 minutes" % os.getloadavg(),
    }  # fmt: skip
