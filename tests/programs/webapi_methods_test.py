"""What the methods of the web API do, asked through both of its fronts: the command, and a real web
server. Arguments: the build folder, the project's folder."""

import json
import re
import sys
import time
import unittest

import visitor_server as vs
import webapi_server as ws
from visitor_server import sql

FRONTS = {}
MEMBERS = {"id", "hash", "project_name", "owner_user", "owner_uid", "state", "enabled", "start_at",
           "expire_at", "expire_times", "use_count", "auto_gc", "enable_match_ip", "protect_type",
           "protect_title", "protect_users", "protect_groups", "redirect_type", "redirect_uri", "app"}
TIME = re.compile(r"\d{4}-\d\d-\d\d \d\d:\d\d:\d\d")


def moment(offset):
    """Local time, so many seconds from now."""
    return time.strftime("%Y-%m-%d %H:%M:%S", time.localtime(time.time() + offset))


class Methods:
    """The tests, for one front."""

    front = None

    @property
    def api(self):
        return FRONTS[self.front]

    def call(self, who, method, **arguments):
        return self.api.call(who, method, **arguments)

    def done(self, who, method, **arguments):
        answer = self.call(who, method, **arguments)
        self.assertTrue(answer.ok, answer)
        return answer.data

    def create(self, who="alice", **settings):
        return self.done(who, "create", **{"project_name": "photos", **settings})["link"]

    def refused(self, code, field, who, method, **arguments):
        answer = self.call(who, method, **arguments)
        self.assertEqual((answer.code, answer.field), (code, field), answer)
        return answer

    def set_refused(self, code, field, **settings):
        """Refused at creation and for an existing link alike, which stays as it was."""
        self.refused(code, field, "alice", "create", **{"project_name": "x", **settings})
        self.refused(code, field, "alice", "set", id=self.kept["id"], **settings)
        self.assertEqual(self.done("alice", "get", id=self.kept["id"])["link"], self.kept)

    def accepted(self, name, value, shown=None):
        """Accepted at creation and for an existing link, and shown so."""
        shown = value if shown is None else shown
        link = self.create(**{name: value})
        self.assertEqual(link[name], shown)
        other = self.create()
        self.assertEqual(self.done("alice", "set", id=other["id"], **{name: value})["link"][name],
                         shown)
        self.assertEqual(self.done("alice", "get", id=link["id"])["link"], link)

    def setUp(self):
        sql("DELETE FROM entry")
        self.kept = self.create(protect_title="stays")


class Create(Methods):
    def test_a_project_is_all_it_takes(self):
        answer = self.done("alice", "create", project_name="photos")
        self.assertEqual(set(answer), {"link", "url", "url_type"})
        link = answer["link"]
        self.assertEqual(set(link), MEMBERS)
        self.assertRegex(link["hash"], "^[A-Za-z0-9]{9}$")
        row, = sql("SELECT id FROM entry WHERE hash=?", link["hash"])
        self.assertEqual(link, {
            "id": row[0], "hash": link["hash"], "project_name": "photos", "owner_user": "alice",
            "owner_uid": 2001, "state": "live", "enabled": True, "start_at": "", "expire_at": "",
            "expire_times": 0, "use_count": 0, "auto_gc": True, "enable_match_ip": True,
            "protect_type": "none", "protect_title": "", "protect_users": [], "protect_groups": [],
            "redirect_type": "none", "redirect_uri": "", "app": {}})

    def test_address_is_the_tools(self):
        answer = self.done("alice", "create", project_name="photos")
        self.assertRegex(answer["url"], r"^http://[^/ ]+/sharing/" + answer["link"]["hash"] + "$")
        self.assertEqual(answer["url_type"], 0)

    def test_everything_at_once(self):
        settings = {
            "project_name": "photos", "hash": "My-own_hash1", "enabled": False,
            "start_at": "2030-01-02 03:04:05", "expire_at": "2031-01-02 03:04:05",
            "expire_times": 7, "use_count": 2, "auto_gc": False, "enable_match_ip": False,
            "protect_type": "user", "protect_title": "Our trip", "protect_users": ["alice", "bob"],
            "protect_groups": ["friends"], "redirect_type": "always",
            "redirect_uri": "https://example.org/a?b#c", "app": {"a": [1, {"b": None}]}}
        link = self.create(private_data={"secret": "s3cret"}, **settings)
        self.assertEqual({name: link[name] for name in settings}, settings)
        stored = json.loads(sql("SELECT data FROM entry WHERE id=?", link["id"])[0][0])
        self.assertEqual(stored["private_data"], {"secret": "s3cret"})

    def test_project_is_needed(self):
        self.refused(201, "project_name", "alice", "create")

    def test_chosen_hash_that_is_taken(self):
        self.create(hash="taken-one")
        for who in "alice", "bob", "carol":
            self.refused(204, "hash", who, "create", project_name="x", hash="taken-one")
        self.assertEqual(len(sql("SELECT 1 FROM entry WHERE hash='taken-one'")), 1)

    def test_hashes_differ_by_case(self):
        self.create(hash="some-hash")
        self.create(hash="Some-Hash")

    def test_end_must_lie_in_the_future(self):
        for end in moment(-60), moment(0), "1999-12-31", "1999-12-31 23:59":
            self.refused(203, "expire_at", "alice", "create", project_name="x", expire_at=end)

    def test_unknown_argument(self):
        for name in "id", "owner_uid", "state", "url", "qr", "Hash", "protect_password_salt":
            self.refused(200, name, "alice", "create", project_name="x", **{name: "1"})


