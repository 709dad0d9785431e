"""What the visitor's program tells the system log about visitors. Arguments: the build folder, the
project's folder."""

import http.client
import os
import re
import sqlite3
import sys
import time
import unittest

import visitor_server as vs
from visitor_server import Visitor, change_data, make_file_link, sql

SERVER = None
FILE = "/tmp/shared/the-report.txt"
CONTENT = os.urandom(40000)
LOG_INFO = 6


def path_of(link):
    return "/sharing/" + link


def row_of(link):
    return sql("SELECT id FROM entry WHERE hash=?", link)[0][0]


def admitted(link, fields=None, address="127.0.0.1"):
    visitor = Visitor(SERVER, address)
    assert visitor.post(path_of(link), fields).status == 303
    return visitor


class EventsTest(unittest.TestCase):
    def setUp(self):
        self.log = vs.SystemLog()
        self.log.__enter__()
        self.addCleanup(self.log.__exit__)

    def take(self, count):
        """The event lines so far, `count` of them, without what stands before; none is left."""
        time.sleep(0.1 if count == 0 else 0)
        for _ in range(1200):
            lines = [line for line in self.log.lines if "sharing event=" in line]
            if len(lines) >= count:
                break
            time.sleep(0.05)
        for line in lines:
            self.assertEqual(int(re.match(r"<(\d+)>", line).group(1)) % 8, LOG_INFO, line)
            self.assertIn(" sharing.cgi: ", line)
        self.log.lines.clear()
        return [line.rstrip("\0").split("sharing.cgi: ", 1)[1] for line in lines]

    def assert_events(self, *events):
        self.assertEqual(self.take(len(events)), list(events))

    def event(self, name, link, result, address="127.0.0.1"):
        row = row_of(link) if link else 0
        return f"sharing event={name} link={row} address={address} result={result}"


