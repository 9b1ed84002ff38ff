"""tova: the gridded data, cross-section and VRE files of the modelling
suite, and its units, from Python.

Submodules: ``units`` (quantities, units, conversions), ``vre`` (VRE files),
``xsec`` (cross-section files), ``errors`` (status codes and ``TovaError``). The C libraries are found as
``tova._lib`` describes and loaded on first use.
"""

from . import errors, units, vre, xsec
from ._lib import ENV_VAR, LibraryNotFoundError, library_paths
from .errors import TovaError, UnitError

__version__ = "0.1.0"

__all__ = [
    "ENV_VAR",
    "LibraryNotFoundError",
    "TovaError",
    "UnitError",
    "errors",
    "library_paths",
    "units",
    "vre",
    "xsec",
]
