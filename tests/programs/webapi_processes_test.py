"""The web API used by many processes at once. Arguments: the build folder, the project's folder."""

import sys
import threading
import unittest

import visitor_server as vs
import webapi_server as ws
from visitor_server import sql

API = ws.ToolFront()


def at_once(works):
    """Runs all of `works`, each in a thread of its own, from the same moment on; what they return."""
    start = threading.Barrier(len(works))
    results = [None] * len(works)

    def run(number, work):
        start.wait()
        results[number] = work()

    threads = [threading.Thread(target=run, args=item) for item in enumerate(works)]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    return results


def create(who="alice", **settings):
    answer = API.call(who, "create", **{"project_name": "x", **settings})
    assert answer.ok, answer
    return answer.data["link"]


class Processes(unittest.TestCase):
    def test_one_of_those_who_choose_the_same_hash_has_it(self):
        for number in range(6):
            works = [lambda who=who: API.call(who, "create", project_name="x", hash=f"same-{number}")
                     for who in ("alice", "bob", "carol", "root") * 2]
            codes = sorted(answer.code for answer in at_once(works))
            self.assertEqual(codes, [1] + [204] * 7)

    def test_one_of_those_who_change_to_the_same_hash_has_it(self):
        links = [create() for _ in range(8)]
        works = [lambda link=link: API.call("alice", "set", id=link["id"], hash="wanted")
                 for link in links]
        codes = sorted(answer.code for answer in at_once(works))
        self.assertEqual(codes, [1] + [204] * 7)
        self.assertEqual(len(sql("SELECT 1 FROM entry WHERE hash='wanted'")), 1)

    def test_link_is_deleted_once(self):
        link = create()
        works = [lambda: API.call("alice", "delete", id=link["id"])] * 8
        self.assertEqual(sorted(answer.code for answer in at_once(works)), [1] + [205] * 7)

    def test_drawn_hashes_are_never_refused(self):
        works = [lambda: [create()["hash"] for _ in range(10)]] * 8
        hashes = sum(at_once(works), [])
        self.assertEqual(len(set(hashes)), 80)

    def test_nobodys_change_is_lost_while_visitors_log_in(self):
        link = create(protect_password="secret", expire_times=100000, enable_match_ip=False)
        rounds = 12
        changes = {
            "protect_title": lambda n: f"title {n}",
            "project_name": lambda n: f"project-{n}",
            "start_at": lambda n: f"2020-01-{n + 1:02} 00:00:00",
            "expire_at": lambda n: f"2035-01-{n + 1:02} 00:00:00",
            "auto_gc": lambda n: n % 2 == 0,
            "redirect_uri": lambda n: f"/path/{n}",
            "app": lambda n: {"n": n},
            "protect_users": lambda n: [["alice"], ["bob"], ["alice", "bob"]][n % 3],
        }
        # Those without what follows from them: a user list would make it a link for accounts.
        fixed = {"protect_users": {"protect_type": "password"}}
        lost = []

        def change(name):
            for number in range(rounds):
                value = changes[name](number)
                answer = API.call("alice", "set", id=link["id"], **{name: value},
                                  **fixed.get(name, {}))
                if not answer.ok:
                    lost.append((name, answer))
                    continue
                # Nobody else sets it: it has to be there until the next round.
                shown = API.call("alice", "get", id=link["id"]).data["link"][name]
                if shown != value:
                    lost.append((name, value, shown))

        done = threading.Event()

        def visit(number):
            admitted = 0
            while not done.is_set():
                reply = vs.run_program("POST", "/" + link["hash"], b"password=secret",
                                       REMOTE_ADDR=f"192.0.2.{number}")
                admitted += reply.status == 303
            return admitted

        visitors = [threading.Thread(target=lambda number=number: counts.append(visit(number)))
                    for number in range(1, 3)]
        counts = []
        for visitor in visitors:
            visitor.start()
        at_once([lambda name=name: change(name) for name in changes])
        done.set()
        for visitor in visitors:
            visitor.join()
        self.assertEqual(lost, [])
        end = API.call("alice", "get", id=link["id"]).data["link"]
        self.assertEqual({name: end[name] for name in changes},
                         {name: value(rounds - 1) for name, value in changes.items()})
        # And no visitor's use either.
        self.assertGreater(sum(counts), 0)
        self.assertEqual(end["use_count"], sum(counts))


if __name__ == "__main__":
    ws.install(sys.argv[1], sys.argv[2])
    unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
