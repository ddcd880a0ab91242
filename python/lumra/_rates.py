# SPDX-License-Identifier: MIT
"""Other sample rates, and channels out of wideband streams."""
import math
from fractions import Fraction

import numpy as np

from lumra import _lumra

_MOST = 2**64


def _exactly(name, rate):
    if isinstance(rate, np.floating):
        rate = float(rate)
    if not isinstance(rate, (int, float, Fraction, np.integer)):
        raise TypeError(f"{name} is {rate!r} ({type(rate).__name__}); give an int, a float or a Fraction")
    if not (math.isfinite(rate) and rate > 0):
        raise ValueError(f"{name} is {rate!r}; give hertz above 0")
    return Fraction(rate)


def _ratio(rate_in, rate_out):
    """The ratio, and how the library takes it: up and down where they fit, else both rates."""
    exact_in, exact_out = _exactly("rate_in", rate_in), _exactly("rate_out", rate_out)
    ratio = exact_out / exact_in
    if not Fraction(1, 10**9) < ratio < 10**9:
        raise ValueError(f"rate_in is {rate_in!r} and rate_out {rate_out!r}; give rates less than 10**9 times apart")
    if ratio.numerator < _MOST and ratio.denominator < _MOST:
        return ratio, (ratio.numerator, ratio.denominator, 1.0, 1.0)
    for name, rate, exact in (("rate_in", rate_in, exact_in), ("rate_out", rate_out, exact_out)):
        if Fraction(float(exact)) != exact:
            raise ValueError(f"{name} is {rate!r}; give rates whose ratio has less than 65 bits, or that floats hold")
    return ratio, (0, 0, float(exact_in), float(exact_out))


def resample(x, rate_in, rate_out, *, passband=0.9, rejection=100.0, axis=-1):
    """A record at another rate.

    Sample k of the result lies at the time k / rate_out, exactly; no delay is left in.

    Parameters
    ----------
    x : array_like
        Samples.
    rate_in, rate_out : int, float or Fraction
        In hertz, taken as exactly the number that they are.
    passband : float, optional
        The part of half the lower rate that is kept within 0.01 dB, above 0 to 0.99.
    rejection : float, optional
        In dB, 40 to 150, in single precision to 120, from half the lower rate on.
    axis : int, optional
        The axis that is resampled.

    Returns
    -------
    numpy.ndarray
        ceil(n * rate_out / rate_in) samples along the axis.

    Examples
    --------
    >>> import lumra, numpy
    >>> tone = numpy.cos(2 * numpy.pi * 1000 * numpy.arange(4410) / 44100)
    >>> slower = lumra.resample(tone, 44100, 8000)
    >>> len(slower), bool(abs(slower[400] - numpy.cos(2 * numpy.pi * 1000 * 400 / 8000)) < 1e-4)
    (800, True)
    """
    array = np.asarray(x)
    ratio, ways = _ratio(rate_in, rate_out)
    try:
        length = array.shape[axis]
    except (IndexError, TypeError):
        length = 0  # which is refused with the axis
    return _lumra.resample(array, axis, math.ceil(length * ratio), *ways, passband, rejection)


class Resampler:
    """A stream at another rate, called with one block after the other.

    The blocks that it gives, and the last of them from `flush`, are together what `resample` gives, bit by bit.
    Resamplers can be pickled and copied, with their state.

    Parameters
    ----------
    rate_in, rate_out, passband, rejection
        As for `resample`.
    dtype : data-type, optional
        Of the samples: float32, float64, complex64 or complex128.

    Examples
    --------
    >>> import lumra, numpy
    >>> slower = lumra.Resampler(3, 2, dtype=float)
    >>> parts = [slower(numpy.ones(500)), slower(numpy.ones(100)), slower.flush()]
    >>> sum(len(part) for part in parts)
    400
    """

    __slots__ = ("_resampler", "_made_from")

    def __init__(self, rate_in, rate_out, *, passband=0.9, rejection=100.0, dtype=np.complex64):
        _, ways = _ratio(rate_in, rate_out)
        self._made_from = (rate_in, rate_out, passband, rejection, dtype)
        self._resampler = _lumra.Resampler(dtype, *ways, passband, rejection)

    def __call__(self, x):
        """Takes the stream's next block.

        Parameters
        ----------
        x : array_like
            Samples of one dimension, of the resampler's type.

        Returns
        -------
        numpy.ndarray
            The samples that can be computed by now.
        """
        return self._resampler(x)

    def flush(self):
        """Ends the stream, and begins a new one.

        Returns
        -------
        numpy.ndarray
            The samples that were held back.
        """
        return self._resampler.flush()

    def reset(self):
        """Begins a new stream; what was held back is lost."""
        self._resampler.reset()

    def __getstate__(self):
        return self._made_from, self._resampler.save()

    def __setstate__(self, state):
        (rate_in, rate_out, passband, rejection, dtype), saved = state
        self.__init__(rate_in, rate_out, passband=passband, rejection=rejection, dtype=dtype)
        self._resampler.load(saved)


class Channelizer:
    """Channels out of one wideband stream, called with one block after the other.

    Channel k is the stream shifted by -center, filtered, and at a rate of its own: flat within 0.01 dB up to 0.9 of half
    its rate. All share the transforms of the stream's blocks. Channelizers can be pickled and copied, with their state.

    Parameters
    ----------
    sample_rate : float
        Of the stream, in hertz.
    channels : iterable of (center, rate)
        In hertz; centers count from that of the stream.
    rejection : float, optional
        Of what lies beyond half a channel's rate, in dB, 40 to 150, in single precision to 120.

    Examples
    --------
    >>> import lumra, numpy
    >>> split = lumra.Channelizer(1e6, [(100e3, 50e3), (-200e3, 48e3)])
    >>> wide = numpy.exp(2j * numpy.pi * 0.1 * numpy.arange(100000))
    >>> first, second = (numpy.concatenate(parts) for parts in zip(split(wide), split.flush()))
    >>> len(first), len(second), bool(abs(first[2500] - 1) < 1e-4)
    (5000, 4800, True)
    """

    __slots__ = ("_channelizer", "_made_from")

    def __init__(self, sample_rate, channels, *, rejection=80.0):
        pairs = []
        try:
            for center, rate in channels:
                pairs.append((center, rate))
        except (TypeError, ValueError):
            raise TypeError(f"channels is {channels!r}; give pairs of center and rate") from None
        self._channelizer = _lumra.Channelizer(sample_rate, pairs, rejection)
        self._made_from = sample_rate, pairs, rejection

    def __call__(self, x):
        """Takes the stream's next block. The first one that is not empty chooses the type of the stream.

        Parameters
        ----------
        x : array_like
            Samples of one dimension.

        Returns
        -------
        list of numpy.ndarray
            The samples of each channel that can be computed by now: complex, of the precision of x.
        """
        return self._channelizer(x)

    def flush(self):
        """Ends the stream, and begins a new one.

        Returns
        -------
        list of numpy.ndarray
            The samples of each channel that were held back.
        """
        return self._channelizer.flush()

    def reset(self):
        """Begins a new stream, of any type; what was held back is lost."""
        self._channelizer.reset()

    def __getstate__(self):
        return self._made_from, self._channelizer.save()

    def __setstate__(self, state):
        (sample_rate, pairs, rejection), saved = state
        self.__init__(sample_rate, pairs, rejection=rejection)
        self._channelizer.load(saved)
