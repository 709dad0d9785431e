"""The list of the owner's page: what it shows, to whom, and what it does without its server.
Arguments: the build folder, the project's folder."""

import contextlib
import os
import re
import sys

import owner_page
import visitor_server as vs
from browser import By, Keys
from owner_page import FILE, OwnerTest, make_link, make_links

FORGED = "<script>document.title='broken'</script><img src=x onerror=\"document.title='b'\">"
OTHER_SCRIPTS = "Zürich 東京 \U0001f30d"


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

    def test_pages_that_hold_too_much_become_smaller(self):
        make_links(*({"protect_title": f"Number {number}"} for number in range(60)))
        self.sign_in(fragment="size=50&page=2")
        self.watch()
        self.replace("list", "return new Response('{\"success\": false, \"error\": {\"code\": 203, "
                     "\"field\": \"limit\", \"message\": \"asks for too much\"}}')")
        self.sort_by("Uses")
        self.assert_says("Page 1 of 3")
        self.assertEqual([(asked["offset"], asked["limit"]) for asked in self.sent("list")],
                         [(0, 50), (0, 25)])
        self.assertFalse(self.browser.find_element(By.ID, "problem").is_displayed())
        self.press("Next")
        self.assert_says("Page 2 of 3")
        self.replace("list", "return new Response('{\"success\": false, \"error\": {\"code\": 203, "
                     "\"field\": \"limit\", \"message\": \"asks for too much\"}}')")
        self.press("Next")  # there are none smaller
        self.assert_text("problem-text", "Asks for too much.")

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
        self.go(f"http://127.0.0.1:{self.server.port}/owner/#owner=nobody-of-that-name")
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

    def test_mistakes_are_told_beside_their_fields(self):
        self.sign_in("carol")
        self.press("Remove ended links…")
        self.field("Only of the owner").send_keys("nobody")
        self.assert_error("Only of the owner", "account")
        self.assertEqual(self.error_of("Only of the project"), "")
        self.assert_text("ended-count", "Not counted")
        self.field("Only of the owner").send_keys(Keys.CONTROL + "a", Keys.NULL, Keys.BACKSPACE)
        self.assert_text("ended-count", "Now 1 link.")
        self.assertEqual(self.error_of("Only of the owner"), "")
        self.field("Only of the project").send_keys("a\u200b" * 40)
        self.assert_error("Only of the project", "64")
        self.assertEqual(self.error_of("Only of the owner"), "")

    def test_where_there_are_none_there_is_nothing_to_press(self):
        self.sign_in("bob")
        self.watch()
        self.press("Remove ended links…")
        self.assert_text("ended-count", "There are none")
        self.press_in("ended", "Remove")
        self.assertEqual(len(self.sent("delete_expired")), 1)


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


if __name__ == "__main__":
    sys.exit(owner_page.run())
