"""netCDF (CF) and gridded data files both ways: CF files of the shapes other
producers write come back bit for bit through a gridded data file, NaN
becomes the delete value, a native file gets CF attributes, and the
converter picks its direction and refuses what it cannot map."""

import subprocess
import shutil

import numpy as np
import pytest

import tova

xr = pytest.importorskip("xarray")
cf_samples = pytest.importorskip("cf_samples")
from tova import convert  # noqa: E402
from tova.xarray_backend import TovaBackendEntrypoint  # noqa: E402

import grd_samples  # noqa: E402


def _bits(values: np.ndarray) -> np.ndarray:
    return values.view(f"u{values.dtype.itemsize}") if values.dtype.kind == "f" else values


@pytest.mark.parametrize("shape", sorted(cf_samples.SHAPES))
def test_cf_file_comes_back_through_a_gridded_file(shape, tmp_path):
    nc = cf_samples.SHAPES[shape](tmp_path / "in.nc")
    grd, back = tmp_path / "mid.grd", tmp_path / "back.nc"
    assert convert.main([str(nc), str(grd)]) == 0
    assert convert.main([str(grd), str(back)]) == 0

    # The decoded view of the gridded file is the dataset of the netCDF file.
    with xr.open_dataset(nc) as a, xr.open_dataset(grd, engine=TovaBackendEntrypoint) as b:
        xr.testing.assert_identical(a, b)
    # The netCDF file written back holds the same bits, names, dimensions and attributes.
    with xr.open_dataset(nc, decode_cf=False) as a, xr.open_dataset(back, decode_cf=False) as b:
        assert set(a.variables) == set(b.variables) and a.attrs == b.attrs
        for name, var in a.variables.items():
            other = b[name]
            assert other.dims == var.dims and other.dtype == var.dtype, name
            np.testing.assert_array_equal(_bits(other.values), _bits(var.values), err_msg=name)
            attrs = {k: v for k, v in var.attrs.items() if k != "units" or "since" not in v}
            assert {k: v for k, v in other.attrs.items() if k in attrs} == pytest.approx(attrs, nan_ok=True), name

    with tova.open(grd) as f:
        header = {"regular": ("F_TM_NEQ_AXIS", "EqD2"), "projected": ("F_CAL_EQ_AXIS", "EqD2"),
                  "stations": ("F_CAL_NEQ_AXIS", "EqD1"), "curvilinear": ("F_CAL_EQ_AXIS", "CurveLinearD2")}[shape]
        assert (f.time_axis.name, f.items[0].axis.name) == header
        if shape == "projected":
            assert "Transverse Mercator" in f.projection.name and f.projection.longitude == 9.0
        if shape == "regular":  # kg m-2 s-1 matched through UDUNITS; the fill value is a delete value
            assert f.items[0].unit_name == "kg/m^2/s" and f.items[0].quantity_name == "PrecipitationFlux"
            assert f.item_extremes(0)[2] == 6 * 2
        if shape == "curvilinear":
            assert f.items[0].axis.unit_name == "deg" and f.item_extremes(0)[2] == 3 + 1


def test_nan_is_written_as_the_delete_value(tmp_path):
    level = np.array([[1.0, np.nan], [np.nan, 4.0]], dtype=np.float32)
    ds = xr.Dataset({"level": (("time", "y", "x"), level[None], {"units": "m"})},
                    coords={"time": np.array(["2024-01-01T00:00"], dtype="datetime64[ns]")})
    tova.to_grd(ds, tmp_path / "a.grd")
    with tova.create(tmp_path / "b.grd", [tova.Item("level", "WaterLevel", "m", np.float32,
                                                    tova.Axis.equidistant([2, 2]))],
                     tova.TimeAxis.equidistant(60.0)) as w:
        w.append([level])
    assert np.isnan(level).sum() == 2  # the caller's array is left alone
    for name in ("a.grd", "b.grd"):
        with tova.open(tmp_path / name, mask=False) as f:
            raw = f.read(0, 0)
            np.testing.assert_array_equal(raw == np.float32(f.delete_values.float), np.isnan(level))
            assert f.item_extremes(0)[2] == 2


def test_native_file_gets_cf_attributes(tmp_path):
    path = tmp_path / "eq.grd"
    with tova.create(path, [tova.Item("Water level", "WaterLevel", "m", np.float32,
                                      tova.Axis.equidistant([4, 3], [500000.0, 6000000.0], [100.0, 100.0]))],
                     tova.TimeAxis.calendar("2024-03-21", step=3600.0), title="tide",
                     projection=tova.Projection("UTM-32N", 9.0, 54.0),
                     custom_blocks={"note": "made for a test"}) as w:
        for t in range(3):
            w.append([np.full((3, 4), t, np.float32)])
    out = tmp_path / "eq.nc"
    assert convert.main([str(path), str(out), "--format", "classic"]) == 0
    with xr.open_dataset(out) as ds:
        assert ds.attrs["Conventions"] == "CF-1.10" and ds.attrs["custom_block_note"] == "made for a test"
        level = ds["Water_level"]
        assert level.attrs["long_name"] == "Water level" and level.attrs["grid_mapping"] == "crs"
        assert level.attrs["standard_name"] == "water_surface_height_above_reference_datum"
        assert ds.crs.attrs["grid_mapping_name"] == "transverse_mercator"
        assert ds.x.attrs["standard_name"] == "projection_x_coordinate" and ds.y.attrs["axis"] == "Y"
        assert str(ds.time.values[-1]).startswith("2024-03-21T02:00")
    if shutil.which("ncdump"):
        header = subprocess.run(["ncdump", "-h", str(out)], capture_output=True, text=True, check=True).stdout
        assert 'time:units = "seconds since 2024-03-21' in header and 'time:calendar = "proleptic_gregorian"' in header


