# SPDX-License-Identifier: Apache-2.0
"""Words in a million texts of alerts and POS transactions, in SQLite and PostgreSQL. Prints Markdown tables."""

import pathlib
import sqlite3
import sys
import time

from postgres import Postgres
from search import ask
from stand import Stand

CAMERAS = 64
NOW = int(time.time()) // 86400 * 86400
TEXTS = 1_000_000
WORDS = {"a word of every text": "total", "a word of one in a thousand": "item7", "a word of one in a million": "receipt77",
         "two words, one of one camera": "total counter3", "no such word": "nothing"}
COLUMNS = "id kind camera_id moment_s start_s end_s text state mount_id path demo".split()


def texts():
    """Receipts, one a minute, of all cameras in turn."""
    for number in range(TEXTS):
        camera, start = 1 + number % CAMERAS, NOW - (TEXTS - number) * 60
        text = f"counter{camera} receipt{number} item{number % 1000} total {number % 97}.{number % 89:02}"
        yield 10_000_000 + number, 2, camera, start + 5, start, start + 15, text, 2, 0, "", 1


def plant_in_sqlite(database):
    with sqlite3.connect(database) as connection:
        marks = ", ".join("?" * len(COLUMNS))
        connection.executemany(f"insert into marks ({', '.join(COLUMNS)}) values ({marks})", texts())
    connection.close()


def measure(bin_folder, store=None, plant=None):
    """The newest 100 of a million texts with each of the words, of all cameras and of one in eight."""
    with Stand(bin_folder, store) as stand:
        for number in range(CAMERAS):
            stand.add_test_camera(f"Camera {number + 1}", "test:mjpeg?size=1280x720&fps=25")
        if plant is not None:
            plant()
        else:
            plant_in_sqlite(stand.database)
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        for name, words in WORDS.items():
            for some, cameras in ("all", 1), ("8", 8):
                ids = ",".join(str(camera) for camera in range(1, CAMERAS + 1, cameras))
                query = f"api=VEXO.Event&version=1&method=List&limit=100&cameralists={ids}&text=" + words.replace(" ", "+")
                yield f"{name}, {some} cameras", *ask(bin_folder, stand, cookie, query)


def print_table(engine, rows):
    print(f"| {engine}, a million texts | p50 ms | p99 ms |")
    print("|---|---|---|")
    for name, p50, p99 in rows:
        print(f"| {name} | {p50:.1f} | {p99:.1f} |", flush=True)
    print()


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    print_table("SQLite", measure(bin_folder))
    with Postgres() as server:
        address = server.new_database("texts")

        def plant():
            server.make_months("texts", NOW - TEXTS * 60)
            server.copy("texts", "marks", COLUMNS, texts())
            server.ask("texts", "vacuum analyze marks")  # as PostgreSQL does by itself within minutes

        print_table("PostgreSQL", measure(bin_folder, address, plant))


if __name__ == "__main__":
    main()
