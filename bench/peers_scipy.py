"""What SciPy takes for the work of the benchmarks, in million samples a second. Run by scripts/bench."""
import time

import numpy as np
import scipy.fft
import scipy.signal


def rate(samples, work):
    """Best of several runs, in million samples a second."""
    times = []
    for _ in range(5):
        start = time.perf_counter()
        work()
        times.append(time.perf_counter() - start)
    return samples / min(times) / 1e6


random = np.random.default_rng(1)
count = 1 << 20
samples = (random.standard_normal(count) + 1j * random.standard_normal(count)).astype(np.complex64)
for n in (256, 1024, 4096, 65536):
    welch = rate(count, lambda: scipy.signal.welch(samples, window="flattop", nperseg=n, detrend=False,
                                                   return_onesided=False, scaling="spectrum"))
    print(f"scipy.signal.welch/{n}: {welch:.0f} Msamples/s")
b, a = scipy.signal.butter(4, 0.4)
record = samples[:16384]
for name, x in (("real", record.real.copy()), ("complex", record)):
    coefficients = b.astype(np.float32), a.astype(np.float32)
    print(f"scipy.signal.lfilter, order 4, {name}: "
          f"{rate(record.size * 20, lambda: [scipy.signal.lfilter(*coefficients, x) for _ in range(20)]):.0f} Msamples/s")
for n in (1024, 65536, 1009):
    for name, x, transform in (("fft", samples[:n], scipy.fft.fft), ("rfft", samples.real[:n].copy(), scipy.fft.rfft)):
        print(f"scipy.fft.{name}/{n}: {n / rate(n, lambda: transform(x)):.1f} us")
