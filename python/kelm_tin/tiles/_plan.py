"""How a layer is cut into tiles."""

from __future__ import annotations

import math
import os
from dataclasses import InitVar, dataclass
from typing import Any, Optional, Union

import numpy as np
from numpy.typing import ArrayLike, NDArray

from .._arrays import FloatArray, to_position, to_positive
from .._reading import Path, Survey, count_shapes, find_crs, survey, to_datum

Tile = tuple[int, int]
"""Row from the north on, column from the west on."""
Box = tuple[float, float, float, float]
"""xmin, ymin, xmax, ymax in map coordinates."""

MOST_TILES = 10_000_000
NO_TILE = -1
MARGIN = 2.0**-18
"""What a window is larger than its tile by, as a share of the distances in the layer. Positions and
corners are rounded to `float32`, each by at most 2^-24 of their distance from the base, and the inside
rule is off by at most 24 times 2^-24 of the triangle's size. So a triangle can hold a position although
its polygon does not touch it, but only so near."""
MOST_HALVINGS = 12
"""How often a tile is halved before it counts as too large."""
OPEN_NBYTES = 32_000_000
"""Bytes of an open file with its survey."""


class TileError(RuntimeError):
    """A tile that could not be answered. The text names the file, the tile and the cause."""


@dataclass(frozen=True)
class Plan:
    """How a layer is cut into tiles. A plain value that pickles; it holds no file open.

    Tiles are squares whose sides lie on whole multiples of `tile`. Rows run from north to south, columns
    from west to east. The western and the northern side belong to a tile, so a position on a seam lies in
    one tile. Polygons that meet a tile enter it whole.

    Args:
        path: file that all workers see.
        tile: side of a tile in map units.
        layer: number of the layer from 1 on; None for the first with polygons.
        source, output, offset, scale: as `kelm_tin.read` takes them.
        base: "tile", or x and y. With x and y all tiles are stored relative to this one position, and
            every answer is that of the whole layer read with this base, to the bit. With "tile" each tile
            is stored relative to its own centre, so that a wide layer loses no precision.
        limit: bytes that a worker may need for a tile; a tile that would need more is answered in parts.
            None for no limit. See `estimate`.
        survey: what `kelm_tin.survey` tells of the layer; None to find it out now, which reads the layer
            once.
        progress: told how far that is; see `kelm_tin.survey`.

    Raises:
        ValueError: an argument that cannot be used; more than ten million tiles.
        OSError, DataError: as `kelm_tin.survey`.

    >>> plan = Plan("data/jacksboro.gpkg", tile=2000.0)
    >>> plan.tiles, plan.origin
    ((8, 8), (738000.0, 4060000.0))
    """

    path: str
    tile: float
    layer: Optional[int] = None
    source: str = "other"
    output: Optional[str] = None
    offset: float = 0.0
    scale: float = 1.0
    base: Union[str, tuple[float, float]] = "tile"
    limit: Optional[int] = None
    survey: Optional[Survey] = None
    progress: InitVar[Any] = None

    def __post_init__(self, progress: Any) -> None:
        self._set(path=_to_path(self.path), tile=to_positive("tile", self.tile))
        if self.base != "tile":
            self._set(base=to_position("base", self.base))
        if self.limit is not None:
            self._set(limit=int(to_positive("limit", self.limit)))
        for name in ("source", "output"):
            to_datum(name, getattr(self, name) or "other")
        if self.survey is None:
            self._set(survey=survey(self.path, self.layer, progress=progress))
        rows, columns = self.tiles
        if rows * columns > MOST_TILES:
            raise ValueError(f"tile: {self.tile!r} gives {rows} x {columns} tiles, more than {MOST_TILES}")

    def _set(self, **values: Any) -> None:
        for name, value in values.items():
            object.__setattr__(self, name, value)

    @property
    def bounds(self) -> Box:
        """xmin, ymin, xmax, ymax of the layer in map coordinates."""
        return self._survey.bounds

    @property
    def crs(self) -> Optional[str]:
        """CRS of the answers as WKT; None if the layer has none. See `Surface.crs`."""
        return find_crs(self._survey.crs, self.source, self.output or self.source, self.offset, self.scale)

    @property
    def origin(self) -> tuple[float, float]:
        """x and y of the north-western corner of the first tile: whole multiples of the tile."""
        xmin, _, _, ymax = self.bounds
        return math.floor(xmin / self.tile) * self.tile, math.ceil(ymax / self.tile) * self.tile

    @property
    def tiles(self) -> tuple[int, int]:
        """Number of rows and of columns of tiles."""
        x, y = self.origin
        _, ymin, xmax, _ = self.bounds
        return max(1, math.ceil((y - ymin) / self.tile)), max(1, math.ceil((xmax - x) / self.tile))

    def list_tiles(self) -> list[Tile]:
        """Row and column of every tile, row by row."""
        rows, columns = self.tiles
        return [(row, column) for row in range(rows) for column in range(columns)]

    def box(self, tile: Tile) -> Box:
        """The sides of a tile in map coordinates."""
        (x, y), (row, column) = self.origin, tile
        return (
            x + column * self.tile,
            y - (row + 1) * self.tile,
            x + (column + 1) * self.tile,
            y - row * self.tile,
        )

    def base_of(self, tile: Tile) -> tuple[float, float]:
        """The base of the surface of a tile."""
        if isinstance(self.base, tuple):
            return self.base
        xmin, ymin, xmax, ymax = self.box(tile)
        return (xmin + xmax) / 2, (ymin + ymax) / 2

    def window(self, box: Box) -> Box:
        """What is loaded for a box: it and a margin. Every triangle that holds a position of the box, by
        the rule that works in `float32`, is of a polygon that meets the window."""
        bounds = self.bounds
        size = max(bounds[2] - bounds[0], bounds[3] - bounds[1])
        reach = size if self.base == "tile" else self._reach()
        grow = MARGIN * (size + self.tile + reach)
        return box[0] - grow, box[1] - grow, box[2] + grow, box[3] + grow

    def _reach(self) -> float:
        x, y = self.base_of((0, 0))
        xmin, ymin, xmax, ymax = self.bounds
        return max(abs(xmin - x), abs(ymin - y), abs(xmax - x), abs(ymax - y))

    def find(self, xy: FloatArray) -> NDArray[np.int64]:
        """The number of the tile of each position, row by row from 0 on.

        Args:
            xy: (n, 2) map coordinates.

        Returns:
            (n,) int64; `NO_TILE` for NaN and beyond the layer. A position beyond the last tile by less than
            the margin lies in that one, since rounding may bring it onto the surface.
        """
        rows, columns = self.tiles
        x, y = self.origin
        xmin, ymin, xmax, ymax = self.window(self.bounds)
        inside = (xy >= (xmin, ymin)).all(axis=1) & (xy <= (xmax, ymax)).all(axis=1)
        near = np.where(inside[:, np.newaxis], xy, (x, y))
        row = np.clip(np.floor((y - near[:, 1]) / self.tile), 0, rows - 1)
        column = np.clip(np.floor((near[:, 0] - x) / self.tile), 0, columns - 1)
        return np.where(inside, row * columns + column, NO_TILE).astype(np.int64)

    def count(self, boxes: list[Box]) -> NDArray[np.int64]:
        """For each box a bound on the number of polygons that are loaded for it. Opens the file once, and
        reads no polygon: the survey knows where blocks of polygons lie.

        Raises:
            OSError, DataError: the file is gone, or was written to since the survey.
        """
        windows = [self.window(box) for box in boxes]
        counts: NDArray[np.int64] = np.array(count_shapes(self.path, self._survey, windows), np.int64)
        return counts

    @property
    def estimate(self) -> int:
        """Bytes that a worker needs for its largest tile, beyond what it holds while it waits, and beyond the
        cells or positions: what a load of the polygons that `count` bounds takes, at one triangle a polygon.
        With a limit it is that of a part. Raises as `count`, and as `parts`."""
        most = int(self.estimate_boxes([self.box(tile) for tile in self.list_tiles()]).max())
        return most if self.limit is None else min(most, self.limit)

    def estimate_boxes(self, boxes: list[Box]) -> NDArray[np.int64]:
        """The same for each of some boxes."""
        each = self._survey.load_nbytes / max(1, self._survey.shapes)
        needed: NDArray[np.int64] = OPEN_NBYTES + np.ceil(self.count(boxes) * each).astype(np.int64)
        return needed

    def parts(self, tile: Tile) -> list[Box]:
        """The boxes in which a tile is answered, so that each stays within the limit.

        Raises:
            TileError: a part would exceed the limit although it is 64 times as narrow as the tile.
            OSError, DataError: as `count`.
        """
        boxes, done = [self.box(tile)], []
        if self.limit is None:
            return boxes
        for level in range(MOST_HALVINGS + 1):
            fits = (self.estimate_boxes(boxes) <= self.limit).tolist()
            done += [box for box, fit in zip(boxes, fits) if fit]
            boxes = [box for box, fit in zip(boxes, fits) if not fit]
            if not boxes:
                return done
            boxes = [half for box in boxes for half in _halve(box, level % 2)]
        raise TileError(f"{self.describe(tile)}: a small part of it exceeds the limit of {self.limit:,} bytes")

    def describe(self, tile: Tile) -> str:
        """The file, the tile and where it lies, for messages."""
        xmin, ymin, xmax, ymax = self.box(tile)
        return (
            f"{self.path}: tile {tile[0]}, {tile[1]} "
            f"(x {xmin:.10g} to {xmax:.10g}, y {ymin:.10g} to {ymax:.10g})"
        )

    @property
    def _survey(self) -> Survey:
        assert self.survey is not None
        return self.survey


def _halve(box: Box, axis: int) -> list[Box]:
    """The two halves, cut across x or across y."""
    xmin, ymin, xmax, ymax = box
    if axis == 0:
        x = (xmin + xmax) / 2
        return [(xmin, ymin, x, ymax), (x, ymin, xmax, ymax)]
    y = (ymin + ymax) / 2
    return [(xmin, y, xmax, ymax), (xmin, ymin, xmax, y)]


def _to_path(path: Path) -> str:
    """A path that a worker in another folder finds, too. What is no file here stays as it is."""
    name = os.fspath(path)
    return os.path.abspath(name) if os.path.exists(name) else name
