"""How the owner's page looks, on screens of every width and in both schemes.
Arguments: the build folder, the project's folder."""

import os
import sys
import unittest

import owner_page
import visitor_server as vs
from browser import By
from owner_page import FILE, FOLDER, PHONE, WIDE, ZOOMED, OwnerTest, make_link, make_links

SCREENS = ("phone", PHONE), ("zoomed", ZOOMED), ("wide", WIDE)


class Look(OwnerTest):
    def setUp(self):
        super().setUp()
        make_links(
            {"protect_title": "Our trip to the coast", "expire_times": 10, "use_count": 3},
            {"protect_title": "The summer report", "protect_type": "password", "password": "tea",
             "expire_at": 2130000000},
            {"protect_title": "For colleagues", "protect_type": "user", "protect_users": ["bob"],
             "start_at": 2130000000},
            {"protect_title": "Averyveryverylongwordwithoutanyblankinit" * 5, "enabled": False},
            {"project_name": "album", "app": {}, "protect_title": "Pictures", "expire_times": 3,
             "use_count": 3},
            {"protect_title": "Last year’s plan", "expire_at": 1700000000})

    def tearDown(self):
        self.assert_own_host_alone()

    @unittest.skipUnless(os.environ.get("TUVO_SCREENSHOTS"), "TUVO_SCREENSHOTS is not set")
    def test_pictures_of_the_guide(self):
        """Those of docs/images, kept with the names they have there."""
        vs.sql("DELETE FROM entry")
        for path, members in (
                ("minutes.pdf", {"expire_at": 1790000000}),
                ("plans/garden.zip", {"protect_title": "The new garden", "enabled": False}),
                ("talks/slides.pdf", {"protect_title": "Slides of the talk", "expire_times": 50,
                                      "use_count": 12, "start_at": 2130000000}),
                ("reports/summer.pdf", {"protect_title": "The summer report", "password": "x",
                                        "protect_type": "password", "expire_at": 2130000000}),
                ("pictures/coast.zip", {"protect_title": "Our trip to the coast",
                                        "expire_times": 10, "use_count": 3})):
            vs.make_file_link(FOLDER + "/" + path, **members)
        self.sign_in()
        self.set_size(1260, 620)
        self.picture("owner-page")
        self.edit("Our trip to the coast")
        self.set_size(800, 700)
        self.picture("owner-form")
        self.press_in("link", "Cancel")
        self.assert_no_dialog()
        self.set_size(560, 620)
        self.act("The summer report", "qr")
        self.dialog("address")
        self.wait_for(lambda: self.browser.find_elements(By.CSS_SELECTOR, "#address-dialog svg, "
                                                         "#address-dialog img"),
                      lambda seen: seen and seen[0].is_displayed())
        self.picture("owner-qr")
        self.press_in("address", "Close")
        self.assert_no_dialog()
        self.set_scheme("dark")
        self.set_size(360, 800)
        self.picture("owner-phone")
        self.set_scheme("light")
        self.set_size(560, 420)
        vs.sql("UPDATE entry SET hash='summer' WHERE data LIKE '%summer.pdf%'")
        self.go(f"http://127.0.0.1:{self.server.port}/sharing/summer")
        self.picture("visitor-login")
        self.pictures_of_visitors_pages()

    def pictures_of_visitors_pages(self):
        """Those without a password."""
        link = vs.make_file_link(FOLDER + "/pictures/coast.zip", protect_title="Our trip to the coast")
        accounts = vs.make_file_link(FOLDER + "/reports/summer.pdf", protect_type="user",
                                     protect_title="The summer report", protect_users=["alice"])
        used_up = vs.make_file_link(FILE, expire_times=1, use_count=1)
        album = vs.make_link(project_name="album", protect_title="Our trip to the coast")
        for name, path, heading in (
                ("visitor-open", link, "Our trip to the coast"),
                ("visitor-account", accounts, "The summer report"),
                ("visitor-used-up", used_up, "This link is used up"),
                ("visitor-unknown", "nosuchlink", "This link does not open")):
            self.go(f"http://127.0.0.1:{self.server.port}/sharing/{path}")
            self.assert_heading(heading)
            self.picture(name)
        self.go(f"http://127.0.0.1:{self.server.port}/sharing/{album}")
        self.press("Open")
        self.assert_heading("The link is open")
        self.picture("visitor-other-application")
        self.browser.find_element(By.LINK_TEXT, "Log out of this link").click()
        self.assert_heading("Log out of this link?")
        self.picture("visitor-logout")
        self.press("Log out")
        self.assert_heading("You are logged out")
        self.picture("visitor-logged-out")

    def fits_everywhere(self, name):
        """A dialog that is open, on every kind of screen."""
        for screen, size in SCREENS:
            self.set_size(*size)
            with self.subTest(dialog=name, screen=screen):
                self.assertTrue(self.dialog_fits(name.split("-")[0]))
                self.picture(f"owner-{screen}-{name}")

    def test_dialogs_fit_everywhere(self):
        self.set_scheme("dark")
        self.sign_in("carol")
        self.press("New link")
        self.dialog("link")
        self.show_more()
        self.select("Redirect", "Always")
        self.fill(Certain_accounts=True)
        self.fits_everywhere("link")
        self.press_in("link", "Create link")
        self.wait_for(self.summary, lambda seen: seen != "")
        self.fits_everywhere("link-mistakes")
        self.press_in("link", "Cancel")
        self.fits_everywhere("question-discard")
        self.press_in("question", "Discard")
        self.assert_no_dialog()
        for action, dialog in ("qr", "address"), ("visitors", "visitors"), ("remove", "question"):
            self.act("Our trip to the coast", action)
            self.dialog(dialog)
            self.fits_everywhere(dialog)
            self.dialog(dialog).find_element(By.CSS_SELECTOR, "[data-close]").click()
            self.assert_no_dialog()
        self.press("Remove ended links…")
        self.dialog("ended")
        self.fits_everywhere("ended")

    def dialog_fits(self, name):
        return self.browser.execute_script(
            "const box = arguments[0].getBoundingClientRect();"
            "return arguments[0].scrollWidth <= arguments[0].clientWidth && box.left >= 0 && "
            "box.right <= window.innerWidth && box.bottom <= window.innerHeight",
            self.dialog(name))

    def test_every_width(self):
        vs.make_link(project_name="p" * 64, protect_title="x" * 255, start_at=2130000000,
                     expire_at=2130000001, use_count=2147483646, expire_times=2147483647)
        vs.sql("UPDATE entry SET hash=? WHERE project_name='album'", "h" * 64)
        self.sign_in("carol")
        for width in 320, 360, 480, 600, 768, 900, 1024, 1200, 1216, 1232, 1280, 1440, 1920:
            self.set_size(width, 900)
            with self.subTest(width=width):
                self.assertEqual(self.too_wide(), [])
                self.picture(f"owner-width-{width}")
        self.assertFalse(self.cards())
        self.set_size(1024, 900)
        self.assertTrue(self.cards())

    def too_wide(self):
        """What makes the page scroll sideways."""
        return self.browser.execute_script(
            "const width = document.documentElement.clientWidth;"
            "return document.documentElement.scrollWidth <= width ? [] :"
            "    [...document.querySelectorAll('body *')]"
            "        .filter((element) => element.getBoundingClientRect().right > width)"
            "        .map((element) => element.tagName + '.' + element.className + '#' + element.id"
            "            + ': ' + element.textContent.slice(0, 40))")

    def cards(self):
        return self.style("#rows tr", "display") == "block"

    def test_light_and_dark(self):
        grounds = set()
        for scheme in "light", "dark":
            self.set_scheme(scheme)
            self.sign_in()
            self.picture("owner-" + scheme)
            grounds.add(self.style("body", "backgroundColor"))
        self.assertEqual(len(grounds), 2)

    def test_no_motion_for_those_who_want_none(self):
        self.sign_in()
        self.assertNotEqual(self.style("#new-link", "transitionDuration"), "0s")
        self.browser.execute_cdp_cmd("Emulation.setEmulatedMedia", {
            "features": [{"name": "prefers-reduced-motion", "value": "reduce"}]})
        self.assertEqual(self.style("#new-link", "transitionDuration"), "0s")

    def test_visitors_pages_look_alike(self):
        link = make_link(protect_type="password", password="x")
        for scheme in "light", "dark":
            self.set_scheme(scheme)
            self.sign_in()
            own = [self.style("body", "backgroundColor"), self.style("body", "color"),
                   self.style("#links", "backgroundColor"), self.style("#links", "borderRadius"),
                   self.style("#new-link", "backgroundColor"), self.style("body", "fontFamily")]
            self.go(f"http://127.0.0.1:{self.server.port}/sharing/{link}")
            theirs = [self.style("body", "backgroundColor"), self.style("body", "color"),
                      self.style("main", "backgroundColor"), self.style("main", "borderRadius"),
                      self.style("button", "backgroundColor"), self.style("body", "fontFamily")]
            self.assertEqual(own, theirs, scheme)
            self.picture("visitor-" + scheme)


if __name__ == "__main__":
    sys.exit(owner_page.run())
