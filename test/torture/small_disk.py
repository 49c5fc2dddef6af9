# SPDX-License-Identifier: Apache-2.0
"""A disk that recordings fill within minutes, and what can happen to it: it runs full, becomes read-only, is unplugged."""

import contextlib
import os
import pathlib
import random
import subprocess
import time

from installation import wait_until


class SmallDisk:
    """A tmpfs beside the installation's state folder. Only root can mount it."""

    def __init__(self, server):
        self.path = pathlib.Path(f"{server._folder.name}/disk")
        self.camera = None  # the id of the one that is recorded here
        self._server = server
        self.path.mkdir(mode=0o777)
        owner = server.home.stat()
        options = f"size=48m,uid={owner.st_uid},gid={owner.st_gid}"
        subprocess.run(["mount", "-t", "tmpfs", "-o", options, "tmpfs", self.path], check=True)

    def fill_disk(self):
        with contextlib.suppress(OSError), open(self.path / "filler", "wb") as filler:
            while True:
                filler.write(bytes(1 << 20))
        time.sleep(random.uniform(0.5, 3))
        (self.path / "filler").unlink()

    def remount_disk_read_only(self):
        """Laid over itself: the kernel refuses to write-protect a file system while a file on it is open for writing. So
        the recorder notices with its next file, or, on a full disk, with the next one that retention is to remove."""
        subprocess.run(["mount", "--bind", self.path, self.path], check=True)
        try:
            subprocess.run(["mount", "-o", "remount,bind,ro", self.path], check=True)
            assert os.statvfs(self.path).f_flag & os.ST_RDONLY, "the disk can be written"
            wait_until(self._is_found_read_only, 60, "the recorder finds the disk read-only")
        finally:
            subprocess.run(["umount", "--lazy", self.path], check=True)

    def unplug_disk(self):
        """Away, with all that is on it, and another one in its place."""
        subprocess.run(["mount", "--move", self.path, self._parking()], check=True)
        time.sleep(random.uniform(0.5, 3))
        subprocess.run(["mount", "--move", self._parking(), self.path], check=True)

    def _parking(self):
        parking = self.path.with_name("parking")
        parking.mkdir(exist_ok=True)
        return parking

    def _is_found_read_only(self):
        run = self._server.home / "run"
        states = [line.split()[:2] for line in (run / "recordings").read_text().splitlines()]
        is_full = [str(self.camera), "disk-full"] in states
        return [str(self.camera), "disk-fails"] in states or is_full and "Read-only" in (run / "mounts").read_text()

    def close(self):
        for folder in (self.path, self._parking()):
            if os.path.ismount(folder):
                subprocess.run(["umount", "--lazy", folder], check=True)
