"""Build step of the Python package: the C libraries go inside it.

`pip install .` and `pip wheel .` at the root of the source tree run CMake
(Release, only the libtova and libqty targets) and copy the two shared
libraries into the package folder of the build, each under the name the
other one asks the dynamic loader for (symbolic links resolved: a wheel
holds plain files). The libraries carry a run path to their own folder, so
libtova finds the libqty next to it by whatever route it is loaded.

The CMake build folder is `build/python` in the source tree: a second
`pip install .` or `pip wheel .` of the same tree only relinks what changed.
Settings from the environment: `CMAKE_BUILD_PARALLEL_LEVEL` (jobs, default:
the processor count), `TOVA_CMAKE_ARGS` (more arguments for the configure
step, split as a shell would).
"""

from __future__ import annotations

import os
import shlex
import shutil
import subprocess
import sys
from pathlib import Path

from setuptools import setup
from setuptools.command.build_py import build_py
from setuptools.dist import Distribution

try:
    from wheel.bdist_wheel import bdist_wheel
except ImportError:  # building without the wheel package: no wheels, installs still work
    bdist_wheel = None

ROOT = Path(__file__).resolve().parent
BUILD_DIR = ROOT / "build" / "python"


def _shared_libraries(out: Path) -> dict:
    """{name inside the package: file in the build tree} of libtova and libqty."""
    found = {}
    for base in ("tova", "qty"):
        if sys.platform.startswith("win"):
            candidates = [out / cfg / f"{base}.dll" for cfg in ("Release", ".")] + [out / f"{base}.dll"]
            files = [(c.name, c) for c in candidates if c.is_file()][:1]
        elif sys.platform == "darwin":
            # lib<base>.<major>.dylib is the install name the other library records.
            names = sorted(out.glob(f"lib{base}.*.dylib"), key=lambda p: len(p.name))
            files = [(names[0].name, names[0].resolve())] if names else []
        else:
            # lib<base>.so.<major> is the SONAME, the name libtova's dependency names.
            names = sorted(out.glob(f"lib{base}.so.*"), key=lambda p: len(p.name))
            files = [(names[0].name, names[0].resolve())] if names else []
        if not files:
            raise RuntimeError(f"the CMake build left no {base} library in {out}")
        found.update(files)
    return found


def build_libraries() -> dict:
    """Configures and builds libtova and libqty; returns them as
    `_shared_libraries` does."""
    if shutil.which("cmake") is None:
        raise RuntimeError("building the tova package needs CMake 3.25 or later on the PATH")
    origin = "@loader_path" if sys.platform == "darwin" else "$ORIGIN"
    configure = ["cmake", "-S", str(ROOT), "-B", str(BUILD_DIR), "-DCMAKE_BUILD_TYPE=Release",
                 "-DTOVA_BUILD_TESTS=OFF", "-DTOVA_BUILD_TOOLS=OFF", "-DTOVA_BUILD_BENCH=OFF",
                 "-DTOVA_BUILD_FUZZ=OFF", "-DCMAKE_BUILD_WITH_INSTALL_RPATH=ON", f"-DCMAKE_INSTALL_RPATH={origin}"]
    if not (BUILD_DIR / "CMakeCache.txt").exists():
        if shutil.which("ninja"):
            configure += ["-G", "Ninja"]
        if shutil.which("ccache"):
            configure += ["-DCMAKE_C_COMPILER_LAUNCHER=ccache", "-DCMAKE_CXX_COMPILER_LAUNCHER=ccache"]
    configure += shlex.split(os.environ.get("TOVA_CMAKE_ARGS", ""))
    jobs = os.environ.get("CMAKE_BUILD_PARALLEL_LEVEL") or str(os.cpu_count() or 2)
    # Paths inside the tree are hashed relative to it: a copy of the tree
    # elsewhere finds the compiler cache's results of this one.
    env = {"CCACHE_BASEDIR": str(ROOT), **os.environ}
    subprocess.run(configure, check=True, env=env)
    subprocess.run(["cmake", "--build", str(BUILD_DIR), "--config", "Release", "--parallel", jobs,
                    "--target", "tova", "qty"], check=True, env=env)
    return _shared_libraries(BUILD_DIR / "src")


class BuildWithLibraries(build_py):
    """build_py that also puts the freshly built C libraries into the package."""

    def run(self):
        super().run()
        target = Path(self.build_lib) / "tova"
        target.mkdir(parents=True, exist_ok=True)
        for name, source in build_libraries().items():
            shutil.copyfile(source, target / name)
            shutil.copymode(source, target / name)


class BinaryDistribution(Distribution):
    """The package holds native libraries: wheels are per platform."""

    def has_ext_modules(self):
        return True


commands = {"build_py": BuildWithLibraries}
if bdist_wheel is not None:

    class PlatformWheel(bdist_wheel):
        """Tagged for the platform only: the libraries are loaded through
        ctypes, so any Python 3 interpreter of that platform can use them."""

        def get_tag(self):
            _, _, platform = super().get_tag()
            return "py3", "none", platform

    commands["bdist_wheel"] = PlatformWheel

setup(cmdclass=commands, distclass=BinaryDistribution)