class Get(Methods):
    def test_by_id_and_by_hash(self):
        link = self.create()
        by_id = self.done("alice", "get", id=link["id"])
        self.assertEqual(set(by_id), {"link", "url", "url_type"})
        self.assertEqual(by_id["link"], link)
        self.assertEqual(self.done("alice", "get", hash=link["hash"]), by_id)

    def test_one_name_and_only_one(self):
        self.refused(201, "id", "alice", "get")
        self.refused(208, "hash", "alice", "get", id=self.kept["id"], hash=self.kept["hash"])

    def test_names_that_name_nothing(self):
        self.refused(205, "", "alice", "get", id=2147483647)
        self.refused(205, "", "alice", "get", hash="no-such-link")
        self.refused(205, "", "alice", "get", hash="' OR '1'='1")
        self.refused(205, "", "alice", "get", hash=self.kept["hash"].swapcase())
        self.refused(203, "id", "alice", "get", id=0)
        self.refused(203, "id", "alice", "get", id=-1)
        self.refused(203, "id", "alice", "get", id=2147483648)
        self.refused(203, "id", "alice", "get", id=10**30 if self.api.reads_texts else 2**63)
        self.refused(203, "hash", "alice", "get", hash="")

    def test_qr_code_of_the_address(self):
        answer = self.done("alice", "get", id=self.kept["id"], qr=True)
        self.assertEqual(set(answer), {"link", "url", "url_type", "qr_svg"})
        self.assertIn("<svg ", answer["qr_svg"])
        self.assertIn("</svg>", answer["qr_svg"])
        self.assertNotIn("<script", answer["qr_svg"])
        self.assertNotIn("qr_svg", self.done("alice", "get", id=self.kept["id"], qr=False))

    def test_without_an_address_there_is_no_qr_code(self):
        sql("UPDATE entry SET hash='no good hash' WHERE id=?", self.kept["id"])
        answer = self.done("alice", "get", id=self.kept["id"], qr=True)
        self.assertEqual((answer["url"], answer["url_type"], answer["qr_svg"]), ("", -1, ""))
        self.assertEqual(self.done("alice", "get", hash="no good hash"),
                         {name: answer[name] for name in ("link", "url", "url_type")})

    def test_password_and_private_data_stay_hidden(self):
        link = self.create(protect_password="hunter2-hunter2", private_data={"inner": "hidden-part"})
        data = json.loads(sql("SELECT data FROM entry WHERE id=?", link["id"])[0][0])
        secrets = [data["protect_password"], data["protect_password_salt"], "hunter2", "hidden-part",
                   "private_data", "protect_password"]
        self.assertTrue(all(secrets))
        for answer in (self.done("alice", "get", id=link["id"], qr=True),
                       self.done("alice", "list"), self.done("carol", "list"),
                       self.done("alice", "set", id=link["id"], protect_password="another-one"),
                       self.done("alice", "sessions", id=link["id"])):
            for secret in secrets:
                self.assertNotIn(secret, json.dumps(answer))


class State(Methods):
    def states(self, link):
        shown = self.done("alice", "get", id=link["id"])["link"]["state"]
        for state in "disabled", "expired", "used_up", "not_yet", "live":
            ids = [one["id"] for one in self.done("alice", "list", state=state)["links"]]
            self.assertEqual(link["id"] in ids, state == shown, (state, shown))
        return shown

    def test_first_that_applies(self):
        link = self.create()
        self.assertEqual(self.states(link), "live")
        self.done("alice", "set", id=link["id"], start_at=moment(3600))
        self.assertEqual(self.states(link), "not_yet")
        self.done("alice", "set", id=link["id"], expire_times=2)
        self.done("alice", "set", id=link["id"], use_count=2)
        self.assertEqual(self.states(link), "used_up")
        self.done("alice", "set", id=link["id"], start_at="", expire_at=moment(-3600))
        self.assertEqual(self.states(link), "expired")
        self.done("alice", "set", id=link["id"], enabled=False)
        self.assertEqual(self.states(link), "disabled")


