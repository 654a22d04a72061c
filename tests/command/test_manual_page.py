"""The manual page of the command, as its package has it."""

import os
import re
import shlex
import subprocess
from pathlib import Path
from typing import Dict, List, Set

import click
import pytest

from vswitch import _table
from vswitch.command import assignments, meeting
from vswitch.command.fabric.program import group as fabric_group
from vswitch.command.program import group

ROOT = Path(__file__).resolve().parents[2]
PACKAGING = ROOT / "packaging"
GUIDE = ROOT / "docs" / "guides" / "command.md"


def made(name: str, program: str) -> str:
    """A page, in the words of groff."""
    maker, template = PACKAGING / "make_manual_page.py", PACKAGING / "manual" / f"{name}.1.in"
    command = ["/usr/bin/python3", "-B", str(maker), str(template), f"{program}:group"]
    return subprocess.run(command, check=True, stdout=subprocess.PIPE, encoding="utf-8").stdout


@pytest.fixture(scope="module")
def page() -> str:
    return made("vswitch", "vswitch.command.program")


@pytest.fixture(scope="module")
def fabric_page() -> str:
    return made("vswitch-fabric", "vswitch.command.fabric.program")


def plain(page: str) -> str:
    return page.replace("\\-", "-").replace("\\(aq", "'")


def section(page: str, title: str) -> str:
    (found,) = re.findall(
        rf'^\.S[HS] "?{title}\b(.*?)(?=^\.S[HS] |\Z)', page, re.MULTILINE | re.DOTALL
    )
    return str(found)


def terms(page: str) -> List[str]:
    """What the page has something to say of."""
    return re.findall(r"^\.TP\n\\fB(.*)\\fR$", page, re.MULTILINE)


def missing(page: str, commands: click.Group) -> List[str]:
    """Commands of the program, their options and arguments that are not where they belong."""
    found = []
    for name, command in commands.commands.items():
        title = f"{commands.name} {name}"
        if f".SS {title} " not in page:
            found.append(name)
            continue
        words = {word for term in terms(section(page, title)) for word in term.split()}
        for parameter in command.params:
            is_option = isinstance(parameter, click.Option)
            asked = parameter.opts if is_option else [str(parameter.metavar)]
            found += [f"{name} {one}" for one in asked if one not in words]
    return found


def test_every_command_is_there_with_its_options(page: str) -> None:
    assert missing(plain(page), group()) == []


def test_what_is_not_there_would_be_noticed(page: str) -> None:
    less = plain(page).replace("\\fB--every S\\fR", "", 1).replace(".SS vswitch lag ", ".SS ")
    assert missing(less, group()) == ["stats --every", "lag"]


def test_it_says_which_options_all_commands_take(page: str) -> None:
    taken = {
        option: {name for name, one in group().commands.items() if option in _options(one)}
        for option in ("--real", "--json")
    }
    assert taken["--real"] == set(group().commands)
    *others, last = [name for name in group().commands if name not in taken["--json"]]
    said = f"and all but {', '.join(others)} and {last} take --json for programs."
    assert said in " ".join(plain(page).split())


def _options(command: click.Command) -> Set[str]:
    return {one for parameter in command.params for one in parameter.opts}


def complaints(page: str) -> str:
    command = ["groff", "-man", "-Tutf8", "-ww", "-z"]
    done = subprocess.run(command, check=True, input=page, stderr=subprocess.PIPE, encoding="utf-8")
    return done.stderr


def test_groff_has_nothing_to_complain_of(page: str) -> None:
    assert complaints(page) == ""
    assert "macro 'BQ' not defined" in complaints(page.replace("\n.B ", "\n.BQ ", 1))


def statuses(page: str) -> Dict[str, str]:
    return dict(
        re.findall(r"^\.TP\n\\fB(.*)\\fR\n(.*)$", section(page, "EXIT STATUS"), re.MULTILINE)
    )


def test_it_says_how_the_command_ends(page: str) -> None:
    found = statuses(plain(page))
    assert list(found) == ["0", "1", "2", "3"]
    rows = re.findall(r"^\| ([0-9]) \| (.*) \|$", GUIDE.read_text(encoding="utf-8"), re.MULTILINE)
    assert dict(rows) == found


def test_it_says_where_changes_wait(page: str) -> None:
    folder = str(meeting.folder()).replace(str(os.getuid()), "UID")
    assert f".I {folder}/\n" in section(plain(page), "FILES")


def test_it_has_all_sections(page: str) -> None:
    found = re.findall(r"^\.SH (.*)$", page, re.MULTILINE)
    assert found == [
        *("NAME", "SYNOPSIS", "DESCRIPTION", "COMMANDS", "EXIT STATUS", "ENVIRONMENT"),
        *("FILES", "EXAMPLES", "SEE ALSO"),
    ]


def test_the_program_takes_its_examples(page: str) -> None:
    examples = re.findall(r"^vswitch (.*)$", section(plain(page), "EXAMPLES"), re.MULTILINE)
    assert len(examples) > 10
    for example in examples:
        name, *words = shlex.split(example.partition(" > ")[0])
        context = group().commands[name].make_context(name, words)
        if name == "set":
            place, settings = context.params["place"], context.params["settings"]
            known = _table.PORT if "/" in place else _table.SWITCH
            assert assignments.read(known, settings, lambda setting: setting.default)


def test_the_page_of_fabrics_says_all_of_them(fabric_page: str) -> None:
    said, commands = plain(fabric_page), fabric_group()
    assert isinstance(commands, click.Group)
    assert missing(said, commands) == []
    assert complaints(fabric_page) == ""
    assert list(statuses(said)) == ["0", "1", "2", "3"]
    assert {one.split()[0] for one in terms(section(said, "OPTIONS"))} == {
        *("--fabric", "-p,", "-c,", "-C,")
    }


def test_the_program_takes_its_examples_of_fabrics(fabric_page: str) -> None:
    examples = re.findall(r"^vswitch (.*)$", section(plain(fabric_page), "EXAMPLES"), re.MULTILINE)
    assert len(examples) == 5
    for example in examples:
        context = fabric_group().make_context("vswitch", shlex.split(example))
        assert isinstance(context.command, click.Group) and context.params["fabric"]
        name, *words = context.protected_args + context.args
        context.command.commands[name].make_context(name, words, context)
