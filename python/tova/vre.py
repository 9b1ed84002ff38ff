"""VRE files (panel-body response data) as plain Python objects.

``read(path)`` loads a whole file into a ``Vre``: its eight size parameters,
the bodies' names and panel counts, the symmetry pair, the two scalar items
and every vector item the file holds, each item with its quantity key and
storage unit and its values as a float64 numpy array. ``write(path, vre)``
(or ``vre.write(path)``) writes one back; ``new()`` gives an empty one with
the library's defaults.

Size parameters: 0 N0, 1 body count B, 2 total panel count P (derived: the
sum of the panel counts, ignored on write), 3 N3, 4 N4, 5, 6 (1: items 21
and 22 are present), 7 N7. ``Vre.element_count(k)`` gives the length vector
item k must have.
"""

from __future__ import annotations

import os
from ctypes import byref, c_char, c_double, c_int32
from dataclasses import dataclass, field

import numpy as np

from . import _lib, units
from .errors import F_ERR_MEMORY, F_ERR_SIZE, F_ERR_VALUE, VRE_NOT_SET, TovaError, check, check_open

VECTOR_ITEMS = 23
SCALAR_ITEMS = 2
SIZE_PARAMS = 8
NAME_LENGTH = 256
DELETE_VALUE = -1e-35
# Body names are stored as 8-bit text; Latin-1 keeps every byte as it is.
NAME_ENCODING = "latin-1"


@dataclass(eq=False)
class VreItem:
    """One item: quantity key, storage unit key and values (a float for a
    scalar item, a float64 array for a vector item)."""

    quantity: int
    unit: int
    values: np.ndarray | float

    @property
    def quantity_name(self) -> str:
        return units.quantity(self.quantity).name

    @property
    def unit_name(self) -> str:
        return units.unit(self.unit).name

    def to(self, unit: units.UnitLike):
        """The values in another unit (a new array or float); elements equal
        to the delete value stay as they are."""
        return units.convert(self.values, self.unit, unit, delete_value=DELETE_VALUE)


def _params() -> np.ndarray:
    return np.zeros(SIZE_PARAMS, dtype=np.int32)


def _counts() -> np.ndarray:
    return np.zeros(0, dtype=np.int32)


@dataclass(eq=False)
class Vre:
    """The contents of one VRE file. ``vectors`` holds the vector items that
    have values, by index 0-22."""

    params: np.ndarray = field(default_factory=_params)
    panel_counts: np.ndarray = field(default_factory=_counts)
    names: list[str] | None = None
    symmetry: tuple[int, int] = (1, 0)
    scalars: list[VreItem] = field(default_factory=list)
    vectors: dict[int, VreItem] = field(default_factory=dict)

    @property
    def body_count(self) -> int:
        return int(self.params[1])

    @property
    def panel_total(self) -> int:
        """P: the sum of the first B panel counts."""
        b = max(self.body_count, 0)
        return int(np.sum(np.asarray(self.panel_counts, dtype=np.int64)[:b]))

    def element_count(self, index: int) -> int:
        """Number of values vector item ``index`` holds under the current
        size parameters and panel counts."""
        p = [int(x) for x in self.params]
        n0, b, n3, n4, n7 = p[0], p[1], p[3], p[4], p[7]
        panels = self.panel_total
        counts = {
            0: 12 * n0, 1: 3 * panels, 2: panels, 3: 3 * panels, 4: panels * n3, 5: 3 * b, 6: 3 * b,
            7: b, 8: n3 * n3, 9: n4, 10: n4, 11: 9 * b, 12: panels * n4 * n3, 13: panels * n4 * n3,
            14: n4 * n3 * n3, 15: n4 * n3 * n3, 16: b, 17: b, 18: b, 19: b, 20: b, 21: n7, 22: n7 * n4 * n3,
        }
        if index not in counts:
            raise IndexError(f"vector item {index} is outside 0-{VECTOR_ITEMS - 1}")
        return counts[index]

    def write(self, path: str | os.PathLike) -> None:
        write(path, self)


# ---- Reading ------------------------------------------------------------------