class Settings(Methods):
    def test_project_name(self):
        for value in "a", "a" * 64, "日本" * 10, "a b'\"<>;--%", "\u202egnp.exe", "😀":
            self.accepted("project_name", value)
        for value in "", "a" * 65, "日" * 22, "a\nb", "a\tb", "a\x7fb", "a\u0085b":
            self.set_refused(203, "project_name", project_name=value)

    def test_hash(self):
        for value in "abc", "a" * 64, "A-z_0-9":
            self.accepted_hash(value)
        for value in "", "ab", "a" * 65, "a b", "a/b", "a'b", "äöü", "abc\n", "a%41b":
            self.set_refused(203, "hash", hash=value)

    def accepted_hash(self, value):
        self.assertEqual(self.create(hash=value)["hash"], value)
        other = self.create()
        self.refused(204, "hash", "alice", "set", id=other["id"], hash=value)
        self.assertEqual(self.done("alice", "set", id=other["id"],
                                   hash=value[::-1] + "x" if len(value) < 64 else "y" * 64
                                   )["link"]["id"], other["id"])

    def test_booleans(self):
        for name in "enabled", "auto_gc", "enable_match_ip":
            for value in True, False:
                self.accepted(name, value)

    def test_times(self):
        for name in "start_at", "expire_at":
            self.accepted(name, "")
            self.accepted(name, "2030-05-06 07:08:09")
            self.accepted(name, "2030-05-06T07:08:09", "2030-05-06 07:08:09")
            self.accepted(name, "2030-05-06 07:08", "2030-05-06 07:08:00")
            self.accepted(name, "2038-01-19 03:14:07")
            for value in ("2038-01-19 03:14:08", "2030-02-30", "2030-5-6", "tomorrow", "+", "+7", "7d",
                          "+1y", "-1d", "2030-05-06 24:00", "2030-05-06 07:08:09 ", " 2030-05-06",
                          "2030-05-06\n", "1969-12-31", "+99999w", "'", "2030-05-06 07:08:60"):
                self.set_refused(203, name, **{name: value})
        self.accepted("start_at", "2030-05-06", "2030-05-06 00:00:00")
        self.accepted("expire_at", "2030-05-06", "2030-05-06 23:59:59")

    def test_times_counted_from_now(self):
        for text, seconds in (("+90s", 90), ("+30m", 1800), ("+12h", 43200), ("+7d", 604800),
                              ("+2w", 1209600)):
            before = moment(seconds)
            shown = self.create(expire_at=text)["expire_at"]
            self.assertLessEqual(before, shown)
            self.assertLessEqual(shown, moment(seconds))

    def test_end_behind_the_start(self):
        self.set_refused(208, "expire_at", start_at="2030-01-01", expire_at="2029-12-31")
        self.set_refused(208, "expire_at", start_at="2030-01-01 12:00", expire_at="2030-01-01 12:00")
        link = self.create(start_at="2030-01-01 12:00", expire_at="2030-01-01 12:00:01")
        self.refused(208, "expire_at", "alice", "set", id=link["id"], start_at="2031-01-01")
        self.refused(208, "expire_at", "alice", "set", id=link["id"], expire_at="2029-01-01")
        self.done("alice", "set", id=link["id"], expire_at="", start_at="2031-01-01")

    def test_existing_link_may_be_ended(self):
        link = self.create()
        self.assertEqual(self.done("alice", "set", id=link["id"], expire_at=moment(-1))
                         ["link"]["state"], "expired")

    def test_counts(self):
        for name in "expire_times", "use_count":
            for value in 0, 1, 2147483647:
                self.accepted(name, value)
            for value in -1, -2147483648, 2147483648, 2**62:
                self.set_refused(203, name, **{name: value})

    def test_limit_where_there_was_none_starts_the_count(self):
        link = self.create(use_count=5)
        self.assertEqual(self.done("alice", "set", id=link["id"], expire_times=9)
                         ["link"]["use_count"], 0)
        self.done("alice", "set", id=link["id"], use_count=5)
        self.assertEqual(self.done("alice", "set", id=link["id"], expire_times=8)
                         ["link"]["use_count"], 5)
        link = self.create(use_count=5)
        self.assertEqual(self.done("alice", "set", id=link["id"], expire_times=9, use_count=3)
                         ["link"]["use_count"], 3)

    def test_title(self):
        for value in "", "x" * 255, "日" * 85, "<b>'\"&\\ \u202e😀":
            self.accepted("protect_title", value)
        for value in "x" * 256, "日" * 86, "a\nb", "a\x1bb":
            self.set_refused(203, "protect_title", protect_title=value)

    def test_password(self):
        for value in "x", "x" * 128, "日本 '\"\\%s😀":
            link = self.create(protect_password=value)
            self.assertEqual(link["protect_type"], "password")
            self.assertTrue(opens(link["hash"], value))
            self.assertFalse(opens(link["hash"], value + "x"))
        for value in "", "x" * 129, "a\nb":
            self.set_refused(203, "protect_password", protect_password=value)

    def test_changed_password_replaces_the_old_one(self):
        link = self.create(protect_password="old")
        self.done("alice", "set", id=link["id"], protect_title="kept password")
        self.assertTrue(opens(link["hash"], "old"))
        self.done("alice", "set", id=link["id"], protect_password="new")
        self.assertFalse(opens(link["hash"], "old"))
        self.assertTrue(opens(link["hash"], "new"))

    def test_protection_by_what_is_given(self):
        self.assertEqual(self.create(protect_password="x")["protect_type"], "password")
        self.assertEqual(self.create(protect_users=["bob"])["protect_type"], "user")
        self.assertEqual(self.create(protect_groups=["friends"])["protect_type"], "user")
        self.assertEqual(self.create(protect_users=[])["protect_type"], "none")
        self.set_refused(208, "protect_type", protect_password="x", protect_users=["bob"])
        both = self.create(protect_password="x", protect_users=["bob"], protect_type="password")
        self.assertEqual((both["protect_type"], both["protect_users"]), ("password", ["bob"]))

    def test_protection_needs_what_it_is_about(self):
        self.set_refused(208, "protect_password", protect_type="password")
        self.set_refused(208, "protect_users", protect_type="user")
        self.set_refused(203, "protect_type", protect_type="anything")
        self.set_refused(203, "protect_type", protect_type="")
        link = self.create(protect_users=["bob"])
        self.refused(208, "protect_users", "alice", "set", id=link["id"], protect_users=[])
        self.assertEqual(self.done("alice", "set", id=link["id"], protect_users=[],
                                   protect_type="none")["link"]["protect_type"], "none")

    def test_users_and_groups(self):
        self.assertEqual(self.create(protect_users=["bob", "alice", "bob"])["protect_users"],
                         ["bob", "alice", "bob"])
        self.assertEqual(len(self.create(protect_users=["bob"] * 200)["protect_users"]), 200)
        for name in "protect_users", "protect_groups":
            for value in (["bob"] * 201, ["no-such"], [""], ["bob\n"], ["bo'b"], ["bob", "no-such"]):
                self.set_refused(203, name, **{name: value})

    def test_redirect(self):
        for uri in ("https://example.org/", "HTTP://example.org:81/a?b=c#d", "/path", "relative/x",
                    "/" + "x" * 2047):
            link = self.create(redirect_type="url_param", redirect_uri=uri)
            self.assertEqual((link["redirect_type"], link["redirect_uri"]), ("url_param", uri))
        for uri in ("javascript:alert(1)", "data:text/html,x", "//example.org", "/\\example.org",
                    "ftp://example.org", "https://", "/a\nb", "/" + "x" * 2048):
            self.set_refused(203, "redirect_uri", redirect_uri=uri)
        self.set_refused(203, "redirect_type", redirect_type="sometimes")
        self.set_refused(208, "redirect_uri", redirect_type="always")
        link = self.create(redirect_type="always", redirect_uri="/x")
        self.refused(208, "redirect_uri", "alice", "set", id=link["id"], redirect_uri="")

    def test_app_and_private_data(self):
        hostile = {"'; DROP TABLE entry; --": ["\"\\\n\u202e😀", 1, -2.5, None, True, {"": {}}]}
        self.accepted("app", hostile)
        room = 65536 - len('{"a":""}')
        self.accepted("app", {"a": "x" * room})
        self.accepted("app", nested(32))
        self.create(private_data={"a": "x" * room})
        for name in "app", "private_data":
            self.set_refused(203, name, **{name: {"a": "x" * (room + 1)}})

    def test_values_of_another_type(self):
        wrong = {"owner_user": [], "project_name": {}, "hash": [], "enabled": "maybe",
                 "start_at": [], "expire_times": "many", "use_count": "1.5",
                 "auto_gc": "yes", "enable_match_ip": "", "protect_type": {}, "protect_title": [],
                 "protect_password": {}, "protect_users": "bob", "protect_groups": [1],
                 "redirect_type": [], "redirect_uri": {}, "app": [], "private_data": "text"}
        if self.api.reads_texts:  # where every text is a text
            wrong = {name: value for name, value in wrong.items()
                     if name in ("enabled", "expire_times", "use_count", "auto_gc",
                                 "enable_match_ip", "protect_users", "protect_groups", "app",
                                 "private_data")}
        else:
            wrong.update(enabled=1, expire_times=1.0, use_count=True, protect_title=None, app=None,
                         hash=123, protect_users=None)
        for name, value in wrong.items():
            with self.subTest(name=name):
                self.set_refused(202, name, **{name: value})

    def test_nothing_set_changes_nothing(self):
        self.assertEqual(self.done("alice", "set", id=self.kept["id"])["link"], self.kept)

    def test_set_needs_an_id_that_is_there(self):
        self.refused(201, "id", "alice", "set", protect_title="x")
        self.refused(203, "id", "alice", "set", id=0, protect_title="x")
        self.refused(205, "", "alice", "set", id=2147483647, protect_title="x")

    def test_own_hash_may_be_set_again(self):
        self.done("alice", "set", id=self.kept["id"], hash=self.kept["hash"])

    def test_set_answers_with_the_link_as_it_is_now(self):
        answer = self.done("alice", "set", id=self.kept["id"], hash="new-hash", enabled=False)
        self.assertEqual(answer["link"], {**self.kept, "hash": "new-hash", "enabled": False,
                                          "state": "disabled"})
        self.assertTrue(answer["url"].endswith("/sharing/new-hash"))
        self.assertEqual(set(answer), {"link", "url", "url_type"})


