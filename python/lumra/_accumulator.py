# SPDX-License-Identifier: MIT
"""What the accumulators of streams have in common."""
import numpy as np

from lumra._mapped import pieces
from lumra._recordings import Recording


class Accumulator:
    """Stands somewhere in a stream, takes its samples, and joins its neighbour. `_of` does the work."""

    __slots__ = ("_of",)

    @property
    def start(self):
        """int : Position of the first sample."""
        return self._of.where()[0]

    @property
    def samples(self):
        """int : How many were added."""
        return self._of.where()[1]

    def add(self, x):
        """Adds the stream's next samples. The first block that is not empty fixes their type, or precision.

        Parameters
        ----------
        x : array_like
            Samples of one dimension.

        Returns
        -------
        LevelMeter or SpectrumEstimator
            This one.
        """
        self._of.add(x)
        return self

    def merge(self, other):
        """Joins the neighbour whose start is where this one ends; what spans the border is completed.

        Parameters
        ----------
        other : LevelMeter or SpectrumEstimator
            Of the same kind and options; it is not changed.

        Returns
        -------
        LevelMeter or SpectrumEstimator
            This one.
        """
        if not isinstance(other, type(self)):
            raise TypeError(f"other is {other!r} ({type(other).__name__}); give a {type(self).__name__}")
        self._of.merge(other._of)
        return self

    def _add_from(self, x, first, count):
        """Samples of a recording or an array; memory maps leave no pages behind."""
        if isinstance(x, Recording):
            self._of.add_recording(x._file, first, count)
        else:
            for part in pieces(x, first, count):
                self._of.add(part)


def one_dimension(x):
    """The array, or the recording as it is."""
    if isinstance(x, Recording):
        return x
    array = np.asarray(x)
    if array.ndim != 1:
        raise ValueError(f"x is of shape {array.shape}; give an array of one dimension")
    return array
