# SPDX-License-Identifier: Apache-2.0
#
# A whole installation for one test: started by script/server on free ports, in a state folder of its own.
import base64
import contextlib
import hashlib
import hmac
import http.client
import json
import os
import pathlib
import re
import signal
import socket
import subprocess
import tempfile
import time
import urllib.parse

from parts import Parts

ROOT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(os.environ.get("LOOKHAVEN_BUILD_FOLDER", ROOT / "build/dev"))
PASSWORDS = {"admin": "correct horse", "viewer": "battery staple"}
PLAYER = "VEXO.Lookhaven.Player"
LIVE = "VEXO.Lookhaven.Player.LiveviewSrc"


def wait_until(condition, seconds, what):
    """The first true value of condition(); fails with the last false one after that many seconds."""
    deadline = time.monotonic() + seconds
    while True:
        value = condition()
        if value:
            return value
        if time.monotonic() > deadline:
            raise AssertionError(f"not within {seconds} s: {what}; last: {value!r}")
        time.sleep(0.02)


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def children(pid):
    """Direct children by process id."""
    try:
        tasks = list(pathlib.Path(f"/proc/{pid}/task").iterdir())
        return {int(child) for task in tasks for child in (task / "children").read_text().split()}
    except OSError:
        return set()


def descendants(pid):
    found = children(pid)
    for child in list(found):
        found |= descendants(child)
    return found


def process_name(pid):
    """Empty once it is gone."""
    try:
        return pathlib.Path(f"/proc/{pid}/comm").read_text().strip()
    except OSError:
        return ""


def program(pid):
    """The base name of a process's program; empty once it is gone, a zombie included."""
    with contextlib.suppress(OSError):
        words = pathlib.Path(f"/proc/{pid}/cmdline").read_bytes().split(b"\0")[0].decode()
        return words if words.startswith("nginx: ") else words.rsplit("/", 1)[-1]
    return ""


def recorded_events(server, camera, account="admin", **parameters):
    """The camera's recorded events of the last day, those that grow included, as EnumEvent tells them."""
    now = int(time.time())
    span = {"from": now - 86400, "to": now + 3600, "recording": "true"}
    query = call(PLAYER, "EnumEvent", cameralists=camera, **{**span, **parameters})
    cameras = server.request(query, account).json["data"]["camera"]
    return [event for entry in cameras for event in entry["event"]]


def call(api, method, version=1, **parameters):
    return {"api": api, "version": version, "method": method, **parameters}


def pairing_secret(line):
    """Of what `server pair` printed."""
    return json.loads(base64.b64decode(line.strip().split(":", 1)[1]))["secret"]


def pairing_token(secret, timestamp):
    """Proves to a host that its paired host asks at this time."""
    return hmac.new(bytes.fromhex(secret), f"lookhaven pair 1\n{timestamp}".encode(), hashlib.sha256).hexdigest()


def make_certificate(folder, name, days):
    """Self-signed: certificate.pem and key.pem in the folder."""
    command = "openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -keyout key.pem -out certificate.pem"
    words = [*command.split(), "-subj", f"/CN={name}", "-days", str(days)]
    subprocess.run(words, cwd=folder, check=True, capture_output=True)


class Answer:
    def __init__(self, response, body):
        self.status = response.status
        self.headers = response.headers
        self.body = body

    @property
    def json(self):
        return json.loads(self.body)

    @property
    def code(self):
        return self.json["error"]["code"]


