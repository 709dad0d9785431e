"""The web API's command: what it reads, for whom it acts, and what it prints. Arguments: the build
folder, the project's folder."""

import json
import os
import re
import resource
import select
import shutil
import signal
import sqlite3
import stat
import subprocess
import sys
import time
import unittest

import visitor_server as vs
import webapi_server as ws
from webapi_server import run_tool

API = ws.ToolFront()
START = ("--exec", "api=TUVO.Sharing.Link", "version=1")
PROJECT = None
# Of a build with sanitizers: the leak check cannot look into a process of mixed ids.
NOTHING = {"ASAN_OPTIONS": "detect_leaks=0"}


def root_may_lift_limits():
    """Not in every container: whether the capability CAP_SYS_RESOURCE can be had."""
    with open("/proc/self/status") as status:
        return int(re.search(r"CapBnd:\t(\w+)", status.read()).group(1), 16) >> 24 & 1 == 1


def code(*arguments, who="alice", **options):
    """What a command line is answered."""
    done = run_tool(who, *arguments, **options)
    assert done.stdout.count(b"\n") == 1 and done.stdout.endswith(b"\n"), done
    answer = ws.answer_of(done.stdout)
    assert done.returncode == (0 if answer.ok else 1), done
    assert done.stderr == b"", done
    return answer.code


class CommandLine(unittest.TestCase):
    def test_that_cannot_be_read(self):
        good = (*START, "method=list")
        self.assertEqual(code(*good), 1)
        for arguments in ((), ("",), ("--exec",), ("--Exec", *good[1:]), good[1:], ("exec", *good[1:]),
                          (*good[1:], "--exec"), ("--help", *good), ("-h",), ("--version",),
                          (*good, "search"), (*good, ""), (*good, "=x"), (*good, "="), (*good, "--exec"),
                          (*good, "search=a", "search=a"), (*good, "method=get"), (*good, "api=x"),
                          ("--exec", *good), (*START[:2], "method=list"), START,
                          ("--exec", "version=1", "method=list")):
            self.assertEqual(code(*arguments), 101, arguments)

    def test_version_is_a_decimal(self):
        for version, wanted in (("1", 1), ("01", 1), ("0", 104), ("2", 104), ("-1", 104),
                                ("99999999999999999999", 104), ("", 101), ("-", 101), ("1.0", 101),
                                ("1 ", 101), (" 1", 101), ("+1", 101), ("0x1", 101), ("one", 101),
                                ("1e0", 101), ("١", 101)):
            self.assertEqual(code("--exec", "api=TUVO.Sharing.Link", "method=list",
                                  "version=" + version), wanted, version)

    def test_order_of_arguments_is_free(self):
        self.assertEqual(code("--exec", "limit=3", "method=list", "version=1", "search=x",
                              "api=TUVO.Sharing.Link"), 1)

    def test_value_begins_behind_the_first_equals_sign(self):
        link = API.call("alice", "create", project_name="a=b=c").data["link"]
        self.assertEqual(link["project_name"], "a=b=c")

    def test_values_are_read_by_their_types(self):
        for text, wanted in (("true", 1), ("false", 1), ("1", 1), ("0", 1), ("yes", 202),
                             ("True", 202), ("", 202), ("2", 202)):
            self.assertEqual(code(*START, "method=list", "descending=" + text), wanted, text)
        for text, wanted in (("0", 1), ("7", 1), ("007", 1), ("-1", 203), ("2147483648", 203),
                             ("9" * 30, 203), ("", 202), ("1.0", 202), ("x", 202), ("1x", 202),
                             (" 1", 202), ("+1", 202), ("-", 202)):
            self.assertEqual(code(*START, "method=list", "offset=" + text), wanted, text)
        for text, wanted in (('["bob"]', 1), ('[]', 1), ("bob", 202), ('"bob"', 202), ("[1]", 202),
                             ('["bob"', 202), ('["bob"]x', 202), ("", 202), ("null", 202)):
            self.assertEqual(code(*START, "method=create", "project_name=x", "protect_type=none",
                                  "protect_users=" + text), wanted, text)
        for text, wanted in (('{"a": 1}', 1), ("{}", 1), ("[]", 202), ("", 202), ("null", 202),
                             ('{"a":1,"a":2}', 202), ("{'a':1}", 202), ('{"a":1}//', 202),
                             ('{"x":' * 32 + "1" + "}" * 32, 1), ('{"x":' * 33 + "1" + "}" * 33, 203),
                             ('{"x":' * 34 + "1" + "}" * 34, 202), ('{"x":' * 40 + "1" + "}" * 40, 202)):
            self.assertEqual(code(*START, "method=create", "project_name=x", "app=" + text), wanted,
                             text)

    def test_texts_that_are_not_utf8(self):
        for text in b"a\xffb", b"\xc0\x80", b"\xed\xa0\x80", b"\xf4\x90\x80\x80":
            for name in b"search", b"project_name":
                self.assertEqual(code(*START, "method=list", name + b"=" + text), 203)
        self.assertEqual(code(*START, b"method=l\xffst"), 103)
        self.assertEqual(code(*START, "method=list", b"l\xffst=1"), 200)

    def test_up_to_256_kib(self):
        texts = [f"{name}={'x' * 100000}" for name in "abc"]
        self.assertEqual(code(*START, "method=list", *texts[:2]), 200)
        self.assertEqual(code(*START, "method=list", *texts), 110)

    def test_help(self):
        done = run_tool("nobody", "--help")
        self.assertEqual((done.returncode, done.stderr), (0, b""))
        self.assertTrue(done.stdout.startswith(b"Usage: tuvowebapi --exec "))


