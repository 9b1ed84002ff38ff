"""Writing a CF-style xarray Dataset as a gridded data file:
``tova.to_grd(ds, path)`` and the accessor ``ds.tova.to_grd(path)``.

Data variables over the time dimension become items, those without it
static items. The time coordinate becomes the time axis (a calendar axis for
the standard calendars, equidistant when the steps are equal), 1-D
coordinates become equidistant or non-equidistant axes, 2-D longitude and
latitude a curvilinear axis, the ``grid_mapping`` variable the projection.
Units are matched to the unit library through ``tova.cf``; NaN and the
variables' fill values become the file's delete values. Everything the header
has no place for is kept in the file's custom blocks (``tova.cf``), so that
opening the file with ``engine="tova"`` gives the dataset back.

Nothing is written before the whole dataset has been mapped: a variable that
cannot be (text data, no shared time dimension, more than three spatial
dimensions) fails the call, or is skipped with a warning when
``skip_unmappable`` is set. Data go out one time step at a time: a
dask-backed or lazily opened dataset is read step by step.
"""

from __future__ import annotations

import re
import sys
from dataclasses import dataclass, field

import numpy as np

from . import cf, grd
from . import units as _units
from .errors import F_ERR_VALUE, TovaError
from .grd import Axis, Item, StaticItem, TimeAxis

_DEGREES = re.compile(r"^degrees?(_?(east|north|E|N))?$", re.IGNORECASE)
_SINCE = re.compile(r"^\s*(\w+)\s+since\s+(.+?)\s*$")
# Time steps are read from the dataset in runs of about this many bytes.
_RUN_BYTES = 8 << 20
_ENCODING_KEPT = ("_FillValue", "missing_value", "dtype", "units", "calendar", "scale_factor", "add_offset",
                  "coordinates")


class Unmappable(TovaError):
    """A variable that has no place in a gridded data file."""


@dataclass
class _Source:
    """One item or static item and the variable its values come from."""

    name: str
    item: Item
    var: object
    tdim: str | None
    spatial: tuple

    def values(self, steps: slice | None = None, delete=None) -> np.ndarray:
        """The values of a static item, or of a run of time steps (time
        first), as the item's element type."""
        if steps is None:
            data = np.asarray(self.var.transpose(*self.spatial).values)
        else:
            data = np.asarray(self.var.isel({self.tdim: steps}).transpose(self.tdim, *self.spatial).values)
        dtype = self.item.dtype
        if dtype.kind == "f" or data.dtype.kind != "f":
            return np.asarray(data, dtype=dtype)
        # Missing values of an integer variable (decoded as NaN) become the delete value.
        missing = np.isnan(data)
        out = np.where(missing, 0, data).astype(dtype)
        out[missing] = delete
        return out


@dataclass
class _Plan:
    items: list = field(default_factory=list)  # _Source
    statics: list = field(default_factory=list)  # _Source
    time_axis: TimeAxis | None = None
    times: np.ndarray | None = None
    projection: grd.Projection | None = None
    meta: dict = field(default_factory=dict)
    arrays: dict = field(default_factory=dict)
    blocks: dict = field(default_factory=dict)
    skipped: list = field(default_factory=list)
    lost: list = field(default_factory=list)  # attributes that could not be kept


# ---- Recognising the parts of a dataset --------------------------------------------------


def _is_time(var) -> bool:
    attrs = var.attrs
    return (var.dtype.kind == "M" or (var.dtype == object and var.size and hasattr(var.values.flat[0], "calendar"))
            or attrs.get("axis") == "T" or attrs.get("standard_name") == "time"
            or " since " in str(attrs.get("units", var.encoding.get("units", ""))))


def _time_dim(ds) -> str | None:
    """The time dimension: that of a 1-D time coordinate most data variables
    use, else a dimension named "time"."""
    candidates = [d for d in ds.dims if d in ds.coords and ds[d].ndim == 1 and _is_time(ds[d])]
    if not candidates:
        return "time" if "time" in ds.dims else None
    return max(candidates, key=lambda d: sum(d in v.dims for v in ds.data_vars.values()))


def _names(text) -> list:
    """Variable names in an attribute: "crs", "lat lon", or "crs: x y"."""
    words = str(text or "").split()
    named = [w[:-1] for w in words if w.endswith(":")]
    return named or words


