"""Finding and loading libtova/libqty."""

from __future__ import annotations

import os
import shutil
import subprocess
import sys
from pathlib import Path

import pytest

import tova
from tova import _lib

PACKAGE_ROOT = Path(__file__).resolve().parents[1]


def test_found_without_settings_from_any_directory(tmp_path):
    env = {k: v for k, v in os.environ.items() if k != _lib.ENV_VAR}
    env["PYTHONPATH"] = str(PACKAGE_ROOT)
    out = subprocess.run([sys.executable, "-c", "import tova; print(tova.library_paths()[0])"],
                         cwd=tmp_path, env=env, capture_output=True, text=True, check=True).stdout
    loaded = Path(out.strip())
    assert loaded.name.startswith("libtova") or loaded.name.startswith("tova")
    if loaded.is_absolute():  # from a build tree rather than the loader's own search
        assert (PACKAGE_ROOT.parent / "build") in loaded.parents


def test_override_directory_is_the_only_place_looked_at(tmp_path):
    with pytest.raises(tova.LibraryNotFoundError) as info:
        _lib.load(environ={_lib.ENV_VAR: str(tmp_path)})
    assert _lib.ENV_VAR in str(info.value) and str(tmp_path) in str(info.value)

    real = Path(tova.library_paths()[0]).parent
    tova_lib, qty_lib = _lib.load(environ={_lib.ENV_VAR: str(real)})
    assert Path(tova_lib._name).parent == real and Path(qty_lib._name).parent == real


def _fake_build(checkout: Path, name: str, mtime: float, real: Path | None) -> Path:
    src = checkout / "build" / name / "src"
    src.mkdir(parents=True)
    for base in ("tova", "qty"):
        target = src / _lib.file_names(base)[0]
        if real is None:
            target.write_bytes(b"not a shared library")
        else:
            shutil.copyfile(real / _lib.file_names(base)[0], target)
        os.utime(target, (mtime, mtime))
    return src


def test_build_trees_newest_first_and_unloadable_ones_skipped(tmp_path):
    real = Path(tova.library_paths()[0]).parent
    checkout = tmp_path / "checkout"
    good = _fake_build(checkout, "gcc", 1_000_000, real)
    broken = _fake_build(checkout, "odd", 2_000_000, None)
    sanitized = _fake_build(checkout, "asan", 3_000_000, real)
    (sanitized.parent / "CMakeCache.txt").write_text("CMAKE_BUILD_TYPE:STRING=Debug\nTOVA_SANITIZE:BOOL=ON\n")
    package_dir = checkout / "python" / "tova"
    package_dir.mkdir(parents=True)

    assert _lib.build_tree_dirs(checkout) == [broken, good]
    tova_lib, _ = _lib.load(environ={}, package_dir=package_dir)
    assert Path(tova_lib._name).parent == good
