"""The web API by FastCGI, behind a real web server that has one process of it. Arguments: the build
folder, the project's folder."""

import os
import re
import sys
import threading
import time
import unittest

import visitor_server as vs
import webapi_server as ws
from webapi_server import LINK, PATH, request_body

API = None
SHARED = "/tmp/shared"


def processes():
    """The processes of the web API's program."""
    found = []
    for pid in API.server.programs():
        try:
            with open(f"/proc/{pid}/comm") as comm:
                if comm.read().strip() == "entry.cgi":
                    found.append(pid)
        except FileNotFoundError:
            pass  # has just ended
    return found


def memory(pid):
    """Kilobytes that are in memory."""
    return figure(pid, "VmRSS")


def figure(pid, name):
    with open(f"/proc/{pid}/status") as status:
        return int(re.search(name + r":\s+(\d+) kB", status.read()).group(1))


class FastCgiTest(unittest.TestCase):
    """Every test leaves the process as it found it: alive."""

    def setUp(self):
        self.process, = processes()

    def tearDown(self):
        self.assertEqual(processes(), [self.process])


class Requests(FastCgiTest):
    def test_accounts_are_each_requests_own(self):
        links = {who: API.call(who, "create", project_name="x").data["link"]
                 for who in ("alice", "bob")}
        for _ in range(10):
            for who, other in (("alice", "bob"), ("bob", "alice")):
                self.assertEqual(API.call(who, "get", id=links[who]["id"]).data["link"], links[who])
                self.assertEqual(API.call(who, "get", id=links[other]["id"]).code, 205)
                self.assertTrue(API.call("carol", "get", id=links[who]["id"]).ok)
                self.assertEqual(API.call(who, "query", api=ws.INFO).data["account"]["user"], who)

    def test_headers_are_each_requests_own(self):
        body = request_body("list")
        query = PATH + f"?api={LINK}&version=1&method=list"
        for _ in range(5):
            self.assertEqual(API.answer(API.post("alice", body, Origin="null")).code, 109)
            self.assertEqual(API.answer(API.post("alice", body)).code, 1)
            self.assertEqual(API.answer(API.post("alice", body,
                                                 **{"Content-Type": "text/plain"})).code, 108)
            self.assertEqual(API.request("GET", "alice", query).status, 200)
            self.assertEqual(API.request("GET", "alice", PATH).status, 400)
            self.assertEqual(API.request("HEAD", "alice", query).body, b"")
            self.assertEqual(API.request("PUT", "alice", PATH, b"x").status, 405)

    def test_body_that_was_not_read_is_not_the_next_requests(self):
        link = API.call("alice", "create", project_name="x").data["link"]
        bad = request_body("delete", id=link["id"])
        for kind, size, code in (("text/plain", len(bad), 108), ("application/json", 262145, 110)):
            for _ in range(5):
                reply = API.post("alice", bad + b" " * (size - len(bad)), **{"Content-Type": kind})
                self.assertEqual(API.answer(reply).code, code)
                self.assertEqual(API.call("alice", "get", id=link["id"]).data["link"], link)

    def test_at_the_same_time(self):
        failures = []

        def work(who):
            try:
                for number in range(10):
                    link = API.call(who, "create", project_name=f"{who}-{number}").data["link"]
                    assert link["owner_user"] == who
                    assert API.call(who, "delete", id=link["id"]).ok
            except Exception as error:  # told by the thread that waits
                failures.append((who, error))

        threads = [threading.Thread(target=work, args=(who,)) for who in ("alice", "bob") * 3]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        self.assertEqual(failures, [])

    def test_files_are_looked_at_as_each_owner(self):
        for who, uid in ("alice", 2001), ("bob", 2002):
            path = f"{SHARED}/{who}"
            with open(path, "w"):
                pass
            os.chown(path, uid, uid)
            os.chmod(path, 0o600)
        for _ in range(3):
            for who, other in (("alice", "bob"), ("bob", "alice")):
                self.assertTrue(API.call(who, "create", project_name="file",
                                         app={"path": f"{SHARED}/{who}"}).ok)
                self.assertEqual(API.call(who, "create", project_name="file",
                                          app={"path": f"{SHARED}/{other}"}).code, 206)

    def test_configuration_is_read_anew(self):
        with open(ws.CONFIG) as config:
            text = config.read()
        try:
            with open(ws.CONFIG, "a") as config:
                config.write("share_folder = /tmp/another\n")
            self.assertEqual(API.call("alice", "query", api=ws.INFO).data["share_folders"],
                             [SHARED, "/tmp/another"])
        finally:
            with open(ws.CONFIG, "w") as config:
                config.write(text)
        self.assertEqual(API.call("alice", "query", api=ws.INFO).data["share_folders"], [SHARED])

    def test_events_have_each_requests_account_and_link(self):
        with vs.SystemLog() as log:
            links = [API.call(who, "create", project_name="x").data["link"]["id"]
                     for who in ("alice", "bob")]
            API.call("alice", "delete", id=links[1])
        self.assertEqual([(event["link"], event["by"], event["result"]) for event in ws.events(log)],
                         [(str(links[0]), "2001", "1"), (str(links[1]), "2002", "1"),
                          ("0", "2001", "205")])

    def test_many_leave_nothing_behind(self):
        link = API.call("alice", "create", project_name="x").data["link"]

        def some(count):
            for _ in range(count):
                API.call("alice", "set", id=link["id"], protect_title="x" * 200,
                         app={"a": ["y" * 1000] * 20})
                API.call("bob", "get", id=link["id"])
                API.call("alice", "create", project_name="file", app={"path": "/etc/shadow"})
                API.post("alice", b"{")
        some(25)
        before, files = memory(self.process), self.idle_descriptors()
        some(100)
        self.assertEqual(self.idle_descriptors(), files)
        with open(f"/proc/{self.process}/task/{self.process}/children") as children:
            self.assertEqual(children.read(), "")
        if not vs.is_sanitized():
            self.assertLess(memory(self.process) - before, 512)

    def test_large_lists_do_not_take_much_memory(self):
        """As trees, the values of these links take 300 MB."""
        def fill(values):
            vs.sql("DELETE FROM entry")
            API.call("bob", "create", project_name="x", app={"values": values})
            vs.sql("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 299) "
                   "INSERT INTO entry SELECT NULL, hash || '-' || i, project_name, enabled, owner_uid, "
                   "start_at, expire_at, expire_times, use_count, auto_gc, data FROM entry, n")

        fill([1] * 9990)
        answer = API.call("bob", "list", limit=500)
        self.assertEqual(len(answer.data["links"]), 300)
        self.assertEqual(answer.data["links"][299]["app"]["values"], [1] * 9990)
        fill(["x" * 100] * 600)
        answer = API.call("bob", "list", limit=500)
        self.assertEqual((answer.code, answer.field), (203, "limit"))
        answer = API.call("bob", "list", limit=100, offset=200)
        self.assertEqual(len(answer.data["links"]), 100)
        if not vs.is_sanitized():
            self.assertLess(figure(self.process, "VmHWM"), 128 * 1024)
            self.assertLess(memory(self.process), 96 * 1024)

    def idle_descriptors(self):
        """How many are open once the last request's connection is closed."""
        counts = []
        for _ in range(20):
            counts.append(len(os.listdir(f"/proc/{self.process}/fd")))
            time.sleep(0.05)
        return min(counts)

    def test_identity_between_requests(self):
        API.call("alice", "create", project_name="x")
        with open(f"/proc/{self.process}/status") as status:
            text = status.read()
        # Real, effective, saved, file system: root is only kept for the moments that need it.
        self.assertIn("Uid:\t33\t33\t0\t33", text)
        self.assertIn("Gid:\t33\t33\t33\t33", text)
        self.assertRegex(text, r"Groups:\t *\n")


