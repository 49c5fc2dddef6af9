# SPDX-License-Identifier: Apache-2.0
#
# Set up in the browser, without a shell: a camera of the network with a plan, and an account that sees it alone and unheard; and
# all of it from an installation without an account.
import json
import re
import subprocess
import unittest

from installation import BUILD, LIVE, PASSWORDS, PLAYER, Installation, call
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

    @unittest.skipUnless(CAMERA.exists(), "the simulated camera is not built")
    def test_from_nothing_to_a_camera_on_the_wall_by_the_printed_address(self):
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
        with Visit("first_start.mjs", start, OLD=token, TOKEN=newer, CAMERA=self.simulated_camera()) as visit:
            for step in ("no account", "replaced", "account", "camera", "storage", "wall"):
                seen = visit.see(step)
                with self.subTest(step):
                    self.assertEqual(seen["violations"] + seen["complaints"], [])
        headers = {"Content-Type": "application/json"}
        PASSWORDS["ada"] = "correct horse"
        entries = server.request(call("VEXO.System", "Audit"), "ada", body="{}", headers=headers).json["data"]["entry"]
        self.assertEqual([(one["action"], one["who"]) for one in entries], [("camera.add", "ada"), ("user.add", "one-time address")])
        camera = server.request(call("VEXO.Camera", "List"), "ada", body="{}", headers=headers).json["data"]["camera"]
        self.assertEqual([one["name"] for one in camera], ["Gate"])
        logs = "".join(file.read_text() for file in (server.home / "log").iterdir())
        for secret in (token, newer):
            self.assertNotIn(secret, logs)
        server.stop()
        server.start()
        self.assertNotIn("#setup", server.said())
        self.assertIn(f"fingerprint (SHA-256) {fingerprint}\n", server.said())

    @unittest.skipUnless(CAMERA.exists(), "the simulated camera is not built")
    def test_a_camera_a_plan_and_an_account(self):
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
            self.assertIn("PNG, JPEG or WebP", maps["refused"])
            self.assertEqual(maps["size"], [2400, 1200], "a drawing is large enough to look at")
            self.assertEqual(maps["narrow"], 390)
            self.assertIn("Ground floor", maps["removal"], "what else shows the map")
            self.assertRegex(maps["hash"], r"^#map=\d+$")
            account = visit.see("account")
            self.assertIn("sees 1 of", account["row"])
            self.assertIn("without sound", account["row"])
            session = server.login("night", account["word"])
            listed = server.request(call(PLAYER, "LoadCamera"), headers={"Cookie": f"id={session}"})
            self.assertEqual([one["name"] for one in listed.json["data"]["camera"]], ["Loading bay"])
            self.assertEqual(self.kinds(server, camera["id"], session), {"image"})
            self.assertEqual(self.kinds(server, camera["id"], server.session("admin")), {"image", "audio"})
            seen = visit.see("system")["text"]
            told = subprocess.run(["openssl", "x509", "-noout", "-fingerprint", "-sha256", "-in", server.home / "tls/certificate.pem"],
                                  capture_output=True, text=True, check=True).stdout
            for text in (told.partition("=")[2].strip(), "Recorder\nrunning since", "SQLite, schema"):
                self.assertIn(text, seen)
            self.assertNotIn("Not checked", seen)
            shown = json.loads(server.cli("setting", "show", "--json"))
            self.assertEqual(shown["players_per_session"], "5")
            wanted = ["Setting changed: players_per_session", "Account added: night (", "Map changed: Dock (",
                      "Map added: Loading dock (", "Camera changed: Loading bay (", "Camera group added: Deliveries (",
                      "Camera added: Loading bay ("]
            entries = visit.see("audit")["entries"]
            self.assertEqual([entry[: len(text)] for entry, text in zip(entries, wanted)], wanted)
            self.assertNotIn(account["word"], json.dumps(server.request(
                call("VEXO.System", "Audit"), "admin", body="{}", headers=headers).json))
            night = visit.see("night")
            self.assertEqual((night["tiles"], night["complaints"]), (1, []))
            self.assertEqual(night["links"], ["Live", "Events", "Maps"])


if __name__ == "__main__":
    unittest.main()
