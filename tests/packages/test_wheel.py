"""The wheel, installed into an environment on a machine that has nothing else of this, and removed.

The tests go on where the one before left the environment: it ends as it began.
"""

import re
from pathlib import Path
from typing import Set

import pytest
from on_a_machine import HOST, Machine
from roots import Root

EXAMPLES = Path(__file__).resolve().parents[2] / "examples"

ENVIRONMENT = "/tmp/environment"
PACKAGES = f"{ENVIRONMENT}/lib/python3.11/site-packages"
SIMHOST = f"{PACKAGES}/simhost/lib"


def files(root: Root) -> Set[str]:
    """What the environment holds, but for the byte code of its own tools."""
    found = root.run("find", ENVIRONMENT).splitlines()
    return {file for file in found if not file.startswith(f"{PACKAGES}/pip/")}


@pytest.fixture(scope="module")
def before(root: Root) -> Set[str]:
    root.satisfy("python3-venv, python3-pytest, mypy")
    root.run("python3", "-m", "venv", ENVIRONMENT)
    return files(root)


@pytest.fixture(scope="module")
def file(root: Root, wheel: Path) -> str:
    """The wheel, where it lies on that machine."""
    return root.put(wheel, "/tmp/wheel")


@pytest.fixture(scope="module")
def machine(root: Root, before: Set[str], file: str) -> Machine:
    assert before
    for example in EXAMPLES.glob("*.py"):
        root.put(example, "/tmp/examples")
    root.run(f"{ENVIRONMENT}/bin/pip", "install", "--no-index", file)
    return Machine(root, f"{ENVIRONMENT}/bin/python", f"{ENVIRONMENT}/bin")


def test_it_says_which_host_it_found(machine: Machine) -> None:
    machine.finds_simulated_host(SIMHOST)


def test_the_examples_run(machine: Machine) -> None:
    machine.runs_the_examples("/tmp/examples")


def test_simhostctl_controls_the_host(machine: Machine) -> None:
    machine.controls_the_host()


def test_the_plugin_is_found(machine: Machine) -> None:
    # An environment has no pytest of its own; that of the system is lent to it.
    machine.runs_tests_with_the_plugin(PYTHONPATH="/usr/lib/python3/dist-packages")


def test_type_checkers_find_the_stubs(machine: Machine) -> None:
    machine.type_checks("--python-executable", machine.python)


def test_it_brings_its_host_and_prefers_it_to_the_systems(
    machine: Machine, real_host: Path
) -> None:
    for name in HOST:
        machine.root.put(real_host / name, "/usr/lib")
        machine.root.put(real_host / name, "/opt/host")
    machine.root.run("ldconfig")
    machine.finds_simulated_host(SIMHOST)
    assert machine.answer_of_the_host() != 4242
    assert machine.answer_of_the_host(LD_LIBRARY_PATH="/opt/host") == 4242
    found = machine.doctor(LD_LIBRARY_PATH="/opt/host")
    assert (found["is_well"], found["simulated"]) == (True, False)
    assert found["host"] == {name: f"/opt/host/{name}" for name in HOST}


def test_without_its_extra_the_command_says_what_to_install(machine: Machine, file: str) -> None:
    machine.program("import vswitch; assert vswitch.Host().simulated")
    done = machine.root.try_run(machine.vswitch, "list")
    assert (done.returncode, done.stdout) == (1, "")
    assert re.fullmatch(
        r"vswitch: No module named '\w+'; pip install 'libvswitch\[command\]' .*\n", done.stderr
    )
    pip = [f"{ENVIRONMENT}/bin/pip", "install", "--no-index"]
    done = machine.root.try_run(*pip, f"{file}[command]")
    assert done.returncode != 0
    assert re.search("No matching distribution found for (click|PyYAML|rich|typer)", done.stderr)


def test_with_its_extra_the_command_runs(root: Root, file: str) -> None:
    """The system's own libraries are enough for it, in an environment that is to see them."""
    environment = "/tmp/with_extra"
    root.satisfy("python3-click, python3-rich, python3-typer, python3-yaml")
    root.run("python3", "-m", "venv", "--system-site-packages", environment)
    root.run(f"{environment}/bin/pip", "install", "--no-index", f"{file}[command]")
    machine = Machine(root, f"{environment}/bin/python", f"{environment}/bin")
    machine.runs_the_command()
    machine.records_and_plays()


def test_nothing_is_left_after_uninstalling(machine: Machine, before: Set[str]) -> None:
    assert f"{SIMHOST}/libvswitch.so" in files(machine.root) - before
    machine.root.run(f"{ENVIRONMENT}/bin/pip", "uninstall", "-y", "libvswitch")
    assert files(machine.root) ^ before == set()
