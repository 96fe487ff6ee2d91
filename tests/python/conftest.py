import os
import pathlib

import kelm_tin
import numpy as np
import pytest

ROOT = pathlib.Path(__file__).resolve().parents[2]
TERRAIN = str(ROOT / "data" / "jacksboro.gpkg")


@pytest.fixture(autouse=True, scope="session")
def in_root():
    os.chdir(ROOT)


@pytest.fixture(scope="session")
def terrain():
    return kelm_tin.read(TERRAIN, source="orthometric")


@pytest.fixture
def square():
    """Two triangles over ten by ten map units, 5 high in the west and 15 in the east."""
    points = [[0, 0, 5], [10, 0, 15], [10, 10, 15], [0, 10, 5]]
    return kelm_tin.Surface(np.array(points) + [500000.37, 4649776.81, 0], [[0, 1, 2], [0, 2, 3]])
