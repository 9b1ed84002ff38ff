"""Gridded data files: time steps written from numpy arrays and read back,
positioned reads, masking, times and calendar dates, failures."""

import gc
import json
import shutil
import subprocess
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

import numpy as np
import pytest

import tova
from tova import DeleteValues, Item, StaticItem, TimeAxis, TovaError
from tova.errors import F_ERR_ARGUMENT, F_ERR_SIZE

import grd_samples as samples


def _masked(values):
    out = np.array(values, dtype=np.float64 if np.asarray(values).dtype.kind != "f" else np.asarray(values).dtype)
    out[np.asarray(values) == samples.DELETE_FLOAT] = np.nan
    return out


def test_time_steps_round_trip(tmp_path):
    path = samples.write_equidistant(tmp_path / "eq.grd")
    expected = [samples.values(t) for t in range(samples.N_STEPS)]
    with tova.open(path) as f:
        assert f.n_steps == samples.N_STEPS and f.file_type == 1
        np.testing.assert_array_equal(f.times, 3600.0 + 900.0 * np.arange(samples.N_STEPS))

        raw = f.read("water_level", mask=False)
        assert raw.dtype == np.float32 and raw.shape == (samples.N_STEPS, 3, 4)
        assert raw.tobytes() == b"".join(e["water_level"].tobytes() for e in expected)
        masked = f.read("water_level")
        assert np.isnan(masked[3, 1, 3]) and np.isnan(masked).sum() == samples.N_STEPS
        np.testing.assert_array_equal(masked, np.stack([_masked(e["water_level"]) for e in expected]))

        np.testing.assert_array_equal(f.read("discharge", 4), expected[4]["discharge"])
        np.testing.assert_array_equal(f.read(1, -1), expected[-1]["discharge"])
        np.testing.assert_array_equal(f.read("depth", [6, 0, 3], mask=False),
                                      np.stack([expected[t]["depth"] for t in (6, 0, 3)]))
        np.testing.assert_array_equal(f.read("depth", slice(1, None, 3), mask=False),
                                      np.stack([expected[t]["depth"] for t in (1, 4)]))
        assert f.read("depth", []).shape == (0, 3, 4)

        flags = f.read("flag", mask=False)
        assert flags.dtype == np.int32 and flags.tolist() == [0, 3, 2147483647, 9, 12, 15, 18]
        flags = f.read("flag")
        assert flags.dtype == np.float64 and np.isnan(flags[2]) and flags[3] == 9.0

        step = f.read_step(5, mask=False)
        assert list(step) == ["water_level", "discharge", "flag", "depth"]
        for name, want in expected[5].items():
            np.testing.assert_array_equal(step[name], want)

        # The extremes and delete counts the library kept while writing.
        assert f.item_extremes("water_level") == (0.0, 611.0, samples.N_STEPS)
        assert f.item_extremes("flag") == (0.0, 18.0, 1)

        np.testing.assert_array_equal(f.static_item("bathymetry").values, np.arange(12).reshape(3, 4))
        # Static items read after time steps, and time steps after them.
        np.testing.assert_array_equal(f.read("flag", 6), 18)


def test_each_step_is_one_positioned_read(tmp_path, monkeypatch):
    path = samples.write_equidistant(tmp_path / "eq.grd")
    positions = samples.count_positions(monkeypatch)
    with tova.open(path) as f:
        f.read("depth", 5)
        assert positions == [(5, 4)]
        positions.clear()
        f.read("water_level", [6, 2])
        assert positions == [(6, 1), (2, 1)]


def test_custom_delete_values_are_masked(tmp_path):
    path = tmp_path / "dv.grd"
    item = Item("level", "WaterLevel", "m", np.float64, tova.Axis.equidistant([3]))
    with tova.create(path, [item], TimeAxis.equidistant(1.0), delete_values=DeleteValues(double=-999.0)) as w:
        w.append(np.array([1.0, -999.0, -1e-255]))
    with tova.open(path) as f:
        assert f.delete_values.double == -999.0
        got = f.read("level", 0)
        assert np.isnan(got[1]) and got[0] == 1.0 and got[2] == -1e-255
    with tova.open(path, mask=False) as f:
        assert f.read("level", 0)[1] == -999.0


