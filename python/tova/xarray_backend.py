"""xarray backend for gridded data files: ``xr.open_dataset(path,
engine="tova")`` (registered as an entry point) or
``engine=TovaBackendEntrypoint``.

The Dataset has one variable per item with the dimensions ``time`` and those
of its axis (``y``, ``x``, ...), coordinates from the axes and the time axis
(datetime64 for calendar axes), the unit and quantity as attributes, and the
header's titles and settings as global attributes. Static items become
variables without ``time``. Items of different grids get their own dimension
names (``x``, then ``x_1``, ``x_2``, ...); items of one grid share them.

Nothing is read on opening but the header (and, for the non-equidistant time
axes, the time of each step; static items only when asked for): each
variable is a lazy array whose indexing reads only the time steps it selects,
each reached by one jump. With ``chunks`` the arrays become dask arrays whose
tasks open the file themselves (once per process) and read their own steps,
so the work spreads over the workers of ``dask.distributed``.
"""

from __future__ import annotations

import os

import numpy as np
import xarray as xr
from xarray.backends import BackendArray, BackendEntrypoint, CachingFileManager
from xarray.core import indexing

from . import cf, writer
from .errors import TovaError
from .grd import Axis, GridFile

# The first bytes of a gridded data file: the record-file tag and the
# application tag, in either byte order.
_MAGIC = (b"QTA_GRD_", b"_ATQ_DRG")
# CF names of time units, for the "units" attribute of a time coordinate.
_CF_TIME_UNITS = {"s": "seconds", "min": "minutes", "h": "hours", "day": "days", "ms": "milliseconds"}


def _open(path: str, mode: str = "r") -> GridFile:
    """The file manager's opener: read-only, values as stored."""
    if mode != "r":
        raise ValueError("gridded data files open read-only here")
    return GridFile(path, mask=False)


class TovaBackendArray(BackendArray):
    """The time steps of one item, read on indexing: (time, *item shape).

    It holds the file manager, not an open file, so it pickles: a dask task
    in another process opens the file on first use there."""

    def __init__(self, manager: CachingFileManager, item_index: int, shape: tuple, dtype, mask: bool):
        self.manager = manager
        self.item_index = item_index
        self.shape = shape
        self.dtype = np.dtype(dtype)
        self.mask = mask

    def __getitem__(self, key: indexing.ExplicitIndexer):
        return indexing.explicit_indexing_adapter(key, self.shape, indexing.IndexingSupport.OUTER, self._read)

    def _read(self, key: tuple) -> np.ndarray:
        steps, space = key[0], key[1:]
        if isinstance(steps, np.ndarray) and steps.ndim == 0:
            steps = int(steps)
        data = self.manager.acquire().read(self.item_index, steps, mask=self.mask)
        # Outer indexing of the spatial directions, the last first, so that
        # an integer that drops a direction does not move those before it.
        lead = 0 if isinstance(steps, (int, np.integer)) else 1
        for axis in reversed(range(len(space))):
            k = space[axis]
            if not (isinstance(k, slice) and k == slice(None)):
                data = data[(slice(None),) * (lead + axis) + (k,)]
        return data


class _Grids:
    """Dimension names and coordinates per distinct item axis: the first
    grid takes the plain names, later ones a suffix."""

    def __init__(self):
        self.suffixes: dict = {}
        self.coords: dict = {}

    def dims(self, axis: Axis) -> tuple:
        if axis.ndim == 0:
            return ()
        key = axis.signature()
        if key not in self.suffixes:
            self.suffixes[key] = suffix = f"_{len(self.suffixes)}" if self.suffixes else ""
            self._add_coords(axis, suffix)
        suffix = self.suffixes[key]
        return tuple(d + suffix for d in axis.dims)

    def _add_coords(self, axis: Axis, suffix: str) -> None:
        attrs = {"units": axis.unit_name, "axis_kind": axis.name}
        for d, values in axis.coordinates().items():
            name = d + suffix
            self.coords[name] = xr.Variable((name,), values, dict(attrs))
        if axis.family == "nonequidistant" and axis.ndim > 1:
            for d, boundaries in zip("xyz", axis.coords):
                bounds = np.stack([boundaries[:-1], boundaries[1:]], axis=1)
                self.coords[f"{d}{suffix}"].attrs["bounds"] = f"{d}{suffix}_bounds"
                self.coords[f"{d}{suffix}_bounds"] = xr.Variable((d + suffix, "bounds"), bounds, dict(attrs))
        elif axis.family == "curvilinear":
            node_dims = tuple(f"{d}_node{suffix}" for d in axis.dims)
            for d, nodes in zip("xyz", axis.coords):
                self.coords[f"{d}_nodes{suffix}"] = xr.Variable(node_dims, nodes, dict(attrs))


