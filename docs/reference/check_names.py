#!/usr/bin/env python3
"""Checks that every name which a library exports is in the reference: doxygen leaves some out, such
as all of a namespace without a description, and says nothing. Destructors need no description.

    check_names.py TAG_FILE SYMBOLS...

TAG_FILE lists what doxygen has described, SYMBOLS is a text of exported names, one a line. A name
with several parameter lists must be described as often. Exits with 1 when one is missing.
"""

import collections
import re
import sys
import xml.etree.ElementTree


def described_in(tag_file):
    """How often each name is described, with the namespaces and the class that it is in."""
    names = collections.Counter()
    seen = set()
    for compound in xml.etree.ElementTree.parse(tag_file).getroot():
        scope = "" if compound.get("kind") == "file" else compound.findtext("name") + "::"
        for member in compound.iter("member"):
            name = re.sub(r"<.*>", "", member.findtext("name")).strip()
            described = scope + name
            key = (described, member.findtext("arglist"), member.findtext("anchor"))
            if key not in seen:
                seen.add(key)
                names[described] += 1
    return names


def exported_by(symbols):
    """How many parameter lists each exported name has; of templates one."""
    names = collections.Counter()
    with open(symbols, encoding="utf-8") as lines:
        for line in set(lines.read().split("\n")):
            head = line.split("(")[0]
            if not line or re.match(r"(vtable|typeinfo|typeinfo name) for ", line) or "~" in head:
                continue
            name = re.sub(r"<.*>|\[abi:\w+\]", "", head).split(" ")[-1]
            names[name] = 1 if "<" in head else names[name] + 1
    return names


def main():
    described = described_in(sys.argv[1])
    missing = []
    count = 0
    for symbols in sys.argv[2:]:
        for name, times in sorted(exported_by(symbols).items()):
            count += 1
            if described[name] < times:
                missing.append(f"{name}: {described[name]} of {times} described")
    print("\n".join(missing + [f"{count} exported names, {len(missing)} not described"]))
    sys.exit(1 if missing or count == 0 else 0)


main()
