# SPDX-License-Identifier: Apache-2.0
#
# Two hosts on one machine: one shows the other's cameras.
import base64
import contextlib
import http.server
import json
import pathlib
import ssl
import tempfile
import threading
import time
import unittest

from api_test import call, play
from installation import PASSWORDS, Installation, make_certificate, pairing_secret, pairing_token, wait_until
from parts import Parts


class HostileHost(http.server.BaseHTTPRequestHandler):
    """Requests to a paired host whose every answer tries to steer the web server and the browser of the host that asks it."""

    content_type = "text/html"
    ahead_s = 0
    asked = 0
    HEADERS = {
        "Set-Cookie": "id=chosen-by-another; Path=/",
        "X-Accel-Redirect": "/webapi?api=VEXO.Auth&version=1&method=Status",
        "Clear-Site-Data": "*",
        "Access-Control-Allow-Origin": "*",
        "Refresh": "0; url=https://evil.example/",
    }

    def do_POST(self):
        HostileHost.asked += 1
        self.send_response(200)
        for name, value in {"Content-Type": self.content_type, **self.HEADERS}.items():
            self.send_header(name, value)
        self.end_headers()
        self.wfile.write(b"<script>evil()</script>")

    def do_GET(self):
        self.send_response(401)
        self.end_headers()

    def date_time_string(self, timestamp=None):
        return super().date_time_string(time.time() + self.ahead_s)

    def log_message(self, *arguments):
        pass

    @classmethod
    @contextlib.contextmanager
    def running(cls):
        """Its port and its certificate."""
        with tempfile.TemporaryDirectory() as folder, http.server.ThreadingHTTPServer(("127.0.0.1", 0), cls) as server:
            make_certificate(folder, "hostile", 2)
            context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
            context.load_cert_chain(f"{folder}/certificate.pem", f"{folder}/key.pem")
            server.socket = context.wrap_socket(server.socket, server_side=True)
            threading.Thread(target=server.serve_forever, daemon=True).start()
            yield server.server_port, pathlib.Path(folder, "certificate.pem").read_text()
            server.shutdown()


class PairingTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.owner = cls.enterClassContext(Installation())
        cls.watcher = cls.enterClassContext(Installation())
        cls.pair()
        cls.watcher.cli("setting", "set", "cms", "on")
        cls.cameras = cls.known()

    @classmethod
    def line(cls, name, port, address="localhost"):
        """What the watcher is to be told, to be let in under this name."""
        return cls.owner.cli("server", "pair", name, "--address", address, "--port", str(port))

    @classmethod
    def pair(cls, line=None):
        line = line or cls.line("Watcher", cls.owner.tls_port)
        cls.secret = pairing_secret(line)
        cls.watcher.cli("server", "add", "Owner", text=line)

    @classmethod
    def known(cls):
        """The watcher's number of each of the owner's cameras."""
        cameras = json.loads(cls.watcher.cli("server", "cameras", "--json"))
        return {camera["id_on_server"]: camera["id"] for camera in cameras}

    def relay(self, camera, account="admin", server=1):
        """The answer to the request for one picture."""
        return self.watcher.request(call("VEXO.Relay", "Play", server=server, camera=camera, snapshot=1), account)

    def ask_owner(self, cookie, timestamp, **parameters):
        query = play(1, snapshot=1, client="REC_SERVER", cookie=cookie, **parameters)
        return self.owner.request(query, headers={"Cookie": f"timestamp={timestamp}"}).status

    def token(self, timestamp):
        return pairing_token(self.secret, timestamp)

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
        self.assertEqual(self.relay(1, "viewer").body, self.relay(77, "viewer").body, "as for an unknown camera")
        for what, camera, account, status in [
            ("denied", 1, "viewer", 404), ("not mapped", 77, "admin", 404), ("no session", 1, None, 401)
        ]:
            self.assertEqual(self.relay(camera, account).status, status, what)

    def test_the_owner_lets_in_only_who_proves_the_secret_now(self):
        now = int(time.time())
        wait_until(lambda: self.ask_owner(self.token(now), now) == 200, 15, "a paired host is let in")
        for what, cookie, timestamp in [
            ("another secret", pairing_token("ab" * 32, now), now),
            ("stale", self.token(now - 400), now - 400),
            ("from the future", self.token(now + 400), now + 400),
            ("another time", self.token(now), now + 1),
            ("no token", "", now),
            ("the secret itself", self.secret, now),
        ]:
            self.assertEqual(self.ask_owner(cookie, timestamp), 401, what)
        self.assertEqual(self.owner.request(play(1, snapshot=1, client="REC_SERVER")).status, 401)
        kinds = {}
        for who, extra, headers in [
            (None, {"client": "REC_SERVER", "cookie": self.token(now)}, {"Cookie": f"timestamp={now}"}),
            ("admin", {}, {}), ("viewer", {}, {}),
        ]:
            answer = self.owner.request(play(1, itemType=1, **extra), who, headers=headers)
            kinds[who] = [item["type"] for item in answer.json["data"]["items"]]
        self.assertEqual(kinds[None], kinds["admin"], "a paired host sees all")
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
        line = self.line("Again", impostor.tls_port)
        server = json.loads(self.watcher.cli("server", "add", "Impostor", "--json", text=line))["id"]
        answer = wait_until(lambda: (a := self.relay(1, server=server)).status == 502 and a, 5, "another certificate")
        self.assertIn("paired host", answer.json["error"]["message"])
        with self.assertRaisesRegex(AssertionError, "Impostor failed: its certificate is not the one"):
            self.watcher.cli("server", "refresh")
        impostor.stop()
        self.assertEqual(self.relay(1, server=server).status, 502)
        self.watcher.cli("server", "remove", str(server))
        self.assertEqual(self.relay(1, server=server).status, 404)

    def test_two_hosts_are_paired_by_a_code_that_is_typed(self):
        def ask(host, method, **form):
            return host.request(call("VEXO.Server", method), "admin", form)

        def invite():
            answer = ask(self.owner, "Invite", name="By code", reauth=PASSWORDS["admin"])
            self.assertEqual(answer.status, 200, answer.body)
            return answer.json["data"]["code"]

        def pair(code, port=self.owner.tls_port, address="localhost"):
            answer = ask(self.watcher, "Add", name="By code", address=address, port=port, code=code, reauth=PASSWORDS["admin"])
            return answer.json["data"]["server"] if answer.status == 200 else (answer.json["error"]["data"] or {"reason": answer.status})["reason"]

        replaced, code = invite(), invite()
        port, _ = self.enterContext(HostileHost.running())
        HostileHost.asked = 0
        for what, given, why in [
            ("a typing error", (code[:-1] + ("0" if code[-1] != "0" else "1"),), 400),
            ("nobody", (code, 1), "unreachable"),
            ("a web server without TLS", (code, self.owner.port), "unreachable"),
            ("no such name", (code, 1, "no-such-host.invalid"), "unreachable"),
            ("another host", (code, self.watcher.tls_port), "certificate"),
            ("somebody in between", (code, port), "certificate"),
            ("the code before", (replaced,), "code"),
        ]:
            with self.subTest(what):
                self.assertEqual(pair(*given), why)
        self.assertEqual(HostileHost.asked, 0, "nothing is sent to another host")
        server = pair(code.lower().replace("-", " "), address="127.0.0.1")
        self.addCleanup(self.watcher.cli, "server", "remove", str(server["id"]), "--yes")
        self.assertEqual({camera["idOnServer"] for camera in server["camera"]}, set(self.known()))
        self.assertEqual(pair(code)["id"], server["id"], "it asks again")
        self.assertEqual(ask(self.watcher, "Check", id=server["id"]).json["data"], {"answers": True, "reason": ""})
        wait_until(lambda: self.relay(1, server=server["id"]).status == 200, 15, "a picture of the new pairing")
        said = json.loads(self.watcher.cli("server", "add", "By code", "--address", "localhost", "--port", str(self.owner.tls_port),
                                           "--json", text=self.owner.cli("server", "invite", "By code")))
        self.assertEqual((said["id"], said["answers"]), (server["id"], True), "renewed, by the command line")
        self.assertEqual(pair(code), "code", "the pairing of the code is over")
        watchers = [one for one in ask(self.owner, "List").json["data"]["server"] if one["name"] == "By code"]
        self.assertEqual(len(watchers), 1)
        self.assertIn("removed", ask(self.owner, "Remove", id=watchers[0]["id"], revision=watchers[0]["revision"]).json["data"])
        self.assertIn("does not let this host in", ask(self.watcher, "Check", id=server["id"]).json["data"]["reason"])
        log = "".join(path.read_text() for home in (self.owner.home, self.watcher.home) for path in (home / "log").iterdir())
        self.assertNotIn(code, log)

    def test_a_hostile_host_steers_neither_web_server_nor_browser(self):
        port, certificate = self.enterContext(HostileHost.running())
        line = self.line("Third", port, "127.0.0.1")
        prefix, coded = line.strip().split(":", 1)
        said = {**json.loads(base64.b64decode(coded)), "certificate": certificate}
        line = f"{prefix}:{base64.b64encode(json.dumps(said).encode()).decode()}"
        server = json.loads(self.watcher.cli("server", "add", "Hostile", "--json", text=line))["id"]
        self.addCleanup(self.watcher.cli, "server", "remove", str(server))
        for kind in ("text/html", "image/svg+xml", "image/jpeg\x7f", "multipart/mixed", "multipart/x-mixed-replacement", ""):
            HostileHost.content_type = kind
            self.assertEqual(self.relay(1, server=server).status, 502, kind)
        for HostileHost.ahead_s, reason in (3630, "its clock is 60 minutes ahead of"), (-3630, "its clock is 60 minutes behind"), \
                (0, "it does not let this host in: it knows another secret"):
            with self.assertRaisesRegex(AssertionError, "Hostile failed: " + reason):
                self.watcher.cli("server", "refresh")
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
                        wait_until(parts.ends, 2, "the stream ends")
                for server in (self.watcher, self.owner):
                    wait_until(lambda: len(server.requests()) <= 1, 5, "the request ends on both hosts")

    def test_later_cameras_arrive_and_a_new_pairing_keeps_what_is_known(self):
        before = self.known()
        later = self.owner.add_camera("Later", "test:mjpeg")
        self.watcher.cli("server", "refresh")  # unless the minute's own was faster
        self.assertEqual(json.loads(self.watcher.cli("server", "refresh", "--json"))[0]["new"], 0)
        self.assertEqual(set(self.known()) - set(before), {later})
        with self.relayed_parts(1) as parts:
            parts.next()
            line = self.line("Watcher", self.owner.tls_port)
            wait_until(parts.ends, 5, "the stream ends with the pairing")
        with self.assertRaisesRegex(AssertionError, "does not let this host in"):
            self.watcher.cli("server", "refresh")
        before = self.known()
        self.pair(line)
        self.assertEqual(self.known(), before)
        self.assertEqual(json.loads(self.watcher.cli("server", "refresh", "--json"))[0]["new"], 0)


if __name__ == "__main__":
    unittest.main()
