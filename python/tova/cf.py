"""The CF conventions for gridded data files, both ways: one mapping used by
the xarray backend (a file opened with ``engine="tova"`` carries CF
attributes) and by the writer ``tova.to_grd`` (a CF-style Dataset becomes a
gridded data file).

- Units: a unit text of a CF file ("kg m-2 s-1", "degC", "m s-1") is matched
  to a unit of the unit library through UDUNITS-2 (an exact factor and
  offset); the library's units are shown in UDUNITS spelling.
- Quantities: the standard name of each quantity that has one is kept in
  ``STANDARD_NAMES``; the quantity of a CF variable comes from its standard
  name, else from its unit.
- Map projections: pyproj turns a ``grid_mapping`` variable into the header's
  projection text (an authority code or WKT) and back.
- What a header has no place for (the original names, dimension order,
  attributes and encodings of variables and of the dataset, exact coordinate
  values, bounds variables) is kept in custom blocks: ``METADATA_BLOCK`` holds
  it as JSON text, ``ARRAY_BLOCK_PREFIX`` + name the arrays. Reading restores
  them, so a CF file comes back as it was.
"""

from __future__ import annotations

import json
import math
import re
import warnings

import numpy as np

from . import _udunits, units
from .errors import F_ERR_UNIT, F_ERR_VALUE, TovaError, UnitError

CONVENTIONS = "CF-1.10"
METADATA_BLOCK = "CF_METADATA"
ARRAY_BLOCK_PREFIX = "CF_ARRAY:"
CUSTOM_ATTR_PREFIX = "custom_block_"
_META_VERSION = 1

# CF standard names of the unit library's quantities (one table, both ways).
STANDARD_NAMES = {
    "WaterLevel": "water_surface_height_above_reference_datum",
    "WaterDepth": "sea_floor_depth_below_sea_surface",
    "VelocityX": "sea_water_x_velocity",
    "VelocityY": "sea_water_y_velocity",
    "VelocityZ": "upward_sea_water_velocity",
    "CurrentSpeed": "sea_water_speed",
    "CurrentDirection": "sea_water_velocity_to_direction",
    "Discharge": "water_volume_transport_in_river_channel",
    "Temperature": "sea_water_temperature",
    "Salinity": "sea_water_salinity",
    "Density": "sea_water_density",
    "SignificantWaveHeight": "sea_surface_wave_significant_height",
    "PeakWavePeriod": "sea_surface_wave_period_at_variance_spectral_density_maximum",
    "MeanWaveDirection": "sea_surface_wave_from_direction",
    "WindSpeed": "wind_speed",
    "WindDirection": "wind_from_direction",
    "WindVelocityX": "x_wind",
    "WindVelocityY": "y_wind",
    "AirPressure": "air_pressure",
    "AirTemperature": "air_temperature",
    "PrecipitationRate": "lwe_precipitation_rate",
    "PrecipitationFlux": "precipitation_flux",
    "Precipitation": "lwe_thickness_of_precipitation_amount",
    "RelativeHumidity": "relative_humidity",
    "SolarRadiation": "surface_downwelling_shortwave_flux_in_air",
}
_QUANTITY_OF_STANDARD_NAME = {v: k for k, v in STANDARD_NAMES.items()}

# UDUNITS spellings of the unit library's symbols that UDUNITS reads
# otherwise or not at all ("nmi" would be a nano-mile).
_UDUNITS_SPELLING = {
    "undefined": "", "-": "1", "PSU": "1e-3", "permille": "1e-3", "ppm": "1e-6", "ppb": "1e-9", "deg": "degree",
    "gon": "0.9 degree", "deg/s": "degree/s", "nmi": "nautical_mile", "ftUS": "US_survey_foot",
    "galUS": "US_liquid_gallon", "galUS/min": "US_liquid_gallon/min", "MgalUS/day": "1e6 US_liquid_gallon/day",
    "mph": "mile/hour", "mH2O": "9806.65 Pa", "g0": "9.80665 m/s2", "acre-ft": "acre foot",
    "acre-ft/day": "acre foot/day", "%": "percent",
}
# Time units of CF "U since ..." texts.
_CF_TIME_UNITS = {"s": "seconds", "min": "minutes", "h": "hours", "day": "days", "week": "weeks",
                  "ms": "milliseconds"}