def _unit_info(getter, handle, index: int) -> tuple[int, int]:
    key, unit, mode, user = c_int32(), c_int32(), c_int32(), c_int32()
    check(getter(handle, index, byref(key), byref(unit), byref(mode), byref(user)))
    return key.value, unit.value


def _read_names(lib, handle, bodies: int) -> list[str] | None:
    buf = np.zeros(max(bodies, 1) * NAME_LENGTH, dtype=np.uint8)
    status = lib.vreGetBodyNames(handle, _lib.as_pointer(buf, c_char))
    if status == VRE_NOT_SET:
        return None
    check(status, "body names")
    fields = buf[: bodies * NAME_LENGTH].view(f"S{NAME_LENGTH}").tolist()
    return [f.split(b"\0", 1)[0].decode(NAME_ENCODING) for f in fields]


def _read_vector(lib, handle, index: int) -> np.ndarray | None:
    n = lib.vreGetVectorSize(handle, index)
    values = np.empty(max(n, 1), dtype=np.float64)
    status = lib.vreGetVectorItem(handle, index, _lib.as_pointer(values, c_double))
    if status == VRE_NOT_SET:
        return None
    check(status, f"vector item {index}")
    return values[:n]


def _from_handle(lib, handle) -> Vre:
    params = np.array([lib.vreGetVectorParam(handle, i) for i in range(SIZE_PARAMS)], dtype=np.int32)
    bodies = max(int(params[1]), 0)
    counts = np.zeros(max(bodies, 1), dtype=np.int32)
    check(lib.vreGetBodyPanelCount(handle, _lib.as_pointer(counts, c_int32)), "panel counts")
    first, second = c_int32(), c_int32()
    check(lib.vreGetSymmetry(handle, byref(first), byref(second)), "symmetry")
    scalars = [VreItem(*_unit_info(lib.vreGetScalarItemUnitInfo, handle, i), lib.vreGetScalarItem(handle, i))
               for i in range(SCALAR_ITEMS)]
    vectors = {}
    for i in range(VECTOR_ITEMS):
        values = _read_vector(lib, handle, i)
        if values is not None:
            vectors[i] = VreItem(*_unit_info(lib.vreGetVectorItemUnitInfo, handle, i), values)
    return Vre(params=params, panel_counts=counts[:bodies], names=_read_names(lib, handle, bodies),
               symmetry=(first.value, second.value), scalars=scalars, vectors=vectors)


class _Handle:
    """A VreHandle of this thread alone, freed on leaving the block."""

    def __enter__(self):
        self.lib = _lib.tova()
        self.handle = _lib.VreHandle()
        return self

    def __exit__(self, *exc):
        self.lib.vreHandleFree(self.handle)


def read(path: str | os.PathLike) -> Vre:
    """Reads a VRE file. Raises TovaError when it cannot be opened or is not
    a VRE file. Values are in each item's storage unit."""
    name = os.fspath(path)
    with _Handle() as h:
        check_open(h.lib.vreFileRead(_lib.encode(path), byref(h.handle)), name)
        # Every file holds B panel counts of 4 bytes: a larger body count
        # comes from a damaged file and would only make huge zero buffers.
        bodies = h.lib.vreGetVectorParam(h.handle, 1)
        if bodies * 4 > os.path.getsize(path):
            raise TovaError(F_ERR_SIZE, name, f"body count {bodies} is more than the file can hold")
        return _from_handle(h.lib, h.handle)


def new() -> Vre:
    """An empty VRE with the library's defaults (symmetry (1, 0), gravity
    9.80665 and 0.0 as scalar items, every unit the first of its quantity)."""
    with _Handle() as h:
        h.handle.value = h.lib.vreHandleCreate()
        if not h.handle:
            raise TovaError(F_ERR_MEMORY, "vreHandleCreate")
        return _from_handle(h.lib, h.handle)


# ---- Writing ------------------------------------------------------------------


def _int32(value, what: str) -> int:
    v = int(value)
    if not -(2**31) <= v < 2**31:
        raise TovaError(F_ERR_VALUE, what, f"{v} does not fit in 32 bits")
    return v


