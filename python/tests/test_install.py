"""`pip install .` as a user runs it: at the root of a fresh copy of the
source tree, with no build before it, into a new virtual environment; then
`pip wheel .` of the same tree (its CMake build is shared) installed into a
second environment after the source tree is gone. Both open a file with
`xr.open_dataset` and no engine, from a folder that holds a folder named
`tova`.

The environments see Debian's modules (`--system-site-packages`) and pip
installs with `--no-build-isolation --no-index`: only Debian's packages are
at hand here."""

from __future__ import annotations

import os
import shutil
import subprocess
import sys
import textwrap
from pathlib import Path

import pytest

ROOT = Path(__file__).resolve().parents[2]
PYTHON = "/usr/bin/python3" if Path("/usr/bin/python3").exists() else sys.executable

CHECK = textwrap.dedent("""
    import sys
    import numpy as np
    import xarray as xr
    import tova
    from tova import Item, TimeAxis
    path = sys.argv[1]
    with tova.create(path, [Item("level", "WaterLevel", "m", np.float32, tova.Axis.equidistant([3]))],
                     TimeAxis.equidistant(60.0)) as w:
        for t in range(4):
            w.append(np.array([t, -1e-35, 2 * t], np.float32))
    with xr.open_dataset(path) as ds:
        assert ds.level.shape == (4, 3) and float(ds.level[3, 2]) == 6.0 and np.isnan(ds.level[1, 1])
    print(tova.library_paths()[0])
""")


def _run(*args, cwd=None) -> str:
    env = {k: v for k, v in os.environ.items() if k not in ("TOVA_LIBRARY_DIR", "PYTHONPATH", "PYTHONHOME")}
    env.update(PIP_DISABLE_PIP_VERSION_CHECK="1", PIP_NO_INPUT="1", CMAKE_BUILD_PARALLEL_LEVEL="2")
    done = subprocess.run([str(a) for a in args], cwd=cwd, env=env, capture_output=True, text=True, timeout=900)
    assert done.returncode == 0, f"{' '.join(map(str, args))}\n{done.stdout[-3000:]}\n{done.stderr[-3000:]}"
    return done.stdout


def _source_files() -> list[str]:
    """The files of the checkout a clone would have, plus new ones not yet
    committed (as they are in the working tree)."""
    if shutil.which("git") is None or not (ROOT / ".git").exists():
        pytest.skip("not a git checkout")
    listed = subprocess.run(["git", "-C", str(ROOT), "ls-files", "-z", "--cached", "--others", "--exclude-standard"],
                            capture_output=True, check=True).stdout.decode().split("\0")
    return [name for name in listed if name and (ROOT / name).is_file()]


def _venv(path: Path) -> tuple:
    """(the environment's interpreter, the command that runs pip for it).
    The system's pip serves it when there is one (`pip --python`): an
    environment without its own copy of pip is made ten times as fast."""
    system_pip = subprocess.run([PYTHON, "-m", "pip", "--python", PYTHON, "--version"], capture_output=True)
    without = ["--without-pip"] if system_pip.returncode == 0 else []
    _run(PYTHON, "-m", "venv", "--system-site-packages", *without, path)
    python = path / "bin" / "python"
    return python, ([PYTHON, "-m", "pip", "--python", python] if without else [python, "-m", "pip"])


@pytest.fixture(scope="module")
def tools():
    for module in ("venv", "setuptools", "wheel", "ensurepip"):
        if subprocess.run([PYTHON, "-c", f"import {module}"], capture_output=True).returncode:
            pytest.skip(f"{PYTHON} has no {module} module")
    if shutil.which("cmake") is None:
        pytest.skip("no cmake")


def test_pip_install_and_wheel_from_a_fresh_tree(tmp_path, tools):
    source = tmp_path / "tova-src"
    for name in _source_files():
        (source / name).parent.mkdir(parents=True, exist_ok=True)
        shutil.copy2(ROOT / name, source / name)
    assert not (source / "build").exists()
    work = tmp_path / "work"
    (work / "tova").mkdir(parents=True)  # a folder named like the package must not shadow it

    first, pip = _venv(tmp_path / "env1")
    _run(*pip, "install", "-q", "--no-build-isolation", "--no-index", ".", cwd=source)
    _run(*pip, "wheel", "-q", "--no-build-isolation", "--no-index", "--no-deps", "-w", tmp_path / "dist", ".",
         cwd=source)
    shutil.rmtree(source)

    loaded = _run(first, "-c", CHECK, work / "one.grd", cwd=work).strip()
    assert Path(loaded).parent == Path(_run(first, "-c", "import tova, os; print(os.path.dirname(tova.__file__))",
                                            cwd=tmp_path).strip())

    wheels = list((tmp_path / "dist").glob("tova-*.whl"))
    assert len(wheels) == 1 and "-py3-none-" in wheels[0].name and not wheels[0].name.endswith("-any.whl")
    second, pip = _venv(tmp_path / "env2")
    _run(*pip, "install", "-q", "--no-index", wheels[0])
    loaded = _run(second, "-c", CHECK, work / "two.grd", cwd=work).strip()
    assert str(tmp_path / "env2") in loaded
