"""The test of the guide "Record once, test for ever"."""

from typing import List

import pytest
import vswitch


def small_frames() -> List[str]:
    """What is tested here: the switches that carry no large frames."""
    return [one.alias for one in vswitch.Host().switches.values() if one.mtu < 9000]


@pytest.mark.recording("small_frames.jsonl", mode="once")
def test_small_frames_are_found() -> None:
    assert small_frames() == ["vswitch0"]
