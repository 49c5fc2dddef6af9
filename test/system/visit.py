# SPDX-License-Identifier: Apache-2.0
#
# Goes along with a visit in Chromium, step by step.
import contextlib
import json
import os
import pathlib
import shutil
import subprocess

from installation import PASSWORDS

HERE = pathlib.Path(__file__).resolve().parent


class Visit:
    """A script of a visit in Chromium, stopped after each step that it reports."""

    def __init__(self, script, address, folder="", **environment):
        self._script = subprocess.Popen(
            [shutil.which("node"), HERE / script, address, PASSWORDS["admin"], folder],
            env={**os.environ, **environment},
            stdin=subprocess.PIPE,
            stdout=subprocess.PIPE,
            text=True,
        )

    def __enter__(self):
        return self

    def __exit__(self, *_):
        with contextlib.suppress(BrokenPipeError):
            self._script.stdin.close()
        self._script.terminate()
        self._script.wait(20)
        self._script.stdout.close()

    def next(self):
        line = self._script.stdout.readline()
        return json.loads(line) if line else {"step": f"the visit ended: {self._script.wait(20)}"}

    def go_on(self):
        self._script.stdin.write("\n")
        self._script.stdin.flush()
