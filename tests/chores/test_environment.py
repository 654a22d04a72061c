"""./dev env: what a shell evaluates finds what was built."""

import os
import subprocess
from pathlib import Path
from typing import Dict, List

import pytest

ROOT = Path(__file__).resolve().parents[2]
BUILD = ROOT / "build"
VARIABLES = {"PATH": "bin", "PYTHONPATH": "python", "MYPYPATH": "python"}


def dev_env(*options: str, root: Path = ROOT) -> "subprocess.CompletedProcess[str]":
    command = [str(root / "dev"), "env", *options]
    return subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8")


def evaluated(text: str, before: Dict[str, str]) -> Dict[str, str]:
    """The variables of a shell that has evaluated the text."""
    program = text + "".join(f'echo "${{{name}}}"\n' for name in VARIABLES)
    done = subprocess.run(
        ["/bin/sh", "-eu", "-c", program], env=before, stdout=subprocess.PIPE, encoding="utf-8"
    )
    assert done.returncode == 0
    return dict(zip(VARIABLES, done.stdout.splitlines()))


def test_it_puts_the_build_tree_first_and_keeps_the_rest() -> None:
    before = {"PATH": "/usr/bin:/with a space", "PYTHONPATH": "/mine"}
    assert evaluated(dev_env().stdout, before) == {
        "PATH": f"{BUILD}/bin:{BUILD}/simhost:/usr/bin:/with a space",
        "PYTHONPATH": f"{BUILD}/python:/mine",
        "MYPYPATH": f"{BUILD}/python",
    }


@pytest.mark.parametrize("folder", ["with a space", "it's", 'of "quotes" and $PATH'])
def test_a_tree_may_lie_anywhere(tmp_path: Path, folder: str) -> None:
    tree = tmp_path / folder
    tree.mkdir()
    for part in ("dev", "chores"):
        (tree / part).symlink_to(ROOT / part)
    done = dev_env(root=tree)
    assert evaluated(done.stdout, {"PATH": "/usr/bin"})["PATH"] == (
        f"{tree}/build/bin:{tree}/build/simhost:/usr/bin"
    )
    assert done.stderr == "dev: nothing is built in build/ yet: ./dev build\n"


@pytest.mark.parametrize(
    "command",
    [
        ["simhostctl", "--version"],
        ["vswitch", "list"],
        ["/usr/bin/python3", "-c", "import libvswitch, simhost"],
        ["mypy", "--strict", "--cache-dir=/dev/null", "examples/inventory.py"],
    ],
)
def test_what_was_built_is_found(command: List[str]) -> None:
    if Path(os.environ["BUILD_DIR"]) != BUILD:
        # The commands print the folder of the plain build; here another one is under test.
        assert str(BUILD) in dev_env().stdout
        return
    before = {"PATH": "/usr/bin:/bin", "HOME": os.environ.get("HOME", "/")}
    environment = {**before, **evaluated(dev_env().stdout, before)}
    done = subprocess.run(
        command, cwd=ROOT, env=environment, stdout=subprocess.PIPE, stderr=subprocess.STDOUT
    )
    assert done.returncode == 0, done.stdout.decode()


def test_it_takes_the_options_of_a_build() -> None:
    assert f"{ROOT}/build-no-fast-paths/python" in dev_env("--no-fast-paths").stdout
    refused = dev_env("--no-such-option")
    assert (refused.returncode, refused.stdout) == (2, "")
    assert "unknown option '--no-such-option'" in refused.stderr
