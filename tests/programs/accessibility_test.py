"""Every page in every state, looked at by axe-core in a real browser: no violation of WCAG 2.2 A
and AA or of axe's best practices, nor, in dark colours, of the rules about colours. Arguments: the build folder, the project's folder.
Skipped without axe-core, which scripts/test fetches (scripts/lib/axe.sh)."""

import os
import sys

import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import FILE, PHONE, WIDE, OwnerTest, make_link, make_links

AXE = "build/tools/node_modules/axe-core/axe.min.js"  # from the project's folder
LOOK = """
const [rules, done] = arguments;
axe.run(document, {runOnly: rules, resultTypes: ["violations"]})
    .then((found) => done({
      version: axe.version,
      passes: found.passes.length,
      violations: found.violations.flatMap((violation) => violation.nodes.map((node) =>
          `${violation.id}: ${node.target.join(" ")}: ${node.failureSummary}`)),
    }), (error) => done({passes: 0, violations: [String(error)]}));
"""
ALL = ["wcag2a", "wcag2aa", "wcag21a", "wcag21aa", "wcag22aa", "best-practice"]
COLOURS = {"type": "rule", "values": ["color-contrast"]}  # all that depends on the scheme


class AccessibilityTest(OwnerTest):
    axe = ""

    def assert_accessible(self, state):
        """In both schemes."""
        for scheme, rules, least in ("light", ALL, 6), ("dark", COLOURS, 1):
            with self.subTest(state=state, scheme=scheme):
                self.set_scheme(scheme)
                # Colours that are still on their way would be measured on the way.
                self.browser.execute_script(
                    "document.getAnimations().forEach((animation) => animation.finish())")
                seen = self.look(rules)
                self.assertEqual(seen["violations"], [])
                self.assertGreaterEqual(seen["passes"], least)

    def look(self, rules):
        """The script comes in through the browser's driver, which the pages' policy does not
        concern; once is enough for a page."""
        if not self.browser.execute_script("return Boolean(window.axe)"):
            self.browser.execute_script(self.axe)
        return self.browser.execute_async_script(LOOK, rules)


class Checker(AccessibilityTest):
    """A check that finds nothing anywhere proves nothing."""

    def test_finds_what_is_wrong(self):
        self.sign_in()
        self.browser.execute_script(
            "document.querySelector('label[for=filter-search]').remove();"
            "for (const name of ['placeholder', 'aria-describedby'])"
            "  document.getElementById('filter-search').removeAttribute(name);"
            "document.getElementById('count').style.color = '#888'")
        found = {violation.split(":")[0] for violation in self.look(ALL)["violations"]}
        self.assertEqual(found, {"label", "color-contrast"})
        found = {violation.split(":")[0] for violation in self.look(COLOURS)["violations"]}
        self.assertEqual(found, {"color-contrast"})


