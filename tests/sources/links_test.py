#!/usr/bin/env python3
"""Checks that every link from one Markdown file to another place in the project leads somewhere.

    links_test.py PROJECT_FOLDER
"""

import pathlib
import re
import sys

LINK = re.compile(r"\]\(([^)\s]+)\)")


def main():
    project = pathlib.Path(sys.argv[1]).resolve()
    files = [*project.glob("*.md"), *(project / "docs").rglob("*.md")]
    links = [(file, target) for file in files
             for target in LINK.findall(file.read_text(encoding="utf-8"))
             if not re.match(r"[a-z]+:|#", target)]
    dead = [(file, target) for file, target in links
            if not (file.parent / target.split("#")[0]).exists()]
    for file, target in dead:
        print(f"{file.relative_to(project)}: {target} is not there")
    print(f"{len(links)} links in {len(files)} files, {len(dead)} dead")
    return 1 if dead or not links else 0


if __name__ == "__main__":
    sys.exit(main())
