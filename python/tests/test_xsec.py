"""Cross-section files read into and written from plain objects."""

import struct

import numpy as np
import pytest

from tova import TovaError, vre, xsec

rng = np.random.default_rng(11)


def _section(primary: str, key: float, secondary: str, n: int, **extra) -> xsec.CrossSection:
    return xsec.CrossSection(
        primary, secondary, key,
        raw=rng.normal(size=(4, n)), raw_marks=rng.integers(0, 65535, size=(2, n), dtype=np.uint16),
        selection=rng.normal(size=n + 1), processed=rng.normal(size=(6, n + 2)), coords=rng.normal(size=(3, n)),
        **extra)


def _same(a: xsec.CrossSection, b: xsec.CrossSection) -> None:
    assert (a.keys, a.extra_name) == (b.keys, b.extra_name)
    for attr in ("raw", "raw_marks", "selection", "processed", "coords"):
        got, want = getattr(a, attr), getattr(b, attr)
        assert got.dtype == want.dtype and got.shape == want.shape, attr
        np.testing.assert_array_equal(got, want)


def test_round_trip_sorts_by_key_and_keeps_every_set(tmp_path):
    words = np.arange(25, dtype=np.uint16)
    values = np.linspace(-1, 1, 23)
    written = [
        _section("river", 250.0, "2024", 5, extra_name="surveyed", header_words=words, header_values=values),
        _section("River", 100.5, "2024", 3),
        _section("canal", 7.0, "old", 0),
    ]
    path = tmp_path / "sections.xfs"
    xsec.write(path, written)
    assert xsec.version(path) == 106

    back = xsec.read(path)
    assert [s.keys for s in back] == [("canal", "old", 7.0), ("River", "2024", 100.5), ("river", "2024", 250.0)]
    for got, want in zip(back, [written[2], written[1], written[0]]):
        _same(got, want)
    np.testing.assert_array_equal(back[2].header_words, words)
    np.testing.assert_array_equal(back[2].header_values, values)
    # Headers left to the library get its defaults; so does the extra name.
    assert back[0].extra_name == " " and back[0].header_words[23] == 2 and back[0].header_values[15] == 0.001
    assert back[0].raw.shape == (4, 0) and back[0].selection.shape == (1,)

    keys = xsec.read(path, keys_only=True)
    assert [s.keys for s in keys] == [s.keys for s in back]
    assert all(s.raw.shape == (4, 0) and s.coords.shape == (3, 0) and s.selection.size == 0 for s in keys)
    np.testing.assert_array_equal(keys[2].header_words, words)


def _record(code: int, fmt: str, values) -> bytes:
    data = struct.pack(f"<{len(values)}{fmt}", *values)
    return bytes([code]) + struct.pack("<I", len(values)) + data


def _block(tag: int, *records: bytes) -> bytes:
    return b"\xfe" + struct.pack("<H", tag) + b"".join(records) + b"\xff"


def test_a_cross_section_with_malformed_data_is_left_out_with_a_warning(tmp_path):
    path = tmp_path / "damaged.xfs"
    xsec.write(path, [_section("a", 1.0, "s", 2), _section("z", 1.0, "s", 2)])
    with open(path, "ab") as f:  # "m" sorts between them; its coordinate columns differ in length
        f.write(_block(257, _record(3, "B", b"m"), _record(2, "d", [1.0]), _record(3, "B", b"s"),
                       _record(3, "B", b"x")))
        f.write(_block(258, _record(7, "H", [0] * 25), _record(2, "d", [0.0] * 23)))
        f.write(_block(262, _record(2, "d", [1.0, 2.0]), _record(2, "d", [1.0, 2.0]),
                       _record(2, "d", [1.0, 2.0, 3.0])))
    assert [s.primary_name for s in xsec.read(path, keys_only=True)] == ["a", "m", "z"]
    with pytest.warns(UserWarning, match="'m'"):
        assert [s.primary_name for s in xsec.read(path)] == ["a", "z"]


def test_write_refuses_bad_sections_before_creating_anything(tmp_path):
    path = tmp_path / "never.xfs"
    cases = [
        (xsec.CrossSection("a", "b", 0.0, raw=np.zeros((3, 2)), raw_marks=np.zeros((2, 2))), 2013),
        (xsec.CrossSection("a", "b", 0.0, raw=np.zeros((4, 2))), 2013),  # marks missing
        (xsec.CrossSection("a", "b", 0.0, coords=np.zeros((3, 70000))), 2013),
        (xsec.CrossSection("a", "b", 0.0, header_words=np.zeros(24)), 2013),
        (xsec.CrossSection("a\0b", "b", 0.0), 2010),
    ]
    for section, status in cases:
        with pytest.raises(TovaError) as info:
            xsec.write(path, [_section("fine", 0.0, "x", 1), section])
        assert info.value.status == status, info.value
        assert not path.exists()


def test_files_of_another_kind_are_refused(tmp_path):
    vre_path = tmp_path / "bodies.vre"
    vre.new().write(vre_path)
    with pytest.raises(TovaError) as info:
        xsec.read(vre_path)
    assert info.value.status == 2017 and "bodies.vre" in str(info.value)

    xfs_path = tmp_path / "sections.xfs"
    xsec.write(xfs_path, [])
    assert xsec.read(xfs_path) == []
    with pytest.raises(TovaError) as info:
        vre.read(xfs_path)
    assert info.value.status == 2017