# Calendars of a calendar axis (whose dates are proleptic Gregorian).
STANDARD_CALENDARS = ("standard", "gregorian", "proleptic_gregorian")
# Names of the backend's axis coordinates: x, y, z, with a suffix per grid.
_DIRECTION = re.compile(r"^([xyz])(_\d+)?$")
# Quantities tried first when only a unit is known: the general ones.
_GENERAL_QUANTITIES = range(40600, 40700)


# ---- Units ---------------------------------------------------------------------------


def udunits_spelling(unit) -> str:
    """The UDUNITS text of a unit of the unit library."""
    name = str(units.unit(unit))
    return _UDUNITS_SPELLING.get(name, name)


def _same(factor_offset) -> bool:
    if factor_offset is None:
        return False
    factor, offset = factor_offset
    return math.isclose(factor, 1.0, rel_tol=1e-9) and abs(offset) < 1e-9


def cf_units(unit) -> str:
    """The CF (UDUNITS) spelling of a unit of the unit library: "m s-1" for
    "m/s", "kg m-2 s-1" for "kg/m^2/s", "1" for "-"; the library's own text
    when UDUNITS cannot read it."""
    name = str(units.unit(unit))
    fixed = {"-": "1", "deg": "degree", "%": "%", "undefined": ""}
    if name in fixed:
        return fixed[name]
    parts = name.split("/")
    terms = []
    for k, part in enumerate(parts):
        for factor in part.split("."):
            symbol, _, power = factor.partition("^")
            if symbol == "1" and not power:
                continue
            exponent = int(power) if power.isdigit() else 1
            exponent = -exponent if k else exponent
            terms.append(symbol if exponent == 1 else f"{symbol}{exponent}")
    text = " ".join(terms)
    spelling = udunits_spelling(name)
    if text and _same(_udunits.linear(text, spelling)):
        return text
    return spelling if _udunits.parse(spelling) is not None else name


_candidates: list = []


def _unit_candidates() -> list:
    """(unit, its UDUNITS text) of every unit of the library UDUNITS reads."""
    if not _candidates:
        for u in units.all_units():
            spelling = udunits_spelling(u)
            if spelling and _udunits.parse(spelling) is not None:
                _candidates.append((u, spelling))
    return _candidates


def match_unit(text: str, what: str = "") -> units.Unit:
    """The unit of the unit library that a CF unit text names: the library's
    own symbol, or the unit UDUNITS finds to be the same (factor 1, offset
    0). Raises UnitError naming ``what`` when there is none."""
    text = (text or "").strip()
    if text in ("", "1"):
        return units.unit("-")
    try:
        return units.unit(text)
    except (UnitError, TovaError):
        pass
    if _udunits.parse(text) is not None:
        for u, spelling in _unit_candidates():
            if _same(_udunits.linear(text, spelling)):
                return u
    hint = "UDUNITS-2 cannot read it" if _udunits.available() and _udunits.parse(text) is None else \
        "no unit of the unit library has that factor" if _udunits.available() else "UDUNITS-2 is not installed"
    raise UnitError(F_ERR_UNIT, detail=f"{what}: unit {text!r} has no match in the unit library ({hint}); "
                              f"name one with --unit-map VAR=UNIT (or units={{VAR: UNIT}} of to_grd)")


