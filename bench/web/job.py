"""Whether a server does the whole job that its requests are measured of. What is fast because it
leaves something out would be no measure."""

import http.client
import re
import time
import urllib.parse

PASSWORD = "tea and biscuits"
USES = 2
DAY = 86400


class Visitor:
    """A browser with one cookie."""

    def __init__(self, server):
        self.server = server
        self.cookie = ""

    def request(self, method, path, fields=None):
        headers = {"Cookie": self.cookie} if self.cookie else {}
        body = None
        if method == "POST":
            headers["Content-Type"] = "application/x-www-form-urlencoded"
            body = urllib.parse.urlencode(fields or {})
        connection = http.client.HTTPConnection("127.0.0.1", self.server.port, timeout=30)
        try:
            connection.request(method, path, body, headers)
            reply = connection.getresponse()
            text = reply.read().decode()
        finally:
            connection.close()
        cookie = re.match(r"sharing_sid=[^;]+", reply.getheader("Set-Cookie") or "")
        if cookie:
            self.cookie = cookie.group()
        return reply.status, text

    def login(self, password=PASSWORD):
        return self.request("POST", self.server.path, {"password": password})[0]

    def is_in(self):
        """Whether a visit shows what the link shares; others get the form, with 200 or 403."""
        status, text = self.request("GET", self.server.path)
        return status == 200 and "<h1>The link is open</h1>" in text and 1500 < len(text) < 3000


def _expect(server, what, found, wanted):
    if found != wanted:
        raise RuntimeError(f"{server.name}: {what}: {found} in place of {wanted}")


def begin(server):
    """Walks through logins and refusals; returns the visitor who is in afterwards, when the link's
    uses are all taken."""
    stranger = Visitor(server)
    _expect(server, "a visit without a login", stranger.is_in(), False)
    _expect(server, "a login with another password", stranger.login("sugar"), 403)
    first, visitor, late = Visitor(server), Visitor(server), Visitor(server)
    _expect(server, "a login", first.login(), 303)
    _expect(server, "the last login", visitor.login(), 303)
    _expect(server, "a login too many", late.login(), 410)
    _expect(server, "a visit", visitor.is_in(), True)
    if server.database is not None:  # else the server has it to itself, and nobody else can look
        _check_prolonging(server, visitor)
        _check_ends(server, first)
    return visitor


def _check_prolonging(server, visitor):
    """Every visit makes session and token last a day from then."""
    server.shorten(1000)
    _expect(server, "a visit", visitor.is_in(), True)
    wanted = time.time() + DAY - 60
    _expect(server, "whether session and token end a day ahead",
            [max(ends) > wanted for ends in server.expiries()], [True, True])


def _check_ends(server, visitor):
    """Ended ones admit nobody. This visitor may be out afterwards; others are not."""
    for table in "session", "token":
        server.shorten(2 * DAY, [table])
        _expect(server, f"a visit with an ended {table}", visitor.is_in(), False)
        server.shorten(-2 * DAY, [table])


def end(server, visitor):
    """After the load: the visitor is still in, can leave, and is out then."""
    _expect(server, "a visit after the load", visitor.is_in(), True)
    _expect(server, "a logout", visitor.request("POST", server.path + "/logout")[0], 200)
    _expect(server, "a visit after the logout", visitor.is_in(), False)
