# SPDX-License-Identifier: Apache-2.0
#
# Set up in the browser, without a shell: from an installation without an account to cameras of two kinds on the wall,
# an account with few rights, a mount and a map; and what there is to change in the demo's.
import json
import os
import pathlib
import re
import subprocess
import tempfile
import unittest

from installation import BUILD, LIVE, PASSWORDS, PLAYER, Installation, call
from moving_camera import MovingCamera
from parts import Parts
from visit import Visit

CAMERA = BUILD / "bin/rtsp-camera"


class SetupTest(unittest.TestCase):
    def kinds(self, server, camera, session):
        """The content types of two seconds of live parts."""
        query = call(LIVE, "Play", camera=camera)
        with Parts(*server.open(query, headers={"Cookie": f"id={session}"})) as stream:
            return {stream.next()[0]["content-type"].partition("/")[0] for _ in range(60)}

    def simulated_camera(self):
        """The address of an RTSP camera."""
        simulated = self.enterContext(subprocess.Popen([CAMERA, "0"], stdout=subprocess.PIPE, text=True))
        self.addCleanup(simulated.kill)
        return f"rtsp://127.0.0.1:{int(simulated.stdout.readline())}/live"

    def disk(self, server):
        """A folder as a disk's: empty, the server's own, and where managers may add mounts."""
        above = "/mnt" if os.access("/mnt", os.W_OK) else None  # one of those where they may before the operator names others
        folder = pathlib.Path(self.enterContext(tempfile.TemporaryDirectory(dir=above)))
        if not above:
            server.cli("setting", "set", "mount_folders", str(folder.parent))
        owner = server.home.stat()
        os.chown(folder, owner.st_uid, owner.st_gid)
        return folder

    @unittest.skipUnless(CAMERA.exists(), "the simulated camera is not built")
    def test_from_nothing_to_all_that_a_house_needs_by_the_printed_address(self):
        server = self.enterContext(Installation(LOOKHAVEN_DEMO="no", LOOKHAVEN_ADMIN_PASSWORD=""))
        self.assertNotIn("admin  ", server.said())
        start = f"http://127.0.0.1:{server.port}/"
        token = re.search(rf"^ *{re.escape(start)}#setup=([0-9a-f]{{48}})$", server.said(), re.M)[1]
        self.assertIn(f":{server.tls_port}/#setup={token}", server.said())
        told = subprocess.run(["openssl", "x509", "-noout", "-fingerprint", "-sha256", "-in", server.home / "tls/certificate.pem"],
                              capture_output=True, text=True, check=True).stdout
        fingerprint = told.partition("=")[2].strip()
        self.assertIn(f"\n    {fingerprint}\n", server.said())
        server.stop()
        server.start()
        newer = re.search(rf"{re.escape(start)}#setup=([0-9a-f]{{48}})", server.said())[1]
        headers = {"Content-Type": "application/json"}
        PASSWORDS["ada"] = "correct horse"

        def ask(api, method):
            return server.request(call(api, method), "ada", body="{}", headers=headers).json["data"]

        moving, disk = self.enterContext(MovingCamera()), self.disk(server)
        given = {"OLD": token, "TOKEN": newer, "RTSP": self.simulated_camera(), "MJPEG": moving.address, "DISK": str(disk)}
        with Visit("first_start.mjs", start, **given) as visit:
            for step in ("no account", "replaced", "account", "camera", "storage", "wall"):
                seen = visit.see(step)
                with self.subTest(step):
                    self.assertEqual(seen["violations"] + seen["complaints"], [])
            self.assertEqual(visit.see("two cameras")["moving"], [True, True])
            gate, yard = ask("VEXO.Camera", "List")["camera"]
            self.assertEqual([(one["name"], one["codec"]) for one in (gate, yard)], [("Gate", "h264"), ("Yard", "mjpeg")])
            self.assertEqual(yard["plan"]["mode"], "never", "around alerts alone")
            account = visit.see("second account")
            self.assertIn("sees 1 of 2 cameras, without sound, without export", account["row"])
            session = server.login("night", account["word"])
            listed = server.request(call(PLAYER, "LoadCamera"), headers={"Cookie": f"id={session}"})
            self.assertEqual([one["name"] for one in listed.json["data"]["camera"]], ["Gate"])
            self.assertEqual(self.kinds(server, gate["id"], session), {"image"})
            self.assertEqual(self.kinds(server, gate["id"], server.session("ada")), {"image", "audio"})
            seen = visit.see("mount and map")
            mounts = {one["path"]: one["state"] for one in ask("VEXO.Mount", "List")["mount"]}
            self.assertEqual(mounts[str(disk)], "ready")
            self.assertEqual(len(mounts), 2)
            self.assertIn("PNG, JPEG or WebP", seen["refused"])
            self.assertEqual(seen["size"], [2400, 1200], "a drawing is large enough to look at")
            self.assertRegex(seen["hash"], r"^#map=\d+$")
            night = visit.see("night")
            self.assertEqual((night["moving"], night["tiles"], night["complaints"]), (True, 1, []))
            self.assertEqual(night["links"], ["Live", "Events", "Maps"])
        log = [one for one in ask("VEXO.System", "Audit")["entry"] if one["who"] != "command line"]
        made = ["emap.add", "mount.add", "user.add", "camera.add", "camera.add"]
        self.assertEqual([(one["action"], one["who"]) for one in log], [*((each, "ada") for each in made), ("user.add", "one-time address")])
        self.assertNotIn(account["word"], json.dumps(log))
        logs = "".join(file.read_text() for file in (server.home / "log").iterdir())
        for secret in (token, newer):
            self.assertNotIn(secret, logs)
        server.stop()
        server.start()
        self.assertNotIn("#setup", server.said())
        self.assertIn(f"fingerprint (SHA-256) {fingerprint}\n", server.said())

    @unittest.skipUnless(CAMERA.exists(), "the simulated camera is not built")
    def test_what_the_demo_has_is_changed(self):
        server = self.enterContext(Installation())
        source = self.simulated_camera()
        with Visit("setup.mjs", f"http://127.0.0.1:{server.port}/", CAMERA=source) as visit:
            tried = visit.see("tried")
            self.assertEqual(tried["size"], [320, 240])
            self.assertEqual(tried["facts"], "H.264 · 320 × 240 · 25 fps · with sound")
            visit.see("on the wall")
            headers = {"Content-Type": "application/json"}
            answer = server.request(call("VEXO.Camera", "List"), "admin", body="{}", headers=headers)
            camera = answer.json["data"]["camera"][-1]
            plan = camera["plan"]
            self.assertEqual((camera["name"], camera["source"][0]["address"]), ("Loading bay", source))
            self.assertEqual((plan["mode"], plan["pre"], plan["hours"]), ("schedule", 7, "0" * 120 + "2" * 48))
            self.assertIn("Loading bay", visit.see("group")["row"])
            maps = visit.see("maps")
            self.assertEqual(maps["narrow"], 390)
            self.assertIn("Ground floor", maps["removal"], "what else shows the map")
            seen = visit.see("system")["text"]
            told = subprocess.run(["openssl", "x509", "-noout", "-fingerprint", "-sha256", "-in", server.home / "tls/certificate.pem"],
                                  capture_output=True, text=True, check=True).stdout
            for text in (told.partition("=")[2].strip(), "Recorder\nrunning since", "SQLite, schema"):
                self.assertIn(text, seen)
            self.assertNotIn("Not checked", seen)
            shown = json.loads(server.cli("setting", "show", "--json"))
            self.assertEqual(shown["players_per_session"], "5")
            wanted = ["Setting changed: players_per_session", "Map changed: Attic (", "Camera changed: Loading bay (",
                      "Camera group added: Deliveries (", "Camera added: Loading bay ("]
            audit = visit.see("audit")
            self.assertEqual([entry[: len(text)] for entry, text in zip(audit["entries"], wanted)], wanted)
            self.assertEqual(audit["complaints"], [])


if __name__ == "__main__":
    unittest.main()
