"""The administrator's command end to end: making links, those to files among them. Arguments: the
build folder, the project's folder."""

import json
import os
import subprocess

import cli_program
from cli_program import (DONE, FAILED, LINK_MEMBERS, NOT_ALLOWED, PROGRAM, TAKEN, USAGE, CliTest,
                         create, data_of, run, show, show_password_works)
from visitor_server import SYSTEM, sql


class Create(CliTest):
    def test_hash_and_address_are_printed(self):
        done = run("create", "--project", "album")
        link, url, rest = done.stdout.split("\n")
        self.assertRegex(link, r"\A[A-Za-z0-9]{9}\Z")
        self.assertEqual((url, rest), ("https://files.example/sharing/" + link, ""))
        self.assertEqual((done.returncode, done.stderr), (DONE, ""))

    def test_json_is_the_link_with_its_address(self):
        done = run("create", "--json", "--project", "album", "--private-data", '{"secret":1}')
        link = json.loads(done.stdout)
        self.assertEqual(set(link), LINK_MEMBERS | {"url", "url_type"})
        self.assertEqual(link["url"], "https://files.example/sharing/" + link["hash"])
        self.assertNotIn("secret", done.stdout)

    def test_defaults(self):
        link = show(create())
        expected = {"project_name": "album", "owner_user": "root", "owner_uid": 0,
                    "enabled": True, "start_at": "", "expire_at": "", "expire_times": 0,
                    "use_count": 0, "auto_gc": True, "enable_match_ip": True,
                    "protect_type": "none", "protect_title": "", "protect_users": [],
                    "protect_groups": [], "redirect_type": "none", "redirect_uri": "", "app": {},
                    "state": "live"}
        self.assertEqual({name: link[name] for name in expected}, expected)

    def test_everything_that_a_link_can_hold(self):
        link = create("--owner", "alice", "--project", "pictures", "--hash", "My_hash-1",
                      "--start", "2030-01-02", "--expire", "2030-03-04 05:06", "--uses", "7",
                      "--use-count", "2", "--users", "alice,bob", "--users", "carol", "--groups",
                      "friends", "--title", "Größe \u65e5\u672c", "--no-match-ip", "--no-auto-gc",
                      "--disabled", "--redirect", "always", "--redirect-uri", "https://x.example/",
                      "--app", '{"a":["[x]","{}"]}', "--private-data", '{"b":1.5}')
        self.assertEqual(link, "My_hash-1")
        shown = show(link, "--private")
        expected = {"owner_user": "alice", "owner_uid": 2001, "project_name": "pictures",
                    "start_at": "2030-01-02 00:00:00", "expire_at": "2030-03-04 05:06:00",
                    "expire_times": 7, "use_count": 2, "protect_type": "user",
                    "protect_users": ["alice", "bob", "carol"], "protect_groups": ["friends"],
                    "protect_title": "Größe \u65e5\u672c", "enable_match_ip": False,
                    "auto_gc": False, "enabled": False, "state": "disabled",
                    "redirect_type": "always", "redirect_uri": "https://x.example/",
                    "app": {"a": ["[x]", "{}"]}, "private_data": {"b": 1.5}}
        self.assertEqual({name: shown[name] for name in expected}, expected)

    def test_faults_name_the_option(self):
        for arguments, option in ((["--uses", "-1"], "--uses"), (["--uses", "x"], "--uses"),
                                  (["--uses", "2147483648"], "--uses"),
                                  (["--start", "tomorrow"], "--start"),
                                  (["--expire", "2020-01-01"], "--expire"),
                                  (["--start", "+2d", "--expire", "+1d"], "--expire"),
                                  (["--hash", "a b"], "--hash"), (["--app", "[]"], "--app"),
                                  (["--app", '{"a":1,"a":2}'], "--app"),
                                  (["--users", "nobody-here"], "--users"),
                                  (["--protect", "user"], "--users"),
                                  (["--protect", "password"], "--password"),
                                  (["--redirect", "always"], "--redirect-uri"),
                                  (["--redirect-uri", "javascript:x"], "--redirect-uri"),
                                  (["--title", "a\nb"], "--title"),
                                  (["--owner", "nobody-here"], "--owner")):
            with self.subTest(arguments=arguments):
                done = run("create", "--project", "album", *arguments)
                self.assert_fails(done, USAGE, option + ": ")
        self.assert_fails(run("create"), USAGE, "--project: ")
        self.assertEqual(sql("SELECT * FROM entry"), [])

    def test_a_taken_hash_is_status_5(self):
        create("--hash", "taken")
        self.assert_fails(run("create", "--project", "x", "--hash", "taken"), TAKEN, "--hash")

    def test_password_from_standard_input(self):
        link = create("--password-stdin", text="gravy 7\nnot this\n")
        self.assertEqual(show(link)["protect_type"], "password")
        self.assertEqual(show_password_works(link, "gravy 7"), True)
        self.assertEqual(show_password_works(link, "gravy 7\nnot this"), False)
        for text in "", "\n", "x" * 129, "x" * 5000:
            self.assert_fails(run("create", "--project", "x", "--password-stdin", text=text),
                              USAGE)

    def test_data_from_files_is_read_as_the_caller(self):
        os.makedirs("/tmp/roots", mode=0o700, exist_ok=True)
        with open("/tmp/roots/app.json", "w") as file:
            file.write('{"x": [1, {"y": null}]}\n')
        os.chmod("/tmp/roots/app.json", 0o600)
        link = create("--app-file", "/tmp/roots/app.json", "--private-data-file",
                      "/tmp/roots/app.json")
        self.assertEqual(show(link, "--private")["private_data"], {"x": [1, {"y": None}]})
        self.assertEqual(show(link)["app"], {"x": [1, {"y": None}]})
        self.assert_fails(run("create", "--project", "x", "--app-file", "/tmp/roots/app.json",
                              uid=SYSTEM), FAILED, "/tmp/roots/app.json")
        self.assert_fails(run("create", "--project", "x", "--app-file", "/nowhere"), FAILED)
        self.assert_fails(run("create", "--project", "x", "--app-file", "/dev/zero"), USAGE)

    def test_hostile_texts_come_back_as_they_were(self):
        for text in ("'; DROP TABLE entry; --", '"\\', "%_%", "\u202eabc", "\U0001f600" * 20,
                     "<script>", "a" * 255):
            link = create("--title", text)
            self.assertEqual(show(link)["protect_title"], text)
        for option in "--title", "--project":
            done = subprocess.run([PROGRAM, "create", "--project", "x", option, b"\xff\xfe"],
                                  stdout=subprocess.PIPE, stderr=subprocess.PIPE)
            self.assertEqual(done.returncode, USAGE)


