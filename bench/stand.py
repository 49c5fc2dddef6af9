# SPDX-License-Identifier: Apache-2.0
"""The stand that benchmarks run on: an installation of its own with host and web server, and what its processes cost."""

import json
import os
import pathlib
import re
import signal
import socket
import subprocess
import sys

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent / "test/system"))
from installation import PASSWORDS, ROOT, Installation, call, descendants, free_port, make_certificate, process_name
from installation import recorded_events, wait_until


def cpu_nanos(pids):
    """Processor time that the threads of the processes have used so far; without those that have ended."""
    threads = (thread for pid in pids for thread in pathlib.Path(f"/proc/{pid}/task").iterdir())
    return sum(int((thread / "schedstat").read_text().split()[0]) for thread in threads)


def busy(pids):
    """Of the processes, those that do not wait for a request."""
    return [pid for pid in pids if process_name(pid) != "webapi-spare"]


def private_kib(pid):
    rollup = pathlib.Path(f"/proc/{pid}/smaps_rollup").read_text().splitlines()
    return sum(int(line.split()[1]) for line in rollup if line.startswith(("Private_Clean", "Private_Dirty")))


def answers(port):
    with socket.socket() as probe:
        return probe.connect_ex(("127.0.0.1", port)) == 0


def viewers(bin_folder, count, seconds, target, program="bench_viewers"):
    """Starts viewers; call the result for what they saw."""
    run = subprocess.Popen(
        [bin_folder / program, "--viewers", str(count), "--seconds", str(seconds), *target], stdout=subprocess.PIPE
    )

    def result():
        output, _ = run.communicate()
        if run.returncode != 0:
            raise RuntimeError("the viewers failed")
        seen = json.loads(output)
        if seen["ended"]:
            raise RuntimeError(f"{seen['ended']} of {count} streams ended")
        return seen

    return result


class Stand(Installation):
    """Use as a context manager: everything started ends with it, and its folder goes. Nothing runs until it is started:
    the benchmark chooses host, web server and feeder instead of script/server's parts."""

    def __init__(self, bin_folder, store=None):
        """store: the address of a store other than SQLite's file."""
        super().__init__(LOOKHAVEN_BUILD_FOLDER=str(bin_folder.parent))
        self._bin = bin_folder
        self._processes = {}
        self.socket = str(self.home / "run/webapi.sock")
        self.database = self.home / "lookhaven.db"
        self.mount = self.home / "recordings"
        try:
            if store is not None:
                self.home.mkdir()
                (self.home / "store").write_text(store + "\n")
            self.cli("init", "--admin", "admin", text=PASSWORDS["admin"] + "\n")
        except BaseException:
            self.discard()
            raise

    def start(self):
        pass

    def stop(self, how=signal.SIGTERM):
        for process in reversed(self._processes.values()):
            process.send_signal(how)
        for process in self._processes.values():
            process.wait(timeout=20)

    def _start(self, name, *command):
        with open(self.home / "log" / f"{name}.log", "w") as log:
            self._processes[name] = subprocess.Popen(command, stdout=log, stderr=log, env=self.environment)

    def add_test_camera(self, name, source, video_type="mjpeg"):
        self.cli("camera", "add", "--name", name, "--type", video_type, "--source", source)

    def add_recorded_camera(self, name, source, video_type):
        self.cli("camera", "add", "--enable", "--name", name, "--type", video_type, "--source", source,
                 "--audio" if video_type == "h264" else "--no-audio", "--record", "always", "--segment", "60m")

    def take_in_recordings(self):
        """Gives the recordings that lie on the mount rows and indexes; the event of each camera."""
        self.cli("verify", "--repair")
        return {event["camera_id"]: event["id"] for event in json.loads(self.cli("event", "list", "--json"))}

    def add_events(self, count, days):
        self.cli("demo", "events", "--count", str(count), "--days", str(days), timeout=None)

    def end(self, name):
        """Ends one process of those that were started, and what is below it."""
        process = self._processes.pop(name)
        process.terminate()
        process.wait(timeout=20)

    def start_recorder(self, *options):
        self._start("recorder", self._bin / "lookhaven-recorder", "--home", self.home, *options)

    def start_feeder(self, camera, codec, frame_bytes, frames_per_second):
        self._start(
            "feeder", self._bin / "bench_feeder", str(camera), codec, str(frame_bytes), str(frames_per_second)
        )

    def start_host(self):
        module = self._bin.parent / "lib" / "VEXO.Lookhaven.Player.so"
        self._start(
            "webapi", "env", "LD_BIND_NOW=1", self._bin / "lookhaven-webapi", "--home", self.home, "--socket", self.socket,
            "--module", module,
        )
        wait_until(pathlib.Path(self.socket).exists, 10, "the host listens")

    def start_nginx(self):
        """The project's own configuration, on ports of its own."""
        subprocess.run(
            ["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes",
             "-subj", "/CN=bench", "-keyout", self.home / "tls/key.pem", "-out", self.home / "tls/certificate.pem"],
            check=True, capture_output=True,
        )
        self._start_nginx("nginx", self.home / "run", self.socket, self.port, self.tls_port)

    def start_relay(self, origin):
        """A second web server, the same in everything, for an origin that speaks SCGI on that socket. Its TLS port."""
        port, tls_port = free_port(), free_port()
        folder = self.home / "run/relay"
        folder.mkdir(exist_ok=True)
        self._start_nginx("relay", folder, origin, port, tls_port)
        return tls_port

    def _start_nginx(self, name, folder, origin, port, tls_port):
        configuration = (ROOT / "packaging/nginx/lookhaven.conf.in").read_text()
        for word, value in {
            "@home@/run/webapi.sock": origin,
            "@home@/run": folder,
            "@user@": "user root root;" if os.geteuid() == 0 else "",
            "@home@": self.home,
            "@client@": self.home,
            "@port@": port,
            "@tls_port@": tls_port,
            "@listen_v6@": "",
            "@prefer_chacha20@": "off",
            "@trusted_proxies@": "",
            "@strict_transport_security@": "",
        }.items():
            configuration = configuration.replace(word, str(value))
        unfilled = re.search(r"@\w+@", configuration)
        assert not unfilled, f"the configuration of nginx has {unfilled[0]}, which nothing fills in"
        path = folder / "nginx.conf"
        path.write_text(configuration)
        self._start(name, "/usr/sbin/nginx", "-p", folder, "-c", path)
        wait_until(lambda: answers(port), 10, "nginx answers")

    def log_in(self):
        """The session cookie's value; needs the web server."""
        return self.session("admin")

    def processes(self, name):
        """The process that was started under that name and all below it, oldest first."""
        pid = self._processes[name].pid
        return [pid, *sorted(descendants(pid))]
