"""The web API over HTTP: through a real web server, and started by hand as a web server would.
Arguments: the build folder, the project's folder."""

import json
import os
import socket
import subprocess
import sys
import unittest
from urllib.parse import urlencode

import visitor_server as vs
import webapi_server as ws
from visitor_server import sql
from webapi_server import LINK, PATH, request_body, run_entry

API = None
LIMIT = 262144
CHANGING = {"create": {"project_name": "x"}, "set": {"id": 1}, "delete": {"id": 1},
            "delete_expired": {}, "sign_out": {"id": 1}}
READING = {"get": {"id": 1}, "list": {}, "sessions": {"id": 1}}


def padded(size):
    """A request with a body of exactly that many bytes."""
    body = request_body("list", search="")
    return body[:-1] + b" " * (size - len(body)) + b"}"


class HttpTest(unittest.TestCase):
    def code(self, reply):
        return API.answer(reply).code

    def create(self, who="alice", **settings):
        return API.call(who, "create", **{"project_name": "x", **settings}).data["link"]

    def get(self, query, who="alice", method="GET", **headers):
        return API.request(method, who, PATH + "?" + query, **headers)


class Accounts(HttpTest):
    def test_password_is_the_accounts(self):
        self.assertTrue(API.call("alice", "list").ok)
        for who, password in (("alice", "wrong"), ("alice", ""), ("alice", "bob-secret"),
                              ("no-such", "x"), ("dave", "dave-secret"), ("www-data", "")):
            reply = API.post(None, request_body("list"), Authorization=ws.basic(who, password))
            self.assertEqual(reply.status, 401, who)
            self.assertNotIn(b"success", reply.body)

    def test_without_an_account_nobody_gets_as_far_as_the_program(self):
        for reply in (API.post(None, request_body("list")),
                      API.request("GET", None, PATH + "?" + urlencode({"api": LINK}))):
            self.assertEqual(reply.status, 401)
            self.assertNotIn(b"success", reply.body)

    def test_account_is_the_web_servers_word_alone(self):
        mine = self.create("alice")
        for name in ("Remote-User", "Remote_User", "REMOTE_USER", "X-Remote-User", "X-Forwarded-User",
                     "Auth-Type"):
            answer = API.answer(API.post("bob", request_body("get", id=mine["id"]),
                                         **{name: "alice"}))
            self.assertEqual(answer.code, 205)
        answer = API.answer(API.post("bob", request_body("list", user="alice")))
        self.assertEqual(answer.code, 200)

    def test_account_that_the_web_server_did_not_name(self):
        for user in None, "", "no-such", "alice ", "2001", "alice\n", "ALICE":
            reply = run_entry(body=request_body("list"), user=user)
            self.assertEqual((reply.status, json.loads(reply.body)["error"]["code"]), (401, 105), user)
            self.assertIsNone(reply.get("WWW-Authenticate"))

    def test_account_comes_before_arguments_and_behind_names(self):
        for body, code in ((request_body("list", nonsense=1), 105),
                           (request_body("nothing"), 103), (request_body("list", version=3), 104),
                           (request_body("list", api="x"), 102)):
            self.assertEqual(json.loads(run_entry(body=body, user=None).body)["error"]["code"], code)


