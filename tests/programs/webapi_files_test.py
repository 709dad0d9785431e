"""Which files the web API lets owners share, asked through both of its fronts. Arguments: the build
folder, the project's folder."""

import fcntl
import os
import shutil
import signal
import sqlite3
import sys
import threading
import time
import unittest

import visitor_server as vs
import webapi_server as ws
from visitor_server import sql

FRONTS = {}
SHARED = "/tmp/shared"
OUTSIDE = "/tmp/outside"
ALICE, BOB, FRIENDS = 2001, 2002, 3001


def make(path, owner=ALICE, mode=0o600, group=None):
    """A file of that owner; its path."""
    os.makedirs(os.path.dirname(path), exist_ok=True)
    with open(path, "w") as file:
        file.write("content")
    os.chown(path, owner, owner if group is None else group)
    os.chmod(path, mode)
    return path


class Files:
    """The tests, for one front."""

    front = None

    @property
    def api(self):
        return FRONTS[self.front]

    def setUp(self):
        for folder in SHARED, OUTSIDE, "/tmp/linked-target":
            shutil.rmtree(folder, ignore_errors=True)
            os.makedirs(folder)
            os.chmod(folder, 0o755)

    def create(self, path, who="alice", **settings):
        return self.api.call(who, "create", project_name="file", app={"path": path}, **settings)

    def shares(self, path, stored=None, who="alice", **settings):
        answer = self.create(path, who, **settings)
        self.assertTrue(answer.ok, answer)
        self.assertEqual(answer.data["link"]["app"], {"path": stored or path})
        return answer.data["link"]

    def refuses(self, path, who="alice", **settings):
        before = sql("SELECT COUNT(*) FROM entry")
        answer = self.create(path, who, **settings)
        self.assertEqual((answer.code, answer.field), (206, "app"), (path, answer))
        self.assertEqual(sql("SELECT COUNT(*) FROM entry"), before)
        return answer.message

    def test_own_file_that_nobody_else_may_read(self):
        self.shares(make(SHARED + "/a"))
        self.refuses(SHARED + "/a", "bob")

    def test_others_file_by_its_mode(self):
        self.refuses(make(SHARED + "/closed", BOB))
        self.shares(make(SHARED + "/open", BOB, 0o644))
        self.shares(make(SHARED + "/for-friends", BOB, 0o640, FRIENDS))  # alice is one of them
        self.refuses(make(SHARED + "/roots", 0, 0o600, 0))
        self.refuses(make(SHARED + "/shadows", 0, 0o640, 42))  # the web server is in this group
        self.refuses(make(SHARED + "/web-servers", 33, 0o600))

    def test_administrators_file_rule_is_the_owners(self):
        mine = make(SHARED + "/alices")
        self.refuses(mine, "carol")
        self.shares(mine, who="carol", owner_user="alice")
        self.refuses(mine, "carol", owner_user="bob")

    def test_files_that_are_none(self):
        os.mkfifo(SHARED + "/pipe")
        os.chown(SHARED + "/pipe", ALICE, ALICE)
        os.mkdir(SHARED + "/folder")
        os.chown(SHARED + "/folder", ALICE, ALICE)
        os.symlink("nothing", SHARED + "/nowhere")
        os.symlink("loop", SHARED + "/loop")
        os.symlink("/dev/zero", SHARED + "/device")
        for name in ("pipe", "folder", "nowhere", "loop", "device", "missing", "", ".", "..",
                     "folder/", "a" * 300, "x/" * 3000):
            self.refuses(f"{SHARED}/{name}")

    def test_paths_that_are_none(self):
        make(SHARED + "/a")
        os.chdir("/tmp/shared")
        try:
            for path in "", "a", "./a", "shared/a", "~/a", " " + SHARED + "/a", SHARED + "/a/":
                self.refuses(path)
        finally:
            os.chdir("/")

    def test_app_without_a_path(self):
        for app in {}, {"path": 7}, {"path": None}, {"path": ["/tmp/shared/a"]}, {"Path": "/x"}:
            answer = self.api.call("alice", "create", project_name="file", app=app)
            self.assertEqual((answer.code, answer.field), (208, "app"))
        answer = self.api.call("alice", "create", project_name="file")
        self.assertEqual((answer.code, answer.field), (208, "app"))

    def test_outside_of_the_shared_folders(self):
        self.refuses(make(OUTSIDE + "/a"))
        self.refuses(make("/tmp/shared-not/a"))
        self.refuses("/etc/passwd")
        self.refuses(SHARED)
        self.refuses(vs.DATABASE)
        make(SHARED + "/a")
        self.refuses(f"{SHARED}/../outside/a")
        self.refuses(f"{SHARED}/../../etc/passwd")
        self.refuses(f"/proc/self/root{OUTSIDE}/a")

    def test_symbolic_link_that_leads_outside(self):
        os.symlink(make(OUTSIDE + "/a"), SHARED + "/link")
        os.symlink(OUTSIDE, SHARED + "/folder")
        os.symlink("/etc/shadow", SHARED + "/shadow")
        for name in "link", "folder/a", "shadow":
            self.refuses(f"{SHARED}/{name}")

    def test_path_is_stored_resolved(self):
        target = make(SHARED + "/inner/a")
        os.symlink("inner", SHARED + "/folder")
        os.symlink(target, SHARED + "/link")
        os.symlink(SHARED, OUTSIDE + "/way-in")
        for path in (f"{SHARED}/folder/a", f"{SHARED}/link", f"{SHARED}/inner/../inner//./a",
                     f"{OUTSIDE}/way-in/inner/a", f"//tmp//shared/inner/a",
                     f"/tmp/../tmp/shared/inner/a"):
            self.shares(path, target)

    def test_shared_folder_that_is_a_symbolic_link(self):
        # The configuration names /tmp/linked, which leads here.
        target = make("/tmp/linked-target/a")
        self.shares("/tmp/linked/a", target)
        self.shares(target)

    def test_hard_link_is_a_file_of_the_folder(self):
        os.link(make(OUTSIDE + "/a", BOB), SHARED + "/hard")
        self.refuses(SHARED + "/hard")
        self.shares(SHARED + "/hard", who="bob")

    def test_folder_that_the_owner_may_not_pass(self):
        make(SHARED + "/closed/a", mode=0o644)
        os.chown(SHARED + "/closed", BOB, BOB)
        os.chmod(SHARED + "/closed", 0o700)
        self.refuses(SHARED + "/closed/a")
        self.shares(SHARED + "/closed/a", who="carol", owner_user="root")

    def test_file_that_is_not_there_and_one_that_may_not_be_read_are_told_alike(self):
        make(SHARED + "/closed/a", BOB)
        os.chmod(SHARED + "/closed", 0o700)
        self.assertEqual(self.refuses(SHARED + "/closed/a"), self.refuses(SHARED + "/closed/b"))
        make(OUTSIDE + "/closed", BOB)
        self.assertEqual(self.refuses(OUTSIDE + "/closed"), self.refuses(OUTSIDE + "/missing"))

    def test_names_of_files(self):
        for name in "a b", "日本😀", "'\"\\;$(x)", "-n", "a\nb", "\u202egnp", "x (deleted)":
            self.shares(make(f"{SHARED}/{name}"))

    def test_name_that_json_has_no_text_for(self):
        path = os.fsencode(SHARED) + b"/\xff\xfe"
        with open(path, "w"):
            pass
        os.chown(path, ALICE, ALICE)
        os.symlink(b"\xff\xfe", SHARED + "/link")
        self.refuses(SHARED + "/link")

    def test_other_members_of_app_stay(self):
        path = make(SHARED + "/a")
        answer = self.api.call("alice", "create", project_name="file",
                               app={"path": path, "name": "x", "path ": "/etc/shadow"})
        self.assertEqual(answer.data["link"]["app"],
                         {"path": path, "name": "x", "path ": "/etc/shadow"})

    def test_app_of_another_project_is_taken_as_it_is(self):
        answer = self.api.call("alice", "create", project_name="photos", app={"path": "/etc/shadow"})
        self.assertEqual(answer.data["link"]["app"], {"path": "/etc/shadow"})

    def test_changes_of_a_link_are_held_to_it(self):
        path, other = make(SHARED + "/a"), make(SHARED + "/b")
        link = self.shares(path)
        for app, code in (({"path": "/etc/shadow"}, 206), ({}, 208), ({"path": other + "x"}, 206)):
            answer = self.api.call("alice", "set", id=link["id"], app=app)
            self.assertEqual((answer.code, answer.field), (code, "app"))
        self.assertEqual(self.api.call("alice", "get", id=link["id"]).data["link"], link)
        answer = self.api.call("alice", "set", id=link["id"], app={"path": SHARED + "/./b"})
        self.assertEqual(answer.data["link"]["app"], {"path": other})

    def test_link_that_becomes_a_file_link_is_held_to_it(self):
        path = make(SHARED + "/a")
        for app, code in (({"path": "/etc/shadow"}, 206), ({}, 208), ({"path": path}, 1)):
            link = self.api.call("alice", "create", project_name="photos", app=app).data["link"]
            answer = self.api.call("alice", "set", id=link["id"], project_name="file")
            self.assertEqual(answer.code, code)

    def test_new_owner_must_be_allowed_to_read_the_file(self):
        link = self.shares(make(SHARED + "/a"))
        answer = self.api.call("carol", "set", id=link["id"], owner_user="bob")
        self.assertEqual((answer.code, answer.field), (206, "app"))
        os.chmod(SHARED + "/a", 0o644)
        self.assertTrue(self.api.call("carol", "set", id=link["id"], owner_user="bob").ok)

    def test_other_settings_do_not_look_at_the_file(self):
        link = self.shares(make(SHARED + "/a"))
        os.unlink(SHARED + "/a")
        self.assertTrue(self.api.call("alice", "set", id=link["id"], enabled=False).ok)
        answer = self.api.call("alice", "set", id=link["id"], project_name="file")
        self.assertEqual(answer.code, 206)

    def test_owner_whose_account_is_gone(self):
        link = self.shares(make(SHARED + "/a", mode=0o644))
        sql("UPDATE entry SET owner_uid=4999 WHERE id=?", link["id"])
        answer = self.api.call("carol", "set", id=link["id"], app={"path": SHARED + "/a"})
        self.assertEqual((answer.code, answer.field), (206, "app"))


