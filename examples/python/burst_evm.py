# SPDX-License-Identifier: MIT
"""Finds a burst in a recording and measures how well it was sent: its error vector magnitude, and its constellation.

python3 burst_evm.py REFERENCE RECORDING SAMPLES_PER_SYMBOL PICTURE

The reference holds the burst as it should be, its first symbol on its first sample.
"""
import sys

import numpy as np
from matplotlib import pyplot

import lumra


def main(reference, path, samples_per_symbol, picture):
    reference, recording = lumra.Recording(reference)[:], lumra.Recording(path)
    x = recording[:]
    # The burst begins where as much energy follows as nowhere else.
    energy = np.concatenate([[0.0], np.cumsum(lumra.power(x), dtype=float)])
    begin = int(np.argmax(energy[len(reference) :] - energy[: -len(reference)]))
    burst = x[begin : begin + len(reference)]

    found = lumra.evm(reference, burst, align=("gain", "delay", "frequency", "dc"), sample_rate=recording.sample_rate)
    print(f"burst at {(begin + found.delay) / recording.sample_rate * 1e3:.4f} ms")
    print(f"EVM {found.rms_percent:.2f} % RMS ({found.rms_db:.1f} dB), {100 * found.peak:.1f} % peak")
    print(f"carrier {found.frequency:+.2f} Hz off, gain {20 * np.log10(abs(found.gain)):.2f} dB, DC {abs(found.dc):.1e}")

    # The burst as the model takes it back to the reference: on its carrier, and earlier by the delay.
    n = np.arange(len(burst))
    turned = (burst - found.dc) * np.exp(-2j * np.pi * found.frequency / recording.sample_rate * n) / found.gain
    earlier = np.exp(2j * np.pi * found.delay * np.fft.fftfreq(len(burst)))
    step, edge = int(samples_per_symbol), 10 * int(samples_per_symbol)  # what surrounds the burst reaches into its ends
    measured = lumra.ifft(lumra.fft(turned) * earlier)[edge:-edge:step]
    wanted = reference[edge:-edge:step]

    figure, axes = pyplot.subplots(figsize=(6, 6), layout="constrained")
    axes.plot(measured.real, measured.imag, ".", markersize=3, label="measured")
    axes.plot(wanted.real, wanted.imag, "+", color="orange", label="reference")
    axes.set(xlabel="I", ylabel="Q", aspect="equal", title=f"EVM {found.rms_percent:.2f} %")
    axes.legend(loc="center")
    figure.savefig(picture)


if __name__ == "__main__":
    main(*sys.argv[1:])
