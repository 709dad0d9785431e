"""The administrator's command end to end: the installed program, as root and as others, at a
terminal and without one. Arguments: the build folder, the project's folder."""

import fcntl
import json
import os
import pty
import re
import select
import signal
import sqlite3
import stat
import struct
import subprocess
import sys
import termios
import time
import unittest

import visitor_server as vs
from visitor_server import DATABASE, SYSTEM, SystemLog, sql

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
TIOCGPTPEER = 0x5441  # which the module does not know
WAITING = 30  # seconds, for a program at a terminal


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

    def __init__(self, *arguments, width=80):
        self.seen = b""
        self.pid, self.master = pty.fork()
        if self.pid == 0:
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
        end = time.monotonic() + WAITING
        while self._read(end):
            pass
        _, status = os.waitpid(self.pid, 0)
        os.close(self.master)
        return os.waitstatus_to_exitcode(status)

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


class Identity(CliTest):
    def test_root_leaves_nothing_of_its_own_beside_the_database(self):
        create()
        holder = sqlite3.connect(DATABASE)  # keeps the companions in place
        try:
            holder.execute("SELECT * FROM entry").fetchall()
            create()
            self.assertEqual(run("list").returncode, DONE)
            self.assertEqual(run("backup", "--force", "/tmp/identity.db").returncode, DONE)
            for name in os.listdir(FOLDER):
                st = os.stat(os.path.join(FOLDER, name))
                self.assertEqual((name, st.st_uid, st.st_gid), (name, SYSTEM, SYSTEM))
        finally:
            holder.close()

    def test_the_system_account_may_do_everything(self):
        link = create("--owner", "alice", uid=SYSTEM)
        self.assertEqual(run("edit", link, "--title", "x", uid=SYSTEM).returncode, DONE)
        self.assertEqual(run("list", uid=SYSTEM).returncode, DONE)
        self.assertEqual(run("delete", "--yes", link, uid=SYSTEM).returncode, DONE)

    def test_others_are_refused(self):
        create()
        for uid, gid in (NOBODY, NOBODY), (2003, 2003), (SYSTEM, 2001), (2001, SYSTEM):
            self.assert_fails(run("list", uid=uid, gid=gid), NOT_ALLOWED, "root")

    def test_a_set_user_id_bit_lets_nobody_in(self):
        program = "/usr/tuvo/bin/tuvosharing-suid"
        subprocess.run(["install", "-m", "4755", PROGRAM, program], check=True)
        done = subprocess.run([program, "list"], user=2001, group=2001, extra_groups=[],
                              stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        self.assertEqual((done.returncode, done.stdout), (NOT_ALLOWED, b""))
        os.unlink(program)

    def test_help_and_version_are_for_everybody(self):
        for arguments in ["--help"], ["create", "--help"], ["--version"]:
            done = run(*arguments, uid=NOBODY)
            self.assertEqual((done.returncode, done.stderr), (DONE, ""))
        self.assertRegex(run("--version").stdout, r"\Atuvosharing \d+\.\d+\.\d+\n\Z")


class Usage(CliTest):
    def test_what_cannot_be_understood_is_status_2(self):
        for arguments in ([], ["frobnicate"], ["list", "--frobnicate"], ["list", "--limit"],
                          ["list", "--limit", "x"], ["list", "--limit", "-1"],
                          ["list", "--sort", "data"], ["list", "--state", "gone"],
                          ["list", "--search", "x" * 65], ["list", "--owner", "nobody-here"],
                          ["show"], ["show", ""], ["show", "#x"], ["show", "#0"], ["show", "#-1"],
                          ["show", "--id", "99999999999"], ["show", "a", "b"], ["edit", "abc"],
                          ["edit", "abc", "abd", "--hash", "new"], ["unblock"],
                          ["unblock", "localhost"], ["backup"], ["import", "--on-conflict", "x"],
                          ["create", "--project", "x", "--enabled", "--disabled"],
                          ["create", "--project", "x", "--password", "--password-stdin"],
                          ["create", "--project", "x", "--project", "y"],
                          ["create", "--project", "x", "--enabled=false"],
                          ["create", "--project", "file", "--path", ""], ["backup", "-"],
                          ["list", "--json=no"], ["show", "abc", "--id="]):
            with self.subTest(arguments=arguments):
                self.assert_fails(run(*arguments), USAGE)

    def test_a_value_behind_a_sign_ends_with_its_word(self):
        links = [create("--title=a=b", "--app={}"), create()]
        self.assertEqual(show(links[0])["protect_title"], "a=b")
        self.assertEqual(run("edit", links[0], "--title=", "--disabled").returncode, DONE)
        shown = show(links[0])
        self.assertEqual((shown["protect_title"], shown["enabled"]), ("", False))
        self.assertEqual(run("edit", "--start=", links[1], "--title=t").returncode, DONE)
        self.assertEqual(show(links[1])["protect_title"], "t")
        self.assertEqual(show(links[0])["protect_title"], "")

    def test_an_empty_filter_is_a_slip_and_not_everybody(self):
        create("--expire", "+1s")
        time.sleep(2.1)
        for option in "--owner", "--project":
            self.assert_fails(run("purge", option, ""), USAGE, option)
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)

    def test_output_that_cannot_be_written_is_a_failure(self):
        create()
        for arguments in ["list"], ["list", "--json"], ["export"], ["--help"]:
            with open("/dev/full", "w") as full:
                done = subprocess.run([PROGRAM, *arguments], stdout=full, stderr=subprocess.PIPE)
            self.assertEqual(done.returncode, FAILED, arguments)

    def test_complaints_are_harmless_on_a_terminal(self):
        done = run("show", "\x1b[31m\u202e\nx")
        self.assert_fails(done, NO_SUCH_LINK, r"\x1b[31m\u202e\nx")


