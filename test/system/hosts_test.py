# SPDX-License-Identifier: Apache-2.0
#
# Two hosts on one store: what lies at the one is served by the other, to whom may have it, and to nobody else.
import hashlib
import hmac
import json
import re
import sys
import time
import unittest
import urllib.error
import urllib.request

from docs_test import PNG
from installation import LIVE, PLAYER, ROOT, Installation, call, recorded_events, wait_until
from parts import Parts
from players import BY_TIME, numbered, pictures, playing, steer

sys.path.append(str(ROOT / "bench"))
from postgres import Postgres


def picture_at(event, **parameters):
    return call("VEXO.Picture", "At", event=event["id"], time_ms=event["start"] * 1000 + 4000, **parameters)


class HostsTest(unittest.TestCase):
    """The owner records all cameras and has their footage; the other has nothing but the store."""

    @classmethod
    def setUpClass(cls):
        cls.postgres = cls.enterClassContext(Postgres())
        url = cls.postgres.new_database("hosts")
        cls.owner = cls.enterClassContext(Installation(LOOKHAVEN_DEMO_FOOTAGE="yes"))
        cls.owner.stop()
        cls.owner.cli("store", "move", "-", text=url)
        cls.owner.start()
        cls.other = Installation()
        cls.other.home.mkdir()
        (cls.other.home / "store").write_text(url + "\n")
        cls.enterClassContext(cls.other)
        cls.register(1, "North", cls.owner)
        cls.register(2, "South", cls.other)
        cls.sql("update mounts set host_id = 1")
        for server in (cls.owner, cls.other):
            server.stop()
            server.start()
        wait_until(lambda: cls.sql("select count(*) from cameras left join camera_leases on camera_id = id"
                                   " where enabled = 1 and camera_leases.host_id is distinct from 1") == "0", 20, "the owner records all")
        cls.owner.cli("user", "deny", "viewer", "2")
        finished = [each for each in recorded_events(cls.owner, 1) if not each["is_recording"] and each["frame_count"] == 500]
        cls.event = finished[0]
        h264 = [each for each in recorded_events(cls.owner, 2) if not each["is_recording"]]
        cls.h264 = min(h264, key=lambda each: abs(each["start"] - cls.event["start"]))

    @classmethod
    def sql(cls, statement):
        return cls.postgres.ask("hosts", statement)

    @classmethod
    def register(cls, number, name, server):
        certificate = (server.home / "tls/certificate.pem").read_text()
        cls.sql("insert into hosts (id, name, address, port, certificate, version, draining, has_room, heartbeat, holder,"
                f" first_reserved_id) values ({number}, '{name}', '127.0.0.1', {server.tls_port}, '{certificate}', '', 0, 1, 0,"
                " '', 2147483647)")
        (server.home / "host").write_text(f"{number}\n")

    def refuse_forwarded(self):
        """Until the test ends, whatever is forwarded to the owner is answered 503: nobody listens at its port."""
        self.addCleanup(self.sql, f"update hosts set port = {self.owner.tls_port} where id = 1")
        self.sql("update hosts set port = 9 where id = 1")

    def token(self, host, client="192.0.2.7", when=None):
        said = f"{int(when or time.time())} {client} "
        key = bytes.fromhex(self.sql("select value from settings where name = 'session_key'"))
        return said + hmac.new(key, f"lookhaven forward 1\n{host}\n{said}".encode(), hashlib.sha256).hexdigest()

    def is_fetched(self, camera):
        """While two watch it there."""
        with self.other.live(camera) as first, self.other.live(camera) as second:
            first.next(), second.next()
            return re.search(rf'camera {camera} "\w+" stream 0: live', (self.other.home / "log/recorder.log").read_text())

    def test_live_pictures_come_through(self):
        wait_until(lambda: self.other.request(call(LIVE, "Play", camera=1, snapshot=1), "viewer").status == 200, 15, "a snapshot")
        passed, direct = (server.request(call(LIVE, "Play", camera=2, snapshot=1), "admin") for server in (self.other, self.owner))
        self.assertEqual((passed.status, passed.body), (direct.status, direct.body), "it is no JPEG camera's")
        self.assertEqual(direct.status, 502)
        for camera, kinds in ((1, {"image/jpeg"}), (2, {"image/H264", "audio/AAC"})):
            wait_until(lambda: self.is_fetched(camera), 30, "the recorder fetches what a second viewer watches")
            wait_until(lambda: len(self.other.requests()) <= 1, 5, "those streams end")
            with self.other.live(camera) as first, self.other.live(camera) as second, self.other.live(camera) as third:
                heads = [each.next()[0] for _ in range(40) for each in (first, second, third)]
                # Its watcher is among them, and the stream of a camera that was watched before may be.
                self.assertLessEqual(len(self.owner.requests()), 2 + camera, "of three viewers one has its own stream")
            self.assertEqual({head["content-type"] for head in heads[2::3]}, kinds)
            self.assertLess(max(float(head["x-age-ms"]) for head in heads[-3:]), 1000)
            wait_until(lambda: len(self.other.requests()) <= 1, 5, "streams end with their viewers")
        picture = self.other.request(call("VEXO.Picture", "Get", camera=2), "admin")
        self.assertEqual((picture.status, picture.body[:2], picture.headers["Cache-Control"]), (200, b"\xff\xd8", "no-store"))

    def test_footage_comes_through(self):
        queries = [
            picture_at(self.event),
            call("VEXO.Picture", "At", camera=1, time_ms=self.event["start"] * 1000 + 4000, width=64),
            call("VEXO.Event", "Frame", event=self.event["id"], time_ms=self.event["start"] * 1000 + 4000),
            call("VEXO.Event", "Download", event=self.event["id"]),
            call("VEXO.Event", "Download", event=self.h264["id"], utc_offset_min=60),
            call(PLAYER, "PlayMjpegEvent", eventid=10**6, timestamp=1),
            call(PLAYER, "LoadCamera"),
            call(PLAYER, "EnumEvent", cameralists="1,2", **{"from": self.event["start"] - 60, "to": self.event["start"] + 600}),
        ]
        kept = ("Content-Type", "Content-Length", "Content-Disposition", "Cache-Control", "ETag", "Vary", "Location",
                "X-Capture-Time")
        for query in queries:
            with self.subTest(**query):
                account = "admin" if query.get("event") == self.h264["id"] else "viewer"
                direct, passed = (server.request(query, account) for server in (self.owner, self.other))
                # The head of a downloaded file has numbers of its own.
                begin = 4096 if query["method"] == "Download" else 0
                self.assertEqual((passed.status, len(passed.body)), (direct.status, len(direct.body)))
                self.assertTrue(passed.body[begin:] == direct.body[begin:], "what is forwarded is not changed")
                told = [{name: answer.headers[name] for name in kept} for answer in (direct, passed)]
                if told[0]["Location"]:  # the web servers put themselves in front
                    for each, server in zip(told, (self.owner, self.other)):
                        each["Location"] = each["Location"].replace(f":{server.port}/", "/")
                self.assertEqual(told[1], told[0])
        tag = self.other.request(picture_at(self.event), "viewer").headers["ETag"]
        self.assertEqual(self.other.request(picture_at(self.event), "viewer", headers={"If-None-Match": tag}).status, 304)
        streams = [Parts(*server.open(call("VEXO.Event", "Stream", event=self.h264["id"], timestamp=3, rate=4), "admin"))
                   for server in (self.owner, self.other)]
        direct, passed = ([parts.next() for _ in range(50)] for parts in streams)
        self.assertEqual(passed, direct)
        for parts in streams:
            parts.close()

    def test_health_and_figures_are_of_the_host_alone(self):
        for server, is_theirs in ((self.owner, True), (self.other, False)):
            with urllib.request.urlopen(f"http://127.0.0.1:{server.port}/metrics") as answer:
                self.assertEqual("lookhaven_mount_up{" in answer.read().decode(), is_theirs)
        try:
            answer = urllib.request.urlopen(f"http://127.0.0.1:{self.other.port}/healthz")
        except urllib.error.HTTPError as problems:  # its recorder's may be among them, which began before it was a host
            answer = problems
        with answer:
            subjects = {each["subject"] for each in json.load(answer)["data"]["problem"]}
        self.assertLessEqual(subjects, {"recorder"})
        mounts = self.other.request(call("VEXO.Mount", "List"), "admin", form={}).json["data"]["mount"]
        self.assertEqual({(each["state"], each["message"]) for each in mounts}, {("other-host", "it is of host North")})

    def test_maps_are_shown_with_their_pictures_by_both_hosts(self):
        # One that takes megabytes, which a browser cannot upload as it is.
        large = '<svg xmlns="http://www.w3.org/2000/svg" width="9" height="9">' + " " * 8_000_000 + "</svg>"
        self.other.cli("emap", "add", "Large", "-", text=large)
        added = self.other.request(call("VEXO.Emap", "Add", name="Annex"), "admin", body=PNG, headers={"Content-Type": "image/png"})
        self.assertEqual(added.status, 200, added.body)
        maps = self.owner.request(call("VEXO.Catalog", "Emaps"), "admin").json["data"]["emap"]
        self.assertGreaterEqual({each["name"] for each in maps}, {"Large", "Annex", "Ground floor"})
        for each in maps:
            for account in ("admin", "viewer"):
                with self.subTest(each["name"], account=account):
                    shown = [server.request(call(LIVE, "Play", camera=each["id"], itemType=1), account)
                             for server in (self.owner, self.other)]
                    self.assertEqual(shown[0].status, 200)
                    self.assertTrue(shown[0].json["data"]["emap"])
                    self.assertTrue(shown[0].body == shown[1].body, "both hosts answer the same")

    def test_monitors_are_told_of_all_hosts(self):
        for server in (self.owner, self.other):
            with urllib.request.urlopen(f"http://127.0.0.1:{server.port}/metrics") as answer:
                text = answer.read().decode()
            self.assertIn('lookhaven_host_cameras{host="South"} 0\n', text)
            enabled = int(self.sql("select count(*) from cameras where enabled = 1"))
            self.assertIn(f'lookhaven_host_cameras{{host="North"}} {enabled}\n', text)
            self.assertRegex(text, r'lookhaven_host_bytes_per_second\{host="North"\} [1-9]\d{5,}\n')
            self.assertIn("lookhaven_store_standby 0\n", text)
            self.assertIn("lookhaven_store_standbys 0\n", text)

    def test_an_export_comes_through(self):
        span = {"cameralists": "1,2", "from": self.event["start"], "to": self.event["start"] + 10}
        plans = [server.request(call("VEXO.Event", "PlanExport", **span), "admin").body for server in (self.owner, self.other)]
        self.assertEqual(plans[1], plans[0])
        answer = self.other.request(call("VEXO.Event", "Export", **span), "admin")
        self.assertEqual((answer.status, answer.body[:2]), (200, b"PK"))

    def test_a_player_is_steered_from_either_host(self):
        with playing(self.other, self.event["id"]) as parts:
            numbers = [number for number, _ in numbered(parts, 3)]
            self.assertEqual(steer(self.other, "SetRate", rate=4).json["data"], {"rate": 4})
            numbers += [number for number, _ in numbered(parts, 20)]
        self.assertEqual(sorted({b - a for a, b in zip(numbers, numbers[1:])}), [1, 4], numbers)
        with playing(self.other, self.event["id"], method=BY_TIME, changerate=1) as parts:
            pictures(parts, 3)
            self.assertEqual(steer(self.other, "Pause", on="true").status, 200)
            pictures(parts, 6)
            still = pictures(parts, 4)
            self.assertEqual(len(set(still)), 1)
            self.assertEqual(steer(self.other, "Pause", on="false").status, 200)
            self.assertGreater(len(set(pictures(parts, 10))), 5)
        headers = {"Cookie": f"id={self.owner.session('admin')}"}
        with playing(self.owner, self.event["id"], cookie=self.owner.session("admin")) as parts:
            numbered(parts, 2)
            body = {"form": {"timestamp": 1}, "headers": headers}
            # The stream does not run through this host.
            self.assertEqual(self.other.request(call("VEXO.Playback", "Stop"), **body).status, 200)
            wait_until(parts.ends, 3, "it stops")
        self.assertEqual(steer(self.other, "Stop").status, 404, "no host has it")
        self.assertEqual(self.other.request(call("VEXO.Playback", "Stop", timestamp=1), "admin").status, 405)

    def test_nobody_gets_more_than_at_the_other_host(self):
        rows = [call(LIVE, "Play", camera=2), call(LIVE, "Play", camera=2, snapshot=1), call("VEXO.Picture", "Get", camera=2),
                picture_at(self.h264), call("VEXO.Event", "Download", event=self.h264["id"]),
                call("VEXO.Event", "Stream", event=self.h264["id"], timestamp=4),
                call(PLAYER, "PlayMjpegEvent", eventid=self.h264["id"], timestamp=5)]
        self.refuse_forwarded()
        for query in rows:
            for account in ("viewer", None):
                with self.subTest(account, **query):
                    passed = self.other.request(query, account)
                    self.assertNotEqual((passed.status, passed.body[:2]), (200, b"\xff\xd8"))
                    direct = self.owner.request(query, account)
                    self.assertEqual((passed.status, passed.body.replace(b"%d" % self.other.port, b"")),
                                     (direct.status, direct.body.replace(b"%d" % self.owner.port, b"")))

    def test_what_says_that_it_was_passed_on_is_never_passed_on(self):
        snapshot = call(LIVE, "Play", camera=1, snapshot=1)
        now = time.time()
        for what, server, token, status in [
            ("forged", self.other, "0" * 64, 403),
            ("empty", self.other, "", 403),
            ("of another host", self.other, self.token(1), 403),
            ("of another client", self.other, self.token(2).replace("192.0.2.7", "192.0.2.8"), 403),
            ("stale", self.other, self.token(2, when=now - 400), 403),
            ("of the future", self.other, self.token(2, when=now + 400), 403),
            ("true, where the camera is not", self.other, self.token(2), 503),
            ("true, where it is", self.owner, self.token(1), 200),
        ]:
            with self.subTest(what):
                answer = server.request(snapshot, "admin", headers={"X-Lookhaven-Forwarded": token})
                self.assertEqual(answer.status, status, answer.body[:200])
                self.assertEqual(server.request(snapshot, headers={"X-Lookhaven-Forwarded": token}).status,
                                 403 if status == 403 else 401, "it is no session")

    def test_footage_on_a_shared_mount_is_read_where_it_is_asked_for(self):
        path, mount = self.sql("select path || '|' || id from mounts").split("|")
        fetched = self.other.request(picture_at(self.event), "viewer")
        self.assertEqual(fetched.status, 200, fetched.body[:200])
        self.addCleanup(self.sql, f"update mounts set host_id = 1, path = '{path}'")
        self.refuse_forwarded()
        for what, change, status, message in [
            ("the mount is one host's", "select 1", 503, "on host North, which is offline"),
            ("it is shared", "update mounts set host_id = -1", 200, ""),
            ("it is mounted nowhere", "update mounts set path = '/nowhere'", 503, "on any host"),
            ("the owner has it", f"insert into shared_mount_hosts (mount_id, host_id) values ({mount}, 1)", 503,
             "on host North, which is offline"),
        ]:
            with self.subTest(what):
                self.sql(change)
                answer = self.other.request(picture_at(self.event), "viewer")
                self.assertEqual(answer.status, status, answer.body[:200])
                if status == 200:
                    self.assertEqual(answer.body, fetched.body)
                else:
                    self.assertIn(message, answer.json["error"]["message"])

    def test_parts_of_several_hosts_make_no_export(self):
        self.sql("insert into mounts (id, name, path, max_bytes, max_age, enabled, is_default, host_id)"
                 " values (99, 'South', '/nowhere', 0, 0, 0, 0, 2)")
        self.addCleanup(self.sql, "delete from mounts where id = 99")
        mount = int(self.sql(f"select mount_id from events where id = {self.h264['id']}"))
        self.sql(f"update events set mount_id = 99 where id = {self.h264['id']}")
        self.addCleanup(self.sql, f"update events set mount_id = {mount} where id = {self.h264['id']}")
        starts = sorted([self.event["start"], self.h264["start"]])
        span = {"cameralists": "1,2", "from": starts[0] + 1, "to": starts[1] + 10}
        answer = self.other.request(call("VEXO.Event", "PlanExport", **span), "admin")
        self.assertEqual(answer.status, 409, answer.body)
        self.assertIn("(North, South)", answer.json["error"]["message"])

    def test_z_a_host_that_is_away_costs_what_it_has(self):
        queries = [call(LIVE, "Play", camera=1), call(PLAYER, "PlayMjpegEvent", eventid=self.event["id"], timestamp=9),
                   picture_at(self.event), call("VEXO.Event", "Download", event=self.event["id"])]
        wait_until(lambda: len(self.owner.requests()) <= 1, 40, "nothing is fetched for longer than it is watched")
        with self.other.live(1) as first, self.other.live(1, "viewer") as second:
            first.next(), second.next()
            self.owner.stop()
            wait_until(lambda: first.ends() and second.ends(), 10, "its streams end")
        log = self.other.home / "log/webapi.log"
        wait_until(lambda: f"host North broke off its answer to {LIVE}/Play" in log.read_text(), 5, "that is logged")
        for query in queries:
            began = time.monotonic()
            answer = self.other.request(query, "viewer")
            self.assertEqual(answer.status, 503, answer.body[:200])
            self.assertRegex(answer.json["error"]["message"], "camera 1 is on host North, which is offline")
            self.assertLess(time.monotonic() - began, 10)
        self.assertEqual(self.other.request(call(PLAYER, "LoadCamera"), "viewer").status, 200)
        self.assertTrue(recorded_events(self.other, 1))
        self.owner.start()
        wait_until(lambda: self.other.request(call(LIVE, "Play", camera=1, snapshot=1), "viewer").status == 200, 20, "it is back")


if __name__ == "__main__":
    unittest.main()
