"""Files: what is read, warned of and refused."""

import dataclasses
import os
import pickle
import shutil
import signal

import kelm_tin
import numpy as np
import pytest
from conftest import TERRAIN

BOW_TIE = "0 0 1, 2 2 1, 2 0 1, 0 2 1, 0 0 1"
TRIANGLES = ["0 0 1, 4 0 2, 0 4 3, 0 0 1", "4 0 2, 4 4 5, 0 4 3, 4 0 2"]


@pytest.fixture
def write(tmp_path):
    """Writes rings as a layer of polygons, in text that GDAL reads."""

    def write_rings(*rings, kind="Polygon", shape="[[%s]]"):
        name = tmp_path / "rings.json"
        features = ",".join(
            '{"type":"Feature","properties":{},"geometry":{"type":"%s","coordinates":%s}}'
            % (kind, shape % ",".join("[%s]" % ",".join(corner.split()) for corner in ring.split(", ")))
            for ring in rings
        )
        name.write_text('{"type":"FeatureCollection","features":[%s]}' % features)
        return name

    return write_rings


def test_datum_and_window(terrain):
    higher = kelm_tin.read(TERRAIN, source="orthometric", output="ellipsoidal")
    assert (terrain.datum, higher.datum) == ("orthometric", "ellipsoidal")
    geoid = higher.points[:, 2] - terrain.points[:, 2]
    assert -34 < geoid.min() < geoid.max() < -28, "the geoid of Tennessee"
    assert "UTM zone 16N" in terrain.crs
    feet = kelm_tin.read(TERRAIN, offset=-286, scale=1 / 0.3048)
    assert np.allclose(feet.points[:, 2] * 0.3048 + 286, terrain.points[:, 2], atol=1e-4)
    xmin, ymin, xmax, ymax = terrain.bounds
    part = kelm_tin.read(TERRAIN, window=(xmin, ymin, xmin + 3000, ymax))
    assert 0.1 < len(part.triangles) / len(terrain.triangles) < 0.4


def test_layers(terrain, write):
    (layer,) = kelm_tin.layers(TERRAIN)
    assert layer.shapes == 17619 and layer.refusal == "" and layer.crs == terrain.crs
    assert np.allclose(layer.bounds, terrain.bounds, atol=1e-3) and layer.heights == (286, 996)
    assert terrain.nbytes > 0.5 * layer.surface_nbytes and layer.load_nbytes > layer.surface_nbytes
    with pytest.warns(kelm_tin.DataWarning, match="declared as a layer of points"):
        (points,) = kelm_tin.layers(write("1 2 3", kind="Point", shape="%s"))
    assert points.number == 1 and "must be defined by polygons" in points.refusal


def test_what_is_left_out_is_a_warning(write, capfd):
    with pytest.warns(kelm_tin.DataWarning) as told:
        surface = kelm_tin.read(write(*TRIANGLES, BOW_TIE))
    assert len(surface.triangles) == 2
    assert any("crosses itself" in str(warning.message) for warning in told)
    assert told[0].filename == __file__
    with pytest.warns(kelm_tin.DataWarning, match="crosses itself"):
        with pytest.raises(kelm_tin.DataError):
            kelm_tin.read(write(BOW_TIE))
    assert capfd.readouterr() == ("", "")


