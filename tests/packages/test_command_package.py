"""The package of the command, on a machine that has the module and the simulated host.

The tests go on where the one before left the root: it ends as it began.
"""

from pathlib import Path
from typing import Dict, Set

import pytest
from debian_packages import field, install, satisfy
from on_a_machine import Machine
from roots import Root

COMMAND = "libvswitch-command"
OTHERS = ("libvswitch-simhost", "python3-libvswitch")
OBJECTS = "import vswitch; print(*vswitch.Host(simulated=True).switches)"

COMPLETED = """
. /usr/share/bash-completion/completions/vswitch
COMP_LINE="vswitch lag vs" COMP_POINT=14 COMP_WORDS=(vswitch lag vs) COMP_CWORD=2
_vswitch_completion vswitch vs lag
echo "${COMPREPLY[@]}"
"""


@pytest.fixture(scope="module")
def before(root: Root, debs: Dict[str, Path]) -> Set[str]:
    """The files of the root with all that the package asks for."""
    install(root, [debs[name] for name in OTHERS])
    satisfy(root, [debs[COMMAND]])
    return root.files()


@pytest.fixture(scope="module")
def machine(root: Root, debs: Dict[str, Path], before: Set[str]) -> Machine:
    assert before
    assert install(root, [debs[COMMAND]]) == {COMMAND}
    return Machine(root, "/usr/bin/python3", "/usr/bin")


def test_the_module_and_its_host_do_not_ask_for_it(debs: Dict[str, Path]) -> None:
    for kind in ("Pre-Depends", "Depends", "Recommends"):
        for name in OTHERS:
            asked = field(debs[name], kind)
            assert not [word for word in (COMMAND, "typer", "click") if word in asked]


def test_without_it_there_are_the_objects(root: Root, before: Set[str]) -> None:
    assert before
    assert root.run("/usr/bin/python3", "-c", OBJECTS) == "vswitch0\n"
    assert root.try_run("/usr/bin/python3", "-m", "vswitch").returncode == 1
    assert not [file for file in before if file.startswith("/usr/bin/vswitch")]


def test_the_command_runs(machine: Machine) -> None:
    machine.runs_the_command()
    said = machine.root.run("/usr/bin/python3", "-m", "vswitch", "list")
    assert said == machine.root.run("vswitch", "list")


def test_it_records_and_plays(machine: Machine) -> None:
    machine.records_and_plays()


def test_it_has_its_manual_page(machine: Machine) -> None:
    page = machine.root.run("zcat", "/usr/share/man/man1/vswitch.1.gz")
    assert page.startswith('.TH VSWITCH 1 "" libvswitch')


def test_bash_completes_its_words(machine: Machine) -> None:
    assert machine.root.run("bash", "-c", COMPLETED) == "vswitch0\n"


def test_other_shells_find_how_to_complete_its_words(machine: Machine) -> None:
    share = machine.root.path("/usr/share")
    fish = (share / "fish/vendor_completions.d/vswitch.fish").read_text(encoding="utf-8")
    assert "--command vswitch" in fish
    zsh = (share / "zsh/vendor-completions/_vswitch").read_text(encoding="utf-8")
    assert zsh.startswith("#compdef vswitch\n")


def test_purged_it_leaves_nothing_and_the_objects_go_on(machine: Machine, before: Set[str]) -> None:
    assert "/usr/bin/vswitch" in machine.root.files("/usr") - before
    machine.root.run("apt-get", "purge", "-q", "-y", COMMAND)
    assert machine.root.files() ^ before == set()
    assert machine.program(OBJECTS) == "vswitch0\n"
