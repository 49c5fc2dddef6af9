# SPDX-License-Identifier: Apache-2.0
"""The timeline dragged in Chromium with ten thousand events in view: the page's frames. Prints a Markdown table.

The whole product as script/server starts it, over HTTPS, its cameras not recorded: 26,000 generated events of the last four days
and 10,000 of the last ninety. "work" is what the page's scripts take for a frame in which they draw; without a graphics
processor the browser then paints with the same processors as all else.
"""

import pathlib
import sys

from stand import Installation
from visit import Visit

DRAG_SECONDS = 10
EVENTS = {4: 26_000, 90: 10_000}


def percentiles(values):
    values = sorted(values)
    return [values[len(values) * share // 100] for share in (50, 95)]


def main():
    build_folder = pathlib.Path(sys.argv[1]).parent
    print("| span shown | listed | moves of the pointer/s | frames/s | between two frames: p50 ms | p95 ms | work a frame: p50 ms | p95 ms |")
    print("|---|---|---|---|---|---|---|---|")
    with Installation(LOOKHAVEN_BUILD_FOLDER=str(build_folder)) as server:
        for camera in 1, 2, 4:
            server.cli("camera", "set", str(camera), "--record", "never")
        for days, count in EVENTS.items():
            server.cli("demo", "events", "--count", str(count), "--days", str(days))
        with Visit("timeline.mjs", f"https://localhost:{server.tls_port}/", LOOKHAVEN_WATCH_MS=str(DRAG_SECONDS * 1000)) as visit:
            for _ in range(2):
                seen = visit.see("dragged")
                gaps, work = seen["gapsMs"], seen["workMs"]
                rates = [seen["moves"] / DRAG_SECONDS, 1000 * len(gaps) / sum(gaps)]
                figures = " | ".join(f"{figure:.1f}" for figure in percentiles(gaps) + percentiles(work))
                print(f"| {seen['span']} | {seen['listed']} | {rates[0]:.0f} | {rates[1]:.0f} | {figures} |", flush=True)


if __name__ == "__main__":
    main()
