#!/usr/bin/env python3
"""Checks that every file and folder that CONTRIBUTING.md names is there.

    contributing_test.py PROJECT_FOLDER
"""

import pathlib
import re
import sys


def main():
    project = pathlib.Path(sys.argv[1])
    text = (project / "CONTRIBUTING.md").read_text(encoding="utf-8")
    outside_blocks = re.sub(r"^ *```.*?^ *```", "", text, flags=re.MULTILINE | re.DOTALL)
    names = {name.split()[0] for name in re.findall(r"`([^`]+)`", outside_blocks)}
    paths = sorted(name for name in names if re.fullmatch(r"[\w./-]*/[\w./-]*", name))
    # A number that is still to come stands as N.
    missing = [path for path in paths if path != "schema/N.sql" and not (project / path).exists()]
    for path in missing:
        print(f"{path} is not there")
    print(f"{len(paths)} paths, {len(missing)} missing")
    return 1 if missing or not paths else 0


if __name__ == "__main__":
    sys.exit(main())
