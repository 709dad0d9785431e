"""The buttons of the owner's list: what they do, and what the page tells of it.
Arguments: the build folder, the project's folder."""

import sys

import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import OwnerTest, Visitor, make_link


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
        address = f"http://127.0.0.1:{self.server.port}/sharing/{self.link}"
        self.wait_for(lambda: self.field("Title").get_attribute("value"),
                      lambda seen: seen == address)

    def test_address_is_selected_where_nothing_may_be_copied(self):
        # As on a page that came without HTTPS from another machine.
        self.browser.execute_cdp_cmd("Page.addScriptToEvaluateOnNewDocument", {
            "source": "Object.defineProperty(navigator, 'clipboard', {value: undefined})"})
        self.reload()
        self.act("One", "copy")
        self.assert_text("address-status", "copy it with the keyboard")
        self.wait_for(lambda: self.browser.execute_script("return getSelection().toString()"),
                      lambda seen: seen == f"http://127.0.0.1:{self.server.port}/sharing/{self.link}")
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
                         f"http://127.0.0.1:{self.server.port}/sharing/{self.link}")
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
        self.assert_notice("“One” is enabled. ")
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

    def test_signing_everyone_out(self):
        with Visitor() as visitor:
            visitor.open("/sharing/" + self.link)
            visitor.field("Password").send_keys("tea", Keys.ENTER)
            visitor.assert_file_arrives()
            self.act("One", "visitors")
            self.wait_for(lambda: self.dialog("visitors").text,
                          lambda seen: "1 visitor is admitted now" in seen)
            self.press_in("visitors", "Sign everyone out…")
            self.assertIn(self.link, self.dialog("question").text)
            self.press_in("question", "Cancel")
            self.assert_focus(lambda: self.browser.find_element(By.ID, "visitors-close"))
            self.assertEqual(vs.sql("SELECT count(*) FROM token"), [(1,)])
            self.press_in("visitors", "Sign everyone out…")
            self.press_in("question", "Sign everyone out")
            self.assert_text("visitors-count",
                             "1 visitor is signed out. Nobody is admitted now.")
            self.assert_focus(lambda: self.browser.find_element(By.ID, "visitors-close"))
            self.assertFalse(self.browser.find_element(By.ID, "sign-out").is_displayed())
            self.press_in("visitors", "Close")
            self.assert_focus(lambda: self.button("One", "visitors"))
            visitor.open("/sharing/" + self.link)
            visitor.field("Password")  # is asked for again

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
                     "{\"code\": 207, \"message\": \"others keep the links locked; try again\"}}')")
        self.act("One", "remove")
        first = self.dialog("question").find_element(By.TAG_NAME, "button")
        self.assertEqual(first.text, "Cancel")
        self.assert_focus(lambda: first)
        self.press_in("question", "Delete")
        self.assert_text("question-problem", "Others keep the links locked; try again.")
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


if __name__ == "__main__":
    sys.exit(owner_page.run())
