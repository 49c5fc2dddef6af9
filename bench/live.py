# SPDX-License-Identifier: Apache-2.0
"""Live viewers: what 25 pictures a second of 100 KB cost, beside a bare server in the same run.

Prints one Markdown table. A feeder stands in for the recorder, so that only serving is measured; everything else is the
real thing: ring, module, host, and nginx where the row says so.
"""

import pathlib
import subprocess
import sys
import tempfile
import time

from stand import Stand, cpu_nanos, descendants, private_kib, viewers

FRAME_BYTES = 100_000
FRAMES_PER_SECOND = 25
SECONDS = 12.0
QUERY = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play&camera=1"


def measure(bin_folder, count, target, serving):
    """One row: `count` viewers of `target` while the processes that `serving()` lists are charged."""
    run = viewers(bin_folder, count, SECONDS, target)
    time.sleep(2.0)
    processes = serving()
    private = [private_kib(pid) for pid in processes[-count:]]
    before, start = cpu_nanos(processes), time.monotonic()
    time.sleep(SECONDS - 4.0)
    cpu = (cpu_nanos(processes) - before) / 1e9 / (time.monotonic() - start)
    result = run()
    rate = result["bytes"] / result["seconds"]
    expected = count * FRAMES_PER_SECOND * result["seconds"]
    return {
        "cpu_per_gb": cpu / rate * 1e9,
        "p50_ms": result["p50_micros"] / 1000,
        "p99_ms": result["p99_micros"] / 1000,
        "private_kib": sorted(private)[len(private) // 2],
        "delivered": result["pictures"] / expected,
    }


def bare_row(bin_folder, count):
    with tempfile.TemporaryDirectory() as folder:
        path = pathlib.Path(folder) / "bare.sock"
        server = subprocess.Popen(
            [bin_folder / "bench_bare_server", path, str(FRAME_BYTES), str(FRAMES_PER_SECOND)]
        )
        try:
            while not path.exists():
                time.sleep(0.01)
            return measure(bin_folder, count, ["--unix", path], lambda: descendants(server.pid)[1:])
        finally:
            server.kill()
            server.wait()


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    print("| viewers | server | CPU s/GB | of bare | p50 ms | p99 ms | private KiB a viewer | pictures delivered |")
    print("|---|---|---|---|---|---|---|---|")
    with Stand(bin_folder) as stand:
        stand.add_camera("Bench", "test:mjpeg?size=1280x720&fps=25")
        stand.start_feeder(1, FRAME_BYTES, FRAMES_PER_SECOND)
        stand.start_host()
        stand.start_nginx()
        cookie = ["--cookie", stand.log_in(), "--query", QUERY]
        socket_target = ["--unix", stand.socket, *cookie]
        nginx_target = ["--port", str(stand.http_port), *cookie]
        for count in (1, 10, 50):
            bare = bare_row(bin_folder, count)
            rows = [
                ("bare", bare),
                ("host, SCGI socket", measure(bin_folder, count, socket_target, stand.host_processes)),
                (
                    "host behind nginx",
                    measure(
                        bin_folder, count, nginx_target, lambda: stand.nginx_processes() + stand.host_processes()
                    ),
                ),
            ]
            for name, row in rows:
                print(
                    f"| {count} | {name} | {row['cpu_per_gb']:.3f} | {row['cpu_per_gb'] / bare['cpu_per_gb']:.2f} "
                    f"| {row['p50_ms']:.2f} | {row['p99_ms']:.2f} | {row['private_kib']} | {row['delivered']:.0%} |",
                    flush=True,
                )


if __name__ == "__main__":
    main()