class Reading(HttpTest):
    def test_by_get(self):
        link = self.create()
        by_post = API.call("alice", "get", id=link["id"])
        query = urlencode({"api": LINK, "version": 1, "method": "get", "id": link["id"]})
        self.assertEqual(API.answer(self.get(query)).data, by_post.data)

    def test_head_is_a_get_without_a_body(self):
        query = urlencode({"api": LINK, "version": 1, "method": "list", "search": "no-such-link"})
        got, head = self.get(query), self.get(query, method="HEAD")
        self.assertEqual((head.status, head.body), (200, b""))
        self.assertEqual(head.get("Content-Length"), str(len(got.body)))
        self.assertEqual(run_entry("HEAD", query=query).body, b"")
        self.assertEqual(self.get("api=x&version=1&method=y", method="HEAD").status, 404)

    def by_hand(self, query):
        """Some servers mend a query string, or refuse it themselves."""
        return self.code(run_entry("GET", query=query))

    def test_query_strings_values_are_texts(self):
        title = "a+b %41&=é😀"
        link = self.create(protect_title=title)
        query = "api=TUVO.Sharing.Link&version=1&method=list&descending=1&limit=5&search="
        found = API.answer(self.get(query + "a%2Bb+%2541%26%3D%c3%A9"))
        self.assertEqual([one["id"] for one in found.data["links"]], [link["id"]])
        self.assertEqual(self.code(self.get(query + "&offset=x")), 202)
        for byte in "%00", "%ff", "%ed%a0%80":
            self.assertEqual(self.by_hand(query + byte), 203)

    def test_query_strings_that_cannot_be_read(self):
        start = "api=TUVO.Sharing.Link&version=1&method=list"
        self.assertEqual(self.code(self.get(start)), 1)
        for more in ("&", "&search", "&=x", "&search=%", "&search=%4", "&search=%zz", "&search=%4&x=1",
                     "&limit=1&limit=2", "&api=x", "&&limit=1", "&se%61rch=a&search=b"):
            self.assertEqual(self.by_hand(start + more), 101, more)
        for query in ("", "api=TUVO.Sharing.Link", "api=TUVO.Sharing.Link&version=1", "x",
                      "version=1&method=list", "api=TUVO.Sharing.Link&method=list&version=one",
                      "api=TUVO.Sharing.Link&method=list&version=",
                      "api=TUVO.Sharing.Link&method=list&version=1.0"):
            self.assertEqual(self.code(self.get(query)), 101, query)

    def test_query_of_a_post_is_not_looked_at(self):
        body = request_body("list", search="no-such")
        reply = API.request("POST", "alice", PATH + "?method=delete&id=1&search", body,
                            Content_Type="application/json")
        self.assertEqual(API.answer(reply).data["total"], 0)


class Changing(HttpTest):
    def test_needs_a_post(self):
        link = self.create()
        for method, arguments in CHANGING.items():
            query = urlencode({"api": LINK, "version": 1, "method": method,
                               **dict(arguments, **({"id": link["id"]} if "id" in arguments else {}))})
            for verb in "GET", "HEAD":
                reply = self.get(query, method=verb)
                self.assertEqual(reply.status, 405)
                self.assertEqual(reply.get("Allow"), "POST")
            self.assertEqual(self.code(self.get(query)), 107)
        self.assertTrue(API.call("alice", "get", id=link["id"]).ok)

    def test_other_http_methods_are_refused(self):
        for verb in "PUT", "DELETE", "PATCH", "OPTIONS", "post", "PROPFIND":
            reply = run_entry(verb, body=request_body("list"), CONTENT_TYPE="application/json",
                              CONTENT_LENGTH=str(len(request_body("list"))))
            self.assertEqual((reply.status, json.loads(reply.body)["error"]["code"]), (405, 107))
            self.assertEqual(reply.get("Allow"), "GET, HEAD, POST")
            self.assertEqual([name for name, _ in reply.headers if "Access-Control" in name], [])

    def test_of_forms_nothing_is_taken(self):
        link = self.create()
        fields = {"api": LINK, "version": "1", "method": "delete", "id": str(link["id"])}
        boundary = "".join(f'--b\r\nContent-Disposition: form-data; name="{name}"\r\n\r\n{value}\r\n'
                           for name, value in fields.items()) + "--b--\r\n"
        as_json = request_body("delete", id=link["id"])
        for kind, body in (("application/x-www-form-urlencoded", urlencode(fields).encode()),
                           ("multipart/form-data; boundary=b", boundary.encode()),
                           ("text/plain", as_json), ("application/x-www-form-urlencoded", as_json),
                           ("text/plain; application/json", as_json), ("", as_json),
                           ("application/jsonx", as_json), ("application/json, text/plain", as_json),
                           ("text/json", as_json), ("application/json+x", as_json)):
            self.assertEqual(self.code(API.post("alice", body, **{"Content-Type": kind})), 108, kind)
        reply = run_entry(body=as_json, CONTENT_TYPE=None)
        self.assertEqual(json.loads(reply.body)["error"]["code"], 108)
        self.assertTrue(API.call("alice", "get", id=link["id"]).ok)

    def test_declarations_of_json(self):
        for kind in ("application/json", "Application/JSON", "application/json; charset=utf-8",
                     "application/json;charset=UTF-8", "application/json "):
            self.assertEqual(self.code(API.post("alice", request_body("list"),
                                                **{"Content-Type": kind})), 1, kind)