def match_quantity(unit: units.Unit, standard_name: str | None = None, quantity=None) -> units.Quantity:
    """The quantity of a variable: ``quantity`` or the one of its standard
    name when the unit fits it, else the first general quantity (length,
    mass, time, ...) and then the first other one whose units hold the
    unit."""
    for q in (quantity, _QUANTITY_OF_STANDARD_NAME.get(standard_name or "")):
        if q:
            try:
                if units.fits(q, unit):
                    return units.quantity(q)
            except (UnitError, TovaError):
                pass
    every = units.quantities()
    ordered = [q for q in every if q.key in _GENERAL_QUANTITIES] + \
              [q for q in every if q.key not in _GENERAL_QUANTITIES]
    for q in ordered:
        if q.key not in (999,) and unit.key in (u.key for u in units.units_of(q)):
            return q
    raise UnitError(F_ERR_UNIT, detail=f"no quantity of the unit library has the unit {unit.name!r}")


def time_unit_of(text: str) -> str | None:
    """The unit library's time unit of a CF time unit word ("days", "hours",
    "s"), or None."""
    try:
        u = match_unit(text, "time")
    except UnitError:
        return None
    return u.name if u.name in _CF_TIME_UNITS else None


# ---- Map projections ---------------------------------------------------------------


def _crs(text: str):
    """The pyproj CRS of a header's projection text, or None."""
    try:
        from pyproj import CRS
    except ImportError:
        return None
    zone = re.fullmatch(r"\s*UTM[-_ ]?(\d{1,2})\s*([NS])?\s*", text or "", re.IGNORECASE)
    try:
        if zone:
            south = (zone.group(2) or "N").upper() == "S"
            return CRS.from_dict({"proj": "utm", "zone": int(zone.group(1)), "south": south, "ellps": "WGS84"})
        return CRS.from_user_input(text)
    except Exception:  # pyproj raises several kinds for texts it cannot read
        return None


def grid_mapping_attrs(projection) -> dict:
    """The attributes of a CF grid-mapping variable for a header's
    projection; only ``projection_name`` when pyproj cannot read it."""
    crs = _crs(projection.name)
    if crs is None:
        return {"projection_name": projection.name}
    attrs = crs.to_cf()
    attrs.setdefault("crs_wkt", crs.to_wkt())
    return attrs


def projection_from_cf(attrs: dict) -> tuple | None:
    """(text, longitude, latitude) of the header projection for a CF
    grid-mapping variable: an authority code when one matches exactly,
    else WKT; None when pyproj cannot read the variable."""
    text = attrs.get("projection_name")
    try:
        from pyproj import CRS
        crs = CRS.from_cf(dict(attrs))
        code = crs.to_authority(min_confidence=100)
        text = ":".join(code) if code else crs.to_wkt()
    except Exception:  # no pyproj, or attributes it cannot read
        if text is None:
            text = attrs.get("crs_wkt") or attrs.get("spatial_ref") or attrs.get("grid_mapping_name")
    if not text:
        return None
    lon = attrs.get("longitude_of_central_meridian", attrs.get("longitude_of_projection_origin", 0.0))
    lat = attrs.get("latitude_of_projection_origin", 0.0)
    return str(text), float(np.ravel(lon)[0]), float(np.ravel(lat)[0])


# ---- Metadata kept in custom blocks ----------------------------------------------------


def encode_value(value):
    """An attribute or encoding value as JSON data that comes back exactly
    (numpy scalars and arrays keep their type)."""
    if isinstance(value, np.dtype):
        return {"__dtype__": value.str}
    if isinstance(value, (np.ndarray, np.generic)):
        array = np.asarray(value)
        if array.dtype.kind in "fiub":
            return {"__array__": array.dtype.str, "shape": list(array.shape), "data": array.ravel().tolist()}
        if array.dtype.kind in "US":
            return array.tolist()
        raise TypeError(f"an array of type {array.dtype}")
    if isinstance(value, (list, tuple)):
        return [encode_value(v) for v in value]
    if isinstance(value, dict):
        return {str(k): encode_value(v) for k, v in value.items()}
    if isinstance(value, (str, bool, int, float)) or value is None:
        return value
    raise TypeError(f"a value of type {type(value).__name__}")