class Installation:
    """Use as a context manager; leaving it ends everything and removes the state folder."""

    def __init__(self, **environment):
        self._folder = tempfile.TemporaryDirectory(prefix="lookhaven-")
        os.chmod(self._folder.name, 0o755)  # the server's account must reach what is in it
        self.home = pathlib.Path(environment.pop("LOOKHAVEN_HOME", f"{self._folder.name}/home"))
        self.port, self.tls_port = free_port(), free_port()
        self.environment = {
            **os.environ,
            "LOOKHAVEN_HOME": str(self.home),
            "LOOKHAVEN_PORT": str(self.port),
            "LOOKHAVEN_TLS_PORT": str(self.tls_port),
            "LOOKHAVEN_BUILD_FOLDER": str(BUILD),
            "LOOKHAVEN_DEMO_FOOTAGE": "no",
            **{f"LOOKHAVEN_{account.upper()}_PASSWORD": password for account, password in PASSWORDS.items()},
            **environment,
        }
        self.server = None
        self._sessions = {}

    def __enter__(self):
        self.start()
        return self

    def __exit__(self, *_):
        self.stop()
        self.discard()

    def discard(self):
        self._folder.cleanup()

    def keep(self):
        """Leaves the state folder where it is, also when Python ends."""
        self._folder._finalizer.detach()

    # --- the server script

    def start(self):
        """Returns what the script said once the server runs; fails with what it said when it ends before."""
        self._output = open(f"{self._folder.name}/output", "w+b")
        self.server = subprocess.Popen(
            [ROOT / "script/server"], env=self.environment, stdin=subprocess.DEVNULL, stdout=self._output, stderr=self._output
        )
        wait_until(lambda: "Ctrl-C" in self.said() or self.server.poll() is not None, 60, "script/server is up")
        if self.server.poll() is not None:
            raise AssertionError(f"script/server ended: {self.said()}")

    def said(self):
        return pathlib.Path(self._output.name).read_text()

    def stop(self, how=signal.SIGTERM):
        """Ends the script and gives the processes that were its own and still run 5 s later; always none, or the test
        fails."""
        if self.server is None:
            return
        parts = descendants(self.server.pid)
        self.server.send_signal(how)
        self.server.wait(40)
        self.server = None
        self._output.close()
        wait_until(lambda: not any(program(pid) for pid in parts), 10, f"all parts end after {how!r}")

    def kill(self):
        """All its processes at once, as when the machine loses power."""
        os.kill(self.server.pid, signal.SIGSTOP)  # it would start again what ends
        for pid in descendants(self.server.pid):
            with contextlib.suppress(ProcessLookupError):
                os.kill(pid, signal.SIGKILL)
        self.stop(signal.SIGKILL)

    def part(self, name):
        """Process id of recorder, webapi or nginx; waits for it."""
        wanted = {"nginx": "nginx:"}.get(name, f"lookhaven-{name}")
        return wait_until(
            lambda: next((pid for pid in children(self.server.pid) if program(pid).startswith(wanted)), None), 15, name
        )

    def requests(self):
        """Process ids below the web API host, its watcher included, but not those that wait for a request."""
        return {pid for pid in descendants(self.part("webapi")) if process_name(pid) != "webapi-spare"}

    def cli(self, *arguments, text="", timeout=60):
        done = subprocess.run(
            [pathlib.Path(self.environment["LOOKHAVEN_BUILD_FOLDER"], "bin/lookhaven"), *arguments],
            env=self.environment, input=text, capture_output=True, text=True, timeout=timeout,
        )
        if done.returncode != 0:
            raise AssertionError(f"lookhaven {' '.join(arguments)}: {done.stdout}{done.stderr}")
        return done.stdout

    def recording_cameras(self):
        """The cameras of which an event is open."""
        states = self.home / "run/recordings"
        lines = [line.split() for line in states.read_text().splitlines()] if states.exists() else []
        return {int(camera) for camera, state, event, *_ in lines if state == "recording" and event != "0"}

    def add_camera(self, name, source):
        """The id of a new camera."""
        return json.loads(self.cli("camera", "add", "--enable", "--name", name, "--source", source, "--json"))["id"]

    # --- the web API

    def request(self, *arguments, **named):
        """One request; its arguments are those of open()."""
        connection, response = self.open(*arguments, **named)
        with contextlib.closing(connection):
            return Answer(response, response.read())

    def open(self, query, account=None, form=None, headers=None, body=None, method=None):
        """A request over plain HTTP, whose answer's body is left to the caller, who closes the connection. A query of pairs is
        escaped, a text goes as it is; a form makes it a POST."""
        if not isinstance(query, str):
            query = urllib.parse.urlencode(query)
        headers = dict(headers or {})
        if account:
            headers["Cookie"] = f"id={self.session(account)}"
        if form is not None:
            body = urllib.parse.urlencode(form)
            headers.setdefault("Content-Type", "application/x-www-form-urlencoded")
        connection = http.client.HTTPConnection("127.0.0.1", self.port, timeout=30)
        connection.request(method or ("GET" if body is None else "POST"), f"/webapi?{query}", body, headers)
        return connection, connection.getresponse()

    def answers(self):
        """The web API serves who is logged in."""
        with contextlib.suppress(OSError):
            return self.request(call("VEXO.Auth", "Status"), "admin").status == 200

    def login(self, account, password=None):
        form = {"account": account, "password": password or PASSWORDS[account]}
        answer = self.request(call("VEXO.Auth", "Login"), form=form)
        if answer.status != 200:
            raise AssertionError(f"log-in of {account}: {answer.status} {answer.body!r}")
        return re.search(r"\bid=([^;]+)", answer.headers["Set-Cookie"])[1]

    def session(self, account):
        if account not in self._sessions:
            self._sessions[account] = self.login(account)
        return self._sessions[account]

    def forget_sessions(self):
        """Each account logs in anew when it is next used: a right that is lost ended its sessions."""
        self._sessions.clear()

    def live(self, camera, account="admin", **parameters):
        """A live stream as a Parts; the caller closes it."""
        return Parts(*self.open(call(LIVE, "Play", camera=camera, **parameters), account))
