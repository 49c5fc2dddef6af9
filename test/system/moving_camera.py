# SPDX-License-Identifier: Apache-2.0
#
# A camera of the network that sends Motion JPEG over HTTP, whose picture moves.
import contextlib
import http.server
import itertools
import subprocess
import threading
import time

PERIOD_S = 0.1
CLIP = "-v error -f lavfi -i testsrc=size=320x240:rate=10:duration=2 -c:v mjpeg -f image2pipe -"


class MovingCamera:
    """Use as a context manager. The same two seconds for each viewer, over and over."""

    def __init__(self):
        data = subprocess.run(["ffmpeg", *CLIP.split()], capture_output=True, check=True, timeout=60).stdout
        pictures = [piece + b"\xff\xd9" for piece in data.split(b"\xff\xd9") if piece]

        class Handler(http.server.BaseHTTPRequestHandler):
            def do_GET(self):
                self.send_response(200)
                self.send_header("Content-Type", "multipart/x-mixed-replace; boundary=edge")
                self.end_headers()
                with contextlib.suppress(OSError):  # until the viewer leaves
                    for picture in itertools.cycle(pictures):
                        head = b"--edge\r\nContent-Type: image/jpeg\r\nContent-Length: %d\r\n\r\n" % len(picture)
                        self.wfile.write(head + picture + b"\r\n")
                        time.sleep(PERIOD_S)

            def log_message(self, *_):
                pass

        self._server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Handler)
        self._server.daemon_threads = True
        self.address = f"http://127.0.0.1:{self._server.server_address[1]}/video"

    def __enter__(self):
        threading.Thread(target=self._server.serve_forever, daemon=True).start()
        return self

    def __exit__(self, *_):
        self._server.shutdown()
        self._server.socket.close()
