# SPDX-License-Identifier: MIT
"""Levels, power statistics and error vectors."""
import dataclasses
from typing import Union

import numpy as np

from lumra import _lumra
from lumra._accumulator import Accumulator, one_dimension
from lumra._recordings import Recording, _finite
from lumra._sharing import useful_threads
from lumra._spectra import _is_distributed


@dataclasses.dataclass(frozen=True)
class Level:
    """Levels of a record.

    Attributes
    ----------
    samples : int
    rms, peak : float
        Amplitudes: the root of the mean power, and the largest magnitude.
    peak_index : int
        The first sample that has the peak.
    papr_db : float
        Peak over RMS; NaN for silence.
    dc : complex or float
        Mean of the samples.
    rms_dbfs, peak_dbfs : float
        Levels of an amplitude of 1; minus infinity for silence.
    """

    samples: int
    rms: float
    peak: float
    peak_index: int
    papr_db: float
    dc: Union[complex, float]
    rms_dbfs: float
    peak_dbfs: float


class LevelMeter(Accumulator):
    """The levels of a stream, as an accumulator.

    Streams may be cut into calls and into meters that are merged: the result has the same bits. Meters can be pickled
    and copied.

    Parameters
    ----------
    start : int, optional
        Position in the stream of the first sample that is added.
    threads : int, optional
        1: the caller's alone; None: as many as pay. The result has the same bits.

    Examples
    --------
    >>> import lumra
    >>> left, right = lumra.LevelMeter().add([3, 4]), lumra.LevelMeter(start=2).add([-12])
    >>> left.merge(right).result().peak_index
    2
    """

    __slots__ = ("_threads",)

    def __init__(self, start=0, *, threads=None):
        self._of = _lumra.Meter(start, threads)
        self._threads = threads

    def result(self):
        """The levels of the samples so far.

        Returns
        -------
        Level
        """
        return Level(*self._of.read())

    def __getstate__(self):
        return self._threads, self._of.save()

    def __setstate__(self, state):
        threads, saved = state
        self.__init__(threads=threads)
        self._of.load(saved)

    def __repr__(self):
        start, samples = self._of.where()
        return f"<lumra.LevelMeter: {samples} samples from {start} on>"


def _metered(x, threads):
    of = one_dimension(x)
    meter = LevelMeter(threads=threads)
    meter._add_from(of, 0, len(of))
    if not meter.samples:
        raise ValueError("x is empty; give one sample or more")
    return meter


def level(x, client=None, compute=True, *, threads=None):
    """The levels of a record in one pass.

    Parameters
    ----------
    x : array_like, Recording or dask.array.Array
        Samples of one dimension.
    client : distributed.Client, optional
        Who works on a recording or a Dask array.
    compute : bool, optional
        False for a Dask object whose `compute()` gives the result; for Dask arrays, or with `client`.
    threads : int, optional
        1: the caller's alone; None: as many as pay. The result has the same bits.

    Returns
    -------
    Level

    Examples
    --------
    >>> import lumra
    >>> found = lumra.level([3, -4, 0, 0])
    >>> found.rms, found.peak, found.peak_index
    (2.5, 4.0, 1)
    """
    if _is_distributed(client, compute, x=x):
        from lumra import _distribution

        return _distribution.level(x, threads, client, compute)
    return _metered(x, threads).result()


def ccdf(x, above_db, *, threads=None):
    """Power statistics: the share of samples whose power is more than so many dB above the mean.

    Parameters
    ----------
    x : array_like or Recording
        Samples of one dimension. Of a recording, which is read once, shares lie between the exact ones 0.0085 dB above
        and below.
    above_db : array_like
        Levels above the mean power in dB.
    threads : int, optional
        Of a recording, 1: the caller's alone; None: as many as pay. The result has the same bits.

    Returns
    -------
    numpy.ndarray
        From 0 to 1, of the shape of above_db.

    Examples
    --------
    >>> import lumra
    >>> lumra.ccdf([0, 0, 0, 2], [0, 3, 6, 9])
    array([0.25, 0.25, 0.25, 0.  ])
    """
    if isinstance(x, Recording):
        return _metered(x, threads)._of.ccdf(above_db)
    _lumra.number_of_threads(threads)  # refuses a wrong one here, too
    return _lumra.ccdf(x, above_db)