class Bodies(HttpTest):
    def test_that_cannot_be_read(self):
        good = request_body("list")
        for body in (b"", b"{", b"[]", b"null", b'"text"', b"7", good + b"x", good + good, good[:-1],
                     b"// comment\n" + good, b"{'api': 1}", b"\xff\xfe" + good, b"\0" + good,
                     b'{"api":"TUVO.Sharing.Link","version":1,"method":"list","limit":1,"limit":2}',
                     b'{"api":"TUVO.Sharing.Link","version":1,"method":"list","limit":NaN}',
                     b'{"version":1,"method":"list"}', b'{"api":"TUVO.Sharing.Link","method":"list"}',
                     b'{"api":"TUVO.Sharing.Link","version":1}',
                     b'{"api":7,"version":1,"method":"list"}',
                     b'{"api":"TUVO.Sharing.Link","version":"1","method":"list"}',
                     b'{"api":"TUVO.Sharing.Link","version":1.0,"method":"list"}',
                     b'{"api":"TUVO.Sharing.Link","version":null,"method":"list"}',
                     b'{"api":"TUVO.Sharing.Link","version":1,"method":["list"]}'):
            self.assertEqual(self.code(API.post("alice", body)), 101, body)

    def test_that_are_nested_too_deeply(self):
        for levels, code in ((32, 1), (33, 101), (34, 101), (30000, 101)):
            app = '{"x":' * levels + "1" + "}" * levels
            body = ('{"api":"TUVO.Sharing.Link","version":1,"method":"create","project_name":"x",'
                    f'"app":{app}}}')
            self.assertEqual(self.code(API.post("alice", body.encode())), code, levels)
        self.assertEqual(self.code(API.post("alice", b'{"api":' + b"[" * 200000)), 101)

    def test_up_to_256_kib(self):
        self.assertEqual(self.code(API.post("alice", padded(LIMIT))), 1)
        self.assertEqual(self.code(API.post("alice", padded(LIMIT + 1))), 110)

    def test_of_ten_megabytes(self):
        try:
            self.assertEqual(API.post("alice", padded(10 * 1024 * 1024)).status, 413)
        except (BrokenPipeError, ConnectionResetError):
            pass  # the web server hung up before all of it was sent
        self.assertTrue(API.call("alice", "list").ok)

    def test_too_large_is_refused_before_it_is_read(self):
        for announced in LIMIT + 1, 10**9, 2**31, 2**32, 2**63, 10**30:
            environment = {"REQUEST_METHOD": "POST", "CONTENT_TYPE": "application/json",
                           "CONTENT_LENGTH": str(announced), "REMOTE_USER": "alice"}
            ours, theirs = socket.socketpair()
            with ours, theirs:  # nothing ever comes, and no end either
                done = subprocess.run([ws.ENTRY], stdin=theirs, env=environment, timeout=120,
                                      stdout=subprocess.PIPE, user=33, group=33, extra_groups=[])
            self.assertIn(b"Status: 413 ", done.stdout)
            self.assertIn(b'"code":110', done.stdout)

    def test_length_that_lies(self):
        body = request_body("list")
        for announced, code in ((len(body) + 1, 101), (len(body) - 1, 101), ("", 101), (None, 101),
                                ("-1", 101), ("abc", 101), ("12 ", 101), ("+5", 101), (0, 101),
                                (len(body), 1)):
            announced = None if announced is None else str(announced)
            reply = run_entry(body=body, CONTENT_LENGTH=announced)
            self.assertEqual(json.loads(reply.body).get("error", {}).get("code", 1), code, announced)

    def test_what_stands_behind_the_announced_end_is_not_read(self):
        body = request_body("list")
        reply = run_entry(body=body + b'{"api"', CONTENT_LENGTH=str(len(body)))
        self.assertEqual(reply.status, 200)


