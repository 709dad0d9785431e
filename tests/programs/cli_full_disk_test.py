"""The administrator's command end to end: where the disk is full, or about to be. Arguments: the
build folder, the project's folder."""

import json
import os
import signal
import sqlite3
import subprocess
import time

import cli_program
from cli_program import DONE, FAILED, FOLDER, PROGRAM, CliTest, create, many_links, run, show
from visitor_server import DATABASE, SYSTEM, SystemLog, sql

MIB = 1 << 20
LARGE = {"x": "y" * 10000}


def export_of(count):
    """The text of an export of so many large links, which are gone again."""
    many_links(count, LARGE)
    text = run("export").stdout
    sql("DELETE FROM entry")
    return text


class SmallDisk(CliTest):
    """The database stands on a disk of its own."""

    def mount(self, size, folder=FOLDER, owner=SYSTEM):
        subprocess.run(["mount", "-t", "tmpfs", "-o", f"size={size},mode=0711", "none", folder],
                       check=True)
        os.chown(folder, owner, owner)
        self.addCleanup(subprocess.run, ["umount", "--lazy", folder], check=True)

    @staticmethod
    def free(folder=FOLDER):
        room = os.statvfs(folder)
        return room.f_bavail * room.f_frsize

    @staticmethod
    def fill(left, folder=FOLDER):
        with open(folder + "/filling", "wb") as file:
            while SmallDisk.free(folder) > left:
                file.write(bytes(min(MIB, SmallDisk.free(folder) - left)))
                file.flush()


class Backup(SmallDisk):
    FILE = "/tmp/full.db"

    def setUp(self):
        super().setUp()
        if os.path.exists(self.FILE):
            os.unlink(self.FILE)

    def assert_nothing_left(self):
        self.assertEqual([name for name in os.listdir(FOLDER) if "backup" in name], [])
        self.assertEqual([name for name in os.listdir("/tmp") if name.startswith("full.db")], [])

    def test_no_copy_is_begun_that_would_leave_others_no_room(self):
        self.mount("40M")
        link = create()
        many_links(200, LARGE)
        sql("PRAGMA wal_checkpoint(TRUNCATE)")
        size = os.stat(DATABASE).st_size
        self.assertGreater(size, MIB)
        self.fill(size + 12 * MIB)
        self.assert_fails(run("backup", self.FILE), FAILED, FOLDER, "too little room")
        self.assert_nothing_left()
        self.assertEqual(run("edit", link, "--title", "x").returncode, DONE)
        os.unlink(FOLDER + "/filling")
        self.assertEqual(run("backup", self.FILE).returncode, DONE)

    def test_the_write_ahead_log_counts(self):
        self.mount("40M")
        create()
        holder = sqlite3.connect(DATABASE, isolation_level=None)
        holder.execute("PRAGMA wal_autocheckpoint = 0")
        holder.execute("PRAGMA synchronous = OFF")
        try:
            for number in range(4):
                holder.execute("INSERT INTO entry VALUES (NULL, ?, 'p', 1, 0, 0, 0, 0, 0, 1, ?)",
                               (f"h{number}", json.dumps({"app": {}, "x": "y" * MIB})))
            size = os.stat(DATABASE).st_size + os.stat(DATABASE + "-wal").st_size
            self.assertGreater(os.stat(DATABASE + "-wal").st_size, 4 * MIB)
            self.fill(size + 15 * MIB)
            self.assert_fails(run("backup", self.FILE), FAILED, "too little room")
            self.assert_nothing_left()
        finally:
            holder.close()

    def begun(self):
        """A backup that is stopped while its copy stands beside the database."""
        while True:
            process = subprocess.Popen([PROGRAM, "backup", "--force", self.FILE],
                                       stderr=subprocess.PIPE, encoding="utf-8")
            while process.poll() is None:
                copies = [name for name in os.listdir(FOLDER) if name.startswith("backup.")]
                if copies:
                    process.send_signal(signal.SIGSTOP)
                    time.sleep(0.1)
                    if process.poll() is None and os.path.exists(f"{FOLDER}/{copies[0]}"):
                        return process
                    process.send_signal(signal.SIGCONT)
            process.stderr.close()

    def test_a_copy_gives_way_when_others_need_the_room(self):
        self.mount("100M")
        link = create()
        connection = sqlite3.connect(DATABASE)
        with connection:
            connection.execute("PRAGMA synchronous = OFF")
            for number in range(30):
                connection.execute("INSERT INTO entry VALUES (NULL,?,'p',1,0,0,0,0,0,1,?)",
                                   (f"h{number}", json.dumps({"app": {}, "x": "y" * MIB})))
        connection.close()
        sql("PRAGMA wal_checkpoint(TRUNCATE)")
        for _ in range(20):  # a copy may be met when it is nearly over
            process = self.begun()
            self.fill(4 * MIB)
            process.send_signal(signal.SIGCONT)
            _, complaint = process.communicate()
            if process.returncode != DONE:
                break
            os.unlink(FOLDER + "/filling")
        self.assertEqual(process.returncode, FAILED)
        self.assertIn("too little room", complaint)
        self.assert_nothing_left()
        self.assertEqual(run("edit", link, "--title", "x").returncode, DONE)

    def test_a_full_target_is_left_as_it_was(self):
        os.makedirs("/tmp/target", exist_ok=True)
        self.mount("1M", "/tmp/target", 0)
        create()
        many_links(200, LARGE)
        for command in "backup", "export":
            self.assert_fails(run(command, "/tmp/target/x"), FAILED, "No space left")
            self.assertEqual(os.listdir("/tmp/target"), [])
        self.assertEqual([name for name in os.listdir(FOLDER) if "backup" in name], [])


class Changes(SmallDisk):
    def refused(self, log, event):
        """That the log has a line of what was refused, and why."""
        lines = "\n".join(log.lines)
        self.assertIn(f"sharing event={event} link=0 address=local result=100 by=0", lines)
        self.assertRegex(lines, "database_log:[0-9]+ the database failed: .*is full")

    def test_an_import_is_taken_back_and_the_log_says_why(self):
        text = export_of(200)
        self.mount("1M")
        link = create()
        with SystemLog() as log:
            done = run("import", text=text)
        self.assert_fails(done, FAILED, "the system log says why")
        self.refused(log, "import")
        self.assertEqual(sql("SELECT hash FROM entry"), [(link,)])
        self.assertEqual(sql("PRAGMA integrity_check"), [("ok",)])
        self.assertEqual(run("edit", link, "--title", "x").returncode, DONE)
        self.assertEqual(show(link)["protect_title"], "x")

    def test_a_link_that_cannot_be_stored_is_none(self):
        self.mount("1M")
        links = [create()]
        self.fill(300 << 10)
        with SystemLog() as log:
            for _ in range(200):  # the log of the database has some room of its own
                done = run("create", "--quiet", "--project", "x", "--app",
                           json.dumps({"x": "y" * 50000}))
                if done.returncode != DONE:
                    break
                links.append(done.stdout.strip())
        self.assert_fails(done, FAILED)
        self.refused(log, "create")
        os.unlink(FOLDER + "/filling")
        self.assertEqual([row[0] for row in sql("SELECT hash FROM entry ORDER BY id")], links)
        self.assertEqual(run("create", "--project", "x").returncode, DONE)


if __name__ == "__main__":
    cli_program.main()
