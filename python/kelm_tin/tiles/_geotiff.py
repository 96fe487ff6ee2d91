"""A raster of tiles as a GeoTIFF."""

from __future__ import annotations

import os
from collections import deque
from contextlib import contextmanager
from typing import Any, Callable, Iterator, NamedTuple, Optional

import numpy as np

from .._reading import Path
from ._dask import compute, from_array, get_scheduler
from ._raster import Transform

GROUP = 8
"""Chunks that are computed together. On a cluster the next group runs while one is written."""
CACHE = 1 << 26
"""Bytes of blocks that GDAL may keep at least. By itself it keeps a twentieth of the machine's memory."""
SMALLEST_OVERVIEW = 256
MOST_BLOCK = 512
OPTIONS = {"TILED": "YES", "COMPRESS": "DEFLATE", "BIGTIFF": "IF_SAFER"}
Blocks = Iterator[tuple[int, int, Any]]
"""First row, first column and cells of a block."""


class Sheet(NamedTuple):
    """What a file is made for."""

    rows: int
    columns: int
    dtype: Any
    chunk: int
    """Rows of a chunk."""
    side: int
    """Cells on a side of a block in the file."""
    transform: Transform
    crs: Optional[str]
    nodata: Optional[float]

    def options(self) -> dict[str, str]:
        predictor = "3" if self.dtype.kind == "f" else "2"
        side = str(self.side)
        return {**OPTIONS, "PREDICTOR": predictor, "BLOCKXSIZE": side, "BLOCKYSIZE": side}

    def cache(self) -> int:
        """Bytes of blocks that GDAL may keep. A block that lies in two rows of chunks must stay for both: else
        it is written twice, and takes its place in the file twice."""
        row = self.chunk * self.columns * int(self.dtype.itemsize)
        return CACHE if self.chunk % self.side == 0 else CACHE + 2 * row

    def resampling(self) -> str:
        """How overviews are made. Whole numbers can be kinds, of which there is no mean."""
        return "average" if self.dtype.kind == "f" else "nearest"

    def overviews(self) -> list[int]:
        levels: list[int] = []
        while max(self.rows, self.columns) >> len(levels) > SMALLEST_OVERVIEW:
            levels.append(2 << len(levels))
        return levels


def write_geotiff(
    array: Any,
    path: Path,
    *,
    transform: Optional[Transform] = None,
    crs: Optional[str] = None,
    nodata: Optional[float] = None,
) -> None:
    """Computes a raster chunk by chunk and writes it: tiled, compressed, with overviews.

    Some chunks are in memory at a time, at most two rows of them, however large the raster is. The file
    appears under its name when it is whole. Needs rasterio or GDAL's Python module.

    Args:
        array: what `raster` gave, or a dask or numpy array of two axes computed from it. Truth values are
            written as 0 and 1.
        path: the file; one that is there is replaced.
        transform, crs: where the cells lie; None for those of the array. A transform is
            (side, 0, western edge, 0, -side, northern edge), as `raster` gives it and as rasterio's
            `Affine` has it. GDAL's order is another one.
        nodata: value of cells that hold nothing; None for NaN in an array of floats, and for none in others.

    Raises:
        ValueError: the array has not two axes, or it is not known where its cells lie; the transform is
            rotated, as one in GDAL's order seems to be.
        TileError: a tile could not be answered. No file is left.
        ImportError: neither rasterio nor GDAL's Python module is there.
        OSError: the file cannot be written.
    """
    where = getattr(array, "transform", None) if transform is None else transform
    if array.ndim != 2 or where is None:
        raise ValueError(f"array: expected two axes and a transform, got shape {array.shape}, {where}")
    if where[1] != 0 or where[3] != 0:
        raise ValueError(f"transform: expected (side, 0, left, 0, -side, top), got {tuple(where)}")
    crs = getattr(array, "crs", None) if crs is None else crs
    array = _to_chunks(array)
    if nodata is None and array.dtype.kind == "f":
        nodata = np.nan
    (rows, columns), chunk = array.shape, array.chunks[0][0]
    sheet = Sheet(rows, columns, array.dtype, chunk, _find_side(chunk), where, crs, nodata)
    write = _find_writer()
    with _whole_or_not_at_all(os.fspath(path)) as name:
        write(name, sheet, _compute_blocks(array))


def _to_chunks(array: Any) -> Any:
    """A dask array of numbers that a GeoTIFF can hold."""
    if not hasattr(array, "chunks"):
        array = from_array(array, chunks=4 * MOST_BLOCK)
    return array.astype(np.uint8) if array.dtype == bool else array


def _find_side(count: int) -> int:
    """A side of blocks that divides the chunks, so that no block is written twice. Must be a multiple of
    16."""
    sides = range(MOST_BLOCK, 127, -16)
    return next((side for side in sides if count % side == 0), 256)


