#!/usr/bin/env python3
"""Checks that everything that tells the login functions' result codes tells the same ones.

    result_codes_test.py PROJECT_FOLDER

The header login.h is what counts. Compared with it are the codes that login/sharinglogin.cpp answers, the
table of the API reference, the manual page, and the table of what the visitor's program makes of them.
"""

import pathlib
import re
import sys

LOGIN, CHECK = "login", "check"


def of_header(text):
    """Code to meaning, from the comment at the top."""
    comment = text[: text.index("*/")]
    return {int(code): meaning for code, meaning in
            re.findall(r"^ \* +(-?\d+)  (\S.*)$", comment, re.MULTILINE)}


def of_library(text):
    """Code to the operations that answer it; what never leaves the library is left out."""
    enumeration = re.search(r"enum ResultCode \{(.*?)\};", text, re.DOTALL)[1]
    codes = {name: int(value) for name, value in
             re.findall(r"(k\w+) = (-?\d+),(?!\s*// never)", enumeration)}
    begin, middle, end = (text.index(function) for function in
                          ("int CheckProtection(", "int IsAuthorized(", "bool Logout("))
    found = {code: set() for code in codes.values()}
    for operation, part in ((LOGIN, text[begin:middle]), (CHECK, text[middle:end])):
        for statement in re.findall(r"return ([^;]*);", part):
            for name in re.findall(r"\bk\w+", statement):
                if name in codes:
                    found[codes[name]].add(operation)
    return found


def rows_of(text, heading):
    """The cells of the table that begins with this heading."""
    lines = iter(text.split("\n"))
    for line in lines:
        if line.startswith("| " + heading):
            break
    next(lines)
    for line in lines:
        if not line.startswith("|"):
            return
        yield [cell.strip() for cell in line.strip("|").split("|")]


def of_reference(text):
    """Code to meaning, and code to operations."""
    rows = list(rows_of(text, "code"))
    operations = {int(row[0]): {name for name, cell in zip((LOGIN, CHECK), row[2:]) if cell == "yes"}
                  for row in rows}
    return {int(row[0]): row[1] for row in rows}, operations


def of_visitor(text):
    """Code to the operations that the visitor's program expects it of."""
    return {int(row[0].split()[0]): {name for name, cell in zip((LOGIN, CHECK), row[1:])
                                     if not cell.startswith("–")}
            for row in rows_of(text, "Code of the library")}


def of_manual(text):
    """Code to meaning."""
    values = text[text.index(".SH RETURN VALUE"): text.index(".SH ERRORS")]
    return {int(code.replace("\\", "")): meaning for code, meaning in
            re.findall(r"^\.TP\n\.B (\\?-?\d+)\n(.*)$", values, re.MULTILINE)}


def main():
    project = pathlib.Path(sys.argv[1])

    def read(path):
        return (project / path).read_text(encoding="utf-8")

    header = of_header(read("include/tuvosharing/login.h"))
    library = of_library(read("login/sharinglogin.cpp"))
    meanings, operations = of_reference(read("docs/reference/result_codes.md"))
    visitor = of_visitor(read("docs/visitor.md"))
    manual = of_manual(read("packaging/man/TuvoSharingLogin.3"))

    not_done = meanings.pop(0, None)  # of the two that answer yes or no
    operations.pop(0, None)
    wrong = []
    if len(header) < 2 or not_done is None:
        wrong.append("the header's comment, or the reference's row 0, cannot be read")
    if set(library) != set(header):
        wrong.append(f"the library answers {sorted(library)}, the header tells {sorted(header)}")
    for name, table in (("reference", meanings), ("manual page", manual)):
        for code in sorted(set(header) | set(table)):
            if header.get(code) != table.get(code):
                wrong.append(f"{code}: header '{header.get(code)}', {name} '{table.get(code)}'")
    visitor[1] = {LOGIN, CHECK}  # is no refusal
    for name, table in (("reference", operations), ("visitor's page", visitor)):
        for code in sorted(set(library) | set(table)):
            if library.get(code) != table.get(code):
                wrong.append(f"{code}: the library answers it at {library.get(code)}, "
                             f"by the {name} at {table.get(code)}")
    print("\n".join(wrong + [f"{len(header)} codes, {len(wrong)} differences"]))
    sys.exit(1 if wrong else 0)


main()
