# SPDX-License-Identifier: Apache-2.0
#
# A recording that is kept stays when its mount's limit deletes those around it, until it is released.
import json
import time
import unittest

from installation import Installation, call, recorded_events, wait_until

DAYS = {"from": int(time.time()) - 8 * 86400}


class KeptTest(unittest.TestCase):
    """The demo's recordings of some days, on a mount whose limit has room for none of them."""

    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation(LOOKHAVEN_DEMO_FOOTAGE="yes"))

    def finished(self):
        events = recorded_events(self.server, "1,2", **DAYS)
        return {event["id"]: event for event in events if not event["is_recording"]}

    def files(self, names):
        return {name for name in names if next(self.server.home.rglob(name), None)}

    def keep(self, event, **parameters):
        answer = self.server.request(call("VEXO.Event", "Keep"), "admin", form={"event": event, **parameters})
        self.assertEqual(answer.status, 200, answer.body)

    def test_kept_recording_outlives_its_neighbours(self):
        before = self.finished()
        self.assertGreater(len(before), 3)
        # One in the middle, so that there are older and newer ones.
        kept = sorted(before, key=lambda id: before[id]["start"])[len(before) // 2]
        name = before[kept]["name"]
        self.keep(kept, note="police")
        mount = json.loads(self.server.cli("mount", "list", "--json"))[0]["id"]
        self.server.cli("mount", "set", str(mount), "--limit", "1M", "--yes")
        wait_until(lambda: before.keys() & self.finished().keys() == {kept}, 60, "the limit deletes all but what is kept")
        names = {event["name"] for event in before.values()}
        wait_until(lambda: self.files(names) == {name}, 30, "only the file of the kept recording is left")
        picture = self.server.request(call("VEXO.Picture", "At", event=kept), "admin")
        self.assertEqual((picture.status, picture.body[:2]), (200, b"\xff\xd8"))
        self.keep(kept, keep="false")
        wait_until(lambda: kept not in self.finished(), 60, "the limit deletes what was released")
        wait_until(lambda: not self.files(names), 30, "its file goes")


if __name__ == "__main__":
    unittest.main()
