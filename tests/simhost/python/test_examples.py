"""The programs of examples/ run to their end, say what they do, and leave nothing behind."""

import os
import subprocess
import sys
from pathlib import Path
from typing import List

import pytest
from programs import EXAMPLES
from simhost import SharedHost

# These show something. The others are tools, with a test file each.
SHOWS = ["first_steps", "records", "tour"]
TOOLS = ["change_vlan", "inventory", "mirror_session", "watch_links"]


def test_every_example_is_run() -> None:
    assert sorted(example.stem for example in EXAMPLES.glob("*.py")) == sorted(SHOWS + TOOLS)
    for tool in TOOLS:
        assert Path(__file__).with_name(f"test_{tool}.py").exists()


@pytest.mark.parametrize("name", SHOWS)
def test_a_show_runs(shared_host: SharedHost, name: str) -> None:
    simhost = os.path.join(os.environ["BUILD_DIR"], "simhost")
    shared_host.environment["PATH"] = f"{simhost}{os.pathsep}{os.environ['PATH']}"
    done = shared_host.run([sys.executable, EXAMPLES / f"{name}.py"])
    assert (done.returncode, done.stderr) == (0, "")
    assert "memory leak" not in done.stdout
    assert len(done.stdout.splitlines()) > 10


@pytest.mark.parametrize("name", TOOLS)
def test_a_tool_explains_itself(name: str) -> None:
    words: List[str] = [sys.executable, str(EXAMPLES / f"{name}.py"), "--help"]
    done = subprocess.run(words, stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8")
    assert (done.returncode, done.stderr) == (0, "")
    assert done.stdout.startswith(f"usage: {name}.py [-h]")
    assert "The status is 0, 1 if " in done.stdout


@pytest.mark.parametrize("name", TOOLS)
def test_a_tool_refuses_a_wrong_command_line(name: str) -> None:
    words: List[str] = [sys.executable, str(EXAMPLES / f"{name}.py"), "--no-such-option"]
    done = subprocess.run(words, stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8")
    assert (done.returncode, done.stdout) == (2, "")
    assert done.stderr.startswith(f"usage: {name}.py [-h]")
