# SPDX-License-Identifier: MIT
"""Transforms, filters, operations by element, least squares and windows beside NumPy and SciPy."""
import copy
import itertools
import pickle
import threading
import unittest

import numpy as np
import scipy.fft
import scipy.signal

import lumra
from support import Test, close, dtypes, forms, noise

real_types, complex_types = dtypes[:2], dtypes[2:]
transforms = {name: (getattr(lumra, name), getattr(scipy.fft, name)) for name in ("fft", "ifft", "rfft", "irfft")}
b, a = scipy.signal.butter(3, 0.3)
sos = scipy.signal.butter(5, [0.2, 0.4], "bandpass", output="sos")
h = scipy.signal.firwin(31, 0.3)


class Transforms(Test):
    def test_as_scipy_in_every_form(self):
        for name, dtype, (form, make) in itertools.product(transforms, dtypes, forms.items()):
            ours, theirs = transforms[name]
            if name == "rfft" and np.dtype(dtype).kind == "c":
                continue
            for shape, axis, n, norm in [((24,), -1, None, None), ((7,), 0, 7, "ortho"), ((3, 10, 4), 1, 10, "forward"),
                                         ((3, 10, 4), 0, 5, "backward"), ((4, 9), -1, 6, None), ((1, 1), 0, 1, None)]:  # fmt: skip
                x = make(noise(shape, dtype))
                if name == "irfft" and n is None and shape[axis] < 2:
                    continue
                with self.subTest(name=name, dtype=dtype, form=form, shape=shape, axis=axis, n=n, norm=norm):
                    wanted = theirs(noise(shape, dtype), n, axis, norm)
                    self.assert_close(ours(x, n, axis, norm, workers=2), wanted, dtype=wanted.dtype)

    def test_out_is_written_wherever_it_lies(self):
        x = noise((6, 8), np.complex64)
        wanted = scipy.fft.fft(x, axis=0)
        for form, make in [("own", np.empty_like), ("every second", lambda x: np.empty((6, 16), x.dtype)[:, ::2])]:
            out = make(x)
            with self.subTest(form=form):
                self.assertIs(lumra.fft(x, axis=0, out=out), out)
                self.assert_close(out, wanted)
        for out in (x, x[::-1]):  # in place, and over the input from its end
            of = x.copy()
            over = of if out is x else of[::-1]
            self.assertIs(lumra.fft(of, axis=0, out=over), over)
            self.assert_close(over, wanted)
        self.assertEqual(lumra.rfft(np.empty((0, 4))).shape, (0, 3))


class Elements(Test):
    def test_as_numpy_in_every_form(self):
        c = [1, -0.5, 2]
        for dtype, (form, make) in itertools.product(dtypes, forms.items()):
            x, y = noise(5000, dtype), noise(5000, dtype, 2)
            real = np.dtype(dtype).type(0).real.dtype
            for name, ours, wanted, type_ in [
                ("magnitude", lumra.magnitude(make(x)), np.abs(x), real),
                ("power", lumra.power(make(x)), np.abs(x) ** 2, real),
                ("decibels", lumra.decibels(make(x)), 20 * np.log10(np.abs(x)), real),
                ("divide", lumra.divide(make(x), make(y)), x / y, dtype),
                ("divide by one", lumra.divide(make(x), 2.5), x / 2.5, dtype),
                ("polynomial", lumra.polynomial(make(x), c), 1 - x / 2 + 2 * x**2, dtype),
                ("complex polynomial", lumra.polynomial(make(x), [1j, 2]), 1j + 2 * x, np.result_type(dtype, np.complex64)),
                ("lookup", lumra.lookup(make(np.abs(x)), make(x), [1, 2, 4, 8], 0, 1),
                 x * np.interp(np.abs(x), range(4), [1, 2, 4, 8]), dtype),
            ]:  # fmt: skip
                with self.subTest(name=name, dtype=dtype, form=form):
                    self.assert_close(ours, wanted, 2 * close(dtype), type_)

    def test_other_types_and_out(self):
        for x in ([3, -4], np.array([3, -4], np.int16), np.array([True, False]), np.array([3, -4], np.float16)):
            self.assert_close(lumra.magnitude(x), np.abs(np.asarray(x, float)))
        self.assertEqual(lumra.magnitude(np.float16([1])).dtype, np.float32)
        x = noise(100, np.float32)
        out = np.empty(200, np.float32)[::-2]
        self.assertIs(lumra.power(x, out), out)
        self.assert_close(out, x**2)
        shifted = x.copy()
        lumra.power(shifted[:-1], out=shifted[1:])
        self.assert_close(shifted[1:], x[:-1] ** 2)
        self.assertTrue(np.isneginf(lumra.decibels(np.zeros(3, np.complex64))).all())


