"""The programs behind another web server, nginx, which starts none: each listens on a socket of its
own. Arguments: the build folder, the project's folder."""

import base64
import configparser
import http.client
import json
import os
import socket
import ssl
import subprocess
import sys
import time
import unittest

import fastcgi
import visitor_server as vs
from visitor_server import Visitor, make_file_link

SERVER = None
FILE = "/tmp/shared/report.txt"
CONTENT = os.urandom(3 * 1024 * 1024 + 17)
MODULE = "/usr/lib/nginx/modules/ngx_http_auth_pam_module.so"
QUERY = "/webapi/entry.cgi?api=TUVO.API.Info&version=1&method=query"

CONFIGURATION = """
load_module %(module)s;
user www-data;
pid /tmp/nginx/pid;
error_log /tmp/nginx/error.log;
daemon off;
worker_processes 1;
events {}
http {
  access_log /tmp/nginx/access.log;
  server_tokens off;
  client_body_temp_path /tmp/nginx/body;
  fastcgi_temp_path /tmp/nginx/fastcgi;
  proxy_temp_path /tmp/nginx/proxy;
  uwsgi_temp_path /tmp/nginx/uwsgi;
  scgi_temp_path /tmp/nginx/scgi;
  upstream tuvosharing_visitors { least_conn; server unix:/tmp/sharing.sock; }
  upstream tuvosharing_webapi { server unix:/tmp/webapi.sock; }
  server {
    listen 127.0.0.1:%(port)d;
    root /var/empty;
    set_real_ip_from 127.0.0.80;
    real_ip_header X-Forwarded-For;
    include %(project)s/packaging/nginx/sharing.conf;
    include %(project)s/packaging/nginx/owner.conf;
  }
  server {
    listen 127.0.0.1:%(lenient)d;
    root /var/empty;
    satisfy any;
    allow 127.0.0.1;
    deny all;
    include %(project)s/packaging/nginx/owner.conf;
  }
  server {
    listen 127.0.0.1:%(secure)d ssl;
    ssl_certificate /tmp/nginx/certificate;
    ssl_certificate_key /tmp/nginx/key;
    root /var/empty;
    include %(project)s/packaging/nginx/sharing.conf;
    include %(project)s/packaging/nginx/owner.conf;
  }
}
"""


class Nginx:
    """The server, for the lifetime of a `with`."""

    def __init__(self, project):
        self.project = project

    def __enter__(self):
        os.mkdir("/tmp/nginx", 0o755)
        os.chown("/tmp/nginx", vs.WWW_DATA, vs.WWW_DATA)
        subprocess.run(["openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-days", "2",
                        "-subj", "/CN=localhost", "-keyout", "/tmp/nginx/key",
                        "-out", "/tmp/nginx/certificate"], check=True, stderr=subprocess.DEVNULL)
        ports = set()  # drawn late, since others take some meanwhile
        while len(ports) < 3:
            ports.add(vs.free_port())
        self.port, self.lenient, self.secure = ports
        with open("/tmp/nginx/nginx.conf", "w") as file:
            file.write(CONFIGURATION % {"module": MODULE, "port": self.port,
                                        "lenient": self.lenient, "secure": self.secure,
                                        "project": self.project})
        self.process = subprocess.Popen(
            ["/usr/sbin/nginx", "-c", "/tmp/nginx/nginx.conf", "-e", "/tmp/nginx/error.log"],
            stdin=subprocess.DEVNULL)
        for _ in range(1200):
            try:
                socket.create_connection(("127.0.0.1", self.port)).close()
                return self
            except ConnectionRefusedError:
                time.sleep(0.05)
        with open("/tmp/nginx/error.log") as log:
            raise RuntimeError("nginx does not start:\n" + log.read())

    def __exit__(self, *_):
        self.process.terminate()
        self.process.wait()


def path_of(link):
    return "/sharing/" + link


def login(name, password):
    token = base64.b64encode(f"{name}:{password}".encode()).decode()
    return {"Authorization": "Basic " + token}


def ask(port, path, headers, method="GET", body=None, secure=False):
    """The answer of another port than the usual one's."""
    connection = http.client.HTTPConnection("127.0.0.1", port, timeout=60)
    if secure:
        connection = http.client.HTTPSConnection("127.0.0.1", port, timeout=60,
                                                 context=ssl._create_unverified_context())
    try:
        connection.request(method, path, body, headers)
        response = connection.getresponse()
        return vs.Reply(response.status, response.getheaders(), response.read())
    finally:
        connection.close()


