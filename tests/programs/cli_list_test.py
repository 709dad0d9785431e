"""The administrator's command end to end: lists of links. Arguments: the build folder, the
project's folder."""

import json

import cli_program
from cli_program import LINK_MEMBERS, CliTest, create, data_of, many_links, run, show
from visitor_server import sql


class List(CliTest):
    def test_json_has_one_schema(self):
        create()
        done = json.loads(run("list", "--json").stdout)
        self.assertEqual(set(done), {"total", "offset", "links"})
        self.assertEqual(set(done["links"][0]), LINK_MEMBERS)
        self.assertEqual(json.loads(run("list", "--json", "--project", "none").stdout),
                         {"total": 0, "offset": 0, "links": []})

    def test_filters(self):
        alices = create("--owner", "alice", "--title", "Tea 100%")
        bobs = create("--owner", "bob", "--project", "pictures", "--disabled")
        late = create("--start", "+1d")

        def listed(*arguments):
            done = run("list", "--json", *arguments)
            return [link["hash"] for link in json.loads(done.stdout)["links"]]
        self.assertEqual(listed(), [alices, bobs, late])
        self.assertEqual(listed("--owner", "alice"), [alices])
        self.assertEqual(listed("--owner", "2002"), [bobs])
        self.assertEqual(listed("--project", "pictures"), [bobs])
        self.assertEqual(listed("--state", "not_yet"), [late])
        self.assertEqual(listed("--state", "disabled"), [bobs])
        self.assertEqual(listed("--search", "100%"), [alices])
        self.assertEqual(listed("--search", "'"), [])
        self.assertEqual(listed("--reverse"), [late, bobs, alices])
        self.assertEqual(listed("--sort", "project_name", "--limit", "1", "--reverse"), [bobs])
        self.assertEqual(listed("--offset", "1", "--limit", "1"), [bobs])
        self.assertEqual(listed("--offset", "5"), [])

    def test_all_links_are_listed_however_many(self):
        many_links(2500)
        done = json.loads(run("list", "--json").stdout)
        self.assertEqual((done["total"], len({link["id"] for link in done["links"]})),
                         (2500, 2500))
        self.assertEqual(len(run("list").stdout.splitlines()), 2501)
        done = json.loads(run("list", "--json", "--offset", "500", "--limit", "1500").stdout)
        self.assertEqual(len(done["links"]), 1500)
        done = json.loads(run("list", "--json", "--offset", "010", "--limit", "0012").stdout)
        self.assertEqual((done["offset"], len(done["links"])), (10, 12))

    def test_the_table_is_harmless(self):
        link = create("--title", "x")
        data = data_of(link)
        data["protect_title"] = "\x1b]0;t\x07\x9b1m\n\u202e"
        sql("UPDATE entry SET data=?, project_name=? WHERE hash=?", json.dumps(data), "p\x1bq",
            link)
        for arguments in ["list"], ["show", link], ["list", "--json"], ["show", "--json", link]:
            text = run(*arguments).stdout
            self.assertNotRegex(text, "[\x00-\x09\x0b-\x1f\x7f-\x9f\u202e]")
        self.assertIn(r"\x1b]0;t\x07\x9b1m\n\u202e", run("list").stdout)
        self.assertEqual(show(link)["protect_title"], data["protect_title"])

    def test_rows_that_are_no_utf8_are_shown_with_replacements(self):
        link = create()
        sql("UPDATE entry SET project_name=CAST(x'61ff62' AS TEXT) WHERE hash=?", link)
        self.assertIn("a\ufffdb", run("list").stdout)
        self.assertEqual(show(link)["project_name"], "a\ufffdb")


if __name__ == "__main__":
    cli_program.main()
