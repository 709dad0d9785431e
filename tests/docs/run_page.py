#!/usr/bin/env python3
"""Runs the code blocks of one page, in order, in a world of their own (world.py).

    scripts/private-root unshare --net /usr/bin/python3 run_page.py BUILD_FOLDER PROJECT_FOLDER PAGE

Shell blocks run in one shell, at a terminal, as root, each beginning in the project's folder; lines
of not_run.py are left out. The first command that fails ends a block. Whoever asks for a password
at the terminal is told PASSWORD. What a block shows as output has to be what it prints, where "…"
stands for anything.

C and C++ blocks whose first line names a file are saved under that name in the project's folder;
others are pieces. On a page with a program that has the line FRAME, each piece is put in its place,
built and run; on others with a program each piece has to stand in it, line by line; on pages
without programs it has to compile. A new page needs nothing else, unless it takes something for
given (given.py) or has lines that cannot be run (not_run.py)."""

import os
import pathlib
import pty
import re
import subprocess
import sys
import tempfile
import threading

import given
import not_run
import pages
import world

PASSWORD = "tea and biscuits"
FRAME = "  // The recipe goes here."
SECONDS = 120
COMPILE = ("c++ -std=c++17 -Wall -Wextra -Wpedantic -Werror {0}.cpp -o piece "
           "$(pkg-config --cflags --libs tuvosharing)")

# Reads names of files with commands, runs each in this very shell, and tells the status.
LOOP = ('while IFS= read -r -u "$1" file; do . "$file" >"$file.out"; '
        'echo $? >"/dev/fd/$2"; done')


class Shell:
    """A shell that goes on from command to command, at a terminal of its own."""

    def __init__(self, path):
        self.folder = tempfile.mkdtemp()
        commands, self.commands = os.pipe()
        self.statuses, statuses = os.pipe()
        self.terminal, own = pty.openpty()
        environment = {"PATH": path, "HOME": "/tmp", "LC_ALL": "C.UTF-8", "TERM": "dumb"}
        self.process = subprocess.Popen(
            ["setsid", "--ctty", "bash", "--norc", "-c", LOOP, "bash", str(commands),
             str(statuses)], stdin=own, stdout=own, stderr=own, env=environment,
            cwd=world.PROJECT, pass_fds=(commands, statuses))
        os.close(commands)
        os.close(statuses)
        os.close(own)
        self.count = 0
        threading.Thread(target=self._answer, daemon=True).start()

    def _answer(self):
        while True:
            try:
                said = os.read(self.terminal, 4096)
            except OSError:
                return
            for _ in re.findall(rb"(?:Password|again): ", said):
                os.write(self.terminal, PASSWORD.encode() + b"\n")

    def run(self, text):
        """Runs a command; its exit status and what it has printed."""
        self.count += 1
        file = pathlib.Path(self.folder, str(self.count))
        # A question is asked at the terminal; all else that is printed is to be seen.
        asks = re.search(r" --password(\s|$)", text)
        file.write_text(f"set -o pipefail\n{{ {text}\n}} {'' if asks else '2>&1'}\n")
        try:
            os.write(self.commands, f"{file}\n".encode())
        except BrokenPipeError:
            sys.exit("the shell has ended")
        guard = threading.Timer(SECONDS, self.process.kill)
        guard.start()
        said = os.read(self.statuses, 16)
        guard.cancel()
        return int(said) if said else None, file.with_suffix(".out").read_text()


def is_alike(shown, printed):
    """Whether lines are as the page shows them."""
    patterns = (re.escape(line).replace("…", ".*") for line in shown)
    return re.fullmatch("\n".join(patterns), "\n".join(printed)) is not None


class Page:
    def __init__(self, project, page, shell):
        self.blocks = pages.blocks_of(project, page)
        self.shell = shell
        self.programs = {}
        self.faults = 0
        self.done = 0

    def fault(self, place, *texts):
        self.faults += 1
        print(f"FAILED  {place}:", *texts, sep="\n  ", flush=True)

    def try_(self, place, text, shown):
        """Runs a command, which has to end with 0 and print what is shown, if that is something."""
        self.done += 1
        status, printed = self.shell.run(text)
        if status != 0:
            self.fault(place, text, f"ended with {status} and printed:", printed)
        elif shown is not None and not is_alike(shown, printed.splitlines()):
            self.fault(place, text, "printed:", printed, "and not:", "\n".join(shown))

    def run_shell(self, block):
        self.shell.run(f"cd {world.PROJECT}")
        for command in pages.commands_of(block):
            text = not_run.runs(command)
            if not text:
                continue
            # In a console block what one command sets the next ones know.
            self.try_(block.place, text if block.language == "console" else f"(set -e\n{text}\n)",
                      command.output)

    def save(self, block):
        text = "\n".join(block.lines) + "\n"
        self.programs[block.file_name] = text
        (world.PROJECT / block.file_name).write_text(text)

    def run_piece(self, block, frame):
        self.done += 1
        (world.PROJECT / "piece.cpp").write_text(frame.replace(FRAME, "\n".join(block.lines)))
        status, printed = self.shell.run(f"cd {world.PROJECT}; {COMPILE.format('piece')}")
        if status != 0 or printed:
            self.fault(block.place, printed)
            return
        self.try_(block.place, "REMOTE_ADDR=192.0.2.7 ./piece", block.shown)

    def find_piece(self, block):
        self.done += 1
        piece = [line.strip() for line in block.lines if line.strip()]
        for text in self.programs.values():
            lines = [line.strip() for line in text.split("\n") if line.strip()]
            if any(lines[at:at + len(piece)] == piece for at in range(len(lines))):
                return
        self.fault(block.place, "is no part of a program of this page:", *piece)

    def compile_piece(self, block):
        (world.PROJECT / "piece.cpp").write_text("\n".join(block.lines) + "\n")
        self.try_(block.place, f"cd {world.PROJECT}; {COMPILE.format('-c piece')}", [])

    def run(self):
        code = [block for block in self.blocks if block.language in ("c", "cpp")]
        for block in code:
            if block.file_name:
                self.save(block)
        frame = next((text for text in self.programs.values() if FRAME in text), None)
        for block in self.blocks:
            if block.is_shell:
                self.run_shell(block)
            elif block in code and not block.file_name:
                if frame:
                    self.run_piece(block, frame)
                elif self.programs:
                    self.find_piece(block)
                else:
                    self.compile_piece(block)


def main():
    build, project, page = sys.argv[1:]
    if os.environ.get("TUVO_PRIVATE_ROOT") != "1":
        sys.exit("run this under scripts/private-root")
    server, path = world.make(build, project)
    try:
        shell = Shell(path)
        here = Page(project, page, shell)
        if page in given.GIVEN:
            here.try_(f"{page}: given", f"(set -e\n{given.GIVEN[page]}\n)", None)
        here.run()
        if page in given.AFTERWARDS:
            here.try_(f"{page}: afterwards", f"(set -e\n{given.AFTERWARDS[page]}\n)", None)
        print(f"{here.done} commands and pieces, {here.faults} faults", flush=True)
    finally:
        server.terminate()
        server.wait()
    sys.exit(1 if here.faults else 0)


if __name__ == "__main__":
    main()
