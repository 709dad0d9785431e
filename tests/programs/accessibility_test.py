"""Every page in every state, looked at by axe-core in a real browser: no violation of WCAG 2.2 A
and AA or of axe's best practices, in light and dark. Arguments: the build folder, the project's folder.
Skipped without axe-core, which scripts/test fetches (scripts/lib/axe.sh)."""

import os
import sys
import unittest

import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import FILE, PHONE, WIDE, OwnerPage, make_link

AXE = "build/tools/node_modules/axe-core/axe.min.js"  # from the project's folder
SERVER = None
LOOK = """
const done = arguments[0];
axe.run(document, {runOnly: ["wcag2a", "wcag2aa", "wcag21a", "wcag21aa", "wcag22aa",
                             "best-practice"]})
    .then((found) => done({
      version: axe.version,
      passes: found.passes.length,
      violations: found.violations.flatMap((violation) => violation.nodes.map((node) =>
          `${violation.id}: ${node.target.join(" ")}: ${node.failureSummary}`)),
    }), (error) => done({passes: 0, violations: [String(error)]}));
"""


class AccessibilityTest(OwnerPage, unittest.TestCase):
    axe = ""

    def setUp(self):
        owner_page.forget()
        self.server = SERVER
        self.start()
        self.addCleanup(self.quit)

    def assert_accessible(self, state):
        """In both schemes. The script comes in through the browser's driver, which the pages'
        policy does not concern."""
        for scheme in "light", "dark":
            with self.subTest(state=state, scheme=scheme):
                self.set_scheme(scheme)
                # Colours that are still on their way would be measured on the way.
                self.browser.execute_script(
                    "document.getAnimations().forEach((animation) => animation.finish())")
                self.browser.execute_script(self.axe)
                seen = self.browser.execute_async_script(LOOK)
                self.assertEqual(seen["violations"], [])
                self.assertGreater(seen["passes"], 5)


class Checker(AccessibilityTest):
    """A check that finds nothing anywhere proves nothing."""

    def test_finds_what_is_wrong(self):
        self.sign_in()
        self.browser.execute_script(
            "document.querySelector('label[for=filter-search]').remove();"
            "document.getElementById('filter-search').removeAttribute('placeholder');"
            "document.getElementById('count').style.color = '#888'")
        self.browser.execute_script(self.axe)
        seen = self.browser.execute_async_script(LOOK)
        found = {violation.split(":")[0] for violation in seen["violations"]}
        self.assertEqual(found, {"label", "color-contrast"})


class OwnersPage(AccessibilityTest):
    def fill_list(self):
        make_link(protect_title="Our trip to the coast", expire_times=10, use_count=3)
        make_link(protect_type="password", password="tea", expire_at=2000000000)
        make_link(protect_type="user", protect_users=["bob"], start_at=2100000000)
        make_link(protect_title="Off", enabled=False)
        vs.make_link(project_name="album", expire_times=3, use_count=3)
        make_link(expire_at=1700000000)

    def test_list(self):
        self.fill_list()
        self.sign_in()
        self.assert_accessible("list")
        self.act("Our trip to the coast", "toggle")
        self.assert_notice("is disabled")
        self.assert_accessible("notice")
        self.field("Search").send_keys("nothing is called so")
        self.assert_count("0 links")
        self.assert_accessible("nothing found")
        self.sign_in("carol")
        self.assert_accessible("administrator")

    def test_phone(self):
        self.fill_list()
        self.sign_in("carol")
        self.set_size(*PHONE)
        self.assert_accessible("cards")
        self.press("New link")
        self.dialog("link")
        self.assert_accessible("form")

    def test_empty_list(self):
        self.sign_in()
        self.assert_accessible("empty list")

    def test_form(self):
        self.sign_in("carol")
        self.set_size(WIDE[0], 2400)  # all of it at once
        self.new_link()
        self.assert_accessible("form")
        self.show_more()
        self.select("Redirect", "Always")
        for choice in "With_a_password", "Certain_accounts":
            self.fill(**{choice: True})
            self.assert_accessible(choice)
        self.fill(Project="album", Application_data="{", Uses_allowed="x", Private_data="[]",
                  Ends="2030-01-01T00:00", Begins="2031-01-01T00:00", Title="x" * 300)
        self.press_in("link", "Create link")
        self.assert_error("Uses allowed", "number")
        self.assert_accessible("mistakes")

    def test_dialogs(self):
        self.fill_list()
        self.sign_in("carol")
        for action, dialog in ("qr", "address"), ("remove", "question"), ("visitors", "visitors"):
            self.act("Our trip to the coast", action)
            self.dialog(dialog)
            self.assert_accessible(dialog)
            self.dialog(dialog).find_element(By.CSS_SELECTOR, "[data-close]").click()
            self.assert_no_dialog()
        self.press("Remove ended links…")
        self.wait_for(lambda: self.dialog("ended").text, lambda seen: "Now" in seen or
                      "none" in seen)
        self.assert_accessible("ended")

    def test_visitors_of_a_link(self):
        link = make_link(protect_title="One")
        self.sign_in()
        self.go(f"http://127.0.0.1:{SERVER.port}/sharing/{link}")
        self.press("Open")
        self.downloaded()
        self.open_page()
        self.act("One", "visitors")
        self.wait_for(lambda: self.dialog("visitors").text, lambda seen: "127.0.0.1" in seen)
        self.assert_accessible("visitors")

    def test_server_out_of_reach(self):
        self.sign_in()
        self.browser.execute_cdp_cmd("Network.emulateNetworkConditions", {
            "offline": True, "latency": 0, "downloadThroughput": -1, "uploadThroughput": -1})
        self.field("Search").send_keys("x")
        self.assert_says("The server cannot be reached")
        self.assert_accessible("out of reach")


