"""The libraries of the recorder: their names, what they export, and what they are bound to."""

import os
import subprocess
from pathlib import Path
from typing import Set

import functions
import pytest
from libvswitch.errors import HostError
from recordings import SIMULATED
from vswitch import _front
from vswitch.recording import recorded

FOLDER = Path(os.environ["BUILD_DIR"], "recordings")
LIBRARIES = ("libvswitch.so", "libnebPublic.so")


def exported(library: Path) -> Set[str]:
    command = ["nm", "-D", "--defined-only", "--format=posix", str(library)]
    told = subprocess.run(command, stdout=subprocess.PIPE, check=True, text=True).stdout
    return {line.split()[0] for line in told.splitlines()}


def test_they_export_the_calls_and_nothing_else() -> None:
    names = [one.name for one in functions.read() if one.kind == "call"]
    both = [exported(FOLDER / name) for name in LIBRARIES]
    assert both[0] | both[1] == set(names)
    assert not both[0] & both[1]
    assert both == [exported(SIMULATED / name) for name in LIBRARIES]


@pytest.mark.parametrize("name", LIBRARIES)
def test_they_have_the_names_of_the_hosts(name: str) -> None:
    told = subprocess.run(
        ["objdump", "-p", str(FOLDER / name)], stdout=subprocess.PIPE, check=True, text=True
    ).stdout
    assert f"SONAME               {name}\n" in told


def test_a_recording_is_not_recorded(tmp_path: Path) -> None:
    libraries = {name: SIMULATED / name for name in LIBRARIES}
    with recorded(tmp_path / "one", ["x"], libraries) as environment:
        inner = Path(environment["LD_LIBRARY_PATH"].split(":")[0])
        with pytest.raises(HostError, match="this is being recorded already"):
            with recorded(tmp_path / "two", ["x"], {name: inner / name for name in LIBRARIES}):
                pass
    assert not inner.exists()


def test_a_recorder_that_is_not_there_is_missed(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setattr(_front, "folder", lambda: tmp_path)
    with pytest.raises(HostError, match=f"not installed: {tmp_path} lacks its libraries"):
        with recorded(tmp_path / "one", ["x"]):
            pass
    assert not (tmp_path / "one").exists()


def test_a_trace_is_its_users_alone(tmp_path: Path) -> None:
    libraries = {name: SIMULATED / name for name in LIBRARIES}
    with recorded(tmp_path / "one", ["x"], libraries):
        assert (tmp_path / "one").stat().st_mode & 0o777 == 0o600
