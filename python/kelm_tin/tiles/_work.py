"""What a worker does for a tile. It keeps nothing between tiles."""

from __future__ import annotations

from contextlib import contextmanager
from typing import Iterator, NamedTuple, Optional

import numpy as np

from .._arrays import FloatArray
from .._reading import NothingRead, read
from .._surface import Heights, Surface
from ._plan import NO_TILE, Box, Plan, Tile, TileError


class Frame(NamedTuple):
    """The cells of a raster over all tiles, and the rule for its edges."""

    cell: float
    side: int
    """Cells on a side of a tile."""
    closed: bool


def fill_cells(plan: Plan, frame: Frame, tile: Tile) -> Heights:
    """The heights of the cells of one tile: (side, side) `float32`, NaN off the surface."""
    x, y = plan.origin
    numbers = np.arange(frame.side) + 0.5
    xs = x + (tile[1] * frame.side + numbers) * frame.cell
    ys = y - (tile[0] * frame.side + numbers) * frame.cell
    cells = make_empty(frame.side)
    with _named(plan, tile):
        for box in plan.parts(tile):
            columns = slice(*np.searchsorted(xs, (box[0], box[2])))
            rows = slice(*np.searchsorted(-ys, (-box[3], -box[1])))
            surface = _load(plan, tile, box)
            if surface is not None:
                cells[rows, columns] = _fill(surface, xs[columns], ys[rows], frame)
    return cells


def make_empty(side: int) -> Heights:
    """A tile without any height."""
    return np.full((side, side), np.nan, np.float32)


def _fill(surface: Surface, xs: FloatArray, ys: FloatArray, frame: Frame) -> Heights:
    """Walks the triangles if the raster call has the very centres of the frame. Else it asks for each."""
    if len(xs) == 0 or len(ys) == 0:
        return np.empty((len(ys), len(xs)), np.float32)
    cell = frame.cell
    west, north = xs[0] - 0.5 * cell, ys[0] + 0.5 * cell
    if np.array_equal(west + (np.arange(len(xs)) + 0.5) * cell, xs) and np.array_equal(
        north - (np.arange(len(ys)) + 0.5) * cell, ys
    ):
        bounds = (west, north - len(ys) * cell, west + len(xs) * cell, north)
        return surface.raster(bounds, cell, closed=frame.closed, threads=1).heights
    return surface.heights(xs[np.newaxis], ys[:, np.newaxis], closed=frame.closed, threads=1)


def answer(plan: Plan, closed: bool, number: int, pieces: list[FloatArray]) -> list[Heights]:
    """The heights of the positions of one tile, piece by piece."""
    xy = np.concatenate(pieces)
    heights = np.full(len(xy), np.nan, np.float32)
    if number != NO_TILE:
        row, column = divmod(number, plan.tiles[1])
        with _named(plan, (row, column)):
            _answer_parts(plan, closed, (row, column), xy, heights)
    return np.split(heights, np.cumsum([len(piece) for piece in pieces])[:-1])


def _answer_parts(plan: Plan, closed: bool, tile: Tile, xy: FloatArray, heights: Heights) -> None:
    """A position on the seam of two parts has the same triangles in both. One beyond the last tile is
    answered by the part beside it."""
    xmin, ymin, xmax, ymax = plan.box(tile)
    near = np.clip(xy, (xmin, ymin), (xmax, ymax))
    for box in plan.parts(tile):
        here = (near >= box[:2]).all(axis=1) & (near <= box[2:]).all(axis=1)
        surface = _load(plan, tile, box) if here.any() else None
        if surface is not None:
            heights[here] = surface.heights(xy[here], closed=closed, threads=1)


def _load(plan: Plan, tile: Tile, box: Box) -> Optional[Surface]:
    """None if no polygon meets the box."""
    try:
        return read(
            plan.path,
            plan.layer,
            source=plan.source,
            output=plan.output,
            window=plan.window(box),
            base=plan.base_of(tile),
            offset=plan.offset,
            scale=plan.scale,
            survey=plan.survey,
        )
    except NothingRead:
        return None


@contextmanager
def _named(plan: Plan, tile: Tile) -> Iterator[None]:
    try:
        yield
    except TileError:
        raise
    except Exception as failure:
        raise TileError(f"{plan.describe(tile)}: {type(failure).__name__}: {failure}") from failure
