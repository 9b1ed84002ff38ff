"""Gridded data files: ``open`` reads one, ``create`` writes one.

A gridded data file holds a header (titles, file type, data type, delete
values, projection, time axis, custom blocks, items), then static items (value
arrays that do not change with time), then the dynamic data: one value array
per item per time step. Reading goes through the library's positioning, so a
time step anywhere in the file is reached by one jump, and every array moves
between the file and numpy as one buffer.

Arrays are in numpy order: an item with an x-y-z axis of sizes (X, Y, Z)
has the shape (Z, Y, X), x varying fastest, as the file stores it. Axis sizes,
origins and steps are given and shown in the file's order, x first.

Time values are in the time axis's unit: for the equidistant kinds the start
plus the step times the index, for the others as stored. Calendar axes also
give them as ``numpy.datetime64`` (``GridFile.datetimes``).
"""

from __future__ import annotations

import ctypes
import datetime as _dt
import functools
import math
import operator
import os
import weakref
from ctypes import POINTER, byref, c_char_p, c_double, c_float, c_int32, c_void_p
from dataclasses import dataclass
from typing import Any, NamedTuple

import numpy as np

from . import _lib, units
from ._handles import HandlePool, Handles, release
from ._mask import nan_where_equal
from .errors import F_ERR_ARGUMENT, F_ERR_SIZE, F_ERR_VALUE, TovaError, UnitError, check, check_open
from .selection import match_name, step_at

# Element types by simple-type code; byte data are C chars, signed.
DTYPES = {1: np.dtype(np.float32), 2: np.dtype(np.float64), 3: np.dtype(np.int8), 4: np.dtype(np.int32),
          5: np.dtype(np.uint32), 6: np.dtype(np.int16), 7: np.dtype(np.uint16)}
TYPE_CODES = {dtype: code for code, dtype in DTYPES.items()}

FILE_TYPES = {0: "F_UNDEFINED_FILE_TYPE", 1: "F_EQTIME_FIXEDSPACE_ALLITEMS", 2: "F_EQTIME_TVARSPACE_ALLITEMS",
              4: "F_NEQTIME_FIXEDSPACE_ALLITEMS", 8: "F_NEQTIME_FIXEDSPACE_VARITEMS",
              16: "F_NEQTIME_TVARSPACE_VARITEMS"}
EQTIME_FIXEDSPACE = 1
NEQTIME_FIXEDSPACE = 4
# File types that store the time of each step in the file.
_TIMES_STORED = (4, 8, 16)

TIME_AXIS_TYPES = {0: "F_UNDEFINED_TAXIS", 1: "F_TM_EQ_AXIS", 2: "F_TM_NEQ_AXIS", 3: "F_CAL_EQ_AXIS",
                   4: "F_CAL_NEQ_AXIS"}

# Item axis kinds: code -> (family, dimension, name).
AXIS_KINDS = {
    0: ("undefined", 0, "undefined"),
    1: ("equidistant", 0, "EqD0"), 2: ("equidistant", 1, "EqD1"), 5: ("equidistant", 2, "EqD2"),
    8: ("equidistant", 3, "EqD3"), 11: ("equidistant", 4, "EqD4"),
    3: ("nonequidistant", 1, "NeqD1"), 6: ("nonequidistant", 2, "NeqD2"), 9: ("nonequidistant", 3, "NeqD3"),
    4: ("time-varying", 1, "TvarD1"), 7: ("time-varying", 2, "TvarD2"), 10: ("time-varying", 3, "TvarD3"),
    12: ("curvilinear", 2, "CurveLinearD2"), 13: ("curvilinear", 3, "CurveLinearD3"),
}
_KIND_OF = {(family, dim): code for code, (family, dim, _) in AXIS_KINDS.items()}
# Directions in the file's order; dimension names are these, reversed.
DIRECTIONS = ("x", "y", "z", "t")
_C_FUNCTION = {"equidistant": "Eq", "nonequidistant": "Neq", "curvilinear": "CurveLinear", "time-varying": "Tvar"}

# Statuses of a read that finds less data than the header promises.
_DATA_MISSING = (2001, 2006, 2009, 2013, 2016, 2019)
# Positioning results that are no failures of the library's dispatcher.
F_TIMESTEP_RANGE = 1001
F_ITEM_RANGE = 1002

DEFAULT_AXIS_UNIT = "m"
DEFAULT_TIME_UNIT = "s"
_NS_PER_S = 1_000_000_000


# ---- Small value types -------------------------------------------------------------


class DeleteValues(NamedTuple):
    """Missing-value markers per element type."""

    float: float = units.DELETE_VALUE_FLOAT
    double: float = units.DELETE_VALUE_DOUBLE
    byte: int = 0
    int: int = 2147483647
    unsigned: int = 2147483647

    def for_dtype(self, dtype) -> Any:
        """The marker of an element type as a numpy scalar of that type;
        None for the 16-bit types, which have none."""
        dtype = np.dtype(dtype)
        value = {1: self.float, 2: self.double, 3: self.byte, 4: self.int, 5: self.unsigned}.get(TYPE_CODES.get(dtype))
        return None if value is None else dtype.type(value)


class Projection(NamedTuple):
    """A map projection: its text and the origin and orientation."""

    name: str
    longitude: float = 0.0
    latitude: float = 0.0
    orientation: float = 0.0


class CustomBlock(NamedTuple):
    """A named array kept in the header. ``values`` is None for a block of a
    type the library keeps no data for."""

    name: str
    values: np.ndarray | None
    simple_type: int = 0


def _unit(key: int, text: str = "") -> units.Unit:
    """The unit of a key as libqty knows it, else one made of the stored text."""
    try:
        return units.unit(key) if key else units.Unit(0, text, "")
    except TovaError:
        return units.Unit(key, text, "")


def _quantity(key: int, text: str = "") -> units.Quantity:
    try:
        return units.quantity(key)
    except TovaError:
        return units.Quantity(key, text, "")


def _text(raw) -> str:
    return _lib.decode(raw.value if isinstance(raw, c_char_p) else raw)


# ---- Axes ---------------------------------------------------------------------------


