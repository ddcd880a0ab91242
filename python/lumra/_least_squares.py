# SPDX-License-Identifier: MIT
"""Least squares."""
from lumra import _lumra


def lstsq(a, b, rcond=None):
    """The shortest of the solutions that make the squared error of a @ x = b least.

    Parameters
    ----------
    a : array_like
        A matrix of m rows and n columns.
    b : array_like
        A vector of m elements, or a matrix of m rows, each column of which is a problem of its own.
    rcond : float, optional
        Singular values up to this times the largest count as zero; max(m, n) times the precision's epsilon by default.

    Returns
    -------
    numpy.ndarray
        n elements, or n rows.

    Examples
    --------
    >>> import lumra
    >>> lumra.lstsq([[1, 0], [1, 1], [1, 2]], [1, 3, 5]).round(12)
    array([1., 2.])
    """
    return _lumra.lstsq(a, b, rcond)
