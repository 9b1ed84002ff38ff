"""Choosing items and time steps the way the ``tova`` tool does: items by
number or by name (the name exactly, then without regard to case, then the
one name it begins), time steps by number, range ``A:B`` or date (exact or
the nearest one). ``GridFile.item`` and ``GridFile.find_step`` use these, and
so does ``python -m tova plot``."""

from __future__ import annotations

import re

import numpy as np

_DATE = re.compile(r"^\d{4}-\d{2}-\d{2}([T ]\d{2}:\d{2}(:\d{2}(\.\d+)?)?)?$")


def match_name(names, key: str, what: str = "item", path: str = "") -> int:
    """The 0-based index of ``key`` among ``names``: the name exactly, else
    without regard to case, else the one name that begins with it (any case).
    KeyError naming the candidates otherwise."""
    names = list(names)
    where = f"{path}: " if path else ""
    if key in names:
        return names.index(key)
    wanted = key.casefold()
    exact = [i for i, n in enumerate(names) if n.casefold() == wanted]
    prefix = [i for i, n in enumerate(names) if n.casefold().startswith(wanted)] if wanted else []
    if len(exact) == 1:
        return exact[0]
    if not exact and len(prefix) == 1:
        return prefix[0]
    several = exact if len(exact) > 1 else prefix
    if len(several) > 1:
        listed = ", ".join(f'{i + 1} "{names[i]}"' for i in several)
        raise KeyError(f'{where}"{key}" names more than one {what} ({listed}): give more of the name or the number')
    listed = ", ".join(f'{i + 1} "{n}"' for i, n in enumerate(names)) or "none"
    raise KeyError(f'{where}no {what} named "{key}"; the {what}s: {listed}')


def parse_date(text: str) -> np.datetime64 | None:
    """A date "2024-03-22", "2024-03-22T06:00" or "2024-03-22 06:00:30.5"
    as datetime64[ns]; None for other texts."""
    if not _DATE.match(text.strip()):
        return None
    try:
        return np.datetime64(text.strip().replace(" ", "T"), "ns")
    except ValueError:
        return None


def _show(stamp) -> str:
    """A datetime64 as "2024-03-22 06:00:00" (with milliseconds when it has them)."""
    stamp = np.datetime64(stamp, "ns")
    unit = "s" if stamp == stamp.astype("datetime64[s]") else "ms"
    return np.datetime_as_string(stamp, unit=unit).replace("T", " ")


def step_at(datetimes: np.ndarray, when, nearest: bool = False, path: str = "") -> int:
    """The index of the time step at ``when`` (a date text or datetime64)
    among the sorted ``datetimes``: the step at that time (within a
    millisecond), or with ``nearest`` the closest one inside the time span.
    ValueError naming the neighbouring steps otherwise."""
    where = f"{path}: " if path else ""
    stamp = parse_date(when) if isinstance(when, str) else np.datetime64(when, "ns")
    if stamp is None:
        raise ValueError(f"{where}{when!r} is no date (2024-03-22T06:00)")
    times = np.asarray(datetimes, dtype="datetime64[ns]")
    if times.size == 0:
        raise ValueError(f"{where}the file holds no time steps")
    tolerance = np.timedelta64(1, "ms")
    after = int(np.searchsorted(times, stamp - tolerance))
    if after < times.size and abs(times[after] - stamp) <= tolerance:
        return after
    if after == 0 or after == times.size:
        side = "before the first" if after == 0 else "after the last"
        raise ValueError(f"{where}{_show(stamp)} is {side} time step; the time steps run from {_show(times[0])} "
                         f"to {_show(times[-1])}")
    before = after - 1
    if nearest:
        return before if stamp - times[before] <= times[after] - stamp else after
    raise ValueError(f"{where}no time step at {_show(stamp)}: the nearest are time step {before} "
                     f"({_show(times[before])}) and time step {after} ({_show(times[after])}); nearest=True takes "
                     "the closer one")


__all__ = ["match_name", "parse_date", "step_at"]