class OtherSites(HttpTest):
    def codes(self, **headers):
        """What a request with these headers is answered: one that changes, and one that reads."""
        changed = json.loads(run_entry(body=request_body("create", project_name="x"),
                                       **headers).body)
        read = json.loads(run_entry(body=request_body("list"), **headers).body)
        got = json.loads(run_entry("GET", query=urlencode({"api": LINK, "version": 1,
                                                           "method": "list"}), **headers).body)
        return {answer.get("error", {}).get("code", 1) for answer in (changed, read, got)}

    def test_fetch_site(self):
        for value in "same-origin", "none":
            self.assertEqual(self.codes(HTTP_SEC_FETCH_SITE=value), {1})
        for value in ("cross-site", "same-site", "", "Same-Origin", "same-origin, same-origin",
                      "anything"):
            self.assertEqual(self.codes(HTTP_SEC_FETCH_SITE=value), {109}, value)

    def test_origin(self):
        for origin, others in (
                ("http://nas.example.org", {}), ("HTTP://NAS.Example.ORG", {}),
                ("http://nas.example.org:80", {}), ("http://nas.example.org",
                                                    {"HTTP_HOST": "Nas.example.org:80"}),
                ("http://nas.example.org:8080", {"HTTP_HOST": "nas.example.org:8080"}),
                ("https://nas.example.org", {"HTTPS": "on"}),
                ("https://nas.example.org:443", {"HTTPS": "on"}),
                ("http://192.0.2.1:81", {"HTTP_HOST": "192.0.2.1:81"}),
                ("http://[2001:db8::1]:81", {"HTTP_HOST": "[2001:DB8::1]:81"}),
                ("http://[2001:db8::1]", {"HTTP_HOST": "[2001:db8::1]"}),
                ("http://nas.example.org", {"HTTPS": "off"}), ("http://nas.example.org", {"HTTPS": ""})):
            self.assertEqual(self.codes(HTTP_ORIGIN=origin, **others), {1}, (origin, others))

    def test_origin_of_another_site(self):
        for origin, others in (
                ("null", {}), ("", {}), ("http://evil.example", {}), ("https://nas.example.org", {}),
                ("http://nas.example.org", {"HTTPS": "on"}), ("http://nas.example.org:8080", {}),
                ("http://nas.example.org.evil.example", {}), ("http://evil-nas.example.org", {}),
                ("http://sub.nas.example.org", {}), ("http://nas.example.org@evil.example", {}),
                ("http://nas.example.org http://evil.example", {}),
                ("http://evil.example, http://nas.example.org", {}),
                ("http://nas.example.org, http://nas.example.org", {}),
                ("http://nas.example.org/", {}), ("nas.example.org", {}), ("//nas.example.org", {}),
                ("file://", {}), ("http://", {}), ("http://:80", {}),
                ("http://nas.example.org:", {}), ("http://nas.example.org:080", {}),
                ("chrome-extension://nas.example.org", {}),
                ("http://nas.example.org", {"HTTP_HOST": None}),
                ("http://nas.example.org", {"HTTP_HOST": ""}),
                ("http://nas.example.org", {"HTTP_HOST": "nas.example.org, evil.example"}),
                ("http://nas.example.org", {"HTTP_HOST": "evil.example"})):
            self.assertEqual(self.codes(HTTP_ORIGIN=origin, **others), {109}, (origin, others))

    def test_both_headers_must_agree(self):
        own = "http://nas.example.org"
        self.assertEqual(self.codes(HTTP_ORIGIN=own, HTTP_SEC_FETCH_SITE="cross-site"), {109})
        self.assertEqual(self.codes(HTTP_ORIGIN="http://evil.example",
                                    HTTP_SEC_FETCH_SITE="same-origin"), {109})

    def test_through_the_web_server(self):
        link = self.create()
        own = f"http://127.0.0.1:{API.server.port}"
        body = request_body("delete", id=link["id"])
        for headers in ({"Origin": "http://evil.example"}, {"Origin": "null"},
                        {"Origin": f"http://127.0.0.1:{API.server.port + 1}"},
                        {"Sec-Fetch-Site": "cross-site"}, {"Sec-Fetch-Site": "same-site"},
                        {"Origin": own, "Host": "evil.example"}):
            self.assertEqual(self.code(API.post("alice", body, **headers)), 109, headers)
        self.assertTrue(API.call("alice", "get", id=link["id"]).ok)
        self.assertEqual(self.code(API.post("alice", body, Origin=own,
                                            **{"Sec-Fetch-Site": "same-origin"})), 1)

    def test_preflight_allows_nothing(self):
        reply = API.request("OPTIONS", None, PATH, Origin="http://evil.example",
                            **{"Access-Control-Request-Method": "POST",
                               "Access-Control-Request-Headers": "content-type"})
        self.assertEqual([name for name, _ in reply.headers if "access-control" in name.lower()], [])
        self.assertEqual(reply.status, 401)


