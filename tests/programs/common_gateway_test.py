"""Long-lived programs: the visitor's program by FastCGI, one process of it, spoken to directly.
Arguments: the build folder, the project's folder."""

import os
import signal
import socket
import sys
import time
import unittest
import urllib.parse

import fastcgi
import visitor_server as vs
from visitor_server import Reply, make_file_link, sql

PROGRAM = None
FILE = "/tmp/shared/report.txt"
CONTENT = os.urandom(300 * 1024 + 5)
LARGE = "/tmp/shared/large.bin"


def variables(method, path, address="192.0.2.7", query="", cookie=None, length=None, **others):
    made = {"REQUEST_METHOD": method, "PATH_INFO": path, "QUERY_STRING": query,
            "REMOTE_ADDR": address, "GATEWAY_INTERFACE": "CGI/1.1"}
    if length is not None:
        made["CONTENT_LENGTH"] = str(length)
        made["CONTENT_TYPE"] = "application/x-www-form-urlencoded"
    if cookie:
        made["HTTP_COOKIE"] = "sharing_sid=" + cookie
    made.update(others)
    return made


def read_reply(answer):
    head, _, content = answer.partition(b"\r\n\r\n")
    headers = [tuple(line.split(": ", 1)) for line in head.decode().split("\r\n") if line]
    status = [int(value.split()[0]) for name, value in headers if name == "Status"]
    return Reply(status[0] if status else None, headers, content)


def ask(program, *given, body=b"", **more):
    answer, ended = program.request(variables(*given, **more), body)
    assert ended, answer
    return read_reply(answer)


def get(program, link, **more):
    return ask(program, "GET", "/" + link, **more)


def post(program, link, fields=None, **more):
    body = urllib.parse.urlencode(fields or {}).encode()
    return ask(program, "POST", "/" + link, length=len(body), body=body, **more)


class GatewayTest(unittest.TestCase):
    uid, groups, path = vs.WWW_DATA, (42,), vs.PROGRAM  # 42: the group "shadow"

    def setUp(self):
        self.program = fastcgi.Spawned(self.path, self.uid, self.groups)
        self.program.__enter__()
        self.addCleanup(self.program.__exit__)

    def assert_alive(self):
        self.assertIsNone(self.program.process.poll())


