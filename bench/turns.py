# SPDX-License-Identifier: MIT
"""What the benchmarks in Python share: works are timed turn by turn, with the options and the JSON of the C++ ones.

Times are the processor's, of this process and of the ones it has waited for, and the clock's.
"""
import argparse
import json
import random
import re
import resource
import statistics
import time


LONG = 0.2  # seconds of a work that need no second look
LONGEST = 6  # seconds of one group of works, unless the fewest turns take longer


def _spent():
    children = resource.getrusage(resource.RUSAGE_CHILDREN)
    return time.process_time() + children.ru_utime + children.ru_stime, time.perf_counter()


class Turns:
    """The works that the options choose; `with` writes what they took when it ends."""

    def __init__(self, description, **files):
        """Further options name files: {option: what the file receives}."""
        parser = argparse.ArgumentParser(description=description)
        parser.add_argument("--benchmark_filter", default="", metavar="REGEX", help="times the works with such names")
        parser.add_argument("--benchmark_repetitions", type=int, default=25, metavar="N",
                            help="turns of each, fewer of those that take long (%(default)s)")  # fmt: skip
        parser.add_argument("--benchmark_min_time", type=float, default=0.01, metavar="SECONDS",
                            help="short works are repeated so long within a turn (%(default)s)")  # fmt: skip
        parser.add_argument("--benchmark_out", metavar="FILE", help="receives every turn as JSON")
        for option, text in files.items():
            parser.add_argument(f"--{option}", metavar="FILE", help=text)
        self.options, _ = parser.parse_known_args()  # the C++ ones have more
        self._chosen = re.compile(self.options.benchmark_filter)
        self._entries = []

    def __enter__(self):
        return self

    def __exit__(self, kind, *_):
        if kind is None and self.options.benchmark_out:
            with open(self.options.benchmark_out, "w") as file:
                json.dump({"benchmarks": self._entries}, file)

    def wanted(self, *names):
        return any(self._chosen.search(name) for name in names)

    def keep(self, name, cpu, wall, items=1, **counters):
        """An entry of one turn: seconds of a work on so many items."""
        self._entries.append({"name": name, "run_type": "iteration", "cpu_time": cpu, "real_time": wall, "time_unit": "s",
                              "items_per_second": items / max(cpu, 1e-12), **counters})  # fmt: skip

    def fail(self, names, why):
        """Entries of works that cannot be timed here."""
        print(f"{', '.join(names)}: {why}", flush=True)
        self._entries += [{"name": name, "error_occurred": True, "error_message": why} for name in names]

    def beside(self, samples, works, always=False, fewest=5, **counters):
        """Times the chosen works, or all, by their names, on so many samples each, in a random order at each turn.

        Further counters are {name of a work: value}.

        Returns for each the seconds of every turn, of the processor and of the clock.
        """
        works = {name: work for name, work in works.items() if always or self.wanted(name)}
        times, turn = {}, 0
        for name, work in works.items():
            once = 1e-9
            for _ in range(2):  # the first time it finds its memory and its threads
                if once < LONG:
                    start = time.perf_counter()
                    work()
                    once = max(time.perf_counter() - start, 1e-9)
            times[name] = max(1, round(self.options.benchmark_min_time / once))
            turn += once * times[name]
        seconds = {name: [] for name in works}
        for _ in range(min(self.options.benchmark_repetitions, max(fewest, round(LONGEST / max(turn, 1e-9))))):
            for name in random.sample(list(works), len(works)):
                work, repeat = works[name], range(times[name])
                cpu, wall = _spent()
                for _ in repeat:
                    work()
                cpu_end, wall_end = _spent()
                seconds[name].append(((cpu_end - cpu) / len(repeat), (wall_end - wall) / len(repeat)))
                more = {key: values[name] for key, values in counters.items() if name in values}
                self.keep(name, *seconds[name][-1], samples, **more)
        for name, taken in seconds.items():
            cpu, wall = map(statistics.median, zip(*taken))
            print(f"{name}: {cpu * 1e6:.4g} us of the processor's, {wall * 1e6:.4g} us by the clock, "
                  f"{samples / cpu / 1e6:.4g} Msamples/s", flush=True)  # fmt: skip
        return seconds
