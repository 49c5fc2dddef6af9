# SPDX-License-Identifier: Apache-2.0
"""Small pictures of recordings, as a timeline asks for them: VEXO.Picture At, 320 pixels wide. Prints a Markdown table.

One client at the host's socket asks for a random second of an hour each time, in a store of a million events. The hour is
playback's: Motion JPEG of 640x360, and H.264 of 1280x720 with a key frame every two seconds.
"""

import os
import pathlib
import random
import socket
import sys
import time

from playback import CODECS, HOUR, START, record_hour
from stand import Stand

CAMERAS = 64
EVENTS = 1_000_000
YEARS_DAYS = 1826
REQUESTS = 300
WARM_UP = 10


def ask(stand, cookie, **parameters):
    """The milliseconds that the request took, which must bring a picture."""
    query = "&".join(f"{name}={value}" for name, value in parameters.items())
    variables = {"CONTENT_LENGTH": "0", "SCGI": "1", "REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1",
                 "HTTP_COOKIE": f"id={cookie}", "QUERY_STRING": f"api=VEXO.Picture&version=1&method=At&width=320&{query}"}
    head = "".join(f"{name}\0{value}\0" for name, value in variables.items()).encode()
    began = time.perf_counter()
    answer = bytearray()
    with socket.socket(socket.AF_UNIX) as connection:
        connection.connect(stand.socket)
        connection.sendall(b"%d:%s," % (len(head), head))
        while block := connection.recv(65536):
            answer += block
    took = (time.perf_counter() - began) * 1000
    if b"Content-Type: image/jpeg" not in answer[:300]:
        raise RuntimeError(f"no picture: {bytes(answer[:300])}")
    return took


def processor_millis(pid):
    """Of a process and its children that have ended, to a hundredth of a second."""
    fields = pathlib.Path(f"/proc/{pid}/stat").read_text().rpartition(")")[2].split()
    return sum(int(ticks) for ticks in fields[11:15]) * 1000 / os.sysconf("SC_CLK_TCK")


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    draw = random.Random(1)
    with Stand(bin_folder) as stand:
        for number in range(CAMERAS):
            stand.add_test_camera(f"Camera {number + 1}", "test:mjpeg")
        for camera, codec in enumerate(CODECS, 1):
            record_hour(stand, camera, codec)
        events = stand.take_in_recordings()
        stand.add_events(EVENTS, YEARS_DAYS)
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        host, *_ = stand.processes("webapi")
        print("| recording | found by | p50 ms | p95 ms | p99 ms | CPU ms a request |")
        print("|---|---|---|---|---|---|")
        for camera, codec in enumerate(CODECS, 1):
            for name, which in (("its event", {"event": events[camera]}), ("camera and time", {"camera": camera})):
                def one():
                    return ask(stand, cookie, **which, time_ms=(START + draw.randrange(HOUR)) * 1000)

                for _ in range(WARM_UP):
                    one()
                before = processor_millis(host)
                times = sorted(one() for _ in range(REQUESTS))
                used = (processor_millis(host) - before) / REQUESTS
                p50, p95, p99 = (times[len(times) * share // 100] for share in (50, 95, 99))
                print(f"| {codec} | {name} | {p50:.1f} | {p95:.1f} | {p99:.1f} | {used:.1f} |", flush=True)


if __name__ == "__main__":
    main()
