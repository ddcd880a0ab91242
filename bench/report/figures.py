# SPDX-License-Identifier: MIT
"""What timings say: ratios of typical times with their spread, and which of two builds' rows differ beyond the noise."""
import dataclasses

import numpy as np
import scipy.stats

LEAST_EFFECT = 0.03  # less is no change worth a word, however sure
FALSE_CHANGES = 0.01  # the share that may be false; where nothing has changed, how probable a single one is


def typical(timings):
    """The lower quartile: what else goes on in a machine only ever adds to a time, now to this one, now to that."""
    return float(np.quantile(timings, 0.25))


@dataclasses.dataclass(frozen=True)
class Ratio:
    """A ratio of two typical times, and where 95 of 100 resampled runs have it."""

    value: float
    low: float
    high: float

    @property
    def spread(self):
        """Half the interval's width, relative."""
        return (self.high - self.low) / (2 * self.value)


def ratio(above, below):
    """Of two lists of timings; resampled in a way that is the same each time."""
    generator = np.random.default_rng(1)
    drawn = [np.quantile(generator.choice(x, (1000, len(x))), 0.25, axis=1) for x in (above, below)]
    low, high = np.quantile(drawn[0] / drawn[1], (0.025, 0.975))
    return Ratio(typical(above) / typical(below), float(low), float(high))


def reached(figure, goal, at_most=False):
    """A goal that lies inside of the spread is neither reached nor missed."""
    if figure.low < goal < figure.high:
        return "undecided"
    return "yes" if (figure.value <= goal if at_most else figure.value >= goal) else "no"


def _chance(one, other):
    """How probable ranks as different as these are where both come from the same build."""
    return scipy.stats.mannwhitneyu(one, other, method="exact").pvalue


def changes(rows):
    """Which rows differ, as {name: (speed of new over old as a Ratio, whether that is a change)}.

    rows  {name: (timings of the old build, of the new one)}, one timing a process: what differs from process to
          process, such as where memory lies, is noise then, and not taken for a change

    A row has changed where the two-sided rank test of Mann and Whitney says so with the correction of Benjamini and
    Hochberg for the number of rows, and both typical times are LEAST_EFFECT apart.
    """
    chances = {name: _chance(*pair) for name, pair in rows.items()}
    ranked = enumerate(sorted(chances.values()), start=1)
    bound = max((chance for rank, chance in ranked if chance <= FALSE_CHANGES * rank / len(rows)), default=-1)
    found = {}
    for name, pair in rows.items():
        speed = ratio(*pair)  # seconds of the old build over those of the new one
        found[name] = speed, chances[name] <= bound and abs(speed.value - 1) >= LEAST_EFFECT
    return found


def fewest_turns(rows):
    """How many timings of each build can show a change among so many rows at all."""
    turns = 3
    while _chance(range(turns), range(turns, 2 * turns)) > FALSE_CHANGES / rows:
        turns += 1
    return turns
