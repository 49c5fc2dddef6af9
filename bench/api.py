# SPDX-License-Identifier: Apache-2.0
"""LoadCamera with 100 cameras: answers a second and their times, at the socket and through nginx."""

import json
import pathlib
import subprocess
import sys

from stand import Stand

QUERY = "api=VEXO.Lookhaven.Player&version=1&method=LoadCamera"
CAMERAS = 100


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    with Stand(bin_folder) as stand:
        for number in range(CAMERAS):
            stand.add_test_camera(f"Camera {number + 1}", "test:mjpeg?size=1280x720&fps=25")
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        print("| server | clients | answers/s | p50 ms | p99 ms | refused |")
        print("|---|---|---|---|---|---|")
        for name, target in (
            ("host, SCGI socket", ["--unix", stand.socket]),
            ("host behind nginx", ["--port", str(stand.port)]),
        ):
            for clients in (1, 16):
                output = subprocess.run(
                    [bin_folder / "bench_requests", *target, "--cookie", cookie, "--query", QUERY]
                    + ["--clients", str(clients), "--seconds", "5"],
                    check=True,
                    capture_output=True,
                ).stdout
                row = json.loads(output)
                print(
                    f"| {name} | {clients} | {row['per_second']:.0f} | {row['p50_micros'] / 1000:.2f} "
                    f"| {row['p99_micros'] / 1000:.2f} | {row['refused']} |",
                    flush=True,
                )


if __name__ == "__main__":
    main()
