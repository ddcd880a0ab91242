# SPDX-License-Identifier: MIT
"""Decodes the picture of an analogue video link (NTSC, frequency modulated) from a recording of it.

python3 decode_video.py RECORDING PICTURE
"""
import sys
from fractions import Fraction

import numpy as np
from matplotlib import pyplot

import lumra

line_rate = Fraction(4_500_000, 286)  # hertz
width = 640  # samples of a line


def main(path, picture):
    recording = lumra.Recording(path)
    x = recording[:]
    rate = int(recording.sample_rate)
    video = np.angle(x[1:] * x[:-1].conj()) * np.float32(rate / (2 * np.pi))  # the carrier's frequency in hertz

    # Brightness without the colour carrier, at a rate with a whole number of samples in a line.
    smooth = lumra.kaiser_lowpass(rate, 2.0e6, 3.2e6, 50).astype(np.float32)
    video = lumra.resample(lumra.convolve(video, smooth, "same"), rate, width * line_rate)
    lines = video[: len(video) // width * width].reshape(-1, width)

    # The deepest stretch that all lines have is the pulse between them.
    mean = np.median(lines, axis=0)
    pulse = round(4.7e-6 * width * line_rate)
    around = np.convolve(np.concatenate([mean, mean[: pulse - 1]]), np.ones(pulse), "valid")
    begin = int(np.argmin(around))
    lines = video[begin : begin + (len(video) - begin) // width * width].reshape(-1, width)
    sync, blank = np.median(lines[:, 2 : pulse - 2]), np.median(lines[:, pulse + 8 : pulse + 16])
    print(f"{len(lines)} lines of {1e6 / line_rate:.3f} us, {len(lines) / 262.5:.2f} fields")
    print(f"pulse {(blank - sync) / 1e3:.0f} kHz below black")

    # White is 100 units above black where the pulse is 40 below.
    brightness = (lines - blank) / (blank - sync) * 40
    figure, axes = pyplot.subplots(figsize=(8, 2 + 6 * len(lines) / 525), layout="constrained")
    axes.imshow(np.clip(brightness, -40, 100), cmap="gray", vmin=0, vmax=100, aspect="auto")
    axes.set(xlabel=f"Samples at {float(width * line_rate) / 1e6:.3f} MHz", ylabel="Line", title="Fields as they were sent")
    figure.savefig(picture)


if __name__ == "__main__":
    main(*sys.argv[1:])