@dataclass(frozen=True, eq=False)
class Axis:
    """The spatial axis of an item. ``sizes``, ``origin`` and ``step`` are in
    the file's order (x first); ``coords`` holds the boundary coordinates of a
    non-equidistant axis (size + 1 per direction) or the node coordinates of a
    curvilinear one (arrays of shape ``node_shape``, one per direction)."""

    kind: int = 1
    sizes: tuple = ()
    unit: Any = DEFAULT_AXIS_UNIT
    origin: tuple = ()
    step: tuple = ()
    coords: tuple = ()

    # Constructors ------------------------------------------------------------------
    @classmethod
    def point(cls, unit=DEFAULT_AXIS_UNIT) -> "Axis":
        """A single value (EqD0)."""
        return cls(1, (), unit)

    @classmethod
    def equidistant(cls, sizes, origin=None, step=None, unit=DEFAULT_AXIS_UNIT) -> "Axis":
        """An equidistant grid of 1 to 4 directions; sizes, origins (default 0)
        and steps (default 1) x first. (Files store 1 to 3 directions: 4-D
        axes exist only in memory.)"""
        sizes = tuple(operator.index(s) for s in sizes)
        if not 1 <= len(sizes) <= 4:
            raise TovaError(F_ERR_VALUE, detail=f"an equidistant axis has 1 to 4 directions, not {len(sizes)}")
        origin = (0.0,) * len(sizes) if origin is None else tuple(float(v) for v in origin)
        step = (1.0,) * len(sizes) if step is None else tuple(float(v) for v in step)
        if len(origin) != len(sizes) or len(step) != len(sizes):
            raise TovaError(F_ERR_SIZE, detail="an equidistant axis needs one origin and one step per direction")
        return cls(_KIND_OF["equidistant", len(sizes)], sizes, unit, origin, step)

    @classmethod
    def from_shape(cls, shape, unit=DEFAULT_AXIS_UNIT) -> "Axis":
        """The equidistant axis (origin 0, step 1) of an array in numpy
        order; a 0-d shape gives a single value."""
        shape = tuple(shape)
        return cls.point(unit) if not shape else cls.equidistant(shape[::-1], unit=unit)

    @classmethod
    def nonequidistant(cls, boundaries, unit=DEFAULT_AXIS_UNIT) -> "Axis":
        """A grid of 1 to 3 directions given by the cell boundaries of each
        direction, x first (n + 1 values for n cells). A file keeps a 1-D
        axis as one point per element: the first n values (as 32-bit floats)
        are its positions, and the last value read back continues the last
        spacing."""
        coords = tuple(np.array(b, dtype=np.float64).reshape(-1) for b in boundaries)
        if not 1 <= len(coords) <= 3 or any(c.size < 2 for c in coords):
            raise TovaError(F_ERR_VALUE, detail="a non-equidistant axis has 1 to 3 directions of at least 2 boundaries")
        return cls(_KIND_OF["nonequidistant", len(coords)], tuple(c.size - 1 for c in coords), unit, coords=coords)

    @classmethod
    def curvilinear(cls, nodes, unit=DEFAULT_AXIS_UNIT) -> "Axis":
        """A curvilinear grid of 2 or 3 directions given by the node
        coordinates of each direction (x first), each an array of the node
        shape in numpy order: (Y + 1, X + 1) or (Z + 1, Y + 1, X + 1)."""
        coords = tuple(np.array(n, dtype=np.float64) for n in nodes)
        dim = len(coords)
        if dim not in (2, 3) or any(c.ndim != dim or c.shape != coords[0].shape or min(c.shape) < 2 for c in coords):
            raise TovaError(F_ERR_VALUE, detail="a curvilinear axis needs 2 or 3 node arrays of one shape, "
                                                "as many dimensions as arrays, at least 2 nodes each way")
        return cls(_KIND_OF["curvilinear", dim], tuple(n - 1 for n in coords[0].shape[::-1]), unit, coords=coords)

    @classmethod
    def time_varying(cls, sizes, unit=DEFAULT_AXIS_UNIT) -> "Axis":
        """A grid of 1 to 3 directions whose coordinates travel with the data."""
        sizes = tuple(operator.index(s) for s in sizes)
        if not 1 <= len(sizes) <= 3:
            raise TovaError(F_ERR_VALUE, detail=f"a time-varying axis has 1 to 3 directions, not {len(sizes)}")
        return cls(_KIND_OF["time-varying", len(sizes)], sizes, unit)

    # Properties --------------------------------------------------------------------
    @property
    def family(self) -> str:
        """"equidistant", "nonequidistant", "curvilinear", "time-varying" or
        "undefined"."""
        return AXIS_KINDS.get(self.kind, AXIS_KINDS[0])[0]

    @property
    def name(self) -> str:
        """The kind's name: "EqD2", "NeqD1", "CurveLinearD2", ..."""
        return AXIS_KINDS.get(self.kind, AXIS_KINDS[0])[2]

    @property
    def ndim(self) -> int:
        return len(self.sizes)

    @property
    def shape(self) -> tuple:
        """The shape of one time step's values, in numpy order."""
        return tuple(self.sizes[::-1])

    @property
    def size(self) -> int:
        return math.prod(self.sizes)

    @property
    def dims(self) -> tuple:
        """Dimension names in numpy order: ("y", "x"), ("t", "z", "y", "x"), ..."""
        return DIRECTIONS[:self.ndim][::-1]

    @property
    def node_shape(self) -> tuple:
        """The shape of a curvilinear axis's node arrays, in numpy order."""
        return tuple(s + 1 for s in self.sizes[::-1])

    @property
    def unit_name(self) -> str:
        return str(self.unit)

    def coordinates(self) -> dict:
        """A coordinate per direction (by name, x first) for the equidistant
        and non-equidistant kinds: the position of each element (origin plus
        step times the index), the middle of each cell of a 2-D or 3-D
        non-equidistant axis, and the point of each element of a 1-D one."""
        if self.family == "equidistant":
            return {d: self.origin[i] + self.step[i] * np.arange(n, dtype=np.float64)
                    for i, (d, n) in enumerate(zip(DIRECTIONS, self.sizes))}
        if self.kind == _KIND_OF["nonequidistant", 1]:
            return {"x": self.coords[0][:-1].copy()}
        if self.family == "nonequidistant":
            return {d: 0.5 * (c[:-1] + c[1:]) for d, c in zip(DIRECTIONS, self.coords)}
        return {}

    def signature(self) -> tuple:
        """What makes two axes the same grid."""
        arrays = tuple(c.tobytes() for c in self.coords)
        return self.kind, self.sizes, self.unit_name, self.origin, self.step, arrays


# ---- Items -----------------------------------------------------------------------


