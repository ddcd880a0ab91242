# SPDX-License-Identifier: MIT
"""Windows for spectra and filters."""
from typing import NamedTuple

from lumra import _lumra


class WindowFigures(NamedTuple):
    """What a window does to a spectrum."""

    gain: float  #: Mean of the values: what a tone on a bin is multiplied by.
    enbw: float  #: Equivalent noise bandwidth in bins.
    scalloping_db: float  #: How much lower a tone halfway between two bins reads, in dB, positive.


def window(name, n, *, sym=False, dtype=float):
    """The values of a window.

    Parameters
    ----------
    name : str or tuple
        "boxcar", "hann", "hamming", "blackman", "flattop", "blackmanharris", "nuttall" or ("kaiser", beta) with the
        values of `scipy.signal.get_window`; besides "blackmanharris3", "blackmanharris7", "exact_blackman",
        "low_sidelobe" and "flattop_toolkit".
    n : int
        Number of values.
    sym : bool, optional
        False for a periodic window, for spectra; True for a symmetric one, for filters.
    dtype : data-type, optional
        float32 or float64.

    Returns
    -------
    numpy.ndarray
        n values.

    Examples
    --------
    >>> import lumra
    >>> lumra.window("hann", 4)
    array([0. , 0.5, 1. , 0.5])
    """
    return _lumra.window(name, n, bool(sym), dtype)


def window_figures(name, n):
    """Gain, noise bandwidth and scalloping loss of a periodic window.

    Parameters
    ----------
    name : str or tuple
        As for `window`.
    n : int
        Number of values, 1 or more.

    Returns
    -------
    WindowFigures
        A named tuple: gain, enbw (bins), scalloping_db (positive).

    Examples
    --------
    >>> import lumra
    >>> figures = lumra.window_figures("hann", 1024)
    >>> round(figures.enbw, 6), round(figures.scalloping_db, 3)
    (1.5, 1.424)
    """
    return WindowFigures(*_lumra.window_figures(name, n))
