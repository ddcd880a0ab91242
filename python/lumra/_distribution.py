# SPDX-License-Identifier: MIT
"""Analyses by Dask: accumulators of chunks, made where the samples are, and merged in a tree."""
import functools
import math
import os
import uuid

import numpy as np

from lumra import _lumra
from lumra._accumulation import Block, accumulate, cut, merge, parts_of
from lumra._comparison import as_stream, measure, require_equal
from lumra._levels import Evm, LevelMeter
from lumra._recordings import Recording, _open
from lumra._spectra import SpectrumEstimator, _join_rows, _require_segment, _row_parts

try:
    import dask
    import dask.array
except ImportError as reason:
    raise ImportError("Dask arrays and clients need Dask: install python3-dask and python3-distributed, or "
                      "dask[distributed] with pip") from reason  # fmt: skip

_MERGED_AT_ONCE = 16
_CHUNKS, _LEAST_CHUNK, _MOST_CHUNK = 64, 2**22, 2**24


def array_of(recording, chunks):
    """A Dask array whose tasks hold path and range."""
    (sizes,) = chunks = dask.array.core.normalize_chunks(chunks, (recording.samples,))
    name = f"recording-{uuid.uuid4().hex}"
    firsts = np.cumsum((0, *sizes)).tolist()
    graph = {(name, k): (_read, _named(recording), firsts[k], size) for k, size in enumerate(sizes)}
    return dask.array.Array(graph, name, chunks, recording.dtype)


def _named(recording):
    """What opens the recording on a machine that has its folder under the same name."""
    return functools.partial(_open, os.path.abspath(recording.path), recording._said)


def _read(opened, first, count):
    return opened().read(first, count)


class _Chunks:
    """Streams side by side in chunks, of which accumulators are made."""

    def __init__(self, sizes):
        self.borders = np.cumsum((0, *sizes)).tolist()
        self.samples = self.borders[-1]

    def reduce(self, rows, begin, finish, streams=None):
        """A Dask object for the pieces of all rows, complete and in order; of the first so many streams."""
        tasks = [self._accumulated(chunk, streams, parts=here, begin=begin, finish=finish)
                 for chunk, here in enumerate(cut(parts_of(rows), self.borders)) if here]  # fmt: skip
        join = dask.delayed(functools.partial(merge, finish=finish))
        while len(tasks) > 1:
            tasks = [join(tasks[k : k + _MERGED_AT_ONCE]) for k in range(0, len(tasks), _MERGED_AT_ONCE)]
        return tasks[0]


class _Arrays(_Chunks):
    """Dask arrays of equal chunks."""

    def __init__(self, arrays):
        super().__init__(arrays[0].chunks[0])
        self._arrays = arrays

    def _accumulated(self, chunk, streams, **how):
        first, count = self.borders[chunk], self.borders[chunk + 1] - self.borders[chunk]
        work = dask.delayed(functools.partial(_accumulate_blocks, first=first, count=count, **how))
        return work(*[x.blocks[chunk] for x in self._arrays[:streams]])

    def figures(self, first, count, align, sample_rate):
        return dask.delayed(_compare_held)(*[x[first : first + count] for x in self._arrays], align, sample_rate)


def _compare_held(*records_and_options):
    return _lumra.evm(*records_and_options, 1)


def _accumulate_blocks(*blocks, first, count, **how):
    for block in blocks:
        if np.shape(block) != (count,):
            raise ValueError(f"a chunk is of shape {np.shape(block)}; its Dask array says {(count,)}")
    return accumulate([Block(block, first) for block in blocks], **how)