class Filters(Test):
    def test_along_axes_with_state_as_scipy(self):
        for dtype, (form, make) in itertools.product(dtypes, forms.items()):
            for shape, axis in [((40,), -1), ((3, 40, 2), 1), ((40, 5), 0), ((0, 5), 1)]:
                x = noise(shape, dtype)
                with self.subTest(dtype=dtype, form=form, shape=shape):
                    self.assert_close(lumra.lfilter(b, a, make(x), axis), scipy.signal.lfilter(b, a, x, axis), close(dtype), dtype)
                    self.assert_close(lumra.sosfilter(sos, make(x), axis), scipy.signal.sosfilt(sos, x, axis), close(dtype))
                    state = list(shape)
                    state[axis] = 3
                    zi = noise(state, np.result_type(dtype, float))
                    for ours, theirs in zip(lumra.lfilter(b, a, make(x), axis, zi), scipy.signal.lfilter(b, a, x, axis, zi)):
                        self.assert_close(ours, theirs, close(dtype))
                    state[axis] = 2
                    zi = noise([len(sos), *state], np.result_type(dtype, float))
                    for ours, theirs in zip(lumra.sosfilter(sos, make(x), axis, zi), scipy.signal.sosfilt(sos, x, axis, zi)):
                        self.assert_close(ours, theirs, close(dtype))

    def test_records_as_scipy(self):
        modes = "full", "same", "valid"
        for mode, kind, (nx, ny) in itertools.product(modes, dtypes, [(50, 7), (7, 50), (1, 1), (3000, 900)]):
            for other in dtypes:
                x, y = noise(nx, kind), noise(ny, other, 2)
                with self.subTest(mode=mode, kind=kind, other=other, nx=nx, ny=ny):
                    for name in ("convolve", "correlate"):
                        wanted = getattr(scipy.signal, name)(x.astype(complex), y.astype(complex), mode)
                        ours = getattr(lumra, name)(x[::-1][::-1], y, mode)
                        self.assert_close(ours, wanted)
                        self.assertEqual(ours.real.dtype, x.real.dtype)
                        self.assertEqual(ours.dtype.kind, "c" if "c" in x.dtype.kind + y.dtype.kind else "f")

    def test_streams_in_any_cut(self):
        for dtype, (make, whole) in itertools.product(dtypes, [
            (lambda: lumra.IirFilter(b, a), lambda x: scipy.signal.lfilter(b, a, x)),
            (lambda: lumra.FirFilter(h), lambda x: scipy.signal.lfilter(h, 1, x)),
            (lambda: lumra.FirFilter(h * 1j), lambda x: scipy.signal.lfilter(h * 1j, 1, x)),
        ]):  # fmt: skip
            x = noise(1000, dtype)
            stream = make()
            at_once = stream(x)
            self.assert_close(at_once, whole(x), close(dtype))
            self.assertEqual(at_once.real.dtype, x.real.dtype)
            stream.reset()
            parts = []
            for block in np.split(x, [0, 1, 2, 300, 301]):
                parts.append(stream(block))
                stream = copy.deepcopy(pickle.loads(pickle.dumps(stream)))
            self.assertEqual(np.concatenate(parts).tobytes(), at_once.tobytes())

    def test_one_stream_in_many_threads(self):
        stream, threads = lumra.IirFilter(b, a), 4
        ones = np.ones(100_000, np.float32)
        workers = [threading.Thread(target=lambda: [stream(ones) for _ in range(5)]) for _ in range(threads)]
        [worker.start() for worker in workers]
        [worker.join() for worker in workers]
        whole = lumra.IirFilter(b, a)
        for _ in range(5 * threads):
            whole(ones)
        self.assertEqual(stream(ones).tobytes(), whole(ones).tobytes())

    def test_designs(self):
        rate = 1e6
        taps = lumra.kaiser_lowpass(rate, 1e5, 1.5e5, 70)
        frequency, response = scipy.signal.freqz(taps, worN=8192, fs=rate)
        level = 20 * np.log10(np.abs(response) + 1e-30)
        self.assertLess(level[frequency >= 1.5e5].max(), -68.5)
        self.assertLess(np.abs(level[frequency <= 1e5]).max(), 0.01)
        pulse = np.convolve(*[lumra.root_raised_cosine(8, 1, 0.3, 40)] * 2)
        symbols = pulse[len(pulse) // 2 % 8 :: 8]
        self.assert_close(symbols, np.eye(1, len(symbols), len(symbols) // 2)[0], 1e-3)


class Records(Test):
    def test_least_squares_as_numpy(self):
        for dtype, (m, n, rank), sides in itertools.product(dtypes, [(9, 4, 4), (4, 9, 4), (8, 8, 3)], [(), (1,), (3,)]):
            left = noise((m, rank), dtype) @ noise((rank, n), dtype, 2)
            right = noise((m, *sides), dtype, 3)
            with self.subTest(dtype=dtype, m=m, n=n, rank=rank, sides=sides):
                rcond = 1e-4 if close(dtype) > 1e-6 else None
                wanted = np.linalg.lstsq(left, right, rcond)[0]
                self.assert_close(lumra.lstsq(np.asfortranarray(left), right, rcond), wanted, 50 * close(dtype), dtype)

    def test_windows_as_scipy(self):
        names = ["boxcar", "hann", "hamming", "blackman", "flattop", "blackmanharris", "nuttall", ("kaiser", 8.6)]
        for name, n, sym in itertools.product(names, (1, 2, 7, 64), (False, True)):
            with self.subTest(name=name, n=n, sym=sym):
                wanted = scipy.signal.get_window(name, n, not sym)
                self.assert_close(lumra.window(name, n, sym=sym), wanted, 1e-14)
                self.assertEqual(lumra.window(name, n, sym=sym, dtype=np.float32).tobytes(), wanted.astype("f").tobytes())
        w = lumra.window("low_sidelobe", 256)
        half = abs(np.sum(w * np.exp(1j * np.pi * np.arange(256) / 256)))
        figures = w.mean(), 256 * (w**2).sum() / w.sum() ** 2, 20 * np.log10(w.sum() / half)
        self.assert_close(np.array(lumra.window_figures("low_sidelobe", 256)), figures, 1e-12)


class Refusals(Test):
    def test_each_names_argument_and_value(self):
        x, text, iir = np.zeros(8), np.array(["a"]), lumra.IirFilter([1], [1])
        read_only = np.zeros(8)
        read_only.setflags(write=False)
        iir(np.zeros(3, np.float32))
        for kind, words, call, arguments in [
            (TypeError, "x is of dtype <U1", lumra.fft, [text]),
            (TypeError, "x is of dtype object", lumra.power, [[None]]),
            (TypeError, "x is of dtype object", lumra.magnitude, [(k for k in range(3))]),
            (ValueError, "x is [[1, 2], [3]]", lumra.magnitude, [[[1, 2], [3]]]),
            (ValueError, "x is of shape (2, 4)", lumra.magnitude, [np.zeros((2, 4))]),
            (ValueError, "x is of shape ()", lumra.magnitude, [1.5]),
            (ValueError, "x is array(3.)", lumra.fft, [np.array(3.0)]),
            (ValueError, "n is 0", lumra.fft, [x, 0]),
            (ValueError, "n is 0", lumra.fft, [[]]),
            (ValueError, "n is 0", lumra.irfft, [[1]]),
            (ValueError, "n is 1267650600228229401496703205376", lumra.fft, [x, 2**100]),
            (TypeError, "n is 2.5", lumra.fft, [x, 2.5]),
            (ValueError, "axis is 1", lumra.fft, [x, None, 1]),
            (ValueError, "norm is 'orthogonal'", lumra.fft, [x, None, -1, "orthogonal"]),
            (TypeError, "x is of dtype complex128", lumra.rfft, [x + 0j]),
            (ValueError, "y is of 7 elements", lumra.divide, [x, x[1:]]),
            (ValueError, "c is empty", lumra.polynomial, [x, []]),
            (ValueError, "step is 0", lumra.lookup, [x, x, [1], 0, 0]),
            (ValueError, "start is nan", lumra.lookup, [x, x, [1], np.nan, 1]),
            (TypeError, "keys is of dtype complex", lumra.lookup, [x + 0j, x, [1], 0, 1]),
            (TypeError, "out is of dtype float32", lumra.power, [x, x.astype(np.float32)]),
            (ValueError, "out is of shape (7,) & (8,)", lumra.power, [x, x[1:]]),
            (ValueError, "out is read-only", lumra.power, [x, read_only]),
            (TypeError, "out is [0", lumra.power, [x, [0] * 8]),
            (TypeError, "b is of dtype complex128", lumra.lfilter, [[1j], [1], x]),
            (ValueError, "a[0] is 0", lumra.lfilter, [[1], [0, 1], x]),
            (ValueError, "zi is of shape (2,) & (1,)", lumra.lfilter, [[1], [1, 1], x, -1, [0, 0]]),
            (ValueError, "sos is of shape (1, 5)", lumra.sosfilter, [np.ones((1, 5)), x]),
            (ValueError, "a is empty", lumra.IirFilter, [[1], []]),
            (TypeError, "x is of dtype complex64 & float32", iir, [np.zeros(3, np.complex64)]),
            (ValueError, "x is empty", lumra.convolve, [[], [1]]),
            (ValueError, "mode is 'all'", lumra.correlate, [x, x, "all"]),
            (ValueError, "stop_edge is 0.7", lumra.kaiser_lowpass, [1, 0.1, 0.7, 80]),
            (ValueError, "b is of shape (3,)", lumra.lstsq, [np.ones((2, 2)), [1, 2, 3]]),
            (ValueError, "rcond is -1", lumra.lstsq, [np.ones((2, 2)), [1, 2], -1]),
            (ValueError, "a[0] is not finite", lumra.lstsq, [np.full((2, 2), np.nan), [1, 2]]),
            (ValueError, "window is 'hanning'", lumra.window, ["hanning", 8]),
            (ValueError, "window is 'kaiser'", lumra.window, ["kaiser", 8]),
            (ValueError, "window is ('kaiser', -1)", lumra.window, [("kaiser", -1), 8]),
            (ValueError, "n is -1", lumra.window, ["hann", -1]),
            (ValueError, "n is 0", lumra.window_figures, ["hann", 0]),
        ]:  # fmt: skip
            self.refused(kind, words, call, *arguments)
        self.refused(TypeError, "dtype is", lumra.window, "hann", 8, dtype=np.int16)
        self.refused(ValueError, "workers is 0", lumra.fft, x, workers=0)
        self.refused(ValueError, "threads is 1025", lumra.power, x, threads=1025)

    def test_damaged_states(self):
        stream = lumra.FirFilter(h)
        stream(noise(100, np.complex64))
        made_from, saved = stream.__getstate__()
        for damaged in (saved[:-1], saved[:40], b"x" * len(saved), saved[:60] + b"\xff" * (len(saved) - 60), b"1"):
            with self.subTest(size=len(damaged)):
                fresh = lumra.FirFilter.__new__(lumra.FirFilter)
                try:
                    fresh.__setstate__((made_from, damaged))
                except lumra.Error as refused:
                    self.assertLess(refused.code, 0)
                    self.assertEqual(pickle.loads(pickle.dumps(refused)).code, refused.code)


if __name__ == "__main__":
    unittest.main()
