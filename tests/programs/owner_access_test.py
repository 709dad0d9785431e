"""Who may come near the owner's side, by the web server's configuration. Arguments: the build folder,
the project's folder."""

import base64
import json
import socket
import sys
import unittest

import visitor_server as vs
from visitor_server import Visitor

SERVERS = []  # by CGI, by FastCGI
QUERY = "/webapi/entry.cgi?api=TUVO.API.Info&version=1&method=query"


def login(name, password):
    token = base64.b64encode(f"{name}:{password}".encode()).decode()
    return {"Authorization": "Basic " + token}


def own_address():
    """An address of this machine that is not the loopback's; None without one."""
    with socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as probe:
        try:
            probe.connect(("192.0.2.1", 9))  # sends nothing
        except OSError:
            return None
        return probe.getsockname()[0]


class Access(unittest.TestCase):
    def ask(self, path, method="GET", body=None, **headers):
        """The same answer of both servers."""
        replies = [Visitor(server).request(method, path, body,
                                           {k.replace("_", "-"): v for k, v in headers.items()})
                   for server in SERVERS]
        self.assertEqual(replies[0].status, replies[1].status)
        self.assertEqual(len(replies[0].body) > 0, len(replies[1].body) > 0)
        return replies[0]

    def assert_asked_for_a_login(self, path, **headers):
        with self.subTest(path=path, headers=headers):
            reply = self.ask(path, **headers)
            self.assertEqual(reply.status, 401)
            self.assertEqual(reply.get("WWW-Authenticate"),
                             'Basic realm="Sharing links", charset="UTF-8"')
            self.assertNotIn(b"<script", reply.body)

    def test_nobody_without_an_account(self):
        for path in ("/owner/", "/owner/index.html", "/owner/none", "/owner/x/owner.js",
                     "/owner/owner.js.bak", "/owner/owner.js/", QUERY):
            self.assert_asked_for_a_login(path)
            self.assert_asked_for_a_login(path, Remote_User="alice")
            self.assert_asked_for_a_login(path, REMOTE_USER="alice")

    def test_nobody_with_a_wrong_account(self):
        for name, password in (("alice", "wrong"), ("nobody-of-that-name", "x"), ("alice", ""),
                               ("dave", "dave-secret"), ("www-data", "")):  # dave's has expired
            self.assert_asked_for_a_login("/owner/", **login(name, password))
            self.assert_asked_for_a_login(QUERY, **login(name, password))

    def test_parts_of_the_page_are_the_same_for_everybody(self):
        for part in "owner.js", "owner.css", "icon.svg":
            with self.subTest(part=part):
                with open(vs.PAGE + part, "rb") as file:
                    content = file.read()
                reply = self.ask("/owner/" + part)
                self.assertEqual((reply.status, reply.body), (200, content))
                # A copy that a browser has kept is asked about, and not sent again.
                reply = self.ask("/owner/" + part, If_None_Match=reply.get("ETag"))
                self.assertEqual((reply.status, reply.body), (304, b""))

    def test_ways_around_the_folders_name(self):
        for path in ("//webapi/entry.cgi", "/webapi//entry.cgi", "/%77ebapi/entry.cgi",
                     "/x/../webapi/entry.cgi", "/webapi/./entry.cgi", "/webapi/entry%2ecgi",
                     "/sharing/../webapi/entry.cgi", "/owner/../webapi/entry.cgi"):
            with self.subTest(path=path):
                self.assertIn(self.ask(path).status, (401, 404))

    def test_account_is_the_web_apis(self):
        for name in "alice", "bob":
            reply = self.ask(QUERY, **login(name, name + "-secret"))
            self.assertEqual(reply.status, 200)
            self.assertEqual(json.loads(reply.body)["data"]["account"]["user"], name)
        reply = self.ask(QUERY, Remote_User="bob", **login("alice", "alice-secret"))
        self.assertEqual(json.loads(reply.body)["data"]["account"]["user"], "alice")

    def test_nothing_beside_the_program(self):
        for path in "/webapi/", "/webapi/entry.cgi.bak", "/webapi/entry.cgi/x", "/webapi/sharing.cgi":
            self.assertEqual(self.ask(path).status, 403, path)
            self.assertEqual(self.ask(path, **login("alice", "alice-secret")).status, 403, path)

    def test_nothing_beside_the_page(self):
        for path in "/owner/../../etc/passwd", "/owner/%2e%2e/db_schema/1.sql", "/owner/none":
            self.assertEqual(self.ask(path, **login("alice", "alice-secret")).status, 404, path)

    def test_pages_headers(self):
        for path, kind in (("/owner/", "text/html; charset=utf-8"),
                           ("/owner/owner.js", "text/javascript; charset=utf-8"),
                           ("/owner/owner.css", "text/css; charset=utf-8")):
            reply = self.ask(path, **login("alice", "alice-secret"))
            self.assertEqual((reply.status, reply.get("Content-Type")), (200, kind), path)
            self.assertEqual(reply.get("Content-Security-Policy"),
                             "default-src 'none'; script-src 'self'; style-src 'self'; "
                             "img-src 'self' data:; connect-src 'self'; form-action 'none'; "
                             "frame-ancestors 'none'; base-uri 'none'")
            self.assertEqual(reply.get("X-Content-Type-Options"), "nosniff")
            self.assertEqual(reply.get("Referrer-Policy"), "no-referrer")
            self.assertEqual(reply.get("X-Frame-Options"), "DENY")
            self.assertEqual(reply.get("Cross-Origin-Opener-Policy"), "same-origin")
            self.assertEqual(reply.get("Cache-Control"), "no-cache")

    def test_large_requests_stay_outside(self):
        reply = self.ask("/webapi/entry.cgi", "POST", "x" * 310 * 1024,
                         Content_Type="application/json", **login("alice", "alice-secret"))
        self.assertEqual(reply.status, 413)

    def test_no_password_travels_in_the_clear(self):
        address = own_address()
        if not address:
            self.skipTest("this machine has no address but the loopback's")
        with open("/tmp/fastcgi.conf") as file:
            text = file.read().replace('server.bind = "127.0.0.1"', 'server.bind = "0.0.0.0"')
        with open("/tmp/open.conf", "w") as file:
            file.write(text.replace('"/tmp/run"', '"/tmp/run-open"'))
        vs.os.mkdir("/tmp/run-open", 0o700)
        vs.os.chown("/tmp/run-open", vs.WWW_DATA, vs.WWW_DATA)
        with vs.WebServer("/tmp/open.conf") as server:
            visitor = Visitor(server, address)
            for path in "/owner/", QUERY:
                self.assertEqual(visitor.request("GET", path).status, 403)
                self.assertEqual(visitor.request(
                    "GET", path, None, login("alice", "alice-secret")).status, 403)
            self.assertEqual(visitor.get("/sharing/no-such-link").status, 404)
            self.assertEqual(Visitor(server).request("GET", QUERY).status, 401)

    def test_visitors_need_no_account(self):
        self.assertEqual(self.ask("/sharing/no-such-link").status, 404)


def main():
    vs.install(sys.argv[1], sys.argv[2])
    with vs.WebServer() as cgi, vs.WebServer(vs.fastcgi_configuration()) as fastcgi:
        SERVERS[:] = cgi, fastcgi
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
