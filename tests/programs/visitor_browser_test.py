"""The visitor's pages in a real browser. Arguments: the build folder, the project's folder. With
TUVO_SCREENSHOTS set to a folder, a picture of every page is left there."""

import http.server
import os
import sys
import threading
import unittest

import browser
import visitor_server as vs
from browser import By, Keys
from visitor_server import make_file_link, make_link, sql

SERVER = None
FILE = "/tmp/shared/Übersicht 2024.txt"
CONTENT = os.urandom(400000)


class BrowserTest(browser.Browser, unittest.TestCase):
    def setUp(self):
        self.start()
        self.addCleanup(self.quit)

    def open(self, path):
        self.go(f"http://127.0.0.1:{SERVER.port}{path}")

    def assert_rendered(self):
        """The style was let through, and nothing was refused by the pages' policy."""
        self.assertEqual(self.style("main", "borderTopLeftRadius"), "12px")
        self.assertEqual(self.policy_complaints(), [])

    def assert_file_arrives(self):
        name, content = self.downloaded()
        self.assertEqual(name, os.path.basename(FILE))
        self.assertTrue(content == CONTENT)


class Pages(BrowserTest):
    def test_open_link(self):
        self.open("/sharing/" + make_file_link(FILE, protect_title="Our trip to the coast"))
        self.assert_heading("Our trip to the coast")
        self.assert_rendered()
        self.picture("open")
        self.assert_focus(lambda: self.browser.find_element(By.TAG_NAME, "button"))
        self.browser.switch_to.active_element.send_keys(Keys.ENTER)
        self.assert_file_arrives()

    def test_password_link(self):
        link = make_file_link(FILE, protect_type="password", password="tëa", protect_title="Report")
        self.open("/sharing/" + link)
        self.assert_rendered()
        self.picture("password")
        field = self.field("Password")
        self.assert_focus(lambda: field)
        self.press("Open")  # an empty field is not sent
        self.assertNotIn("wrong", self.text())
        field.send_keys("guess", Keys.ENTER)
        self.assert_says("The password is wrong")
        self.assert_rendered()
        self.picture("password-wrong")
        field = self.field("Password")
        self.assert_focus(lambda: field)
        field.send_keys("tëa")
        self.press("Open")
        self.assert_file_arrives()

    def test_account_link(self):
        link = make_file_link(FILE, protect_type="user", protect_groups=["administrators"])
        self.open("/sharing/" + link)
        self.assert_rendered()
        self.picture("account")
        self.assert_focus(lambda: self.field("Account name"))
        self.field("Account name").send_keys("bob")
        self.field("Account password").send_keys("bob-secret", Keys.ENTER)
        self.assert_says("This link is not for that account")
        self.picture("account-refused")
        name = self.field("Account name")
        self.assertEqual(name.get_attribute("value"), "bob")
        self.assert_focus(lambda: self.field("Account password"))
        name.clear()
        name.send_keys("carol")
        self.field("Account password").send_keys("carol-secret")
        self.press("Open")
        self.assert_file_arrives()
        # The browser keeps the page; going to the link again needs no form.
        self.open("/sharing/" + link)
        self.assert_file_arrives()

    def test_hostile_title(self):
        title = "<script>document.title='broken'</script><img src=x onerror=\"document.title='b'\">"
        self.open("/sharing/" + make_file_link(FILE, protect_title=title))
        self.assert_heading(title)
        self.assertEqual(self.browser.title, title)
        self.assertEqual(self.browser.find_elements(By.TAG_NAME, "img"), [])
        self.assert_rendered()

    def test_pages_without_a_form(self):
        used_up = make_file_link(FILE, expire_times=1, use_count=1)
        for path, heading in (("/sharing/no-such-link", "This link does not open"),
                              ("/sharing/" + used_up, "This link is used up")):
            self.open(path)
            self.assert_heading(heading)
            self.assert_rendered()
            self.assertEqual(self.browser.find_elements(By.TAG_NAME, "form"), [])
        self.picture("used-up")

    def test_other_application_and_logout(self):
        link = make_link(project_name="album", protect_title="Pictures")
        self.open("/sharing/" + link)
        self.press("Open")
        self.assert_heading("The link is open")
        self.assert_rendered()
        self.picture("other-application")
        self.browser.find_element(By.LINK_TEXT, "Log out of this link").click()
        self.assert_heading("Log out of this link?")
        self.picture("logout")
        self.press("Log out")
        self.assert_heading("You are logged out")
        self.assert_rendered()
        self.picture("logged-out")
        self.browser.find_element(By.LINK_TEXT, "Back to the link").click()
        self.assert_heading("Pictures")
        self.assert_says("not, or no longer, admitted")

    def test_expired_access(self):
        link = make_link(project_name="album")
        self.open("/sharing/" + link)
        self.press("Open")
        self.assert_heading("The link is open")
        sql("UPDATE token SET timeout=1")
        self.open("/sharing/" + link)
        self.assert_says("Your access has expired")
        self.press("Open")
        self.assert_heading("The link is open")

    def test_redirect_to_another_site(self):
        with OtherSite() as site:
            link = make_link(redirect_type="always", redirect_uri=site.address)
            self.open("/sharing/" + link)
            self.assert_rendered()
            self.press("Open")
            self.assert_arrives_at(site.address)
            self.wait_for(lambda: self.browser.title, lambda seen: seen == "Elsewhere")
            self.assertEqual(site.referrers, [None])

    def test_redirect_by_parameter_survives_the_form(self):
        link = make_file_link(FILE, redirect_type="url_param", redirect_uri="/sharing/elsewhere",
                              protect_type="password", password="x")
        self.open("/sharing/" + link + "?redirect=1")
        self.field("Password").send_keys("x", Keys.ENTER)
        self.assert_arrives_at(f"http://127.0.0.1:{SERVER.port}/sharing/elsewhere")

    def test_narrow_screen(self):
        self.set_size(360, 640)
        link = make_file_link(FILE, protect_type="password", password="x",
                              protect_title="Averyveryverylongwordwithoutanyblankinit" * 3)
        self.open("/sharing/" + link)
        self.picture("narrow")
        self.assertTrue(self.fits_width())


class OtherSite:
    """A web server of another origin."""

    def __enter__(self):
        site = self
        self.referrers = []

        class Handler(http.server.BaseHTTPRequestHandler):
            def do_GET(self):
                if self.path == "/page":
                    site.referrers.append(self.headers["Referer"])
                self.send_response(200)
                self.send_header("Content-Type", "text/html")
                self.end_headers()
                self.wfile.write(b"<title>Elsewhere</title>")

            def log_message(self, *_):
                pass

        self.server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Handler)
        self.address = f"http://127.0.0.1:{self.server.server_port}/page"
        threading.Thread(target=self.server.serve_forever, daemon=True).start()
        return self

    def __exit__(self, *_):
        self.server.shutdown()
        self.server.server_close()


def main():
    global SERVER
    os.environ["HOME"] = "/tmp"
    vs.install(sys.argv[1], sys.argv[2])
    os.mkdir("/tmp/shared", 0o755)
    with open(FILE, "wb") as file:
        file.write(CONTENT)
    with vs.WebServer() as SERVER:
        return browser.run_tests()


if __name__ == "__main__":
    sys.exit(main())
