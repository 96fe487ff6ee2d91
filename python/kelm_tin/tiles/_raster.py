"""A raster of all tiles."""

from __future__ import annotations

from typing import Any, Optional

import numpy as np

from .._arrays import to_positive
from ._dask import Array, tokenize
from ._plan import Plan
from ._work import Frame, fill_cells, make_empty

Transform = tuple[float, float, float, float, float, float]


class RasterArray(Array):  # type: ignore[misc]
    """A dask array of two axes that knows where its cells lie. What is computed of it is a plain array."""

    transform: Transform
    """a, b, c, d, e, f as rasterio's `Affine` has them: x = a * column + b * row + c and
    y = d * column + e * row + f give the north-western corner of a cell."""
    crs: Optional[str]
    """CRS as WKT; None if the layer has none."""

    @classmethod
    def _make(cls, array: Any, transform: Transform, crs: Optional[str]) -> RasterArray:
        make: Any = cls.__new__
        made: RasterArray = make(cls, array.dask, array.name, array.chunks, array.dtype)
        made.transform, made.crs = transform, crs
        return made

    def _rebuild(self, *arguments: Any, **options: Any) -> RasterArray:
        return self._make(super()._rebuild(*arguments, **options), self.transform, self.crs)

    def __reduce__(self) -> Any:
        plain = Array(self.dask, self.name, self.chunks, self.dtype)
        return RasterArray._make, (plain, self.transform, self.crs)


def raster(plan: Plan, cell: float, *, closed: bool = False) -> RasterArray:
    """The height at the centre of each cell, for all tiles. No cell is computed yet. The call opens the file
    once to see which tiles hold any polygons.

    Args:
        cell: side of a cell in map units; a tile must be a whole number of cells wide.
        closed: give a centre on an edge a height even if rounding puts it beside both triangles.

    Returns:
        Array of `float32`, a chunk a tile, rows from north to south; NaN off the surface. It has the
        attributes `transform` and `crs`.

    Raises:
        ValueError: the cells do not fit the tiles.
        OSError, DataError: the file is gone, or was written to since the plan was made.
        TileError: when it is computed: a tile could not be answered.

    >>> cells = raster(Plan("data/jacksboro.gpkg", tile=2000.0), 40.0)
    >>> cells.shape, cells.transform
    ((400, 400), (40.0, 0.0, 738000.0, 0.0, -40.0, 4060000.0))
    """
    size = to_positive("cell", cell)
    side = round(plan.tile / size)
    if side < 1 or abs(side * size - plan.tile) > 1e-9 * plan.tile:
        raise ValueError(f"cell: a tile of {plan.tile!r} is no whole number of cells of {cell!r}")
    frame = Frame(size, side, bool(closed))
    token = tokenize(plan, frame)
    key, name = "kelm-tin-plan-" + token, "kelm-tin-raster-" + token
    rows, columns = plan.tiles
    graph: dict[Any, Any] = {key: plan}
    places = plan.list_tiles()
    for tile, count in zip(places, plan.count([plan.box(tile) for tile in places])):
        fill = (fill_cells, key, frame, tile) if count else (make_empty, side)
        graph[(name, *tile)] = fill
    array = Array(graph, name, ((side,) * rows, (side,) * columns), np.float32)
    x, y = plan.origin
    return RasterArray._make(array, (size, 0.0, x, 0.0, -size, y), plan.crs)
