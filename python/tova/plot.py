"""Quick-look plots of gridded data files with matplotlib (Agg backend
unless another one was chosen already)."""

from __future__ import annotations

import os
import sys

import numpy as np

from .grd import GridFile


def _pyplot():
    import matplotlib

    if "matplotlib.pyplot" not in sys.modules:
        matplotlib.use("Agg")
    import matplotlib.pyplot as plt

    return plt


def plot_item(path, item, step: int = -1, *, ax=None, out: str | os.PathLike | None = None, cmap: str = "viridis"):
    """Draws a 2-D item (equidistant, non-equidistant or curvilinear axis)
    of a gridded data file at one time step (default: the last), delete
    values left blank, on ``ax`` or a new figure; saves it to ``out`` when
    given. Returns the matplotlib Figure."""
    with GridFile(path) as f:
        it = f.item(item)
        if len(it.shape) != 2:
            raise ValueError(f"{f.path}: item {it.name!r} has {len(it.shape)} dimensions; a plot needs 2")
        values = np.ma.masked_invalid(f.read(it, step, mask=True).astype(np.float64))
        t = step % f.n_steps
        when = f.datetimes[t] if f.time_axis.is_calendar else f"{f.times[t]:g} {f.time_axis.unit_name}"
        title = f"{it.name} at step {t} ({when})"
    plt = _pyplot()
    fig = ax.figure if ax is not None else plt.figure(figsize=(7, 5))
    ax = ax if ax is not None else fig.add_subplot()
    axis = it.axis
    if axis.family in ("curvilinear", "nonequidistant"):  # node grids or cell boundaries
        mesh = ax.pcolormesh(axis.coords[0], axis.coords[1], values, cmap=cmap)
    else:
        c = axis.coordinates()
        mesh = ax.pcolormesh(c["x"], c["y"], values, cmap=cmap, shading="nearest")
    fig.colorbar(mesh, ax=ax, label=f"{it.quantity_name} [{it.unit_name}]")
    ax.set_title(title)
    ax.set_xlabel(f"x [{axis.unit_name}]")
    ax.set_ylabel(f"y [{axis.unit_name}]")
    ax.set_aspect("equal", adjustable="box")
    if out is not None:
        fig.savefig(out)
    return fig


__all__ = ["plot_item"]
