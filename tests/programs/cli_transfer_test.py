"""The administrator's command end to end: export and import. Arguments: the build folder, the
project's folder."""

import json
import os
import signal
import sqlite3
import stat
import subprocess
import sys
import time

import cli_program
import visitor_server as vs
from cli_program import (COLUMNS, DAMAGE, DONE, TAKEN, USAGE, CliTest, create, many_links, run,
                         show, end_by_signal)
from visitor_server import DATABASE, SYSTEM, sql


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
        self.assertEqual(end_by_signal(signal.SIGINT, b"of 20000", "import", self.FILE,
                                       take_back=lambda: sql("DELETE FROM entry")),
                         -signal.SIGINT)
        self.assertEqual(sql("SELECT * FROM entry"), [])
        self.assertEqual(sql("PRAGMA integrity_check"), [("ok",)])

    def test_an_interrupted_export_leaves_no_file(self):
        create()
        many_links(60000)
        before = sorted(os.listdir("/tmp"))
        self.assertEqual(end_by_signal(signal.SIGTERM, b"exported: ", "export", self.FILE,
                                       take_back=lambda: os.unlink(self.FILE)), -signal.SIGTERM)
        self.assertEqual(sorted(os.listdir("/tmp")), before)


if __name__ == "__main__":
    cli_program.main()
