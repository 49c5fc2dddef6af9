# SPDX-License-Identifier: Apache-2.0
"""Breaks a running installation again and again, at random, and checks each time what was lost: footage, a viewer's
connection, processes, descriptors, shared memory, files. Prints what was done and lost; ends with 1 at the first broken
promise, and keeps the state folder then."""

import argparse
import collections
import contextlib
import json
import os
import pathlib
import random
import signal
import socket
import sqlite3
import subprocess
import sys
import time

ROOT = pathlib.Path(__file__).resolve().parents[2]
sys.path[:0] = [str(ROOT / "test/system"), str(ROOT / "bench")]
from installation import LIVE, PASSWORDS, Installation, children, program, wait_until  # noqa: E402
from postgres import Postgres  # noqa: E402
from environment import RESTART_S, Clock, Watcher, last_frame_s, player_files  # noqa: E402
from small_disk import SmallDisk  # noqa: E402
from players import playing  # noqa: E402

MAX_LOST_S = 1.0  # of footage, by a killed recorder
CLOCKS_S = (0, 10, -10, 3600, -3600, 7200)  # ahead of the machine's


class Torture:
    def __init__(self, server, postgres, clock, hurry=False):
        self.server, self.postgres, self.clock, self._hurry = server, postgres, clock, hurry
        self.counts, self.lost, self.recorders = collections.Counter(), [], {server.part("recorder")}
        self._decoded = set()
        self.camera = self._add_camera("Tortured", server.cli("mount", "list", "--json"))
        self._recorded = {self.camera}
        self.disk = None
        if os.geteuid() == 0:
            self.disk = SmallDisk(server)
            self.cli("mount", "add", "--name", "Small disk", str(self.disk.path))
            self.disk.camera = self._add_camera("On the small disk", server.cli("mount", "list", "--json"))
            self._recorded.add(self.disk.camera)
        self.watcher = Watcher(server, self.camera)
        self.watcher.sees_more()

    def cli(self, *arguments):
        return self.server.cli(*arguments)

    def _add_camera(self, name, mounts):
        """Records on the newest mount."""
        mount = str(max(each["id"] for each in json.loads(mounts)))
        camera = self.cli("camera", "add", "--enable", "--name", name, "--source", "test:mjpeg", "--record", "always",
                          "--segment", "10s", "--mount", mount, "--json")
        return json.loads(camera)["id"]

    def recordings(self):
        return sorted(self.server.home.glob(f"recordings/{self.camera}/*/*.mkv"), key=lambda path: path.stat().st_mtime)

    def finished(self):
        """Recorded events of all cameras that have ended, each with its file."""
        folders = {mount["id"]: mount["path"] for mount in json.loads(self.cli("mount", "list", "--json"))}
        events = json.loads(self.cli("event", "list", "--finished", "--limit", "1000000", "--json"))
        return [(event, pathlib.Path(folders[event["mount_id"]], event["path"])) for event in events]

    def sessions(self):
        statement = "select handle from sessions"
        if self.postgres is not None:
            return self.postgres.ask("torture", statement).split()
        with contextlib.closing(sqlite3.connect(self.server.home / "lookhaven.db", timeout=20)) as database:
            return [handle for handle, in database.execute(statement)]

    # --- what is done

    def kill_recorder(self):
        connections = self.watcher.connections
        newest = self.recordings()[-1:]
        killed_s = self.clock.now_s()
        os.kill(self.server.part("recorder"), signal.SIGKILL)
        if self._hurry:
            self._end_pause()
        last_s = last_frame_s(newest[0]) if newest else None
        if last_s is not None:
            self.lost.append(killed_s - last_s)
            assert self.lost[-1] <= MAX_LOST_S, f"{self.lost[-1]:.2f} s lost at the end of {newest[0]}"
        self.watcher.sees_more()
        assert self.watcher.connections == connections, "a viewer had to come back after the recorder was killed"
        self.recorders.add(self.server.part("recorder"))
        wait_until(lambda: self.camera in self.server.recording_cameras(), RESTART_S, "it records again")

    def _end_pause(self):
        """The script waits up to 8 s before it starts a part again; the only other thing that it waits for takes 60 s."""
        def pause():
            commands = {pid: pathlib.Path(f"/proc/{pid}/cmdline") for pid in children(self.server.server.pid)}
            for pid, command in commands.items():
                with contextlib.suppress(OSError):
                    words = command.read_bytes().split(b"\0")
                    if words[0] == b"sleep" and words[1] != b"60":
                        return pid
        with contextlib.suppress(ProcessLookupError):
            os.kill(wait_until(pause, 5, "the script has noticed"), signal.SIGTERM)

    def kill_player(self):
        """One who plays a recording: the host removes the player's file."""
        events = wait_until(lambda: [event for event, _ in self.finished() if event["camera_id"] == self.camera], 30,
                            "an event has ended")
        longest = max(events, key=lambda event: event["frame_count"])
        with playing(self.server, longest["id"]) as player:
            player.next()
            file, = player_files(self.sessions())
            os.kill(int(file.read_text()), signal.SIGKILL)
            wait_until(lambda: not file.exists(), 5, "the player's file goes")

    def kill_host(self):
        os.kill(self.server.part("webapi"), signal.SIGKILL)

    def kill_web_server(self):
        os.kill(self.server.part("nginx"), signal.SIGKILL)

    def kill_request(self):
        requests = [pid for pid in self.server.requests() if program(pid)]
        if requests:
            with contextlib.suppress(ProcessLookupError):
                os.kill(random.choice(requests), signal.SIGKILL)

    def cut_clients(self):
        cookie = self.server.session("admin")
        query = f"/webapi?api={LIVE}&version=1&method=Play&camera={self.camera}"
        head = f"GET {query} HTTP/1.1\r\nHost: 127.0.0.1:{self.server.port}\r\nCookie: id={cookie}\r\n\r\n".encode()
        for _ in range(100):
            with contextlib.suppress(OSError), socket.create_connection(("127.0.0.1", self.server.port)) as client:
                client.sendall(head[: random.randint(0, len(head))] if random.random() < 0.5 else head)
                client.settimeout(0.02)
                client.recv(random.randint(1, 100_000))

    def lose_store(self):
        seconds = random.uniform(0.1, 3)
        if self.postgres is not None:
            self.postgres.crash(seconds)
        else:
            with contextlib.closing(sqlite3.connect(self.server.home / "lookhaven.db", timeout=20)) as database:
                database.execute("begin exclusive")
                time.sleep(seconds)

    def hang_recorder(self):
        recorder = self.server.part("recorder")
        os.kill(recorder, signal.SIGSTOP)
        time.sleep(random.uniform(0.1, 4))
        os.kill(recorder, signal.SIGCONT)

    def step_clock(self):
        self.clock.set(random.choice([ahead_s for ahead_s in CLOCKS_S if ahead_s != self.clock.ahead_s]))
        kept = self.recordings()
        wait_until(lambda: self.recordings()[-1] not in kept, RESTART_S, "it records under the new time")
        recording = self.recordings()[-1]
        wait_until(lambda: last_frame_s(recording), 5, "the recording has a frame")
        assert abs(self.clock.now_s() - last_frame_s(recording)) < 5, f"{recording} has another time"
        assert all(path.exists() for path in kept), "a step of the clock deleted footage"

    # --- what must hold

    def check(self):
        self.watcher.sees_more()
        wait_until(lambda: self._recorded <= self.server.recording_cameras(), RESTART_S + 40, "all is recorded")
        self._agree_within(60)
        for _, recording in self.finished():
            if recording not in self._decoded and recording.exists():  # retention may be faster
                # In the file's own time base: else ffmpeg guesses a rate, and complains of times that it has rounded itself.
                decoder = ["ffmpeg", "-v", "error", "-xerror", "-i", recording, "-enc_time_base", "-1", "-f", "null", "-"]
                done = subprocess.run(decoder, capture_output=True, text=True, check=False)
                assert done.returncode == 0 and not done.stderr or not recording.exists(), f"{recording}: {done.stderr}"
                self._decoded.add(recording)

    def _agree_within(self, seconds):
        """Store and recordings: what the last kill has left is closed when the recorder is back at it."""
        deadline = time.monotonic() + seconds
        while True:
            try:
                return self.cli("verify")
            except AssertionError:
                if time.monotonic() > deadline:
                    raise
                time.sleep(0.5)

    def descriptors(self):
        parts = [pid for pid in children(self.server.server.pid) if program(pid).startswith("lookhaven-")]
        return {program(pid): len(os.listdir(f"/proc/{pid}/fd")) for pid in parts}

    def close(self):
        self.watcher.close()
        if self.disk is not None:
            self.disk.close()


