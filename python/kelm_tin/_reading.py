"""Surfaces from files."""

from __future__ import annotations

import os
import warnings
from dataclasses import dataclass, field
from typing import Callable, NamedTuple, Optional, Union

from numpy.typing import ArrayLike

from . import _native
from ._arrays import to_bounds, to_position
from ._surface import Surface

Path = Union[str, "os.PathLike[str]"]
Progress = Callable[[int, int], object]
Facts = tuple[int, tuple[float, float, float, float], tuple[float, float], Optional[str], int, int]
"""What `Layer` and `Survey` have in common, from `shapes` to `surface_nbytes`."""


class DataWarning(UserWarning):
    """Something in a file was left out, or is not as it should be."""


class NothingRead(_native.DataError):
    """No polygon of the layer or window gave a triangle."""


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


@dataclass(frozen=True)
class Survey:
    """What one walk over a layer has found: `read` then opens the file without another walk.

    A plain value that pickles: a thousand processes can read windows of a file that one has surveyed. It
    holds for the file as it was: its name, sizes and times of change must be the same where it is read.
    """

    path: str
    layer: Optional[int]
    """Number of the layer as `survey` was given it; None for the first with polygons."""
    shapes: int
    bounds: tuple[float, float, float, float]
    heights: tuple[float, float]
    crs: Optional[str]
    load_nbytes: int
    surface_nbytes: int
    data: bytes = field(repr=False)
    """The survey itself, for `read`. Empty where a survey would save nothing."""


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
    progress: Optional[Progress] = None,
    survey: Optional[Survey] = None,
) -> Surface:
    """Reads a surface from a layer of polygons.

    Args:
        path: file of any format that the library reads.
        layer: number of the layer from 1 on; None for the first with polygons.
        source: vertical datum of the stored heights: "orthometric", "ellipsoidal" or "other".
        output: vertical datum of the answers; None for that of the source.
        window: xmin, ymin, xmax, ymax in map coordinates: only polygons that meet it are loaded, whole.
        base: x, y that the stored positions are relative to, in map coordinates; None for the first corner
            that is kept. Two windows read with one base have the same bits where they share polygons.
        offset, scale: a stored height h counts as (h + offset) * scale.
        progress: called with (done, total), some hundred times: done rises from 0 to total, which is 100.
            What it raises stops the read and is raised from here. So does Ctrl-C.
        survey: of this layer, from `survey`, so that the layer is not walked to open it.

    Raises:
        OSError: the file cannot be opened.
        DataError: the layer holds no polygons, heights cannot be converted, or the file was written to
            since its survey.
        NothingRead: no polygon of the layer or window gave a triangle. It is a DataError.

    Warns:
        DataWarning: for example for a polygon that was left out.

    >>> surface = read("data/jacksboro.gpkg")
    >>> len(surface.triangles)
    17619
    """
    texts: list[str] = []
    try:
        native, crs = _native.read(
            _to_file(path),
            _to_number(layer),
            to_datum("source", source),
            to_datum("output", source if output is None else output),
            None if window is None else to_bounds("window", window),
            None if base is None else to_position("base", base),
            offset,
            scale,
            b"" if survey is None else survey.data,
            progress,
            texts,
        )
    finally:
        _warn(texts)
    if native is None:
        raise NothingRead(f"{os.fspath(path)}: no polygon of the layer or window gave a triangle")
    if survey is not None and survey.data:
        crs = survey.crs
    datum = source if output is None else output
    return Surface._wrap(native, find_crs(crs, source, datum, offset, scale), datum)


def find_crs(crs: Optional[str], source: str, output: str, offset: float, scale: float) -> Optional[str]:
    """What of a layer's CRS holds of the answers: the horizontal part alone if heights are not as stored."""
    if crs is None or (output, offset, scale) == (source, 0, 1):
        return crs
    return _native.flatten_crs(crs)


def survey(path: Path, layer: Optional[int] = None, *, progress: Optional[Progress] = None) -> Survey:
    """Walks over a layer once and returns what it found.

    Args:
        path, layer, progress: as for `read`.

    Raises:
        OSError: the file cannot be opened.
        DataError: the layer holds no polygons.

    Warns:
        DataWarning: as `read` does. A read with the survey does not warn again of what the walk found.

    >>> found = survey("data/jacksboro.gpkg")
    >>> xmin, ymin, xmax, ymax = found.bounds
    >>> part = read("data/jacksboro.gpkg", window=(xmin, ymin, xmin + 1000, ymin + 1000), survey=found)
    """
    texts: list[str] = []
    try:
        facts, data = _native.survey(_to_file(path), _to_number(layer), progress, texts)
    finally:
        _warn(texts)
    return Survey(os.fspath(path), layer, *_to_facts(facts), data)


def count_shapes(
    path: Path, found: Survey, windows: list[tuple[float, float, float, float]]
) -> list[int]:
    """For each window a bound on the number of shapes that meet it, without a walk. Raises as `read`."""
    texts: list[str] = []
    try:
        return _native.count(_to_file(path), _to_number(found.layer), found.data, windows, texts)
    finally:
        _warn(texts)


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
    return [Layer(each.number, each.refusal, *_to_facts(each)) for each in facts]


def _to_file(path: Path) -> str:
    name = os.fspath(path)
    if not isinstance(name, str) or "\0" in name:
        raise ValueError(f"path: expected a text without a zero byte, got {path!r}")
    return name


def _to_number(layer: Optional[int]) -> int:
    if layer is None:
        return 0
    if not isinstance(layer, int) or layer < 1:
        raise ValueError(f"layer: expected an integer from 1 on, got {layer!r}")
    return layer


def _to_facts(facts: _native.LayerFacts) -> Facts:
    xmin, ymin, zmin, xmax, ymax, zmax = facts.box
    bounds, heights = (xmin, ymin, xmax, ymax), (zmin, zmax)
    return facts.shapes, bounds, heights, facts.crs, facts.load_nbytes, facts.surface_nbytes


def to_datum(name: str, value: str) -> _native.Datum:
    datum = _native.Datum.__members__.get(value) if isinstance(value, str) else None
    if datum is None:
        raise ValueError(f'{name}: expected "orthometric", "ellipsoidal" or "other", got {value!r}')
    return datum


def _warn(texts: list[str]) -> None:
    for text in texts:
        warnings.warn(text, DataWarning, stacklevel=3)