class Logins(EventsTest):
    def test_success(self):
        link = make_file_link(FILE)
        admitted(link, address="127.0.0.41")
        self.assert_events(self.event("login", link, 1, "127.0.0.41"))

    def test_wrong_password(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        Visitor(SERVER, "127.0.0.42").post(path_of(link), {"password": "guess"})
        self.assert_events(self.event("login", link, -9, "127.0.0.42"))

    def test_wrong_account(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        visitor = Visitor(SERVER, "127.0.0.43")
        for name, secret, code in ("alice", "x", -2), ("bob", "bob-secret", -10), \
                ("alice", "alice-secret", 1):
            visitor.post(path_of(link), {"zor_username": name, "zor_password": secret})
            self.assert_events(self.event("login", link, code, "127.0.0.43"))

    def test_unknown_link(self):
        Visitor(SERVER).post(path_of("no-such-link"))
        self.assert_events(self.event("login", None, -3))

    def test_used_up_link(self):
        link = make_file_link(FILE, expire_times=1, use_count=1)
        Visitor(SERVER).post(path_of(link))
        self.assert_events(self.event("login", link, -11))


class Refusals(EventsTest):
    def setUp(self):
        super().setUp()
        self.link = make_file_link(FILE)
        self.visitor = admitted(self.link)
        self.take(1)

    def test_stolen_cookie(self):
        thief = Visitor(SERVER, "127.0.0.44")
        thief.session_id = self.visitor.session_id
        thief.get(path_of(self.link))
        self.assert_events(self.event("refusal", self.link, -8, "127.0.0.44"))

    def test_session_without_admission(self):
        other = make_file_link(FILE)
        self.visitor.get(path_of(other))
        self.assert_events(self.event("refusal", other, -7))

    def test_unknown_session(self):
        Visitor(SERVER).get(path_of(self.link), Cookie="sharing_sid=" + "x" * 32)
        self.assert_events(self.event("refusal", self.link, -5))

    def test_by_a_look_at_the_head_alone(self):
        Visitor(SERVER).request("HEAD", path_of(self.link), None,
                                {"Cookie": "sharing_sid=" + "x" * 32})
        self.assert_events(self.event("refusal", self.link, -5))

    def test_link_whose_row_does_not_load(self):
        event = self.event("login", self.link, -3)
        sql("UPDATE entry SET data='[' WHERE hash=?", self.link)
        Visitor(SERVER).post(path_of(self.link))
        self.assert_events(event)

    def test_address_that_is_locked_out(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        visitor = Visitor(SERVER, "127.0.0.45")
        for _ in range(10):
            visitor.post(path_of(link), {"password": "guess"})
        self.take(10)
        visitor.post(path_of(link), {"password": "secret"})
        self.assert_events(self.event("refusal", link, -8, "127.0.0.45"))

    def test_form_of_another_site(self):
        self.visitor.post(path_of(self.link), Sec_Fetch_Site="cross-site")
        self.visitor.post(path_of(self.link) + "/logout", Sec_Fetch_Site="same-site")
        self.assert_events(*[self.event("refusal", self.link, 109)] * 2)

    def test_first_look_is_no_event(self):
        Visitor(SERVER).get(path_of(self.link))
        Visitor(SERVER).head(path_of(self.link))
        Visitor(SERVER).get(path_of("no-such-link"))
        self.assert_events()


class Downloads(EventsTest):
    def setUp(self):
        super().setUp()
        self.link = make_file_link(FILE)
        self.visitor = admitted(self.link)
        self.take(1)

    def test_whole_file(self):
        self.visitor.get(path_of(self.link))
        self.assert_events(self.event("download", self.link, 1))

    def test_part_of_a_file(self):
        self.visitor.get(path_of(self.link), Range="bytes=5-9")
        self.assert_events(self.event("download", self.link, 1))

    def test_answers_without_the_files_bytes_are_none(self):
        self.visitor.head(path_of(self.link))
        self.visitor.get(path_of(self.link), If_None_Match="*")
        self.visitor.get(path_of(self.link), Range=f"bytes={len(CONTENT)}-")
        self.assert_events()

    def test_broken_off(self):
        with open("/tmp/shared/large", "wb") as file:
            file.truncate(200 * 1024 ** 2)
        link = make_file_link("/tmp/shared/large")
        visitor = admitted(link)
        self.take(1)
        connection = http.client.HTTPConnection("127.0.0.1", SERVER.port, timeout=60)
        connection.request("GET", path_of(link),
                           headers={"Cookie": "sharing_sid=" + visitor.session_id})
        connection.getresponse().read(1000)
        connection.close()
        self.assert_events(self.event("download", link, 0))


class Logouts(EventsTest):
    def test_once(self):
        link = make_file_link(FILE)
        visitor = admitted(link)
        self.take(1)
        visitor.get(path_of(link) + "/logout")
        for _ in range(2):  # the second ends nothing
            visitor.post(path_of(link) + "/logout")
        Visitor(SERVER).post(path_of(link) + "/logout")
        self.assert_events(self.event("logout", link, 1))


    def test_that_did_not_come_about(self):
        link = make_file_link(FILE)
        visitor = admitted(link)
        self.take(1)
        other = sqlite3.connect(vs.DATABASE, isolation_level=None)
        other.execute("BEGIN IMMEDIATE")  # for longer than the program waits
        self.assertEqual(visitor.post(path_of(link) + "/logout").status, 500)
        other.execute("ROLLBACK")
        other.close()
        self.assert_events(self.event("logout", link, 0))
        self.assertEqual(visitor.get(path_of(link)).status, 200)


class Secrets(EventsTest):
    def test_nothing_that_opens_a_link_is_in_any_line(self):
        link = make_file_link(FILE, protect_type="password", password="the-secret")
        accounts = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        missing = make_file_link("/tmp/shared/missing-7")
        change_data(missing, redirect_type="always", redirect_uri="javascript:evil-8")
        visitor = Visitor(SERVER, "127.0.0.46")
        for path in link, accounts, missing, "no-such-link":
            visitor.post(path_of(path) + "?password=the-query",
                         {"password": "the-guess", "zor_username": "the-name",
                          "zor_password": "the-account-secret", "_sid": "the-sid"})
            visitor.post(path_of(path), {"password": "the-secret"})
            visitor.get(path_of(path))
            visitor.get(path_of(path), Cookie="sharing_sid=the-cookie")
            visitor.post(path_of(path), Sec_Fetch_Site="cross-site")
            visitor.post(path_of(path) + "/logout")
        visitor.post(path_of(link) + "/x", {"password": "the-secret"})
        for _ in range(1200):
            if sum("sharing event=" in line for line in self.log.lines) > 15:
                break
            time.sleep(0.05)
        time.sleep(0.1)  # and whatever else there may be
        lines = "\n".join(line for line in self.log.lines if " sharing.cgi: " in line)
        self.assertGreater(lines.count("sharing event="), 15)
        for secret in (link, accounts, missing, "no-such-link", visitor.session_id, "the-secret",
                       "the-guess", "the-name", "the-account-secret", "the-query", "the-cookie",
                       "the-sid", "missing-7", "the-report", "evil-8", "/tmp/shared"):
            self.assertNotIn(secret, lines)


def main():
    global SERVER
    vs.install(sys.argv[1], sys.argv[2])
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    with vs.WebServer() as SERVER:
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