class Ownership(Methods):
    def test_others_links_do_not_exist(self):
        link = self.create("bob")
        for method, arguments in (("get", {}), ("sessions", {}), ("sign_out", {}), ("delete", {}),
                                  ("set", {"protect_title": "x"})):
            self.assertEqual(self.refused(205, "", "alice", method, id=link["id"], **arguments)
                             .document,
                             self.refused(205, "", "alice", method, id=2147483647, **arguments)
                             .document)
        for method in "get", "sessions", "sign_out", "delete":
            self.refused(205, "", "alice", method, hash=link["hash"])
        self.assertEqual(self.done("bob", "get", id=link["id"])["link"], link)

    def test_list_has_ones_own_links(self):
        own, others = self.create(), self.create("bob")
        ids = [link["id"] for link in self.done("alice", "list")["links"]]
        self.assertIn(own["id"], ids)
        self.assertNotIn(others["id"], ids)
        self.assertEqual(self.done("alice", "list")["total"], len(ids))
        self.assertEqual([link["id"] for link in
                          self.done("alice", "list", owner_user="alice")["links"]], ids)

    def test_owners_other_than_oneself(self):
        for who in "bob", "root", "carol", "no-such", "":
            self.refused(106, "owner_user", "alice", "create", project_name="x", owner_user=who)
            self.refused(106, "owner_user", "alice", "set", id=self.kept["id"], owner_user=who)
            self.refused(106, "owner_user", "alice", "list", owner_user=who)
            self.refused(106, "owner_user", "alice", "delete_expired", owner_user=who)
        self.assertEqual(self.create(owner_user="alice")["owner_uid"], 2001)

    def test_administrators_see_and_change_all(self):
        link = self.create("bob")
        self.assertEqual(self.done("carol", "get", id=link["id"])["link"], link)
        self.assertEqual(self.done("carol", "sessions", id=link["id"])["total"], 0)
        self.assertEqual(self.done("carol", "set", id=link["id"], owner_user="alice")
                         ["link"]["owner_user"], "alice")
        self.refused(205, "", "bob", "get", id=link["id"])
        self.assertEqual(self.create("carol", owner_user="bob")["owner_uid"], 2002)
        self.assertEqual({one["owner_user"] for one in self.done("carol", "list")["links"]},
                         {"alice", "bob"})
        self.assertEqual({one["owner_user"] for one in
                          self.done("carol", "list", owner_user="bob")["links"]}, {"bob"})
        self.assertEqual(self.done("carol", "delete", id=link["id"]), {"deleted": 1})

    def test_administrator_names_an_owner_that_is_none(self):
        for who in "no-such", "", "alice\n", "2001":
            for method, others in (("create", {"project_name": "x"}), ("list", {}),
                                   ("delete_expired", {}), ("set", {"id": self.kept["id"]})):
                self.refused(203, "owner_user", "carol", method, owner_user=who, **others)

    def test_owner_whose_account_is_gone(self):
        link = self.create()
        sql("UPDATE entry SET owner_uid=4999 WHERE id=?", link["id"])
        shown = self.done("carol", "get", id=link["id"])["link"]
        self.assertEqual((shown["owner_user"], shown["owner_uid"]), ("", 4999))
        self.refused(205, "", "alice", "get", id=link["id"])


