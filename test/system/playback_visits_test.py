# SPDX-License-Identifier: Apache-2.0
#
# Visits to what was recorded: the picture of a time is found, video is played as it was recorded and heard, and each
# step of a dragged playhead brings its picture.
import base64
import hashlib
import json
import pathlib
import time
import unittest
import zipfile

from demo_footage import DemoFootageTest
from installation import call
from visit import Visit


class PlaybackVisitsTest(DemoFootageTest):
    @property
    def address(self):
        return f"http://127.0.0.1:{self.server.port}/"

    def test_a_visit_finds_the_picture_of_a_time(self):
        span = {"EVENT_START": str(self.event["start"]), "EVENT_MIDDLE": str(self.event["start"] + 8)}
        marks = {kind: self.mark(kind) for kind in ("alert", "pos")}
        links = ",".join(f"{kind}={mark['id']}" for kind, (mark, _) in marks.items())
        with Visit("events.mjs", self.address, TZ="UTC", MARKS=links, **span) as visit:
            def see(step, event=self.event, is_number_told=True, texts=("time", "caption")):
                seen = visit.see(step)
                painted = seen["painted"] = self.reader.read([base64.b64decode(seen["picture"])])[0]
                if is_number_told:
                    self.assertEqual(painted, seen["told"], f"{step}: the picture is the frame that is named")
                clock = time.strftime("%H:%M:%S", time.gmtime(event["start"] + painted // 25))
                for text in texts:
                    self.assertEqual(seen[text].split()[-1], f"{clock}.{painted % 25 * 40 // 100}")
                return seen

            found = see("found")
            self.assertLess(abs(found["told"] - 8 * 25), 25, "the time that was clicked, as far as the timeline can be read")
            snapshot = pathlib.Path(visit.folder, visit.see("snapshot")["file"]).read_bytes()
            self.assertEqual(self.reader.read([snapshot]), [found["told"]])
            self.assertTrue(visit.see("stands still")["same"])
            self.assertEqual(see("one on")["told"], found["told"] + 1)
            self.assertEqual(see("two back")["told"], found["told"] - 1)
            jumped = see("jumped")
            self.assertLess(abs(jumped["told"] - found["told"] - jumped["by"] * 25), 25)
            dragged = see("dragged", is_number_told=False, texts=["caption"])
            self.assertLess(abs(found["told"] - dragged["painted"] - dragged["by"] * 25), 25 + 25)
            self.assertGreater(see("let go")["told"], dragged["painted"] - 25, "it plays on from there")
            for kind, (mark, recording) in marks.items():
                opened = see(kind, recording, is_number_told=False)
                self.assertGreater(opened["told"], 0)
                self.assertEqual(opened["said"], "\n".join(mark["text"]))
                place = call("VEXO.Event", "Next", cameralists="1,2,4", time=mark["start"], event=mark["id"])
                following = self.server.request(place, "admin").json["data"]["event"]
                self.assertIn(time.strftime("%H:%M", time.gmtime(following.get("time", following["start"]))), opened["next"])
            walked = visit.see("walked")
            self.assertEqual(walked["address"].partition("&")[0], f"#{following['kind']}={following['id']}")
            self.assertIn(walked["notice"], opened["next"])
            self.assertGreater(walked["stills"], 1)
            exported = visit.see("exported")
            with zipfile.ZipFile(f"{visit.folder}/{exported['file']}") as archive:
                for camera in json.loads(archive.read("manifest.json"))["camera"]:
                    for file in camera["file"]:
                        self.assertEqual(hashlib.sha256(archive.read(file["name"])).hexdigest(), file["sha256"])
            self.assertEqual(exported["complaints"], [])

    def test_a_visit_plays_video_as_it_was_recorded(self):
        h264 = self.finished(2)
        events = {"H264_EVENT": str(h264["id"]), "MJPEG_EVENT": str(self.event["id"])}
        with Visit("recorded_video.mjs", self.address, TZ="UTC", **events) as visit:
            def see(step, event=h264):
                seen = visit.see(step)
                painted = self.reader.read([base64.b64decode(seen["picture"])])[0]
                self.assertEqual(painted, seen["told"], "the picture is the frame that is named")
                clock = time.strftime("%H:%M:%S", time.gmtime(event["start"] + painted // 25))
                self.assertEqual(seen["caption"].split()[-1], f"{clock}.{painted % 25 * 40 // 100}")
                return seen

            paused = see("paused")
            self.assertGreater(paused["video"], 20)
            self.assertEqual(paused["pictures"], 0)
            self.assertEqual(see("stepped")["told"], paused["told"] + 1)
            for step in ("heard", "twice as fast"):
                self.assertEqual(see(step)["pictures"], 0)
            self.assertEqual(see("four times as fast")["video"], 0)
            jpeg = see("motion jpeg", self.event)
            self.assertEqual(jpeg["video"], 0)
            self.assertEqual(jpeg["complaints"], [])

    def test_each_step_of_a_dragged_playhead_brings_its_picture(self):
        recordings = self.event, self.finished(2)
        events = ",".join(f"{event['id']}@{event['start'] + 10}" for event in recordings)
        with Visit("dragged.mjs", self.address, EVENTS=events, LOOKHAVEN_WATCH_MS="1000") as visit:
            for event in recordings:
                stepped = visit.see("stepped")
                self.assertGreaterEqual(stepped["steps"], 10)
                self.assertEqual(stepped["pictures"], stepped["steps"])
                self.assertLessEqual(stepped["asked"], stepped["steps"], "no request for anything else")
                dragged = visit.see("dragged")
                self.assertLessEqual(dragged["asked"], dragged["moves"])
                self.assertGreater(dragged["pictures"], 0)

    def test_a_visit_outlives_an_outage_on_each_screen_and_a_link_leads_to_its_picture(self):
        address = f"#event={self.event['id']}&layout=2&cameras=1,0,0,2&filter=1&kinds=alarm,pos"
        with Visit("outage.mjs", self.address, TZ="UTC", PLAYING=address) as visit:
            visit.see("all shown")
            self.server.stop()
            visit.see("all told")
            self.server.start()
            back = visit.see("all back")
            self.assertGreaterEqual(back["resumed"], back["lost"])
            self.assertLess(back["resumed"] - back["lost"], 4 * 25, "it goes on where it was")
            linked = visit.see("linked")
            for part in address[1:].split("&"):
                self.assertIn(part, linked["hash"])
            frame = [linked.pop("frame") - 1]
            for step in ("linked", "opened", "reloaded", "back"):
                seen = linked if step == "linked" else visit.see(step)
                self.assertEqual(self.reader.read([base64.b64decode(seen.pop("picture"))]), frame, step)
                self.assertEqual({**seen, "step": "linked"}, linked)
            visit.see("forward")


if __name__ == "__main__":
    unittest.main()
