"""The administrator's command as the tests of it run it: the installed program, as root and as
others, at a terminal and without one."""

import fcntl
import json
import os
import pty
import select
import sqlite3
import struct
import subprocess
import sys
import termios
import time
import unittest

import visitor_server as vs
from visitor_server import DATABASE, SYSTEM, sql

PROGRAM = "/usr/tuvo/bin/tuvosharing"
FOLDER = os.path.dirname(DATABASE)
NOBODY = 65534
DONE, FAILED, USAGE, DAMAGE, NO_SUCH_LINK, TAKEN, NOT_ALLOWED, BUSY = range(8)
LINK_MEMBERS = {"id", "hash", "project_name", "owner_user", "owner_uid", "state", "enabled",
                "start_at", "expire_at", "expire_times", "use_count", "auto_gc", "enable_match_ip",
                "protect_type", "protect_title", "protect_users", "protect_groups", "redirect_type",
                "redirect_uri", "app"}
COLUMNS = ("hash, project_name, enabled, owner_uid, start_at, expire_at, expire_times, use_count, "
           "auto_gc, data")
WAITING = 120  # seconds, for a program at a terminal


def run(*arguments, text="", uid=0, gid=None, **options):
    """Runs the command; what it prints is text."""
    ids = {} if uid == 0 else {"user": uid, "group": uid if gid is None else gid,
                               "extra_groups": []}
    return subprocess.run([PROGRAM, *arguments], input=text, stdout=subprocess.PIPE,
                          stderr=subprocess.PIPE, encoding="utf-8", timeout=300, **ids, **options)


def create(*arguments, **options):
    """Makes a link of the project "album" unless told otherwise; its hash."""
    if "--project" not in arguments:
        arguments = ("--project", "album", *arguments)
    done = run("create", "--quiet", *arguments, **options)
    assert done.returncode == DONE, done.stderr
    return done.stdout.strip()


def show(link, *arguments):
    done = run("show", "--json", *arguments, "--", link)
    assert done.returncode == DONE, done.stderr
    return json.loads(done.stdout)


def data_of(link):
    return json.loads(sql("SELECT data FROM entry WHERE hash=?", link)[0][0])


class Terminal:
    """The command at a terminal of its own."""

    def __init__(self, *arguments, width=80, uid=0, before=None):
        self.seen = b""
        self.pid, self.master = pty.fork()
        if self.pid == 0:
            if before:
                before()
            if uid != 0:
                os.setgroups([])
                os.setgid(uid)
                os.setuid(uid)
            os.execv(PROGRAM, [PROGRAM, *arguments])
        fcntl.ioctl(self.master, termios.TIOCSWINSZ, struct.pack("HHHH", 24, width, 0, 0))

    def expect(self, text):
        """Reads until `text` was printed behind what was expected before."""
        end = time.monotonic() + WAITING
        while text not in self.seen:
            if not self._read(end):
                raise AssertionError(f"no {text!r} in {self.seen!r}")
        self.seen = self.seen.split(text, 1)[1]

    def echoes(self):
        return bool(termios.tcgetattr(self.master)[3] & termios.ECHO)

    def wait_for(self, condition):
        end = time.monotonic() + WAITING
        while not condition():
            if time.monotonic() > end:
                raise AssertionError("waited in vain")
            time.sleep(0.02)

    def type(self, text):
        os.write(self.master, text)

    def end(self):
        """Reads to the end; the exit status (negative: a signal)."""
        return os.waitstatus_to_exitcode(self.end_status())

    def end_status(self):
        """Reads to the end; the status as the system has it."""
        end = time.monotonic() + WAITING
        while self._read(end):
            pass
        _, status = os.waitpid(self.pid, 0)
        os.close(self.master)
        return status

    def _read(self, end):
        ready, _, _ = select.select([self.master], [], [], max(0, end - time.monotonic()))
        if not ready:
            return False
        try:
            piece = os.read(self.master, 65536)
        except OSError:  # the other end is closed
            return False
        self.seen += piece
        return bool(piece)


def end_by_signal(number, shown, *arguments, take_back):
    """The status of a command that is sent the signal once it has shown that, at a terminal. It may be
    through before the signal comes: what it did is taken back then, and it is tried again."""
    status = DONE
    for _ in range(20):
        terminal = Terminal(*arguments)
        terminal.expect(shown)
        os.kill(terminal.pid, number)
        status = terminal.end()
        if status != DONE:
            break
        take_back()
    return status


class CliTest(unittest.TestCase):
    def setUp(self):
        if os.path.exists(DATABASE):
            for table in "entry", "session", "token":
                sql("DELETE FROM " + table)

    def assert_fails(self, done, status, *texts):
        """One line on standard error, and nothing else."""
        self.assertEqual(done.returncode, status, done.stderr)
        self.assertRegex(done.stderr, r"\Atuvosharing: [^\n]+\n\Z")
        for text in texts:
            self.assertIn(text, done.stderr)
        self.assertEqual(done.stdout, "")


def show_password_works(link, password):
    """Whether a visitor gets in with it."""
    reply = vs.run_program("POST", "/" + link, ("password=" + password.replace(" ", "+")
                                               .replace("\n", "%0A")).encode(), uid=SYSTEM)
    return reply.status == 303


def numbers_begin_anew():
    """Behind rows of large numbers new ones would have larger ones still."""
    for table in "entry", "session", "token":
        sql("DELETE FROM " + table)
    sql("DELETE FROM sqlite_sequence")


def many_links(count, app=None):
    """Puts links into the database behind the library's back."""
    data = json.dumps({"app": app or {}, "protect_type": "none", "private_data": {}})
    connection = sqlite3.connect(DATABASE, timeout=30)
    with connection:
        connection.executemany(
            "INSERT INTO entry VALUES (NULL, ?, 'many', 1, 2001, 0, 0, 0, 0, 1, ?)",
            ((f"many{number}", data) for number in range(count)))
    connection.close()


def main():
    """Runs the tests of the script that was started. Its arguments: the build folder, the project's
    folder."""
    vs.install(sys.argv[1], sys.argv[2])
    # Of a build with sanitizers: the leak check cannot look into a process of mixed ids.
    os.environ.setdefault("ASAN_OPTIONS", "detect_leaks=0")
    with open("/usr/tuvo/etc/tuvosharing.conf", "w") as file:
        file.write("external_address = https://files.example\nshare_folder = /srv/shares\n")
    # The namespace's own: what is made below is not the machine's.
    subprocess.run(["mount", "-t", "tmpfs", "-o", "mode=0755", "none", "/srv"], check=True)
    run("list")  # makes the database
    done = unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)
    sys.exit(0 if done.result.wasSuccessful() else 1)
