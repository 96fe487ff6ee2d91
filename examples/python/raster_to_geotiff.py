"""Writes a terrain as a GeoTIFF of heights:

    raster_to_geotiff.py terrain.gpkg heights.tif 20
"""

import sys

import kelm_tin
import numpy as np
import rasterio

if len(sys.argv) != 4:
    sys.exit(__doc__)
terrain, name, cell = sys.argv[1:]
surface = kelm_tin.read(terrain)
cells, transform = surface.raster(cell=float(cell), closed=True)
with rasterio.open(
    name,
    "w",
    driver="GTiff",
    width=cells.shape[1],
    height=cells.shape[0],
    count=1,
    dtype="float32",
    crs=surface.crs,
    transform=rasterio.Affine(*transform),
    nodata=np.nan,
    tiled=True,
    compress="deflate",
    predictor=3,
) as file:
    file.write(cells, 1)
print(f"{cells.shape[1]} x {cells.shape[0]} cells, {np.isfinite(cells).sum()} with a height")
