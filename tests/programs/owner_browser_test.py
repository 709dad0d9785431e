"""The owner's page in a real browser, in front of the real web server and web API, and the pages of
the links that are made with it. Arguments: the build folder, the project's folder."""

import contextlib
import os
import re
import sys
import unittest

import browser
import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import (CONTENT, FILE, FOLDER, OUTSIDE, PHONE, WIDE, ZOOMED, OwnerPage, make_link,
                        make_links)

SERVER = None
FORGED = "<script>document.title='broken'</script><img src=x onerror=\"document.title='b'\">"
SCREENS = ("phone", PHONE), ("zoomed", ZOOMED), ("wide", WIDE)
OTHER_SCRIPTS = "Zürich 東京 \U0001f30d"


class Visitor(browser.Browser):
    """Somebody else, in a browser that has been nowhere yet."""

    def open(self, path):
        self.go(f"http://127.0.0.1:{SERVER.port}{path}")

    def assert_file_arrives(self):
        name, content = self.downloaded()
        assert name == os.path.basename(FILE), name
        assert content == CONTENT


class OwnerTest(OwnerPage, unittest.TestCase):
    def setUp(self):
        owner_page.forget()
        self.server = SERVER
        self.start()
        self.addCleanup(self.quit)

    def assert_own_host_alone(self):
        """Whatever a test did, nothing but the own server was asked, and the page's policy had
        nothing to refuse."""
        self.assertEqual(self.hosts(), {f"127.0.0.1:{SERVER.port}"})
        self.assertEqual(self.policy_complaints(), [])


class Creating(OwnerTest):
    """One link of each kind, and a visitor for it."""

    def setUp(self):
        super().setUp()
        self.sign_in()

    def tearDown(self):
        self.assert_own_host_alone()

    def test_open_file(self):
        self.new_link(File=FILE, Title="Our trip to the coast")
        path = self.create()
        self.assert_cell("Our trip to the coast", "State", "Live")
        self.assert_cell("Our trip to the coast", "Uses", "0, no limit")
        with Visitor() as visitor:
            visitor.open(path)
            visitor.assert_heading("Our trip to the coast")
            visitor.press("Open")
            visitor.assert_file_arrives()
        self.reload()
        self.assert_cell("Our trip to the coast", "Uses", "1, no limit")

    def test_password(self):
        self.new_link(File=FILE, Title="Report", With_a_password=True, Password="tëa & <scones>")
        path = self.create()
        with Visitor() as visitor:
            visitor.open(path)
            visitor.field("Password").send_keys("guess", Keys.ENTER)
            visitor.assert_says("The password is wrong")
            visitor.field("Password").send_keys("tëa & <scones>", Keys.ENTER)
            visitor.assert_file_arrives()
            visitor.open(path + "/logout")
            visitor.press("Log out")
            visitor.assert_heading("You are logged out")
            visitor.open(path)
            visitor.field("Password")
        self.reload()
        self.assert_cell("Report", "Uses", "1, no limit")

    def test_accounts(self):
        self.new_link(File=FILE, Title="Colleagues", Certain_accounts=True, Users="bob",
                      Groups="administrators\n\n")
        path = self.create()
        with Visitor() as visitor:
            visitor.open(path)
            visitor.field("Account name").send_keys("alice")
            visitor.field("Account password").send_keys("alice-secret", Keys.ENTER)
            visitor.assert_says("This link is not for that account")
            for user in "bob", "carol":
                visitor.open(path + "/logout")
                visitor.press("Log out")
                visitor.assert_heading("You are logged out")
                visitor.open(path)
                visitor.field("Account name").send_keys(user)
                visitor.field("Account password").send_keys(user + "-secret", Keys.ENTER)
                visitor.assert_file_arrives()

    def test_limited_uses(self):
        self.new_link(File=FILE, Title="Once", Uses_allowed="1")
        path = self.create()
        self.assert_cell("Once", "Uses", "0 of 1")
        with Visitor() as visitor:
            visitor.open(path)
            visitor.press("Open")
            visitor.assert_file_arrives()
        with Visitor() as visitor:
            visitor.open(path)
            visitor.assert_heading("This link is used up")
        self.reload()
        self.assert_cell("Once", "Uses", "1 of 1")
        self.assert_cell("Once", "State", "Used up")

    def test_start_in_the_future(self):
        self.new_link(File=FILE, Title="Later", Begins="2037-02-01T08:00")
        path = self.create()
        self.assert_cell("Later", "State", "Not yet begun\nbegins 2037-02-01 08:00")
        with Visitor() as visitor:
            visitor.open(path)
            visitor.assert_heading("This link does not open")

    def test_end(self):
        self.new_link(File=FILE, Title="A week")
        self.press_in("link", "+7 days")
        self.create()
        self.assert_cell("A week", "Ends", "in 7 days")
        # Seven days by the clock on the wall, which may be an hour more or less.
        seconds = vs.sql("SELECT strftime('%s', expire_at, 'unixepoch', 'localtime') - "
                         "strftime('%s', 'now', 'localtime') FROM entry")[0][0]
        self.assertTrue(7 * 86400 - 120 <= seconds <= 7 * 86400 + 1, seconds)
        self.edit("A week")
        self.press_in("link", "Never")
        self.save()
        self.assert_cell("A week", "Ends", "No end")

    def test_redirect(self):
        self.new_link(File=FILE, Title="Elsewhere")
        self.show_more()
        self.select("Redirect", "Always")
        self.fill(Leads_to="/sharing/elsewhere")
        path = self.create()
        with Visitor() as visitor:
            visitor.open(path)
            visitor.press("Open")
            visitor.assert_arrives_at(f"http://127.0.0.1:{SERVER.port}/sharing/elsewhere")

    def test_other_project(self):
        self.new_link(Project="album", Title="Pictures", Application_data='{"album": [7, "ü"]}')
        self.show_more()
        self.fill(Private_data='{"key": "not shown"}', Last_part_of_the_address="my-pictures_1")
        self.assertEqual(self.create(), "/sharing/my-pictures_1")
        self.assert_cell("Pictures", "Project", "album")
        self.assertIn("not shown", vs.sql("SELECT data FROM entry")[0][0])
        with Visitor() as visitor:
            visitor.open("/sharing/my-pictures_1")
            visitor.press("Open")
            visitor.assert_heading("The link is open")

    def test_everything_else(self):
        self.new_link(File=FILE, Title="Plain", Enabled=False,
                      Bind_visitors_to_their_network_address=False,
                      Remove_the_link_by_itself_some_time_after_its_end=False, Uses_so_far="3")
        self.create()
        self.assertEqual(vs.sql("SELECT enabled, auto_gc, use_count, "
                                "json_extract(data, '$.enable_match_ip') FROM entry"),
                         [(0, 0, 3, 0)])
        self.edit("Plain")
        for label in ("Enabled", "Bind visitors to their network address",
                      "Remove the link by itself some time after its end"):
            self.assertFalse(self.field(label).is_selected(), label)

    def test_by_keyboard_alone(self):
        def tab_to(label):
            for _ in range(40):
                focused = self.browser.switch_to.active_element
                if label in (focused.text, focused.accessible_name):
                    return focused
                focused.send_keys(Keys.TAB)
            raise AssertionError("Tab does not lead to " + label)

        tab_to("New link").send_keys(Keys.ENTER)
        self.dialog("link")
        tab_to("File").send_keys(FILE)
        tab_to("Title").send_keys("By keys")
        tab_to("Anybody with the address").send_keys(Keys.ARROW_DOWN)  # the next choice
        tab_to("Password").send_keys("tea")
        tab_to("Ends")
        tab_to("+30 days").send_keys(Keys.SPACE)
        tab_to("Uses allowed").send_keys(Keys.CONTROL + "a" + Keys.NULL, "5")
        tab_to("Create link").send_keys(Keys.ENTER)
        self.dialog("address")
        self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
        self.assert_no_dialog()
        self.assert_focus(lambda: self.browser.find_element(By.ID, "new-link"))
        self.assert_cell("By keys", "Uses", "0 of 5")
        self.assert_cell("By keys", "Title", "With a password")
        self.assert_cell("By keys", "Ends", "in 30 days")

    def test_focus_stays_in_the_dialog(self):
        self.press("New link")
        dialog = self.dialog("link")
        for _ in range(60):
            self.browser.switch_to.active_element.send_keys(Keys.TAB)
            inside = self.browser.execute_script(
                "return arguments[0].contains(document.activeElement) || "
                "document.activeElement === document.body", dialog)  # the browser's own buttons
            self.assertTrue(inside)


