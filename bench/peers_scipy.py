"""What SciPy takes for the work of the benchmarks, in million samples a second. Run by scripts/bench."""
import time

import numpy as np
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
