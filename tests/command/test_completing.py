"""What a shell is told when somebody presses the key for completion."""

import subprocess
from pathlib import Path
from typing import List

import pytest
from command_line import PROGRAM, Refused, Vswitch
from simhost import SharedHost

CHOSEN = """
eval "$(vswitch completion bash)"
COMP_WORDS=("$@")
COMP_CWORD=$(($# - 1))
_vswitch_completion vswitch
printf '%s\\n' "${COMPREPLY[@]}"
"""


def completed(host: SharedHost, *words: str) -> List[str]:
    """What bash offers for the last word."""
    path = f"{Path(PROGRAM).parent}:{host.environment['PATH']}"
    done = subprocess.run(
        ["bash", "-c", CHOSEN, "bash", "vswitch", *words],
        env={**host.environment, "PATH": path},
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
    ],
)
def test_names(lab: SharedHost, words: List[str], expected: List[str]) -> None:
    assert completed(lab, *words) == expected


@pytest.mark.parametrize("shell", ["bash", "zsh", "fish"])
def test_each_shell_has_a_script(vswitch: Vswitch, shell: str) -> None:
    done = vswitch("completion", shell)
    assert (done.status, done.stderr) == (0, "")
    assert f"_VSWITCH_COMPLETE={shell}_complete" in done.stdout


def test_a_shell_that_there_is_none_for(refused: Refused) -> None:
    assert refused("completion", "csh", status=2).startswith("vswitch: Invalid value for ")
