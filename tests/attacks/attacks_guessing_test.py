"""Guessing links' passwords, and ways around what stops it. Arguments: the build folder, the
project's folder."""

import collections
import concurrent.futures
import os
import sys
import unittest

import visitor_server as vs
from visitor_server import Visitor, make_file_link, run_program

SERVER = None
FILE = "/tmp/shared/report.txt"
LIMIT = 10       # failed logins until an address is locked out
PROCESSES = 4    # as packaging/lighttpd/sharing-fastcgi.conf starts them


def password_link(password="secret"):
    return "/sharing/" + make_file_link(FILE, protect_type="password", password=password)


def guess(visitor, path, **headers):
    return visitor.post(path, {"password": "guess"}, **headers).status


class OneAddress(unittest.TestCase):
    def test_guesses_at_many_links_count_together(self):
        visitor = Visitor(SERVER, "127.0.1.1")
        paths = [password_link() for _ in range(LIMIT)]
        self.assertEqual([guess(visitor, path) for path in paths], [403] * LIMIT)
        self.assertEqual(visitor.post(password_link(), {"password": "secret"}).status, 429)

    def test_a_login_that_succeeds_in_between_does_not_clear_the_count(self):
        visitor = Visitor(SERVER, "127.0.1.2")
        path, own = password_link(), "/sharing/" + make_file_link(FILE)
        seen = []
        for _ in range(LIMIT):
            seen.append(guess(visitor, path))
            visitor.post(own)
        self.assertEqual(seen, [403] * LIMIT)
        self.assertEqual(visitor.post(path, {"password": "secret"}).status, 429)

    def test_headers_make_no_other_address(self):
        visitor = Visitor(SERVER, "127.0.1.3")
        path = password_link()
        seen = []
        for number in range(LIMIT):
            address = f"198.51.100.{number}"
            seen.append(guess(visitor, path, X_Forwarded_For=address, X_Real_IP=address,
                              Forwarded="for=" + address, Client_IP=address, X_Client_IP=address,
                              True_Client_IP=address, X_Cluster_Client_IP=address, Via=address,
                              CF_Connecting_IP=address, Remote_Addr=address, X_TUVO_SHARING=path,
                              X_TUVO_Remote_IP=address, X_TUVO_Forwarded_For=address))
        self.assertEqual(seen, [403] * LIMIT)
        reply = visitor.post(path, {"password": "secret"}, X_Forwarded_For="203.0.113.9",
                             X_TUVO_Remote_IP="203.0.113.9")
        self.assertEqual(reply.status, 429)

    def test_cookies_and_sessions_make_no_other_address(self):
        path = password_link()
        for number in range(LIMIT):
            visitor = Visitor(SERVER, "127.0.1.4")  # a browser of its own each time
            visitor.session_id = f"{number:032}"
            self.assertEqual(guess(visitor, path), 403)
        self.assertEqual(guess(Visitor(SERVER, "127.0.1.4"), path), 429)

    def test_other_ways_of_sending_a_form_are_counted_too(self):
        visitor = Visitor(SERVER, "127.0.1.5")
        path = password_link()
        seen = []
        for number in range(LIMIT):
            if number % 2:
                body = ("--b\r\nContent-Disposition: form-data; name=\"password\"\r\n\r\n"
                        "guess\r\n--b--\r\n")
                kind = "multipart/form-data; boundary=b"
            else:
                body, kind = "", "application/x-www-form-urlencoded"  # a form without its field
            seen.append(visitor.request("POST", path, body, {"Content-Type": kind}).status)
        self.assertEqual(seen, [403] * LIMIT)
        self.assertEqual(guess(visitor, path), 429)

    def test_accounts_are_guessed_no_more_often(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        visitor = Visitor(SERVER, "127.0.1.6")
        with concurrent.futures.ThreadPoolExecutor(4) as threads:  # PAM takes its time
            seen = collections.Counter(threads.map(
                lambda number: visitor.post("/sharing/" + link, {
                    "zor_username": f"alice{'' if number % 2 else number}",
                    "zor_password": "x"}).status, range(LIMIT)))
        self.assertEqual(seen, {403: LIMIT})
        self.assertEqual(visitor.post("/sharing/" + link, {
            "zor_username": "alice", "zor_password": "alice-secret"}).status, 429)


class Ipv6(unittest.TestCase):
    """Started as the web server would start the program for such an address."""

    def post(self, link, password, address):
        return run_program("POST", "/" + link, b"password=" + password, REMOTE_ADDR=address).status

    def test_range_of_64_bits_counts_as_one(self):
        link = password_link().rpartition("/")[2]
        seen = [self.post(link, b"guess", f"2001:db8:1:1:{number:x}::{number:x}")
                for number in range(LIMIT)]
        self.assertEqual(seen, [403] * LIMIT)
        self.assertEqual(self.post(link, b"secret", "2001:db8:1:1:ffff:ffff:ffff:ffff"), 429)
        self.assertEqual(self.post(link, b"secret", "2001:0DB8:0001:0001::1"), 429)
        self.assertEqual(self.post(link, b"secret", "2001:db8:1:2::1"), 303)

    def test_ipv4_in_ipv6_is_the_ipv4_address(self):
        link = password_link().rpartition("/")[2]
        for number in range(LIMIT):
            address = "192.0.2.99" if number % 2 else "::ffff:192.0.2.99"
            self.assertEqual(self.post(link, b"guess", address), 403)
        self.assertEqual(self.post(link, b"secret", "::ffff:c000:263"), 429)
        self.assertEqual(self.post(link, b"secret", "::ffff:192.0.2.98"), 303)


class ManyAddresses(unittest.TestCase):
    """Each has its own ten guesses: that is all that addresses can be held to."""

    def test_each_has_its_own_count_and_the_link_stays_open_for_others(self):
        path = password_link()
        def all_of(number):
            visitor = Visitor(SERVER, f"127.0.2.{number}")
            return [guess(visitor, path) for _ in range(LIMIT + 1)]
        with concurrent.futures.ThreadPoolExecutor(4) as threads:
            for seen in threads.map(all_of, range(1, 7)):
                self.assertEqual(seen, [403] * LIMIT + [429])
        # Nobody can lock a link's visitors out but from their own address.
        self.assertEqual(Visitor(SERVER, "127.0.2.99").post(path, {"password": "secret"}).status,
                         303)


class AtOnce(unittest.TestCase):
    def test_no_more_than_the_processes_that_answer_are_over_the_limit(self):
        configuration = vs.fastcgi_configuration(processes=PROCESSES)
        with vs.WebServer(configuration) as server:
            path = password_link()
            with concurrent.futures.ThreadPoolExecutor(40) as threads:
                seen = collections.Counter(threads.map(
                    lambda _: guess(Visitor(server, "127.0.3.1"), path), range(200)))
        self.assertEqual(set(seen), {403, 429})
        self.assertGreaterEqual(seen[403], LIMIT)
        self.assertLess(seen[403], LIMIT + PROCESSES)


def main():
    vs.install(sys.argv[1], sys.argv[2])
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(b"content")
    global SERVER
    with vs.WebServer() as SERVER:
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