class Requests(GatewayTest):
    def test_road_of_one_visitor(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        self.assertIn("<form", get(self.program, link).text)
        self.assertEqual(post(self.program, link, {"password": "x"}).status, 403)
        reply = post(self.program, link, {"password": "secret"})
        self.assertEqual(reply.status, 303)
        file = get(self.program, link, cookie=reply.session_id())
        self.assertEqual((file.status, file.body == CONTENT), (200, True))

    def test_nothing_of_one_request_is_seen_by_the_next(self):
        mine = make_file_link(FILE, redirect_type="url_param", redirect_uri="/album/7")
        admitted = post(self.program, mine).session_id()
        for _ in range(3):
            self.assertEqual(get(self.program, mine, cookie=admitted).status, 200)
            self.assertIn("<form", get(self.program, mine).text)  # no cookie of the former's
            reply = get(self.program, mine, cookie=admitted, query="redirect=1")
            self.assertEqual(reply.get("Location"), "/album/7")
            reply = get(self.program, mine, cookie=admitted, HTTP_RANGE="bytes=5-9")
            self.assertEqual((reply.status, reply.body), (206, CONTENT[5:10]))
            reply = get(self.program, mine, cookie=admitted)  # neither parameter nor range
            self.assertEqual((reply.status, reply.body == CONTENT), (200, True))
            self.assertIsNone(reply.get("Set-Cookie"))

    def test_two_visitors_in_turn(self):
        first = make_file_link(FILE)
        second = make_file_link(FILE, protect_type="password", password="secret")
        one = post(self.program, first, address="192.0.2.1").session_id()
        two = post(self.program, second, {"password": "secret"}, address="192.0.2.2").session_id()
        self.assertNotEqual(one, two)
        for _ in range(3):
            self.assertEqual(get(self.program, first, address="192.0.2.1", cookie=one).status, 200)
            self.assertEqual(get(self.program, second, address="192.0.2.2", cookie=two).status, 200)
            self.assertEqual(get(self.program, second, address="192.0.2.1", cookie=one).status, 403)
            self.assertEqual(get(self.program, first, address="192.0.2.2", cookie=two).status, 403)
            self.assertIn("<form", get(self.program, second, address="192.0.2.3").text)
            self.assertEqual(post(self.program, second, address="192.0.2.3").status, 403)

    def test_form_fields_are_not_the_next_forms(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        self.assertEqual(post(self.program, link, {"password": "secret"}).status, 303)
        self.assertEqual(post(self.program, link, address="192.0.2.4").status, 403)
        self.assertIn("<form", get(self.program, link, address="192.0.2.4").text)

    def test_cookie_is_secure_for_the_request_that_came_over_https(self):
        link = make_file_link(FILE)
        for https in "on", None, "on", None:
            more = {"HTTPS": https} if https else {}
            cookie = post(self.program, link, **more).get("Set-Cookie")
            self.assertEqual(cookie.endswith("; Secure"), bool(https), cookie)

    def test_rest_of_a_refused_body_is_not_the_next_requests(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        good = b"password=secret"
        # Far more than the platform takes, and holding what would be a good form.
        huge = good + b"&x=" + b"y" * 1000000 + b"&" + good
        for broken in (dict(length=len(huge), body=huge), dict(length=200, body=good),
                       dict(length=9, body=good), dict(length="-1", body=good),
                       dict(length="x", body=huge), dict(length=4, body=b"a=%0")):
            with self.subTest(length=broken["length"]):
                reply = ask(self.program, "POST", "/" + link, address="192.0.2.5", **broken)
                self.assertIn(reply.status, (400, 403))
                self.assertEqual(post(self.program, link, {"password": "secret"}).status, 303)
                self.assertEqual(
                    post(self.program, link, {"password": ""}, address="192.0.2.50").status, 403)
                sql("DELETE FROM session")
                os.unlink("/usr/tuvo/etc/private/session/autoblock.db")

    def test_body_that_never_comes_to_its_end_ends_its_request_alone(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        with self.program.begin(variables("POST", "/" + link, length=50)) as connection:
            connection.sendall(fastcgi.record(fastcgi.STDIN, b"password=secret"))
        self.assertEqual(post(self.program, link, {"password": "secret"}).status, 303)

    def test_head_has_no_body(self):
        reply = ask(self.program, "HEAD", "/no-such-link")
        self.assertEqual((reply.status, reply.body), (404, b""))

    def test_connection_is_closed_whatever_the_server_asks_for(self):
        answer, ended = self.program.request(variables("GET", "/no-such-link"), keep=True)
        self.assertTrue(ended)  # and the connection had an end
        self.assertEqual(read_reply(answer).status, 404)
        self.assertEqual(get(self.program, "no-such-link").status, 404)

    def test_failure_of_one_request_is_not_the_next_ones(self):
        link = make_file_link(FILE)
        for _ in range(3):
            reply = ask(self.program, "POST", "/" + link, address="no address", length=0)
            self.assertEqual(reply.status, 500)
            self.assertEqual(post(self.program, link).status, 303)
        self.assert_alive()


class Connections(GatewayTest):
    def admitted(self, path):
        link = make_file_link(path)
        return link, post(self.program, link).session_id()

    def test_that_break_do_no_harm(self):
        link, cookie = self.admitted(LARGE)
        before = self.program.descriptors()
        for _ in range(20):
            with self.program.connect():
                pass
            with self.program.connect() as connection:
                connection.sendall(b"\1\1\0")
            with self.program.connect() as connection:
                connection.sendall(b"GET / HTTP/1.0\r\n\r\n")
            with self.program.begin(variables("GET", "/" + link, cookie=cookie)) as connection:
                fastcgi.send_body(connection, b"")
                connection.recv(5000)  # and away in the middle of a file
        reply = get(self.program, link, cookie=cookie, HTTP_RANGE="bytes=0-9")
        self.assertEqual((reply.status, reply.body), (206, bytes(10)))
        self.assertEqual(self.program.descriptors(), before)

    def test_memory_and_descriptors_stay(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        accounts = make_file_link(FILE, protect_type="user", protect_users=["alice"])

        def round_of_visits():
            for number in range(20):
                address = f"192.0.2.{number + 1}"
                get(self.program, link, address=address)
                reply = post(self.program, link, {"password": "secret"}, address=address)
                get(self.program, link, address=address, cookie=reply.session_id())
                post(self.program, link + "/logout", address=address, cookie=reply.session_id())
                ask(self.program, "POST", "/" + link, length=9, body=b"a=%zz&b=c")
                get(self.program, "no-such-link", query="x=" + "y" * 3000)
            fields = {"zor_username": "alice", "zor_password": "alice-secret"}
            self.assertEqual(post(self.program, accounts, fields).status, 303)

        for _ in range(2):
            round_of_visits()
        descriptors, memory = self.program.descriptors(), self.program.memory()
        for _ in range(6):  # more than 700 requests
            round_of_visits()
        self.assertEqual(self.program.descriptors(), descriptors)
        if not vs.is_sanitized():
            self.assertLess(self.program.memory() - memory, 256)  # kilobytes

    def test_file_that_becomes_shorter_ends_its_answer(self):
        path = "/tmp/shared/shrinking.bin"
        with open(path, "wb") as file:
            file.truncate(100 * 1024 ** 2)
        link, cookie = self.admitted(path)
        with vs.SystemLog() as log:
            with self.program.begin(variables("GET", "/" + link, cookie=cookie)) as connection:
                fastcgi.send_body(connection, b"")
                connection.recv(1000)
                os.truncate(path, 50000)
                while connection.recv(1024 ** 2):
                    pass
            self.assertEqual(get(self.program, "no-such-link").status, 404)
        self.assertRegex("\n".join(log.lines), "event=download .* result=0")
        self.assert_alive()

    def test_file_goes_out_in_bounded_memory(self):
        link, cookie = self.admitted(LARGE)
        before = self.program.memory()
        connection = self.program.begin(variables("GET", "/" + link, cookie=cookie))
        with connection:
            fastcgi.send_body(connection, b"")
            received = 0
            while received < 50 * 1024 ** 2:
                received += len(connection.recv(1024 ** 2))
            self.assertLess(self.program.memory() - before, 4096)


class Ends(GatewayTest):
    def test_sigterm_ends_an_idle_program(self):
        self.assertEqual(get(self.program, "no-such-link").status, 404)
        self.program.process.terminate()
        self.assertEqual(self.program.process.wait(120), 0)

    def test_sigterm_lets_the_running_request_end(self):
        link = make_file_link(LARGE)
        cookie = post(self.program, link).session_id()
        with self.program.begin(variables("GET", "/" + link, cookie=cookie)) as connection:
            fastcgi.send_body(connection, b"")
            answer = connection.recv(65536)
            self.program.process.terminate()
            time.sleep(0.3)
            self.assert_alive()
            received = len(answer)
            while piece := connection.recv(1024 ** 2):
                received += len(piece)
        self.assertGreater(received, os.path.getsize(LARGE))
        self.assertEqual(self.program.process.wait(120), 0)

    def test_process_ends_by_itself_after_many_requests(self):
        for _ in range(10000):
            with self.program.begin(variables("OPTIONS", "/")) as connection:
                fastcgi.send_body(connection, b"")
                self.assertTrue(fastcgi.receive(connection)[1])
        self.assertEqual(self.program.process.wait(120), 0)


class Database(GatewayTest):
    """That cannot be used when the process starts."""
    uid, groups, path = vs.SYSTEM, (), vs.PLAIN_PROGRAM

    def test_ends_the_process_behind_the_answer(self):
        os.rename(vs.DATABASE, vs.DATABASE + ".kept")
        os.mkdir(vs.DATABASE)
        try:
            with vs.SystemLog():
                reply = get(self.program, "abcdef")
            self.assertEqual(reply.status, 500)
            self.assertEqual(self.program.process.wait(120), 1)
        finally:
            os.rmdir(vs.DATABASE)
            os.rename(vs.DATABASE + ".kept", vs.DATABASE)


class Identities(GatewayTest):
    def test_set_user_id_root_without_supplementary_groups(self):
        get(self.program, "no-such-link")
        self.assertEqual(self.program.status("Uid"), ["33", "33", "0", "33"])
        self.assertEqual(self.program.status("Gid"), ["33", "33", "33", "33"])
        self.assertEqual(self.program.status("Groups"), [])

    def test_accounts_log_in(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        fields = {"zor_username": "alice", "zor_password": "alice-secret"}
        for _ in range(3):
            self.assertEqual(post(self.program, link, fields).status, 303)
            self.assertEqual(
                post(self.program, link, dict(fields, zor_password="x")).status, 403)
            self.assertEqual(self.program.status("Uid"), ["33", "33", "0", "33"])

    def test_account_file_is_not_sent(self):
        link = make_file_link("/etc/shadow")
        cookie = post(self.program, link).session_id()
        with vs.SystemLog():
            self.assertEqual(get(self.program, link, cookie=cookie).status, 500)


class SystemIdentity(GatewayTest):
    uid, groups, path = vs.SYSTEM, (), vs.PLAIN_PROGRAM

    def test_needs_no_root(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        for _ in range(3):
            reply = post(self.program, link, {"password": "secret"})
            self.assertEqual(reply.status, 303)
            self.assertEqual(get(self.program, link, cookie=reply.session_id()).body, CONTENT)
        self.assertEqual(self.program.status("Uid"), ["1", "1", "1", "1"])


class Environment(GatewayTest):
    """That of the spawner (fastcgi.Spawned) counts for nothing."""

    def test_spawners_address_is_no_visitors(self):
        link = make_file_link(FILE)
        asked = variables("POST", "/" + link, length=0)
        del asked["REMOTE_ADDR"]
        answer, _ = self.program.request(asked)
        self.assertEqual(read_reply(answer).status, 500)
        self.assertEqual(post(self.program, link).status, 303)

    def test_spawners_settings_are_not_the_protocols(self):
        """They would have a connection closed on which nothing is said at once."""
        connection = self.program.connect()
        time.sleep(0.3)
        with self.program.begin(variables("GET", "/no-such-link"), connection=connection):
            fastcgi.send_body(connection, b"")
            answer, ended = fastcgi.receive(connection)
        self.assertTrue(ended)
        self.assertEqual(read_reply(answer).status, 404)


class DeadConnections(GatewayTest):
    def test_download_that_nobody_waits_for_is_broken_off(self):
        """Also when the whole answer fits into the program's buffer."""
        small = "/tmp/shared/small"
        with open(small, "wb") as file:
            file.write(b"x" * 100)
        for path in small, LARGE:
            link = make_file_link(path)
            cookie = post(self.program, link).session_id()
            with vs.SystemLog() as log:
                os.kill(self.program.pid, signal.SIGSTOP)
                with self.program.begin(variables("GET", "/" + link, cookie=cookie)) as connection:
                    fastcgi.send_body(connection, b"")
                os.kill(self.program.pid, signal.SIGCONT)
                for _ in range(1200):
                    if any("event=download" in line for line in log.lines):
                        break
                    time.sleep(0.05)
            results = [line.rsplit("result=", 1)[1].rstrip("\0") for line in log.lines
                       if "event=download" in line]
            self.assertEqual(results, ["0"], path)
        self.assert_alive()


class Sockets(unittest.TestCase):
    def test_of_the_network_is_refused(self):
        with vs.SystemLog() as log:
            with fastcgi.Spawned(vs.PROGRAM, vs.WWW_DATA, family=socket.AF_INET) as program:
                self.assertEqual(program.process.wait(120), 1)
        self.assertRegex("\n".join(log.lines), r"gateway:\d+ the FastCGI socket is no local one")


def main():
    vs.install(sys.argv[1], sys.argv[2])
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    with open(LARGE, "wb") as file:
        file.truncate(200 * 1024 ** 2)
    return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
