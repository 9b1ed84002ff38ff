"""Loading libtova and libqty through ctypes, with the prototypes of every C
function the package calls.

Where the libraries are looked for, in this order:

1. ``TOVA_LIBRARY_DIR``: when set, that directory and nothing else.
2. The package's own directory (libraries bundled next to ``__init__.py``).
3. The build trees of the source checkout the package sits in:
   ``<checkout>/build/src`` and ``<checkout>/build/*/src``, newest ``libtova``
   first. Sanitizer builds are left out, and a build that cannot be loaded
   into this interpreter is skipped.
4. The installed libraries: ``<sys.prefix>/lib``, then the dynamic loader's
   own search (``ctypes.util.find_library`` and the standard names).

libqty is always taken from the directory libtova comes from, and loaded
first, so libtova's own dependency resolves to that same copy.

The libraries are loaded on first use, not on import. They keep no hidden
state shared between files: distinct files may be used on distinct threads
at once, while each handle is used by one thread at a time (the package's
file objects hold a lock per handle for that).
"""

from __future__ import annotations

import ctypes
import ctypes.util
import os
import struct
import sys
import threading
from ctypes import (
    POINTER,
    c_byte,
    c_char,
    c_char_p,
    c_double,
    c_float,
    c_int,
    c_int32,
    c_uint16,
    c_uint32,
    c_void_p,
)
from pathlib import Path

ENV_VAR = "TOVA_LIBRARY_DIR"

# Guards the first load of the libraries only.
_load_lock = threading.Lock()

_WINDOWS = sys.platform.startswith("win")
_MACOS = sys.platform == "darwin"
# Exported functions are __stdcall on 32-bit Windows, cdecl everywhere else.
_Loader = ctypes.WinDLL if _WINDOWS and struct.calcsize("P") == 4 else ctypes.CDLL  # type: ignore[attr-defined]


class LibraryNotFoundError(OSError):
    """libtova or libqty could not be found or loaded."""


def file_names(base: str) -> list[str]:
    """File names under which the shared library ``base`` ('tova', 'qty') may
    be found in a directory, most specific first."""
    if _WINDOWS:
        return [f"{base}.dll", f"lib{base}.dll"]
    if _MACOS:
        return [f"lib{base}.dylib", f"lib{base}.0.dylib"]
    return [f"lib{base}.so", f"lib{base}.so.0"]


def _library_in(directory: Path, base: str) -> Path | None:
    for name in file_names(base):
        path = directory / name
        if path.is_file():
            return path
    return None


def _sanitized(build_dir: Path) -> bool:
    """Whether a CMake build tree was configured with sanitizers: such
    libraries need their runtime loaded first and may abort the process."""
    try:
        cache = (build_dir / "CMakeCache.txt").read_text(errors="replace")
    except OSError:
        return False
    return any(f"{opt}:BOOL=ON" in cache for opt in ("TOVA_SANITIZE", "TOVA_TSAN"))


def build_tree_dirs(checkout: Path) -> list[Path]:
    """Library directories of the build trees below ``checkout``, newest
    libtova first; sanitizer builds are left out."""
    build = checkout / "build"
    subdirs = [d for d in [build / "src", *sorted(build.glob("*/src"))] if not _sanitized(d.parent)]
    if _WINDOWS:  # multi-config generators put the DLLs one level deeper
        subdirs = [d / cfg for d in subdirs for cfg in ("Release", "RelWithDebInfo", "Debug")] + subdirs
    found = [(lib.stat().st_mtime, d) for d in subdirs if (lib := _library_in(d, "tova")) is not None]
    found.sort(key=lambda entry: entry[0], reverse=True)
    return [d for _, d in found]


def candidate_dirs(environ=os.environ, package_dir: Path | None = None) -> list[Path]:
    """Directories to try, in order: the override alone when it is set, else
    those of the places above that hold a libtova."""
    package_dir = package_dir or Path(__file__).resolve().parent
    override = environ.get(ENV_VAR)
    if override:
        return [Path(override)]
    dirs = [package_dir]
    dirs += build_tree_dirs(package_dir.parent.parent)
    dirs.append(Path(sys.prefix) / ("bin" if _WINDOWS else "lib"))
    return [d for d in dirs if _library_in(d, "tova") is not None]


