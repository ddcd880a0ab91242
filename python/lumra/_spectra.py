# SPDX-License-Identifier: MIT
"""Averaged power spectra and waterfalls."""
import dataclasses
import functools
from typing import NamedTuple, Optional, Tuple

import numpy as np

from lumra import _lumra
from lumra._accumulator import Accumulator, one_dimension
from lumra._recordings import Recording, _positive


def _decibels(power):
    with np.errstate(divide="ignore", invalid="ignore"):
        return 10 * np.log10(power)


def _frozen(array):
    array.setflags(write=False)
    return array


class Peak(NamedTuple):
    """The top of a line."""

    frequency: float  #: In hertz.
    power: float


class Harmonic(NamedTuple):
    """A harmonic of a tone."""

    frequency: float  #: Where it falls in the band, in hertz.
    level_dbc: float  #: Relative to the tone; NaN where it cannot be told from another line.


class Tone(NamedTuple):
    """What can be measured of a carrier. Levels that do not exist are NaN."""

    frequency: float  #: In hertz.
    power: float  #: Integrated over the line.
    snr_db: float  #: To noise.
    sinad_db: float  #: To noise, harmonics, image and other lines.
    thd_db: float  #: Of the harmonics to the carrier.
    sfdr_db: float  #: To the strongest other line.
    image_db: float  #: Of the line at the mirrored offset to the carrier.
    dc_db: float  #: Of the line in the middle of the band to the carrier.
    enob: float  #: Effective bits.
    harmonics: Tuple[Harmonic, ...]  #: From the second on.


