# SPDX-License-Identifier: Apache-2.0
#
# What was really recorded is what a search finds, for those who may see it.
import calendar
import pathlib
import subprocess
import sys
import time
import unittest

from installation import PASSWORDS, PLAYER, Installation, call, recorded_events, wait_until

sys.path.append(str(pathlib.Path(__file__).resolve().parents[2] / "bench"))
from postgres import Postgres  # noqa: E402


class SearchTest(unittest.TestCase):
    """The demo's recordings: 20 s each, some in the last days; both cameras record on."""

    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation(LOOKHAVEN_DEMO_FOOTAGE="yes"))

    def ask(self, api, method, **parameters):
        return self.server.request(call(api, method, **parameters), "admin").json["data"]

    def recorded(self, camera):
        """Begin and end of each recording of the camera that lies on the disk, as the file itself tells them."""
        for path in sorted(self.server.home.rglob(f"{camera}/*/*.mkv")):
            begin = calendar.timegm(time.strptime(path.parent.name + path.name[:6], "%Y-%m-%d%H%M%S"))
            probe = ["ffprobe", "-v", "error", "-show_entries", "format=duration", "-of", "csv=p=0", path]
            length = subprocess.run(probe, capture_output=True, text=True, timeout=60).stdout.strip()
            if length and length != "N/A":
                yield begin, begin + round(float(length))

    def test_finds_the_days(self):
        now = int(time.time())
        # Days of this zone begin at any time of the day.
        for start in (now - 5 * 86400, now // 86400 * 86400 - 4 * 86400 + 3600 * 5):
            spans = list(self.recorded(1))
            self.assertGreaterEqual(len(spans), 4)
            expected = [
                int(any(begin < start + (day + 1) * 86400 and end > start + day * 86400 for begin, end in spans))
                for day in range(6)
            ]
            found = self.ask(PLAYER, "SearchAvaiDate", cameralists="1", start=start, day_count=6)["available_day"]
            self.assertEqual(found[:4], expected[:4])
            self.assertIn(1, found)

    def test_finds_what_was_recorded_and_nothing_else(self):
        to = int(time.time()) - 3600  # what is being recorded now is no part of it
        start = to - 5 * 86400
        answer = self.ask(PLAYER, "EnumEvent", **{"cameralists": "1,2,1", "from": start, "to": to, "interval": 1})
        self.assertEqual([entry["camera_id"] for entry in answer["camera"]], [1, 2, 1])
        for entry in answer["camera"]:
            camera = entry["camera_id"]
            spans = [span for span in self.recorded(camera) if span[0] < to]
            self.assertEqual([(event["start"], event["stop"]) for event in entry["event"]], spans)
            self.assertEqual(entry["total"], len(spans))
            seconds = [value for value, count in entry["event_map"]["runs"] for _ in range(count)]
            self.assertEqual(len(seconds), to - start)
            covered = {second for begin, end in spans for second in range(begin, end)}
            self.assertEqual({start + i for i, value in enumerate(seconds) if value == 2}, covered)
            for event in entry["event"]:
                self.assertEqual(event["frame_count"], 25 * (event["stop"] - event["start"]))
                file = next(self.server.home.rglob(event["name"]))
                self.assertAlmostEqual(event["event_size"] * 2**20, file.stat().st_size, delta=50_000)

    def test_groups_and_mounts_select_cameras(self):
        now = int(time.time())
        (group,) = self.ask("VEXO.Catalog", "Groups")["group"]
        mount = self.ask("VEXO.Catalog", "Mounts")["mount"][0]
        self.assertEqual(group["camera"], [1, 2])
        for by, cameras in ({"camGrpId": group["id"]}, [1, 2]), ({"mount_id": mount["id"]}, sorted({1, 2, 3, 4} & {*mount["camera"]})):
            found = self.ask(PLAYER, "EnumEvent", **{"cameralists": "1,2,3,4", "from": now - 3600, "to": now, **by})["camera"]
            self.assertEqual([entry["camera_id"] for entry in found], cameras)

    def test_words_find_what_a_mark_says_for_those_who_may_see_its_camera(self):
        self.addCleanup(self.server.forget_sessions)
        self.addCleanup(self.server.cli, "user", "deny", "viewer", "2")  # as the demo does
        form = {"kind": "pos", "camera": 2, "text": "1 Coffee 2.80\nTotal 2.80 searched"}
        mark = self.server.request(call("VEXO.Event", "Mark"), "admin", form=form).json["data"]["id"]
        rows = [
            # who, which words, of which cameras and kinds: whether it is found
            ("admin", "searched COFFEE", {}, True),
            ("viewer", "searched", {"cameralists": "2"}, True),
            ("admin", "searched", {"cameralists": "1"}, False),
            ("admin", "searched", {"kind": "alert"}, False),
            ("admin", "searched tea", {}, False),
            ("admin", "search", {}, False),
            ("denied", "searched", {}, False),
            ("denied", "searched", {"cameralists": "2"}, False),
        ]
        for who, text, where, is_found in rows:
            if who != "admin":
                self.server.cli("user", "deny" if who == "denied" else "allow", "viewer", "2")
                self.server.forget_sessions()
            with self.subTest(who, text=text, **where):
                account = "admin" if who == "admin" else "viewer"
                found = self.server.request(call("VEXO.Event", "List", text=text, **where), account).json["data"]["event"]
                self.assertEqual([one["id"] for one in found], [mark] * is_found)
                for one in found:
                    self.assertIn("searched", one["found"][1][1::2])


class PostgresSearchTest(unittest.TestCase):
    """The same words, where PostgreSQL keeps the records and searches the texts."""

    @classmethod
    def setUpClass(cls):
        store = cls.enterClassContext(Postgres()).new_database("search")
        server = Installation()
        server.home.mkdir()
        (server.home / "store").write_text(store + "\n")
        server.cli("init", "--admin", "admin", text=PASSWORDS["admin"] + "\n")
        server.cli("demo", "setup", text=PASSWORDS["viewer"] + "\n")
        cls.server = cls.enterClassContext(server)

    test_words_find_what_a_mark_says = SearchTest.test_words_find_what_a_mark_says_for_those_who_may_see_its_camera


class RecordedNowTest(unittest.TestCase):
    """What the recorder records in this very test."""

    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())
        for camera in ("1", "2"):
            cls.server.cli("camera", "set", camera, "--record", "always", "--segment", "10s")
        def last_two(camera):
            return [event["is_recording"] for event in recorded_events(cls.server, camera)[-2:]]
        for camera in (1, 2):
            wait_until(lambda: last_two(camera) == [False, True], 60, "an event has ended, the next has begun")

    def test_is_found_with_its_coverage(self):
        now = int(time.time())
        span = {"from": now - 600, "to": now, "recording": "true"}
        query = call(PLAYER, "EnumEvent", cameralists="1,2", interval=1, **span)
        for entry in self.server.request(query, "admin").json["data"]["camera"]:
            seconds = [value for value, count in entry["event_map"]["runs"] for _ in range(count)]
            self.assertEqual(seconds[0], 0, "nothing before the start")
            first = min(event["start"] for event in entry["event"]) - (now - 600)
            self.assertNotIn(0, seconds[first + 1 : -5], "no hole from the first event to a moment ago")
            for event in entry["event"]:
                # Whole seconds around the footage: it may begin within the first and end within the last.
                length = event["stop"] - event["start"]
                self.assertLess(25 * (length - 2) - 2, event["frame_count"], event)
                self.assertLessEqual(event["frame_count"], 25 * length + 2, event)
            self.assertEqual([event["is_recording"] for event in entry["event"][:-1]], [False] * (entry["total"] - 1))
        query = call(PLAYER, "SearchAvaiDate", cameralists="1", start=now // 86400 * 86400)
        self.assertEqual(self.server.request(query, "admin").json["data"]["available_day"], [1])
        finished = recorded_events(self.server, 1, recording="false")
        self.assertEqual({event["is_recording"] for event in finished}, {False}, "what grows is left out unless asked for")


if __name__ == "__main__":
    unittest.main()
