# SPDX-License-Identifier: Apache-2.0
#
# A visit in Chromium: log in, see camera 1 move, take a snapshot, log out; and what the server then still runs.
import contextlib
import json
import os
import pathlib
import shutil
import subprocess
import tempfile
import unittest

from installation import PASSWORDS, Installation, wait_until

HERE = pathlib.Path(__file__).resolve().parent


class Visit:
    """The browser's script, stopped after each step that it reports."""

    def __init__(self, address, folder):
        self._script = subprocess.Popen(
            [shutil.which("node"), HERE / "browser.mjs", address, PASSWORDS["admin"], folder],
            stdin=subprocess.PIPE,
            stdout=subprocess.PIPE,
            text=True,
        )

    def __enter__(self):
        return self

    def __exit__(self, *_):
        with contextlib.suppress(BrokenPipeError):
            self._script.stdin.close()
        self._script.terminate()
        self._script.wait(20)
        self._script.stdout.close()

    def next(self):
        line = self._script.stdout.readline()
        return json.loads(line) if line else {"step": f"the browser's script ended: {self._script.wait(20)}"}

    def go_on(self):
        self._script.stdin.write("\n")
        self._script.stdin.flush()


class BrowserTest(unittest.TestCase):
    def test_a_visit_over_https(self):
        self.visit(lambda server: f"https://localhost:{server.tls_port}/", "h2")

    def test_a_visit_over_http(self):
        self.visit(lambda server: f"http://127.0.0.1:{server.port}/", "http/1.1")

    def visit(self, address, protocol):
        with Installation() as server, tempfile.TemporaryDirectory() as folder:
            idle = server.requests()
            with Visit(address(server), folder) as visit:
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
