#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Sends one request to the web API host's socket and copies the answer to standard output.

scgi_request.py SOCKET QUERY [--cookie ID] [--post FORM] [--seconds N]
"""
import argparse
import socket
import sys
import time


def request(query, cookie="", form=None):
    lines = {
        "CONTENT_LENGTH": str(len(form or "")),
        "SCGI": "1",
        "REQUEST_METHOD": "GET" if form is None else "POST",
        "QUERY_STRING": query,
        "CONTENT_TYPE": "application/x-www-form-urlencoded",
        "REMOTE_ADDR": "127.0.0.1",
        "HTTP_COOKIE": f"id={cookie}" if cookie else "",
    }
    head = "".join(f"{name}\0{value}\0" for name, value in lines.items()).encode()
    return str(len(head)).encode() + b":" + head + b"," + (form or "").encode()


def main():
    options = argparse.ArgumentParser(description=__doc__)
    options.add_argument("socket")
    options.add_argument("query")
    options.add_argument("--cookie", default="")
    options.add_argument("--post")
    options.add_argument("--seconds", type=float, default=60)
    given = options.parse_args()
    end = time.monotonic() + given.seconds
    with socket.socket(socket.AF_UNIX) as connection:
        connection.connect(given.socket)
        connection.sendall(request(given.query, given.cookie, given.post))
        while (left := end - time.monotonic()) > 0:
            connection.settimeout(left)
            try:
                block = connection.recv(65536)
            except socket.timeout:
                break
            if not block:
                break
            sys.stdout.buffer.write(block)
    sys.stdout.buffer.flush()


if __name__ == "__main__":
    main()
