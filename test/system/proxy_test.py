# SPDX-License-Identifier: Apache-2.0
#
# Another web server in front, below a path, set up as the guide shows it: everything works through it, and clients are
# known by their own addresses.
import contextlib
import http.client
import pathlib
import re
import socket
import ssl
import subprocess
import tempfile
import unittest
import urllib.parse

from installation import PASSWORDS, ROOT, Installation, call, free_port, wait_until

CLIENT, STRANGER, CLAIMED = "127.0.0.2", "127.0.0.3", "198.51.100.7"
CONFIGURATION = """
daemon off;
pid {folder}/nginx.pid;
error_log {folder}/error.log;
events {{}}
http {{
    access_log off;
    client_body_temp_path {folder}/body;
    proxy_temp_path {folder}/proxy;
    fastcgi_temp_path {folder}/unused;
    scgi_temp_path {folder}/unused;
    uwsgi_temp_path {folder}/unused;
    server {{
        listen 127.0.0.1:{port};
        {location}
    }}
}}
"""


def listens(port):
    with socket.socket() as probe:
        return probe.connect_ex(("127.0.0.1", port)) == 0


@contextlib.contextmanager
def proxy(tls_port):
    """Its port; forwards as the guide's example does."""
    guide = (ROOT / "docs/guide/proxy.md").read_text()
    location = re.search(r"```nginx\n(.*?)```", guide, re.DOTALL)[1].replace(":8443", f":{tls_port}")
    port = free_port()
    with tempfile.TemporaryDirectory() as folder:
        file = pathlib.Path(folder, "nginx.conf")
        file.write_text(CONFIGURATION.format(folder=folder, port=port, location=location))
        process = subprocess.Popen(["nginx", "-p", folder, "-c", str(file)], stderr=subprocess.DEVNULL)
        try:
            wait_until(lambda: listens(port), 10, "the proxy listens")
            yield port
        finally:
            process.terminate()
            process.wait(10)


class ProxyTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation(LOOKHAVEN_TRUSTED_PROXIES="127.0.0.1, 2001:db8::/64"))
        cls.port = cls.enterClassContext(proxy(cls.server.tls_port))

    def ask(self, path, headers={}, form=None, connection=None):
        """The response, whose body is left to the caller; through the proxy unless another connection is given."""
        connection = connection or http.client.HTTPConnection("127.0.0.1", self.port, timeout=30, source_address=(CLIENT, 0))
        self.addCleanup(connection.close)
        body = form and urllib.parse.urlencode(form)
        kind = {"Content-Type": "application/x-www-form-urlencoded"} if form else {}
        connection.request("POST" if form else "GET", path, body, {**kind, **headers})
        return connection.getresponse()

    def log_in(self, **named):
        form = {"account": "admin", "password": PASSWORDS["admin"]}
        path = "webapi?" + urllib.parse.urlencode(call("VEXO.Auth", "Login"))
        response = self.ask(named.pop("root", "/nvr/") + path, {"X-Forwarded-For": CLAIMED, **named.pop("headers", {})}, form, **named)
        self.assertEqual(response.status, 200, response.read())
        return response.headers["Set-Cookie"].partition(";")[0]

    def last_address(self):
        line = (self.server.home / "log/log-ins.log").read_text().splitlines()[-1]
        return re.search(r"\d+\.\d+\.\d+\.\d+", line)[0]

    def test_everything_works_below_a_path(self):
        page = self.ask("/nvr/").read().decode()
        self.assertEqual(self.ask("/nvr/" + page.split('src="./')[1].split('"')[0]).status, 200)
        cookie = {"Cookie": self.log_in(headers={"Origin": f"http://127.0.0.1:{self.port}"})}
        live = "/nvr/webapi?" + urllib.parse.urlencode(call("VEXO.Lookhaven.Player.LiveviewSrc", "Play", camera=1))
        stream = self.ask(live, cookie)
        pictures = 0
        while pictures < 5:
            line = stream.readline()
            self.assertTrue(line, "the stream ended")
            pictures += line.lower().startswith(b"content-type: image/jpeg")
        nothing = "/nvr/webapi?" + urllib.parse.urlencode(call("VEXO.Lookhaven.Player", "PlayMjpegEvent", eventid=999999))
        away = self.ask(nothing, cookie)
        self.assertEqual(away.status, 302, away.read())
        self.assertRegex(away.headers["Location"], "^(http://[^/]*)?/nvr/webman/")
        self.assertEqual(self.ask(away.headers["Location"]).headers["Content-Type"], "image/png")
        self.assertEqual(self.ask("/nvr/healthz").status, 401, "a proxy on this machine is no monitor")

    def test_a_clients_address_is_its_own_whatever_it_claims(self):
        self.log_in()
        self.assertEqual(self.last_address(), CLIENT)
        context = ssl._create_unverified_context()
        direct = http.client.HTTPSConnection(
            "127.0.0.1", self.server.tls_port, timeout=30, source_address=(STRANGER, 0), context=context
        )
        self.log_in(root="/", connection=direct)
        self.assertEqual(self.last_address(), STRANGER)


if __name__ == "__main__":
    unittest.main()
