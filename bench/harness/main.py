"""scripts/bench, inside scripts/private-root; see there."""

import argparse
import datetime
import fnmatch
import itertools
import json
import os
import pathlib
import platform
import sys

import ending
import floor_check
import kept_counts
import pairs
import programs
import rows as table
import table as printed
import workplace

QUICK_PAIRS, PAIRS, MOST_PAIRS = 3, 11, 15
COUNTED_OPERATIONS = 10


def options():
    parser = argparse.ArgumentParser(prog="scripts/bench", description=(
        "Measures what the library costs on top of the statements that it runs."))
    parser.add_argument("--rows", metavar="PATTERN", default="*",
                        help="only rows whose name is like it, for example 'check*'")
    parser.add_argument("--pairs", type=int, help=f"runs of each side (default {PAIRS})")
    parser.add_argument("--quick", action="store_true",
                        help="few runs, no million of links, no counts: a first look")
    parser.add_argument("--json", metavar="FILE", type=pathlib.Path, help="writes all figures")
    parser.add_argument("--web", action="store_true",
                        help="then the rows through the web server, and the peers")
    parser.add_argument("--seconds", type=float, help="for each point through the web server")
    parser.add_argument("--check-floor", action="store_true",
                        help="only compares what library and floor call")
    parser.add_argument("--instructions", action="store_true",
                        help="only counts the instructions of one check and one login")
    parser.add_argument("--check", action="store_true",
                        help="with --instructions: fails above the kept counts")
    parser.add_argument("--write", metavar="WHY", help="with --instructions: keeps the counts")
    parser.add_argument("--build-dir", type=pathlib.Path, required=True, help=argparse.SUPPRESS)
    given = parser.parse_args()
    if (given.check or given.write) and not given.instructions:
        parser.error("--check and --write need --instructions")
    if given.pairs is not None and not 1 <= given.pairs <= MOST_PAIRS:
        parser.error(f"--pairs takes 1 to {MOST_PAIRS}: a logout needs a visitor of its own each time")
    return given


def chosen(given):
    rows = [row for row in table.ROWS if fnmatch.fnmatch(row.name, given.rows)
            and not (given.quick and row.links == table.LARGE)]
    if not rows:
        sys.exit(f"no row is like {given.rows}")
    return rows


def add_counts(place, result, row):
    """What is counted rather than timed."""
    result["fsyncs"] = {side: programs.fsyncs(place, row_for_counts(row), side)
                        for side in programs.SIDES}
    if row.countable:
        result["instructions"] = {}
        for side in programs.SIDES:
            place.lay_out(row.links)
            result["instructions"][side] = programs.instructions(place, row, side,
                                                                 COUNTED_OPERATIONS)


def row_for_counts(row):
    """Fsyncs are the same at any size; a small database is copied faster."""
    return type(row)(**{**vars(row), "links": table.SMALL})


def measure(place, given):
    count = given.pairs or (QUICK_PAIRS if given.quick else PAIRS)
    results = []
    for once, group in itertools.groupby(chosen(given), key=lambda row: row.once):
        group = list(group)
        measured = (pairs.measure_once(place, group, count) if once else
                    (pairs.measure(place, row, count) for row in group))
        for row, result in zip(group, measured):
            print(f"measured {row.name}", file=sys.stderr, flush=True)
            if not given.quick:
                add_counts(place, result, row)
            pairs.judge(result, row)
            results.append(result)
    grown = pairs.growth(results)
    return results + ([grown] if grown else [])


def through_web(given):
    """The rows of bench/web and what there is to read, as table and comparisons."""
    sys.path.insert(0, str(workplace.PROJECT / "bench" / "web"))
    import web_rows  # pylint: disable=import-outside-toplevel
    found = web_rows.rows(argparse.Namespace(seconds=given.seconds, build=str(given.build_dir)))
    return found, "\n".join([web_rows.table(found), "", *web_rows.ratios(found)])


def machine():
    return {"date": datetime.date.today().isoformat(), "processors": os.cpu_count(),
            "kernel": platform.release(), "load": os.getloadavg()[0]}


def report(given, about, results):
    print(f"\n{about['date']}, {about['processors']} processors, Linux {about['kernel']}, "
          f"load {about['load']:.1f} before, {os.getloadavg()[0]:.1f} after\n")
    print(printed.text(results), flush=True)
    web = []
    if given.web:
        web, text = through_web(given)
        print("\n" + text)
    if given.json:
        given.json.write_text(json.dumps({"machine": about, "rows": results, "web": web},
                                         indent=2) + "\n", encoding="utf-8")


def count_instructions(place, given):
    counts = kept_counts.count(place)
    if given.write:
        kept_counts.write(counts, given.write)
    if given.check:
        return kept_counts.check(counts)
    print("\n".join(f"{name}: {count} instructions" for name, count in counts.items()))
    return True


def main():
    ending.by_exception()
    given = options()
    place = workplace.Workplace(given.build_dir)
    about = machine()
    with place.mounted():
        if given.check_floor:
            return 0 if floor_check.check(place, chosen(given)) else 1
        if given.instructions:
            return 0 if count_instructions(place, given) else 1
        results = measure(place, given)
    report(given, about, results)
    return 0


if __name__ == "__main__":
    sys.exit(main())
