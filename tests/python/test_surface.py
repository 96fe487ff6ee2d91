"""What a surface is: its arrays, copies and pictures, and what it refuses."""

import copy
import gc
import os
import pickle
import resource
import subprocess
import sys

import kelm_tin
import numpy as np
import pytest
from conftest import ROOT

POINTS = [[0, 0, 5], [10, 0, 7], [0, 10, 9]]
XY = [[1.0, 1.0]]


def test_views_are_read_only_and_outlive_the_surface(square):
    points, triangles, base = square.points, square.triangles, square.base
    assert points.dtype == np.float32 and triangles.dtype == np.uint32
    assert not (points.flags.writeable or triangles.flags.writeable or points.flags.owndata)
    with pytest.raises(ValueError):
        points.flags.writeable = True
    in_map = square.map_points()
    del square
    gc.collect()
    assert np.allclose(points[:, :2] + base, in_map[:, :2]) and triangles.tolist() == [[0, 1, 2], [0, 2, 3]]


def test_copies_answer_alike_and_are_other_surfaces(terrain):
    xy = np.random.default_rng(5).uniform(terrain.bounds[:2], terrain.bounds[2:], (5000, 2))
    for other in (copy.copy(terrain), copy.deepcopy(terrain), pickle.loads(pickle.dumps(terrain))):
        assert other != terrain and repr(other) == repr(terrain)
        assert (other.crs, other.base, other.datum) == (terrain.crs, terrain.base, terrain.datum)
        assert other.heights(xy).tobytes() == terrain.heights(xy).tobytes()
    restore, state = terrain.__reduce__()
    with pytest.raises(ValueError, match="triangles: row 1 names a point"):
        restore(state[0][:3], state[1], *state[2:])


def test_the_list_of_triangles_is_counted(terrain):
    part = terrain.subset(terrain.bounds)
    before = part.nbytes
    assert part.triangles.nbytes > 0 and part.nbytes - before == part.triangles.nbytes
    assert np.shares_memory(part.triangles, part.triangles)


def test_base_and_empty(square):
    assert square.base == (500005.0, 4649781.0)
    far = kelm_tin.Surface(square.map_points(), square.triangles, base=(500000.37, 4649776.81))
    assert np.allclose(far.points[0], [0, 0, 5], atol=1e-6)
    for empty in (kelm_tin.Surface(np.empty((0, 3)), np.empty((0, 3), int)), kelm_tin.Surface(POINTS, [])):
        assert np.isnan(empty.heights(XY)).all() and empty.triangles.shape == (0, 3)
        assert empty._repr_png_() is None
        assert pickle.loads(pickle.dumps(empty)).nbytes > 0
    assert square.heights(np.empty((0, 2))).shape == (0,)


def test_picture(terrain):
    image = pytest.importorskip("matplotlib.image")
    import io

    picture = image.imread(io.BytesIO(terrain._repr_png_()))
    assert max(picture.shape) == 320 and 0.9 < picture[..., 3].mean() < 1
    road = kelm_tin.Surface([[0, 0, 5], [9000, 0, 7], [9000, 9, 9], [0, 9, 9]], [[0, 1, 2], [0, 2, 3]])
    assert image.imread(io.BytesIO(road._repr_png_())).shape[:2] == (2, 320)
    for x, y in ((1, 0), (0, 1), (1, 1)):
        upright = kelm_tin.Surface([[0, 0, 0], [9 * x, 9 * y, 0], [9 * x, 9 * y, 5]], [[0, 1, 2]])
        assert upright._repr_png_() is None


