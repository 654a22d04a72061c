"""The README's session of the command prints what it says there."""

import doctest
import shlex
from pathlib import Path

from command_line import PROGRAM
from console import sessions
from simhost import SharedHost

README = Path(__file__).resolve().parents[2] / "README.md"


def test_the_session_prints_what_it_says(shared_host: SharedHost) -> None:
    found = [
        shown
        for session in sessions(README.read_text(encoding="utf-8"))
        for shown in session
        if shown.command.startswith("vswitch ")
    ]
    assert len(found) >= 4
    for shown in found:
        done = shared_host.run([PROGRAM, *shlex.split(shown.command)[1:]])
        # It is said to be simulated before anything else.
        printed = done.stderr + done.stdout
        same = doctest.OutputChecker().check_output(shown.output, printed, doctest.ELLIPSIS)
        assert same, f"$ {shown.command}\n{printed}"
