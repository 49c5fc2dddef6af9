# SPDX-License-Identifier: Apache-2.0
#
# Runs the examples of docs/api/: each answer must have the status, the keys and the types that its page shows.
import base64
import contextlib
import json
import pathlib
import re
import tempfile
import time
import unittest

from installation import PASSWORDS, ROOT, Installation, call, make_certificate, recorded_events, wait_until
from parts import Parts

# For a file that an example names: one pixel.
PNG = base64.b64decode(
    "iVBORw0KGgoAAAANSUhEUgAAAAEAAAABCAYAAAAfFcSJAAAADUlEQVR42mNk+M9QDwADhgGAWjR9awAAAABJRU5ErkJggg=="
)
EXAMPLE = re.compile(
    r"(?:```player\n([^`]*)```\s*)?```request(?: as (\w+))?\n([^`]*)```\s*```answer (\d+)(?: (\S+))?\n([^`]*)```"
)


def shape(value):
    """Keys and types; of a list, those of its first element."""
    if isinstance(value, dict):
        return {key: shape(inner) for key, inner in value.items()}
    if isinstance(value, list):
        return [shape(value[0])] if value else []
    return type(value).__name__


def words(server):
    """What stands for the words with a dollar sign: what the examples refer to, as it is in the demo."""
    now = int(time.time())
    server.cli("server", "add", "Itself", text=server.cli("server", "pair", "Other", "--address", "localhost", "--port", str(server.tls_port)))
    hosts = server.request(call("VEXO.Server", "List"), "admin", {}).json["data"]["server"]
    accounts = server.request(call("VEXO.User", "List"), "admin", {}).json["data"]["user"]
    mounts = server.request(call("VEXO.Mount", "List"), "admin", {}).json["data"]["mount"]
    with tempfile.TemporaryDirectory() as folder:
        make_certificate(folder, "nvr", 90)
        certificate, key = (json.dumps(pathlib.Path(folder, name).read_text())[1:-1] for name in ("certificate.pem", "key.pem"))
    settings = server.request(call("VEXO.System", "Settings"), "admin", {}).json["data"]["setting"]
    return {
        "$LOG_REVISION": str(server.request(call("VEXO.System", "LogLevels"), "admin", {}).json["data"]["log"]["revision"]),
        "$CERTIFICATE": certificate,
        "$KEY": key,
        "$SETTING_REVISION": str(next(one["revision"] for one in settings if one["name"] == "marks_per_day")),
        "$ADMIN_PASSWORD": PASSWORDS["admin"].replace(" ", "+"),
        "$VIEWER_PASSWORD": PASSWORDS["viewer"].replace(" ", "+"),
        "$MOUNT_REVISION": str(mounts[0]["revision"]),
        "$SERVER_REVISION": str(hosts[1]["revision"]),
        "$ORDER_REVISION": str(server.request(call("VEXO.Camera", "List"), "admin", {}).json["data"]["order"]["revision"]),
        "$REVISION": str(next(one["revision"] for one in accounts if one["name"] == "viewer")),
        "$EVENT": str(recorded_events(server, 1)[0]["id"]),
        "$H264_EVENT": str(recorded_events(server, 2)[0]["id"]),
        "$FROM": str(now - 86400),
        "$TO": str(now),
    }


class DocsTest(unittest.TestCase):
    def test_examples(self):
        ran = 0
        with Installation(LOOKHAVEN_DEMO_FOOTAGE="yes") as server:
            known = words(server)
            states = call("VEXO.Catalog", "CameraStates")
            wait_until(lambda: server.request(states, "admin").json["data"]["camera"], 10, "the recorder tells of its cameras")
            with open(server.home / "log/recorder.log", "a") as log:
                log.write("2026-03-01T08:15:30.123Z recorder[812] error: an example\n")
            for page in sorted((ROOT / "docs/api").glob("*.md")):
                text = page.read_text()
                for word, meaning in known.items():
                    text = text.replace(word, meaning)
                for player, account, request, status, kind, shown in EXAMPLE.findall(text):
                    line, _, body = request.strip().partition("\n")
                    method, target = line.split(" ", 1)
                    # A session that an example may end, but not so many log-ins that the host refuses one.
                    log_in = server.login if page.name == "auth.md" else server.session
                    headers = {"Cookie": f"id={log_in(account)}"} if account not in ("", "token") else {}
                    if account == "token":
                        token = json.loads(server.cli("token", "add", "Till 1", "--camera", "1", "--json"))
                        headers["Authorization"] = f"Bearer {token['secret']}"
                    form = "json" if body.startswith("{") else "x-www-form-urlencoded"
                    headers["Content-Type"] = "image/png" if body.startswith("@") else f"application/{form}"
                    body = PNG if body.startswith("@") else body
                    with self.subTest(page=page.name, request=line), contextlib.ExitStack() as running:
                        ran += 1
                        if player:
                            query = player.strip().partition("?")[2]
                            parts = running.enter_context(Parts(*server.open(query, headers=headers)))
                            parts.next(), parts.next(), parts.next()
                        connection, response = server.open(
                            target.partition("?")[2], headers=headers, body=body if method == "POST" else None, method=method
                        )
                        self.assertEqual(response.status, int(status))
                        if kind == "redirect":
                            self.assertIn("icon_indicator_warning", response.headers["Location"])
                        elif kind:
                            self.assertEqual(response.headers.get_content_type(), kind)
                        else:
                            self.assertEqual(shape(json.loads(response.read())), shape(json.loads(shown)))
                        connection.close()
        self.assertGreaterEqual(ran, 20)


if __name__ == "__main__":
    unittest.main()
