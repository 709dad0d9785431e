"""The administrator's command end to end: deleting and purging. Arguments: the build folder, the
project's folder."""

import json
import sqlite3
import subprocess
import time

import cli_program
import visitor_server as vs
from cli_program import (DONE, NO_SUCH_LINK, PROGRAM, USAGE, CliTest, create, many_links,
                         numbers_begin_anew, run, show)
from visitor_server import DATABASE, SYSTEM, sql


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


class Purge(CliTest):
    def make_ended(self):
        """Two ended links and a live one; an expired session with a token."""
        links = [create("--owner", "alice"), create("--owner", "bob", "--project", "pictures"),
                 create()]
        # First, since a visit now and then removes what has ended.
        vs.run_program("POST", "/" + links[2], uid=SYSTEM)
        sql("UPDATE entry SET expire_at = 1000, auto_gc = 0 WHERE hash = ?", links[0])
        sql("UPDATE entry SET expire_times = 2, use_count = 2 WHERE hash = ?", links[1])
        sql("UPDATE session SET timeout = 1000")
        sql("UPDATE token SET timeout = 1000")
        return links

    def test_ended_links_go_and_live_ones_stay(self):
        links = self.make_ended()
        done = run("purge")
        self.assertEqual((done.returncode, done.stdout), (DONE, "removed 2 links\n"))
        self.assertEqual(sql("SELECT hash FROM entry"), [(links[2],)])
        self.assertEqual(len(sql("SELECT * FROM session")), 1)

    def test_rows_that_load_as_live_stay(self):
        """A text is no count, whatever SQL makes of it."""
        links = [create("--uses", "5") for _ in range(5)]
        for link, count in zip(links, ("''", "NULL", "'5 of 5'", "'4x'", "'none'")):
            sql(f"UPDATE entry SET use_count = {count} WHERE hash = ?", link)
        soon = create()
        sql("UPDATE entry SET expire_at = 'soon', start_at = 'later' WHERE hash = ?", soon)
        live = links[:2] + links[3:] + [soon]
        for state, expected in ("live", live), ("used_up", [links[2]]), ("not_yet", []), (
                "expired", []):
            listed = json.loads(run("list", "--json", "--state", state).stdout)["links"]
            self.assertEqual([link["hash"] for link in listed], expected, state)
            self.assertEqual([show(link)["state"] for link in expected], [state] * len(expected))
        counts = json.loads(run("purge", "--dry-run", "--json").stdout)
        self.assertEqual(counts["links"], 1)
        self.assertEqual(run("purge").stdout, "removed 1 link\n")
        self.assertEqual([row[0] for row in sql("SELECT hash FROM entry ORDER BY id")], live)

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
        self.assertEqual(run("purge", "--all-kinds", "--dry-run").stdout,
                         "would remove 2 links, 1 session, 1 token\n")
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


if __name__ == "__main__":
    cli_program.main()
