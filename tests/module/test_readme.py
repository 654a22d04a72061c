"""The README's sessions are run as they stand, each on a host of its own."""

import doctest
import os
import re
import subprocess
import sys
from pathlib import Path
from typing import List

import pytest
from console import Shown, sessions
from simhost import SharedHost

ROOT = Path(__file__).resolve().parents[2]
README = (ROOT / "README.md").read_text(encoding="utf-8")
SIMHOSTCTL = str(Path(os.environ["BUILD_DIR"], "simhost", "simhostctl"))


def test_the_tour_prints_what_it_says() -> None:
    program = (
        "import doctest, sys; result = doctest.testfile(sys.argv[1], module_relative=False, "
        "optionflags=doctest.ELLIPSIS | doctest.REPORT_NDIFF); "
        "print(result.attempted, 'attempted'); sys.exit(result.failed)"
    )
    environment = {name: os.environ[name] for name in os.environ if not name.startswith("SIMHOST_")}
    done = subprocess.run(
        [sys.executable, "-c", program, str(ROOT / "README.md")],
        env=environment,
        capture_output=True,
        text=True,
    )
    assert done.returncode == 0, done.stdout + done.stderr
    assert done.stdout == f"{examples()} attempted\n"


def examples() -> int:
    found = doctest.DocTestParser().get_examples(README)
    assert found
    return len(found)


def differences(host: SharedHost, session: List[Shown]) -> str:
    """Where the commands of a session print something else; ... stands for anything."""
    found = []
    for shown in session:
        arguments = shown.arguments(SIMHOSTCTL)
        assert arguments is not None
        done = host.run(arguments)
        printed = done.stdout + done.stderr
        if not doctest.OutputChecker().check_output(shown.output, printed, doctest.ELLIPSIS):
            found.append(f"$ {shown.command}\n{printed}instead of\n{shown.output}")
    return "\n".join(found)


def runnable(document: str) -> List[List[Shown]]:
    return [
        session
        for session in sessions(document)
        if all(shown.arguments(SIMHOSTCTL) is not None for shown in session)
    ]


def first_command(session: List[Shown]) -> str:
    return session[0].command


@pytest.mark.parametrize("session", runnable(README), ids=first_command)
def test_a_session_prints_what_it_says(shared_host: SharedHost, session: List[Shown]) -> None:
    assert not differences(shared_host, session)


def test_each_example_that_is_shown_is_run() -> None:
    shown = {one.command for session in sessions(README) for one in session}
    run = {one.command for session in runnable(README) for one in session}
    assert {command for command in shown if "examples/" in command} == run


def test_each_test_that_is_shown_is_one_of_the_guides() -> None:
    guide = (ROOT / "docs" / "guides" / "test_uplinks.py").read_text(encoding="utf-8")
    shown = re.findall(r"^```python\n(.*?)^```$", README, re.DOTALL | re.MULTILINE)
    assert shown
    for test in shown:
        assert test in guide


SAMPLE = """
```console
$ ./examples/inventory.py vswitch0
SWITCH      MTU   PORTS       UPLINKS
vswitch0    ...nic5 up
$ simhostctl link nic5 down
$ ./examples/inventory.py vswitch0
SWITCH      MTU   PORTS       UPLINKS
vswitch0    1500  3 of 128    nic4 up, nic5 up
```

```console
$ ./dev build
```
"""


def test_a_wrong_session_would_be_found(shared_host: SharedHost) -> None:
    (session,) = runnable(SAMPLE)
    assert len(session) == 3
    row = "vswitch0    1500  3 of 128    nic4 up, nic5 "
    head = "SWITCH      MTU   PORTS       UPLINKS\n"
    assert differences(shared_host, session) == (
        f"$ ./examples/inventory.py vswitch0\n{head}{row}down\ninstead of\n{head}{row}up\n"
    )
