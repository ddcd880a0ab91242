# SPDX-License-Identifier: MIT
"""Reading and writing of recordings."""
import contextlib
import copy
import datetime
import functools
import json
import math
import operator
import os
import tempfile
from typing import NamedTuple, Optional

import numpy as np

from lumra import _lumra

_EPOCH = datetime.datetime(1970, 1, 1, tzinfo=datetime.timezone.utc)


class Capture(NamedTuple):
    """Samples that were recorded with one setting."""

    start: int  #: First sample.
    samples: int
    frequency: Optional[float]  #: Centre in hertz, None where unknown.
    time: Optional[datetime.datetime]  #: Of the first sample in UTC, None where unknown.


class Annotation(dict):
    """A part of a recording that somebody has marked: SigMF's fields as a dict, the usual ones as attributes.

    Attributes
    ----------
    start : int
        First sample, counted as those of the recording are.
    samples : int or None
        None: up to the end.
    low, high : float or None
        Edges in hertz.
    label, comment : str
        "" where there is none.
    """

    def __init__(self, fields, start):
        super().__init__(fields)
        self.start = start
        self.samples = self.get("core:sample_count")
        self.low, self.high = self.get("core:freq_lower_edge"), self.get("core:freq_upper_edge")
        self.label, self.comment = self.get("core:label", ""), self.get("core:comment", "")

    def __reduce__(self):
        return type(self), (dict(self), self.start)


def _time(since_1970):
    if since_1970 is None:
        return None
    try:
        return _EPOCH + datetime.timedelta(seconds=since_1970[0], microseconds=round(since_1970[1] * 1e6))
    except OverflowError:  # a year that datetime does not have
        return None