def _load_from(directory: Path) -> tuple[ctypes.CDLL, ctypes.CDLL]:
    if _WINDOWS and hasattr(os, "add_dll_directory"):
        os.add_dll_directory(str(directory))
    qty_path = _library_in(directory, "qty")
    tova_path = _library_in(directory, "tova")
    if qty_path is None or tova_path is None:
        raise LibraryNotFoundError(f"no libtova and libqty in {directory}")
    qty = _Loader(str(qty_path))
    return _Loader(str(tova_path)), qty


def _load_installed() -> tuple[ctypes.CDLL, ctypes.CDLL]:
    loaded = []
    for base in ("qty", "tova"):
        errors = []
        for name in filter(None, [ctypes.util.find_library(base), *reversed(file_names(base))]):
            try:
                loaded.append(_Loader(name))
                break
            except OSError as exc:
                errors.append(str(exc))
        else:
            raise LibraryNotFoundError("; ".join(errors) or f"no installed lib{base}")
    qty, tova = loaded
    return tova, qty


def load(environ=os.environ, package_dir: Path | None = None) -> tuple[ctypes.CDLL, ctypes.CDLL]:
    """(libtova, libqty) from the first place that yields both; raises
    LibraryNotFoundError naming every place tried."""
    tried = []
    for directory in candidate_dirs(environ, package_dir):
        try:
            return _load_from(directory)
        except OSError as exc:
            tried.append(f"{directory}: {exc}")
    if not environ.get(ENV_VAR):
        try:
            return _load_installed()
        except OSError as exc:
            tried.append(f"installed libraries: {exc}")
    raise LibraryNotFoundError(
        "cannot load libtova/libqty (build the project, install it, or set "
        f"{ENV_VAR} to the directory holding the libraries). Tried: " + " | ".join(tried)
    )


# ---- Prototypes ------------------------------------------------------------

i32 = c_int32
p_i32 = POINTER(c_int32)
p_double = POINTER(c_double)
p_float = POINTER(c_float)
p_text = POINTER(c_char_p)

QTY_PROTOTYPES = {
    "qtyItemUnitEqv": (c_int, [i32, i32]),
    "qtyGetItemTypeKey": (c_int, [i32, p_text]),
    "qtyGetUnitKey": (c_int, [i32, p_text]),
    "qtyGetUnitTag": (c_int, [c_char_p, p_i32]),
    "qtyGetItemTypeTag": (c_int, [c_char_p, p_i32]),
    "qtyGetItemUnitSeq": (c_int, [i32, i32, p_i32, p_text]),
    "qtyGetItemUnitCount": (i32, [i32]),
    "qtyGetItemTypeCount": (i32, []),
    "qtyGetItemTypeByIndex": (c_int, [i32, p_i32, p_text, p_text]),
    "qtyGetUnitCount": (i32, []),
    "qtyGetUnitByIndex": (c_int, [i32, p_i32, p_text, p_text]),
    "qtyGetItemTypeDescription": (c_int, [i32, p_text]),
    "qtyGetUnitDescription": (c_int, [i32, p_text]),
    "qtyConvertUnit": (c_int, [i32, c_double, i32, p_double]),
    "qtyConvertToUserUnit": (c_int, [i32, i32, c_double, p_double]),
    "qtyConvertFromUserUnit": (c_int, [i32, i32, c_double, p_double]),
    "qtyConvertItemArrayD": (c_int, [i32, i32, p_double, i32, c_double]),
    "qtyConvertItemArrayF": (c_int, [i32, i32, p_float, i32, c_float]),
    "qtyConvertItemArrayToUserUnitD": (c_int, [i32, i32, p_double, i32, c_double]),
    "qtyConvertItemArrayToUserUnitF": (c_int, [i32, i32, p_float, i32, c_float]),
    "qtyConvertItemArrayFromUserUnitD": (c_int, [i32, i32, p_double, i32, c_double]),
    "qtyConvertItemArrayFromUserUnitF": (c_int, [i32, i32, p_float, i32, c_float]),
    "qtySetUserUnit": (c_int, [i32, i32]),
    "qtyGetUserUnit": (c_int, [i32, p_i32]),
}

