"""Which places see each other, from masts of a given height:

    sight_table.py terrain.gpkg places.csv 25
"""

import sys

import kelm_tin
import numpy as np
import pandas

if len(sys.argv) != 4:
    sys.exit(__doc__)
terrain, places, mast = sys.argv[1:]
surface = kelm_tin.read(terrain)
table = pandas.read_csv(places)
ground = surface.heights(table["x"], table["y"])
tops = np.column_stack((table["x"], table["y"], ground + float(mast)))
seen = surface.visible(tops[:, np.newaxis], tops[np.newaxis])
print(pandas.DataFrame(np.where(seen, "yes", "-"), table["place"], table["place"]).to_string())
