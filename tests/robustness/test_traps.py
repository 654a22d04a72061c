"""Calls that trap again and again, every one and in every way."""

import processes
import pytest

TRAPS = 20_000


# 145 calls arm the trap, one of them in two forms.
@pytest.mark.parametrize(
    "way, traps, least", [("in-turns", TRAPS, TRAPS * 3 // 4), ("in-a-row", 1000, 146 * 900)]
)
def test_any_number_of_traps_is_survived_in_the_same_memory(
    way: str, traps: int, least: int
) -> None:
    done = processes.run(str(processes.HERE / "traps.py"), way, str(traps))
    assert done.returncode == 0, done.stderr
    *wrong, count = done.stdout.splitlines()
    assert wrong == []
    assert int(count) >= least


@pytest.mark.parametrize("way, traps", [("in-turns", TRAPS // 2), ("in-a-row", 1000)])
def test_what_is_planted_is_found(way: str, traps: int) -> None:
    done = processes.run(str(processes.HERE / "traps.py"), way, str(traps), PLANTED="yes")
    assert done.returncode == 0, done.stderr
    assert "bytes of the heap" in done.stdout
