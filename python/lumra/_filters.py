# SPDX-License-Identifier: MIT
"""Filters of records and streams, convolution, designs."""
from lumra import _lumra


def lfilter(b, a, x, axis=-1, zi=None):
    """Filters along an axis by a difference equation, as `scipy.signal.lfilter`.

    Parameters
    ----------
    b, a : array_like
        Real coefficients; a[0] is not 0.
    x : array_like
        Samples. Single precision stays single whatever the coefficients are; sums are double precision's.
    axis : int, optional
        The axis that is filtered.
    zi : array_like, optional
        State of the transposed direct form: of the shape of x, with max(len(a), len(b)) - 1 values along the axis.

    Returns
    -------
    y : numpy.ndarray
        As many samples.
    zf : numpy.ndarray
        The state behind them, in double precision; only where `zi` is given.

    Examples
    --------
    >>> import lumra
    >>> lumra.lfilter([1], [1, -0.5], [1, 0, 0])
    array([1.  , 0.5 , 0.25])
    """
    return _lumra.lfilter(b, a, x, axis, zi)


def sosfilter(sos, x, axis=-1, zi=None):
    """Filters along an axis by sections of second order, as `scipy.signal.sosfilt`.

    Parameters
    ----------
    sos : array_like
        A row of b[0], b[1], b[2], a[0], a[1], a[2] for each section.
    x : array_like
        Samples. Single precision stays single; sums are double precision's.
    axis : int, optional
        The axis that is filtered.
    zi : array_like, optional
        State of the transposed direct form: the sections, then the shape of x with 2 values along the axis.

    Returns
    -------
    y : numpy.ndarray
        As many samples.
    zf : numpy.ndarray
        The state behind them, in double precision; only where `zi` is given.

    Examples
    --------
    >>> import lumra
    >>> lumra.sosfilter([[1, 0, 0, 1, -0.5, 0]], [1, 0, 0])
    array([1.  , 0.5 , 0.25])
    """
    return _lumra.sosfilter(sos, x, axis, zi)


class _Stream:
    """What filters of streams have in common: the extension's filter and what it was made from."""

    __slots__ = ("_filter", "_made_from")

    def __call__(self, x):
        """Filters the stream's next block.

        Parameters
        ----------
        x : array_like
            Samples of one dimension. The first block that is not empty chooses the type of the stream.

        Returns
        -------
        numpy.ndarray
            As many samples as there were.
        """
        return self._filter(x)

    def reset(self):
        """Begins a new stream, of any type."""
        self._filter.reset()

    def __getstate__(self):
        return self._made_from, self._filter.save()

    def __setstate__(self, state):
        made_from, saved = state
        type(self).__init__(self, *made_from)
        self._filter.load(saved)


class IirFilter(_Stream):
    """A recursive filter over a stream, called with one block after the other.

    Results have the same bits however the stream is cut. Filters can be pickled and copied, with their state.

    Parameters
    ----------
    b, a : array_like
        Real coefficients; a[0] is not 0.

    Examples
    --------
    >>> import lumra
    >>> smooth = lumra.IirFilter([1], [1, -0.5])
    >>> smooth([1, 0]), smooth([0, 0])
    (array([1. , 0.5]), array([0.25 , 0.125]))
    """

    __slots__ = ()

    def __init__(self, b, a):
        self._filter = _lumra.Iir(b, a)
        self._made_from = b, a


class FirFilter(_Stream):
    """A filter with a finite response over a stream, called with one block after the other.

    With up to 64 taps results have the same bits however the stream is cut, with more they are the same within
    rounding. Filters can be pickled and copied, with their state.

    Parameters
    ----------
    h : array_like
        Taps, real or complex.

    Examples
    --------
    >>> import lumra
    >>> smooth = lumra.FirFilter([0.5, 0.5])
    >>> smooth([1, 1]), smooth([3])
    (array([0.5, 1. ]), array([2.]))
    """

    __slots__ = ()

    def __init__(self, h):
        self._filter = _lumra.Fir(h)
        self._made_from = (h,)


def convolve(x, h, mode="full"):
    """Convolves two records, as `scipy.signal.convolve`, directly or through transforms, whichever takes less time.

    Parameters
    ----------
    x : array_like
        Samples of one dimension; the result has their precision.
    h : array_like
        Samples or taps of one dimension.
    mode : {"full", "same", "valid"}, optional
        All of it, the len(x) elements in its middle, or those that all elements of the shorter record enter.

    Returns
    -------
    numpy.ndarray
        Complex where one of the two is.

    Examples
    --------
    >>> import lumra
    >>> lumra.convolve([1, 2, 3], [1, 1])
    array([1., 3., 5., 3.])
    """
    return _lumra.convolve(x, h, mode)


def correlate(x, y, mode="full"):
    """Correlates two records, as `scipy.signal.correlate`.

    Parameters
    ----------
    x : array_like
        Samples of one dimension; the result has their precision.
    y : array_like
        Samples of one dimension; their conjugates are taken.
    mode : {"full", "same", "valid"}, optional
        All lags, the len(x) in the middle, or those at which the shorter record is wholly inside of the other.

    Returns
    -------
    numpy.ndarray
        Complex where one of the two is.

    Examples
    --------
    >>> import lumra
    >>> lumra.correlate([1, 2, 3], [0, 1])
    array([1., 2., 3., 0.])
    """
    return _lumra.correlate(x, y, mode)


def kaiser_lowpass(sample_rate, pass_edge, stop_edge, rejection):
    """Taps of a low pass by Kaiser's window, the fewest that keep the rejection.

    Parameters
    ----------
    sample_rate : float
        In hertz.
    pass_edge, stop_edge : float
        In hertz, 0 <= pass_edge < stop_edge <= sample_rate / 2.
    rejection : float
        In dB, 20 to 200. Up to the pass edge the gain differs from 1 by as little as the stop band's is above 0.

    Returns
    -------
    numpy.ndarray
        Symmetric taps with gain 1 at 0 Hz.

    Examples
    --------
    >>> import lumra
    >>> taps = lumra.kaiser_lowpass(1e6, 100e3, 150e3, 80)
    >>> round(taps.sum(), 12)
    1.0
    """
    return _lumra.kaiser_lowpass(sample_rate, pass_edge, stop_edge, rejection)


def root_raised_cosine(sample_rate, symbol_rate, roll_off, span):
    """Taps of a root raised cosine.

    Parameters
    ----------
    sample_rate, symbol_rate : float
        In hertz.
    roll_off : float
        0 to 1.
    span : float
        Length in symbols; there are round(span * sample_rate / symbol_rate) + 1 taps.

    Returns
    -------
    numpy.ndarray
        Symmetric taps of energy 1.

    Examples
    --------
    >>> import lumra
    >>> taps = lumra.root_raised_cosine(4e6, 1e6, 0.22, 10)
    >>> len(taps), round((taps**2).sum(), 12)
    (41, 1.0)
    """
    return _lumra.root_raised_cosine(sample_rate, symbol_rate, roll_off, span)
