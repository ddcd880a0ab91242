# SPDX-License-Identifier: MIT
"""Analyses by Dask: the bits of the local ones from every cut of the samples, in this process and in two others."""
import dataclasses
import json
import logging
import os
import pathlib
import pickle
import tempfile
import unittest
import unittest.mock

import dask
import dask.array
import numpy as np
from distributed import Client, LocalCluster

import lumra
from lumra import _distribution
from support import Test, noise

count = 600_000
# The chunks' borders; one chunk is empty.
borders = (0, 1, 7000, 7000, 261_000, 300_001, 599_990, count)
analyses = [
    (lumra.spectrum, dict(sample_rate=1e6)),
    (lumra.spectrum, dict(nfft=1000, overlap=0.7, hold=True, frequency=1e9)),
    (lumra.spectrum, dict(nfft=2**18)),
    (lumra.waterfall, dict(sample_rate=1e6)),
    (lumra.waterfall, dict(rows=3, nfft=5000, window=("kaiser", 9.0))),
    (lumra.level, {}),
]


def chunked(x, at=borders):
    return dask.array.concatenate([dask.array.from_array(x[a:b], max(b - a, 1)) for a, b in zip(at, at[1:])])


def burst(size):
    """A reference that delays can be told from, and what was measured of it."""
    reference = np.convolve(noise(size, np.complex64), np.hanning(9), "same").astype(np.complex64)
    turns = np.exp(2e-7j * np.pi * np.arange(size))
    return reference, (0.5j * np.roll(reference, 3) * turns + 0.01 * noise(size, np.complex64, 2) + 0.1).astype(np.complex64)


def bits(result):
    values = ((field.name, getattr(result, field.name)) for field in dataclasses.fields(result))
    return {name: value.tobytes() if isinstance(value, np.ndarray) else repr(value) for name, value in values}


