# SPDX-License-Identifier: MIT
"""Pictures by Matplotlib that look like those of the program lumra."""
import math

import numpy as np

_COLOR = "#1f4e8c"
_POINTS = 1150  # of a curve with a band, about as many as a picture has pixels; more bins than twice that share points


def _axes(ax, size):
    if ax is not None:
        return ax
    try:
        from matplotlib import pyplot
    except ImportError as reason:
        raise ImportError("plot needs Matplotlib: install python3-matplotlib, or matplotlib with pip") from reason
    return pyplot.subplots(figsize=size, layout="constrained")[1]


def _scaled(unit, largest):
    for factor, prefix in ((1e9, "G"), (1e6, "M"), (1e3, "k")):
        if largest >= factor:
            return factor, prefix + unit
    return 1.0, unit


def _frequency_scale(frequency, df, center):
    """Title, origin and unit: offsets from the center where the numbers would be long."""
    low, high = frequency[0] - df / 2, frequency[-1] + df / 2
    largest, span = max(abs(low), abs(high)), high - low
    absolute = largest < 1e4 * span
    factor, unit = _scaled("Hz", max(span / 2, largest / 10) if absolute else span / 2)
    if absolute:
        return f"Frequency ({unit})", 0.0, factor
    center_factor, center_unit = _scaled("Hz", abs(center))
    return f"Offset from {center / center_factor:.12g} {center_unit} ({unit})", center, factor


def _frame(ax, title, settings, xlabel, ylabel):
    ax.set_title(title, fontweight="bold", pad=22)
    ax.annotate(settings, (0.5, 1), (0, 6), xycoords="axes fraction", textcoords="offset points", ha="center", va="bottom",
                color="#505050", fontsize="small")  # fmt: skip
    ax.set_xlabel(xlabel)
    ax.set_ylabel(ylabel)
    for spine in ax.spines.values():
        spine.set_color("#404040")


def _finite(levels):
    return levels[np.isfinite(levels)]


def _level_limits(level, lowest, highest):
    """Whole divisions; a few deep notches do not press the curve together, nor does a band that reaches far down."""
    finite = _finite(level)
    if not len(finite):
        return -100.0, 0.0
    low, top = np.percentile(finite, 0.5) - 2, _finite(highest).max()
    if lowest is not level and len(_finite(lowest)):
        low = float(np.clip(np.percentile(_finite(lowest), 0.5) - 2, low - 20, low))
    bottom = max(min(low, top - 5), top - 190)
    division = 20 if top - bottom > 100 else 10 if top - bottom > 25 else 5
    bottom, end = division * math.floor(bottom / division), division * math.ceil(top / division)
    return bottom, end + division / 2 if end - top < 0.05 * (end - bottom) else end


def spectrum(of, ax):
    from lumra._spectra import _decibels

    ax = _axes(ax, (12.8, 7.2))
    bins = len(of.power)
    points = _POINTS if bins > 2 * _POINTS else bins
    edges = np.arange(points + 1) * bins // points
    mean = np.add.reduceat(of.power, edges[:-1]) / np.diff(edges)
    highest = np.maximum.reduceat(of.power if of.max_hold is None else of.max_hold, edges[:-1])
    lowest = np.minimum.reduceat(of.power if of.min_hold is None else of.min_hold, edges[:-1])
    title, origin, unit = _frequency_scale(of.frequency, of.df, of.center)
    x = ((of.frequency[edges[:-1]] + of.frequency[edges[1:] - 1]) / 2 - origin) / unit
    level, lowest, highest = _decibels(mean), _decibels(lowest), _decibels(highest)
    bottom, top = _level_limits(level, lowest, highest)
    banded = of.max_hold is not None or points < bins
    if banded:
        ax.fill_between(x, np.maximum(lowest, bottom), highest, color=_COLOR, alpha=0.3, linewidth=0)
    ax.plot(x, level, color=_COLOR, linewidth=1.2, marker="o" if bins < 40 else None, markersize=3)
    ax.set_ylim(bottom, top)
    half = of.df / 2 if of.sides == 2 else 0.0
    ax.set_xlim((of.frequency[0] - half - origin) / unit, (of.frequency[-1] + half - origin) / unit)
    band = ""
    if banded:
        band = ", band: lowest to highest " + ("segment" if points == bins else f"of {round(bins / points)} bins")
    settings = f"RBW {_text(of.rbw, 'Hz')}, {of.nfft} points, {_name(of.window)} window, {of.segments} segments{band}"
    _frame(ax, "Spectrum", settings, title, "Level (dBFS)")
    ax.minorticks_on()
    ax.grid(True, which="major", color="#d4d4d4", linewidth=0.8)
    ax.grid(True, which="minor", axis="y", color="#eeeeee", linewidth=0.6)
    ax.set_axisbelow(True)
    if not len(_finite(level)):
        ax.text(0.5, 0.5, "all samples are zero", transform=ax.transAxes, ha="center", color="#505050")
    return ax


def waterfall(of, ax):
    ax = _axes(ax, (12.8, 9.0))
    title, origin, unit = _frequency_scale(of.frequency, of.sample_rate / of.nfft, of.center)
    half = of.sample_rate / of.nfft / 2
    left, right = (of.frequency[0] - half - origin) / unit, (of.frequency[-1] + half - origin) / unit
    # A row lasts as long as the first one does.
    step = of.nfft - int(of.overlap * of.nfft)
    length = of.time[1] - of.time[0] if len(of.time) > 1 else of.segments * step / of.sample_rate
    begin, end = of.time[0], of.time[-1] + length
    seconds, time_unit = next(((s, u) for s, u in ((1, "s"), (1e-3, "ms"), (1e-6, "µs")) if end >= 2 * s), (1e-9, "ns"))
    finite = _finite(of.level)
    high = math.ceil(finite.max()) if len(finite) else 0
    low = math.floor(max(np.percentile(finite, 5), high - 150)) if len(finite) else high - 100
    image = ax.imshow(
        of.level, aspect="auto", interpolation="nearest", cmap="magma", vmin=low, vmax=max(high, low + 5),
        extent=(left, right, end / seconds, begin / seconds))
    image.cmap.set_bad("#000004")
    ax.figure.colorbar(image, ax=ax, label="Level (dBFS)", pad=0.02)
    settings = f"{len(of.time)} rows of {_text(length, 's')}, {of.nfft} points, {_name(of.window)} window"
    _frame(ax, "Waterfall", settings, title, f"Time ({time_unit})")
    return ax


def _text(value, unit):
    if unit == "s" and value < 1:
        factor, unit = next(((f, u) for f, u in ((1e-3, "ms"), (1e-6, "µs")) if value >= f), (1e-9, "ns"))
    else:
        factor, unit = _scaled(unit, value)
    return f"{value / factor:.4g} {unit}"


def _name(window):
    return window if isinstance(window, str) else f"{window[0]} {window[1]:g}" if len(window) > 1 else window[0]
