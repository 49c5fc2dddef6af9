# SPDX-License-Identifier: Apache-2.0
#
# E-maps through the web server: who sees what of them, how they are changed, and pictures that mean harm.
import json
import os
import unittest

from api_test import call, play
from docs_test import PNG
from installation import Installation, recorded_events, wait_until
from visit import Visit

JSON = {"Content-Type": "application/json"}


class EmapTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())

    def command(self, *words):
        return json.loads(self.server.cli(*words, "--json"))

    def ask(self, method, account="admin", **parameters):
        return self.server.request(call("VEXO.Emap", method, **parameters), account)

    def save(self, **changes):
        return self.server.request(call("VEXO.Emap", "SaveItems"), "admin", body=json.dumps(changes), headers=JSON)

    def shown(self, emap, account="admin"):
        answer = self.server.request(play(emap, itemType=1), account)
        self.assertEqual(answer.headers.get_content_type(), "application/json")
        self.assertEqual(answer.headers["X-Content-Type-Options"], "nosniff", "a picture could run its script")
        return answer.json["data"]

    def kinds(self, account):
        return [(item["type"], item["id"]) for item in self.shown(1, account)["items"]]

    def test_each_caller_sees_what_he_may(self):
        every = [("0", "1"), ("0", "1"), ("0", "2"), ("1", "2"), ("2", "1"), ("2", "2"), ("3", "1"), ("3", "1"), ("4", "1")]
        self.assertEqual(self.kinds("admin"), every)
        self.assertEqual(self.kinds("viewer"), [item for item in every if item not in (("0", "2"), ("2", "2"))])
        states = self.ask("States", "viewer", emap=1).json["data"]
        self.assertEqual([door["id"] for door in states["door"]], [1])
        self.command("user", "deny", "viewer", "--emap", "2")
        self.command("user", "deny", "viewer", "--io", "1")
        self.server.forget_sessions()
        self.assertEqual(self.kinds("viewer"), [("0", "1"), ("0", "1"), ("2", "1"), ("4", "1")])
        self.assertEqual(self.server.request(play(2, itemType=1), "viewer").status, 502)
        self.assertEqual(self.ask("States", "viewer", emap=2).status, 404)
        names = self.server.request(call("VEXO.Catalog", "Emaps"), "viewer").json["data"]["emap"]
        self.assertEqual({frozenset(emap) for emap in names}, {frozenset({"id", "name"})}, "nor how many items a map has")

    def test_a_change_is_shown_and_a_stale_one_is_not_taken(self):
        before = self.ask("Items", emap=2).json["data"]
        items = [{**item, "x": 333} for item in before["items"]]
        saved = self.save(emap=2, revision=before["revision"], items=items, hideItemName=True)
        self.assertEqual(saved.status, 200, saved.body)
        self.assertTrue(all(item["x"] == "333" for item in self.shown(2)["items"]))
        self.assertTrue(self.shown(2)["hideItemName"])
        revision = saved.json["data"]["revision"]
        bad = {"type": 0, "id": 1}
        for what, changes, status in [
            ("stale", {"revision": before["revision"], "items": items}, 409),
            ("items of another type", {"items": 5}, 400),
            ("no items", {}, 400),
            ("unknown device", {"items": [{**bad, "id": 99}]}, 404),
            ("unknown kind", {"items": [{**bad, "type": 7}]}, 400),
            ("fraction", {"items": [{**bad, "x": 1.5}]}, 400),
            ("too far", {"items": [{**bad, "x": 2**31}]}, 400),
            ("long name", {"items": [{**bad, "name": "n" * 256}]}, 400),
            ("too many", {"items": [bad] * 1001}, 400),
        ]:
            with self.subTest(what=what):
                self.assertEqual(self.save(**{"emap": 2, "revision": revision, **changes}).status, status)
        self.assertEqual(self.ask("SaveItems", emap=2, revision=revision, items="[]").status, 405)
        self.assertEqual(self.ask("Items", emap=2).json["data"]["revision"], revision)

    def test_states_come_from_reports(self):
        report = call("VEXO.Emap", "Report")
        for form, status in [
            ({"kind": "door", "id": 1, "state": "open"}, 200),
            ({"kind": "io", "id": 1, "portIdx": 0, "state": "on"}, 200),
            ({"kind": "io", "id": 1, "state": "on"}, 404),
            ({"kind": "door", "id": 1, "state": "ajar"}, 400),
            ({"kind": "camera", "id": 1, "state": "on"}, 400),
        ]:
            self.assertEqual(self.server.request(report, "admin", form=form).status, status, form)
        states = self.ask("States", emap=1).json["data"]
        self.assertEqual(states["door"][0]["state"] + states["io"][0]["state"], "openon")

    def test_a_picture_that_is_broken_or_gone_leaves_the_items(self):
        whole = self.server.home / "whole"
        whole.write_bytes(PNG)
        made = self.command("emap", "add", "Broken", str(whole))
        self.command("emap", "item", "add", str(made["id"]), "camera", "1")
        self.assertEqual(self.shown(made["id"])["emapType"], "png")
        picture = self.server.home / "emaps" / made["image"]
        picture.write_bytes(b"\x89PNG\r\n\x1a\nand nothing more")
        self.assertEqual((self.shown(made["id"])["emapType"], self.shown(made["id"])["itemNum"]), ("png", 1))
        picture.unlink()
        os.mkfifo(picture)  # opening it to read would hang
        data = self.shown(made["id"])
        self.assertEqual((data["emap"], data["emapLength"], data["itemNum"]), ("", "0", 1))

    def test_a_large_body_is_a_managers_picture_alone(self):
        large = PNG + bytes(5 << 20)
        for what, status, picture, account, more in [
            ("a picture", 200, PNG, "admin", {"name": "Small"}),
            ("bytes behind it", 200, large, "admin", {"name": "Large"}),
            ("a viewer's", 403, large, "viewer", {"name": "x"}),
            ("nobody's", 401, large, None, {"name": "x"}),
            ("more than 20 MiB", 413, PNG + bytes(20 << 20), "admin", {"name": "x"}),
            ("of a method that takes none", 413, large, "admin", {"method": "Remove"}),
            ("of an api that takes none", 413, large, "admin", {"method": "Add", "API": "VEXO.Camera"}),
            ("a method named twice", 413, large, "admin", {"method": "Add&method=Remove", "name": "x"}),
            ("an escaped name of the api", 413, large, "admin", {"API": "VEXO%2eEmap", "name": "x"}),
        ]:
            with self.subTest(what):
                api, method = more.pop("API", "VEXO.Emap"), more.pop("method", "Add")
                query = "&".join([f"api={api}&version=1&method={method}", *(f"{name}={text}" for name, text in more.items())])
                answer = self.server.request(query, account, body=picture, headers={"Content-Type": "image/png"})
                self.assertEqual(answer.status, status, answer.body)
                self.assertEqual(answer.headers.get_content_type(), "application/json")
        self.assertEqual(list((self.server.home / "run/nginx-body").rglob("*[0-9]")), [], "no body is left")

    def test_a_visit(self):
        harm = self.server.home / "harm.svg"
        script = "<script>top.document.title = 'harmed'</script><rect width='9' height='9' onload='top.document.title=1'/>"
        harm.write_text(f"<svg xmlns='http://www.w3.org/2000/svg' width='40' height='30'>{script}</svg>")
        self.command("emap", "add", "Harmful", str(harm))
        wait_until(lambda: recorded_events(self.server, 1), 30, "footage, before which nothing can have happened")
        for number in range(6):
            transaction = {"kind": "pos", "camera": 1, "text": f"Tea {number}"}
            self.assertEqual(self.server.request(call("VEXO.Event", "Mark"), "admin", form=transaction).status, 200)
        with Visit("maps.mjs", f"http://127.0.0.1:{self.server.port}/") as visit:
            seen = visit.see("shown")
            self.assertEqual((seen["items"], seen["picture"]), (9, [1200, 800]))
            self.assertEqual(visit.see("camera")["hash"], "#map=1&camera=1")
            self.assertEqual(visit.see("link")["hash"], "#map=2")

            transactions = visit.see("transactions")["transactions"]
            self.assertEqual([each.rpartition(" · ")[2] for each in transactions], [f"Tea {number}" for number in (5, 4, 3, 2, 1)])

            seen = visit.see("moved")
            self.assertEqual(seen["undone"], seen["before"])
            self.assertEqual(seen["saved"], seen["dragged"])
            self.assertTrue(seen["dragged"][0] > seen["before"][0] and seen["dragged"][1] < seen["before"][1], seen)
            items = self.ask("Items", emap=1).json["data"]
            terminal = next(item for item in items["items"] if item["name"] == "POS terminal")
            self.assertEqual([terminal["x"], terminal["y"]], seen["saved"])
            self.assertEqual(self.save(emap=1, revision=items["revision"], items=[terminal]).status, 200)

            seen = visit.see("saved over")
            items = self.ask("Items", emap=1).json["data"]["items"]
            self.assertEqual(len(items), 9, "the visitor's items are on top of the others'")
            self.assertEqual([terminal["x"] + 1, terminal["y"]], seen["saved"])

            seen = visit.see("harmless")
            self.assertEqual((seen["title"], seen["complaints"]), ("Harmful · Lookhaven", []))


if __name__ == "__main__":
    unittest.main()