class Create(CliTest):
    def test_hash_and_address_are_printed(self):
        done = run("create", "--project", "album")
        link, url, rest = done.stdout.split("\n")
        self.assertRegex(link, r"\A[A-Za-z0-9]{9}\Z")
        self.assertEqual((url, rest), ("https://files.example/sharing/" + link, ""))
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))

    def test_json_is_the_link_with_its_address(self):
        done = run("create", "--json", "--project", "album", "--private-data", '{"secret":1}')
        link = json.loads(done.stdout)
        self.assertEqual(set(link), LINK_MEMBERS | {"url", "url_type"})
        self.assertEqual(link["url"], "https://files.example/sharing/" + link["hash"])
        self.assertNotIn("secret", done.stdout)

    def test_defaults(self):
        link = show(create())
        expected = {"project_name": "album", "owner_user": "root", "owner_uid": 0,
                    "enabled": True, "start_at": "", "expire_at": "", "expire_times": 0,
                    "use_count": 0, "auto_gc": True, "enable_match_ip": True,
                    "protect_type": "none", "protect_title": "", "protect_users": [],
                    "protect_groups": [], "redirect_type": "none", "redirect_uri": "", "app": {},
                    "state": "live"}
        self.assertEqual({name: link[name] for name in expected}, expected)

    def test_everything_that_a_link_can_hold(self):
        link = create("--owner", "alice", "--project", "pictures", "--hash", "My_hash-1",
                      "--start", "2030-01-02", "--expire", "2030-03-04 05:06", "--uses", "7",
                      "--use-count", "2", "--users", "alice,bob", "--users", "carol", "--groups",
                      "friends", "--title", "Größe \u65e5\u672c", "--no-match-ip", "--no-auto-gc",
                      "--disabled", "--redirect", "always", "--redirect-uri", "https://x.example/",
                      "--app", '{"a":["[x]","{}"]}', "--private-data", '{"b":1.5}')
        self.assertEqual(link, "My_hash-1")
        shown = show(link, "--private")
        expected = {"owner_user": "alice", "owner_uid": 2001, "project_name": "pictures",
                    "start_at": "2030-01-02 00:00:00", "expire_at": "2030-03-04 05:06:00",
                    "expire_times": 7, "use_count": 2, "protect_type": "user",
                    "protect_users": ["alice", "bob", "carol"], "protect_groups": ["friends"],
                    "protect_title": "Größe \u65e5\u672c", "enable_match_ip": False,
                    "auto_gc": False, "enabled": False, "state": "disabled",
                    "redirect_type": "always", "redirect_uri": "https://x.example/",
                    "app": {"a": ["[x]", "{}"]}, "private_data": {"b": 1.5}}
        self.assertEqual({name: shown[name] for name in expected}, expected)

    def test_faults_name_the_option(self):
        for arguments, option in ((["--uses", "-1"], "--uses"), (["--uses", "x"], "--uses"),
                                  (["--uses", "2147483648"], "--uses"),
                                  (["--start", "tomorrow"], "--start"),
                                  (["--expire", "2020-01-01"], "--expire"),
                                  (["--start", "+2d", "--expire", "+1d"], "--expire"),
                                  (["--hash", "a b"], "--hash"), (["--app", "[]"], "--app"),
                                  (["--app", '{"a":1,"a":2}'], "--app"),
                                  (["--users", "nobody-here"], "--users"),
                                  (["--protect", "user"], "--users"),
                                  (["--protect", "password"], "--password"),
                                  (["--redirect", "always"], "--redirect-uri"),
                                  (["--redirect-uri", "javascript:x"], "--redirect-uri"),
                                  (["--title", "a\nb"], "--title"),
                                  (["--owner", "nobody-here"], "--owner")):
            with self.subTest(arguments=arguments):
                done = run("create", "--project", "album", *arguments)
                self.assert_fails(done, USAGE, option + ": ")
        self.assert_fails(run("create"), USAGE, "--project: ")
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_a_taken_hash_is_status_5(self):
        create("--hash", "taken")
        self.assert_fails(run("create", "--project", "x", "--hash", "taken"), TAKEN, "--hash")

    def test_password_from_standard_input(self):
        link = create("--password-stdin", text="gravy 7\nnot this\n")
        self.assertEqual(show(link)["protect_type"], "password")
        self.assertEqual(show_password_works(link, "gravy 7"), True)
        self.assertEqual(show_password_works(link, "gravy 7\nnot this"), False)
        for text in "", "\n", "x" * 129, "x" * 5000:
            self.assert_fails(run("create", "--project", "x", "--password-stdin", text=text),
                              USAGE)

    def test_data_from_files_is_read_as_the_caller(self):
        os.makedirs("/tmp/roots", mode=0o700, exist_ok=True)
        with open("/tmp/roots/app.json", "w") as file:
            file.write('{"x": [1, {"y": null}]}\n')
        os.chmod("/tmp/roots/app.json", 0o600)
        link = create("--app-file", "/tmp/roots/app.json", "--private-data-file",
                      "/tmp/roots/app.json")
        self.assertEqual(show(link, "--private")["private_data"], {"x": [1, {"y": None}]})
        self.assertEqual(show(link)["app"], {"x": [1, {"y": None}]})
        self.assert_fails(run("create", "--project", "x", "--app-file", "/tmp/roots/app.json",
                              uid=SYSTEM), FAILED, "/tmp/roots/app.json")
        self.assert_fails(run("create", "--project", "x", "--app-file", "/nowhere"), FAILED)
        self.assert_fails(run("create", "--project", "x", "--app-file", "/dev/zero"), USAGE)

    def test_hostile_texts_come_back_as_they_were(self):
        for text in ("'; DROP TABLE entry; --", '"\\', "%_%", "\u202eabc", "\U0001f600" * 20,
                     "<script>", "a" * 255):
            link = create("--title", text)
            self.assertEqual(show(link)["protect_title"], text)
        for option in "--title", "--project":
            done = subprocess.run([PROGRAM, "create", "--project", "x", option, b"\xff\xfe"],
                                  stdout=subprocess.PIPE, stderr=subprocess.PIPE)
            self.assertEqual(done.returncode, USAGE)


def show_password_works(link, password):
    """Whether a visitor gets in with it."""
    reply = vs.run_program("POST", "/" + link, ("password=" + password.replace(" ", "+")
                                               .replace("\n", "%0A")).encode(), uid=SYSTEM)
    return reply.status == 303


class FileLinks(CliTest):
    @classmethod
    def setUpClass(cls):
        os.makedirs("/srv/shares/alice", exist_ok=True)
        for name, owner, mode in (("hers", 2001, 0o600), ("his", 2002, 0o600)):
            path = "/srv/shares/alice/" + name
            with open(path, "w") as file:
                file.write(name)
            os.chown(path, owner, owner)
            os.chmod(path, mode)
        if not os.path.lexists("/srv/shares/link"):
            os.symlink("/srv/shares/alice/hers", "/srv/shares/link")

    def test_the_resolved_path_is_stored(self):
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/link")
        self.assertEqual(show(link)["app"], {"path": "/srv/shares/alice/hers"})

    def test_a_relative_path_is_below_the_current_folder(self):
        link = create("--project", "file", "--owner", "alice", "--path", "hers",
                      cwd="/srv/shares/alice")
        self.assertEqual(show(link)["app"], {"path": "/srv/shares/alice/hers"})

    def test_files_that_the_owner_may_not_share_are_refused(self):
        for path in ("/srv/shares/alice/his", "/srv/shares/alice", "/srv/shares/none",
                     "/etc/passwd"):
            done = run("create", "--project", "file", "--owner", "alice", "--path", path)
            self.assert_fails(done, NOT_ALLOWED, "--path")
        self.assert_fails(run("create", "--project", "file", "--owner", "alice"), USAGE, "--app")

    def test_another_path_leaves_the_rest_of_the_data(self):
        link = create("--project", "file", "--owner", "alice", "--app",
                      '{"note": "n"}', "--path", "/srv/shares/alice/hers")
        self.assertEqual(run("edit", link, "--path", "/srv/shares/link").returncode, DONE)
        self.assertEqual(show(link)["app"], {"note": "n", "path": "/srv/shares/alice/hers"})
        done = run("edit", link, "--path", "/srv/shares/alice/his")
        self.assert_fails(done, NOT_ALLOWED, link, "--path")
        self.assertEqual(show(link)["app"]["path"], "/srv/shares/alice/hers")

    def test_data_that_grows_by_its_path_stays_below_the_most(self):
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/alice/hers")
        data = data_of(link)
        data["app"] = {"note": "n" * 65500, "path": "/"}
        sql("UPDATE entry SET data=? WHERE hash=?", json.dumps(data), link)
        done = run("edit", link, "--path", "/srv/shares/alice/hers")
        self.assert_fails(done, USAGE, "64 KiB")
        self.assertEqual(data_of(link), data)

    def test_another_owner_must_be_able_to_read_the_file(self):
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/alice/hers")
        self.assert_fails(run("edit", link, "--owner", "bob"), NOT_ALLOWED)


