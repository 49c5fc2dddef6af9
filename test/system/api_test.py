# SPDX-License-Identifier: Apache-2.0
#
# What the web API answers to good and bad requests through the web server.
import pathlib
import re
import socket
import time
import unittest
from concurrent.futures import ThreadPoolExecutor

from installation import LIVE, PLAYER, ROOT, Installation, call, wait_until


def play(camera, **parameters):
    return call(LIVE, "Play", camera=camera, **parameters)


def picture(**parameters):
    return call("VEXO.Picture", "Get", **parameters)


LOGIN = call("VEXO.Auth", "Login")
STATUS = call("VEXO.Auth", "Status")
FORM = {"Content-Type": "application/x-www-form-urlencoded"}

# What is asked; the account; further arguments of the request; the HTTP status and the code in the answer.
BAD_REQUESTS = [
    ("unknown method", call(PLAYER, "Dance"), "admin", {}, 404, 404),
    ("cookie too large", call(PLAYER, "LoadCamera"), None, {"headers": {"Cookie": "id=" + "a" * 9000}}, 400, 400),
    ("query too large", "api=" + "a" * 9000, None, {}, 400, 400),
    ("body too large", LOGIN, None, {"body": b"a" * (1 << 20) + b"b", "headers": FORM}, 413, 413),
    ("log-in without a word", LOGIN, None, {"form": {}}, 401, 401),
    ("camera 0", play(0), "admin", {}, 502, 502),
    ("camera -1", play(-1), "admin", {}, 502, 502),
    ("camera 2^31", play(2**31), "admin", {}, 400, 400),
    ("camera of letters", play("abc"), "admin", {}, 400, 400),
    ("camera that is not there", play(4711), "admin", {}, 502, 502),
    ("snapshot of letters", play(1, snapshot="abc"), "admin", {}, 400, 400),
    ("snapshot of H.264", play(2, snapshot=1), "admin", {}, 502, 502),
    ("e-map that is not there", play(99, itemType=1), "admin", {}, 502, 502),
    ("relay of an unknown camera", call("VEXO.Relay", "Play", server=1, camera=1), "admin", {}, 404, 404),
    ("search without a span", call(PLAYER, "EnumEvent"), "admin", {}, 200, 401),
    ("search in a group that is not there", call(PLAYER, "SearchAvaiDate", camGrpId=99), "admin", {}, 200, 400),
    ("number of an event that is a text", call(PLAYER, "PlayMjpegEvent", eventid="abc"), "admin", {}, 400, 400),
    ("picture of no camera", picture(), "admin", {}, 400, 400),
    ("picture of letters", picture(camera="abc"), "admin", {}, 400, 400),
    ("picture of an unknown camera", picture(camera=4711), "admin", {}, 404, 404),
    ("picture of a disabled camera", picture(camera=3), "admin", {}, 504, 504),
    ("picture, unknown method", call("VEXO.Picture", "Dance", camera=2), "admin", {}, 404, 404),
]


class ApiTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())

    def test_bad_requests_get_a_clear_answer(self):
        for name, query, account, arguments, status, code in BAD_REQUESTS:
            with self.subTest(name):
                answer = self.server.request(query, account, **arguments)
                self.assertEqual((answer.status, answer.json.get("success"), answer.code), (status, False, code), answer.body)
        self.assertEqual(self.server.request(STATUS, "admin").status, 200)

    def test_admin_sees_the_demo_cameras(self):
        data = self.server.request(call(PLAYER, "LoadCamera"), "admin").json["data"]
        seen = [(one["id"], one["name"], one["video_type"], one["sound_support"]) for one in data["camera"]]
        self.assertEqual(seen, [(1, "Entrance", 1, 0), (2, "Parking", 3, 1), (4, "Gate", 1, 1)])
        self.assertEqual((data["isManager"], data["CamNum"], data["EnableCamNum"], data["selected"]), (True, 4, 3, 1))

    def test_silent_camera_is_given_up_in_time_and_costs_the_others_nothing(self):
        with socket.create_server(("127.0.0.1", 0)) as silent:
            camera = self.server.add_camera("Silent", f"http://127.0.0.1:{silent.getsockname()[1]}/")
            began = time.monotonic()
            with ThreadPoolExecutor() as pool:
                waiting = pool.submit(self.server.request, play(camera, snapshot=1), "admin")
                self.assertEqual(self.server.request(play(1, snapshot=1), "admin").status, 200)
                self.assertLess(time.monotonic() - began, 3)
                answer = waiting.result()
            self.assertEqual((answer.status, answer.code), (504, 504), answer.body)
            self.assertLess(time.monotonic() - began, 8)

    def test_log_ins_are_throttled_by_address(self):
        with Installation() as server:
            form = {"account": 'x" from "203.0.113.9": wrong account or password', "password": "x"}
            # Refused before any password is hashed, so that 40 are sent faster than the limit forgets, on any machine.
            seen = [server.request({**LOGIN, "account": "nobody"}, form=form).status for _ in range(40)]
            self.assertEqual((seen[0], seen[-1]), (400, 429), seen)
            # Neither a body nor an escape hides what is asked for.
            for query in ("", "api=VEXO%2EAuth&version=1&method=Login", "api=VEXO.Event&api=VEXO.Auth&method=Login"):
                self.assertEqual(server.request(query, form=form).status, 429, query)
            wait_until(lambda: server.request(LOGIN, form=form).status == 401, 5, "a log-in is let through again")
            # The client's address is banned, not the one in the account's name.
            rules = (ROOT / "packaging/fail2ban/filter.d/lookhaven.conf").read_text()
            rule, time_rule = (re.search(f"^{key} = (.*)", rules, re.M)[1] for key in ("failregex", "datepattern"))
            pattern = re.compile(rule.replace("<HOST>", "(.*?)"))
            time_pattern = re.sub("%%[YmdHMSf]", r"\\d+", time_rule).replace("%%z", "Z")
            lines = (server.home / "log/refused-log-ins.log").read_text().splitlines()
            self.assertEqual({pattern.search(re.sub(time_pattern, "", line))[1] for line in lines}, {"127.0.0.1"}, lines)

    def test_plain_http_is_for_this_machine_by_its_own_names(self):
        for host, status in (("localhost", 200), ("127.0.0.1:8080", 200), ("rebound.example", 421)):
            self.assertEqual(self.server.request(STATUS, "admin", headers={"Host": host}).status, status, host)

    def test_no_query_string_in_any_log(self):
        self.server.request({**STATUS, "remark": "sesame-open"}, "admin")
        self.server.request("api=%zz&remark=sesame-open" + "a" * 9000)
        for log in pathlib.Path(self.server.home / "log").iterdir():
            self.assertNotIn("sesame-open", log.read_text(), log)


if __name__ == "__main__":
    unittest.main()
