# SPDX-License-Identifier: Apache-2.0
#
# script/server: what it says when it cannot start, what it leaves behind, what it sets up.
import contextlib
import json
import os
import pathlib
import pwd
import re
import signal
import socket
import sqlite3
import ssl
import subprocess
import tempfile
import time
import unittest

from installation import BUILD, PASSWORDS, ROOT, Installation, call, free_port, make_certificate, wait_until


def said_by(*command, **options):
    return subprocess.run(command, capture_output=True, check=True, **options).stdout.decode(errors="replace")


def fetched(server, path):
    """Head and body of a file of the web server."""
    return said_by("curl", "-si", f"http://127.0.0.1:{server.port}/{path}")


class ServerTest(unittest.TestCase):
    def check_refusal(self, server, words, seconds):
        """script/server ends within that time, and says one sentence with the words in it."""
        command = [ROOT / "script/server"]
        streams = {"stdin": subprocess.DEVNULL, "capture_output": True, "text": True}
        began = time.monotonic()
        done = subprocess.run(command, env=server.environment, timeout=60, **streams)
        self.assertLess(time.monotonic() - began, seconds)
        server.discard()
        self.assertNotEqual(done.returncode, 0, done.stdout)
        said = done.stderr.strip()
        self.assertEqual(len(said.splitlines()), 1, said)
        for word in words:
            self.assertIn(word, said)

    def test_each_refusal_is_one_sentence_at_once(self):
        with socket.create_server(("127.0.0.1", 0)) as taken, tempfile.TemporaryDirectory() as folder:
            port = taken.getsockname()[1]
            file = pathlib.Path(folder, "file")
            file.touch()
            rows = [
                ("taken port", {"LOOKHAVEN_PORT": str(port)}, [str(port), "LOOKHAVEN_PORT="]),
                ("taken TLS port", {"LOOKHAVEN_TLS_PORT": str(port)}, [str(port), "LOOKHAVEN_TLS_PORT="]),
                ("port of root", {"LOOKHAVEN_PORT": "80"}, ["80", "1024"]),
                ("port of letters", {"LOOKHAVEN_PORT": "web"}, ["web", "1024"]),
                ("the same port twice", dict.fromkeys(["LOOKHAVEN_PORT", "LOOKHAVEN_TLS_PORT"], str(free_port())), ["both"]),
                ("read-only folder", {"LOOKHAVEN_HOME": "/proc/lookhaven"}, ["/proc/lookhaven", "LOOKHAVEN_HOME"]),
                ("no network", {"LOOKHAVEN_TRUSTED_PROXIES": "192.0.2.1,proxy;"}, ["proxy;", "LOOKHAVEN_TRUSTED_PROXIES"]),
                ("folder that is a file", {"LOOKHAVEN_HOME": str(file)}, [str(file), "LOOKHAVEN_HOME"]),
                ("folder too long for a socket", {"LOOKHAVEN_HOME": f"{folder}/{'a' * 90}"}, ["too long"]),
                ("folder with a quote", {"LOOKHAVEN_HOME": f'{folder}/a"b'}, ['a"b', "LOOKHAVEN_HOME"]),
            ]
            for age, version, words in (("newer", 999, ["schema 999", "update Lookhaven"]), ("older", 1, ["schema 1", "lookhaven init"])):
                home = f"{folder}/{age}"
                said_by(BUILD / "bin/lookhaven", "--home", home, "init")
                with contextlib.closing(sqlite3.connect(f"{home}/lookhaven.db", isolation_level=None)) as store:
                    store.execute("update schema_version set version = ?", (version,))
                    store.execute("update settings set value = ? where name = 'schema_compatible'", (version,))
                rows.append((f"{age} store", {"LOOKHAVEN_HOME": home}, words))
            if os.geteuid() == 0:
                rows.append(("folder of something else", {"LOOKHAVEN_HOME": folder}, [folder, "LOOKHAVEN_HOME"]))
            for name, environment, words in rows:
                with self.subTest(name):
                    self.check_refusal(Installation(**environment), words, 5)

    def test_missing_package_offline_is_one_sentence(self):
        with tempfile.TemporaryDirectory() as folder:
            for name, body in {
                "dpkg-query": '/usr/bin/dpkg-query "$@" | grep -v " libsodium-dev$"',
                "apt-get": 'case "$*" in *install*) echo "E: Unable to fetch some archives"; exit 100 ;; esac',
            }.items():
                pathlib.Path(folder, name).write_text(f"#!/bin/sh\n{body}\n")
                pathlib.Path(folder, name).chmod(0o755)
            server = Installation(PATH=f"{folder}:{os.environ['PATH']}", LOOKHAVEN_BUILD_FOLDER="")
            self.check_refusal(server, ["libsodium-dev", "Unable to fetch", "apt-get install"], 60)

    def test_it_says_that_it_runs_once_a_request_is_answered(self):
        # A web API host that ends the first connections without an answer, so that the web server tells of a bad gateway.
        late = """#!/usr/bin/python3
import os, socket, sys
words = sys.argv[1:]
path = words[words.index("--socket") + 1]
with socket.socket(socket.AF_UNIX) as listener:
    listener.bind(path)
    listener.listen()
    for _ in range(3):
        listener.accept()[0].close()
os.unlink(path)
os.execv("{program}", ["{program}", *words])
"""
        with tempfile.TemporaryDirectory() as folder:
            build, program = pathlib.Path(folder, "build"), BUILD / "bin/lookhaven-webapi"
            (build / "bin").mkdir(parents=True)
            for name in ("lib", *(f"bin/{file.name}" for file in (BUILD / "bin").iterdir() if file != program)):
                (build / name).symlink_to(BUILD / name)
            (build / "bin/lookhaven-webapi").write_text(late.format(program=program))
            for path in (folder, build, build / "bin", build / "bin/lookhaven-webapi"):
                os.chmod(path, 0o755)
            with Installation(LOOKHAVEN_BUILD_FOLDER=str(build), LOOKHAVEN_DEMO="no") as server:
                self.assertIn("Lookhaven is running", server.said())
                self.assertTrue(server.answers(), "at once")

    def test_second_start_on_the_same_folder(self):
        with Installation(LOOKHAVEN_DEMO="no") as first:
            self.check_refusal(Installation(LOOKHAVEN_HOME=str(first.home)), [f"kill {first.server.pid}"], 5)
            self.assertTrue(first.answers())
            self.assertNotIn("viewer", first.said())
            self.assertEqual(json.loads(first.cli("camera", "list", "--json")), [])

    def test_whatever_ends_the_script_leaves_nothing_running_and_the_next_start_works_elsewhere_too(self):
        with Installation() as server:
            password_line = server.said()
            for how in (signal.SIGTERM, signal.SIGINT, signal.SIGHUP, signal.SIGKILL):
                with self.subTest(how):
                    server.stop(how)
                    server.start()
                    self.assertIn("set at the first start", server.said())
                    server.login("admin")
            self.assertIn("correct horse", password_line)
            server.stop()
            server.home = server.home.rename(server.home.with_name("moved"))
            server.environment["LOOKHAVEN_HOME"] = str(server.home)
            server.start()
            self.assertEqual(json.loads(server.cli("mount", "list", "--json"))[0]["path"], str(server.home / "recordings"))

    def test_passwords_are_generated_when_none_is_given(self):
        with Installation(LOOKHAVEN_ADMIN_PASSWORD="", LOOKHAVEN_VIEWER_PASSWORD="") as server:
            said = dict(line.split(None, 1) for line in server.said().splitlines() if len(line.split()) == 2)
            for account in ("admin", "viewer"):
                self.assertGreaterEqual(len(said[account]), 12)
                server.login(account, said[account])

    def test_a_journal_gets_no_password(self):
        server = Installation()
        output = server.home.with_name("output")
        output.touch()
        server.environment["JOURNAL_STREAM"] = f"{output.stat().st_dev}:{output.stat().st_ino}"
        with server:
            self.assertIn("set at the first start", server.said())
            self.assertNotIn("correct horse", server.said())

    def test_parts_run_without_privilege_and_in_private_folders(self):
        with Installation() as server:
            for part in ("recorder", "webapi", "nginx"):
                status = pathlib.Path(f"/proc/{server.part(part)}/status").read_text()
                self.assertIn("CapEff:\t0000000000000000", status, part)
                self.assertIn("NoNewPrivs:\t1", status, part)
            for folder in ("", "run", "tls", "log"):
                self.assertEqual((server.home / folder).stat().st_mode & 0o077, 0, folder)
            self.assertEqual((server.home / "tls/key.pem").stat().st_mode & 0o077, 0)

    @unittest.skipIf(os.geteuid() != 0, "needs root")
    def test_root_hands_over_to_the_system_account_even_a_folder_that_it_made(self):
        def owners(*paths):
            return {path.lstat().st_uid for path in paths}

        server = Installation()
        with tempfile.TemporaryDirectory() as folder:
            secret, mount = pathlib.Path(folder, "secret"), pathlib.Path(folder, "mount")
            secret.touch()
            mount.mkdir()
            server.cli("init", "--admin", "admin", text="correct horse\n")
            server.cli("mount", "add", str(mount))
            (mount / "7").mkdir()
            (mount / "photos").mkdir()
            (server.home / "link").symlink_to(secret)
            (mount / "7/link").symlink_to(secret)
            self.assertEqual(owners(server.home, mount), {0})
            with server:
                self.assertIn("was root's", server.said())
                account = pwd.getpwnam("lookhaven").pw_uid
                parts = server.server.pid, *(server.part(name) for name in ("recorder", "webapi", "nginx"))
                self.assertEqual(owners(*(pathlib.Path(f"/proc/{pid}") for pid in parts)), {account})
                server.cli("camera", "add", "--name", "Shed", "--source", "test:mjpeg", "--type", "mjpeg")
                self.assertEqual(owners(server.home, *server.home.rglob("*"), mount, *mount.glob("7/*")), {account})
                self.assertEqual(owners(secret, mount / "photos"), {0})

    def test_https_on_every_address_and_http_on_loopback_only(self):
        with Installation() as server:
            local = {line.split()[3]: line for line in said_by("ss", "-HltnmO").splitlines()}
            self.assertIn(f"127.0.0.1:{server.port}", local)
            self.assertNotIn(f"0.0.0.0:{server.port}", local)
            self.assertIn(f"0.0.0.0:{server.tls_port}", local)
            if pathlib.Path("/proc/net/if_inet6").read_text():
                self.assertIn(f"[::]:{server.tls_port}", local)
            own = [line for address, line in local.items() if int(address.rsplit(":")[-1]) in (server.port, server.tls_port)]
            sizes = {re.search(r",tb(\d+),", line)[1] for line in own}
            self.assertEqual(sizes, {str(2 * (192 << 10))}, "what waits in it is old pictures; the kernel doubles it")
            context = ssl.create_default_context(cafile=server.home / "tls/certificate.pem")
            context.set_alpn_protocols(["h2"])
            with socket.create_connection(("127.0.0.1", server.tls_port)) as plain:
                with context.wrap_socket(plain, server_hostname="localhost") as secure:
                    self.assertEqual(secure.selected_alpn_protocol(), "h2")

    def test_a_damaged_certificate_is_made_anew_but_an_owners_is_left_alone(self):
        with Installation() as server:
            folder = server.home / "tls"
            made = (folder / "certificate.pem").read_bytes()
            self.assertIn("CA:FALSE", said_by("openssl", "x509", "-noout", "-text", input=made))
            server.stop()
            (folder / "certificate.pem").write_bytes(b"")
            server.start()
            self.assertNotIn((folder / "certificate.pem").read_bytes(), (b"", made))
            self.assertTrue((folder / "certificate.pem.damaged").exists())
            server.stop()
            make_certificate(folder, "owner", 1)
            owners = [(folder / name).read_bytes() for name in ("certificate.pem", "key.pem")]
            server.start()
            self.assertIn("expires within 30 days", server.said())
            self.assertEqual([(folder / name).read_bytes() for name in ("certificate.pem", "key.pem")], owners)

    def test_another_certificate_is_shown_at_once_or_the_one_from_before_stays(self):
        def shown():
            return ssl.get_server_certificate(("127.0.0.1", server.tls_port))

        def on_disk():
            return [(server.home / "tls" / name).read_text() for name in names]

        names = "certificate.pem", "key.pem"
        with Installation() as server, tempfile.TemporaryDirectory() as folder:
            own = [pathlib.Path(folder, name) for name in names]
            make_certificate(folder, "own.example", 90)
            with server.live(1) as parts:
                self.assertIn("The web server shows it.", server.cli("certificate", "set", *map(str, own)))
                self.assertEqual(shown(), own[0].read_text())
                self.assertFalse(parts.ends(), "viewers are not interrupted")
            make_certificate(folder, "other.example", 90)
            offer = {"certificate": own[0].read_text(), "key": own[1].read_text(), "confirm": True, "reauth": PASSWORDS["admin"]}
            answer = server.request(
                call("VEXO.System", "SetCertificate"), "admin", body=json.dumps(offer), headers={"Content-Type": "application/json"})
            self.assertTrue(answer.json["data"]["certificate"]["reloaded"])
            self.assertEqual(shown(), offer["certificate"])
            kept = on_disk()
            make_certificate(folder, "third.example", 90)
            with (server.home / "run/nginx.conf").open("a") as configuration:
                configuration.write("no such directive;\n")
            with self.assertRaisesRegex(AssertionError, "the certificate from before is in use again"):
                server.cli("certificate", "set", *map(str, own))
            self.assertEqual((shown(), on_disk()), (offer["certificate"], kept))
            logs = "".join(file.read_text() for file in (server.home / "log").iterdir())
            self.assertNotIn(offer["key"].splitlines()[1], logs)

    def test_client_comes_with_strict_headers(self):
        with Installation() as server:
            page = fetched(server, "")
            self.assertIn("Content-Security-Policy: default-src 'self'", page)
            self.assertNotIn("unsafe", page)
            self.assertIn("Cache-Control: no-cache", page)
            self.assertIn(f'<meta name="tls-port" content="{server.tls_port}"', page, "the client leads to https")
            asset = page.split('src="./')[1].split('"')[0]
            warning = "webman/3rdparty/Lookhaven/resources/images/2x/components/icon_indicator_warning.png"
            for path, kind, caching in ((asset, "application/javascript", "immutable"), (warning, "image/png", "no-cache")):
                head = fetched(server, path).partition("\r\n\r\n")[0]
                self.assertIn("200 OK", head, path)
                self.assertIn(kind, head)
                self.assertIn(caching, head)

    def test_a_part_that_ends_comes_back(self):
        with Installation() as server:
            for part in ("recorder", "webapi", "nginx"):
                old = server.part(part)
                os.kill(old, signal.SIGKILL)
                self.assertNotEqual(wait_until(lambda: server.part(part) if server.part(part) != old else 0, 10, part), old)
            wait_until(server.answers, 10, "everything answers again")
            self.assertIn("recorder ended", server.said())

    def test_however_often_a_part_ends_it_is_back_before_streams_give_up(self):
        restart = re.search(r"^Restart\(\) \{.*?^\}", (ROOT / "script/lib/supervision").read_text(), re.M | re.S)[0]
        script = f"""declare -A pid started pause=([recorder]=0)
            kill() {{ :; }}
            Detach() {{ printf '%s ' "$2" >&2; sleep 0 & }}
            {restart}
            for lived in 0 0 0 0 0 0 59 60 0; do
                pid[recorder]=1 started[recorder]=$((SECONDS - lived))
                Restart recorder
            done"""
        done = subprocess.run(["bash", "-c", script], capture_output=True, text=True, check=True)
        self.assertEqual(done.stderr, "1 2 4 8 8 8 8 1 2 ", done.stdout)


if __name__ == "__main__":
    unittest.main()