@pytest.mark.filterwarnings("ignore::kelm_tin.DataWarning")
@pytest.mark.parametrize(
    "options, error, message",
    [
        (dict(path="no such file"), OSError, "no such file is not supported"),
        (dict(path="README.md"), OSError, "README.md is not supported"),
        (dict(path="a\0b"), ValueError, "path: expected"),
        (dict(layer=2), kelm_tin.DataError, "vector layer 2"),
        (dict(layer=0), ValueError, "layer: expected an integer from 1 on, got 0"),
        (dict(source="geoid"), ValueError, 'source: expected "orthometric"'),
        (dict(output=3), ValueError, "output: expected"),
        (dict(output="ellipsoidal"), kelm_tin.DataError, ""),
        (dict(source="ellipsoidal", output="other"), kelm_tin.DataError, "output vertical datum may not be"),
        (dict(base=(0, np.nan)), ValueError, "base: expected"),
        (dict(window=(0, 0, np.nan, 1)), ValueError, "window: expected finite"),
        (dict(window=(0, 0, 1, 1)), kelm_tin.DataError, "no polygon of the layer or window"),
        (dict(scale=0.0), kelm_tin.DataError, ""),
        (dict(offset=np.inf), kelm_tin.DataError, "dfOffset must be a finite number"),
    ],
)
def test_refusals(options, error, message):
    with pytest.raises(error, match=message):
        kelm_tin.read(**{"path": TERRAIN, **options})


def test_the_handler_of_gdal_is_left_alone():
    gdal = pytest.importorskip("osgeo.gdal")
    told = []
    gdal.PushErrorHandler(lambda kind, number, text: told.append(text))
    try:
        kelm_tin.read(TERRAIN)
        gdal.Error(gdal.CE_Warning, 1, "still there")
    finally:
        gdal.PopErrorHandler()
    assert told == ["still there"]


def test_windows_of_one_survey_and_one_base(tmp_path):
    path = tmp_path / "a.gpkg"
    shutil.copy(TERRAIN, path)
    survey = pickle.loads(pickle.dumps(kelm_tin.survey(path)))
    (layer,) = kelm_tin.layers(path)
    assert (survey.shapes, survey.bounds, survey.heights, survey.crs) == layer[2:6]
    xmin, ymin, xmax, ymax = survey.bounds
    base = ((xmin + xmax) / 2, (ymin + ymax) / 2)
    whole = kelm_tin.read(path, base=base)
    assert whole.base == base
    xy = np.random.default_rng(1).uniform((xmin, ymin), (xmin + 2000, ymin + 2000), (10_000, 2))
    part = kelm_tin.read(path, base=base, window=(*xy.min(axis=0), *xy.max(axis=0)), survey=survey)
    assert len(part.triangles) < len(whole.triangles) / 10
    assert np.array_equal(part.heights(xy), whole.heights(xy), equal_nan=True)
    assert part.crs == whole.crs is not None
    compound, how = dataclasses.replace(survey, crs="EPSG:32616+5773"), dict(source="orthometric")
    assert kelm_tin.read(path, survey=compound, **how).crs == compound.crs
    for moved in (dict(output="ellipsoidal"), dict(offset=1.0), dict(scale=2.0)):
        flat = kelm_tin.read(path, survey=compound, **how, **moved).crs
        assert "UTM zone 16N" in flat and "EGM96" not in flat
        assert kelm_tin.tiles.Plan(path, tile=2000, survey=compound, **how, **moved).crs == flat
    with pytest.raises(kelm_tin.NothingRead):
        kelm_tin.read(path, window=(xmin, ymin, xmin, ymin), survey=survey)
    os.utime(path, (1, 1))
    with pytest.raises(kelm_tin.DataError, match="written to since"):
        kelm_tin.read(path, survey=survey)


def test_progress_rises_to_its_total():
    for call in (kelm_tin.read, kelm_tin.survey):
        told = []
        call(TERRAIN, progress=lambda *parts: told.append(parts))
        assert {total for _, total in told} == {100} and told[-1] == (100, 100)
        assert told == sorted(told) and 4 < len(told) < 1000


@pytest.mark.parametrize("call", [kelm_tin.read, kelm_tin.survey])
@pytest.mark.parametrize("share", [0, 30, 60, 100])
def test_what_progress_raises_stops_the_work(call, share):
    def stop(done, _):
        if done >= share:
            raise LookupError("of the caller")

    with pytest.raises(LookupError, match="of the caller"):
        call(TERRAIN, progress=stop)
    with pytest.raises(KeyboardInterrupt):
        call(TERRAIN, progress=lambda done, _: done < share or signal.raise_signal(signal.SIGINT))