class Visitors(unittest.TestCase):
    def test_road(self):
        link = make_file_link(FILE, protect_type="password", password="secret",
                              redirect_type="url_param", redirect_uri="/album/7")
        visitor = Visitor(SERVER)
        self.assertIn("<form", visitor.get(path_of(link)).text)
        refused = visitor.post(path_of(link) + "?password=secret", {"password": "x"})
        self.assertEqual(refused.status, 403)
        reply = visitor.post(path_of(link), {"password": "secret"})
        self.assertEqual((reply.status, reply.get("Location")), (303, path_of(link)))
        self.assertRegex(reply.get("Set-Cookie"),
                         r"^sharing_sid=[A-Za-z0-9_-]{32}; Path=/sharing; HttpOnly; SameSite=Lax$")
        reply = visitor.get(path_of(link))
        self.assertEqual((reply.status, reply.body == CONTENT), (200, True))
        self.assertEqual(reply.get("Content-Length"), str(len(CONTENT)))
        reply = visitor.get(path_of(link), Range="bytes=100-199")
        self.assertEqual((reply.status, reply.body), (206, CONTENT[100:200]))
        reply = visitor.get(path_of(link) + "?redirect=1")
        self.assertEqual((reply.status, reply.get("Location")), (302, "/album/7"))
        self.assertEqual(visitor.head(path_of(link)).body, b"")
        self.assertEqual(visitor.post(path_of(link) + "/logout").status, 200)
        self.assertIn("<form", visitor.get(path_of(link)).text)

    def test_address_is_the_connections(self):
        link = make_file_link(FILE)
        visitor = Visitor(SERVER, "127.0.0.71")
        visitor.post(path_of(link), X_Forwarded_For="192.0.2.1")
        self.assertEqual(vs.sql("SELECT ip FROM session WHERE session_id=?", visitor.session_id),
                         [("127.0.0.71",)])
        visitor.address = "127.0.0.72"
        self.assertEqual(visitor.get(path_of(link)).status, 403)

    def test_address_is_the_trusted_proxys_word(self):
        visitor = Visitor(SERVER, "127.0.0.80")
        visitor.post(path_of(make_file_link(FILE)), X_Forwarded_For="192.0.2.1")
        self.assertEqual(vs.sql("SELECT ip FROM session WHERE session_id=?", visitor.session_id),
                         [("192.0.2.1",)])

    def test_other_paths(self):
        for path in "/sharing/", "/sharing/ab", "/sharing/abc/def", "/sharing/%2e%2e", "/other":
            self.assertEqual(Visitor(SERVER).get(path).status, 404, path)

    def test_hashes_are_not_in_the_access_log(self):
        link = make_file_link(FILE)
        visitor = Visitor(SERVER)
        visitor.get(path_of(link))
        visitor.post(path_of(link))
        visitor.get(path_of(link) + "?redirect=1")
        query = "/webapi/entry.cgi?api=TUVO.Sharing.Link&version=1&method=get&hash=" + link
        for headers in {}, login("alice", "alice-secret"):
            visitor.request("GET", query, None, headers)
        visitor.get("/logged")  # the witness: behind them, and there
        text = ""
        for _ in range(1200):
            with open("/tmp/nginx/access.log") as file:
                text = file.read()
            if "/logged" in text:
                break
            time.sleep(0.05)
        self.assertIn("/logged", text)
        self.assertNotIn(link, text)

    def test_large_request_stays_outside(self):
        reply = Visitor(SERVER).request("POST", "/sharing/abcdef", "x" * 1200 * 1024, {
            "Content-Type": "application/x-www-form-urlencoded"})
        self.assertEqual(reply.status, 413)