VreHandle = c_void_p
TOVA_PROTOTYPES = {
    "vreHandleCreate": (VreHandle, []),
    "vreHandleFree": (i32, [VreHandle]),
    "vreFileRead": (i32, [c_char_p, POINTER(VreHandle)]),
    "vreFileWrite": (i32, [c_char_p, VreHandle]),
    "vreGetVectorParam": (i32, [VreHandle, i32]),
    "vreSetVectorParam": (i32, [VreHandle, i32, i32]),
    "vreGetVectorSize": (i32, [VreHandle, i32]),
    "vreGetBodyNames": (i32, [VreHandle, POINTER(c_char)]),
    "vreSetBodyNames": (i32, [VreHandle, POINTER(c_char)]),
    "vreGetBodyPanelCount": (i32, [VreHandle, p_i32]),
    "vreSetBodyPanelCount": (i32, [VreHandle, p_i32]),
    "vreGetSymmetry": (i32, [VreHandle, p_i32, p_i32]),
    "vreSetSymmetry": (i32, [VreHandle, i32, i32]),
    "vreGetScalarItem": (c_double, [VreHandle, i32]),
    "vreSetScalarItem": (i32, [VreHandle, i32, c_double]),
    "vreGetScalarItemUnitInfo": (i32, [VreHandle, i32, p_i32, p_i32, p_i32, p_i32]),
    "vreGetVectorItemUnitInfo": (i32, [VreHandle, i32, p_i32, p_i32, p_i32, p_i32]),
    "vreSetScalarItemUnit": (i32, [VreHandle, i32, i32]),
    "vreSetVectorItemUnit": (i32, [VreHandle, i32, i32]),
    "vreGetVectorItem": (i32, [VreHandle, i32, p_double]),
    "vreSetVectorItem": (i32, [VreHandle, i32, p_double]),
}



class XsecData(ctypes.Structure):
    """The record of one cross section, laid out as the C header has it:
    packed on 2-byte boundaries, pointers of the platform's width."""

    _pack_ = 2
    _fields_ = [
        ("keyValue", c_double),
        ("primaryName", c_char_p),
        ("secondaryName", c_char_p),
        ("extraName", c_char_p),
        ("headerWords", c_uint16 * 25),
        ("headerValues", c_double * 23),
        ("noRaw", c_uint32),
        ("raw", POINTER(c_double) * 3),
        ("noSel", c_uint32),
        ("sel", POINTER(c_double)),
        ("noPrc", c_uint32),
        ("prc", POINTER(c_double) * 6),
        ("raw3", POINTER(c_double)),
        ("rawMark", POINTER(c_uint16) * 2),
        ("noCoords", c_uint32),
        ("coords", POINTER(c_double) * 3),
        ("owner", c_void_p),
    ]


XsecHandle = POINTER(XsecData)
p_handle = POINTER(c_void_p)
TOVA_PROTOTYPES.update({
    "xfsFileOpenCreate": (i32, [c_char_p, p_handle]),
    "xfsFileClose": (i32, [p_handle]),
    "xfsGetError": (i32, [c_void_p]),
    "xfsPeekError": (i32, [c_void_p]),
    "xfsXsecTableLoad": (i32, [c_char_p, p_handle, c_uint32]),
    "xfsXsecTableFree": (None, [p_handle]),
    "xfsXsecTableVersion": (i32, [c_void_p]),
    "xfsXsecCreateEx": (XsecHandle, [c_char_p, c_double, c_char_p, c_char_p]),
    "xfsXsecFree": (None, [POINTER(XsecHandle)]),
    "xfsXsecSetNoCoords": (i32, [XsecHandle, c_uint32]),
    "xfsXsecSetNoPrc": (i32, [XsecHandle, c_uint32]),
    "xfsXsecSetNoRaw": (i32, [XsecHandle, c_uint32]),
    "xfsXsecSetNoSel": (i32, [XsecHandle, c_uint32]),
    "xfsXsecWrite": (i32, [XsecHandle, c_void_p]),
    "xfsXsecFind": (XsecHandle, [c_void_p, c_char_p, c_double, c_char_p, p_handle]),
    "xfsXsecFindNext": (XsecHandle, [c_void_p, c_void_p]),
})

