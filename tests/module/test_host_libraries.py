"""How the module finds its host: by two names, in an order that needs no rebuild to change."""

import os
import re
import shutil
import subprocess
import sys
from pathlib import Path
from typing import Dict, List, Set

import pytest

import _libvswitch as vs

BUILD = Path(os.environ["BUILD_DIR"])
ROOT = Path(__file__).resolve().parents[2]
MODULE = Path(vs.__file__)
RECORDING_HOST = BUILD / "tests" / "recording_host"
HOST_LIBRARIES = {"libvswitch.so", "libnebPublic.so"}


def dynamic_section(library: Path) -> Dict[str, Set[str]]:
    listing = subprocess.run(
        ["readelf", "--dynamic", "--wide", str(library)], check=True, capture_output=True, text=True
    ).stdout
    section: Dict[str, Set[str]] = {}
    for tag, value in re.findall(r"\((\w+)\)\s+[^\[]*\[(.*)\]", listing):
        section.setdefault(tag, set()).add(value)
    return section


def imported_from(folder: Path, **environment: str) -> "subprocess.CompletedProcess[str]":
    """What a process prints that imports the module in a folder and shows the host it found."""
    program = (
        "import pathlib\n"
        "import _libvswitch\n"
        "lines = pathlib.Path('/proc/self/maps').read_text().split()\n"
        "print(*sorted({word for word in lines if word.endswith(('vswitch.so', 'Public.so'))}))"
    )
    clean = {name: os.environ[name] for name in os.environ if name != "LD_LIBRARY_PATH"}
    return subprocess.run(
        [sys.executable, "-c", program],
        env={**clean, "PYTHONPATH": str(folder), **environment},
        capture_output=True,
        text=True,
    )


def hosts(folder: Path) -> List[str]:
    return sorted(str(folder / name) for name in HOST_LIBRARIES)


def test_the_build_leaves_everything_at_its_place() -> None:
    assert MODULE.parent == BUILD / "python"
    for name in HOST_LIBRARIES:
        assert dynamic_section(BUILD / "simhost" / name)["SONAME"] == {name}


def test_the_module_needs_both_libraries_by_name() -> None:
    section = dynamic_section(MODULE)
    assert HOST_LIBRARIES <= section["NEEDED"]
    assert not any("/" in name for name in section["NEEDED"])


def test_the_search_path_gives_way_to_the_environment() -> None:
    section = dynamic_section(MODULE)
    assert section["RUNPATH"] == {"$ORIGIN/../simhost"}
    assert "RPATH" not in section


def test_the_simulated_host_is_found_beside_the_module() -> None:
    found = imported_from(MODULE.parent)
    assert [os.path.realpath(path) for path in found.stdout.split()] == hosts(BUILD / "simhost")


def test_another_host_takes_its_place_without_a_rebuild() -> None:
    found = imported_from(MODULE.parent, LD_LIBRARY_PATH=str(RECORDING_HOST))
    assert found.stdout.split() == hosts(RECORDING_HOST)


def test_a_missing_host_is_named_by_the_loader(tmp_path: Path) -> None:
    """The README explains this very line."""
    shutil.copy(MODULE, tmp_path)
    done = imported_from(tmp_path)
    assert done.returncode != 0
    line = "ImportError: libvswitch.so: cannot open shared object file"
    assert line in done.stderr
    assert line in (ROOT / "README.md").read_text(encoding="utf-8")


def run(*command: str) -> str:
    done = subprocess.run(command, capture_output=True, text=True)
    assert done.returncode == 0, done.stdout + done.stderr
    return done.stdout


def configure(folder: Path, *options: str) -> None:
    """A build against the recording host."""
    run(
        "cmake",
        f"-S{ROOT}",
        f"-B{folder}",
        "-GNinja",
        f"-DHOST_LIBRARY_DIR={RECORDING_HOST}",
        # Which is compiled in a third of the time.
        "-DCMAKE_BUILD_TYPE=Debug",
        f"-DPython3_EXECUTABLE={sys.executable}",
        *options,
    )


def test_a_build_against_a_host_brings_no_other(tmp_path: Path) -> None:
    configure(tmp_path, f"-DPROPERTY_REFERENCE={BUILD}/simhost/properties.json")
    # The rest is no different with a host, and takes its time.
    run("cmake", "--build", str(tmp_path), "--target", "_libvswitch", "objects")
    assert "simhost/" not in run("ninja", "-C", str(tmp_path), "-t", "targets", "all")
    assert not (tmp_path / "simhost").exists()
    found = imported_from(tmp_path / "python", LD_LIBRARY_PATH=str(RECORDING_HOST))
    assert found.stdout.split() == hosts(RECORDING_HOST), found.stderr
    settings = "python/vswitch/_properties.py"
    assert (tmp_path / settings).read_bytes() == (BUILD / settings).read_bytes()


def test_a_build_against_a_host_makes_the_table_of_settings_if_none_is_given(
    tmp_path: Path,
) -> None:
    configure(tmp_path)
    commands = run("ninja", "-C", str(tmp_path), "-t", "commands", "all")
    assert "/properties/make_properties" in commands
    assert "libsimhost.so" not in commands


@pytest.mark.parametrize("missing", sorted(HOST_LIBRARIES))
def test_a_build_against_no_host_says_what_is_missing(tmp_path: Path, missing: str) -> None:
    (other,) = HOST_LIBRARIES - {missing}
    (tmp_path / "host").mkdir()
    (tmp_path / "host" / other).touch()
    done = subprocess.run(
        ["cmake", "-GNinja", f"-S{ROOT}", f"-B{tmp_path}/build"]
        + [f"-DHOST_LIBRARY_DIR={tmp_path}/host"],
        capture_output=True,
        text=True,
    )
    assert done.returncode != 0
    unwrapped = " ".join(done.stderr.split())
    assert f"{tmp_path}/host/{missing} does not exist" in unwrapped