class Mistakes(OwnerTest):
    def setUp(self):
        super().setUp()
        self.sign_in()

    def tearDown(self):
        self.assert_own_host_alone()

    def test_each_is_told_beside_its_field(self):
        self.new_link(Project="album", Application_data="[1]", Begins="2037-02-01T08:00",
                      Ends="2037-01-01T08:00", Uses_allowed="many", Uses_so_far="-1",
                      Title="x" * 256)
        self.show_more()
        self.fill(Last_part_of_the_address="a b", Private_data="{")
        self.select("Redirect", "Always")
        self.press_in("link", "Create link")
        for label, text in (("Application data", "not an object"), ("Ends", "behind the beginning"),
                            ("Uses allowed", "whole number"), ("Uses so far", "whole number"),
                            ("Title", "too long"), ("Last part of the address", "letters"),
                            ("Private data", "no JSON"), ("Leads to", "lead to")):
            self.assert_error(label, text)
        self.assertEqual(self.error_of("Project"), "")
        self.assert_text("link-summary", "8 fields need another look")
        self.assert_focus(lambda: self.field("Application data"))
        self.assertEqual(vs.sql("SELECT count(*) FROM entry"), [(0,)])
        self.picture("owner-mistakes")

    def test_a_hidden_field_is_opened_for_its_mistake(self):
        self.new_link(File=FILE)
        self.show_more()
        self.fill(Last_part_of_the_address="a b")
        self.show_more()  # closes it
        self.press_in("link", "Create link")
        self.assert_error("Last part of the address", "letters")
        self.assert_focus(lambda: self.field("Last part of the address"))

    def test_missing_file(self):
        self.new_link()
        self.press_in("link", "Create link")
        self.assert_error("File", "Which file")
        self.assert_focus(lambda: self.field("File"))

    def test_what_the_server_refuses(self):
        taken = make_link()
        self.new_link(File=OUTSIDE, Certain_accounts=True)
        self.press_in("link", "Create link")
        self.assert_error("Users", "somebody")
        self.fill(Users="nobody-of-that-name")
        self.press_in("link", "Create link")
        self.assert_error("Users", "knows")
        self.fill(Users="bob")
        self.press_in("link", "Create link")
        self.wait_for(lambda: self.error_of("File"), lambda seen: seen != "")
        self.assert_focus(lambda: self.field("File"))
        self.assertEqual(self.error_of("Users"), "")
        self.fill(File=FILE)
        self.show_more()
        self.fill(Last_part_of_the_address=taken)
        self.press_in("link", "Create link")
        self.assert_error("Last part of the address", "taken")
        self.fill(Last_part_of_the_address="not-taken")
        self.assertEqual(self.create(), "/sharing/not-taken")

    def test_an_error_of_no_field_is_told_above(self):
        link = make_link(protect_title="Gone")
        self.reload()
        self.edit("Gone", Title="Still there?")
        vs.sql("DELETE FROM entry WHERE hash=?", link)
        self.press_in("link", "Save")
        self.wait_for(self.summary, lambda seen: "does not exist any more" in seen)
        self.assertEqual(self.browser.find_element(By.ID, "link-summary").get_attribute("role"),
                         "alert")