class List(Methods):
    def ids(self, who="alice", **arguments):
        return [link["id"] for link in self.done(who, "list", **arguments)["links"]]

    def test_answer(self):
        answer = self.done("alice", "list")
        self.assertEqual(set(answer), {"total", "offset", "now", "links"})
        self.assertRegex(answer["now"], TIME)
        self.assertEqual(answer["links"], [self.kept])
        self.assertEqual((answer["total"], answer["offset"]), (1, 0))

    def test_pages(self):
        made = [self.kept["id"]] + [self.create()["id"] for _ in range(6)]
        seen = []
        for offset in 0, 3, 6, 9:
            answer = self.done("alice", "list", offset=offset, limit=3)
            self.assertEqual((answer["total"], answer["offset"]), (7, offset))
            seen += [link["id"] for link in answer["links"]]
        self.assertEqual(seen, made)

    def test_page_limits(self):
        self.assertEqual(self.ids(limit=1, offset=0), [self.kept["id"]])
        self.assertEqual(self.ids(limit=500), [self.kept["id"]])
        self.assertEqual(self.ids(offset=2147483647), [])
        for limit in 0, -1, 501, 2147483648:
            self.refused(203, "limit", "alice", "list", limit=limit)
        for offset in -1, 2147483648:
            self.refused(203, "offset", "alice", "list", offset=offset)

    def test_fifty_unless_told(self):
        data = sql("SELECT data FROM entry")[0][0]
        for number in range(55):
            sql("INSERT INTO entry VALUES (NULL,?,'x',1,2001,0,0,0,0,1,?)", f"bulk{number}", data)
        answer = self.done("alice", "list")
        self.assertEqual((len(answer["links"]), answer["total"]), (50, 56))

    def test_sorts(self):
        rows = [self.create(project_name=project, hash=hash_, enabled=enabled, start_at=start,
                            expire_at=end, expire_times=times, use_count=count)
                for project, hash_, enabled, start, end, times, count in (
                    ("b", "hash-1", True, "2030-01-03", "2031-01-01", 5, 1),
                    ("a", "hash-3", False, "2030-01-01", "2031-01-03", 7, 0),
                    ("c", "hash-2", True, "2030-01-02", "2031-01-02", 6, 2))]
        for row in rows:
            row["owner_uid"] = 2001
        for column in ("id", "hash", "project_name", "owner_uid", "enabled", "start_at", "expire_at",
                       "expire_times", "use_count"):
            wanted = [row["id"] for row in sorted(rows, key=lambda row: (row[column], row["id"]))]
            with self.subTest(column=column):
                self.assertEqual([one for one in self.ids(sort=column) if one != self.kept["id"]],
                                 wanted)
                self.assertEqual([one for one in self.ids(sort=column, descending=True)
                                  if one != self.kept["id"]], wanted[::-1])
        for column in "", "data", "private_data", "id; DROP TABLE entry", "ID", "state":
            self.refused(203, "sort", "alice", "list", sort=column)

    def test_filters(self):
        one = self.create(project_name="one", protect_title="Summer in Rome")["id"]
        two = self.create(project_name="two", hash="Hash-of-two")["id"]
        self.assertEqual(self.ids(project_name="one"), [one])
        self.assertEqual(self.ids(project_name="On"), [])
        self.assertEqual(self.ids(search="summer"), [one])
        self.assertEqual(self.ids(search="of-t"), [two])
        self.assertEqual(self.ids(search="two"), [two])
        self.assertEqual(self.ids(search="one", project_name="two"), [])
        self.assertEqual(self.ids(search=""), [self.kept["id"], one, two])
        self.assertEqual(self.done("alice", "list", search="Rome", limit=1)["total"], 1)

    def test_search_is_for_the_text_as_it_is(self):
        plain = self.create(protect_title="100% o'clock_ \\ \"x\"")["id"]
        for piece in "100%", "o'clock", "k_", "\\", '"x"':
            self.assertEqual(self.ids(search=piece), [plain])
        for piece in "%", "_":
            self.assertEqual(self.ids(search=piece), [plain])
        for piece in "' OR 1=1 --", "%%", "__":
            self.assertEqual(self.ids(search=piece), [])

    def test_search_is_short(self):
        self.assertEqual(self.ids(search="x" * 64), [])
        self.refused(203, "search", "alice", "list", search="x" * 65)

    def test_search_does_not_look_into_secrets(self):
        self.create(protect_password="p", private_data={"k": "needle"}, app={"k": "needle"})
        self.assertEqual(self.ids(search="needle"), [])
        self.assertEqual(self.ids(search="private_data"), [])

    def test_filter_values_that_are_none(self):
        for state in "", "Live", "live ", "gone":
            self.refused(203, "state", "alice", "list", state=state)
        self.refused(203, "project_name", "alice", "list", project_name="")
        self.refused(203, "project_name", "alice", "list", project_name="x" * 65)

    def test_row_that_is_no_link_is_counted_only(self):
        sql("INSERT INTO entry VALUES (NULL,'damaged','x',1,2001,0,0,0,0,1,'no json')")
        answer = self.done("alice", "list")
        self.assertEqual((answer["total"], answer["links"]), (2, [self.kept]))
        self.refused(205, "", "alice", "get", hash="damaged")

    def test_text_that_is_not_utf8_stays_readable(self):
        sql("UPDATE entry SET project_name=CAST(x'61ff62' AS TEXT) WHERE id=?", self.kept["id"])
        self.assertEqual(self.done("alice", "list")["links"][0]["project_name"], "a\ufffdb")


