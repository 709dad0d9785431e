"""The administrator's command end to end: what it leaves in the system log. Arguments: the build
folder, the project's folder."""

import os
import re
import signal
import sqlite3
import subprocess
import time

import cli_program
from cli_program import (BUSY, FAILED, NO_SUCH_LINK, NOT_ALLOWED, PROGRAM, USAGE, CliTest,
                         Terminal, create, many_links, run, show)
from visitor_server import DATABASE, SYSTEM, SystemLog, sql


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
            run("signout", first, "gone")
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
            f"sharing event=sign_out link={ids[0]} address=local result=1 by=0",
            "sharing event=sign_out link=0 address=local result=205 by=0",
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

    def test_whatever_was_refused_behind_its_options_leaves_one_line(self):
        link = create()
        cases = (
            (["create"], USAGE, "create", 201),
            (["create", "--project", "x", "--uses", "-1"], USAGE, "create", 203),
            (["create", "--project", "x", "--app-file", "/nonexistent"], FAILED, "create", 100),
            (["create", "--project", "x", "--password"], USAGE, "create", 203),
            (["create", "--project", "file", "--owner", "alice", "--path", "/etc/shadow"],
             NOT_ALLOWED, "create", 206),
            (["edit", link], USAGE, "set", 203),
            (["edit", "#x", "--title", "t"], USAGE, "set", 203),
            (["edit", link, "--owner", "nobody-here"], USAGE, "set", 203),
            (["edit", link, "gone", "--hash", "x"], USAGE, "set", 203),
            (["enable", "#0"], USAGE, "set", 203),
            (["delete", "#x"], USAGE, "delete", 203),
            (["delete", link], USAGE, "delete", 203),  # nobody to ask
            (["signout", "#x"], USAGE, "sign_out", 203),
            (["purge", "--owner", "nosuch"], USAGE, "delete_expired", 203),
            (["import", "/nonexistent"], FAILED, "import", 100),
            (["import"], USAGE, "import", 203),
            (["import", "--on-conflict", "x"], USAGE, "import", 203),
            (["unblock", "localhost"], USAGE, "unblock", 203),
            (["import", "--dry-run"], USAGE, None, 0),
            (["purge", "--dry-run", "--owner", "nosuch"], USAGE, None, 0),
            (["edit", link, "--frobnicate"], USAGE, None, 0),
            (["show", "gone"], NO_SUCH_LINK, None, 0))
        for arguments, status, event, code in cases:
            with self.subTest(arguments=arguments), SystemLog() as log:
                self.assert_fails(run(*arguments), status)
            lines = [f"sharing event={event} link=0 address=local result={code} by=0"]
            self.assertEqual(self.events(log), lines if event else [], arguments)

    def test_the_answer_no_is_no_refusal(self):
        link = create()
        with SystemLog() as log:
            terminal = Terminal("delete", link)
            terminal.expect(b"[y/N]")
            terminal.type(b"n\n")
            self.assertEqual(terminal.end(), FAILED)
        self.assertEqual(self.events(log), [])

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
                self.assertEqual(process.wait(timeout=60), -signal.SIGTERM)
                # One wait of SQLite's, and not a second one.
                self.assertLess(time.monotonic() - begun, 19)
                process.stderr.close()
        finally:
            holder.execute("ROLLBACK")
            holder.close()


if __name__ == "__main__":
    cli_program.main()
