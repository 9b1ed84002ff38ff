"""tova: the gridded data, cross-section and VRE files of the modelling
suite, and its units, from Python.

Gridded data files: ``tova.open(path)`` reads one (``GridFile``),
``tova.create(path, items, time_axis)`` writes one (``GridWriter``);
``tova.plot_item`` draws an item at a time step. With xarray installed,
``xarray.open_dataset(path, engine="tova")`` opens one lazily
(``tova.xarray_backend``) with CF attributes (``tova.cf``), and
``tova.to_grd(ds, path)`` (or ``ds.tova.to_grd(path)`` once xarray is
imported) writes a CF-style Dataset as one (``tova.writer``);
``python3 -m tova convert IN OUT`` converts between netCDF and gridded data
files (``tova.convert``).

Submodules: ``grd`` (gridded data files), ``units`` (quantities, units,
conversions), ``vre`` (VRE files), ``xsec`` (cross-section files), ``errors``
(status codes and ``TovaError``). The C libraries are found as ``tova._lib``
describes and loaded on first use.
"""

import sys

from . import errors, grd, units, vre, writer, xsec
from ._lib import ENV_VAR, LibraryNotFoundError, library_paths
from .errors import TovaError, UnitError
from .grd import (Axis, CustomBlock, DeleteValues, GridFile, GridWriter, Item, Projection, StaticItem, TimeAxis,
                  create, open)

from .writer import to_grd

__version__ = "0.1.0"

if "xarray" in sys.modules:  # the accessor needs xarray; importing it here would slow every start
    writer.register_accessor()


def plot_item(path, item, step=-1, **options):
    """Draws a 1-D or 2-D item of a gridded data file at one time step with
    matplotlib; see ``tova.plot.plot_item``."""
    from .plot import plot_item as plot

    return plot(path, item, step, **options)


def plot_static(path, item, **options):
    """Draws a 1-D or 2-D static item with matplotlib; see
    ``tova.plot.plot_static``."""
    from .plot import plot_static as plot

    return plot(path, item, **options)


__all__ = [
    "Axis",
    "CustomBlock",
    "DeleteValues",
    "ENV_VAR",
    "GridFile",
    "GridWriter",
    "Item",
    "LibraryNotFoundError",
    "Projection",
    "StaticItem",
    "TimeAxis",
    "TovaError",
    "UnitError",
    "create",
    "errors",
    "grd",
    "library_paths",
    "open",
    "plot_item",
    "plot_static",
    "to_grd",
    "units",
    "vre",
    "xsec",
]
