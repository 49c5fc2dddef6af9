# SPDX-License-Identifier: Apache-2.0
#
# Footage taken away over the network: what the file holds, for whom, and how one that is cut shows it.
import hashlib
import http.client
import io
import json
import subprocess
import tempfile
import time
import unittest
import zipfile
from pathlib import Path

from installation import PASSWORDS, Installation, call, recorded_events


class ExportTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        server = cls.server = cls.enterClassContext(Installation(LOOKHAVEN_DEMO_FOOTAGE="yes"))
        for name, *denied in [("guard",), ("blind", "2"), ("deaf", "2", "--kind", "audio")]:
            PASSWORDS[name] = f"secret of {name}"
            server.cli("user", "add", name, text=PASSWORDS[name])
            if denied:
                server.cli("user", "deny", name, *denied)
        # A recording of each camera, and a while before and behind them.
        first, second = (recorded_events(server, camera)[0] for camera in (1, 2))
        cls.span = {"from": min(first["start"], second["start"]) - 5, "to": max(first["stop"], second["stop"]) + 5}

    def ask(self, account, method="Export", **parameters):
        return self.server.request(call("VEXO.Event", method, **{**self.span, **parameters}), account)

    def probe(self, data):
        with tempfile.NamedTemporaryFile() as file:
            file.write(data)
            file.flush()
            show = ["ffprobe", "-v", "error", "-show_entries", "stream=codec_name", "-of", "csv=p=0", file.name]
            return subprocess.run(show, capture_output=True, text=True, timeout=60, check=True).stdout.split()

    def test_an_archive_holds_what_its_manifest_says(self):
        plan = self.ask("guard", "PlanExport", cameralists="1,2", utc_offset_min=60).json["data"]
        answer = self.ask("guard", cameralists="1,2", utc_offset_min=60)
        self.assertEqual((answer.status, answer.headers.get_content_type()), (200, "application/zip"))
        self.assertEqual(len(answer.body), plan["size_bytes"])
        with zipfile.ZipFile(io.BytesIO(answer.body)) as archive:
            self.assertIsNone(archive.testzip())
            manifest = json.loads(archive.read("manifest.json"))
            self.assertEqual([camera["id"] for camera in manifest["camera"]], [1, 2])
            self.assertEqual(manifest["exported"]["by"], "guard")
            files = [file for camera in manifest["camera"] for file in camera["file"]]
            beside = {"manifest.json", "manifest.json.sig", "manifest.json.pub"}
            self.assertEqual({file["name"] for file in files} | beside, set(archive.namelist()))
            for file in files:
                data = archive.read(file["name"])
                self.assertEqual(hashlib.sha256(data).hexdigest(), file["sha256"])
                self.assertEqual(len(self.probe(data)), 2 if file["sound"] else 1)
        self.assertTrue(all(camera["gap"] for camera in manifest["camera"]))

    def signed_by(self, folder, key, manifest):
        """Signature and public key that somebody else makes with OpenSSL."""
        def openssl(*arguments):
            subprocess.run(["openssl", *arguments], cwd=folder, capture_output=True, timeout=60, check=True)
        (folder / "text").write_bytes(manifest)
        openssl("genpkey", "-algorithm", "ED25519", "-out", key)
        openssl("pkey", "-in", key, "-pubout", "-out", "pub")
        openssl("pkeyutl", "-sign", "-inkey", key, "-rawin", "-in", "text", "-out", "sig")
        return {"manifest.json.sig": (folder / "sig").read_bytes(), "manifest.json.pub": (folder / "pub").read_bytes()}

    def test_a_signature_tells_whose_the_file_is_and_whether_it_was_changed(self):
        with zipfile.ZipFile(io.BytesIO(self.ask("guard", cameralists="1", archive="true").body)) as archive:
            made = {name: archive.read(name) for name in archive.namelist()}
        footage, manifest = next(name for name in made if not name.startswith("manifest")), "manifest.json"
        key = json.loads(self.server.cli("export", "key", "--json"))["fingerprint"]
        self.assertEqual((self.server.home / "signing/key.pem").stat().st_mode & 0o777, 0o600)
        changed = bytes([*made[footage][:-1], made[footage][-1] ^ 1])
        lie = made[manifest].replace(b'"guard"', b'"bob"  ')
        hashed_anew = made[manifest].replace(json.loads(made[manifest])["camera"][0]["file"][0]["sha256"].encode(),
                                             hashlib.sha256(changed).hexdigest().encode())
        unsigned = {"manifest.json.sig": None, "manifest.json.pub": None}
        rows = [
            ("as made", {}, (0, "own"), (0, "named")),
            ("changed byte", {footage: changed}, (1, "own"), (1, "named")),
            ("changed manifest", {manifest: lie}, (1, "nobody"), (1, "nobody")),
            ("changed byte and hash", {footage: changed, manifest: hashed_anew}, (1, "nobody"), (1, "nobody")),
            ("no signature", {"manifest.json.sig": None}, (1, "nobody"), (1, "nobody")),
            ("neither signature nor key", {footage: changed, manifest: hashed_anew, **unsigned}, (2, "nobody"), (1, "nobody")),
        ]
        with tempfile.TemporaryDirectory() as folder:
            folder = Path(folder)
            others = self.signed_by(folder, "other", hashed_anew)
            rows.append(("other key", {footage: changed, manifest: hashed_anew, **others}, (2, "unknown"), (1, "other")))
            for what, changes, *expected in rows:
                path = folder / "copy.zip"
                with zipfile.ZipFile(path, "w") as archive:
                    for name, data in {**made, **changes}.items():
                        if data is not None:
                            archive.writestr(name, data)
                for options, wanted in zip(([], ["--key", key.upper()]), expected, strict=True):
                    with self.subTest(what, options=options):
                        program = Path(self.server.environment["LOOKHAVEN_BUILD_FOLDER"], "bin/lookhaven")
                        done = subprocess.run([program, "export", "verify", path, "--json", *options], text=True,
                                              env=self.server.environment, capture_output=True, timeout=60)
                        self.assertEqual((done.returncode, json.loads(done.stdout)["signer"]), wanted, done.stderr)

    def test_who_may_not_see_or_hear_gets_nothing_of_it(self):
        heard = self.probe(self.ask("guard", cameralists="2").body)
        self.assertEqual(len(heard), 2)
        self.assertEqual(self.probe(self.ask("deaf", cameralists="2").body), heard[:1])
        for cameras in ("2", "1,2"):
            hidden = self.ask("blind", cameralists=cameras)
            absent = self.ask("blind", cameralists=cameras.replace("2", "999"))
            self.assertEqual((hidden.status, hidden.body), (absent.status, absent.body))
            self.assertEqual(hidden.status, 404)
        self.assertEqual(self.ask("blind", cameralists="1").status, 200)

    def test_a_copy_that_nobody_reads_ends_without_an_error(self):
        event = recorded_events(self.server, 1)[0]["id"]
        log = self.server.home / "log/webapi.log"
        logged_before = len(log.read_text())
        for method, what in ("Export", {"cameralists": "1,2"}), ("Export", {"cameralists": "1"}), ("Download", {"event": event}):
            with self.subTest(method, **what):
                before = len(self.server.requests())
                connection, response = self.server.open(call("VEXO.Event", method, **what, **self.span), "guard")
                self.assertGreater(int(response.headers["Content-Length"]), 1 << 16)
                response.read(1024)
                connection.close()
                deadline = time.monotonic() + 20
                while len(self.server.requests()) > before and time.monotonic() < deadline:
                    time.sleep(0.1)
                self.assertLessEqual(len(self.server.requests()), before)
        self.assertNotIn("failed", log.read_text()[logged_before:])

    def test_without_its_bytes_a_copy_is_seen_to_be_cut(self):
        # What the index names is no longer there: the copy begins, and cannot go on.
        event = recorded_events(self.server, 1)[0]
        file = next(Path(self.server.home).rglob(f"1/*/*-{event['id']}.mkv"))
        data = bytearray(file.read_bytes())
        data[len(data) // 2 :] = bytes(len(data) - len(data) // 2)
        file.write_bytes(data)
        span = {"from": event["start"], "to": event["stop"]}
        connection, response = self.server.open(call("VEXO.Event", "Export", cameralists="1", **span), "guard")
        self.assertEqual(response.status, 200)
        with self.assertRaises(http.client.IncompleteRead):
            response.read()
        connection.close()


if __name__ == "__main__":
    unittest.main()