def decode_value(value):
    """The inverse of ``encode_value``."""
    if isinstance(value, dict):
        if "__dtype__" in value:
            return np.dtype(value["__dtype__"])
        if "__array__" in value:
            array = np.array(value["data"], dtype=value["__array__"]).reshape(value["shape"])
            return array[()] if array.ndim == 0 else array
        return {k: decode_value(v) for k, v in value.items()}
    if isinstance(value, list):
        return [decode_value(v) for v in value]
    return value


def encode_attrs(attrs: dict, lost: list | None = None, owner: str = "") -> dict:
    """Attributes as JSON data; those that cannot be kept are left out and
    named in ``lost`` ("owner: name (type)")."""
    out = {}
    for k, v in attrs.items():
        try:
            out[str(k)] = encode_value(v)
        except TypeError as exc:
            if lost is not None:
                lost.append(f"{owner}{k} ({exc})")
    return out


def decode_attrs(attrs: dict) -> dict:
    return {k: decode_value(v) for k, v in (attrs or {}).items()}


def metadata_of(custom_blocks) -> dict | None:
    """The CF metadata a file keeps (``METADATA_BLOCK``), with the arrays of
    ``ARRAY_BLOCK_PREFIX`` blocks under "arrays"; None when there is none."""
    meta, arrays = None, {}
    for block in custom_blocks:
        if block.name == METADATA_BLOCK and block.values is not None:
            try:
                meta = json.loads(block.values.tobytes().decode("utf-8"))
            except (UnicodeDecodeError, ValueError):
                return None
        elif block.name.startswith(ARRAY_BLOCK_PREFIX) and block.values is not None:
            arrays[block.name[len(ARRAY_BLOCK_PREFIX):]] = block.values
    if not isinstance(meta, dict) or meta.get("version") != _META_VERSION:
        return None
    variables, time, attrs = meta.get("variables", []), meta.get("time"), meta.get("attrs", {})
    if not (isinstance(variables, list) and all(isinstance(e, dict) for e in variables)
            and isinstance(time, (dict, type(None))) and isinstance(attrs, dict)):
        return None  # not what this package writes: the file is read without it
    meta["arrays"] = arrays
    return meta


def metadata_blocks(meta: dict, arrays: dict) -> dict:
    """The custom blocks that keep ``meta`` (JSON) and ``arrays``."""
    text = json.dumps(dict(meta, version=_META_VERSION), allow_nan=True, separators=(",", ":"))
    blocks = {METADATA_BLOCK: np.frombuffer(text.encode("utf-8"), dtype=np.int8)}
    for name, values in arrays.items():
        blocks[ARRAY_BLOCK_PREFIX + name] = values
    return blocks


def storable_array(values: np.ndarray) -> tuple:
    """(array of a type a custom block stores, the original dtype text)."""
    values = np.asarray(values)
    kind = values.dtype
    if kind in (np.float32, np.float64, np.int8, np.int32, np.uint32, np.int16, np.uint16):
        return np.ascontiguousarray(values.ravel()), kind.str
    if kind.kind in "iub":
        wide = values.astype(np.float64)
        if np.array_equal(wide.astype(kind), values):
            return wide.ravel(), kind.str
    if kind.kind == "f":
        return values.astype(np.float64).ravel(), kind.str
    raise TovaError(F_ERR_VALUE, detail=f"arrays of type {kind} are not kept")


def custom_block_attrs(custom_blocks) -> dict:
    """Global attributes for the custom blocks that are not CF metadata:
    text for char blocks, arrays for the others."""
    attrs = {}
    for block in custom_blocks:
        if block.name == METADATA_BLOCK or block.name.startswith(ARRAY_BLOCK_PREFIX) or block.values is None:
            continue
        key = CUSTOM_ATTR_PREFIX + re.sub(r"[^A-Za-z0-9_]", "_", block.name)
        if block.values.dtype == np.int8:
            attrs[key] = block.values.tobytes().split(b"\0", 1)[0].decode("latin-1")
        else:
            attrs[key] = block.values
    return attrs


