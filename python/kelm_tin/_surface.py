"""The surface and its queries."""

from __future__ import annotations

import math
from typing import Any, NamedTuple, Optional

import numpy as np
from numpy.typing import ArrayLike, NDArray

from . import _native
from ._arrays import (
    FloatArray,
    to_bounds,
    to_coordinates,
    to_floats,
    to_positive,
    to_rows,
    to_thread_count,
    to_triangles,
)
from ._relief import make_png

Heights = NDArray[np.float32]


class Profile(NamedTuple):
    """Heights along a line. Four arrays of one length."""

    stations: FloatArray
    """Distance from the start of the line, in map units."""
    x: FloatArray
    y: FloatArray
    heights: Heights
    """NaN off the surface."""


class Raster(NamedTuple):
    """Cells with the heights at their centres, and where they lie."""

    heights: Heights
    """Rows from north to south, columns from west to east; NaN off the surface."""
    transform: tuple[float, float, float, float, float, float]
    """a, b, c, d, e, f as rasterio's `Affine` has them: x = a * column + b * row + c and
    y = d * column + e * row + f give the north-western corner of a cell."""


class Surface:
    """Triangles over scattered points. A surface does not change, and any thread may ask it.

    Args:
        points: (n, 3) map coordinates x, y and height, any dtype of numbers, finite.
        triangles: (m, 3) integers, each the number of a point.
        base: x and y of the local origin; None for the middle of the points, in whole units. Points
            are kept as `float32` relative to it.

    Raises:
        ValueError: an array of another shape or dtype; a point that is not finite; a number of no
            point.

    >>> surface = Surface([[0, 0, 5], [10, 0, 7], [0, 10, 9]], [[0, 1, 2]])
    >>> surface
    <kelm_tin.Surface: 1 triangle, 3 points, x 0 to 10, y 0 to 10, heights 5 to 9, datum other>
    """

    __slots__ = ("_native", "_crs", "_datum", "__weakref__")

    def __init__(
        self, points: ArrayLike, triangles: ArrayLike, base: Optional[ArrayLike] = None
    ) -> None:
        rows = to_rows("points", points, 3)
        numbers = to_triangles(triangles, len(rows))
        if max(len(rows), len(numbers)) >= 2**31:
            raise ValueError(f"points, triangles: at most 2147483647 each, got {len(rows)}, {len(numbers)}")
        origin = _make_base(rows, base)
        local = _narrow(rows, origin)
        self._set(_native.Surface(local, numbers, *origin), None, "other")

    def _set(self, native: _native.Surface, crs: Optional[str], datum: str) -> None:
        self._native = native
        self._crs = crs
        self._datum = datum

    @classmethod
    def _wrap(cls, native: _native.Surface, crs: Optional[str], datum: str) -> Surface:
        surface = cls.__new__(cls)
        surface._set(native, crs, datum)
        return surface

    @classmethod
    def from_points(cls, points: ArrayLike, base: Optional[ArrayLike] = None) -> Surface:
        """Makes the Delaunay triangles of points in plan, by scipy.

        Args:
            points, base: as for `Surface`. Of points at one place scipy keeps one.

        Raises:
            ImportError: scipy is not installed.
            ValueError: fewer than three points, or all on one line.

        >>> Surface.from_points([[0, 0, 5], [10, 0, 7], [0, 10, 9], [10, 10, 8]]).triangles.shape
        (2, 3)
        """
        from scipy.spatial import Delaunay, QhullError  # type: ignore[import]

        rows = to_rows("points", points, 3)
        origin = _make_base(rows, base)
        try:
            triangles = Delaunay(rows[:, :2] - origin).simplices
        except (QhullError, ValueError) as failure:
            raise ValueError(f"points: no triangles: {str(failure).strip().splitlines()[0]}") from None
        return cls(rows, triangles, origin)

    @property
    def points(self) -> Heights:
        """(n, 3) `float32`, relative to `base` in x and y. A read-only view: it copies nothing and
        keeps the surface alive."""
        return self._native.points

    @property
    def triangles(self) -> NDArray[np.uint32]:
        """(m, 3) numbers of points. A read-only view of a list that is made at first use."""
        return self._native.triangles

    @property
    def base(self) -> tuple[float, float]:
        """Map coordinates of the local origin."""
        return self._native.base

    @property
    def bounds(self) -> tuple[float, float, float, float]:
        """xmin, ymin, xmax, ymax of all points, in map coordinates."""
        box = self._native.box
        return box[0], box[1], box[3], box[4]

    @property
    def nbytes(self) -> int:
        """Bytes of the surface and of the indexes that queries have built so far."""
        return self._native.nbytes

    @property
    def crs(self) -> Optional[str]:
        """CRS of the layer as WKT; None if it has none, or if the surface is made from arrays. It has no
        vertical part if the heights are not as stored: after a change of datum, an offset or a scale."""
        return self._crs

    @property
    def datum(self) -> str:
        """Vertical datum of the heights: "orthometric", "ellipsoidal" or "other"."""
        return self._datum

    def map_points(self) -> FloatArray:
        """The points in map coordinates: a new (n, 3) array of `float64`."""
        points = self.points.astype(np.float64)
        points[:, :2] += self.base
        return points

    def heights(
        self, x: ArrayLike, y: Optional[ArrayLike] = None, *, closed: bool = False, threads: int = 0
    ) -> Heights:
        """The greatest height of the triangles at each position. The first call builds an index.

        Args:
            x, y: map coordinates of any shapes that broadcast; or `x` alone with shape (..., 2).
            closed: give a position on an edge a height even if rounding puts it beside both triangles.
            threads: most threads; 0 for all.

        Returns:
            `float32` of the shape of the positions; NaN off the surface.

        Raises:
            ValueError: an array of another shape or dtype.

        >>> surface = Surface([[0, 0, 5], [10, 0, 7], [0, 10, 9]], [[0, 1, 2]])
        >>> surface.heights([0.0, 5.0, 9.0], 1.0)
        array([5.4, 6.4, 7.2], dtype=float32)
        >>> surface.heights(1.0, 1.0)
        5.6
        """
        if isinstance(x, float) and isinstance(y, float):
            return np.float32(self._native.height(x, y, closed))  # type: ignore[return-value]
        positions = to_coordinates("x", x, 2) if y is None else _join(x, y)
        found = self._native.heights(positions.reshape(-1, 2), to_thread_count(threads), closed)
        return found.reshape(positions.shape[:-1])[()]

    def crossings(self, a: ArrayLike, b: ArrayLike, *, threads: int = 0) -> Heights:
        """The highest crossing of each segment with the surface, as the segment's height there.

        Args:
            a, b: ends, map coordinates and heights, of any shapes (..., 3) that broadcast.
            threads: most threads; 0 for all.

        Returns:
            `float32` of the shape of the segments; NaN for a segment that crosses nothing.

        >>> surface = Surface([[0, 0, 5], [10, 0, 5], [0, 10, 5]], [[0, 1, 2]])
        >>> surface.crossings([[1, 1, 9], [1, 1, 9]], [[1, 2, 1], [1, 2, 8]])
        array([ 5., nan], dtype=float32)
        """
        starts, ends = _broadcast(to_coordinates("a", a, 3), to_coordinates("b", b, 3), "a, b")
        segments = np.concatenate((starts, ends), axis=-1).reshape(-1, 6)
        found = self._native.crossings(segments, to_thread_count(threads))
        return found.reshape(starts.shape[:-1])[()]

    def visible(
        self, eye: ArrayLike, targets: ArrayLike, *, clearance: float = 0.01, threads: int = 0
    ) -> NDArray[np.bool_]:
        """Tells for each target whether the straight line from the eye to it is free.

        A line is straight in map coordinates: it knows no curvature of the earth and no refraction.

        Args:
            eye, targets: map coordinates and heights, of any shapes (..., 3) that broadcast.
            clearance: both ends are raised by this much, so that ground does not hide what stands on it.
            threads: most threads; 0 for all.

        Returns:
            bool of the shape of the lines. False for a target below the surface, and for NaN.

        >>> surface = Surface([[0, 0, 5], [10, 0, 5], [0, 10, 5]], [[0, 1, 2]])
        >>> surface.visible([1, 1, 9], [[1, 2, 5], [1, 2, 4]])
        array([ True, False])
        """
        start, end = _broadcast(
            to_coordinates("eye", eye, 3), to_coordinates("targets", targets, 3), "eye, targets"
        )
        lift = np.array([0.0, 0.0, clearance])
        start, end = start + lift, end + lift
        free = np.isnan(self.crossings(start, end, threads=threads))
        ground = self.heights(end[..., :2], closed=True, threads=threads)
        known = np.isfinite(start).all(axis=-1) & np.isfinite(end).all(axis=-1)
        return np.asarray(known & free & ~(ground > end[..., 2]))[()]

    def profile(
        self, line: ArrayLike, step: float, *, closed: bool = False, threads: int = 0
    ) -> Profile:
        """Heights along a line: at its points and, between them, at stations at most a step apart.

        Args:
            line: (n, 2) map coordinates of two points or more.
            step: greatest distance between stations, in map units.

        >>> surface = Surface([[0, 0, 5], [10, 0, 7], [0, 10, 9]], [[0, 1, 2]])
        >>> surface.profile([[1, 1], [5, 1]], 2).heights
        array([5.6, 6. , 6.4], dtype=float32)
        """
        points = to_rows("line", line, 2)
        if len(points) < 2:
            raise ValueError(f"line: expected two points or more, got {len(points)}")
        stations, xy = _place_stations(points, to_positive("step", step))
        heights = self.heights(xy, closed=closed, threads=threads)
        return Profile(stations, xy[:, 0], xy[:, 1], heights)

    def raster(
        self,
        bounds: Optional[ArrayLike] = None,
        cell: float = 10.0,
        *,
        closed: bool = False,
        threads: int = 0,
    ) -> Raster:
        """Cells that hold the height at their centre, to the bit as `heights` tells it.

        Args:
            bounds: xmin, ymin, xmax, ymax. Cells begin in the north-western corner and cover all. None
                for the bounds of the surface, widened to whole multiples of the cell.
            cell: side of a cell, in map units.

        >>> surface = Surface([[0, 0, 5], [10, 0, 7], [0, 10, 9]], [[0, 1, 2]])
        >>> cells, transform = surface.raster(cell=5)
        >>> cells
        array([[8.5, nan],
               [6.5, 7.5]], dtype=float32)
        >>> transform
        (5.0, 0.0, 0.0, 0.0, -5.0, 10.0)
        """
        side = to_positive("cell", cell)
        xmin, ymin, xmax, ymax = (
            _widen(self.bounds, side) if bounds is None else to_bounds("bounds", bounds)
        )
        columns, rows = _count_cells(xmax - xmin, side), _count_cells(ymax - ymin, side)
        heights = self._native.rasterize(
            columns, rows, (xmin, side, 0.0, ymax, 0.0, -side), to_thread_count(threads), closed
        )
        return Raster(heights, (side, 0.0, xmin, 0.0, -side, ymax))

    def subset(self, bounds: ArrayLike) -> Optional[Surface]:
        """A new surface of the triangles of which an edge meets the bounds.

        Args:
            bounds: xmin, ymin, xmax, ymax in map coordinates.

        Returns:
            None if there is no such triangle.
        """
        return self._part(self._native.subset(to_bounds("bounds", bounds)))

    def along(self, line: ArrayLike) -> Optional[Surface]:
        """A new surface of the triangles that a line touches in plan.

        Args:
            line: (n, 2) map coordinates.

        Returns:
            None if there is no such triangle.
        """
        return self._part(self._native.along(to_rows("line", line, 2)))

    def _part(self, native: Optional[_native.Surface]) -> Optional[Surface]:
        return None if native is None else Surface._wrap(native, self._crs, self._datum)

    def __copy__(self) -> Surface:
        return Surface._wrap(self._native, self._crs, self._datum)

    def __deepcopy__(self, memo: Any) -> Surface:
        return _restore(*self.__reduce__()[1])

    def __reduce__(self) -> tuple[Any, tuple[Any, ...]]:
        return _restore, (self.points, self.triangles, self.base, self._crs, self._datum)

    def __repr__(self) -> str:
        box = self._native.box
        triangles, points = len(self.triangles), len(self.points)
        return (
            f"<kelm_tin.Surface: {triangles:,} triangle{'s'[: triangles != 1]}, {points:,} points, "
            f"x {box[0]:.10g} to {box[3]:.10g}, y {box[1]:.10g} to {box[4]:.10g}, "
            f"heights {box[2]:g} to {box[5]:g}, datum {self._datum}>"
        )

    def _repr_png_(self) -> Optional[bytes]:
        return make_png(self)


