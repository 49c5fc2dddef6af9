# SPDX-License-Identifier: Apache-2.0
#
# A recording plays while it is still being recorded: up to this moment, and on as it grows.
import time
import unittest

from installation import Installation, recorded_events, wait_until
from painted import NumberReader
from players import BY_TIME, FAR, numbered, pictures, playing, steer


class GrowingTest(unittest.TestCase):
    """What the recorder is writing at the moment."""

    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())

    def growing(self):
        def found():
            return next((event for event in recorded_events(self.server, 1) if event["is_recording"]), None)
        return wait_until(lambda: (found() or {"frame_count": 0})["frame_count"] >= 25 and found(), 30, "an event grows")

    def check(self, shown):
        painted = NumberReader(shown, 1280, 720).read(shown)
        self.assertEqual(painted, [*range(painted[0], painted[0] + len(shown))])

    def test_is_followed_from_any_frame_to_its_end_and_beyond(self):
        event = self.growing()
        rows = [(0, event["frame_count"] + 75, {"interval": 0}), (0, 25, {}), (20, 25, {}), (7, 25, {})]
        for start, count, parameters in rows:
            with playing(self.server, event["id"], framestart=start, framestop=FAR, **parameters) as parts:
                pairs = numbered(parts, count)
            self.assertEqual([number for number, _ in pairs], [*range(start, start + count)])
            self.check([picture for _, picture in pairs])

    def test_is_playable_up_to_this_moment(self):
        event = self.growing()
        wait_until(lambda: time.time() - event["start"] > 4, 10, "some footage")
        start_ms = int((time.time() - event["start"]) * 1000) - 2500
        with playing(self.server, event["id"], method=BY_TIME, flushHeader=1, startTimeMS=start_ms) as parts:
            shown = [picture for _, picture in parts.rest()]
        self.check(shown[1:])
        # The event began up to a second after the whole second that the list tells.
        self.assertGreaterEqual(len(shown), 25 * 1.5 - 8)
        self.assertLess(len(shown), 25 * 2.5 + 25, "it ends where the recording was when it was asked for")

    def test_pause_at_the_end_does_not_end_it(self):
        event = self.growing()
        with playing(self.server, event["id"], method=BY_TIME, flushHeader=1, stopTimeMS=FAR,
                     startTimeMS=int((time.time() - event["start"]) * 1000) - 500) as parts:
            pictures(parts, 20)
            for on in ("true", "false", "true", "false"):
                self.assertEqual(steer(self.server, "Pause", on=on).status, 200)
                pictures(parts, 5)


if __name__ == "__main__":
    unittest.main()