class VisitorsPages(AccessibilityTest):
    def open(self, path):
        self.go(f"http://127.0.0.1:{SERVER.port}{path}")

    def test_forms(self):
        self.open("/sharing/" + make_link(protect_title="Our trip"))
        self.assert_accessible("open")
        self.open("/sharing/" + make_link(protect_type="password", password="x"))
        self.assert_accessible("password")
        self.field("Password").send_keys("guess", Keys.ENTER)
        self.assert_says("wrong")
        self.assert_accessible("wrong password")
        self.open("/sharing/" + make_link(protect_type="user", protect_users=["bob"]))
        self.assert_accessible("account")
        self.field("Account name").send_keys("alice")
        self.field("Account password").send_keys("alice-secret", Keys.ENTER)
        self.assert_says("not for that account")
        self.assert_accessible("wrong account")

    def test_notices(self):
        self.open("/sharing/no-such-link")
        self.assert_accessible("not open")
        self.open("/sharing/" + make_link(expire_times=1, use_count=1))
        self.assert_accessible("used up")
        link = vs.make_link(project_name="album", protect_title="Pictures")
        self.open("/sharing/" + link)
        self.press("Open")
        self.assert_heading("The link is open")
        self.assert_accessible("other application")
        self.open(f"/sharing/{link}/logout")
        self.assert_accessible("log out?")
        self.press("Log out")
        self.assert_heading("You are logged out")
        self.assert_accessible("logged out")
        vs.make_link(protect_title="Pictures")
        gone = make_link()
        vs.change_data(gone, app={"path": FILE + ".gone"})
        self.open("/sharing/" + gone)
        self.press("Open")
        self.wait_for(lambda: self.browser.find_elements(By.XPATH, "//button[.='Open']"),
                      lambda seen: seen == [])
        self.assert_accessible("file gone")

    def test_blocked_address(self):
        link = make_link(protect_type="password", password="x")
        for _ in range(11):
            self.open("/sharing/" + link)
            self.field("Password").send_keys("guess", Keys.ENTER)
            self.wait_for(self.text, lambda seen: "wrong" in seen or "oo many" in seen)
            if "oo many" in self.text():
                break
        self.assert_says("oo many")
        self.assert_accessible("blocked")


def main():
    global SERVER
    os.environ["HOME"] = "/tmp"
    path = os.path.join(sys.argv[2], AXE)
    if not os.path.exists(path):
        vs.skip(f"axe-core is not at {AXE}: scripts/test says why it could not be fetched")
    with open(path) as file:
        AccessibilityTest.axe = file.read()
    vs.install(sys.argv[1], sys.argv[2])
    owner_page.lay_out()
    with vs.WebServer() as SERVER:
        owner_page.configure(SERVER)
        return unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2, exit=False)


if __name__ == "__main__":
    sys.exit(0 if main().result.wasSuccessful() else 1)
