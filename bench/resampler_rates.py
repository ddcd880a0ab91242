# SPDX-License-Identifier: MIT
"""Resamplers beside each other: ripple and rejection by swept tones, and the processor's time.

Prints the rows of docs/rates.md, and draws its picture into the file that --picture names. LUMRA_LIBRARY names the
library. The peers are libsoxr.so.0 and libliquid.so.1; samples are complex, in single precision unless named otherwise.
"""
import ctypes
import functools
import pathlib
import subprocess
import sys

import numpy as np

from turns import Turns

root = pathlib.Path(__file__).resolve().parents[1]
sys.path.insert(0, str(root / "tests" / "open"))
import open as lumra  # noqa: E402

RATES = [(10e6, 3e6), (10e6, 7.68e6), (10e6, 9.99e6), (10e6, 0.1e6), (1e6, 3e6), (44.1e3, 48e3), (1e6, 1e6 / 1.37)]
PASSBAND = 0.9  # of half the lower rate


class Lumra:
    def __init__(self, rejection, dtype=np.complex64):
        self.name = f"lumra, {rejection} dB" + (", double" if dtype == np.complex128 else "")
        self.rejection, self.dtype = float(rejection), dtype

    def start(self, rates):
        kind = lumra.type_code("cf32" if self.dtype == np.complex64 else "cf64")
        self.object = lumra.create(
            "resampler", type=kind, input_rate_hz=rates[0], output_rate_hz=rates[1], rejection_db=self.rejection
        )

    def run(self, x, out):
        written = ctypes.c_uint64()
        lumra.call("resampler_process", self.object, x, 0, len(x), out, 0, len(out), written)
        return written.value


class Soxr:
    library = ctypes.CDLL("libsoxr.so.0")
    quality = type("quality", (ctypes.Structure,), {"_fields_": [
        ("precision", ctypes.c_double), ("phase", ctypes.c_double), ("pass_end", ctypes.c_double),
        ("stop_begin", ctypes.c_double), ("e", ctypes.c_void_p), ("flags", ctypes.c_ulong)]})  # fmt: skip
    io = type("io", (ctypes.Structure,), {"_fields_": [
        ("input", ctypes.c_int), ("output", ctypes.c_int), ("scale", ctypes.c_double), ("e", ctypes.c_void_p),
        ("flags", ctypes.c_ulong)]})  # fmt: skip
    library.soxr_create.restype = ctypes.c_void_p
    library.soxr_quality_spec.restype = quality
    library.soxr_io_spec.restype = io

    def __init__(self, name, recipe):
        self.name, self.recipe, self.dtype = name, recipe, np.complex64
        self.object = None

    def __del__(self):
        self.library.soxr_delete(ctypes.c_void_p(self.object))

    def start(self, rates):
        self.__del__()
        quality = self.library.soxr_quality_spec(ctypes.c_ulong(self.recipe), ctypes.c_ulong(0))
        io = self.library.soxr_io_spec(0, 0)
        how = ctypes.byref(io), ctypes.byref(quality), None
        self.object = self.library.soxr_create(ctypes.c_double(rates[0]), ctypes.c_double(rates[1]), 2, None, *how)

    def run(self, x, out):
        read, written = ctypes.c_size_t(), ctypes.c_size_t()
        self.library.soxr_process(
            ctypes.c_void_p(self.object), ctypes.c_void_p(x.ctypes.data), ctypes.c_size_t(len(x)), ctypes.byref(read),
            ctypes.c_void_p(out.ctypes.data), ctypes.c_size_t(len(out)), ctypes.byref(written))  # fmt: skip
        assert read.value == len(x)
        return written.value


class Liquid:
    library = ctypes.CDLL("libliquid.so.1")
    library.msresamp_crcf_create.restype = ctypes.c_void_p

    def __init__(self, rejection):
        self.name, self.rejection, self.dtype = f"liquid-dsp, {rejection} dB", rejection, np.complex64

    def start(self, rates):
        self.object = self.library.msresamp_crcf_create(
            ctypes.c_float(rates[1] / rates[0]), ctypes.c_float(self.rejection)
        )

    def run(self, x, out):
        written = ctypes.c_uint()
        self.library.msresamp_crcf_execute(
            ctypes.c_void_p(self.object), ctypes.c_void_p(x.ctypes.data), ctypes.c_uint(len(x)),
            ctypes.c_void_p(out.ctypes.data), ctypes.byref(written))  # fmt: skip
        return written.value


