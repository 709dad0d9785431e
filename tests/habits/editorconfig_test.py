#!/usr/bin/env python3
"""Checks that .editorconfig tells editors what the files are: every text file of the project is as it
says, and for C and C++ it says what .clang-format does (whether lines are too long is for that).

    editorconfig_test.py PROJECT_FOLDER
"""

import fnmatch
import os
import pathlib
import re
import sys

SKIPPED_FOLDERS = {"build", ".git", ".cache", "node_modules", "__pycache__"}


def sections_of(text):
    """Pairs of a pattern and its properties, in order."""
    sections = []
    for line in text.split("\n"):
        line = line.strip()
        if re.match(r"\[.*\]$", line):
            sections.append((line[1:-1], {}))
        elif "=" in line and not line.startswith("#") and sections:
            name, value = line.split("=", 1)
            sections[-1][1][name.strip()] = value.strip()
    return sections


def alternatives(pattern):
    braces = re.search(r"\{([^{}]*)\}", pattern)
    if not braces:
        return [pattern]
    return [one for choice in braces[1].split(",") for one in
            alternatives(pattern[:braces.start()] + choice + pattern[braces.end():])]


def matches(path, pattern):
    """A pattern without a slash is for names, one with for paths."""
    for one in alternatives(pattern):
        subject = path if "/" in one else path.split("/")[-1]
        if fnmatch.fnmatchcase(subject, one):
            return True
    return False


def properties_of(path, sections):
    found = {}
    for pattern, properties in sections:
        if matches(path, pattern):
            found.update(properties)
    return {name: value for name, value in found.items() if value != "unset"}


def faults_in(content, wanted):
    """What of a file is not as wanted. A program that somebody has left lying about is no text."""
    faults = []
    if b"\0" in content:
        return faults
    if wanted.get("charset") == "utf-8":
        try:
            content.decode("utf-8")
        except UnicodeDecodeError:
            return ["is no UTF-8"]
    text = content.decode("utf-8", "replace")
    lines = text.split("\n")
    if wanted.get("end_of_line") == "lf" and "\r" in text:
        faults.append("has carriage returns")
    if wanted.get("insert_final_newline") == "true" and text and not text.endswith("\n"):
        faults.append("does not end with a line feed")
    if wanted.get("trim_trailing_whitespace") == "true":
        faults += [f"{number}: blanks at the end" for number, line in enumerate(lines, 1)
                   if re.search(r"[ \t]$", line)]
    if wanted.get("indent_style") == "space":
        faults += [f"{number}: a tab at the beginning" for number, line in enumerate(lines, 1)
                   if re.match(r" *\t", line)]
    return faults


def project_files(project):
    for folder, folders, names in os.walk(project):
        folders[:] = [name for name in folders if name not in SKIPPED_FOLDERS]
        for name in names:
            path = pathlib.Path(folder, name)
            if path.is_file() and not path.is_symlink():
                yield path


def check_the_checking():
    wanted = {"charset": "utf-8", "end_of_line": "lf", "insert_final_newline": "true",
              "trim_trailing_whitespace": "true", "indent_style": "space"}
    assert faults_in(b"good\n", wanted) == []
    for bad in b"\xff\n", b"a\r\n", b"a", b"a \n", b"\ta\n":
        assert len(faults_in(bad, wanted)) == 1 or bad == b"a\r\n", (bad, faults_in(bad, wanted))
    assert matches("a/b.cpp", "*.{c,cpp}") and not matches("a/b.h", "*.{c,cpp}")
    assert matches("t/x/y/z", "{t/x/**,*.png}") and not matches("t/y", "{t/x/**,*.png}")


def main():
    project = pathlib.Path(sys.argv[1]).resolve()
    check_the_checking()
    sections = sections_of((project / ".editorconfig").read_text())
    formatting = dict(re.findall(r"^(\w+): *(\S+)$", (project / ".clang-format").read_text(),
                                 re.MULTILINE))
    code = properties_of("db/base_db.cpp", sections)
    faults = []
    if code.get("max_line_length") != formatting["ColumnLimit"]:
        faults.append("max_line_length is not .clang-format's ColumnLimit")
    # Google's style, which .clang-format begins with: two blanks, never a tab.
    google = {"IndentWidth": "2", "UseTab": "Never"}
    if (code.get("indent_size") != formatting.get("IndentWidth", google["IndentWidth"]) or
            formatting["BasedOnStyle"] != "Google" or
            formatting.get("UseTab", google["UseTab"]) != "Never" or
            code.get("indent_style") != "space"):
        faults.append("the indentation is not .clang-format's")
    count = 0
    for path in sorted(project_files(project)):
        name = path.relative_to(project).as_posix()
        count += 1
        faults += [f"{name}: {fault}" for fault in
                   faults_in(path.read_bytes(), properties_of(name, sections))]
    print("\n".join(faults + [f"{count} files, {len(faults)} faults"]))
    return 1 if faults or count == 0 else 0


if __name__ == "__main__":
    sys.exit(main())
