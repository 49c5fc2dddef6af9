# SPDX-License-Identifier: Apache-2.0
"""Many viewers of one live stream: what they cost and how late their pictures are, beside a bare server in the same run.

A feeder stands in for the recorder, so that only serving is measured; everything else is the real thing: ring, module,
host, and nginx where the row says so. The first table is about plain sockets, the second about TLS and HTTP/2 with 32
streams on a connection, beside the same nginx relaying the bare server.
"""

import contextlib
import dataclasses
import pathlib
import subprocess
import tempfile
import time

from stand import Stand, busy, cpu_nanos, descendants, private_kib, viewers

SECONDS = 10.0
STREAMS = 32  # on one of a browser's connections
QUERY = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play&camera=1"


@dataclasses.dataclass
class Load:
    codec: str  # of the ring; MJPEG or H264
    frame_bytes: int
    frames_per_second: int
    viewers: tuple[int, ...]


def measure(start_viewers, load, count, serving, front=None):
    """One row: `count` viewers while the processes that `serving()` lists, and those of the web server that `front()` lists,
    are charged."""
    front = front or list
    front_kib = sum(map(private_kib, front()))
    run = start_viewers(count, SECONDS)
    time.sleep(2.0)
    processes, front_processes = serving(), front()
    private = sorted(private_kib(pid) for pid in busy(processes)[-count:])
    before, front_before, start = cpu_nanos(processes), cpu_nanos(front_processes), time.monotonic()
    time.sleep(SECONDS - 4.0)
    seconds = time.monotonic() - start
    behind = (cpu_nanos(processes) - before) / 1e3 / seconds
    before_it = (cpu_nanos(front_processes) - front_before) / 1e3 / seconds
    front_kib = sum(map(private_kib, front_processes)) - front_kib
    result = run()
    frames_per_second = result["pictures"] / result["seconds"]
    return {
        "cpu_per_gb": (behind + before_it) / 1e6 / (result["bytes"] / result["seconds"]) * 1e9,
        "front_micros": before_it / frames_per_second,
        "behind_micros": behind / frames_per_second,
        "p50_ms": result["p50_micros"] / 1000,
        "p99_ms": result["p99_micros"] / 1000,
        "private_kib": private[len(private) // 2],
        "front_kib": front_kib / count,
        "delivered": frames_per_second / (count * load.frames_per_second),
    }


@contextlib.contextmanager
def bare_server(bin_folder, load):
    """Its socket, and what lists its processes, one a viewer."""
    with tempfile.TemporaryDirectory() as folder:
        path = pathlib.Path(folder) / "bare.sock"
        server = subprocess.Popen(
            [bin_folder / "bench_bare_server", path, str(load.frame_bytes), str(load.frames_per_second)]
        )
        try:
            while not path.exists():
                time.sleep(0.01)
            yield path, lambda: sorted(descendants(server.pid))[1:]
        finally:
            server.kill()
            server.wait()


@contextlib.contextmanager
def serving_stand(bin_folder, load):
    """A stand whose camera 1 sends the load, and the options by which viewers ask for it."""
    with Stand(bin_folder) as stand:
        video_type = load.codec.lower()
        stand.add_test_camera("Bench", f"test:{video_type}?size=1280x720&fps={load.frames_per_second}", video_type)
        stand.start_feeder(1, load.codec, load.frame_bytes, load.frames_per_second)
        stand.start_host()
        stand.start_nginx()
        yield stand, ["--cookie", stand.log_in(), "--query", QUERY]


def print_tables(bin_folder, load, throttled=False):
    with serving_stand(bin_folder, load) as (stand, cookie):
        print_plain(bin_folder, load, stand, cookie)
        print()
        print_browsers(bin_folder, load, stand, cookie)
        if throttled:
            print()
            print_throttled(bin_folder, load, stand, cookie)


def print_plain(bin_folder, load, stand, cookie):
    print("| viewers | server | CPU s/GB | of bare | p50 ms | p99 ms | private KiB a viewer | pictures delivered |")
    print("|---|---|---|---|---|---|---|---|")
    def row(count, serving, *target, front=None):
        return measure(lambda *arguments: viewers(bin_folder, *arguments, target), load, count, serving, front)

    def host():
        return stand.processes("webapi")

    for count in load.viewers:
        with bare_server(bin_folder, load) as (path, bare_processes):
            rows = {"bare": row(count, bare_processes, "--unix", path)}
        rows["host, SCGI socket"] = row(count, host, "--unix", stand.socket, *cookie)
        rows["host behind nginx"] = row(
            count, host, "--port", str(stand.port), *cookie, front=lambda: stand.processes("nginx")
        )
        for name, one in rows.items():
            print(
                f"| {count} | {name} | {one['cpu_per_gb']:.3f} | {one['cpu_per_gb'] / rows['bare']['cpu_per_gb']:.2f} "
                f"| {one['p50_ms']:.2f} | {one['p99_ms']:.2f} | {one['private_kib']} | {one['delivered']:.0%} |",
                flush=True,
            )


def print_browsers(bin_folder, load, stand, cookie):
    print(
        "| viewers, HTTPS and HTTP/2 | behind nginx | CPU µs a frame in nginx | behind it | of bare | p50 ms | p99 ms"
        " | KiB a viewer in nginx | behind it | pictures delivered |"
    )
    print("|---|---|---|---|---|---|---|---|---|---|")

    def row(count, origin, serving):
        target = ["--port", str(stand.start_relay(origin)), "--streams", str(STREAMS), *cookie]
        try:
            return measure(
                lambda *arguments: viewers(bin_folder, *arguments, target, "bench_browser_viewers"),
                load, count, serving, lambda: stand.processes("relay"),
            )
        finally:
            stand.end("relay")

    for count in load.viewers:
        with bare_server(bin_folder, load) as (path, bare_processes):
            rows = {"bare": row(count, path, bare_processes)}
        rows["host"] = row(count, stand.socket, lambda: stand.processes("webapi"))
        bare = rows["bare"]["front_micros"] + rows["bare"]["behind_micros"]
        for name, one in rows.items():
            print(
                f"| {count} | {name} | {one['front_micros']:.0f} | {one['behind_micros']:.0f} "
                f"| {(one['front_micros'] + one['behind_micros']) / bare:.2f} | {one['p50_ms']:.1f} | {one['p99_ms']:.1f} "
                f"| {one['front_kib']:.0f} | {one['private_kib']} | {one['delivered']:.0%} |",
                flush=True,
            )


def print_throttled(bin_folder, load, stand, cookie):
    """What the other streams of a connection notice of one whose reader is too slow."""
    settle = 6.0  # by then the slow stream's window is full
    rate = load.frame_bytes * load.frames_per_second // 4
    print(f"| {STREAMS} streams on a connection: those that read all | p50 ms | p99 ms | longest ms | pictures delivered |")
    print("|---|---|---|---|---|")
    target = ["--port", str(stand.tls_port), "--streams", str(STREAMS), "--settle", str(settle), *cookie]
    for name, count, throttle in (
        ("without the first", STREAMS - 1, 0),
        ("the first reads all", STREAMS, 0),
        ("the first reads a quarter", STREAMS, rate),
    ):
        options = [*target, "--throttle", str(throttle)] if throttle else target
        seen = viewers(bin_folder, count, settle + 8, options, "bench_browser_viewers")()
        counted = count - 1 if throttle else count
        delivered = seen["pictures"] / seen["seconds"] / (counted * load.frames_per_second)
        print(
            f"| {name} | {seen['p50_micros'] / 1000:.1f} | {seen['p99_micros'] / 1000:.1f} "
            f"| {seen['longest_micros'] / 1000:.1f} | {delivered:.0%} |",
            flush=True,
        )
