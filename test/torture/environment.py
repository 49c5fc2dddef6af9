# SPDX-License-Identifier: Apache-2.0
"""What stands around an installation under torture: its wall clock, a viewer, and a look at what it leaves."""

import contextlib
import datetime
import json
import pathlib
import struct
import subprocess
import threading
import time

from installation import BUILD, wait_until

RESTART_S = 20  # within which viewers are promised new pictures


class Clock:
    """The wall clock of an installation, by shifted_clock.cpp."""

    def __init__(self, server):
        self._file = server.home.with_name("clock")
        self.set(0)
        library = BUILD / "lib/libshifted_clock.so"
        server.environment.update(LD_PRELOAD=str(library), LOOKHAVEN_SHIFTED_CLOCK=str(self._file))

    def set(self, ahead_s):
        self.ahead_s = ahead_s
        with open(self._file, "r+b" if self._file.exists() else "wb") as file:
            file.write(struct.pack("=q", ahead_s))

    def now_s(self):
        return time.time() + self.ahead_s


class Watcher:
    """A viewer who comes back whenever its stream ends."""

    def __init__(self, server, camera):
        self.connections = self.pictures = 0
        self._server, self._camera, self._stop = server, camera, threading.Event()
        self._thread = threading.Thread(target=self._watch)
        self._thread.start()

    def _watch(self):
        while not self._stop.is_set():
            with contextlib.suppress(OSError, EOFError, ValueError, AssertionError):
                with self._server.live(self._camera) as stream:
                    self.connections += 1
                    while not self._stop.is_set():
                        stream.next()
                        self.pictures += 1
            self._stop.wait(0.1)

    def sees_more(self):
        """Waits for ten more pictures."""
        wanted = self.pictures + 10
        wait_until(lambda: self.pictures >= wanted, RESTART_S + 10, "a viewer gets pictures again")

    def close(self):
        self._stop.set()
        self._thread.join()


def player_files(sessions):
    """Files of these sessions' players; all installations of a machine keep theirs in one folder."""
    return [file for session in sessions if (file := pathlib.Path(f"/tmp/player_src.pid.{session}")).exists()]


def last_frame_s(recording):
    """Unix time of the file's last frame; None for a file without one."""
    words = "ffprobe -v quiet -of json -select_streams v -show_entries format_tags=creation_time:packet=pts_time".split()
    told = json.loads(subprocess.run([*words, recording], capture_output=True, check=False).stdout or "{}")
    packets = told.get("packets")
    if not packets:
        return None
    start = datetime.datetime.fromisoformat(told["format"]["tags"]["creation_time"].replace("Z", "+00:00"))
    return start.timestamp() + float(packets[-1]["pts_time"])
