"""Converting between netCDF (CF) files and gridded data files, either way:
``python3 -m tova convert IN OUT`` or the console script ``tova-convert``.

The direction comes from what the input is, not from its name: a record
file with the "GRD_" application tag becomes a netCDF file (through the
xarray backend, with CF attributes), a netCDF or HDF5 file becomes a gridded
data file (through ``tova.to_grd``). On a terminal a progress line counts the
time steps. Exit status: 0 done, 1 failed (nothing is left behind), 2 bad
usage.
"""

from __future__ import annotations

import argparse
import os
import sys
import time

from .errors import TovaError

# First bytes of the inputs: a gridded data file in either byte order, netCDF
# classic (CDF1, CDF2, CDF5) and HDF5 (netCDF-4).
_GRD_MAGIC = (b"QTA_GRD_", b"_ATQ_DRG")
_NETCDF_MAGIC = (b"CDF\x01", b"CDF\x02", b"CDF\x05", b"\x89HDF\r\n\x1a\n")
FORMATS = {"netcdf4": "NETCDF4", "classic": "NETCDF3_CLASSIC"}
# Time steps go to netCDF in runs of about this many bytes.
_RUN_BYTES = 8 << 20


def kind_of(path: str) -> str:
    """"grd" or "netcdf" by the file's first bytes; raises ValueError for
    anything else."""
    with open(path, "rb") as stream:
        head = stream.read(8)
    if head in _GRD_MAGIC:
        return "grd"
    if any(head.startswith(m) for m in _NETCDF_MAGIC):
        return "netcdf"
    raise ValueError(f"{path}: neither a gridded data file (\"GRD_\") nor a netCDF/HDF5 file")


class Progress:
    """A progress line on standard error by time steps: only on a terminal,
    and only for work that lasts longer than half a second."""

    def __init__(self, label: str, stream=sys.stderr):
        self.label, self.stream = label, stream
        self.shown = stream.isatty()
        self.start = self.last = time.monotonic()
        self.drawn = False

    def __call__(self, done: int, total: int) -> None:
        now = time.monotonic()
        if not self.shown or now - (self.last if self.drawn else self.start) < (0.25 if self.drawn else 0.5):
            return
        self.last, self.drawn = now, True
        percent = 100.0 * done / total if total else 100.0
        self.stream.write(f"\r{self.label} {percent:5.1f}% ({done}/{total} time steps)")
        self.stream.flush()

    def close(self) -> None:
        if self.drawn:
            self.stream.write("\r" + " " * 60 + "\r")
            self.stream.flush()


def _grd_to_netcdf(source: str, target: str, fmt: str, progress: Progress) -> None:
    import xarray as xr
    from dask.callbacks import Callback

    from .grd import open as tova_open
    from .xarray_backend import TovaBackendEntrypoint

    with tova_open(source) as f:  # runs of time steps of a few MiB: few tasks, little memory
        step_bytes = sum(it.size * 8 for it in f.items)
        run = max(1, _RUN_BYTES // max(step_bytes, 1))
    with xr.open_dataset(source, engine=TovaBackendEntrypoint, chunks={"time": run}) as ds:
        steps = ds.sizes.get("time", 0)
        job = ds.to_netcdf(target, format=FORMATS[fmt], compute=False)

        class _Count(Callback):
            def _start(self, dsk):
                self.total, self.done = max(len(dsk), 1), 0

            def _posttask(self, key, result, dsk, state, worker_id):
                self.done += 1
                progress(round(steps * self.done / self.total), steps)

        with _Count():
            job.compute(scheduler="synchronous")


def _netcdf_to_grd(source: str, target: str, options: dict, progress: Progress) -> None:
    import xarray as xr

    from .writer import to_grd

    with xr.open_dataset(source) as ds:
        to_grd(ds, target, progress=progress, **options)


def _unit_map(pairs) -> dict:
    out = {}
    for pair in pairs or ():
        name, sep, unit = pair.partition("=")
        if not sep or not name or not unit:
            raise argparse.ArgumentTypeError(f"--unit-map takes VAR=UNIT, not {pair!r}")
        out[name] = unit
    return out


def parser() -> argparse.ArgumentParser:
    p = argparse.ArgumentParser(
        prog="tova convert",
        description="Convert a netCDF (CF) file to a gridded data file or a gridded data file to netCDF; "
                    "the direction comes from the input's kind.")
    p.add_argument("input", metavar="IN", help="a gridded data file or a netCDF/HDF5 file")
    p.add_argument("output", metavar="OUT", help="the file to write (replaced when it exists)")
    p.add_argument("--format", choices=sorted(FORMATS), default="netcdf4",
                   help="netCDF format of the output (default netcdf4; classic is netCDF-3)")
    p.add_argument("--unit-map", action="append", metavar="VAR=UNIT", default=[],
                   help="the unit-library unit of a variable whose unit text has no match (repeatable)")
    p.add_argument("--skip-unmappable", action="store_true",
                   help="leave out variables that have no place in a gridded data file (named on stderr)")
    return p


def main(argv=None) -> int:
    """The command; returns the exit status."""
    args = parser().parse_args(argv)
    try:
        units = _unit_map(args.unit_map)
    except argparse.ArgumentTypeError as exc:
        parser().error(str(exc))
    try:
        kind = kind_of(args.input)
        if os.path.exists(args.output) and os.path.samefile(args.input, args.output):
            raise ValueError("the output would replace the input")
    except (OSError, ValueError) as exc:
        print(f"tova convert: {exc}", file=sys.stderr)
        return 1
    progress = Progress("converting")
    try:
        if kind == "grd":
            _grd_to_netcdf(args.input, args.output, args.format, progress)
        else:
            _netcdf_to_grd(args.input, args.output, {"units": units, "skip_unmappable": args.skip_unmappable},
                           progress)
    except (TovaError, OSError, ValueError, TypeError, KeyError, RuntimeError) as exc:
        progress.close()
        if os.path.exists(args.output):
            os.remove(args.output)
        print(f"tova convert: {args.input}: {exc}", file=sys.stderr)
        return 1
    progress.close()
    return 0


def console() -> None:
    """Entry point of the console script ``tova-convert``."""
    sys.exit(main())


if __name__ == "__main__":
    console()
