# SPDX-License-Identifier: MIT
"""Element-wise functions against NumPy in extended precision."""
import threading
import unittest

import numpy as np
import open as lumra

TYPES = lumra.types
long = 300_007  # elements that threads share


def noise(n, dtype):
    x = lumra.noise(n, dtype)
    x.real *= 10.0 ** lumra.random.uniform(-4, 4, n)
    return x


def wide(x):
    return x.astype(np.clongdouble if np.asarray(x).dtype.kind == "c" else np.longdouble)


def real_type(dtype):
    return np.empty(0, dtype).real.dtype


def value(suffix, number):
    """A scalar argument."""
    if suffix[0] != "c":
        return number
    return lumra.record(suffix, re=number.real, im=number.imag)


class Elementwise(lumra.Test):
    def tearDown(self):
        lumra.call("elementwise_set_threads", 1)

    def check(self, function, inputs, arguments, expected, error, out_type, in_place=True):
        """All inputs but scalars; `arguments` take `out` and then n after them. Errors are absolute. By any number of
        threads, to the same bits."""
        n, inputs = len(expected), [lumra.odd(x) for x in inputs]
        kept = [x.copy() for x in inputs]
        what, results = (function, n), []
        for threads in (1, 2, 3, 0):
            lumra.call("elementwise_set_threads", threads)
            whole = lumra.odd(np.full(n + 2, 7, out_type))
            lumra.call(function, *inputs, *arguments, whole[:n], n)
            results.append(whole.tobytes())
        self.assertEqual(1, len(set(results)), what)
        out = whole[:n]
        for x, y in zip(kept, inputs):
            np.testing.assert_array_equal(x, y, what)
        self.assertTrue((whole[n:] == 7).all(), what)
        with np.errstate(invalid="ignore"):
            wrong = ~((np.abs(out - expected) <= error) | (out == expected) | (np.isnan(out) & np.isnan(expected)))
        self.assertFalse(wrong.any(), (what, out[wrong], np.asarray(expected)[wrong]))
        for k, x in enumerate(inputs if in_place else []):
            if x.dtype == out_type and len(x) == n:
                lumra.call(function, *[y if j != k else x for j, y in enumerate(inputs)], *arguments, x, n)
                np.testing.assert_array_equal(x, out, what)
                x[...] = kept[k]

    def test_quotients_products_and_powers(self):
        for (suffix, dtype), n in ((t, n) for t in TYPES.items() for n in (*range(41), 4097, long)):
            real, eps = real_type(dtype), np.finfo(dtype).eps
            x, y = noise(n, dtype), noise(n, dtype)
            v = complex(1.5, -0.75) if dtype.kind == "c" else -0.7
            errors = 3 * eps if dtype.kind == "c" else eps / 2
            q = wide(x) / wide(y)
            self.check(f"divide_{suffix}", [x, y], [], q, errors * np.abs(q), dtype)
            q = wide(x) / dtype.type(v)
            self.check(f"divide_by_value_{suffix}", [x], [value(suffix, v)], q, errors * np.abs(q), dtype)
            self.check(f"scale_{suffix}", [x], [0.3], x * real.type(0.3), 0, dtype)
            self.check(f"magnitude_{suffix}", [x], [], np.abs(wide(x)), 1.5 * eps * np.abs(x), real)
            p = np.abs(wide(x)) ** 2
            self.check(f"power_{suffix}", [x], [], p, 1.5 * eps * p, real)

    def test_logarithms(self):
        special = [0.0, -0.0, np.inf, -np.inf, np.nan, 1.0, np.nextafter(1, 0), 1e30, 1e-30, 1e-44]
        for (suffix, dtype), n in ((t, n) for t in TYPES.items() for n in (*range(41), 5000, long)):
            real, eps = real_type(dtype), np.finfo(dtype).eps
            a, b, x = real.type(10 * np.log10(2)), real.type(-3.25), noise(n, dtype)
            x[n - len(special) :] = special if n > 2 * len(special) else x[n - len(special) :]
            with np.errstate(all="ignore"):
                if dtype.kind == "f":
                    logarithm = np.log2(wide(x))
                    error = 2 * eps * (np.abs(a * logarithm) + np.abs(b))
                    self.check(f"log2_{suffix}", [x], [a, b], a * logarithm + b, error, real)
                    p, uncertain = wide(np.abs(x)), 0
                    logarithm = 2 * np.log2(p)
                else:
                    x[np.abs(x) > 1e20] = x[np.abs(x) < 1e-20] = 0
                    logarithm, uncertain = np.log2(np.abs(wide(x)) ** 2), 2
                error = 2 * eps * (np.abs(a) * (np.abs(logarithm) + uncertain) + np.abs(b))
            self.check(f"log2_power_{suffix}", [x], [a, b], a * logarithm + b, error, real)

    def test_polynomials(self):
        kinds = [(s, s, "polynomial_") for s in TYPES]
        kinds += [("f32", "cf32", "polynomial_of_real_"), ("f64", "cf64", "polynomial_of_real_")]
        for (of, suffix, function), n in ((k, n) for k in kinds for n in (*range(41), 200, long)):
            for m in (1, 2, 3, 9, 40) if n < long else (5,):
                x, c = noise(n, TYPES[of]).clip(-1.5, 1.5), noise(m, TYPES[suffix])
                powers = wide(x)[:, None] ** np.arange(m)
                expected, size = powers @ wide(c), np.abs(powers) @ np.abs(wide(c))
                error = 3 * m * np.finfo(x.dtype).eps * size
                self.check(function + suffix, [x], [c, m], expected, error, TYPES[suffix], of == suffix)

    def test_gains_by_key_are_the_formulas_bits(self):
        for suffix, n in ((t, n) for t in ("cf32", "cf64") for n in (*range(41), 300, long)):
            dtype, real = TYPES[suffix], real_type(TYPES[suffix]).type
            for m, start, step in ((1, 0.5, 1.0), (7, -2.0, 0.3), (200, 1.0, -0.01)):
                table, x = noise(m, dtype), noise(n, dtype)
                keys = (start + step * lumra.random.uniform(-3, m + 3, n)).astype(real)
                keys[: n // 4] = np.resize([np.nan, np.inf, -np.inf, 1e30, start - 0.5 * step, start], n // 4)
                with np.errstate(all="ignore"):
                    t = (keys - real(start)) * (real(1) / real(step))
                    k = np.where((t > -1) & (t < 2.0**31), np.trunc(t), -1).astype(int)
                    inner = (k >= 0) & (k < m - 1)
                    low = np.where(inner, k, 0)
                    f, low, high = t - low.astype(real), table[low], table[np.where(inner, k + 1, 0)]
                    g = [f * (h - v) + v for v, h in ((low.real, high.real), (low.imag, high.imag))]
                    ends = np.where(k < 0, table[0], table[-1])
                    re, im = np.where(inner, g[0], ends.real), np.where(inner, g[1], ends.imag)
                    expected = (re * x.real - im * x.imag) + 1j * (re * x.imag + im * x.real)
                arguments = [table, m, float(start), float(step)]
                self.check(f"lookup_{suffix}", [x, keys], arguments, expected.astype(dtype), 0, dtype)

    def test_threads_are_the_calling_threads_own(self):
        def other():
            found.append(lumra.run("elementwise_threads"))
            lumra.call("elementwise_set_threads", 1024)

        found = []
        lumra.call("elementwise_set_threads", 2)
        thread = threading.Thread(target=other)
        thread.start()
        thread.join()
        self.refused("LUMRA_OUT_OF_RANGE", "elementwise_set_threads", 1025, says="threads is 1025; it is 0 to 1024")
        self.assertEqual([1, 2], [*found, lumra.run("elementwise_threads")])

    def test_refusals(self):
        x, real = noise(20, TYPES["cf32"]), noise(50, TYPES["f32"])
        at, far, huge, nan = x.ctypes.data, x.ctypes.data + 80, 2**64 - 1, float("nan")
        for code, word, function, arguments in (
            ("LUMRA_NULL_ARGUMENT", "x is null", "divide_cf32", (None, x, far, 10)),
            ("LUMRA_NULL_ARGUMENT", "y is null", "divide_cf32", (x, None, far, 10)),
            ("LUMRA_NULL_ARGUMENT", "out is null", "divide_cf32", (x, x, None, 10)),
            ("LUMRA_OUT_OF_RANGE", "count of x", "divide_cf32", (x, x, far, huge)),
            ("LUMRA_OVERLAP", "out overlaps y", "divide_cf32", (real, x, at + 8, 10)),
            ("LUMRA_OVERLAP", "out overlaps x", "scale_cf32", (x, 1.0, at + 8, 10)),
            ("LUMRA_OVERLAP", "out overlaps x", "magnitude_cf32", (x, at, 10)),
            ("LUMRA_OVERLAP", "out overlaps x", "log2_power_cf32", (x, 1.0, 0.0, at + 76, 10)),
            ("LUMRA_OUT_OF_RANGE", "m is 0", "polynomial_cf32", (x, x, 0, far, 10)),
            ("LUMRA_OUT_OF_RANGE", "count of c", "polynomial_cf32", (x, x, huge, far, 10)),
            ("LUMRA_OVERLAP", "out overlaps c", "polynomial_cf32", (real, x, 3, at + 16, 10)),
            ("LUMRA_OVERLAP", "out overlaps x", "polynomial_of_real_cf32", (real, x, 3, real, 10)),
            ("LUMRA_OUT_OF_RANGE", "m is 2147483648", "lookup_cf32", (x, real, x, 2**31, 0.0, 1.0, far, 10)),
            ("LUMRA_OUT_OF_RANGE", "start is nan", "lookup_cf32", (x, real, x, 9, nan, 1.0, far, 10)),
            ("LUMRA_OUT_OF_RANGE", "step is 0", "lookup_cf32", (x, real, x, 9, 0.0, 0.0, far, 10)),
            ("LUMRA_OUT_OF_RANGE", "step is inf", "lookup_cf32", (x, real, x, 9, 0.0, float("inf"), far, 10)),
            ("LUMRA_OVERLAP", "out overlaps keys", "lookup_cf32", (x, real, x, 9, 0.0, 1.0, real, 10)),
            ("LUMRA_OVERLAP", "out overlaps table", "lookup_cf32", (x, real, far, 9, 0.0, 1.0, far, 10)),
        ):
            self.refused(code, function, *arguments, says=word)


if __name__ == "__main__":
    unittest.main()