class Terminals(CliTest):
    def test_the_password_is_asked_for_twice_and_not_shown(self):
        terminal = Terminal("create", "--project", "album", "--password", "--hash", "asked")
        terminal.expect(b"Password: ")
        self.assertFalse(terminal.echoes())
        terminal.type(b"open sesame\n")
        terminal.expect(b"The same again: ")
        terminal.type(b"open sesame\n")
        terminal.expect(b"asked")
        self.assertEqual(terminal.end(), DONE)
        self.assertNotIn(b"sesame", terminal.seen)
        self.assertTrue(show_password_works("asked", "open sesame"))

    def test_two_different_passwords_are_none(self):
        terminal = Terminal("create", "--project", "album", "--password")
        terminal.expect(b"Password: ")
        terminal.type(b"one\n")
        terminal.expect(b"again: ")
        terminal.type(b"two\n")
        terminal.expect(b"not the same")
        self.assertEqual(terminal.end(), USAGE)
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_an_interrupted_question_gives_the_echo_back(self):
        terminal = Terminal("create", "--project", "album", "--password")
        terminal.expect(b"Password: ")
        self.assertFalse(terminal.echoes())
        # The shell's end, without which the terminal's settings go with the program.
        shell = fcntl.ioctl(terminal.master, TIOCGPTPEER, os.O_RDWR | os.O_NOCTTY)
        os.kill(terminal.pid, signal.SIGTERM)
        terminal.wait_for(terminal.echoes)
        os.close(shell)
        self.assertEqual(terminal.end(), -signal.SIGTERM)

    def test_without_a_terminal_there_is_nobody_to_ask(self):
        self.assert_fails(run("create", "--project", "x", "--password"), USAGE, "--password-stdin")

    def test_a_password_is_not_read_from_a_terminal_that_shows_it(self):
        terminal = Terminal("create", "--project", "album", "--password-stdin")
        terminal.expect(b"--password-stdin: ")
        self.assertEqual(terminal.end(), USAGE)

    def test_deletion_asks_first(self):
        link = create()
        terminal = Terminal("delete", link)
        terminal.expect(b"Delete the link " + link.encode())
        terminal.type(b"n\n")
        self.assertEqual(terminal.end(), FAILED)
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)
        terminal = Terminal("delete", link)
        terminal.expect(b"[y/N]")
        terminal.type(b"y\n")
        self.assertEqual(terminal.end(), DONE)
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_deletion_without_a_terminal_needs_yes(self):
        link = create()
        self.assert_fails(run("delete", link, text="y\n"), USAGE, "--yes")
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)

    def test_the_table_fits_the_terminal(self):
        create("--title", "wide \u65e5\u672c\u8a9e " + "x" * 200, "--owner", "alice")
        for width in 80, 120:
            terminal = Terminal("list", width=width)
            self.assertEqual(terminal.end(), DONE)
            lines = terminal.seen.decode().split("\r\n")
            self.assertIn("\u2026", lines[1])
            for line in lines:
                wide = sum(1 for character in line if character in "\u65e5\u672c\u8a9e")
                self.assertLessEqual(len(line) + wide, width)
        self.assertIn("x" * 200, run("list").stdout)

    def test_progress_is_shown_on_a_terminal_alone(self):
        many_links(3000)
        terminal = Terminal("export", "/tmp/progress.jsonl")
        terminal.expect(b"exported: ")
        terminal.expect(b"\r\x1b[K")
        self.assertEqual(terminal.end(), DONE)
        sql("DELETE FROM entry")
        terminal = Terminal("import", "/tmp/progress.jsonl")
        terminal.expect(b"imported: ")
        terminal.expect(b"of 3000")
        self.assertEqual(terminal.end(), DONE)
        sql("UPDATE entry SET expire_at = 1000")
        terminal = Terminal("purge")
        terminal.expect(b"removed: ")
        self.assertEqual(terminal.end(), DONE)
        many_links(10000)
        terminal = Terminal("backup", "/tmp/progress.db")
        terminal.expect(b"pages copied: ")
        self.assertEqual(terminal.end(), DONE)
        sql("DELETE FROM entry")
        done = run("import", "/tmp/progress.jsonl")
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))

    def test_an_export_is_not_shown_by_mistake(self):
        create()
        terminal = Terminal("export")
        terminal.expect(b"name a file")
        self.assertEqual(terminal.end(), USAGE)
        terminal = Terminal("export", "-")
        terminal.expect(b'"format"')
        self.assertEqual(terminal.end(), DONE)


def numbers_begin_anew():
    """Behind rows of large numbers new ones would have larger ones still."""
    for table in "entry", "session", "token":
        sql("DELETE FROM " + table)
    sql("DELETE FROM sqlite_sequence")


def many_links(count):
    """Puts links into the database behind the library's back."""
    data = json.dumps({"app": {}, "protect_type": "none", "private_data": {}})
    connection = sqlite3.connect(DATABASE, timeout=30)
    with connection:
        connection.executemany(
            "INSERT INTO entry VALUES (NULL, ?, 'many', 1, 2001, 0, 0, 0, 0, 1, ?)",
            ((f"many{number}", data) for number in range(count)))
    connection.close()


class Edit(CliTest):
    def test_what_is_not_told_stays(self):
        link = create("--owner", "bob", "--uses", "3", "--users", "alice", "--title", "t",
                      "--private-data", '{"p":1}')
        before = show(link, "--private")
        self.assertEqual(run("edit", link, "--title", "new").returncode, DONE)
        self.assertEqual(show(link, "--private"), dict(before, protect_title="new"))

    def test_links_by_hash_by_number_and_by_option(self):
        links = [create() for _ in range(3)]
        ids = [show(link)["id"] for link in links]
        done = run("edit", links[0], f"#{ids[1]}", "--id", str(ids[2]), "--title", "all")
        self.assertEqual((done.returncode, done.stdout, done.stderr), (DONE, "", ""))
        self.assertEqual([show(link)["protect_title"] for link in links], ["all"] * 3)

    def test_a_hash_that_begins_with_a_dash(self):
        create("--hash", "-abc")
        self.assertEqual(run("edit", "--title", "x", "--", "-abc").returncode, DONE)
        self.assertEqual(show("-abc")["protect_title"], "x")

    def test_of_several_links_those_are_changed_that_can_be(self):
        links = [create(), create()]
        done = run("edit", links[0], "gone", links[1], "--title", "x")
        self.assertEqual(done.returncode, NO_SUCH_LINK)
        self.assertEqual(done.stderr, "tuvosharing: gone: there is no such link\n")
        self.assertEqual([show(link)["protect_title"] for link in links], ["x", "x"])

    def test_json(self):
        links = [create(), create()]
        changed = json.loads(run("edit", *links, "--title", "x", "--json").stdout)["links"]
        self.assertEqual([link["hash"] for link in changed], links)
        self.assertEqual(set(changed[0]), LINK_MEMBERS | {"url", "url_type"})

    def test_another_hash(self):
        link = create()
        create("--hash", "other")
        self.assert_fails(run("edit", link, "--hash", "other"), TAKEN, "--hash")
        self.assertEqual(run("edit", link, "--hash", "fresh").returncode, DONE)
        self.assert_fails(run("show", link), NO_SUCH_LINK)
        self.assertEqual(run("show", "fresh").returncode, DONE)

    def test_no_password_forgets_it(self):
        link = create("--password-stdin", text="secret")
        self.assertEqual(run("edit", link, "--no-password").returncode, DONE)
        self.assertEqual(show(link)["protect_type"], "none")
        self.assertEqual(data_of(link)["protect_password"], "")
        for_accounts = create("--users", "alice")
        self.assertEqual(run("edit", for_accounts, "--no-password").returncode, DONE)
        self.assertEqual(show(for_accounts)["protect_type"], "user")

    def test_lists_can_be_emptied(self):
        link = create("--users", "alice,bob", "--groups", "friends")
        self.assertEqual(run("edit", link, "--users", "").returncode, DONE)
        self.assertEqual(show(link)["protect_users"], [])
        self.assert_fails(run("edit", link, "--groups", ""), USAGE)

    def test_enable_and_disable(self):
        links = [create(), create()]
        self.assertEqual(run("disable", *links).returncode, DONE)
        self.assertEqual([show(link)["state"] for link in links], ["disabled"] * 2)
        self.assertEqual(run("enable", links[0]).returncode, DONE)
        self.assertEqual([show(link)["enabled"] for link in links], [True, False])
        self.assert_fails(run("enable", "gone"), NO_SUCH_LINK)

    def test_nothing_is_lost_beside_others_who_write(self):
        link = create("--uses", "100000")
        counts = [f"UPDATE entry SET use_count = use_count + 1 WHERE hash = '{link}'"] * 200
        writer = subprocess.Popen([sys.executable, "-c",
                                   "import sqlite3,sys\n"
                                   f"c=sqlite3.connect({DATABASE!r},timeout=60,"
                                   "isolation_level=None)\n"
                                   "for s in sys.stdin.read().split(';'): c.execute(s)"],
                                  stdin=subprocess.PIPE)
        editors = []
        for options in (["--title", "t"], ["--expire", "2030-01-01"], ["--no-match-ip"],
                        ["--no-auto-gc"], ["--users", "alice"], ["--redirect-uri", "/x"]):
            editors.append(subprocess.Popen([PROGRAM, "edit", link, *options],
                                            stderr=subprocess.PIPE))
        writer.communicate(";".join(counts).encode())
        self.assertEqual([editor.wait() for editor in editors], [DONE] * len(editors))
        for editor in editors:
            editor.stderr.close()
        shown = show(link)
        self.assertEqual(shown["use_count"], 200)
        self.assertEqual((shown["protect_title"], shown["expire_at"], shown["enable_match_ip"],
                          shown["auto_gc"], shown["protect_users"], shown["redirect_uri"]),
                         ("t", "2030-01-01 23:59:59", False, False, ["alice"], "/x"))

    def test_a_lock_is_waited_for(self):
        link = create()
        holder = sqlite3.connect(DATABASE, isolation_level=None)
        holder.execute("BEGIN IMMEDIATE")
        process = subprocess.Popen([PROGRAM, "edit", link, "--title", "x"],
                                   stderr=subprocess.PIPE)
        time.sleep(0.5)
        self.assertIsNone(process.poll())
        time.sleep(5)
        self.assertIsNone(process.poll())
        holder.execute("ROLLBACK")
        holder.close()
        self.assertEqual((process.wait(), process.stderr.read()), (DONE, b""))
        process.stderr.close()

    def test_a_lock_that_stays_is_status_7(self):
        link = create()
        holder = sqlite3.connect(DATABASE, isolation_level=None)
        holder.execute("BEGIN IMMEDIATE")
        try:
            self.assert_fails(run("edit", link, "--title", "x"), BUSY, "try again")
        finally:
            holder.execute("ROLLBACK")
            holder.close()


