# SPDX-License-Identifier: MIT
"""Arrays over files in memory, read so that the process stays small."""
import mmap

import numpy as np

_AT_ONCE = 2**22
_LARGE = 2**26  # bytes; what is smaller stays


def _shared_map(x):
    """The memory map that all of a large array lies in, where the file has every change of it."""
    if x.nbytes < _LARGE or x.strides[0] < 0:
        return None
    while isinstance(x, np.ndarray):
        if isinstance(x, np.memmap) and x.mode == "c":
            return None
        holder, x = x, x.base
    return x if isinstance(x, mmap.mmap) and isinstance(holder, np.memmap) else None


def pieces(x, first, count):
    """Views of x[first : first + count]. The pages of a memory map leave the process when they were used; the system keeps
    them in its cache."""
    mapped = _shared_map(x)
    if mapped is None:
        yield x[first : first + count]
        return
    begin = np.frombuffer(mapped, np.uint8).__array_interface__["data"][0]
    for at in range(first, first + count, _AT_ONCE):
        part = x[at : min(at + _AT_ONCE, first + count)]
        yield part
        start = part.__array_interface__["data"][0] - begin
        end = start + len(part) * part.strides[0]
        start, end = -(-start // mmap.PAGESIZE) * mmap.PAGESIZE, end // mmap.PAGESIZE * mmap.PAGESIZE
        if start < end:
            mapped.madvise(mmap.MADV_DONTNEED, start, end - start)
