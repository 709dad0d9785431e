"""Instruction counts of one check and one login, and the kept ones that they are held to.

Counts do not depend on what else the machine does, so a small rise shows at once.
"""

import json
import subprocess

import programs
import rows as table
from workplace import PROJECT

KEPT = PROJECT / "bench" / "instructions.json"
MOST = 1.03
OPERATIONS = 40
ROWS = {"check": table.Row("check", "check", links=table.SMALL),
        "login": table.Row("login", "login_open", links=table.SMALL)}

# Others' code is most of what is counted; with another version of it, other figures are right.
PACKAGES = ("libc6", "libjsoncpp25", "libsqlite3-0", "libstdc++6", "g++-12", "valgrind")


def _packages():
    # Fails for one that is not installed, and shows the others all the same.
    shown = subprocess.run(["dpkg-query", "--show", "--showformat=${Package} ${Version}\\n",
                            *PACKAGES], stdout=subprocess.PIPE, stderr=subprocess.DEVNULL,
                           text=True, check=False)
    return dict(line.split(" ") for line in shown.stdout.splitlines())


def count(place):
    counts = {}
    for name, row in ROWS.items():
        place.lay_out(row.links)
        counts[name] = round(programs.instructions(place, row, programs.LIBRARY, OPERATIONS,
                                                   fixed=True))
    return counts


def write(counts, why):
    KEPT.write_text(json.dumps({"why": why, "instructions": counts, "packages": _packages()},
                               indent=2) + "\n", encoding="utf-8")
    print(f"kept in {KEPT.relative_to(PROJECT)}")


def check(counts):
    """Prints how they compare and returns whether they are the kept ones, or nearly. A fall fails, too:
    as much could be lost again unnoticed."""
    kept = json.loads(KEPT.read_text(encoding="utf-8"))
    good = True
    for name, now in counts.items():
        ratio = now / kept["instructions"][name]
        risen, fallen = ratio > MOST, ratio < 2 - MOST
        good = good and not risen and not fallen
        verdict = " - TOO MANY" if risen else " - fallen: keep it, with --write" if fallen else ""
        print(f"{name}: {now} instructions, kept {kept['instructions'][name]}: "
              f"{(ratio - 1) * 100:+.2f} %{verdict}")
    now = _packages()
    for name, version in kept["packages"].items():
        if now.get(name) != version:
            print(f"note: {name} is {now.get(name)}; the kept figures are those with {version}")
    return good
