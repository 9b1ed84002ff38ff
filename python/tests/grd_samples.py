"""Sample gridded data files for the tests, written through the package,
with the values they hold."""

import numpy as np

import tova
from tova import Axis, Item, StaticItem, TimeAxis

N_STEPS = 7
LEVEL_AXIS = Axis.equidistant([4, 3], origin=[1000.0, 2000.0], step=[10.0, 20.0])
DELETE_FLOAT = np.float32(tova.units.DELETE_VALUE_FLOAT)


def items():
    return [Item("water_level", "WaterLevel", "m", np.float32, LEVEL_AXIS),
            Item("discharge", "Velocity", "m/s", np.float64, Axis.equidistant([5], [0.0], [2.0])),
            Item("flag", "WaterDepth", "m", np.int32),
            Item("depth", "WaterDepth", "m", np.float32, LEVEL_AXIS)]


def values(step: int) -> dict:
    """The values of every item at a time step: distinct per step and
    element, with delete values at known places."""
    level = (step * 100 + np.arange(12, dtype=np.float32)).reshape(3, 4)
    level[1, step % 4] = DELETE_FLOAT
    discharge = step + np.linspace(0.0, 1.0, 5)
    flag = np.int32(2147483647 if step == 2 else step * 3)
    depth = -level
    depth[1, step % 4] = DELETE_FLOAT
    return {"water_level": level, "discharge": discharge, "flag": flag, "depth": depth}


def write_equidistant(path, n_steps: int = N_STEPS):
    """Equidistant time axis (start 3600 s, step 900 s), four items, one
    static item on the grid of the water level."""
    bathymetry = StaticItem("bathymetry", "WaterDepth", "m", values=np.arange(12, dtype=np.float32).reshape(3, 4),
                            axis=LEVEL_AXIS)
    with tova.create(path, items(), TimeAxis.equidistant(step=900.0, start=3600.0), title="sample",
                     static_items=[bathymetry]) as w:
        for t in range(n_steps):
            w.append(values(t))
    return path


def count_positions(monkeypatch) -> list:
    """Records (time step, item number) of every positioning of a read."""
    positions = []
    original = tova.GridFile._position

    def counting(self, lib, h, f, step, number):
        positions.append((step, number))
        original(self, lib, h, f, step, number)

    monkeypatch.setattr(tova.GridFile, "_position", counting)
    return positions