@dataclass(eq=False)
class Item:
    """A quantity stored per time step: name, quantity type, unit, element
    type and spatial axis. Quantity and unit are ``units.Quantity`` /
    ``units.Unit`` objects when read; when writing they may also be keys or
    texts. ``number`` is the item's 1-based number in its file (0 when not
    from a file)."""

    name: str
    quantity: Any
    unit: Any
    dtype: Any = np.float32
    axis: Axis | None = None
    value_type: int = 0
    number: int = 0

    def __post_init__(self):
        self.dtype = np.dtype(self.dtype)
        if self.dtype.newbyteorder("=") not in TYPE_CODES:
            raise TovaError(F_ERR_VALUE, detail=f"item {self.name!r}: element type {self.dtype} is not stored; "
                                                f"use one of {', '.join(str(d) for d in TYPE_CODES)}")
        self.dtype = self.dtype.newbyteorder("=")
        if self.axis is None:
            self.axis = Axis.point()

    @property
    def shape(self) -> tuple:
        return self.axis.shape

    @property
    def dims(self) -> tuple:
        return self.axis.dims

    @property
    def size(self) -> int:
        return self.axis.size

    @property
    def quantity_name(self) -> str:
        return str(self.quantity)

    @property
    def unit_name(self) -> str:
        return str(self.unit)


@dataclass(eq=False)
class StaticItem(Item):
    """An item that carries its own values, written once before the time
    steps. When creating one, ``dtype`` and ``axis`` default to those of
    ``values`` (an equidistant axis with origin 0 and step 1)."""

    values: np.ndarray | None = None
    dtype: Any = None

    def __post_init__(self):
        if self.values is not None:
            self.values = np.asarray(self.values)
            if self.dtype is None:
                self.dtype = self.values.dtype if self.values.dtype in TYPE_CODES else np.float32
            if self.axis is None:
                self.axis = Axis.from_shape(self.values.shape)
        if self.dtype is None:
            self.dtype = np.float32
        super().__post_init__()


# ---- Time axes --------------------------------------------------------------------


def _datetime(value) -> np.datetime64:
    """A date and time in whole seconds from a datetime64, datetime, date or
    text ("2020-01-01", "2020-01-01 06:00:00", "2020-01-01T06:00")."""
    if isinstance(value, str):
        value = value.strip().replace(" ", "T")
    try:
        stamp = np.datetime64(value)
    except (TypeError, ValueError) as exc:
        raise TovaError(F_ERR_VALUE, detail=f"not a date and time: {value!r}") from exc
    seconds = stamp.astype("datetime64[s]")
    if seconds != stamp:
        raise TovaError(F_ERR_VALUE, detail=f"a calendar start takes whole seconds, not {value!r}")
    return seconds


def _parse_start(date_text: str, time_text: str) -> np.datetime64 | None:
    """The start of a calendar axis from its stored texts ("yyyy-mm-dd",
    "hh:mm:ss"). Fields out of range roll over (month 13 is January of the
    next year), as the library's own date arithmetic does; None when the texts
    are not of that form."""
    try:
        year, month, day = (int(p) for p in date_text.split("-"))
        hour, minute, second = (int(p) for p in time_text.split(":"))
    except ValueError:
        return None
    base = np.datetime64(year - 1970, "Y").astype("datetime64[M]") + np.timedelta64(month - 1, "M")
    return (base.astype("datetime64[s]") + np.timedelta64(day - 1, "D")
            + np.timedelta64(hour * 3600 + minute * 60 + second, "s"))


@dataclass(eq=False)
class TimeAxis:
    """The time axis: kind 1 equidistant time, 2 non-equidistant time,
    3 equidistant calendar, 4 non-equidistant calendar (0: none).

    ``start`` is the time of the first step (kinds 1 and 2) or its offset from
    ``start_date`` (calendar kinds), in ``unit``; ``step`` the distance of
    the equidistant kinds; ``count`` the number of time steps in the file."""

    kind: int = 0
    unit: Any = DEFAULT_TIME_UNIT
    start: float = 0.0
    step: float = 0.0
    count: int = 0
    first_index: int = 0
    start_date: np.datetime64 | None = None
    start_text: tuple | None = None  # the stored date and time texts of a calendar axis

    @classmethod
    def equidistant(cls, step: float, start: float = 0.0, unit=DEFAULT_TIME_UNIT, first_index: int = 0) -> "TimeAxis":
        return cls(1, unit, float(start), float(step), first_index=first_index)

    @classmethod
    def nonequidistant(cls, unit=DEFAULT_TIME_UNIT, first_index: int = 0) -> "TimeAxis":
        """Each time step carries its own time; the first one written is the
        start."""
        return cls(2, unit, first_index=first_index)

    @classmethod
    def calendar(cls, start_date, step: float | None = None, unit=DEFAULT_TIME_UNIT, offset: float = 0.0,
                 first_index: int = 0) -> "TimeAxis":
        """A calendar axis from a date and time (whole seconds): equidistant
        with a step (the first step ``offset`` after the date), else each time
        step carries its own time, measured from the date."""
        stamp = _datetime(start_date)
        if step is None:
            return cls(4, unit, 0.0, 0.0, first_index=first_index, start_date=stamp)
        return cls(3, unit, float(offset), float(step), first_index=first_index, start_date=stamp)

    @property
    def name(self) -> str:
        return TIME_AXIS_TYPES.get(self.kind, "*** TimeAxis error ***")

    @property
    def is_calendar(self) -> bool:
        return self.kind in (3, 4)

    @property
    def is_equidistant(self) -> bool:
        return self.kind in (1, 3)

    @property
    def unit_name(self) -> str:
        return str(self.unit)

    def equidistant_times(self, steps) -> np.ndarray:
        """Times of the given step indices on an equidistant axis."""
        return self.start + self.step * np.asarray(steps, dtype=np.float64)

    def to_datetime(self, times) -> np.ndarray:
        """Times of a calendar axis (in its unit, from its start date) as
        datetime64[ns]."""
        if not self.is_calendar or self.start_date is None:
            raise TovaError(F_ERR_VALUE, detail=f"a {self.name} time axis has no calendar dates")
        seconds = units.convert(np.asarray(times, dtype=np.float64), self.unit, "s")
        offsets = np.rint(seconds * _NS_PER_S).astype("timedelta64[ns]")
        return self.start_date.astype("datetime64[ns]") + offsets

    def from_datetime(self, when) -> float:
        """A date and time as a time of a calendar axis (in its unit)."""
        if not self.is_calendar or self.start_date is None:
            raise TovaError(F_ERR_VALUE, detail=f"a {self.name} time axis takes no dates")
        delta = np.datetime64(when, "ns") - self.start_date.astype("datetime64[ns]")
        return float(units.convert(delta / np.timedelta64(1, "ns") / _NS_PER_S, "s", self.unit))


# ---- Reading the header -------------------------------------------------------------


