"""What the system shows or keeps of processes that handle secrets, and what answers and times tell.
Arguments: the build folder, the project's folder."""

import os
import re
import resource
import signal
import statistics
import subprocess
import sys
import time
import unittest
import urllib.parse

import fastcgi
import visitor_server as vs
import webapi_server as ws
from visitor_server import Visitor, make_file_link

FILE = "/tmp/shared/report.txt"
SAMPLES = int(os.environ.get("TUVO_ROUNDS", "60"))
WAYS = {  # program, started as
    "visitors, set-user-id root": (vs.PROGRAM, vs.WWW_DATA),
    "visitors, as the system identity": (vs.PLAIN_PROGRAM, vs.SYSTEM),
    "web API, set-user-id root": (ws.ENTRY, vs.WWW_DATA),
    "web API, as the system identity": (ws.PLAIN_ENTRY, vs.SYSTEM),
}


def variables(link, **more):
    return {"REQUEST_METHOD": "GET", "PATH_INFO": "/" + link, "REMOTE_ADDR": "192.0.2.7",
            "REMOTE_USER": "alice", "QUERY_STRING": "", **more}


class Processes(unittest.TestCase):
    def each(self):
        for way, (program, uid) in WAYS.items():
            with self.subTest(way), fastcgi.Spawned(program, uid) as spawned:
                spawned.request(variables("none-such"))  # has got as far as serving
                yield spawned, uid

    def test_leave_no_core_file(self):
        with open("/proc/sys/kernel/core_pattern") as file:
            if file.read().startswith("|"):
                self.skipTest("the system hands cores to a program")
        os.makedirs("/tmp/cores", exist_ok=True)
        os.chmod("/tmp/cores", 0o777)
        # One that may leave a core does: what is looked for would be there.
        witness = subprocess.run(["sh", "-c", "ulimit -c unlimited; cd /tmp/cores; kill -ABRT $$"])
        self.assertEqual(witness.returncode, -signal.SIGABRT)
        if not os.listdir("/tmp/cores"):
            self.skipTest("the system leaves no cores here")
        for name in os.listdir("/tmp/cores"):
            os.unlink("/tmp/cores/" + name)
        soft, hard = resource.getrlimit(resource.RLIMIT_CORE)
        resource.setrlimit(resource.RLIMIT_CORE, (hard, hard))
        here = os.getcwd()
        os.chdir("/tmp/cores")
        try:
            for spawned, _ in self.each():
                os.kill(spawned.pid, signal.SIGABRT)
                self.assertEqual(spawned.process.wait(), -signal.SIGABRT)
                self.assertEqual(os.listdir("/tmp/cores"), [])
        finally:
            os.chdir(here)
            resource.setrlimit(resource.RLIMIT_CORE, (soft, hard))

    def test_have_no_limit_that_a_core_fits_into(self):
        for spawned, _ in self.each():
            with open(f"/proc/{spawned.pid}/limits") as file:
                self.assertRegex(file.read(), r"Max core file size +1 +1 ")

    def test_cannot_be_looked_into_by_their_own_account(self):
        """What belongs to root in /proc may not be traced, nor its memory read, by others."""
        if vs.is_sanitized():
            self.skipTest("the leak check has to look into its process")
        for spawned, uid in self.each():
            self.assertEqual(os.stat(f"/proc/{spawned.pid}/environ").st_uid, 0)
            looked = subprocess.run(["cat", f"/proc/{spawned.pid}/environ",
                                     f"/proc/{spawned.pid}/maps"], user=uid, group=uid,
                                    extra_groups=[], stdout=subprocess.PIPE,
                                    stderr=subprocess.DEVNULL)
            self.assertEqual((looked.returncode, looked.stdout), (1, b""))

    def test_show_nothing_of_a_request_in_the_process_table(self):
        link = make_file_link(FILE, protect_type="password", password="the-secret")
        with fastcgi.Spawned(vs.PLAIN_PROGRAM, vs.SYSTEM) as spawned:
            body = b"password=the-secret"
            answer, _ = spawned.request(variables(
                link, REQUEST_METHOD="POST", CONTENT_LENGTH=str(len(body)),
                CONTENT_TYPE="application/x-www-form-urlencoded"), body)
            self.assertTrue(answer.startswith(b"Status: 303"))
            for name in "cmdline", "environ", "comm":
                with open(f"/proc/{spawned.pid}/{name}", "rb") as file:
                    shown = file.read()
                for secret in b"the-secret", link.encode(), b"sharing_sid":
                    self.assertNotIn(secret, shown, name)


