"""The visitor's program end to end: through a real web server, and started by hand as a web server
would. Arguments: the build folder, the project's folder."""

import base64
import hashlib
import http.client
import os
import re
import shutil
import socket
import subprocess
import sys
import time
import unittest
from urllib.parse import unquote

import visitor_server as vs
from visitor_server import Visitor, make_file_link, make_link, run_program, sql, use_count

SERVER = None
FILE = "/tmp/shared/report.txt"
CONTENT = os.urandom(3 * 1024 * 1024 + 17)
POLICY = re.compile(r"default-src 'none'; style-src 'sha256-([A-Za-z0-9+/=]{44})'; "
                    r"form-action 'self'; frame-ancestors 'none'; base-uri 'none'")


def path_of(link):
    return "/sharing/" + link


def admitted(link, fields=None, address="127.0.0.1"):
    """A visitor whom the link has let in."""
    visitor = Visitor(SERVER, address)
    reply = visitor.post(path_of(link), fields)
    assert reply.status == 303, reply.status
    return visitor


class VisitorTest(unittest.TestCase):
    def assert_page(self, reply, status, *texts):
        self.assertEqual(reply.status, status)
        self.assertEqual(reply.get("Content-Type"), "text/html; charset=utf-8")
        self.assertRegex(reply.get("Content-Security-Policy"), POLICY)
        self.assert_every_answers_headers(reply)
        for text in texts:
            self.assertIn(text, reply.text)
        self.assertNotIn("<script", reply.text)
        self.assertIn('<html lang="en">', reply.text)
        self.assertNotIn("/usr/tuvo", reply.text)
        self.assertNotIn("/tmp/", reply.text)

    def assert_every_answers_headers(self, reply):
        self.assertEqual(reply.get("Cache-Control"), "no-store")
        self.assertEqual(reply.get("Referrer-Policy"), "no-referrer")
        self.assertEqual(reply.get("X-Robots-Tag"), "noindex")
        self.assertEqual(reply.get("X-Content-Type-Options"), "nosniff")

    def assert_form(self, reply, status, *fields):
        self.assert_page(reply, status, '<form method="post"', '<button type="submit"')
        self.assertEqual(re.findall(r'<input id="(\w+)"', reply.text), list(fields))
        for field in fields:
            self.assertIn(f'<label for="{field}">', reply.text)


