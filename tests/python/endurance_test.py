# SPDX-License-Identifier: MIT
"""Long work that is interrupted, objects that threads share, children of a process that has used the package."""
import os
import signal
import subprocess
import sys
import tempfile
import threading
import time
import unittest

import numpy as np

import lumra
from support import Test, noise


class Interrupts(Test):
    def test_long_work_ends_within_a_second(self):
        endless = np.broadcast_to(np.complex64(1), 2**36)
        file = tempfile.NamedTemporaryFile(suffix=".cf32")
        self.addCleanup(file.close)
        os.truncate(file.name, 2**36)
        recording = lumra.Recording(file.name, sample_rate=1.0)
        taps, square = np.ones(20_000), noise((1700, 1700), float)
        for name, work in {
            "spectrum": lambda: lumra.spectrum(endless, threads=1),
            "spectrum by threads": lambda: lumra.spectrum(endless, nfft=2**20, threads=2),
            "recording": lambda: lumra.level(recording),
            "evm by threads": lambda: lumra.evm(endless, endless, threads=2),
            "waterfall": lambda: lumra.waterfall(recording, rows=10),
            "resample": lambda: lumra.resample(endless.real, 100_000, 1),
            "lfilter": lambda: lumra.lfilter(taps, [1], np.ones(2**20)),
            "convolve": lambda: lumra.convolve(np.ones(2**23), np.ones(2**23)),
            "lstsq": lambda: lumra.lstsq(square, square),
        }.items():
            signal.setitimer(signal.ITIMER_REAL, 0.3)
            start = time.process_time()  # what others do on the machine does not count
            with self.subTest(name=name), self.assertRaises(KeyboardInterrupt):
                work()
            self.assertLess(time.process_time() - start, 2, name)
            signal.setitimer(signal.ITIMER_REAL, 0)

    def setUp(self):
        before = signal.signal(signal.SIGALRM, lambda *_: (_ for _ in ()).throw(KeyboardInterrupt))
        self.addCleanup(signal.signal, signal.SIGALRM, before)

    def test_a_handler_that_comes_back_to_the_object_in_use(self):
        estimator, found = lumra.SpectrumEstimator(), []

        def come_back(*_):
            try:
                estimator.add([1])
            except lumra.Error as refused:
                found.append(refused)
            raise KeyboardInterrupt

        signal.signal(signal.SIGALRM, come_back)
        signal.setitimer(signal.ITIMER_REAL, 0.2)
        with self.assertRaises(KeyboardInterrupt):
            estimator.add(np.broadcast_to(np.complex64(1), 2**36))
        self.assertIn("in use", str(found[0]))
        self.assertGreater(estimator.result().segments, 0)


class Sharing(Test):
    def in_threads(self, *works):
        failed = []

        def run(work):
            try:
                work()
            except Exception as reason:
                failed.append(reason)

        threads = [threading.Thread(target=run, args=[work], daemon=True) for work in works]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join(60)
            self.assertFalse(thread.is_alive())
        return failed

    def test_objects_serve_threads_one_after_the_other(self):
        ones = np.ones(20_000, np.complex64)
        estimator, meter = lumra.SpectrumEstimator(nfft=64), lumra.LevelMeter()
        stream, split = lumra.Resampler(3, 2), lumra.Channelizer(1.0, [(0.1, 0.2)])
        for one in (estimator.add, meter.add, lambda x: estimator.result() if estimator.segments else None, stream, split):
            self.assertEqual(self.in_threads(*[lambda: [one(ones) for _ in range(10)]] * 4), [])
        self.assertEqual((estimator.samples, meter.samples), (800_000, 800_000))
        self.assertEqual(len(stream.flush()) > 0, True)
        # Neighbours that are merged crosswise at once: refused for their places, never stuck.
        a, b = lumra.LevelMeter().add(ones), lumra.LevelMeter(start=20_000).add(ones)
        failed = self.in_threads(*[lambda: [a.merge(b) for _ in range(200)], lambda: [b.merge(a) for _ in range(200)]])
        self.assertTrue(all(type(each) is ValueError for each in failed))

    def test_children(self):
        x = noise(5000, np.complex64)
        wanted = lumra.fft(x), lumra.spectrum(x, nfft=64).power, lumra.lfilter([1], [1, -0.5], x)
        child = os.fork()
        if child == 0:
            found = lumra.fft(x), lumra.spectrum(x, nfft=64).power, lumra.lfilter([1], [1, -0.5], x)
            os._exit(0 if all(a.tobytes() == b.tobytes() for a, b in zip(found, wanted)) else 1)
        self.assertEqual(os.waitpid(child, 0)[1], 0)

    def test_threads_share_the_work(self):
        x = noise(2**21, np.complex64)
        for workers in (2, -1):
            self.assertEqual(lumra.fft(x.reshape(64, -1), workers=workers).tobytes(), lumra.fft(x.reshape(64, -1)).tobytes())
        for one in (lambda n: lumra.spectrum(x, threads=n).power, lambda n: lumra.divide(x, x[::-1].copy(), threads=n)):
            self.assertEqual(one(2).tobytes(), one(1).tobytes())
        for n in (100_000, 2**21):
            for one, options in ((lumra.level, {}), (lumra.evm, dict(measured=0.5j * x[:n], align=["gain", "delay"]))):
                self.assertEqual(one(x[:n], threads=2, **options), one(x[:n], threads=1, **options))


class Memory(Test):
    def test_of_maps_stays_small(self):
        with tempfile.NamedTemporaryFile() as file:
            file.write(noise(2**20, np.complex64).tobytes())
            file.truncate(2**28 + 8)
            mapped, peak = np.memmap(file.name, np.complex64, "r+"), "open('/proc/self/status').read().split('VmHWM:')[1]"
            script = (f"import lumra, numpy; x = numpy.memmap({file.name!r}, numpy.complex64, 'r')[1:]; "
                      f"before = {peak}; found = lumra.spectrum(x); lumra.waterfall(x[::3]); lumra.level(x); "
                      f"print(before.split()[0], {peak}.split()[0], found.power.sum())")  # fmt: skip
            before, after, power = subprocess.check_output([sys.executable, "-c", script], text=True).split()
            self.assertLess(int(after), int(before) + 100_000)  # KiB
            self.assertEqual(power, str(lumra.spectrum(np.array(mapped[1:])).power.sum()))
            mapped[-1] = 3
            lumra.spectrum(mapped)
            self.assertEqual(3, np.memmap(file.name, np.complex64, "r")[-1], "what was written is in the file")


if __name__ == "__main__":
    unittest.main()
