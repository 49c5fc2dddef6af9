# SPDX-License-Identifier: Apache-2.0
"""A PostgreSQL server of one's own for as long as a benchmark runs. It refuses to be root, so root lends it a user."""

import os
import pathlib
import pwd
import shutil
import signal
import subprocess
import tempfile
import time

from stand import wait_until

PROGRAMS = pathlib.Path("/usr/lib/postgresql/15/bin")


class Postgres:
    """Use as a context manager: the server and its files go with it."""

    def __enter__(self):
        self._folder = pathlib.Path(tempfile.mkdtemp(prefix="lookhaven-bench-postgres-"))
        self._folder.chmod(0o711)  # others than its own user connect, too
        self._user = {}
        if os.geteuid() == 0:
            entry = pwd.getpwnam("postgres")
            os.chown(self._folder, entry.pw_uid, entry.pw_gid)
            self._user = {"user": entry.pw_uid, "group": entry.pw_gid, "extra_groups": []}
        data = self._folder / "data"
        self._run("initdb", "-D", data, "-A", "trust", "-U", "postgres", "-N", "-E", "UTF8", "--locale=C")
        self._start()
        return self

    def _start(self):
        data = self._folder / "data"
        self._server = subprocess.Popen(
            [PROGRAMS / "postgres", "-D", data, "-k", self._folder, "-c", "listen_addresses="],
            cwd=self._folder, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, **self._user,
        )
        wait_until(lambda: "ready" in self._state(data / "postmaster.pid"), 60, "PostgreSQL is ready")

    def crash(self, seconds):
        """Ends without a shutdown, and is back after that many seconds."""
        self._server.send_signal(signal.SIGQUIT)
        self._server.wait(timeout=60)
        time.sleep(seconds)
        self._start()

    def __exit__(self, *_):
        self._server.send_signal(signal.SIGINT)  # its fast shutdown
        self._server.wait(timeout=60)
        shutil.rmtree(self._folder)

    def new_database(self, name):
        """The store's address of a new, empty database."""
        self._run("createdb", "-h", self._folder, "-U", "postgres", name)
        return f"postgresql:host={self._folder} user=postgres dbname={name}"

    def copy(self, database, table, columns, rows):
        text = "".join("\t".join(str(value) for value in row) + "\n" for row in rows)
        self._run("psql", "-q", "-h", self._folder, "-U", "postgres", "-d", database, "-c",
                  f"copy {table} ({', '.join(columns)}) from stdin", stdin=text)

    def ask(self, database, statement):
        """What it answers, as text."""
        return self._run("psql", "-qtA", "-h", self._folder, "-U", "postgres", "-d", database, "-c", statement).strip()

    def _run(self, program, *arguments, stdin=""):
        return subprocess.run([PROGRAMS / program, *arguments], cwd=self._folder, input=stdin, text=True, check=True,
                              stdout=subprocess.PIPE, **self._user).stdout

    @staticmethod
    def _state(path):
        return path.read_text() if path.exists() else ""
