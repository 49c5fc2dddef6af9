# SPDX-License-Identifier: Apache-2.0
#
# Visits: log in, see camera 1 move, take a snapshot, log out; see and hear camera 2, hide the tab; nine
# cameras of one moment; alerts in two tabs. And what the server then still runs.
import base64
import json
import subprocess
import time
import unittest

from installation import Installation, call, recorded_events, wait_until
from painted import ClockReader
from players import numbered, playing
from visit import Visit


WATCH = 1  # over HTTPS a page is told of alerts by a request of its own, hidden or not


class BrowserTest(unittest.TestCase):
    def setUp(self):
        self.server = self.enterContext(Installation())
        self.secure = f"https://localhost:{self.server.tls_port}/"
        self.idle = self.server.requests()

    def test_a_camera_with_sound_is_drawn_and_heard_and_left_when_the_tab_is_hidden(self):
        with Visit("muxed.mjs", self.secure) as visit:
            for step, is_heard in ("watched", False), ("heard", True):
                seen = visit.see(step)
                self.assertGreaterEqual(seen["moments"] / seen["seconds"], 20, "different pictures a second")
                self.assertEqual(seen["peak"] > 0.01, is_heard, f"{step}: loudest sample {seen['peak']}")

            visit.see("hidden")
            wait_until(lambda: len(self.server.requests() - self.idle) == WATCH, 2, "the stream of a hidden tab ends")

            self.assertEqual(visit.see("seen again")["complaints"], [])
            self.assertGreater(len(self.server.requests() - self.idle), WATCH, "nothing streams")

    def recorded_camera(self, name, fps):
        source = f"test:mjpeg?size=640x360&fps={fps}&label={name}"
        recording = ["--enable", "--record", "always", "--segment", "10s"]
        added = self.server.cli("camera", "add", "--name", name, "--source", source, *recording, "--json")
        return json.loads(added)["id"]

    def recorded(self, camera, count):
        """The pictures of the first recordings, and for each when it was captured, in seconds since the epoch."""
        pictures, times = [], []
        for event in recorded_events(self.server, camera)[:count]:
            with playing(self.server, event["id"], interval=0) as parts:
                pictures += [picture for _, picture in numbered(parts, event["frame_count"], times)]
        return pictures, [float(each) for each in times]

    def arrivals(self, reader, camera):
        """How long after its painting each picture was captured, in milliseconds."""
        pictures, captured = self.recorded(camera, 1)
        return [(time * 1000 - painted) % 3_600_000 for painted, time in zip(reader.read(pictures), captured)]

    def test_nine_cameras_of_one_moment_stay_in_step(self):
        slow, fast = 5, 10
        for camera in 1, 2, 4:  # of the demo: large, and not looked at here
            self.server.cli("camera", "set", str(camera), "--disable")
        cameras = [self.recorded_camera(f"Yard {at}", slow if at % 3 == 2 else fast) for at in range(9)]
        began = wait_until(lambda: min((event["start"] for event in recorded_events(self.server, cameras[-1])), default=0), 30, "recording") + 1
        wait_until(lambda: time.time() > began + 24, 40, "footage to go through")
        reader = ClockReader(*self.recorded(cameras[-1], 2), 640, 360)
        # The players go by when pictures were captured; what is read off them is when they were painted.
        arrivals = [each for camera in cameras for each in self.arrivals(reader, camera)]
        frame_ms, arrival_ms = 1000 / slow, max(arrivals) - min(arrivals)
        steps = {"AT": str(began * 1000 + 500), "CAMERAS": ",".join(map(str, cameras)), "TZ": "UTC"}
        with Visit("in_step.mjs", self.secure, **steps) as visit:
            for step, rate in ("opened", 1), ("at 1", 1), ("at 4", 4), ("at ½", 1), ("at 1", 1):
                seen = visit.see(step)
                for sample in seen["samples"]:
                    times = reader.read([base64.b64decode(picture) for picture in sample])
                    self.assertLessEqual(max(times) - min(times), rate * frame_ms + arrival_ms, (step, times))
            dragged = visit.see("dragged")
            self.assertGreaterEqual(dragged["pictures"], 5, "pictures come while the pointer moves")
            self.assertEqual(dragged["players"], 0)
            (painted,) = reader.read([base64.b64decode(dragged["large"])])
            told = dragged["told"] % 3600
            self.assertLess(abs(painted / 1000 - told), 1.5, "the last picture is of the playhead's place")
            wait_until(lambda: len(self.server.requests() - self.idle) <= 3, 2, "nothing plays while it is dragged")
            released = visit.see("let go")
            times = reader.read([base64.b64decode(picture) for picture in released["samples"][0]])
            self.assertLessEqual(max(times) - min(times), frame_ms + arrival_ms, times)
            self.assertLess(abs(times[0] / 1000 - told), 4, "plays from where it was let go")
            closed = visit.see("closed")
            wait_until(lambda: len(self.server.requests() - self.idle) == 8 + WATCH, 2, "the closed one's player ends")
            self.assertEqual(closed["violations"] + closed["complaints"], [])

    def test_what_is_new_is_the_same_after_a_reload_and_in_every_tab(self):
        def mark(text):
            answer = self.server.request(call("VEXO.Event", "Mark"), "admin", form={"kind": "alert", "camera": 1, "text": text})
            self.assertEqual(answer.status, 200)

        wait_until(lambda: recorded_events(self.server, 1), 30, "footage, before which nothing can have happened")
        with Visit("alerts.mjs", self.secure) as visit:
            visit.see("watching")
            mark("First")
            mark("Second")
            visit.see("told")
            visit.see("away")
            mark("Third")
            visit.see("back")
            self.assertEqual(visit.see("looked")["notice"], "3 new since you looked.")
            mark("Fourth")
            visit.see("alone")
            mark("Fifth")
            seen = visit.see("looking")
            self.assertEqual((seen["notice"], seen["complaints"]), ("1 new since you looked.", []))

    def test_a_visit_over_https_and_http(self):
        for address, protocol in (self.secure, "h2"), (f"http://127.0.0.1:{self.server.port}/", "http/1.1"):
            with self.subTest(protocol), Visit("browser.mjs", address) as visit:
                seen = visit.see("streaming")
                self.assertEqual(seen["pictures"], 3, "camera 1 stands still")
                self.assertEqual(seen["protocol"], protocol)
                states = dict(seen["states"])
                self.assertEqual(sorted(states), ["1", "2", "4"])
                self.assertEqual((states["1"], states["4"]), ("live", "live"))
                self.assertGreater(len(self.server.requests()), len(self.idle), "nothing streams")

                file = visit.see("snapshot")["file"]
                self.assertRegex(file, r"^Entrance.*\.jpe?g$")
                probe = ["ffprobe", "-v", "error", "-show_entries", "stream=width,height", "-of", "csv=p=0"]
                size = subprocess.run([*probe, f"{visit.folder}/{file}"], capture_output=True, text=True, check=True)
                self.assertEqual(size.stdout.strip(), "1280,720")

                self.assertEqual(visit.see("logged out")["complaints"], [])
                wait_until(lambda: self.server.requests() == self.idle, 2, "the streams end with the session")


if __name__ == "__main__":
    unittest.main()