def _axis_of(lib, handle) -> Axis:
    """The axis of an item handle, with its unit and values copied out."""
    kind = lib.grdGetItemAxisType(handle)
    family, dim, name = AXIS_KINDS.get(kind, AXIS_KINDS[0])
    if family == "undefined":
        return Axis(kind, (), None)
    unit, text = c_int32(), c_char_p()
    sizes = [c_int32() for _ in range(dim)]
    fn = getattr(lib, f"grdGetItemAxis{name}")
    origin = step = coords = ()
    if family == "equidistant":
        values = [c_float() for _ in range(2 * dim)]
        check(fn(handle, byref(unit), byref(text), *map(byref, sizes), *map(byref, values)))
        origin = tuple(v.value for v in values[:dim])
        step = tuple(v.value for v in values[dim:])
    elif family in ("nonequidistant", "curvilinear"):
        pointers = [POINTER(c_double)() for _ in range(dim)]
        check(fn(handle, byref(unit), byref(text), *map(byref, sizes), *map(byref, pointers)))
        counts = [s.value + 1 for s in sizes]
        shapes = [(n,) for n in counts] if family == "nonequidistant" else [tuple(counts[::-1])] * dim
        if not all(pointers):
            raise TovaError(F_ERR_VALUE, detail=f"an {name} axis lacks its coordinates")
        coords = tuple(np.ctypeslib.as_array(p, shape=(math.prod(s),)).copy().reshape(s)
                       for p, s in zip(pointers, shapes))
    else:
        check(fn(handle, byref(unit), byref(text), *map(byref, sizes)))
    return Axis(kind, tuple(s.value for s in sizes), _unit(unit.value, _text(text)), origin, step, coords)


def _item_of(lib, handle, number: int, cls=Item, **extra) -> Item:
    qty, qty_text, name, unit, unit_text, data_type = (c_int32(), c_char_p(), c_char_p(), c_int32(), c_char_p(),
                                                       c_int32())
    check(lib.grdGetItemInfo(handle, byref(qty), byref(qty_text), byref(name), byref(unit), byref(unit_text),
                             byref(data_type)))
    if data_type.value not in DTYPES:
        raise TovaError(F_ERR_VALUE, detail=f"item {number} has the unknown data type {data_type.value}")
    value_type = c_int32()
    check(lib.grdGetItemValueType(handle, byref(value_type)))
    return cls(name=_text(name), quantity=_quantity(qty.value, _text(qty_text)),
               unit=_unit(unit.value, _text(unit_text)), dtype=DTYPES[data_type.value], axis=_axis_of(lib, handle),
               value_type=value_type.value, number=number, **extra)


def _time_axis_of(lib, header) -> TimeAxis:
    kind = lib.grdGetTimeAxisType(header)
    if kind not in (1, 2, 3, 4):
        return TimeAxis(kind, None)
    unit, text, start, step, count, first = c_int32(), c_char_p(), c_double(), c_double(), c_int32(), c_int32()
    if kind in (1, 2):
        fn = lib.grdGetEqTimeAxis if kind == 1 else lib.grdGetNeqTimeAxis
        check(fn(header, byref(unit), byref(text), byref(start), byref(step), byref(count), byref(first)))
        dates = None
    else:
        fn = lib.grdGetEqCalendarAxis if kind == 3 else lib.grdGetNeqCalendarAxis
        date, time = c_char_p(), c_char_p()
        check(fn(header, byref(unit), byref(text), byref(date), byref(time), byref(start), byref(step),
                 byref(count), byref(first)))
        dates = (_text(date), _text(time))
    return TimeAxis(kind, _unit(unit.value, _text(text)), start.value, step.value, count.value, first.value,
                    _parse_start(*dates) if dates else None, dates)


def _custom_blocks_of(lib, header) -> list:
    blocks = []
    block = c_void_p()
    check(lib.grdGetCustomBlockRef(header, byref(block)))
    while block.value:
        kind, name, count, data, following = c_int32(), c_char_p(), c_int32(), c_void_p(), c_void_p()
        check(lib.grdGetCustomBlock(block, byref(kind), byref(name), byref(count), byref(data), byref(following)))
        dtype = DTYPES.get(kind.value)
        values = None
        if dtype is not None:
            values = np.empty(max(count.value, 0) if data.value else 0, dtype=dtype)
            if values.size:
                ctypes.memmove(values.ctypes.data, data.value, values.nbytes)
        blocks.append(CustomBlock(_text(name), values, kind.value))
        block = following
    return blocks


def _index(value, length: int, what: str) -> int:
    i = operator.index(value)
    if not -length <= i < length:
        raise IndexError(f"{what} {i} out of range for {length}")
    return i % length


def _delete_values_of(lib, h) -> DeleteValues:
    return DeleteValues(lib.grdGetDeleteValFloat(h), lib.grdGetDeleteValDouble(h), lib.grdGetDeleteValByte(h),
                        lib.grdGetDeleteValInt(h), lib.grdGetDeleteValUnsignedInt(h))


class _OpenFile:
    """The header and file handles of an open file (a ``HandlePool``),
    released exactly once: by ``close``, on leaving a ``with`` block, or when
    the object goes. Each handle pair is used by one thread at a time."""

    path: str

    def _own(self, handles: Handles, reopen=None) -> None:
        self._pool = HandlePool(self.path, handles, reopen)
        self._finalizer = weakref.finalize(self, self._pool.close)

    def _use(self):
        """A context lending a (lib, header, file) pair to this thread."""
        return self._pool.use()

    @property
    def closed(self) -> bool:
        return self._pool.closed

    def close(self) -> None:
        """Closes the file and frees its header; later calls raise."""
        self._finalizer()

    def __enter__(self):
        return self

    def __exit__(self, *exc) -> None:
        self.close()


def _read_handles(lib, path: str) -> Handles:
    """A new header and file handle pair of a file opened for reading."""
    handles = Handles(lib, c_void_p(), c_void_p())
    status = lib.grdFileRead(_lib.encode(path), byref(handles.header), byref(handles.file))
    if status:
        release(handles)
        check_open(status, path)
    # Times as stored, and calendar texts as stored: dates are computed
    # here from the start and the times.
    lib.grdParamModifyTimes(handles.header, 0)
    return handles


# ---- Reader -------------------------------------------------------------------------