class Delete(Methods):
    def test_by_id_and_by_hash(self):
        for name in "id", "hash":
            link = self.create()
            self.assertEqual(self.done("alice", "delete", **{name: link[name]}), {"deleted": 1})
            self.refused(205, "", "alice", "get", id=link["id"])
            self.refused(205, "", "alice", "delete", **{name: link[name]})
        self.assertEqual(self.done("alice", "get", id=self.kept["id"])["link"], self.kept)

    def test_names_exactly_one(self):
        self.refused(201, "id", "alice", "delete")
        self.refused(208, "hash", "alice", "delete", id=self.kept["id"], hash="x")
        self.refused(203, "id", "alice", "delete", id=0)
        self.refused(203, "hash", "alice", "delete", hash="")
        self.refused(205, "", "alice", "delete", hash="%")
        self.assertEqual(self.done("alice", "list")["total"], 1)


class DeleteExpired(Methods):
    def ended(self, who, project, **settings):
        link = self.create(who, project_name=project, **settings)
        if "expire_times" not in settings:
            self.done(who, "set", id=link["id"], expire_at=moment(-60))
        return link["id"]

    def left(self):
        return {row[0] for row in sql("SELECT id FROM entry")}

    def test_ones_own_ended_links(self):
        gone = {self.ended("alice", "x"), self.ended("alice", "y", auto_gc=False),
                self.ended("alice", "x", expire_times=3, use_count=3),
                self.ended("alice", "x", enabled=False)}
        stay = {self.kept["id"], self.ended("bob", "x"),
                self.create(expire_at="+1h", expire_times=3, use_count=2)["id"]}
        self.assertEqual(self.done("alice", "delete_expired"), {"deleted": len(gone)})
        self.assertEqual(self.left(), stay)
        self.assertEqual(self.done("alice", "delete_expired", owner_user="alice"), {"deleted": 0})

    def test_one_project(self):
        x, y = self.ended("alice", "x"), self.ended("alice", "y")
        self.assertEqual(self.done("alice", "delete_expired", project_name="x"), {"deleted": 1})
        self.assertEqual(self.left(), {self.kept["id"], y})
        self.assertNotIn(x, self.left())
        self.refused(203, "project_name", "alice", "delete_expired", project_name="")
        self.assertEqual(self.done("alice", "delete_expired", project_name="' OR '1'='1"),
                         {"deleted": 0})

    def test_only_counting(self):
        there = {self.kept["id"], self.ended("alice", "x"), self.ended("alice", "x", enabled=False)}
        self.ended("bob", "x")
        self.assertEqual(self.done("alice", "delete_expired", dry_run=True), {"deleted": 2})
        self.assertEqual(self.done("alice", "delete_expired", dry_run=True, project_name="y"),
                         {"deleted": 0})
        self.assertLessEqual(there, self.left())

    def test_administrators_everybodys_or_one_owners(self):
        self.ended("alice", "x")
        bobs = self.ended("bob", "x")
        self.assertEqual(self.done("carol", "delete_expired", owner_user="bob"), {"deleted": 1})
        self.assertNotIn(bobs, self.left())
        self.ended("bob", "x")
        self.assertEqual(self.done("carol", "delete_expired"), {"deleted": 2})
        self.assertEqual(self.left(), {self.kept["id"]})


