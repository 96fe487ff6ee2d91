"""Tiles on Dask: the bits of the whole surface, whatever the tiles, the workers and their fate."""

import dataclasses
import os
import pathlib
import pickle
import subprocess
import sys
import time
from types import SimpleNamespace

import kelm_tin
import numpy as np
import pytest
from conftest import ROOT, TERRAIN

dask = pytest.importorskip("dask")
import dask.array as da  # noqa: E402
from kelm_tin import tiles  # noqa: E402
from kelm_tin.tiles import _work  # noqa: E402

BASE = (500000.25, 4649776.5)
CELL = 4.0


def make_country(folder, triangles):
    """A file of so many triangles with a coast, and the whole surface."""
    path = str(folder / "country.fgb")
    program = str(ROOT / "examples" / "python" / "country.py")
    subprocess.run([sys.executable, program, str(triangles), path], check=True, stdout=subprocess.DEVNULL)
    return path, kelm_tin.read(path, base=BASE)


@pytest.fixture(scope="module")
def country(tmp_path_factory):
    return make_country(tmp_path_factory.mktemp("country"), 40_000)


@pytest.fixture(scope="module")
def large_country(tmp_path_factory):
    return make_country(tmp_path_factory.mktemp("large"), 1_000_000)


@pytest.fixture(scope="module")
def cluster():
    distributed = pytest.importorskip("distributed")
    with distributed.LocalCluster(2, threads_per_worker=1, dashboard_address=None) as made:
        with distributed.Client(made) as client:
            yield client


def cells_of(surface, plan, cell=CELL):
    """The cells of all tiles, of the whole surface."""
    (x, y), (rows, columns) = plan.origin, plan.tiles
    bounds = (x, y - rows * plan.tile, x + columns * plan.tile, y)
    return surface.raster(bounds, cell).heights


