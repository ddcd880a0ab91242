# SPDX-License-Identifier: MIT
"""The spectrum of a recording in dBm, from the power that its full scale stands for at the receiver's input.

python3 calibrated_spectrum.py RECORDING FULL_SCALE_DBM PICTURE
"""
import sys

import numpy as np
from matplotlib import pyplot

import lumra


def main(path, full_scale_dbm, picture):
    recording = lumra.Recording(path)
    spectrum = lumra.spectrum(recording, nfft=8192, window="blackmanharris", hold=True)
    offset = float(full_scale_dbm)
    low, high = spectrum.occupied_bandwidth(0.99)
    channel = spectrum.channel_power((low + high) / 2, high - low)
    # The median of the bins is the noise, as long as signals fill less than half of the band.
    noise = 10 * np.log10(np.median(spectrum.density)) + offset
    print(f"{recording.samples} samples at {recording.sample_rate / 1e6:g} MHz, RBW {spectrum.rbw:.0f} Hz")
    print(f"occupied: {low / 1e6:.3f} to {high / 1e6:.3f} MHz")
    print(f"power in it: {10 * np.log10(channel) + offset:.2f} dBm")
    print(f"noise: {noise:.1f} dBm/Hz, {noise + 174:.1f} dB above that of a resistor")
    for peak in spectrum.peaks(3):
        print(f"peak: {peak.frequency / 1e6:.4f} MHz, {10 * np.log10(peak.power) + offset:.2f} dBm")

    figure, axes = pyplot.subplots(figsize=(9, 5), layout="constrained")
    axes.fill_between(spectrum.frequency / 1e6, *(10 * np.log10(hold) + offset for hold in (spectrum.min_hold, spectrum.max_hold)),
                      color="lightsteelblue", label="least and greatest")
    axes.plot(spectrum.frequency / 1e6, spectrum.level + offset, linewidth=0.8, label="mean")
    axes.axvspan(low / 1e6, high / 1e6, color="orange", alpha=0.15, label="99 % of the power")
    axes.set(xlabel="Frequency in MHz", ylabel=f"dBm in {spectrum.rbw:.0f} Hz", title="Power at the receiver's input")
    axes.margins(x=0)
    axes.legend()
    figure.savefig(picture)


if __name__ == "__main__":
    main(*sys.argv[1:])