class Listing(OwnerTest):
    def tearDown(self):
        self.assert_own_host_alone()

    def test_empty(self):
        self.sign_in()
        self.assert_count("0 links")
        self.assert_says("There are no links yet")
        self.assertFalse(self.browser.find_element(By.TAG_NAME, "table").is_displayed())

    def test_sorting_and_paging(self):
        make_links(*({"protect_title": f"Number {number}", "use_count": (number * 7) % 60}
                     for number in range(60)))
        self.sign_in()
        self.assert_count("60 links")
        self.assertEqual(len(self.rows()), 50)
        self.assert_says("Page 1 of 2")
        self.press("Next")
        self.wait_for(lambda: len(self.rows()), lambda seen: seen == 10)
        self.assert_says("Page 2 of 2")
        self.assert_focus(lambda: self.browser.find_element(By.ID, "next"))
        self.press("Next")  # there is none: nothing happens
        self.press("Previous")
        self.wait_for(lambda: len(self.rows()), lambda seen: seen == 50)
        self.sort_by("Uses")
        self.wait_for(lambda: [row["Uses"].split(",")[0] for row in self.rows()][:3],
                      lambda seen: seen == ["59", "58", "57"])
        heading = self.browser.find_element(By.XPATH, "//th[button[.='Uses']]")
        self.assertEqual(heading.get_attribute("aria-sort"), "descending")
        self.wait_for(lambda: self.browser.switch_to.active_element.text,
                      lambda seen: seen.startswith("Uses"))
        self.sort_by("Uses")
        self.wait_for(lambda: self.rows()[0]["Uses"], lambda seen: seen.startswith("0"))
        heading = self.browser.find_element(By.XPATH, "//th[button[.='Uses']]")
        self.assertEqual(heading.get_attribute("aria-sort"), "ascending")
        self.assertEqual(len(self.browser.find_elements(By.CSS_SELECTOR, "[aria-sort]")), 1)
        self.select("Links per page", "25")
        self.assert_says("Page 1 of 3")
        self.wait_for(lambda: len(self.rows()), lambda seen: seen == 25)

    def test_filters_outlive_a_reload(self):
        make_links(*({"protect_title": f"Number {number}", "enabled": number % 3 != 0}
                     for number in range(30)))
        vs.make_link(project_name="album", protect_title="Number of pictures", enabled=False)
        self.sign_in()
        self.field("Search").send_keys("Number 1")
        self.assert_count("11 links")
        self.select("State", "Disabled")
        self.assert_count("3 links")
        self.sort_by("Address")
        self.wait_for(lambda: self.browser.find_element(By.CSS_SELECTOR, "[aria-sort]").text,
                      lambda seen: seen.startswith("Address"))
        shown = self.rows()
        self.reload()
        self.assert_count("3 links")
        self.assertEqual(self.rows(), shown)
        self.assertEqual(self.field("Search").get_attribute("value"), "Number 1")
        self.press("Clear filters")
        self.assert_count("31 links")
        self.assert_focus(lambda: self.field("Search"))
        self.field("Project").send_keys("album")
        self.assert_count("1 link")
        self.field("Project").clear()
        self.field("Search").send_keys("no such thing")
        self.assert_count("0 links")
        self.assert_says("No link is like that")

    def test_a_fragment_from_elsewhere_does_no_harm(self):
        make_link(protect_title="Here")
        self.sign_in(fragment="sort=password&state=<b>&page=-1&size=1000000&order=x")
        self.assert_count("1 link")
        self.open_page("page=7")  # behind the last one
        self.wait_for(lambda: len(self.rows()), lambda seen: seen == 1)

    def test_states_are_told_in_words(self):
        make_link(protect_title="Is live")
        make_link(protect_title="Is off", enabled=False)
        make_link(protect_title="Is over", expire_at=1000000000)
        make_link(protect_title="Is spent", expire_times=2, use_count=2)
        make_link(protect_title="Is to come", start_at=2130000000)
        self.sign_in()
        for title, state in (("Is live", "Live"), ("Is off", "Disabled"), ("Is over", "Expired"),
                             ("Is spent", "Used up"), ("Is to come", "Not yet begun")):
            self.assert_cell(title, "State", state)
            self.select("State", state)
            self.wait_for(lambda: [row["Title"] for row in self.rows()],
                          lambda seen, title=title: len(seen) == 1 and title in seen[0])
            self.select("State", "Any")
            self.assert_count("5 links")

    def test_hostile_texts_stay_texts(self):
        vs.make_link(project_name="<b>p</b>", protect_title=FORGED, app={"x": "<img src=x>"})
        vs.make_link(project_name="album", protect_title=OTHER_SCRIPTS)
        self.sign_in()
        self.assert_cell(FORGED, "Title", FORGED)
        self.assert_cell(OTHER_SCRIPTS, "Title", OTHER_SCRIPTS)
        self.act(FORGED, "remove")
        self.assert_text("question-heading", FORGED)
        self.press_in("question", "Cancel")
        self.edit(FORGED)
        self.assertEqual(self.field("Title").get_attribute("value"), FORGED)
        self.assertIn("<img src=x>", self.field("Application data").get_attribute("value"))
        self.assertEqual(self.browser.title, "Sharing links")
        self.assertEqual(self.browser.find_elements(By.CSS_SELECTOR, "img[src=x], td b"), [])


