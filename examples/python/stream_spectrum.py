# SPDX-License-Identifier: MIT
"""Watches a stream of 16-bit I/Q samples on the standard input: a line every second, a spectrum when it ends.

receiver | python3 stream_spectrum.py SAMPLE_RATE PICTURE

A socket is read in the same way: socket.makefile("rb") in place of the standard input.
"""
import sys

import numpy as np
from matplotlib import pyplot

import lumra


def main(sample_rate, picture):
    rate = float(sample_rate)
    low_pass = lumra.FirFilter(lumra.kaiser_lowpass(rate, 0.2 * rate, 0.3 * rate, 80))
    received, filtered = (lumra.SpectrumEstimator(rate, nfft=2048, window="hann") for _ in range(2))
    pending, second = b"", lumra.LevelMeter()
    while block := sys.stdin.buffer.read1(1 << 20):
        # A pipe may cut samples in the middle.
        whole = len(pending + block) // 4 * 4
        raw, pending = np.frombuffer((pending + block)[:whole], "<i2"), (pending + block)[whole:]
        x = (raw * np.float32(2**-15)).view(np.complex64)
        received.add(x)
        filtered.add(low_pass(x))
        while len(x):
            count = int(min(len(x), rate - second.samples))
            second.add(x[:count])
            x = x[count:]
            if second.samples >= rate:
                level = second.result()
                print(f"{second.start / rate:6.0f} s: {level.rms_dbfs:7.2f} dBFS RMS, {level.peak_dbfs:7.2f} dBFS peak", flush=True)
                second = lumra.LevelMeter(second.start + second.samples)

    figure, axes = pyplot.subplots(figsize=(9, 5), layout="constrained")
    for name, estimator in ("received", received), ("behind the filter", filtered):
        spectrum = estimator.result()
        (peak,) = spectrum.peaks(1)
        print(f"{name}: {spectrum.segments} segments, peak at {peak.frequency:.1f} Hz, {10 * np.log10(peak.power):.2f} dBFS")
        axes.plot(spectrum.frequency / 1e3, spectrum.level, linewidth=0.8, label=name)
    axes.set(xlabel="Frequency in kHz", ylabel=f"dB of full scale in {spectrum.rbw:.0f} Hz", title="The stream's mean spectrum")
    axes.margins(x=0)
    axes.legend()
    figure.savefig(picture)


if __name__ == "__main__":
    main(*sys.argv[1:])