class Accounts(unittest.TestCase):
    def account(self, who, **options):
        answer = API.call(who, "query", api=ws.INFO, **options)
        return answer.data["account"] if answer.ok else answer.code

    def test_is_the_one_of_who_runs_it(self):
        self.assertEqual(self.account("alice"), {"user": "alice", "uid": 2001, "administrator": False})
        self.assertEqual(self.account("carol"), {"user": "carol", "uid": 2003, "administrator": True})
        self.assertEqual(self.account("root"), {"user": "root", "uid": 0, "administrator": True})
        self.assertEqual(self.account("daemon"), {"user": "daemon", "uid": 1, "administrator": True})
        self.assertEqual(self.account("www-data")["administrator"], False)

    def test_that_the_system_does_not_know(self):
        ws.UIDS["stranger"] = 4321
        self.assertEqual(code(*START, "method=list", who="stranger"), 105)
        self.assertEqual(code(*START, "method=nothing", who="stranger"), 103)

    def test_environment_has_no_say(self):
        environment = {"USER": "root", "LOGNAME": "root", "REMOTE_USER": "root", "SUDO_UID": "0",
                       "REQUEST_METHOD": "POST", "HOME": "/root"}
        done = run_tool("alice", "--exec", "api=TUVO.API.Info", "version=1", "method=query",
                        environment=environment)
        self.assertEqual(json.loads(done.stdout)["data"]["account"]["user"], "alice")

    def test_callers_time_zone_has_no_say(self):
        answers = []
        for zone in {}, {"TZ": "Pacific/Kiritimati"}, {"TZ": "XYZ-20"}:
            done = run_tool("alice", *START, "method=create", "project_name=x",
                            "expire_at=2030-01-01 12:00", environment=zone)
            row = json.loads(done.stdout)["data"]["link"]["id"]
            answers.append(vs.sql("SELECT expire_at FROM entry WHERE id=?", row)[0][0])
        self.assertEqual(len(set(answers)), 1)

    def test_without_root_only_the_system_account_reaches_the_links(self):
        self.assertTrue(API.call("daemon", "list", program=ws.PLAIN_TOOL).ok)
        self.assertTrue(API.call("root", "list", program=ws.PLAIN_TOOL).ok)
        with vs.SystemLog() as log:
            self.assertEqual(API.call("alice", "list", program=ws.PLAIN_TOOL).code, 100)
            self.assertTrue(API.call("alice", "query", api=ws.INFO, program=ws.PLAIN_TOOL).ok)
        self.assertTrue(any("the database of links cannot be used" in line for line in log.errors()))

    def test_ownership(self):
        link = API.call("alice", "create", project_name="x").data["link"]
        self.assertEqual(API.call("bob", "get", id=link["id"]).code, 205)
        for who in "alice", "carol", "root", "daemon":
            self.assertTrue(API.call(who, "get", id=link["id"]).ok, who)


