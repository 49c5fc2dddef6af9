# SPDX-License-Identifier: Apache-2.0
"""Live viewers: what 25 pictures a second of 100 KB cost. Prints three Markdown tables."""

import pathlib
import sys

from viewing import Load, print_tables

if __name__ == "__main__":
    print_tables(pathlib.Path(sys.argv[1]), Load("MJPEG", 100_000, 25, viewers=(1, 10, 50)), throttled=True)
