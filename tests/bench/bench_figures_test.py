#!/usr/bin/env python3
"""What scripts/bench says of the figures that it has measured or counted."""

import contextlib
import io
import json
import pathlib
import sys
import tempfile
import unittest

sys.dont_write_bytecode = True
PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "bench" / "harness"))

import kept_counts  # pylint: disable=wrong-import-position
import pairs  # pylint: disable=wrong-import-position
import rows  # pylint: disable=wrong-import-position
import table  # pylint: disable=wrong-import-position


class KeptCounts(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        for name, value in (("PROJECT", pathlib.Path(folder.name)),
                            ("KEPT", pathlib.Path(folder.name, "kept.json"))):
            self.addCleanup(setattr, kept_counts, name, getattr(kept_counts, name))
            setattr(kept_counts, name, value)
        self.printed = io.StringIO()
        out = contextlib.redirect_stdout(self.printed)
        out.__enter__()
        self.addCleanup(out.__exit__, None, None, None)
        kept_counts.write({"check": 100000, "login": 200000}, "the first")

    def test_the_kept_counts_pass(self):
        self.assertTrue(kept_counts.check({"check": 100000, "login": 200000}))

    def test_three_per_cent_more_pass(self):
        self.assertTrue(kept_counts.check({"check": 103000, "login": 206000}))

    def test_more_than_three_per_cent_more_fail(self):
        self.assertFalse(kept_counts.check({"check": 100000, "login": 206001}))
        self.assertFalse(kept_counts.check({"check": 103001, "login": 200000}))
        self.assertIn("check: 103001 instructions, kept 100000: +3.00 % - TOO MANY",
                      self.printed.getvalue())

    def test_three_per_cent_fewer_pass(self):
        self.assertTrue(kept_counts.check({"check": 97000, "login": 194000}))

    def test_even_fewer_fail_and_are_to_be_kept(self):
        self.assertFalse(kept_counts.check({"check": 96000, "login": 200000}))
        self.assertIn("-4.00 % - fallen: keep it, with --write", self.printed.getvalue())

    def test_other_packages_are_named(self):
        kept = json.loads(kept_counts.KEPT.read_text(encoding="utf-8"))
        here = kept["packages"]["libc6"]
        kept["packages"]["libc6"] = "0.1"
        kept_counts.KEPT.write_text(json.dumps(kept), encoding="utf-8")
        kept_counts.check({"check": 100000, "login": 200000})
        self.assertIn(f"note: libc6 is {here}; the kept figures are those with 0.1",
                      self.printed.getvalue())

    def test_the_reason_is_kept(self):
        kept = json.loads(kept_counts.KEPT.read_text(encoding="utf-8"))
        self.assertEqual(kept["why"], "the first")


class TheKeptFile(unittest.TestCase):
    def test_names_its_reason_and_both_counts(self):
        kept = json.loads(kept_counts.KEPT.read_text(encoding="utf-8"))
        self.assertTrue(kept["why"])
        self.assertEqual(set(kept["instructions"]), set(kept_counts.ROWS))


def figures(cpu, grown_kib=0.0, kept_kib=0.0):
    return {key: {"median": value, "min": value, "max": value}
            for key, value in (("cpu", cpu), ("wall", 2 * cpu), ("peak_kib", 1024.0),
                               ("grown_kib", grown_kib), ("kept_kib", kept_kib))}


def result(row, library, floor):
    ratio = library["cpu"]["median"] / floor["cpu"]["median"]
    ratio = {"median": ratio, "min": ratio, "max": ratio}
    return {"row": row.name, "operation": row.operation, "links": row.links, "expired": 0,
            "library": library, "floor": floor, "wall_ratio": ratio, "cpu_ratio": ratio}


class Targets(unittest.TestCase):
    def judged(self, row, library, floor):
        found = result(row, library, floor)
        pairs.judge(found, row)
        return found

    def test_what_meets_its_target_is_ok(self):
        row = rows.Row("check", "check", cpu_target=1.25)
        self.assertIn("| CPU 1.25 of 1.25 | ok ",
                      table.text([self.judged(row, figures(1.25), figures(1.0))]))

    def test_what_does_not_is_missed(self):
        row = rows.Row("check", "check", cpu_target=1.25)
        self.assertIn("| CPU 1.26 of 1.25 | MISSED ",
                      table.text([self.judged(row, figures(1.26), figures(1.0))]))

    def test_memory_is_held_to_the_records(self):
        row = rows.Row("query", "query", memory_target=1.5)
        self.assertIn("memory 1.60 of 1.50 | MISSED",
                      table.text([self.judged(row, figures(1, 160, 100), figures(1))]))

    def test_growth_is_beyond_the_floors(self):
        small = rows.Row("check 1k", "check", links=rows.SMALL)
        large = rows.Row("check 1M", "check", links=rows.LARGE)
        fresh = rows.Row("fresh_process", "check", links=rows.SMALL, process=True)
        grown = pairs.growth([result(small, figures(1.0), figures(1.0)),
                              result(large, figures(3.0), figures(2.0)),
                              result(fresh, figures(9.0), figures(1.0))])
        self.assertEqual(grown["targets"][0]["value"], 1.5)
        self.assertFalse(grown["targets"][0]["kept"])


if __name__ == "__main__":
    unittest.main()