def _special(ds) -> tuple:
    """(grid-mapping variables, variables that only describe others:
    bounds, grid mappings, auxiliary coordinates)."""
    mappings, described = [], set()
    for var in ds.variables.values():
        for name in _names(var.attrs.get("grid_mapping")):
            if name in ds.variables and name not in mappings:
                mappings.append(name)
        for key in ("bounds", "climatology"):
            described.update(n for n in _names(var.attrs.get(key)) if n in ds.variables)
        described.update(n for n in _names(var.encoding.get("coordinates", var.attrs.get("coordinates")))
                         if n in ds.variables)
    return mappings, described | set(mappings)


# ---- Time ------------------------------------------------------------------------------


def _encode_times(var, units_text=None, calendar=None) -> tuple:
    """(numbers, units, calendar) of a time variable as CF stores it."""
    import xarray as xr

    values = var.values
    if values.dtype.kind == "M" or values.dtype == object:
        units_text = units_text or var.encoding.get("units")
        calendar = calendar or var.encoding.get("calendar")
        numbers, used_units, used_calendar = xr.coding.times.encode_cf_datetime(values, units_text, calendar)
        # The texts as given: the encoder may respell an equal reference date.
        return np.asarray(numbers), units_text or used_units, calendar or used_calendar
    return values, units_text or var.attrs.get("units", ""), calendar or var.attrs.get("calendar")


def _calendar_start(reference: str, calendar: str | None):
    """The start date of a calendar axis for a CF reference date: whole
    seconds, years 1 to 9999, a standard calendar; else None."""
    if (calendar or "standard").lower() not in cf.STANDARD_CALENDARS:
        return None
    try:
        import pandas as pd

        stamp = pd.Timestamp(reference.strip().replace(" UTC", "").rstrip("Z"))
    except (ValueError, TypeError, OverflowError):
        return None
    if stamp.tzinfo is not None:
        if stamp.utcoffset().total_seconds():
            return None
        stamp = stamp.tz_localize(None)
    if stamp != stamp.floor("s") or not 1 <= stamp.year <= 9999:
        return None
    return np.datetime64(stamp.to_pydatetime(), "s")


def _plan_time(ds, tdim: str, plan: _Plan) -> None:
    n = ds.sizes[tdim]
    var = ds[tdim] if tdim in ds.variables else None
    if var is None:
        numbers, units_text, calendar = np.arange(n, dtype=np.float64), "s", None
    else:
        numbers, units_text, calendar = _encode_times(var)
    if np.asarray(numbers).dtype.kind not in "iuf":
        raise Unmappable(F_ERR_VALUE, detail=f"time {tdim!r}: values of type {np.asarray(numbers).dtype}")
    times = np.asarray(numbers, dtype=np.float64)
    if not np.array_equal(times, numbers):
        raise Unmappable(F_ERR_VALUE, detail=f"time {tdim!r}: values beyond the exact range of doubles")
    since = _SINCE.match(str(units_text or ""))
    word = since.group(1) if since else (units_text or "s")
    unit = cf.time_unit_of(word)
    if unit is None:
        raise Unmappable(F_ERR_VALUE, detail=f"time {tdim!r}: unit {units_text!r} is not a time unit of the "
                                              f"unit library (seconds, minutes, hours, days)")
    start = _calendar_start(since.group(2), calendar) if since else None
    step = times[1] - times[0] if n > 1 else 1.0
    equal = n < 2 or (step > 0 and np.array_equal(times[0] + step * np.arange(n, dtype=np.float64), times))
    first = float(times[0]) if n else 0.0
    if start is not None:
        plan.time_axis = TimeAxis.calendar(start, step=float(step) if equal else None, unit=unit,
                                           offset=first if equal else 0.0)
    elif equal:
        plan.time_axis = TimeAxis.equidistant(float(step), start=first, unit=unit)
    else:
        plan.time_axis = TimeAxis.nonequidistant(unit)
    plan.times = times
    if var is not None:
        encoding = _kept_encoding(var)
        encoding.setdefault("units", units_text)
        encoding.setdefault("dtype", np.asarray(numbers).dtype)
        if calendar:
            encoding.setdefault("calendar", calendar)
        attrs = {k: v for k, v in var.attrs.items() if k not in ("units", "calendar")}
        plan.meta["time"] = {"name": tdim, "dim": tdim, "attrs": cf.encode_attrs(attrs, plan.lost, "time: "),
                             "encoding": cf.encode_attrs(encoding, plan.lost, "time: ")}
        plan.meta["time_units"] = (units_text, calendar)


# ---- Space ------------------------------------------------------------------------------


