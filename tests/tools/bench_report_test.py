# SPDX-License-Identifier: MIT
"""The benchmarks' report: what becomes of a program's JSON, of what is missing, of the page, of noise."""
import pathlib
import re
import sys
import unittest

import numpy as np

root = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(root / "bench" / "report"))
import compare  # noqa: E402
import figures  # noqa: E402
import measure  # noqa: E402
import page  # noqa: E402
import rows  # noqa: E402
from rows import Peer, Row  # noqa: E402


def entry(name, cpu, real, unit="ns", **more):
    return {"name": name, "run_type": "iteration", "cpu_time": cpu, "real_time": real, "time_unit": unit, **more}


def timings(**entries):
    """Of a program `p`: a benchmark each, from seconds of its repetitions and items of one."""
    return {"p": {name: measure.Timing(cpu=seconds, wall=[2 * s for s in seconds], items=items)
                  for name, (seconds, items) in entries.items()}}  # fmt: skip


def cells(row, taken):
    return [line for line, _ in page.lines(row, taken)]


class Reading(unittest.TestCase):
    def test_items_follow_the_clock_that_the_name_tells(self):
        document = {"benchmarks": [
            entry("a/64", 10, 30, items_per_second=6.4e9), entry("a/64", 20, 30, items_per_second=3.2e9),
            entry("b/real_time", 10, 20, "us", items_per_second=5e6), entry("c", 1, 1, "ms", bytes_per_second=4e6),
            {**entry("a/64_median", 15, 30), "run_type": "aggregate"},
            {"name": "d", "error_occurred": True, "error_message": "no memory"},
        ]}  # fmt: skip
        taken, errors = measure.read(document)
        self.assertEqual({"d": "no memory"}, errors)
        self.assertEqual(["a/64", "b/real_time", "c"], list(taken))
        np.testing.assert_allclose([1e-8, 2e-8], taken["a/64"].cpu)
        np.testing.assert_allclose([3e-8, 3e-8], taken["a/64"].wall)
        np.testing.assert_allclose([64, 100, 4000], [taken[name].items for name in taken])

    def test_a_filter_takes_exactly_the_names(self):
        names = ["f<float, &x>/4/1.5", "g/2"]
        pattern = measure.choose(names)
        self.assertEqual(names, [n for n in [*names, "f<float, &x>/4/175", "g/22", "ag/2"] if re.search(pattern, n)])

    def test_programs_that_fail_are_named(self):
        results = measure.measure(pathlib.Path("nowhere"), {"p": ["a", "b"]})
        text = page.missing(results, {"one row": "not quiet", "another": "not quiet"})
        for word in ("`p`: the program failed", ": `a`; `b`", "- not quiet: one row; another\n"):
            self.assertIn(word, text)


class Tables(unittest.TestCase):
    row = Row("s", "work", "p", "ours/{}", (Peer("peer", "theirs/{}", (2, None)),), (16, 1 << 20))

    def test_ratios_are_of_speeds(self):
        taken = timings(**{"ours/16": ([1.0, 1.0], 100e6), "theirs/16": ([1.5, 1.5], 50e6),
                           "ours/1048576": ([4.0], 100e6), "theirs/1048576": ([2.0], 100e6)})  # fmt: skip
        self.assertEqual([["work", "16 / 1M", "100 / 25.0 Msamples/s", "peer", "3.00 / 0.50", "±0 %", "2 / –", "yes / –"]],
                         cells(self.row, taken))  # fmt: skip
        text, verdicts = page.table([self.row], taken)
        self.assertEqual({"yes": 1}, dict(verdicts))
        columns = {line.count("|") for line in text.strip().split("\n")}
        self.assertEqual(1, len(columns), "lines of one width")

    def test_what_is_missing_is_a_dash_and_never_another_size(self):
        taken = timings(**{"ours/16": ([1.0], 1e6), "ours/1048576": ([1.0], 1e6), "theirs/1048576": ([0.5], 1e6)})
        self.assertEqual("– / 0.50", cells(self.row, taken)[0][4])
        self.assertEqual([("–", "–")], [(line[2], line[7]) for line in cells(self.row, {})])

    def test_counted_beside_uncounted_is_refused(self):
        with self.assertRaisesRegex(ValueError, "counts"):
            page.table([self.row], timings(**{"ours/16": ([1.0], 1e6), "theirs/16": ([1.0], 0)}))

    def test_times_shares_and_clocks(self):
        taken = timings(a=([2e-9, 2e-9], 0), b=([1e-6], 1e6), c=([1e-5], 0))
        call = Row("s", "w", "p", "a", unit="time", most=3e-9)
        self.assertEqual([["w", "", "2.00 ns", "", "", "", "≤ 3.00 ns", "yes"]], cells(call, taken))
        wall = Row("s", "w", "p", "a", (Peer("q", "b", 0.01, share=True), Peer("r", "c")), unit="time", clock="wall")
        self.assertEqual([["4.00 ns", "0.2 %", "≤ 1 %", "yes"], ["", "5000", "", ""]],
                         [[line[2], line[4], line[6], line[7]] for line in cells(wall, taken)])  # fmt: skip

    def test_goals_inside_of_the_spread_are_undecided(self):
        figure = figures.Ratio(1.0, 0.9, 1.1)
        found = [figures.reached(figure, goal, at_most) for at_most in (False, True) for goal in (0.8, 0.95, 1.05, 1.2)]
        self.assertEqual(["yes", "undecided", "undecided", "no", "no", "undecided", "undecided", "yes"], found)

    def test_every_row_has_its_own_name_and_as_many_goals_as_sizes(self):
        self.assertEqual(len(rows.ROWS), len({(row.section, row.work) for row in rows.ROWS}))
        for row in rows.ROWS:
            self.assertIn(len(row.labels), (0, len(row.sizes)), row.work)
            for peer in row.peers:
                if isinstance(peer.goal, tuple):
                    self.assertEqual(len(row.sizes), len(peer.goal), row.work)


