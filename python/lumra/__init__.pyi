# SPDX-License-Identifier: MIT
import dataclasses
import datetime
import os
from fractions import Fraction
from functools import cached_property
from typing import Any, Dict, Iterable, Iterator, List, Mapping, NamedTuple, Optional, Sequence, Tuple, Type, TypeVar, Union
from typing import Literal, overload

import numpy as np
from numpy.typing import ArrayLike, NDArray

_Array = NDArray[Any]
_Mode = Literal["full", "same", "valid"]
_Norm = Optional[Literal["backward", "ortho", "forward"]]
_Window = Union[str, Tuple[str, float]]
_Path = Union[str, bytes, "os.PathLike[str]", "os.PathLike[bytes]"]
_Rate = Union[int, float, Fraction]
_Self = TypeVar("_Self")

class Error(RuntimeError):
    code: int
    def __init__(self, message: str, code: int = ...) -> None: ...
    def __reduce__(self) -> Tuple[Any, ...]: ...

# Recordings

class Capture(NamedTuple):
    start: int
    samples: int
    frequency: Optional[float]
    time: Optional[datetime.datetime]

class Annotation(Dict[str, Any]):
    start: int
    samples: Optional[int]
    low: Optional[float]
    high: Optional[float]
    label: str
    comment: str
    def __init__(self, fields: Mapping[str, Any], start: int) -> None: ...
    def __reduce__(self) -> Tuple[Any, ...]: ...

class Recording:
    def __init__(
        self, path: _Path, *, datatype: Optional[str] = ..., sample_rate: Optional[float] = ...,
        frequency: Optional[float] = ..., capture: Optional[int] = ..., channel: int = ...,
    ) -> None: ...
    @property
    def path(self) -> str: ...
    @property
    def datatype(self) -> str: ...
    @property
    def sample_rate(self) -> float: ...
    @property
    def frequency(self) -> Optional[float]: ...
    @property
    def samples(self) -> int: ...
    @property
    def channels(self) -> int: ...
    @property
    def duration(self) -> float: ...
    @property
    def dtype(self) -> np.dtype[Any]: ...
    @cached_property
    def captures(self) -> Tuple[Capture, ...]: ...
    @cached_property
    def annotations(self) -> Tuple[Annotation, ...]: ...
    @property
    def metadata(self) -> Dict[str, Any]: ...
    def __len__(self) -> int: ...
    @overload
    def __getitem__(self, key: slice) -> _Array: ...
    @overload
    def __getitem__(self, key: int) -> Any: ...
    def __array__(self, dtype: Any = ...) -> _Array: ...
    def __reduce__(self) -> Tuple[Any, ...]: ...
    def read(self, start: int = ..., count: Optional[int] = ..., out: Optional[_Array] = ...) -> _Array: ...
    def blocks(self, count: int) -> Iterator[_Array]: ...
    def to_dask(self, chunk: int = ...) -> Any: ...

def write(
    path: _Path, x: ArrayLike, sample_rate: float, *, frequency: Optional[float] = ..., datatype: Optional[str] = ...,
    annotations: Iterable[Mapping[str, Any]] = ..., description: Optional[str] = ...,
) -> None: ...

# Spectra

class Peak(NamedTuple):
    frequency: float
    power: float

class Harmonic(NamedTuple):
    frequency: float
    level_dbc: float

class Tone(NamedTuple):
    frequency: float
    power: float
    snr_db: float
    sinad_db: float
    thd_db: float
    sfdr_db: float
    image_db: float
    dc_db: float
    enob: float
    harmonics: Tuple[Harmonic, ...]

@dataclasses.dataclass(frozen=True, eq=False, repr=False)
class Spectrum:
    power: NDArray[np.float64]
    max_hold: Optional[NDArray[np.float64]]
    min_hold: Optional[NDArray[np.float64]]
    sample_rate: float
    nfft: int
    window: _Window
    overlap: float
    segments: int
    enbw: float
    center: float
    sides: int
    @property
    def df(self) -> float: ...
    @property
    def rbw(self) -> float: ...
    @cached_property
    def frequency(self) -> NDArray[np.float64]: ...
    @cached_property
    def level(self) -> NDArray[np.float64]: ...
    @cached_property
    def density(self) -> NDArray[np.float64]: ...
    def channel_power(self, center: float, bandwidth: float) -> float: ...
    def occupied_bandwidth(self, fraction: float = ...) -> Tuple[float, float]: ...
    def adjacent_power(
        self, center: float, bandwidth: float, offsets: Sequence[float], adjacent_bandwidth: Optional[float] = ...
    ) -> List[Tuple[float, float, float]]: ...
    def peaks(
        self, count: int = ..., threshold: Optional[float] = ..., distance: Optional[float] = ...
    ) -> List[Peak]: ...
    def tone(self, frequency: Optional[float] = ..., harmonics: int = ...) -> Tone: ...
    def plot(self, ax: Any = ...) -> Any: ...
    def to_xarray(self) -> Any: ...

