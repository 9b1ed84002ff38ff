"""Status codes of the C libraries and the exception that carries them.

Every C call that returns a status goes through ``check``: 0 passes, anything
else raises ``TovaError`` with the code, its symbolic name and a readable
text, plus what the call was doing (usually the file's path).
"""

from __future__ import annotations

import errno
import os

from . import _lib

# Codes of the VRE family, which the library's status table leaves out.
_VRE_STATUS = {10000: "VRE_NOT_SET: the item holds no values"}

F_NO_ERROR = 0
F_ERR_ARGUMENT = 1000
F_ERR_MEMORY = 2000
F_ERR_OPEN = 2003
F_ERR_VALUE = 2010
F_ERR_SIZE = 2013
F_ERR_NOT_RCF = 2014
F_ERR_APP_TAG = 2017
F_ERR_UNIT = 2020
VRE_NOT_SET = 10000


_status_texts: dict = {}


def _status_entry(status: int) -> tuple:
    """(name, meaning) of a status code from the library's own table; the
    name is "status <n>" for a code the library does not know."""
    text = _VRE_STATUS.get(status) or _status_texts.get(status)
    if text is None:
        try:
            text = _status_texts[status] = _lib.decode(_lib.tova().grdGetStatusText(status))
        except OSError:  # no library to ask (not kept: it may load later)
            text = ""
    name, colon, meaning = text.partition(": ")
    if not colon:
        return f"status {status}", "unknown status code"
    return name, meaning


def status_name(status: int) -> str:
    """The symbolic name of a status code ("F_ERR_OPEN"), or "status <n>"."""
    return _status_entry(int(status))[0]


def status_text(status: int) -> str:
    """What a status code means, as the library words it."""
    return _status_entry(int(status))[1]


class TovaError(Exception):
    """A failure reported by libtova or libqty.

    Attributes: ``status`` (the integer code), ``name`` (its symbolic name),
    ``context`` (what was being done, often a path; may be empty) and
    ``detail`` (a further explanation given by the package, may be empty).
    """

    def __init__(self, status: int, context: str = "", detail: str = ""):
        self.status = int(status)
        self.name = status_name(self.status)
        self.context = context
        self.detail = detail
        text = detail or status_text(self.status)
        prefix = f"{context}: " if context else ""
        self.message = f"{prefix}{text} [{self.name}, {self.status}]"
        super().__init__(self.message)

    def __str__(self) -> str:
        return self.message

    def __reduce__(self):
        # Rebuilt from its parts, so that it crosses processes (dask workers) whole.
        return type(self), (self.status, self.context, self.detail)


class UnitError(TovaError, ValueError):
    """An unknown quantity or unit, or a unit that does not fit (status 2010
    or 2020)."""


class _FileSystemError(TovaError):
    """A file that could not be opened, with the reason the file system
    gives: also the matching OSError, with ``errno`` and ``filename``."""

    errno_code = 0

    def __init__(self, status: int, path: str, detail: str):
        super().__init__(status, path, detail)
        self.errno = self.errno_code
        self.strerror = os.strerror(self.errno_code)
        self.filename = path


class TovaFileNotFoundError(_FileSystemError, FileNotFoundError):
    """The file (or the folder it is to be made in) does not exist."""

    errno_code = errno.ENOENT


class TovaIsADirectoryError(_FileSystemError, IsADirectoryError):
    """A folder where a file was expected."""

    errno_code = errno.EISDIR


class TovaPermissionError(_FileSystemError, PermissionError):
    """The file may not be read (or written) by this process."""

    errno_code = errno.EACCES


def _open_failure(path: str, writing: bool):
    """(class, reason) that the file system gives for a file that could
    not be opened, or None when it shows no reason."""
    if writing:
        folder = os.path.dirname(os.path.abspath(path))
        if os.path.isdir(path):
            return TovaIsADirectoryError, "is a folder, not a file"
        if not os.path.isdir(folder):
            return TovaFileNotFoundError, f"no folder {folder!r} to write the file in"
        if not os.access(folder, os.W_OK | os.X_OK) or (os.path.exists(path) and not os.access(path, os.W_OK)):
            return TovaPermissionError, "no permission to write the file"
        return None
    if not os.path.exists(path):
        return TovaFileNotFoundError, "no such file"
    if os.path.isdir(path):
        return TovaIsADirectoryError, "is a folder, not a file"
    if not os.access(path, os.R_OK):
        return TovaPermissionError, "no permission to read the file"
    return None


def check_open(status: int, path, *, writing: bool = False) -> None:
    """``check`` for a call that opens or creates the file ``path``: when it
    failed, a missing file raises a FileNotFoundError, a folder an
    IsADirectoryError and a lack of permission a PermissionError (each also
    a TovaError with the library's status)."""
    if status == F_NO_ERROR:
        return
    path = os.fspath(path)
    failure = _open_failure(path, writing)
    if failure is not None:
        cls, reason = failure
        raise cls(status, path, reason)
    check(status, path)


def check(status: int, context: str = "") -> None:
    """Raises TovaError (UnitError for 2020) for any status other than 0."""
    if status != F_NO_ERROR:
        raise (UnitError if status == F_ERR_UNIT else TovaError)(status, context)