def test_nonequidistant_times_are_stored(tmp_path):
    path = tmp_path / "neq.grd"
    times = [0.5, 1.0, 4.0, 4.25]
    with tova.create(path, samples.items(), TimeAxis.nonequidistant(unit="h")) as w:
        with pytest.raises(TovaError) as err:
            w.append(samples.values(0))  # no time
        assert err.value.status == F_ERR_ARGUMENT
        for t, time in enumerate(times):
            w.append(samples.values(t), time=time)
    with tova.open(path) as f:
        assert (f.file_type, f.time_axis.kind, f.time_axis.start, f.n_steps) == (4, 2, 0.5, 4)
        np.testing.assert_array_equal(f.times, times)
        np.testing.assert_array_equal(f.read_times([3, 1]), [4.25, 1.0])
        np.testing.assert_array_equal(f.read("water_level", 2, mask=False), samples.values(2)["water_level"])


def test_calendar_times_as_datetime64(tmp_path):
    eq = tmp_path / "cal_eq.grd"
    with tova.create(eq, samples.items()[:1], TimeAxis.calendar("2020-02-28 22:00:00", step=1.5, unit="h",
                                                              offset=0.5)) as w:
        for t in range(3):
            w.append([samples.values(t)["water_level"]])
    with tova.open(eq) as f:
        np.testing.assert_array_equal(f.times, [0.5, 2.0, 3.5])
        assert f.datetimes.dtype == np.dtype("datetime64[ns]")
        np.testing.assert_array_equal(f.datetimes, np.array(["2020-02-28T22:30", "2020-02-29T00:00",
                                                             "2020-02-29T01:30"], dtype="datetime64[ns]"))

    neq = tmp_path / "cal_neq.grd"
    stamps = np.array(["2023-12-31T23:59:59", "2024-01-01T00:00:01", "2024-03-01T12:00:00"], dtype="datetime64[s]")
    with tova.create(neq, samples.items()[2:3], TimeAxis.calendar("2023-12-31", unit="min")) as w:
        for t, stamp in enumerate(stamps):
            w.append({"flag": np.int32(t)}, time=stamp)
    with tova.open(neq) as f:
        assert f.time_axis.kind == 4 and f.file_type == 4
        assert f.times[0] == pytest.approx(1439.0 + 59 / 60)
        np.testing.assert_array_equal(f.datetimes, stamps.astype("datetime64[ns]"))
        np.testing.assert_array_equal(f.read("flag"), [0.0, 1.0, 2.0])


def test_compressed_items_store_only_the_key_elements(tmp_path):
    path = tmp_path / "packed.grd"
    x, y = np.array([0, 3, 1, 2]), np.array([0, 0, 1, 2])  # four of the twelve grid positions
    items = [it for it in samples.items() if it.name != "discharge"]
    with tova.create(path, items, TimeAxis.equidistant(60.0), encoding_keys=(x, y)) as w:
        for t in range(3):
            w.append({k: v for k, v in samples.values(t).items() if k != "discharge"})
    with tova.open(path) as f:
        assert f.compressed and f.encoding_key_length == 4
        assert f.static_items == []  # the keys are no static items of the caller's
        level = f.read("water_level", mask=False)
        inside = np.zeros((3, 4), bool)
        inside[y, x] = True
        for t in range(3):
            np.testing.assert_array_equal(level[t][inside], samples.values(t)["water_level"][inside])
        assert (level[:, ~inside] == samples.DELETE_FLOAT).all()
        assert np.isnan(f.read("depth")[:, ~inside]).all()
        # An item no larger than the keys is stored whole.
        np.testing.assert_array_equal(f.read("flag", mask=False), [0, 3, 2147483647])


