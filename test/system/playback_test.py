# SPDX-License-Identifier: Apache-2.0
#
# What was recorded comes back: the frame that was asked for is the frame that is shown, at the pace that was asked for,
# through the web server; and a session's players give way to each other. playback_visits_test.py looks through a browser,
# growing_test.py has what is still being recorded.
import contextlib
import http.client
import os
import pathlib
import re
import signal
import subprocess
import time
import unittest

from demo_footage import DemoFootageTest
from installation import call, wait_until
from players import BY_TIME, FAR, numbered, pictures, playing, steer


class PlaybackTest(DemoFootageTest):
    def check(self, pairs, expected):
        """The numbers told are those expected, and so are those painted."""
        self.assertEqual([number for number, _ in pairs], expected)
        self.assertEqual(self.reader.read([picture for _, picture in pairs]), expected)

    def test_shows_the_frames_that_it_names(self):
        last = self.event["frame_count"] - 1
        h264 = self.finished(2)
        self.assertEqual((h264["video_type"], h264["audio_format"]), (3, "AAC"))
        rows = [
            ({}, [*range(30)]),
            ({"framestart": 77}, [*range(77, 90)]),
            ({"playrate": 4}, [*range(0, 40, 4)]),
            ({"playrate": 16, "framestart": 100, "framestop": 140}, [100, 116, 132, 140, 140, 140]),
            ({"playrate": -2}, [*range(8)]),
            ({"interval": 2}, [0, 50, 100]),
            ({"interval": 0}, [*range(20)]),
            ({"framestart": last - 2}, [last - 2, last - 1, last, last]),
        ]
        rows_h264 = [
            ({}, [*range(30)]), ({"framestart": 333}, [*range(333, 350)]), ({"playrate": 16}, [*range(0, 320, 16)]),
            ({"interval": 5}, [0, 125, 250, 375, 499]), ({"framestart": 499}, [499, 499]),
        ]
        for event, parameters, expected in [*((self.event, *row) for row in rows), *((h264, *row) for row in rows_h264)]:
            with self.subTest(event["id"], **parameters), playing(self.server, event["id"], **parameters) as parts:
                self.check(numbered(parts, len(expected)), expected)

    def test_keeps_the_pace_of_the_recording(self):
        for parameters, seconds in [({}, 2.0), ({"playrate": 8}, 2.0), ({"playrate": -2}, 4.0)]:
            with self.subTest(parameters), playing(self.server, self.event["id"], **parameters) as parts:
                numbered(parts, 1)
                began = time.monotonic()
                numbered(parts, 50)
                self.assertAlmostEqual(time.monotonic() - began, seconds, delta=0.3)

    def test_plays_between_times(self):
        start, frames = 2000, 15
        span = {"startTimeMS": start, "stopTimeMS": start + frames * 40}
        with playing(self.server, self.event["id"], method=BY_TIME, **span) as parts:
            shown = [picture for _, picture in parts.rest()]
        self.assertEqual(self.reader.read(shown), [50, *range(50, 50 + frames)], "the first picture comes twice")

    def test_takes_a_new_rate_while_it_plays(self):
        with playing(self.server, self.event["id"]) as parts:
            numbers = [number for number, _ in numbered(parts, 3)]
            self.assertEqual(steer(self.server, "SetRate", rate=4).json["data"], {"rate": 4})
            numbers += [number for number, _ in numbered(parts, 20)]
            steps = [after - before for before, after in zip(numbers, numbers[1:])]
            self.assertEqual(sorted(set(steps)), [1, 4], numbers)
            self.assertEqual(steps, sorted(steps))
            self.assertEqual(steer(self.server, "Pause", on="true").status, 409)

    def test_stands_still_while_it_is_paused(self):
        with playing(self.server, self.event["id"], method=BY_TIME, changerate=1, playrate=2) as parts:
            pictures(parts, 5)
            self.assertEqual(steer(self.server, "Pause", on="true").status, 200)
            pictures(parts, 4)
            still = self.reader.read(pictures(parts, 6))
            self.assertEqual(len(set(still)), 1, still)
            self.assertEqual(steer(self.server, "Pause", on="false").status, 200)
            moving = self.reader.read(pictures(parts, 10))
            self.assertLessEqual(max(b - a for a, b in zip([still[-1], *moving], moving)), 2, "nothing is left out")
            self.assertEqual(moving[-1] - moving[-2], 2, "the rate is back")

    def test_tells_where_it_is(self):
        with playing(self.server, self.event["id"], method=BY_TIME, startTimeMS=3000) as parts:
            shown = pictures(parts, 25)
            position = self.server.request(call("VEXO.Playback", "GetPosition", timestamp=1), "admin").json["data"]
            # Read only now, for that takes longer than a picture is shown.
            self.assertAlmostEqual(position["position_ms"], self.reader.read(shown)[-1] * 40, delta=400)
            self.assertEqual(steer(self.server, "Stop").status, 200)
            wait_until(parts.ends, 3, "it stops")

    def test_gives_a_picture_of_any_time(self):
        for camera, event, key_frame in ((1, self.event, 77), (2, self.finished(2), 75)):
            asked = call("VEXO.Picture", "At", camera=camera, time_ms=event["start"] * 1000 + 77 * 40)
            whole = self.server.request({**asked, "width": 640}, "admin")
            self.assertEqual(self.reader.read([whole.body]), [key_frame])
            self.assertEqual(whole.headers["X-Capture-Time"], self.captured(event, key_frame))
            self.assertIn("immutable", whole.headers["Cache-Control"])
            known = {"If-None-Match": whole.headers["ETag"]}
            self.assertEqual(self.server.request({**asked, "width": 640}, "admin", headers=known).status, 304)
            small = self.server.request({**asked, "width": 160}, "admin").body
            self.assertEqual(self.probe(small, "stream=width,height").strip(), "160,90")

    def test_an_older_player_gives_way(self):
        self.server.cli("setting", "set", "players_per_session", "1")
        self.addCleanup(self.server.cli, "setting", "set", "players_per_session", "9")
        cookie, other_cookie = self.server.login("admin"), self.server.login("admin")
        with playing(self.server, self.event["id"], cookie=other_cookie, playrate=-8) as other, \
             playing(self.server, self.event["id"], cookie=cookie, timestamp=1) as older:
            numbered(older, 3)
            with playing(self.server, self.event["id"], cookie=cookie, timestamp=2) as newer:
                numbered(newer, 1)
                began = time.monotonic()
                wait_until(older.ends, 2, "the older one ends")
                self.assertLess(time.monotonic() - began, 0.5)
                numbered(newer, 10)
            numbered(other, 3)
        # A player that cannot start takes nobody's place.
        with playing(self.server, self.event["id"], cookie=cookie) as player:
            with playing(self.server, 999999, cookie=cookie, timestamp=2) as nothing:
                self.assertEqual(nothing.response.status, 302)
            numbered(player, 30)

    def test_gives_footage_to_take_along(self):
        for camera, streams in ((1, "video\n"), (2, "audio\nvideo\n")):
            event = self.finished(camera)
            answer = self.server.request(call("VEXO.Event", "Download", event=event["id"]), "admin")
            self.assertEqual(answer.status, 200)
            self.assertRegex(answer.headers["Content-Disposition"], r'^attachment; filename="\w+ [-0-9]+ [.0-9]+Z\.mkv"')
            self.assertEqual("".join(sorted(self.probe(answer.body, "stream=codec_type").splitlines(True))), streams)
            frames = self.probe(answer.body, "stream=nb_read_frames", "-count_frames", "-select_streams", "v")
            self.assertEqual(int(frames), event["frame_count"])

    def test_a_download_that_fails_midway_is_seen_to_be_cut(self):
        event = self.finished(1)
        file = next(self.server.home.rglob(event["name"]))
        whole = file.read_bytes()
        connection, response = self.server.open(call("VEXO.Event", "Download", event=event["id"]), "admin")
        with contextlib.closing(connection):
            try:
                os.truncate(file, len(whole) // 2)
                with self.assertRaises(http.client.IncompleteRead):
                    response.read()
            finally:
                file.write_bytes(whole)

    def probe(self, data, entries, *options):
        done = subprocess.run(
            ["ffprobe", "-v", "error", *options, "-show_entries", entries, "-of", "csv=p=0", "-"],
            input=data, capture_output=True, timeout=60,
        )
        self.assertEqual(done.stderr, b"")
        return done.stdout.decode()

    def test_plays_the_footage_of_alerts_and_transactions(self):
        for kind, kind_number in (("alert", 1), ("pos", 2)):
            mark, recording = self.mark(kind)
            times = []
            with playing(self.server, mark["id"], recEvtType=kind_number) as parts:
                pairs = numbered(parts, 30, times)
            painted = self.reader.read([picture for _, picture in pairs])
            self.assertEqual([number for number, _ in pairs], [*range(30)])
            self.assertEqual(painted, [*range(painted[0], painted[0] + 30)])
            self.assertGreater(painted[0], 0, "the footage begins inside the recording")
            self.assertEqual(times, [self.captured(recording, number) for number in painted])

    def test_what_is_forbidden_or_gone_does_not_play(self):
        forbidden = self.finished(2)
        for parameters in ({"event": forbidden["id"]}, {"event": 999999}, {"event": self.event["id"], "mountid": 99},
                           {"event": self.event["id"], "recEvtType": 1}, {"event": self.event["id"], "framestart": FAR}):
            with self.subTest(parameters), playing(self.server, account="viewer", **parameters) as parts:
                self.assertEqual(parts.response.status, 302)
                self.assertTrue(parts.response.headers["Location"].endswith("icon_indicator_warning.png"))
        with playing(self.server, self.event["id"], account="viewer") as parts:
            self.check(numbered(parts, 3), [0, 1, 2])

    def test_players_hold_neither_the_store_nor_libraries_that_they_do_not_need(self):
        def loads(library, pid):
            return library in pathlib.Path(f"/proc/{pid}/maps").read_text()

        for camera, decodes in ((1, False), (2, True)):
            event = self.finished(camera)
            before = self.server.requests()
            with playing(self.server, event["id"]) as parts:
                numbered(parts, 3)
                (player,) = self.server.requests() - before
                open_files = [os.readlink(path) for path in pathlib.Path(f"/proc/{player}/fd").iterdir()]
                self.assertFalse([path for path in open_files if "lookhaven.db" in path])
                self.assertTrue([path for path in open_files if path.endswith(event["name"])], open_files)
                self.assertEqual(loads("libavcodec", player), decodes)
                # The decoder's own.
                threads = [task for task in pathlib.Path(f"/proc/{player}/task").iterdir() if int(task.name) != player]
                self.assertEqual(bool(threads), decodes)
                for task in threads:
                    blocked = int(re.search(r"SigBlk:\s(\w+)", (task / "status").read_text())[1], 16)
                    for number in (signal.SIGTERM, signal.SIGUSR1, signal.SIGUSR2):
                        self.assertTrue(blocked >> (number - 1) & 1, "a signal must reach the thread that plays")
        for library in ("libavcodec", "libpq"):
            self.assertFalse(loads(library, self.server.part("webapi")), f"each fork would pay for {library}")

    def test_a_recording_that_is_deleted_plays_on(self):
        event = self.finished(1)
        file = next(self.server.home.rglob(event["name"]))
        copy = file.read_bytes()
        with playing(self.server, event["id"]) as parts:
            numbered(parts, 3)
            file.unlink()
            try:
                numbered(parts, 20)
                with playing(self.server, event["id"], timestamp=2) as gone:
                    self.assertEqual(gone.response.status, 302)
            finally:
                file.write_bytes(copy)


if __name__ == "__main__":
    unittest.main()
