"""Texts of ten mebibytes wherever a stranger can send one: refused, or handled in bounded memory.
Arguments: the build folder, the project's folder."""

import os
import re
import socket
import subprocess
import sys
import unittest

import fastcgi
import visitor_server as vs
import webapi_server as ws
from visitor_server import Visitor, make_file_link

FILE = "/tmp/shared/report.txt"
HUGE = 10 * 1024 ** 2
# What a program needs anyway, the text itself as the protocol's library holds it, and some room.
MOST = 64 * 1024
STARTER = """
import resource, subprocess, sys
done = subprocess.run(sys.argv[1:], stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, env={})
print(done.returncode, resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss)
"""


def peak_of(pid):
    """The most that a process ever had in memory, in kilobytes."""
    with open(f"/proc/{pid}/status") as lines:
        return next(int(line.split()[1]) for line in lines if line.startswith("VmHWM:"))


class SizesTest(unittest.TestCase):
    def assert_bounded(self, kilobytes):
        if not vs.is_sanitized():
            self.assertLess(kilobytes, MOST)


class ByFastCgi(SizesTest):
    """Past the web server's own limits: what the programs themselves do."""

    def answers(self, program, uid, requests):
        """Each is answered by a process of its own, with a refusal, and within bounds."""
        for variables, body, statuses in requests:
            with fastcgi.Spawned(program, uid) as spawned:
                answer, ended = spawned.request(variables, body)
                peak = peak_of(spawned.pid)
                name = max(variables, key=lambda key: len(variables[key]))
                self.assertTrue(ended, name)
                self.assertIn(answer[:11], [b"Status: %d" % status for status in statuses], name)
                self.assert_bounded(peak)
                # And the next request is served.
                again, ended = spawned.request({"REQUEST_METHOD": "GET", "PATH_INFO": "/none-such",
                                                "REMOTE_ADDR": "192.0.2.7", "REMOTE_USER": "alice"})
                self.assertTrue(ended and again.startswith(b"Status: 4"), again[:100])

    def test_visitors(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        plain = {"REQUEST_METHOD": "POST", "PATH_INFO": "/" + link, "REMOTE_ADDR": "192.0.2.7",
                 "CONTENT_TYPE": "application/x-www-form-urlencoded", "CONTENT_LENGTH": "0"}
        text = "x" * HUGE
        body = b"password=" + b"x" * HUGE
        multipart = (b"--b\r\nContent-Disposition: form-data; name=\"password\"\r\n\r\n" +
                     b"x" * HUGE + b"\r\n--b--\r\n")
        self.answers(vs.PROGRAM, vs.WWW_DATA, [
            ({**plain, "PATH_INFO": "/" + text}, b"", (404,)),
            ({**plain, "HTTP_COOKIE": "sharing_sid=" + text}, b"", (400,)),
            ({**plain, "HTTP_COOKIE": "a=" + "b; c=" * (HUGE // 5)}, b"", (400,)),
            ({**plain, "REMOTE_ADDR": text}, b"", (500,)),
            ({**plain, "REQUEST_METHOD": "GET", "QUERY_STRING": "redirect=" + text}, b"", (400,)),
            ({**plain, "REQUEST_METHOD": text}, b"", (405,)),
            ({**plain, "CONTENT_TYPE": "multipart/form-data; boundary=" + text}, b"", (400,)),
            ({**plain, "HTTP_X_TUVO_SHARING": text}, b"", (403,)),
            ({**plain, "CONTENT_LENGTH": str(len(body))}, body, (400,)),
            ({**plain, "CONTENT_LENGTH": "9" * HUGE}, b"", (400,)),
            ({**plain, "CONTENT_TYPE": "multipart/form-data; boundary=b",
              "CONTENT_LENGTH": str(len(multipart))}, multipart, (400,)),
        ])

    def test_visitor_who_is_in(self):
        """These texts are looked at for him alone, before the file is sent."""
        link = make_file_link(FILE)
        given = {"PATH_INFO": "/" + link, "REMOTE_ADDR": "192.0.2.7", "QUERY_STRING": ""}
        with fastcgi.Spawned(vs.PROGRAM, vs.WWW_DATA) as spawned:
            answer, _ = spawned.request({**given, "REQUEST_METHOD": "POST", "CONTENT_LENGTH": "0"})
        cookie = re.search(rb"sharing_sid=\S{32}", answer).group().decode()
        admitted = {**given, "REQUEST_METHOD": "GET", "HTTP_COOKIE": cookie}
        part = {**admitted, "HTTP_RANGE": "bytes=1-2"}
        with fastcgi.Spawned(vs.PROGRAM, vs.WWW_DATA) as spawned:  # he is in
            answer, _ = spawned.request(part)
        self.assertTrue(answer.startswith(b"Status: 206"), answer[:100])
        text = "x" * HUGE
        # A range that is none is passed over, as is one for another version of the file; a list of
        # tags has none of the file's.
        self.answers(vs.PROGRAM, vs.WWW_DATA, [
            ({**admitted, "HTTP_RANGE": "bytes=" + text}, b"", (200,)),
            ({**admitted, "HTTP_RANGE": "bytes=" + "0-1," * (HUGE // 4) + "0-1"}, b"", (200,)),
            ({**admitted, "HTTP_RANGE": "bytes=" + "9" * HUGE + "-"}, b"", (416,)),
            ({**part, "HTTP_IF_RANGE": '"' + text + '"'}, b"", (200,)),
            ({**admitted, "HTTP_IF_NONE_MATCH": '"x", ' * (HUGE // 5) + '"x"'}, b"", (200,)),
            ({**admitted, "HTTP_IF_NONE_MATCH": text}, b"", (200,)),
        ])

    def test_owners(self):
        plain = {"REQUEST_METHOD": "POST", "REMOTE_ADDR": "192.0.2.7", "REMOTE_USER": "alice",
                 "HTTP_HOST": "nas.example.org", "SERVER_PORT": "80", "QUERY_STRING": "",
                 "CONTENT_TYPE": "application/json", "CONTENT_LENGTH": "0"}
        body = ws.request_body("create", project_name="x", protect_password="x" * HUGE)
        text = "x" * HUGE
        listed = ws.request_body("list")
        self.answers(ws.ENTRY, vs.WWW_DATA, [
            ({**plain, "CONTENT_LENGTH": str(len(body))}, body, (413,)),
            ({**plain, "REQUEST_METHOD": "GET", "QUERY_STRING": "api=" + text}, b"", (413,)),
            ({**plain, "REMOTE_USER": text, "CONTENT_LENGTH": str(len(listed))}, listed, (401,)),
            ({**plain, "CONTENT_TYPE": text}, b"", (415,)),
            ({**plain, "HTTP_ORIGIN": text, "CONTENT_LENGTH": str(len(listed))}, listed, (403,)),
        ])


class ThroughTheWebServer(SizesTest):
    def test_requests(self):
        with vs.WebServer() as server:
            path = "/sharing/" + make_file_link(FILE)
            text = b"x" * HUGE
            for request in (b"POST /sharing/" + text + b" HTTP/1.1\r\nHost: x\r\n\r\n",
                            b"POST %b HTTP/1.1\r\nHost: x\r\nCookie: sharing_sid=%b\r\n\r\n"
                            % (path.encode(), text),
                            b"GET %b HTTP/1.1\r\nHost: %b\r\n\r\n" % (path.encode(), text),
                            b"POST %b HTTP/1.1\r\nHost: x\r\nContent-Length: %d\r\n\r\npassword=%b"
                            % (path.encode(), len(text) + 9, text)):
                self.assertIn(self.status(server, request), (400, 413, 414, 431))
            self.assert_bounded(peak_of(server.process.pid))
            self.assertEqual(Visitor(server).post(path).status, 303)

    def status(self, server, request):
        with socket.create_connection(("127.0.0.1", server.port), timeout=60) as connection:
            try:
                connection.sendall(request)
            except OSError:
                pass  # it need not read all of it
            try:
                return int(connection.recv(65536).split(b" ", 2)[1])
            except (OSError, IndexError):
                return 413  # and may close the connection before it says so


class Commands(SizesTest):
    def run_fed(self, *command, text):
        """The exit status and the peak of memory of a command with that standard input."""
        with open("/tmp/input", "wb") as file:
            file.write(text)
        # Out of a small process: what starts a program counts with it.
        with open("/tmp/input", "rb") as file:
            done = subprocess.run([sys.executable, "-c", STARTER, *command], stdin=file,
                                  stdout=subprocess.PIPE, check=True)
        return map(int, done.stdout.split())

    def test_password_on_standard_input(self):
        for text in b"x" * HUGE, b"x" * HUGE + b"\n":
            status, peak = self.run_fed("/usr/tuvo/bin/tuvosharing", "create", "--project", "x",
                                        "--password-stdin", text=text)
            self.assertEqual(status, 2)
            self.assert_bounded(peak)


def main():
    ws.install(sys.argv[1], sys.argv[2], "/tmp/shared")
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(b"content")
    return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
