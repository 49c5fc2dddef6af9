# SPDX-License-Identifier: Apache-2.0
"""A PostgreSQL server, and a standby of it, for as long as a benchmark or a test runs. It refuses to run as root, so
root starts it as the user postgres."""

import os
import pathlib
import pwd
import re
import shutil
import signal
import subprocess
import tempfile
import time

from stand import free_port, wait_until

PROGRAMS = pathlib.Path("/usr/lib/postgresql/15/bin")


class Postgres:
    """Use as a context manager: the server and its files go with it."""

    def __init__(self):
        self.port = free_port()

    def __enter__(self):
        self._folder = pathlib.Path(tempfile.mkdtemp(prefix="lookhaven-bench-postgres-"))
        self._folder.chmod(0o711)  # others than its own user connect, too
        self._user = {}
        if os.geteuid() == 0:
            entry = pwd.getpwnam("postgres")
            os.chown(self._folder, entry.pw_uid, entry.pw_gid)
            self._user = {"user": entry.pw_uid, "group": entry.pw_gid, "extra_groups": []}
        self._make_data()
        self.start()
        return self

    def _make_data(self):
        self._run("initdb", "-D", "data", "-A", "trust", "-U", "postgres", "-N", "-E", "UTF8", "--locale=C")

    def start(self):
        data = self._folder / "data"
        self._server = subprocess.Popen(
            [PROGRAMS / "postgres", "-D", data, "-k", self._folder, "-p", str(self.port),
             "-c", "listen_addresses=127.0.0.1"],
            cwd=self._folder, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, **self._user,
        )
        wait_until(lambda: re.search(r"^(ready|standby)\b", self._state(data / "postmaster.pid"), re.M), 60,
                   "PostgreSQL is ready")

    @property
    def pid(self):
        return self._server.pid

    def kill(self):
        """It ends at once, without a shutdown."""
        self._server.send_signal(signal.SIGQUIT)
        self._server.wait(timeout=60)

    def crash(self, seconds):
        """Ends without a shutdown, and is back after that many seconds."""
        self.kill()
        time.sleep(seconds)
        self.start()

    def __exit__(self, *_):
        self._server.send_signal(signal.SIGINT)  # its fast shutdown
        self._server.wait(timeout=60)
        shutil.rmtree(self._folder)

    def new_database(self, name):
        """The store's address of a new, empty database."""
        self._run("createdb", *self._where(), name)
        return f"postgresql:host={self._folder} port={self.port} user=postgres dbname={name}"

    def make_months(self, database, begin_s):
        """Partitions from then on, as recorders would have made them."""
        self.ask(database, f"""do $$
declare
    month timestamp;
    parent text;
begin
    for month in select generate_series(date_trunc('month', to_timestamp({begin_s}) at time zone 'UTC'),
                                        now() at time zone 'UTC', '1 month') loop
        foreach parent in array array['events', 'marks'] loop
            execute format('create table %I partition of %I for values from (%s) to (%s)',
                           parent || to_char(month, '_YYYY_MM'), parent, cast(extract(epoch from month) as bigint),
                           cast(extract(epoch from month + interval '1 month') as bigint));
        end loop;
    end loop;
end $$""")

    def copy(self, database, table, columns, rows):
        text = "".join("\t".join(str(value) for value in row) + "\n" for row in rows)
        self._run("psql", "-q", *self._where(), "-d", database, "-c",
                  f"copy {table} ({', '.join(columns)}) from stdin", stdin=text)

    def ask(self, database, statement):
        """What it answers, as text."""
        return self._run("psql", "-qtA", *self._where(), "-d", database, "-c", statement).strip()

    def replicate_synchronously(self):
        """From now on a change returns once a standby has it: start one first."""
        self.ask("postgres", "alter system set synchronous_standby_names = '*'")
        self.ask("postgres", "select pg_reload_conf()")

    def _where(self):
        return "-h", self._folder, "-p", str(self.port), "-U", "postgres"

    def _run(self, program, *arguments, stdin=""):
        return subprocess.run([PROGRAMS / program, *arguments], cwd=self._folder, input=stdin, text=True, check=True,
                              stdout=subprocess.PIPE, **self._user).stdout

    @staticmethod
    def _state(path):
        return path.read_text() if path.exists() else ""


class Standby(Postgres):
    """Of a server that runs: has what that has, and can be asked, but not written to until it is promoted."""

    def __init__(self, primary):
        super().__init__()
        self._primary = primary

    def _make_data(self):
        self._run("pg_basebackup", "-D", "data", "-h", "127.0.0.1", "-p", str(self._primary.port), "-U", "postgres",
                  "--checkpoint=fast", "--write-recovery-conf", "--no-sync")

    def promote(self):
        self.ask("postgres", "select pg_promote()")