class GridFile(_OpenFile):
    """A gridded data file open for reading (read-only). Use as a context
    manager, or call ``close``; the handles are also released when the object
    is collected.

    Header attributes: ``file_type`` (and ``file_type_name``), ``title``,
    ``app_title``, ``app_version``, ``data_type``, ``stats_type``,
    ``delete_values``, ``projection`` (None when there is none),
    ``time_axis``, ``custom_blocks``, ``compressed`` (only the elements
    of the encoding keys are stored; the others read as delete values) and
    ``encoding_key_length``; the items in ``items``
    (numbered from 1 in the file), the static items in ``static_items``
    (read on first use), the number of time steps in ``n_steps`` and their
    times in ``times`` (and ``datetimes`` for calendar axes);
    ``item_extremes`` gives what the header kept of an item's values.

    ``mask`` is the default of ``read``: delete values become NaN.
    """

    def __init__(self, path: str | os.PathLike, *, mask: bool = True):
        self.path = os.fspath(path)
        self.mask = mask
        lib = _lib.tova()
        self._own(_read_handles(lib, self.path), functools.partial(_read_handles, lib, self.path))
        try:
            with self._use() as (_, header, _):
                self._load_header(lib, header)
        except BaseException:
            self.close()
            raise

    def _load_header(self, lib, h) -> None:
        self.file_type = lib.grdGetFileType(h)
        self.title = _text(lib.grdGetFileTitle(h))
        self.app_title = _text(lib.grdGetAppTitle(h))
        self.app_version = lib.grdGetAppVersionNo(h)
        self.data_type = lib.grdGetDataType(h)
        self.stats_type = lib.grdGetItemStatsType(h)
        self.delete_values = _delete_values_of(lib, h)
        self.projection = None
        if lib.grdGetGeoInfoType(h) == 1:
            text, lon, lat, orient = c_char_p(), c_double(), c_double(), c_double()
            check(lib.grdGetGeoInfoUTMProj(h, byref(text), byref(lon), byref(lat), byref(orient)), self.path)
            self.projection = Projection(_text(text), lon.value, lat.value, orient.value)
        self.time_axis = _time_axis_of(lib, h)
        self.custom_blocks = _custom_blocks_of(lib, h)
        self.compressed = bool(lib.grdIsFileCompressed(h))
        self.encoding_key_length = lib.grdGetEncodeKeySize(h) if self.compressed else 0
        self.items = [_item_of(lib, lib.grdItemD(h, n), n) for n in range(1, lib.grdGetNoOfItems(h) + 1)]

    def __repr__(self) -> str:
        state = "closed" if self.closed else f"{len(self.items)} items, {self.n_steps} steps"
        return f"<tova.GridFile {self.path!r} {self.file_type_name} ({state})>"

    # Header -------------------------------------------------------------------------
    @property
    def file_type_name(self) -> str:
        return FILE_TYPES.get(self.file_type, "*** FileType error ***")

    @property
    def n_steps(self) -> int:
        """The number of time steps, as the time axis counts them."""
        return self.time_axis.count

    def item(self, key) -> Item:
        """An item by name, by position in ``items`` (0-based) or itself. A
        name is matched as the tool matches it: exactly, then without regard
        to case, then as the unique beginning of a name ("water" finds
        "Water level"); KeyError lists the items otherwise."""
        if isinstance(key, Item) and not isinstance(key, StaticItem):
            if 0 < key.number <= len(self.items) and self.items[key.number - 1] is key:
                return key
            key = key.name
        if isinstance(key, str):
            return self.items[match_name([it.name for it in self.items], key, "item", self.path)]
        return self.items[_index(key, len(self.items), "item")]

    @functools.cached_property
    def static_items(self) -> list:
        """The static items with their values, in file order."""
        out = []
        with self._use() as (lib, h, f):
            check(lib.grdFindBlockStatic(h, f), self.path)
            status = c_int32()
            while True:
                handle = c_void_p(lib.grdStaticRead(f, byref(status)))
                if not handle.value:
                    check(status.value, f"{self.path}: static item {len(out) + 1}")
                    break
                try:
                    item = _item_of(lib, handle, len(out) + 1, StaticItem)
                    values = np.empty(item.shape, dtype=item.dtype)
                    check(lib.grdStaticGetData(handle, values.ctypes.data), f"{self.path}: static item {item.name!r}")
                    item.values = values
                    out.append(item)
                finally:
                    lib.grdStaticDestroy(byref(handle))
        return out

    def static_item(self, key) -> StaticItem:
        """A static item by name (matched as ``item`` matches) or position
        (0-based)."""
        if isinstance(key, str):
            names = [it.name for it in self.static_items]
            return self.static_items[match_name(names, key, "static item", self.path)]
        return self.static_items[_index(key, len(self.static_items), "static item")]

    # Time ---------------------------------------------------------------------------
    @functools.cached_property
    def times(self) -> np.ndarray:
        """The time of each step (float64, in the time axis's unit): computed
        for the equidistant axes, read from the file otherwise (one jump and
        one small read per step)."""
        axis = self.time_axis
        if axis.is_equidistant:
            return axis.equidistant_times(np.arange(self.n_steps))
        return self.read_times(range(self.n_steps))

    @property
    def datetimes(self) -> np.ndarray | None:
        """The times of a calendar axis as datetime64[ns]; None for other
        axes."""
        return self.time_axis.to_datetime(self.times) if self.time_axis.is_calendar else None

    def find_step(self, when, *, nearest: bool = False) -> int:
        """The index of the time step at a date and time of a calendar axis
        (a text such as "2024-03-22T06:00", or a datetime64): exact to a
        millisecond, or with ``nearest`` the closest step."""
        if self.datetimes is None:
            raise ValueError(f"{self.path}: its {self.time_axis.name} time axis has no dates")
        return step_at(self.datetimes, when, nearest, self.path)

    def read_times(self, steps) -> np.ndarray:
        """The stored time of each given step; for file types that store no
        times, the step's index."""
        self._pool.require_open()
        steps = self._steps(steps)[0]
        if self.file_type not in _TIMES_STORED:
            return steps.astype(np.float64)
        out = np.empty(len(steps), dtype=np.float64)
        time = c_double()
        with self._use() as (lib, h, f):
            for k, t in enumerate(steps.tolist()):
                try:
                    self._position(lib, h, f, t, 1)
                    check(lib.grdReadItemTimeStep(h, f, byref(time), None), f"{self.path}: time step {t}")
                except TovaError as exc:
                    raise self._where_data_ends(lib, h, f, t, self.items[0], exc) from exc
                out[k] = time.value
        return out

    # Data -----------------------------------------------------------------------------
    def _steps(self, steps) -> tuple:
        """(0-based step indices as an int64 array, whether one step was
        asked for by an integer)."""
        n = self.n_steps
        if steps is None:
            return np.arange(n, dtype=np.int64), False
        if isinstance(steps, str):  # a date of a calendar axis, as the tool takes it
            return np.array([self.find_step(steps)], dtype=np.int64), True
        if isinstance(steps, slice):
            return np.arange(n, dtype=np.int64)[steps], False
        if np.ndim(steps) == 0:
            return np.array([_index(steps, n, "time step")], dtype=np.int64), True
        steps = np.asarray(steps)
        if steps.size and steps.dtype.kind not in "iu":
            raise TypeError(f"time steps must be integers, not {steps.dtype}")
        steps = steps.astype(np.int64).reshape(-1)
        if steps.size and (steps.min() < -n or steps.max() >= n):
            raise IndexError(f"time step out of range for {n}")
        return steps % max(n, 1), False

    def _position(self, lib, h, f, step: int, number: int) -> None:
        status = lib.grdFindItemDynamic(h, f, step, number)
        if status:
            raise TovaError(status, self.path, f"cannot position at item {number} of time step {step}")

    def _read_into(self, lib, h, f, item: Item, step: int, buffer: np.ndarray) -> None:
        """Reads one item of one step into a C-contiguous buffer of its size;
        a file whose data ends too early is named with where it ends."""
        try:
            self._position(lib, h, f, step, item.number)
            check(lib.grdReadItemTimeStep(h, f, None, buffer.ctypes.data),
                  f"{self.path}: item {item.name!r} of time step {step}")
        except TovaError as exc:
            raise self._where_data_ends(lib, h, f, step, item, exc) from exc

    def _readable(self, lib, h, f, position: int) -> bool:
        """Whether the item at a position (time step times item count plus
        item index) can be found and read whole."""
        step, index = divmod(position, len(self.items))
        item = self.items[index]
        scratch = np.empty(item.size, dtype=item.dtype)
        return (lib.grdFindItemDynamic(h, f, step, item.number) == 0
                and lib.grdReadItemTimeStep(h, f, None, scratch.ctypes.data) == 0)

    def _where_data_ends(self, lib, h, f, step: int, item: Item, exc: TovaError) -> TovaError:
        """The error of a read that failed at (step, item) as the data of a
        damaged file: the first item, in file order, that cannot be read,
        found by halving between the file's start and the failure."""
        if exc.status not in _DATA_MISSING:
            return exc
        low, high = 0, step * len(self.items) + item.number - 1  # high cannot be read
        while low < high:
            middle = (low + high) // 2
            if self._readable(lib, h, f, middle):
                low = middle + 1
            else:
                high = middle
        end_step, index = divmod(high, len(self.items))
        ends = self.items[index]
        return TovaError(exc.status, self.path,
                         f"the data ends in time step {end_step} at item {ends.number} {ends.name!r}, "
                         f"although the header counts {self.n_steps} time steps: the file is cut short or damaged "
                         f"(reading item {item.name!r} of time step {step})")

    def masked_dtype(self, item) -> np.dtype:
        """The element type of an item's values once delete values are NaN."""
        item = item if isinstance(item, Item) else self.item(item)
        if self.delete_values.for_dtype(item.dtype) is None or item.dtype.kind == "f":
            return item.dtype
        return np.dtype(np.float64)

    def mask_values(self, item, values: np.ndarray) -> np.ndarray:
        """The values with the delete value of the item's element type as NaN:
        float arrays in place, other types as a new float64 array (16-bit
        types have no delete value and stay as they are)."""
        item = item if isinstance(item, Item) else self.item(item)
        marker = self.delete_values.for_dtype(item.dtype)
        if marker is None:
            return values
        if values.dtype.kind != "f":
            hit = values == marker
            values = values.astype(np.float64)
            values[hit] = np.nan
            return values
        if values.flags.c_contiguous and values.flags.writeable:
            nan_where_equal(values, marker)
        else:
            values[values == marker] = np.nan
        return values

    def read(self, item, steps=None, *, mask: bool | None = None) -> np.ndarray:
        """The values of an item at the given time steps: an integer step (or
        the date of one, "2024-03-22T06:00") gives one array of the item's
        shape; None (all), a slice or a sequence of steps gives an array with
        the steps first. Each step is one jump and one read straight into the
        result; its delete values become NaN while it is fresh in the cache."""
        self._pool.require_open()
        item = self.item(item)
        indices, single = self._steps(steps)
        masked = self.mask if mask is None else mask
        marker = self.delete_values.for_dtype(item.dtype) if masked and item.dtype.kind == "f" else None
        out = np.empty((len(indices),) + item.shape, dtype=item.dtype)
        rows = out.reshape(len(indices), item.size)
        with self._use() as (lib, h, f):
            for k, t in enumerate(indices.tolist()):
                self._read_into(lib, h, f, item, t, rows[k])
                if marker is not None:
                    nan_where_equal(rows[k], marker)
        if masked and marker is None:
            out = self.mask_values(item, out)
        return out[0] if single else out

    def read_step(self, step: int, *, mask: bool | None = None) -> dict:
        """Every item of one time step, by name, in one pass."""
        self._pool.require_open()
        t = _index(step, self.n_steps, "time step")
        out = {}
        with self._use() as (lib, h, f):
            for item in self.items:
                out[item.name] = values = np.empty(item.shape, dtype=item.dtype)
                self._read_into(lib, h, f, item, t, values.reshape(item.size))
        if self.mask if mask is None else mask:
            out = {it.name: self.mask_values(it, out[it.name]) for it in self.items}
        return out

    def item_extremes(self, item) -> tuple:
        """(minimum, maximum, number of delete values) of an item as the
        header keeps them."""
        item = self.item(item)
        lo, hi, deletes = c_double(), c_double(), c_int32()
        with self._use() as (lib, h, _):
            check(lib.grdGetItemStatsGlobal(lib.grdItemD(h, item.number), byref(lo), byref(hi), byref(deletes)),
                  self.path)
        return lo.value, hi.value, deletes.value