class Sessions(Methods):
    def test_nobody(self):
        self.assertEqual(self.done("alice", "sessions", id=self.kept["id"]),
                         {"total": 0, "sessions": []})

    def test_who_is_admitted(self):
        now = int(time.time())
        for row, (uid, address, end) in enumerate((
                (4294967295, "192.0.2.1", now + 3600), (2002, "2001:db8::1", now + 7200),
                (4999, "192.0.2.3", now + 1800), (2002, "192.0.2.4", now - 60)), 1):
            sql("INSERT INTO session VALUES (?,?,?,?,?)", row, f"session-id-{row}", uid, address, end)
            sql("INSERT INTO token VALUES (?,?,?,?)", row, self.kept["id"], row, end)
        try:
            # A session with an account that it proved at another link.
            self.assertEqual({one["user"] for one in self.done(
                "alice", "sessions", id=self.kept["id"])["sessions"]}, {""})
            self.done("alice", "set", id=self.kept["id"], protect_users=["bob"])
            for name in "id", "hash":
                answer = self.done("alice", "sessions", **{name: self.kept[name]})
                self.assertEqual(answer["total"], 3)
                self.assertEqual(
                    [(one["ip"], one["user"], one["expires_at"]) for one in answer["sessions"]],
                    [("2001:db8::1", "bob", moment(now + 7200 - time.time())),
                     ("192.0.2.1", "", moment(now + 3600 - time.time())),
                     ("192.0.2.3", "", moment(now + 1800 - time.time()))])
                self.assertNotIn("session-id", json.dumps(answer))
        finally:
            self.done("alice", "set", id=self.kept["id"], protect_type="none")
            sql("DELETE FROM session")
            sql("DELETE FROM token")

    def test_five_hundred_at_most(self):
        end = int(time.time()) + 3600
        connection = vs.sqlite3.connect(vs.DATABASE, timeout=30)
        with connection:
            for row in range(1, 503):
                connection.execute("INSERT INTO session VALUES (?,?,4294967295,'192.0.2.1',?)",
                                   (row, f"s{row}", end))
                connection.execute("INSERT INTO token VALUES (?,?,?,?)",
                                   (row, self.kept["id"], row, end))
        connection.close()
        try:
            answer = self.done("alice", "sessions", id=self.kept["id"])
            self.assertEqual((answer["total"], len(answer["sessions"])), (502, 500))
        finally:
            sql("DELETE FROM session")
            sql("DELETE FROM token")

    def test_needs_a_name(self):
        self.refused(201, "id", "alice", "sessions")
        self.refused(205, "", "alice", "sessions", hash="no-such")


class SignOut(Methods):
    def setUp(self):
        super().setUp()
        for table in "token", "session":
            self.addCleanup(sql, "DELETE FROM " + table)

    def admit(self, link, *seconds):
        """Visitors of a link whose admission ends so many seconds from now."""
        for offset in seconds:
            row = sql("SELECT ifnull(max(id), 0) + 1 FROM session")[0][0]
            end = int(time.time()) + offset
            sql("INSERT INTO session VALUES (?,?,4294967295,'192.0.2.1',?)", row, f"s{row}", end)
            sql("INSERT INTO token VALUES (NULL,?,?,?)", link["id"], row, end)

    def admitted(self, link):
        return sql("SELECT count(*) FROM token WHERE entry_id=?", link["id"])[0][0]

    def test_everybody_of_one_link(self):
        other = self.create()
        for name in "id", "hash":
            self.admit(self.kept, 60, 3600, -60)
            self.admit(other, 60)
            self.assertEqual(self.done("alice", "sign_out", **{name: self.kept[name]}),
                             {"signed_out": 2})  # the third had ended by itself
            self.assertEqual(self.admitted(self.kept), 0)
            self.assertEqual(self.done("alice", "sessions", id=self.kept["id"])["total"], 0)
        self.assertEqual(self.admitted(other), 2)
        self.assertEqual(self.done("alice", "get", id=self.kept["id"])["link"], self.kept)
        self.assertEqual(sql("SELECT count(*) FROM session"), [(8,)])  # which other links may need

    def test_nobody_is_no_fault(self):
        self.assertEqual(self.done("alice", "sign_out", id=self.kept["id"]), {"signed_out": 0})

    def test_others_visitors_stay(self):
        self.admit(self.kept, 60)
        self.refused(205, "", "bob", "sign_out", id=self.kept["id"])
        self.assertEqual(self.admitted(self.kept), 1)
        self.assertEqual(self.done("carol", "sign_out", id=self.kept["id"]), {"signed_out": 1})

    def test_needs_a_name(self):
        self.refused(201, "id", "alice", "sign_out")
        self.refused(208, "hash", "alice", "sign_out", id=self.kept["id"], hash=self.kept["hash"])
        self.refused(205, "", "alice", "sign_out", hash="no-such")

    def test_another_password_signs_out(self):
        for settings in {"protect_password": "first"}, {"protect_password": "second"}:
            self.admit(self.kept, 60)
            self.done("alice", "set", id=self.kept["id"], **settings)
            self.assertEqual(self.admitted(self.kept), 0, settings)

    def test_other_changes_do_not(self):
        self.done("alice", "set", id=self.kept["id"], protect_password="tea")
        self.admit(self.kept, 60)
        for settings in ({"protect_title": "x"}, {"enabled": False}, {"hash": "other-hash"},
                         {"protect_users": ["bob"]}, {"protect_type": "none"}):
            self.done("alice", "set", id=self.kept["id"], **settings)
            self.assertEqual(self.admitted(self.kept), 1, settings)
        self.done("alice", "set", id=self.kept["id"], protect_type="password")  # the former one
        self.assertEqual(self.admitted(self.kept), 0)

    def test_password_that_is_refused_signs_nobody_out(self):
        self.admit(self.kept, 60)
        self.refused(203, "protect_password", "alice", "set", id=self.kept["id"],
                     protect_password="")
        self.create(hash="taken")
        self.refused(204, "hash", "alice", "set", id=self.kept["id"], protect_password="x",
                     hash="taken")
        self.assertEqual(self.admitted(self.kept), 1)