class SpectrumEstimator:
    def __init__(
        self, sample_rate: float = ..., *, nfft: int = ..., window: _Window = ..., overlap: float = ...,
        hold: bool = ..., frequency: float = ..., start: int = ..., origin: int = ..., real: bool = ...,
        threads: Optional[int] = ...,
    ) -> None: ...
    @property
    def start(self) -> int: ...
    @property
    def samples(self) -> int: ...
    @property
    def segments(self) -> int: ...
    def add(self: _Self, x: ArrayLike) -> _Self: ...
    def gap(self: _Self) -> _Self: ...
    def merge(self: _Self, other: SpectrumEstimator) -> _Self: ...
    def result(self) -> Spectrum: ...

@dataclasses.dataclass(frozen=True, eq=False, repr=False)
class Waterfall:
    time: NDArray[np.float64]
    frequency: NDArray[np.float64]
    power: NDArray[np.float64]
    sample_rate: float
    nfft: int
    window: _Window
    overlap: float
    segments: int
    enbw: float
    center: float
    @cached_property
    def level(self) -> NDArray[np.float64]: ...
    def plot(self, ax: Any = ...) -> Any: ...
    def to_xarray(self) -> Any: ...

# What is computed by Dask is a Spectrum and so on, or with compute=False an object that gives one.
@overload
def spectrum(
    x: Any, sample_rate: float = ..., *, nfft: int = ..., window: _Window = ..., overlap: float = ..., hold: bool = ...,
    frequency: float = ..., threads: Optional[int] = ..., client: Any = ..., compute: Literal[True] = ...,
) -> Spectrum: ...
@overload
def spectrum(
    x: Any, sample_rate: float = ..., *, nfft: int = ..., window: _Window = ..., overlap: float = ..., hold: bool = ...,
    frequency: float = ..., threads: Optional[int] = ..., client: Any = ..., compute: bool,
) -> Any: ...
@overload
def waterfall(
    x: Any, sample_rate: float = ..., *, nfft: int = ..., window: _Window = ..., overlap: float = ..., rows: int = ...,
    frequency: float = ..., threads: Optional[int] = ..., client: Any = ..., compute: Literal[True] = ...,
) -> Waterfall: ...
@overload
def waterfall(
    x: Any, sample_rate: float = ..., *, nfft: int = ..., window: _Window = ..., overlap: float = ..., rows: int = ...,
    frequency: float = ..., threads: Optional[int] = ..., client: Any = ..., compute: bool,
) -> Any: ...

# Levels and errors

@dataclasses.dataclass(frozen=True)
class Level:
    samples: int
    rms: float
    peak: float
    peak_index: int
    papr_db: float
    dc: Union[complex, float]
    rms_dbfs: float
    peak_dbfs: float

class LevelMeter:
    def __init__(self, start: int = ..., *, threads: Optional[int] = ...) -> None: ...
    @property
    def start(self) -> int: ...
    @property
    def samples(self) -> int: ...
    def add(self: _Self, x: ArrayLike) -> _Self: ...
    def merge(self: _Self, other: LevelMeter) -> _Self: ...
    def result(self) -> Level: ...

@overload
def level(x: Any, client: Any = ..., compute: Literal[True] = ..., *, threads: Optional[int] = ...) -> Level: ...
@overload
def level(x: Any, client: Any = ..., *, compute: bool, threads: Optional[int] = ...) -> Any: ...
def ccdf(
    x: Union[ArrayLike, Recording], above_db: ArrayLike, *, threads: Optional[int] = ...
) -> NDArray[np.float64]: ...

@dataclasses.dataclass(frozen=True)
class Evm:
    rms: float
    peak: float
    magnitude_rms: float
    phase_rms: float
    gain: complex
    delay: float
    frequency: float
    dc: complex
    samples: int
    @property
    def rms_percent(self) -> float: ...
    @property
    def rms_db(self) -> float: ...

_Align = Literal["gain", "delay", "frequency", "dc"]

@overload
def evm(
    reference: Any, measured: Any, *, align: Union[_Align, Iterable[_Align]] = ..., sample_rate: float = ...,
    threads: Optional[int] = ..., client: Any = ..., compute: Literal[True] = ...,
) -> Evm: ...
@overload
def evm(
    reference: Any, measured: Any, *, align: Union[_Align, Iterable[_Align]] = ..., sample_rate: float = ...,
    threads: Optional[int] = ..., client: Any = ..., compute: bool,
) -> Any: ...

# Filters

@overload
def lfilter(b: ArrayLike, a: ArrayLike, x: ArrayLike, axis: int = ..., zi: None = ...) -> _Array: ...
@overload
def lfilter(b: ArrayLike, a: ArrayLike, x: ArrayLike, axis: int = ..., *, zi: ArrayLike) -> Tuple[_Array, _Array]: ...
@overload
def lfilter(b: ArrayLike, a: ArrayLike, x: ArrayLike, axis: int, zi: ArrayLike) -> Tuple[_Array, _Array]: ...
@overload
def sosfilter(sos: ArrayLike, x: ArrayLike, axis: int = ..., zi: None = ...) -> _Array: ...
@overload
def sosfilter(sos: ArrayLike, x: ArrayLike, axis: int = ..., *, zi: ArrayLike) -> Tuple[_Array, _Array]: ...
@overload
def sosfilter(sos: ArrayLike, x: ArrayLike, axis: int, zi: ArrayLike) -> Tuple[_Array, _Array]: ...

