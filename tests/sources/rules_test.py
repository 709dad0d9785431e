#!/usr/bin/env python3
"""Checks that every rule of the ledger in docs/rules/ names a test that is there, and one alone.

    rules_test.py PROJECT_FOLDER

A rule is a list item that ends in the names of its tests, `Suite.Case` for the C++ ones and a file
name for the scripts:

    - A link with an empty owner is not legal. `EntryIsLegal.NotWithoutAnOwner`

No two C++ tests have the same name, in different programs either: the rule would not tell which.
"""

import collections
import pathlib
import re
import sys

TEST = re.compile(r"^\s*(?:TEST|TEST_F|TEST_P|TYPED_TEST)\((\w+),\s*(\w+)\)", re.MULTILINE)


def cpp_tests_of(project):
    """The C++ tests' names, each with the files that define it."""
    names = collections.defaultdict(list)
    for path in sorted((project / "tests").rglob("*.cpp")):
        for suite, case in TEST.findall(path.read_text()):
            names[f"{suite}.{case}"].append(str(path.relative_to(project)))
    return names


def tests_of(project):
    """Every name under which the ledger may call a test."""
    names = set(cpp_tests_of(project))
    for path in (project / "tests").rglob("*"):
        if path.suffix == ".py":
            names.update(f"{path.name}:{case}" for case in
                         re.findall(r"^\s*def (test_\w+)\(", path.read_text(), re.MULTILINE))
        if path.suffix in (".py", ".sh"):
            names.add(path.name)
    return names


def items_of(text):
    """The list items of a page, each on one line."""
    items = re.findall(r"^- .*(?:\n  .*)*", text, re.MULTILINE)
    return [re.sub(r"\s+", " ", item) for item in items]


def main():
    project = pathlib.Path(sys.argv[1])
    known = tests_of(project)
    wrong = [f"{name} is the name of several tests: {', '.join(files)}"
             for name, files in cpp_tests_of(project).items() if len(files) > 1]
    rules = 0
    for page in sorted((project / "docs" / "rules").glob("*.md")):
        for item in items_of(page.read_text()):
            rules += 1
            named = re.search(r"(?:[.:;)] )((?:`[\w.:]+`(?:, | )?)+)$", item)
            if not named:
                wrong.append(f"{page.name}: names no test: {item}")
                continue
            for test in re.findall(r"`([\w.:]+)`", named[1]):
                if test not in known:
                    wrong.append(f"{page.name}: there is no test {test}: {item}")
    print("\n".join(wrong))
    if rules == 0:
        sys.exit("the ledger holds no rules")
    print(f"{rules} rules, {len(wrong)} faults")
    sys.exit(1 if wrong else 0)


main()
