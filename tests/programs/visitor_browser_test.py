"""The visitor's pages in a real browser. Arguments: the build folder, the project's folder. With
TUVO_SCREENSHOTS set to a folder, a picture of every page is left there."""

import http.server
import os
import socket
import sys
import tempfile
import threading
import time
import unittest

import visitor_server as vs
from visitor_server import make_file_link, make_link, sql

CHROMIUM = "/usr/bin/chromium"
DRIVER = "/usr/bin/chromedriver"
for needed, package in (CHROMIUM, "chromium"), (DRIVER, "chromium-driver"):
    if not os.path.exists(needed):
        vs.skip(f"the package {package} is missing")
try:
    from selenium import webdriver
    from selenium.common.exceptions import WebDriverException
    from selenium.webdriver.chrome.service import Service
    from selenium.webdriver.common.by import By
    from selenium.webdriver.common.keys import Keys
except ImportError:
    vs.skip("the package python3-selenium is missing")

# The browser and its driver talk to each other by that name.
try:
    socket.getaddrinfo("localhost", 80)
except OSError:
    vs.skip("the name localhost is not known here: no /etc/hosts")

SERVER = None
FILE = "/tmp/shared/Übersicht 2024.txt"
CONTENT = os.urandom(400000)
DOWNLOADS = "/tmp/downloads"
FLAGS = ("--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
         "--disable-background-networking", "--disable-component-update", "--disable-sync",
         "--host-resolver-rules=MAP * ~NOTFOUND, EXCLUDE 127.0.0.1", "--no-proxy-server",
         "--window-size=800,640")


class BrowserTest(unittest.TestCase):
    def setUp(self):
        self.profile = tempfile.TemporaryDirectory(ignore_cleanup_errors=True)
        self.addCleanup(self.profile.cleanup)
        os.makedirs(DOWNLOADS, exist_ok=True)
        options = webdriver.ChromeOptions()
        options.binary_location = CHROMIUM
        for flag in FLAGS + ("--user-data-dir=" + self.profile.name,):
            options.add_argument(flag)
        options.add_experimental_option("prefs", {"download.default_directory": DOWNLOADS,
                                                  "download.prompt_for_download": False})
        options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
        self.browser = webdriver.Chrome(service=Service(DRIVER), options=options)
        self.addCleanup(self.browser.quit)
        self.browser.set_page_load_timeout(60)

    def open(self, path):
        self.browser.get(f"http://127.0.0.1:{SERVER.port}{path}")

    def picture(self, name):
        folder = os.environ.get("TUVO_SCREENSHOTS")
        if folder:
            self.browser.save_screenshot(os.path.join(folder, name + ".png"))

    def wait_for(self, look, wanted):
        """A pressed button or link returns before the next page is there."""
        seen = None
        for _ in range(200):
            try:
                seen = look()
                if wanted(seen):
                    return
            except WebDriverException:
                pass  # between two pages
            time.sleep(0.05)
        self.fail(f"the browser ends up with: {seen}")

    def text(self):
        return self.browser.find_element(By.TAG_NAME, "main").text

    def assert_heading(self, text):
        self.wait_for(lambda: self.browser.find_element(By.TAG_NAME, "h1").text,
                      lambda seen: seen == text)

    def assert_says(self, text):
        self.wait_for(self.text, lambda seen: text in seen)

    def assert_arrives_at(self, address):
        self.wait_for(lambda: self.browser.current_url, lambda seen: seen == address)

    def field(self, label):
        """By its label, as a person finds it."""
        element = self.browser.find_element(By.XPATH, f"//label[.='{label}']")
        return self.browser.find_element(By.ID, element.get_attribute("for"))

    def has_focus(self, element):
        return self.browser.switch_to.active_element == element

    def press(self, button):
        self.browser.find_element(By.XPATH, f"//button[.='{button}']").click()

    def assert_rendered(self):
        """The style was let through, and nothing was refused by the pages' policy."""
        radius = self.browser.execute_script(
            "return getComputedStyle(document.querySelector('main')).borderTopLeftRadius")
        self.assertEqual(radius, "12px")
        complaints = [entry["message"] for entry in self.browser.get_log("browser")
                      if "Security Policy" in entry["message"]]
        self.assertEqual(complaints, [])

    def downloaded(self):
        for _ in range(200):
            names = os.listdir(DOWNLOADS)
            # The browser writes under a hidden name, then under one of its own, before the file's.
            if names and not any(name.startswith(".") or name.endswith(".crdownload")
                                 for name in names):
                path = os.path.join(DOWNLOADS, names[0])
                with open(path, "rb") as file:
                    content = file.read()
                os.unlink(path)
                return names[0], content
            time.sleep(0.05)
        self.fail("nothing was downloaded; the page says: " + self.text())

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
        self.browser.switch_to.active_element.send_keys(Keys.ENTER)  # the button has the focus
        self.assert_file_arrives()

    def test_password_link(self):
        link = make_file_link(FILE, protect_type="password", password="tëa", protect_title="Report")
        self.open("/sharing/" + link)
        self.assert_rendered()
        self.picture("password")
        field = self.field("Password")
        self.assertTrue(self.has_focus(field))
        self.press("Open")  # an empty field is not sent
        self.assertNotIn("wrong", self.text())
        field.send_keys("guess", Keys.ENTER)
        self.assert_says("The password is wrong")
        self.assert_rendered()
        self.picture("password-wrong")
        field = self.field("Password")
        self.assertTrue(self.has_focus(field))
        field.send_keys("tëa")
        self.press("Open")
        self.assert_file_arrives()

    def test_account_link(self):
        link = make_file_link(FILE, protect_type="user", protect_groups=["administrators"])
        self.open("/sharing/" + link)
        self.assert_rendered()
        self.picture("account")
        self.assertTrue(self.has_focus(self.field("Account name")))
        self.field("Account name").send_keys("bob")
        self.field("Account password").send_keys("bob-secret", Keys.ENTER)
        self.assert_says("This link is not for that account")
        self.picture("account-refused")
        name = self.field("Account name")
        self.assertEqual(name.get_attribute("value"), "bob")
        self.assertTrue(self.has_focus(self.field("Account password")))
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
            self.assertEqual(self.browser.title, "Elsewhere")
            self.assertEqual(site.referrers, [None])

    def test_redirect_by_parameter_survives_the_form(self):
        link = make_file_link(FILE, redirect_type="url_param", redirect_uri="/sharing/elsewhere",
                              protect_type="password", password="x")
        self.open("/sharing/" + link + "?redirect=1")
        self.field("Password").send_keys("x", Keys.ENTER)
        self.assert_arrives_at(f"http://127.0.0.1:{SERVER.port}/sharing/elsewhere")

    def test_narrow_screen(self):
        self.browser.set_window_size(360, 640)
        link = make_file_link(FILE, protect_type="password", password="x",
                              protect_title="Averyveryverylongwordwithoutanyblankinit" * 3)
        self.open("/sharing/" + link)
        self.picture("narrow")
        self.assertFalse(self.browser.execute_script(
            "return document.documentElement.scrollWidth > window.innerWidth"))


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
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
