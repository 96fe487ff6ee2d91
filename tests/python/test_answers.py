"""The answers: those of the C++ interface to the bit, and those of scipy within rounding."""

import os
import subprocess
import threading

import kelm_tin
import numpy as np
import pytest
from conftest import TERRAIN
from hypothesis import given, settings
from hypothesis import strategies as st
from hypothesis.extra import numpy as npst


def make_positions(surface, count):
    """Random positions, and such on vertices and on edges."""
    random = np.random.default_rng(7)
    xmin, ymin, xmax, ymax = surface.bounds
    anywhere = random.uniform((xmin - 99, ymin - 99), (xmax + 99, ymax + 99), (count, 2))
    corners = surface.map_points()[surface.triangles[random.integers(0, 17619, count)]]
    share = random.uniform(0, 1, (count, 1)) * (random.uniform(0, 1, (count, 1)) < 0.9)
    on_edges = (corners[:, 0] * share + corners[:, 1] * (1 - share))[:, :2]
    return np.concatenate((anywhere, on_edges))


@pytest.fixture(scope="module")
def queries(terrain, tmp_path_factory):
    """Positions, segments, and the answers of the program beside."""
    positions = make_positions(terrain, 500_000)
    a = np.concatenate((positions[::250], np.full((4000, 1), 990.0)), axis=1)
    b = np.concatenate((positions[::250][::-1], np.full((4000, 1), 300.0)), axis=1)
    folder = tmp_path_factory.mktemp("answers")
    positions.tofile(folder / "positions")
    np.concatenate((a, b), axis=1).tofile(folder / "segments")
    program = os.environ["KELM_TIN_ANSWERS"]
    output = subprocess.run(
        [program, TERRAIN, folder / "positions", folder / "segments", "211.5"],
        stdout=subprocess.PIPE,
        check=True,
    ).stdout
    answers = np.frombuffer(output, np.float32)
    return positions, a, b, np.split(answers, [len(positions), len(positions) + len(a)])


@pytest.mark.parametrize("threads", [1, 2])
def test_bits_are_those_of_cpp(terrain, queries, threads):
    positions, a, b, (heights, crossings, cells) = queries
    assert terrain.heights(positions, threads=threads).tobytes() == heights.tobytes()
    assert terrain.crossings(a, b, threads=threads).tobytes() == crossings.tobytes()
    xmin, _, _, ymax = terrain.bounds
    bounds = (xmin, ymax - 64 * 211.5, xmin + 64 * 211.5, ymax)
    raster = terrain.raster(bounds, 211.5, threads=threads)
    assert raster.heights.tobytes() == cells.tobytes()
    assert np.isfinite(heights).mean() > 0.9 and np.isfinite(crossings).mean() > 0.5


def test_closed_misses_no_position_on_an_edge(terrain):
    positions = make_positions(terrain, 100_000)[100_000:]
    usual, closed = terrain.heights(positions), terrain.heights(positions, closed=True)
    missed = np.isnan(usual)
    assert missed.any() and np.isnan(closed).sum() < missed.sum() / 10
    assert (usual[~missed] == closed[~missed]).all()
    alone = [terrain.heights(float(x), float(y), closed=True) for x, y in positions[missed][:100]]
    along = terrain.profile(positions[missed][:100], 1e9, closed=True).heights
    assert np.array_equal(alone, closed[missed][:100], equal_nan=True)
    assert np.array_equal(alone, along, equal_nan=True)
    cells = [(x - 0.5, y - 0.5, x + 0.5, y + 0.5) for x, y in positions[missed & ~np.isnan(closed)][:50]]
    for options, share in (({}, 1), ({"closed": True}, 0)):  # but for a rounding of the centre
        found = [terrain.raster(cell, 1, **options).heights[0, 0] for cell in cells]
        assert abs(np.isnan(found).mean() - share) < 0.1


def test_scipy_agrees_on_its_own_triangles():
    interpolate = pytest.importorskip("scipy.interpolate")
    random = np.random.default_rng(3)
    points = random.uniform((0, 0, 100), (1000, 1000, 900), (5000, 3))
    surface = kelm_tin.Surface.from_points(points)
    xy = random.uniform(0, 1000, (200_000, 2))
    ours = surface.heights(xy)
    theirs = interpolate.LinearNDInterpolator(points[:, :2] - surface.base, points[:, 2])(
        xy - surface.base
    )
    both = np.isfinite(ours) & np.isfinite(theirs)
    # Near slivers of the rim the plane is steep, so that a rounded position tells.
    assert np.median(np.abs(ours - theirs)[both]) < 1e-4
    assert np.quantile(np.abs(ours - theirs)[both], 0.9999) < 0.1
    lone = np.isfinite(ours) != np.isfinite(theirs)
    assert lone.mean() < 1e-3
    on_rim = np.isfinite(surface.heights(xy[lone], closed=True))
    assert on_rim.sum() >= lone.sum() // 2


