"""A terrain that no machine holds: cut into tiles, and answered tile by tile on Dask.

A plan says how a layer is cut. It is a plain value, so it travels to the workers of whatever scheduler
Dask uses: threads, processes of one machine, or a cluster. A worker opens the file, loads the polygons
that meet its tile, answers, and forgets them. So all workers must see the file under one path. Only the
plan, positions and answers travel.

>>> import kelm_tin.tiles
>>> plan = kelm_tin.tiles.Plan("data/jacksboro.gpkg", tile=2000.0)
>>> cells = kelm_tin.tiles.raster(plan, cell=40.0)
>>> cells.chunksize, cells.dtype
((50, 50), dtype('float32'))
>>> round(float(kelm_tin.tiles.heights(plan, [[745000.0, 4052000.0]]).compute()[0]), 2)
752.5

This module needs dask; the rest of the package does not.
"""

from ._geotiff import write_geotiff
from ._heights import heights
from ._plan import Plan, TileError
from ._raster import RasterArray, raster

__all__ = ["Plan", "RasterArray", "TileError", "heights", "raster", "write_geotiff"]