class ByTool(Files, unittest.TestCase):
    front = "Tool"

    def test_root_and_the_system_identity_have_files_of_their_own(self):
        self.shares(make(SHARED + "/roots", 0), who="root")
        self.shares(make(SHARED + "/systems", 1), who="daemon")
        self.refuses(SHARED + "/roots", "daemon")


class ByHttp(Files, unittest.TestCase):
    front = "Http"

    def test_path_with_a_zero_byte(self):
        make(SHARED + "/a")
        self.refuses(SHARED + "/a\0.txt")


class Looking(unittest.TestCase):
    def test_nobody_waits_for_it(self):
        """A lease on the file delays the look at it; the database is free meanwhile."""
        os.makedirs(SHARED, exist_ok=True)
        path = make(SHARED + "/leased")
        api = ws.ToolFront()
        link = api.call("alice", "create", project_name="x").data["link"]
        # A slow machine may stand still; who waits for the look does so every time.
        self.assertTrue(any(self.longest_wait(api, link, path) < 1 for _ in range(5)))
        self.assertTrue(api.call("alice", "set", id=link["id"], project_name="file",
                                 app={"path": path}).ok)

    def longest_wait(self, api, link, path):
        """Of those who write while the file is looked at."""
        with open(path, "r+") as file:
            signal.signal(signal.SIGIO, signal.SIG_IGN)
            fcntl.fcntl(file, fcntl.F_SETLEASE, fcntl.F_WRLCK)
            answers = []
            asking = threading.Thread(target=lambda: answers.append(
                api.call("alice", "set", id=link["id"], project_name="file", app={"path": path})))
            start = time.monotonic()
            asking.start()
            longest = 0
            while asking.is_alive():
                before = time.monotonic()
                connection = sqlite3.connect(vs.DATABASE, timeout=30, isolation_level=None)
                connection.execute("BEGIN IMMEDIATE")
                connection.execute("ROLLBACK")
                connection.close()
                longest = max(longest, time.monotonic() - before)
                asking.join(0.05)
            took = time.monotonic() - start
        self.assertEqual((answers[0].code, answers[0].field), (206, "app"))
        self.assertGreater(took, 1.8)  # the look alone takes 2 seconds
        return longest