def test_refusals_and_lifecycle(tmp_path):
    path = tmp_path / "w.grd"
    w = tova.create(path, samples.items(), TimeAxis.equidistant(60.0))
    good = samples.values(0)
    with pytest.raises(TovaError) as err:
        w.append({**good, "water_level": np.zeros((4, 3), np.float32)})
    assert err.value.status == F_ERR_SIZE and "water_level" in str(err.value)
    with pytest.raises(TypeError):
        w.append({**good, "flag": np.float64(1.5)})
    with pytest.raises(KeyError):
        w.append({"water_level": good["water_level"]})
    assert w.steps_written == 0  # nothing went to the file
    w.append(good)
    with pytest.raises(TovaError) as err:
        w.write_static(StaticItem("late", "WaterDepth", "m", values=np.zeros(3, np.float32)))
    assert err.value.status == F_ERR_ARGUMENT
    w.close()
    with pytest.raises(TovaError):
        w.append(good)

    f = tova.open(path)
    assert f.n_steps == 1
    with pytest.raises(IndexError):
        f.read("flag", 1)
    with pytest.raises(KeyError):
        f.read("nothing", 0)
    finalizer = f._finalizer
    del f
    gc.collect()
    assert not finalizer.alive  # the handles went with the object


def _tool() -> Path | None:
    root = Path(__file__).resolve().parents[2]
    for candidate in sorted(root.glob("build/*/tools/tova/tova")) + sorted(root.glob("build/tools/tova/tova")):
        if candidate.is_file():
            return candidate
    found = shutil.which("tova")
    return Path(found) if found else None


def test_files_written_here_read_with_the_tool(tmp_path):
    tool = _tool()
    if tool is None:
        pytest.skip("the tova tool is not built")
    path = samples.write_equidistant(tmp_path / "eq.grd")
    info = subprocess.run([str(tool), "info", "--json", str(path)], capture_output=True, text=True, timeout=60)
    if "not available" in info.stdout + info.stderr or '"grd"' not in info.stdout:
        pytest.skip("this build of the tool does not read gridded data files yet")
    assert info.returncode == 0, info.stderr
    text = json.dumps(json.loads(info.stdout))
    for name in ("sample", "water_level", "discharge", "flag", "depth", "bathymetry"):
        assert name in text
    check = subprocess.run([str(tool), "check", str(path)], capture_output=True, text=True, timeout=60)
    assert check.returncode == 0, check.stdout + check.stderr


def test_a_cut_file_names_the_step_and_item_where_its_data_ends(tmp_path):
    whole = samples.write_equidistant(tmp_path / "whole.grd", n_steps=5)
    cut = samples.write_equidistant(tmp_path / "cut.grd")
    with open(cut, "r+b") as stream:  # five whole steps and a few bytes of the sixth
        stream.truncate(whole.stat().st_size + 10)
    with tova.open(cut) as f:
        assert f.n_steps == samples.N_STEPS
        np.testing.assert_array_equal(f.read("depth", 4), _masked(samples.values(4)["depth"]))
        for item in ("water_level", "depth"):
            with pytest.raises(TovaError, match="the data ends in time step 5 at item 1 'water_level'") as err:
                f.read(item)
            assert err.value.status >= 2000 and f"item {item!r} of time step 5" in str(err.value)


def test_threads_read_one_file_at_once(tmp_path, monkeypatch):
    """Reads of one open file from several threads overlap on handles of
    their own and give what one thread reads."""
    big = tova.Axis.equidistant([300, 300])  # more than one masking block per step
    path = tmp_path / "big.grd"
    steps = [np.arange(90000, dtype=np.float32).reshape(300, 300) + t for t in range(8)]
    holes = [0, 65535, 65536, 89999]
    for values in steps:
        values.reshape(-1)[holes] = samples.DELETE_FLOAT
    with tova.create(path, [Item("level", "WaterLevel", "m", np.float32, big)], TimeAxis.equidistant(1.0)) as w:
        for values in steps:
            w.append(values)
    expected = _masked(np.stack(steps))
    assert np.isnan(expected.reshape(8, -1)[:, holes]).all()
    headers = set()
    position = tova.GridFile._position

    def note_handle(self, lib, h, f, step, number):
        headers.add(h.value)
        position(self, lib, h, f, step, number)

    monkeypatch.setattr(tova.GridFile, "_position", note_handle)
    with tova.open(path) as f, ThreadPoolExecutor(4) as pool:
        results = list(pool.map(lambda t: f.read("level", slice(t % 8, None)), range(32)))
        for t, got in enumerate(results):
            np.testing.assert_array_equal(got, expected[t % 8:])
    assert 1 < len(headers) <= 4  # the threads read through handles of their own
