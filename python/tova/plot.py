"""Quick-look pictures of gridded data files with matplotlib (the Agg
backend, which needs no display, unless another one was chosen already):
``plot_item`` draws an item at one time step, ``plot_static`` a static item,
and ``main`` is ``python -m tova plot`` (and so ``tova plot``)."""

from __future__ import annotations

import argparse
import os
import re
import sys

import numpy as np

from .grd import GridFile
from .selection import parse_date


def _pyplot():
    import matplotlib

    if "matplotlib.pyplot" not in sys.modules:
        matplotlib.use("Agg")
    import matplotlib.pyplot as plt

    return plt


def _draw(item, values, title: str, ax=None, out=None, cmap: str = "viridis"):
    """Draws the values of a 1-D or 2-D item on its axis: a line over its
    coordinates, or cells coloured by value with a colour bar; delete values
    (NaN) stay blank."""
    values = np.ma.masked_invalid(np.asarray(values, dtype=np.float64))
    if values.ndim not in (1, 2):
        raise ValueError(f"item {item.name!r} has {values.ndim} dimensions; a picture needs 1 or 2")
    plt = _pyplot()
    fig = ax.figure if ax is not None else plt.figure(figsize=(7, 5))
    ax = ax if ax is not None else fig.add_subplot()
    axis = item.axis
    label = f"{item.quantity_name} [{item.unit_name}]"
    if values.ndim == 1:
        x = axis.coordinates().get("x", np.arange(values.size, dtype=np.float64))
        ax.plot(x, values)
        ax.set_ylabel(label)
    else:
        if axis.family in ("curvilinear", "nonequidistant"):  # node grids or cell boundaries
            mesh = ax.pcolormesh(axis.coords[0], axis.coords[1], values, cmap=cmap)
        else:
            c = axis.coordinates()
            mesh = ax.pcolormesh(c["x"], c["y"], values, cmap=cmap, shading="nearest")
        fig.colorbar(mesh, ax=ax, label=label)
        ax.set_ylabel(f"y [{axis.unit_name}]")
        ax.set_aspect("equal", adjustable="box")
    ax.set_xlabel(f"x [{axis.unit_name}]")
    ax.set_title(title)
    if out is not None:
        fig.savefig(out)
    return fig


def plot_item(path, item, step: int = -1, *, ax=None, out: str | os.PathLike | None = None, cmap: str = "viridis"):
    """Draws a 1-D or 2-D item (equidistant, non-equidistant or curvilinear
    axis) of a gridded data file at one time step (default: the last),
    delete values left blank, on ``ax`` or a new figure; saves it to ``out``
    when given. ``item`` is a name (matched as ``GridFile.item`` matches) or
    a position. Returns the matplotlib Figure."""
    with GridFile(path) as f:
        it = f.item(item)
        values = f.read(it, step, mask=True)
        t = step % f.n_steps
        when = str(f.datetimes[t].astype("datetime64[s]")).replace("T", " ") if f.time_axis.is_calendar \
            else f"{f.times[t]:g} {f.time_axis.unit_name}"
        title = f"{it.name}, time step {t} ({when})"
    return _draw(it, values, title, ax, out, cmap)


def plot_static(path, item, *, ax=None, out: str | os.PathLike | None = None, cmap: str = "viridis"):
    """Draws a 1-D or 2-D static item as ``plot_item`` draws an item."""
    with GridFile(path) as f:
        it = f.static_item(item)
        values = f.mask_values(it, it.values.copy())
    return _draw(it, values, f"{it.name} (static)", ax, out, cmap)


# ---- python -m tova plot ---------------------------------------------------------


def _key(text: str):
    """An item as given on the command line: a number counts from 1."""
    return int(text) - 1 if re.fullmatch(r"\d+", text) else text


def _step(f: GridFile, text: str | None, nearest: bool) -> int:
    if text is None:
        return f.n_steps - 1
    if re.fullmatch(r"-?\d+", text):
        t = int(text)
        if not -f.n_steps <= t < f.n_steps:
            raise ValueError(f"{f.path} holds time steps 0 to {f.n_steps - 1}; time step {t} is not there")
        return t % f.n_steps
    if parse_date(text) is None:
        raise ValueError(f"--time {text}: not a time step or a date (2024-03-22T06:00)")
    return f.find_step(text, nearest=nearest)


def _slug(text: str) -> str:
    return re.sub(r"[^A-Za-z0-9]+", "-", text).strip("-").lower() or "item"


def main(argv=None) -> int:
    parser = argparse.ArgumentParser(
        prog="tova plot", description="Draws one item of a gridded data file at one time step, or a static item, "
                                      "into a PNG file (no display needed).")
    parser.add_argument("file", metavar="FILE", help="the gridded data file")
    what = parser.add_mutually_exclusive_group(required=True)
    what.add_argument("--item", help="the item, by number or name (exact, else a unique beginning, any case)")
    what.add_argument("--static", metavar="ITEM", help="a static item instead, by number or name")
    parser.add_argument("--time", "--step", metavar="WHEN",
                        help="the time step: T (negative from the end) or a date 2024-03-22T06:00 (default: the last)")
    parser.add_argument("--nearest", action="store_true", help="a date takes the nearest time step")
    parser.add_argument("-o", "--output", metavar="OUT", help="the picture file (default: FILE-ITEM-STEP.png)")
    parser.add_argument("--cmap", default="viridis", help="matplotlib colour map (default: viridis)")
    args = parser.parse_args(argv)
    try:
        with GridFile(args.file) as f:
            if args.static is not None:
                it = f.static_item(_key(args.static))
                suffix = "static"
            else:
                it = f.item(_key(args.item))
                step = _step(f, args.time, args.nearest)
                suffix = str(step)
        stem = os.path.splitext(os.path.basename(args.file))[0]
        out = args.output or f"{stem}-{_slug(it.name)}-{suffix}.png"
        if args.static is not None:
            plot_static(args.file, it.name, out=out, cmap=args.cmap)
        else:
            plot_item(args.file, it.number - 1, step, out=out, cmap=args.cmap)
    except (KeyError, ValueError, IndexError, OSError) as e:
        message = e.args[0] if isinstance(e, KeyError) and e.args else e
        print(f"tova: {message}", file=sys.stderr)
        return 1
    except Exception as e:  # noqa: BLE001 - the library's failures (TovaError) and the like
        print(f"tova: {e}", file=sys.stderr)
        return 1
    print(f"{args.file}: {it.name} drawn into {out}")
    return 0


__all__ = ["main", "plot_item", "plot_static"]