def _axis_unit(ds, dims) -> str:
    """The axis unit of a grid from the units of its coordinates: degrees,
    a length of the unit library, else metres."""
    for d in dims:
        text = ds[d].attrs.get("units", "") if d in ds.coords else ""
        if _DEGREES.match(str(text)):
            return "deg"
        if text:
            try:
                unit = cf.match_unit(text, f"coordinate {d!r}")
                if _units.fits("Length", unit):
                    return unit.name
            except TovaError:
                pass
    return grd.DEFAULT_AXIS_UNIT


def _lonlat(ds, var, spatial) -> tuple:
    """The 2-D longitude and latitude of a variable over two dimensions,
    when it has them."""
    found = {}
    for name, c in var.coords.items():
        if c.ndim == 2 and set(c.dims) == set(spatial):
            units_text = str(c.attrs.get("units", ""))
            standard = c.attrs.get("standard_name", "")
            if standard == "longitude" or re.match(r"^degrees?_?(east|E)$", units_text):
                found["lon"] = c.transpose(*spatial).values
            elif standard == "latitude" or re.match(r"^degrees?_?(north|N)$", units_text):
                found["lat"] = c.transpose(*spatial).values
    return found.get("lon"), found.get("lat")


def _boundaries(ds, dim: str, values: np.ndarray, ndim: int) -> np.ndarray:
    """Cell boundaries of a direction for a non-equidistant axis: the bounds
    variable when it is contiguous, else half-way between the coordinates.
    A 1-D axis keeps one point per element, then one more."""
    n = values.size
    extra = values[-1] + (values[-1] - values[-2]) if n > 1 else values[-1] + 1.0
    if ndim == 1:
        return np.append(values, extra)
    bounds = ds[dim].attrs.get("bounds") if dim in ds.coords else None
    if bounds in ds.variables and ds[bounds].shape == (n, 2):
        b = np.asarray(ds[bounds].values, dtype=np.float64)
        if np.array_equal(b[1:, 0], b[:-1, 1]):
            return np.append(b[:, 0], b[-1, 1])
    if n == 1:
        return np.array([values[0] - 0.5, values[0] + 0.5])
    middle = 0.5 * (values[:-1] + values[1:])
    return np.concatenate([[2 * values[0] - middle[0]], middle, [2 * values[-1] - middle[-1]]])


def _axis(ds, var, spatial: tuple) -> Axis:
    if not spatial:
        return Axis.point()
    if len(spatial) == 2:
        lon, lat = _lonlat(ds, var, spatial)
        if lon is not None and lat is not None:
            return Axis.curvilinear([cf.curvilinear_nodes(lon), cf.curvilinear_nodes(lat)], unit="deg")
    unit = _axis_unit(ds, spatial)
    columns = []
    for d in reversed(spatial):  # x first
        c = ds[d] if d in ds.coords and ds[d].ndim == 1 and ds[d].dtype.kind in "iuf" else None
        columns.append(np.arange(ds.sizes[d], dtype=np.float64) if c is None
                       else np.asarray(c.values, dtype=np.float64))
    steps = [np.diff(v) for v in columns]
    regular = all(s.size == 0 or (s[0] > 0 and np.allclose(s, s[0], rtol=1e-6, atol=0)) for s in steps)
    if regular:
        return Axis.equidistant([v.size for v in columns], origin=[v[0] for v in columns],
                                step=[s[0] if s.size else 1.0 for s in steps], unit=unit)
    dims_x_first = list(reversed(spatial))
    return Axis.nonequidistant([_boundaries(ds, d, v, len(columns)) for d, v in zip(dims_x_first, columns)],
                               unit=unit)


# ---- Variables --------------------------------------------------------------------------


def _item_dtype(var) -> np.dtype:
    data = var.dtype
    stored = np.dtype(var.encoding.get("dtype", data))
    if data.kind == "f":
        packed = "scale_factor" in var.encoding or "add_offset" in var.encoding
        if stored.kind in "iub" and not packed:
            return np.dtype(np.uint32 if stored == np.uint32 else np.int32)
        return np.dtype(np.float64 if data == np.float64 else np.float32)
    if data.kind in "iub":
        return np.dtype(np.uint32 if data == np.uint32 else np.int32)
    raise Unmappable(F_ERR_VALUE, detail=f"values of type {data} (text or dates) are not stored")


def _unmappable(plan: _Plan, name: str, reason: str, skip: bool, warn) -> None:
    if not skip:
        raise Unmappable(F_ERR_VALUE, detail=f"variable {name!r} cannot be written: {reason} "
                                             f"(--skip-unmappable leaves it out)")
    plan.skipped.append((name, reason))
    warn(f"variable {name!r} left out: {reason}")