class Database(unittest.TestCase):
    def test_process_without_one_ends_and_another_takes_its_place(self):
        os.rename(vs.DATABASE, vs.DATABASE + ".kept")
        for end in "-wal", "-shm":
            if os.path.exists(vs.DATABASE + end):
                os.unlink(vs.DATABASE + end)
        try:
            with open(vs.DATABASE, "wb") as file:
                file.write(b"this is no database at all, and long enough to be looked at" * 40)
            os.chown(vs.DATABASE, 1, 1)
            old, = processes()
            os.kill(old, 15)  # it has the former file open
            self.wait_for_another(old)
            self.assertEqual(self.answer().code, 100)
        finally:
            os.replace(vs.DATABASE + ".kept", vs.DATABASE)
        for _ in range(1200):
            answer = self.answer()
            if answer is not None and answer.ok:
                break
            time.sleep(0.1)
        self.assertTrue(answer.ok)

    def answer(self):
        reply = API.post("alice", request_body("list"))
        return ws.answer_of(reply.body) if reply.get("Content-Type") == "application/json" else None

    def wait_for_another(self, old):
        for _ in range(1200):
            now = processes()
            if now and old not in now:
                return
            time.sleep(0.1)
        self.fail("no other process came")


if __name__ == "__main__":
    os.makedirs(SHARED)
    os.chmod(SHARED, 0o755)
    ws.install(sys.argv[1], sys.argv[2], SHARED)
    with vs.WebServer(vs.fastcgi_configuration()) as server:
        API = ws.HttpFront(server)
        unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
