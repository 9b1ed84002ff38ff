"""The handles of an open gridded data file, shared safely between threads.

The library's rule is one handle, one thread at a time; distinct handles
may be used on distinct threads at once. A ``HandlePool`` keeps the header
and file handles the file was opened with and, for a file open for reading,
opens further pairs of the same file when several threads read at once (up
to a small limit), so dask's threads read one file in parallel instead of
queueing for one handle. Each pair is lent to one thread at a time; the
pool's condition variable is the only lock, and no lock is held while the
library reads.
"""

from __future__ import annotations

import os
import threading
from contextlib import contextmanager
from ctypes import byref, c_void_p
from typing import Callable, NamedTuple

from .errors import F_ERR_ARGUMENT, TovaError

# Handle pairs per file: enough for the threads of one machine's dask
# scheduler, few enough that each open file costs little memory.
DEFAULT_LIMIT = max(2, min(8, os.cpu_count() or 2))


class Handles(NamedTuple):
    """A header handle and a file handle of one open file, with the library."""

    lib: object
    header: c_void_p
    file: c_void_p


def release(handles: Handles) -> None:
    """Closes the file and frees the header (each only if still there). A
    file whose final header update fails is closed by the record layer all
    the same: the handles never outlive their owner."""
    lib, header, file = handles
    if file.value and lib.grdFileClose(header, byref(file)) and file.value:
        lib.rcfFileClose(byref(file))
    if header.value:
        lib.grdHeaderDestroy(byref(header))


class HandlePool:
    """The handle pairs of one open file: the first, given by the owner,
    and up to ``limit`` in all, made by ``reopen`` when every pair is busy
    (no more when ``reopen`` is None: a file being written has one pair)."""

    def __init__(self, path: str, first: Handles, reopen: Callable[[], Handles] | None = None,
                 limit: int = DEFAULT_LIMIT):
        self.path = path
        self._idle = [first]
        self._count = 1
        self._limit = limit if reopen is not None else 1
        self._reopen = reopen
        self._closed = False
        self._ready = threading.Condition(threading.Lock())

    @property
    def closed(self) -> bool:
        return self._closed

    def require_open(self) -> None:
        """Raises the error of a closed file when the pool is closed."""
        if self._closed:
            raise TovaError(F_ERR_ARGUMENT, self.path, "the file is closed")

    @contextmanager
    def use(self):
        """Lends a pair to the calling thread for the block: an idle one, a
        new one while fewer than the limit are open, else the next one given
        back."""
        handles = None
        with self._ready:
            while handles is None:
                self.require_open()
                if self._idle:
                    handles = self._idle.pop()
                elif self._count < self._limit:
                    self._count += 1
                    break
                else:
                    self._ready.wait()
        if handles is None:  # a new pair, opened outside the lock
            try:
                handles = self._reopen()
            except BaseException:
                with self._ready:
                    self._count -= 1
                    self._ready.notify()
                raise
        try:
            yield handles
        finally:
            with self._ready:
                if self._closed:
                    release(handles)
                else:
                    self._idle.append(handles)
                    self._ready.notify()

    def close(self) -> None:
        """Releases every idle pair now and each lent one when it is given
        back; later ``use`` raises."""
        with self._ready:
            if self._closed:
                return
            self._closed = True
            idle, self._idle = self._idle, []
            self._ready.notify_all()
        for handles in idle:
            release(handles)
