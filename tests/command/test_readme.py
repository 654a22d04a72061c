"""The README's sessions of the shell, one after the other on one host, as a reader types them."""

import doctest
import os
import shlex
from pathlib import Path
from typing import List

from command_line import PROGRAM
from console import Shown, sessions
from simhost import SharedHost

README = (Path(__file__).resolve().parents[2] / "README.md").read_text(encoding="utf-8")
SIMHOSTCTL = str(Path(os.environ["BUILD_DIR"], "simhost", "simhostctl"))


def arguments(shown: Shown) -> List[str]:
    program, *words = shlex.split(shown.command)
    found = [PROGRAM, *words] if program == "vswitch" else shown.arguments(SIMHOSTCTL)
    assert found is not None, f"nothing runs $ {shown.command}"
    return found


def test_a_reader_sees_what_it_says(shared_host: SharedHost) -> None:
    found = [shown for session in sessions(README) for shown in session]
    assert len([shown for shown in found if shown.command.startswith("vswitch ")]) >= 4
    for shown in found:
        done = shared_host.run(arguments(shown))
        # It is said to be simulated before anything else.
        printed = done.stderr + done.stdout
        same = doctest.OutputChecker().check_output(shown.output, printed, doctest.ELLIPSIS)
        assert same, f"$ {shown.command}\n{printed}"
