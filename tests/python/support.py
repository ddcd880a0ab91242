# SPDX-License-Identifier: MIT
"""What the tests of the Python package share: samples in every form that an array may have, refusals by table."""
import unittest

import numpy as np

single, double = np.complex64, np.complex128
dtypes = np.float32, np.float64, np.complex64, np.complex128


def noise(shape, dtype, seed=1):
    generator = np.random.default_rng(seed)
    x = generator.standard_normal(shape)
    if np.dtype(dtype).kind == "c":
        x = x + 1j * generator.standard_normal(shape)
    return x.astype(dtype)


def close(dtype):
    """The tolerance of results whose magnitude is about 1."""
    return 2e-5 if np.dtype(dtype).itemsize // (1 + (np.dtype(dtype).kind == "c")) == 4 else 1e-12


def _misaligned(x):
    memory = np.zeros(x.nbytes + 1, np.uint8)
    view = memory[1:].view(x.dtype).reshape(x.shape)
    view[...] = x
    return view


def _record_field(x):
    records = np.zeros(x.shape, [("gap", np.uint8, 4), ("x", x.dtype)])
    records["x"] = x
    return records["x"]


def _strided(x, step):
    wide = np.full(x.shape[:-1] + (3 * x.shape[-1],), np.nan, x.dtype)
    view = wide[..., ::3][..., ::step]
    view[...] = x
    return view


def _read_only(x):
    x = x.copy()
    x.setflags(write=False)
    return x


# Each gives the same numbers in another form.
forms = {
    "as it is": lambda x: x,
    "every third": lambda x: _strided(x, 1),
    "backwards": lambda x: _strided(x, -1),
    "Fortran's order": lambda x: np.asfortranarray(x),
    "other byte order": lambda x: x.astype(x.dtype.newbyteorder()),
    "misaligned": _misaligned,
    "field of records": _record_field,
    "read-only": _read_only,
}


class Test(unittest.TestCase):
    def assert_close(self, ours, theirs, tolerance=None, dtype=None):
        theirs = np.asarray(theirs)
        self.assertEqual(ours.shape, theirs.shape)
        if dtype is not None:
            self.assertEqual(ours.dtype, dtype)
        scale = max(np.abs(theirs).max(initial=0), 1e-300)
        error = np.abs(ours - theirs).max(initial=0)
        self.assertLessEqual(error, (tolerance or close(ours.dtype)) * scale)

    def refused(self, kind, words, call, *arguments, **named):
        """The call raises exactly this kind, and its message holds all the words."""
        with self.subTest(words=words, arguments=str(arguments)[:80], named=str(named)[:80]):
            with self.assertRaises(kind) as caught:
                call(*arguments, **named)
            self.assertIs(type(caught.exception), kind)
            for word in words.split(" & "):
                self.assertIn(word, str(caught.exception))
