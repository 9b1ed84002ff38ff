"""VRE files read into and written from plain objects."""

import struct

import numpy as np
import pytest

from tova import TovaError, UnitError, units, vre

rng = np.random.default_rng(7)
# Quantity keys of vector items 0-22.
QUANTITIES = [100514, 100514, 110030, 100514, 110243, 100514, 100514, 110245, 110246, 100085, 110247, 100515,
              110248, 110248, 110266, 110250, 110258, 110258, 110220, 110220, 110258, 100415, 100144]


def _sample(flag6: int = 1) -> vre.Vre:
    """Two bodies of 3 and 4 panels, every size parameter non-zero, every
    item filled, some items in units other than their first."""
    v = vre.new()
    v.params[:] = [1, 2, 0, 2, 3, 7, flag6, 2]
    v.panel_counts = np.array([3, 4], dtype=np.int32)
    v.names = ["hull", "barge \xe9"]
    v.symmetry = (0, 1)
    v.scalars[0].unit = units.unit("ft/s^2").key
    v.scalars[0].values = 32.174
    v.scalars[1].values = 12.5
    for i in range(23 if flag6 == 1 else 21):
        v.vectors[i] = vre.VreItem(QUANTITIES[i], units.quantity(QUANTITIES[i]).units()[0].key,
                                   rng.normal(size=v.element_count(i)))
    v.vectors[1].unit = units.unit("ft").key
    return v


def test_new_has_the_library_defaults():
    v = vre.new()
    assert v.symmetry == (1, 0) and v.params.tolist() == [0] * 8 and v.names is None and v.vectors == {}
    assert [s.values for s in v.scalars] == [9.80665, 0.0]
    assert v.scalars[0].quantity == 110244 and v.scalars[0].unit_name == units.quantity(110244).units()[0].name


def test_round_trip_keeps_everything(tmp_path):
    v = _sample()
    assert v.panel_total == 7 and v.element_count(1) == 21 and v.element_count(12) == 7 * 3 * 2
    path = tmp_path / "bodies.vre"
    v.write(path)
    back = vre.read(str(path))

    expected_params = v.params.copy()
    expected_params[2] = 7  # derived from the panel counts
    np.testing.assert_array_equal(back.params, expected_params)
    np.testing.assert_array_equal(back.panel_counts, [3, 4])
    assert back.names == v.names and back.symmetry == (0, 1)
    assert [(s.quantity, s.unit, s.values) for s in back.scalars] == \
        [(s.quantity, s.unit, s.values) for s in v.scalars]
    assert sorted(back.vectors) == list(range(23))
    for i, item in v.vectors.items():
        got = back.vectors[i]
        assert (got.quantity, got.unit) == (item.quantity, item.unit), i
        assert got.values.dtype == np.float64
        np.testing.assert_array_equal(got.values, item.values)
    assert back.vectors[1].unit_name == "ft"
    np.testing.assert_allclose(back.vectors[1].to("m"), v.vectors[1].values * 0.3048)


def test_absent_items_and_shapes(tmp_path):
    v = _sample(flag6=0)
    del v.vectors[5]
    v.vectors[12].values = v.vectors[12].values.reshape(7, 3, 2)  # any shape of the right size
    v.names = None
    path = tmp_path / "partial.vre"
    vre.write(path, v)
    back = vre.read(path)
    assert 21 not in back.vectors and 22 not in back.vectors
    np.testing.assert_array_equal(back.vectors[5].values, np.zeros(6))  # written as zeros
    np.testing.assert_array_equal(back.vectors[12].values, v.vectors[12].values.ravel())
    assert back.names == ["", ""]


def test_write_refuses_inconsistent_objects_before_creating_anything(tmp_path):
    path = tmp_path / "never.vre"
    cases = []
    v = _sample(); v.vectors[2].values = v.vectors[2].values[:-1]; cases.append((v, 2013))
    v = _sample(); v.panel_counts = np.array([3], dtype=np.int32); cases.append((v, 2013))
    v = _sample(); v.names = ["only one"]; cases.append((v, 2013))
    v = _sample(); v.names = ["x" * 256, "y"]; cases.append((v, 2010))
    v = _sample(); v.vectors[3].unit = units.unit("m/s").key; cases.append((v, 2020))
    v = _sample(); v.vectors[3].quantity = 110030; cases.append((v, 2010))
    v = _sample(flag6=0); v.vectors[21] = vre.VreItem(100415, 20601, np.zeros(2)); cases.append((v, 2010))
    v = _sample(); v.params = np.array([2**31, 2, 0, 2, 3, 7, 1, 2]); cases.append((v, 2010))
    for v, status in cases:
        with pytest.raises(TovaError) as info:
            v.write(path)
        assert info.value.status == status, info.value
        assert not path.exists()
    v = _sample()
    v.scalars[1].unit = units.unit("kg").key
    with pytest.raises(UnitError):
        v.write(path)


def test_read_failures_name_the_file(tmp_path):
    with pytest.raises(TovaError) as info:
        vre.read(tmp_path / "missing.vre")
    assert info.value.status == 2003 and "missing.vre" in str(info.value)
    junk = tmp_path / "junk.vre"
    junk.write_bytes(b"this is not a record file at all" * 4)
    with pytest.raises(TovaError) as info:
        vre.read(junk)
    assert info.value.status == 2014


def test_a_body_count_beyond_the_file_is_refused(tmp_path):
    v = vre.new()
    v.params[5] = 0x5A5A  # marks the place of the body count in the file
    v.params[1] = 1
    v.panel_counts = np.array([2], dtype=np.int32)
    path = tmp_path / "bodies.vre"
    v.write(path)
    data = path.read_bytes()
    marker = bytes([4]) + struct.pack("<Ii", 1, 0x5A5A) + bytes([4]) + struct.pack("<Ii", 1, 1)
    at = data.index(marker) + len(marker) - 4
    path.write_bytes(data[:at] + struct.pack("<i", 1_000_000) + data[at + 4:])
    with pytest.raises(TovaError) as info:
        vre.read(path)
    assert info.value.status == 2013 and "1000000" in str(info.value)
