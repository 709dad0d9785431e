"""The administrator's command end to end: visitors who are in, or kept out. Arguments: the build
folder, the project's folder."""

import json

import cli_program
import visitor_server as vs
from cli_program import DONE, NO_SUCH_LINK, USAGE, CliTest, create, numbers_begin_anew, run, show
from visitor_server import SYSTEM, sql


class Visitors(CliTest):
    def test_sessions_and_tokens_name_everything_but_the_identifier(self):
        link, other = create(), create()
        reply = vs.run_program("POST", "/" + link, uid=SYSTEM, REMOTE_ADDR="192.0.2.9")
        vs.run_program("POST", "/" + other, uid=SYSTEM, REMOTE_ADDR="192.0.2.10")
        session_id = reply.session_id()
        self.assertTrue(session_id)
        row = show(link)["id"]
        sessions = json.loads(run("sessions", "--json").stdout)
        self.assertEqual((sessions["total"], len(sessions["sessions"])), (2, 2))
        done = run("sessions", link, "--json")
        sessions = json.loads(done.stdout)["sessions"]
        self.assertEqual([session["ip"] for session in sessions], ["192.0.2.9"])
        self.assertEqual(set(sessions[0]), {"id", "ip", "user", "expires_at"})
        tokens = json.loads(run("tokens", f"#{row}", "--json").stdout)["tokens"]
        self.assertEqual([(token["hash"], token["link"], token["ip"]) for token in tokens],
                         [(link, row, "192.0.2.9")])
        self.assertEqual(set(tokens[0]),
                         {"id", "link", "hash", "session", "ip", "user", "expires_at"})
        for arguments in (["sessions"], ["tokens"], ["sessions", "--json"], ["tokens", "--json"],
                          ["sessions", link], ["tokens", link]):
            done = run(*arguments)
            self.assertEqual(done.returncode, DONE)
            self.assertIn("192.0.2.9", done.stdout)
            self.assertNotIn(session_id, done.stdout)

    def test_the_expired_are_out(self):
        link = create()
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        sql("UPDATE token SET timeout = 1000")
        sql("UPDATE session SET timeout = 1000")
        for command in "sessions", "tokens":
            self.assertEqual(json.loads(run(command, "--json").stdout)["total"], 0)
        self.assert_fails(run("sessions", "gone"), NO_SUCH_LINK)

    def test_admission_ends_with_the_session(self):
        link = create()
        vs.run_program("POST", "/" + link, uid=SYSTEM)
        self.assertEqual(json.loads(run("tokens", "--json").stdout)["total"], 1)
        sql("UPDATE session SET timeout = 1000")
        self.assertEqual(json.loads(run("tokens", "--json").stdout)["total"], 0)

    def test_sessions_of_any_number_are_listed(self):
        self.addCleanup(numbers_begin_anew)
        create()
        for number in -5, 7, 3000000000:
            sql("INSERT INTO session VALUES (?, ?, 5, '192.0.2.1', 4000000000)", number,
                f"s{number}")
        sessions = json.loads(run("sessions", "--json").stdout)["sessions"]
        self.assertEqual([session["id"] for session in sessions], [-5, 7, 3000000000])
        findings = json.loads(run("check", "--json").stdout)["findings"]
        subjects = [item["subject"] for item in findings]
        self.assertEqual(subjects, ["session #-5", "session #3000000000"])


class SignOut(CliTest):
    def admit(self, *links):
        for link in links:
            self.assertEqual(vs.run_program("POST", "/" + link, uid=SYSTEM).status, 303)

    def test_of_several_links_those_that_are_there(self):
        first, second, third = create(), create(), create()
        self.admit(first, first, second, third)
        done = run("signout", first, "gone", f"#{show(second)['id']}")
        self.assertEqual((done.returncode, done.stdout), (NO_SUCH_LINK, "signed out 3 visitors\n"))
        self.assertRegex(done.stderr, r"\Atuvosharing: gone: [^\n]+\n\Z")
        tokens = json.loads(run("tokens", "--json").stdout)["tokens"]
        self.assertEqual([token["hash"] for token in tokens], [third])

    def test_json(self):
        link = create()
        self.admit(link)
        for number in 1, 0:
            done = run("signout", "--id", str(show(link)["id"]), "--json")
            self.assertEqual((done.returncode, json.loads(done.stdout)),
                             (DONE, {"signed_out": number}))

    def test_needs_a_link(self):
        self.assert_fails(run("signout"), USAGE)

    def test_another_password_signs_out(self):
        link = create()
        self.admit(link)
        run("edit", link, "--password-stdin", text="new\n")
        self.assertEqual(json.loads(run("tokens", "--json").stdout)["total"], 0)


class Unblock(CliTest):
    def test_a_blocked_address_may_try_again(self):
        link = create("--password-stdin", text="right")
        for address in "192.0.2.77", "2001:db8::7":
            for _ in range(10):
                vs.run_program("POST", "/" + link, b"password=wrong", uid=SYSTEM,
                               REMOTE_ADDR=address)

            def status():
                return vs.run_program("POST", "/" + link, b"password=right", uid=SYSTEM,
                                      REMOTE_ADDR=address).status
            self.assertEqual(status(), 429)
            done = run("unblock", address, "192.0.2.78")
            self.assertEqual((done.returncode, done.stderr), (DONE, ""))
            self.assertEqual(status(), 303)

    def test_a_bad_address_behind_a_good_one_changes_nothing(self):
        link = create("--password-stdin", text="right")
        for _ in range(10):
            vs.run_program("POST", "/" + link, b"password=wrong", uid=SYSTEM,
                           REMOTE_ADDR="192.0.2.99")
        self.assert_fails(run("unblock", "192.0.2.99", "localhost"), USAGE, "localhost")
        reply = vs.run_program("POST", "/" + link, b"password=right", uid=SYSTEM,
                               REMOTE_ADDR="192.0.2.99")
        self.assertEqual(reply.status, 429)


if __name__ == "__main__":
    cli_program.main()
