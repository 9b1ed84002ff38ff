"""Status codes of the C libraries and the exception that carries them.

Every C call that returns a status goes through ``check``: 0 passes, anything
else raises ``TovaError`` with the code, its symbolic name and a readable
text, plus what the call was doing (usually the file's path).
"""

from __future__ import annotations

# code: (symbolic name, what it means)
STATUS = {
    0: ("F_NO_ERROR", "success"),
    1: ("F_EOF", "end of file reached"),
    1000: ("F_ERR_ARGUMENT", "a required handle or argument is missing or of the wrong kind"),
    1001: ("F_ERR_TIMESTEP_RANGE", "time step index out of range"),
    1002: ("F_ERR_ITEM_RANGE", "no such item or static item"),
    2000: ("F_ERR_MEMORY", "out of memory, or a size too large to hold"),
    2001: ("F_ERR_READ", "reading failed: the data expected is not in the file"),
    2002: ("F_ERR_WRITE", "writing to the file failed"),
    2003: ("F_ERR_OPEN", "the file could not be opened"),
    2004: ("F_ERR_CLOSE", "closing the file failed"),
    2005: ("F_ERR_FLUSH", "flushing the file to disk failed"),
    2006: ("F_ERR_SEEK", "positioning in the file failed"),
    2007: ("F_ERR_ITEMNO", "item number out of range"),
    2008: ("F_ERR_ELEMENT", "element index out of range"),
    2009: ("F_ERR_TYPE", "a record or block of the wrong type was found"),
    2010: ("F_ERR_VALUE", "a value is not valid or not supported here"),
    2011: ("F_ERR_DATE_FORMAT", "the date text could not be parsed"),
    2012: ("F_ERR_TIME_FORMAT", "the time-of-day text could not be parsed"),
    2013: ("F_ERR_SIZE", "a record or array has the wrong size or count"),
    2014: ("F_ERR_NOT_RCF", "not a record file"),
    2015: ("F_ERR_READONLY", "the file is open for reading only"),
    2016: ("F_ERR_NOT_BLOCK", "a block was expected but the next record does not start one"),
    2017: ("F_ERR_APP_TAG", "the file is of another kind (its application tag does not match)"),
    2018: ("F_ERR_DATA_TYPE", "invalid data type, or an operation the file's type does not allow"),
    2019: ("F_ERR_SKIP", "skipping a record did not land on a valid record"),
    2020: ("F_ERR_UNIT", "the unit does not fit the item's quantity"),
    10000: ("VRE_NOT_SET", "the item holds no values"),
}

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


def status_name(status: int) -> str:
    """The symbolic name of a status code ("F_ERR_OPEN"), or "status <n>"."""
    entry = STATUS.get(status)
    return entry[0] if entry else f"status {status}"


def status_text(status: int) -> str:
    """A readable text for a status code."""
    entry = STATUS.get(status)
    return entry[1] if entry else "unknown status code"


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
        super().__init__(f"{prefix}{text} [{self.name}, {self.status}]")


class UnitError(TovaError, ValueError):
    """An unknown quantity or unit, or a unit that does not fit (status 2010
    or 2020)."""


def check(status: int, context: str = "") -> None:
    """Raises TovaError (UnitError for 2020) for any status other than 0."""
    if status != F_NO_ERROR:
        raise (UnitError if status == F_ERR_UNIT else TovaError)(status, context)
