# SPDX-License-Identifier: Apache-2.0
"""Viewers on slow lines, and viewers that read slowly, over HTTP and over TLS with HTTP/2: how old the pictures are
that they see, and whether fast viewers of the same camera notice. Prints two Markdown tables."""

import contextlib
import pathlib
import sys

from line import Line
from stand import viewers
from viewing import Load, serving_stand

SECONDS = 60
RATES = (50_000, 200_000, 500_000)  # bytes a second
FAST_VIEWERS = 5
TILES = 4  # of one page, on one connection
BUFFERED_BYTES = 128 * 1024


def print_table(bin_folder, load, most_s):
    """most_s: what a picture may be old besides the time that it and the buffers take on the line."""
    print(f"| {load.codec}: the viewer | over | pictures/s | age p50 s | p99 s | longest s | aim s |")
    print("|---|---|---|---|---|---|---|")
    with serving_stand(bin_folder, load) as (stand, cookie), contextlib.ExitStack() as lines:
        ways = ("HTTP", stand.port, "bench_viewers"), ("TLS, HTTP/2", stand.tls_port, "bench_browser_viewers")

        def watch(count, port, program):
            return viewers(bin_folder, count, SECONDS, ["--port", str(port), *cookie], program)

        def watch_slowly(what, name, port, program, rate, count=1, is_reader=False):
            slow_port = lines.enter_context(Line(port, rate, is_reader)).port
            aim_s = most_s + (count * load.frame_bytes + BUFFERED_BYTES) / rate
            return f"{what} {rate // 1000} kB/s", name, watch(count, slow_port, program), f"{aim_s:.2f}"

        runs = [watch_slowly("has a line of", *way, rate) for way in ways for rate in RATES]
        runs += [watch_slowly("reads", *way, rate, is_reader=True) for way in ways for rate in RATES]
        runs += [watch_slowly(f"has {TILES} tiles on a line of", *ways[1], rate, TILES) for rate in RATES]
        runs += [(f"{FAST_VIEWERS} beside, without a limit", name, watch(FAST_VIEWERS, port, program), "")
                 for name, port, program in ways]
        for viewer, name, run, aim in runs:
            seen = run()
            ages = " | ".join(f"{seen[age + '_micros'] / 1e6:.2f}" for age in ("p50", "p99", "longest"))
            print(f"| {viewer} | {name} | {seen['pictures'] / seen['seconds']:.1f} | {ages} | {aim} |", flush=True)


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    print_table(bin_folder, Load("MJPEG", 100_000, 25, viewers=()), 1)
    print()
    print_table(bin_folder, Load("H264", 20_000, 25, viewers=()), 2)


if __name__ == "__main__":
    main()
