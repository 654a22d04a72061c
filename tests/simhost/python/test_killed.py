"""A process that is killed at any moment leaves a state with all that it completed, and no half."""

import random
from pathlib import Path
from typing import Any

import pytest

import kill_loop

ROUNDS = 6


def test_whatever_was_completed_is_there(tmp_path: Path) -> None:
    seed = random.randrange(1 << 32)
    print(f"kill_loop.py --seed {seed}")
    hosts = kill_loop.Hosts(tmp_path, seed)
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
        kill_loop.Hosts(tmp_path, 1).round()


def test_the_changes_are_of_every_kind() -> None:
    made = kill_loop.replayed("2", 2999, 3000)["succeeded"]
    kinds = made.keys() - {kind for kind, count in made.items() if not count}
    assert len(made) == 39, "those of churn.py, and the two that stop the clock"
    assert kinds == made.keys()
