"""The administrator's command end to end: who may run it, and how it is told what to do. Arguments:
the build folder, the project's folder."""

import os
import sqlite3
import subprocess
import time

import cli_program
from cli_program import (DONE, FOLDER, NO_SUCH_LINK, NOBODY, NOT_ALLOWED, PROGRAM, USAGE,
                         CliTest, create, run, show)
from visitor_server import DATABASE, SYSTEM, sql


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
                          ["list", "--limit", "0x1"], ["list", "--offset", "1e1"],
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

    def test_complaints_are_harmless_on_a_terminal(self):
        done = run("show", "\x1b[31m\u202e\nx")
        self.assert_fails(done, NO_SUCH_LINK, r"\x1b[31m\u202e\nx")


if __name__ == "__main__":
    cli_program.main()
