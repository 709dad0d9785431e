"""Sessions that somebody else knows: put into a visitor's browser, stolen, made up. Arguments: the
build folder, the project's folder."""

import os
import sys
import threading
import unittest

import visitor_server as vs
from visitor_server import Visitor, make_file_link, sql

SERVER = None
FILE = "/tmp/shared/report.txt"
CONTENT = b"content of the shared file"


def path_of(link):
    return "/sharing/" + link


def open_link(**members):
    return path_of(make_file_link(FILE, **members))


def password_link(**members):
    return open_link(protect_type="password", password="secret", **members)


class SessionsTest(unittest.TestCase):
    def assert_in(self, visitor, path):
        reply = visitor.get(path)
        self.assertEqual((reply.status, reply.body), (200, CONTENT))

    def assert_out(self, visitor, path):
        reply = visitor.get(path)
        self.assertEqual(reply.status, 403)
        self.assertNotIn(CONTENT, reply.body)

    def admitted(self, path, fields=None, address="127.0.0.1"):
        visitor = Visitor(SERVER, address)
        self.assertEqual(visitor.post(path, fields).status, 303)
        return visitor


class Fixation(SessionsTest):
    """The attacker has put a session of his own into the victim's browser."""

    def victim(self, attacker, address="127.0.0.1"):
        victim = Visitor(SERVER, address)
        victim.session_id = attacker.session_id
        return victim

    def test_attacker_is_not_admitted_with_the_victim(self):
        # Address for address: behind one router both come from the same.
        for binds in True, False:
            for address in "127.0.0.1", "127.0.4.1":
                attacker = self.admitted(open_link())
                victim = self.victim(attacker, address)
                path = password_link(enable_match_ip=binds)
                self.assertEqual(victim.post(path, {"password": "secret"}).status, 303)
                self.assertNotEqual(victim.session_id, attacker.session_id)
                self.assert_in(victim, path)
                self.assert_out(attacker, path)

    def test_victims_account_is_not_the_attackers(self):
        own = open_link(protect_type="user", protect_users=["bob"])
        attacker = self.admitted(own, {"zor_username": "bob", "zor_password": "bob-secret"})
        path = open_link(protect_type="user", protect_users=["alice"])
        victim = self.victim(attacker)
        victim.post(path, {"zor_username": "alice", "zor_password": "alice-secret"})
        self.assert_in(victim, path)
        self.assert_out(attacker, path)
        self.assertEqual(sql("SELECT count(*) FROM session WHERE session_id = ?",
                             attacker.session_id), [(0,)])

    def test_identifier_that_is_made_up_is_not_taken(self):
        victim = Visitor(SERVER)
        victim.session_id = chosen = "a" * 32
        path = password_link()
        victim.post(path, {"password": "secret"})
        self.assertNotEqual(victim.session_id, chosen)
        self.assertEqual(sql("SELECT count(*) FROM session WHERE session_id = ?", chosen), [(0,)])
        self.assert_in(victim, path)

    def test_login_that_fails_leaves_the_session_as_it_is(self):
        visitor = self.admitted(path := open_link(), address="127.0.4.2")
        former = visitor.session_id
        self.assertEqual(visitor.post(password_link(), {"password": "x"}).status, 403)
        self.assertEqual(visitor.session_id, former)
        self.assert_in(visitor, path)

    def test_every_login_has_an_identifier_of_its_own(self):
        visitor = Visitor(SERVER)
        paths = [password_link() for _ in range(4)]
        seen = set()
        for path in paths + paths:
            visitor.post(path, {"password": "secret"})
            seen.add(visitor.session_id)
        self.assertEqual(len(seen), 8)
        for path in paths:
            self.assert_in(visitor, path)
        self.assertEqual(sql("SELECT count(*) FROM token WHERE session_id = (SELECT id FROM session "
                             "WHERE session_id = ?)", visitor.session_id), [(4,)])
        for former in seen - {visitor.session_id}:
            visitor.session_id = former
            self.assert_out(visitor, paths[0])


class Stolen(SessionsTest):
    def test_login_from_elsewhere_takes_nothing_over(self):
        roams = open_link(enable_match_ip=False)
        bound = password_link()
        owner = self.admitted(bound, {"password": "secret"})
        owner.post(roams)
        thief = Visitor(SERVER, "127.0.4.3")
        thief.session_id = owner.session_id
        thief.post(open_link())
        self.assert_out(thief, bound)
        self.assert_in(owner, bound)  # and is not logged out by it
        self.assert_in(owner, roams)

    def test_session_of_one_link_opens_no_other(self):
        visitor = self.admitted(open_link())
        for path in open_link(), password_link(), open_link(protect_type="user",
                                                            protect_users=["alice"]):
            self.assert_out(visitor, path)

    def test_logout_ends_it_for_whoever_has_it(self):
        path = open_link()
        visitor = self.admitted(path)
        thief = Visitor(SERVER)
        thief.session_id = visitor.session_id
        visitor.post(path + "/logout")
        self.assert_out(thief, path)

    def test_identifiers_do_not_follow_from_each_other(self):
        path = open_link()
        seen = [self.admitted(path).session_id for _ in range(20)]
        self.assertEqual(len(set(seen)), 20)
        for place in range(32):  # no part of them that stays the same, or counts
            self.assertGreater(len({text[place] for text in seen}), 5)


class AtOnce(SessionsTest):
    def test_two_logins_with_one_cookie_lose_no_admission_for_good(self):
        """Both bring the former session; the browser keeps one of the two new ones."""
        first = open_link()
        for _ in range(5):
            former = self.admitted(first)
            paths = [open_link(), open_link()]
            browsers = [Visitor(SERVER), Visitor(SERVER)]
            threads = []
            for browser, path in zip(browsers, paths):
                browser.session_id = former.session_id
                threads.append(threading.Thread(target=browser.post, args=(path,)))
            for thread in threads:
                thread.start()
            for thread in threads:
                thread.join()
            for browser, path in zip(browsers, paths):
                self.assert_in(browser, path)
            self.assertEqual([browser.get(first).status for browser in browsers].count(200), 1)
            self.assert_out(former, first)


def main():
    vs.install(sys.argv[1], sys.argv[2])
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    global SERVER
    with vs.WebServer() as SERVER:
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
