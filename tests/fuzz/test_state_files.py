"""States that are damaged at random, and the hosts that a run of them must find."""

import sqlite3
from pathlib import Path

import pytest
import state_files

SEED = 20
STATES = 150

FAULTS = {"crash": "status -11", "hang": "status -9", "untrue": "what was read was believed"}


def test_no_damage_is_found_that_a_call_does_not_survive() -> None:
    print("seed", SEED)
    assert state_files.run(SEED, STATES) == (STATES, [])


def test_a_sound_state_is_used_without_an_error(tmp_path: Path) -> None:
    state_files.make_state(tmp_path / "host.db")
    assert state_files.survives(tmp_path / "host.db", "sound") == ""


@pytest.mark.parametrize("fault", FAULTS)
def test_a_host_that_believes_what_it_reads_is_found(
    fault: str, tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setattr(state_files, "PATIENCE", 2)
    monkeypatch.setattr(state_files, "MUTATIONS", [unknown_exception])
    tried, wrong = state_files.run(SEED, 5, planted=fault, most=1)
    assert tried == 1 and FAULTS[fault] in wrong[0]


def unknown_exception(file: Path, _: object) -> str:
    """A damage that a host must not believe."""
    database = sqlite3.connect(file)
    with database:
        database.execute("UPDATE fault SET exception = 'Nonsense'")
    database.close()
    return "an unknown exception"
