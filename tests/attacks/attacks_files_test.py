"""Files outside of the shared folders, by somebody who may write to one and changes it at the very
moment that it is looked at. Arguments: the build folder, the project's folder."""

import ctypes
import os
import re
import signal
import subprocess
import sys
import time
import unittest
import urllib.parse

import fastcgi
import visitor_server as vs
import webapi_server as ws
from visitor_server import make_file_link

SHARED = "/tmp/shared"
FILE = SHARED + "/folder/report.txt"
OUTSIDE = "/tmp/outside"
SECRET = b"what is outside"
CONTENT = b"what is shared "
ROUNDS = int(os.environ.get("TUVO_ROUNDS", "400"))
CREATIONS = ROUNDS // 20
LIBC = ctypes.CDLL(None, use_errno=True)
AT_FDCWD, RENAME_EXCHANGE = -100, 2


def exchange(one, other):
    if LIBC.renameat2(AT_FDCWD, one.encode(), AT_FDCWD, other.encode(), RENAME_EXCHANGE) != 0:
        raise OSError(ctypes.get_errno(), one)


class Swapping:
    """A name that is a folder (or file) now and a symbolic link then, for a `with`."""

    def __init__(self, name, target):
        self.name, self.other = name, name + ".other"
        os.symlink(target, self.other)

    def __enter__(self):
        self.pid = os.fork()  # a thread would wait for this one most of the time
        if self.pid == 0:
            while True:
                exchange(self.name, self.other)
                time.sleep(0.00005)
        return self

    def __exit__(self, *_):
        os.kill(self.pid, signal.SIGKILL)
        os.waitpid(self.pid, 0)
        if os.path.islink(self.name):
            exchange(self.name, self.other)
        os.unlink(self.other)


class Delivery(unittest.TestCase):
    """The file is looked at, and then sent: what is sent must be what was looked at."""

    def setUp(self):
        self.program = fastcgi.Spawned(vs.PROGRAM, vs.WWW_DATA)
        self.program.__enter__()
        self.addCleanup(self.program.__exit__)

    def ask(self, method, link, **more):
        variables = {"REQUEST_METHOD": method, "PATH_INFO": "/" + link, "QUERY_STRING": "",
                     "REMOTE_ADDR": "192.0.2.7", "CONTENT_LENGTH": "0", **more}
        answer, ended = self.program.request(variables)
        self.assertTrue(ended)
        return answer

    def hammer(self, name, target):
        link = make_file_link(FILE)
        cookie = re.search(rb"sharing_sid=\S{32}", self.ask("POST", link)).group().decode()
        seen = {"shared": 0, "gone": 0}
        begun = time.monotonic()
        with Swapping(name, target):
            for _ in range(ROUNDS):
                answer = self.ask("GET", link, HTTP_COOKIE=cookie)
                self.assertNotIn(SECRET, answer)
                seen["shared" if CONTENT in answer else "gone"] += 1
        print(f"{name}: {seen}, {time.monotonic() - begun:.1f} s", file=sys.stderr)
        # Both came often: the moment was hit.
        self.assertGreater(min(seen.values()), ROUNDS // 100)

    def test_folder_that_becomes_a_symbolic_link(self):
        self.hammer(SHARED + "/folder", OUTSIDE)

    def test_file_that_becomes_a_symbolic_link(self):
        self.hammer(FILE, OUTSIDE + "/report.txt")


class Sharing(unittest.TestCase):
    """The path is resolved and looked at, and then stored."""

    def hammer(self, name, target):
        front = ws.ToolFront()
        stored, refused = set(), 0
        with Swapping(name, target):
            for _ in range(CREATIONS):
                answer = front.call("alice", "create", project_name="file", app={"path": FILE})
                if answer.ok:
                    stored.add(answer.data["link"]["app"]["path"])
                else:
                    self.assertEqual(answer.code, 206)
                    refused += 1
        # Both came: the moment was hit.
        self.assertGreater(len(stored), 0)
        self.assertGreater(refused, 0)
        for path in stored:  # "folder.other" is what the folder is called every other moment
            self.assertTrue(path.startswith(SHARED + "/"), path)
        vs.sql("DELETE FROM entry")

    def test_folder_that_becomes_a_symbolic_link(self):
        self.hammer(SHARED + "/folder", OUTSIDE)

    def test_file_that_becomes_a_symbolic_link(self):
        self.hammer(FILE, OUTSIDE + "/report.txt")


class Paths(unittest.TestCase):
    """Of a link that some other program has stored, with whatever path."""

    def test_nothing_but_the_path_itself(self):
        with vs.WebServer() as server:
            for path in (SHARED + "/link", SHARED + "/to-folder/report.txt", "/proc/self/environ",
                         "/proc/self/root" + OUTSIDE + "/report.txt", "/proc/self/mem",
                         "/proc/self/exe", "/dev/zero", "/dev/log", SHARED,
                         "/proc/self/cwd" + OUTSIDE + "/report.txt", "/dev/fd/0", "/etc/shadow",
                         vs.DATABASE, vs.DATABASE + "-wal"):
                visitor = vs.Visitor(server)
                address = "/sharing/" + make_file_link(path)
                self.assertEqual(visitor.post(address).status, 303)
                reply = visitor.get(address)
                self.assertIn(reply.status, (404, 500), path)
                for bytes_ in SECRET, b"SQLite", b"root:", b"ELF":
                    self.assertNotIn(bytes_, reply.body, path)

    def test_address_leads_to_no_file(self):
        with vs.WebServer() as server:
            for path in ("/sharing/..%2f..%2fetc%2fpasswd", "/sharing/../../etc/passwd",
                         "/sharing/%2e%2e/%2e%2e/etc/passwd", "/sharing//etc/passwd",
                         "/sharing/" + urllib.parse.quote(FILE, safe=""), "/sharing/abc%00",
                         "/sharing/abc/../../etc/passwd", "/sharing/%c0%ae%c0%ae/"):
                reply = vs.Visitor(server).get(path)
                self.assertIn(reply.status, (400, 404), path)
                self.assertNotIn(b"root:", reply.body)


def main():
    ws.install(sys.argv[1], sys.argv[2], SHARED)
    subprocess.run(["install", "-d", "-m", "0755", SHARED, SHARED + "/folder", OUTSIDE], check=True)
    for path, content in (FILE, CONTENT), (OUTSIDE + "/report.txt", SECRET):
        with open(path, "wb") as file:
            file.write(content)
        os.chmod(path, 0o644)
    os.symlink(OUTSIDE + "/report.txt", SHARED + "/link")
    os.symlink(OUTSIDE, SHARED + "/to-folder")
    return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
