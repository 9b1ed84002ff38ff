"""The xarray backend: Dataset structure and values, lazy reads of only the
selected time steps, dask over a LocalCluster, the registered engine name,
and the quick-look plot."""

import os
import shutil
import subprocess
import sys
import textwrap
from importlib.metadata import entry_points
from pathlib import Path

import numpy as np
import pytest

import tova
from tova import Axis, Item, TimeAxis

import grd_samples as samples

xr = pytest.importorskip("xarray")
from tova.xarray_backend import TovaBackendEntrypoint  # noqa: E402

PACKAGE_ROOT = Path(__file__).resolve().parents[1]


@pytest.fixture(scope="module")
def sample(tmp_path_factory):
    return samples.write_equidistant(tmp_path_factory.mktemp("xr") / "eq.grd")


def _expected(name: str, masked: bool = True) -> np.ndarray:
    stacked = np.stack([samples.values(t)[name] for t in range(samples.N_STEPS)])
    if not masked:
        return stacked
    out = stacked.astype(np.float64 if stacked.dtype.kind != "f" else stacked.dtype)
    out[stacked == (2147483647 if stacked.dtype.kind == "i" else samples.DELETE_FLOAT)] = np.nan
    return out


def test_dataset_structure_and_values(sample):
    with xr.open_dataset(sample, engine=TovaBackendEntrypoint) as ds:
        assert list(ds.data_vars) == ["water_level", "discharge", "flag", "depth", "bathymetry"]
        assert ds.water_level.dims == ("time", "y", "x") and ds.depth.dims == ("time", "y", "x")
        assert ds.discharge.dims == ("time", "x_1") and ds.flag.dims == ("time",)
        assert ds.bathymetry.dims == ("y", "x")  # the static item on the same grid shares its dimensions
        assert dict(ds.sizes) == {"time": samples.N_STEPS, "y": 3, "x": 4, "x_1": 5}
        np.testing.assert_array_equal(ds.x, [1000.0, 1010.0, 1020.0, 1030.0])
        np.testing.assert_array_equal(ds.y, [2000.0, 2020.0, 2040.0])
        np.testing.assert_array_equal(ds.x_1, [0.0, 2.0, 4.0, 6.0, 8.0])
        np.testing.assert_array_equal(ds.time, 3600.0 + 900.0 * np.arange(samples.N_STEPS))
        assert ds.time.attrs["units"] == "seconds" and ds.x.attrs["units"] == "m"
        assert ds.water_level.attrs["units"] == "m" and ds.water_level.attrs["quantity"] == "WaterLevel"
        assert ds.discharge.attrs["units"] == "m s-1" and ds.water_level.attrs["tova_item"] == 1  # UDUNITS spelling
        assert ds.attrs["title"] == "sample" and ds.attrs["time_axis"] == "F_TM_EQ_AXIS"
        assert ds.water_level.encoding["_FillValue"] == samples.DELETE_FLOAT

        for name in ("water_level", "discharge", "depth"):
            np.testing.assert_array_equal(ds[name].values, _expected(name), err_msg=name)
        # Integer items keep their type and values; the delete value is their _FillValue.
        assert ds.flag.dtype == np.int32 and ds.flag.attrs["_FillValue"] == 2147483647
        np.testing.assert_array_equal(ds.flag.values, _expected("flag", False))
        np.testing.assert_array_equal(xr.decode_cf(ds).flag.values, _expected("flag"))
        np.testing.assert_array_equal(ds.bathymetry, np.arange(12).reshape(3, 4))
        np.testing.assert_array_equal(ds.depth[2:5, 1, ::2].values, _expected("depth")[2:5, 1, ::2])
        np.testing.assert_array_equal(ds.water_level.isel(time=[5, 1], x=[3, 0]).values,
                                      _expected("water_level")[[5, 1]][:, :, [3, 0]])

    with xr.open_dataset(sample, engine=TovaBackendEntrypoint, mask_and_scale=False, static_items=False,
                         drop_variables=["depth"]) as ds:
        assert list(ds.data_vars) == ["water_level", "discharge", "flag"]
        assert ds.flag.dtype == np.int32 and ds.flag.values.tolist() == _expected("flag", False).tolist()
        assert ds.water_level.values.tobytes() == _expected("water_level", False).tobytes()


