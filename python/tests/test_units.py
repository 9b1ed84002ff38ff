"""Quantity and unit look-ups and conversions through libqty."""

import numpy as np
import pytest

from tova import UnitError, units


def test_lookups_by_key_text_and_object():
    wl = units.quantity("WaterLevel")
    assert wl.key == 40101 and wl.description
    assert units.quantity(40101) == wl == units.quantity("waterlevel") == units.quantity(wl)
    assert units.quantity(np.int32(40101)) == wl
    ft = units.unit("ft")
    assert ft == units.unit(ft.key) == units.unit(ft) and str(ft) == "ft"
    assert [u.name for u in units.units_of("Temperature")] == ["degC", "K", "degF"]
    assert wl.units()[0].name == "m"
    assert units.fits("WaterLevel", "ft") and not units.fits("WaterLevel", "m/s")

    assert wl in units.quantities()
    names = [u.name for u in units.all_units()]
    assert "m" in names and "degF" in names and len(names) == len(set(names))

    for bad in (lambda: units.quantity("NoSuchQuantity"), lambda: units.quantity(12345678),
                lambda: units.unit("furlongs"), lambda: units.unit(-5)):
        with pytest.raises(UnitError) as info:
            bad()
        assert info.value.status == 2010


def test_scalar_conversions_are_exact_and_affine():
    assert units.convert(1.0, "ft", "m") == 0.3048
    assert units.convert(0, "degC", "degF") == pytest.approx(32.0)
    assert units.convert(100.0, "degC", "degF") == pytest.approx(212.0)
    assert isinstance(units.convert(np.float32(2), "m", "m"), float)
    # The delete value passes untouched, the default one or one given.
    assert units.convert(-1e-255, "degC", "K") == -1e-255
    assert units.convert(-999.0, "degC", "K", delete_value=-999.0) == -999.0
    with pytest.raises(UnitError) as info:
        units.convert(1.0, "m", "kg")
    assert info.value.status == 2020 and "'m'" in str(info.value)


def test_array_conversions_keep_shape_type_and_delete_values():
    src = np.array([[0.0, 100.0, -1e-255], [np.nan, -40.0, 10.0]])
    before = src.copy()
    out = units.convert(src, "degC", "degF")
    assert out.shape == (2, 3) and out.dtype == np.float64 and out is not src
    np.testing.assert_array_equal(src, before)
    np.testing.assert_allclose(out, [[32.0, 212.0, -1e-255], [np.nan, -40.0, 50.0]])

    single = units.convert(np.array([1.0, -1e-35, 2.0], dtype=np.float32), "m", "cm")
    assert single.dtype == np.float32
    np.testing.assert_array_equal(single, np.array([100.0, -1e-35, 200.0], dtype=np.float32))

    assert units.convert([1, 2], "km", "m").tolist() == [1000.0, 2000.0]
    odd = np.arange(12, dtype=">f8").reshape(3, 4)[:, ::2]  # foreign byte order, strided
    np.testing.assert_array_equal(units.convert(odd, "m", "mm"), odd * 1000)
    np.testing.assert_array_equal(units.convert(np.array([5.0, 7.0]), "m", "m", delete_value=7.0), [5.0, 7.0])

    with pytest.raises(UnitError):
        units.convert(np.zeros(0), "m", "s")  # units are checked even with nothing to convert
    assert units.convert(np.zeros((0, 3)), "m", "ft").shape == (0, 3)


def test_in_place_conversion_changes_the_callers_array_only_when_it_can():
    a = np.array([1.0, 2.0], dtype=np.float32)
    assert units.convert(a, "m", "mm", inplace=True) is a
    np.testing.assert_array_equal(a, [1000.0, 2000.0])
    for bad in (np.array([1, 2]), np.zeros((4, 4))[:, ::2], np.zeros(3, dtype=">f8")):
        with pytest.raises(ValueError):
            units.convert(bad, "m", "mm", inplace=True)


def test_user_units_are_process_wide_and_convert_both_ways():
    assert units.user_unit("WaterLevel").name == "m"
    units.set_user_unit("WaterLevel", "ft")
    try:
        assert units.user_unit("WaterLevel").name == "ft"
        assert units.to_user_unit(0.3048, "WaterLevel", "m") == pytest.approx(1.0)
        back = units.from_user_unit(np.array([1.0, -1e-255]), "WaterLevel", "cm")
        np.testing.assert_allclose(back, [30.48, -1e-255])
        with pytest.raises(UnitError):
            units.to_user_unit(1.0, "WaterLevel", "m/s")
        with pytest.raises(UnitError) as info:
            units.set_user_unit("WaterLevel", "kg")
        assert info.value.status == 2020
    finally:
        units.set_user_unit("WaterLevel", "m")


def test_unknown_names_suggest_the_closest_known_ones():
    with pytest.raises(UnitError, match=r"unknown unit 'm/sec' \(did you mean 'm/s'"):
        units.unit("m/sec")
    with pytest.raises(UnitError, match=r"did you mean 'WaterLevel'"):
        units.quantity("waterlvel")
    with pytest.raises(UnitError) as info:
        units.unit("qqqqqq")
    assert "did you mean" not in str(info.value)
