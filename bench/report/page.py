# SPDX-License-Identifier: MIT
"""The page's parts between markers: tables of a section's rows, and what was not measured."""
import collections
import re

import figures
from rows import goal_at

HEAD = "| work | size | ours | beside | ratio | spread | goal | reached |\n|---|---|---|---|---|---|---|---|\n"
_marked = re.compile(r"(<!-- measured: (\w+) -->\n).*?(<!-- end -->)", re.S)


def replace(text, parts):
    """The text with the parts between its markers; every part must have its markers, and all markers a part."""
    names = [name for _, name, _ in _marked.findall(text)]
    if sorted(names) != sorted(parts) or text.count("<!-- measured:") != len(names):
        raise ValueError(f"the page has the parts {sorted(names)}, the report {sorted(parts)}")
    return _marked.sub(lambda found: found[1] + parts[found[2]].rstrip("\n") + "\n" + found[3], text)


def number(value):
    """About three digits, no exponent."""
    if abs(value) < 0.1:
        return f"{value:.2g}"
    return f"{value:.{2 if abs(value) < 10 else 1 if abs(value) < 100 else 0}f}"


def size_text(size):
    size = str(size)
    for power, suffix in ((1 << 20, "M"), (1 << 10, "K")):
        if size.isdigit() and int(size) >= 1 << 17 and int(size) % power == 0:
            return f"{int(size) // power}{suffix}"
    return size


def time_text(seconds):
    for scale, unit in ((1, "s"), (1e-3, "ms"), (1e-6, "µs")):
        if seconds >= scale:
            return f"{number(seconds / scale)} {unit}"
    return f"{number(seconds * 1e9)} ns"


def joined(cells):
    """One cell of those of all sizes: said once where all are alike."""
    return cells[0] if len(set(cells)) == 1 else " / ".join(cells)


def _ours(row, timing):
    if row.unit == "time":
        return time_text(1 / timing.speed(row.clock) * (timing.items or 1))
    if row.unit in timing.counters:
        return f"{number(timing.counters[row.unit])} MB"
    return number(timing.speed(row.clock) / 1e6)


def _own_goal(row, timing):
    """The goal of a time or a counter, and whether it is reached."""
    if row.unit == "time":
        figure = figures.ratio(getattr(timing, row.clock), [1.0])
        return f"≤ {time_text(row.most)}", figures.reached(figure, row.most, at_most=True)
    return f"≤ {row.most} MB", "yes" if timing.counters[row.unit] <= row.most else "no"


def _against(row, peer, place, ours, theirs):
    """Ratio, spread, goal and whether it is reached, at one size."""
    goal = goal_at(peer.goal, place)
    if peer.share:
        figure = figures.ratio(getattr(ours, row.clock), getattr(theirs, row.clock))
        value, goal_text = f"{figure.value * 100:.2g} %", goal and f"≤ {goal * 100:g} %"
    elif bool(ours.items) != bool(theirs.items):
        raise ValueError(f"{row.work}: only one of {row.ours} and {peer.benchmark} counts what it works on")
    else:
        figure = figures.ratio(theirs.an_item(row.clock), ours.an_item(row.clock))
        value, goal_text = number(figure.value), goal and f"{goal:g}"
    verdict = figures.reached(figure, goal, peer.share) if goal else ""
    return value, f"±{figure.spread * 100:.0f} %", goal_text or "–", verdict or "–"


def lines(row, timings):
    """The row's lines of the table, each with its verdicts; a dash where a benchmark is missing."""
    def found(pattern):
        return [timings.get(row.program, {}).get(pattern.replace("{}", str(size))) for size in row.sizes]

    ours = found(row.ours)
    unit = "" if row.unit == "time" or any(t and row.unit in t.counters for t in ours) else f" {row.unit}"
    speeds = " / ".join(_ours(row, t) if t else "–" for t in ours)
    head = [row.work, " / ".join(row.labels or map(size_text, row.sizes)), speeds + unit if any(ours) else "–"]
    if row.most is not None:
        texts, verdicts = zip(*(_own_goal(row, t) if t else ("–", "–") for t in ours))
        yield [*head, "", "", "", joined(texts), joined(verdicts)], verdicts
    elif not row.peers:
        yield [*head, "", "", "", "", ""], ()
    for place, peer in enumerate(row.peers):
        cells = [_against(row, peer, k, *pair) if all(pair) else ("–",) * 4
                 for k, pair in enumerate(zip(ours, found(peer.benchmark)))]  # fmt: skip
        ratios, spreads, goals, verdicts = zip(*cells)
        aims = [joined(goals), joined(verdicts)] if peer.goal is not None else ["", ""]
        first = head if place == 0 and row.most is None else ["", "", ""]
        yield [*first, peer.name, " / ".join(ratios), joined(spreads), *aims], verdicts


def table(rows, timings):
    """The rows as a table, and how often each verdict stands in it."""
    found = [line for row in rows for line in lines(row, timings)]
    text = HEAD + "".join("| " + " | ".join(cells) + " |\n" for cells, _ in found)
    return text, collections.Counter(verdict for _, verdicts in found for verdict in verdicts if verdict.isalpha())


def missing(results, skipped):
    """What was not measured, and why: results' missing benchmarks, and rows {work: reason} that were left out."""
    reasons = {}
    for program, names in results.missing.items():
        for name, why in names.items():
            reasons.setdefault(f"`{program}`: {why}", []).append(f"`{name}`")
    for work, why in skipped.items():
        reasons.setdefault(why, []).append(work)
    listed = "".join(f"- {why}: {'; '.join(names)}\n" for why, names in reasons.items())
    return f"Not measured:\n\n{listed}" if listed else "All rows were measured.\n"