class Surroundings(unittest.TestCase):
    """What a local user can do to a program that is installed set-user-id root."""

    def test_arguments_are_not_for_everybody(self):
        lock = sqlite3.connect(vs.DATABASE, isolation_level=None)
        lock.execute("BEGIN IMMEDIATE")  # it waits for that, its arguments read
        process = subprocess.Popen([ws.TOOL, *START, "method=create", "project_name=x",
                                    "hash=visible", "protect_password=visible"], user=2001,
                                   group=2001, extra_groups=[], stdout=subprocess.PIPE, env=NOTHING)
        try:
            end = time.monotonic() + 8
            words = b"visible"
            while b"visible" in words and time.monotonic() < end:
                time.sleep(0.01)
                with open(f"/proc/{process.pid}/cmdline", "rb") as file:
                    words = file.read()
            self.assertIsNone(process.poll())
        finally:
            lock.execute("ROLLBACK")
            lock.close()
            answer = json.loads(process.communicate()[0])
        self.assertEqual(words.rstrip(b"\0"), ws.TOOL.encode())
        self.assertEqual(answer["data"]["link"]["hash"], "visible")

    def test_name_that_it_is_called_by_is_not_logged(self):
        with vs.SystemLog() as log:
            # Its own name is argument 0, which the caller chooses.
            done = subprocess.run(["x\nsharing event=delete link=1 address=local result=1 by=0",
                                   *START, "method=delete", "id=999999"], executable=ws.TOOL,
                                  user=2001, group=2001, extra_groups=[], stdout=subprocess.PIPE,
                                  env=NOTHING)
        self.assertEqual(json.loads(done.stdout)["error"]["code"], 205)
        self.assertEqual([event["result"] for event in ws.events(log)], ["205"])
        self.assertTrue(all(": sharing event" not in line or "tuvowebapi[" in line
                            for line in log.lines), log.lines)

    def test_output_that_cannot_be_written(self):
        with open("/dev/full", "w") as full:
            done = subprocess.run([ws.TOOL, *START, "method=list"], stdout=full, user=2001, group=2001,
                                  extra_groups=[], env=NOTHING)
        self.assertEqual(done.returncode, 1)
        reading, writing = os.pipe()
        os.close(reading)
        done = subprocess.run([ws.TOOL, *START, "method=list"], stdout=writing, user=2001, group=2001,
                              extra_groups=[], env=NOTHING)
        os.close(writing)
        self.assertEqual(done.returncode, 1)

    def test_standard_descriptors_that_are_closed(self):
        before = os.stat(vs.DATABASE).st_size
        script = f'exec {ws.TOOL} --exec api=TUVO.Sharing.Link version=1 method=create ' \
                 'project_name=closed <&- >&- 2>&-'
        subprocess.run(["/bin/sh", "-c", script], user=2001, group=2001, extra_groups=[], env=NOTHING)
        self.assertGreaterEqual(os.stat(vs.DATABASE).st_size, before)
        self.assertEqual(vs.sql("PRAGMA integrity_check"), [("ok",)])
        self.assertEqual(len(vs.sql("SELECT 1 FROM entry WHERE project_name='closed'")), 1)

    def test_standard_descriptors_that_root_closes(self):
        """The system's loader opens them for set-user-id programs, but not for those of root."""
        answers = []
        for closed in ">&-", "<&- >&-", "<&- >&- 2>&-":
            script = f'exec {ws.TOOL} --exec api=TUVO.Sharing.Link version=1 method=create ' \
                     f'project_name=by-root {closed}'
            with vs.SystemLog() as log:
                done = subprocess.run(["/bin/sh", "-c", script], env=NOTHING)
            self.assertEqual(done.returncode, 1)  # nobody has seen the answer
            self.assertEqual(len(log.lines), 1, log.lines)
            answers += ws.events(log)
        self.assertEqual([event["result"] for event in answers], ["1"] * 3)
        hashes = vs.sql("SELECT hash FROM entry WHERE project_name='by-root'")
        self.assertEqual(len(hashes), 3)

    def test_nothing_that_is_printed_gets_into_the_log(self):
        """Of any program that root starts with its standard output closed: the connection to the
        system log must not take its place."""
        link = API.call("root", "create", project_name="x").data["link"]["hash"]
        cgi = {"GATEWAY_INTERFACE": "CGI/1.1", "REMOTE_ADDR": "192.0.2.7", "REQUEST_METHOD": "GET",
               "QUERY_STRING": "api=TUVO.Sharing.Link&version=1&method=get&hash=" + link,
               "REMOTE_USER": "root", "PATH_INFO": f"/{link}/none", "HTTP_HOST": "nas.example.org"}
        for program, environment in (
                (f"{ws.TOOL} --exec api=TUVO.Sharing.Link version=1 method=set id=x hash={link}", {}),
                (f"/usr/tuvo/bin/tuvosharing show {link}", {}),
                (f"/usr/tuvo/bin/tuvosharing disable {link}", {}),
                (f"/usr/tuvo/bin/tuvosharingurl x 0 0 '' {link}", {}),
                (ws.ENTRY, cgi), (ws.ENTRY, {}), (vs.PROGRAM, cgi), (vs.PROGRAM, {})):
            for closed in ">&-", "<&- >&- 2>&-":
                with vs.SystemLog() as log:
                    subprocess.run(["/bin/sh", "-c", f"exec {program} {closed}"], cwd="/",
                                   env={**NOTHING, **environment}, stderr=subprocess.DEVNULL)
                for line in log.lines:
                    self.assertRegex(line, r"^<\d+>\w+ +\d+ [\d:]+ [\w.]+(\[\d+\])?: ", program)
                    self.assertNotIn(link, line)

    def limited(self, *limits):
        """A creation under these limits, and whether the log knows of what it made."""
        before = vs.sql("SELECT COUNT(*) FROM entry")[0][0]
        with vs.SystemLog() as log:
            done = subprocess.run([ws.TOOL, *START, "method=create", "project_name=limited"],
                                  user=2001, group=2001, extra_groups=[], stdout=subprocess.PIPE,
                                  stderr=subprocess.PIPE, env=NOTHING, timeout=60,
                                  preexec_fn=lambda: [resource.setrlimit(which, (value, value))
                                                      for which, value in limits])
        made = vs.sql("SELECT COUNT(*) FROM entry")[0][0] - before
        noted = [event for event in ws.events(log) if event["result"] == "1"]
        self.assertEqual(len(noted), made, limits)
        self.assertEqual(vs.sql("PRAGMA integrity_check"), [("ok",)])
        if done.returncode == 0:
            self.assertTrue(json.loads(done.stdout)["success"])
            self.assertEqual(made, 1)
        return done.returncode

    def test_limits_that_the_caller_sets(self):
        for value in (*range(3, 16), 24, 31, 32, 33, 40):
            self.limited((resource.RLIMIT_NOFILE, value))
        self.limited((resource.RLIMIT_NPROC, 0))
        self.assertTrue(API.call("alice", "create", project_name="x").ok)

    def test_limits_that_it_takes_back(self):
        for which, values in ((resource.RLIMIT_FSIZE, (0, 4096, 65536)),
                              (resource.RLIMIT_DATA, (1 << 20, 4 << 20)),
                              (resource.RLIMIT_STACK, (256 << 10, 1 << 20))):
            for value in values:
                status = self.limited((which, value))
                if root_may_lift_limits():
                    self.assertEqual(status, 0, (which, value))
        # Too small for the program's own code to be loaded.
        for value in 10 << 20, 40 << 20:
            self.limited((resource.RLIMIT_AS, value))

    def test_few_descriptors_by_the_soft_limit_alone(self):
        hard = resource.getrlimit(resource.RLIMIT_NOFILE)[1]
        done = run_tool("alice", *START, "method=create", "project_name=x", preexec_fn=lambda:
                        resource.setrlimit(resource.RLIMIT_NOFILE, (4, hard)))
        self.assertEqual(done.returncode, 0)

    def test_descriptors_that_the_caller_left_open(self):
        def fill():
            resource.setrlimit(resource.RLIMIT_NOFILE, (40, 40))
            for _ in range(3, 40):
                try:
                    os.set_inheritable(os.dup(0), True)
                except OSError:
                    return

        with vs.SystemLog() as log:
            done = run_tool("alice", *START, "method=create", "project_name=x", preexec_fn=fill,
                            close_fds=False)
        self.assertEqual((done.returncode, len(ws.events(log))), (0, 1))

    def test_timers_of_the_caller_end_nothing(self):
        """They outlast an exec. However soon they go off: what was made stands in the log."""
        for timer, number in ((signal.ITIMER_REAL, signal.SIGALRM),
                              (signal.ITIMER_VIRTUAL, signal.SIGVTALRM),
                              (signal.ITIMER_PROF, signal.SIGPROF)):
            with vs.SystemLog() as log:
                before = vs.sql("SELECT COUNT(*) FROM entry")[0][0]
                ends = [run_tool("alice", *START, "method=create", "project_name=timed",
                                 preexec_fn=lambda: signal.setitimer(timer, seconds)).returncode
                        for seconds in [step / 2000 for step in range(1, 80, 2)]]
                made = vs.sql("SELECT COUNT(*) FROM entry")[0][0] - before
            self.assertEqual(len(ws.events(log)), made)
            self.assertEqual(ends.count(0), made)
            self.assertLessEqual(set(ends), {0, -number})  # before it has begun

    def test_change_is_noted_before_its_answer_is_made_up(self):
        """Killed while it waits for the tool that tells the link's address."""
        tool = "/usr/tuvo/bin/tuvosharingurl"
        try:
            row = API.call("alice", "create", project_name="x").data["link"]["id"] + 1
            os.rename(tool, tool + ".kept")
            with open(tool, "w") as file:
                file.write("#!/bin/sh\nkill -KILL $PPID\n")
            os.chmod(tool, 0o755)
            with vs.SystemLog() as log:
                for method in ("create", "project_name=killed"), ("set", f"id={row}", "enabled=false"):
                    done = run_tool("alice", *START, "method=" + method[0], *method[1:])
                    self.assertEqual(done.returncode, -signal.SIGKILL)
        finally:
            os.rename(tool + ".kept", tool)
        self.assertEqual(vs.sql("SELECT project_name, enabled FROM entry WHERE id=?", row),
                         [("killed", 0)])
        self.assertEqual([(event["event"], event["link"], event["result"]) for event in ws.events(log)],
                         [("create", str(row), "1"), ("set", str(row), "1")])

    def test_caller_that_ignores_its_childrens_ends(self):
        """What is inherited: a child that has ended could not be waited for."""
        os.makedirs("/tmp/shared", exist_ok=True)
        with open("/tmp/shared/open", "w"):
            pass
        os.chmod("/tmp/shared/open", 0o644)
        for who in "alice", "root":
            done = run_tool(who, *START, "method=create", "project_name=file",
                            'app={"path": "/tmp/shared/open"}', preexec_fn=lambda:
                            signal.signal(signal.SIGCHLD, signal.SIG_IGN))
            answer = ws.answer_of(done.stdout)
            self.assertTrue(answer.ok, answer)
            self.assertTrue(answer.data["url"])

    def test_caller_cannot_stop_it(self):
        """A program that is stopped while it writes to the database would stop all others; one that is
        ended leaves no line of what it did."""
        reading, writing = os.pipe()
        os.set_blocking(writing, False)
        while True:  # its answer finds no room, and it stays
            try:
                os.write(writing, b"x" * 4096)
            except BlockingIOError:
                break
        os.set_blocking(writing, True)
        process = subprocess.Popen([ws.TOOL, *START, "method=list"], stdout=writing, user=2001,
                                   group=2001, extra_groups=[], env=NOTHING, cwd="/", preexec_fn=lambda:
                                   resource.setrlimit(resource.RLIMIT_CPU, (50, 60)))
        try:
            for _ in range(400):
                with open(f"/proc/{process.pid}/status") as lines:
                    status = dict(line.rstrip("\n").split(":\t", 1) for line in lines if ":\t" in line)
                if status["Uid"].split()[:3] == ["1", "1", "0"]:
                    break
                time.sleep(0.05)
            self.assertEqual(status["Uid"].split(), ["1", "1", "0", "1"])
            self.assertEqual(status["Gid"].split()[:2], ["1", "1"])
            ignored = int(status["SigIgn"], 16)
            for number in signal.SIGTSTP, signal.SIGTTIN, signal.SIGTTOU:
                self.assertTrue(ignored >> (number - 1) & 1, number)
            done = subprocess.run(["/bin/sh", "-c", f"kill -STOP {process.pid}"], user=2001,
                                  group=2001, extra_groups=[], env={"LC_ALL": "C"},
                                  stderr=subprocess.PIPE)
            self.assertNotEqual(done.returncode, 0)
            self.assertIn(b"not permitted", done.stderr)
            # What a terminal, and the system in the caller's name, send all the same.
            for number in (signal.SIGINT, signal.SIGQUIT, signal.SIGHUP, signal.SIGALRM, signal.SIGPROF,
                           signal.SIGVTALRM, signal.SIGXCPU, signal.SIGXFSZ):
                process.send_signal(number)
            with open(f"/proc/{process.pid}/limits") as limits:
                limit = "unlimited +unlimited" if root_may_lift_limits() else "60 +60 "
                self.assertRegex(limits.read(), f"Max cpu time +{limit}")
            os.set_blocking(reading, False)
            os.close(writing)
            answer = b""
            for _ in range(400):
                answer += os.read(reading, 1 << 20) if select.select([reading], [], [], 0.1)[0] else b""
                if process.poll() is not None:
                    break
            self.assertEqual(process.wait(1), 0)
        finally:
            os.close(reading)
            process.wait(60)

    def test_mask_of_the_caller_does_not_open_the_database(self):
        done = subprocess.run(["/bin/sh", "-c", f"umask 0; exec {ws.TOOL} --exec api=TUVO.Sharing.Link "
                               "version=1 method=create project_name=x"], user=2001, group=2001,
                              extra_groups=[], stdout=subprocess.PIPE, env=NOTHING)
        self.assertEqual(done.returncode, 0)
        for name in os.listdir(os.path.dirname(vs.DATABASE)):
            status = os.stat(os.path.join(os.path.dirname(vs.DATABASE), name))
            self.assertEqual((status.st_uid, stat.S_IMODE(status.st_mode) & 0o7), (1, 0), name)

    def test_files_are_looked_at_as_the_owner_wherever_it_is_started(self):
        os.makedirs("/tmp/shared", exist_ok=True)
        with open("/tmp/shared/roots", "w"):
            pass
        os.chmod("/tmp/shared/roots", 0o600)
        answer = API.call("alice", "create", project_name="file", app={"path": "/tmp/shared/roots"})
        self.assertEqual(answer.code, 206)


