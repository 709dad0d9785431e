"""The administrator's command end to end: copies of the whole database. Arguments: the build
folder, the project's folder."""

import os
import signal
import sqlite3
import stat
import subprocess
import sys

import cli_program
from cli_program import (COLUMNS, DONE, FOLDER, TAKEN, USAGE, CliTest, create, many_links, run,
                         show, end_by_signal)
from visitor_server import DATABASE, sql


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
        self.assertEqual(end_by_signal(signal.SIGINT, b"pages copied: ", "backup", self.FILE,
                                       take_back=lambda: os.unlink(self.FILE)), -signal.SIGINT)
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


if __name__ == "__main__":
    cli_program.main()