class OwnersPage(AccessibilityTest):
    def fill_list(self):
        make_links(
            {"protect_title": "Our trip to the coast", "expire_times": 10, "use_count": 3},
            {"protect_type": "password", "password": "tea", "expire_at": 2130000000},
            {"protect_type": "user", "protect_users": ["bob"], "start_at": 2130000000},
            {"protect_title": "Off", "enabled": False}, {"protect_title": "\u200b"},
            {"project_name": "album", "app": {}, "expire_times": 3, "use_count": 3},
            {"expire_at": 1700000000})

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
                  Ends="2037-01-01T00:00", Begins="2037-02-01T00:00", Title="x" * 300)
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
        self.assert_text("ended-count", "none")
        self.assert_accessible("no ended links")
        self.field("Only of the owner").send_keys(Keys.CONTROL + "a", Keys.NULL, Keys.BACKSPACE)
        self.assert_text("ended-yes", "Remove 2 links of everybody")
        self.assert_accessible("ended links")

    def fail(self, method):
        """The next request of this method fails inside."""
        self.replace(method, "return new Response('{\"success\": false, \"error\": "
                     "{\"code\": 100, \"message\": \"the request failed\"}}')")

    def test_failures_in_dialogs(self):
        self.fill_list()
        self.sign_in()
        self.watch()
        self.fail("create")
        self.new_link(File=FILE)
        self.press_in("link", "Create link")
        self.assert_text("link-summary", "The request failed")
        self.assert_accessible("form refused")
        self.press_in("link", "Cancel")
        self.dialog("question")
        self.assert_accessible("discard?")
        self.press_in("question", "Discard")
        self.assert_no_dialog()
        self.fail("delete")
        self.act("Our trip to the coast", "remove")
        self.press_in("question", "Delete")
        self.assert_text("question-problem", "The request failed")
        self.assert_accessible("question refused")
        self.press_in("question", "Cancel")
        self.assert_no_dialog()
        self.fail("sessions")
        self.act("Our trip to the coast", "visitors")
        self.assert_text("visitors-count", "The request failed")
        self.assert_accessible("visitors not told")
        self.press_in("visitors", "Close")
        self.assert_no_dialog()
        self.press("Remove ended links…")
        self.assert_text("ended-yes", "Remove 2 links of yours")
        self.fail("delete_expired")
        self.press_in("ended", "Remove 2 links of yours")
        self.assert_text("ended-problem", "The request failed")
        self.assert_accessible("ended links refused")

    def test_address_without_a_qr_code(self):
        self.fill_list()
        self.sign_in()
        self.watch()
        self.replace("get", "const answer = await response.json(); answer.data.url = ''; "
                     "answer.data.qr_svg = ''; return new Response(JSON.stringify(answer))")
        self.act("Our trip to the coast", "qr")
        self.dialog("address")
        self.assert_accessible("guessed address")

    def test_mistake_in_a_filter(self):
        self.sign_in("carol")
        self.field("Owner").send_keys("nobody-of-that-name")
        self.assert_error("Owner", "account")
        self.assert_accessible("filter")

    def test_no_usable_answer(self):
        self.sign_in()
        self.watch()
        self.break_off("list")
        self.field("Search").send_keys("x")
        self.assert_says("The server gives no usable answer")
        self.assert_accessible("no usable answer")

    def test_visitors_of_a_link(self):
        link = make_link(protect_title="One")
        self.sign_in()
        self.go(f"http://127.0.0.1:{self.server.port}/sharing/{link}")
        self.press("Open")
        self.downloaded()
        self.open_page()
        self.act("One", "visitors")
        self.wait_for(lambda: self.dialog("visitors").text, lambda seen: "127.0.0.1" in seen)
        self.assert_accessible("visitors")
        self.press_in("visitors", "Sign everyone out…")
        self.dialog("question")
        self.assert_accessible("sign everyone out?")

    def test_server_out_of_reach(self):
        self.sign_in()
        self.browser.execute_cdp_cmd("Network.emulateNetworkConditions", {
            "offline": True, "latency": 0, "downloadThroughput": -1, "uploadThroughput": -1})
        self.field("Search").send_keys("x")
        self.assert_says("The server cannot be reached")
        self.assert_accessible("out of reach")


class VisitorsPages(AccessibilityTest):
    def open(self, path):
        self.go(f"http://127.0.0.1:{self.server.port}{path}")

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
        self.open("/sharing/" + make_link(protect_title="\u200b"))
        self.assert_heading("Shared link")
        self.assert_accessible("blank title")

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
        vs.sql("UPDATE token SET timeout=1")
        self.open("/sharing/" + link)
        self.assert_says("Your access has expired")
        self.assert_accessible("expired access")
        self.press("Open")
        self.assert_heading("The link is open")
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
        self.assert_heading("The file is no longer there")
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
    path = os.path.join(sys.argv[2], AXE)
    if not os.path.exists(path):
        vs.skip(f"axe-core is not at {AXE}: scripts/test says why it could not be fetched")
    with open(path) as file:
        AccessibilityTest.axe = file.read()
    return owner_page.run()


if __name__ == "__main__":
    sys.exit(main())
