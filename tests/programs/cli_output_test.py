"""The administrator's command end to end: readers who do not read, and output that cannot be
written. Arguments: the build folder, the project's folder."""

import fcntl
import json
import os
import signal
import sqlite3
import struct
import subprocess
import termios
import time

import cli_program
from cli_program import DONE, FAILED, PROGRAM, CliTest, create, many_links, run, show
from visitor_server import DATABASE, SystemLog, sql


def unread(descriptor):
    """How much waits in the pipe."""
    return struct.unpack("i", fcntl.ioctl(descriptor, termios.FIONREAD, bytes(4)))[0]


class Unread(CliTest):
    """Standard output is a pipe that nobody reads."""

    def start(self, *arguments, done=None):
        """The process, once its output goes no further. With `done`, which tells that its work is,
        the pipe is full before."""
        reading, writing = os.pipe()
        self.addCleanup(os.close, reading)
        if done:
            os.set_blocking(writing, False)
            try:
                while True:
                    os.write(writing, b"x" * 4096)
            except BlockingIOError:
                os.set_blocking(writing, True)
        process = subprocess.Popen([PROGRAM, *arguments], stdout=writing, stderr=subprocess.PIPE)
        self.addCleanup(process.stderr.close)
        os.close(writing)
        end = time.monotonic() + 60
        while not (done() if done else unread(reading) > 60000) and time.monotonic() < end:
            time.sleep(0.02)
        time.sleep(0.3)
        self.assertIsNone(process.poll())
        return process

    def test_a_signal_ends_the_waiting(self):
        many_links(3000)
        for arguments in ["export", "-"], ["export"], ["list", "--json"], ["list"]:
            for number in signal.SIGTERM, signal.SIGINT:
                process = self.start(*arguments)
                process.send_signal(number)
                self.assertEqual(process.wait(timeout=60), -number, arguments)
                self.assertEqual(process.stderr.read(), b"")

    def test_a_link_that_is_made_is_told_when_its_hash_is_not(self):
        process = self.start("create", "--project", "x",
                             done=lambda: sql("SELECT id FROM entry"))
        process.terminate()
        self.assertEqual(process.wait(timeout=60), -signal.SIGTERM)
        link = sql("SELECT id FROM entry")[0][0]
        self.assertEqual(process.stderr.read().decode(),
                         f"tuvosharing: the link is made (#{link}); its hash cannot be written\n")

    def test_a_pipe_that_is_read_later_gets_everything(self):
        many_links(3000)
        process = subprocess.Popen([PROGRAM, "list", "--json"], stdout=subprocess.PIPE)
        time.sleep(1)
        text, _ = process.communicate()
        self.assertEqual(process.returncode, DONE)
        self.assertEqual(len(json.loads(text)["links"]), 3000)

    def test_nobody_waits_for_an_export_that_has_ended(self):
        """The reading of an export keeps the log of the database from being taken over."""
        many_links(3000)
        process = self.start("export", "-")
        sql("UPDATE entry SET use_count = 1")
        process.terminate()
        process.wait(timeout=60)
        connection = sqlite3.connect(DATABASE, timeout=0)
        self.assertEqual(connection.execute("PRAGMA wal_checkpoint(TRUNCATE)").fetchone()[0], 0)
        connection.close()


class Unwritable(CliTest):
    def test_output_that_cannot_be_written_is_a_failure(self):
        create()
        for arguments in ["list"], ["list", "--json"], ["export"], ["--help"]:
            with open("/dev/full", "w") as full:
                done = subprocess.run([PROGRAM, *arguments], stdout=full, stderr=subprocess.PIPE)
            self.assertEqual(done.returncode, FAILED, arguments)

    def test_a_new_link_is_named_by_its_number(self):
        for how in ">/dev/full", ">&-", "--json >/dev/full", "--quiet >&-":
            with SystemLog() as log:
                done = subprocess.run(["sh", "-c", f"{PROGRAM} create --project x {how}"],
                                      stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                      encoding="utf-8")
            row, link = sql("SELECT id, hash FROM entry ORDER BY id DESC")[0]
            self.assert_fails(done, FAILED, f"the link is made (#{row}); its hash cannot")
            self.assertEqual(show(f"#{row}")["state"], "live")
            self.assertEqual([line for line in log.lines if link in line], [])
            events = [line.split("sharing ")[1] for line in log.lines if "sharing " in line]
            self.assertEqual(events, [f"event=create link={row} address=local result=1 by=0"])
        self.assertEqual(run("delete", "--yes", f"#{row}").returncode, DONE)


if __name__ == "__main__":
    cli_program.main()