@dataclasses.dataclass(frozen=True)
class Evm:
    """How a measured record differs from its reference. What was not aligned is that of equal records.

    Attributes
    ----------
    rms, peak : float
        Length of the error vectors, as a fraction of the reference's RMS.
    magnitude_rms : float
        Differences of magnitudes, as such a fraction.
    phase_rms : float
        Differences of phases in radians.
    gain : complex
    delay : float
        By which the measured record is late, in samples.
    frequency : float
        By which the measured carrier is higher, in hertz.
    dc : complex
        In the measured record.
    samples : int
        How many were compared.
    """

    rms: float
    peak: float
    magnitude_rms: float
    phase_rms: float
    gain: complex
    delay: float
    frequency: float
    dc: complex
    samples: int

    @property
    def rms_percent(self):
        """float : rms in hundredths."""
        return 100 * self.rms

    @property
    def rms_db(self):
        """float : rms in dB; minus infinity for equal records."""
        with np.errstate(divide="ignore"):
            return float(20 * np.log10(self.rms))


_ALIGNMENTS = {"gain": 1, "delay": 2, "frequency": 4, "dc": 8}


def _alignment(align):
    wanted = 0
    for name in (align,) if isinstance(align, str) else align:
        if not isinstance(name, str) or name not in _ALIGNMENTS:
            raise ValueError(f"align holds {name!r}; give any of {', '.join(_ALIGNMENTS)}")
        wanted |= _ALIGNMENTS[name]
    return wanted


def evm(reference, measured, *, align=(), sample_rate=1.0, threads=None, client=None, compute=True):
    """Compares a record with its reference sample by sample.

    measured(n) = gain * reference(n - delay) * exp(2j * pi * frequency * n / sample_rate) + dc + errors; errors are fractions
    of the reference's RMS.

    Parameters
    ----------
    reference, measured : array_like, Recording or dask.array.Array
        Samples of one dimension, as many of each.
    align : iterable of {"gain", "delay", "frequency", "dc"}, optional
        What is found and taken out before errors are measured. Delays are found up to 500 samples.
    sample_rate : float, optional
        In hertz; that of the reference where it is a recording.
    threads : int, optional
        1: the caller's alone; None: as many as pay. The result has the same bits.
    client : distributed.Client, optional
        Who works on recordings or Dask arrays.
    compute : bool, optional
        False for a Dask object whose `compute()` gives the result; for Dask arrays, or with `client`.

    Returns
    -------
    Evm

    Examples
    --------
    >>> import lumra, numpy
    >>> reference = numpy.exp(2j * numpy.pi * numpy.arange(100)**2 / 300)
    >>> found = lumra.evm(reference, 2j * reference + 0.2, align=("gain", "dc"))
    >>> complex(round(found.gain.real, 9), round(found.gain.imag, 9)), found.rms < 1e-9
    (2j, True)
    """
    from lumra import _comparison

    wanted, threads = _alignment(align), useful_threads(threads)
    if isinstance(reference, Recording):
        sample_rate = reference.sample_rate
    rate = _finite("sample_rate", sample_rate)
    if rate <= 0:
        raise ValueError(f"sample_rate is {rate}; give hertz above 0")
    if _is_distributed(client, compute, reference=reference, measured=measured):
        from lumra import _distribution

        return _distribution.evm(reference, measured, wanted, rate, client, compute)
    return Evm(*_comparison.measure(_comparison.Streams(reference, measured, threads), wanted, rate))
