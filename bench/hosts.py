# SPDX-License-Identifier: Apache-2.0
"""Several hosts on one PostgreSQL: what their recorders' rows cost it, what a search costs beside them, and what a live
stream costs that comes from another host. Prints Markdown tables. With the further argument "rows" or "live" that part
alone.

Only recording is simulated: bench_rows holds leases and stores rows by the recorder's own code, without footage. The
store always has the same 1,000 cameras, of which each host records 250.
"""

import contextlib
import os
import pathlib
import signal
import statistics
import subprocess
import sys
import time

from postgres import Postgres
from search import COLUMNS, DENSE_CAMERAS, DENSE_DAYS, API, DAY, ask, planted_rows
from stand import Installation, Stand, cpu_nanos, descendants, make_certificate, viewers, wait_until
from viewing import QUERY, Load, measure

HOSTS = (1, 2, 4)
CAMERAS, CAMERAS_A_HOST = 1000, 250
EVENT_S, MARK_S = 300, 600
SETTLE_S, SECONDS = 10.0, 30.0
FILL_S = 10.0  # a ring of 16 MiB, whose pages cost more when they are written to for the first time
ROUNDS, RESUME_S = 5, 10.0  # whoever stood still has stored what it missed before the questions
DATABASE = "hosts"


class SimulatedHost(Installation):
    """A state folder with a mount, and bench_rows as its recorder. Use as a context manager: it records from the
    beginning."""

    def __init__(self, bin_folder, store, number):
        super().__init__(LOOKHAVEN_BUILD_FOLDER=str(bin_folder.parent))
        self._bin, self._number = bin_folder, number
        for folder in ("run", "tls", "recordings"):
            (self.home / folder).mkdir(parents=True)
        (self.home / "store").write_text(store + "\n")
        make_certificate(self.home / "tls", "bench", 1)
        self.cli("host", "add", "--name", f"nvr{number}", "--address", "127.0.0.1", "--port", str(self.tls_port))
        self.cli("mount", "add", str(self.home / "recordings"), "--name", f"nvr{number}-disk")

    def start(self):
        first = 1 + (self._number - 1) * CAMERAS_A_HOST
        arguments = [str(each) for each in (first, CAMERAS_A_HOST, EVENT_S, MARK_S)]
        self._recorder = subprocess.Popen([self._bin / "bench_rows", *arguments], env=self.environment,
                                          stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)

    @property
    def pid(self):
        return self._recorder.pid

    def stop(self):
        self._recorder.terminate()
        self._recorder.wait(timeout=30)


def make_cameras(server):
    """Of camera 1, which is there, 999 more."""
    def clone(table, key):
        columns = server.ask(DATABASE, "select string_agg(column_name, ', ') from information_schema.columns"
                                       f" where table_name = '{table}' and column_name <> '{key}'")
        server.ask(DATABASE, f"insert into {table} ({key}, {columns}) select clone, {columns} from {table},"
                             f" generate_series(2, {CAMERAS}) as clone where {key} = 1")
    for table, key in (("cameras", "id"), ("camera_profiles", "camera_id"), ("recording_plans", "camera_id")):
        clone(table, key)
    server.ask(DATABASE, f"update cameras set host_id = (id - 1) / {CAMERAS_A_HOST} + 1")
    server.ask(DATABASE, f"update counters set value = {CAMERAS} where name = 'camera'")


def recorded(server):
    return int(server.ask(DATABASE, "select count(*) from events where recording = 1"))


def processes_of(server):
    return [server.pid, *descendants(server.pid)]


def counted(server):
    """Rows inserted or changed, and transactions, so far; a server's own figures come late by half a second."""
    rows = server.ask(DATABASE, "select sum(n_tup_ins + n_tup_upd) from pg_stat_user_tables")
    commits = server.ask(DATABASE, f"select xact_commit from pg_stat_database where datname = '{DATABASE}'")
    return int(rows), int(commits)


def cpu_during(server, recorders, seconds):
    """Of a core, in percent: the server's, and that of a recorder; rows and transactions a second."""
    def measured():
        return cpu_nanos(processes_of(server)), cpu_nanos([host.pid for host in recorders]), *counted(server)
    before, began = measured(), time.monotonic()
    time.sleep(seconds)
    after, seconds = measured(), time.monotonic() - began
    server_s, recorders_s, rows, commits = ((b - a) / seconds for a, b in zip(before, after))
    return server_s / 1e7, recorders_s / 1e7 / len(recorders), rows, commits


def ask_in_turns(bin_folder, stand, cookie, hosts, questions):
    """The medians of p50 and p99 by the number of hosts. Recorders beyond it stand still: so the numbers take turns within
    seconds, and what else the machine does meanwhile slows all of them alike."""
    times = {count: {name: [] for name in questions} for count in HOSTS}
    try:
        for _ in range(ROUNDS):
            for count in HOSTS:
                for number, host in enumerate(hosts):
                    os.kill(host.pid, signal.SIGCONT if number < count else signal.SIGSTOP)
                time.sleep(RESUME_S)
                for name, query in questions.items():
                    times[count][name].append(ask(bin_folder, stand, cookie, query))
    finally:
        for host in hosts:
            os.kill(host.pid, signal.SIGCONT)
    return {count: {name: [statistics.median(each) for each in zip(*rows)] for name, rows in answers.items()}
            for count, answers in times.items()}


