#!/usr/bin/env python3
"""Measures tiles on Dask, and prints the tables of docs/guide/scale.md.

Usage: tiles.py FOLDER [--triangles 20000000] [--small 1000000] [--whole] [--relief PICTURE.png]

The made-up countries are written to the folder unless they are there: some 8 GB for 20 million triangles.
--whole holds the bits against the whole surface in one process, which takes some 10 GB of memory.
"""

import argparse
import hashlib
import os
import pathlib
import pickle
import resource
import statistics
import subprocess
import sys
import time

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
ENDINGS = (".fgb", ".gpkg")


def make_country(folder, triangles):
    paths = [os.path.join(folder, f"country{triangles}{ending}") for ending in ENDINGS]
    if not all(map(os.path.exists, paths)):
        subprocess.run([sys.executable, PROGRAM, str(triangles), *paths], check=True, stdout=sys.stderr)
    return paths


def measure(call, clock=time.perf_counter):
    start = clock()
    result = call()
    return clock() - start, result


def measure_processor(call):
    """Seconds of the processor, which other programs on the machine do not change much."""
    return measure(call, time.process_time)


def get_resident():
    with open("/proc/self/statm") as file:
        return int(file.read().split()[1]) * resource.getpagesize()


def get_peak():
    return resource.getrusage(resource.RUSAGE_SELF).ru_maxrss * 1024


def digest(cells):
    return hashlib.sha256(np.ascontiguousarray(cells).tobytes()).hexdigest()


