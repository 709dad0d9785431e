"""What an owner's change does to visitors who are in, and to those in the middle of a download.
Arguments: the build folder, the project's folder."""

import http.client
import os
import sys
import threading
import time
import unittest

import visitor_server as vs
import webapi_server as ws
from visitor_server import Visitor, make_file_link, sql

SERVER = None
OWNER = None
FILE = "/tmp/shared/report.txt"
CONTENT = b"content of the shared file"
LARGE = "/tmp/shared/large.bin"
LARGE_SIZE = 64 * 1024 ** 2
MANY = int(os.environ.get("TUVO_ROUNDS", "8"))


def path_of(link):
    return "/sharing/" + link


class ChangesTest(unittest.TestCase):
    def setUp(self):
        self.link = make_file_link(FILE)
        self.path = path_of(self.link)
        self.visitor = self.admitted()

    def admitted(self, fields=None, path=None):
        visitor = Visitor(SERVER)
        self.assertEqual(visitor.post(path or self.path, fields).status, 303)
        return visitor

    def id(self):
        return sql("SELECT id FROM entry WHERE hash=?", self.link)[0][0]

    def change(self, **settings):
        answer = OWNER.call("alice", "set", id=self.id(), **settings)
        self.assertTrue(answer.ok, answer)

    def sign_out(self):
        answer = OWNER.call("alice", "sign_out", hash=self.link)
        self.assertTrue(answer.ok, answer)
        return answer.data["signed_out"]

    def assert_visit(self, status):
        reply = self.visitor.get(self.path)
        self.assertEqual(reply.status, status)
        self.assertEqual(CONTENT in reply.body, status == 200)


class Changes(ChangesTest):
    def test_password_that_is_new(self):
        self.change(protect_password="secret")
        self.assert_visit(403)
        self.assertEqual(self.visitor.post(self.path, {"password": "secret"}).status, 303)
        self.assert_visit(200)

    def test_password_that_is_another(self):
        self.change(protect_password="first")
        self.visitor = self.admitted({"password": "first"})
        self.change(protect_password="second")
        self.assert_visit(403)
        self.assertEqual(self.visitor.post(self.path, {"password": "first"}).status, 403)

    def test_protection_by_accounts(self):
        self.change(protect_users=["alice"])
        self.assert_visit(403)

    def test_account_that_is_taken_off_the_list(self):
        self.change(protect_users=["alice", "bob"])
        self.visitor = self.admitted({"zor_username": "bob", "zor_password": "bob-secret"})
        self.assert_visit(200)
        self.change(protect_users=["alice"])
        self.assert_visit(403)

    def test_accounts_that_become_a_password(self):
        self.change(protect_users=["bob"])
        self.visitor = self.admitted({"zor_username": "bob", "zor_password": "bob-secret"})
        self.change(protect_password="secret")
        self.assert_visit(403)

    def test_title_end_and_limit_leave_them_in(self):
        self.change(protect_title="x", expire_at="+1h", expire_times=5, redirect_type="none")
        self.assert_visit(200)

    def test_link_that_is_switched_off(self):
        self.change(enabled=False)
        self.assert_visit(404)
        self.change(enabled=True)
        self.assert_visit(200)  # the admission was not taken away

    def test_link_whose_begin_is_put_off(self):
        self.change(start_at="+1h")
        self.assert_visit(404)
        self.change(start_at="")
        self.assert_visit(200)

    def test_another_file_is_what_they_get(self):
        other = FILE + ".other"
        with open(other, "wb") as file:
            file.write(b"of another file")
        self.change(app={"path": other})
        reply = self.visitor.get(self.path)
        self.assertEqual((reply.status, reply.body), (200, b"of another file"))

    def test_link_that_has_expired(self):
        sql("UPDATE entry SET expire_at = ? WHERE hash = ?", int(time.time()) - 1, self.link)
        self.assert_visit(404)

    def test_link_that_is_used_up_keeps_those_who_are_in(self):
        self.change(expire_times=1, use_count=1)
        self.assertEqual(Visitor(SERVER).post(self.path).status, 410)
        self.assert_visit(200)

    def test_limit_below_the_uses_puts_everybody_out(self):
        self.change(expire_times=5, use_count=3)
        self.assert_visit(200)
        self.change(expire_times=2)
        self.assert_visit(404)
        self.assertNotEqual(Visitor(SERVER).post(self.path).status, 303)
        self.change(expire_times=3)
        self.assert_visit(200)

    def test_end_in_the_past_puts_everybody_out(self):
        self.change(expire_at="2020-01-01")
        self.assert_visit(404)
        self.change(expire_at="+1h")
        self.assert_visit(200)

    def test_link_that_is_deleted_and_made_again(self):
        self.assertTrue(OWNER.call("alice", "delete", hash=self.link).ok)
        self.assert_visit(404)
        answer = OWNER.call("alice", "create", project_name="file", hash=self.link,
                            app={"path": FILE})
        self.assertTrue(answer.ok, answer)
        self.assert_visit(403)

    def test_hash_that_becomes_another_links(self):
        """The admission stays with the link and does not go with the hash."""
        former, new = self.link, self.link + "-new"
        self.change(hash=new)
        answer = OWNER.call("alice", "create", project_name="file", hash=former, app={"path": FILE})
        self.assertTrue(answer.ok, answer)
        self.assert_visit(403)
        self.link, self.path = new, path_of(new)
        self.assert_visit(200)

    def test_change_by_a_program_that_asks_the_library_alone(self):
        """What it does not sign out stays in; a sign-out ends that."""
        other = make_file_link(FILE, protect_type="password", password="second")
        sql("UPDATE entry SET data = (SELECT data FROM entry WHERE hash = ?) WHERE hash = ?", other,
            self.link)
        self.assertEqual(Visitor(SERVER).post(self.path, {"password": "x"}).status, 403)
        self.assert_visit(200)
        self.sign_out()
        self.assert_visit(403)