class Info(Methods):
    def query(self, who):
        answer = self.call(who, "query", api=ws.INFO)
        self.assertTrue(answer.ok, answer)
        return answer.data

    def test_account(self):
        self.assertEqual(self.query("alice")["account"],
                         {"user": "alice", "uid": 2001, "administrator": False})
        self.assertEqual(self.query("carol")["account"],
                         {"user": "carol", "uid": 2003, "administrator": True})

    def test_answer(self):
        answer = self.query("alice")
        self.assertEqual(set(answer), {"apis", "account", "now", "share_folders"})
        self.assertRegex(answer["now"], TIME)
        self.assertEqual(answer["share_folders"], ["/tmp/shared", "/tmp/other folder"])

    def test_apis(self):
        apis = self.query("alice")["apis"]
        self.assertEqual(set(apis), {ws.LINK, ws.INFO})
        for api in apis.values():
            self.assertEqual((api["path"], api["min_version"], api["max_version"]),
                             ("/webapi/entry.cgi", 1, 1))
        methods = apis[ws.LINK]["methods"]
        self.assertEqual({name: method["changes"] for name, method in methods.items()},
                         {"create": True, "get": False, "list": False, "set": True, "delete": True,
                          "delete_expired": True, "sessions": False, "sign_out": True})
        self.assertEqual([name for name, argument in methods["create"]["arguments"].items()
                          if argument["needed"]], ["project_name"])
        self.assertEqual(methods["set"]["arguments"]["id"], {"type": "integer", "needed": True})
        self.assertEqual(len(methods["create"]["arguments"]), 19)
        self.assertEqual(methods["get"]["arguments"]["qr"], {"type": "boolean", "needed": False})
        self.assertEqual(methods["create"]["arguments"]["protect_users"]["type"], "list of texts")
        self.assertEqual(methods["create"]["arguments"]["app"]["type"], "object")
        self.assertEqual(apis[ws.INFO]["methods"], {"query": {"changes": False, "arguments": {}}})

    def test_takes_no_arguments(self):
        answer = self.call("alice", "query", api=ws.INFO, id="1")
        self.assertEqual((answer.code, answer.field), (200, "id"))


class Naming(Methods):
    def test_api_then_version_then_method(self):
        for api in "", "TUVO.Sharing", "tuvo.sharing.link", "x" * 1000, "TUVO.Sharing.Link ":
            self.assertEqual(self.call("alice", "nothing", api=api, version=9, x="y").code, 102)
        for version in 0, 2, -1, 2147483648, 10**18:
            self.assertEqual(self.call("alice", "nothing", version=version, x="y").code, 104)
        for method in "", "nothing", "Create", "query", "create ":
            self.assertEqual(self.call("alice", method, x="y").code, 103)

    def test_unknown_name_is_told_only_when_it_is_harmless(self):
        for name, field in (("harmless", "harmless"), ("x" * 64, "x" * 64), ("x" * 65, ""),
                            ("a\nb", ""), ("a\u0085b", "")):
            self.refused(200, field, "alice", "list", **{name: "1"})


def nested(levels):
    value = {}
    for _ in range(levels - 1):
        value = {"x": value}
    return value


def opens(link, password):
    """Whether the password opens the link: a visitor's login, at an address of its own."""
    opens.visits += 1
    address = f"198.51.{opens.visits // 250}.{opens.visits % 250 + 1}"
    reply = vs.run_program("POST", "/" + link,
                           vs.urllib.parse.urlencode({"password": password}).encode(),
                           REMOTE_ADDR=address)
    return reply.status == 303


opens.visits = 0


def both_fronts(tests):
    """The same tests for each front."""
    for front in "Tool", "Http":
        name = tests.__name__ + front
        globals()[name] = type(name, (tests, unittest.TestCase), {"front": front})


for _tests in list(Methods.__subclasses__()):
    both_fronts(_tests)


if __name__ == "__main__":
    ws.install(sys.argv[1], sys.argv[2], "/tmp/shared", "/tmp/other folder/")
    with vs.WebServer() as server:
        FRONTS["Tool"] = ws.ToolFront()
        FRONTS["Http"] = ws.HttpFront(server)
        unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