def find_inner_tiles(plan, count):
    """Tiles in the middle of the country, which the sea and the rim do not touch much."""
    full = plan.tile**2 / 50  # two triangles in ten by ten metres
    everywhere = plan.list_tiles()
    counts = plan.count([plan.box(tile) for tile in everywhere])
    inner = [tile for tile, found in zip(everywhere, counts) if found > full]
    return inner[:: max(1, len(inner) // count)][:count]


def report_tiles(plans):
    """The processor time of one tile, from the small and from the large layer, in one process."""
    print("| layer | triangles | survey, s | plan, kB | opening, ms | a tile, ms | of these reading, ms |")
    print("|---|---|---|---|---|---|---|")
    medians = {}
    for path, plan, seconds in plans:
        names = find_inner_tiles(plan, 12)
        opening = statistics.median(measure_processor(lambda: plan.count([plan.bounds]))[0] for _ in range(5))
        times = [measure_processor(lambda: _work.fill_cells(plan, FRAME, tile))[0] for tile in names]
        reads = [measure_processor(lambda: _work._load(plan, tile, plan.box(tile)))[0] for tile in names]
        medians[path] = statistics.median(times)
        print(
            f"| {os.path.basename(path)} | {plan.survey.shapes:,} | {seconds:.1f} | "
            f"{len(pickle.dumps(plan)) / 1e3:,.0f} | {opening * 1e3:.1f} | {medians[path] * 1e3:.0f} | "
            f"{statistics.median(reads) * 1e3:.0f} |"
        )
    for small, large in zip(list(medians)[:2], list(medians)[2:]):
        print(f"\nA tile of the large layer takes {medians[large] / medians[small]:.2f} of one of the small layer "
              f"({os.path.splitext(large)[1]}).")
    print()


def run_cluster(plan, workers):
    """Wall time, the digests of all tiles, and what the fullest worker needed beyond its rest."""
    options = dict(n_workers=workers, threads_per_worker=1, dashboard_address=None)
    with distributed.LocalCluster(**options) as cluster, distributed.Client(cluster) as client:
        client.run(lambda: __import__("kelm_tin.tiles"))
        rest = client.run(get_resident)
        blocks = tiles.raster(plan, CELL).to_delayed().ravel().tolist()
        seconds, found = measure(lambda: dask.compute(*[dask.delayed(digest)(block) for block in blocks]))
        peaks = client.run(get_peak)
        return seconds, found, max(peaks[name] - rest[name] for name in peaks)


def report_cluster(plan, path):
    print(f"{os.path.basename(path)}: {plan.tiles[0]} x {plan.tiles[1]} tiles of {TILE:.0f} m, cells of {CELL:.0f} m.\n")
    print("| processes | wall time, s | of one process | bits | peak of a worker, MB | estimate and cells, MB |")
    print("|---|---|---|---|---|---|")
    first = None
    bound = plan.estimate + 2 * 4 * FRAME.side**2
    for workers in (1, 2, 4):
        seconds, found, peak = run_cluster(plan, workers)
        first = first or (seconds, found)
        same = "equal" if found == first[1] else "DIFFERENT"
        print(f"| {workers} | {seconds:.1f} | {seconds / first[0]:.2f} | {same} | {peak / 1e6:.0f} | {bound / 1e6:.0f} |")
    print()
    return first[1]


def report_whole(plan, path, found):
    seconds, surface = measure(lambda: kelm_tin.read(path, base=BASE))
    same = True
    for number, tile in enumerate(np.ndindex(plan.tiles)):
        xmin, ymin, xmax, ymax = plan.box(tile)
        same &= digest(surface.raster((xmin, ymin, xmax, ymax), CELL).heights) == found[number]
    print(f"The whole surface in one process: {seconds:.0f} s to read, peak {get_peak() / 1e9:.1f} GB, "
          f"bits {'equal' if same else 'DIFFERENT'}.\n")


def report_products(plan, folder, picture):
    """Heights at random positions, a GeoTIFF, and the picture."""
    options = dict(n_workers=2, threads_per_worker=1, dashboard_address=None)
    with distributed.LocalCluster(**options) as cluster, distributed.Client(cluster):
        xmin, ymin, xmax, ymax = plan.bounds
        xy = np.random.default_rng(1).uniform((xmin, ymin), (xmax, ymax), (5_000_000, 2))
        seconds, _ = measure(lambda: tiles.heights(plan, xy).compute())
        print(f"Two processes: {len(xy):,} heights at random positions in {seconds:.1f} s;", end=" ")
        name = os.path.join(folder, "country.tif")
        seconds, _ = measure(lambda: tiles.write_geotiff(tiles.raster(plan, CELL), name))
        print(f"a GeoTIFF of {os.path.getsize(name) / 1e6:,.0f} MB in {seconds:.1f} s, "
              f"by a process whose peak was {get_peak() / 1e6:.0f} MB.")
        if picture:
            draw(tiles.raster(plan, 50.0), picture)


def draw(cells, picture):
    import matplotlib

    matplotlib.use("Agg")
    from matplotlib.colors import LightSource
    from PIL import Image

    heights = cells.compute()
    land = np.isfinite(heights)
    rows, columns = (slice(*np.flatnonzero(land.any(axis=axis))[[0, -1]]) for axis in (1, 0))
    heights, land = heights[rows, columns], land[rows, columns]
    shaded = LightSource().shade(
        np.where(land, heights, 0), matplotlib.colormaps["gist_earth"], dx=50, dy=50, vert_exag=3, vmin=-900
    )
    shaded[~land, :3] = 0.82, 0.9, 0.95
    image = Image.fromarray((255 * shaded[..., :3]).astype(np.uint8))
    image.quantize(64).save(picture, optimize=True)


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawTextHelpFormatter)
    parser.add_argument("folder")
    parser.add_argument("--triangles", type=int, default=20_000_000)
    parser.add_argument("--small", type=int, default=1_000_000)
    parser.add_argument("--whole", action="store_true")
    parser.add_argument("--relief")
    options = parser.parse_args()
    plans = []
    for count in (options.small, options.triangles):
        for path in make_country(options.folder, count):
            seconds, plan = measure_processor(lambda: tiles.Plan(path, tile=TILE, base=BASE))
            plans.append((path, plan, seconds))
    report_tiles(plans)
    for path, plan, _ in plans[2:]:
        found = report_cluster(plan, path)
    report_products(plans[2][1], options.folder, options.relief)
    if options.whole:
        report_whole(plan, path, found)


if __name__ == "__main__":
    main()