def test_lon_lat_items_and_curvilinear_coordinates(tmp_path):
    nodes_x, nodes_y = np.meshgrid(np.arange(4.0), np.arange(3.0))
    path = tmp_path / "c.grd"
    items = [tova.Item("u", "VelocityX", "m/s", np.float32, tova.Axis.curvilinear([nodes_x, nodes_y], unit="deg")),
             tova.Item("flux", "PrecipitationFlux", "kg/m^2/s", np.float64,
                       tova.Axis.equidistant([3], [0.5], [1.0], unit="deg"))]
    with tova.create(path, items, tova.TimeAxis.equidistant(1.0)) as w:
        w.append([np.zeros((2, 3), np.float32), np.ones(3)])
    with xr.open_dataset(path, engine=TovaBackendEntrypoint) as ds:
        assert ds.u.attrs["units"] == "m s-1" and ds.flux.attrs["units"] == "kg m-2 s-1"
        np.testing.assert_array_equal(ds.lon, [[0.5, 1.5, 2.5], [0.5, 1.5, 2.5]])
        assert ds.lat.attrs["units"] == "degrees_north" and ds.lat.dims == ds.u.dims[1:]
        assert ds.x_1.attrs["standard_name"] == "longitude" and ds.x_1.attrs["units"] == "degrees_east"


def test_refusals_name_the_variable_and_write_nothing(tmp_path, capsys):
    times = np.array(["2000-01-01T00", "2000-01-01T06"], dtype="datetime64[ns]")
    ds = xr.Dataset({"a": (("time", "x"), np.ones((2, 3)), {"units": "furlong/fortnight"}),
                     "label": (("time",), np.array(["p", "q"])),
                     "b": (("time", "x"), np.zeros((2, 3)), {"units": "mm"})}, coords={"time": times})
    nc, out = tmp_path / "in.nc", tmp_path / "out.grd"
    ds.to_netcdf(nc)
    assert convert.main([str(nc), str(out)]) == 1
    assert "variable 'a': unit 'furlong/fortnight'" in capsys.readouterr().err and not out.exists()
    assert convert.main([str(nc), str(out), "--unit-map", "a=m/s"]) == 1
    assert "variable 'label' cannot be written" in capsys.readouterr().err and not out.exists()
    assert convert.main([str(nc), str(out), "--unit-map", "a=m/s", "--skip-unmappable"]) == 0
    assert "'label' left out" in capsys.readouterr().err
    with tova.open(out) as f:
        assert [(it.name, it.unit_name) for it in f.items] == [("a", "m/s"), ("b", "mm")]
    (tmp_path / "text.txt").write_text("hello")
    assert convert.main([str(tmp_path / "text.txt"), str(out)]) == 1
    assert "neither a gridded data file" in capsys.readouterr().err


def test_dask_dataset_and_accessor(tmp_path):
    path = grd_samples.write_equidistant(tmp_path / "eq.grd")
    with xr.open_dataset(path, engine=TovaBackendEntrypoint, chunks={"time": 1}) as ds:
        ds.tova.to_grd(tmp_path / "copy.grd")
        with xr.open_dataset(tmp_path / "copy.grd", engine=TovaBackendEntrypoint) as copy:
            xr.testing.assert_identical(ds.load(), copy)



@pytest.mark.filterwarnings("ignore:.*CF metadata left aside")
@pytest.mark.parametrize("meta", ["{not json", '{"version": 1, "variables": 5}',
                                  '{"version": 1, "variables": [{"name": "a", "kind": "item", "number": 1, '
                                  '"dims": ["t", "q", "r"]}]}'])
def test_metadata_that_does_not_fit_is_left_aside(meta, tmp_path):
    path = tmp_path / "h.grd"
    with tova.create(path, [tova.Item("a", "WaterLevel", "m", np.float32, tova.Axis.equidistant([2]))],
                     tova.TimeAxis.equidistant(1.0), custom_blocks={"CF_METADATA": meta}) as w:
        w.append([np.array([1.0, 2.0], np.float32)])
    with xr.open_dataset(path, engine=TovaBackendEntrypoint) as ds:
        np.testing.assert_array_equal(ds.a.values, [[1.0, 2.0]])
