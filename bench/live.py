# SPDX-License-Identifier: Apache-2.0
"""Live viewers: what 25 pictures a second of 100 KB cost. Prints one Markdown table."""

import pathlib
import sys

from viewing import Load, print_comparison

if __name__ == "__main__":
    print_comparison(pathlib.Path(sys.argv[1]), Load("MJPEG", 100_000, 25, viewers=(1, 10, 50)))
