#!/usr/bin/env python3
"""Shows doxygen the contract comments of a header, which are plain ones (// and /* */).

    filter.py HEADER        prints the header as doxygen is to read it, line by line

- The comment at the top is the file's.
- A comment right above a declaration is its contract, and that of the further declarations that
  follow without a blank line or another comment between them.
- A comment behind a declaration is that one's. Destructors and forward declarations have none.
- What is deleted ("= delete") is no name that anybody can use, and is left out; so are the guards
  against a second inclusion.
"""

import re
import sys

TRAILING = re.compile(r"^(.*[;,{)\w])\s+(?:// (.*)|/\* (.*) \*/)$")
GUARD = re.compile(r"#ifndef (\w+_H_)$")
FORWARD = re.compile(r"(class|struct) \w+;$")
ACCESS = re.compile(r"(public|protected|private):$")


def escaped(text):
    """`text` without meaning to doxygen, but for what stands between backquotes."""
    pieces = re.split(r"(`[^`]*`)", text)
    pieces[::2] = [re.sub(r"([@\\#<>]|--)", r"\\\1", piece) for piece in pieces[::2]]
    return "".join(pieces)


def comment_at(lines, at):
    """The texts of the comment that begins in this line, one for each of its lines; or none."""
    first = lines[at].strip()
    if first.startswith("/*"):
        end = next(i for i in range(at, len(lines)) if lines[i].rstrip().endswith("*/"))
        body = "\n".join(line.strip() for line in lines[at:end + 1])[2:-2]
        return [re.sub(r"^\* ?", "", line).rstrip() for line in body.strip().split("\n")]
    texts = []
    while at < len(lines) and re.match(r"\s*//( |$)", lines[at]):
        texts.append(lines[at].strip()[3:])
        at += 1
    return texts


def as_table(texts):
    """`texts` with lines like "  -1  expired" as the rows of a table."""
    shown, in_table = [], False
    for text in texts:
        row = re.match(r" +(-?\d+)  (\S.*)", text)
        if row and not in_table:
            shown += ["", "| code | meaning |", "| ---: | :--- |"]
        in_table = bool(row)
        shown.append(f"| {row[1]} | {row[2]} |" if row else text)
    return shown


def documented(texts):
    """The comment as one of doxygen's."""
    return [f"/// {text}".rstrip() for text in as_table([escaped(text) for text in texts])]


class Reader:
    """Goes through a header's lines and collects what doxygen is to see."""

    def __init__(self, lines):
        self.lines = lines
        self.result = []
        self.guard = None  # against a second inclusion
        self.contract = []  # of the declarations that come next
        self.begins = True  # whether the next line of code begins a declaration

    def comment(self, at, texts):
        """Takes the comment that ends before line `at`."""
        apart = at == len(self.lines) or not self.lines[at].strip()
        self.contract = [] if apart else texts
        if not apart:
            self.result += documented(texts)
        self.begins = False

    def preprocessor(self, line):
        """Takes a line that begins with #."""
        found = GUARD.match(line)
        if found and not self.guard:
            self.guard = found[1]
            line = "/// @file"  # of the comment above
        elif re.match(rf"#(define|endif\b.*) {self.guard}\b", line):
            line = ""
        self.result.append(line)
        self.contract, self.begins = [], True

    def code(self, line):
        """Takes any other line."""
        trailing = TRAILING.match(line)
        if trailing:
            line = trailing[1]
        code = line.strip()
        if FORWARD.match(code):
            self.result.append(line)
            return
        closing = code.startswith("}") or ACCESS.match(code)
        if self.begins and self.contract and not closing and "~" not in code:
            self.result += documented(self.contract)
        if trailing and not closing:
            line += f"  ///< {escaped(trailing[2] or trailing[3])}"
        self.result.append(line)
        self.begins = code.endswith((";", "{", "}")) or bool(closing)
        if code.endswith("{") or closing:
            self.contract = []

    def run(self):
        """The lines as doxygen is to see them."""
        at = 0
        while at < len(self.lines):
            line = re.sub(r"\s*// NOLINT.*$", "", self.lines[at].rstrip())
            texts = comment_at(self.lines, at) if line else []
            at += max(1, len(texts))
            if texts:
                self.comment(at, texts)
            elif line.startswith("#"):
                self.preprocessor(line)
            elif not line or line.endswith("= delete;"):
                self.result.append("")
                self.contract, self.begins = [], True
            else:
                self.code(line)
        return self.result


def main():
    with open(sys.argv[1], encoding="utf-8") as header:
        print("\n".join(Reader(header.read().split("\n")).run()))


main()
