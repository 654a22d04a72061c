"""Whether a figure of frames that misses what it is to be is noticed."""

from typing import List

import pytest

import come_back
import frames


@pytest.mark.parametrize(
    ("target", "is_met", "missed"),
    [("throughput", 0.95, 0.9), ("round trip", 1.1, 1.2), ("resync", 0.2, 0.22)],
)
def test_a_figure_is_judged(target: str, is_met: float, missed: float) -> None:
    good, bad = (frames.Row("figure", value, "", target) for value in (is_met, missed))
    assert good.is_met() and str(good).endswith(": met")
    assert not bad.is_met() and str(bad).endswith(": missed")


def test_a_figure_without_a_target_is_not() -> None:
    row = frames.Row("figure", 7.0, "ms")
    assert row.is_met() and str(row).split() == ["figure", "7.000", "ms"]


@pytest.mark.parametrize("counts", [[0, 2, 1], [0, 2, 3], [1, 2, 2]])
def test_a_copy_too_few_or_too_many_is_noticed(counts: List[int]) -> None:
    frames.check_copies([0, 2, 2], 2)
    with pytest.raises(AssertionError):
        frames.check_copies(counts, 2)


def test_the_longest_time_without_a_frame_is_found() -> None:
    assert come_back.longest([1.0, 1.5, 4.0, 4.25]) == 2.5
