"""Editing links with the owner's page: what is sent, answers that come late, and leaving.
Arguments: the build folder, the project's folder."""

import sys

import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import FILE, FOLDER, OwnerTest, make_link, make_links


class Sending(OwnerTest):
    """What a saved form sends, and what it refuses to send."""

    def edited(self, title, **fields):
        """What saving these changes sends, without the link's number."""
        before = len(self.sent("set"))
        self.edit(title, **fields)
        self.forget_notice()
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
        self.wait_for(lambda: self.sent("list"),
                      lambda seen: seen and seen[-1].get("search") == "One")
        self.field("Search").clear()
        self.field("Search").send_keys("Two")
        self.wait_for(lambda: [row["Title"] for row in self.rows()],
                      lambda seen: len(seen) == 1 and "Two" in seen[0])
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


if __name__ == "__main__":
    sys.exit(owner_page.run())