def run(torture, seconds):
    """For that long; 0: does everything once."""
    actions = [torture.kill_recorder, torture.kill_request, torture.kill_player, torture.cut_clients, torture.kill_host,
               torture.kill_web_server, torture.hang_recorder, torture.lose_store, torture.step_clock]
    if torture.disk is not None:
        actions += [torture.disk.fill_disk, torture.disk.remount_disk_read_only, torture.disk.unplug_disk]
    if seconds:
        actions += [torture.kill_recorder] * 11 + [torture.kill_request, torture.cut_clients]
    before = torture.descriptors()
    deadline = time.monotonic() + seconds
    while not torture.counts or time.monotonic() < deadline:
        for action in random.sample(actions, len(actions)):
            if seconds and time.monotonic() > deadline:
                break
            action()
            torture.counts[action.__name__] += 1
            torture.watcher.sees_more()
        torture.check()
    after = torture.descriptors()
    for name, count in before.items():
        assert after.get(name, 0) <= count + 8, f"{name} had {count} descriptors, and has {after.get(name)}"


def segments_of(creators):
    """Shared memory that one of these processes made."""
    rows = [line.split() for line in pathlib.Path("/proc/sysvipc/shm").read_text().splitlines()[1:]]
    return [row[1] for row in rows if int(row[4]) in creators]