class SigningOut(ChangesTest):
    def test_everybody_is_out_at_the_next_request(self):
        others = [self.admitted() for _ in range(3)]
        self.assertEqual(self.sign_out(), 4)
        for visitor in others + [self.visitor]:
            self.assertEqual(visitor.get(self.path).status, 403)

    def test_sessions_stay_for_other_links(self):
        other = path_of(make_file_link(FILE))
        self.visitor.post(other)
        self.sign_out()
        self.assert_visit(403)
        self.assertEqual(self.visitor.get(other).status, 200)

    def test_visits_at_that_moment_bring_nothing_back(self):
        for _ in range(MANY):
            self.visitor.post(self.path)
            over = threading.Event()
            session_id = self.visitor.session_id

            def visit():
                visitor = Visitor(SERVER)
                visitor.session_id = session_id
                while not over.is_set():
                    visitor.get(self.path)
            threads = [threading.Thread(target=visit) for _ in range(3)]
            for thread in threads:
                thread.start()
            self.assertEqual(self.sign_out(), 1)
            self.assert_visit(403)
            over.set()
            for thread in threads:
                thread.join()
            self.assert_visit(403)
            self.assertEqual(sql("SELECT count(*) FROM token WHERE entry_id = ?", self.id()), [(0,)])

    def test_new_password_admits_nobody_by_the_former_one(self):
        """With logins under way all the time: who gets in after the change knew the new one."""
        self.change(protect_password="first", enable_match_ip=False)
        over = threading.Event()

        def log_in():
            while not over.is_set():
                Visitor(SERVER, "127.0.6.1").post(self.path, {"password": "first"})
        # From an address of its own: what the change makes wrong may lock it out.
        thread = threading.Thread(target=log_in)
        thread.start()
        time.sleep(0.2)
        self.change(protect_password="second")
        over.set()
        thread.join()
        self.assertEqual(sql("SELECT count(*) FROM token WHERE entry_id = ?", self.id()), [(0,)])


class InTheMiddleOfADownload(ChangesTest):
    """Admission is decided when a request comes: an answer that has begun comes to its end."""

    def setUp(self):
        self.link = make_file_link(LARGE)
        self.path = path_of(self.link)
        self.visitor = self.admitted()

    def check(self, change, status):
        connection = http.client.HTTPConnection("127.0.0.1", SERVER.port, timeout=60)
        connection.request("GET", self.path,
                           headers={"Cookie": "sharing_sid=" + self.visitor.session_id})
        response = connection.getresponse()
        self.assertEqual(response.status, 200)
        size = len(response.read(1000000))
        change()
        self.assertEqual(self.visitor.get(self.path, Range="bytes=1000000-").status, status)
        while piece := response.read(1 << 20):
            size += len(piece)
        connection.close()
        self.assertEqual(size, LARGE_SIZE)
        self.assertEqual(self.visitor.get(self.path, Range="bytes=1000000-").status, status)

    def test_link_that_is_switched_off(self):
        self.check(lambda: self.change(enabled=False), 404)

    def test_link_that_expires(self):
        self.check(lambda: sql("UPDATE entry SET expire_at = 1000 WHERE hash = ?", self.link), 404)

    def test_link_that_is_used_up(self):
        self.check(lambda: self.change(expire_times=1, use_count=1), 206)

    def test_link_that_is_deleted(self):
        self.check(lambda: OWNER.call("alice", "delete", hash=self.link), 404)

    def test_everybody_signed_out(self):
        self.check(self.sign_out, 403)


def main():
    ws.install(sys.argv[1], sys.argv[2], "/tmp/shared")
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    with open(LARGE, "wb") as file:
        file.truncate(LARGE_SIZE)
    global SERVER, OWNER
    OWNER = ws.ToolFront()
    with vs.WebServer() as SERVER:
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
