"""Whether the floor does what the library does: the same calls into SQLite and the kernel, in the same
order. Only what is drawn or read from the clock may differ."""

import difflib
import re

import programs
import rows as table

# New sessions and links, and times, which all have ten digits.
DRAWN = [
    (re.compile(r"(session_id=|session VALUES \(NULL,|entry VALUES \(NULL,)'[^']*'"), r"\1'DRAWN'"),
    (re.compile(r"\b1\d{9}\b"), "TIME"),  # until 2033
]

OPERATIONS = 3


def _plain(line):
    for pattern, replacement in DRAWN:
        line = pattern.sub(replacement, line)
    return line


def _lines(place, row, side):
    place.lay_out(table.SMALL, row.expired and table.SMALL)
    return [_plain(line) for line in programs.trace(place, row, side, OPERATIONS)]


def _named(row):
    return row.operation + (" of what is over" if row.expired else "")


def check(place, rows):
    """Prints the differences and returns whether there were none."""
    same = True
    for row in {(row.operation, row.expired): row for row in rows if not row.process}.values():
        small = type(row)(**{**vars(row), "links": table.SMALL})
        floor, library = (_lines(place, small, side) for side in programs.SIDES)
        if not any(line.startswith("step") for line in floor):
            raise RuntimeError(f"nothing was traced of {row.name}")
        if floor == library:
            print(f"same      {_named(row)}: {len(floor)} calls")
            continue
        same = False
        print(f"DIFFERENT {_named(row)}")
        print("\n".join(difflib.unified_diff(floor, library, "floor", "library", lineterm="", n=2)))
    return same
