# SPDX-License-Identifier: Apache-2.0
#
# Reads the frame number and the time of day that the test pattern paints into each picture.
#
# The font is learned: in a row of pictures the last digit of the number runs through all ten shapes, and it is a zero
# where the digit before it changes. Of the time, the seconds are known from when the picture was captured.
import subprocess

# At the lower right, "frame 000123" and above it "12:34:56.789": how many characters, their height, and how far up they
# stand.
NUMBER = 6, 3, 7
CLOCK = 12, 5, 13


def cells_of(pictures, width, height, line=NUMBER):
    """For each JPEG picture the characters of a line as grey bytes."""
    characters, units, up = line
    unit = height // 90
    rows, advance = units * unit, units * unit * 11 // 14
    row = characters * advance
    size = row * rows
    crop = f"format=gray,crop={row}:{rows}:{width - 4 * unit - row}:{height - up * unit}"
    done = subprocess.run(
        ["ffmpeg", "-v", "error", "-f", "mjpeg", "-i", "-", "-vf", crop, "-fps_mode", "passthrough", "-pix_fmt", "gray",
         "-f", "rawvideo", "-"],
        input=b"".join(pictures), capture_output=True, timeout=60,
    )
    if done.returncode != 0 or len(done.stdout) != size * len(pictures):
        raise AssertionError(f"{len(pictures)} pictures gave {len(done.stdout) / size} decoded: {done.stderr.decode()}")
    return [
        [b"".join(done.stdout[at + line * row + digit * advance :][:advance] for line in range(rows))
         for digit in range(characters)]
        for at in range(0, len(done.stdout), size)
    ]


def distance(one, other):
    return sum(abs(a - b) for a, b in zip(one, other))


def nearest(shapes, cell):
    return min(range(10), key=lambda digit: distance(cell, shapes[digit]))


class NumberReader:
    def __init__(self, row, width, height):
        """row: 25 pictures or more that follow each other."""
        self._size = width, height
        cells = cells_of(row, *self._size)
        change = max(range(1, len(cells) - 9), key=lambda i: distance(cells[i - 1][-2], cells[i][-2]))
        self._shapes = [cells[change + digit][-1] for digit in range(10)]

    def read(self, pictures):
        """The painted numbers."""
        return [int("".join(str(nearest(self._shapes, cell)) for cell in cells)) for cells in cells_of(pictures, *self._size)]


class ClockReader:
    def __init__(self, pictures, captured, width, height):
        """pictures: of ten seconds or more; captured: for each the seconds since the epoch."""
        self._size = width, height
        # In the middle of a second it is sure which one is painted.
        certain = [(cells[7], time) for cells, time in zip(cells_of(pictures, *self._size, CLOCK), captured) if 0.3 < time % 1 < 0.8]
        self._shapes = [next(cell for cell, time in certain if int(time) % 10 == digit) for digit in range(10)]

    def read(self, pictures):
        """The painted times, in milliseconds since the full hour."""
        found = []
        for cells in cells_of(pictures, *self._size, CLOCK):
            minutes, seconds, thousandths = (
                int("".join(str(nearest(self._shapes, cells[at])) for at in places)) for places in ((3, 4), (6, 7), (9, 10, 11)))
            found.append((minutes * 60 + seconds) * 1000 + thousandths)
        return found