class Forms(VisitorTest):
    def test_open_link_has_one_button(self):
        reply = Visitor(SERVER).get(path_of(make_file_link(FILE, protect_title="Our trip")))
        self.assert_form(reply, 200)
        self.assert_page(reply, 200, "<h1>Our trip</h1>", "<title>Our trip</title>", ">Open<")

    def test_password_link_asks_for_a_password(self):
        link = make_file_link(FILE, protect_type="password", password="x")
        self.assert_form(Visitor(SERVER).get(path_of(link)), 200, "password")

    def test_account_link_asks_for_an_account(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        self.assert_form(Visitor(SERVER).get(path_of(link)), 200, "zor_username", "zor_password")

    def test_styles_digest_is_the_one_in_the_policy(self):
        reply = Visitor(SERVER).get(path_of(make_file_link(FILE)))
        style = re.search(r"<style>(.*?)</style>", reply.text, re.S).group(1)
        digest = base64.b64encode(hashlib.sha256(style.encode()).digest()).decode()
        self.assertEqual(POLICY.match(reply.get("Content-Security-Policy")).group(1), digest)

    def test_titles_markup_is_text(self):
        title = "<script>alert(1)</script> \"q\" 'a' &amp; <img src=x onerror=alert(2)>"
        reply = Visitor(SERVER).get(path_of(make_file_link(FILE, protect_title=title)))
        self.assert_page(reply, 200, "&lt;script&gt;alert(1)&lt;/script&gt; &quot;q&quot; "
                                     "&#39;a&#39; &amp;amp; &lt;img src=x onerror=alert(2)&gt;")
        self.assertNotIn("<img", reply.text)

    def test_typed_account_name_comes_back_as_text(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        name = "\"><script>alert(1)</script>"
        reply = Visitor(SERVER, "127.0.0.21").post(
            path_of(link), {"zor_username": name, "zor_password": "x"})
        self.assert_form(reply, 403, "zor_username", "zor_password")
        self.assertIn('value="&quot;&gt;&lt;script&gt;', reply.text)
        self.assertNotIn("value=\"x\"", reply.text)

    def test_head_has_the_headers_and_no_body(self):
        link = make_file_link(FILE)
        page = Visitor(SERVER).get(path_of(link))
        head = Visitor(SERVER).head(path_of(link))
        self.assertEqual((head.status, head.body), (200, b""))
        self.assertEqual(head.get("Content-Length"), str(len(page.body)))


class LinksThatDoNotOpen(VisitorTest):
    def test_are_all_the_same_page(self):
        now = int(time.time())
        links = ["no-such-link", make_file_link(FILE, enabled=False),
                 make_file_link(FILE, expire_at=now - 60, auto_gc=False),
                 make_file_link(FILE, start_at=now + 3600),
                 make_file_link(FILE, protect_type="password", password="x", enabled=False)]
        pages = set()
        for link in links:
            for method in "GET", "POST":
                reply = Visitor(SERVER).request(method, path_of(link),
                                                "" if method == "POST" else None)
                self.assert_page(reply, 404, "This link does not open")
                pages.add(reply.body)
        self.assertEqual(len(pages), 1)

    def test_paths_that_are_no_link(self):
        for path in ("/sharing/", "/sharing/ab", "/sharing/" + "a" * 65, "/sharing/abc/",
                     "/sharing/abc/def", "/sharing/abc.d", "/sharing/a%00b", "/sharing/a%27b",
                     "/sharing/%2e%2e%2fetc", "/sharing/logout", "/sharing//logout",
                     "/sharing/a%0d%0ab"):
            with self.subTest(path=path):
                reply = Visitor(SERVER).get(path)
                self.assertIn(reply.status, (400, 404))
                self.assertNotIn(b"<form", reply.body)

    def test_used_up(self):
        link = make_file_link(FILE, expire_times=3, use_count=3)
        self.assert_page(Visitor(SERVER).get(path_of(link)), 410, "used up")
        self.assert_page(Visitor(SERVER).post(path_of(link)), 410, "used up")
        self.assertEqual(use_count(link), 3)


class Admission(VisitorTest):
    def test_post_lets_in_with_a_cookie_and_sends_back_to_the_link(self):
        link = make_file_link(FILE)
        reply = Visitor(SERVER).post(path_of(link))
        self.assertEqual(reply.status, 303)
        self.assertEqual(reply.get("Location"), path_of(link))
        self.assertRegex(reply.get("Set-Cookie"),
                         r"^sharing_sid=[A-Za-z0-9_-]{32}; Path=/sharing; HttpOnly; SameSite=Lax$")
        self.assert_every_answers_headers(reply)

    def test_looking_never_counts_a_use_and_opening_counts_one(self):
        link = make_file_link(FILE, expire_times=2)
        stranger = Visitor(SERVER)
        for _ in range(5):
            stranger.get(path_of(link))
            stranger.head(path_of(link))
        self.assertEqual(use_count(link), 0)
        visitor = admitted(link)
        for _ in range(5):
            self.assertEqual(visitor.get(path_of(link)).status, 200)
            visitor.head(path_of(link))
        self.assertEqual(use_count(link), 1)

    def test_password(self):
        link = make_file_link(FILE, protect_type="password", password="tëa & <b>=?")
        visitor = Visitor(SERVER, "127.0.0.22")
        reply = visitor.post(path_of(link), {"password": "Tëa & <b>=?"})
        self.assert_form(reply, 403, "password")
        self.assertIn("The password is wrong", reply.text)
        self.assertIsNone(reply.get("Set-Cookie"))
        self.assertIsNone(reply.get("WWW-Authenticate"))
        self.assertEqual(use_count(link), 0)
        self.assertEqual(visitor.post(path_of(link), {"password": "tëa & <b>=?"}).status, 303)
        self.assertEqual(visitor.get(path_of(link)).body, CONTENT)

    def test_multipart_forms_are_read_too(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        body = ('--B\r\nContent-Disposition: form-data; name="password"\r\n\r\nsecret\r\n'
                "--B--\r\n")
        reply = Visitor(SERVER).request("POST", path_of(link), body,
                                        {"Content-Type": "multipart/form-data; boundary=B"})
        self.assertEqual(reply.status, 303)

    def test_password_in_the_address_is_not_taken(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        visitor = Visitor(SERVER, "127.0.0.23")
        reply = visitor.post(path_of(link) + "?password=secret")
        self.assert_form(reply, 403, "password")
        self.assert_form(visitor.get(path_of(link) + "?password=secret"), 200, "password")

    def test_form_without_its_field(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        reply = Visitor(SERVER, "127.0.0.24").post(path_of(link), {"something": "else"})
        self.assert_form(reply, 403, "password")
        self.assertIn("Fill in every field", reply.text)

    def test_accounts(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"],
                              protect_groups=["administrators"])

        def try_account(name, password, address="127.0.0.25"):
            return Visitor(SERVER, address).post(
                path_of(link), {"zor_username": name, "zor_password": password})

        self.assertEqual(try_account("alice", "alice-secret").status, 303)
        self.assertEqual(try_account("carol", "carol-secret").status, 303)
        refused = try_account("alice", "wrong")
        unknown = try_account("nobody-of-that-name", "wrong")
        self.assert_form(refused, 403, "zor_username", "zor_password")
        # Nothing but the name that was typed differs, so that nobody learns which accounts exist.
        self.assertEqual(refused.text.replace("alice", "NAME"),
                         unknown.text.replace("nobody-of-that-name", "NAME"))
        other = try_account("bob", "bob-secret")
        self.assert_form(other, 403, "zor_username", "zor_password")
        self.assertIn("This link is not for that account", other.text)
        self.assertEqual(try_account("dave", "dave-secret").text.replace("dave", "NAME"),
                         refused.text.replace("alice", "NAME"))

    def test_limit_of_uses(self):
        link = make_file_link(FILE, expire_times=3)
        visitors = [admitted(link) for _ in range(3)]
        self.assert_page(Visitor(SERVER).post(path_of(link)), 410, "used up")
        for visitor in visitors:
            self.assertEqual(visitor.get(path_of(link)).status, 200)

    def test_ten_failures_block_the_address_and_no_other(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        attacker = Visitor(SERVER, "127.0.0.26")
        for _ in range(10):
            self.assertEqual(attacker.post(path_of(link), {"password": "guess"}).status, 403)
        reply = attacker.post(path_of(link), {"password": "secret"})
        self.assert_page(reply, 429, "Too many failed attempts")
        self.assertEqual(reply.get("Retry-After"), "1800")
        self.assertEqual(Visitor(SERVER, "127.0.0.27").post(
            path_of(link), {"password": "secret"}).status, 303)

    def test_second_link_leaves_the_first_open(self):
        first, second = make_file_link(FILE), make_file_link(FILE)
        visitor = admitted(first)
        session_id = visitor.session_id
        self.assert_form(visitor.get(path_of(second)), 403)
        self.assertNotEqual(visitor.post(path_of(second)).session_id(), session_id)
        self.assertEqual(visitor.get(path_of(first)).status, 200)
        self.assertEqual(visitor.get(path_of(second)).status, 200)

    def test_second_link_leaves_the_account_of_the_first(self):
        first = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        second = make_file_link(FILE)
        visitor = Visitor(SERVER)
        visitor.post(path_of(first), {"zor_username": "alice", "zor_password": "alice-secret"})
        visitor.post(path_of(second))
        self.assertEqual(visitor.get(path_of(first)).status, 200)

    def test_link_opened_again_is_open_once(self):
        link = make_file_link(FILE)
        visitor = admitted(link)
        visitor.post(path_of(link))
        self.assertEqual(visitor.get(path_of(link)).status, 200)
        self.assertEqual(sql("SELECT count(*) FROM token WHERE entry_id = (SELECT id FROM entry "
                             "WHERE hash = ?)", link), [(1,)])

    def test_forms_of_other_sites_are_refused(self):
        link = make_file_link(FILE)
        for site in "cross-site", "same-site":
            reply = Visitor(SERVER).post(path_of(link), Sec_Fetch_Site=site)
            self.assert_page(reply, 403, "another web site")
            self.assertIsNone(reply.get("Set-Cookie"))
        self.assertEqual(use_count(link), 0)
        for site in "same-origin", "none":
            self.assertEqual(Visitor(SERVER).post(path_of(link), Sec_Fetch_Site=site).status, 303)

    def test_sid_parameter_never_leads_to_a_cookie(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        visitor = Visitor(SERVER)
        reply = visitor.post(path_of(link) + "?_sid=evil1", {
            "zor_username": "alice", "zor_password": "alice-secret", "_sid": "evil2"})
        self.assertEqual(reply.status, 303)
        self.assertEqual(len(reply.all("Set-Cookie")), 1)
        self.assertTrue(reply.get("Set-Cookie").startswith("sharing_sid="))
        reply = visitor.get(path_of(link) + "?_sid=evil3")
        self.assertEqual(reply.status, 200)
        self.assertIsNone(reply.get("Set-Cookie"))
        reply = Visitor(SERVER, "127.0.0.28").post(path_of(link), {
            "zor_username": "alice", "zor_password": "wrong", "_sid": "evil2"})
        self.assertIsNone(reply.get("Set-Cookie"))


class LaterVisits(VisitorTest):
    def setUp(self):
        self.link = make_file_link(FILE)
        self.visitor = admitted(self.link)

    def visit(self):
        return self.visitor.get(path_of(self.link))

    def test_malformed_and_unknown_cookies(self):
        for cookie in ("sharing_sid=", "sharing_sid=a b", "sharing_sid=" + "x" * 65,
                       "sharing_sid='; DROP TABLE session; --", "other=1"):
            self.assert_form(self.visitor.get(path_of(self.link), Cookie=cookie), 200)
        reply = self.visitor.get(path_of(self.link), Cookie="sharing_sid=" + "x" * 32)
        self.assert_form(reply, 403)
        self.assertIn("not, or no longer, admitted", reply.text)

    def test_stolen_cookie(self):
        thief = Visitor(SERVER, "127.0.0.29")
        thief.session_id = self.visitor.session_id
        reply = thief.get(path_of(self.link))
        self.assert_form(reply, 403)
        self.assertIn("network address has changed", reply.text)
        self.assertEqual(self.visit().status, 200)

    def test_stolen_cookie_gains_nothing_by_a_login(self):
        thief = Visitor(SERVER, "127.0.0.32")
        stolen = thief.session_id = self.visitor.session_id
        reply = thief.post(path_of(make_file_link(FILE)))
        self.assertEqual(reply.status, 303)
        self.assertNotEqual(reply.session_id(), stolen)
        for session_id in thief.session_id, stolen:
            thief.session_id = session_id
            self.assert_form(thief.get(path_of(self.link)), 403)
        self.assertEqual(self.visit().status, 200)

    def test_visitor_who_moved_opens_the_link_again(self):
        self.visitor.address = "127.0.0.33"
        self.assert_form(self.visit(), 403)
        self.assertEqual(self.visitor.post(path_of(self.link)).status, 303)
        self.assertEqual(self.visit().status, 200)

    def test_cookie_may_travel_when_the_link_allows_it(self):
        link = make_file_link(FILE, enable_match_ip=False)
        visitor = admitted(link)
        visitor.address = "127.0.0.30"
        self.assertEqual(visitor.get(path_of(link)).status, 200)

    def test_expired_token(self):
        sql("UPDATE token SET timeout=1 WHERE entry_id="
            "(SELECT id FROM entry WHERE hash=?)", self.link)
        reply = self.visit()
        self.assert_form(reply, 403)
        self.assertIn("has expired", reply.text)
        self.assertIn("not, or no longer, admitted", self.visit().text)

    def test_link_switched_off_meanwhile(self):
        sql("UPDATE entry SET enabled='0' WHERE hash=?", self.link)
        self.assert_page(self.visit(), 404, "This link does not open")

    def test_link_deleted_meanwhile(self):
        sql("DELETE FROM token WHERE entry_id=(SELECT id FROM entry WHERE hash=?)", self.link)
        sql("DELETE FROM entry WHERE hash=?", self.link)
        self.assert_page(self.visit(), 404, "This link does not open")

    def test_account_taken_off_the_link(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        visitor = admitted(link, {"zor_username": "alice", "zor_password": "alice-secret"})
        self.assertEqual(visitor.get(path_of(link)).status, 200)
        vs.change_data(link, protect_uids=[2002])
        reply = visitor.get(path_of(link))
        self.assert_form(reply, 403, "zor_username", "zor_password")
        self.assertIn("may no longer open", reply.text)

    def test_logout(self):
        other = make_file_link(FILE)
        self.visitor.post(path_of(other))
        page = self.visitor.get(path_of(self.link) + "/logout")
        self.assert_page(page, 200, f'action="/sharing/{self.link}/logout"', ">Log out<")
        self.visitor.head(path_of(self.link) + "/logout")
        self.assertEqual(self.visit().status, 200)
        reply = self.visitor.post(path_of(self.link) + "/logout")
        self.assert_page(reply, 200, "You are logged out", f'href="/sharing/{self.link}"')
        self.assertIsNone(reply.get("Set-Cookie"))
        self.assert_form(self.visit(), 403)
        self.assertEqual(self.visitor.get(path_of(other)).status, 200)
        again = self.visitor.post(path_of(self.link) + "/logout")
        self.assert_page(again, 200, "You are logged out")

    def test_logout_from_elsewhere_does_nothing(self):
        reply = self.visitor.post(path_of(self.link) + "/logout", Sec_Fetch_Site="cross-site")
        self.assert_page(reply, 403)
        self.assertEqual(self.visit().status, 200)

    def test_logout_without_a_session(self):
        for link in self.link, "no-such-link":
            reply = Visitor(SERVER).post(path_of(link) + "/logout")
            self.assert_page(reply, 200, "You are logged out")


class Files(VisitorTest):
    @classmethod
    def setUpClass(cls):
        cls.link = make_file_link(FILE)
        cls.visitor = admitted(cls.link)

    def get(self, **headers):
        return self.visitor.get(path_of(self.link), **headers)

    def shared(self, path, **members):
        link = make_file_link(path, **members)
        return admitted(link).get(path_of(link))

    def test_whole_file(self):
        reply = self.get()
        self.assertEqual((reply.status, reply.body == CONTENT), (200, True))
        self.assertEqual(reply.get("Content-Length"), str(len(CONTENT)))
        self.assertEqual(reply.get("Content-Type"), "text/plain")
        self.assertEqual(reply.get("Content-Disposition"),
                         "attachment; filename=\"report.txt\"; filename*=UTF-8''report.txt")
        self.assertEqual(reply.get("Accept-Ranges"), "bytes")
        self.assertEqual(reply.get("Content-Security-Policy"), "default-src 'none'; sandbox")
        self.assertIsNone(reply.get("Set-Cookie"))
        self.assert_every_answers_headers(reply)

    def test_head(self):
        reply = self.visitor.head(path_of(self.link), Range="bytes=0-4")
        self.assertEqual((reply.status, reply.body), (200, b""))
        self.assertEqual(reply.get("Content-Length"), str(len(CONTENT)))

    def test_ranges(self):
        size = len(CONTENT)
        for text, first, last in (("0-0", 0, 0), ("5-9", 5, 9), ("-7", size - 7, size - 1),
                                  (f"{size - 3}-", size - 3, size - 1),
                                  ("100000-2999999", 100000, 2999999),
                                  ("0-99999999999999999999", 0, size - 1),
                                  (f"-{size * 2}", 0, size - 1)):
            with self.subTest(range=text):
                reply = self.get(Range="bytes=" + text)
                self.assertEqual(reply.status, 206)
                self.assertEqual(reply.get("Content-Range"), f"bytes {first}-{last}/{size}")
                self.assertTrue(reply.body == CONTENT[first:last + 1])

    def test_ranges_that_mean_the_whole_file(self):
        for text in "bytes=0-1,5-6", "bytes=5-2", "lines=1-2", "bytes=a-b", "bytes=-", "bytes":
            with self.subTest(range=text):
                reply = self.get(Range=text)
                self.assertEqual((reply.status, len(reply.body)), (200, len(CONTENT)))

    def test_ranges_beyond_the_end(self):
        for text in f"bytes={len(CONTENT)}-", "bytes=-0":
            reply = self.get(Range=text)
            self.assert_page(reply, 416)
            self.assertEqual(reply.get("Content-Range"), f"bytes */{len(CONTENT)}")

    def test_a_copy_that_is_current_is_not_sent_again(self):
        first = self.get(Range="bytes=0-0")
        for headers in ({"If_None_Match": first.get("ETag")}, {"If_None_Match": '"x", W/' +
                        first.get("ETag")}, {"If_None_Match": "*"},
                        {"If_Modified_Since": first.get("Last-Modified")}):
            reply = self.get(**headers)
            self.assertEqual((reply.status, reply.body), (304, b""), headers)
            self.assertEqual(reply.get("ETag"), first.get("ETag"))
            self.assertEqual(reply.get("Cache-Control"), "no-store")
        for headers in ({"If_None_Match": '"x"'},
                        {"If_None_Match": '"x"',
                         "If_Modified_Since": first.get("Last-Modified")},
                        {"If_Modified_Since": "Thu, 01 Jan 1970 00:00:01 GMT"},
                        {"If_Modified_Since": "yesterday"}):
            self.assertEqual(self.get(**headers).status, 200, headers)

    def test_demands_for_a_version(self):
        etag = self.get(Range="bytes=0-0").get("ETag")
        self.assertEqual(self.get(If_Match=etag).status, 200)
        self.assert_page(self.get(If_Match='"x"'), 412)
        self.assert_page(self.get(If_Unmodified_Since="Thu, 01 Jan 1970 00:00:01 GMT"), 412)

    def test_range_of_another_version_gets_the_whole_file(self):
        os.utime(FILE, (time.time(), time.time() - 3600))
        first = self.get(Range="bytes=0-0")
        for validator in first.get("ETag"), first.get("Last-Modified"):
            self.assertEqual(self.get(Range="bytes=0-4", If_Range=validator).status, 206)
        for validator in '"x"', "W/" + first.get("ETag"), "Thu, 01 Jan 1970 00:00:01 GMT":
            self.assertEqual(self.get(Range="bytes=0-4", If_Range=validator).status, 200)

    def test_changed_file_has_another_tag(self):
        path = "/tmp/shared/changing.bin"
        with open(path, "wb") as file:
            file.write(b"one")
        link = make_file_link(path)
        visitor = admitted(link)
        first = visitor.get(path_of(link))
        stat = os.stat(path)
        with open(path, "wb") as file:
            file.write(b"two")
        os.utime(path, ns=(stat.st_atime_ns, stat.st_mtime_ns))
        second = visitor.get(path_of(link))
        self.assertEqual((first.body, second.body), (b"one", b"two"))
        self.assertEqual(first.get("Last-Modified"), second.get("Last-Modified"))
        self.assertNotEqual(first.get("ETag"), second.get("ETag"))

    def test_types(self):
        for name, wanted in (("a.PDF", "application/pdf"), ("a.tar.gz", "application/gzip"),
                             ("a.html", "text/html"), ("a", "application/octet-stream"),
                             ("a.no-such-type", "application/octet-stream"),
                             (".txt", "application/octet-stream")):
            path = "/tmp/shared/" + name
            with open(path, "wb") as file:
                file.write(b"x")
            reply = self.shared(path)
            self.assertEqual((reply.status, reply.get("Content-Type")), (200, wanted), name)
            self.assertTrue(reply.get("Content-Disposition").startswith("attachment;"))

    def test_names_cannot_add_headers(self):
        for name in ("a\r\nSet-Cookie: id=evil", "a\nLocation: x\n\n<b>",
                     'a"; filename="evil.exe', "a\\", "\u202egpj.exe", "a\x7f\x1b[2J", "日本語 100%.txt"):
            path = "/tmp/shared/" + name
            with open(path, "wb") as file:
                file.write(b"x")
            reply = self.shared(path)
            self.assertEqual((reply.status, reply.body), (200, b"x"), name)
            self.assertIsNone(reply.get("Set-Cookie"))
            self.assertIsNone(reply.get("Location"))
            value = reply.get("Content-Disposition")
            self.assertRegex(value, r"^attachment; filename=\"[ !#$&-\[\]-~]*\"; "
                                    r"filename\*=UTF-8''[A-Za-z0-9!#$&+.^_`|~%-]*$")
            encoded = value.partition("filename*=UTF-8''")[2]
            self.assertEqual(unquote(encoded), name)

    def test_empty_file(self):
        open("/tmp/shared/empty", "wb").close()
        link = make_file_link("/tmp/shared/empty")
        visitor = admitted(link)
        reply = visitor.get(path_of(link))
        self.assertEqual((reply.status, reply.body, reply.get("Content-Length")), (200, b"", "0"))
        self.assertEqual(visitor.get(path_of(link), Range="bytes=0-").status, 416)

    def test_what_is_no_file(self):
        os.makedirs("/tmp/shared/folder", exist_ok=True)
        os.symlink(FILE, "/tmp/shared/symlink")
        os.mkfifo("/tmp/shared/pipe")
        with socket.socket(socket.AF_UNIX) as listener:
            listener.bind("/tmp/shared/socket")
        for path in ("/tmp/shared/missing", "/tmp/shared/folder", "/tmp/shared/symlink",
                     "/tmp/shared/pipe", "/tmp/shared/socket", "/dev/zero", FILE + "/x"):
            with self.subTest(path=path):
                self.assert_page(self.shared(path), 404, "no longer there")

    def test_what_may_not_be_read(self):
        shutil.copy(FILE, "/tmp/shared/private")
        os.chmod("/tmp/shared/private", 0o600)
        for path in "/tmp/shared/private", "/etc/shadow", vs.DATABASE:
            with self.subTest(path=path):
                self.assert_page(self.shared(path), 500, "cannot be sent")

    def test_links_without_a_usable_path(self):
        for app in ({}, {"path": ""}, {"path": 7}, {"path": ["/etc/passwd"]},
                    {"path": "etc/passwd"}, {"path": "../../etc/passwd"}):
            link = make_link(app=app)
            reply = admitted(link).get(path_of(link))
            self.assert_page(reply, 500)

    def test_link_of_another_application(self):
        link = make_link(project_name="album<b>", app={"path": FILE})
        reply = admitted(link).get(path_of(link))
        self.assert_page(reply, 200, "The link is open", f'href="/sharing/{link}/logout"')
        self.assertNotIn("<b>", reply.text)

    def test_large_file(self):
        size = 5 * 1024 ** 3
        with open("/tmp/shared/large.iso", "wb") as file:
            file.truncate(size)
            file.seek(size - 5)
            file.write(b"hello")
        link = make_file_link("/tmp/shared/large.iso")
        visitor = admitted(link)
        self.assertEqual(visitor.head(path_of(link)).get("Content-Length"), str(size))
        reply = visitor.get(path_of(link), Range=f"bytes={size - 7}-")
        self.assertEqual(reply.get("Content-Range"), f"bytes {size - 7}-{size - 1}/{size}")
        self.assertEqual(reply.body, b"\0\0hello")

    def test_large_file_streams_and_ends_with_the_visitor(self):
        with open("/tmp/shared/stream.bin", "wb") as file:
            file.truncate(400 * 1024 ** 2)
        link = make_file_link("/tmp/shared/stream.bin")
        visitor = admitted(link)
        connection = http.client.HTTPConnection("127.0.0.1", SERVER.port, timeout=60)
        connection.request("GET", path_of(link),
                           headers={"Cookie": "sharing_sid=" + visitor.session_id})
        response = connection.getresponse()
        for _ in range(200):
            self.assertEqual(len(response.read(1024 * 1024)), 1024 * 1024)
        self.assertEqual(len(SERVER.programs()), 1)
        # Neither side holds more than a little of it.
        for pid in (SERVER.process.pid, SERVER.programs()[0]):
            self.assertLess(peak_memory(pid), 32 * 1024)
        connection.close()
        for _ in range(1200):
            if not SERVER.programs():
                break
            time.sleep(0.05)
        self.assertEqual(SERVER.programs(), [])


def read(path):
    with open(path) as file:
        return file.read()


def peak_memory(pid):
    """In kilobytes."""
    return int(re.search(r"VmHWM:\s+(\d+) kB", read(f"/proc/{pid}/status")).group(1))


class Redirects(VisitorTest):
    def link(self, uri, kind="always", **members):
        return make_file_link(FILE, redirect_type=kind, redirect_uri=uri, **members)

    def target(self, link, query=""):
        reply = admitted(link).get(path_of(link) + query)
        self.assertIn(reply.status, (302, 200))
        return reply.get("Location")

    def test_always(self):
        for uri in ("https://example.org/a?b=c#d", "http://example.org", "/album/7", "next?x=1",
                    "HTTPS://example.org/"):
            self.assertEqual(self.target(self.link(uri)), uri)
        self.assertEqual(self.target(self.link("/ü b")), "/%C3%BC%20b")

    def test_only_once_admitted(self):
        link = self.link("https://example.org/", protect_type="password", password="x")
        reply = Visitor(SERVER).get(path_of(link))
        self.assertEqual((reply.status, reply.get("Location")), (200, None))
        self.assertNotIn("example.org", reply.text)
        self.assertNotIn("example.org", str(reply.headers))
        # Browsers hold the redirects behind a form to its policy.
        self.assertIn("form-action 'self' http: https:;", reply.get("Content-Security-Policy"))

    def test_targets_that_are_none(self):
        for uri in ("javascript:alert(1)", "data:text/html,x", "ftp://example.org/", "//evil.example",
                    "/\\evil.example", "\\\\evil.example", "http://", "https:///x", "file:///etc",
                    "/ok\r\nSet-Cookie: id=evil", "/ok\nX: y", "https://example.org/\t"):
            with self.subTest(uri=uri):
                link = self.link(uri)
                reply = admitted(link).get(path_of(link))
                self.assert_page(reply, 500, "set up wrongly")
                self.assertIsNone(reply.get("Location"))
                self.assertIsNone(reply.get("Set-Cookie"))

    def test_without_a_target_the_link_is_served(self):
        link = self.link("")
        self.assertEqual(admitted(link).get(path_of(link)).body, CONTENT)

    def test_by_parameter(self):
        link = self.link("/album/7", "url_param")
        visitor = admitted(link)
        self.assertEqual(visitor.get(path_of(link)).status, 200)
        self.assertEqual(visitor.get(path_of(link) + "?redirect=1").get("Location"), "/album/7")
        self.assertEqual(visitor.get(path_of(link) + "?redirect").get("Location"), "/album/7")
        self.assertEqual(visitor.get(path_of(link) + "?other=redirect").status, 200)

    def test_parameter_survives_the_form(self):
        link = self.link("/album/7", "url_param")
        visitor = Visitor(SERVER)
        page = visitor.get(path_of(link) + "?redirect=%22%3E%3Cb%3E")
        self.assertIn('<input type="hidden" name="redirect" value="1">', page.text)
        self.assertNotIn("<b>", page.text)
        reply = visitor.post(path_of(link), {"redirect": "1"})
        self.assertEqual(reply.get("Location"), path_of(link) + "?redirect=1")

    def test_none(self):
        link = self.link("https://example.org/", "none")
        self.assertIsNone(self.target(link, "?redirect=1"))


class Requests(VisitorTest):
    def test_other_methods(self):
        for method in "PUT", "DELETE", "OPTIONS", "PATCH", "FOO":
            reply = run_program(method, "/abcdef")
            self.assert_page(reply, 405)
            self.assertEqual(reply.get("Allow"), "GET, HEAD, POST")
        reply = Visitor(SERVER).request("DELETE", "/sharing/abcdef")
        self.assert_page(reply, 405)
        self.assertEqual(reply.get("Allow"), "GET, HEAD, POST")

    def test_zero_byte_in_a_field(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        self.assert_page(run_program("POST", "/" + link, b"password=secret%00x"), 400)

    def test_malformed_body(self):
        self.assert_page(run_program("POST", "/abcdef", b"short", CONTENT_LENGTH="50"), 400)
        self.assert_page(run_program("POST", "/abcdef", b"x", CONTENT_LENGTH="-1"), 400)
        self.assert_page(run_program("POST", "/abcdef", b"x",
                                     CONTENT_TYPE="multipart/form-data"), 400)

    def test_body_of_ten_mebibytes(self):
        body = b"password=" + b"x" * (10 * 1024 ** 2)
        link = make_file_link(FILE, protect_type="password", password="x")
        self.assert_page(run_program("POST", "/" + link, body), 400)
        with socket.create_connection(("127.0.0.1", SERVER.port)) as connection:
            connection.sendall((f"POST /sharing/{link} HTTP/1.1\r\nHost: x\r\n"
                                "Content-Type: application/x-www-form-urlencoded\r\n"
                                f"Content-Length: {len(body)}\r\n\r\n").encode())
            try:
                connection.sendall(body)
            except OSError:
                pass  # the server need not read it
            self.assertIn(b" 413 ", connection.recv(65536).split(b"\r\n")[0])
        self.assertEqual(use_count(link), 0)

    def test_body_that_is_no_form(self):
        link = make_file_link(FILE)
        reply = run_program("POST", "/" + link, b"{}", CONTENT_TYPE="application/json")
        self.assertEqual(reply.status, 303)  # an open link asks for no field

    def test_without_an_address(self):
        for address in None, "", "not an address":
            reply = run_program("POST", "/" + make_file_link(FILE), REMOTE_ADDR=address)
            self.assert_page(reply, 500, "Something went wrong")
        reply = run_program("GET", "/" + make_file_link(FILE), REMOTE_ADDR=None,
                            HTTP_COOKIE="sharing_sid=" + "x" * 32)
        self.assert_page(reply, 500, "Something went wrong")

    def test_no_header_of_the_visitors_is_an_address(self):
        link = make_file_link(FILE)
        first = run_program("POST", "/" + link, HTTP_X_FORWARDED_FOR="192.0.2.9",
                            HTTP_CLIENT_IP="192.0.2.9")
        self.assertEqual(sql("SELECT ip FROM session WHERE session_id=?", first.session_id()),
                         [("192.0.2.7",)])

    def test_cookie_is_secure_under_https(self):
        link = make_file_link(FILE)
        plain = run_program("POST", "/" + link).get("Set-Cookie")
        self.assertRegex(plain, r"; Path=/sharing; HttpOnly; SameSite=Lax$")
        secure = run_program("POST", "/" + link, HTTPS="on").get("Set-Cookie")
        self.assertRegex(secure, r"; Path=/sharing; HttpOnly; SameSite=Lax; Secure$")


    def test_head_sends_no_body(self):
        link = make_file_link(FILE)
        cookie = "sharing_sid=" + run_program("POST", "/" + link).session_id()
        for reply in (run_program("HEAD", "/" + link), run_program("HEAD", "/no-such-link"),
                      run_program("HEAD", "/" + link, HTTP_COOKIE=cookie)):
            self.assertEqual(reply.body, b"")
            self.assertGreater(int(reply.get("Content-Length")), 0)


class Identities(VisitorTest):
    def road(self, **start):
        link = make_file_link(FILE, protect_type="password", password="secret")
        self.assert_form(run_program("GET", "/" + link, **start), 200, "password")
        self.assert_form(run_program("POST", "/" + link, b"password=x", **start), 403, "password")
        reply = run_program("POST", "/" + link, b"password=secret", **start)
        self.assertEqual((reply.status, reply.exit), (303, 0))
        cookie = "sharing_sid=" + reply.session_id()
        reply = run_program("GET", "/" + link, HTTP_COOKIE=cookie, **start)
        self.assertEqual((reply.status, reply.body == CONTENT, reply.exit), (200, True, 0))

    def test_set_user_id_root(self):
        self.road()

    def test_system_identity_needs_no_root(self):
        self.road(uid=vs.SYSTEM)

    def test_root_itself(self):
        self.road(uid=0)

    def test_system_identitys_private_files_are_not_sent(self):
        link = make_file_link(vs.DATABASE)
        cookie = "sharing_sid=" + run_program("POST", "/" + link).session_id()
        for uid in vs.SYSTEM, 0:
            reply = run_program("GET", "/" + link, HTTP_COOKIE=cookie, uid=uid)
            self.assert_page(reply, 500, "cannot be sent")

    def test_without_root_account_links_stay_closed(self):
        link = make_file_link(FILE, protect_type="user", protect_users=["alice"])
        reply = run_program("POST", "/" + link, b"zor_username=alice&zor_password=alice-secret",
                            uid=vs.SYSTEM)
        self.assert_form(reply, 403, "zor_username", "zor_password")

    def test_stranger_without_privilege_gets_the_failure_page(self):
        with vs.SystemLog():  # the refused switch is logged
            reply = run_program("GET", "/" + make_file_link(FILE), uid=65534)
        self.assert_page(reply, 500, "Something went wrong")

    def strace(self, *options):
        if not shutil.which("strace"):
            self.skipTest("the package strace is missing")
        return ["strace", "-u", "www-data", "-o", "/tmp/strace.txt", *options]

    def test_input_is_read_after_privilege_is_dropped(self):
        link = make_file_link(FILE, protect_type="password", password="secret")
        reply = run_program("POST", "/" + link, b"password=secret", program=vs.PROGRAM,
                            prefix=self.strace("-e", "trace=/^setres[ug]id,read,openat"))
        self.assertEqual(reply.status, 303)
        # 32-bit x86 has a second setresuid, called setresuid32, and uses that one.
        lines = read("/tmp/strace.txt").replace("id32(", "id(").splitlines()
        first = {}
        for number, line in enumerate(lines):
            for key in ("setresgid(-1, 33, -1)", "setresuid(-1, 33, -1)", "read(0, ",
                        "sharing.db"):
                if key in line:
                    first.setdefault(key, number)
        self.assertEqual(len(first), 4, first)
        order = sorted(first, key=first.get)
        self.assertEqual(order[:3], ["setresgid(-1, 33, -1)", "setresuid(-1, 33, -1)", "read(0, "])
        # Whatever was taken back for the database is given up again.
        self.assertIn("setresuid(-1, 33, -1)", [line for line in lines if "setres" in line][-1])

    def test_ends_when_privilege_cannot_be_dropped(self):
        for call in "setresgid", "setresuid":
            prefix = self.strace("-e", f"trace=/^{call},read,openat",
                                 "-e", f"inject=/^{call}:error=EPERM:when=1")
            reply = run_program("POST", "/abcdef", b"x=1", program=vs.PROGRAM, prefix=prefix)
            self.assert_page(reply, 500, "Something went wrong")
            self.assertEqual(reply.exit, 1)
            trace = read("/tmp/strace.txt")
            self.assertIn("(INJECTED)", trace)
            self.assertNotIn("sharing.db", trace)
            self.assertNotIn("read(0, ", trace)


class BehindAProxy(VisitorTest):
    """Of which the web server is told whom to believe."""

    @classmethod
    def setUpClass(cls):
        trust = ('server.modules += ( "mod_extforward" )\n'
                 'extforward.forwarder = ( "127.0.0.80" => "trust" )\n'
                 'extforward.headers = ( "X-Forwarded-For" )\n')
        cls.server = vs.WebServer(vs.changed_configuration("include", trust + "include"))
        cls.server.__enter__()
        cls.addClassCleanup(cls.server.__exit__)

    def session_address(self, address, **headers):
        visitor = Visitor(self.server, address)
        self.reply = visitor.post(path_of(make_file_link(FILE)), **headers)
        return sql("SELECT ip FROM session WHERE session_id=?", visitor.session_id)[0][0]

    def test_the_proxys_word_counts(self):
        address = self.session_address("127.0.0.80", X_Forwarded_For="192.0.2.1",
                                       X_Forwarded_Proto="https")
        self.assertEqual(address, "192.0.2.1")
        self.assertTrue(self.reply.get("Set-Cookie").endswith("; Secure"))

    def test_nobody_elses_does(self):
        address = self.session_address("127.0.0.81", X_Forwarded_For="192.0.2.1",
                                       X_Forwarded_Proto="https")
        self.assertEqual(address, "127.0.0.81")
        self.assertFalse(self.reply.get("Set-Cookie").endswith("; Secure"))

    def test_what_a_visitor_claimed_to_the_proxy_does_not(self):
        address = self.session_address("127.0.0.80", X_Forwarded_For="198.51.100.1, 192.0.2.1")
        self.assertEqual(address, "192.0.2.1")


class Log(VisitorTest):
    def test_an_ordinary_road_writes_no_errors(self):
        open_link = make_file_link(FILE)
        password_link = make_file_link(FILE, protect_type="password", password="secret")
        with vs.SystemLog() as log:
            visitor = Visitor(SERVER)
            for link, fields in (open_link, {}), (password_link, {"password": "secret"}):
                visitor.get(path_of(link))
                self.assertEqual(visitor.post(path_of(link), fields).status, 303)
                self.assertEqual(visitor.get(path_of(link)).status, 200)
                visitor.get(path_of(link), Range="bytes=0-9")
                visitor.post(path_of(link) + "/logout")
                visitor.post(path_of(link) + "/logout")
                visitor.get(path_of(link))
            Visitor(SERVER).get("/sharing/no-such-link")
            Visitor(SERVER).get("/sharing/'")
        self.assertEqual(log.errors(), [])

    def test_secrets_and_paths_are_not_logged(self):
        link = make_file_link("/tmp/shared/missing-7", protect_type="password",
                              password="the-secret")
        with vs.SystemLog() as log:
            visitor = Visitor(SERVER, "127.0.0.31")
            visitor.post(path_of(link), {"password": "the-guess"})
            visitor.post(path_of(link), {"password": "the-secret"})
            self.assertEqual(visitor.get(path_of(link)).status, 404)
        lines = "\n".join(log.lines)
        self.assertIn("is not there", lines)
        for secret in "the-secret", "the-guess", visitor.session_id, link, "missing-7":
            self.assertNotIn(secret, lines)


class CleanUp(VisitorTest):
    def test_is_not_cut_short_by_the_web_server(self):
        """Which ends the program once the program has ended its output."""
        link = make_file_link(FILE)
        for _ in range(30):
            program = subprocess.Popen(
                [vs.PLAIN_PROGRAM], stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                env={"REQUEST_METHOD": "POST", "PATH_INFO": "/" + link, "REMOTE_ADDR": "192.0.2.7"},
                user=vs.SYSTEM, group=vs.SYSTEM, extra_groups=[])
            with program:
                self.assertIn(b"Status: 303", program.stdout.read())
                program.terminate()
            self.assertEqual(program.returncode, 0)

    def test_expired_rows_go_when_a_login_hits(self):
        sql("INSERT INTO session VALUES (NULL, 'expired-session', '0', '192.0.2.1', '1')")
        link = make_file_link(FILE)
        count = "SELECT count(*) FROM session WHERE session_id='expired-session'"
        for _ in range(3000):  # each has a chance of a hundredth
            run_program("POST", "/" + link, uid=vs.SYSTEM)
            if sql(count) == [(0,)]:
                return
        self.fail("nothing was purged in 3000 logins")


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
