"""Gridded data files: headers, items, axes and static items written from
Python and read back."""

import numpy as np
import pytest

import tova
from tova import Axis, DeleteValues, Item, Projection, StaticItem, TimeAxis, TovaError, UnitError, units
from tova.errors import F_ERR_ARGUMENT, F_ERR_OPEN, F_ERR_VALUE


def _items():
    nodes_x, nodes_y = np.meshgrid(np.linspace(0, 30, 4), np.linspace(100, 120, 3))
    return [
        Item("gauge", "WaterLevel", "m", np.float64),
        Item("section", "Velocity", "m/s", axis=Axis.equidistant([5], [10.0], [2.5], unit="km")),
        Item("water_level", "WaterLevel", "ft", axis=Axis.equidistant([4, 3], [100.0, 200.0], [50.0, 25.0])),
        Item("temperature", "Temperature", "degC", axis=Axis.equidistant([2, 3, 4])),
        Item("cells", "WaterDepth", "m", np.int32, axis=Axis.nonequidistant([[0.0, 1.0, 3.0, 7.0]]), value_type=3),
        Item("neq2", "WaterDepth", "m", np.uint16, axis=Axis.nonequidistant([[0, 1, 2], [0, 10, 30, 60]])),
        Item("curved", "WaterDepth", "m", np.float32, axis=Axis.curvilinear([nodes_x, nodes_y])),
    ]


def test_header_items_and_static_items_round_trip(tmp_path):
    path = tmp_path / "model.grd"
    bathymetry = np.arange(12, dtype=np.float32).reshape(3, 4) - 5.5
    mask = np.array([1, 0, 1, 1, 0], dtype=np.int32)
    statics = [StaticItem("bathymetry", "WaterDepth", "m", values=bathymetry,
                          axis=Axis.equidistant([4, 3], [100.0, 200.0], [50.0, 25.0])),
               StaticItem("mask", "WaterDepth", "m", values=mask)]
    with tova.create(path, _items(), TimeAxis.equidistant(step=1800.0, start=60.0), title="Harbour run 7",
                     app_title="hydro", app_version=312, data_type=-5,
                     projection=Projection("UTM-32", 9.0, 0.5, 1.25),
                     delete_values=DeleteValues(float=-999.0, int=-1), static_items=statics,
                     custom_blocks={"coefficients": np.array([1.5, 2.5]), "note": "calm"}) as w:
        assert w.steps_written == 0 and not w.closed
    assert w.closed

    with tova.open(path) as f:
        assert (f.title, f.app_title, f.app_version, f.data_type) == ("Harbour run 7", "hydro", 312, -5)
        assert (f.file_type, f.file_type_name, f.stats_type) == (1, "F_EQTIME_FIXEDSPACE_ALLITEMS", 1)
        assert f.projection == Projection("UTM-32", 9.0, 0.5, 1.25)
        assert f.delete_values.float == -999.0 and f.delete_values.int == -1
        assert f.delete_values.double == -1e-255 and f.delete_values.unsigned == 2147483647
        assert not f.compressed

        ta = f.time_axis
        assert (ta.kind, ta.name, ta.unit.name, ta.start, ta.step, ta.count) == (1, "F_TM_EQ_AXIS", "s", 60.0,
                                                                                 1800.0, 0)
        assert f.n_steps == 0 and f.times.shape == (0,) and f.datetimes is None

        blocks = {b.name: b for b in f.custom_blocks}
        np.testing.assert_array_equal(blocks["coefficients"].values, [1.5, 2.5])
        assert blocks["note"].values.tobytes() == b"calm" and blocks["note"].simple_type == 3

        expected = _items()
        assert [it.name for it in f.items] == [it.name for it in expected]
        assert [it.number for it in f.items] == list(range(1, 8))
        for got, want in zip(f.items, expected):
            assert got.dtype == want.dtype, got.name
            assert got.quantity == units.quantity(want.quantity), got.name
            assert got.unit == units.unit(want.unit), got.name
            assert (got.axis.kind, got.axis.sizes, got.shape) == (want.axis.kind, want.axis.sizes, want.shape)
            assert got.axis.unit_name == want.axis.unit_name
            assert got.axis.origin == want.axis.origin and got.axis.step == want.axis.step
            assert len(got.axis.coords) == len(want.axis.coords)
            for a, b in zip(got.axis.coords, want.axis.coords):
                if got.axis.name == "NeqD1":  # one point per element: the last boundary continues the spacing
                    a, b = a[:-1], b[:-1]
                np.testing.assert_array_equal(a, b)

        gauge, section, level, temp, cells, neq2, curved = f.items
        assert gauge.shape == () and gauge.dims == () and gauge.axis.name == "EqD0"
        assert level.shape == (3, 4) and level.dims == ("y", "x") and level.axis.name == "EqD2"
        assert temp.shape == (4, 3, 2) and temp.dims == ("z", "y", "x")
        assert cells.value_type == 3 and cells.shape == (3,)
        np.testing.assert_array_equal(cells.axis.coords[0], [0.0, 1.0, 3.0, 5.0])
        np.testing.assert_array_equal(cells.axis.coordinates()["x"], [0.0, 1.0, 3.0])
        np.testing.assert_array_equal(neq2.axis.coordinates()["y"], [5.0, 20.0, 45.0])
        np.testing.assert_allclose(section.axis.coordinates()["x"], [10.0, 12.5, 15.0, 17.5, 20.0])
        assert neq2.shape == (3, 2) and curved.shape == (2, 3) and curved.axis.node_shape == (3, 4)
        assert f.item("water_level") is level and f.item(-1) is curved and f.item(level) is level

        assert [s.name for s in f.static_items] == ["bathymetry", "mask"]
        bathy = f.static_item("bathymetry")
        assert bathy.dtype == np.float32 and bathy.axis.sizes == (4, 3) and bathy.number == 1
        np.testing.assert_array_equal(bathy.values, bathymetry)
        np.testing.assert_array_equal(f.static_item(1).values, mask)
        assert f.static_item(1).axis.name == "EqD1"
    assert f.closed


