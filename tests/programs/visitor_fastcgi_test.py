"""The visitor's program by FastCGI, behind a real web server that has one process of it. Arguments:
the build folder, the project's folder."""

import http.client
import os
import re
import socket
import sys
import threading
import time
import unittest

import visitor_http_test as road
import visitor_server as vs
from visitor_http_test import CONTENT, FILE, admitted, path_of
from visitor_server import Visitor, make_file_link, sql

SERVER = None


def the_process():
    """The one process of the visitor's program."""
    found = []
    for pid in SERVER.programs():
        with open(f"/proc/{pid}/comm") as comm:
            if comm.read().strip() == "sharing.cgi":
                found.append(pid)
    assert len(found) == 1, found
    return found[0]


def memory(pid):
    """Kilobytes that are in memory."""
    return int(re.search(r"VmRSS:\s+(\d+) kB", road.read(f"/proc/{pid}/status")).group(1))


class FastCgiTest(unittest.TestCase):
    """Every test leaves the process as it found it: alive."""

    def setUp(self):
        self.process = the_process()

    def tearDown(self):
        self.assertEqual(the_process(), self.process)


class Visitors(FastCgiTest):
    def test_see_nothing_of_each_other(self):
        plain = make_file_link(FILE, redirect_type="url_param", redirect_uri="/album/7")
        locked = make_file_link(FILE, protect_type="password", password="secret")
        one, two = admitted(plain, address="127.0.0.51"), Visitor(SERVER, "127.0.0.52")
        for _ in range(20):
            self.assertEqual(one.get(path_of(plain)).body, CONTENT)
            self.assertIn("<form", two.get(path_of(locked)).text)
            self.assertEqual(one.get(path_of(plain) + "?redirect=1").get("Location"), "/album/7")
            self.assertIn("<form", two.get(path_of(plain)).text)
            self.assertEqual(one.get(path_of(plain), Range="bytes=0-4").status, 206)
            self.assertEqual(one.get(path_of(locked)).status, 403)
            reply = one.get(path_of(plain))
            self.assertEqual((reply.status, reply.get("Set-Cookie")), (200, None))
        self.assertIsNone(two.session_id)

    def test_at_the_same_time(self):
        links = [make_file_link(FILE, protect_type="password", password=f"secret-{number}")
                 for number in range(6)]
        failures = []

        def visit(number):
            try:
                visitor = admitted(links[number], {"password": f"secret-{number}"},
                                   f"127.0.0.{60 + number}")
                for _ in range(15):
                    assert visitor.get(path_of(links[number])).body == CONTENT
                    assert visitor.get(path_of(links[number - 1])).status == 403
            except Exception as error:  # told by the thread that waits
                failures.append(error)

        threads = [threading.Thread(target=visit, args=(number,)) for number in range(6)]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        self.assertEqual(failures, [])

    def test_form_is_not_the_next_requests(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        one, two = Visitor(SERVER, "127.0.0.53"), Visitor(SERVER, "127.0.0.54")
        self.assertEqual(one.post(path_of(link), {"password": "secret"}).status, 303)
        self.assertIn("<form", two.get(path_of(link)).text)
        self.assertEqual(two.post(path_of(link)).status, 403)
        self.assertEqual(two.post(path_of(link), {"password": "secret"}).status, 303)
        self.assertNotEqual(one.session_id, two.session_id)

    def test_refused_body_is_not_the_next_requests(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        visitor = Visitor(SERVER, "127.0.0.55")
        form = {"Content-Type": "application/x-www-form-urlencoded"}
        for body in ("password=%zz&password=secret", "x=" + "y" * 1000000 + "&password=secret"):
            reply = visitor.request("POST", path_of(link), body, form)
            self.assertEqual(reply.status, 400)
            self.assertEqual(visitor.post(path_of(link)).status, 403)
            self.assertEqual(visitor.post(path_of(link), {"password": "secret"}).status, 303)

    def test_body_that_the_visitor_does_not_finish(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        with socket.create_connection(("127.0.0.1", SERVER.port)) as connection:
            connection.sendall(f"POST /sharing/{link} HTTP/1.1\r\nHost: x\r\nContent-Length: 90\r\n"
                               "Content-Type: application/x-www-form-urlencoded\r\n\r\n"
                               "password=secret".encode())
            time.sleep(0.2)
            self.assertIn("<form", Visitor(SERVER).get(path_of(link)).text)
        self.assertEqual(use_count_after(link), 1)

    def test_who_leave_in_the_middle_of_a_file(self):
        with open("/tmp/shared/stream.bin", "wb") as file:
            file.truncate(100 * 1024 ** 2)
        link = make_file_link("/tmp/shared/stream.bin")
        visitor = admitted(link)
        for _ in range(5):
            connection = http.client.HTTPConnection("127.0.0.1", SERVER.port, timeout=60)
            connection.request("GET", path_of(link),
                               headers={"Cookie": "sharing_sid=" + visitor.session_id})
            connection.getresponse().read(100000)
            connection.close()
        self.assertEqual(visitor.get(path_of(link), Range="bytes=0-9").body, bytes(10))

    def test_slow_one_holds_nobody_up(self):
        with open("/tmp/shared/slow.bin", "wb") as file:
            file.truncate(100 * 1024 ** 2)
        link = make_file_link("/tmp/shared/slow.bin")
        visitor = admitted(link)
        with socket.create_connection(("127.0.0.1", SERVER.port)) as slow:
            slow.sendall(f"GET /sharing/{link} HTTP/1.1\r\nHost: x\r\n"
                         f"Cookie: sharing_sid={visitor.session_id}\r\n\r\n".encode())
            slow.recv(1000)
            self.assertEqual(visitor.get(path_of(link), Range="bytes=0-9").body, bytes(10))

    def test_memory_and_descriptors_stay(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        accounts = make_file_link(FILE, protect_type="user", protect_users=["alice"])

        def visits(count):
            for number in range(count):
                visitor = Visitor(SERVER, f"127.0.1.{number + 1}")
                visitor.get(path_of(link))
                visitor.post(path_of(link), {"password": "secret"})
                visitor.get(path_of(link))
                visitor.post(path_of(link) + "/logout")
                visitor.request("POST", path_of(link), "a=%zz", {
                    "Content-Type": "application/x-www-form-urlencoded"})
            visitor.post(path_of(accounts), {"zor_username": "alice",
                                             "zor_password": "alice-secret"})

        visits(40)
        before = memory(self.process)
        descriptors = len(os.listdir(f"/proc/{self.process}/fd"))
        for _ in range(5):
            visits(24)  # more than 600 requests in all
        self.assertLessEqual(len(os.listdir(f"/proc/{self.process}/fd")), descriptors + 1)
        if not vs.is_sanitized():
            self.assertLess(memory(self.process) - before, 256)


def use_count_after(link):
    """Once somebody has opened the link with its password."""
    admitted(link, {"password": "secret"}, "127.0.0.56")
    return sql("SELECT use_count FROM entry WHERE hash=?", link)[0][0]


class Process(unittest.TestCase):
    def test_runs_as_the_web_server_without_its_groups(self):
        status = dict(line.split(":", 1) for line in
                      road.read(f"/proc/{the_process()}/status").splitlines())
        self.assertEqual(status["Uid"].split(), ["33", "33", "0", "33"])
        self.assertEqual(status["Gid"].split(), ["33", "33", "33", "33"])
        self.assertEqual(status["Groups"].split(), [])
        # While the server itself must read what passwords are compared with.
        self.assertIn("42", dict(line.split(":", 1) for line in road.read(
            f"/proc/{SERVER.process.pid}/status").splitlines())["Groups"].split())

    def test_is_started_anew_when_it_has_ended(self):
        link = make_file_link(FILE)
        visitor = admitted(link)
        first = the_process()
        os.kill(first, 15)
        for _ in range(1200):
            if not os.path.exists(f"/proc/{first}"):
                break
            time.sleep(0.05)
        for _ in range(1200):
            reply = visitor.get(path_of(link))
            if reply.status == 200:
                break
            time.sleep(0.1)
        self.assertEqual(reply.status, 200)
        self.assertNotEqual(the_process(), first)

    def test_ends_with_the_server(self):
        with vs.WebServer(vs.fastcgi_configuration("/tmp/run-of-another")) as server:
            programs = server.programs()
        self.assertGreaterEqual(len(programs), 2)
        for _ in range(1200):
            left = [pid for pid in programs if os.path.exists(f"/proc/{pid}")]
            if not left:
                return
            time.sleep(0.05)
        self.fail(f"still there: {left}")


# What holds for one process a request holds here, too.
del road.Files.test_large_file_streams_and_ends_with_the_visitor  # counts processes


class Forms(road.Forms):
    pass


class LinksThatDoNotOpen(road.LinksThatDoNotOpen):
    pass


class Admission(road.Admission):
    pass


class LaterVisits(road.LaterVisits):
    pass


class Files(road.Files):
    pass


class Redirects(road.Redirects):
    pass


class Log(road.Log):
    pass


def main():
    global SERVER
    vs.install(sys.argv[1], sys.argv[2])
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    with vs.WebServer(vs.fastcgi_configuration()) as SERVER:
        road.SERVER = SERVER
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