def test_grid_kinds_give_their_coordinates(tmp_path):
    path = tmp_path / "kinds.grd"
    nodes_x, nodes_y = np.meshgrid([0.0, 1.0, 2.5], [10.0, 11.0])
    items = [Item("cells", "WaterDepth", "m", axis=Axis.nonequidistant([[0, 1, 3], [0, 10, 30, 60]])),
             Item("curved", "WaterDepth", "m", axis=Axis.curvilinear([nodes_x, nodes_y])),
             Item("stations", "WaterLevel", "m", np.float64, axis=Axis.nonequidistant([[5.0, 7.0, 8.0, 9.0]])),
             Item("gauge", "WaterLevel", "m")]
    with tova.create(path, items, TimeAxis.equidistant(10.0)) as w:
        for t in range(2):
            w.append([np.full((3, 2), t, np.float32), np.full((1, 2), -t, np.float32),
                      np.arange(3.0) + t, np.float32(t)])
    with xr.open_dataset(path, engine=TovaBackendEntrypoint) as ds:
        assert ds.cells.dims == ("time", "y", "x") and ds.curved.dims == ("time", "y_1", "x_1")
        np.testing.assert_array_equal(ds.y, [5.0, 20.0, 45.0])
        np.testing.assert_array_equal(ds.y_bounds, [[0, 10], [10, 30], [30, 60]])
        assert ds.y.attrs["bounds"] == "y_bounds"
        assert ds.x_nodes_1.dims == ("y_node_1", "x_node_1")
        np.testing.assert_array_equal(ds.x_nodes_1, nodes_x)
        np.testing.assert_array_equal(ds.y_nodes_1, nodes_y)
        np.testing.assert_array_equal(ds.x_2, [5.0, 7.0, 8.0])  # one point per element
        assert float(ds.gauge[1]) == 1.0 and float(ds.stations[1, 2]) == 3.0
        np.testing.assert_array_equal(ds.curved[:, 0, 1], [0.0, -1.0])


def test_only_the_selected_time_steps_are_read(sample, monkeypatch):
    positions = samples.count_positions(monkeypatch)
    with xr.open_dataset(sample, engine=TovaBackendEntrypoint) as ds:
        assert positions == []  # opening reads the header (and the static items) only
        last = ds.water_level.isel(time=-1).values
        assert positions == [(samples.N_STEPS - 1, 1)]
        np.testing.assert_array_equal(last, _expected("water_level")[-1])
        positions.clear()
        ds.depth.isel(time=slice(2, 4)).mean().values
        assert positions == [(2, 4), (3, 4)]


def test_calendar_axis_gives_datetime_coordinates(tmp_path):
    path = tmp_path / "cal.grd"
    with tova.create(path, [Item("level", "WaterLevel", "m", axis=Axis.equidistant([2]))],
                     TimeAxis.calendar("2024-02-29 12:00:00", step=30.0, unit="min")) as w:
        for t in range(3):
            w.append(np.array([t, -t], dtype=np.float32))
    with xr.open_dataset(path, engine=TovaBackendEntrypoint) as ds:
        assert ds.time.dtype == np.dtype("datetime64[ns]")
        assert str(ds.time.values[-1]) .startswith("2024-02-29T13:00:00")
        assert float(ds.level.sel(time="2024-02-29T12:30").values[1]) == -1.0
    with xr.open_dataset(path, engine=TovaBackendEntrypoint, decode_times=False) as ds:
        np.testing.assert_array_equal(ds.time, [0.0, 30.0, 60.0])
        assert ds.time.attrs["units"] == "minutes since 2024-02-29 12:00:00"


