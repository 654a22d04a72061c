"""Builds the wheel: CMake builds and installs, setuptools packs.

The wheel holds the module with its classes, objects and stubs, the command, and the simulated host,
which the module finds after LD_LIBRARY_PATH and before the system's libraries. What it makes on the
way lies in build/wheel/.
"""

import os
import shutil
import subprocess
import sys
import sysconfig
from pathlib import Path

import setuptools
from setuptools import Extension, setup
from setuptools.command.build_ext import build_ext

ROOT = Path(__file__).resolve().parent
# A folder for each binary interface, as interpreters share this tree.
WORK = Path("build", "wheel", str(sysconfig.get_config_var("SOABI")))

CONFIGURATION = {
    "CMAKE_BUILD_TYPE": "Release",
    "Python3_EXECUTABLE": sys.executable,
    "PYTHON_INSTALL_DIR": ".",
    "SIMHOST_INSTALL_DIR": "simhost/lib",
    "RECORDINGS_INSTALL_DIR": "vswitch/recordings",
    "HOST_RUNPATH": "$ORIGIN/simhost/lib",
    "INSTALL_METADATA": "OFF",
    "SOURCES_TOGETHER": "ON",
    # A wheel cannot ask for libraries of the system.
    "COMPILE_FMT_IN": "ON",
}


def require_setuptools(major: int) -> None:
    """Older ones pass over pyproject.toml, and pack a wheel without a name."""
    if int(setuptools.__version__.split(".")[0]) < major:
        raise SystemExit(f"setup.py: setuptools is {setuptools.__version__}, this takes {major}")


class CMakeBuild(build_ext):
    """Makes the whole content of the wheel; to setuptools it is one extension module."""

    def run(self) -> None:
        if self.inplace or getattr(self, "editable_mode", False):
            raise SystemExit("setup.py: to edit in place, ./dev build and PYTHONPATH=build/python")
        objects = str(ROOT / WORK / "objects")
        target = Path(self.build_lib).resolve()
        settings = [f"-D{name}={value}" for name, value in CONFIGURATION.items()]
        generator = ["-G", "Ninja"] if shutil.which("ninja") else []
        self._cmake("-S", str(ROOT), "-B", objects, *generator, *settings)
        self._cmake("--build", objects, "--parallel", str(os.cpu_count() or 1))
        # What an earlier build left there would go into the wheel.
        shutil.rmtree(target, ignore_errors=True)
        for component in ("module", "recordings", "command", "simhost"):
            self._cmake(
                "--install", objects, "--strip", "--prefix", str(target), "--component", component
            )
        shutil.copy(ROOT / "packaging" / "simhostctl.py", target / "simhost" / "_simhostctl.py")

    @staticmethod
    def _cmake(*arguments: str) -> None:
        subprocess.run(["cmake", *arguments], check=True)


require_setuptools(65)
(ROOT / WORK).mkdir(parents=True, exist_ok=True)
setup(
    version=(ROOT / "VERSION").read_text(encoding="ascii").strip(),
    ext_modules=[Extension("_libvswitch", [])],
    cmdclass={"build_ext": CMakeBuild},
    options={
        "build": {"build_base": str(WORK)},
        "bdist_wheel": {"bdist_dir": str(WORK / "content")},
        "egg_info": {"egg_base": str(WORK)},
    },
)
