"""What the package takes for an array."""

from __future__ import annotations

from typing import Any

import numpy as np
from numpy.typing import ArrayLike, NDArray

FloatArray = NDArray[np.float64]


def to_numbers(name: str, value: ArrayLike, kinds: str, what: str) -> NDArray[Any]:
    """Makes an array of any shape. Raises ValueError unless its dtype is of one of the kinds."""
    try:
        array = np.asarray(value)
    except ValueError as failure:
        raise ValueError(f"{name}: expected an array of {what}: {failure}") from None
    if array.dtype.kind not in kinds:
        raise ValueError(f"{name}: expected an array of {what}, got dtype {array.dtype}")
    return array


def to_floats(name: str, value: ArrayLike) -> FloatArray:
    """Makes a contiguous `float64` array; one that is so already is not copied."""
    array = to_numbers(name, value, "fiu", "numbers")
    return np.require(array, dtype=np.float64, requirements="C")


def to_coordinates(name: str, value: ArrayLike, width: int) -> FloatArray:
    """The same of an array whose last axis has `width` coordinates."""
    array = to_floats(name, value)
    if array.ndim == 0 or array.shape[-1] != width:
        raise ValueError(f"{name}: expected shape (..., {width}), got {array.shape}")
    return array


def to_rows(name: str, value: ArrayLike, width: int) -> FloatArray:
    """The same of an array of two axes, whose numbers must be finite."""
    array = to_coordinates(name, value, width)
    if array.ndim != 2:
        raise ValueError(f"{name}: expected shape (n, {width}), got {array.shape}")
    if not np.isfinite(array).all():
        row = int(np.argmin(np.isfinite(array).all(axis=1)))
        raise ValueError(f"{name}: row {row} is not finite: {array[row].tolist()}")
    return array


def to_triangles(value: ArrayLike, point_count: int) -> NDArray[np.uint32]:
    """Makes rows of three vertex numbers, each below `point_count`."""
    array = np.asarray(value) if np.size(value) == 0 else to_numbers("triangles", value, "iu", "integers")
    if array.shape == (0,):
        array = array.reshape(0, 3)
    if array.ndim != 2 or array.shape[1] != 3:
        raise ValueError(f"triangles: expected shape (m, 3), got {array.shape}")
    bad = (array < 0) | (array >= point_count)
    if bad.any():
        row = int(np.argmax(bad.any(axis=1)))
        raise ValueError(
            f"triangles: row {row} names a point that is not there: {array[row].tolist()}, "
            f"of {point_count} points"
        )
    return np.require(array, dtype=np.uint32, requirements="C")


def to_bounds(name: str, value: ArrayLike) -> tuple[float, float, float, float]:
    """Makes xmin, ymin, xmax, ymax, finite and in order."""
    array = to_floats(name, value)
    if array.shape != (4,):
        raise ValueError(f"{name}: expected (xmin, ymin, xmax, ymax), got shape {array.shape}")
    xmin, ymin, xmax, ymax = array.tolist()
    if not (np.isfinite(array).all() and xmin <= xmax and ymin <= ymax):
        raise ValueError(
            f"{name}: expected finite xmin <= xmax and ymin <= ymax, got {array.tolist()}"
        )
    return xmin, ymin, xmax, ymax


def to_position(name: str, value: ArrayLike) -> tuple[float, float]:
    """Makes x and y, finite."""
    array = to_floats(name, value)
    if array.shape != (2,) or not np.isfinite(array).all():
        raise ValueError(f"{name}: expected two finite numbers, got {value!r}")
    return float(array[0]), float(array[1])


def to_positive(name: str, value: float) -> float:
    """Makes a finite number above 0."""
    array = to_floats(name, value)
    if array.ndim != 0 or not (np.isfinite(array) and array > 0):
        raise ValueError(f"{name}: expected a finite number above 0, got {value!r}")
    return float(array)


def to_thread_count(value: int) -> int:
    """Makes a number of threads; 0 stands for all."""
    if not isinstance(value, (int, np.integer)) or not 0 <= value <= 65536:
        raise ValueError(f"threads: expected an integer from 0 to 65536, got {value!r}")
    return int(value)
