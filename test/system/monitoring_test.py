# SPDX-License-Identifier: Apache-2.0
#
# What a monitor is told: health while everything runs and while a part does not, metrics, and who may ask.
import http.client
import json
import os
import pathlib
import re
import shutil
import signal
import socket
import subprocess
import time
import unittest

from installation import ROOT, Installation, call, wait_until

SAMPLE = re.compile(r'([a-z_]+)(?:\{((?:[a-z]+="(?:[^"\\\n]|\\.)*",?)*)\})? ([-+.e0-9]+|\+Inf)')

UNCHECKED = "its cameras cannot be checked, because its counts cannot be read"


def own_address():
    """An address of this machine that is not of the loopback; none without a network."""
    with socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as probe:
        try:
            probe.connect(("192.0.2.1", 9))
        except OSError:
            return None
        return probe.getsockname()[0]


class MonitoringTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())
        wait_until(lambda: cls.server.recording_cameras(), 20, "something is recorded")

    def get(self, path, headers={}):
        connection = http.client.HTTPConnection("127.0.0.1", self.server.port, timeout=30)
        self.addCleanup(connection.close)
        connection.request("GET", path, headers=headers)
        response = connection.getresponse()
        return response.status, response.read().decode()

    def problems(self):
        status, body = self.get("/healthz")
        answer = json.loads(body)["data"]
        self.assertEqual((status, answer["healthy"]), (503, False) if answer["problem"] else (200, True))
        return {(each["subject"], each["message"]) for each in answer["problem"]}

    def samples(self):
        status, text = self.get("/metrics")
        self.assertEqual(status, 200)
        found = {}
        for line in text.splitlines():
            if not line.startswith("#"):
                name, labels, value = SAMPLE.fullmatch(line).groups()
                found[name, labels or ""] = float(value)
        return found

    def test_tells_what_does_not_work_and_that_it_works_again(self):
        wait_until(lambda: not self.problems(), 20, "all is well")
        recorder = self.server.part("recorder")
        os.kill(recorder, signal.SIGSTOP)
        wait_until(lambda: ("recorder", "it hangs") in self.problems(), 10, "a recorder that hangs is told")
        in_the_way = self.server.home / "run/stream-counters.new/x"
        in_the_way.mkdir(parents=True)
        (self.server.home / "run/recordings").unlink()
        os.kill(recorder, signal.SIGKILL)
        wait_until(lambda: ("recorder", UNCHECKED) in self.problems(), 10, "a recorder that cannot count is told")
        wait_until(lambda: self.server.recording_cameras(), 20, "it records without")
        shutil.rmtree(in_the_way.parent)
        mount = pathlib.Path(json.loads(self.server.cli("mount", "list", "--json"))[0]["path"])
        away = mount.with_name("away")
        mount.rename(away)
        wait_until(lambda: ("mount", "its disk is not mounted") in self.problems(), 10, "a disk that is away is told")
        away.rename(mount)
        lost = self.server.add_camera("Lost", "http://127.0.0.1:9/")
        self.server.cli("camera", "set", str(lost), "--record", "always")
        wait_until(lambda: ("camera", "no picture has come for ten seconds") in self.problems(), 20, "a lost camera is told")
        self.server.cli("camera", "remove", str(lost))
        wait_until(lambda: not self.problems(), 20, "all is well again")

    def test_counts_pictures_requests_and_viewers(self):
        before = self.samples()
        with self.server.live(1) as stream:
            stream.next()
            self.server.request(call("VEXO.Catalog", "Groups"), "admin")
            self.server.request(call("VEXO.Catalog", "Groups"))
            stream_1 = 'camera="1",stream="0"'
            groups = 'api="VEXO.Catalog",method="Groups"'
            grown = [("lookhaven_stream_pictures_total", stream_1), ("lookhaven_stream_bytes_total", stream_1),
                     ("lookhaven_requests_total", f'{groups},code="200"'),
                     ("lookhaven_requests_total", 'api="VEXO.Catalog",method="",code="401"')]

            def counted():
                now = self.samples()
                return now if all(now.get(name, 0) > before.get(name, 0) for name in grown) else None

            now = wait_until(counted, 10, "pictures and requests are counted")
        for name in grown:
            if name[0] == "lookhaven_requests_total":
                self.assertEqual(now[name] - before.get(name, 0), 1, name)
        buckets = [value for (name, labels), value in now.items()
                   if name == "lookhaven_request_duration_seconds_bucket" and labels.startswith(groups)]
        self.assertEqual(buckets, sorted(buckets))
        self.assertEqual(buckets[-1], now["lookhaven_request_duration_seconds_count", groups])
        live = 'api="VEXO.Lookhaven.Player.LiveviewSrc",method="Play"'
        self.assertEqual(now["lookhaven_viewers", live], 1)
        self.assertGreater(now["lookhaven_viewers_private_bytes", live], 4096)
        mount = 'mount="1",name="' + json.loads(self.server.cli("mount", "list", "--json"))[0]["name"] + '"'
        self.assertGreater(now["lookhaven_mount_size_bytes", mount], now["lookhaven_mount_free_bytes", mount])
        self.assertGreater(now["lookhaven_mount_retention_runs_total", mount], 0)
        self.assertEqual(now["lookhaven_mount_retention_failures_total", mount], 0)
        ring = f'{stream_1},medium="video"'
        self.assertEqual(now["lookhaven_ring_readers", ring], 1)
        self.assertTrue(0 < now["lookhaven_ring_used_bytes", ring] <= now["lookhaven_ring_size_bytes", ring])
        self.assertLess(now["lookhaven_recording_queue_bytes", stream_1], now["lookhaven_recording_queue_limit_bytes", stream_1])
        for name in ("recorder", "store"):
            self.assertEqual(now[f"lookhaven_{name}_up", ""], 1)
        self.assertLess(now["lookhaven_recording_lag_seconds", stream_1], 5)
        self.assertLess(now["lookhaven_stream_picture_age_seconds", stream_1], 10)
        for process in ("recorder", "webapi"):
            ticks = int(pathlib.Path(f"/proc/{self.server.part(process)}/stat").read_text().rsplit(")")[1].split()[19])
            uptime = time.clock_gettime(time.CLOCK_BOOTTIME) - ticks / os.sysconf("SC_CLK_TCK")
            self.assertAlmostEqual(now["lookhaven_process_uptime_seconds", f'process="{process}"'], uptime, delta=10)
        self.assertLess(now["lookhaven_recording_store_lag_seconds", ""], 10)

    def test_alerts_and_dashboard_name_what_there_is(self):
        there = set(re.findall(r"# TYPE (\w+)", self.get("/metrics")[1]))
        for file in ("alerts.yml", "dashboard.json"):
            named = re.findall(r"\blookhaven_\w+", (ROOT / "packaging/monitoring" / file).read_text())
            missing = {each.removesuffix("_bucket") for each in named} - there
            # These two are of hosts and of PostgreSQL.
            self.assertLessEqual(missing, {"lookhaven_host_up", "lookhaven_store_standbys"}, file)

    def test_is_well_formed_for_prometheus(self):
        if not shutil.which("promtool"):
            self.skipTest("promtool is not installed")
        done = subprocess.run(["promtool", "check", "metrics"], input=self.get("/metrics")[1], capture_output=True, text=True)
        self.assertEqual((done.returncode, done.stdout + done.stderr), (0, ""))
        subprocess.run(["promtool", "check", "rules", ROOT / "packaging/monitoring/alerts.yml"], check=True, capture_output=True)

    def test_tells_others_nothing(self):
        token = self.server.cli("setting", "set", "monitor_token", "new").strip()
        bearer = {"Authorization": f"Bearer {token}"}
        proxied = {"X-Forwarded-For": "192.0.2.9"}
        for path in ("/healthz", "/metrics"):
            for headers, status in [({}, 200), (proxied, 401), ({**proxied, "Authorization": f"Bearer {token}x"}, 401),
                                    ({**proxied, "Authorization": "Bearer "}, 401), ({**proxied, **bearer}, 200)]:
                self.assertEqual(self.get(path, headers)[0], status, headers)
            self.assertEqual(self.get(f"{path}%0a?api=VEXO.System&version=1&method=Health")[0], 404)
        if address := own_address():
            url = f"https://{address}:{self.server.tls_port}/metrics"
            for word, status in ([], "401"), (["-H", f"Authorization: Bearer {token}"], "200"):
                shown = subprocess.run(["curl", "-ksS", "-o", os.devnull, "-w", "%{http_code}", *word, url], capture_output=True, text=True)
                self.assertEqual(shown.stdout, status)
        self.server.cli("setting", "set", "monitor_token", "off")
        self.assertEqual(self.get("/healthz", {**proxied, **bearer})[0], 401)


if __name__ == "__main__":
    unittest.main()
