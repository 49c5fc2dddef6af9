# SPDX-License-Identifier: Apache-2.0
"""Live viewers of H.264: what 4 Mbit/s cost, and how old the picture is that Chromium shows. Prints three Markdown tables.

The last table is about the whole product as script/server starts it: the test pattern of camera 2 is drawn, encoded,
recorded into its ring, served through nginx over HTTP/2 and TLS, decoded by WebCodecs and drawn to the canvas of the large
view. The delay is from the time that the pattern shows (the light along its lower edge, read back from the canvas) to the
animation frame after the drawing.
"""

import pathlib
import sys

from stand import ROOT, Installation
from viewing import Load, print_tables
from visit import Visit

WATCH_SECONDS = 20


def print_canvas_delays(build_folder):
    print("| camera 2 in Chromium | pictures/s | p50 ms | p95 ms | longest ms |")
    print("|---|---|---|---|---|")
    with Installation(LOOKHAVEN_BUILD_FOLDER=str(build_folder)) as server:
        address = f"https://localhost:{server.tls_port}/"
        with Visit("muxed.mjs", address, LOOKHAVEN_WATCH_MS=str(WATCH_SECONDS * 1000)) as visit:
            for name, step in ("sound off", "watched"), ("sound on", "heard"):
                seen = visit.see(step)
                delays = sorted(delay for delay in seen["delaysMs"] if delay is not None)
                print(
                    f"| {name} | {seen['moments'] / seen['seconds']:.1f} | {delays[len(delays) // 2]:.0f} "
                    f"| {delays[len(delays) * 95 // 100]:.0f} | {delays[-1]:.0f} |",
                    flush=True,
                )
            for step in "hidden", "seen again":
                visit.see(step)


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    print_tables(bin_folder, Load("H264", 20_000, 25, viewers=(1, 10, 50)))
    print()
    if (ROOT / "client/dist/index.html").exists() and (ROOT / "test/node_modules").exists():
        print_canvas_delays(bin_folder.parent)
    else:
        print("No delay in Chromium: script/build and script/test fetch and build what it needs.")


if __name__ == "__main__":
    main()
