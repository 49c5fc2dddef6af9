# SPDX-License-Identifier: Apache-2.0
#
# Visits in Chromium: log in, see camera 1 move, take a snapshot, log out; see and hear camera 2, hide the tab. And what the
# server then still runs.
import subprocess
import unittest

from installation import Installation, wait_until
from visit import Visit


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
            wait_until(lambda: self.server.requests() == self.idle, 2, "the stream of a hidden tab ends")

            self.assertEqual(visit.see("seen again")["complaints"], [])
            self.assertGreater(len(self.server.requests()), len(self.idle), "nothing streams")

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

                self.assertRegex(visit.see("snapshot")["file"], r"^Entrance.*\.jpe?g$")
                probe = ["ffprobe", "-v", "error", "-show_entries", "stream=width,height", "-of", "csv=p=0"]
                size = subprocess.run([*probe, f"{visit.folder}/snapshot.jpg"], capture_output=True, text=True, check=True)
                self.assertEqual(size.stdout.strip(), "1280,720")

                self.assertEqual(visit.see("logged out")["complaints"], [])
                wait_until(lambda: self.server.requests() == self.idle, 2, "the streams end with the session")


if __name__ == "__main__":
    unittest.main()