def _restore(
    points: Heights,
    triangles: NDArray[np.uint32],
    base: tuple[float, float],
    crs: Optional[str],
    datum: str,
) -> Surface:
    """Makes a surface of its own arrays, to the bit. They may come from a file: numbers are tested."""
    numbers = to_triangles(triangles, len(points))
    return Surface._wrap(_native.Surface(np.ascontiguousarray(points), numbers, *base), crs, datum)


def _make_base(points: FloatArray, base: Optional[ArrayLike]) -> tuple[float, float]:
    if base is None:
        if len(points) == 0:
            return 0.0, 0.0
        low, high = points[:, :2].min(axis=0), points[:, :2].max(axis=0)
        x, y = np.floor(low / 2 + high / 2).tolist()
        return x, y
    array = to_floats("base", base)
    if array.shape != (2,) or not np.isfinite(array).all():
        raise ValueError(f"base: expected two finite numbers, got {base!r}")
    return float(array[0]), float(array[1])


def _narrow(points: FloatArray, base: tuple[float, float]) -> Heights:
    local = points.copy()
    local[:, :2] -= base
    with np.errstate(over="ignore"):
        narrow = local.astype(np.float32)
    if not np.isfinite(narrow).all():
        row = int(np.argmin(np.isfinite(narrow).all(axis=1)))
        raise ValueError(f"points: row {row} is too large for float32: {points[row].tolist()}")
    return narrow