class Distribution(Test):
    @classmethod
    def setUpClass(cls):
        folder = cls.enterClassContext(tempfile.TemporaryDirectory())
        cls.cluster = cls.enterClassContext(LocalCluster(
            n_workers=2, threads_per_worker=1, dashboard_address=None, host="127.0.0.1", local_directory=folder))
        cls.client = cls.enterClassContext(Client(cls.cluster, set_as_default=False))
        # Failures of tasks are wanted here.
        cls.client.run(lambda: logging.getLogger("distributed").setLevel(logging.CRITICAL))
        cls.folder = pathlib.Path(folder)
        cls.x = noise(count, np.complex64)
        cls.captures = 0, 1000, 261_000, 261_001, 599_999
        lumra.write(cls.folder / "r", cls.x, 1e6, frequency=1e9)
        metadata = json.loads((cls.folder / "r.sigmf-meta").read_text())
        metadata["captures"] = [{"core:sample_start": k, "core:frequency": 1e9 + k} for k in cls.captures]
        (cls.folder / "r.sigmf-meta").write_text(json.dumps(metadata))

    def same(self, call, *streams, **options):
        """Here and by the workers, at once and later, the result has the bits of what the call gives for streams[0]."""
        wanted = bits(call(*streams[0], **options))
        for given in streams[1:]:
            for client in (self.client,) if isinstance(given[0], lumra.Recording) else (None, self.client):
                self.assertEqual(bits(call(*given, client=client, **options)), wanted)
            self.assertEqual(bits(call(*given, client=self.client, compute=False, **options).compute()), wanted)

    def test_arrays_in_chunks(self):
        for x in self.x, np.arange(count) % 77:
            for analysis, options in analyses:
                with self.subTest(analysis.__name__, dtype=x.dtype, **options):
                    self.same(analysis, (x,), (chunked(x),), **options)

    def test_recordings_with_gaps(self):
        recording = lumra.Recording(self.folder / "r")
        self.assertEqual(len(recording._stretches()), len(self.captures))
        lazy = recording.to_dask(100_000)
        self.assertEqual((lazy.chunks, lazy.dtype), (((100_000,) * 6,), np.complex64))
        self.assertEqual(self.client.compute(lazy).result().tobytes(), self.x.tobytes())
        # No samples are in the graph.
        self.assertLess(len(pickle.dumps(lazy)), 10_000)
        with unittest.mock.patch.multiple(_distribution, _CHUNKS=7, _LEAST_CHUNK=1):
            for analysis, options in analyses:
                if "sample_rate" not in options and "frequency" not in options:
                    with self.subTest(analysis.__name__, **options):
                        self.same(analysis, (recording,), (recording,), **options)

    def test_error_vectors(self):
        reference, measured = burst(count)
        other = dask.array.from_array(measured, 250_000)
        for align in (), ("gain", "dc"), ("gain", "delay", "frequency", "dc"):
            with self.subTest(align=align):
                self.same(lumra.evm, (reference, measured), (chunked(reference), other), align=align, sample_rate=1e6)
        whole = lumra._lumra.evm(reference, measured, 15, 1e6, 1)
        self.assertEqual(lumra.evm(reference, other, align=("gain", "delay", "frequency", "dc"), sample_rate=1e6), lumra.Evm(*whole))
        for name, x in ("reference", reference), ("measured", measured):
            lumra.write(self.folder / name, x, 1e6)
        pair = [lumra.Recording(self.folder / name) for name in ("reference", "measured")]
        self.same(lumra.evm, pair, pair, (pair[0].to_dask(), pair[1]), align="delay")
        short = [x[:2000] for x in (reference, measured)]
        self.same(lumra.evm, short, [dask.array.from_array(x, 900) for x in short], align=["gain", "delay"])

    def test_refusals(self):
        recording, lazy = lumra.Recording(self.folder / "r"), chunked(self.x)
        for call, kind, words, options in [
            (lumra.spectrum, TypeError, "client is 3 (int) & distributed.Client", dict(x=lazy, client=3)),
            (lumra.level, TypeError, "x is ndarray & client", dict(x=self.x, client=self.client)),
            (lumra.level, ValueError, "compute is False", dict(x=self.x, compute=False)),
            (lumra.level, ValueError, "x is empty", dict(x=lazy[:0])),
            (lumra.level, ValueError, "compute_chunk_sizes", dict(x=lazy[lazy.real > 0])),
            (lumra.level, ValueError, "x is of shape (2, 3)", dict(x=dask.array.zeros((2, 3)))),
            (lumra.level, TypeError, "x is a Dask object", dict(x=dask.delayed(3))),
            (lumra.spectrum, ValueError, "nfft is 600001 & 600000", dict(x=lazy, nfft=600_001)),
            (lumra.waterfall, ValueError, "window is 'no such'", dict(x=lazy, window="no such")),
            (lumra.spectrum, ValueError, "threads", dict(x=recording, client=self.client, threads=0)),
            (lumra.level, ValueError, "threads is 0", dict(x=recording, client=self.client, threads=0)),
            (lumra.evm, ValueError, "measured is of 3 samples & 600000", dict(reference=lazy, measured=[1, 2, 3])),
            (lumra.evm, ValueError, "sample_rate is 0.0", dict(reference=lazy, measured=lazy, sample_rate=0)),
        ]:
            self.refused(kind, words, call, **options)

    def test_failures_of_workers(self):
        lumra.write(self.folder / "gone", self.x, 1e6)
        gone = lumra.Recording(self.folder / "gone")
        os.unlink(self.folder / "gone.sigmf-data")
        self.refused(lumra.Error, "gone", lumra.level, gone, client=self.client)
        shorter = chunked(self.x).map_blocks(lambda block: block[1:], dtype=np.complex64)
        for client in None, self.client:
            self.refused(ValueError, "a chunk is of shape", lumra.level, shorter, client=client)
        later = lumra.level(gone, client=self.client, compute=False)
        self.refused(lumra.Error, "gone", later.compute)


if __name__ == "__main__":
    unittest.main()