def make_positions(surface, plan, count=20_000):
    """Random ones, beside the layer as well; such near seams, on seams and corners; and no numbers."""
    random = np.random.default_rng(4)
    xmin, ymin, xmax, ymax = plan.bounds
    anywhere = random.uniform((xmin - 50, ymin - 50), (xmax + 50, ymax + 50), (count, 2))
    seams = anywhere.copy()
    seams[:, 0] = np.round(seams[:, 0] / plan.tile) * plan.tile + random.choice([0, 1e-3, -1e-3, 0.02], count)
    corners = surface.map_points()[random.integers(0, len(surface.points), count), :2]
    return np.concatenate((anywhere, seams, seams[::9, :] // plan.tile * plan.tile, corners, [[np.nan, ymin]]))


@pytest.mark.parametrize("tile, limit", [(400.0, None), (1000.0 / 3, None), (2000.0, 40_000_000)])
def test_bits_are_those_of_the_whole_surface(country, tile, limit):
    path, whole = country
    plan = pickle.loads(pickle.dumps(tiles.Plan(path, tile=tile, base=BASE, limit=limit)))
    for cell in (tile / 100, tile / 99):
        cells = tiles.raster(plan, cell)
        assert cells.numblocks == plan.tiles and cells.dtype == np.float32
        found = cells.compute()
        assert found.tobytes() == cells_of(whole, plan, cell).tobytes()
    assert 0.2 < np.isfinite(found).mean() < 0.9 and (limit is None or len(plan.parts((0, 0))) > 1)
    xy = make_positions(whole, plan)
    usual, closed = tiles.heights(plan, xy), tiles.heights(plan, xy, closed=True)
    assert usual.name != closed.name and usual.compute().tobytes() == whole.heights(xy).tobytes()
    assert closed.compute().tobytes() == whole.heights(xy, closed=True).tobytes()


@pytest.mark.parametrize("cell, call", [(2.0, "raster"), (1000 / 999, "heights")])
def test_centres_are_those_of_the_whole_raster(cell, call):
    """Of some sizes of cells a raster call for one tile would round the centres in another way."""
    plan = tiles.Plan(TERRAIN, tile=1000.0)
    asked = []
    spy = SimpleNamespace(
        raster=lambda *_, closed, **__: asked.append(("raster", closed)) or SimpleNamespace(heights=0),
        heights=lambda *_, closed, **__: asked.append(("heights", closed)) or 0,
    )
    frame = _work.Frame(cell, round(1000 / cell), True)
    with pytest.MonkeyPatch.context() as patch:
        patch.setattr(_work, "_load", lambda *_: spy)
        _work.fill_cells(plan, frame, (7, 5))
    assert asked == [(call, True)]


def test_a_far_base_loses_no_triangle_beside_a_seam(country):
    """There a position is rounded by up to half a metre, onto polygons beside its tile."""
    path, _ = country
    base = (BASE[0] + 9e6, BASE[1])
    whole = kelm_tin.read(path, base=base)
    plan = tiles.Plan(path, tile=400.0, base=base)
    xy = make_positions(whole, plan)
    expected = whole.heights(xy)
    assert np.isfinite(expected).mean() > 0.5
    assert tiles.heights(plan, xy).compute().tobytes() == expected.tobytes()


def test_base_of_a_tile_depends_on_the_tile_alone(country):
    path, whole = country
    plan = tiles.Plan(path, tile=400.0)
    cells = tiles.raster(plan, CELL).compute()
    assert np.allclose(cells, cells_of(whole, plan), atol=0.01, equal_nan=True) or (
        (np.isfinite(cells) != np.isfinite(cells_of(whole, plan))).mean() < 1e-4
    )
    xmin, ymin, xmax, ymax = plan.box((1, 2))
    part = kelm_tin.read(path, window=(xmin - 1, ymin - 1, xmax + 1, ymax + 1), base=plan.base_of((1, 2)))
    assert part.raster((xmin, ymin, xmax, ymax), CELL).heights.tobytes() == cells[100:200, 200:300].tobytes()
    small = tiles.Plan(path, tile=400.0, limit=33_000_000)
    assert len(small.parts((1, 2))) > 1 and tiles.raster(small, CELL).compute().tobytes() == cells.tobytes()


def test_positions_keep_their_order_and_kind(country):
    pd = pytest.importorskip("pandas")
    import dask.dataframe as dd

    path, whole = country
    plan = tiles.Plan(path, tile=400.0, base=BASE)
    xy = make_positions(whole, plan, 3000)
    expected = whole.heights(xy).tobytes()
    lazy = tiles.heights(plan, da.from_array(xy, chunks=(1700, 1)))
    assert lazy.chunks[0][0] == 1700 and lazy.compute().tobytes() == expected
    frame = pd.DataFrame({"y": xy[:, 1], "n": 1, "x": xy[:, 0]}, index=np.arange(len(xy))[::-1])
    for asked in (frame, dd.from_pandas(frame, npartitions=5, sort=False)):
        series = tiles.heights(plan, asked)
        assert series.compute().to_numpy().tobytes() == expected and series.compute().index.equals(frame.index)
    assert tiles.heights(plan, np.empty((0, 2))).compute().shape == (0,)
    loads = [key for key in lazy.dask if "kelm-tin-tile-" in key[0]]
    assert len(loads) == len(np.unique(plan.find(xy))), "each tile is loaded once"


def test_a_cluster_gives_the_same_bits_and_keeps_the_transform(large_country, cluster):
    path, whole = large_country
    plan = tiles.Plan(path, tile=2000.0, base=BASE)
    cells = tiles.raster(plan, CELL)
    expected = cells_of(whole, plan)
    assert cells.compute().tobytes() == expected.tobytes()
    xy = make_positions(whole, plan)
    assert tiles.heights(plan, xy).compute().tobytes() == whole.heights(xy).tobytes()
    with dask.config.set(scheduler="processes", num_workers=2):
        assert cells[:100].compute().tobytes() == expected[:100].tobytes()
    for kept in (cells.persist(), pickle.loads(pickle.dumps(cells))):
        assert (kept.transform, kept.crs) == (cells.transform, cells.crs) and kept.transform[0] == CELL
    plans = [value for value in dict(cells.dask).values() if isinstance(value, tiles.Plan)]
    assert len(plans) == 1, "the plan travels once"


def wait_for(condition):
    for _ in range(600):
        if condition():
            return
        time.sleep(0.1)
    raise AssertionError("it did not happen within a minute")


def test_a_killed_worker_costs_time_and_no_bit(large_country, cluster):
    path, whole = large_country
    plan = tiles.Plan(path, tile=1000.0, base=BASE)
    cells = tiles.raster(plan, CELL)
    victim = next(iter(cluster.run(os.getpid).values()))
    running = cells.persist()
    done = lambda: sum(future.status == "finished" for future in cluster.futures.values())
    wait_for(lambda: done() > 4)
    os.kill(victim, 9)
    assert done() < cells.npartitions
    assert running.compute().tobytes() == cells_of(whole, plan).tobytes()
    assert victim not in cluster.run(os.getpid).values()


def test_a_file_cut_away_is_named_with_its_tile(country, tmp_path):
    path, _ = country
    copy = tmp_path / "copy.fgb"
    copy.write_bytes(pathlib.Path(path).read_bytes())
    plan = tiles.Plan(copy, tile=400.0)
    cells = tiles.raster(plan, CELL)
    result = tmp_path / "cells.tif"
    copy.write_bytes(copy.read_bytes()[:-5000])
    with pytest.raises(tiles.TileError, match=r"copy.fgb: tile \d, \d \(x .*: DataError: .*written to since"):
        cells.compute()
    copy.unlink()
    with pytest.raises(tiles.TileError, match=r"copy.fgb: tile \d, \d \(x .*: OSError: .*No such file"):
        tiles.write_geotiff(cells, result)
    assert os.listdir(tmp_path) == []
    (error,) = [pickle.loads(pickle.dumps(tiles.TileError("a tile")))]
    assert str(error) == "a tile"


@pytest.mark.parametrize("writer", ["rasterio", "osgeo.gdal"])
def test_geotiff(country, tmp_path, monkeypatch, writer):
    pytest.importorskip(writer)
    rasterio = pytest.importorskip("rasterio")
    path, whole = country
    if writer == "osgeo.gdal":
        monkeypatch.setitem(sys.modules, "rasterio", None)
    plan = tiles.Plan(path, tile=800.0, base=BASE)
    cells = tiles.raster(plan, 2.0)
    name = tmp_path / "cells.tif"
    name.write_text("to be replaced")
    with dask.config.set(scheduler="sync" if writer == "rasterio" else None):
        tiles.write_geotiff(cells, name)
    seen = np.arange(12).reshape(3, 4) % 2 == 0
    tiles.write_geotiff(seen, mask := tmp_path / "seen.tif", transform=(5, 0, 10, 0, -5, 20), nodata=255)
    monkeypatch.undo()
    with rasterio.open(mask) as file:
        assert (file.read(1) == seen).all() and file.dtypes == ("uint8",) and file.nodata == 255
    with pytest.raises(ValueError, match=r"transform: expected \(side, 0, left, 0, -side, top\), got \(10, 5"):
        tiles.write_geotiff(seen, mask, transform=(10, 5, 0, 20, 0, -5))
    mask.unlink()
    with rasterio.open(name) as file:
        assert file.read(1).tobytes() == cells_of(whole, plan, 2.0).tobytes()
        assert tuple(file.transform)[:6] == cells.transform and file.crs.to_epsg() == 32633
        assert np.isnan(file.nodata) and file.overviews(1) == [2, 4, 8][: len(file.overviews(1))] != []
        assert file.block_shapes == [(400, 400)] and file.profile["compress"] == "deflate"
    other = cells[::-1].map_blocks(np.nan_to_num)
    with pytest.raises(ValueError, match="array: expected two axes and a transform"):
        tiles.write_geotiff(other, name)
    tiles.write_geotiff(other, name, transform=cells.transform, nodata=0)
    with rasterio.open(name) as file:
        assert file.nodata == 0
    kinds = np.where(np.indices((120, 600)).sum(axis=0) % 2, 1, 3).astype(np.int16)
    uneven = da.from_array(kinds, chunks=((20, 50, 50), 600))
    tiles.write_geotiff(uneven, name, transform=cells.transform)
    with rasterio.open(name) as file, rasterio.open(name, overview_level=0) as overview:
        assert (file.read(1) == kinds).all() and set(np.unique(overview.read(1))) <= {1, 3}
    assert os.listdir(tmp_path) == ["cells.tif"]


def test_a_plan_of_a_relative_folder_holds_elsewhere(tmp_path, monkeypatch):
    gdal = pytest.importorskip("osgeo.gdal")
    monkeypatch.chdir(tmp_path)
    gdal.VectorTranslate("a.gdb", TERRAIN, format="OpenFileGDB")
    plan = tiles.Plan("a.gdb", tile=4000.0)
    monkeypatch.chdir("/")
    assert np.isfinite(tiles.raster(plan, 500.0).compute()).any()


def test_the_margin_counts_all_distances(country):
    survey = kelm_tin.survey(country[0])
    xmin, ymin, xmax, ymax = survey.bounds
    margin = lambda base: -(2**18) * tiles.Plan(country[0], 800, base=base, survey=survey).window((0, 0, 0, 0))[0]
    for width, height in ((9e5, 10), (10, 9e5)):
        survey = dataclasses.replace(survey, bounds=(xmin, ymin, xmin + width, ymin + height))
        assert 1.8e6 <= margin("tile") < 1.81e6
    survey = dataclasses.replace(survey, bounds=(xmin, ymin, xmax, ymax))
    for base in ((xmin - 1e8, ymin), (xmax + 1e8, ymin), (xmin, ymin - 1e8), (xmin, ymax + 1e8)):
        assert 1e8 <= margin(base) < 1.001e8


def measure_peak(prepare, run, *arguments):
    """The bytes that `run` needs and what it prints, in a process of its own, since what a process has freed is
    not given back at once."""
    code = f"""if True:
        import re, sys
        from kelm_tin import tiles
        from kelm_tin.tiles import _work
        read = lambda name: 1024 * int(re.search(name + r":\\s+(\\d+)", open("/proc/self/status").read())[1])
        {prepare}
        before = read("VmRSS")
        open("/proc/self/clear_refs", "w").write("5")  # the peak begins anew
        {run}
        print(read("VmHWM") - before)
    """
    command = [sys.executable, "-c", code, *map(str, arguments)]
    run = subprocess.run(command, stdout=subprocess.PIPE, text=True, check=True)
    *printed, used = map(int, run.stdout.split())
    return used, printed


def test_estimate_bounds_what_a_worker_needs(country):
    path, _ = country
    used, (estimate,) = measure_peak(
        "plan = tiles.Plan(sys.argv[1], tile=100000.0); print(plan.estimate)",
        "_work.answer(plan, False, 0, [_work.np.array([plan.bounds[:2]])])",
        path,
    )
    assert 0 < used < estimate < 20 * used


@pytest.mark.parametrize("writer", ["rasterio", "osgeo.gdal"])
def test_a_geotiff_takes_a_bounded_memory(tmp_path, writer):
    pytest.importorskip(writer)
    pytest.importorskip("osgeo.gdal")
    used, (before, after) = measure_peak(
        "import dask.array as da; from osgeo import gdal; print(gdal.GetCacheMax()); "
        "sys.argv[1] == 'rasterio' or sys.modules.update(rasterio=None)",
        "tiles.write_geotiff(da.ones((8000, 6000), 'f4', (500, 500)), sys.argv[2], transform=(1, 0, 0, 0, -1, 0)); "
        "print(gdal.GetCacheMax())",
        writer,
        tmp_path / "cells.tif",
    )
    assert used < 400_000_000, "600 MB where GDAL may take a twentieth of a machine of 24 GB"
    assert before == after


@pytest.mark.parametrize(
    "call, message",
    [
        (lambda: tiles.Plan(TERRAIN, tile=0), "tile: expected a finite number above 0"),
        (lambda: tiles.Plan(TERRAIN, tile=1e-3), "tile: 0.001 gives .* tiles, more than 10000000"),
        (lambda: tiles.Plan(TERRAIN, tile=2000, base="tiles"), "base: expected"),
        (lambda: tiles.Plan(TERRAIN, tile=2000, source="geoid"), "source: expected"),
        (lambda: tiles.Plan(TERRAIN, tile=2000, limit=-1), "limit: expected"),
        (lambda: tiles.raster(tiles.Plan(TERRAIN, tile=2000), 300), "no whole number of cells of 300"),
        (lambda: tiles.raster(tiles.Plan(TERRAIN, tile=2000), 330), "no whole number of cells of 330"),
        (lambda: tiles.raster(tiles.Plan(TERRAIN, tile=2000), 5000), "no whole number of cells of 5000"),
        (lambda: tiles.heights(tiles.Plan(TERRAIN, tile=2000), [1.0, 2.0]), r"xy: expected shape \(n, 2\)"),
        (lambda: tiles.heights(tiles.Plan(TERRAIN, tile=2000), da.zeros((3, 3))), r"got \(3, 3\)"),
        (lambda: tiles.raster(tiles.Plan(TERRAIN, tile=2000, limit=999), 50).compute(), "tile .* exceeds the limit of 999"),
    ],
)
def test_refusals(call, message):
    with pytest.raises((ValueError, tiles.TileError), match=message):
        call()


def test_examples_of_the_documentation():
    code = "import doctest, kelm_tin, sys; from kelm_tin.tiles import _plan, _raster, _heights; " \
        "sys.exit(sum(doctest.testmod(m).failed for m in (kelm_tin.tiles, _plan, _raster, _heights)))"
    subprocess.run([sys.executable, "-c", code], check=True)


def test_the_package_does_without_dask():
    code = "import sys; sys.modules['dask'] = None; import kelm_tin; kelm_tin.read; kelm_tin.tiles"
    run = subprocess.run([sys.executable, "-c", code], stderr=subprocess.PIPE, text=True)
    assert run.returncode == 1 and "dask" in run.stderr.splitlines()[-1]
