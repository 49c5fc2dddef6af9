# SPDX-License-Identifier: Apache-2.0
#
# Goes along with a visit in a browser, step by step.
import contextlib
import json
import os
import pathlib
import shutil
import subprocess
import tempfile

from installation import PASSWORDS

HERE = pathlib.Path(__file__).resolve().parent


class Visit:
    """A script of a visit, stopped after each step that it reports. LOOKHAVEN_KEEP_SCREENSHOTS is a folder in
    which its pictures stay."""

    def __init__(self, script, address, **environment):
        self._name = f"{pathlib.Path(script).stem}-{address.partition(':')[0]}"
        self._pictures = tempfile.TemporaryDirectory()
        self.folder = self._pictures.name
        self._script = subprocess.Popen(
            [shutil.which("node"), HERE / script, address, PASSWORDS["admin"], self.folder],
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
        if keep := os.environ.get("LOOKHAVEN_KEEP_SCREENSHOTS"):
            shutil.copytree(self.folder, f"{keep}/{self._name}", dirs_exist_ok=True)
        self._pictures.cleanup()

    def see(self, step):
        """Lets the visit go on to its next step, which must be this one. What it reports there."""
        self._script.stdin.write("\n")
        self._script.stdin.flush()
        line = self._script.stdout.readline()
        seen = json.loads(line) if line else {"step": f"the visit ended: {self._script.wait(20)}"}
        if seen["step"] != step:
            raise AssertionError(f"{seen['step']} instead of {step}")
        return seen
