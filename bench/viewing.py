# SPDX-License-Identifier: Apache-2.0
"""Many viewers of one live stream: what they cost and how late their pictures are, beside a bare server in the same run.

A feeder stands in for the recorder, so that only serving is measured; everything else is the real thing: ring, module,
host, and nginx where the row says so.
"""

import dataclasses
import pathlib
import subprocess
import tempfile
import time

from stand import Stand, cpu_nanos, descendants, private_kib, viewers

SECONDS = 12.0
QUERY = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play&camera=1"


@dataclasses.dataclass
class Load:
    codec: str  # of the ring; MJPEG or H264
    frame_bytes: int
    frames_per_second: int
    viewers: tuple[int, ...]


def measure(bin_folder, load, count, target, serving):
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
    expected = count * load.frames_per_second * result["seconds"]
    return {
        "cpu_per_gb": cpu / rate * 1e9,
        "p50_ms": result["p50_micros"] / 1000,
        "p99_ms": result["p99_micros"] / 1000,
        "private_kib": sorted(private)[len(private) // 2],
        "delivered": result["pictures"] / expected,
    }


def bare_row(bin_folder, load, count):
    with tempfile.TemporaryDirectory() as folder:
        path = pathlib.Path(folder) / "bare.sock"
        server = subprocess.Popen(
            [bin_folder / "bench_bare_server", path, str(load.frame_bytes), str(load.frames_per_second)]
        )
        try:
            while not path.exists():
                time.sleep(0.01)
            return measure(bin_folder, load, count, ["--unix", path], lambda: sorted(descendants(server.pid))[1:])
        finally:
            server.kill()
            server.wait()


def print_comparison(bin_folder, load):
    print("| viewers | server | CPU s/GB | of bare | p50 ms | p99 ms | private KiB a viewer | pictures delivered |")
    print("|---|---|---|---|---|---|---|---|")
    with Stand(bin_folder) as stand:
        video_type = load.codec.lower()
        stand.add_test_camera("Bench", f"test:{video_type}?size=1280x720&fps={load.frames_per_second}", video_type)
        stand.start_feeder(1, load.codec, load.frame_bytes, load.frames_per_second)
        stand.start_host()
        stand.start_nginx()
        cookie = ["--cookie", stand.log_in(), "--query", QUERY]
        servers = [
            ("host, SCGI socket", ["--unix", stand.socket, *cookie], stand.host_processes),
            (
                "host behind nginx",
                ["--port", str(stand.port), *cookie],
                lambda: stand.nginx_processes() + stand.host_processes(),
            ),
        ]
        for count in load.viewers:
            bare = bare_row(bin_folder, load, count)
            rows = [("bare", bare)]
            rows += [(name, measure(bin_folder, load, count, target, serving)) for name, target, serving in servers]
            for name, row in rows:
                print(
                    f"| {count} | {name} | {row['cpu_per_gb']:.3f} | {row['cpu_per_gb'] / bare['cpu_per_gb']:.2f} "
                    f"| {row['p50_ms']:.2f} | {row['p99_ms']:.2f} | {row['private_kib']} | {row['delivered']:.0%} |",
                    flush=True,
                )