class Delete(CliTest):
    def test_links_are_deleted_with_their_tokens(self):
        link = create()
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        self.assertEqual(len(sql("SELECT * FROM token")), 1)
        self.assertEqual(run("delete", "-y", link).returncode, DONE)
        self.assertEqual((sql("SELECT * FROM entry"), sql("SELECT * FROM token")), ([], []))

    def test_damaged_rows_are_deleted_by_their_numbers(self):
        link = create()
        good = show(link)["id"]
        sql("INSERT INTO entry VALUES (9101, 'bad', 'x', 1, 5, 0, 0, 0, 0, 1, 'no json')")
        self.assert_fails(run("delete", "--yes", "#9101"), NO_SUCH_LINK)
        self.assert_fails(run("delete", "--yes", "--damaged", "bad"), USAGE, "--damaged")
        self.assert_fails(run("delete", "--damaged", "#9101"), USAGE, "--yes")
        self.assert_fails(run("delete", "--yes", "--damaged", "#9102"), NO_SUCH_LINK)
        self.assert_fails(run("delete", "--yes", "--damaged", f"#{good}"), USAGE, "not damaged")
        self.assertEqual(run("delete", "--yes", "--damaged", "#9101").returncode, DONE)
        self.assertEqual(sql("SELECT hash FROM entry"), [(link,)])

    def test_a_link_that_is_named_twice_is_deleted_once(self):
        link = create()
        done = run("delete", "--yes", link, link, f"#{show(link)['id']}")
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))

    def test_rows_of_numbers_that_no_link_has(self):
        self.addCleanup(numbers_begin_anew)
        insert = "INSERT INTO entry VALUES (?, ?, 'x', 1, 5, 0, 0, 0, 0, 1, ?)"
        plain = json.dumps({"app": {}, "protect_type": "none"})
        for number in -5, 3000000000, 9223372036854775807:
            sql(insert, number, f"h{number}", plain)
        done = run("check", "--json")
        self.assertEqual([(item["subject"], item["reason"])
                          for item in json.loads(done.stdout)["findings"]],
                         [("entry #-5", "id"), ("entry #3000000000", "id"),
                          ("entry #9223372036854775807", "id")])
        done = run("export")
        self.assertEqual(done.returncode, DONE)
        self.assertEqual([json.loads(line).get("hash") for line in done.stdout.splitlines()[1:-1]],
                         ["h-5", "h3000000000", "h9223372036854775807"])
        done = run("delete", "--yes", "--damaged", "#3000000000", "#-5", "#9223372036854775807",
                   "#-5")
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_nothing_is_deleted_when_one_is_missing(self):
        link = create()
        self.assert_fails(run("delete", "--yes", link, "gone"), NO_SUCH_LINK, "gone: ")
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)


class List(CliTest):
    def test_json_has_one_schema(self):
        create()
        done = json.loads(run("list", "--json").stdout)
        self.assertEqual(set(done), {"total", "offset", "links"})
        self.assertEqual(set(done["links"][0]), LINK_MEMBERS)
        self.assertEqual(json.loads(run("list", "--json", "--project", "none").stdout),
                         {"total": 0, "offset": 0, "links": []})

    def test_filters(self):
        alices = create("--owner", "alice", "--title", "Tea 100%")
        bobs = create("--owner", "bob", "--project", "pictures", "--disabled")
        late = create("--start", "+1d")

        def listed(*arguments):
            done = run("list", "--json", *arguments)
            return [link["hash"] for link in json.loads(done.stdout)["links"]]
        self.assertEqual(listed(), [alices, bobs, late])
        self.assertEqual(listed("--owner", "alice"), [alices])
        self.assertEqual(listed("--owner", "2002"), [bobs])
        self.assertEqual(listed("--project", "pictures"), [bobs])
        self.assertEqual(listed("--state", "not_yet"), [late])
        self.assertEqual(listed("--state", "disabled"), [bobs])
        self.assertEqual(listed("--search", "100%"), [alices])
        self.assertEqual(listed("--search", "'"), [])
        self.assertEqual(listed("--reverse"), [late, bobs, alices])
        self.assertEqual(listed("--sort", "project_name", "--limit", "1", "--reverse"), [bobs])
        self.assertEqual(listed("--offset", "1", "--limit", "1"), [bobs])
        self.assertEqual(listed("--offset", "5"), [])

    def test_all_links_are_listed_however_many(self):
        many_links(2500)
        done = json.loads(run("list", "--json").stdout)
        self.assertEqual((done["total"], len({link["id"] for link in done["links"]})),
                         (2500, 2500))
        self.assertEqual(len(run("list").stdout.splitlines()), 2501)
        done = json.loads(run("list", "--json", "--offset", "500", "--limit", "1500").stdout)
        self.assertEqual(len(done["links"]), 1500)

    def test_the_table_is_harmless(self):
        link = create("--title", "x")
        data = data_of(link)
        data["protect_title"] = "\x1b]0;t\x07\x9b1m\n\u202e"
        sql("UPDATE entry SET data=?, project_name=? WHERE hash=?", json.dumps(data), "p\x1bq",
            link)
        for arguments in ["list"], ["show", link], ["list", "--json"], ["show", "--json", link]:
            text = run(*arguments).stdout
            self.assertNotRegex(text, "[\x00-\x09\x0b-\x1f\x7f-\x9f\u202e]")
        self.assertIn(r"\x1b]0;t\x07\x9b1m\n\u202e", run("list").stdout)
        self.assertEqual(show(link)["protect_title"], data["protect_title"])

    def test_rows_that_are_no_utf8_are_shown_with_replacements(self):
        link = create()
        sql("UPDATE entry SET project_name=CAST(x'61ff62' AS TEXT) WHERE hash=?", link)
        self.assertIn("a\ufffdb", run("list").stdout)
        self.assertEqual(show(link)["project_name"], "a\ufffdb")


class Visitors(CliTest):
    def test_sessions_and_tokens_name_everything_but_the_identifier(self):
        link, other = create(), create()
        reply = vs.run_program("POST", "/" + link, uid=SYSTEM, REMOTE_ADDR="192.0.2.9")
        vs.run_program("POST", "/" + other, uid=SYSTEM, REMOTE_ADDR="192.0.2.10")
        session_id = reply.session_id()
        self.assertTrue(session_id)
        row = show(link)["id"]
        sessions = json.loads(run("sessions", "--json").stdout)
        self.assertEqual((sessions["total"], len(sessions["sessions"])), (2, 2))
        done = run("sessions", link, "--json")
        sessions = json.loads(done.stdout)["sessions"]
        self.assertEqual([session["ip"] for session in sessions], ["192.0.2.9"])
        self.assertEqual(set(sessions[0]), {"id", "ip", "user", "expires_at"})
        tokens = json.loads(run("tokens", f"#{row}", "--json").stdout)["tokens"]
        self.assertEqual([(token["hash"], token["link"], token["ip"]) for token in tokens],
                         [(link, row, "192.0.2.9")])
        self.assertEqual(set(tokens[0]),
                         {"id", "link", "hash", "session", "ip", "user", "expires_at"})
        for arguments in (["sessions"], ["tokens"], ["sessions", "--json"], ["tokens", "--json"],
                          ["sessions", link], ["tokens", link]):
            done = run(*arguments)
            self.assertEqual(done.returncode, DONE)
            self.assertIn("192.0.2.9", done.stdout)
            self.assertNotIn(session_id, done.stdout)

    def test_the_expired_are_out(self):
        link = create()
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        sql("UPDATE token SET timeout = 1000")
        sql("UPDATE session SET timeout = 1000")
        for command in "sessions", "tokens":
            self.assertEqual(json.loads(run(command, "--json").stdout)["total"], 0)
        self.assert_fails(run("sessions", "gone"), NO_SUCH_LINK)

    def test_admission_ends_with_the_session(self):
        link = create()
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        self.assertEqual(json.loads(run("tokens", "--json").stdout)["total"], 1)
        sql("UPDATE session SET timeout = 1000")
        self.assertEqual(json.loads(run("tokens", "--json").stdout)["total"], 0)

    def test_sessions_of_any_number_are_listed(self):
        self.addCleanup(numbers_begin_anew)
        create()
        for number in -5, 7, 3000000000:
            sql("INSERT INTO session VALUES (?, ?, 5, '192.0.2.1', 4000000000)", number,
                f"s{number}")
        sessions = json.loads(run("sessions", "--json").stdout)["sessions"]
        self.assertEqual([session["id"] for session in sessions], [-5, 7, 3000000000])
        findings = json.loads(run("check", "--json").stdout)["findings"]
        subjects = [item["subject"] for item in findings]
        self.assertEqual(subjects, ["session #-5", "session #3000000000"])


