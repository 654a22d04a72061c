"""A host that gives up again and again, on every call and in every way."""

import processes
import pytest

PANICS = 20_000


# 145 calls arm the trap, one of them in two forms.
@pytest.mark.parametrize(
    "way, panics, least", [("in-turns", PANICS, PANICS * 3 // 4), ("in-a-row", 1000, 146 * 900)]
)
def test_any_number_of_panics_is_survived_in_the_same_memory(
    way: str, panics: int, least: int
) -> None:
    done = processes.run(str(processes.HERE / "panics.py"), way, str(panics))
    assert done.returncode == 0, done.stderr
    *wrong, count = done.stdout.splitlines()
    assert wrong == []
    assert int(count) >= least


@pytest.mark.parametrize("way, panics", [("in-turns", PANICS // 2), ("in-a-row", 1000)])
def test_what_is_planted_is_found(way: str, panics: int) -> None:
    done = processes.run(str(processes.HERE / "panics.py"), way, str(panics), PLANTED="yes")
    assert done.returncode == 0, done.stderr
    assert "bytes of the heap" in done.stdout