# Gridded data files. Handles are opaque pointers; texts handed out are lent.
p_coords = POINTER(POINTER(c_double))
_H = c_void_p  # HeaderHandle, FileHandle, ItemHandle, CustomBlockHandle
TOVA_PROTOTYPES.update({
    "grdHeaderCreate": (i32, [i32, c_char_p, c_char_p, i32, i32, i32, p_handle]),
    "grdHeaderDestroy": (i32, [p_handle]),
    "grdGetStatusText": (c_char_p, [i32]),
    "grdFileTypeStr": (c_char_p, [i32]),
    "grdTimeAxisTypeStr": (c_char_p, [i32]),
    "grdGetFileType": (i32, [_H]),
    "grdGetFileTitle": (c_char_p, [_H]),
    "grdSetFileTitle": (i32, [_H, c_char_p]),
    "grdGetAppTitle": (c_char_p, [_H]),
    "grdSetAppTitle": (i32, [_H, c_char_p]),
    "grdGetAppVersionNo": (i32, [_H]),
    "grdGetDataType": (i32, [_H]),
    "grdSetDataType": (i32, [_H, i32]),
    "grdGetItemStatsType": (i32, [_H]),
    "grdGetDeleteValFloat": (c_float, [_H]),
    "grdGetDeleteValDouble": (c_double, [_H]),
    "grdGetDeleteValByte": (c_byte, [_H]),
    "grdGetDeleteValInt": (i32, [_H]),
    "grdGetDeleteValUnsignedInt": (c_uint32, [_H]),
    "grdSetDeleteValFloat": (i32, [_H, c_float]),
    "grdSetDeleteValDouble": (i32, [_H, c_double]),
    "grdSetDeleteValByte": (i32, [_H, c_byte]),
    "grdSetDeleteValInt": (i32, [_H, i32]),
    "grdSetDeleteValUnsignedInt": (i32, [_H, c_uint32]),
    "grdParamModifyTimes": (i32, [_H, i32]),
    "grdGetGeoInfoType": (i32, [_H]),
    "grdSetGeoInfoUTMProj": (i32, [_H, c_char_p, c_double, c_double, c_double]),
    "grdGetGeoInfoUTMProj": (i32, [_H, p_text, p_double, p_double, p_double]),
    "grdAddCustomBlock": (i32, [_H, i32, c_char_p, i32, c_void_p]),
    "grdGetCustomBlockRef": (i32, [_H, p_handle]),
    "grdGetCustomBlock": (i32, [_H, p_i32, p_text, p_i32, p_handle, p_handle]),
    "grdGetNoOfItems": (i32, [_H]),
    "grdItemD": (_H, [_H, i32]),
    "grdSetItemInfo": (i32, [_H, _H, i32, c_char_p, i32, i32]),
    "grdGetItemInfo": (i32, [_H, p_i32, p_text, p_text, p_i32, p_text, p_i32]),
    "grdSetItemValueType": (i32, [_H, i32]),
    "grdGetItemValueType": (i32, [_H, p_i32]),
    "grdGetItemAxisType": (i32, [_H]),
    "grdGetEncodeKeySize": (i32, [_H]),
    "grdSetEncodeKey": (i32, [_H, p_i32, p_i32, p_i32, i32]),
    "grdIsFileCompressed": (i32, [_H]),
    "grdGetItemStatsGlobal": (i32, [_H, p_double, p_double, p_i32]),
    # Time axes.
    "grdSetEqTimeAxis": (i32, [_H, i32, c_double, c_double, i32]),
    "grdSetNeqTimeAxis": (i32, [_H, i32, c_double, i32]),
    "grdSetEqCalendarAxis": (i32, [_H, c_char_p, c_char_p, i32, c_double, c_double, i32]),
    "grdSetNeqCalendarAxis": (i32, [_H, c_char_p, c_char_p, i32, c_double, i32]),
    "grdGetTimeAxisType": (i32, [_H]),
    "grdGetEqTimeAxis": (i32, [_H, p_i32, p_text, p_double, p_double, p_i32, p_i32]),
    "grdGetNeqTimeAxis": (i32, [_H, p_i32, p_text, p_double, p_double, p_i32, p_i32]),
    "grdGetEqCalendarAxis": (i32, [_H, p_i32, p_text, p_text, p_text, p_double, p_double, p_i32, p_i32]),
    "grdGetNeqCalendarAxis": (i32, [_H, p_i32, p_text, p_text, p_text, p_double, p_double, p_i32, p_i32]),
    # File lifecycle, static items, dynamic data, positioning.
    "grdFileCreate": (i32, [c_char_p, _H, p_handle]),
    "grdFileRead": (i32, [c_char_p, p_handle, p_handle]),
    "grdFileFlush": (i32, [_H, _H]),
    "grdFileClose": (i32, [_H, p_handle]),
    "grdStaticCreate": (i32, [p_handle]),
    "grdStaticDestroy": (i32, [p_handle]),
    "grdStaticSetHeader": (i32, [_H, _H]),
    "grdStaticWrite": (i32, [_H, _H, c_void_p]),
    "grdStaticRead": (_H, [_H, p_i32]),
    "grdStaticGetData": (i32, [_H, c_void_p]),
    "grdWriteItemTimeStep": (i32, [_H, _H, c_double, c_void_p]),
    "grdReadItemTimeStep": (i32, [_H, _H, p_double, c_void_p]),
    "grdFindBlockStatic": (i32, [_H, _H]),
    "grdFindTimeStep": (i32, [_H, _H, i32]),
    "grdFindItemDynamic": (i32, [_H, _H, i32, i32]),
    "rcfFileClose": (i32, [p_handle]),
})


