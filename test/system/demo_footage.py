# SPDX-License-Identifier: Apache-2.0
#
# Tests of what the demo has recorded: 20 s of 640x360 at 25 pictures a second, and the number painted is the frame's.
import unittest

from installation import Installation, call, recorded_events
from painted import NumberReader
from players import numbered, playing


class DemoFootageTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation(LOOKHAVEN_DEMO_FOOTAGE="yes"))
        cls.event = cls.finished(1)
        with playing(cls.server, cls.event["id"]) as parts:
            cls.reader = NumberReader([picture for _, picture in numbered(parts, 30)], 640, 360)

    @classmethod
    def finished(cls, camera):
        """The newest of them, not what was recorded live since: on a busy machine that has gaps, and ends early."""
        of_demo = (event for event in recorded_events(cls.server, camera) if event["frame_count"] == 20 * 25)
        return next(event for event in of_demo if not event["is_recording"])

    @staticmethod
    def captured(event, number):
        """When the picture of that painted number was taken."""
        return f"{event['start'] + number // 25}.{number % 25 * 40:03}"

    def mark(self, kind):
        """One of camera 1, and the recording that it lies in."""
        mark = self.server.request(call("VEXO.Event", "List", kind=kind, cameralists=1), "admin").json["data"]["event"][0]
        self.assertEqual(mark["state"], "saved")
        events = recorded_events(self.server, 1, **{"from": mark["start"] - 60})
        return mark, next(event for event in events if event["start"] <= mark["start"] < event["stop"])