class IirFilter:
    def __init__(self, b: ArrayLike, a: ArrayLike) -> None: ...
    def __call__(self, x: ArrayLike) -> _Array: ...
    def reset(self) -> None: ...

class FirFilter:
    def __init__(self, h: ArrayLike) -> None: ...
    def __call__(self, x: ArrayLike) -> _Array: ...
    def reset(self) -> None: ...

def convolve(x: ArrayLike, h: ArrayLike, mode: _Mode = ...) -> _Array: ...
def correlate(x: ArrayLike, y: ArrayLike, mode: _Mode = ...) -> _Array: ...
def kaiser_lowpass(sample_rate: float, pass_edge: float, stop_edge: float, rejection: float) -> NDArray[np.float64]: ...
def root_raised_cosine(
    sample_rate: float, symbol_rate: float, roll_off: float, span: float
) -> NDArray[np.float64]: ...

# Windows, transforms, elements

class WindowFigures(NamedTuple):
    gain: float
    enbw: float
    scalloping_db: float

def window(
    name: _Window, n: int, *, sym: bool = ..., dtype: Union[str, Type[float], Type[np.floating[Any]], np.dtype[Any]] = ...
) -> _Array: ...
def window_figures(name: _Window, n: int) -> WindowFigures: ...
def fft(
    x: ArrayLike, n: Optional[int] = ..., axis: int = ..., norm: _Norm = ..., *, out: Optional[_Array] = ...,
    workers: Optional[int] = ...,
) -> _Array: ...
def ifft(
    x: ArrayLike, n: Optional[int] = ..., axis: int = ..., norm: _Norm = ..., *, out: Optional[_Array] = ...,
    workers: Optional[int] = ...,
) -> _Array: ...
def rfft(
    x: ArrayLike, n: Optional[int] = ..., axis: int = ..., norm: _Norm = ..., *, out: Optional[_Array] = ...,
    workers: Optional[int] = ...,
) -> _Array: ...
def irfft(
    x: ArrayLike, n: Optional[int] = ..., axis: int = ..., norm: _Norm = ..., *, out: Optional[_Array] = ...,
    workers: Optional[int] = ...,
) -> _Array: ...
def magnitude(x: ArrayLike, out: Optional[_Array] = ..., *, threads: Optional[int] = ...) -> _Array: ...
def power(x: ArrayLike, out: Optional[_Array] = ..., *, threads: Optional[int] = ...) -> _Array: ...
def divide(x: ArrayLike, y: ArrayLike, out: Optional[_Array] = ..., *, threads: Optional[int] = ...) -> _Array: ...
def decibels(x: ArrayLike, out: Optional[_Array] = ..., *, threads: Optional[int] = ...) -> _Array: ...
def polynomial(x: ArrayLike, c: ArrayLike, out: Optional[_Array] = ..., *, threads: Optional[int] = ...) -> _Array: ...
def lookup(
    keys: ArrayLike, x: ArrayLike, table: ArrayLike, start: float, step: float, out: Optional[_Array] = ..., *,
    threads: Optional[int] = ...,
) -> _Array: ...
def lstsq(a: ArrayLike, b: ArrayLike, rcond: Optional[float] = ...) -> _Array: ...

# Rates

def resample(
    x: ArrayLike, rate_in: _Rate, rate_out: _Rate, *, passband: float = ..., rejection: float = ..., axis: int = ...
) -> _Array: ...

class Resampler:
    def __init__(
        self, rate_in: _Rate, rate_out: _Rate, *, passband: float = ..., rejection: float = ..., dtype: Any = ...
    ) -> None: ...
    def __call__(self, x: ArrayLike) -> _Array: ...
    def flush(self) -> _Array: ...
    def reset(self) -> None: ...

class Channelizer:
    def __init__(
        self, sample_rate: float, channels: Iterable[Tuple[float, float]], *, rejection: float = ...
    ) -> None: ...
    def __call__(self, x: ArrayLike) -> List[_Array]: ...
    def flush(self) -> List[_Array]: ...
    def reset(self) -> None: ...

__all__ = [
    "Annotation",
    "Capture",
    "Channelizer",
    "Error",
    "Evm",
    "FirFilter",
    "Harmonic",
    "IirFilter",
    "Level",
    "LevelMeter",
    "Peak",
    "Recording",
    "Resampler",
    "Spectrum",
    "SpectrumEstimator",
    "Tone",
    "Waterfall",
    "WindowFigures",
    "ccdf",
    "convolve",
    "correlate",
    "decibels",
    "divide",
    "evm",
    "fft",
    "ifft",
    "irfft",
    "kaiser_lowpass",
    "level",
    "lfilter",
    "lookup",
    "lstsq",
    "magnitude",
    "polynomial",
    "power",
    "resample",
    "rfft",
    "root_raised_cosine",
    "sosfilter",
    "spectrum",
    "waterfall",
    "window",
    "window_figures",
    "write",
]
