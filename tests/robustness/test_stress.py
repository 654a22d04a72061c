"""The long run says what its parts did, and fails if one of them finds something."""

import sys
from pathlib import Path
from typing import Iterator, List

import processes
import pytest

sys.path.append(str(processes.TESTS / "fuzz"))

import stress  # noqa: E402  (it imports what lies there)


def _found(*wrong: str) -> "stress.Part":
    return stress.Part("a part", "calls", lambda seconds: (1234, list(wrong)), share=1.0)


def _ended(monkeypatch: pytest.MonkeyPatch, *parts: "stress.Part") -> int:
    def planted(seed: int, minutes: float, folder: Path, frames: bool) -> Iterator["stress.Part"]:
        return iter(parts)

    monkeypatch.setattr(stress, "parts", planted)
    monkeypatch.setattr(sys, "argv", ["stress.py", "--minutes", "0.01", "--seed", "7"])
    return stress.main()


def test_nothing_wrong_is_status_0(
    monkeypatch: pytest.MonkeyPatch, capsys: pytest.CaptureFixture[str]
) -> None:
    assert _ended(monkeypatch, _found()) == 0
    lines: List[str] = capsys.readouterr().out.splitlines()
    assert lines[0] == "seed 7, 0.01 minutes"
    assert lines[-3].split() == ["a", "part", "1,234", "calls", "-"]
    assert lines[-1] == "0 wrong, seed 7"


def test_what_is_found_is_told_and_is_status_1(
    monkeypatch: pytest.MonkeyPatch, capsys: pytest.CaptureFixture[str]
) -> None:
    assert _ended(monkeypatch, _found(), _found("it broke\nat call 5")) == 1
    output = capsys.readouterr().out
    assert "a part:\n  it broke\n  at call 5\n" in output
    assert output.endswith("\n1 wrong, seed 7\n")


def test_what_a_program_finds_is_found(monkeypatch: pytest.MonkeyPatch) -> None:
    monkeypatch.setenv("PLANTED", "yes")
    count, wrong = stress.program("traps.py", "in-turns", "10000")
    assert count > 5_000
    assert len(wrong) == 1 and "bytes of the heap" in wrong[0]


def test_a_program_that_ends_early_is_found() -> None:
    count, wrong = stress.program("traps.py", "in-turns", "no number")
    assert count == 0
    assert len(wrong) == 1 and "ValueError" in wrong[0]


def test_a_demo_that_shows_less_is_found() -> None:
    count, wrong = stress.demonstrated("3 received, 3 received, 30 received, 3 received")
    assert count == 1
    assert len(wrong) == 1 and "not shown: pings, two " in wrong[0]


@pytest.mark.parametrize("frames", [True, False])
def test_all_parts_share_the_time(frames: bool) -> None:
    parts = list(stress.parts(1, 20.0, Path(), frames))
    assert sum(part.share for part in parts) == pytest.approx(1.0)
    assert len({part.name for part in parts}) == len(parts) > 25