class _Recordings(_Chunks):
    """Recordings of equal length."""

    def __init__(self, recordings, least=0):
        samples = recordings[0].samples
        chunk = max(min(max(samples // _CHUNKS, _LEAST_CHUNK), _MOST_CHUNK), least)
        super().__init__(min(chunk, samples - first) for first in range(0, samples, chunk))
        self._opened = [_named(recording) for recording in recordings]

    def _accumulated(self, chunk, streams, **how):
        return dask.delayed(functools.partial(_accumulate_read, self._opened[:streams], **how))()

    def figures(self, *part_and_options):
        return dask.delayed(functools.partial(_compare_read, self._opened, *part_and_options))()


def _accumulate_read(opened, **how):
    return accumulate([each() for each in opened], **how)


def _compare_read(opened, first, count, align, sample_rate):
    return _lumra.evm(*[_read(each, first, count) for each in opened], align, sample_rate, 1)


def _require_client(client):
    if client is None:
        return
    try:
        from distributed import Client
    except ImportError as reason:
        raise ImportError(
            "a client needs Dask's scheduler: install python3-distributed, or distributed with pip") from reason
    if not isinstance(client, Client):
        raise TypeError(f"client is {client!r} ({type(client).__name__}); give a distributed.Client")
    if client.asynchronous:
        raise ValueError(f"client is {client!r}, which is asynchronous; give one that is not")


def _computed(graph, client):
    return graph.compute() if client is None else client.compute(graph).result()


def _array(name, x):
    """As a Dask array, whose chunks have sizes."""
    if not isinstance(x, dask.array.Array):
        x = getattr(x, "data", None)  # of a labelled array
        if not isinstance(x, dask.array.Array):
            raise TypeError(f"{name} is a Dask object, but no array; give a dask.array.Array")
    if x.ndim != 1:
        raise ValueError(f"{name} is of shape {x.shape}; give an array of one dimension")
    if math.isnan(x.shape[0]):
        raise ValueError(f"{name} has chunks of unknown sizes; call its compute_chunk_sizes() before")
    return x


class _Stream:
    """What an analysis runs over."""

    def __init__(self, x, client, sample_rate=1.0, frequency=0.0, least_chunk=0):
        _require_client(client)
        if isinstance(x, Recording):
            self.sample_rate, self.frequency = x.sample_rate, 0.0 if x.frequency is None else x.frequency
            self.stretches, self.chunks = x._stretches(), _Recordings([x], least_chunk)
        else:
            x = _array("x", x)
            self.sample_rate, self.frequency, self.chunks = sample_rate, frequency, _Arrays([x])
            self.stretches = [(0, self.chunks.samples)]
        self.real = x.dtype.kind != "c"
        self._client = client

    def give(self, rows, begin, finish, join, compute):
        """join(values of all rows)."""
        graph = dask.delayed(functools.partial(_join, join))(self.chunks.reduce(rows, begin, finish))
        return _computed(graph, self._client) if compute else graph


def _join(join, pieces):
    return join([piece.value for piece in pieces])


def _only(values):
    (value,) = values
    return value


def _begin_spectra(stream, threads, **options):
    """Makes estimators for one thread; refuses wrong options now."""
    begin = functools.partial(SpectrumEstimator, stream.sample_rate, real=stream.real, **options)
    begin(threads=threads)
    return functools.partial(begin, threads=1)


def spectrum(x, sample_rate, nfft, window, overlap, hold, frequency, threads, client, compute):
    stream = _Stream(x, client, sample_rate, frequency, _least_chunk(nfft))
    begin = _begin_spectra(
        stream, threads, nfft=nfft, window=window, overlap=overlap, hold=hold, frequency=stream.frequency)
    _require_segment(stream.stretches, nfft)
    row = [(first, count, first) for first, count in stream.stretches]
    return stream.give([row], begin, SpectrumEstimator.result, _only, compute)


def waterfall(x, sample_rate, nfft, window, overlap, rows, frequency, threads, client, compute):
    stream = _Stream(x, client, sample_rate, frequency, _least_chunk(nfft))
    begin = _begin_spectra(stream, threads, nfft=nfft, window=window, overlap=overlap, frequency=stream.frequency)
    _require_segment(stream.stretches, nfft)
    per_row, parted = _row_parts(stream.stretches, nfft, overlap, rows)
    join = functools.partial(
        _join_rows, parted=[parts[:1] for parts in parted], sample_rate=stream.sample_rate, per_row=per_row)
    return stream.give(parted, begin, SpectrumEstimator.result, join, compute)


def _least_chunk(nfft):
    """Samples of unfinished segments at the borders move with the accumulators: a small share of a chunk."""
    return 8 * nfft if isinstance(nfft, int) else 0


def _begin_level(start, origin):
    return LevelMeter(start, threads=1)


def level(x, threads, client, compute):
    stream = _Stream(x, client)
    _lumra.number_of_threads(threads)  # refuses a wrong one now
    n = stream.chunks.samples
    if not n:
        raise ValueError("x is empty; give one sample or more")
    return stream.give([[(0, n, 0)]], _begin_level, LevelMeter.result, _only, compute)


def evm(reference, measured, align, sample_rate, client, compute):
    _require_client(client)
    work = functools.partial(_compare, _pair(reference, measured), align, sample_rate)
    return work(client) if compute else dask.delayed(functools.partial(_compare_in_task, work))()


def _pair(reference, measured):
    given = {"reference": reference, "measured": measured}
    if all(isinstance(x, Recording) for x in given.values()):
        require_equal(reference.samples, measured.samples)
        return _Recordings([reference, measured])
    arrays = {name: _array(name, x) for name, x in given.items() if dask.is_dask_collection(x)}
    (chunks,) = next(iter(arrays.values())).chunks
    chunks = (tuple(size for size in chunks if size) or (0,),)
    streams = [arrays.get(name) if name in arrays else as_stream(name, x) for name, x in given.items()]
    require_equal(*map(len, streams))
    return _Arrays([_chunked(x, chunks) for x in streams])


def _chunked(x, chunks):
    if isinstance(x, Recording):
        return array_of(x, chunks)
    return x.rechunk(chunks) if isinstance(x, dask.array.Array) else dask.array.from_array(x.x, chunks)


class _Pair:
    """Reference and measured samples that are compared by Dask's workers, round by round."""

    def __init__(self, chunks, client):
        self._chunks, self._client, self.samples = chunks, client, chunks.samples

    def figures(self, *part_and_options):
        return _computed(self._chunks.figures(*part_and_options), self._client)

    def of_reference(self, rows, begin, finish):
        return self._values(rows, begin, finish, 1)

    def of_both(self, rows, begin, finish):
        return self._values(rows, begin, finish, 2)

    def _values(self, *how):
        return [piece.value for piece in _computed(self._chunks.reduce(*how), self._client)]


def _compare(chunks, align, sample_rate, client):
    return Evm(*measure(_Pair(chunks, client), align, sample_rate))


def _compare_in_task(work):
    """Each round is a graph of its own, which the worker that has this task hands to its scheduler."""
    try:
        from distributed import get_worker, worker_client

        get_worker()
    except (ImportError, ValueError):
        return work(None)
    with worker_client() as client:
        return work(client)
