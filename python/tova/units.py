"""Quantities, units and conversions through libqty.

Quantities (``WaterLevel``, ``Velocity``, ...) and units (``m``, ``ft/s``,
...) are named by their integer key, their text key, or the ``Quantity`` /
``Unit`` objects this module hands out. Arrays are converted by libqty's
array calls, a whole buffer per call: a float32 array stays float32, any
other input becomes float64; elements equal to the delete value are left as
they are (NaN stays NaN anyway).
"""

from __future__ import annotations

import difflib
import operator
from ctypes import byref, c_char_p, c_double, c_float, c_int32
from typing import NamedTuple, Union

import numpy as np

from . import _lib
from .errors import F_ERR_UNIT, F_ERR_VALUE, UnitError

# Default delete values of the file formats, per element type.
DELETE_VALUE_FLOAT = -1e-35
DELETE_VALUE_DOUBLE = -1e-255
# libqty takes element counts as 32-bit integers.
_CHUNK = 2**31 - 1


class Quantity(NamedTuple):
    """A quantity type: its key, text key and description."""

    key: int
    name: str
    description: str

    def units(self) -> list["Unit"]:
        """The quantity's units, in the library's order (the first is its
        base unit)."""
        return units_of(self)

    def __str__(self) -> str:
        return self.name


class Unit(NamedTuple):
    """A unit: its key, text (symbol) and description."""

    key: int
    name: str
    description: str

    def __str__(self) -> str:
        return self.name


QuantityLike = Union[int, str, Quantity]
UnitLike = Union[int, str, Unit]


def _text_out(fn, key: int) -> str | None:
    text = c_char_p()
    return _lib.decode(text.value) if fn(key, byref(text)) else None


def _suggestions(text, known) -> str:
    """" (did you mean 'a', 'b'?)" for the known names closest to a text
    (letter case ignored), or "" when none is close."""
    text = text.decode("utf-8", "replace") if isinstance(text, bytes) else text
    by_folded = {}
    for entry in known:
        by_folded.setdefault(entry.name.casefold(), entry.name)
    close = difflib.get_close_matches(text.casefold(), list(by_folded), n=3, cutoff=0.6)
    return f" (did you mean {', '.join(repr(by_folded[c]) for c in close)}?)" if close else ""


def _lookup(value, cls, by_text, by_key, describe, what: str, known):
    """A Quantity or Unit from a key, a text or an object of its class;
    ``known`` lists every one, for suggestions when a text is unknown."""
    if isinstance(value, cls):
        return value
    if isinstance(value, (str, bytes)):
        key = c_int32()
        if not by_text(_lib.encode(value), byref(key)):
            raise UnitError(F_ERR_VALUE, detail=f"unknown {what} {value!r}{_suggestions(value, known())}")
        k = key.value
    else:
        k = operator.index(value)
    name = _text_out(by_key, k)
    if name is None:
        raise UnitError(F_ERR_VALUE, detail=f"unknown {what} key {k}")
    return cls(k, name, _text_out(describe, k) or "")


def quantity(q: QuantityLike) -> Quantity:
    """The quantity of a key, a text key (exact, or letter case ignored when
    that is unambiguous) or a Quantity. Raises UnitError when unknown."""
    lib = _lib.qty()
    return _lookup(q, Quantity, lib.qtyGetItemTypeTag, lib.qtyGetItemTypeKey, lib.qtyGetItemTypeDescription,
                   "quantity", quantities)


def unit(u: UnitLike) -> Unit:
    """The unit of a key, a text (symbol or alias) or a Unit. Raises
    UnitError when unknown."""
    lib = _lib.qty()
    return _lookup(u, Unit, lib.qtyGetUnitTag, lib.qtyGetUnitKey, lib.qtyGetUnitDescription, "unit", all_units)


def _entries(count: int, by_index, make) -> list:
    key, text, desc = c_int32(), c_char_p(), c_char_p()
    out = []
    for i in range(count):
        if by_index(i, byref(key), byref(text), byref(desc)):
            out.append(make(key.value, _lib.decode(text.value), _lib.decode(desc.value)))
    return out


def quantities() -> list[Quantity]:
    """Every quantity type libqty knows, by key."""
    lib = _lib.qty()
    return _entries(lib.qtyGetItemTypeCount(), lib.qtyGetItemTypeByIndex, Quantity)


def all_units() -> list[Unit]:
    """Every unit libqty knows, by key."""
    lib = _lib.qty()
    return _entries(lib.qtyGetUnitCount(), lib.qtyGetUnitByIndex, Unit)


def units_of(q: QuantityLike) -> list[Unit]:
    """The units of a quantity, in the library's order."""
    lib = _lib.qty()
    k = quantity(q).key
    key = c_int32()
    keys = [key.value for seq in range(1, lib.qtyGetItemUnitCount(k) + 1)
            if lib.qtyGetItemUnitSeq(k, seq, byref(key), None)]
    return [unit(x) for x in keys]


def fits(q: QuantityLike, u: UnitLike) -> bool:
    """Whether the unit can express the quantity (their dimensions agree)."""
    return bool(_lib.qty().qtyItemUnitEqv(quantity(q).key, unit(u).key))