class Recording:
    """A recording on disk, whose samples are read when they are asked for.

    Samples are scaled so that full scale is 1, and are complex64, or float32 where the file's are real.

    Parameters
    ----------
    path : str or os.PathLike
        A SigMF recording by either of its files or their common stem, a SigMF archive (.sigmf), a WAV file, or a raw
        file, which needs `datatype` and `sample_rate`.
    datatype : str, optional
        As SigMF names it, "ci16_le" for one. For raw files, or in place of what the metadata say.
    sample_rate : float, optional
        In hertz; the same.
    frequency : float, optional
        Centre in hertz of all captures; the same.
    capture : int, optional
        The one capture to read, from 0; all of them by default.
    channel : int, optional
        Of several interleaved ones, from 0.

    Examples
    --------
    >>> import lumra, numpy
    >>> lumra.write("example", numpy.ones(1000, numpy.complex64), 1e6, frequency=2.4e9)
    >>> recording = lumra.Recording("example")
    >>> recording
    <lumra.Recording example: 1000 samples of cf32_le at 1e+06 Hz around 2.4e+09 Hz>
    >>> recording[-2:]
    array([1.+0.j, 1.+0.j], dtype=complex64)
    """

    def __init__(self, path, *, datatype=None, sample_rate=None, frequency=None, capture=None, channel=0):
        try:
            self._path = os.fsdecode(path)
        except TypeError:
            raise TypeError(f"path is {path!r} ({type(path).__name__}); give the name of a file") from None
        if "\0" in self._path or not self._path:
            raise ValueError(f"path is {self._path!r}; give the name of a file")
        self._said = dict(
            datatype=datatype, sample_rate=sample_rate, frequency=frequency, capture=capture, channel=channel)
        # "-" is a file here, not the standard input.
        opened = os.path.join(".", "-") if self._path == "-" else self._path
        self._file = _lumra.RecordingFile(opened, datatype, sample_rate, frequency, capture, channel)

    def __reduce__(self):
        return _open, (self._path, self._said)

    @property
    def path(self):
        """str : The path that was given."""
        return self._path

    @property
    def datatype(self):
        """str : How samples lie in the file, as SigMF names it; of a WAV file its own name for it."""
        return self._file.datatype

    @property
    def sample_rate(self):
        """float : Samples per second."""
        return self._file.sample_rate

    @property
    def frequency(self):
        """float or None : Centre in hertz; None where it is unknown, or where captures have different ones."""
        return self._file.frequency

    @property
    def samples(self):
        """int : Number of samples, also len()."""
        return self._file.samples

    @property
    def channels(self):
        """int : How many channels are interleaved in the file, one of which is read."""
        return self._file.channels

    @property
    def duration(self):
        """float : In seconds."""
        return self.samples / self.sample_rate

    @property
    def dtype(self):
        """numpy.dtype : Of the samples that are read: complex64 or float32."""
        return np.dtype(np.complex64 if self._file.is_complex else np.float32)

    @functools.cached_property
    def captures(self):
        """tuple of Capture : What was recorded with one setting each."""
        return tuple(Capture(start, samples, frequency, _time(time))
                     for start, samples, frequency, time in self._file.captures())  # fmt: skip

    @functools.cached_property
    def annotations(self):
        """tuple of Annotation : What is marked in the samples."""
        listed = self._metadata.get("annotations", [])
        return tuple(Annotation(listed[item], start) for start, item in self._file.annotations())

    @functools.cached_property
    def _metadata(self):
        return json.loads(self._file.metadata())

    @property
    def metadata(self):
        """dict : All that the SigMF metadata say, a copy; empty for other files."""
        return copy.deepcopy(self._metadata)

    def _stretches(self):
        """First sample and number of samples of each stretch without a gap or a new frequency in it."""
        return self._file.stretches()

    def __len__(self):
        return self.samples

    def __getitem__(self, key):
        if isinstance(key, slice):
            if key.step is not None and operator.index(key.step) != 1:
                raise ValueError(f"the step of {key} is {key.step}; a recording is read with a step of 1")
            start, stop, _ = key.indices(self.samples)
            return self.read(start, max(stop - start, 0))
        try:
            index = operator.index(key)
        except TypeError:
            raise TypeError(f"the index is {key!r} ({type(key).__name__}); give a whole number or a slice") from None
        if not -self.samples <= index < self.samples:
            raise IndexError(f"the index is {index}; the recording has {self.samples} samples")
        return self.read(index % self.samples, 1)[0]

    def __array__(self, dtype=None):
        return self.read() if dtype is None else self.read().astype(dtype, copy=False)

    def read(self, start=0, count=None, out=None):
        """Reads samples.

        Parameters
        ----------
        start : int, optional
            The first one.
        count : int, optional
            How many; all up to the end by default, or as many as `out` has.
        out : numpy.ndarray, optional
            Written and returned; of the recording's `dtype`.

        Returns
        -------
        numpy.ndarray
            `count` samples.
        """
        if count is None and isinstance(out, np.ndarray) and out.ndim == 1:
            count = len(out)
        return self._file.read(start, count, out)

    def blocks(self, count):
        """Iterates over the samples in blocks.

        Parameters
        ----------
        count : int
            Samples of a block; the last one may have fewer.

        Yields
        ------
        numpy.ndarray
            The next samples, in an array of their own.
        """
        count = _positive("count", count)
        return self._blocks(count)

    def _blocks(self, count):
        reader = _lumra.BlockReader(self._file, 0, self.samples)
        for done in range(0, self.samples, count):
            yield reader.next(min(count, self.samples - done))

    def to_dask(self, chunk=2**24):
        """The samples as a Dask array, each chunk of which is read where it is computed.

        Parameters
        ----------
        chunk : int, optional
            Samples of a chunk.

        Returns
        -------
        dask.array.Array
            Of the recording's `dtype`. Its tasks hold the path and the range of samples, not the samples.
        """
        from lumra import _distribution

        return _distribution.array_of(self, _positive("chunk", chunk))

    def __repr__(self):
        around = "" if self.frequency is None else f" around {self.frequency:g} Hz"
        return (f"<lumra.Recording {self.path}: {self.samples} samples of {self.datatype} at {self.sample_rate:g} Hz"
                f"{around}>")  # fmt: skip


def _open(path, said):
    return Recording(path, **said)


def _positive(name, value):
    try:
        number = operator.index(value)
    except TypeError:
        raise TypeError(f"{name} is {value!r} ({type(value).__name__}); give a whole number") from None
    if number < 1:
        raise ValueError(f"{name} is {number}; give 1 or more")
    return number