class Purge(CliTest):
    def make_ended(self):
        """Two ended links and a live one; an expired session with a token."""
        links = [create("--owner", "alice"), create("--owner", "bob", "--project", "pictures"),
                 create()]
        sql("UPDATE entry SET expire_at = 1000, auto_gc = 0 WHERE hash = ?", links[0])
        sql("UPDATE entry SET expire_times = 2, use_count = 2 WHERE hash = ?", links[1])
        vs.run_program("POST", "/" + links[2], uid=SYSTEM)
        sql("UPDATE session SET timeout = 1000")
        sql("UPDATE token SET timeout = 1000")
        return links

    def test_ended_links_go_and_live_ones_stay(self):
        links = self.make_ended()
        done = run("purge")
        self.assertEqual((done.returncode, done.stdout), (DONE, "removed 2 links\n"))
        self.assertEqual(sql("SELECT hash FROM entry"), [(links[2],)])
        self.assertEqual(len(sql("SELECT * FROM session")), 1)

    def test_by_owner_and_project(self):
        self.make_ended()
        self.assertEqual(json.loads(run("purge", "--owner", "carol", "--json").stdout)["links"], 0)
        self.assertEqual(json.loads(run("purge", "--owner", "bob", "--project", "album",
                                        "--json").stdout)["links"], 0)
        self.assertEqual(json.loads(run("purge", "--owner", "bob", "--project", "pictures",
                                        "--json").stdout)["links"], 1)
        self.assertEqual(json.loads(run("purge", "--project", "album", "--json").stdout)["links"],
                         1)

    def test_all_kinds(self):
        self.make_ended()
        counts = json.loads(run("purge", "--all-kinds", "--dry-run", "--json").stdout)
        self.assertEqual(counts, {"links": 2, "sessions": 1, "tokens": 1, "dry_run": True})
        self.assertEqual(len(sql("SELECT * FROM entry")), 3)
        counts = json.loads(run("purge", "--all-kinds", "--json").stdout)
        self.assertEqual(counts, {"links": 2, "sessions": 1, "tokens": 1, "dry_run": False})
        self.assertEqual((sql("SELECT * FROM session"), sql("SELECT * FROM token")), ([], []))

    def test_more_than_a_piece(self):
        create()
        many_links(1700)
        sql("UPDATE entry SET expire_at = 1000 WHERE project_name = 'many'")
        self.assertEqual(run("purge").stdout, "removed 1700 links\n")
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)

    def test_writers_come_in_between_the_pieces(self):
        link = create()
        many_links(30000)
        sql("UPDATE entry SET expire_at = 1000 WHERE project_name = 'many'")
        writer = sqlite3.connect(DATABASE, timeout=0, isolation_level=None)
        seen = set()
        process = subprocess.Popen([PROGRAM, "purge"], stdout=subprocess.PIPE)
        while process.poll() is None:
            try:
                writer.execute("BEGIN IMMEDIATE")
            except sqlite3.OperationalError:  # locked
                time.sleep(0.001)
                continue
            writer.execute("UPDATE entry SET use_count = use_count + 1 WHERE hash = ?", (link,))
            left = writer.execute("SELECT count(*) FROM entry").fetchone()[0] - 1
            writer.execute("COMMIT")
            seen.add(left)
            time.sleep(0.001)
        writer.close()
        self.assertEqual((process.wait(), process.stdout.read()), (DONE, b"removed 30000 links\n"))
        process.stdout.close()
        # What a writer sees between is whole pieces that have gone, and others that have not.
        between = [left for left in seen if 0 < left < 30000]
        self.assertGreater(len(between), 0)
        self.assertEqual([left for left in between if left % 500 != 0], [])


