"""Cross-section files as lists of plain Python objects.

``read(path)`` loads a file into a list of ``CrossSection`` objects in the
table order of the library (sorted by primary name, secondary name, key
value; names without regard to letter case). Each holds its three keys,
its extra name, the 25 header words and 23 header values (kept as they
stand) and its four data sets as numpy arrays, one row per column:

- ``raw``: float64, shape (4, n): raw point columns 0-3
- ``raw_marks``: uint16, shape (2, n): raw point columns 4 and 5
- ``selection``: float64, shape (n,)
- ``processed``: float64, shape (6, n)
- ``coords``: float64, shape (3, n)

An empty set has n = 0. ``write(path, sections)`` writes a new file (format
version 106) in the order given. A data set holds at most 65535 entries.
"""

from __future__ import annotations

import ctypes
import os
import warnings
from ctypes import byref, c_void_p
from dataclasses import dataclass, field

import numpy as np

from . import _lib
from ._lib import XsecData
from .errors import F_ERR_MEMORY, F_ERR_SIZE, F_ERR_VALUE, TovaError, check, check_open

LOAD_KEYS_ONLY = 0x1
MAX_ENTRIES = 0xFFFF
HEADER_WORDS = 25
HEADER_VALUES = 23
# Names are stored as 8-bit text; Latin-1 keeps every byte as it is.
NAME_ENCODING = "latin-1"

# Data sets: attribute, rows, element type.
_SETS = (("raw", 4, np.float64), ("raw_marks", 2, np.uint16), ("selection", None, np.float64),
         ("processed", 6, np.float64), ("coords", 3, np.float64))


def _empty(rows: int | None, dtype) -> np.ndarray:
    return np.zeros((0,) if rows is None else (rows, 0), dtype=dtype)


@dataclass(eq=False)
class CrossSection:
    """One cross section. ``header_words`` / ``header_values`` None means the
    library's defaults (on write)."""

    primary_name: str
    secondary_name: str
    key_value: float
    extra_name: str = " "
    header_words: np.ndarray | None = None
    header_values: np.ndarray | None = None
    raw: np.ndarray = field(default_factory=lambda: _empty(4, np.float64))
    raw_marks: np.ndarray = field(default_factory=lambda: _empty(2, np.uint16))
    selection: np.ndarray = field(default_factory=lambda: _empty(None, np.float64))
    processed: np.ndarray = field(default_factory=lambda: _empty(6, np.float64))
    coords: np.ndarray = field(default_factory=lambda: _empty(3, np.float64))

    @property
    def keys(self) -> tuple[str, str, float]:
        return self.primary_name, self.secondary_name, self.key_value


# ---- Reading ------------------------------------------------------------------


def _text(raw: bytes | None) -> str:
    return "" if raw is None else raw.decode(NAME_ENCODING)


def _columns(pointers, count: int, dtype) -> np.ndarray:
    """Copies count elements behind each pointer into one row each."""
    out = np.empty((len(pointers), count), dtype=dtype)
    if count:
        for row, pointer in zip(out, pointers):
            if not pointer:
                raise TovaError(F_ERR_VALUE, detail="a data set of the cross section lacks an array")
            ctypes.memmove(row.ctypes.data, pointer, count * out.itemsize)
    return out


def _section(rec: XsecData) -> CrossSection:
    return CrossSection(
        primary_name=_text(rec.primaryName),
        secondary_name=_text(rec.secondaryName),
        key_value=rec.keyValue,
        extra_name=_text(rec.extraName),
        header_words=np.frombuffer(bytes(rec.headerWords), dtype=np.uint16).copy(),
        header_values=np.frombuffer(bytes(rec.headerValues), dtype=np.float64).copy(),
        raw=_columns([*rec.raw, rec.raw3], rec.noRaw, np.float64),
        raw_marks=_columns(list(rec.rawMark), rec.noRaw, np.uint16),
        selection=_columns([rec.sel], rec.noSel, np.float64)[0],
        processed=_columns(list(rec.prc), rec.noPrc, np.float64),
        coords=_columns(list(rec.coords), rec.noCoords, np.float64),
    )


class _Table:
    """A loaded table, freed on leaving the block; the walk yields each
    position's record (None where the library holds an invalid one)."""

    def __init__(self, lib, path, flags: int):
        self.lib, self.table = lib, c_void_p()
        check_open(lib.xfsXsecTableLoad(_lib.encode(path), byref(self.table), flags), path)
        self.version = lib.xfsXsecTableVersion(self.table)

    def __enter__(self):
        return self

    def __exit__(self, *exc):
        self.lib.xfsXsecTableFree(byref(self.table))

    def walk(self, count: int | None):
        """Records in table order: ``count`` positions, or up to the first
        null when count is None (right when every entry is valid)."""
        cursor = c_void_p()
        handle = self.lib.xfsXsecFind(self.table, b"", 0.0, b"", byref(cursor))
        position = 0
        while count is None or position < count:
            if not handle and count is None:
                return
            yield handle.contents if handle else None
            position += 1
            handle = self.lib.xfsXsecFindNext(self.table, cursor)


