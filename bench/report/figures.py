# SPDX-License-Identifier: MIT
"""What timings say: ratios of medians with their spread, and which of two builds' rows differ beyond the noise."""
import dataclasses

import numpy as np
import scipy.stats

LEAST_EFFECT = 0.03  # less is no change worth a word, however sure
FAMILY_ERROR = 0.01  # how probable one false change among all rows may be


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

    A row has changed where the two-sided rank test of Mann and Whitney says so with Holm's correction for the number of
    rows, and both typical times are LEAST_EFFECT apart.
    """
    chances = {name: _chance(*pair) for name, pair in rows.items()}
    found, sure = {}, True
    for tested, name in enumerate(sorted(chances, key=chances.get)):
        sure = sure and chances[name] <= FAMILY_ERROR / (len(rows) - tested)
        speed = ratio(*rows[name])  # seconds of the old build over those of the new one
        found[name] = speed, sure and abs(speed.value - 1) >= LEAST_EFFECT
    return {name: found[name] for name in rows}


def fewest_turns(rows):
    """How many timings of each build can show a change among so many rows at all."""
    turns = 3
    while _chance(range(turns), range(turns, 2 * turns)) > FAMILY_ERROR / rows:
        turns += 1
    return turns
