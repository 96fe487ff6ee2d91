"""Compares a survey with a terrain: points to a surface, and its height above the terrain on a grid:

    points_to_difference.py terrain.gpkg

The survey is made here: points on the terrain with two centimetres of noise, and a mound of five metres.
"""

import sys

import kelm_tin
import numpy as np

if len(sys.argv) != 2:
    sys.exit(__doc__)
terrain = kelm_tin.read(sys.argv[1])
random = np.random.default_rng(1)
xmin, ymin, xmax, ymax = 744000.0, 4050000.0, 745000.0, 4051000.0
xy = random.uniform((xmin, ymin), (xmax, ymax), (200_000, 2))
mound = 5 * np.exp(-(((xy - (744600, 4050400)) / 50) ** 2).sum(axis=1))
z = terrain.heights(xy) + random.normal(0, 0.02, len(xy)) + mound
survey = kelm_tin.Surface.from_points(np.column_stack((xy, z))[np.isfinite(z)])

bounds, cell = (xmin + 5, ymin + 5, xmax - 5, ymax - 5), 2.0
difference = survey.raster(bounds, cell).heights - terrain.raster(bounds, cell).heights
print(f"median {np.nanmedian(difference):.3f}, highest {np.nanmax(difference):.1f}")
print(f"volume {np.nansum(difference) * cell**2:.0f} of {np.pi * 50**2 * 5:.0f}")