def read(path: str | os.PathLike, *, keys_only: bool = False) -> list[CrossSection]:
    """Reads every cross section of a file, in table order. With keys_only
    the data sets are not loaded (they come back empty). A cross section
    whose data blocks are malformed is left out with a warning. Raises
    TovaError when the file cannot be opened or is not a cross-section file,
    or when a header block yields no valid cross section (2010)."""
    lib = _lib.tova()
    # Loaded without data, every cross section is valid, so this walk
    # gives them all; with data, the library answers null for one made
    # invalid by a malformed data block, which only the count tells
    # apart from the end of the table.
    with _Table(lib, path, LOAD_KEYS_ONLY) as table:
        sections = [_section(rec) for rec in table.walk(None)]
    if keys_only or not sections:
        return sections
    with _Table(lib, path, 0) as table:
        loaded = [_section(rec) if rec is not None else None for rec in table.walk(len(sections))]
    for bare, full in zip(sections, loaded):
        if full is None:
            warnings.warn(f"{os.fspath(path)}: cross section {bare.keys} has malformed data and is left out",
                          stacklevel=2)
    return [s for s in loaded if s is not None]


def version(path: str | os.PathLike) -> int:
    """The format version of a cross-section file."""
    with _Table(_lib.tova(), path, LOAD_KEYS_ONLY) as table:
        return table.version


# ---- Writing ------------------------------------------------------------------


def _encode_name(text: str, what: str) -> bytes:
    raw = text.encode(NAME_ENCODING)
    if b"\0" in raw:
        raise TovaError(F_ERR_VALUE, what, "a name holds a zero character")
    return raw


def _prepared(cs: CrossSection, index: int) -> dict:
    """The cross section's values in the forms the library takes, checked."""
    what = f"cross section {index} {cs.keys}"
    out = {
        "names": [_encode_name(n, what) for n in (cs.primary_name, cs.secondary_name, cs.extra_name)],
        "key": float(cs.key_value),
    }
    for attr, size, dtype in (("header_words", HEADER_WORDS, np.uint16), ("header_values", HEADER_VALUES, np.float64)):
        value = getattr(cs, attr)
        if value is not None:
            value = np.ascontiguousarray(value, dtype=dtype)
            if value.shape != (size,):
                raise TovaError(F_ERR_SIZE, what, f"{attr} needs {size} entries, not shape {value.shape}")
        out[attr] = value
    for attr, rows, dtype in _SETS:
        value = np.ascontiguousarray(getattr(cs, attr), dtype=dtype)
        if rows is None:
            value = value.reshape(1, -1) if value.ndim == 1 else value
            rows = 1
        if value.ndim != 2 or value.shape[0] != rows:
            raise TovaError(F_ERR_SIZE, what, f"{attr} needs {rows} rows, not shape {value.shape}")
        if value.shape[1] > MAX_ENTRIES:
            raise TovaError(F_ERR_SIZE, what, f"{attr} holds {value.shape[1]} entries, at most {MAX_ENTRIES}")
        out[attr] = value
    if out["raw"].shape[1] != out["raw_marks"].shape[1]:
        raise TovaError(F_ERR_SIZE, what, "raw and raw_marks differ in length")
    return out


def _fill_columns(pointers, values: np.ndarray) -> None:
    for pointer, row in zip(pointers, values):
        ctypes.memmove(pointer, row.ctypes.data, row.nbytes)


def _write_one(lib, file, p: dict, what: str) -> None:
    handle = lib.xfsXsecCreateEx(p["names"][0], p["key"], p["names"][1], p["names"][2])
    if not handle:
        raise TovaError(F_ERR_MEMORY, what)
    try:
        rec = handle.contents
        base = ctypes.addressof(rec)
        for attr, offset in (("header_words", XsecData.headerWords.offset),
                             ("header_values", XsecData.headerValues.offset)):
            if p[attr] is not None:
                ctypes.memmove(base + offset, p[attr].ctypes.data, p[attr].nbytes)
        sizing = ((lib.xfsXsecSetNoRaw, p["raw"]), (lib.xfsXsecSetNoSel, p["selection"]),
                  (lib.xfsXsecSetNoPrc, p["processed"]), (lib.xfsXsecSetNoCoords, p["coords"]))
        for setter, values in sizing:
            if not setter(handle, values.shape[1]):
                raise TovaError(F_ERR_MEMORY, what)
        _fill_columns([*rec.raw, rec.raw3], p["raw"])
        _fill_columns(rec.rawMark, p["raw_marks"])
        _fill_columns([rec.sel], p["selection"])
        _fill_columns(rec.prc, p["processed"])
        _fill_columns(rec.coords, p["coords"])
        check(lib.xfsXsecWrite(handle, file), what)
    finally:
        lib.xfsXsecFree(byref(handle))


def write(path: str | os.PathLike, sections) -> None:
    """Writes the cross sections to a new file, in the order given (a file
    written in key order loads fastest). Every cross section is checked
    before the file is created; raises TovaError."""
    prepared = [_prepared(cs, i) for i, cs in enumerate(sections)]
    name = os.fspath(path)
    lib = _lib.tova()
    file = c_void_p()
    check_open(lib.xfsFileOpenCreate(_lib.encode(path), byref(file)), name, writing=True)
    try:
        for i, p in enumerate(prepared):
            _write_one(lib, file, p, f"{name}: cross section {i}")
    except BaseException:
        lib.xfsFileClose(byref(file))
        raise
    check(lib.xfsFileClose(byref(file)), name)


__all__ = ["CrossSection", "LOAD_KEYS_ONLY", "read", "version", "write"]