def test_calendar_axes_keep_their_start_date(tmp_path):
    item = [Item("level", "WaterLevel", "m")]
    eq = tmp_path / "eq.grd"
    tova.create(eq, item, TimeAxis.calendar("2021-03-04 05:06:07", step=0.5, unit="h", offset=2.0)).close()
    with tova.open(eq) as f:
        ta = f.time_axis
        assert (ta.kind, ta.name, ta.unit.name, ta.start, ta.step) == (3, "F_CAL_EQ_AXIS", "h", 2.0, 0.5)
        assert ta.start_date == np.datetime64("2021-03-04T05:06:07") and ta.start_text == ("2021-03-04", "05:06:07")
        assert ta.to_datetime([0.0, 1.5])[1] == np.datetime64("2021-03-04T06:36:07")

    neq = tmp_path / "neq.grd"
    tova.create(neq, item, TimeAxis.calendar(np.datetime64("1999-12-31T23:00"), unit="min")).close()
    with tova.open(neq) as f:
        assert (f.file_type, f.time_axis.kind, f.time_axis.name) == (4, 4, "F_CAL_NEQ_AXIS")
        assert f.time_axis.start_date == np.datetime64("1999-12-31T23:00:00")
        assert f.time_axis.from_datetime("2000-01-01T00:30") == 90.0

    # Stored texts whose fields are out of range roll over, as the library's dates do.
    assert tova.grd._parse_start("2024-13-45", "25:00:00") == np.datetime64("2025-02-15T01:00:00")
    assert tova.grd._parse_start("20x4-01-01", "00:00:00") is None
    with pytest.raises(TovaError, match="whole seconds"):
        TimeAxis.calendar("2020-01-01T00:00:00.25", step=1.0)


def test_refusals_raise_with_the_library_status(tmp_path):
    with pytest.raises(TovaError) as err:
        tova.open(tmp_path / "missing.grd")
    assert err.value.status == F_ERR_OPEN and "missing.grd" in str(err.value)

    (tmp_path / "junk.grd").write_bytes(b"not a record file at all" * 10)
    with pytest.raises(TovaError) as err:
        tova.open(tmp_path / "junk.grd")
    assert err.value.status >= 2000

    with pytest.raises(UnitError) as err:
        tova.create(tmp_path / "u.grd", [Item("level", "WaterLevel", "m/s")], TimeAxis.equidistant(60.0))
    assert err.value.status == 2020 and "level" in str(err.value)

    # An equidistant time axis belongs to the equidistant file types.
    with pytest.raises(TovaError) as err:
        tova.create(tmp_path / "t.grd", [Item("level", "WaterLevel", "m")], TimeAxis.equidistant(60.0), file_type=4)
    assert err.value.status == F_ERR_ARGUMENT
    # A step that is not above zero is the library's to refuse.
    with pytest.raises(TovaError) as err:
        tova.create(tmp_path / "s.grd", [Item("level", "WaterLevel", "m")], TimeAxis.equidistant(0.0))
    assert err.value.status == F_ERR_ARGUMENT

    # A create that fails after the file was made leaves no file behind.
    with pytest.raises(UnitError):
        tova.create(tmp_path / "st.grd", [Item("level", "WaterLevel", "m")], TimeAxis.equidistant(60.0),
                    static_items=[StaticItem("bad", "WaterDepth", "m/s", values=np.zeros(3))])
    assert not (tmp_path / "st.grd").exists()

    # 4-D axes live in memory only: a file refuses them.
    volume = Item("volume", "WaterLevel", "m", axis=Axis.equidistant([2, 2, 2, 3], [0, 0, 0, 5], [1, 1, 1, 0.5]))
    assert volume.shape == (3, 2, 2, 2) and volume.dims == ("t", "z", "y", "x")
    with pytest.raises(TovaError) as err:
        tova.create(tmp_path / "v.grd", [volume], TimeAxis.equidistant(60.0))
    assert err.value.status == F_ERR_VALUE
    with pytest.raises(TovaError) as err:
        Item("flag", "WaterLevel", "m", np.int64)
    assert err.value.status == F_ERR_VALUE
    with pytest.raises(TovaError):
        tova.create(tmp_path / "d.grd", [Item("a", "WaterLevel", "m"), Item("a", "WaterLevel", "m")],
                    TimeAxis.equidistant(1.0))

    path = tmp_path / "ok.grd"
    tova.create(path, [Item("level", "WaterLevel", "m")], TimeAxis.equidistant(60.0)).close()
    f = tova.open(path)
    f.close()
    f.close()  # a second close is harmless
    with pytest.raises(TovaError, match="closed") as err:
        f.read("level", 0)
    assert err.value.status == F_ERR_ARGUMENT