class Actions(OwnerTest):
    def setUp(self):
        super().setUp()
        self.link = make_link(protect_title="One", protect_type="password", password="tea")
        make_link(protect_title="Two")
        self.sign_in()

    def tearDown(self):
        self.assert_own_host_alone()

    def state_of(self, link):
        return vs.sql("SELECT enabled FROM entry WHERE hash=?", link)[0][0]

    def test_address_is_copied(self):
        self.act("One", "copy")
        self.assert_notice("The address of “One” is copied")
        self.new_link()
        self.field("Title").send_keys(Keys.CONTROL + "v")
        self.assertEqual(self.field("Title").get_attribute("value"),
                         f"http://127.0.0.1:{SERVER.port}/sharing/{self.link}")

    def test_address_is_selected_where_nothing_may_be_copied(self):
        # As on a page that came without HTTPS from another machine.
        self.browser.execute_cdp_cmd("Page.addScriptToEvaluateOnNewDocument", {
            "source": "Object.defineProperty(navigator, 'clipboard', {value: undefined})"})
        self.reload()
        self.act("One", "copy")
        self.assert_text("address-status", "copy it with the keyboard")
        self.wait_for(lambda: self.browser.execute_script("return getSelection().toString()"),
                      lambda seen: seen == f"http://127.0.0.1:{SERVER.port}/sharing/{self.link}")
        self.press_in("address", "Close")
        self.assert_no_dialog()
        self.assert_focus(lambda: self.button("One", "copy"))

    def test_qr_code(self):
        self.act("One", "qr")
        self.dialog("address")
        image = self.browser.find_element(By.ID, "qr")
        self.wait_for(lambda: self.browser.execute_script(
            "return arguments[0].complete && arguments[0].naturalWidth", image),
            lambda seen: seen > 0)
        self.assertEqual(image.get_attribute("alt"), "QR code of the address "
                         f"http://127.0.0.1:{SERVER.port}/sharing/{self.link}")
        self.picture("owner-qr")
        self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
        self.assert_no_dialog()
        self.assert_focus(lambda: self.button("One", "qr"))

    def test_disabling_enabling_and_taking_it_back(self):
        self.act("One", "toggle")
        self.assert_cell("One", "State", "Disabled")
        self.assertEqual(self.state_of(self.link), 0)
        self.assert_notice("“One” is disabled")
        self.assert_focus(lambda: self.button("One", "toggle"))
        with Visitor() as visitor:
            visitor.open("/sharing/" + self.link)
            visitor.assert_heading("This link does not open")
        self.press("Undo")
        self.assert_cell("One", "State", "Live")
        self.assertEqual(self.state_of(self.link), 1)
        self.assert_notice("“One” is enabled again")
        self.act("One", "toggle")
        self.assert_cell("One", "State", "Disabled")
        self.act("One", "toggle")
        self.assert_cell("One", "State", "Live")
        self.press("Dismiss")
        self.wait_for(self.notice, lambda seen: seen == "")

    def test_deleting_asks_first(self):
        self.act("One", "remove")
        self.assert_text("question-heading", "Delete “One”?")
        self.picture("owner-delete")
        self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
        self.assert_no_dialog()
        self.assert_focus(lambda: self.button("One", "remove"))
        self.act("One", "remove")
        self.press_in("question", "Cancel")
        self.assert_no_dialog()
        self.assert_count("2 links")
        self.act("One", "remove")
        self.press_in("question", "Delete")
        self.assert_count("1 link")
        self.assert_notice("“One” is deleted")
        self.assert_focus(lambda: self.button("Two", "edit"))
        self.assertEqual(vs.sql("SELECT count(*) FROM entry WHERE hash=?", self.link), [(0,)])

    def test_visitors_now(self):
        self.act("One", "visitors")
        self.wait_for(lambda: self.dialog("visitors").text, lambda seen: "Nobody" in seen)
        self.press_in("visitors", "Close")
        with Visitor() as visitor:
            visitor.open("/sharing/" + self.link)
            visitor.field("Password").send_keys("tea", Keys.ENTER)
            visitor.assert_file_arrives()
        self.act("One", "visitors")
        self.wait_for(lambda: self.dialog("visitors").text,
                      lambda seen: "1 visitor is admitted now" in seen and "127.0.0.1" in seen and
                      "A stranger" in seen)

    def test_removing_ended_links(self):
        make_link(protect_title="Over", expire_at=1000000000)
        make_link(protect_title="Spent", expire_times=1, use_count=1)
        vs.make_link(project_name="album", protect_title="Over too", expire_at=1000000000)
        self.reload()
        self.press("Remove ended links…")
        self.assert_text("ended-yes", "Remove 3 links of yours")
        self.field("Only of the project").send_keys("file")
        self.assert_text("ended-count", "Now 2 links.")
        self.press_in("ended", "Remove 2 links of yours of the project “file”")
        self.assert_count("3 links")
        self.assert_notice("2 links are removed")
        self.assert_cell("Over too", "State", "Expired")

    def test_editing_keeps_what_is_not_shown(self):
        vs.change_data(self.link, private_data={"key": 7})
        self.edit("One", Title="Another title")
        self.assertEqual(self.field("Password").get_attribute("value"), "")
        self.assertEqual(self.field("Password").get_attribute("type"), "password")
        with Visitor() as visitor:  # the count of uses goes on meanwhile
            visitor.open("/sharing/" + self.link)
            visitor.field("Password").send_keys("tea", Keys.ENTER)
            visitor.assert_file_arrives()
        self.save()
        self.assert_notice("“Another title” is saved")
        self.assert_focus(lambda: self.button("Another title", "edit"))
        self.assertEqual(vs.use_count(self.link), 1)
        self.assertIn('"private_data":{"key":7}',
                      vs.sql("SELECT data FROM entry WHERE hash=?", self.link)[0][0])
        with Visitor() as visitor:
            visitor.open("/sharing/" + self.link)
            visitor.field("Password").send_keys("tea", Keys.ENTER)
            visitor.assert_file_arrives()

    def test_changing_the_password_and_the_address(self):
        self.edit("One", Password="coffee")
        self.show_more()
        self.fill(Last_part_of_the_address="fresh-one")
        self.save()
        with Visitor() as visitor:
            visitor.open("/sharing/fresh-one")
            visitor.field("Password").send_keys("tea", Keys.ENTER)
            visitor.assert_says("The password is wrong")
            visitor.field("Password").send_keys("coffee", Keys.ENTER)
            visitor.assert_file_arrives()

    def test_opening_a_protected_link_to_anybody(self):
        self.edit("One", Anybody_with_the_address=True)
        self.save()
        self.assert_cell("One", "Title", "Open to anybody")