class Answers(unittest.TestCase):
    def test_tell_nothing_of_passwords_sessions_and_paths(self):
        link = make_file_link(FILE, protect_type="password", password="the-secret",
                              protect_title="Title")
        row = vs.sql("SELECT data FROM entry WHERE hash=?", link)[0][0]
        digest = re.search(r'"protect_password" ?: ?"([0-9a-f]{40})"', row).group(1)
        salt = re.search(r'"protect_password_salt" ?: ?"([^"]+)"', row).group(1)
        with vs.WebServer() as server:
            visitor = Visitor(server, "127.0.5.1")
            path = "/sharing/" + link
            replies = [visitor.get(path), visitor.post(path, {"password": "a-guess"}),
                       visitor.post(path), visitor.get(path + "x"), visitor.get(path + "/logout"),
                       visitor.post(path, {"password": "the-secret"}),
                       visitor.request("POST", path, b"\0", {"Content-Type": "multipart/form-data"})]
            os.rename(FILE, FILE + ".away")
            try:
                replies.append(visitor.get(path))
            finally:
                os.rename(FILE + ".away", FILE)
        for reply in replies:
            text = reply.body + repr([(name, value) for name, value in reply.headers
                                      if name != "Set-Cookie"]).encode()
            for secret in (digest, salt, "the-secret", "a-guess", "report.txt", "/tmp/", "/usr/tuvo",
                           "sqlite", visitor.session_id, "alice"):
                self.assertNotIn(secret.encode(), text, reply.status)


class Times(unittest.TestCase):
    """A rough look: differences that a stranger could measure over a network with a few tries. The
    medians are printed."""

    def shortest(self, requests):
        """Their shortest times in ms, taken in turn, so that others' load meets all alike."""
        times = {name: [] for name in requests}
        with fastcgi.Spawned(vs.PROGRAM, vs.WWW_DATA) as spawned:
            for _ in range(SAMPLES):
                for name, (given, body) in requests.items():
                    begun = time.perf_counter()
                    spawned.request(given, body)
                    times[name].append((time.perf_counter() - begun) * 1000)
        print({name: round(statistics.median(values), 3) for name, values in times.items()},
              file=sys.stderr)
        return {name: min(values) for name, values in times.items()}

    def assert_alike(self, requests):
        """None takes more than twice as long as another. This finds what does some more work for
        one of them, and not a comparison that ends early, which is some nanoseconds. Such work is
        done every time; what others' load does is not."""
        self.assertTrue(any(max(found.values()) < 2 * min(found.values())
                            for found in (self.shortest(requests) for _ in range(5))))

    def test_links_that_do_not_open_take_as_long_as_each_other(self):
        off = make_file_link(FILE, enabled=False)
        late = make_file_link(FILE, start_at=int(time.time()) + 3600)
        self.assert_alike({
            "unknown": (variables("nosuchone"), b""),
            "nearly": (variables(off[:-1] + ("a" if off[-1] != "a" else "b")), b""),
            "switched off": (variables(off), b""), "not begun": (variables(late), b"")})

    def test_wrong_passwords_take_as_long_as_each_other(self):
        with open("/usr/tuvo/etc/autoblock.conf", "w") as file:
            file.write("failures = 1000000\n")
        self.addCleanup(os.unlink, "/usr/tuvo/etc/autoblock.conf")
        link = make_file_link(FILE, protect_type="password", password="correct horse battery")

        def form(password):
            body = urllib.parse.urlencode({"password": password}).encode()
            return variables(link, REQUEST_METHOD="POST", CONTENT_LENGTH=str(len(body)),
                             CONTENT_TYPE="application/x-www-form-urlencoded"), body
        self.assert_alike({
            "far": form("X" * 21), "near": form("correct horse batterz"), "short": form("c")})


def main():
    ws.install(sys.argv[1], sys.argv[2], "/tmp/shared")
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(b"content")
    return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