def _kept_encoding(var) -> dict:
    """The encoding that decides how a variable is stored in netCDF: fill
    values, packing, its stored type (not a text type's class)."""
    encoding = {k: v for k, v in var.encoding.items() if k in _ENCODING_KEPT}
    if "dtype" in var.encoding and "_FillValue" not in encoding:
        encoding["_FillValue"] = None  # read from a file that had none: write none either
    if not isinstance(encoding.get("dtype", np.dtype(int)), np.dtype):
        del encoding["dtype"]
    return encoding


def _entry(plan: _Plan, name, var, kind: str, **extra) -> dict:
    encoding = _kept_encoding(var)
    return {"name": name, "kind": kind, "dims": list(var.dims),
            "attrs": cf.encode_attrs(var.attrs, plan.lost, f"attribute of {name!r}: "),
            "encoding": cf.encode_attrs(encoding, plan.lost, f"encoding of {name!r}: "), **extra}


def _keep_array(plan: _Plan, name: str, var, coord: bool) -> None:
    """A variable kept whole in the custom blocks (coordinates, bounds, grid
    mappings); dates as numbers in the time axis's units."""
    values = var.values
    entry = _entry(plan, name, var, "array", coord=coord, shape=list(values.shape))
    if values.dtype.kind == "M" or values.dtype == object and values.size and hasattr(values.flat[0], "calendar"):
        units_text, calendar = plan.meta.get("time_units", (None, None))
        values = _encode_times(var, units_text, calendar)[0]
        entry["time_encoded"] = True
    if values.dtype.kind in "USO":
        entry.update(kind="values", values=np.asarray(values).astype(str).tolist(), dtype="U")
    else:
        plan.arrays[name], entry["dtype"] = cf.storable_array(values)
    plan.meta["variables"].append(entry)


def _direction_rank(ds, dim: str) -> int:
    """2 for an x (longitude) dimension, 1 for y (latitude), 0 for others:
    a file's x varies fastest, so x goes last in numpy order."""
    if dim not in ds.coords:
        return 0
    attrs = ds[dim].attrs
    text = " ".join(str(attrs.get(k, "")) for k in ("axis", "standard_name", "units"))
    if re.search(r"\bX\b|longitude|projection_x_coordinate|degrees?_?(east|E)\b", text):
        return 2
    if re.search(r"\bY\b|latitude|projection_y_coordinate|degrees?_?(north|N)\b", text):
        return 1
    return 0


def _add_variable(ds, plan: _Plan, name, var, tdim, units_map, skip, warn) -> None:
    time_dims = {d for d in var.dims if d != tdim and d in ds.coords and _is_time(ds[d])}
    spatial = tuple(sorted((d for d in var.dims if d != tdim), key=lambda d: _direction_rank(ds, d)))
    try:
        if time_dims:
            raise Unmappable(F_ERR_VALUE, detail=f"it lies over the time dimension {sorted(time_dims)[0]!r}, "
                                                 f"not the file's {tdim!r}")
        if len(spatial) > 3:
            raise Unmappable(F_ERR_VALUE, detail=f"{len(spatial)} spatial dimensions, a file stores at most 3")
        if any(ds.sizes[d] == 0 for d in spatial):
            raise Unmappable(F_ERR_VALUE, detail="an empty dimension")
        dtype = _item_dtype(var)
        axis = _axis(ds, var, spatial)
    except Unmappable as exc:
        _unmappable(plan, name, exc.detail, skip, warn)
        return
    what = f"variable {name!r}"
    if name in units_map:
        unit = _units.unit(units_map[name])
    else:
        unit = cf.match_unit(str(var.attrs.get("units", "")), what)
    quantity = cf.match_quantity(unit, var.attrs.get("standard_name"), var.attrs.get("quantity"))
    over_time = tdim in var.dims
    kind = "item" if over_time else "static"
    group = plan.items if over_time else plan.statics
    if over_time:
        item = Item(name, quantity, unit, dtype, axis)
    else:
        item = StaticItem(name, quantity, unit, dtype=dtype, axis=axis)
    group.append(_Source(name, item, var, tdim if over_time else None, spatial))
    stored_dims = ([tdim] if over_time else []) + list(spatial)
    masked = var.dtype.kind == "f" or "_FillValue" in var.encoding or "missing_value" in var.encoding
    plan.meta["variables"].append(_entry(plan, name, var, kind, number=len(group), stored_dims=stored_dims,
                                         masked=bool(masked)))