# ---- Reading: attributes of a plain Dataset ------------------------------------------


def coordinate_attrs(direction: str, unit_name: str, projected: bool) -> dict:
    """CF attributes of an axis coordinate: longitude/latitude for degrees,
    projection coordinates otherwise."""
    axis = direction.upper()
    if unit_name == "deg" and direction in "xy":
        if direction == "x":
            return {"axis": "X", "standard_name": "longitude", "long_name": "longitude", "units": "degrees_east"}
        return {"axis": "Y", "standard_name": "latitude", "long_name": "latitude", "units": "degrees_north"}
    attrs = {"axis": axis, "units": cf_units(unit_name) if unit_name else ""}
    if direction in "xy":
        attrs["standard_name"] = f"projection_{direction}_coordinate"
        attrs["long_name"] = f"{direction} coordinate of projection" if projected else f"{direction} coordinate"
    return attrs


def item_attrs(item) -> dict:
    """CF attributes of an item: units in UDUNITS spelling, long_name,
    standard_name when its quantity has one."""
    attrs = {"units": cf_units(item.unit) if getattr(item.unit, "key", 0) else str(item.unit),
             "long_name": item.name}
    standard = STANDARD_NAMES.get(item.quantity_name)
    if standard:
        attrs["standard_name"] = standard
    return attrs


def time_units(axis) -> str | None:
    """The CF units of a time axis: "U since DATE TIME" for calendar axes,
    "U" for the others."""
    if axis.unit is None:
        return None
    word = _CF_TIME_UNITS.get(axis.unit_name, axis.unit_name)
    if axis.is_calendar and axis.start_text:
        return f"{word} since {axis.start_text[0]} {axis.start_text[1]}"
    return word


def curvilinear_centres(nodes: np.ndarray) -> np.ndarray:
    """Cell centres of a 2-D node grid: the mean of each cell's four nodes."""
    return 0.25 * (nodes[:-1, :-1] + nodes[1:, :-1] + nodes[:-1, 1:] + nodes[1:, 1:])


def curvilinear_nodes(centres: np.ndarray) -> np.ndarray:
    """Node coordinates around a 2-D grid of cell centres: the mean of the
    four surrounding centres inside, continued linearly at the edges."""
    c = np.asarray(centres, dtype=np.float64)
    # Pad by linear continuation on each side, then average 2 x 2 blocks.
    c = np.concatenate([2 * c[:1] - c[1:2] if c.shape[0] > 1 else c[:1], c,
                        2 * c[-1:] - c[-2:-1] if c.shape[0] > 1 else c[-1:]], axis=0)
    c = np.concatenate([2 * c[:, :1] - c[:, 1:2] if c.shape[1] > 1 else c[:, :1], c,
                        2 * c[:, -1:] - c[:, -2:-1] if c.shape[1] > 1 else c[:, -1:]], axis=1)
    return 0.25 * (c[:-1, :-1] + c[1:, :-1] + c[:-1, 1:] + c[1:, 1:])


def _time_variable(f, meta: dict | None, decode_times: bool):
    """The time coordinate: the axis's times with CF units (and the stored
    attributes and encoding of a file written from a CF dataset), decoded
    to dates when asked and possible."""
    import xarray as xr

    axis = f.time_axis
    values = np.asarray(f.times, dtype=np.float64)
    stored = (meta or {}).get("time") or {}
    attrs = decode_attrs(stored.get("attrs"))
    encoding = decode_attrs(stored.get("encoding"))
    if not stored:
        attrs = {"standard_name": "time", "long_name": "time", "axis": "T", "time_axis": axis.name}
        unit_text = time_units(axis)
        if unit_text:
            attrs["units"] = unit_text
        if axis.is_calendar:
            attrs["calendar"] = "proleptic_gregorian"
    for key in ("units", "calendar"):
        if key in encoding:
            attrs[key] = encoding.pop(key)
    dtype = encoding.get("dtype")
    if dtype is not None and np.dtype(dtype).kind in "iu" and np.array_equal(np.round(values), values):
        values = values.astype(dtype)
    var = xr.Variable((stored.get("dim", "time"),), values, attrs, encoding)
    if decode_times and "since" in str(attrs.get("units", "")):
        try:
            var = xr.conventions.decode_cf_variable(stored.get("name", "time"), var, decode_times=True)
        except Exception:  # a unit or calendar the decoder does not take: the numbers as they are
            pass
    return stored.get("name", "time"), var