def _finite(name, value):
    try:
        number = float(value)
    except (TypeError, ValueError):
        raise TypeError(f"{name} is {value!r} ({type(value).__name__}); give a number") from None
    if not math.isfinite(number):
        raise ValueError(f"{name} is {number}; give a finite number")
    return number


_usual_datatypes = {"complex64": "cf32_le", "float32": "rf32_le", "float16": "rf32_le"}


def _usual_datatype(dtype):
    return _usual_datatypes.get(dtype.newbyteorder("=").name, "cf64_le" if dtype.kind == "c" else "rf64_le")


def write(path, x, sample_rate, *, frequency=None, datatype=None, annotations=(), description=None):
    """Writes a SigMF recording: both of its files, or none.

    Files that are there already are replaced.

    Parameters
    ----------
    path : str or os.PathLike
        The stem of both files, or the name of either.
    x : array_like
        Samples of one dimension, finite, of full scale 1. Those beyond it are limited where the type has integers.
    sample_rate : float
        In hertz.
    frequency : float, optional
        Centre in hertz.
    datatype : str, optional
        As SigMF names it, "ci16_le" for one; by default what holds the samples as they are.
    annotations : iterable of dict, optional
        SigMF's fields of each, "core:sample_start" among them.
    description : str, optional
        What the recording is.

    Examples
    --------
    >>> import lumra
    >>> lumra.write("example", [0.5, -0.5], 48e3, datatype="ri16_le", description="two samples",
    ...             annotations=[{"core:sample_start": 0, "core:sample_count": 1, "core:label": "first"}])
    >>> lumra.Recording("example").annotations[0].label
    'first'
    """
    rate = _finite("sample_rate", sample_rate)
    if rate <= 0:
        raise ValueError(f"sample_rate is {rate}; give hertz above 0")
    samples = np.asarray(x)
    name = _lumra.datatype_name(_usual_datatype(samples.dtype) if datatype is None else datatype)
    capture = {"core:sample_start": 0}
    if frequency is not None:
        capture["core:frequency"] = _finite("frequency", frequency)
    about = {"core:datatype": name, "core:sample_rate": rate, "core:version": "1.2.0"}
    if description is not None:
        if not isinstance(description, str):
            raise TypeError(f"description is {description!r} ({type(description).__name__}); give a text")
        about["core:description"] = description
    metadata = {"global": about, "captures": [capture], "annotations": _annotations(annotations)}
    try:
        text = json.dumps(metadata, indent=2, allow_nan=False) + "\n"
    except (TypeError, ValueError) as reason:
        raise ValueError(f"annotations is {annotations!r}; give what JSON can hold: {reason}") from None
    try:
        stem, suffix = os.path.splitext(os.fsdecode(path))
    except TypeError:
        raise TypeError(f"path is {path!r} ({type(path).__name__}); give the name of a file") from None
    if suffix not in (".sigmf-data", ".sigmf-meta"):
        stem += suffix
    _write_both(stem, samples, name, text)


def _annotations(given):
    listed = []
    for each in given:
        start = each.get("core:sample_start") if isinstance(each, dict) else None
        if not isinstance(start, int) or start < 0:
            raise ValueError(f"annotations holds {each!r}; give dicts with a core:sample_start from 0")
        listed.append(dict(each))
    return sorted(listed, key=lambda each: each["core:sample_start"])


def _write_both(stem, samples, datatype, text):
    from lumra._failures import Error

    folder = os.path.dirname(stem) or "."
    try:
        with contextlib.ExitStack() as undone:
            # Made in a folder beside their places, so that moving them there is all that can fail in between.
            made = undone.enter_context(tempfile.TemporaryDirectory(prefix=".lumra-", dir=folder))
            data, meta = os.path.join(made, "data"), os.path.join(made, "meta")
            with open(data, "xb") as file:
                _lumra.write_samples(file.fileno(), samples, datatype)
            with open(meta, "x", encoding="utf-8") as file:
                file.write(text)
            os.replace(data, stem + ".sigmf-data")
            try:
                os.replace(meta, stem + ".sigmf-meta")
            except OSError:
                os.unlink(stem + ".sigmf-data")
                raise
    except (OSError, ValueError) as reason:
        if isinstance(reason, ValueError) and not str(reason).startswith("embedded null"):
            raise
        raise Error(f"{stem} cannot be written: {reason}") from reason