def _plan(ds, units_map: dict, skip: bool, warn) -> _Plan:
    plan = _Plan(meta={"attrs": {}, "variables": [],
                       "unlimited_dims": sorted(ds.encoding.get("unlimited_dims", ()))})
    tdim = _time_dim(ds)
    if tdim is None:
        raise Unmappable(F_ERR_VALUE, detail="the dataset has no time dimension (a time coordinate, or a "
                                             "dimension named \"time\")")
    plan.meta["attrs"] = cf.encode_attrs(ds.attrs, plan.lost, "global attribute: ")
    _plan_time(ds, tdim, plan)
    mappings, described = _special(ds)
    for name in ds.variables:
        if name == tdim:
            continue
        var = ds[name]
        if name in ds.coords or name in described:
            _keep_array(plan, name, var, coord=name in ds.coords)
        else:
            _add_variable(ds, plan, name, var, tdim, units_map, skip, warn)
    if not plan.items:
        raise Unmappable(F_ERR_VALUE, detail=f"no variable lies over the time dimension {tdim!r}")
    used = [m for m in mappings if any(m in _names(s.var.attrs.get("grid_mapping")) for s in plan.items)]
    if used:
        found = cf.projection_from_cf(ds[used[0]].attrs)
        if found:
            plan.projection = grd.Projection(*found)
    plan.meta.pop("time_units", None)
    for text in plan.lost:
        warn(f"{text} has no place in the file: left out")
    for key, value in ds.attrs.items():
        if key.startswith(cf.CUSTOM_ATTR_PREFIX):
            block = key[len(cf.CUSTOM_ATTR_PREFIX):]
            plan.blocks[block] = value.encode("latin-1") if isinstance(value, str) else np.asarray(value)
    return plan


def _warn(text: str) -> None:
    print(f"tova: {text}", file=sys.stderr)


def to_grd(ds, path, *, units: dict | None = None, skip_unmappable: bool = False, progress=None, warn=_warn,
           **options) -> list:
    """Writes a CF-style Dataset as a gridded data file (see the module
    text). ``units`` maps variable names to units of the unit library for
    unit texts that have no match; ``progress(done, total)`` is called after
    each time step; ``warn`` receives the note of each skipped variable.
    Further options go to ``tova.create`` (``title``, ``app_title``, ...).
    Returns the (name, reason) of the variables left out."""
    plan = _plan(ds, dict(units or {}), skip_unmappable, warn)
    blocks = dict(plan.blocks)
    blocks.update(cf.metadata_blocks(plan.meta, plan.arrays))
    attrs = ds.attrs
    version = attrs.get("application_version", 0)
    options.setdefault("title", str(attrs.get("title", "")))
    options.setdefault("app_title", str(attrs.get("application", "tova")))
    options.setdefault("app_version", int(version) if np.ndim(version) == 0 and str(version).isdigit() else 0)
    options.setdefault("projection", plan.projection)
    statics = []
    deletes = grd.DeleteValues(*options.get("delete_values") or grd.DeleteValues())
    for source in plan.statics:
        source.item.values = source.values(delete=deletes.for_dtype(source.item.dtype))
        statics.append(source.item)
    n = plan.times.size
    with grd.create(path, [s.item for s in plan.items], plan.time_axis, static_items=statics, custom_blocks=blocks,
                    **options) as writer:
        deletes = [writer.delete_values.for_dtype(s.item.dtype) for s in plan.items]
        timed = not plan.time_axis.is_equidistant
        # Steps are read in runs of a few MiB: one read per run instead of
        # one per step, and memory bounded whatever the length of the file.
        step_bytes = sum(s.item.size * s.item.dtype.itemsize for s in plan.items)
        run = max(1, _RUN_BYTES // max(step_bytes, 1))
        for first in range(0, n, run):
            steps = slice(first, min(first + run, n))
            blocks = [s.values(steps, d) for s, d in zip(plan.items, deletes)]
            for k, t in enumerate(range(steps.start, steps.stop)):
                writer.append([b[k] for b in blocks], time=float(plan.times[t]) if timed else None)
                if progress is not None:
                    progress(t + 1, n)
    return plan.skipped


def register_accessor() -> None:
    """Registers ``Dataset.tova`` (with ``to_grd``) when xarray is there."""
    try:
        import xarray as xr
    except ImportError:
        return

    if hasattr(xr.Dataset, "tova"):
        return

    @xr.register_dataset_accessor("tova")
    class _TovaAccessor:
        def __init__(self, ds):
            self._ds = ds

        def to_grd(self, path, **options):
            """``tova.to_grd(ds, path, **options)``."""
            return to_grd(self._ds, path, **options)


__all__ = ["Unmappable", "register_accessor", "to_grd"]
