"""Adds a column of heights to a CSV with the columns x and y:

    heights_of_csv.py terrain.gpkg positions.csv heights.csv
"""

import sys

import kelm_tin
import pandas

if len(sys.argv) != 4:
    sys.exit(__doc__)
terrain, positions, heights = sys.argv[1:]
table = pandas.read_csv(positions)
surface = kelm_tin.read(terrain)
table["height"] = surface.heights(table["x"], table["y"])
table.to_csv(heights, index=False, float_format="%.3f")
print(table.to_string(index=False))
