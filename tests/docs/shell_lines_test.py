#!/usr/bin/env python3
"""Runs every shell line of the project's pages.

    shell_lines_test.py BUILD_FOLDER PROJECT_FOLDER [PAGE...]

Each code block of a page in `sh`, `shell`, `bash` or `console` is run by run_page.py, in a namespace
of its own with an installation of the build in it, unless its lines are in the list of not_run.py. What
a `console` block shows is compared, and so is a `text` block right behind a block. Fails as well when
a block has no language, since it might be one for a shell, and when an entry of the list is of no use.
"""

import os
import pathlib
import re
import subprocess
import sys

import not_run
import pages

SKIPPED = 77


def faults_of_list(build, project, wanted):
    """What is wrong with blocks and listed lines; with all pages, with the list itself too."""
    faults, used = [], set()
    for page in wanted:
        for block in pages.blocks_of(project, page):
            if not block.language:
                faults.append(f"{block.place}: a code block without a language")
            if not block.is_shell:
                continue
            for command in pages.commands_of(block):
                for line in pages.joined(command.text.split("\n")):
                    entry = not_run.entry_for(pages.plain(line))
                    if not entry:
                        continue
                    used.add(entry.pattern)
                    print(f"not run: {block.place}: {pages.plain(line)} ({entry.reason})")
                    try:
                        entry.check(pages.plain(line), project, build)
                    except not_run.Wrong as wrong:
                        faults.append(f"{block.place}: {pages.plain(line)}: {wrong}")
    if wanted == pages.all_pages(project):
        faults += [f"no page has a line like {entry.pattern}" for entry in not_run.NOT_RUN
                   if entry.pattern not in used]
    return faults


def faults_within_lines(build, project, wanted):
    """Commands that a page's sentences name: the scripts are there, and `tuvosharing` has them."""
    told = subprocess.run([f"{build}/programs/cli/tuvosharing", "--help"], stdout=subprocess.PIPE,
                          text=True, check=True).stdout
    faults = []
    for page in wanted:
        for text in pages.spans_of(project, page):
            script = re.match(r"(?:sudo )?(scripts/[\w-]+)(?: |$)", text)
            if script and not os.access(pathlib.Path(project, script[1]), os.X_OK):
                faults.append(f"{page}: `{text}`: {script[1]} is no program")
            command = re.match(r"(?:sudo )?tuvosharing ([a-z]+)(?: |$)", text)
            if command and not re.search(rf"^  {command[1]}\b", told, re.MULTILINE):
                faults.append(f"{page}: `{text}`: there is no such command")
    return faults


def has_something_to_run(project, page):
    for block in pages.blocks_of(project, page):
        if block.language in ("c", "cpp"):
            return True
        if block.is_shell and any(not_run.runs(command) for command in pages.commands_of(block)):
            return True
    return False


def check_the_reading():
    """The reading itself, which would otherwise let lines pass by not seeing them."""
    here = pathlib.Path(__file__).parent
    blocks = pages.blocks_of(here, "example.md")
    assert [block.language for block in blocks] == ["sh", "text", "console", "", "cpp"], blocks
    assert blocks[0].shown == ["one"] and blocks[2].shown is None
    assert pages.commands_of(blocks[0])[0].output == ["one"]
    first, second = pages.commands_of(blocks[2])
    assert (first.text, first.output) == ("echo two \\\n  three", ["two three"]), first
    assert (second.text, second.output) == ("true", []), second
    assert blocks[4].file_name == "four.cpp"
    assert "no language" not in "".join(pages.spans_of(here, "example.md"))
    assert pages.spans_of(here, "example.md") == ["tuvosharing list"], "spans"
    assert pages.plain("sudo scripts/test \\\n  -R x  # why") == "sudo scripts/test -R x"
    assert not_run.entry_for("sudo scripts/test") and not not_run.entry_for("scripts/format")
    for line in ("sudo scripts/nothing", "scripts/lint --no-such-option"):
        try:
            not_run.script(line, here.parent.parent, None)
        except not_run.Wrong:
            continue
        raise AssertionError(f"{line} was let through")


def main():
    build, project, *wanted = sys.argv[1:]
    check_the_reading()
    wanted = wanted or pages.all_pages(project)
    faults = faults_of_list(build, project, wanted) + faults_within_lines(build, project, wanted)
    ran, skipped = 0, 0
    for page in wanted:
        if not has_something_to_run(project, page):
            continue
        print(f"== {page}", flush=True)
        done = subprocess.run([f"{project}/scripts/private-root", "unshare", "--net",
                               "/usr/bin/python3", f"{project}/tests/docs/run_page.py", build,
                               project, page], stdin=subprocess.DEVNULL, timeout=600)
        if done.returncode == SKIPPED:
            skipped += 1
        elif done.returncode != 0:
            faults.append(f"{page}: see above")
        ran += 1
    print("\n".join(faults + [f"{ran} pages run, {len(faults)} faults"]))
    if faults or ran == 0:
        return 1
    return SKIPPED if skipped else 0


if __name__ == "__main__":
    sys.exit(main())
