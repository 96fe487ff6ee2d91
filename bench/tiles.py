#!/usr/bin/env python3
"""Measures tiles on Dask, and prints the tables of docs/guide/scale.md.

Usage: tiles.py FOLDER [PART ...] [--triangles 20000000] [--small 1000000] [--formats fgb gpkg] [--processes 1 2 4]

The parts, of which all are run unless some are named:

data      writes the made-up countries to the folder unless they are there: some 8 GB for 20 million triangles
tiles     one tile of the small and of the large country
cluster   all tiles on worker processes: wall time, bits, peak memory
products  heights at many positions, and a GeoTIFF
whole     the bits of the part cluster against the whole country in one process, which takes some 3 GB of memory
relief    a picture of the large country, country.png in the folder
"""

import argparse
import contextlib
import hashlib
import json
import os
import pathlib
import pickle
import re
import statistics
import subprocess
import sys
import time
import typing

import dask
import distributed
import kelm_tin
import numpy as np
from kelm_tin import tiles
from kelm_tin.tiles import _work

PROGRAM = pathlib.Path(__file__).resolve().parents[1] / "examples" / "python" / "country.py"
BASE = (517000.0, 4667000.0)
TILE, CELL = 2000.0, 2.0
FRAME = _work.Frame(CELL, round(TILE / CELL), False)
FULL = round(TILE**2 / 50)
"""Triangles of a tile without sea: two in ten by ten metres."""
FORMATS = ("fgb", "gpkg")


def find_country(folder, triangles, ending):
    """The path of a country, which is written unless it is there. A part of a file never has the name."""
    path = os.path.join(folder, f"country{triangles}.{ending}")
    if not os.path.exists(path):
        part = os.path.join(folder, f"part.{ending}")
        subprocess.run([sys.executable, PROGRAM, str(triangles), part], check=True, stdout=sys.stderr)
        os.replace(part, path)
    return path


def make_plan(path):
    """A plan by a new survey, which is kept beside the file."""
    plan = tiles.Plan(path, tile=TILE, base=BASE)
    pathlib.Path(path + ".survey").write_bytes(pickle.dumps(plan.survey))
    return plan


def find_plan(path):
    """A plan by the survey that is kept, if it is one of the file as it is."""
    try:
        survey = pickle.loads(pathlib.Path(path + ".survey").read_bytes())
        plan = tiles.Plan(path, tile=TILE, base=BASE, survey=survey)
        plan.count([plan.bounds])
        return plan
    except (FileNotFoundError, kelm_tin.DataError):
        return make_plan(path)


def measure(call, clock=time.perf_counter):
    start = clock()
    result = call()
    return clock() - start, result


def measure_processor(call):
    """Seconds of the processor, which other programs on the machine do not change much."""
    return measure(call, time.process_time)


def read_memory(name):
    """Bytes of this process: VmRSS for those it has, VmHWM for the most that it had."""
    return 1024 * int(re.search(name + r":\s+(\d+)", pathlib.Path("/proc/self/status").read_text())[1])


def restart_peak():
    """The peak is counted anew from the bytes that the process has, which are returned."""
    pathlib.Path("/proc/self/clear_refs").write_text("5")
    return read_memory("VmRSS")


def digest(cells):
    return hashlib.sha256(np.ascontiguousarray(cells).tobytes()).hexdigest()