def masked(meta: dict | None, kind: str, number: int) -> bool | None:
    """Whether the delete values of an item ("item") or static item
    ("static") are to become NaN as the file's CF metadata says: True when
    its variable had missing values or float data, False for an integer
    variable without them (it then stays integer); None when the file does
    not say (the reader's own rule applies)."""
    for entry in (meta or {}).get("variables", ()):
        if entry.get("kind") == kind and entry.get("number") == number:
            return bool(entry.get("masked", True))
    return None


def decorate(ds, f, *, decode_times: bool = True):
    """The CF form of the Dataset the backend made of a gridded data file:
    a file written from a CF dataset comes back as that dataset (names,
    dimensions, attributes, encodings, coordinates); any other file gets CF
    attributes, a grid-mapping variable, 2-D coordinates of curvilinear
    grids and a CF time coordinate."""
    meta = metadata_of(f.custom_blocks)
    if meta is not None:
        try:
            time_name, time = _time_variable(f, meta, decode_times)
            return _restore(ds, meta, time_name, time, decode_times)
        except (ValueError, KeyError, TypeError, IndexError, AttributeError) as exc:
            # Metadata that no longer fits the file (a file changed by other
            # writers since): the file as it is.
            warnings.warn(f"{f.path}: CF metadata left aside, it does not fit the file ({exc})", stacklevel=2)
    import xarray as xr

    _, time = _time_variable(f, None, decode_times)

    ds = ds.assign_coords(time=time)
    ds.attrs = {"Conventions": CONVENTIONS, **ds.attrs, **custom_block_attrs(f.custom_blocks)}
    mapping = None
    if f.projection is not None:
        mapping = "crs" if "crs" not in ds.variables else "tova_crs"
        ds[mapping] = xr.Variable((), np.int32(0), grid_mapping_attrs(f.projection))
    by_number = {it.number: it for it in f.items}
    statics = {}
    for name in list(ds.data_vars):
        var = ds[name]
        if "tova_item" in var.attrs:
            item = by_number[var.attrs["tova_item"]]
        elif "tova_static_item" in var.attrs:
            statics = statics or {it.number: it for it in f.static_items}
            item = statics[var.attrs["tova_static_item"]]
        else:
            continue
        var.attrs.update(item_attrs(item))
        if mapping:
            var.attrs["grid_mapping"] = mapping
        if item.axis.family == "curvilinear" and item.axis.ndim == 2:
            ds = _curvilinear_coords(ds, name, item.axis)
    for name in list(ds.coords):
        hit = _DIRECTION.match(str(name))
        if hit and ds[name].ndim == 1 and "axis_kind" in ds[name].attrs:
            ds[name].attrs.update(coordinate_attrs(hit.group(1), ds[name].attrs.get("units", ""), mapping is not None))
        ds[name].encoding.setdefault("_FillValue", None)
    for var in ds.variables.values():  # netCDF classic files take no 64-bit integer attributes
        var.attrs = _int32_attrs(var.attrs)
    ds.attrs = _int32_attrs(ds.attrs)
    return ds.rename({n: cf_name(n, ds.variables) for n in ds.data_vars if cf_name(n, ds.variables) != n})


