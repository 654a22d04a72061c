"""What a shell is told when somebody presses the key for completion."""

import functools
import subprocess
from pathlib import Path
from typing import Dict, List

import click
import pexpect
import pytest
from command_line import PROGRAM, Refused, Vswitch
from simhost import SharedHost

from vswitch import _table
from vswitch.command import assignments

# The word that bash completes begins after a character that it takes words apart at.
CHOSEN = """
eval "$SCRIPT"
compopt() { printf '%s\\n' "$2"; }
COMP_LINE=$1 COMP_POINT=${#1}
_vswitch_completion vswitch "${COMP_LINE##*[ =:]}"
printf '%s\\n' "${COMPREPLY[@]}"
"""


def environment(host: SharedHost) -> Dict[str, str]:
    path = f"{Path(PROGRAM).parent}:{host.environment['PATH']}"
    return {**host.environment, "PATH": path}


@functools.lru_cache(None)
def script() -> str:
    """What lets bash complete."""
    return subprocess.check_output([PROGRAM, "completion", "bash"], encoding="utf-8")


def completed(host: SharedHost, *words: str) -> List[str]:
    """What bash offers for the last word, after what it is told of how to put it in."""
    done = subprocess.run(
        ["bash", "-c", CHOSEN, "bash", " ".join(("vswitch", *words))],
        env={**environment(host), "SCRIPT": script()},
        capture_output=True,
        text=True,
    )
    assert (done.returncode, done.stderr) == (0, "")
    return done.stdout.split()


@pytest.mark.parametrize(
    "words, expected",
    [
        (["sh"], ["show"]),
        (["show", ""], ["vswitch0", "lab"]),
        (["show", "l"], ["lab", "lab/web-1", "lab/web-2", "lab/left", "lab/right"]),
        (["set", "lab/w"], ["lab/web-1", "lab/web-2"]),
        (["lag", "l"], ["lab"]),
        (["unset", "lab/web-1", "te"], ["teaming"]),
        (["unset", "nope/web-1", "te"], []),
        (["uplink", "lab", ""], ["add", "remove", "up", "down"]),
        (["uplink", "lab", "down", "nic"], ["nic0", "nic1"]),
        (["mirror", "lab/web-1", "--to", "lab/web-"], ["lab/web-1", "lab/web-2"]),
        (["watch", "--kind", "l"], ["link"]),
        (["apply", ""], ["default"]),
    ],
)
def test_names(lab: SharedHost, words: List[str], expected: List[str]) -> None:
    assert completed(lab, *words) == expected


@pytest.mark.parametrize(
    "words, expected",
    [
        (["set", "lab", "m"], ["nospace", "mtu=", "mac_learning=", "multicast="]),
        (["set", "lab/web-1", "vlan=7", "forbids=promiscuous,f"], ["promiscuous,forged_transmits"]),
        (["set", "lab/left", "f"], []),
        (["set", "lab/web-1", "teaming.active=right,l"], ["right,left", "right,lag1"]),
        (["set", "lab/web-1", "uplink=nic"], ["nic0", "nic1"]),
        (["set", "nope/web-1", "te"], []),
        (["add", "lab/new", "teaming.active=nic"], ["nic0", "nic1"]),
        (["add", "new", "teaming.active="], []),
    ],
)
def test_settings(lab: SharedHost, words: List[str], expected: List[str]) -> None:
    assert completed(lab, *words) == expected


@pytest.mark.parametrize(
    "known, begun, expected",
    [
        (_table.SWITCH, "", [f"{name}=" for name in _table.SWITCH]),
        (_table.PORT, "vlan.t", ["vlan.trunk="]),
        (_table.PORT, "t", ["teaming=", "transmit_uplink="]),
        (_table.PORT, "tr", ["transmit_uplink="]),
        (_table.PORT, "tru", ["trunk="]),
        (_table.SWITCH, "multicast=", ["legacy", "snooping", "igmp", "mld"]),
        (_table.SWITCH, "disabled=", ["true", "false"]),
        (_table.SWITCH, "teaming.balance=e", ["explicit"]),
        (_table.PORT, "balance=e", ["explicit"]),
        (_table.PORT, "forbids=", ["promiscuous", "mac_changes", "forged_transmits"]),
        (_table.PORT, "forbids=mac_changes,", ["promiscuous", "forged_transmits"]),
        (_table.PORT, "private=", ["true", "false"]),
        (_table.PORT, "standby=b,", ["a"]),
        (_table.PORT, "uplink=", ["a", "b"]),
        (_table.PORT, "alias=", []),
        (_table.SWITCH, "mtu=", []),
        (_table.SWITCH, 'teaming={"balance": ', []),
    ],
)
def test_what_may_follow(
    known: Dict[str, _table.Property], begun: str, expected: List[str]
) -> None:
    offered = assignments.offered(known, begun, lambda: ["a", "b"])
    before = begun[: max(begun.rfind("="), begun.rfind(",")) + 1]
    assert [one for one in offered if one.startswith(begun)] == [before + one for one in expected]


def test_a_setting_that_there_is_not_has_no_values() -> None:
    with pytest.raises(click.UsageError, match="no setting 'nope'"):
        list(assignments.offered(_table.SWITCH, "nope=", list))


TO_THE_BEGINNING = "\x01"  # of the line


def test_bash_puts_in_what_is_offered(lab: SharedHost) -> None:
    """The key for completion is pressed after some letters of each word; then the line is run."""
    with pexpect.spawn(
        "bash --norc --noprofile -i",
        env={**environment(lab), "TERM": "dumb", "SCRIPT": script()},
        dimensions=(24, 200),
        encoding="ascii",
        timeout=300,
    ) as shell:
        # What is typed is echoed: it does not look as the prompt does.
        shell.sendline(r"""eval "$SCRIPT"; PS1='$? now: '""")
        shell.expect_exact("0 now: ")
        shell.send("vswitch set lab/web-1 forb\t")
        shell.expect_exact("vswitch set lab/web-1 forbids=")
        shell.send("p\t")
        shell.expect_exact("promiscuous ")
        shell.send("upl\t")
        shell.expect_exact("uplink=")
        shell.send("r\t")
        shell.expect_exact("right ")
        shell.sendline(f"{TO_THE_BEGINNING}echo typed: ")
        typed = "typed: vswitch set lab/web-1 forbids=promiscuous uplink=right"
        shell.expect_exact(f"\r\n{typed}\r\n0 now: ")


@pytest.mark.parametrize("shell", ["bash", "zsh", "fish"])
def test_each_shell_has_a_script(vswitch: Vswitch, shell: str) -> None:
    done = vswitch("completion", shell)
    assert (done.status, done.stderr) == (0, "")
    assert f"_VSWITCH_COMPLETE={shell}_complete" in done.stdout


def test_a_shell_that_there_is_none_for(refused: Refused) -> None:
    assert refused("completion", "csh", status=2).startswith("vswitch: Invalid value for ")