def open(path: str | os.PathLike, *, mask: bool = True) -> GridFile:  # noqa: A001 - tova.open is the API
    """Opens a gridded data file for reading; see ``GridFile``."""
    return GridFile(path, mask=mask)


# ---- Writer ---------------------------------------------------------------------------


def _set_axis(lib, handle, axis: Axis, what: str) -> None:
    family, dim, name = AXIS_KINDS.get(axis.kind, AXIS_KINDS[0])
    if family == "undefined":
        raise TovaError(F_ERR_VALUE, what, "the item has no axis")
    unit = units.unit(axis.unit).key
    fn = getattr(lib, f"grdSetItemAxis{name}")
    if family == "equidistant":
        status = fn(handle, unit, *axis.sizes, *axis.origin, *axis.step)
    elif family == "time-varying":
        status = fn(handle, unit, *axis.sizes)
    else:
        arrays = [np.ascontiguousarray(c, dtype=np.float64) for c in axis.coords]
        status = fn(handle, unit, *axis.sizes, *(_lib.as_pointer(a, c_double) for a in arrays), 0)
    check(status, what)


def _set_item(lib, header, handle, item: Item, what: str) -> None:
    quantity, unit = units.quantity(item.quantity), units.unit(item.unit)
    status = lib.grdSetItemInfo(header, handle, quantity.key, _lib.encode(item.name), unit.key,
                                TYPE_CODES[item.dtype])
    if status:
        raise (UnitError if status == 2020 else TovaError)(
            status, what, f"unit {unit.name!r} does not fit quantity {quantity.name!r}" if status == 2020 else "")
    _set_axis(lib, handle, item.axis, what)
    check(lib.grdSetItemValueType(handle, item.value_type), what)


