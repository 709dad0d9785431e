"""The administrator's command end to end: looking for damage. Arguments: the build folder, the
project's folder."""

import json
import os
import sqlite3
import stat

import cli_program
import visitor_server as vs
from cli_program import (DAMAGE, DONE, FAILED, FOLDER, USAGE, CliTest, create, many_links, run,
                         show)
from visitor_server import DATABASE, SYSTEM, sql


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
        sql("INSERT INTO session VALUES (204, CAST(x'610062' AS TEXT), 5, '192.0.2.1', "
            "4000000000)")
        sql("INSERT INTO session VALUES (205, 'z', 5, CAST(x'0031' AS TEXT), 4000000000)")
        sql("INSERT INTO token VALUES (301, 105, 201, NULL)")
        self.assertEqual(self.findings(),
                         [("row", f"entry #{row[0]}", row[5]) for row in rows] +
                         [("row", "session #201", "session_id"),
                          ("row", "session #204", "session_id"), ("row", "session #202", "ip"),
                          ("row", "session #205", "ip"), ("row", "session #203", "timeout"),
                          ("row", "token #301", "timeout")])

    def test_columns_with_numbers_that_are_none(self):
        values = {"enabled": "''", "owner_uid": "'5x'", "start_at": "'later'", "expire_at": "1.5",
                  "expire_times": "3000000000", "use_count": "''", "auto_gc": "x'31'"}
        expected = []
        for column, value in values.items():
            row = show(create("--uses", "5"))["id"]
            sql(f"UPDATE entry SET {column} = {value} WHERE id = {row}")
            expected.append(("row", f"entry #{row}", column))
        without = show(create())["id"]  # columns that have no value are none of these
        sql("UPDATE entry SET " + ", ".join(f"{column} = NULL" for column in values
                                            if column != "owner_uid") + f" WHERE id = {without}")
        self.assertEqual(self.findings(), expected)
        # They are links that a change brings in order.
        self.assertEqual(run("export").returncode, DONE)
        for _, subject, _ in expected:
            self.assert_fails(run("delete", "--yes", "--damaged", subject.split()[1]), USAGE)
            self.assertEqual(run("edit", subject.split()[1], "--title", "x").returncode, DONE)
        self.assertEqual(run("check").returncode, DONE)

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


if __name__ == "__main__":
    cli_program.main()
