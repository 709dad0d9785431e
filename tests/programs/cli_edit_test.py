"""The administrator's command end to end: changing links. Arguments: the build folder, the
project's folder."""

import json
import os
import sqlite3
import subprocess
import sys
import time

import cli_program
from cli_program import (BUSY, DONE, LINK_MEMBERS, NO_SUCH_LINK, PROGRAM, TAKEN, USAGE, CliTest,
                         create, data_of, run, show)
from visitor_server import DATABASE, SystemLog, sql


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

    def test_a_link_that_is_named_twice_is_changed_once(self):
        link, other = create(), create()
        row = show(link)["id"]
        with SystemLog() as log:
            done = run("edit", link, f"#{row}", other, "--id", str(row), "--title", "x", "--json")
            self.assertEqual([link["hash"] for link in json.loads(done.stdout)["links"]],
                             [link, other])
            self.assertEqual(run("disable", f"#{row}", link).returncode, DONE)
        lines = [line for line in log.lines if f"event=set link={row} " in line]
        self.assertEqual(len(lines), 2)

    def test_looking_at_a_file_holds_nobody_up(self):
        for left in reversed(range(5)):  # the machine may stand still for the second that there is
            try:
                self.look_while_others_write()
                return
            except (AssertionError, sqlite3.OperationalError):
                if left == 0:
                    raise

    def look_while_others_write(self):
        """A lease on the file delays the look at it, as a share that hangs does."""
        os.makedirs("/srv/shares", exist_ok=True)
        path = "/srv/shares/leased"
        with open(path, "w") as file:
            file.write("x")
        os.chown(path, 2001, 2001)
        link, other = create("--project", "file", "--owner", "alice", "--path", path), create()
        holder = subprocess.Popen([sys.executable, "-c", f"""
import fcntl, signal, time
signal.pthread_sigmask(signal.SIG_BLOCK, [signal.SIGIO])
with open({path!r}, "r+") as file:
    fcntl.fcntl(file, fcntl.F_SETLEASE, fcntl.F_WRLCK)
    print("held", flush=True)
    signal.sigwait([signal.SIGIO])
    print("looked at", flush=True)
    time.sleep(1)
"""], stdout=subprocess.PIPE)
        holder.stdout.readline()
        process = subprocess.Popen([PROGRAM, "edit", link, "--path", path, "--title", "x"],
                                   stderr=subprocess.PIPE)
        self.assertEqual(holder.stdout.readline(), b"looked at\n")
        connection = sqlite3.connect(DATABASE, timeout=0)
        with connection:
            connection.execute("UPDATE entry SET use_count = 7 WHERE hash = ?", (other,))
        # Which waits for whoever has begun to read before.
        taken_over = connection.execute("PRAGMA wal_checkpoint(TRUNCATE)").fetchone()
        connection.close()
        self.assertIsNone(process.poll())
        self.assertEqual(taken_over, (0, 0, 0))
        self.assertEqual((process.wait(), process.stderr.read()), (DONE, b""))
        process.stderr.close()
        holder.wait()
        holder.stdout.close()
        self.assertEqual((show(link)["protect_title"], show(other)["use_count"]), ("x", 7))

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


if __name__ == "__main__":
    cli_program.main()