def response(resampler, rates, tone, n):
    """The middle of what a tone of amplitude 1 gives; tone in cycles per input sample."""
    x = np.exp(2j * np.pi * ((tone * np.arange(n)) % 1)).astype(resampler.dtype)
    out = np.zeros(int(n * rates[1] / rates[0]) + 100000, resampler.dtype)
    resampler.start(rates)
    written = resampler.run(x, out)
    return out[written // 3 : written * 5 // 6].astype(np.complex128)


def sweep(resampler, rates):
    """Largest and smallest gain in the pass band, and how much stronger a tone is than what must not be there, in dB.

    The latter for tones of the pass band and from half the lower rate on, and for those a quarter of that half apart.
    """
    lower = min(1, rates[1] / rates[0])
    n = int(60000 + 4000 / lower)
    gains, wrong, wrong_apart = [], [], []

    def found(tone, unwanted):
        wrong.append(unwanted)
        if abs(tone * 2 / lower - 1) >= 0.25:
            wrong_apart.append(unwanted)

    for tone in np.linspace(0.003, PASSBAND, 24) * lower / 2:
        y = response(resampler, rates, tone, n)
        ideal = np.exp(2j * np.pi * ((tone * rates[0] / rates[1] * np.arange(len(y))) % 1))
        window = np.hanning(len(y))
        gain = np.vdot(ideal, y * window) / window.sum()
        gains.append(20 * np.log10(abs(gain)))
        found(tone, np.std(y - gain * ideal))
    beyond = np.concatenate([np.linspace(1.0005, 1.1, 16) * lower / 2, np.linspace(0.5 * lower, 0.4999, 24)[1:]])
    for tone in beyond[(beyond > lower / 2) & (beyond < 0.5)]:
        found(tone, np.sqrt(np.mean(np.abs(response(resampler, rates, tone, n)) ** 2)))
    return max(gains), min(gains), -20 * np.log10(max(wrong)), -20 * np.log10(max(wrong_apart))


def name_of(resampler, rates):
    return " → ".join(f"{r / 1e6:.6g}" for r in rates) + f" MHz/{resampler.name}"


def speeds(turns, resamplers, rates, n=1 << 18):
    """Millions of input samples a second of the processor's time, of those that are chosen."""
    out = np.zeros(int(n * rates[1] / rates[0]) + 100000, np.complex128)
    works = {}
    for resampler in resamplers:
        resampler.start(rates)
        x, room = np.ones(n, resampler.dtype), out.view(resampler.dtype)
        works[name_of(resampler, rates)] = functools.partial(resampler.run, x, room)
    taken = turns.beside(n, works)
    return {r: n / np.quantile([cpu for cpu, _ in taken[name]], 0.25) / 1e6 for r in resamplers
            if (name := name_of(r, rates)) in taken}  # fmt: skip


def table(turns, resamplers):
    for rates in RATES:
        for resampler, speed in speeds(turns, resamplers, rates).items():
            most, fewest, rejection, apart = sweep(resampler, rates)
            ratio = " → ".join(f"{r / 1e6:.6g}" for r in rates)
            ripple = f"{most:+.4f} / {fewest:+.4f}"
            print(f"| {ratio} | {resampler.name} | {ripple} | {rejection:.0f} / {apart:.0f} | {speed:.0f} |")


def picture(turns, rates, path):
    """Speed against the rejection from half the lower rate on, a line a family."""
    families = {
        "lumra, single precision": [Lumra(r) for r in (60, 80, 100, 120)],
        "lumra, double precision": [Lumra(r, np.complex128) for r in (60, 80, 100, 120, 140, 150)],
        "soxr: MQ, HQ, 24 bits, VHQ": [Soxr(f"soxr, recipe {r}", r) for r in (2, 4, 5, 6)],
    }
    everyone = [r for family in families.values() for r in family]
    speed = speeds(turns, everyone, rates)
    data = "".join(
        f"$d{k} << EOD\n" + "".join(f"{sweep(r, rates)[2]} {speed[r]}\n" for r in family) + "EOD\n"
        for k, family in enumerate(families.values())
    )
    plots = ", ".join(f"$d{k} with linespoints lw 2 pt 7 title '{name}'" for k, name in enumerate(families))
    script = f"""{data}set terminal svg size 720,440 dynamic background 'white' font 'sans,13'
set output '{path}'
set xlabel 'measured rejection in dB'
set ylabel 'input samples a second, millions'
set logscale y
set grid
set key outside bottom center horizontal
plot {plots}
"""
    subprocess.run(["gnuplot"], input=script, text=True, check=True)


if __name__ == "__main__":
    with Turns(__doc__, picture="receives the picture of docs/rates.md") as turns:
        ours = [Lumra(60), Lumra(100), Lumra(120), Lumra(150, np.complex128)]
        table(turns, [*ours, Soxr("soxr HQ", 4), Soxr("soxr VHQ", 6), Liquid(100)])
        if turns.options.picture:
            picture(turns, RATES[1], turns.options.picture)
