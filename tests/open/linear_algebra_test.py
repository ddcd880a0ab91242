# SPDX-License-Identifier: MIT
"""Least squares beside SciPy's."""
import ctypes
import unittest

import numpy as np
import open as lumra
import scipy.linalg


def solver(kind, rows, columns, right_sides=1):
    return lumra.create("least_squares", type=lumra.type_code(kind), rows=rows, columns=columns, right_sides=right_sides)


class LeastSquares(lumra.Test):
    def test_values_and_rank(self):
        for kind, dtype in lumra.types.items():
            epsilon = np.finfo(dtype).eps
            noise = lambda *shape: lumra.noise(shape, dtype)
            for m, n, k, missing in [(1, 1, 1, 0), (20, 5, 3, 0), (5, 20, 2, 0), (7, 7, 1, 0), (30, 8, 2, 3),
                                     (8, 30, 2, 1), (200, 50, 1, 0), (6, 4, 1, 4)]:
                rank = min(m, n) - missing
                a = noise(m, n) if not missing else (noise(m, rank) @ noise(rank, n)).astype(dtype)
                b, x, found = noise(m, k), np.empty((n, k), dtype), ctypes.c_uint64()
                one = solver(kind, m, n, k)
                for _ in range(2):  # workspace that was used is as good as new
                    lumra.call("least_squares_solve", one, lumra.odd(a), lumra.odd(b), np.nan, x, found)
                    self.assertEqual(rank, found.value, (kind, m, n))
                    wide = np.complex128 if np.iscomplexobj(a) else np.float64
                    expected = scipy.linalg.lstsq(a.astype(wide), b.astype(wide), cond=max(m, n) * epsilon)[0]
                    s = np.linalg.svd(a.astype(wide), compute_uv=False)
                    condition = s[0] / s[rank - 1] if rank else 1
                    self.close(expected, x, 200 * epsilon * condition**2, (kind, m, n, k, missing))

    def test_rcond(self):
        a, x, rank = np.diag([1.0, 1e-3, 1e-6]), np.empty(3), ctypes.c_uint64()
        one = solver("F64", 3, 3)
        for rcond, wanted in [(0.0, 3), (1e-7, 3), (1e-5, 2), (0.5, 1)]:
            lumra.call("least_squares_solve", one, a, np.ones(3), rcond, x, rank)
            self.assertEqual(wanted, rank.value)
            self.close([1, 1e3, 1e6][:wanted] + [0] * (3 - wanted), x, 1e-12, rcond)

    def test_refusals(self):
        one, a, b, x = solver("F64", 4, 2), np.ones((4, 2)), np.ones(4), np.ones(2)
        for code, says, arguments in [
            ("LUMRA_NULL_ARGUMENT", "solver is null", (None, a, b, 0.0, x, None)),
            ("LUMRA_WRONG_OBJECT", "another kind", (a, a, b, 0.0, x, None)),
            ("LUMRA_NULL_ARGUMENT", "a is null", (one, None, b, 0.0, x, None)),
            ("LUMRA_NULL_ARGUMENT", "b is null", (one, a, None, 0.0, x, None)),
            ("LUMRA_NULL_ARGUMENT", "x is null", (one, a, b, 0.0, None, None)),
            ("LUMRA_OVERLAP", "x overlaps a", (one, a, b, 0.0, a, None)),
            ("LUMRA_OVERLAP", "x overlaps b", (one, a, b, 0.0, b[1:], None)),
            ("LUMRA_OUT_OF_RANGE", "rcond is -1", (one, a, b, -1.0, x, None)),
            ("LUMRA_OUT_OF_RANGE", "a[3] is not finite", (one, np.r_[1, 1, 1, np.inf, 1, 1, 1, 1], b, 0.0, x, None)),
            ("LUMRA_OUT_OF_RANGE", "b[2] is not finite", (one, a, np.r_[1, 1, np.nan, 1], 0.0, x, None)),
        ]:
            self.refused(code, "least_squares_solve", *arguments, says=says)
        out = ctypes.c_void_p()
        for code, changes in [("LUMRA_UNKNOWN_CHOICE", {"type": 0}), ("LUMRA_OUT_OF_RANGE", {"rows": 0}),
                              ("LUMRA_OUT_OF_RANGE", {"columns": 2**31}), ("LUMRA_OUT_OF_RANGE", {"right_sides": 0}),
                              ("LUMRA_OUT_OF_RANGE", {"rows": 2**30, "columns": 2**30})]:
            self.refused(code, "least_squares_create", lumra.record("least_squares", **changes), out)
        self.assertIsNone(out.value)


if __name__ == "__main__":
    unittest.main()