def _axis_prototypes() -> dict:
    """Setters and getters of the item axes: (unit, sizes, then origins and
    steps, coordinate arrays or nothing), by kind and dimension."""
    protos = {"grdSetItemAxisEqD0": (i32, [_H, i32]), "grdGetItemAxisEqD0": (i32, [_H, p_i32, p_text])}
    for d in (1, 2, 3, 4):
        protos[f"grdSetItemAxisEqD{d}"] = (i32, [_H, i32] + [i32] * d + [c_float] * (2 * d))
        protos[f"grdGetItemAxisEqD{d}"] = (i32, [_H, p_i32, p_text] + [p_i32] * d + [p_float] * (2 * d))
    for kind, dims in (("Neq", (1, 2, 3)), ("CurveLinear", (2, 3))):
        for d in dims:
            protos[f"grdSetItemAxis{kind}D{d}"] = (i32, [_H, i32] + [i32] * d + [p_double] * d + [i32])
            protos[f"grdGetItemAxis{kind}D{d}"] = (i32, [_H, p_i32, p_text] + [p_i32] * d + [p_coords] * d)
    for d in (1, 2, 3):
        protos[f"grdSetItemAxisTvarD{d}"] = (i32, [_H, i32] + [i32] * d)
        protos[f"grdGetItemAxisTvarD{d}"] = (i32, [_H, p_i32, p_text] + [p_i32] * d)
    return protos


TOVA_PROTOTYPES.update(_axis_prototypes())


def _missing(lib_name: str, name: str):
    def call(*_args):
        raise LibraryNotFoundError(f"{lib_name} has no function {name}: it is older than this package; rebuild it")

    return call


def declare(lib: ctypes.CDLL, prototypes: dict) -> None:
    """Sets restype and argtypes of each function; a function the library
    lacks becomes a stub that raises LibraryNotFoundError when called."""
    for name, (restype, argtypes) in prototypes.items():
        try:
            fn = getattr(lib, name)
        except AttributeError:
            setattr(lib, name, _missing(getattr(lib, "_name", "the library"), name))
            continue
        fn.restype = restype
        fn.argtypes = argtypes


_loaded: tuple[ctypes.CDLL, ctypes.CDLL] | None = None


def _libraries() -> tuple[ctypes.CDLL, ctypes.CDLL]:
    global _loaded
    with _load_lock:
        if _loaded is None:
            tova_lib, qty_lib = load()
            declare(qty_lib, QTY_PROTOTYPES)
            declare(tova_lib, TOVA_PROTOTYPES)
            _loaded = (tova_lib, qty_lib)
        return _loaded


def tova() -> ctypes.CDLL:
    """libtova with its prototypes declared (loaded on first call)."""
    return _libraries()[0]


def qty() -> ctypes.CDLL:
    """libqty with its prototypes declared (loaded on first call)."""
    return _libraries()[1]


def library_paths() -> tuple[str, str]:
    """The names under which libtova and libqty were loaded."""
    tova_lib, qty_lib = _libraries()
    return tova_lib._name, qty_lib._name


def encode(text: str | bytes | os.PathLike) -> bytes:
    """A text or path as the zero-terminated bytes the C API takes."""
    if isinstance(text, os.PathLike):
        text = os.fsencode(text)
    if isinstance(text, str):
        text = os.fsencode(text)
    if b"\0" in text:
        raise ValueError("text holds a zero byte")
    return text


def decode(raw: bytes | None) -> str:
    """A C text handed out by the libraries (ASCII; other bytes kept)."""
    return "" if raw is None else raw.decode("utf-8", "surrogateescape")


def as_pointer(array, ctype):
    """A ctypes pointer to a C-contiguous numpy array's first element."""
    return array.ctypes.data_as(POINTER(ctype))

