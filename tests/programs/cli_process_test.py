"""The administrator's command end to end: what others see of its process, and what is left of it.
Arguments: the build folder, the project's folder."""

import os
import resource
import signal
import subprocess
import time

import cli_program
from cli_program import DONE, PROGRAM, CliTest, Terminal, create, run, show
from visitor_server import DATABASE, SYSTEM, sql


def first_words(pid):
    """What everybody can read of the command line, until it is down to the program's name."""
    end = time.monotonic() + 120
    while True:
        with open(f"/proc/{pid}/cmdline", "rb") as file:
            words = file.read().rstrip(b"\0")
        if words == PROGRAM.encode() or time.monotonic() > end:
            return words
        time.sleep(0.01)


class Secrets(CliTest):
    def test_the_command_line_is_not_for_everybody(self):
        process = subprocess.Popen(
            [PROGRAM, "create", "--project", "x", "--hash", "visible", "--private-data",
             '{"key":"visible"}', "--password-stdin"], stdin=subprocess.PIPE,
            stdout=subprocess.PIPE)
        words = first_words(process.pid)
        self.assertIsNone(process.poll())  # it waits for the password
        process.communicate(b"secret\n")
        self.assertEqual(words, PROGRAM.encode())
        self.assertEqual(process.returncode, DONE)
        self.assertEqual(show("visible", "--private")["private_data"], {"key": "visible"})

    def test_a_typed_password_goes_into_no_core_file(self):
        def unlimited():
            resource.setrlimit(resource.RLIMIT_CORE, (resource.RLIM_INFINITY,) * 2)
            os.chdir("/tmp")
        for uid in 0, SYSTEM:
            before = sorted(os.listdir("/tmp"))
            terminal = Terminal("create", "--project", "x", "--password", before=unlimited,
                                uid=uid)
            terminal.expect(b"Password: ")
            terminal.type(b"open sesame\n")
            terminal.expect(b"again: ")
            with open(f"/proc/{terminal.pid}/limits") as file:
                limits = [line.split()[4:6] for line in file if line.startswith("Max core file")]
            self.assertEqual(limits, [["1", "1"]])
            # A process that is not to be dumped belongs to root here.
            self.assertEqual(os.stat(f"/proc/{terminal.pid}/mem").st_uid, 0)
            terminal.type(b"\x1c")
            status = terminal.end_status()
            self.assertEqual(os.waitstatus_to_exitcode(status), -signal.SIGQUIT)
            self.assertFalse(os.WCOREDUMP(status))
            self.assertEqual(sorted(os.listdir("/tmp")), before)


class FileSizes(CliTest):
    """A limit on the size of files, as of the shell's `ulimit -f`."""

    def test_what_grows_too_large_is_taken_back(self):
        create()
        cli_program.many_links(1000)
        folder = os.path.dirname(DATABASE)
        sql("PRAGMA wal_checkpoint(TRUNCATE)")
        before = sorted(os.listdir("/tmp")), sorted(os.listdir(folder))

        def limited():
            resource.setrlimit(resource.RLIMIT_FSIZE, (100 << 10, 100 << 10))
        for command in "backup", "export":
            done = run(command, "/tmp/large", preexec_fn=limited)
            self.assert_fails(done, cli_program.FAILED)
            self.assertEqual((sorted(os.listdir("/tmp")), sorted(os.listdir(folder))), before)


if __name__ == "__main__":
    cli_program.main()