def _time_coordinate(f: GridFile, decode_times: bool) -> xr.Variable:
    axis = f.time_axis
    attrs = {"time_axis": axis.name, "standard_name": "time"}
    if axis.is_calendar and decode_times and axis.start_date is not None:
        try:
            return xr.Variable(("time",), f.datetimes, attrs)
        except TovaError:  # a time unit the unit library cannot convert: the numbers as they are
            pass
    if axis.unit is not None:
        unit = _CF_TIME_UNITS.get(axis.unit_name, axis.unit_name)
        attrs["units"] = f"{unit} since {axis.start_date}" if axis.is_calendar else unit
    return xr.Variable(("time",), f.times, attrs)


def _global_attrs(f: GridFile) -> dict:
    attrs = {"title": f.title, "application": f.app_title, "application_version": f.app_version,
             "file_type": f.file_type_name, "data_type": f.data_type, "time_axis": f.time_axis.name}
    if f.projection is not None:
        attrs.update(projection=f.projection.name, projection_longitude=f.projection.longitude,
                     projection_latitude=f.projection.latitude, projection_orientation=f.projection.orientation)
    return attrs


def _unique(name: str, taken, alternative: str) -> str:
    return name if name not in taken else alternative


def open_tova_dataset(path, *, mask_and_scale: bool = True, decode_times: bool = True, static_items: bool = True,
                      drop_variables=None) -> xr.Dataset:
    """The Dataset of a gridded data file (see the module text)."""
    path = os.fspath(path)
    # The mode is given, not left to the manager's default: its sentinel does
    # not survive pickling, and a worker would otherwise pass it on.
    manager = CachingFileManager(_open, path, mode="r")
    try:
        f = manager.acquire()
        drop = set([drop_variables] if isinstance(drop_variables, str) else drop_variables or ())
        grids = _Grids()
        coords = {"time": _time_coordinate(f, decode_times)}
        variables = {}
        meta = cf.metadata_of(f.custom_blocks)
        for index, item in enumerate(f.items):
            masked = mask_and_scale and cf.masked(meta, "item", item.number) is not False
            dims = ("time",) + grids.dims(item.axis)
            name = _unique(item.name, variables.keys() | grids.coords.keys() | {"time"}, f"{item.name}_{item.number}")
            if name in drop:
                continue
            dtype = f.masked_dtype(item) if masked else item.dtype
            lazy = indexing.LazilyIndexedArray(
                TovaBackendArray(manager, index, (f.n_steps,) + item.shape, dtype, masked))
            variables[name] = xr.Variable(dims, lazy, _item_attrs(f, item, tova_item=item.number),
                                          _encoding(f, item, masked))
        if static_items:
            for item in f.static_items:
                dims = grids.dims(item.axis)
                name = _unique(item.name, variables.keys() | grids.coords.keys() | {"time"}, f"{item.name}_static")
                if name in drop:
                    continue
                masked = mask_and_scale and cf.masked(meta, "static", item.number) is not False
                values = f.mask_values(item, item.values.copy()) if masked else item.values
                variables[name] = xr.Variable(dims, values, _item_attrs(f, item, tova_static_item=item.number),
                                              _encoding(f, item, masked))
        coords.update(grids.coords)
        ds = xr.Dataset(variables, coords={k: v for k, v in coords.items() if k not in drop},
                        attrs=_global_attrs(f))
        ds = cf.decorate(ds, f, decode_times=decode_times)
    except BaseException:
        manager.close()
        raise
    ds.set_close(manager.close)
    return ds


def _item_attrs(f: GridFile, item, **number) -> dict:
    return {"long_name": item.name, "units": item.unit_name, "quantity": item.quantity_name,
            "axis_kind": item.axis.name, "value_type": item.value_type, **number}


def _encoding(f: GridFile, item, masked: bool) -> dict:
    marker = f.delete_values.for_dtype(item.dtype)
    if not masked or marker is None:
        return {"dtype": item.dtype}
    return {"dtype": item.dtype, "_FillValue": marker}


class TovaBackendEntrypoint(BackendEntrypoint):
    """``engine="tova"``: gridded data files of the modelling suite.

    Options: ``mask_and_scale`` (default True: delete values become NaN;
    integer items then come as float64), ``decode_times`` (default True:
    calendar axes as datetime64), ``static_items`` (default True: static
    items as variables without time), ``drop_variables``."""

    description = "Gridded data files (time steps of items on grids) read lazily through libtova"
    open_dataset_parameters = ("filename_or_obj", "drop_variables", "mask_and_scale", "decode_times",
                               "static_items")

    def open_dataset(self, filename_or_obj, *, drop_variables=None, mask_and_scale=True, decode_times=True,
                     static_items=True):
        if not isinstance(filename_or_obj, (str, os.PathLike)):
            raise TypeError("the tova engine opens files by path")
        return open_tova_dataset(filename_or_obj, mask_and_scale=bool(mask_and_scale),
                                 decode_times=bool(decode_times), static_items=static_items,
                                 drop_variables=drop_variables)

    def guess_can_open(self, filename_or_obj) -> bool:
        if not isinstance(filename_or_obj, (str, os.PathLike)):
            return False
        try:
            with open(filename_or_obj, "rb") as stream:
                return stream.read(8) in _MAGIC
        except OSError:
            return False


writer.register_accessor()

__all__ = ["TovaBackendArray", "TovaBackendEntrypoint", "open_tova_dataset"]
