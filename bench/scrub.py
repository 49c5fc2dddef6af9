# SPDX-License-Identifier: Apache-2.0
"""The playhead dragged in Chromium: how many pictures a second come to the screen. Prints a Markdown table.

The whole product as script/server starts it, over HTTPS, with the demo's recordings of 20 s and its cameras disabled, so
that nothing else runs. The pointer moves by 9 pixels, which are 0.8 s of the recording, with each picture of the screen.
"""

import pathlib
import sys

from stand import Installation, recorded_events
from visit import Visit

DRAG_SECONDS = 10


def finished(server, camera):
    return next(event for event in recorded_events(server, camera) if event["frame_count"] == 500 and not event["is_recording"])


def main():
    build_folder = pathlib.Path(sys.argv[1]).parent
    print("| recording | moves of the pointer/s | pictures/s | requests/s | between two pictures: p50 ms | p95 ms |")
    print("|---|---|---|---|---|---|")
    with Installation(LOOKHAVEN_BUILD_FOLDER=str(build_folder), LOOKHAVEN_DEMO_FOOTAGE="yes") as server:
        recorded = {"MJPEG": finished(server, 1), "H.264, a key frame each second": finished(server, 2)}
        for camera in 1, 2, 4:
            server.cli("camera", "set", str(camera), "--disable")
        events = ",".join(f"{event['id']}@{event['start'] + 10}" for event in recorded.values())
        steps = {"EVENTS": events, "LOOKHAVEN_WATCH_MS": str(DRAG_SECONDS * 1000)}
        with Visit("dragged.mjs", f"https://localhost:{server.tls_port}/", **steps) as visit:
            for name in recorded:
                visit.see("stepped")
                seen = visit.see("dragged")
                gaps = sorted(seen["gapsMs"])
                rates = " | ".join(f"{seen[what] * 1000 / seen['ms']:.0f}" for what in ("moves", "pictures", "asked"))
                print(f"| {name} | {rates} | {gaps[len(gaps) // 2]:.0f} | {gaps[len(gaps) * 95 // 100]:.0f} |", flush=True)


if __name__ == "__main__":
    main()