def test_dask_chunks_spread_over_worker_processes(sample):
    pytest.importorskip("dask")
    distributed = pytest.importorskip("distributed")
    serial = np.nansum(_expected("water_level"), axis=0)
    with xr.open_dataset(sample, engine=TovaBackendEntrypoint, chunks={"time": 1}) as ds:
        data = ds.water_level.data
        assert type(data).__module__.startswith("dask") and data.numblocks == (samples.N_STEPS, 1, 1)
        with distributed.LocalCluster(n_workers=2, processes=True, threads_per_worker=1, dashboard_address=None,
                                      silence_logs=40) as cluster, distributed.Client(cluster) as client:
            with distributed.get_task_stream(client) as stream:
                total = ds.water_level.sum("time").compute()
            np.testing.assert_allclose(total.values, serial, rtol=1e-6)
            # The reads ran in the worker processes: each opened the file
            # itself (an open file does not travel; only its path does).
            assert os.getpid() not in client.run(os.getpid).values()
            workers = set(client.scheduler_info()["workers"])
            reads = [t for t in stream.data if "water_level" in str(t["key"]) or "open_dataset" in str(t["key"])]
            assert reads and {t["worker"] for t in reads} <= workers


def _registered() -> bool:
    return any(e.name == "tova" for e in entry_points(group="xarray.backends"))


def test_registered_engine_name(sample, tmp_path):
    if _registered():
        with xr.open_dataset(sample, engine="tova") as ds:
            assert ds.sizes["time"] == samples.N_STEPS
        return
    # Not installed: let setuptools make the package's metadata from
    # pyproject.toml (in a copy; the source tree stays clean) and open the
    # file with engine="tova" in a process that sees it.
    pytest.importorskip("setuptools")
    src, meta = tmp_path / "src", tmp_path / "meta"
    shutil.copytree(PACKAGE_ROOT / "tova", src / "python" / "tova", ignore=shutil.ignore_patterns("__pycache__"))
    for name in ("pyproject.toml", "setup.py", "python/README.md"):
        shutil.copy(PACKAGE_ROOT.parent / name, src / name)
    meta.mkdir()
    subprocess.run([sys.executable, "-c", f"from setuptools import build_meta; "
                                          f"build_meta.prepare_metadata_for_build_wheel({str(meta)!r})"],
                   cwd=src, check=True, capture_output=True, timeout=300)
    script = textwrap.dedent(f"""
        import xarray as xr
        from tova.xarray_backend import TovaBackendEntrypoint
        assert type(xr.backends.list_engines()["tova"]) is TovaBackendEntrypoint
        with xr.open_dataset({str(sample)!r}, engine="tova") as ds:
            print(ds.sizes["time"], float(ds.water_level.isel(time=0, x=0, y=0)))
        print(xr.backends.plugins.guess_engine({str(sample)!r}))
    """)
    env = {**os.environ, "PYTHONPATH": os.pathsep.join([str(meta), str(src / "python")])}
    out = subprocess.run([sys.executable, "-c", script], env=env, capture_output=True, text=True, timeout=300)
    assert out.returncode == 0, out.stderr
    assert out.stdout.split() == [str(samples.N_STEPS), "0.0", "tova"]


def test_plot_item_draws_a_time_step(sample, tmp_path):
    pytest.importorskip("matplotlib")
    out = tmp_path / "level.png"
    fig = tova.plot_item(sample, "water_level", 3, out=out)
    assert out.stat().st_size > 1000 and out.read_bytes()[:8] == b"\x89PNG\r\n\x1a\n"
    ax = fig.axes[0]
    assert "water_level" in ax.get_title() and "step 3" in ax.get_title()
    np.testing.assert_array_equal(ax.collections[0].get_array().mask.reshape(3, 4),
                                  np.isnan(_expected("water_level")[3]))
    line = tova.plot_item(sample, "disch", 0).axes[0]  # a 1-D item is a line over x
    np.testing.assert_array_equal(line.lines[0].get_ydata(), samples.values(0)["discharge"])
    with pytest.raises(ValueError, match="a picture needs 1 or 2"):
        tova.plot_item(sample, "flag", 0)