class Transfer(CliTest):
    FILE = "/tmp/links.jsonl"

    def setUp(self):
        super().setUp()
        if os.path.exists(self.FILE):
            os.unlink(self.FILE)

    def make_odd_links(self):
        """Links of every kind, and rows that other programs wrote."""
        create("--password-stdin", "--title", "Größe", "--private-data", '{"p":[1.0,-0.5,1e300]}',
               text="secret")
        create("--users", "alice,bob", "--groups", "friends", "--disabled")
        create("--uses", "5", "--use-count", "3", "--start", "+1d", "--expire", "+2d",
               "--no-auto-gc", "--no-match-ip")
        create("--redirect", "url_param", "--redirect-uri", "/x?y")
        plain = {"app": {"deep": [[[{}]]], "big": 18446744073709551615}, "private_data": {}}
        for name, data in (
                ("md5", dict(plain, protect_type="password", protect_password="0" * 32,
                             protect_password_algo="md5")),
                ("unresolved", dict(plain, protect_type="user", protect_uids=[77777],
                                    protect_extra_users=["gone"], protect_gids=[88888],
                                    protect_extra_groups=["none"])),
                ("unknown-member", dict(plain, protect_type="none", plugin="x"))):
            sql("INSERT INTO entry VALUES (NULL, ?, 'odd', 1, 77777, 0, 0, 0, 0, 1, ?)", name,
                "  " + json.dumps(data, indent=1))
        text = json.dumps(dict(plain, protect_type="none"))
        sql("INSERT INTO entry VALUES (NULL, 'nulls', 'odd', NULL, 5, NULL, NULL, NULL, NULL, "
            "NULL, ?)", text)
        sql("INSERT INTO entry VALUES (NULL, 'texts', '012', '', '6', 'x', 1.5, '', -3, 'y', ?)",
            text)
        sql("INSERT INTO entry VALUES (NULL, 'bytes', CAST(x'ff61' AS TEXT), 1, 7, 0, 0, 0, 0, 1, "
            "CAST(? || x'20' AS TEXT))", text)
        sql("INSERT INTO entry VALUES (NULL, 'far', 'odd', 1, 4294967294, 0, 4102444800, 0, "
            "2147483647, 1, ?)", text)

    def rows(self):
        exact = ", ".join(f"typeof({column}), hex({column})" for column in COLUMNS.split(", "))
        return sql(f"SELECT {exact} FROM entry ORDER BY id")

    def test_the_round_trip_is_exact(self):
        self.make_odd_links()
        before = self.rows()
        done = run("export", self.FILE)
        self.assertEqual((done.returncode, done.stdout, done.stderr), (DONE, "", ""))
        sql("DELETE FROM entry")
        done = run("import", self.FILE)
        self.assertEqual((done.returncode, done.stdout),
                         (DONE, f"imported {len(before)} links, replaced 0, skipped 0\n"))
        self.assertEqual(self.rows(), before)

    def test_the_format(self):
        self.make_odd_links()
        lines = [json.loads(line) for line in run("export").stdout.splitlines()]
        self.assertEqual(lines[0], {"format": "tuvosharing links", "version": 1})
        self.assertEqual(lines[-1], {"links": len(lines) - 2})
        for line in lines[1:-1]:
            self.assertEqual(set(line), set(COLUMNS.split(", ")) | {"owner_user"})

    def test_a_filtered_export(self):
        create("--owner", "alice")
        create("--owner", "bob")
        lines = run("export", "-", "--owner", "alice").stdout.splitlines()
        self.assertEqual(len(lines), 3)

    def test_the_file_is_the_callers_alone(self):
        create()
        self.assertEqual(run("export", self.FILE).returncode, DONE)
        st = os.stat(self.FILE)
        self.assertEqual((st.st_uid, stat.S_IMODE(st.st_mode)), (0, 0o600))
        before = os.listdir("/tmp")
        with open(self.FILE) as file:
            content = file.read()
        create()
        self.assert_fails(run("export", self.FILE), TAKEN, "--force")
        with open(self.FILE) as file:
            self.assertEqual(file.read(), content)
        self.assertEqual(run("export", "--force", self.FILE).returncode, DONE)
        with open(self.FILE) as file:
            self.assertNotEqual(file.read(), content)
        self.assertEqual(sorted(os.listdir("/tmp")), sorted(before))
        self.assertNotEqual(run("export", "/nowhere/x").returncode, DONE)
        self.assert_fails(run("export", "--force", "/tmp"), USAGE)

    def test_a_symbolic_link_is_not_written_through(self):
        create()
        os.symlink("/tmp/victim", self.FILE)
        self.assert_fails(run("export", self.FILE), TAKEN)
        self.assertFalse(os.path.exists("/tmp/victim"))
        self.assert_fails(run("export", "--force", self.FILE), USAGE)
        self.assertFalse(os.path.exists("/tmp/victim"))
        os.unlink(self.FILE)

    def test_damaged_rows_are_left_out_and_told(self):
        create()
        sql("INSERT INTO entry VALUES (NULL, 'bad', 'x', 1, 5, 0, 0, 0, 0, 1, 'no json')")
        sql("INSERT INTO entry VALUES (NULL, 'zero', CAST(x'610062' AS TEXT), 1, 5, 0, 0, 0, 0, "
            "1, '{\"app\":{},\"protect_type\":\"none\"}')")
        done = run("export")
        self.assertEqual(done.returncode, DAMAGE)
        self.assertIn("2 damaged rows", done.stderr)
        self.assertEqual(json.loads(done.stdout.splitlines()[-1]), {"links": 1})
        # What one command leaves out the others know.
        rows = sql("SELECT id FROM entry WHERE hash IN ('bad', 'zero') ORDER BY id")
        findings = json.loads(run("check", "--json").stdout)["findings"]
        self.assertEqual([(item["subject"], item["reason"]) for item in findings],
                         [(f"entry #{rows[0][0]}", "data"), (f"entry #{rows[1][0]}",
                                                             "project_name")])
        self.assertEqual(run("delete", "--yes", "--damaged", *(f"#{row[0]}" for row in rows))
                         .returncode, DONE)
        self.assertEqual(run("export").returncode, DONE)

    def test_an_export_beside_writers_is_of_one_moment(self):
        # One is the first row and one the last, with many pieces between.
        create("--hash", "left")
        many_links(5000)
        create("--hash", "right")
        writer = subprocess.Popen([sys.executable, "-c", f"""
import sqlite3
c = sqlite3.connect({DATABASE!r}, timeout=60, isolation_level=None)
c.execute("PRAGMA synchronous = OFF")
print("ready", flush=True)
while True:
    c.execute("UPDATE entry SET use_count = use_count + 1 WHERE hash IN ('left', 'right')")
"""], stdout=subprocess.PIPE)
        try:
            writer.stdout.readline()
            counts = []
            for _ in range(3):
                lines = [json.loads(line) for line in run("export").stdout.splitlines()]
                self.assertEqual((lines[1]["hash"], lines[-2]["hash"]), ("left", "right"))
                self.assertEqual(lines[1]["use_count"], lines[-2]["use_count"])
                counts.append(lines[1]["use_count"])
            self.assertLess(counts[0], counts[2])
        finally:
            writer.kill()
            writer.wait()
            writer.stdout.close()

    def test_conflicts(self):
        link = create("--title", "old")
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        text = run("export").stdout
        self.assertEqual(run("edit", link, "--title", "new").returncode, DONE)
        free = create()
        more = run("export").stdout
        self.assertEqual(run("delete", "-y", free).returncode, DONE)
        self.assert_fails(run("import", text=more), TAKEN, "line 2")
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)
        counts = json.loads(run("import", "--on-conflict", "skip", "--json", text=more).stdout)
        self.assertEqual(counts, {"imported": 1, "replaced": 0, "skipped": 1, "dry_run": False})
        self.assertEqual(show(link)["protect_title"], "new")
        before = show(link)["id"]
        counts = json.loads(run("import", "--on-conflict", "replace", "--json", text=text).stdout)
        self.assertEqual(counts, {"imported": 0, "replaced": 1, "skipped": 0, "dry_run": False})
        self.assertEqual(show(link)["protect_title"], "old")
        self.assertNotEqual(show(link)["id"], before)
        self.assertEqual(sql("SELECT * FROM token"), [])

    def test_a_rehearsal_changes_nothing(self):
        link = create()
        text = run("export").stdout
        before = sql("SELECT * FROM entry")
        done = run("import", "--dry-run", "--on-conflict", "replace", text=text)
        self.assertEqual((done.returncode, done.stdout),
                         (DONE, "would import 0 links, replace 1, skip 0\n"))
        self.assertEqual(sql("SELECT * FROM entry"), before)
        self.assert_fails(run("import", "--dry-run", text=text), TAKEN, "line 2")
        self.assertEqual(show(link)["hash"], link)

    def test_a_damaged_file_changes_nothing(self):
        for _ in range(3):
            create()
        lines = run("export").stdout.splitlines()
        sql("DELETE FROM entry")
        link = json.loads(lines[2])
        row = json.dumps(link)

        def with_line(**members):
            return json.dumps(dict(link, **members))
        files = {
            "empty": ("", "line 1"),
            "another file": ("hello\n", "line 1"),
            "another version": ('{"format":"tuvosharing links","version":2}\n', "line 1"),
            "cut off": ("\n".join(lines[:3]) + "\n", "line 4"),
            "cut in a line": ("\n".join(lines)[:-60], "line"),
            "a line is missing": ("\n".join(lines[:2] + lines[3:]), "line 4"),
            "a line more": ("\n".join(lines + [row]), "line 6"),
            "no JSON": ("\n".join([lines[0], lines[1], "{", lines[3], lines[4]]), "line 3"),
            "a list": ("\n".join([lines[0], lines[1], "[]", lines[3], lines[4]]), "line 3"),
            "twice the same": ("\n".join([lines[0], row, row, lines[3], lines[4]]), "line 3"),
        }
        for name, bad in {
                "unknown member": with_line(x=1), "a boolean": with_line(enabled=True),
                "a fraction": with_line(start_at=1.5), "zero byte": with_line(hash="a\0b"),
                "no hash": with_line(hash=""), "no project": with_line(project_name=None),
                "no owner": with_line(owner_uid=4294967295), "data": with_line(data="{"),
                "data list": with_line(data="[]"), "hex": with_line(hash={"hex": "6"}),
                "not hex": with_line(hash={"hex": "zz"}),
                "missing": json.dumps({key: value for key, value in link.items()
                                       if key != "data"})}.items():
            files[name] = ("\n".join([lines[0], lines[1], bad, lines[3], lines[4]]), "line 3")
        for name, (text, place) in files.items():
            with self.subTest(file=name):
                self.assert_fails(run("import", text=text), USAGE, place)
                self.assertEqual(sql("SELECT * FROM entry"), [])
        self.assertEqual(run("import", text="\n".join(lines)).returncode, DONE)

    def test_an_import_beside_writers_is_whole(self):
        many_links(2000)
        text = run("export").stdout
        sql("DELETE FROM entry")
        other = create()
        writer = subprocess.Popen([sys.executable, "-c", f"""
import sqlite3, sys, time
c = sqlite3.connect({DATABASE!r}, timeout=60, isolation_level=None)
print("ready", flush=True)
for i in range(300):
    c.execute("UPDATE entry SET use_count = use_count + 1 WHERE hash = ?", ({other!r},))
    time.sleep(0.002)
"""], stdout=subprocess.PIPE)
        writer.stdout.readline()
        done = run("import", text=text)
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))
        self.assertEqual(writer.wait(), 0)
        writer.stdout.close()
        self.assertEqual(len(sql("SELECT * FROM entry")), 2001)
        self.assertEqual(show(other)["use_count"], 300)

    def test_an_interrupted_import_leaves_nothing(self):
        many_links(20000)
        self.assertEqual(run("export", self.FILE).returncode, DONE)
        sql("DELETE FROM entry")
        terminal = Terminal("import", self.FILE)
        terminal.expect(b"imported: ")
        terminal.expect(b"of 20000")
        os.kill(terminal.pid, signal.SIGINT)
        self.assertEqual(terminal.end(), -signal.SIGINT)
        self.assertEqual(sql("SELECT * FROM entry"), [])
        self.assertEqual(sql("PRAGMA integrity_check"), [("ok",)])

    def test_an_interrupted_export_leaves_no_file(self):
        create()
        many_links(60000)
        before = sorted(os.listdir("/tmp"))
        terminal = Terminal("export", self.FILE)
        terminal.expect(b"exported: ")
        os.kill(terminal.pid, signal.SIGTERM)
        self.assertEqual(terminal.end(), -signal.SIGTERM)
        self.assertEqual(sorted(os.listdir("/tmp")), before)