REFUSALS = {
    "points shape": (lambda s: kelm_tin.Surface([[1, 2]], []), r"points: expected shape \(..., 3\), got \(1, 2\)"),
    "points axes": (lambda s: kelm_tin.Surface(np.zeros((2, 2, 3)), []), r"points: expected shape \(n, 3\), got \(2, 2, 3\)"),
    "points dtype": (lambda s: kelm_tin.Surface([["a"] * 3], []), "points: expected an array of numbers, got dtype <U1"),
    "points complex": (lambda s: kelm_tin.Surface(np.zeros((1, 3), complex), []), "points: .* complex128"),
    "points ragged": (lambda s: kelm_tin.Surface([[1, 2, 3], [1]], []), "points: expected an array of numbers"),
    "points NaN": (lambda s: kelm_tin.Surface([[0, 0, 1], [0, np.nan, 1]], []), "points: row 1 is not finite"),
    "points huge": (lambda s: kelm_tin.Surface([[0, 0, 1e39]], []), "points: row 0 is too large for float32"),
    "index": (lambda s: kelm_tin.Surface(POINTS, [[0, 1, 2], [0, 1, 3]]), r"triangles: row 1 names .* \[0, 1, 3\], of 3"),
    "index below": (lambda s: kelm_tin.Surface(POINTS, [[0, -1, 2]]), "triangles: row 0 names a point"),
    "index dtype": (lambda s: kelm_tin.Surface(POINTS, [[0.0, 1.0, 2.0]]), "triangles: expected an array of integers"),
    "index wraps": (lambda s: kelm_tin.Surface(POINTS, np.array([[0, 1, 2**32 + 2]])), "triangles: row 0 names"),
    "index shape": (lambda s: kelm_tin.Surface(POINTS, [0, 1, 2]), r"triangles: expected shape \(m, 3\), got \(3,\)"),
    "base": (lambda s: kelm_tin.Surface(POINTS, [], base=[1]), "base: expected two finite numbers"),
    "line points": (lambda s: kelm_tin.Surface.from_points([[0, 0, 0], [1, 1, 0], [2, 2, 0]]), "points: no triangles"),
    "two points": (lambda s: kelm_tin.Surface.from_points(POINTS[:2]), "points: no triangles"),
    "xy": (lambda s: s.heights([1.0, 2.0, 3.0]), r"x: expected shape \(..., 2\), got \(3,\)"),
    "one x": (lambda s: s.heights(1.0), r"x: expected shape \(..., 2\), got \(\)"),
    "x y": (lambda s: s.heights([1, 2], [1, 2, 3]), r"x, y: shapes \(2,\) and \(3,\) do not broadcast"),
    "bool": (lambda s: s.heights([[True, False]]), "x: expected an array of numbers, got dtype bool"),
    "threads": (lambda s: s.heights(XY, threads=-1), "threads: expected an integer from 0"),
    "segment": (lambda s: s.crossings([0, 0], [1, 1, 1]), r"a: expected shape \(..., 3\)"),
    "segments": (lambda s: s.crossings(np.zeros((2, 3)), np.zeros((3, 3))), "a, b: shapes"),
    "eye": (lambda s: s.visible([0, 0], [1, 1, 1]), r"eye: expected shape \(..., 3\)"),
    "step": (lambda s: s.profile([[0, 0], [1, 1]], 0), "step: expected a finite number above 0, got 0"),
    "steps": (lambda s: s.profile([[0, 0], [1e9, 1]], 1e-3), "step: 0.001 gives more than"),
    "line": (lambda s: s.profile([[0, 0]], 1), "line: expected two points or more, got 1"),
    "line NaN": (lambda s: s.along([[0, 0], [np.nan, 1]]), "line: row 1 is not finite"),
    "cell": (lambda s: s.raster(cell=np.inf), "cell: expected a finite number above 0"),
    "cells": (lambda s: s.raster(cell=1e-12), "cell: 1e-12 gives more than 2147483647 cells on a side"),
    "bounds": (lambda s: s.raster((0, 0, 1)), r"bounds: expected \(xmin, ymin, xmax, ymax\), got shape \(3,\)"),
    "bounds order": (lambda s: s.subset((2, 0, 1, 1)), "bounds: expected finite xmin <= xmax"),
}


@pytest.mark.parametrize("name", REFUSALS)
def test_bad_argument_is_named(square, name):
    call, message = REFUSALS[name]
    with pytest.raises(ValueError, match=message):
        call(square)


def test_arrays_pass_that_numpy_takes(square):
    x, y = square.map_points()[:, :2].mean(axis=0)
    expected = square.heights([[x, y]])
    read_only = np.array([[x, y]])
    read_only.flags.writeable = False
    for same in (read_only, np.array([[x, y]], ">f8"), np.asfortranarray([[x, y], [x, y]])[:1], [(x, y)]):
        assert square.heights(same) == expected


def test_dropped_surfaces_leak_nothing():
    random = np.random.default_rng(1)
    points = random.uniform(0, 1000, (1500, 3))
    source = kelm_tin.Surface.from_points(points)
    kept = []

    def run(count):
        for i in range(count):
            surface = kelm_tin.Surface(source.points, source.triangles)
            surface.heights(points[:, :2], threads=1)
            view = surface.points if i % 2 else surface.triangles
            kept[:] = [view]
        gc.collect()
        with open("/proc/self/statm") as file:
            return int(file.read().split()[1]) * resource.getpagesize()

    run(100)
    before = run(100)
    assert run(1000) - before < 40e6, "a surface and its index take 0.3 MB"


def test_version_is_that_of_the_distribution():
    assert f'\nversion = "{kelm_tin.__version__}"\n' in (ROOT / "pyproject.toml").read_text()


def test_types_of_the_package():
    mypy = pytest.importorskip("mypy.api")
    package = os.path.dirname(kelm_tin.__file__)
    out, err, status = mypy.run(["--strict", "--cache-dir=/dev/null", package])
    assert status == 0, out + err


def test_examples_of_the_documentation():
    code = "import doctest, kelm_tin, sys\n" "sys.exit(sum(doctest.testmod(m).failed for m in " \
        "(kelm_tin, kelm_tin._surface, kelm_tin._reading)))"
    subprocess.run([sys.executable, "-c", code], check=True)
