# SPDX-License-Identifier: MIT
"""Accumulators over parts of streams, whose samples are read piece by piece from arrays or recordings.

A row is what one accumulator is for: parts (first sample, samples, first of the run of samples that it belongs to) that
follow each other without samples between; between two parts of a row there is a gap. Streams are objects with
read(first, count). Rows and their ends are in ascending order; neighbouring rows may share samples.
"""
import copy
import dataclasses
from typing import NamedTuple

import numpy as np

_AT_ONCE = 2**20


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


def accumulate(streams, parts, begin, finish):
    """Pieces of the rows that have parts here: [(row, samples of the row, first, samples, first of the run), ...].

    begin(start, origin) makes an accumulator, finish(accumulator) gives what a row is wanted for.
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
            take = min(_AT_ONCE, first + count - at)
            accumulator.add(*[stream.read(at, take) for stream in streams])
    return [_closed(piece, finish) for piece in pieces.values()]


def merge(groups, finish):
    """Joins lists of pieces that follow each other. They are not changed: another may be given them, too."""
    merged, joined = {}, set()
    for piece in (piece for group in groups for piece in group):
        if piece.row not in merged:
            merged[piece.row] = piece
            continue
        if piece.row not in joined:
            joined.add(piece.row)
            merged[piece.row] = piece._replace(value=copy.copy(merged[piece.row].value))
        merged[piece.row].value.merge(piece.value)
    return [_closed(piece, finish) if row in joined else piece for row, piece in merged.items()]


def parts_of(rows):
    """All parts of rows as `accumulate` takes them."""
    return [(number, sum(count for _, count, _ in row), *part)
            for number, row in enumerate(rows) for part in row if part[1]]  # fmt: skip


def accumulate_all(streams, rows, begin, finish):
    """What each row is wanted for."""
    return [piece.value for piece in accumulate(streams, parts_of(rows), begin, finish)]
