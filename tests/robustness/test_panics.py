"""A host that gives up again and again, on every call and in every way."""

import processes

PANICS = 20_000


def test_any_number_of_panics_is_survived_in_the_same_memory() -> None:
    done = processes.run(str(processes.HERE / "panics.py"), str(PANICS))
    assert done.returncode == 0, done.stderr
    *wrong, count = done.stdout.splitlines()
    assert wrong == []
    assert int(count) >= PANICS * 3 // 4


def test_what_is_planted_is_found() -> None:
    done = processes.run(str(processes.HERE / "panics.py"), str(PANICS // 2), PLANTED="yes")
    assert done.returncode == 0, done.stderr
    assert "bytes of the heap" in done.stdout
