# SPDX-License-Identifier: Apache-2.0
#
# A multipart answer, read part by part.
import contextlib
import time


class Parts:
    """Reads a multipart answer part by part; a context manager that closes the connection."""

    def __init__(self, connection, response):
        self.response = response
        self._connection = connection
        self.slow_down(None)

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()

    def close(self):
        self.response.close()
        self._connection.close()

    def ends(self):
        """Whether the stream has ended before its next part."""
        try:
            self.next()
        except EOFError:
            return True
        return False

    def rest(self):
        """What is still to come, to the end of the stream."""
        with contextlib.suppress(EOFError):
            while True:
                yield self.next()

    def slow_down(self, bytes_per_second):
        self._pace, self._began, self._read = bytes_per_second, time.monotonic(), 0

    def next(self):
        """Header names in lower case with their values, and the picture; fails when the stream ends."""
        line = self.response.readline()
        while line and not line.startswith(b"--"):
            line = self.response.readline()
        if not line:
            raise EOFError("the stream ended")
        head = {}
        while (line := self.response.readline().strip()):
            name, _, value = line.decode().partition(":")
            head[name.lower()] = value.strip()
        if "content-length" not in head:
            raise EOFError("the stream ended inside a part's head")
        picture = b""
        while len(picture) < int(head["content-length"]):
            piece = self.response.read(min(16384, int(head["content-length"]) - len(picture)))
            if not piece:
                raise EOFError("the stream ended inside a part")
            picture += piece
            self._read += len(piece)
            if self._pace:
                time.sleep(max(0.0, self._read / self._pace - (time.monotonic() - self._began)))
        return head, picture
