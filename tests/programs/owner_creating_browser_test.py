"""Making links with the owner's page, each with a visitor for it, and the mistakes that the form tells.
Arguments: the build folder, the project's folder."""

import sys

import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import FILE, OUTSIDE, OwnerTest, Visitor, make_link


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
            visitor.assert_arrives_at(f"http://127.0.0.1:{self.server.port}/sharing/elsewhere")

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


if __name__ == "__main__":
    sys.exit(owner_page.run())
