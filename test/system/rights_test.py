# SPDX-License-Identifier: Apache-2.0
#
# Who gets what of every method of every API. What is denied to somebody is answered as what does not exist.
import base64
import contextlib
import hashlib
import hmac
import json
import re
import time
import unittest
from typing import NamedTuple

from api_test import PLAYER, call
from installation import LIVE, PASSWORDS, ROOT, Installation, Parts, recorded_events

# The callers, a letter of an outcome for each: nobody, one whose session has ended, a viewer, viewers who are denied cameras
# 1 and 2 (but may mark), the sound of all, e-map 1, door 2; a viewer who may mark, a manager, a paired host.
CALLERS = ["nobody", "ended", "viewer2", "blind", "deaf", "mapless", "doorless", "marker", "manager", "peer"]
# Outcomes: D data, S data with sound, O an answer without the object, R a redirect, G an error of a gateway, and:
LETTERS = {400: "B", 401: "E", 403: "F", 404: "N", 405: "M", 409: "C", 429: "Q", 502: "G", 504: "T"}


class Row(NamedTuple):
    api: str
    method: str
    there: str  # outcomes where the object exists …
    absent: str = ""  # … and where it does not; empty: the method is about no object
    query: dict = {}
    form: dict | None = None  # makes it a POST
    parameter: str = ""  # names the object, which is one of cls.ids
    target: str = ""
    shows: object = None  # whether the answer's data tells of the object; of other than JSON always


def camera_2(data):
    return any(2 in each["camera"] for each in next(iter(data.values())))


def about(camera):
    return lambda data: any(event["camera_id"] == camera for event in data["event"])


N = "EENNNNNNNE"
MANAGERS = "EEFFFFFFDE"
ROWS = [
    Row("VEXO.Auth", "Status", "EEDDDDDDDE"),
    Row("VEXO.Auth", "Login", "MMMMMMMMMM"),
    Row("VEXO.Auth", "Logout", "MMMMMMMMMM"),
    Row("VEXO.Catalog", "Groups", "EEDODDDDDE", shows=camera_2),
    Row("VEXO.Catalog", "Mounts", "EEDODDDDDE", shows=camera_2),
    Row("VEXO.Catalog", "Emaps", "EEDDDODDDE", shows=lambda data: any(one["id"] == 1 for one in data["emap"])),
    Row("VEXO.Emap", "States", "EEDDDNODDE", N, {}, None, "emap", "map", lambda data: any(one["id"] == 2 for one in data["door"])),
    Row("VEXO.Emap", "States", "EEDODNDDDE", N, {}, None, "emap", "map", lambda data: any(one["camera"] == 2 for one in data["io"])),
    Row("VEXO.Emap", "Items", MANAGERS, "EEFFFFFFNE", {}, None, "emap", "map"),
    Row("VEXO.Emap", "Devices", MANAGERS),
    Row("VEXO.Emap", "SaveItems", "EEFFFFFFCE", "EEFFFFFFNE", {}, {"revision": 99, "items": "[]"}, "emap", "map"),
    Row("VEXO.Emap", "Report", MANAGERS, "EEFFFFFFNE", {}, {"kind": "door", "state": "open"}, "id", "door"),
    Row("VEXO.Event", "Mark", "EEFNFFFDDE", "EEFNFFFNNE", {}, {"kind": "alert"}, "camera", "camera"),
    Row("VEXO.Event", "List", "EEDODDDDDE", "EEOOOOOOOE", {}, None, "cameralists", "camera", about(2)),
    Row("VEXO.Event", "Get", "EEDNDDDDDE", N, {}, None, "event", "event"),
    Row("VEXO.Event", "Get", "EEDNDDDDDE", N, {"kind": "alert"}, None, "event", "alert"),
    Row("VEXO.Event", "Download", "EEDNDDDDDE", N, {}, None, "event", "event"),
    Row("VEXO.Pairing", "Cameras", "EEEEEEEEED"),
    Row("VEXO.Picture", "Get", "EEDNDDDDDE", N, {}, None, "camera", "camera"),
    Row("VEXO.Playback", "SetRate", N, form={"timestamp": 1, "rate": 2}),
    Row("VEXO.Playback", "GetPosition", N, query={"timestamp": 1}),
    Row("VEXO.Playback", "Pause", N, form={"timestamp": 1, "on": "true"}),
    Row("VEXO.Playback", "CheckOwner", N, form={"timestamp": 1}),
    Row("VEXO.Playback", "Stop", N, form={"timestamp": 1}),
    Row("VEXO.Relay", "Play", "EESNDSSSSE", N, {"server": 2}, None, "camera", "camera"),
    Row(PLAYER, "LoadCamera", "EEDODDDDDE", shows=lambda data: any(one["id"] == 2 for one in data["camera"])),
    Row(PLAYER, "SearchAvaiDate", "EEDODDDDDE", "EEOOOOOOOE", {"start": "$FROM", "day_count": 2}, None, "cameralists", "camera",
        lambda data: 1 in data["available_day"]),
    Row(PLAYER, "EnumEvent", "EEDODDDDDE", "EEOOOOOOOE", {"from": "$FROM", "to": "$TO"}, None, "cameralists", "camera",
        lambda data: any(one["event"] for one in data["camera"])),
    Row(PLAYER, "PlayMjpegEvent", "EEDRDDDDDE", "EERRRRRRRE", {"timestamp": 3}, None, "eventid", "mjpeg"),
    Row(PLAYER, "PlayMjpegEventNoFrameId", "EEDRDDDDDE", "EERRRRRRRE", {"timestamp": 4}, None, "eventid", "mjpeg"),
    Row(LIVE, "Play", "EESGDSSSSS", "EEGGGGGGGE", {}, None, "camera", "camera"),
    Row(LIVE, "Play", "EEDGDDDDDD", "EEGGGGGGGE", {}, None, "camera", "silent"),
    Row(LIVE, "Play", "EEDDDGDDDD", "EEGGGGGGGE", {"itemType": 1}, None, "camera", "map"),
    Row(LIVE, "Play", "EEDODGDDDD", "EEGGGGGGGE", {"itemType": 1}, None, "camera", "map",
        lambda data: any(item.get("pairedCamId") == 2 for item in data["items"])),
]


