# SPDX-License-Identifier: MIT
"""Signal processing for radio-frequency measurement, on NumPy's arrays and on recordings.

Samples are of full scale 1, frequencies are in hertz, powers are those of the samples: a complex tone of amplitude 1 has
power 1. complex64 and float32 are computed in single precision and give single precision, complex128 and float64 in
double; integers are taken as double. Views with any stride are read in place. Work runs without the interpreter's
lock, and an object that several threads use at once serves them one after the other.

A wrong argument is a ValueError or a TypeError that names argument and value, every other failure a `lumra.Error`.
"""
from lumra._elements import decibels, divide, lookup, magnitude, polynomial, power
from lumra._failures import Error
from lumra._filters import (
    FirFilter, IirFilter, convolve, correlate, kaiser_lowpass, lfilter, root_raised_cosine, sosfilter)
from lumra._least_squares import lstsq
from lumra._levels import Evm, Level, LevelMeter, ccdf, evm, level
from lumra._rates import Channelizer, Resampler, resample
from lumra._recordings import Annotation, Capture, Recording, write
from lumra._spectra import (
    Harmonic, Peak, Spectrum, SpectrumEstimator, Tone, Waterfall, spectrum, waterfall)
from lumra._transforms import fft, ifft, irfft, rfft
from lumra._windows import WindowFigures, window, window_figures

__all__ = [name for name in dir() if not name.startswith("_")]
for _name in __all__:
    if isinstance(globals()[_name], type):
        globals()[_name].__module__ = "lumra"
del _name
