#!/usr/bin/env python3
"""Measures the heights of kelm_tin beside those of scipy and matplotlib, for report.py.

Usage: arrays.py OUT.json       with the package on PYTHONPATH
"""

import json
import os
import sys
import time

import kelm_tin
import numpy as np
from matplotlib.tri import LinearTriInterpolator, Triangulation
from scipy.interpolate import LinearNDInterpolator
from scipy.spatial import Delaunay

COUNT = 1_000_000
NODES = 224  # a side: 100k triangles


def make_terrain():
    """Nodes 10 m apart with 3 m of jitter, and their Delaunay triangulation."""
    random = np.random.default_rng(1)
    xy = np.stack(np.meshgrid(np.arange(NODES), np.arange(NODES)), axis=-1).reshape(-1, 2) * 10.0
    xy += random.uniform(-3, 3, xy.shape)
    waves = random.uniform(-0.05, 0.05, (2, 8))
    z = 500 + 20 * np.sin(xy @ waves).sum(axis=1)
    return xy, z, Delaunay(xy)


def make_positions(xy):
    low, high = xy.min(axis=0) + 10, xy.max(axis=0) - 10
    side = int(COUNT**0.5)
    grid = np.stack(np.meshgrid(*(np.linspace(low[i], high[i], side) for i in (0, 1))), axis=-1)
    return {"random": np.random.default_rng(2).uniform(low, high, (COUNT, 2)),
            "scanline": grid.reshape(-1, 2).copy()}


def measure(work, least=0.5):
    """Seconds of one call: the best of those that fit into half a second, at least two."""
    best, start, calls = float("inf"), time.perf_counter(), 0
    while calls < 2 or time.perf_counter() - start < least:
        before = time.perf_counter()
        work()
        best = min(best, time.perf_counter() - before)
        calls += 1
    return best


def main(out):
    xy, z, delaunay = make_terrain()
    surface = kelm_tin.Surface(np.column_stack([xy, z]), delaunay.simplices)
    scipy = LinearNDInterpolator(delaunay, z)
    matplotlib = LinearTriInterpolator(Triangulation(*xy.T, delaunay.simplices), z)
    runs = []

    def add(subject, who, seconds, items):
        runs.append({"name": f"python/{subject}/100k/{who}", "items_per_second": items / seconds})

    for order, positions in make_positions(xy).items():
        ours = surface.heights(positions, threads=1)
        theirs = scipy(positions)
        both = np.isfinite(ours) & np.isfinite(theirs)
        if both.mean() < 0.99 or np.abs(ours - theirs)[both].max() > 0.01:
            sys.exit("kelm_tin and scipy disagree")
        columns = positions.T.copy()
        native = surface._native
        for who, work in {
            "ours": lambda: surface.heights(positions, threads=1),
            "two threads": lambda: surface.heights(positions, threads=2),
            "C++ batch": lambda: native.heights(positions, 1, False),
            "scipy": lambda: scipy(positions),
            "matplotlib": lambda: matplotlib(*columns),
        }.items():
            add(order, who, measure(work), COUNT)
    x, y = xy.mean(axis=0).tolist()
    calls = range(10_000)
    add("one position", "ours", measure(lambda: [surface.heights(x, y) for _ in calls]), len(calls))
    with open(out, "w", encoding="utf-8") as file:
        json.dump({"context": {"cores": os.cpu_count()}, "benchmarks": runs}, file)


if __name__ == "__main__":
    main(sys.argv[1])
