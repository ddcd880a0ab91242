# SPDX-License-Identifier: MIT
"""Fourier transforms, as scipy.fft has them."""
from lumra import _lumra

_parameters = """
    Parameters
    ----------
    x : array_like
        {x}
    n : int, optional
        {n}
    axis : int, optional
        The axis that is transformed.
    norm : {{"backward", "ortho", "forward"}}, optional
        Which direction is divided by n: the inverse one, both by its square root, or the forward one.
    out : numpy.ndarray, optional
        Written and returned; it has the type and shape of the result, and may be `x` where both are the same.
    workers : int, optional
        Threads that share the rows of an array with more dimensions; negative numbers count from that of processors.

    Returns
    -------
    numpy.ndarray
        {returned}
"""


def _documented(x, n, returned):
    def document(function):
        before, after = function.__doc__.split("PARAMETERS\n")
        function.__doc__ = before.rstrip() + "\n" + _parameters.format(x=x, n=n, returned=returned) + after
        return function

    return document


_COMPLEX = "complex64 of float32 and complex64, else complex128."


@_documented("Samples.", "Points: x is cut to them, or has zeros put behind it. Its length by default.", _COMPLEX)
def fft(x, n=None, axis=-1, norm=None, *, out=None, workers=None):
    """The discrete Fourier transform.

    PARAMETERS

    Examples
    --------
    >>> import lumra
    >>> lumra.fft([1, 0, 0, 0]).real
    array([1., 1., 1., 1.])
    """
    return _lumra.fft(x, n, axis, norm, out, workers)


@_documented("Bins.", "Points: x is cut to them, or has zeros put behind it. Its length by default.", _COMPLEX)
def ifft(x, n=None, axis=-1, norm=None, *, out=None, workers=None):
    """The inverse of the discrete Fourier transform.

    PARAMETERS

    Examples
    --------
    >>> import lumra
    >>> lumra.ifft([4, 0, 0, 0])
    array([1.+0.j, 1.+0.j, 1.+0.j, 1.+0.j])
    """
    return _lumra.ifft(x, n, axis, norm, out, workers)


@_documented(
    "Real samples.", "Points: x is cut to them, or has zeros put behind it. Its length by default.",
    "n // 2 + 1 bins along the axis: complex64 of float32, else complex128.")
def rfft(x, n=None, axis=-1, norm=None, *, out=None, workers=None):
    """The half of the discrete Fourier transform that tells all of real samples.

    PARAMETERS

    Examples
    --------
    >>> import lumra
    >>> lumra.rfft([1, 1, 1, 1])
    array([4.+0.j, 0.+0.j, 0.+0.j])
    """
    return _lumra.rfft(x, n, axis, norm, out, workers)


@_documented(
    "The bins from 0 to half the rate.", "Samples of the result, 2 * (bins - 1) by default.",
    "Real samples: float32 of complex64, else float64.")
def irfft(x, n=None, axis=-1, norm=None, *, out=None, workers=None):
    """The inverse of `rfft`.

    PARAMETERS

    Examples
    --------
    >>> import lumra
    >>> lumra.irfft([4, 0, 0])
    array([1., 1., 1., 1.])
    """
    return _lumra.irfft(x, n, axis, norm, out, workers)