def cf_name(name: str, taken=()) -> str:
    """A variable name as CF recommends it (letters, digits, underscores,
    beginning with a letter); the item's own name stays in long_name."""
    fixed = re.sub(r"[^A-Za-z0-9_]", "_", str(name))
    if not fixed[:1].isalpha():
        fixed = "v_" + fixed
    while fixed != name and fixed in taken:
        fixed += "_"
    return fixed


def _int32_attrs(attrs: dict) -> dict:
    return {k: np.int32(v) if isinstance(v, (int, np.integer)) and not isinstance(v, bool)
            and -2**31 <= v < 2**31 else v for k, v in attrs.items()}


def _curvilinear_coords(ds, name: str, axis):
    """2-D coordinates at the cell centres of a curvilinear item (longitude
    and latitude for a grid in degrees)."""
    import xarray as xr

    dims = ds[name].dims[-2:]
    geographic = axis.unit_name == "deg"
    suffix = dims[-1][1:]
    for direction, nodes in zip("xy", axis.coords):
        coord = ("lon" if direction == "x" else "lat") if geographic else f"{direction}c"
        coord += suffix
        if coord not in ds.variables:
            attrs = coordinate_attrs(direction, axis.unit_name, not geographic)
            attrs.pop("axis", None)
            ds = ds.assign_coords({coord: xr.Variable(dims, curvilinear_centres(nodes), attrs)})
    return ds


def _restore(ds, meta: dict, time_name: str, time, decode_times: bool):
    """The dataset a file was written from, from its CF metadata."""
    import xarray as xr

    plain = {}
    for name, var in ds.data_vars.items():
        for kind in ("tova_item", "tova_static_item"):
            if kind in var.attrs:
                plain[("item" if kind == "tova_item" else "static", var.attrs[kind])] = var.variable
    variables, coords = {}, set()
    if time is not None and meta.get("time"):
        variables[time_name] = time
        coords.add(time_name)
    arrays = meta.get("arrays", {})
    time_units_attrs = {k: time.encoding.get(k, time.attrs.get(k)) for k in ("units", "calendar")}
    for entry in meta.get("variables", ()):
        name, kind, dims = entry["name"], entry.get("kind"), tuple(entry.get("dims", ()))
        attrs, encoding = decode_attrs(entry.get("attrs")), decode_attrs(entry.get("encoding"))
        if kind in ("item", "static"):
            source = plain.get((kind, entry.get("number")))
            if source is None:
                continue
            var = source.copy(deep=False)
            var.dims = tuple(entry.get("stored_dims", dims))
            var = var.transpose(*dims)
        elif kind == "array" and name in arrays:
            values = arrays[name].astype(np.dtype(entry["dtype"])).reshape(entry.get("shape", ()))
            var = xr.Variable(dims, values)
        elif kind == "values":
            var = xr.Variable(dims, np.array(entry.get("values"), dtype=np.dtype(entry["dtype"])))
        else:
            continue
        var.attrs, var.encoding = attrs, encoding
        if entry.get("time_encoded"):
            for key, value in time_units_attrs.items():
                value = var.encoding.pop(key, None) or var.attrs.get(key) or value
                if value is not None:
                    var.attrs[key] = value
            if decode_times:
                try:
                    var = xr.conventions.decode_cf_variable(name, var, decode_times=True)
                except Exception:  # left as numbers
                    pass
        variables[name] = var
        if entry.get("coord"):
            coords.add(name)
    out = xr.Dataset({k: v for k, v in variables.items() if k not in coords},
                     coords={k: v for k, v in variables.items() if k in coords},
                     attrs=decode_attrs(meta.get("attrs")))
    if meta.get("unlimited_dims"):
        out.encoding["unlimited_dims"] = set(meta["unlimited_dims"])
    return out


__all__ = ["CONVENTIONS", "METADATA_BLOCK", "STANDARD_NAMES", "cf_units", "match_quantity", "match_unit",
           "grid_mapping_attrs", "projection_from_cf"]