class Sending(OwnerTest):
    """What a saved form sends, and what it refuses to send."""

    def edited(self, title, **fields):
        """What saving these changes sends, without the link's number."""
        before = len(self.sent("set"))
        self.edit(title, **fields)
        self.press_in("link", "Save")
        self.assert_no_dialog()
        self.wait_for(lambda: len(self.sent("set")), lambda seen: seen == before + 1)
        self.assert_notice("is saved")
        return {name: value for name, value in self.sent("set")[-1].items() if name != "id"}

    def test_what_was_changed_alone_is_sent(self):
        make_link(protect_title="One", protect_type="user", protect_users=["bob"])
        self.sign_in("carol")
        self.watch()
        for fields, settings in (
                ({"Title": "Two"}, {"protect_title": "Two"}),
                ({"Owner": " carol "}, {"owner_user": "carol"}),
                ({"Users": "bob\n alice\n"},
                 {"protect_users": ["bob", "alice"], "protect_type": "user"}),
                ({"Enabled": False}, {"enabled": False}),
                ({"Begins": "2037-01-01T08:00", "Ends": "2037-01-02T08:00:01"},
                 {"start_at": "2037-01-01T08:00:00", "expire_at": "2037-01-02T08:00:01"}),
                ({"Uses allowed": "9", "Uses so far": "4"}, {"expire_times": 9, "use_count": 4}),
                ({"With a password": True, "Password": "tea"},
                 {"protect_type": "password", "protect_password": "tea"}),
                ({"Password": "coffee"},
                 {"protect_type": "password", "protect_password": "coffee"}),
                ({"Anybody with the address": True}, {"protect_type": "none"})):
            with self.subTest(fields=fields):
                title = "One" if "Title" in fields else "Two"
                self.assertEqual(self.edited(title, **fields), settings)

    def test_nothing_is_sent_when_nothing_was_changed(self):
        make_link(protect_title="One")
        self.sign_in()
        self.watch()
        self.edit("One")
        self.save()
        self.assertEqual(self.sent("set"), [])

    def test_a_project_that_begins_with_a_blank_is_not_trimmed(self):
        link = make_link(protect_title="One")
        vs.sql("UPDATE entry SET project_name=' album' WHERE hash=?", link)
        self.sign_in()
        self.watch()
        self.assertEqual(self.edited("One", Title="Two"), {"protect_title": "Two"})

    def test_line_feeds_in_title_and_path_are_not_dropped(self):
        path = FOLDER + "/two\nlines.txt"
        with open(path, "w") as file:
            file.write("x")
        link = vs.make_file_link(path, protect_title="one\ntwo")
        self.sign_in()
        self.watch()
        self.assertEqual(self.edited("one[U+000A]two", Uses_allowed="9"), {"expire_times": 9})
        self.assertIn("two\\nlines", vs.sql("SELECT data FROM entry WHERE hash=?", link)[0][0])

    def test_numbers_that_no_browser_keeps_are_refused(self):
        self.sign_in()
        self.new_link(Project="album", Application_data='{"a": [9007199254740993]}')
        self.show_more()
        self.fill(Private_data='{"b": 1e999, "c": "9007199254740993"}')
        self.press_in("link", "Create link")
        self.assert_error("Application data", "9007199254740993")
        self.assert_error("Private data", "1e999")
        self.fill(Application_data='{"a": [9007199254740992, 0.1, -1.5e-7, "1e999"]}',
                  Private_data="")
        self.create()

    def test_data_with_such_a_number_is_left_alone(self):
        data = '{"id":9007199254740993,"n":1}'
        album = vs.make_link(project_name="album", protect_title="Album")
        vs.sql("UPDATE entry SET data=json_set(data, '$.app', json(?)) WHERE hash=?", data, album)
        file = make_link(protect_title="File")
        vs.sql("UPDATE entry SET data=json_set(data, '$.app.inode', 9007199254740993) "
               "WHERE hash=?", file)
        self.sign_in()
        for title, label in ("Album", "Application data"), ("File", "File"):
            self.edit(title, Uses_allowed="5")
            self.assertEqual(self.field(label).get_attribute("readonly"), "true")
            self.assertIn("9007199254740993", self.dialog("link").text)
            self.save()
            self.assert_cell(title, "Uses", "of 5")
        self.assertEqual(vs.sql("SELECT json_extract(data, '$.app') FROM entry WHERE hash=?",
                                album), [(data,)])
        self.assertEqual(vs.sql("SELECT json_extract(data, '$.app.inode') FROM entry WHERE hash=?",
                                file), [(9007199254740993,)])

    def test_turning_to_a_password_needs_one(self):
        make_link(protect_title="One")
        self.sign_in()
        self.edit("One", With_a_password=True)
        self.press_in("link", "Save")
        self.assert_error("Password", "Which password")

    def test_an_owner_that_is_cleared_is_a_mistake(self):
        make_link(protect_title="One")
        self.sign_in("carol")
        self.edit("One", Owner="")
        self.press_in("link", "Save")
        self.assert_error("Owner", "has an owner")

    def test_a_date_that_is_not_complete_is_a_mistake(self):
        self.sign_in()
        self.new_link(File=FILE)
        self.field("Ends").send_keys("01")
        self.press_in("link", "Create link")
        self.assert_error("Ends", "not complete")

    def test_pressing_twice_makes_one_link(self):
        self.sign_in()
        self.watch()
        self.new_link(File=FILE)
        self.hold("create")
        self.press_in("link", "Create link")
        self.press_in("link", "Create link")
        self.let_go()
        self.dialog("address")
        self.assertEqual(len(self.sent("create")), 1)

    def test_the_newest_state_is_edited(self):
        link = make_link(protect_title="One")
        self.sign_in()
        vs.sql("UPDATE entry SET expire_times=7 WHERE hash=?", link)
        self.edit("One")
        self.assertEqual(self.field("Uses allowed").get_attribute("value"), "7")

    def test_times_are_the_servers_in_any_zone(self):
        make_link(protect_title="One", expire_at=2130000000)
        self.browser.execute_cdp_cmd("Emulation.setTimezoneOverride",
                                     {"timezoneId": "Pacific/Kiritimati"})
        self.sign_in()
        self.edit("One")
        ((end, now),) = vs.sql("SELECT datetime(expire_at, 'unixepoch', 'localtime'), "
                               "strftime('%s', 'now', 'localtime') FROM entry")
        self.assertEqual(self.field("Ends").get_attribute("value")[:16], end[:16].replace(" ", "T"))
        shown = self.browser.find_element(By.ID, "server-clock").text
        ((seconds,),) = vs.sql("SELECT strftime('%s', ?)", shown[-17:-1])
        self.assertLess(abs(int(seconds) - int(now)), 120, shown)


