"""Heights, lines of sight and rasters of triangulated terrain.

A surface is a set of triangles over scattered points. It comes from a layer of polygons in a file, or
from arrays. Then it answers arrays of questions on all cores:

>>> import kelm_tin
>>> surface = kelm_tin.Surface([[0, 0, 5], [10, 0, 7], [0, 10, 9]], [[0, 1, 2]])
>>> surface.heights([[1.0, 1.0], [20.0, 20.0]])
array([5.6, nan], dtype=float32)

Coordinates are map coordinates, `float64`, in the units of the layer's CRS. Heights are `float32`. A
position without a height gives NaN. Do not fork a process that has used this package (`multiprocessing`
with "fork"): the child would wait for threads that it does not have. Start it with "spawn".
"""

import importlib
from types import ModuleType

from ._native import DataError
from ._native import __version__ as __version__
from ._reading import DataWarning, Layer, NothingRead, Survey, layers, read, survey
from ._surface import Profile, Raster, Surface

__all__ = [
    "DataError",
    "DataWarning",
    "Layer",
    "NothingRead",
    "Profile",
    "Raster",
    "Surface",
    "Survey",
    "layers",
    "read",
    "survey",
]


def __getattr__(name: str) -> ModuleType:
    """Imports `kelm_tin.tiles` when it is first used, since it needs dask."""
    if name == "tiles":
        return importlib.import_module(".tiles", __name__)
    raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