def user_unit(q: QuantityLike) -> Unit:
    """The unit values of this quantity are shown in (process-wide; by
    default the quantity's first unit)."""
    k = quantity(q).key
    key = c_int32()
    if not _lib.qty().qtyGetUserUnit(k, byref(key)):
        raise UnitError(F_ERR_VALUE, detail=f"quantity {k} has no user unit")
    return unit(key.value)


def set_user_unit(q: QuantityLike, u: UnitLike) -> None:
    """Chooses the user unit of a quantity for the whole process."""
    qq, uu = quantity(q), unit(u)
    if not _lib.qty().qtySetUserUnit(qq.key, uu.key):
        raise UnitError(F_ERR_UNIT, detail=f"unit {uu.name!r} does not fit quantity {qq.name!r}")


# ---- Conversions --------------------------------------------------------------


def _is_scalar(values) -> bool:
    return not isinstance(values, np.ndarray) and np.ndim(values) == 0


def _prepare(values, inplace: bool) -> np.ndarray:
    """The array to convert: the caller's own when inplace, else a new
    C-contiguous float32 (for float32 input) or float64 copy."""
    if inplace:
        ok = (isinstance(values, np.ndarray) and values.dtype in (np.float32, np.float64)
              and values.dtype.isnative and values.flags.c_contiguous and values.flags.writeable)
        if not ok:
            raise ValueError("in-place conversion needs a writeable, C-contiguous float32 or float64 array")
        return values
    src = np.asarray(values)
    dtype = np.float32 if src.dtype == np.float32 else np.float64
    return np.array(src, dtype=dtype, order="C", copy=True)


def _run(array: np.ndarray, fn_f, fn_d, first: int, second: int, delete_value, what: str) -> np.ndarray:
    single = array.dtype == np.float32
    fn, ctype = (fn_f, c_float) if single else (fn_d, c_double)
    if delete_value is None:
        delete_value = DELETE_VALUE_FLOAT if single else DELETE_VALUE_DOUBLE
    flat = array.reshape(-1)
    # One call per 2^31-1 elements; an empty array still checks the units.
    for start in range(0, max(flat.size, 1), _CHUNK):
        part = flat[start:start + _CHUNK]
        if not fn(first, second, _lib.as_pointer(part, ctype), part.size, delete_value):
            raise UnitError(F_ERR_UNIT, detail=what)
    return array


def _scalar(call, value, delete_value, what: str) -> float:
    """call(value, out) is the scalar conversion; scalars count as doubles."""
    value = float(value)
    if value == (DELETE_VALUE_DOUBLE if delete_value is None else delete_value):
        return value
    out = c_double()
    if not call(value, byref(out)):
        raise UnitError(F_ERR_UNIT, detail=what)
    return out.value


def convert(values, from_unit: UnitLike, to_unit: UnitLike, *, delete_value: float | None = None,
            inplace: bool = False):
    """Converts values from one unit to another.

    A Python or numpy scalar gives a float; anything else gives an ndarray
    of the same shape (float32 stays float32, all else becomes float64), a
    new one unless ``inplace`` asks to convert the caller's C-contiguous
    float array itself. Elements equal to ``delete_value`` (default: the
    formats' delete value of the element type) are kept. Raises UnitError
    when the units are unknown or of different dimensions.
    """
    a, b = unit(from_unit), unit(to_unit)
    what = f"cannot convert from {a.name!r} to {b.name!r}"
    lib = _lib.qty()
    if _is_scalar(values) and not inplace:
        return _scalar(lambda v, out: lib.qtyConvertUnit(a.key, v, b.key, out), values, delete_value, what)
    return _run(_prepare(values, inplace), lib.qtyConvertItemArrayF, lib.qtyConvertItemArrayD,
                a.key, b.key, delete_value, what)


def _user_convert(values, q: QuantityLike, u: UnitLike, delete_value, inplace: bool, to_user: bool):
    qq, uu = quantity(q), unit(u)
    lib = _lib.qty()
    what = f"unit {uu.name!r} does not fit quantity {qq.name!r}"
    if to_user:
        scalar_fn, fn_f, fn_d = (lib.qtyConvertToUserUnit, lib.qtyConvertItemArrayToUserUnitF,
                                 lib.qtyConvertItemArrayToUserUnitD)
    else:
        scalar_fn, fn_f, fn_d = (lib.qtyConvertFromUserUnit, lib.qtyConvertItemArrayFromUserUnitF,
                                 lib.qtyConvertItemArrayFromUserUnitD)
    if _is_scalar(values) and not inplace:
        return _scalar(lambda v, out: scalar_fn(qq.key, uu.key, v, out), values, delete_value, what)
    return _run(_prepare(values, inplace), fn_f, fn_d, qq.key, uu.key, delete_value, what)


def to_user_unit(values, q: QuantityLike, u: UnitLike, *, delete_value: float | None = None,
                 inplace: bool = False):
    """Converts values of quantity ``q`` from unit ``u`` to the quantity's
    user unit; the same forms and rules as ``convert``."""
    return _user_convert(values, q, u, delete_value, inplace, True)


def from_user_unit(values, q: QuantityLike, u: UnitLike, *, delete_value: float | None = None,
                   inplace: bool = False):
    """Converts values of quantity ``q`` from its user unit to unit ``u``."""
    return _user_convert(values, q, u, delete_value, inplace, False)