def main():
    options = argparse.ArgumentParser(description=__doc__)
    options.add_argument("--seconds", type=float, default=600)
    options.add_argument("--short", action="store_const", dest="seconds", const=0, help="do everything once")
    options.add_argument("--seed", type=int, default=int(time.time()))
    options.add_argument("--hurry", action="store_true", help="kill the recorder more often: do not let script/server pause")
    options.add_argument("--postgresql", action="store_true", help="keep the records there instead of in SQLite")
    chosen = options.parse_args()
    random.seed(chosen.seed)
    print(f"seed {chosen.seed}", flush=True)
    with contextlib.ExitStack() as stack:
        postgres = stack.enter_context(Postgres()) if chosen.postgresql else None
        store = postgres.new_database("torture") if postgres else None
        server = Installation()
        clock = Clock(server)
        if store is not None:
            server.home.mkdir()
            (server.home / "store").write_text(store + "\n")
            server.cli("init", "--admin", "admin", text=PASSWORDS["admin"] + "\n")
        server.start()
        torture = None
        try:
            torture = Torture(server, postgres, clock, chosen.hurry)
            run(torture, chosen.seconds)
        except BaseException:
            server.keep()
            print(f"torture: state folder kept: {server.home}", file=sys.stderr)
            raise
        finally:
            if torture is not None:
                print(json.dumps({"done": torture.counts, "files decoded": len(torture._decoded),
                                  "lost a kill, mean s": round(sum(torture.lost) / max(1, len(torture.lost)), 3),
                                  "lost a kill, max s": round(max(torture.lost, default=0), 3)}), flush=True)
                torture.close()
            server.stop()
        assert not player_files(torture.sessions()), "player files are left"
        server.discard()
    assert not segments_of(torture.recorders), "shared memory is left"


if __name__ == "__main__":
    main()