class WithoutRoot(unittest.TestCase):
    """Started as the system identity, which cannot look at files as somebody else."""

    def setUp(self):
        Files.setUp(self)

    def answer(self, user, path, **settings):
        body = ws.request_body("create", project_name="file", app={"path": path}, **settings)
        return ws.answer_of(ws.run_entry(body=body, user=user, program=ws.PLAIN_ENTRY,
                                         uid=vs.SYSTEM).body)

    def test_only_administrators_make_file_links(self):
        path = make(SHARED + "/a", mode=0o644)
        answer = self.answer("alice", path)
        self.assertEqual((answer.code, answer.field), (106, "app"))
        self.assertTrue(self.answer("carol", path).ok)
        self.assertTrue(self.answer("carol", path, owner_user="alice").ok)

    def test_the_file_is_looked_at_all_the_same(self):
        for path in (make(SHARED + "/closed"), make(OUTSIDE + "/a", mode=0o644), "/etc/shadow",
                     SHARED):
            self.assertEqual(self.answer("carol", path).code, 206, path)

    def test_other_links_are_everybodys(self):
        reply = ws.run_entry(body=ws.request_body("create", project_name="x"), uid=vs.SYSTEM,
                             program=ws.PLAIN_ENTRY)
        self.assertEqual(reply.status, 200)


class WithoutFolders(unittest.TestCase):
    def test_no_file_can_be_shared(self):
        Files.setUp(self)
        path = make(SHARED + "/a")
        os.rename(ws.CONFIG, ws.CONFIG + ".kept")
        try:
            for front in FRONTS.values():
                answer = front.call("alice", "create", project_name="file", app={"path": path})
                self.assertEqual(answer.code, 206)
                self.assertEqual(front.call("alice", "query", api=ws.INFO).data["share_folders"], [])
        finally:
            os.rename(ws.CONFIG + ".kept", ws.CONFIG)


if __name__ == "__main__":
    ws.install(sys.argv[1], sys.argv[2], SHARED, "/tmp/linked", "/tmp/not-there")
    os.symlink("/tmp/linked-target", "/tmp/linked")
    with vs.WebServer() as server:
        FRONTS["Tool"] = ws.ToolFront()
        FRONTS["Http"] = ws.HttpFront(server)
        unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