class Owners(unittest.TestCase):
    def ask(self, path, headers=None):
        return Visitor(SERVER).request("GET", path, None, headers or {})

    def test_page_needs_an_account(self):
        for path in "/owner/", "/owner/index.html", "/owner/none", "/owner/x/owner.js", QUERY:
            self.assertEqual(self.ask(path).status, 401)
            self.assertEqual(self.ask(path, login("alice", "wrong")).status, 401)
            self.assertEqual(self.ask(path, login("dave", "dave-secret")).status, 401)

    def test_page(self):
        for path, kind in (("/owner/", "text/html; charset=utf-8"),
                           ("/owner/owner.js", "text/javascript; charset=utf-8")):
            reply = self.ask(path, login("alice", "alice-secret"))
            self.assertEqual((reply.status, reply.get("Content-Type")), (200, kind))
            self.assertEqual(reply.get("Content-Security-Policy"),
                             "default-src 'none'; script-src 'self'; style-src 'self'; "
                             "img-src 'self' data:; connect-src 'self'; form-action 'none'; "
                             "frame-ancestors 'none'; base-uri 'none'")
            self.assertEqual(reply.get("X-Content-Type-Options"), "nosniff")
            self.assertEqual(reply.get("Cache-Control"), "no-cache")
            self.assertEqual(reply.get("Referrer-Policy"), "no-referrer")
            self.assertEqual(reply.get("X-Frame-Options"), "DENY")
            self.assertEqual(reply.get("Cross-Origin-Opener-Policy"), "same-origin")

    def test_parts_of_the_page_are_the_same_for_everybody(self):
        for part, kind in (("owner.js", "text/javascript; charset=utf-8"),
                           ("owner.css", "text/css; charset=utf-8"), ("icon.svg", "image/svg+xml")):
            with open(vs.PAGE + part, "rb") as file:
                content = file.read()
            reply = self.ask("/owner/" + part)
            self.assertEqual((reply.status, reply.get("Content-Type"), reply.body),
                             (200, kind, content))
            self.assertIn("script-src 'self'", reply.get("Content-Security-Policy"))
            # A copy that a browser has kept is asked about, and not sent again.
            self.assertEqual(reply.get("Cache-Control"), "no-cache")
            reply = self.ask("/owner/" + part, {"If-None-Match": reply.get("ETag")})
            self.assertEqual((reply.status, reply.body), (304, b""))

    def test_server_that_lets_addresses_in_without_a_password(self):
        for path in "/owner/", QUERY:
            for headers in {}, login("alice", "wrong"):
                self.assertEqual(ask(SERVER.lenient, path, headers).status, 401)
            self.assertEqual(ask(SERVER.lenient, path, login("alice", "alice-secret")).status, 200)

    def test_large_request_stays_outside(self):
        reply = Visitor(SERVER).request("POST", "/webapi/entry.cgi", "x" * 310 * 1024, {
            "Content-Type": "application/json", **login("alice", "alice-secret")})
        self.assertEqual(reply.status, 413)
        self.assertNotIn(b'"success"', reply.body)

    def test_port_and_scheme_reach_the_web_api(self):
        body = json.dumps({"api": "TUVO.Sharing.Link", "version": 1, "method": "create",
                           "project_name": "x"})
        for secure, port, scheme in ((False, SERVER.port, "http"), (True, SERVER.secure, "https")):
            headers = {"Content-Type": "application/json", "Origin": f"{scheme}://127.0.0.1:{port}",
                       **login("alice", "alice-secret")}
            reply = ask(port, "/webapi/entry.cgi", headers, "POST", body, secure)
            data = json.loads(reply.body)["data"]
            self.assertRegex(data["url"], rf"^{scheme}://[^/]*:{port}/sharing/")
            other = dict(headers, Origin=f"http{'' if secure else 's'}://127.0.0.1:{port}")
            self.assertEqual(ask(port, "/webapi/entry.cgi", other, "POST", body, secure).status, 403)

    def test_cookie_is_secure_by_tls(self):
        reply = ask(SERVER.secure, path_of(make_file_link(FILE)), {
            "Content-Type": "application/x-www-form-urlencoded"}, "POST", "", True)
        self.assertEqual(reply.status, 303)
        self.assertIn("; Secure", reply.get("Set-Cookie"))

    def test_account_is_the_web_apis(self):
        reply = self.ask(QUERY, dict(login("alice", "alice-secret"), **{"Remote-User": "bob"}))
        self.assertEqual(reply.status, 200)
        self.assertEqual(json.loads(reply.body)["data"]["account"]["user"], "alice")


class Units(unittest.TestCase):
    """The units of packaging/systemd, as texts: nothing here runs under systemd."""

    def read(self, name):
        unit = configparser.ConfigParser(interpolation=None, strict=True)
        unit.optionxform = str
        with open(f"{sys.argv[2]}/packaging/systemd/tuvosharing-{name}") as file:
            unit.read_file(file)
        return unit

    def test_sockets_are_the_web_servers_alone(self):
        for name in "visitors", "webapi":
            unit = self.read(f"{name}@.socket")["Socket"]
            self.assertEqual((unit["SocketUser"], unit["SocketGroup"], unit["SocketMode"]),
                             ("www-data", "www-data", "0600"))
            self.assertEqual(unit["ListenStream"], f"/run/tuvosharing/{name}-%i.sock")
            self.assertEqual(unit["TriggerLimitIntervalSec"], "0")

    def test_identities(self):
        visitors, webapi = (self.read(name + "@.service") for name in ("visitors", "webapi"))
        self.assertEqual((visitors["Service"]["User"], visitors["Service"]["Group"],
                          visitors["Service"]["NoNewPrivileges"]), ("1", "1", "yes"))
        self.assertEqual((webapi["Service"]["User"], webapi["Service"]["Group"]),
                         ("www-data", "www-data"))
        self.assertNotIn("NoNewPrivileges", webapi["Service"])  # it is set-user-id root
        for unit in visitors, webapi:
            self.assertEqual(unit["Service"]["StandardInput"], "socket")
            self.assertNotIn("SupplementaryGroups", unit["Service"])
            self.assertEqual(unit["Unit"]["StartLimitIntervalSec"], "0")


def main():
    global SERVER
    vs.install(sys.argv[1], sys.argv[2])
    if not os.path.exists("/usr/sbin/nginx") or not os.path.exists(MODULE):
        vs.skip("the packages nginx-light and libnginx-mod-http-auth-pam are missing")
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    # The visitors' one without any privilege; the web API's set-user-id root, as owners' files want.
    with fastcgi.Spawned(vs.PLAIN_PROGRAM, vs.SYSTEM, path="/tmp/sharing.sock"), \
            fastcgi.Spawned(vs.OWNERS_PROGRAM, vs.WWW_DATA, path="/tmp/webapi.sock"), \
            Nginx(sys.argv[2]) as SERVER:
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
