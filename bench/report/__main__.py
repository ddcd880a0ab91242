# SPDX-License-Identifier: MIT
"""scripts/bench --report and --compare, behind the build."""
import argparse
import pathlib
import sys

import compare
import machine
import measure
import page
import pictures
import rows

PAGE = measure.ROOT / "docs" / "performance.md"
DRAWN = {"spectra": "points of a transform", "elements": "elements", "transforms": "points", "filters": "taps"}


def chosen(words):
    return [row for row in rows.ROWS if not words or any(word in f"{row.section} {row.work} {row.program}" for word in words)]


def report(build, words, again):
    """One run, written into the page and its pictures; with words, the tables of such rows alone, to be read at once."""
    kept = build / "report.json"
    picked, skipped = chosen(words), {}
    described = machine.describe(build)
    others = machine.others_now()
    if again:
        results = measure.Results.load(kept)
        described, skipped = results.context["machine"], results.context["skipped"]
    else:
        if others > machine.QUIET:
            why = f"two threads are timed by the clock, and others kept {others:.1f} processors busy at the start"
            skipped = {row.work: why for row in picked if row.clock == "wall"}
        results = measure.measure(build, rows.benchmarks([row for row in picked if row.work not in skipped]))
        described["Kernels"] = results.context.get("kernels", "unknown")
        described["Others meanwhile"] = f"kept {results.others:.2f} processors busy" + (
            ": the machine was not quiet, read all figures as indications" if results.others > machine.QUIET else "")
        results.context.update(machine=described, skipped=skipped)
        results.save(build / ("chosen.json" if words else kept))
    tables = {section: page.table([row for row in picked if row.section == section], results.timings)
              for section in dict.fromkeys(row.section for row in picked)}  # fmt: skip
    verdicts = sum((counted for _, counted in tables.values()), start=type(next(iter(tables.values()))[1])())
    parts = {section: text for section, (text, _) in tables.items()}
    parts["machine"] = "".join(f"- {subject}: {line}\n" for subject, line in described.items()) + (
        f"- Goals: {verdicts['yes']} reached, {verdicts['undecided']} within the spread, {verdicts['no']} missed\n")
    parts["missing"] = page.missing(results, skipped)
    if words:
        print("\n".join(parts.values()))
        return
    PAGE.write_text(page.replace(PAGE.read_text(), parts))
    folder = PAGE.parent / "pictures"
    for name, size_name in DRAWN.items():
        drawn = [row for row in picked if row.picture == name]
        pictures.over_size(folder / f"performance-{name}.svg", drawn, results.timings, size_name)
    pictures.bars(folder / "performance-rates.svg", [row for row in picked if row.picture == "rates"], results.timings)
    print(parts["missing"], end="")


def main():
    parser = argparse.ArgumentParser(prog="scripts/bench", add_help=False)
    parser.add_argument("mode", choices=("report", "compare"))
    parser.add_argument("words", nargs="*")
    parser.add_argument("--build", type=pathlib.Path, required=True, nargs="+")
    parser.add_argument("--again", action="store_true")
    parser.add_argument("--filter", default="")
    parser.add_argument("--turns", type=int)
    options = parser.parse_args()
    if options.mode == "report":
        report(options.build[0].resolve(), options.words, options.again)
    else:
        compare.compare(*(build.resolve() for build in options.build), options.filter, options.turns)


if __name__ == "__main__":
    sys.exit(main())
