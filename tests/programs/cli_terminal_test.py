"""The administrator's command end to end: at a terminal: questions, tables, progress. Arguments:
the build folder, the project's folder."""

import fcntl
import os
import signal

import cli_program
from cli_program import (DONE, FAILED, USAGE, CliTest, create, many_links, run,
                         show_password_works, Terminal)
from visitor_server import sql

TIOCGPTPEER = 0x5441  # which the module does not know


class Terminals(CliTest):
    def test_the_password_is_asked_for_twice_and_not_shown(self):
        terminal = Terminal("create", "--project", "album", "--password", "--hash", "asked")
        terminal.expect(b"Password: ")
        self.assertFalse(terminal.echoes())
        terminal.type(b"open sesame\n")
        terminal.expect(b"The same again: ")
        terminal.type(b"open sesame\n")
        terminal.expect(b"asked")
        self.assertEqual(terminal.end(), DONE)
        self.assertNotIn(b"sesame", terminal.seen)
        self.assertTrue(show_password_works("asked", "open sesame"))

    def test_two_different_passwords_are_none(self):
        terminal = Terminal("create", "--project", "album", "--password")
        terminal.expect(b"Password: ")
        terminal.type(b"one\n")
        terminal.expect(b"again: ")
        terminal.type(b"two\n")
        terminal.expect(b"not the same")
        self.assertEqual(terminal.end(), USAGE)
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_an_interrupted_question_gives_the_echo_back(self):
        terminal = Terminal("create", "--project", "album", "--password")
        terminal.expect(b"Password: ")
        self.assertFalse(terminal.echoes())
        # The shell's end, without which the terminal's settings go with the program.
        shell = fcntl.ioctl(terminal.master, TIOCGPTPEER, os.O_RDWR | os.O_NOCTTY)
        os.kill(terminal.pid, signal.SIGTERM)
        terminal.wait_for(terminal.echoes)
        os.close(shell)
        self.assertEqual(terminal.end(), -signal.SIGTERM)

    def test_without_a_terminal_there_is_nobody_to_ask(self):
        self.assert_fails(run("create", "--project", "x", "--password"), USAGE, "--password-stdin")

    def test_a_password_is_not_read_from_a_terminal_that_shows_it(self):
        terminal = Terminal("create", "--project", "album", "--password-stdin")
        terminal.expect(b"--password-stdin: ")
        self.assertEqual(terminal.end(), USAGE)

    def test_deletion_asks_first(self):
        link = create()
        terminal = Terminal("delete", link)
        terminal.expect(b"Delete the link " + link.encode())
        terminal.type(b"n\n")
        self.assertEqual(terminal.end(), FAILED)
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)
        terminal = Terminal("delete", link)
        terminal.expect(b"[y/N]")
        terminal.type(b"y\n")
        self.assertEqual(terminal.end(), DONE)
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_deletion_without_a_terminal_needs_yes(self):
        link = create()
        self.assert_fails(run("delete", link, text="y\n"), USAGE, "--yes")
        self.assertEqual(len(sql("SELECT * FROM entry")), 1)

    def test_the_table_fits_the_terminal(self):
        create("--title", "wide \u65e5\u672c\u8a9e " + "x" * 200, "--owner", "alice")
        for width in 80, 120:
            terminal = Terminal("list", width=width)
            self.assertEqual(terminal.end(), DONE)
            lines = terminal.seen.decode().split("\r\n")
            self.assertIn("\u2026", lines[1])
            for line in lines:
                wide = sum(1 for character in line if character in "\u65e5\u672c\u8a9e")
                self.assertLessEqual(len(line) + wide, width)
        self.assertIn("x" * 200, run("list").stdout)

    def test_progress_is_shown_on_a_terminal_alone(self):
        many_links(3000)
        terminal = Terminal("export", "/tmp/progress.jsonl")
        terminal.expect(b"exported: ")
        terminal.expect(b"\r\x1b[K")
        self.assertEqual(terminal.end(), DONE)
        sql("DELETE FROM entry")
        terminal = Terminal("import", "/tmp/progress.jsonl")
        terminal.expect(b"read: ")
        terminal.expect(b"imported: ")
        terminal.expect(b"of 3000")
        self.assertEqual(terminal.end(), DONE)
        sql("UPDATE entry SET expire_at = 1000")
        terminal = Terminal("purge")
        terminal.expect(b"removed: ")
        self.assertEqual(terminal.end(), DONE)
        many_links(10000)
        terminal = Terminal("backup", "/tmp/progress.db")
        terminal.expect(b"pages copied: ")
        self.assertEqual(terminal.end(), DONE)
        sql("DELETE FROM entry")
        done = run("import", "/tmp/progress.jsonl")
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))

    def test_an_export_is_not_shown_by_mistake(self):
        create()
        terminal = Terminal("export")
        terminal.expect(b"name a file")
        self.assertEqual(terminal.end(), USAGE)
        terminal = Terminal("export", "-")
        terminal.expect(b'"format"')
        self.assertEqual(terminal.end(), DONE)


if __name__ == "__main__":
    cli_program.main()