class FileLinks(CliTest):
    @classmethod
    def setUpClass(cls):
        os.makedirs("/srv/shares/alice", exist_ok=True)
        for name, owner, mode in (("hers", 2001, 0o600), ("his", 2002, 0o600)):
            path = "/srv/shares/alice/" + name
            with open(path, "w") as file:
                file.write(name)
            os.chown(path, owner, owner)
            os.chmod(path, mode)
        if not os.path.lexists("/srv/shares/link"):
            os.symlink("/srv/shares/alice/hers", "/srv/shares/link")

    def test_the_resolved_path_is_stored(self):
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/link")
        self.assertEqual(show(link)["app"], {"path": "/srv/shares/alice/hers"})

    def test_a_relative_path_is_below_the_current_folder(self):
        link = create("--project", "file", "--owner", "alice", "--path", "hers",
                      cwd="/srv/shares/alice")
        self.assertEqual(show(link)["app"], {"path": "/srv/shares/alice/hers"})

    def test_files_that_the_owner_may_not_share_are_refused(self):
        for path in ("/srv/shares/alice/his", "/srv/shares/alice", "/srv/shares/none",
                     "/etc/passwd"):
            done = run("create", "--project", "file", "--owner", "alice", "--path", path)
            self.assert_fails(done, NOT_ALLOWED, "--path")
        self.assert_fails(run("create", "--project", "file", "--owner", "alice"), USAGE, "--app")

    def test_the_system_account_looks_with_its_own_eyes(self):
        with open("/srv/shares/open", "w") as file:
            file.write("x")
        os.chmod("/srv/shares/open", 0o644)
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/open",
                      uid=SYSTEM)
        self.assertEqual(show(link)["app"], {"path": "/srv/shares/open"})
        done = run("create", "--project", "file", "--owner", "alice", "--path",
                   "/srv/shares/alice/hers", uid=SYSTEM)
        self.assert_fails(done, NOT_ALLOWED, "--path")

    def test_another_path_leaves_the_rest_of_the_data(self):
        link = create("--project", "file", "--owner", "alice", "--app",
                      '{"note": "n"}', "--path", "/srv/shares/alice/hers")
        self.assertEqual(run("edit", link, "--path", "/srv/shares/link").returncode, DONE)
        self.assertEqual(show(link)["app"], {"note": "n", "path": "/srv/shares/alice/hers"})
        done = run("edit", link, "--path", "/srv/shares/alice/his")
        self.assert_fails(done, NOT_ALLOWED, link, "--path")
        self.assertEqual(show(link)["app"]["path"], "/srv/shares/alice/hers")

    def test_data_that_grows_by_its_path_stays_below_the_most(self):
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/alice/hers")
        data = data_of(link)
        data["app"] = {"note": "n" * 65500, "path": "/"}
        sql("UPDATE entry SET data=? WHERE hash=?", json.dumps(data), link)
        done = run("edit", link, "--path", "/srv/shares/alice/hers")
        self.assert_fails(done, USAGE, "64 KiB")
        self.assertEqual(data_of(link), data)

    def test_another_owner_must_be_able_to_read_the_file(self):
        link = create("--project", "file", "--owner", "alice", "--path", "/srv/shares/alice/hers")
        self.assert_fails(run("edit", link, "--owner", "bob"), NOT_ALLOWED)


if __name__ == "__main__":
    cli_program.main()
