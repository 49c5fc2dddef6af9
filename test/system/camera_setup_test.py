# SPDX-License-Identifier: Apache-2.0
#
# Cameras as a manager's page sets them up, from the first look at an address to the wall, without a shell.
import base64
import json
import subprocess
import unittest

from cameras_test import JPEG, PICTURE, VIDEO, Camera
from installation import BUILD, Installation, call, program, wait_until

RTSP_CAMERA = BUILD / "bin/rtsp-camera"


class CameraSetupTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())

    def ask(self, method, api="VEXO.Camera", **parameters):
        connection, response = self.server.open(
            call(api, method), "admin", body=json.dumps(parameters), headers={"Content-Type": "application/json"}
        )
        answer = json.loads(response.read())
        connection.close()
        return answer["data"] if answer["success"] else answer["error"]

    def test_a_camera_is_looked_at_added_and_on_the_wall(self):
        camera = Camera(VIDEO, repeated=PICTURE)
        address = f"http://127.0.0.1:{camera.port}/video"
        found = self.ask("Probe", address=address, account="root", password="camera-s3cret")
        self.assertEqual((found["codec"], found["width"], found["audio"]), ("mjpeg", 64, False))
        self.assertEqual(base64.b64decode(found["picture"]), JPEG)
        self.assertNotIn("lookhaven-camera", map(program, self.server.requests()), "its reader has ended")

        fields = {"name": "Shed", "source": [{"profile": 0, "address": address}], "codec": found["codec"]}
        added = self.ask("Add", account="root", password="camera-s3cret", **fields)["camera"]
        with self.server.live(added["id"]) as parts:
            self.assertFalse(parts.ends(), "its first viewer waits for the picture")
        self.assertIn(added["id"], [one["id"] for one in self.ask("LoadCamera", "VEXO.Lookhaven.Player")["camera"]])
        self.assertEqual((added["account"], added["hasPassword"]), ("root", True))

        other = Camera(VIDEO)
        moved = [{"profile": 0, "address": f"http://localhost:{other.port}/"}]
        probed = {"address": moved[0]["address"], "camera": added["id"]}
        for method, where in (("Set", {"source": moved}), ("Probe", probed)):
            refused = self.ask(method, id=added["id"], revision=added["revision"], **where)
            self.assertEqual((refused["code"], refused["message"][:28]), (400, "password must be given again"))
        self.assertEqual(other.requests, 0, "a stored password is told to no other host")

        plan = {"mode": "schedule", "hours": "1" * 168}
        changed = self.ask("Set", id=added["id"], revision=added["revision"], name="Barn", plan=plan)
        wait_until(lambda: added["id"] in self.server.recording_cameras(), 10, "the schedule is obeyed")
        stale = self.ask("Set", id=added["id"], revision=added["revision"], name="Attic")
        self.assertEqual((stale["code"], stale["data"]["name"]), (409, "Barn"))
        order = self.ask("List", footage=False)["order"]
        ids, seen = order["id"], order["revision"]
        self.ask("Order", id=ids[::-1], revision=seen)
        self.assertEqual(self.ask("Order", id=ids, revision=seen)["code"], 409, "somebody else was faster")
        self.assertEqual([one["id"] for one in self.ask("List")["camera"]], ids[::-1])
        files = f"recordings/{added['id']}/*/*.mkv"
        self.assertTrue(any(self.server.home.glob(files)))
        revision = changed["camera"]["revision"]
        self.assertEqual(self.ask("Remove", id=added["id"], revision=revision, footage="remove"), {})
        wait_until(lambda: not any(self.server.home.glob(files)), 30, "its footage goes")

        log = self.ask("Audit", "VEXO.System")["entry"]
        self.assertEqual([one["action"] for one in log], ["camera.remove", "camera.order", "camera.set", "camera.add"])
        first = (log[-1]["who"], log[-1]["address"], log[-1]["object"])
        self.assertEqual(first, ("admin", "127.0.0.1", f"Shed ({added['id']})"))
        self.assertNotIn("s3cret", json.dumps(log))
        self.assertNotIn("s3cret", json.dumps(self.ask("LogTail", "VEXO.System")))
        self.assertIn("admin at 127.0.0.1", self.server.cli("audit"))

    def test_what_a_camera_sends_is_decoded_and_what_it_does_not_is_said(self):
        for address, failed in (("rtsp://127.0.0.1:1/a", "refused"), ("http://nowhere.invalid/", "unknown-host")):
            self.assertEqual(self.ask("Probe", address=address)["failed"], failed)
        for address in ("file:/etc/passwd", "test:mjpeg", "rtsp://a:b@127.0.0.1/", "", 5):
            self.assertEqual(self.ask("Probe", address=address)["code"], 400, address)
        if not RTSP_CAMERA.exists():
            self.skipTest("the RTSP camera is not built")
        camera = self.enterContext(subprocess.Popen([RTSP_CAMERA, "0"], stdout=subprocess.PIPE, text=True))
        self.addCleanup(camera.kill)
        found = self.ask("Probe", address=f"rtsp://127.0.0.1:{int(camera.stdout.readline())}/live")
        self.assertEqual((found["codec"], found["width"], found["height"], found["audio"]), ("h264", 320, 240, True))
        self.assertEqual(base64.b64decode(found["picture"])[:2], b"\xff\xd8")
        self.assertAlmostEqual(found["rate"], 25, delta=5)


if __name__ == "__main__":
    unittest.main()