class Check(CliTest):
    def test_all_is_well(self):
        link = create()
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        sql("UPDATE session SET timeout = 1000")
        sql("UPDATE token SET timeout = 1000")
        done = run("check")
        self.assertEqual((done.returncode, done.stderr), (DONE, ""), done.stdout)
        self.assertEqual(json.loads(run("check", "--json").stdout),
                         {"ok": True, "schema_version": "2", "journal_mode": "wal",
                          "findings": []})

    def findings(self):
        done = run("check", "--json")
        self.assertEqual(done.returncode, DAMAGE, done.stderr)
        report = json.loads(done.stdout)
        self.assertFalse(report["ok"])
        plain = run("check")
        self.assertEqual(plain.returncode, DAMAGE)
        self.assertEqual(len(plain.stdout.splitlines()), len(report["findings"]))
        return [(item["kind"], item["subject"], item["reason"]) for item in report["findings"]]

    def test_damaged_rows_are_named_with_their_reason(self):
        insert = "INSERT INTO entry VALUES ({}, ?, ?, 1, ?, 0, 0, 0, 0, 1, ?)"
        plain = '{"app":{}}'
        rows = ((101, "", "p", 5, plain, "hash"), (102, "h2", "", 5, plain, "project_name"),
                (103, "h3", "p", 4294967295, plain, "owner_uid"), (104, "h4", "p", 5, "x", "data"),
                (105, "h5", "p", 5, "[]", "data"), (106, "h6", "p", 5, '{"app":1}', "data"),
                (107, "h7", "p", 5, '{"app":{},"protect_type":"password"}', "protection"),
                (108, "h8", "p", 5, '{"app":{},"protect_type":"user"}', "protection"))
        for row, link, project, owner, data, _ in rows:
            sql(insert.format(row), link, project, owner, data)
        sql("INSERT INTO session VALUES (201, '', 5, '192.0.2.1', 4000000000)")
        sql("INSERT INTO session VALUES (202, 'x', 5, '', 4000000000)")
        sql("INSERT INTO session VALUES (203, 'y', 5, '192.0.2.1', 'soon')")
        sql("INSERT INTO token VALUES (301, 105, 201, NULL)")
        self.assertEqual(self.findings(),
                         [("row", f"entry #{row[0]}", row[5]) for row in rows] +
                         [("row", "session #201", "session_id"), ("row", "session #202", "ip"),
                          ("row", "session #203", "timeout"), ("row", "token #301", "timeout")])

    def test_tokens_without_their_link(self):
        create()
        connection = sqlite3.connect(DATABASE)
        with connection:
            connection.execute("INSERT INTO token VALUES (401, 99999, 99998, 4000000000)")
        connection.close()
        self.assertEqual(sorted(self.findings()),
                         [("foreign_key", "token #401", "there is no such entry"),
                          ("foreign_key", "token #401", "there is no such session")])

    def test_another_version_and_journal(self):
        create()
        sql("PRAGMA user_version = 7")
        sql("PRAGMA journal_mode = DELETE")
        try:
            self.assertEqual([finding[0] for finding in self.findings()], ["schema", "journal"])
            # Looking has changed nothing.
            self.assertEqual(sql("PRAGMA journal_mode"), [("delete",)])
        finally:
            sql("PRAGMA user_version = 2")
            sql("PRAGMA journal_mode = WAL")

    def test_owners_and_modes(self):
        create()
        cases = ((DATABASE, 0, 0o660), (DATABASE, SYSTEM, 0o666), (FOLDER, SYSTEM, 0o777),
                 (os.path.dirname(FOLDER), 0, 0o777))
        for path, owner, mode in cases:
            st = os.stat(path)
            os.chown(path, owner, st.st_gid)
            os.chmod(path, mode)
            try:
                found = self.findings()
                self.assertTrue(all(finding[0] == "file" for finding in found), found)
                self.assertEqual(found[0][1], path)
            finally:
                os.chown(path, st.st_uid, st.st_gid)
                os.chmod(path, stat.S_IMODE(st.st_mode))

    def test_a_missing_database_is_found_missing_and_not_made(self):
        create()
        os.rename(DATABASE, DATABASE + ".away")
        try:
            self.assertEqual(self.findings(), [("file", DATABASE, "No such file or directory")])
            self.assertFalse(os.path.exists(DATABASE))
            self.assert_fails(run("backup", "/tmp/none.db"), FAILED)
            self.assertFalse(os.path.exists("/tmp/none.db"))
        finally:
            os.rename(DATABASE + ".away", DATABASE)

    def test_broken_pages_are_found(self):
        many_links(3000)
        sql("VACUUM")  # no free pages, whose content is nobody's
        sql("PRAGMA wal_checkpoint(TRUNCATE)")
        with open(DATABASE, "rb") as file:
            whole = file.read()
        middle = len(whole) // 2 // 4096 * 4096
        try:
            with open(DATABASE, "r+b") as file:
                file.seek(middle)
                file.write(b"\xa5" * 8192)
            self.assertIn("integrity", {finding[0] for finding in self.findings()})
            with open(DATABASE, "r+b") as file:
                file.write(b"no database at all")
            self.assertIn("integrity", {finding[0] for finding in self.findings()})
        finally:
            with open(DATABASE, "r+b") as file:
                file.write(whole)


class Backup(CliTest):
    FILE = "/tmp/backup.db"

    def setUp(self):
        super().setUp()
        if os.path.exists(self.FILE):
            os.unlink(self.FILE)

    def test_a_backup_is_complete_and_the_callers(self):
        create("--title", "kept")
        done = run("backup", self.FILE)
        self.assertEqual((done.returncode, done.stdout, done.stderr), (DONE, "", ""))
        st = os.stat(self.FILE)
        self.assertEqual((st.st_uid, stat.S_IMODE(st.st_mode)), (0, 0o600))
        connection = sqlite3.connect(self.FILE)
        self.assertEqual(connection.execute(f"SELECT {COLUMNS} FROM entry").fetchall(),
                         sql(f"SELECT {COLUMNS} FROM entry"))
        self.assertEqual(connection.execute("PRAGMA integrity_check").fetchall(), [("ok",)])
        self.assertEqual(connection.execute("PRAGMA user_version").fetchall(), [(2,)])
        connection.close()
        self.assertEqual([name for name in os.listdir(FOLDER) if "backup" in name], [])

    def test_a_file_is_replaced_only_when_told(self):
        create()
        with open(self.FILE, "w") as file:
            file.write("precious")
        self.assert_fails(run("backup", self.FILE), TAKEN, "--force")
        with open(self.FILE) as file:
            self.assertEqual(file.read(), "precious")
        self.assertEqual(run("backup", "--force", self.FILE).returncode, DONE)
        with open(self.FILE, "rb") as file:
            self.assertEqual(file.read(15), b"SQLite format 3")

    def test_a_backup_beside_writers_is_of_one_moment_and_restores(self):
        # Two links whose counts a writer keeps equal; others are made all the time, so that every
        # moment has another file.
        create("--hash", "left")
        create("--hash", "right")
        many_links(3000)
        writers = [subprocess.Popen([sys.executable, "-c", f"""
import sqlite3
c = sqlite3.connect({DATABASE!r}, timeout=60, isolation_level=None)
c.execute("PRAGMA synchronous = OFF")
print("ready", flush=True)
while True:
    c.execute("BEGIN IMMEDIATE")
    c.execute("UPDATE entry SET use_count = use_count + 1 WHERE hash = 'left'")
    c.execute("UPDATE entry SET data = data || ' ' WHERE id % 97 = {number}")
    c.execute("UPDATE entry SET use_count = use_count + 1 WHERE hash = 'right'")
    c.execute("COMMIT")
"""], stdout=subprocess.PIPE) for number in range(2)]
        try:
            for writer in writers:
                writer.stdout.readline()
            counts = []
            for _ in range(3):
                self.assertEqual(run("backup", "--force", self.FILE).returncode, DONE)
                connection = sqlite3.connect(self.FILE)
                left, right = (connection.execute("SELECT use_count FROM entry WHERE hash = ?",
                                                  (link,)).fetchone()[0]
                               for link in ("left", "right"))
                self.assertEqual(left, right)
                self.assertEqual(connection.execute("PRAGMA integrity_check").fetchall(),
                                 [("ok",)])
                connection.close()
                counts.append(left)
            self.assertLess(counts[0], counts[2])
        finally:
            for writer in writers:
                writer.kill()
                writer.wait()
                writer.stdout.close()
        # Restoring: nobody has the database open; the file goes back, without companions.
        for companion in "-wal", "-shm":
            if os.path.exists(DATABASE + companion):
                os.unlink(DATABASE + companion)
        subprocess.run(["install", "-m", "0660", "-o", "1", "-g", "1", self.FILE, DATABASE],
                       check=True)
        self.assertEqual(show("left")["use_count"], counts[2])
        self.assertEqual(run("check").returncode, DONE)

    def test_an_interrupted_backup_leaves_nothing(self):
        many_links(100)
        sql("UPDATE entry SET data = data || CAST(zeroblob(500000) AS TEXT)")  # 50 MB
        before = sorted(os.listdir("/tmp"))
        terminal = Terminal("backup", self.FILE)
        terminal.expect(b"pages copied: ")
        os.kill(terminal.pid, signal.SIGINT)
        self.assertEqual(terminal.end(), -signal.SIGINT)
        self.assertEqual(sorted(os.listdir("/tmp")), before)
        self.assertEqual([name for name in os.listdir(FOLDER) if "backup" in name], [])


    def test_the_database_in_use_is_not_replaced(self):
        link = create()
        holder = sqlite3.connect(DATABASE, isolation_level=None)
        os.symlink(FOLDER, "/tmp/way")
        try:
            holder.execute("SELECT * FROM entry").fetchall()
            before = [(name, os.stat(os.path.join(FOLDER, name)).st_ino)
                      for name in sorted(os.listdir(FOLDER))]
            for command in "backup", "export":
                for path in (DATABASE, DATABASE + "-wal", FOLDER + "/autoblock.db",
                             FOLDER + "/new", "/tmp/way/sharing.db"):
                    self.assert_fails(run(command, "--force", path), USAGE, "database in use")
                    self.assert_fails(run(command, path), USAGE, "database in use")
                self.assert_fails(run(command, "--force", "sharing.db", cwd=FOLDER), USAGE)
            self.assertEqual([(name, os.stat(os.path.join(FOLDER, name)).st_ino)
                              for name in sorted(os.listdir(FOLDER))], before)
            self.assertEqual(show(link)["hash"], link)
        finally:
            holder.close()
            os.unlink("/tmp/way")


