# SPDX-License-Identifier: MIT
"""Surveys a folder of recordings with Dask: the highest level that any of them had at each frequency.

python3 cluster_survey.py FOLDER PICTURE [SCHEDULER]

Workers see the folder under the same name. Without the address of a scheduler, two processes of this machine work.
"""
import pathlib
import sys

import numpy as np
from distributed import Client
from matplotlib import pyplot

import lumra


def main(folder, picture, scheduler=None):
    recordings = [lumra.Recording(path) for path in sorted(pathlib.Path(folder).glob("*.sigmf-meta"))]
    with Client(scheduler) if scheduler else Client(n_workers=2, threads_per_worker=1, dashboard_address=None) as client:
        # Nothing is read yet; paths and ranges go out, spectra come back.
        later = [lumra.spectrum(each, nfft=2048, window="hann", hold=True, client=client, compute=False) for each in recordings]
        spectra = [future.result() for future in client.compute(later)]
    for recording, spectrum in zip(recordings, spectra):
        low, high = spectrum.occupied_bandwidth()
        print(f"{pathlib.Path(recording.path).stem}: {10 * np.log10(spectrum.power.sum() / spectrum.enbw):.2f} dBFS, "
              f"{low / 1e6:.3f} to {high / 1e6:.3f} MHz, {spectrum.segments} segments")

    highest = np.max([spectrum.max_hold for spectrum in spectra], axis=0)
    figure, axes = pyplot.subplots(figsize=(9, 5), layout="constrained")
    for spectrum in spectra:
        axes.plot(spectrum.frequency / 1e6, spectrum.level, linewidth=0.5, alpha=0.6)
    axes.plot(spectra[0].frequency / 1e6, 10 * np.log10(highest), color="black", linewidth=0.8, label="highest")
    axes.set(xlabel="Frequency in MHz", ylabel=f"dB of full scale in {spectra[0].rbw:.0f} Hz", title=f"{len(spectra)} recordings")
    axes.margins(x=0)
    axes.legend()
    figure.savefig(picture)


if __name__ == "__main__":
    main(*sys.argv[1:])