@dataclasses.dataclass(frozen=True, eq=False, repr=False)
class Spectrum:
    """An averaged power spectrum. Arrays are in ascending frequency and read-only.

    Attributes
    ----------
    power : numpy.ndarray
        Mean power of each bin: a tone of amplitude 1 on a bin has 1. Of real samples that of both sides.
    max_hold, min_hold : numpy.ndarray or None
        The largest and the smallest power of any segment, where they were held.
    sample_rate : float
        In hertz.
    nfft : int
        Points of a segment.
    window : str or tuple
        Its name.
    overlap : float
        Fraction of a segment that the next one shares.
    segments : int
        How many were averaged.
    enbw : float
        Equivalent noise bandwidth of the window in bins.
    center : float
        The frequency in hertz that was added to the axis.
    sides : int
        2 for complex samples, 1 for real ones.
    """

    power: np.ndarray
    max_hold: Optional[np.ndarray]
    min_hold: Optional[np.ndarray]
    sample_rate: float
    nfft: int
    window: object
    overlap: float
    segments: int
    enbw: float
    center: float
    sides: int

    def __post_init__(self):
        for array in (self.power, self.max_hold, self.min_hold):
            if array is not None:
                _frozen(array)

    def __getstate__(self):
        return {field.name: getattr(self, field.name) for field in dataclasses.fields(self)}

    def __setstate__(self, state):
        self.__init__(**state)

    @property
    def df(self):
        """float : From a bin to the next, in hertz."""
        return self.sample_rate / self.nfft

    @property
    def rbw(self):
        """float : Resolution bandwidth, which is the noise bandwidth of a bin, in hertz."""
        return self.enbw * self.df

    @functools.cached_property
    def frequency(self):
        """numpy.ndarray : Of each bin in hertz."""
        first = -(self.nfft // 2) if self.sides == 2 else 0
        return _frozen(np.arange(first, first + len(self.power)) * self.df + self.center)

    @functools.cached_property
    def level(self):
        """numpy.ndarray : Power in dB of full scale; minus infinity where the power is 0."""
        return _frozen(_decibels(self.power))

    @functools.cached_property
    def density(self):
        """numpy.ndarray : Power per hertz."""
        return _frozen(self.power / self.rbw)

    @functools.cached_property
    def _figures(self):
        return _lumra.Figures(self.power, self.sides, self.nfft, self.sample_rate, self.center, self.enbw, self.window)

    def channel_power(self, center, bandwidth):
        """Power of a channel, linear. Bins at its edges count by the part of them that is inside.

        Parameters
        ----------
        center, bandwidth : float
            In hertz; the channel lies inside of the band.

        Returns
        -------
        float

        Examples
        --------
        >>> import lumra, numpy
        >>> tone = numpy.exp(0.25j * numpy.pi * numpy.arange(8192))
        >>> round(lumra.spectrum(tone, 1e6).channel_power(125e3, 10e3), 6)
        1.0
        """
        return self._figures.channel_power(center, bandwidth)

    def occupied_bandwidth(self, fraction=0.99):
        """The band that leaves (1 - fraction) / 2 of the power below and as much above.

        Parameters
        ----------
        fraction : float, optional
            Above 0, to 1.

        Returns
        -------
        low, high : float
            In hertz; NaN where there is no power.
        """
        return self._figures.occupied_bandwidth(fraction)

    def adjacent_power(self, center, bandwidth, offsets, adjacent_bandwidth=None):
        """Powers of the channels beside a main channel, relative to it.

        Parameters
        ----------
        center, bandwidth : float
            Of the main channel, in hertz.
        offsets : sequence of float
            From centre to centre, in hertz.
        adjacent_bandwidth : float, optional
            Of the others; that of the main channel by default.

        Returns
        -------
        list of tuple
            (offset, lower, upper) in hertz and dB; NaN for a channel beyond the band.
        """
        return self._figures.adjacent_power(center, bandwidth, offsets, adjacent_bandwidth)

    def peaks(self, count=10, threshold=None, distance=None):
        """The highest peaks, highest first, with frequency and power interpolated between the bins.

        Parameters
        ----------
        count : int, optional
            At most so many.
        threshold : float, optional
            A power that they are above.
        distance : float, optional
            In hertz: of two that are closer the higher one stays.

        Returns
        -------
        list of Peak

        Examples
        --------
        >>> import lumra, numpy
        >>> tone = numpy.exp(2j * numpy.pi * 0.1 * numpy.arange(8192))
        >>> [(round(peak.frequency, 3), round(peak.power, 6)) for peak in lumra.spectrum(tone, 1e6).peaks(1)]
        [(100000.0, 1.0)]
        """
        return [Peak(*each) for each in self._figures.peaks(count, threshold, distance)]

    def tone(self, frequency=None, harmonics=5):
        """Measures a carrier, its harmonics and what else there is.

        Parameters
        ----------
        frequency : float, optional
            In hertz: the line nearest to it; the strongest line by default.
        harmonics : int, optional
            The highest order.

        Returns
        -------
        Tone
        """
        *figures, levels = self._figures.tone(frequency, harmonics)
        return Tone(*figures, tuple(Harmonic(*each) for each in levels))

    def plot(self, ax=None):
        """Draws the levels over frequency with Matplotlib.

        Parameters
        ----------
        ax : matplotlib.axes.Axes, optional
            Where; a new figure's by default.

        Returns
        -------
        matplotlib.axes.Axes
        """
        from lumra import _plotting

        return _plotting.spectrum(self, ax)

    def to_xarray(self):
        """The powers as an xarray.Dataset over the coordinate "frequency".

        Returns
        -------
        xarray.Dataset
        """
        from lumra import _labelled

        return _labelled.spectrum(self)

    def __repr__(self):
        return (f"<lumra.Spectrum of {len(self.power)} bins, {self.frequency[0]:g} to {self.frequency[-1]:g} Hz, "
                f"RBW {self.rbw:g} Hz, {self.window} window, mean of {self.segments} segment(s)>")  # fmt: skip


class SpectrumEstimator(Accumulator):
    """The averaged power spectrum of a stream, as an accumulator.

    Streams may be cut into calls and into estimators that are merged: the result has the same bits, with any number of
    threads. Estimators can be pickled and copied. An interrupted `add` may have added part of its samples.

    Parameters
    ----------
    sample_rate : float, optional
        In hertz.
    nfft : int, optional
        Points of a segment, 16 to 2**27.
    window : str or tuple, optional
        A name as `window` takes it.
    overlap : float, optional
        Fraction of a segment that the next one shares, 0 or more, below 1.
    hold : bool, optional
        Whether the largest and the smallest power of each bin are kept.
    frequency : float, optional
        Added to the frequencies, in hertz.
    start : int, optional
        Position in the stream of the first sample that is added.
    origin : int, optional
        Position from which segments count: 0, or that of the last gap before `start`.
    real : bool, optional
        Whether samples are real, which gives a spectrum of one side.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Examples
    --------
    >>> import lumra, numpy
    >>> x = numpy.exp(0.5j * numpy.pi * numpy.arange(4096))
    >>> whole = lumra.SpectrumEstimator(1e6, nfft=64).add(x)
    >>> left = lumra.SpectrumEstimator(1e6, nfft=64).add(x[:1000])
    >>> right = lumra.SpectrumEstimator(1e6, nfft=64, start=1000).add(x[1000:])
    >>> bool((left.merge(right).result().power == whole.result().power).all())
    True
    """

    __slots__ = ("_options",)

    def __init__(self, sample_rate=1.0, *, nfft=4096, window="flattop", overlap=0.5, hold=False, frequency=0.0,
                 start=0, origin=0, real=False, threads=None):  # fmt: skip
        hold, real = bool(hold), bool(real)
        self._of = _lumra.Average(
            sample_rate, nfft, window, overlap, hold, frequency, start, origin, real, threads)
        self._options = (sample_rate, nfft, window, overlap, hold, frequency, real, threads)

    @property
    def segments(self):
        """int : How many are complete."""
        return self._of.where()[2]

    def gap(self):
        """Ends the present run of samples: the next one begins new segments.

        Returns
        -------
        SpectrumEstimator
            This one.
        """
        self._of.gap()
        return self

    def result(self):
        """The spectrum of the segments that are complete.

        Returns
        -------
        Spectrum
        """
        rate, nfft, window, overlap, _, frequency, _, _ = self._options
        power, highest, lowest, sides, segments, enbw = self._of.read()
        return Spectrum(
            power, highest, lowest, float(rate), int(nfft), window, float(overlap), segments, enbw, float(frequency),
            sides)

    def __getstate__(self):
        return self._options, self._of.save()

    def __setstate__(self, state):
        options, saved = state
        rate, nfft, window, overlap, hold, frequency, real, threads = options
        self.__init__(rate, nfft=nfft, window=window, overlap=overlap, hold=hold, frequency=frequency, real=real,
                      threads=threads)  # fmt: skip
        self._of.load(saved)

    def __repr__(self):
        rate, nfft, window, *_ = self._options
        start, samples, segments = self._of.where()
        return (f"<lumra.SpectrumEstimator at {rate:g} Hz, {nfft} points, {window} window: {samples} samples from "
                f"{start} on, {segments} segment(s)>")  # fmt: skip


class _Stream:
    """What an analysis runs over: an array or a recording, in stretches without a gap."""

    def __init__(self, x, sample_rate, frequency):
        self.of = one_dimension(x)
        self.real = self.of.dtype.kind != "c"
        if isinstance(x, Recording):
            self.sample_rate, self.frequency = x.sample_rate, 0.0 if x.frequency is None else x.frequency
            self.stretches = x._stretches()
        else:
            self.sample_rate, self.frequency, self.stretches = sample_rate, frequency, [(0, len(self.of))]


def _segments_of(stretches, nfft, overlap):
    """The step between segments, and how many each of the stretches has."""
    step = nfft - int(overlap * nfft)
    return step, [(count - nfft) // step + 1 if count >= nfft else 0 for _, count in stretches]


def _require_segment(stretches, nfft):
    longest = max((count for _, count in stretches), default=0)
    if nfft > longest:
        raise ValueError(f"nfft is {nfft}; x has {longest} samples without a gap, so give at most that")


def spectrum(x, sample_rate=1.0, *, nfft=4096, window="flattop", overlap=0.5, hold=False, frequency=0.0, threads=None,
             client=None, compute=True):  # fmt: skip
    """The averaged power spectrum of a record.

    Equal to `scipy.signal.welch` with `detrend=False, scaling="spectrum"`, two-sided for complex samples and one-sided
    for real ones, in ascending frequency.

    Parameters
    ----------
    x : array_like, Recording or dask.array.Array
        Samples of one dimension. A recording brings its rate and frequency. Its segments end where a capture does,
        unless the next one continues it by its datetime, at the same frequency.
    sample_rate : float, optional
        In hertz.
    nfft : int, optional
        Points of a segment, 16 to 2**27, at most the length of the record.
    window : str or tuple, optional
        A name as `window` takes it.
    overlap : float, optional
        Fraction of a segment that the next one shares, 0 or more, below 1.
    hold : bool, optional
        Whether the largest and the smallest power of each bin are kept.
    frequency : float, optional
        Added to the frequencies, in hertz.
    threads : int, optional
        1: the caller's alone; None: as many as pay. The result has the same bits.
    client : distributed.Client, optional
        Who works on a recording or a Dask array.
    compute : bool, optional
        False for a Dask object whose `compute()` gives the result; for Dask arrays, or with `client`.

    Returns
    -------
    Spectrum

    Examples
    --------
    >>> import lumra, numpy
    >>> x = 0.1 * numpy.exp(0.5j * numpy.pi * numpy.arange(10000))
    >>> found = lumra.spectrum(x, 1e6, nfft=1000)
    >>> round(float(found.level.max()), 6), float(found.frequency[found.level.argmax()])
    (-20.0, 250000.0)
    """
    if _is_distributed(client, compute, x=x):
        from lumra import _distribution

        return _distribution.spectrum(x, sample_rate, nfft, window, overlap, hold, frequency, threads, client, compute)
    stream = _Stream(x, sample_rate, frequency)
    estimator = SpectrumEstimator(
        stream.sample_rate, nfft=nfft, window=window, overlap=overlap, hold=hold, frequency=stream.frequency,
        real=stream.real, threads=threads)
    _require_segment(stream.stretches, nfft)
    for number, (first, count) in enumerate(stream.stretches):
        if number:
            estimator.gap()
        estimator._add_from(stream.of, first, count)
    return estimator.result()


def _is_dask(x):
    # Labelled arrays have the function whether or not a Dask array is in them.
    graph = getattr(x, "__dask_graph__", None)
    return graph is not None and graph() is not None


def _is_distributed(client, compute, **streams):
    if any(map(_is_dask, streams.values())):
        return True
    for name, x in streams.items():
        if client is not None and not isinstance(x, Recording):
            raise TypeError(f"{name} is {type(x).__name__}; give a Recording or a Dask array with a client")
    if client is None and not compute:
        raise ValueError("compute is False; give a Dask array, or a Recording and a client")
    return client is not None


@dataclasses.dataclass(frozen=True, eq=False, repr=False)
class Waterfall:
    """Power spectra that follow each other in time. Arrays are read-only.

    Attributes
    ----------
    time : numpy.ndarray
        Of each row's first sample, in seconds.
    frequency : numpy.ndarray
        Of each bin, in hertz.
    power : numpy.ndarray
        A row for each time.
    sample_rate, nfft, window, overlap, enbw, center
        As those of a Spectrum.
    segments : int
        Averaged in a row; the last one may have fewer.
    """

    time: np.ndarray
    frequency: np.ndarray
    power: np.ndarray
    sample_rate: float
    nfft: int
    window: object
    overlap: float
    segments: int
    enbw: float
    center: float

    def __post_init__(self):
        for array in (self.time, self.frequency, self.power):
            _frozen(array)

    def __getstate__(self):
        return {field.name: getattr(self, field.name) for field in dataclasses.fields(self)}

    def __setstate__(self, state):
        self.__init__(**state)

    @functools.cached_property
    def level(self):
        """numpy.ndarray : Power in dB of full scale; minus infinity where the power is 0."""
        return _frozen(_decibels(self.power))

    def plot(self, ax=None):
        """Draws the levels over frequency and time with Matplotlib.

        Parameters
        ----------
        ax : matplotlib.axes.Axes, optional
            Where; a new figure's by default.

        Returns
        -------
        matplotlib.axes.Axes
        """
        from lumra import _plotting

        return _plotting.waterfall(self, ax)

    def to_xarray(self):
        """The powers as an xarray.Dataset over the coordinates "time" and "frequency".

        Returns
        -------
        xarray.Dataset
        """
        from lumra import _labelled

        return _labelled.waterfall(self)

    def __repr__(self):
        rows, bins = self.power.shape
        return (f"<lumra.Waterfall of {rows} rows of {bins} bins, {self.frequency[0]:g} to {self.frequency[-1]:g} Hz, "
                f"{self.time[0]:g} to {self.time[-1]:g} s>")  # fmt: skip


def _row_parts(stretches, nfft, overlap, rows):
    """Segments of a row, and for each row its samples: [(first sample, samples, first of the stretch), ...].

    The parts of a row follow each other without samples between, and so do the rows but for what segments share.
    """
    step, segments = _segments_of(stretches, nfft, overlap)
    per_row = -(-sum(segments) // rows)
    parted, parts, held = [], [], 0
    for (origin, count), here in zip(stretches, segments):
        taken = 0
        while taken < here:
            take = min(per_row - held, here - taken)
            first = origin + taken * step
            taken += take
            held += take
            # A row that goes on in the next stretch has the samples up to there.
            end = origin + (taken - 1) * step + nfft if held == per_row else origin + count
            parts.append((first, end - first, origin))
            if held == per_row:
                parted.append(parts)
                parts, held = [], 0
        if parts and taken == here and not here:
            parts.append((origin, count, origin))
    if parts:
        parted.append(parts)
    return per_row, parted


def _row_spectra(stream, parted, options):
    """The rows' spectra from one estimator, which goes on where rows follow each other."""
    estimator, at = None, 0
    for parts in parted:
        for first, count, origin in parts:
            if estimator is None or first > at:
                at = first
                estimator = SpectrumEstimator(
                    stream.sample_rate, start=first, origin=origin, real=stream.real, frequency=stream.frequency,
                    **options)
            elif first == origin:
                estimator.gap()
            estimator._add_from(stream.of, at, first + count - at)
            at = first + count
        yield estimator.result()
        estimator._of.clear()


def _join_rows(results, parted, sample_rate, per_row):
    first = results[0]
    return Waterfall(
        np.array([parts[0][0] for parts in parted]) / sample_rate, first.frequency.copy(),
        np.array([each.power for each in results]), first.sample_rate, first.nfft, first.window, first.overlap, per_row,
        first.enbw, first.center)


def waterfall(x, sample_rate=1.0, *, nfft=1024, window="hann", overlap=0.5, rows=512, frequency=0.0, threads=None,
              client=None, compute=True):  # fmt: skip
    """Averaged power spectra that follow each other in time.

    A row is the mean over ceil(segments / rows) successive segments; the last row holds what remains.

    Parameters
    ----------
    x, sample_rate, nfft, window, overlap, frequency, threads, client, compute
        As for `spectrum`.
    rows : int, optional
        At most so many.

    Returns
    -------
    Waterfall

    Examples
    --------
    >>> import lumra, numpy
    >>> found = lumra.waterfall(numpy.ones(10000), 1e6, nfft=100, rows=20)
    >>> found.power.shape, float(found.time[1])
    ((20, 51), 0.0005)
    """
    rows = _positive("rows", rows)
    if _is_distributed(client, compute, x=x):
        from lumra import _distribution

        return _distribution.waterfall(x, sample_rate, nfft, window, overlap, rows, frequency, threads, client, compute)
    stream = _Stream(x, sample_rate, frequency)
    options = dict(nfft=nfft, window=window, overlap=overlap, threads=threads)
    # Refuses wrong options before they are counted with.
    SpectrumEstimator(stream.sample_rate, frequency=stream.frequency, **options)
    _require_segment(stream.stretches, nfft)
    per_row, parted = _row_parts(stream.stretches, nfft, overlap, rows)
    return _join_rows(list(_row_spectra(stream, parted, options)), parted, stream.sample_rate, per_row)