class Unblock(CliTest):
    def test_a_blocked_address_may_try_again(self):
        link = create("--password-stdin", text="right")
        for address in "192.0.2.77", "2001:db8::7":
            for _ in range(10):
                vs.run_program("POST", "/" + link, b"password=wrong", uid=SYSTEM,
                               REMOTE_ADDR=address)

            def status():
                return vs.run_program("POST", "/" + link, b"password=right", uid=SYSTEM,
                                      REMOTE_ADDR=address).status
            self.assertEqual(status(), 429)
            done = run("unblock", address, "192.0.2.78")
            self.assertEqual((done.returncode, done.stderr), (DONE, ""))
            self.assertEqual(status(), 303)

    def test_a_bad_address_behind_a_good_one_changes_nothing(self):
        link = create("--password-stdin", text="right")
        for _ in range(10):
            vs.run_program("POST", "/" + link, b"password=wrong", uid=SYSTEM,
                           REMOTE_ADDR="192.0.2.99")
        self.assert_fails(run("unblock", "192.0.2.99", "localhost"), USAGE, "localhost")
        reply = vs.run_program("POST", "/" + link, b"password=right", uid=SYSTEM,
                               REMOTE_ADDR="192.0.2.99")
        self.assertEqual(reply.status, 429)


class SystemLogLines(CliTest):
    def events(self, log):
        return [match.group(1) for line in log.lines
                if (match := re.search(r"(sharing event=.*)", line))]

    def test_every_change_leaves_one_line(self):
        with SystemLog() as log:
            first = create("--title", "secret title", "--password-stdin", text="secret pass")
            second = create(uid=SYSTEM)
            ids = [row[0] for row in sql("SELECT id FROM entry ORDER BY id")]
            run("edit", first, "--title", "x", "--uses", "3")
            run("disable", first, second)
            run("create", "--project", "x", "--hash", second)
            run("edit", "gone", "--title", "x")
            run("delete", "--yes", second)
            text = run("export").stdout
            run("import", "--on-conflict", "replace", text=text)
            run("import", text=text)
            run("import", "--dry-run", text=text)
            run("purge")
            run("purge", "--dry-run")
            run("unblock", "192.0.2.1")
            for command in ["list"], ["show", first], ["sessions"], ["tokens"], ["check"]:
                run(*command)
        self.assertEqual(self.events(log), [
            f"sharing event=create link={ids[0]} address=local result=1 by=0",
            f"sharing event=create link={ids[1]} address=local result=1 by=1",
            f"sharing event=set link={ids[0]} address=local result=1 by=0",
            f"sharing event=set link={ids[0]} address=local result=1 by=0",
            f"sharing event=set link={ids[1]} address=local result=1 by=0",
            "sharing event=create link=0 address=local result=204 by=0",
            "sharing event=set link=0 address=local result=205 by=0",
            f"sharing event=delete link={ids[1]} address=local result=1 by=0",
            "sharing event=import link=0 address=local result=1 by=0",
            "sharing event=import link=0 address=local result=204 by=0",
            "sharing event=delete_expired link=0 address=local result=1 by=0",
            "sharing event=unblock link=0 address=local result=1 by=0"])
        self.assertEqual(log.errors(), [])
        for line in log.lines:
            for secret in first, second, "secret":
                self.assertNotIn(secret, line)

    def test_what_is_refused_leaves_its_code(self):
        create()
        with SystemLog() as log:
            self.assert_fails(run("delete", "--yes", "gone"), NO_SUCH_LINK)
            self.assert_fails(run("delete", "--yes", "--damaged", "#77777"), NO_SUCH_LINK)
            self.assert_fails(run("unblock", "localhost"), USAGE)
        self.assertEqual(self.events(log), [
            "sharing event=delete link=0 address=local result=205 by=0",
            "sharing event=delete link=77777 address=local result=205 by=0",
            "sharing event=unblock link=0 address=local result=203 by=0"])

    def test_a_purge_that_fails_leaves_its_line(self):
        many_links(10)
        sql("UPDATE entry SET expire_at = 1000")
        holder = sqlite3.connect(DATABASE, isolation_level=None)
        holder.execute("BEGIN IMMEDIATE")
        try:
            with SystemLog() as log:
                self.assert_fails(run("purge"), BUSY)
        finally:
            holder.execute("ROLLBACK")
            holder.close()
        self.assertEqual(self.events(log),
                         ["sharing event=delete_expired link=0 address=local result=207 by=0"])

    def test_an_interrupted_purge_leaves_a_line_when_rows_went(self):
        many_links(30000)
        sql("UPDATE entry SET expire_at = 1000")
        with SystemLog() as log:
            terminal = Terminal("purge")
            terminal.expect(b"removed: ")
            os.kill(terminal.pid, signal.SIGTERM)
            self.assertEqual(terminal.end(), -signal.SIGTERM)
        left = len(sql("SELECT id FROM entry"))
        self.assertTrue(0 < left < 30000, left)
        self.assertEqual(self.events(log),
                         ["sharing event=delete_expired link=0 address=local result=1 by=0"])

    def test_a_signal_ends_a_command_that_waits_for_a_lock(self):
        link = create()
        holder = sqlite3.connect(DATABASE, isolation_level=None)
        holder.execute("BEGIN IMMEDIATE")
        try:
            for arguments in ["purge"], ["edit", link, "--title", "x"]:
                process = subprocess.Popen([PROGRAM, *arguments], stderr=subprocess.PIPE)
                time.sleep(0.5)
                self.assertIsNone(process.poll())
                begun = time.monotonic()
                process.terminate()
                self.assertEqual(process.wait(timeout=30), -signal.SIGTERM)
                # One wait of SQLite's, and not a second one.
                self.assertLess(time.monotonic() - begun, 17)
                process.stderr.close()
        finally:
            holder.execute("ROLLBACK")
            holder.close()


def main():
    vs.install(sys.argv[1], sys.argv[2])
    # Of a build with sanitizers: the leak check cannot look into a process of mixed ids.
    os.environ.setdefault("ASAN_OPTIONS", "detect_leaks=0")
    with open("/usr/tuvo/etc/tuvosharing.conf", "w") as file:
        file.write("external_address = https://files.example\nshare_folder = /srv/shares\n")
    # The namespace's own: what is made below is not the machine's.
    subprocess.run(["mount", "-t", "tmpfs", "-o", "mode=0755", "none", "/srv"], check=True)
    return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
