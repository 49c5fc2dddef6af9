# SPDX-License-Identifier: Apache-2.0
"""A slow line to a server on this machine, and a machine that reads slowly."""

import contextlib
import socket
import threading
import time

BUFFER_BYTES = 16_384  # of the line itself: what has left the server and has not arrived
SEGMENT_BYTES = 1_448  # as on Ethernet; those of the loopback are larger than the buffer
MAX_CREDIT_S = 0.05  # a late wake-up is made good, an idle line stores nothing


class Line:
    """Relays one connection to the port, from the server at that many bytes a second. Use as a context manager.

    is_reader: the line is fast, and what is read slowly waits in the receive buffer that the kernel gives a program."""

    def __init__(self, port, bytes_per_second, is_reader=False):
        self._rate = bytes_per_second
        self._listener = socket.create_server(("127.0.0.1", 0))
        self.port = self._listener.getsockname()[1]
        self._server = socket.socket()
        if not is_reader:
            self._server.setsockopt(socket.SOL_SOCKET, socket.SO_RCVBUF, BUFFER_BYTES)
            self._server.setsockopt(socket.IPPROTO_TCP, socket.TCP_MAXSEG, SEGMENT_BYTES)
        self._server.connect(("127.0.0.1", port))
        threading.Thread(target=self._relay, daemon=True).start()

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self._listener.close()
        self._server.close()

    def _relay(self):
        with contextlib.suppress(OSError), self._listener.accept()[0] as client:
            threading.Thread(target=self._relay_requests, args=(client,), daemon=True).start()
            free_at = time.monotonic()
            while data := self._server.recv(self._rate // 50):
                client.sendall(data)
                free_at = max(free_at, time.monotonic() - MAX_CREDIT_S) + len(data) / self._rate
                time.sleep(max(0, free_at - time.monotonic()))

    def _relay_requests(self, client):
        with contextlib.suppress(OSError):
            while data := client.recv(65_536):
                self._server.sendall(data)
