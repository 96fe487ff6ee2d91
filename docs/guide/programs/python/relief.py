import sys

import kelm_tin
import matplotlib

matplotlib.use("Agg")
import matplotlib.pyplot as plt
import numpy as np
from matplotlib.colors import LightSource

surface = kelm_tin.read(sys.argv[1], source="orthometric")

# A raster of the heights, and where its cells lie.
cells, (side, _, left, _, _, top) = surface.raster(cell=40)
rows, columns = cells.shape
extent = (left, left + columns * side, top - rows * side, top)

# What an eye 30 m above the highest corner sees of the ground in each cell.
peak = surface.map_points()[surface.points[:, 2].argmax()]
x, y = np.meshgrid(left + (np.arange(columns) + 0.5) * side, top - (np.arange(rows) + 0.5) * side)
seen = surface.visible(peak + [0, 0, 30], np.stack((x, y, cells), axis=-1))

# The profile from there to the south-eastern valley.
line = surface.profile([peak[:2], (749860, 4051720)], step=20)

figure, (plan, section) = plt.subplots(2, figsize=(6, 8), height_ratios=(4, 1), layout="constrained")
plan.imshow(LightSource().hillshade(cells, dx=side, dy=side), cmap="gray", extent=extent)
plan.imshow(np.where(seen, 1.0, np.nan), cmap="autumn", alpha=0.4, extent=extent)
plan.plot(line.x, line.y, "b", linewidth=1)
plan.set_title(f"{seen.sum() * side**2 / 1e6:.1f} km² in sight of {peak[0]:.0f}, {peak[1]:.0f}")
section.plot(line.stations, line.heights, "b")
section.set(xlabel="metres along the line", ylabel="height")
figure.savefig(sys.argv[2], dpi=60)
print(plan.get_title())
