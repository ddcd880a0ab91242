# SPDX-License-Identifier: MIT
"""Runs benchmarks, those in C++ and those in Python, and reads what they took."""
import dataclasses
import json
import os
import pathlib
import re
import subprocess
import sys
import tempfile

import figures
import machine

ROOT = pathlib.Path(__file__).resolve().parents[2]
PYTHON = "/usr/bin/python3"
_seconds = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1}
_entry_fields = {
    "name", "run_name", "run_type", "family_index", "per_family_instance_index", "repetitions", "repetition_index", "threads",
    "iterations", "real_time", "cpu_time", "time_unit", "items_per_second", "bytes_per_second",
}  # fmt: skip


@dataclasses.dataclass
class Timing:
    """One benchmark: seconds of each repetition by either clock, items (samples, else bytes) each, further counters."""

    cpu: list = dataclasses.field(default_factory=list)
    wall: list = dataclasses.field(default_factory=list)
    items: float = 0
    counters: dict = dataclasses.field(default_factory=dict)

    def an_item(self, clock):
        """Seconds of an item, or of the whole where none are counted."""
        return [seconds / (self.items or 1) for seconds in getattr(self, clock)]

    def speed(self, clock):
        return 1 / figures.typical(self.an_item(clock))


@dataclasses.dataclass
class Results:
    """Timings by program and name; why others are missing; what the programs say of themselves; others' load meanwhile."""

    timings: dict = dataclasses.field(default_factory=dict)
    missing: dict = dataclasses.field(default_factory=dict)
    context: dict = dataclasses.field(default_factory=dict)
    others: float = 0  # processors that others kept busy while programs ran

    def save(self, path):
        path.write_text(json.dumps(dataclasses.asdict(self)))

    @classmethod
    def load(cls, path):
        results = cls(**json.loads(path.read_text()))
        results.timings = {p: {n: Timing(**t) for n, t in rows.items()} for p, rows in results.timings.items()}
        return results


def read(document):
    """Timings and errors by name, from the JSON of a benchmark program."""
    timings, errors = {}, {}
    for entry in document["benchmarks"]:
        name = entry["name"]
        if entry.get("error_occurred"):
            errors[name] = entry["error_message"]
        elif entry["run_type"] == "iteration":
            unit = _seconds[entry["time_unit"]]
            cpu, wall = entry["cpu_time"] * unit, entry["real_time"] * unit
            # Rates are by the clock that the name tells.
            counted = entry.get("items_per_second", entry.get("bytes_per_second", 0))
            timing = timings.setdefault(name, Timing())
            timing.cpu.append(cpu)
            timing.wall.append(wall)
            timing.items = counted * (wall if "/real_time" in name else cpu)
            timing.counters = {key: value for key, value in entry.items() if key not in _entry_fields}
    return timings, errors


def choose(names):
    """The pattern of exactly these names."""
    return "^(" + "|".join(re.sub(r"([.\[\]{}()*+?^$|\\])", r"\\\1", name) for name in names) + ")$"


def command(build, program):
    """How a benchmark program of a build folder is run, and in which environment."""
    if not program.endswith(".py"):
        return [str(build / "bench" / program)], {}
    return [PYTHON, str(ROOT / "bench" / program)], {
        "LUMRA_LIBRARY": str(build / "lib" / "libqsLumraAlgo.so"),
        "LUMRA_PROGRAM": str(build / "bin" / "lumra"),
        "PYTHONPATH": str(build / "python"),
    }


def run(build, program, names, repetitions, min_time):
    """Timings of these names, errors, and the context of the run; raises when the program fails."""
    with tempfile.TemporaryDirectory() as folder:
        out = pathlib.Path(folder) / "out.json"
        words, environment = command(build, program)
        options = [f"--benchmark_filter={choose(names)}", f"--benchmark_repetitions={repetitions}",
                   f"--benchmark_min_time={min_time}", f"--benchmark_out={out}", "--benchmark_out_format=json",
                   "--benchmark_enable_random_interleaving=true"]  # fmt: skip
        ran = subprocess.run(words + options, env={**os.environ, **environment}, capture_output=True, text=True)
        if ran.returncode:
            raise OSError((ran.stderr.strip().split("\n") or [""])[-1] or f"it ended with {ran.returncode}")
        document = json.loads(out.read_text()) if out.stat().st_size else {"benchmarks": []}
    return *read(document), document.get("context", {})


def measure(build, wanted, repetitions=25, min_time=0.01):
    """Results of {program: names}, each program once."""
    results, clock = Results(), machine.Load()
    for program, names in wanted.items():
        print(f"bench: {program}, {len(names)} benchmarks", file=sys.stderr, flush=True)
        errors, why = {}, "the program has no such benchmark"
        clock.begin()
        try:
            results.timings[program], errors, context = run(build, program, names, repetitions, min_time)
            results.context.update(context)
        except (OSError, ValueError) as failure:
            results.timings[program], why = {}, f"the program failed: {failure}"
        clock.end()
        for name in names:
            if name not in results.timings[program]:
                results.missing.setdefault(program, {})[name] = errors.get(name, why)
    results.others = clock.others
    return results
