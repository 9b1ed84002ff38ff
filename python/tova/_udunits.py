"""UDUNITS-2 through ctypes: parsing unit texts as CF files write them
("kg m-2 s-1", "degrees_north", "K") and the factor and offset between two
units. Used by ``tova.cf`` to match those texts with the unit library's units.

The library (``libudunits2.so.0``, Debian ``libudunits2-0``) and its unit
database are loaded on first use; ``available()`` tells whether they could be.
"""

from __future__ import annotations

import ctypes
import ctypes.util
import threading
from ctypes import c_char_p, c_double, c_int, c_void_p

_NAMES = ("udunits2", "libudunits2.so.0", "libudunits2.so", "libudunits2.0.dylib", "udunits2.dll")
_UT_ASCII = 0
_lock = threading.Lock()
_state: dict = {}


def _load():
    """(library, unit system), or None when UDUNITS-2 is missing."""
    with _lock:
        if "lib" in _state:
            return _state["lib"]
        lib = None
        for name in _NAMES:
            path = ctypes.util.find_library(name) if "." not in name else name
            if not path:
                continue
            try:
                lib = ctypes.CDLL(path)
                break
            except OSError:
                continue
        result = None
        if lib is not None:
            lib.ut_read_xml.restype = c_void_p
            lib.ut_read_xml.argtypes = [c_char_p]
            lib.ut_parse.restype = c_void_p
            lib.ut_parse.argtypes = [c_void_p, c_char_p, c_int]
            lib.ut_free.argtypes = [c_void_p]
            lib.ut_are_convertible.argtypes = [c_void_p, c_void_p]
            lib.ut_get_converter.restype = c_void_p
            lib.ut_get_converter.argtypes = [c_void_p, c_void_p]
            lib.cv_convert_double.restype = c_double
            lib.cv_convert_double.argtypes = [c_void_p, c_double]
            lib.cv_free.argtypes = [c_void_p]
            lib.ut_set_error_message_handler.restype = c_void_p
            lib.ut_set_error_message_handler.argtypes = [c_void_p]
            # The database and unknown texts would otherwise be reported on stderr.
            lib.ut_set_error_message_handler(ctypes.cast(lib.ut_ignore, c_void_p))
            system = lib.ut_read_xml(None)
            if system:
                result = (lib, system)
        _state["lib"] = result
        return result


def available() -> bool:
    """Whether UDUNITS-2 and its database could be loaded."""
    return _load() is not None


class _Unit:
    """A parsed unit, freed with the object."""

    def __init__(self, lib, pointer: int):
        self._lib, self.pointer = lib, pointer

    def __del__(self):
        if self.pointer:
            self._lib.ut_free(self.pointer)
            self.pointer = None


_cache: dict = {}


def parse(text: str) -> _Unit | None:
    """The unit of a text, or None when UDUNITS-2 cannot parse it (or is
    missing)."""
    loaded = _load()
    if loaded is None or not text.strip():
        return None
    key = text.strip()
    with _lock:
        if key not in _cache:
            lib, system = loaded
            pointer = lib.ut_parse(system, key.encode("utf-8"), _UT_ASCII)
            _cache[key] = _Unit(lib, pointer) if pointer else None
        return _cache[key]


def linear(from_text: str, to_text: str) -> tuple | None:
    """(factor, offset) with to = factor * from + offset between the units of
    two texts, or None when either does not parse or their dimensions
    differ."""
    a, b = parse(from_text), parse(to_text)
    if a is None or b is None:
        return None
    lib = a._lib
    with _lock:
        if not lib.ut_are_convertible(a.pointer, b.pointer):
            return None
        converter = lib.ut_get_converter(a.pointer, b.pointer)
        if not converter:
            return None
        try:
            offset = lib.cv_convert_double(converter, 0.0)
            factor = lib.cv_convert_double(converter, 1.0) - offset
        finally:
            lib.cv_free(converter)
    return factor, offset