class Late(OwnerTest):
    """Answers that come when something else is on the screen."""

    def setUp(self):
        super().setUp()
        self.links = make_links({"protect_title": "One"}, {"protect_title": "Two"})
        self.sign_in()
        self.watch()

    def save_late(self):
        self.edit("One", Title="One more")
        self.hold("set")
        self.press_in("link", "Save")
        self.press_in("link", "Cancel")
        self.assert_no_dialog()

    def test_save_does_not_close_another_form(self):
        self.save_late()
        self.new_link(Title="Long typing")
        self.let_go()
        self.assert_cell("One more", "Title", "One more")
        self.assertEqual(self.open_dialogs(), ["link-dialog"])
        self.assertEqual(self.field("Title").get_attribute("value"), "Long typing")
        self.assert_notice("“One more” is saved")

    def test_refusal_of_a_save_is_told_on_the_page(self):
        self.edit("One", Title="One more")
        self.hold("set")
        vs.sql("DELETE FROM entry WHERE hash=?", self.links[0])
        self.press_in("link", "Save")
        self.press_in("link", "Cancel")
        self.new_link()
        self.let_go()
        self.assert_notice("“One”: This link does not exist any more")
        self.assertEqual(self.summary(), "")
        self.assert_count("1 link")  # and the list is a new one

    def test_second_link_to_be_edited_is_the_one_shown(self):
        self.hold("get")
        self.act("One", "edit")
        self.edit("Two", Title="Two more")
        self.let_go()
        self.settle()
        self.assert_text("link-heading", "Edit “Two”")
        self.assertEqual(self.field("Title").get_attribute("value"), "Two more")

    def test_visitors_are_those_of_the_link_shown(self):
        self.hold("sessions")
        self.replace("sessions", "return new Response(JSON.stringify({success: true, data: "
                     "{total: 2, sessions: [{user: '', ip: '192.0.2.7', expires_at: ''}]}}))")
        self.act("One", "visitors")
        self.press_in("visitors", "Close")
        self.assert_no_dialog()
        self.act("Two", "visitors")
        self.assert_text("visitors-count", "2 visitors")
        self.let_go()
        self.settle()
        self.assert_text("visitors-count", "2 visitors")
        self.assert_text("visitors-rows", "A stranger")

    def test_address_does_not_appear_over_a_form(self):
        self.hold("get")
        self.act("One", "qr")
        self.new_link(Title="Long typing")
        self.let_go()
        self.settle()
        self.assertEqual(self.open_dialogs(), ["link-dialog"])

    def test_list_of_an_older_filter_is_dropped(self):
        self.hold("list")
        self.field("Search").send_keys("One")
        self.wait_for(lambda: len(self.sent("list")), lambda seen: seen == 1)
        self.field("Search").clear()
        self.field("Search").send_keys("Two")
        self.assert_count("1 link")
        self.let_go()
        self.settle()
        self.assertIn("Two", self.rows()[0]["Title"])

    def settle(self):
        """What an answer sets off in the page is over."""
        self.browser.execute_async_script("setTimeout(arguments[0], 200)")


class Leaving(OwnerTest):
    def setUp(self):
        super().setUp()
        self.sign_in()

    def test_escape_asks_before_what_was_typed_is_lost(self):
        self.new_link(Title="Long typing")
        for _ in range(3):  # however often it is pressed
            self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
            self.assert_text("question-heading", "Discard")
            self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
            self.wait_for(self.open_dialogs, lambda seen: seen == ["link-dialog"])
        self.assertEqual(self.field("Title").get_attribute("value"), "Long typing")

    def test_keep_editing_goes_back_to_the_field(self):
        self.new_link(Title="Long typing")
        self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
        self.dialog("question")
        self.browser.switch_to.active_element.send_keys(Keys.ENTER)  # it has the focus
        self.wait_for(self.open_dialogs, lambda seen: seen == ["link-dialog"])
        self.assert_focus(lambda: self.field("Title"))

    def test_discard_closes_both(self):
        self.new_link(Title="Long typing")
        self.discard()
        self.assert_focus(lambda: self.browser.find_element(By.ID, "new-link"))

    def test_escape_closes_what_was_not_changed(self):
        self.new_link()
        self.browser.switch_to.active_element.send_keys(Keys.ESCAPE)
        self.assert_no_dialog()


class EndedLinks(OwnerTest):
    def setUp(self):
        super().setUp()
        make_links({"protect_title": "Off and over", "enabled": False, "expire_at": 1000000000},
                   {"protect_title": "Here"})

    def test_disabled_ones_are_counted_too(self):
        self.sign_in()
        self.press("Remove ended links…")
        self.assert_text("ended-yes", "Remove 1 link of yours")
        self.press_in("ended", "Remove 1 link of yours")
        self.assert_count("1 link")

    def test_nothing_is_removed_before_it_is_counted(self):
        make_link(protect_title="Of carol", owner_user="carol", expire_at=1000000000)
        self.sign_in("carol")
        self.watch()
        self.press("Remove ended links…")
        self.assert_text("ended-yes", "Remove 1 link of carol")
        self.hold("delete_expired")
        self.field("Only of the owner").send_keys(Keys.CONTROL + "a", Keys.NULL, Keys.BACKSPACE,
                                                  Keys.ENTER)
        self.wait_for(lambda: len(self.sent("delete_expired")), lambda seen: seen == 2)
        button = self.browser.find_element(By.ID, "ended-yes")
        self.assertEqual(button.get_attribute("aria-disabled"), "true")
        self.assertEqual(button.text, "Remove")
        self.assertEqual(self.browser.find_element(By.ID, "ended-problem").text, "")
        self.field("Only of the owner").send_keys(Keys.ENTER)
        self.let_go()
        self.assert_text("ended-yes", "Remove 2 links of everybody")
        self.assertEqual([request.get("dry_run") for request in self.sent("delete_expired")],
                         [True, True])
        self.assertEqual(vs.sql("SELECT count(*) FROM entry"), [(3,)])

    def test_where_there_are_none_there_is_nothing_to_press(self):
        self.sign_in("bob")
        self.watch()
        self.press("Remove ended links…")
        self.assert_text("ended-count", "There are none")
        self.press_in("ended", "Remove")
        self.assertEqual(len(self.sent("delete_expired")), 1)