def _find_writer() -> Callable[[str, Sheet, Blocks], None]:
    try:
        import rasterio  # type: ignore[import]  # noqa: F401

        return _write_by_rasterio
    except ImportError:
        from osgeo import gdal  # type: ignore[import]  # noqa: F401

        return _write_by_gdal


@contextmanager
def _whole_or_not_at_all(path: str) -> Iterator[str]:
    folder, name = os.path.split(path)
    part = os.path.join(folder, f".{name}.{os.getpid()}.part")
    try:
        yield part
        os.replace(part, path)
    finally:
        if os.path.exists(part):
            os.remove(part)


def _compute_blocks(array: Any) -> Blocks:
    blocks = array.to_delayed().ravel().tolist()
    rows, columns = (np.cumsum((0, *sizes))[:-1].tolist() for sizes in array.chunks)
    places = [(row, column) for row in rows for column in columns]
    for first, cells in enumerate(_compute_in_order(blocks)):
        yield (*places[first], cells)


def _compute_in_order(blocks: list[Any]) -> Iterator[Any]:
    groups = [blocks[i : i + GROUP] for i in range(0, len(blocks), GROUP)]
    client = getattr(get_scheduler(), "__self__", None)
    if client is None:
        for group in groups:
            yield from compute(*group)
        return
    running: deque[Any] = deque()
    for group in groups:
        running.append(client.compute(group))
        if len(running) > 1:
            yield from client.gather(running.popleft())
    for futures in running:
        yield from client.gather(futures)


@contextmanager
def _small_cache(most: int, get: Callable[[], Any], set_to: Callable[[int], Any]) -> Iterator[None]:
    """The cache of GDAL is the process's: it becomes as large as before in the end."""
    before = get()
    set_to(min(before, most))
    try:
        yield
    finally:
        set_to(before)


def _write_by_rasterio(name: str, sheet: Sheet, blocks: Blocks) -> None:
    import rasterio
    from rasterio.env import get_gdal_config, set_gdal_config  # type: ignore[import]

    key = "GDAL_CACHEMAX"
    get, set_to = lambda: get_gdal_config(key), lambda size: set_gdal_config(key, size)
    with rasterio.Env(), _small_cache(sheet.cache(), get, set_to):
        _write_within_cache(name, sheet, blocks)


def _write_within_cache(name: str, sheet: Sheet, blocks: Blocks) -> None:
    import rasterio
    from rasterio.enums import Resampling  # type: ignore[import]
    from rasterio.windows import Window  # type: ignore[import]

    with rasterio.open(
        name,
        "w",
        driver="GTiff",
        width=sheet.columns,
        height=sheet.rows,
        count=1,
        dtype=sheet.dtype.name,
        crs=sheet.crs,
        transform=rasterio.Affine(*sheet.transform),
        nodata=sheet.nodata,
        **sheet.options(),
    ) as file:
        for row, column, cells in blocks:
            file.write(cells, 1, window=Window(column, row, cells.shape[1], cells.shape[0]))
    with rasterio.open(name, "r+") as file:
        file.build_overviews(sheet.overviews(), Resampling[sheet.resampling()])


def _write_by_gdal(name: str, sheet: Sheet, blocks: Blocks) -> None:
    from osgeo import gdal, gdal_array

    with _exceptions_of(gdal), _small_cache(sheet.cache(), gdal.GetCacheMax, gdal.SetCacheMax):
        kind = gdal_array.NumericTypeCodeToGDALTypeCode(sheet.dtype)
        options = [f"{key}={value}" for key, value in sheet.options().items()]
        file = gdal.GetDriverByName("GTiff").Create(name, sheet.columns, sheet.rows, 1, kind, options)
        a, b, c, d, e, f = sheet.transform
        file.SetGeoTransform((c, a, b, f, d, e))
        if sheet.crs is not None:
            file.SetProjection(sheet.crs)
        band = file.GetRasterBand(1)
        if sheet.nodata is not None:
            band.SetNoDataValue(sheet.nodata)
        for row, column, cells in blocks:
            # GDAL's module crashes on cells that share one place in memory, as constants do.
            band.WriteArray(np.ascontiguousarray(cells), column, row)
        file.FlushCache()
        file.BuildOverviews(sheet.resampling(), sheet.overviews())
        del band, file


@contextmanager
def _exceptions_of(gdal: Any) -> Iterator[None]:
    """Errors of GDAL become exceptions here, and afterwards what the program has chosen."""
    before = gdal.GetUseExceptions()
    gdal.UseExceptions()
    try:
        yield
    finally:
        if not before:
            gdal.DontUseExceptions()
