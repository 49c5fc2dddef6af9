# SPDX-License-Identifier: Apache-2.0
"""LoadCamera with 100 cameras: answers a second and their times, at the socket and through nginx; asked by one client now
and then, as people do, and by clients that ask again at once, who wait for the host to fork the next process. Then how long
a camera that is added over the web API takes to its first live picture."""

import json
import pathlib
import subprocess
import sys
import tempfile
import time

from record import start_cameras
from stand import Stand, call

QUERY = "api=VEXO.Lookhaven.Player&version=1&method=LoadCamera"
CAMERAS = 100
ADDED = 10  # of each kind


def print_answers(bin_folder):
    with Stand(bin_folder) as stand:
        for number in range(CAMERAS):
            stand.add_test_camera(f"Camera {number + 1}", "test:mjpeg?size=1280x720&fps=25")
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        print("| server | clients | pause ms | answers/s | p50 ms | p99 ms | refused |")
        print("|---|---|---|---|---|---|---|")
        for name, target in (
            ("host, SCGI socket", ["--unix", stand.socket]),
            ("host behind nginx", ["--port", str(stand.port)]),
        ):
            for clients, pause_ms in (1, 50), (1, 0), (16, 0):
                output = subprocess.run(
                    [bin_folder / "bench_requests", *target, "--cookie", cookie, "--query", QUERY]
                    + ["--clients", str(clients), "--pause-ms", str(pause_ms), "--seconds", "5"],
                    check=True,
                    capture_output=True,
                ).stdout
                row = json.loads(output)
                print(
                    f"| {name} | {clients} | {pause_ms} | {row['per_second']:.0f} | {row['p50_micros'] / 1000:.2f} "
                    f"| {row['p99_micros'] / 1000:.2f} | {row['refused']} |",
                    flush=True,
                )


def first_picture_ms(stand, source, codec):
    fields = {"name": source, "source": [{"profile": 0, "address": source}], "codec": codec}
    began = time.monotonic()
    answer = stand.request(call("VEXO.Camera", "Add"), "admin", body=json.dumps(fields), headers={"Content-Type": "application/json"})
    with stand.live(json.loads(answer.body)["data"]["camera"]["id"]) as stream:
        stream.next()
    return (time.monotonic() - began) * 1000


def print_first_pictures(bin_folder):
    print("\n| a camera is added, until its first live picture | p50 ms | most ms |\n|---|---|---|")
    with tempfile.TemporaryDirectory() as folder, Stand(bin_folder) as stand:
        cameras, addresses = start_cameras(bin_folder, pathlib.Path(folder))
        try:
            stand.start_recorder()
            stand.start_host()
            stand.start_nginx()
            for scheme, codec in (("http", "mjpeg"), ("rtsp", "h264")):
                times = sorted(first_picture_ms(stand, f"{addresses[scheme]}/{number}", codec) for number in range(ADDED))
                print(f"| {codec} by {scheme} | {times[len(times) // 2]:.0f} | {times[-1]:.0f} |", flush=True)
        finally:
            cameras.kill()
            cameras.wait()


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    print_answers(bin_folder)
    print_first_pictures(bin_folder)


if __name__ == "__main__":
    main()
