"""Surfaces from files."""

from __future__ import annotations

import os
import warnings
from typing import NamedTuple, Optional, Union

from numpy.typing import ArrayLike

from . import _native
from ._arrays import to_bounds, to_position
from ._surface import Surface

Path = Union[str, "os.PathLike[str]"]


class DataWarning(UserWarning):
    """Something in a file was left out, or is not as it should be."""


class NothingRead(_native.DataError):
    """No polygon of the layer or window gave a triangle."""


class Survey(NamedTuple):
    path: str
    layer: int
    shapes: int
    bounds: tuple[float, float, float, float]
    heights: tuple[float, float]
    crs: Optional[str]
    load_nbytes: int
    surface_nbytes: int


def survey(path: Path, layer: Optional[int] = None, *, progress: object = None) -> Survey:
    each = layers(path)[(layer or 1) - 1]
    return Survey(os.fspath(path), each.number, *each[2:])


class Layer(NamedTuple):
    """What one layer of a file is, before a load."""

    number: int
    """Number of the layer from 1 on, as `read` takes it."""
    refusal: str
    """Why no surface can be read from it; empty if one can. The fields below then mean nothing."""
    shapes: int
    """Number of polygons; triangles, if each polygon is one."""
    bounds: tuple[float, float, float, float]
    """xmin, ymin, xmax, ymax in map coordinates."""
    heights: tuple[float, float]
    """Lowest and highest height as stored."""
    crs: Optional[str]
    """CRS as WKT; None if there is none."""
    load_nbytes: int
    """Estimated bytes that a load of the whole layer takes while it runs, for a layer of triangles."""
    surface_nbytes: int
    """Estimated bytes of the surface."""


def read(
    path: Path,
    layer: Optional[int] = None,
    *,
    source: str = "other",
    output: Optional[str] = None,
    window: Optional[ArrayLike] = None,
    base: Optional[ArrayLike] = None,
    offset: float = 0.0,
    scale: float = 1.0,
    survey: Optional[Survey] = None,
) -> Surface:
    """Reads a surface from a layer of polygons.

    Args:
        path: file of any format that the library reads.
        layer: number of the layer from 1 on; None for the first with polygons.
        source: vertical datum of the stored heights: "orthometric", "ellipsoidal" or "other".
        output: vertical datum of the answers; None for that of the source.
        window: xmin, ymin, xmax, ymax in map coordinates: only polygons that meet it are loaded, whole.
        offset, scale: a stored height h counts as (h + offset) * scale.

    Raises:
        OSError: the file cannot be opened.
        DataError: the layer holds no polygons, no polygon gave a triangle, or heights cannot be
            converted.

    Warns:
        DataWarning: for example for a polygon that was left out.

    >>> surface = read("data/jacksboro.gpkg")
    >>> len(surface.triangles)
    17619
    """
    if layer is not None and (not isinstance(layer, int) or layer < 1):
        raise ValueError(f"layer: expected an integer from 1 on, got {layer!r}")
    texts: list[str] = []
    try:
        native, crs = _native.read(
            _to_file(path),
            layer or 0,
            _to_datum("source", source),
            _to_datum("output", source if output is None else output),
            None if window is None else to_bounds("window", window),
            None if base is None else to_position("base", base),
            offset,
            scale,
            texts,
        )
    finally:
        _warn(texts)
    if native is None:
        raise NothingRead(f"{os.fspath(path)}: no polygon of the layer or window gave a triangle")
    return Surface._wrap(native, crs, source if output is None else output)


def layers(path: Path) -> list[Layer]:
    """Lists the layers of a file with what is known of each before a load.

    Raises:
        OSError: the file cannot be opened.

    >>> [(each.number, each.shapes) for each in layers("data/jacksboro.gpkg")]
    [(1, 17619)]
    """
    texts: list[str] = []
    try:
        facts = _native.layers(_to_file(path), texts)
    finally:
        _warn(texts)
    return [
        Layer(
            each.number,
            each.refusal,
            each.shapes,
            (each.box[0], each.box[1], each.box[3], each.box[4]),
            (each.box[2], each.box[5]),
            each.crs,
            each.load_nbytes,
            each.surface_nbytes,
        )
        for each in facts
    ]


def _to_file(path: Path) -> str:
    name = os.fspath(path)
    if not isinstance(name, str) or "\0" in name:
        raise ValueError(f"path: expected a text without a zero byte, got {path!r}")
    return name


def _to_datum(name: str, value: str) -> _native.Datum:
    datum = _native.Datum.__members__.get(value) if isinstance(value, str) else None
    if datum is None:
        raise ValueError(f'{name}: expected "orthometric", "ellipsoidal" or "other", got {value!r}')
    return datum


def _warn(texts: list[str]) -> None:
    for text in texts:
        warnings.warn(text, DataWarning, stacklevel=3)