def _set_unit(setter, info, handle, index: int, item: VreItem, what: str) -> None:
    key, _ = _unit_info(info, handle, index)
    if int(item.quantity) != key:
        raise TovaError(F_ERR_VALUE, what, f"holds quantity {key}, not {item.quantity}")
    check(setter(handle, index, _int32(item.unit, what)), what)


def _set_names(lib, handle, names: list[str]) -> None:
    encoded = [n.encode(NAME_ENCODING) for n in names]
    if any(len(e) >= NAME_LENGTH or b"\0" in e for e in encoded):
        raise TovaError(F_ERR_VALUE, "body names", f"names are at most {NAME_LENGTH - 1} bytes without zeros")
    buf = np.array(encoded, dtype=f"S{NAME_LENGTH}")  # zero-padded fields
    check(lib.vreSetBodyNames(handle, _lib.as_pointer(buf, c_char)), "body names")


def _fill(lib, handle, vre: Vre) -> None:
    for i in range(SIZE_PARAMS):
        if i != 2:  # P follows the panel counts
            check(lib.vreSetVectorParam(handle, i, _int32(vre.params[i], f"size parameter {i}")))
    bodies = vre.body_count
    counts = np.ascontiguousarray(vre.panel_counts, dtype=np.int32)
    if counts.shape != (max(bodies, 0),):
        raise TovaError(F_ERR_SIZE, "panel counts", f"{counts.size} panel counts for {bodies} bodies")
    if vre.names is not None and len(vre.names) != counts.size:
        raise TovaError(F_ERR_SIZE, "body names", f"{len(vre.names)} names for {bodies} bodies")
    if bodies > 0:
        check(lib.vreSetBodyPanelCount(handle, _lib.as_pointer(counts, c_int32)), "panel counts")
        if vre.names is not None:
            _set_names(lib, handle, vre.names)
    check(lib.vreSetSymmetry(handle, *(_int32(s, "symmetry") for s in vre.symmetry)), "symmetry")

    if len(vre.scalars) not in (0, SCALAR_ITEMS):
        raise TovaError(F_ERR_SIZE, "scalar items", f"{len(vre.scalars)} scalar items, not {SCALAR_ITEMS}")
    for i, item in enumerate(vre.scalars):
        what = f"scalar item {i}"
        _set_unit(lib.vreSetScalarItemUnit, lib.vreGetScalarItemUnitInfo, handle, i, item, what)
        check(lib.vreSetScalarItem(handle, i, float(item.values)), what)

    if int(vre.params[6]) != 1 and (21 in vre.vectors or 22 in vre.vectors):
        raise TovaError(F_ERR_VALUE, "vector items 21, 22", "written only when size parameter 6 is 1")
    for index in sorted(vre.vectors):
        item, what = vre.vectors[index], f"vector item {index}"
        expected = vre.element_count(index)
        values = np.ascontiguousarray(item.values, dtype=np.float64).reshape(-1)
        if values.size != expected:
            raise TovaError(F_ERR_SIZE, what, f"{values.size} values where the size parameters give {expected}")
        _set_unit(lib.vreSetVectorItemUnit, lib.vreGetVectorItemUnitInfo, handle, index, item, what)
        buf = values if values.size else np.zeros(1)
        check(lib.vreSetVectorItem(handle, index, _lib.as_pointer(buf, c_double)), what)


def write(path: str | os.PathLike, vre: Vre) -> None:
    """Writes a VRE file (format version 101). Items without values are
    written as zeros. Raises TovaError, before anything is created, when an
    array's length does not match the size parameters, a unit does not fit
    its item's quantity or a value does not fit the format."""
    with _Handle() as h:
        h.handle.value = h.lib.vreHandleCreate()
        if not h.handle:
            raise TovaError(F_ERR_MEMORY, "vreHandleCreate")
        _fill(h.lib, h.handle, vre)
        check_open(h.lib.vreFileWrite(_lib.encode(path), h.handle), path, writing=True)


__all__ = ["DELETE_VALUE", "Vre", "VreItem", "new", "read", "write"]