class Answers(HttpTest):
    def assert_headers(self, reply):
        self.assertEqual(reply.get("Content-Type"), "application/json")
        self.assertEqual(reply.get("Cache-Control"), "no-store")
        self.assertEqual(reply.get("X-Content-Type-Options"), "nosniff")
        self.assertEqual(reply.get("Cross-Origin-Resource-Policy"), "same-origin")
        self.assertEqual(reply.get("Content-Security-Policy"),
                         "default-src 'none'; frame-ancestors 'none'")
        self.assertEqual(reply.get("Referrer-Policy"), "no-referrer")
        self.assertEqual(reply.get("Content-Length"), str(len(reply.body)))
        self.assertEqual([name for name, _ in reply.headers if "access-control" in name.lower()
                          or name.lower() == "set-cookie"], [])

    def test_headers_of_every_answer(self):
        query = urlencode({"api": LINK, "version": 1, "method": "list"})
        for reply in (API.post("alice", request_body("list")), self.get(query),
                      API.post("alice", b"{"), API.post("alice", request_body("get", id=999999)),
                      API.post("alice", b"x", **{"Content-Type": "text/plain"}),
                      API.post("alice", padded(LIMIT + 1)),
                      API.post("alice", request_body("list"), Origin="null"),
                      run_entry(body=request_body("list"), user=None), run_entry("PUT")):
            self.assert_headers(reply)

    def test_markup_is_no_page(self):
        title = "</script><script>alert(1)</script>"
        link = self.create(protect_title=title)
        reply = API.post("alice", request_body("get", id=link["id"]))
        self.assert_headers(reply)
        self.assertEqual(json.loads(reply.body)["data"]["link"]["protect_title"], title)

    def test_address_names_the_port_that_the_request_came_to(self):
        answer = API.call("alice", "create", project_name="x")
        self.assertIn(f":{API.server.port}/sharing/", answer.data["url"])
        for https, port, wanted in (("on", "443", "https://"), ("on", "8443", "https://"),
                                    (None, "80", "http://"), (None, "81", "http://")):
            reply = run_entry(body=request_body("create", project_name="x"), HTTPS=https,
                              SERVER_PORT=port)
            url = json.loads(reply.body)["data"]["url"]
            self.assertTrue(url.startswith(wanted), url)
            self.assertEqual(f":{port}/" in url, port not in ("80", "443"), url)

    def test_port_that_is_none(self):
        for port in None, "", "x", "-1", "65536", "999999999999999999999":
            reply = run_entry(body=request_body("create", project_name="x"), SERVER_PORT=port)
            self.assertRegex(json.loads(reply.body)["data"]["url"], "^http://[^:]*/sharing/")

    def test_only_the_program_is_there(self):
        for path in ("/webapi/", "/webapi/entry.cgi/x", "/webapi/tuvowebapi", "/webapi/../sharing.cgi",
                     "/webapi/entry.cgi.bak"):
            reply = API.request("GET", "alice", path)
            self.assertIn(reply.status, (403, 404), path)
            self.assertNotIn(b"success", reply.body)


