# SPDX-License-Identifier: Apache-2.0
#
# Reads the frame number that the test pattern paints into each picture.
#
# The font is learned: in a row of pictures the last digit runs through all ten shapes, and it is a zero where the digit
# before it changes.
import subprocess

DIGITS = 6


def cells_of(pictures, width, height):
    """For each JPEG picture its six digits as grey bytes. They stand at the lower right: "frame 000123"."""
    unit = height // 90
    rows, advance = 3 * unit, 3 * unit * 11 // 14
    row = DIGITS * advance
    size = row * rows
    crop = f"format=gray,crop={row}:{rows}:{width - 4 * unit - row}:{height - 7 * unit}"
    done = subprocess.run(
        ["ffmpeg", "-v", "error", "-f", "mjpeg", "-i", "-", "-vf", crop, "-fps_mode", "passthrough", "-pix_fmt", "gray",
         "-f", "rawvideo", "-"],
        input=b"".join(pictures), capture_output=True, timeout=60,
    )
    if done.returncode != 0 or len(done.stdout) != size * len(pictures):
        raise AssertionError(f"{len(pictures)} pictures gave {len(done.stdout) / size} decoded: {done.stderr.decode()}")
    return [
        [b"".join(done.stdout[at + line * row + digit * advance :][:advance] for line in range(rows))
         for digit in range(DIGITS)]
        for at in range(0, len(done.stdout), size)
    ]


def distance(one, other):
    return sum(abs(a - b) for a, b in zip(one, other))


class NumberReader:
    def __init__(self, row, width, height):
        """row: 25 pictures or more that follow each other."""
        self._size = width, height
        cells = cells_of(row, *self._size)
        change = max(range(1, len(cells) - 9), key=lambda i: distance(cells[i - 1][-2], cells[i][-2]))
        self._shapes = [cells[change + digit][-1] for digit in range(10)]

    def read(self, pictures):
        """The painted numbers."""
        return [
            int("".join(str(min(range(10), key=lambda digit: distance(cell, self._shapes[digit]))) for cell in cells))
            for cells in cells_of(pictures, *self._size)
        ]
