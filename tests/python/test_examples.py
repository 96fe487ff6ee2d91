"""The programs to copy, as a user runs them."""

import subprocess
import sys

import pytest
from conftest import ROOT, TERRAIN

PLACES = str(ROOT / "data" / "jacksboro_places.csv")


@pytest.mark.parametrize(
    "name, arguments, needs, expected",
    [
        ("heights_of_csv", [TERRAIN, PLACES, "OUT.csv"], "pandas", "long ridge 746660.000 4048120.000 643.01"),
        ("raster_to_geotiff", [TERRAIN, "OUT.tif", "50"], "rasterio", "276 x 285 cells, 74040 with"),
        ("points_to_difference", [TERRAIN], "scipy", "volume 39264 of 39270"),
        ("sight_table", [TERRAIN, PLACES, "25"], "pandas", "valley floor"),
    ],
)
def test_example(name, arguments, needs, expected, tmp_path):
    pytest.importorskip(needs)
    program = [sys.executable, str(ROOT / "examples" / "python" / f"{name}.py")]
    paths = [each.replace("OUT", str(tmp_path / "out")) for each in arguments]
    run = subprocess.run(program + paths, stdout=subprocess.PIPE, text=True, check=True)
    assert expected in run.stdout


def test_the_picture_of_the_guide_is_what_its_program_draws(tmp_path):
    image = pytest.importorskip("matplotlib.image")
    program = ROOT / "docs" / "guide" / "programs" / "python" / "relief.py"
    subprocess.run([sys.executable, program, TERRAIN, tmp_path / "drawn.png"], check=True)
    drawn = image.imread(tmp_path / "drawn.png")
    shown = image.imread(ROOT / "docs" / "guide" / "python.png")
    assert drawn.shape == shown.shape
    assert abs(drawn - shown).mean() < 0.01, "letters may differ between versions of matplotlib"
