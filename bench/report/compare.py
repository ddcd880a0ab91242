# SPDX-License-Identifier: MIT
"""Two builds beside each other: which benchmarks changed beyond the noise."""
import itertools
import re
import subprocess
import sys

import figures
import machine
import measure
import page
import rows

MIN_TIME = 0.005  # seconds of a repetition; of those of a process the fastest counts
FEWEST_REPETITIONS = 10
LEAST_SPAN = 1  # seconds over which the repetitions of a process are spread: slow spells of machines last some tenths
SPARE_TURNS = 6  # so that a few which are disturbed hide no change


def names_of(build, program):
    listed = subprocess.run([*measure.command(build, program)[0], "--benchmark_list_tests"], capture_output=True, text=True,
                            check=True)  # fmt: skip
    return listed.stdout.split("\n")[:-1]


def select(listed, pattern):
    """Names that both builds have and that are asked for, and those that only one has; of {program: names}, old and new."""
    asked = rows.benchmarks(rows.ROWS, peers=False)

    def wanted(program, name):
        return re.search(pattern, name) if pattern else name in asked.get(program, ())

    common, alone = {}, []
    for program in sorted({*listed[0], *listed[1]}):
        old, new = (dict.fromkeys(n for n in names.get(program, ()) if wanted(program, n)) for names in listed)
        if both := [name for name in old if name in new]:
            common[program] = both
        alone += [f"{name} ({program}): only in the old build" for name in old if name not in new]
        alone += [f"{name} ({program}): only in the new build" for name in new if name not in old]
    return common, alone


def by_clock(name):
    """Whether the clock tells what a benchmark takes: where its name says so, and no processor's time of all threads."""
    return "/real_time" in name and "/process_time" not in name


def take_turns(builds, wanted, turns, load):
    """{(program, name): seconds of the old build, of the new one}, a timing a process: old, new, new, old, old and on."""
    taken = {}
    for turn, (program, names) in itertools.product(range(turns), wanted.items()):
        for which in (0, 1) if turn % 2 == 0 else (1, 0):
            load.begin()
            repetitions = max(FEWEST_REPETITIONS, round(LEAST_SPAN / MIN_TIME / len(names)))
            timings, errors, _ = measure.run(builds[which], program, names, repetitions, MIN_TIME)
            load.end()
            for name, timing in timings.items():
                seconds = timing.wall if by_clock(name) else timing.cpu
                taken.setdefault((program, name), ([], []))[which].append(min(seconds))
            if turn == 0:
                for name, why in errors.items():
                    print(f"{name} ({program}): {why}")
    return taken


def table(changes):
    text = "| benchmark | new is | spread | verdict |\n|---|---|---|---|\n"
    for (program, name), (speed, changed) in changes.items():
        verdict = ("faster" if speed.value > 1 else "slower") if changed else "–"
        text += f"| `{program}` {name} | {page.number(speed.value)} as fast | ±{speed.spread * 100:.1f} % | {verdict} |\n"
    return text


def compare(old, new, pattern, turns):
    builds = old, new
    programs = [{path.name for path in (build / "bench").glob("*_bench")} for build in builds]
    listed = [{program: names_of(build, program) for program in there} for build, there in zip(builds, programs)]
    wanted, alone = select(listed, pattern)
    count = sum(map(len, wanted.values()))
    if not count:
        sys.exit("bench: both builds have no benchmark with such a name")
    turns = turns or figures.fewest_turns(count) + SPARE_TURNS
    print(f"bench: {count} benchmarks, {turns} turns of each build", file=sys.stderr, flush=True)
    load = machine.Load()
    taken = take_turns(builds, wanted, turns, load)
    changes = figures.changes({key: pair for key, pair in taken.items() if all(len(x) == turns for x in pair)})
    found = {key: change for key, change in changes.items() if change[1]}
    print(table(changes))
    print("".join(f"{line}\n" for line in (*alone, *(f"{name} ({program}): failed in some turns" for program, name in taken
                                                     if (program, name) not in changes))))  # fmt: skip
    print(f"{turns} processes of each build, of each the fastest repetition by the processor's time; others kept "
          f"{load.others:.2f} processors busy. A change: rank test of Mann and Whitney, by Benjamini's and Hochberg's "
          f"correction at {figures.FALSE_CHANGES:.0%} for all {len(changes)} rows, and {figures.LEAST_EFFECT:.0%} or more.")
    fewest = figures.fewest_turns(count)
    nothing = "Nothing changed beyond the noise." if turns >= fewest else f"Fewer than {fewest} turns cannot tell a change."
    print("\nChanged:\n\n" + table(found) if found else nothing)
