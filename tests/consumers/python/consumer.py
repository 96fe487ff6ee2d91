"""A program of somebody else: it loads the terrain named on its command line and prints a height."""

import sys

import kelm_tin

try:
    kelm_tin.read("no such file")
except OSError:
    surface = kelm_tin.read(sys.argv[1])
    print(f"{surface.heights(745000.0, 4052000.0):.3f} m")
