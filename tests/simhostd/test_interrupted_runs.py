"""What is left of a run of tests that is interrupted while frames go: nothing."""

import json
import os
import subprocess
import sys
from pathlib import Path
from typing import Dict, Iterator, List

import pytest

from simhost._namespaces import Namespace, own_user_needed

PROGRAM = Path(__file__).with_name("left_by_a_run.py")


@pytest.fixture
def namespace() -> Iterator[Namespace]:
    made = Namespace(own_user=own_user_needed())
    yield made
    made.close()


def left_by_a_run(namespace: Namespace, *words: str) -> Dict[str, List[str]]:
    # The run within is one by itself.
    within = {name: value for name, value in os.environ.items() if not name.startswith("PYTEST_")}
    run = namespace.start(
        *("unshare", "--mount", sys.executable, str(PROGRAM), *words),
        **{"env": within, "stdout": subprocess.PIPE, "stderr": subprocess.PIPE},
    )
    found, said = run.communicate()
    assert run.returncode == 0, said
    print(said)
    left: Dict[str, List[str]] = json.loads(found)
    return left


def test_ended_with_its_runner_a_run_leaves_nothing(namespace: Namespace) -> None:
    left = left_by_a_run(namespace, "runner")
    assert left == {"processes": [], "devices": [], "mounts": [], "sockets": []}


def test_interrupted_from_a_terminal_a_run_leaves_what_is_planted_alone(
    namespace: Namespace,
) -> None:
    assert left_by_a_run(namespace, "terminal", "--plant") == {
        "processes": ["sleep infinity"],
        "devices": ["planted0", "planted1"],
        "mounts": ["/run/planted"],
        "sockets": ["/run/planted/planted.sock"],
    }
