"""Only versions of the generator that the frame is tested with make the module, unless told to."""

import subprocess
from pathlib import Path

import pytest

MODULE = Path(__file__).resolve().parents[2] / "cmake" / "Generator.cmake"


def looked_at(generator: Path, *options: str) -> "subprocess.CompletedProcess[str]":
    return subprocess.run(
        ["cmake", f"-DSWIG_EXECUTABLE={generator}", *options, "-P", str(MODULE)],
        capture_output=True,
        text=True,
        check=False,
    )


def generator_that_says(words: str, folder: Path) -> Path:
    program = folder / "swig"
    program.write_text(f"#!/bin/sh\nprintf '%s\\n' '' '{words}' ''\n", encoding="utf-8")
    program.chmod(0o755)
    return program


@pytest.mark.parametrize("version", ["4.1.0", "4.1.1", "4.1.12"])
def test_a_tested_version_is_taken(version: str, tmp_path: Path) -> None:
    done = looked_at(generator_that_says(f"SWIG Version {version}", tmp_path))
    assert (done.returncode, done.stdout + done.stderr) == (0, "")


@pytest.mark.parametrize("version", ["3.0.12", "4.0.2", "4.2.0", "4.10.1", "14.1.0"])
def test_another_version_is_refused_with_its_number(version: str, tmp_path: Path) -> None:
    program = generator_that_says(f"SWIG Version {version}", tmp_path)
    done = looked_at(program)
    words = " ".join(done.stderr.split())
    assert done.returncode != 0
    assert f"{program} is SWIG {version}; the module is tested with SWIG 4.1.x only" in words
    assert "-DALLOW_UNTESTED_SWIG=ON" in words


def test_another_version_is_tried_by_who_insists(tmp_path: Path) -> None:
    program = generator_that_says("SWIG Version 4.2.0", tmp_path)
    done = looked_at(program, "-DALLOW_UNTESTED_SWIG=ON")
    assert done.returncode == 0
    assert "is SWIG 4.2.0; the module is tested with SWIG 4.1.x only" in " ".join(
        done.stderr.split()
    )


def test_what_is_no_generator_is_refused(tmp_path: Path) -> None:
    done = looked_at(generator_that_says("something else", tmp_path))
    assert done.returncode != 0
    assert "does not say which version of SWIG it is" in " ".join(done.stderr.split())