@settings(max_examples=60, deadline=None, derandomize=True)
@given(
    npst.mutually_broadcastable_shapes(num_shapes=2, max_dims=3, max_side=4),
    st.sampled_from([np.float64, np.float32, ">f8", np.int32, np.uint8, np.float16]),
    st.booleans(),
)
def test_any_shape_dtype_and_stride(shapes, dtype, is_strided):
    square = kelm_tin.Surface([[0, 0, 5], [10, 0, 15], [10, 10, 15], [0, 10, 5]], [[0, 1, 2], [0, 2, 3]])
    random = np.random.default_rng(1)
    x, y = (
        random.integers(0, 9, tuple(2 * n for n in shape)).astype(dtype)[
            tuple(slice(None, None, 2) for _ in shape)
        ]
        if is_strided
        else random.integers(0, 9, shape).astype(dtype)
        for shape in shapes.input_shapes
    )
    found = square.heights(x, y, closed=True)
    assert found.shape == shapes.result_shape and found.dtype == np.float32
    assert np.allclose(found, np.asarray(x, float) + 5)
    both = np.stack(np.broadcast_arrays(x, y), axis=-1)
    assert np.array_equal(square.heights(both, closed=True), found)


def test_one_position_is_an_array_of_one(square):
    x, y = 500003.0, 4649780.0
    assert square.heights(x, y) == square.heights([[x, y]])[0] == square.heights([x, y])
    assert np.isnan(square.heights(0.0, 0.0)) and np.isnan(square.heights(np.nan, y))


def test_sight(square):
    x, y, _ = square.map_points().mean(axis=0)
    eye = [x - 3, y, 40]
    targets = [[x + 3, y, 13.5], [x + 3, y, 12.5], [x + 3, y, np.nan], [x + 99, y, 1]]
    assert square.visible(eye, targets).tolist() == [True, False, False, True]
    assert not square.visible([x, np.nan, 40], targets).any()
    # A ridge between: the western side of a roof does not see the eastern.
    roof = kelm_tin.Surface(
        [[0, 0, 0], [5, 0, 5], [10, 0, 0], [0, 9, 0], [5, 9, 5], [10, 9, 0]],
        [[0, 1, 4], [0, 4, 3], [1, 2, 5], [1, 5, 4]],
    )
    assert not roof.visible([2, 3, 2], [8, 3.5, 2])
    assert roof.visible([2, 3, 2], [4, 3.5, 4]) and roof.visible([2, 3, 4.2], [8, 3.5, 6.2])
    assert not roof.visible([2, 3, 2], [4, 3.5, 4], clearance=-0.1)


def test_profile_places_stations_evenly(square):
    x, y = np.array(square.base)
    stations, xs, ys, heights = square.profile([[x, y], [x + 3, y + 4], [x + 3, y - 1]], 2)
    assert np.allclose(stations, [0, 5 / 3, 10 / 3, 5, 20 / 3, 25 / 3, 10])
    assert np.allclose(np.hypot(np.diff(xs), np.diff(ys)), 5 / 3)
    assert np.array_equal(heights, square.heights(xs, ys))
    still = square.profile([[x, y], [x, y], [x + 3, y + 4]], 5)
    assert still.stations.tolist() == [0, 0, 5]


def test_parts_keep_heights(terrain):
    xmin, ymin, _, _ = terrain.bounds
    window = (xmin + 4000, ymin + 4000, xmin + 6000, ymin + 7000)
    part = terrain.subset(window)
    inside = np.random.default_rng(2).uniform((xmin + 4000, ymin + 4000), (xmin + 6000, ymin + 7000), (9999, 2))
    assert part.base == terrain.base and np.allclose(part.bounds, window, atol=400)
    assert part.heights(inside).tobytes() == terrain.heights(inside).tobytes()
    line = inside[:20]
    strip = terrain.along(line)
    on_line = terrain.profile(line, 5)
    assert np.array_equal(strip.profile(line, 5).heights, on_line.heights, equal_nan=True)
    assert strip.crs == terrain.crs and strip.datum == "orthometric"
    assert terrain.subset((0, 0, 1, 1)) is None and terrain.along([[0, 0], [1, 1]]) is None


def test_eight_threads_ask_one_new_surface(terrain):
    surface = kelm_tin.Surface(terrain.map_points(), terrain.triangles, terrain.base)
    positions = make_positions(terrain, 20_000)
    expected = terrain.heights(positions).tobytes()
    found = []
    ask = lambda: found.append(surface.heights(positions, threads=2).tobytes())
    threads = [threading.Thread(target=ask) for _ in range(8)]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    assert found == [expected] * 8
