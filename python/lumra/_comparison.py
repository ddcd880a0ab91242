# SPDX-License-Identifier: MIT
"""Error vectors of streams: sums under a model give a better model, until it is settled."""
import dataclasses
import functools
import operator

import numpy as np

from lumra import _lumra
from lumra._accumulation import Block, accumulate_all
from lumra._levels import _ALIGNMENTS, LevelMeter
from lumra._recordings import Recording

_SEARCHED = _ALIGNMENTS["delay"] | _ALIGNMENTS["frequency"]
_WINDOW = _lumra.evm_window
_MOST_ROUNDS = 24


@dataclasses.dataclass(frozen=True)
class _Model:
    gain: complex = 1.0
    delay: float = 0.0
    frequency: float = 0.0
    dc: complex = 0.0


class Streams:
    """Reference and measured samples, arrays or recordings, that are compared by so many threads."""

    def __init__(self, reference, measured, threads):
        self._threads = threads
        self._streams = [as_stream("reference", reference), as_stream("measured", measured)]
        self.samples = len(self._streams[0])
        require_equal(*map(len, self._streams))

    def figures(self, first, count, align, sample_rate):
        """Of a part that is held in memory."""
        return _lumra.evm(*[stream.read(first, count) for stream in self._streams], align, sample_rate, self._threads)

    def of_reference(self, rows, begin, finish):
        return accumulate_all(self._streams[:1], rows, begin, finish, self._threads)

    def of_both(self, rows, begin, finish):
        return accumulate_all(self._streams, rows, begin, finish, self._threads)


def as_stream(name, x):
    """A recording as it is, all else in memory."""
    if isinstance(x, Recording):
        return x
    x = np.asarray(x)
    if x.ndim != 1:
        raise ValueError(f"{name} is of shape {x.shape}; give an array of one dimension")
    return Block(x)


def require_equal(reference, measured):
    if measured != reference:
        raise ValueError(f"measured is of {measured} samples; give as many as the reference has, {reference}")


def _begin_level(start, origin):
    return LevelMeter(start, threads=1)


def _rms(meter):
    return meter.result().rms


def _loudest(streams):
    """First sample of the window in which the reference has the most energy."""
    firsts = [min(first, streams.samples - _WINDOW) for first in range(0, streams.samples, _WINDOW)]
    found = streams.of_reference([[(first, _WINDOW, first)] for first in firsts], _begin_level, _rms)
    return firsts[int(np.argmax(np.nan_to_num(found, nan=-1)))]


def _begin_meter(align, sample_rate, model, start, origin):
    return _lumra.EvmMeter(align, sample_rate, start, model.gain, model.delay, model.frequency, model.dc)


def _summed(streams, first, count, align, sample_rate, model, figures):
    begin = functools.partial(_begin_meter, align, sample_rate, model)
    (found,) = streams.of_both([[(first, count, first)]], begin, operator.methodcaller(figures))
    return found


def measure(streams, align, sample_rate):
    """The figures of Evm, in its order."""
    n = streams.samples
    if n <= _WINDOW:
        return streams.figures(0, n, align, sample_rate)
    model, first, count = _Model(), 0, n
    if align & _SEARCHED:
        first, count = _loudest(streams), _WINDOW
        _, _, _, _, _, delay, frequency, _, _ = streams.figures(first, count, align, sample_rate)
        model = _Model(delay=delay, frequency=frequency)
    for _ in range(_MOST_ROUNDS if align else 0):
        *better, settled, reach = _summed(streams, first, count, align, sample_rate, model, "refine")
        model = _Model(*better)
        if settled and count == n:
            break
        # The next part has this one in its middle.
        middle, count = first + count // 2, min(reach, n)
        first = min(max(middle - count // 2, 0), n - count)
    return _summed(streams, 0, n, 0, sample_rate, model, "read")
