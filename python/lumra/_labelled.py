# SPDX-License-Identifier: MIT
"""Results as xarray's datasets, with units."""


def _xarray():
    try:
        import xarray
    except ImportError as reason:
        raise ImportError("to_xarray needs xarray: install python3-xarray, or xarray with pip") from reason
    return xarray


_POWER = {"units": "1", "long_name": "Power, of an amplitude of 1"}
_HERTZ = {"units": "Hz", "long_name": "Frequency"}


def _attributes(of):
    window = of.window if isinstance(of.window, str) else ":".join(str(part) for part in of.window)
    return {
        "sample_rate": of.sample_rate, "nfft": of.nfft, "window": window, "overlap": of.overlap, "enbw": of.enbw,
        "segments": of.segments, "center": of.center,
    }  # fmt: skip


def spectrum(of):
    data = {"power": ("frequency", of.power, _POWER)}
    for name in ("max_hold", "min_hold"):
        if getattr(of, name) is not None:
            data[name] = ("frequency", getattr(of, name), _POWER)
    return _xarray().Dataset(data, {"frequency": ("frequency", of.frequency, _HERTZ)}, _attributes(of))


def waterfall(of):
    coordinates = {
        "time": ("time", of.time, {"units": "s", "long_name": "Time"}), "frequency": ("frequency", of.frequency, _HERTZ)
    }  # fmt: skip
    return _xarray().Dataset({"power": (("time", "frequency"), of.power, _POWER)}, coordinates, _attributes(of))
