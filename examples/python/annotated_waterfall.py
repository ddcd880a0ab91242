# SPDX-License-Identifier: MIT
"""The waterfall of a recording, with a box and the level of all that is annotated in it.

python3 annotated_waterfall.py RECORDING PICTURE
"""
import sys

import numpy as np
from matplotlib import pyplot
from matplotlib.patches import Rectangle

import lumra


def main(path, picture):
    recording = lumra.Recording(path)
    waterfall = lumra.waterfall(recording, nfft=1024, rows=400)
    figure, axes = pyplot.subplots(figsize=(9, 6), layout="constrained")
    drawn = axes.pcolormesh(waterfall.frequency / 1e6, waterfall.time * 1e3, waterfall.level, shading="nearest",
                            vmin=np.percentile(waterfall.level, 5), rasterized=True)
    axes.set(xlabel="Frequency in MHz", ylabel="Time in ms", title=str(path))
    axes.invert_yaxis()
    axes.ticklabel_format(axis="x", useOffset=False)
    figure.colorbar(drawn, label=f"dB of full scale in {waterfall.enbw * waterfall.sample_rate / waterfall.nfft:.0f} Hz")

    for each in recording.annotations:
        count = recording.samples - each.start if each.samples is None else each.samples
        low = waterfall.frequency[0] if each.low is None else each.low
        high = waterfall.frequency[-1] if each.high is None else each.high
        # One spectrum of what is marked gives the power between the edges.
        marked = recording[each.start : each.start + count]
        spectrum = lumra.spectrum(marked, recording.sample_rate, nfft=min(1024, count), frequency=recording.frequency or 0)
        level = 10 * np.log10(spectrum.channel_power((low + high) / 2, high - low))
        begin, length = each.start / recording.sample_rate * 1e3, count / recording.sample_rate * 1e3
        print(f"{each.label}: {begin:.3f} ms, {length:.3f} ms long, {low / 1e6:.3f} to {high / 1e6:.3f} MHz, {level:.2f} dBFS")
        axes.add_patch(Rectangle((low / 1e6, begin), (high - low) / 1e6, length, fill=False, edgecolor="white"))
        axes.annotate(f"{each.label}, {level:.1f} dB", (low / 1e6, begin), (0, 3), textcoords="offset points", color="white")
    figure.savefig(picture)


if __name__ == "__main__":
    main(*sys.argv[1:])
