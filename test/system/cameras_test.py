# SPDX-License-Identifier: Apache-2.0
#
# Cameras of the network that are not what they seem: certificates of nobody, and ways to other hosts.
import pathlib
import socket
import ssl
import subprocess
import tempfile
import threading
import time
import unittest

from installation import BUILD

JPEG = bytes.fromhex("ffd8ffc0000b080030004001011100ffd9")
PICTURE = b"--edge\r\nContent-Type: image/jpeg\r\nContent-Length: %d\r\n\r\n%b\r\n" % (len(JPEG), JPEG)
VIDEO = b"HTTP/1.1 200 OK\r\nContent-Type: multipart/x-mixed-replace; boundary=edge\r\n\r\n" + PICTURE * 30


class Camera:
    """Gives each client the same answer to every request; with `repeated` it goes on with that until they leave."""

    def __init__(self, answer, tls=None, repeated=b""):
        self.answer, self.tls, self.repeated, self.requests = answer, tls, repeated, 0
        self.listener = socket.create_server(("127.0.0.1", 0))
        self.port = self.listener.getsockname()[1]
        threading.Thread(target=self.serve, daemon=True).start()

    def serve(self):
        while True:
            threading.Thread(target=self.send, args=[self.listener.accept()[0]], daemon=True).start()

    def send(self, connection):
        try:
            connection.settimeout(5)
            connection = self.tls.wrap_socket(connection, server_side=True) if self.tls else connection
            self.requests += bool(connection.recv(65536))
            connection.sendall(self.answer)
            while self.repeated:
                time.sleep(0.1)
                connection.sendall(self.repeated)
        except OSError:
            pass  # refused by the reader
        connection.close()


def moved(protocol, address):
    return f"{protocol} 302 Found\r\nCSeq: 1\r\nLocation: {address}\r\nContent-Length: 0\r\n\r\n".encode()


def probe(*arguments):
    done = subprocess.run(
        [BUILD / "bin/lookhaven", "camera", "probe", *arguments], capture_output=True, text=True, timeout=60
    )
    return done.stdout + done.stderr


class Cameras(unittest.TestCase):
    def test_a_certificate_of_nobody_is_taken_only_where_that_was_said(self):
        with tempfile.TemporaryDirectory() as folder:
            key, certificate = pathlib.Path(folder) / "key.pem", pathlib.Path(folder) / "certificate.pem"
            subprocess.run(
                f"openssl req -x509 -newkey rsa:2048 -nodes -days 2 -subj /CN=cam -addext subjectAltName=IP:127.0.0.1"
                f" -keyout {key} -out {certificate}".split(), check=True, capture_output=True
            )
            tls = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
            tls.load_cert_chain(certificate, key)
        camera = Camera(VIDEO, tls)
        address = f"https://127.0.0.1:{camera.port}/"
        refused = probe(address)
        self.assertIn("its TLS certificate is refused", refused)
        self.assertIn("--insecure", refused)
        self.assertEqual(camera.requests, 0, "a host without a trusted certificate learns nothing")
        self.assertIn("MJPEG 64x48", probe("--insecure", address))

    def test_redirects_lead_to_the_same_host_only(self):
        target = Camera(VIDEO)
        here, other = f"127.0.0.1:{target.port}/", f"localhost:{target.port}/"
        self.assertIn("MJPEG 64x48", probe(f"http://127.0.0.1:{Camera(moved('HTTP/1.1', 'http://' + here)).port}/"))
        target.requests = 0
        for scheme, protocol in (("http", "HTTP/1.1"), ("rtsp", "RTSP/1.0")):
            camera = Camera(moved(protocol, f"{scheme}://{other}"))
            self.assertIn("it redirects to localhost", probe(f"{scheme}://127.0.0.1:{camera.port}/"))
        self.assertEqual(target.requests, 0)
        for scheme, protocol in (("http", "HTTP/1.1"), ("rtsp", "RTSP/1.0")):
            camera = Camera(b"")
            camera.answer = moved(protocol, f"{scheme}://127.0.0.1:{camera.port}/")
            probe(f"{scheme}://127.0.0.1:{camera.port}/")
            self.assertTrue(2 <= camera.requests <= 20, f"{camera.requests} times in a circle")


if __name__ == "__main__":
    unittest.main()
