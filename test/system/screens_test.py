# SPDX-License-Identifier: Apache-2.0
#
# Every screen can be used by everyone: no violation of the rules of axe-core, a title, and the focus at the heading.
import unittest

from installation import Installation, recorded_events, wait_until
from visit import Visit


class ScreensTest(unittest.TestCase):
    def test_every_screen(self):
        server = self.enterContext(Installation())
        wait_until(lambda: recorded_events(server, 1), 30, "an event of camera 1")
        line = server.cli("server", "pair", "Head office", "--address", "localhost", "--port", str(server.tls_port))
        server.cli("server", "add", "Warehouse", text=line)
        with Visit("screens.mjs", f"http://127.0.0.1:{server.port}/") as visit:
            for name, title, focus in [
                ("log-in", "Log in", None),
                ("wall", "Live", "Live"),
                ("keys", "Live", None),
                ("save-layout", "Live", None),
                ("new-sequence", "Live", None),
                ("layouts", "Live", None),
                ("layout", "Live", None),
                ("sequence", "Live", None),
                ("sessions", "Live", None),
                ("large", "Entrance", "Entrance"),
                ("snapshot", "Entrance", None),
                ("events", "Events", "Events"),
                ("playing", "Events", None),
                ("calendar", "Events", None),
                ("timeline", "Events", None),
                ("filter", "Events", None),
                ("map", "Ground floor", "Maps"),
                ("editor", "Ground floor", None),
                ("cameras", "Cameras", "Settings"),
                ("camera", "Cameras", None),
                ("new-camera", "Cameras", None),
                ("groups", "Cameras", None),
                ("group", "Cameras", None),
                ("maps", "Maps", None),
                ("devices", "Maps", None),
                ("accounts", "Accounts", None),
                ("account", "Accounts", None),
                ("storage", "Storage", "Storage"),
                ("mount", "Storage", None),
                ("hosts", "Hosts", "Hosts"),
                ("system", "System", "System"),
                ("audit", "Audit log", "Audit log"),
            ]:
                seen = visit.see(name)
                with self.subTest(name):
                    self.assertEqual(seen["title"], f"{title} · Lookhaven")
                    self.assertIn(focus, (None, seen["focus"]))
                    self.assertEqual(seen["violations"] + seen["complaints"], [])


if __name__ == "__main__":
    unittest.main()