def _values(values, item: Item, what: str) -> np.ndarray:
    """The values of an item as the C-contiguous native array to hand over."""
    src = np.asarray(values)
    if not np.can_cast(src.dtype, item.dtype, "same_kind"):
        raise TypeError(f"{what}: cannot store {src.dtype} values in a {item.dtype} item")
    if src.shape != item.shape:
        raise TovaError(F_ERR_SIZE, what, f"values of shape {src.shape}, the item's shape is {item.shape}")
    return np.ascontiguousarray(src, dtype=item.dtype)


def _nan_as_delete(values: np.ndarray, src, marker) -> np.ndarray:
    """Float values with NaN replaced by the file's delete value, so that
    every reader sees "no value" there; the caller's array is not changed."""
    if values.dtype.kind != "f" or marker is None:
        return values
    nan = np.isnan(values)
    if not nan.any():
        return values
    if np.shares_memory(values, np.asarray(src)):
        values = values.copy()
    values[nan] = marker
    return values


def _set_time_axis(lib, header, axis: TimeAxis, what: str) -> None:
    unit = units.unit(axis.unit).key
    if axis.kind == 1:
        status = lib.grdSetEqTimeAxis(header, unit, axis.start, axis.step, axis.first_index)
    elif axis.kind == 2:
        status = lib.grdSetNeqTimeAxis(header, unit, axis.start, axis.first_index)
    elif axis.kind in (3, 4) and axis.start_date is not None:
        stamp = str(_datetime(axis.start_date))
        date, time = (_lib.encode(p) for p in stamp.split("T"))
        if axis.kind == 3:
            status = lib.grdSetEqCalendarAxis(header, date, time, unit, axis.start, axis.step, axis.first_index)
        else:
            status = lib.grdSetNeqCalendarAxis(header, date, time, unit, axis.start, axis.first_index)
    else:
        raise TovaError(F_ERR_VALUE, what, f"time axis kind {axis.kind} without its start date" if axis.kind in (3, 4)
                        else f"unknown time axis kind {axis.kind}")
    check(status, what)


