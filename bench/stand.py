# SPDX-License-Identifier: Apache-2.0
"""The stand that benchmarks run on: an installation of its own with host and web server, and what its processes cost."""

import json
import os
import pathlib
import shutil
import signal
import socket
import subprocess
import tempfile
import time

ROOT = pathlib.Path(__file__).resolve().parent.parent
PASSWORD = "bench-password"


def children(pid):
    found = []
    for task in pathlib.Path(f"/proc/{pid}/task").iterdir():
        found += [int(child) for child in (task / "children").read_text().split()]
    return found


def descendants(pid):
    """The process's descendants, oldest first."""
    found = []
    for child in children(pid):
        found += [child, *descendants(child)]
    return sorted(found)


def cpu_nanos(pids):
    """Processor time that the threads of the processes have used so far; without those that have ended."""
    threads = (thread for pid in pids for thread in pathlib.Path(f"/proc/{pid}/task").iterdir())
    return sum(int((thread / "schedstat").read_text().split()[0]) for thread in threads)


def private_kib(pid):
    rollup = pathlib.Path(f"/proc/{pid}/smaps_rollup").read_text().splitlines()
    return sum(int(line.split()[1]) for line in rollup if line.startswith(("Private_Clean", "Private_Dirty")))


def viewers(bin_folder, count, seconds, target):
    """Starts viewers; call the result for what they saw."""
    run = subprocess.Popen(
        [bin_folder / "bench_viewers", "--viewers", str(count), "--seconds", str(seconds), *target],
        stdout=subprocess.PIPE,
    )

    def result():
        output, _ = run.communicate()
        if run.returncode != 0:
            raise RuntimeError("the viewers failed")
        return json.loads(output)

    return result


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def wait_until(condition, what, seconds=10):
    deadline = time.monotonic() + seconds
    while not condition():
        if time.monotonic() > deadline:
            raise TimeoutError(f"{what} did not happen within {seconds} s")
        time.sleep(0.02)


class Stand:
    """Use as a context manager: everything started ends with it, and its folder goes."""

    def __init__(self, bin_folder, store=None):
        """store: the address of a store other than SQLite's file."""
        self._bin = bin_folder
        self._home = pathlib.Path(tempfile.mkdtemp(prefix="lookhaven-bench-"))
        self._environment = {**os.environ, "LOOKHAVEN_HOME": str(self._home)}
        self._processes = {}
        self.http_port = free_port()
        self.socket = str(self._home / "run" / "webapi.sock")
        self.database = self._home / "lookhaven.db"
        self.mount = self._home / "recordings"
        try:
            if store is not None:
                (self._home / "store").write_text(store + "\n")
            self._run("init", "--admin", "admin", stdin=PASSWORD + "\n")
        except BaseException:
            shutil.rmtree(self._home)
            raise

    def __enter__(self):
        return self

    def __exit__(self, *_):
        for process in reversed(self._processes.values()):
            process.send_signal(signal.SIGTERM)
        for process in self._processes.values():
            process.wait(timeout=20)
        shutil.rmtree(self._home)

    def _run(self, *arguments, stdin=""):
        subprocess.run(
            [self._bin / "lookhaven", *arguments],
            input=stdin, text=True, check=True, stdout=subprocess.DEVNULL, env=self._environment,
        )

    def _start(self, name, *command):
        log = open(self._home / "log" / f"{name}.log", "w")
        self._processes[name] = subprocess.Popen(command, stdout=log, stderr=log, env=self._environment)

    def add_camera(self, name, source, video_type="mjpeg"):
        self._run("camera", "add", "--name", name, "--type", video_type, "--source", source)

    def take_in_recordings(self):
        """Gives the recordings that lie on the mount rows and indexes; the event of each camera."""
        self._run("verify", "--repair")
        listed = subprocess.run(
            [self._bin / "lookhaven", "event", "list", "--json"], check=True, capture_output=True, env=self._environment
        ).stdout
        return {event["camera_id"]: event["id"] for event in json.loads(listed)}

    def add_events(self, count, days):
        self._run("demo", "events", "--count", str(count), "--days", str(days))

    def start_feeder(self, camera, codec, frame_bytes, frames_per_second):
        self._start(
            "feeder", self._bin / "bench_feeder", str(camera), codec, str(frame_bytes), str(frames_per_second)
        )

    def start_host(self):
        module = self._bin.parent / "lib" / "VEXO.Lookhaven.Player.so"
        self._start(
            "webapi", self._bin / "lookhaven-webapi", "--home", self._home, "--socket", self.socket, "--module", module
        )
        wait_until(lambda: pathlib.Path(self.socket).exists(), "listening")

    def start_nginx(self):
        """The project's own configuration, on ports of its own."""
        subprocess.run(
            ["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes",
             "-subj", "/CN=bench", "-keyout", self._home / "tls/key.pem", "-out", self._home / "tls/certificate.pem"],
            check=True, capture_output=True,
        )
        self._run("server", "configure")
        configuration = (ROOT / "packaging/nginx/lookhaven.conf.in").read_text()
        for word, value in {
            "user": "user root root;" if os.geteuid() == 0 else "",
            "home": self._home,
            "client": self._home,
            "port": self.http_port,
            "tls_port": free_port(),
            "listen_v6": "",
        }.items():
            configuration = configuration.replace(f"@{word}@", str(value))
        path = self._home / "run/nginx.conf"
        path.write_text(configuration)
        self._start("nginx", "/usr/sbin/nginx", "-p", self._home / "run", "-c", path)
        wait_until(lambda: self._answers(), "nginx answering")

    def _answers(self):
        with socket.socket() as probe:
            return probe.connect_ex(("127.0.0.1", self.http_port)) == 0

    def log_in(self):
        """The session cookie's value; needs the web server."""
        answer = subprocess.run(
            ["curl", "-s", "-i", f"http://127.0.0.1:{self.http_port}/webapi?api=VEXO.Auth&version=1&method=Login",
             "--data-urlencode", "account=admin", "--data-urlencode", f"password={PASSWORD}"],
            check=True, capture_output=True, text=True,
        ).stdout
        for line in answer.splitlines():
            if line.lower().startswith("set-cookie: id="):
                return line.split("=", 1)[1].split(";")[0]
        raise RuntimeError("cannot log in: " + answer)

    def host_processes(self):
        """The host and its request processes, oldest first."""
        host = self._processes["webapi"].pid
        return [host, *descendants(host)]

    def nginx_processes(self):
        nginx = self._processes["nginx"].pid
        return [nginx, *descendants(nginx)]
