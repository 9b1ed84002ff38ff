"""Items and time steps chosen as the tova tool chooses them, and the
quick-look pictures of ``python -m tova plot`` on the axis kinds it draws."""

import numpy as np
import pytest

import tova
from tova import Axis, Item, TimeAxis
from tova.__main__ import main

import grd_samples as samples


@pytest.fixture(scope="module")
def calendar(tmp_path_factory):
    """Hourly calendar steps from 2024-03-21 06:00 of a non-equidistant and a
    curvilinear item."""
    path = tmp_path_factory.mktemp("sel") / "cal.grd"
    nodes = np.meshgrid(np.arange(4.0), np.arange(3.0))
    items = [Item("Water level", "WaterLevel", "m", np.float32, Axis.nonequidistant([[0, 1, 3, 6], [0, 2, 5]])),
             Item("Water depth", "WaterDepth", "m", np.float32, Axis.curvilinear([nodes[0] + 0.1 * nodes[1],
                                                                                   nodes[1]]))]
    with tova.create(path, items, TimeAxis.calendar("2024-03-21T06:00", step=3600.0)) as w:
        for t in range(4):
            level = np.full((2, 3), t, dtype=np.float32)
            level[0, 0] = samples.DELETE_FLOAT
            w.append({"Water level": level, "Water depth": level + 10})
    return path


def test_items_by_name_beginning_or_case(calendar):
    with tova.open(calendar) as f:
        assert f.item("Water level").number == 1
        assert f.item("WATER D").number == 2
        with pytest.raises(KeyError, match=r'"water" names more than one item \(1 "Water level", 2 "Water depth"\)'):
            f.item("water")
        with pytest.raises(KeyError, match='no item named "speed"; the items: 1 "Water level", 2 "Water depth"'):
            f.item("speed")


def test_time_steps_by_date(calendar):
    with tova.open(calendar) as f:
        assert f.find_step("2024-03-21T08:00") == 2
        np.testing.assert_array_equal(f.read("water d", "2024-03-21T08:00"), f.read(1, 2))
        assert f.find_step(np.datetime64("2024-03-21T08:20"), nearest=True) == 2
        with pytest.raises(ValueError, match=r"no time step at 2024-03-21 08:20:00: the nearest are time step 2 "
                                             r"\(2024-03-21 08:00:00\) and time step 3"):
            f.find_step("2024-03-21 08:20")
        with pytest.raises(ValueError, match="before the first time step"):
            f.find_step("2024-03-20", nearest=True)


def test_plot_command_draws_every_axis_kind(calendar, tmp_path, capsys):
    pytest.importorskip("matplotlib")
    for item in ("level", "depth"):
        out = tmp_path / f"{item}.png"
        assert main(["plot", str(calendar), "--item", f"water {item}", "--time", "2024-03-21T07:00",
                     "-o", str(out)]) == 0
        assert out.read_bytes()[:8] == b"\x89PNG\r\n\x1a\n"
    assert main(["plot", str(calendar), "--item", "1", "--time", "9"]) == 1
    assert "holds time steps 0 to 3; time step 9 is not there" in capsys.readouterr().err
    fig = tova.plot_item(calendar, "Water level", 1)
    assert fig.axes[0].get_title() == "Water level, time step 1 (2024-03-21 07:00:00)"
    assert fig.axes[1].get_ylabel() == "WaterLevel [m]"  # the colour bar
    assert main(["frobnicate"]) == 2
