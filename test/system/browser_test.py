# SPDX-License-Identifier: Apache-2.0
#
# Visits in Chromium: log in, see camera 1 move, take a snapshot, log out; see and hear camera 2, hide the tab. And what the
# server then still runs.
import os
import shutil
import subprocess
import tempfile
import unittest

from installation import Installation, wait_until
from visit import Visit


class BrowserTest(unittest.TestCase):
    def test_a_visit_over_https(self):
        self.visit(lambda server: f"https://localhost:{server.tls_port}/", "h2")

    def test_a_visit_over_http(self):
        self.visit(lambda server: f"http://127.0.0.1:{server.port}/", "http/1.1")

    def test_a_camera_with_sound_is_drawn_and_heard_and_left_when_the_tab_is_hidden(self):
        with Installation() as server:
            idle = server.requests()
            with Visit("muxed.mjs", f"https://localhost:{server.tls_port}/") as visit:
                for step, is_heard in ("watched", False), ("heard", True):
                    seen = visit.next()
                    self.assertEqual(seen["step"], step)
                    self.assertGreaterEqual(seen["moments"] / seen["seconds"], 20, "different pictures a second")
                    self.assertEqual(seen["peak"] > 0.01, is_heard, f"{step}: loudest sample {seen['peak']}")
                    visit.go_on()

                self.assertEqual(visit.next()["step"], "hidden")
                wait_until(lambda: server.requests() == idle, 2, "the stream of a hidden tab ends")
                visit.go_on()

                seen = visit.next()
                self.assertEqual(seen["step"], "seen again")
                self.assertGreater(len(server.requests()), len(idle), "nothing streams")
                self.assertEqual(seen["complaints"], [])
                visit.go_on()

    def visit(self, address, protocol):
        with Installation() as server, tempfile.TemporaryDirectory() as folder:
            idle = server.requests()
            with Visit("browser.mjs", address(server), folder) as visit:
                seen = visit.next()
                self.assertEqual(seen["step"], "streaming")
                self.assertEqual(seen["pictures"], 3, "camera 1 stands still")
                self.assertEqual(seen["protocol"], protocol)
                states = dict(seen["states"])
                self.assertEqual(sorted(states), ["1", "2", "4"])
                self.assertEqual((states["1"], states["4"]), ("live", "live"))
                self.assertGreater(len(server.requests()), len(idle), "nothing streams")
                visit.go_on()

                seen = visit.next()
                self.assertEqual(seen["step"], "snapshot")
                self.assertRegex(seen["file"], r"^Entrance.*\.jpe?g$")
                size = subprocess.run(
                    ["ffprobe", "-v", "error", "-show_entries", "stream=width,height", "-of", "csv=p=0", f"{folder}/snapshot.jpg"],
                    capture_output=True,
                    text=True,
                    check=True,
                ).stdout.strip()
                self.assertEqual(size, "1280,720")
                visit.go_on()

                seen = visit.next()
                self.assertEqual(seen["step"], "logged out")
                self.assertEqual(seen["complaints"], [])
                wait_until(lambda: server.requests() == idle, 2, "the streams end with the session")
                visit.go_on()
            if keep := os.environ.get("LOOKHAVEN_KEEP_SCREENSHOTS"):
                shutil.copytree(folder, f"{keep}/{protocol.replace('/', '-')}", dirs_exist_ok=True)


if __name__ == "__main__":
    unittest.main()
