"""What is written about the administrator's command agrees with what it does: the manual page and
the shell's completion with its help. Arguments: the build folder, the project's folder."""

import os
import pty
import re
import select
import shutil
import subprocess
import sys
import time
import unittest

import visitor_server as vs

PROGRAM = "/usr/tuvo/bin/tuvosharing"
PAGE = "/usr/tuvo/share/man/man1/tuvosharing.1"
COMPLETION = "/usr/tuvo/share/bash-completion/completions/tuvosharing"
COMMANDS = ["create", "list", "show", "edit", "enable", "disable", "delete", "purge", "sessions",
            "tokens", "signout", "export", "import", "check", "backup", "unblock"]


def help_of(*command):
    return subprocess.run([PROGRAM, *command, "--help"], stdout=subprocess.PIPE, check=True,
                          encoding="utf-8").stdout


def options_of(*command):
    """The long options that the help of a command lists."""
    lines = [line for line in help_of(*command).splitlines() if line.startswith("  -")]
    return {re.match(r"  (?:-\w,)?(--[a-z-]+)", line).group(1) for line in lines}


def page_sections():
    """The page's text by the titles of its parts."""
    done = subprocess.run(["man", "--warnings", "-P", "cat", "-l", PAGE], stdout=subprocess.PIPE,
                          stderr=subprocess.PIPE, check=True, encoding="utf-8",
                          env=dict(os.environ, MANWIDTH="200", LC_ALL="C.UTF-8",
                                   MAN_KEEP_FORMATTING=""))
    sections, title = {}, ""
    for line in done.stdout.splitlines():
        match = re.match(r"(?:   )?([A-Za-z][A-Za-z, ]*)$", line)
        if match:
            title = match.group(1)
        sections[title] = sections.get(title, "") + line + "\n"
    return sections, done.stderr


def options_in(text):
    """The options that stand at the beginning of an entry of the page."""
    entries = [line for line in text.splitlines() if re.match(r" {7}-", line)]
    return {option for line in entries
            for option in re.findall(r"(?:^ +|, )(?:-\w, )?(--[a-z-]+)", line)}


class ManualPage(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        if not shutil.which("man"):
            raise unittest.SkipTest("the package man-db is missing")
        cls.sections, cls.warnings = page_sections()

    def test_has_no_faults(self):
        self.assertEqual(self.warnings, "")

    def test_every_command_has_its_options(self):
        shared = options_in(self.sections["What a link can hold"])
        for command in COMMANDS:
            title = "enable, disable" if command in ("enable", "disable") else command
            written = options_in(self.sections[title]) | {"--help"}
            if command in ("create", "edit"):
                written |= shared
            self.assertEqual(written, options_of(command), command)

    def test_every_command_of_the_program_is_there(self):
        listed = re.findall(r"^  ([a-z]+) ", help_of().split("Subcommands:")[1], re.MULTILINE)
        self.assertEqual(sorted(listed), sorted(COMMANDS))


def completions(*words):
    """What a bash offers for the last of the words."""
    script = ('source "$1"; shift; COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1)); _tuvosharing; '
              'printf "%s\\n" "${COMPREPLY[@]}"')
    done = subprocess.run(["bash", "--norc", "-c", script, "bash", COMPLETION, "tuvosharing",
                           *words], stdout=subprocess.PIPE, stderr=subprocess.PIPE, cwd="/usr/tuvo",
                          encoding="utf-8")
    return {line for line in done.stdout.splitlines() if line}


class Completion(unittest.TestCase):
    def test_commands(self):
        self.assertEqual(completions(""), set(COMMANDS) | {"--help", "--version"})
        self.assertEqual(completions("e"), {"edit", "enable", "export"})

    def test_every_command_has_its_options(self):
        for command in COMMANDS:
            self.assertEqual(completions(command, "--"), options_of(command), command)

    def test_every_option_with_a_value_awaits_one(self):
        for command in COMMANDS:
            for line in help_of(command).splitlines():
                match = re.match(r"  (--[a-z-]+) [A-Z]+\b(?!xcludes)", line)
                if match:
                    offered = completions(command, match.group(1), "--")
                    self.assertFalse(offered & options_of(command), (command, line))

    def test_values(self):
        self.assertEqual(completions("list", "--state", ""),
                         {"disabled", "expired", "used_up", "not_yet", "live"})
        self.assertEqual(completions("list", "--sort", "expire_"), {"expire_at", "expire_times"})
        self.assertEqual(completions("import", "--on-conflict", ""), {"fail", "skip", "replace"})
        self.assertEqual(completions("create", "--protect", "p"), {"password"})
        self.assertEqual(completions("edit", "--redirect", "u"), {"url_param"})
        self.assertIn("alice", completions("create", "--owner", "al"))
        self.assertIn("friends", completions("create", "--groups", "fr"))
        self.assertEqual(completions("backup", "sha"), {"share"})
        self.assertEqual(completions("create", "--app-file", "et"), {"etc"})

    def test_values_are_those_that_the_program_takes(self):
        for option, command in (("--state", ["list"]), ("--sort", ["list"])):
            for value in completions(*command, option, ""):
                done = subprocess.run([PROGRAM, *command, option, value], stdout=subprocess.PIPE)
                self.assertEqual(done.returncode, 0, value)

    def test_names_of_files_are_offered_as_they_are(self):
        names = {"odd *", "odd a b", "odd $(id)", "odd ?dd", "odd [a]"}
        os.makedirs("/tmp/odd")
        for name in names:
            open(os.path.join("/tmp/odd", name), "w").close()
        self.assertEqual(completions("backup", "/tmp/odd/"), {"/tmp/odd/" + name for name in names})

    def test_links_are_not_offered(self):
        subprocess.run([PROGRAM, "create", "--project", "x", "--hash", "zzz-secret"], check=True,
                       stdout=subprocess.DEVNULL)
        for command in "show", "edit", "delete", "enable", "sessions":
            self.assertEqual(completions(command, "z"), set())

    def test_in_an_interactive_shell(self):
        pid, master = pty.fork()
        if pid == 0:
            os.environ["PATH"] = "/usr/tuvo/bin:" + os.environ["PATH"]
            os.environ["TERM"] = "dumb"
            os.execv("/bin/bash", ["bash", "--norc", "-i"])
        seen = b""
        os.write(master, b"source " + COMPLETION.encode() + b"; echo rea''dy\n")
        end = time.monotonic() + 120
        typed = False
        while b"--dry-run" not in seen and time.monotonic() < end:
            if select.select([master], [], [], 0.2)[0]:
                seen += os.read(master, 65536)
            if b"ready" in seen and not typed:
                typed = True
                os.write(master, b"tuvosharing pur\t--dr\t")
        os.write(master, b"\x15exit\n")
        os.close(master)
        os.waitpid(pid, 0)
        self.assertIn(b"tuvosharing purge --dry-run", seen)


def main():
    vs.install(sys.argv[1], sys.argv[2])
    # Of a build with sanitizers: the leak check cannot look into a process of mixed ids.
    os.environ.setdefault("ASAN_OPTIONS", "detect_leaks=0")
    return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