def _broadcast(a: FloatArray, b: FloatArray, names: str) -> tuple[FloatArray, FloatArray]:
    try:
        first, second = np.broadcast_arrays(a, b)
    except ValueError:
        raise ValueError(f"{names}: shapes {a.shape} and {b.shape} do not broadcast") from None
    return first, second


def _join(x: ArrayLike, y: ArrayLike) -> FloatArray:
    first, second = _broadcast(to_floats("x", x), to_floats("y", y), "x, y")
    return np.stack((first, second), axis=-1)


def _place_stations(points: FloatArray, step: float) -> tuple[FloatArray, FloatArray]:
    lengths = np.hypot(*np.diff(points, axis=0).T)
    parts = np.maximum(1, np.ceil(lengths / step))
    if not parts.sum() < 1e9:
        raise ValueError(f"step: {step!r} gives more than a thousand million stations")
    counts = parts.astype(np.int64)
    leg = np.repeat(np.arange(len(counts)), counts)
    number = np.arange(len(leg)) - np.repeat(np.cumsum(counts) - counts, counts) + 1
    share = (number / counts[leg])[:, np.newaxis]
    xy = points[leg] * (1 - share) + points[leg + 1] * share
    start = np.concatenate(([0.0], np.cumsum(lengths)))
    stations = start[leg] + lengths[leg] * share[:, 0]
    return np.concatenate(([0.0], stations)), np.concatenate((points[:1], xy))


def _widen(
    bounds: tuple[float, float, float, float], side: float
) -> tuple[float, float, float, float]:
    xmin, ymin, xmax, ymax = bounds
    return (
        math.floor(xmin / side) * side,
        math.floor(ymin / side) * side,
        math.ceil(xmax / side) * side,
        math.ceil(ymax / side) * side,
    )


def _count_cells(width: float, side: float) -> int:
    """Cells of the side that cover a width; a rest of a millionth of a cell is rounding."""
    count = max(1, math.ceil(width / side - 1e-6))
    if count >= 2**31:
        raise ValueError(f"cell: {side!r} gives more than 2147483647 cells on a side")
    return count