class Names(OwnerTest):
    def test_links_without_a_visible_title_have_a_name(self):
        for title in " ", "\u200b\u200b", "\u3164":
            with self.subTest(title=title):
                owner_page.forget()
                vs.make_link(project_name="album", protect_title=title)
                self.sign_in()
                ((number,),) = vs.sql("SELECT id FROM entry")
                self.assert_cell(f"Link No. {number}", "Title", f"Link No. {number}")

    def test_titles_cannot_turn_the_words_around(self):
        make_link(protect_title="\u202egnp.x")
        self.sign_in()
        self.assertEqual(self.button("[U+202E]gnp.x", "remove").accessible_name,
                         "Delete [U+202E]gnp.x")
        self.act("[U+202E]gnp.x", "remove")
        self.assert_text("question-heading", "Delete “[U+202E]gnp.x”?")
        self.assertEqual(len(self.browser.find_elements(By.CSS_SELECTOR,
                                                        "#question-heading bdi")), 1)

    def test_questions_and_notices_name_the_link(self):
        first, second = make_links({"protect_title": "Same"},
                                   {"protect_title": "Same", "owner_user": "bob"})
        numbers = dict(vs.sql("SELECT hash, id FROM entry"))
        self.sign_in("carol")
        self.assert_count("2 links")
        self.act("Same", "remove")  # the newest one is first
        self.assert_text("question-text", f"No. {numbers[second]}, address {second}, owner bob.")
        self.press_in("question", "Delete")
        self.assert_notice(f"“Same” is deleted. No. {numbers[second]}, address {second}, "
                           "owner bob.")
        self.sign_in("alice")
        self.act("Same", "toggle")
        self.assert_notice(f"“Same” is disabled. No. {numbers[first]}, address {first}.")

    def test_buttons_of_a_row_name_its_link(self):
        make_link(protect_title="One")
        self.sign_in()
        names = [self.button("One", action).accessible_name
                 for action in ("edit", "copy", "qr", "visitors", "toggle", "remove")]
        self.assertEqual(names, ["Edit One", "Copy address of One", "QR code of One",
                                 "Visitors of One", "Disable One", "Delete One"])


class Telling(OwnerTest):
    def setUp(self):
        super().setUp()
        self.link = make_link(protect_title="One")
        self.sign_in()
        self.watch()

    def test_notice_is_always_there_for_screen_readers(self):
        text = self.browser.find_element(By.ID, "notice-text")
        self.assertEqual(text.get_attribute("role"), "status")
        self.browser.execute_script(
            "window.seen = []; new MutationObserver((all) => seen.push(...all.map((one) => "
            "one.type + one.target.id))).observe(document.getElementById('notice'), "
            "{attributes: true, attributeFilter: ['hidden'], childList: true, subtree: true})")
        self.assertEqual(self.browser.execute_script(
            "return arguments[0].closest('[hidden]')", text), None)
        self.act("One", "toggle")
        self.assert_notice("is disabled")
        self.act("One", "toggle")
        self.assert_notice("is enabled")
        kinds = set(self.browser.execute_script("return seen"))
        self.assertEqual(kinds - {"attributesundo", "attributesdismiss"}, {"childListnotice-text"})

    def test_copy_says_when_the_address_is_a_guess(self):
        self.replace("get", "const answer = await response.json(); answer.data.url = ''; "
                     "return new Response(JSON.stringify(answer))")
        self.act("One", "copy")
        self.assert_notice("The server does not know its own address")

    def test_what_somebody_else_did_is_not_undone(self):
        vs.sql("UPDATE entry SET enabled=0")
        self.act("One", "toggle")
        self.assert_notice("“One” was disabled already")
        self.assertFalse(self.browser.find_element(By.ID, "undo").is_displayed())
        self.assert_cell("One", "State", "Disabled")
        self.assertEqual(self.sent("set"), [])

    def test_a_link_that_is_gone_leaves_the_list(self):
        vs.sql("DELETE FROM entry")
        self.act("One", "edit")
        self.assert_notice("does not exist any more")
        self.assert_count("0 links")

    def test_question_stays_open_when_its_answer_fails(self):
        self.replace("delete", "return new Response('{\"success\": false, \"error\": "
                     "{\"code\": 207, \"message\": \"\"}}')")
        self.act("One", "remove")
        first = self.dialog("question").find_element(By.TAG_NAME, "button")
        self.assertEqual(first.text, "Cancel")
        self.assert_focus(lambda: first)
        self.press_in("question", "Delete")
        self.assert_text("question-problem", "Other programs keep changing this link")
        self.assertEqual(self.open_dialogs(), ["question-dialog"])

    def test_an_answer_that_breaks_off_leaves_a_change_in_doubt(self):
        self.edit("One", Title="Two")
        self.break_off("set")
        self.press_in("link", "Save")
        self.assert_text("link-summary", "no usable answer, so it is not known whether")

    def test_an_answer_that_breaks_off_leaves_nothing_read(self):
        self.break_off("get")
        self.act("One", "edit")
        self.assert_notice("no usable answer, so this could not be read")


class Filters(OwnerTest):
    def test_owner_in_an_address_is_for_administrators(self):
        make_link(protect_title="Of alice")
        self.sign_in(fragment="owner=bob")
        self.assert_count("1 link")
        self.assertNotIn("owner=", self.browser.current_url)

    def test_texts_of_an_address_are_cut(self):
        self.sign_in(fragment="search=" + "ü" * 40)
        self.assertEqual(self.field("Search").get_attribute("value"), "ü" * 32)
        self.open_page("project=" + "x" * 70)
        self.assertEqual(self.field("Project").get_attribute("value"), "x" * 64)

    def test_a_mistake_is_told_beside_its_filter(self):
        make_link(protect_title="One")
        self.sign_in("carol")
        self.field("Owner").send_keys("bo")
        self.assert_error("Owner", "account")
        self.assertFalse(self.browser.find_element(By.ID, "problem").is_displayed())
        self.field("Owner").send_keys("b")
        self.assert_count("0 links")
        self.assertEqual(self.error_of("Owner"), "")

    def test_filters_are_there_when_the_first_list_fails(self):
        make_link(protect_title="One")
        self.sign_in("carol")
        self.go("about:blank")
        self.go(f"http://127.0.0.1:{SERVER.port}/owner/#owner=nobody-of-that-name")
        self.assert_error("Owner", "account")
        self.assertTrue(self.browser.find_element(By.ID, "new-link").is_displayed())
        self.press("Clear filters")
        self.assert_count("1 link")


