# SPDX-License-Identifier: Apache-2.0
#
# Two hosts on one machine: one shows the other's cameras.
import base64
import hashlib
import hmac
import http.server
import json
import pathlib
import ssl
import subprocess
import tempfile
import threading
import time
import unittest

from api_test import call, play
from installation import Installation, Parts, wait_until


class HostileHost:
    """A paired host whose every answer tries to steer the web server and the browser of the host that asks it."""

    content_type = "text/html"
    HEADERS = {
        "Set-Cookie": "id=chosen-by-another; Path=/",
        "X-Accel-Redirect": "/webapi?api=VEXO.Auth&version=1&method=Status",
        "Clear-Site-Data": "*",
        "Access-Control-Allow-Origin": "*",
        "Refresh": "0; url=https://evil.example/",
    }

    class Handler(http.server.BaseHTTPRequestHandler):
        def do_POST(self):
            self.send_response(200)
            self.send_header("Content-Type", HostileHost.content_type)
            for name, value in HostileHost.HEADERS.items():
                self.send_header(name, value)
            self.end_headers()
            self.wfile.write(b"<script>evil()</script>")

        def log_message(self, *arguments):
            pass

    def __enter__(self):
        self.folder = tempfile.TemporaryDirectory()
        key, certificate = (pathlib.Path(self.folder.name) / name for name in ("key.pem", "certificate.pem"))
        subprocess.run(
            ["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes", "-days", "2",
             "-subj", "/CN=hostile", "-keyout", key, "-out", certificate], check=True, capture_output=True
        )
        self.certificate = certificate.read_text()
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(certificate, key)
        self.server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), self.Handler)
        self.server.socket = context.wrap_socket(self.server.socket, server_side=True)
        threading.Thread(target=self.server.serve_forever, daemon=True).start()
        return self

    def __exit__(self, *error):
        self.server.shutdown()
        self.server.server_close()
        self.folder.cleanup()


class PairingTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.owner = cls.enterClassContext(Installation())
        cls.watcher = cls.enterClassContext(Installation())
        line = cls.owner.cli("server", "pair", "Watcher", "--address", "localhost", "--port", str(cls.owner.tls_port))
        cls.secret = json.loads(base64.b64decode(line.strip().split(":", 1)[1]))["secret"]
        cls.watcher.cli("server", "add", "Owner", text=line)
        cls.watcher.cli("set", "cms", "on")
        cls.cameras = {camera["id_on_server"]: camera["id"] for camera in json.loads(cls.watcher.cli("server", "cameras", "--json"))}

    def relay(self, camera, account="admin", server=1):
        """The answer to the request for one picture."""
        return self.watcher.request(call("VEXO.Relay", "Play", server=server, camera=camera, snapshot=1), account)

    def ask_owner(self, cookie, timestamp, **parameters):
        query = play(1, snapshot=1, client="REC_SERVER", cookie=cookie, **parameters)
        return self.owner.request(query, headers={"Cookie": f"timestamp={timestamp}"}).status

    def token(self, timestamp, secret=None):
        message = f"lookhaven pair 1\n{timestamp}".encode()
        return hmac.new(bytes.fromhex(secret or self.secret), message, hashlib.sha256).hexdigest()

    def relayed_parts(self, camera, account="admin"):
        return Parts(*self.watcher.open(call("VEXO.Relay", "Play", server=1, camera=camera), account))

    def test_a_snapshot_and_streams_come_through(self):
        # The first request starts the other host's camera.
        picture = wait_until(lambda: (a := self.relay(1)).status == 200 and a, 15, "a relayed snapshot")
        self.assertTrue(picture.body.startswith(b"\xff\xd8"))
        with self.relayed_parts(1) as parts:
            heads = [parts.next()[0] for _ in range(10)]
        self.assertLess(float(heads[-1]["x-age-ms"]), 1000)
        with self.relayed_parts(2) as parts:
            kinds = {parts.next()[0]["content-type"] for _ in range(40)}
        self.assertEqual(kinds, {"image/H264", "audio/AAC"})
        wait_until(lambda: len(self.owner.requests()) <= 1, 5, "the owner's streams end with their viewers")

    def test_the_rights_of_the_host_that_shows_it_count(self):
        self.watcher.cli("user", "deny", "viewer", str(self.cameras[1]))
        self.watcher.cli("user", "deny", "viewer", str(self.cameras[2]), "--kind", "audio")
        self.watcher.forget_sessions()
        with self.relayed_parts(2, "viewer") as parts:
            self.assertEqual({parts.next()[0]["content-type"] for _ in range(20)}, {"image/H264"})
        self.assertEqual(self.relay(1, "viewer").body, self.relay(77, "viewer").body, "as one that is not there")
        for what, camera, account, status in [
            ("denied", 1, "viewer", 404), ("not mapped", 77, "admin", 404), ("no session", 1, None, 401)
        ]:
            self.assertEqual(self.relay(camera, account).status, status, what)

    def test_the_owner_lets_in_only_who_proves_the_secret_now(self):
        now = int(time.time())
        wait_until(lambda: self.ask_owner(self.token(now), now) == 200, 15, "a peer is let in")
        for what, cookie, timestamp in [
            ("another secret", self.token(now, "ab" * 32), now),
            ("stale", self.token(now - 400), now - 400),
            ("from the future", self.token(now + 400), now + 400),
            ("another time", self.token(now), now + 1),
            ("no token", "", now),
            ("the secret itself", self.secret, now),
        ]:
            self.assertEqual(self.ask_owner(cookie, timestamp), 401, what)
        self.assertEqual(self.owner.request(play(1, snapshot=1, client="REC_SERVER")).status, 401)
        kinds = {}
        for who, query, account in [
            ("peer", play(1, itemType=1, client="REC_SERVER", cookie=self.token(now)), None),
            ("admin", play(1, itemType=1), "admin"),
            ("viewer", play(1, itemType=1), "viewer"),
        ]:
            headers = {"Cookie": f"timestamp={now}"} if who == "peer" else {}
            kinds[who] = [item["type"] for item in self.owner.request(query, account, headers=headers).json["data"]["items"]]
        self.assertEqual(kinds["peer"], kinds["admin"], "a peer sees all")
        self.assertLess(len(kinds["viewer"]), len(kinds["admin"]))
        self.assertEqual(self.ask_owner(self.token(now), now, privData='{"deniedCameras":[1]}'), 401)

    def test_items_of_the_other_host_are_on_the_map(self):
        self.watcher.cli("emap", "item", "add", "2", "camera", "1", "--server", "1", "--name", "Far")
        self.assertEqual(self.watcher.request(play(2, itemType=1)).status, 401)
        answer = self.watcher.request(play(2, itemType=1), "admin")
        item = next(item for item in answer.json["data"]["items"] if item["hxId"] == "1")
        self.assertEqual((item["ownerDevName"], item["hxIP"], item["hxPort"]), ("Owner", "localhost", str(self.owner.tls_port)))
        timestamp, _, cookie = item["hxCookie"].partition("-")
        self.assertEqual(cookie, self.token(timestamp))
        self.assertNotIn(self.secret, answer.body.decode())
        items = self.watcher.request(play(2, itemType=1), "viewer").json["data"]["items"]
        self.assertEqual([item["hxCookie"] for item in items if item["hxId"] == "1"], [""], "it would open all of that server")
        # What is shown to the owner opens nothing at home.
        headers = {"Cookie": f"timestamp={timestamp}"}
        self.assertEqual(
            self.watcher.request(play(1, snapshot=1, client="REC_SERVER", cookie=cookie), headers=headers).status, 401
        )
        log = "".join(path.read_text() for home in (self.owner.home, self.watcher.home) for path in (home / "log").iterdir())
        self.assertNotIn(self.secret, log)
        self.assertNotIn("cookie=", log)

    def test_a_server_that_is_gone_or_another_is_an_error(self):
        impostor = self.enterContext(Installation())
        line = self.owner.cli("server", "pair", "Again", "--address", "localhost", "--port", str(impostor.tls_port))
        server = json.loads(self.watcher.cli("server", "add", "Impostor", "--json", text=line))["id"]
        answer = wait_until(lambda: (a := self.relay(1, server=server)).status == 502 and a, 5, "another certificate")
        self.assertIn("recording server", answer.json["error"]["message"])
        with self.assertRaisesRegex(AssertionError, "Impostor failed: its certificate is not the one"):
            self.watcher.cli("server", "refresh")
        impostor.stop()
        self.assertEqual(self.relay(1, server=server).status, 502)
        self.watcher.cli("server", "remove", str(server))
        self.assertEqual(self.relay(1, server=server).status, 404)

    def test_a_hostile_host_steers_neither_web_server_nor_browser(self):
        hostile = self.enterContext(HostileHost())
        line = self.owner.cli("server", "pair", "Third", "--address", "127.0.0.1", "--port", str(hostile.server.server_port))
        prefix, coded = line.strip().split(":", 1)
        said = {**json.loads(base64.b64decode(coded)), "certificate": hostile.certificate}
        line = f"{prefix}:{base64.b64encode(json.dumps(said).encode()).decode()}"
        server = json.loads(self.watcher.cli("server", "add", "Hostile", "--json", text=line))["id"]
        self.addCleanup(self.watcher.cli, "server", "remove", str(server))
        for kind in ("text/html", "image/svg+xml", "image/jpeg\x7f", "multipart/mixed", "multipart/x-mixed-replacement", ""):
            HostileHost.content_type = kind
            self.assertEqual(self.relay(1, server=server).status, 502, kind)
        HostileHost.content_type = "Image/JPEG ; x=y"
        answer = self.relay(1, server=server)
        self.assertEqual(answer.body, b"<script>evil()</script>", "it came from the other host, not from a redirect here")
        self.assertEqual(answer.headers["Content-Security-Policy"], "default-src 'none'; sandbox")
        for name in HostileHost.HEADERS:
            self.assertIsNone(answer.headers[name], name)

    def test_a_relayed_stream_ends_with_its_session_and_its_viewer(self):
        rows = [
            ("log-out", lambda: self.watcher.request("api=VEXO.Auth&version=1&method=Logout", "viewer", form={})),
            ("denial", lambda: self.watcher.cli("user", "deny", "viewer", str(self.cameras[2]))),
            ("viewer", None),
        ]
        self.addCleanup(self.watcher.cli, "user", "allow", "viewer", str(self.cameras[2]))
        self.watcher.cli("user", "allow", "viewer", str(self.cameras[1]))
        for what, end in rows:
            with self.subTest(what):
                self.watcher.forget_sessions()
                with self.relayed_parts(1, "viewer") as parts:
                    parts.next()
                    if end:
                        end()
                        ended = time.monotonic()
                        self.assertRaises(EOFError, lambda: [parts.next() for _ in range(1000)])
                        self.assertLess(time.monotonic() - ended, 2)
                for server in (self.watcher, self.owner):
                    wait_until(lambda: len(server.requests()) <= 1, 5, "the request ends on both hosts")

    def test_later_cameras_arrive_and_a_new_pairing_keeps_what_is_known(self):
        def known():
            return {camera["id_on_server"]: camera["id"] for camera in json.loads(self.watcher.cli("server", "cameras", "--json"))}

        before = known()
        later = self.owner.add_camera("Later", "test:mjpeg")
        self.watcher.cli("server", "refresh")  # unless the minute's own was faster
        self.assertEqual(json.loads(self.watcher.cli("server", "refresh", "--json"))[0]["new"], 0)
        self.assertEqual(set(known()) - set(before), {later})
        with self.relayed_parts(1) as parts:
            parts.next()
            line = self.owner.cli("server", "pair", "Watcher", "--address", "localhost", "--port", str(self.owner.tls_port))
            self.assertRaises(EOFError, lambda: [parts.next() for _ in range(1000)])
        with self.assertRaisesRegex(AssertionError, "does not let this host in"):
            self.watcher.cli("server", "refresh")
        before = known()
        self.watcher.cli("server", "add", "Owner", text=line)
        type(self).secret = json.loads(base64.b64decode(line.strip().split(":", 1)[1]))["secret"]
        self.assertEqual(known(), before)
        self.assertEqual(json.loads(self.watcher.cli("server", "refresh", "--json"))[0]["new"], 0)


if __name__ == "__main__":
    unittest.main()
