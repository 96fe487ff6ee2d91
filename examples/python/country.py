"""Writes a made-up country of about so many triangles, in each of the formats named:

    country.py 1000000 country.fgb country.gpkg

Nodes are 10 m apart with 3 m of jitter. Below the level of the sea there is nothing.
"""

import os
import sys
from itertools import product

import numpy as np
from osgeo import gdal, ogr, osr

DRIVERS = {".fgb": ("FlatGeobuf", []), ".gpkg": ("GPKG", ["SPATIAL_INDEX=NO"])}
SPACING, JITTER = 10.0, 3.0
WEST, SOUTH = 500000.0, 4649776.0
LAND = 0.8  # share of the square above the sea
STEEPNESS = 1.8  # falling spectrum: the larger, the smoother
WKB = np.dtype([("order", "u1"), ("type", "<u4"), ("rings", "<u4"), ("points", "<u4"), ("xyz", "<f8", (4, 3))])
PATCH = 16  # cells on a side of what is written before the next: files stay sorted by place


def make_heights(side, random):
    """Noise whose spectrum falls with a power of the frequency: (side, side), zero at the sea."""
    size = 1 << (side - 1).bit_length()
    spectrum = np.fft.rfft2(random.standard_normal((size, size)))
    frequency = np.hypot(np.fft.fftfreq(size)[:, np.newaxis], np.fft.rfftfreq(size))
    frequency[0, 0] = np.inf
    heights = np.fft.irfft2(spectrum * frequency**-STEEPNESS, (size, size))[:side, :side]
    heights -= np.quantile(heights, 1 - LAND)
    return heights * (0.04 * SPACING * side / np.abs(heights).max())


def make_polygons(nodes, turned):
    """The triangles of some rows and columns of nodes, as WKB with three corners each."""
    a, b, c, d = nodes[:-1, :-1], nodes[:-1, 1:], nodes[1:, 1:], nodes[1:, :-1]
    turn = turned[..., np.newaxis, np.newaxis]
    one = np.where(turn, np.stack((a, b, d, a), axis=2), np.stack((a, b, c, a), axis=2))
    two = np.where(turn, np.stack((b, c, d, b), axis=2), np.stack((a, c, d, a), axis=2))
    corners = np.stack((one, two), axis=2).reshape(-1, 4, 3)
    corners = corners[(corners[..., 2] > 0).all(axis=1)]
    polygons = np.empty(len(corners), WKB)
    polygons["order"], polygons["type"], polygons["rings"], polygons["points"] = 1, 0x80000003, 1, 4
    polygons["xyz"] = corners
    return polygons


def write_layer(path, nodes, turned):
    driver, options = DRIVERS[os.path.splitext(path)[1]]
    if os.path.exists(path):
        os.remove(path)
    file = gdal.GetDriverByName(driver).Create(path, 0, 0, 0, gdal.GDT_Unknown)
    crs = osr.SpatialReference()
    crs.ImportFromEPSG(32633)
    layer = file.CreateLayer("terrain", crs, ogr.wkbPolygon25D, options)
    count = 0
    feature = ogr.Feature(layer.GetLayerDefn())  # one for all: to make one takes a quarter of the time
    file.StartTransaction()
    starts = range(0, len(turned), PATCH)
    for row, column in product(starts, starts):
        patch = nodes[row : row + PATCH + 1, column : column + PATCH + 1]
        polygons = make_polygons(patch, turned[row : row + PATCH, column : column + PATCH])
        data = polygons.tobytes()
        for start in range(0, len(data), WKB.itemsize):
            feature.SetFID(ogr.NullFID)
            feature.SetGeometryDirectly(ogr.CreateGeometryFromWkb(data[start : start + WKB.itemsize]))
            layer.CreateFeature(feature)
        count += len(polygons)
    file.CommitTransaction()
    return count


def main():
    ogr.UseExceptions()
    osr.UseExceptions()
    random = np.random.default_rng(1)
    cells = max(1, round((int(sys.argv[1]) / 2 / LAND) ** 0.5))
    heights = make_heights(cells + 1, random)
    grid = np.meshgrid(np.arange(cells + 1.0), np.arange(cells + 1.0))
    plan = [SPACING * axis + random.uniform(0, JITTER, axis.shape) for axis in grid]
    nodes = np.stack((WEST + plan[0], SOUTH + plan[1], heights), axis=-1)
    turned = random.integers(0, 2, (cells, cells)).astype(bool)
    for path in sys.argv[2:]:
        print(f"{path}: {write_layer(path, nodes, turned):,} triangles, {os.path.getsize(path):,} bytes")


if __name__ == "__main__":
    main()