class Accounts(OwnerTest):
    def test_administrators_see_everybodys_links(self):
        make_link(protect_title="Of alice")
        make_link(protect_title="Of bob", owner_user="bob")
        self.sign_in("carol")
        self.assert_count("2 links")
        self.assert_cell("Of bob", "Owner", "bob")
        self.field("Owner").send_keys("alice")
        self.assert_count("1 link")
        self.edit("Of alice")
        self.fill(Owner="bob")
        self.save()
        self.assert_count("0 links")
        self.press("Clear filters")
        self.assert_cell("Of alice", "Owner", "bob")

    def test_others_see_their_own(self):
        make_link(protect_title="Of alice")
        make_link(protect_title="Of bob", owner_user="bob")
        self.sign_in("bob")
        self.assert_count("1 link")
        self.assertNotIn("Owner", self.rows()[0])
        self.assertFalse(self.browser.find_element(By.ID, "filter-owner").is_displayed())
        self.new_link()
        self.assertFalse(self.browser.find_element(By.ID, "owner_user").is_displayed())

    def test_removing_ended_links_starts_with_the_administrators_own(self):
        make_link(protect_title="Over", expire_at=1000000000, owner_user="bob")
        self.sign_in("carol")
        self.press("Remove ended links…")
        self.assert_text("ended-count", "There are none")
        self.field("Only of the owner").send_keys(Keys.CONTROL + "a", Keys.NULL, Keys.BACKSPACE)
        self.assert_text("ended-yes", "Remove 1 link of everybody")
        self.field("Only of the owner").send_keys("bob")
        self.assert_text("ended-yes", "Remove 1 link of bob")


class Trouble(OwnerTest):
    def test_account_that_the_server_does_not_know(self):
        with vs.WebServer(without_logins()) as server:
            self.go(f"http://127.0.0.1:{server.port}/owner/")
            self.assert_says("You are not signed in")
            self.assertFalse(self.browser.find_element(By.ID, "links").is_displayed())
            self.assertFalse(self.browser.find_element(By.ID, "new-link").is_displayed())
            self.picture("owner-not-signed-in")

    def offline(self, gone):
        self.browser.execute_cdp_cmd("Network.emulateNetworkConditions", {
            "offline": gone, "latency": 0, "downloadThroughput": -1, "uploadThroughput": -1})

    def test_server_out_of_reach(self):
        make_link(protect_title="One")
        self.sign_in()
        self.offline(True)
        self.field("Search").send_keys("nothing is called so")
        self.assert_says("The server cannot be reached")
        self.assertEqual(self.browser.find_element(By.ID, "problem").get_attribute("role"), "alert")
        self.act("One", "toggle")
        self.assert_notice("The server cannot be reached")
        self.new_link(File=FILE)
        self.press_in("link", "Create link")
        self.wait_for(self.summary, lambda seen: "The server cannot be reached" in seen)
        self.discard()
        self.offline(False)
        self.press("Try again")
        self.assert_count("0 links")
        self.assertFalse(self.browser.find_element(By.ID, "problem").is_displayed())

    def test_api_out_of_order(self):
        self.sign_in()
        with no_api():
            self.browser.refresh()
            self.assert_says("The server gives no usable answer")
            self.assertFalse(self.browser.find_element(By.ID, "links").is_displayed())
        self.press("Try again")
        self.assert_count("0 links")


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
        self.set_scheme("dark")
        self.set_size(360, 800)
        self.picture("owner-phone")
        self.set_scheme("light")
        self.set_size(560, 420)
        vs.sql("UPDATE entry SET hash='summer' WHERE data LIKE '%summer.pdf%'")
        self.go(f"http://127.0.0.1:{SERVER.port}/sharing/summer")
        self.picture("visitor-login")

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
            self.go(f"http://127.0.0.1:{SERVER.port}/sharing/{link}")
            theirs = [self.style("body", "backgroundColor"), self.style("body", "color"),
                      self.style("main", "backgroundColor"), self.style("main", "borderRadius"),
                      self.style("button", "backgroundColor"), self.style("body", "fontFamily")]
            self.assertEqual(own, theirs, scheme)
            self.picture("visitor-" + scheme)


def without_logins():
    """A configuration by which the web server asks nobody for an account; its path."""
    folder = sys.argv[2] + "/packaging/lighttpd/"
    with open(folder + "standalone.conf") as file:
        text = file.read()
    for name in "owner.conf", "webapi.conf", "sharing.conf":
        with open(folder + name) as file:
            part = re.sub(r"auth\.require \+= \(.*?\n\)\n", "", file.read(), flags=re.DOTALL)
        text = text.replace(f'include "{name}"', part)
    assert not re.search(r"^(include|auth\.require)", text, re.MULTILINE), text
    with open("/tmp/without-logins.conf", "w") as file:
        file.write(text)
    return "/tmp/without-logins.conf"


@contextlib.contextmanager
def no_api():
    """The program of the web API is out of order."""
    program = "/usr/tuvo/bin/entry.cgi"
    os.rename(program, program + ".away")
    try:
        yield
    finally:
        os.rename(program + ".away", program)


def main():
    global SERVER
    os.environ["HOME"] = "/tmp"
    vs.install(sys.argv[1], sys.argv[2])
    owner_page.lay_out()
    with vs.WebServer() as SERVER:
        owner_page.configure(SERVER)
        return browser.run_tests()


if __name__ == "__main__":
    sys.exit(main())
