"""A process that is killed at any moment leaves a state with all that it completed, and no half."""

from pathlib import Path
from typing import Any

import pytest

import kill_loop

ROUNDS = 6
SEED = 20


def test_whatever_was_completed_is_there(tmp_path: Path) -> None:
    hosts = kill_loop.Hosts(tmp_path, SEED)
    for _ in range(ROUNDS):
        hosts.round()
    assert hosts.changes > ROUNDS


def test_a_change_that_is_lost_would_be_noticed(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    killed = kill_loop.killed_run

    def tells_more_than_was_made(*given: Any) -> int:
        return killed(*given) + 40

    monkeypatch.setattr(kill_loop, "killed_run", tells_more_than_was_made)
    with pytest.raises(AssertionError, match="neither before nor after"):
        kill_loop.Hosts(tmp_path, SEED).round()


def test_a_new_host_is_the_same_in_every_run() -> None:
    new, again = (kill_loop.replayed("2", 0, 1)["digests"][0] for _ in range(2))
    assert new == again


def test_the_changes_are_of_every_kind() -> None:
    made = kill_loop.replayed("2", 2999, 3000)["succeeded"]
    kinds = made.keys() - {kind for kind, count in made.items() if not count}
    assert len(made) == 38, "those of churn.py"
    assert kinds == made.keys()