class EventLog(HttpTest):
    def log_of(self, *calls):
        with vs.SystemLog() as log:
            for call in calls:
                call()
        return ws.events(log), "\n".join(log.lines)

    def test_a_line_for_every_change(self):
        made = {}
        events, _ = self.log_of(
            lambda: made.update(self.create(hash="logged-hash", protect_title="logged-title")))
        self.assertEqual(events, [{"event": "create", "link": str(made["id"]), "result": "1",
                                   "address": "127.0.0.1", "by": "2001"}])
        body = {"address": "127.0.0.1", "result": "1", "by": "2001", "link": str(made["id"])}
        for call, wanted in (
                (lambda: API.call("alice", "set", id=made["id"], protect_password="logged-secret"),
                 {"event": "set", **body}),
                (lambda: API.call("carol", "set", id=made["id"], enabled=False),
                 {"event": "set", **body, "by": "2003"}),
                (lambda: API.call("alice", "sign_out", hash="logged-hash"),
                 {"event": "sign_out", **body}),
                (lambda: API.call("alice", "delete", hash="logged-hash"), {"event": "delete", **body}),
                (lambda: API.call("alice", "delete_expired"),
                 {"event": "delete_expired", **body, "link": "0"})):
            events, text = self.log_of(call)
            self.assertEqual(events, [wanted])
            for word in "logged-hash", "logged-title", "logged-secret", "alice", "password":
                self.assertNotIn(word, text)

    def test_a_line_for_every_change_that_is_refused(self):
        link = self.create()
        others = self.create("bob", hash="taken-by-bob")
        number = str(link["id"])
        for call, event, named, code in (
                (lambda: API.call("alice", "create"), "create", "0", 201),
                (lambda: API.call("alice", "create", project_name="x", hash="taken-by-bob"),
                 "create", "0", 204),
                (lambda: API.call("alice", "create", project_name="x", owner_user="bob"),
                 "create", "0", 106),
                (lambda: API.call("alice", "create", project_name="file"), "create", "0", 208),
                (lambda: API.call("alice", "set", id=others["id"]), "set", "0", 205),
                (lambda: API.call("alice", "set", id=link["id"], hash="taken-by-bob"), "set", number,
                 204),
                (lambda: API.call("alice", "set", id=link["id"], redirect_type="always"), "set",
                 number, 208),
                (lambda: API.call("alice", "delete", id=others["id"]), "delete", "0", 205),
                (lambda: API.call("alice", "sign_out", id=others["id"]), "sign_out", "0", 205),
                (lambda: API.call("alice", "delete_expired", owner_user="bob"), "delete_expired", "0",
                 106),
                (lambda: API.call("alice", "delete_expired", nonsense=1), "delete_expired", "0", 200),
                (lambda: self.get(f"api={LINK}&version=1&method=delete&id={number}"), "delete", "0",
                 107),
                (lambda: API.post("alice", request_body("delete", id=link["id"]), Origin="null"),
                 "delete", "0", 109)):
            events, _ = self.log_of(call)
            self.assertEqual(events, [{"event": event, "link": named, "address": "127.0.0.1",
                                       "result": str(code), "by": "2001"}])

    def test_refused_change_of_nobody_names_nobody(self):
        events, _ = self.log_of(lambda: run_entry(body=request_body("delete", id=1), user="no-such",
                                                  REMOTE_ADDR="2001:DB8::0:1"))
        self.assertEqual(events, [{"event": "delete", "link": "0", "address": "2001:db8::1",
                                   "result": "105"}])

    def test_reading_leaves_none(self):
        link = self.create()
        events, _ = self.log_of(lambda: API.call("alice", "get", id=link["id"]),
                                lambda: API.call("alice", "list"),
                                lambda: API.call("alice", "sessions", id=link["id"]),
                                lambda: API.call("alice", "query", api=ws.INFO),
                                lambda: API.post("alice", b"{"),
                                lambda: API.call("alice", "nothing"))
        self.assertEqual(events, [])

    def test_hostile_texts_make_no_lines(self):
        forged = "x\nsharing event=login link=7 address=local result=1"
        events, text = self.log_of(
            lambda: run_entry(body=request_body("create", project_name=forged), user="alice",
                              REMOTE_ADDR=forged),
            lambda: run_entry(body=request_body("create", **{forged: "x"}), user=forged),
            lambda: run_entry(body=request_body(forged), user="alice"),
            *(lambda who=who, method=method: API.call(who, method, owner_user=forged)
              for who in ("alice", "carol") for method in ("list", "create", "delete_expired")),
            lambda: API.call("alice", "create", project_name="x", protect_users=[forged]),
            lambda: API.call("alice", "create", project_name="file", app={"path": forged}))
        self.assertEqual([event["address"] for event in events][:2], ["-", "192.0.2.7"])
        self.assertEqual([event["result"] for event in events],
                         ["203", "105", "201", "106", "201", "203", "203", "206"])
        self.assertNotIn("link=7", text)


