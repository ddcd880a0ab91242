# SPDX-License-Identifier: MIT
"""Operations element by element."""
from lumra import _lumra


def magnitude(x, out=None, *, threads=None):
    """Magnitudes.

    Parameters
    ----------
    x : array_like
        Samples of one dimension.
    out : numpy.ndarray, optional
        Written and returned: float32 for float32 and complex64, else float64; `x` where that is real.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Returns
    -------
    numpy.ndarray
        abs(x[i]).

    Examples
    --------
    >>> import lumra
    >>> lumra.magnitude([3 + 4j, -2])
    array([5., 2.])
    """
    return _lumra.magnitude(x, out, threads)


def power(x, out=None, *, threads=None):
    """Powers, which are squared magnitudes.

    Parameters
    ----------
    x : array_like
        Samples of one dimension.
    out : numpy.ndarray, optional
        Written and returned: float32 for float32 and complex64, else float64; `x` where that is real.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Returns
    -------
    numpy.ndarray
        abs(x[i])**2.

    Examples
    --------
    >>> import lumra
    >>> lumra.power([3 + 4j, -2])
    array([25.,  4.])
    """
    return _lumra.power(x, out, threads)


def divide(x, y, out=None, *, threads=None):
    """Quotients.

    Parameters
    ----------
    x : array_like
        Dividends, of one dimension.
    y : array_like
        As many divisors, or one number for all, which has the precision of x.
    out : numpy.ndarray, optional
        Written and returned; may be `x` or `y`.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Returns
    -------
    numpy.ndarray
        x[i] / y[i]. The quotient of x and 0 is infinite or NaN, without a warning.

    Examples
    --------
    >>> import lumra
    >>> lumra.divide([2, 4, 9], [1, 2, 3])
    array([2., 2., 3.])
    """
    return _lumra.divide(x, y, out, threads)


def decibels(x, out=None, *, threads=None):
    """Levels of samples in decibels of an amplitude of 1.

    Parameters
    ----------
    x : array_like
        Samples of one dimension.
    out : numpy.ndarray, optional
        Written and returned: float32 for float32 and complex64, else float64; `x` where that is real.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Returns
    -------
    numpy.ndarray
        10 log10 of abs(x[i])**2; minus infinity for 0, without a warning.

    Examples
    --------
    >>> import lumra
    >>> lumra.decibels([1, 10, 0])
    array([  0.,  20., -inf])
    """
    return _lumra.decibels(x, out, threads)


def polynomial(x, c, out=None, *, threads=None):
    """Values of a polynomial.

    Parameters
    ----------
    x : array_like
        Where it is computed, of one dimension.
    c : array_like
        Coefficients, that of the power 0 first. They have the precision of x.
    out : numpy.ndarray, optional
        Written and returned; may be `x` where it is of the result's type.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Returns
    -------
    numpy.ndarray
        c[0] + c[1] x[i] + c[2] x[i]**2 + ...

    Examples
    --------
    >>> import lumra
    >>> lumra.polynomial([0, 1, 2], [1, 0, 3])
    array([ 1.,  4., 13.])
    """
    return _lumra.polynomial(x, c, out, threads)


def lookup(keys, x, table, start, step, out=None, *, threads=None):
    """Samples times gains that are looked up and interpolated.

    Parameters
    ----------
    keys : array_like
        A real number for each sample.
    x : array_like
        Samples of one dimension.
    table : array_like
        Gain k belongs to the key start + k step; between two keys gains are interpolated linearly. Keys a step and more
        in front of `start` have the first gain, those nearer to it the straight line's; keys behind the last one have
        the last gain. Keys that are NaN or 2**31 steps away have the first gain.
    start, step : float
        Finite; the step is not 0, and may be negative.
    out : numpy.ndarray, optional
        Written and returned; may be `x`.
    threads : int, optional
        1: the caller's alone; None: as many as pay.

    Returns
    -------
    numpy.ndarray
        Complex where the samples or the gains are, in the precision of the samples.

    Examples
    --------
    >>> import lumra
    >>> lumra.lookup([0.0, 0.5, 7.0], [1, 1, 2], [1, 3], start=0, step=1)
    array([1., 2., 6.])
    """
    return _lumra.lookup(keys, x, table, start, step, out, threads)
