# SPDX-License-Identifier: Apache-2.0
"""Event search through the host: 64 cameras and five years of events, in SQLite and PostgreSQL. Prints Markdown tables.

Stores of 10,000 and of 1,000,000 events get the same further ones, long before all others: three days of 10, 100 and 1,000
events for each of eight cameras, and a month of two events a day for each of 64. The same questions about these must cost
the same in both stores. What SQLite itself needs to make JSON of the same rows stands beside it.
"""

import json
import pathlib
import sqlite3
import subprocess
import sys
import time

from postgres import Postgres
from stand import Stand

CAMERAS = 64
YEARS_DAYS = 1826
DAY = 86400
SECONDS = 5
SIZES = (10_000, 1_000_000)
API = "api=VEXO.Lookhaven.Player&version=1"
COLUMNS = (
    "id camera_id mount_id start_s end_s recording reason frame_count size_bytes video_type audio_codec width height"
    " path archived demo"
).split()
NOW = int(time.time()) // DAY * DAY
DENSE_DAYS = {count: NOW - (2000 + number) * DAY for number, count in enumerate((10, 100, 1000))}
OLD_MONTH = NOW - 2100 * DAY
DENSE_CAMERAS = 8
# The measured times that have more events in the larger store.
DIFFERENT = ("days of a month, 64 cameras", "outline of 90 days, 64 cameras")


def planted_rows(first_id):
    spans = [
        (camera, day + slot * (DAY // count), DAY // count - 1)
        for count, day in DENSE_DAYS.items()
        for camera in range(1, DENSE_CAMERAS + 1)
        for slot in range(count)
    ]
    spans += [
        (camera, OLD_MONTH + day * DAY + half * DAY // 2, 300)
        for camera in range(1, CAMERAS + 1)
        for day in range(31)
        for half in range(2)
    ]
    return [
        (first_id + number, camera, 1, start, start + min(length, 7200), 0, 1, 25 * length, 4_000_000, 3, "AAC", 1280,
         720, f"{camera}/2020-01-01/000000-{first_id + number}.mkv", 0, 1)
        for number, (camera, start, length) in enumerate(spans)
    ]


def questions():
    cameras = ",".join(str(camera) for camera in range(1, CAMERAS + 1))
    dates = f"{API}&method=SearchAvaiDate&day_count=31&cameralists={cameras}&start="
    yield "days of a month, 64 cameras", dates + str(NOW - 400 * DAY), None
    yield "days of the old month, 64 cameras", dates + str(OLD_MONTH), None
    quarter = f"from={NOW - 130 * DAY}&to={NOW - 40 * DAY}&step=3600"
    yield "outline of 90 days, 64 cameras", f"api=VEXO.Event&version=1&method=Outline&{quarter}&cameralists={cameras}", None
    for count, day in DENSE_DAYS.items():
        eight = ",".join(str(camera) for camera in range(1, DENSE_CAMERAS + 1))
        query = f"{API}&method=EnumEvent&from={day}&to={day + DAY}&interval=60&recording=true&cameralists={eight}"
        yield f"events of a day, 8 cameras × {count}", query, day


def ask(bin_folder, stand, cookie, query):
    output = subprocess.run(
        [bin_folder / "bench_requests", "--unix", stand.socket, "--cookie", cookie, "--query", query]
        + ["--clients", "1", "--seconds", str(SECONDS)],
        check=True, capture_output=True,
    ).stdout
    row = json.loads(output)
    if row["refused"]:
        raise RuntimeError(f"{row['refused']} of {row['answers']} questions were refused")
    return row["p50_micros"] / 1000, row["p99_micros"] / 1000


def bare_millis(database, day):
    """The median time in which SQLite makes JSON of the rows that EnumEvent tells, its connection opened anew as there."""
    keys = ", ".join(f"'{name}', {name}" for name in COLUMNS)
    statement = (
        f"select json_group_array(json_object({keys})) from events"
        " where camera_id = ? and start_s > ? - 7200 and start_s < ? and end_s > ? order by start_s"
    )
    times = []
    for _ in range(200):
        start = time.perf_counter()
        connection = sqlite3.connect(database)
        for camera in range(1, DENSE_CAMERAS + 1):
            connection.execute(statement, (camera, day, day + DAY, day)).fetchall()
        connection.close()
        times.append((time.perf_counter() - start) * 1000)
    return sorted(times)[len(times) // 2]


def measure(bin_folder, size, server=None):
    """What each question costs in a store of that size, and what the bare SQL does where there is one."""
    answers = {}
    name = f"events_{size}"
    with Stand(bin_folder, server and server.new_database(name)) as stand:
        if server is not None:
            server.make_months(name, OLD_MONTH)
        for number in range(CAMERAS):
            stand.add_test_camera(f"Camera {number + 1}", "test:mjpeg?size=1280x720&fps=25")
        stand.add_events(size, YEARS_DAYS)
        rows = planted_rows(10 * SIZES[-1])
        if server is not None:
            server.copy(name, "events", COLUMNS, rows)
        else:
            with sqlite3.connect(stand.database) as connection:
                marks = ", ".join("?" * len(COLUMNS))
                connection.executemany(f"insert into events ({', '.join(COLUMNS)}) values ({marks})", rows)
            connection.close()
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        for question, query, day in questions():
            p50, p99 = ask(bin_folder, stand, cookie, query)
            answers[question] = (p50, p99, bare_millis(stand.database, day) if day and server is None else None)
    return answers


def print_table(engine, small, large):
    print(f"| {engine} | p50 ms | p99 ms | bare SQL ms | of bare | p50 ms with 10,000 events | ratio |")
    print("|---|---|---|---|---|---|---|")
    for name, (p50, p99, bare) in large.items():
        of_bare = f"{bare:.1f} | {p50 / bare:.2f}" if bare else "– | –"
        other = small[name][0]
        same = "–" if name in DIFFERENT else f"{p50 / other:.2f}"
        print(f"| {name} | {p50:.1f} | {p99:.1f} | {of_bare} | {other:.1f} | {same} |")
    print(flush=True)


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    print_table("SQLite", *(measure(bin_folder, size) for size in SIZES))
    with Postgres() as server:
        print_table("PostgreSQL", *(measure(bin_folder, size, server) for size in SIZES))


if __name__ == "__main__":
    main()