class EventLog(unittest.TestCase):
    def test_lines_of_changes(self):
        with vs.SystemLog() as log:
            link = API.call("alice", "create", project_name="x").data["link"]
            API.call("alice", "set", id=link["id"], enabled=False)
            API.call("bob", "set", id=link["id"], enabled=True)
            API.call("carol", "delete", id=link["id"])
            API.call("root", "delete_expired")
            API.call("root", "delete_expired", dry_run=True)
            API.call("alice", "create")
            API.call("alice", "list")
            code(*START)
        row = str(link["id"])
        self.assertEqual(
            [(event["event"], event["link"], event["address"], event["result"], event["by"])
             for event in ws.events(log)],
            [("create", row, "local", "1", "2001"), ("set", row, "local", "1", "2001"),
             ("set", "0", "local", "205", "2002"), ("delete", row, "local", "1", "2003"),
             ("delete_expired", "0", "local", "1", "0"), ("create", "0", "local", "201", "2001")])


class Manual(unittest.TestCase):
    def test_renders_without_warnings(self):
        if not shutil.which("man"):
            self.skipTest("man is not installed")
        done = subprocess.run(["man", "--warnings", "-l", PROJECT + "/packaging/man/tuvowebapi.1"],
                              env={"LC_ALL": "C.UTF-8", "PATH": os.environ["PATH"], "MANWIDTH": "80",
                                   "HOME": "/"},
                              stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        self.assertEqual((done.returncode, done.stderr), (0, b""))
        self.assertIn(b"TUVOWEBAPI(1)", done.stdout)

    def test_names_every_method_and_setting(self):
        with open(PROJECT + "/packaging/man/tuvowebapi.1") as file:
            page = file.read()
        apis = API.call("alice", "query", api=ws.INFO).data["apis"]
        for name, api in apis.items():
            self.assertIn(name, page)
            for method, about in api["methods"].items():
                self.assertRegex(page, rf"(?m)^\.B {method}$")
                for argument in about["arguments"]:
                    self.assertRegex(page, rf"\b{re.escape(argument)}\b")


if __name__ == "__main__":
    PROJECT = sys.argv[2]
    ws.install(sys.argv[1], sys.argv[2], "/tmp/shared")
    unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