class Identities(HttpTest):
    def works(self, **options):
        reply = run_entry(body=request_body("create", project_name="x"), **options)
        return reply.status, json.loads(reply.body).get("error", {}).get("code", 1)

    def test_started_set_user_id_by_the_web_server(self):
        self.assertEqual(self.works(), (200, 1))

    def test_started_as_the_system_identity(self):
        self.assertEqual(self.works(program=ws.PLAIN_ENTRY, uid=vs.SYSTEM), (200, 1))

    def test_started_by_root(self):
        self.assertEqual(self.works(program=ws.PLAIN_ENTRY, uid=0), (200, 1))

    def test_without_any_right_to_the_database(self):
        with vs.SystemLog() as log:
            self.assertEqual(self.works(program=ws.PLAIN_ENTRY), (500, 100))
        self.assertTrue(any("the database of links cannot be used" in line for line in log.errors()))
        self.assertEqual([(event["event"], event["result"]) for event in ws.events(log)],
                         [("create", "100")])

    def test_database_that_is_none(self):
        os.rename(vs.DATABASE, vs.DATABASE + ".kept")
        try:
            with open(vs.DATABASE, "wb") as file:
                file.write(b"this is no database at all, and long enough to be looked at" * 40)
            os.chown(vs.DATABASE, 1, 1)
            for method, arguments in {**CHANGING, **READING}.items():
                answer = API.call("alice", method, **arguments)
                self.assertEqual(answer.code, 100, method)
                self.assertNotIn("sharing.db", repr(answer))
            # What is wrong with the request itself is told without it.
            self.assertEqual(API.call("alice", "list", nonsense=1).code, 200)
        finally:
            os.rename(vs.DATABASE + ".kept", vs.DATABASE)
        self.assertTrue(API.call("alice", "list").ok)

    def test_environment_of_the_caller_does_not_matter(self):
        stored = []
        for more in {}, {"TZ": "Pacific/Kiritimati"}, {"TZ": "XYZ-20"}, {"TZ": "/etc/shadow"}:
            body = request_body("create", project_name="x", expire_at="2030-01-01 12:00")
            row = json.loads(run_entry(body=body, **more).body)["data"]["link"]["id"]
            stored.append(sql("SELECT expire_at FROM entry WHERE id=?", row)[0][0])
        self.assertEqual(len(set(stored)), 1)


class Hostile(HttpTest):
    def test_texts_in_every_field(self):
        texts = ["'; DROP TABLE entry; --", "\" OR \"\"=\"", "\u202e\u2066reversed", "😀👩‍👩‍👧‍👧",
                 "<img src=x onerror=alert(1)>", "%s%n%x", "\\\\\\", "../../etc/passwd", "${jndi:x}",
                 "\ufeffbom", "e\u0301" * 20]
        for text in texts:
            link = self.create(project_name=text[:64], protect_title=text, app={text: [text]},
                               private_data={text: text})
            shown = API.call("alice", "get", id=link["id"]).data["link"]
            self.assertEqual((shown["project_name"], shown["protect_title"], shown["app"]),
                             (text, text, {text: [text]}))
            for name in "hash", "start_at", "state", "sort", "owner_user", "protect_type":
                method = "list" if name in ("state", "sort") else "set"
                more = {} if method == "list" else {"id": link["id"]}
                self.assertIn(API.call("alice", method, **{name: text}, **more).code, (106, 203))
        self.assertGreater(sql("SELECT COUNT(*) FROM entry")[0][0], 0)

    def test_zero_bytes_and_broken_utf8(self):
        for text in b"a\\u0000b", b"a\xffb", b"\xc0\xaf", b"\xed\xa0\x80", b"\\ud800":
            for name in b"project_name", b"hash", b"protect_title", b"protect_password", b"search":
                method = b"list" if name == b"search" else b"create"
                others = b"" if name in (b"project_name", b"search") else b'"project_name":"x",'
                body = (b'{"api":"TUVO.Sharing.Link","version":1,"method":"' + method + b'",' + others
                        + b'"' + name + b'":"' + text + b'"}')
                self.assertIn(self.code(API.post("alice", body)), (101, 203), body)

    def test_names_that_are_hostile(self):
        for name in "", "a\0b", "a\nb", "__proto__", "x" * 100000, "😀":
            self.assertEqual(API.call("alice", "list", **{name: 1}).code, 200)

    def test_many_arguments(self):
        body = request_body("list", **{f"name{number}": number for number in range(10000)})
        self.assertLess(len(body), LIMIT)
        self.assertEqual(self.code(API.post("alice", body)), 200)


if __name__ == "__main__":
    ws.install(sys.argv[1], sys.argv[2])
    with vs.WebServer() as server:
        API = ws.HttpFront(server)
        unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
