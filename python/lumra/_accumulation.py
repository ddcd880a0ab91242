# SPDX-License-Identifier: MIT
"""Accumulators over parts of streams, whose samples are read piece by piece from arrays or recordings.

A row is what one accumulator is for: parts (first sample, samples, first of the run of samples that it belongs to) that
follow each other without samples between; between two parts of a row there is a gap. Streams are objects with
read(first, count). Rows and their ends are in ascending order; neighbouring rows may share samples.
"""
import bisect
import copy
import dataclasses
import functools
from typing import NamedTuple

import numpy as np

from lumra._sharing import share

_AT_ONCE = 2**20
_LEAST_SHARE = 2**19  # samples of a thread


@dataclasses.dataclass(frozen=True)
class Block:
    """Samples in memory from a position of their stream on."""

    x: np.ndarray
    first: int = 0

    def __len__(self):
        return len(self.x)

    def read(self, first, count):
        return self.x[first - self.first : first - self.first + count]


class Piece(NamedTuple):
    """What is known of a row."""

    row: int
    samples: int  # of the whole row; 0 where all of them are in the value
    value: object  # an accumulator, or what `finish` made of it


def _closed(piece, finish):
    return Piece(piece.row, 0, finish(piece.value)) if piece.value.samples == piece.samples else piece


def accumulate(streams, parts, begin, finish, unwanted=lambda: False):
    """Pieces of the rows that have parts here: [(row, samples of the row, first, samples, first of the run), ...].

    begin(start, origin) makes an accumulator, finish(accumulator) gives what a row is wanted for. Ends early where it is
    unwanted.
    """
    pieces = {}
    for row, samples, first, count, origin in parts:
        if row in pieces:
            accumulator = pieces[row].value
            accumulator.gap()
        else:
            accumulator = begin(start=first, origin=origin)
            pieces[row] = Piece(row, samples, accumulator)
        for at in range(first, first + count, _AT_ONCE):
            if unwanted():
                return []
            take = min(_AT_ONCE, first + count - at)
            accumulator.add(*[stream.read(at, take) for stream in streams])
    return [_closed(piece, finish) for piece in pieces.values()]


def merge(groups, finish, copied=copy.copy):
    """Joins lists of pieces that follow each other. They are not changed, as another may be given them, too, unless there
    is no copying."""
    merged, joined = {}, set()
    for piece in (piece for group in groups for piece in group):
        if piece.row not in merged:
            merged[piece.row] = piece
            continue
        if piece.row not in joined:
            joined.add(piece.row)
            merged[piece.row] = piece._replace(value=copied(merged[piece.row].value))
        merged[piece.row].value.merge(piece.value)
    return [_closed(piece, finish) if row in joined else piece for row, piece in merged.items()]


def parts_of(rows):
    """All parts of rows as `accumulate` takes them."""
    return [(number, sum(count for _, count, _ in row), *part)
            for number, row in enumerate(rows) for part in row if part[1]]  # fmt: skip


def cut(parts, borders):
    """The parts between each border and the next."""
    ends = [first + count for _, _, first, count, _ in parts]
    return [_within(parts, bisect.bisect_right(ends, begin), begin, end) for begin, end in zip(borders, borders[1:])]


def _within(parts, at, begin, end):
    """From one of the parts on."""
    here = []
    while at < len(parts) and parts[at][2] < end:
        row, samples, first, count, origin = parts[at]
        inside = max(first, begin)
        here.append((row, samples, inside, min(first + count, end) - inside, origin))
        at += 1
    return here


def accumulate_all(streams, rows, begin, finish, threads):
    """What each row is wanted for, found by so many threads at most."""
    parts = parts_of(rows)
    first, end = parts[0][2], parts[-1][2] + parts[-1][3]
    shares = max(min(threads, (end - first) // _LEAST_SHARE), 1)
    cuts = cut(parts, [first + (end - first) * k // shares for k in range(shares + 1)])
    groups = share([functools.partial(accumulate, streams, here, begin, finish) for here in cuts])
    return [piece.value for piece in merge(groups, finish, copied=lambda own: own)]