def find_inner_tiles(plan, count):
    """Some tiles without sea or rim."""
    everywhere = plan.list_tiles()
    bounds = plan.count([plan.box(tile) for tile in everywhere])
    likely = [tile for tile, bound in zip(everywhere, bounds) if bound >= FULL]
    spread = likely[:: max(1, len(likely) // (2 * count))]
    return [tile for tile in spread if len(_work._load(plan, tile, plan.box(tile)).triangles) >= FULL][:count]


class Cost(typing.NamedTuple):
    """Processor times of one layer, in seconds."""

    plan: tiles.Plan
    survey: float
    tile: float

    def report(self):
        print("| | a triangle | 10,000,000,000 triangles |")
        print("|---|---|---|")
        size = os.path.getsize(self.plan.path) / self.plan.survey.shapes
        survey, tile = self.survey / self.plan.survey.shapes, self.tile / FULL
        print(f"| file | {size:.0f} bytes | {size / 100:.1f} TB |")
        print(f"| survey | {survey * 1e6:.2f} µs | {survey * 1e10 / 3600:.1f} hours of one core |")
        print(f"| {1e10 / FULL:,.0f} tiles of {FULL:,} triangles | {tile * 1e6:.1f} µs | "
              f"{tile * 1e10 / 3600:.1f} hours of one core |")
        print(f"| memory of a worker, by the estimate | | {self.plan.estimate / 1e6:.0f} MB and the interpreter |\n")


def measure_cost(path):
    """Prints the row of a layer."""
    survey, plan = measure_processor(lambda: make_plan(path))
    names = find_inner_tiles(plan, 12)
    opening, tile, reading = (
        statistics.median(measure_processor(lambda: call(name))[0] for name in names)
        for call in (
            lambda name: plan.count([plan.box(name)]),
            lambda name: _work.fill_cells(plan, FRAME, name),
            lambda name: _work._load(plan, name, plan.box(name)),
        )
    )
    travels = len(pickle.dumps(plan)) / 1e3
    print(f"| {os.path.basename(path)} | {plan.survey.shapes:,} | {survey:.1f} | {travels:,.0f} | "
          f"{opening * 1e3:.1f} | {tile * 1e3:.0f} | {reading * 1e3:.0f} |", flush=True)
    return Cost(plan, survey, tile)


def report_tiles(small, large):
    """The processor time of one tile, from small and from large layers, in one process."""
    print("| layer | triangles | survey, s | plan, kB | opening, ms | a tile, ms | of these reading, ms |")
    print("|---|---|---|---|---|---|---|")
    costs = {path: measure_cost(path) for path in [*small, *large]}
    for a, b in zip(small, large):
        print(f"\nA tile of {os.path.basename(b)} takes {costs[b].tile / costs[a].tile:.2f} "
              f"of one of {os.path.basename(a)}.")
    print()
    costs[large[0]].report()


@contextlib.contextmanager
def start_workers(count):
    options = dict(n_workers=count, threads_per_worker=1, dashboard_address=None)
    with distributed.LocalCluster(**options) as cluster, distributed.Client(cluster) as client:
        yield client


class Run(typing.NamedTuple):
    """All tiles on some worker processes."""

    wall: float  # seconds
    work: float  # seconds of the processor, all workers together
    digests: list
    peak: int  # bytes that the fullest worker needed beyond its rest


def run_cluster(plan, workers):
    with start_workers(workers) as client:
        client.run(lambda: __import__("kelm_tin.tiles"))
        rest = client.run(restart_peak)
        blocks = tiles.raster(plan, CELL).to_delayed().ravel().tolist()
        before = sum(client.run(time.process_time).values())
        seconds, found = measure(lambda: dask.compute(*[dask.delayed(digest)(block) for block in blocks]))
        work = sum(client.run(time.process_time).values()) - before
        peaks = client.run(read_memory, "VmHWM")
        return Run(seconds, work, list(found), max(peaks[name] - rest[name] for name in peaks))


def report_cluster(path, processes):
    plan = find_plan(path)
    rows, columns = plan.tiles
    print(f"{os.path.basename(path)}: {rows} x {columns} tiles of {TILE:.0f} m, cells of {CELL:.0f} m.\n")
    print("| processes | wall time, s | of one | processor time, s | bits | peak of a worker, MB | estimate, MB |")
    print("|---|---|---|---|---|---|---|")
    first = None
    bound = plan.estimate + 2 * 4 * FRAME.side**2  # and the cells
    for workers in processes:
        run = run_cluster(plan, workers)
        first = first or run
        same = "equal" if run.digests == first.digests else "DIFFERENT"
        print(f"| {workers} | {run.wall:.1f} | {run.wall / first.wall:.2f} | {run.work:.1f} | {same} | "
              f"{run.peak / 1e6:.0f} | {bound / 1e6:.0f} |", flush=True)
    print()
    pathlib.Path(path + ".digests").write_text(json.dumps(first.digests))


def report_whole(path):
    digests = pathlib.Path(path + ".digests")
    if not digests.exists():
        sys.exit(f"{digests} is missing. The part cluster writes it.")
    plan, expected = find_plan(path), json.loads(digests.read_text())
    seconds, surface = measure(lambda: kelm_tin.read(path, base=BASE))
    peak = read_memory("VmHWM")
    found = []
    rows, columns = plan.tiles
    for row in range(rows):
        xmin, ymin, _, ymax = plan.box((row, 0))
        band = surface.raster((xmin, ymin, xmin + columns * TILE, ymax), CELL).heights
        found += [digest(cells) for cells in np.hsplit(band, columns)]
    print(f"{os.path.basename(path)} as a whole in one process: {seconds:.0f} s to read, peak {peak / 1e9:.1f} GB, "
          f"bits of {len(found)} tiles {'equal' if found == expected else 'DIFFERENT'}.\n", flush=True)


def report_products(plan, folder):
    """Heights at random positions, and a GeoTIFF."""
    with start_workers(2):
        xmin, ymin, xmax, ymax = plan.bounds
        xy = np.random.default_rng(1).uniform((xmin, ymin), (xmax, ymax), (5_000_000, 2))
        seconds, _ = measure(lambda: tiles.heights(plan, xy).compute())
        print(f"Two processes: {len(xy):,} heights at random positions in {seconds:.1f} s;", end=" ", flush=True)
        name = os.path.join(folder, "country.tif")
        rest = restart_peak()
        seconds, _ = measure(lambda: tiles.write_geotiff(tiles.raster(plan, CELL), name))
        print(f"a GeoTIFF of {os.path.getsize(name) / 1e6:,.0f} MB in {seconds:.1f} s, "
              f"by a process that needed {(read_memory('VmHWM') - rest) / 1e6:.0f} MB for it.\n", flush=True)


def draw(plan, picture):
    import matplotlib

    matplotlib.use("Agg")
    from matplotlib.colors import LightSource
    from PIL import Image

    with start_workers(2):
        heights = tiles.raster(plan, 50.0).compute()
    land = np.isfinite(heights)
    rows, columns = (slice(*np.flatnonzero(land.any(axis=axis))[[0, -1]]) for axis in (1, 0))
    heights, land = heights[rows, columns], land[rows, columns]
    shaded = LightSource().shade(
        np.where(land, heights, 0), matplotlib.colormaps["gist_earth"], dx=50, dy=50, vert_exag=3, vmin=-900
    )
    shaded[~land, :3] = 0.82, 0.9, 0.95
    image = Image.fromarray((255 * shaded[..., :3]).astype(np.uint8))
    image.quantize(64).save(picture, optimize=True)


def parse_options():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawTextHelpFormatter)
    parser.add_argument("folder")
    parser.add_argument("parts", nargs="*", metavar="PART")
    parser.add_argument("--triangles", type=int, default=20_000_000)
    parser.add_argument("--small", type=int, default=1_000_000)
    parser.add_argument("--formats", nargs="+", choices=FORMATS, default=FORMATS)
    parser.add_argument("--processes", nargs="+", type=int, default=(1, 2, 4))
    return parser.parse_args()


def main():
    options = parse_options()
    find = lambda count: [find_country(options.folder, count, ending) for ending in options.formats]
    large = find(options.triangles)
    parts = {
        "data": lambda: find(options.small),
        "tiles": lambda: report_tiles(find(options.small), large),
        "cluster": lambda: [report_cluster(path, options.processes) for path in large],
        "products": lambda: report_products(find_plan(large[0]), options.folder),
        "whole": lambda: [report_whole(path) for path in large],
        "relief": lambda: draw(find_plan(large[0]), os.path.join(options.folder, "country.png")),
    }
    unknown = set(options.parts) - set(parts)
    if unknown:
        sys.exit(f"There is no part {min(unknown)}. The parts are {', '.join(parts)}.")
    for part in options.parts or parts:
        seconds, _ = measure(parts[part])
        print(f"{part}: {seconds:.0f} s", file=sys.stderr)


if __name__ == "__main__":
    main()