class GridWriter(_OpenFile):
    """A gridded data file being written: the header and static items are
    written on creation, then each ``append`` adds one time step of every
    item. ``close`` (or leaving the ``with`` block) brings the header up to
    date and closes the file."""

    def __init__(self, path: str | os.PathLike, items, time_axis: TimeAxis, *, file_type: int | None = None,
                 title: str = "", app_title: str = "tova", app_version: int = 0, data_type: int = 0,
                 projection: Projection | None = None, delete_values: DeleteValues | None = None,
                 static_items=(), custom_blocks=(), stats_type: int = 1, encoding_keys=None):
        self.path = os.fspath(path)
        self.items = list(items)
        for n, item in enumerate(self.items, 1):
            if not isinstance(item, Item) or isinstance(item, StaticItem):
                raise TypeError(f"item {n} is a {type(item).__name__}, not a tova.Item")
            item.number = n
        if not self.items:
            raise TovaError(F_ERR_VALUE, self.path, "a file needs at least one item")
        if len({it.name for it in self.items}) != len(self.items):
            raise TovaError(F_ERR_VALUE, self.path, "item names must differ")
        if not isinstance(time_axis, TimeAxis):
            raise TypeError("a file needs a tova.TimeAxis")
        self.time_axis = time_axis
        if file_type is None:
            file_type = NEQTIME_FIXEDSPACE if self.time_axis.kind in (2, 4) else EQTIME_FIXEDSPACE
        self.file_type = file_type
        self.steps_written = 0
        statics = [(s, _values(s.values, s, f"{self.path}: static item {s.name!r}")) for s in static_items]
        blocks = [self._block(b) for b in (custom_blocks.items() if isinstance(custom_blocks, dict) else custom_blocks)]
        keys = self._keys(encoding_keys)
        self._failure: TovaError | None = None

        lib = _lib.tova()
        handles = Handles(lib, c_void_p(), c_void_p())
        header, file = handles.header, handles.file
        self._own(handles)  # one pair: a file being written is never reopened
        try:
            check(lib.grdHeaderCreate(file_type, _lib.encode(title), _lib.encode(app_title), app_version,
                                      len(self.items), stats_type, byref(header)), self.path)
            self._fill_header(lib, header, data_type, projection, delete_values, blocks)
            if keys:
                pointers = [_lib.as_pointer(k, c_int32) if k is not None else None for k in keys]
                check(lib.grdSetEncodeKey(header, *pointers, len(keys[0])), self.path)
            check_open(lib.grdFileCreate(_lib.encode(path), header, byref(file)), self.path, writing=True)
            for item, values in statics:
                self._write_static(handles, item, values)
        except BaseException:
            created = bool(file.value)
            self._finalizer()
            if created:  # a failed create leaves no half-made file behind
                try:
                    os.remove(self.path)
                except OSError:
                    pass
            raise

    def _keys(self, keys) -> list | None:
        """The x, y and z encoding keys (the z key, or the y and z keys, may
        be left out or None) as int32 arrays of one length."""
        if keys is None:
            return None
        keys = list(keys) + [None] * (3 - len(keys))
        if len(keys) != 3 or keys[0] is None:
            raise TovaError(F_ERR_VALUE, self.path, "encoding keys are x, y and z keys, the x key at least")
        keys = [None if k is None else np.ascontiguousarray(k, dtype=np.int32).reshape(-1) for k in keys]
        if len({k.size for k in keys if k is not None}) != 1 or keys[0].size == 0:
            raise TovaError(F_ERR_SIZE, self.path, "the encoding keys need one common, non-zero length")
        return keys

    @staticmethod
    def _block(entry) -> tuple:
        name, values = entry
        if isinstance(values, (bytes, str)):
            values = np.frombuffer(values.encode("latin-1") if isinstance(values, str) else values, dtype=np.int8)
        values = np.ascontiguousarray(values)
        if values.dtype not in TYPE_CODES:
            raise TovaError(F_ERR_VALUE, detail=f"custom block {name!r}: element type {values.dtype} is not stored")
        return _lib.encode(name), values

    def _fill_header(self, lib, h, data_type, projection, delete_values, blocks) -> None:
        check(lib.grdSetDataType(h, data_type), self.path)
        if delete_values is not None:
            dv = DeleteValues(*delete_values)
            for fn, value in ((lib.grdSetDeleteValFloat, dv.float), (lib.grdSetDeleteValDouble, dv.double),
                              (lib.grdSetDeleteValByte, dv.byte), (lib.grdSetDeleteValInt, dv.int),
                              (lib.grdSetDeleteValUnsignedInt, dv.unsigned)):
                check(fn(h, value), self.path)
        if projection is not None:
            p = Projection(*projection) if not isinstance(projection, str) else Projection(projection)
            check(lib.grdSetGeoInfoUTMProj(h, _lib.encode(p.name), p.longitude, p.latitude, p.orientation),
                  self.path)
        for name, values in blocks:
            check(lib.grdAddCustomBlock(h, TYPE_CODES[values.dtype], name, values.size, values.ctypes.data),
                  self.path)
        _set_time_axis(lib, h, self.time_axis, f"{self.path}: time axis")
        for item in self.items:
            _set_item(lib, h, lib.grdItemD(h, item.number), item, f"{self.path}: item {item.name!r}")
        self.delete_values = _delete_values_of(lib, h)

    def _write_static(self, handles: Handles, item: StaticItem, values: np.ndarray) -> None:
        lib, header, file = handles
        what = f"{self.path}: static item {item.name!r}"
        handle = c_void_p()
        check(lib.grdStaticCreate(byref(handle)), what)
        try:
            check(lib.grdStaticSetHeader(header, handle), what)
            _set_item(lib, header, handle, item, what)
            values = _nan_as_delete(values, item.values, self.delete_values.for_dtype(item.dtype))
            check(lib.grdStaticWrite(handle, file, values.ctypes.data), what)
        finally:
            lib.grdStaticDestroy(byref(handle))

    def write_static(self, item: StaticItem) -> None:
        """Writes a static item; only before the first time step."""
        if self.steps_written:
            raise TovaError(F_ERR_ARGUMENT, self.path, "static items go before the first time step")
        values = _values(item.values, item, f"{self.path}: static item {item.name!r}")
        with self._use() as handles:
            self._write_static(handles, item, values)

    def _time(self, time) -> float:
        axis = self.time_axis
        if axis.is_equidistant:
            return float(axis.equidistant_times(self.steps_written))
        if time is None:
            raise TovaError(F_ERR_ARGUMENT, self.path, f"a {axis.name} time axis needs the time of each step")
        if isinstance(time, (np.datetime64, _dt.datetime, _dt.date, str)):
            return axis.from_datetime(time)
        return float(time)

    def append(self, values, time=None) -> None:
        """Writes one time step: ``values`` maps item names to arrays, or
        lists the arrays in item order (a single array for a file of one
        item). ``time`` is the step's time for non-equidistant axes (in the
        axis's unit, or a date and time for a calendar axis); equidistant
        axes compute it."""
        if isinstance(values, dict):
            unknown = set(values) - {it.name for it in self.items}
            missing = [it.name for it in self.items if it.name not in values]
            if unknown or missing:
                raise KeyError(f"{self.path}: unknown items {sorted(unknown)}, missing items {missing}")
            values = [values[it.name] for it in self.items]
        elif len(self.items) == 1 and isinstance(values, np.ndarray):
            values = [values]
        values = list(values)
        if len(values) != len(self.items):
            raise TovaError(F_ERR_SIZE, self.path, f"{len(values)} arrays for {len(self.items)} items")
        step = self.steps_written
        arrays = [_nan_as_delete(_values(v, it, f"{self.path}: item {it.name!r} of time step {step}"), v,
                                 self.delete_values.for_dtype(it.dtype))
                  for v, it in zip(values, self.items)]
        t = self._time(time)
        if self._failure is not None:
            raise TovaError(self._failure.status, self.path, f"an earlier time step failed: {self._failure}")
        with self._use() as (lib, h, f):
            for item, array in zip(self.items, arrays):
                status = lib.grdWriteItemTimeStep(h, f, t, array.ctypes.data)
                if status:
                    # The time step is incomplete: later steps would land on the wrong items.
                    self._failure = TovaError(status, f"{self.path}: item {item.name!r} of time step {step}")
                    raise self._failure
        self.steps_written += 1

    def flush(self) -> None:
        """Brings the header on disk up to date (at most once a second)."""
        with self._use() as (lib, h, f):
            check(lib.grdFileFlush(h, f), self.path)

    def close(self) -> None:
        """Rewrites the header and closes the file. When the final header
        update fails the error is raised and the handles are released."""
        if self.closed:
            return
        try:
            with self._use() as (lib, h, f):
                check(lib.grdFileClose(h, byref(f)), self.path)
        finally:
            self._finalizer()


def create(path: str | os.PathLike, items, time_axis: TimeAxis, **options) -> GridWriter:
    """Creates a gridded data file and writes its header and static items;
    returns the writer to append time steps with. ``items`` are ``Item``
    objects (quantity and unit as objects, keys or texts of ``tova.units``).
    Options: ``file_type`` (default: 1 for equidistant time axes, 4 for the
    others), ``title``, ``app_title``, ``app_version``, ``data_type``,
    ``projection`` (a ``Projection`` or its text), ``delete_values``
    (``DeleteValues``), ``static_items`` (``StaticItem`` objects),
    ``custom_blocks`` (name -> array, or pairs), ``stats_type`` (1-3),
    ``encoding_keys`` (x, y and z grid indices of the elements to store:
    every item larger than the keys then stores only those elements, taken
    from the full arrays given to ``append``)."""
    return GridWriter(path, items, time_axis, **options)


__all__ = ["Axis", "CustomBlock", "DeleteValues", "GridFile", "GridWriter", "Item", "Projection", "StaticItem",
           "TimeAxis", "create", "open"]