def methods_of_the_product():
    """Of the tables in the sources: a method that has no row here is one whose rights nobody has thought about."""
    found = set(re.findall(r'\{"(VEXO[\w.]+)", 1, "(\w+)", ', (ROOT / "webapi/lookhaven_player.cpp").read_text()))
    for source in (ROOT / "standalone/api").glob("*.cpp"):
        text = source.read_text()
        table = re.search(r"constexpr Method kMethods\[\] = \{(.*?)\};", text, re.S)
        if table:
            api = re.search(r'const OwnApi k\w+\{"([\w.]+)"', text)[1]
            found |= {(api, method) for method in re.findall(r'\{"(\w+)"', table[1])}
    return found


class RightsTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        server = cls.server = cls.enterClassContext(Installation(LOOKHAVEN_DEMO_FOOTAGE="yes"))
        line = server.cli("server", "pair", "Peer", "--address", "localhost", "--port", str(server.tls_port))
        cls.secret = json.loads(base64.b64decode(line.strip().split(":", 1)[1]))["secret"]
        server.cli("server", "add", "Itself", text=line)
        far = {one["id_on_server"]: str(one["id"]) for one in json.loads(server.cli("server", "cameras", "--json"))}
        for name in CALLERS[1:-1]:
            PASSWORDS[name] = f"secret of {name}"
            server.cli("user", "add", name, *(["--privilege", "manager"] if name == "manager" else []), text=PASSWORDS[name])
        for name, *denied in [("blind", "1"), ("blind", "2"), ("blind", far[2]), ("deaf", "2", "--kind", "audio"),
                              ("deaf", far[2], "--kind", "audio"), ("mapless", "--emap", "1"), ("doorless", "--door", "2")]:
            server.cli("user", "deny", name, *denied)
        for name in ("blind", "marker"):
            server.cli("user", "allow", name, "--mark")
        server.session("ended")
        server.cli("user", "passwd", "ended", text="another secret")
        marks = server.request(call("VEXO.Event", "List", cameralists=2, kind="alert"), "manager").json["data"]["event"]
        cls.ids = {"camera": 2, "silent": 1, "map": 1, "door": 1, "event": recorded_events(server, 2)[0]["id"],
                   "alert": marks[0]["id"], "mjpeg": recorded_events(server, 1)[0]["id"]}

    def ask(self, row, caller, value):
        """The outcome's letter, and all of the answer that must not tell a hidden object from an absent one."""
        now = int(time.time())
        query = {**call(row.api, row.method), **row.query}
        query = {key: {"$FROM": now - 86400, "$TO": now}.get(word, word) for key, word in query.items()}
        form = dict(row.form) if row.form is not None else None
        if row.parameter:
            (query if form is None else form)[row.parameter] = value
        headers = {}
        if caller == "peer":
            token = hmac.new(bytes.fromhex(self.secret), f"lookhaven pair 1\n{now}".encode(), hashlib.sha256).hexdigest()
            headers["Cookie"] = f"timestamp={now}; token={token}"
            query |= {"client": "REC_SERVER", "cookie": token}
        account = None if caller in ("nobody", "peer") else caller
        connection, response = self.server.open(query, account, form, headers)
        with contextlib.closing(connection):
            kind = response.headers.get_content_type()
            if kind.startswith("multipart/"):
                codecs = Parts(connection, response).next()[0].get("x-codecs", ";")
                return "D" if codecs.endswith(";") else "S", None
            if response.status != 200 or kind != "application/json":
                body = response.read(1 << 20)
                letter = "R" if response.status == 302 else LETTERS.get(response.status, "D" if response.status == 200 else "?")
            else:
                body = response.read()
                answer = json.loads(body)
                letter = LETTERS.get(answer["error"]["code"], "?") if not answer["success"] else \
                    "O" if row.shows and not row.shows(answer["data"]) else "D"
            kept = {name: text for name, text in response.headers.items() if name != "Date"}
            return letter, (response.status, kept, re.sub(rb'"search_time":\d+', b"", body))

    def test_each_caller_gets_what_he_may_and_hidden_is_absent(self):
        for row in ROWS:
            there = [self.ask(row, caller, self.ids[row.target] if row.target else None) for caller in CALLERS]
            with self.subTest(row=f"{row.api}.{row.method}", **row.query):
                self.assertEqual("".join(letter for letter, _ in there), row.there)
            if not row.absent:
                continue
            absent = [self.ask(row, caller, 999_999) for caller in CALLERS]
            with self.subTest(row=f"{row.api}.{row.method}, absent", **row.query):
                self.assertEqual("".join(letter for letter, _ in absent), row.absent)
                for caller, one, other in zip(CALLERS, there, absent):
                    if one[0] == other[0]:
                        self.assertEqual(one[1], other[1], caller)

    def test_each_method_has_a_row(self):
        self.assertEqual({(row.api, row.method) for row in ROWS}, methods_of_the_product())


if __name__ == "__main__":
    unittest.main()