def measure_rows(bin_folder):
    """Both tables' rows, by the number of hosts."""
    costs = {}
    with Postgres() as server:
        store = server.new_database(DATABASE)
        with Stand(bin_folder, store) as stand, contextlib.ExitStack() as stack:
            stand.cli("camera", "add", "--enable", "--name", "Camera", "--type", "h264", "--source",
                      "test:h264?size=1280x720&fps=25", "--record", "always")
            make_cameras(server)
            server.copy(DATABASE, "events", COLUMNS, planted_rows(1_500_000_000))
            server.ask(DATABASE, "analyze")
            stand.start_host()
            stand.start_nginx()
            cookie = stand.log_in()
            day = DENSE_DAYS[100]
            eight = ",".join(str(camera) for camera in range(1, DENSE_CAMERAS + 1))
            questions = {
                "LoadCamera, 1,000 cameras": f"{API}&method=LoadCamera",
                "events of a day, 8 cameras × 100":
                    f"{API}&method=EnumEvent&from={day}&to={day + DAY}&interval=60&recording=true&cameralists={eight}",
            }
            hosts = []
            for count in HOSTS:
                while len(hosts) < count:
                    hosts.append(stack.enter_context(SimulatedHost(bin_folder, store, len(hosts) + 1)))
                wait_until(lambda: recorded(server) >= count * CAMERAS_A_HOST, 60, "all are recorded")
                time.sleep(SETTLE_S)
                costs[count] = cpu_during(server, hosts, SECONDS)
            answers = ask_in_turns(bin_folder, stand, cookie, hosts, questions)
    return costs, answers


def print_rows(bin_folder):
    costs, answers = measure_rows(bin_folder)
    print("| hosts | cameras | rows/s | transactions/s | PostgreSQL, of a core | a recorder's rows, of a core |")
    print("|---|---|---|---|---|---|")
    for count, (server, recorder, rows, commits) in costs.items():
        print(f"| {count} | {count * CAMERAS_A_HOST} | {rows:.0f} | {commits:.0f} | {server:.1f}% | {recorder:.1f}% |")
    print()
    print("| while they record | " + " | ".join(f"p50, p99 ms with {count}" for count in HOSTS) + " | p50, p99 of one host's |")
    print("|---|" + "---|" * (len(HOSTS) + 1))
    for name in answers[1]:
        times = [answers[count][name] for count in HOSTS]
        print(f"| {name} | " + " | ".join(f"{p50:.1f}, {p99:.1f}" for p50, p99 in times) +
              f" | {times[-1][0] / times[0][0]:.2f}, {times[-1][1] / times[0][1]:.2f} |")
    print(flush=True)


@contextlib.contextmanager
def two_hosts(bin_folder, server):
    """The stand whose camera 1 sends pictures, one that has nothing but the store and a recorder, which fetches its
    stream, and a cookie for both."""
    store = server.new_database("live")
    with contextlib.ExitStack() as stack:
        stands = []
        for number in (1, 2):
            stand = stack.enter_context(Stand(bin_folder, store) if number == 1 else OtherStand(bin_folder, store))
            stand.start_nginx()
            stand.cli("host", "add", "--name", f"nvr{number}", "--address", "127.0.0.1", "--port", str(stand.tls_port))
            stands.append(stand)
        stands[0].add_test_camera("Bench", "test:mjpeg?size=1280x720&fps=25", "mjpeg")
        server.ask("live", "insert into camera_leases (camera_id, host_id, count, next_host_id) values (1, 1, 1, 0)")
        stands[0].start_feeder(1, "MJPEG", 100_000, 25)
        for stand in stands:
            stand.start_host()
        stands[1].start_recorder("--host-offline-limit", "600")  # the feeder has no heartbeat
        yield *stands, stands[0].log_in()


class OtherStand(Stand):
    """On a store that has its accounts already."""

    def __init__(self, bin_folder, store):
        Installation.__init__(self, LOOKHAVEN_BUILD_FOLDER=str(bin_folder.parent))
        self._bin, self._processes = bin_folder, {}
        self.socket = str(self.home / "run/webapi.sock")
        for folder in ("run", "log", "tls"):
            (self.home / folder).mkdir(parents=True)
        (self.home / "store").write_text(store + "\n")


def print_live(bin_folder):
    load = Load("MJPEG", 100_000, 25, viewers=(1, 10))
    print("| viewers, HTTPS and HTTP/2 | from | CPU µs a frame | of direct | p50 ms | p99 ms | pictures delivered |")
    print("|---|---|---|---|---|---|---|")
    with Postgres() as server, two_hosts(bin_folder, server) as (owner, other, cookie):
        def serving():
            return [pid for stand, names in ((owner, ("webapi", "nginx")), (other, ("webapi", "nginx", "recorder")))
                    for name in names for pid in stand.processes(name)]
        for count in load.viewers:
            direct = None
            for name, stand in (("the host that has it", owner), ("another host", other)):
                target = ["--port", str(stand.tls_port), "--streams", "32", "--cookie", cookie, "--query", QUERY]
                def watch(count, seconds):
                    return viewers(bin_folder, count, seconds, target, "bench_browser_viewers")
                watch(1, FILL_S)()
                row = measure(watch, load, count, serving)
                direct = direct or row["behind_micros"]
                print(f"| {count} | {name} | {row['behind_micros']:.0f} | {row['behind_micros'] / direct:.2f} "
                      f"| {row['p50_ms']:.1f} | {row['p99_ms']:.1f} | {row['delivered']:.0%} |", flush=True)


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    parts = {"rows": print_rows, "live": print_live}
    for name, part in parts.items():
        if name in (sys.argv[2:] or parts):
            part(bin_folder)


if __name__ == "__main__":
    main()