class Page(unittest.TestCase):
    text = "before\n<!-- measured: one -->\nold\n<!-- end -->\nbetween\n<!-- measured: two -->\n<!-- end -->\nafter\n"

    def test_prose_and_markers_stay(self):
        once = page.replace(self.text, {"one": "1\n", "two": "a\\1\n"})
        self.assertEqual(self.text.replace("old\n", "1\n").replace("two -->\n", "two -->\na\\1\n"), once)
        self.assertEqual(once, page.replace(once, {"one": "1", "two": "a\\1"}))

    def test_parts_without_markers_and_markers_without_parts_are_refused(self):
        for text, parts in ((self.text, {"one": ""}), (self.text, {"one": "", "two": "", "three": ""}),
                            (self.text.replace("<!-- end -->\nafter", ""), {"one": ""}),
                            (self.text + self.text, {"one": "", "two": ""})):  # fmt: skip
            with self.assertRaisesRegex(ValueError, "the page has the parts"):
                page.replace(text, parts)

    def test_the_page_has_a_place_for_every_section(self):
        sections = {row.section for row in rows.ROWS} | {"machine", "missing"}
        page.replace((root / "docs" / "performance.md").read_text(), dict.fromkeys(sections, ""))


class Comparison(unittest.TestCase):
    def taken(self, count, slower, spread=0.02):
        """Timings of rows of two builds, the rows in `slower` by those factors; a quarter of all in a slow mode."""
        generator = np.random.default_rng(5)
        one = lambda factor: factor * (1 + spread * generator.random(13)) * generator.choice([1, 1, 1, 1.4], 13)
        return {k: (one(1), one(slower.get(k, 1))) for k in range(count)}

    def changed(self, taken):
        return {k: round(speed.value, 1) for k, (speed, changed) in figures.changes(taken).items() if changed}

    def test_only_what_changed_is_found(self):
        self.assertEqual({}, self.changed(self.taken(300, {})))
        self.assertEqual({7: 0.8, 40: 1.4}, self.changed(self.taken(100, {7: 1.25, 40: 0.7})))

    def test_sure_but_small_is_no_change(self):
        self.assertEqual({}, self.changed({0: (1 + 1e-4 * np.arange(20), 1.02 + 1e-4 * np.arange(20))}))

    def test_turns_are_enough_for_the_rows(self):
        for count in (1, 30, 300):
            turns = figures.fewest_turns(count)
            taken = {k: (1 + 1e-3 * np.arange(turns), 1 + 1e-3 * np.arange(turns)) for k in range(count)}
            taken[0] = taken[0][0], 2 * taken[0][1]
            self.assertEqual({0: 0.5}, self.changed(taken), count)

    def test_names_of_one_build_alone_are_named(self):
        listed = {"p": ["a/1", "a/2", "b"]}, {"p": ["a/2", "a/3"], "q": ["a/1"]}
        common, alone = compare.select(listed, "^a")
        self.assertEqual({"p": ["a/2"]}, common)
        alone_in = [("a/1 (p)", "old"), ("a/3 (p)", "new"), ("a/1 (q)", "new")]
        self.assertEqual([f"{name}: only in the {which} build" for name, which in alone_in], alone)


if __name__ == "__main__":
    unittest.main()
