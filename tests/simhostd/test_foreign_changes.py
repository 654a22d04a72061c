"""What somebody else changes in the same Open vSwitch is put right where it is the host's."""

from typing import List

import pytest

from frame_lab import Lab, comes_true


class Meddler:
    """Somebody who has the tools of Open vSwitch."""

    def __init__(self, lab: Lab) -> None:
        self._lab = lab
        (self.socket,) = lab.run_folder().glob("vs*.mgmt")
        self.bridge = self.socket.stem

    def ofctl(self, command: str, *words: str) -> str:
        target = f"unix:{self.socket}"
        return self._lab.host.run("ovs-ofctl", "-OOpenFlow15", command, target, *words)

    def flows(self) -> List[str]:
        """Those that the host made, without what they counted."""
        lines = self.ofctl("dump-flows", "--no-stats").splitlines()
        return sorted(
            line for line in lines if not any(f"table={n}," in line for n in range(31, 35))
        )

    def groups(self) -> List[str]:
        return sorted(self.ofctl("dump-groups").splitlines()[1:])


@pytest.fixture
def busy(lab: Lab) -> Lab:
    """Two clients at ports and one beyond two uplinks."""
    one, other, far = lab.client("lab", "a"), lab.client("lab", "b"), lab.network("nic0", "nic1")
    assert one.reaches(other, attempts=5)
    assert one.comes_to_reach(far.client())
    # What the host does by itself is nobody else's.
    assert "somebody else" not in lab.log()
    return lab


@pytest.fixture
def meddler(busy: Lab) -> Meddler:
    return Meddler(busy)


@pytest.mark.parametrize(
    "command, words",
    [
        ("del-flows", []),
        ("del-flows", ["table=13"]),
        ("add-flow", ["table=0,priority=60000,actions=drop"]),
        ("mod-flows", ["table=13,actions=drop"]),
        ("del-groups", []),
    ],
)
def test_flows_and_groups_are_put_right(
    busy: Lab, meddler: Meddler, command: str, words: List[str]
) -> None:
    before = meddler.flows(), meddler.groups()
    assert all(before)
    meddler.ofctl(command, *words)
    assert comes_true(lambda: (meddler.flows(), meddler.groups()) == before)
    assert f"somebody else changed flows or groups of the bridge {meddler.bridge}" in busy.log()


def test_a_group_is_put_right(meddler: Meddler) -> None:
    before = meddler.groups()
    number = before[0].split("group_id=")[1].split(",")[0]
    meddler.ofctl("mod-group", f"group_id={number},type=all,bucket=actions=drop")
    assert comes_true(lambda: meddler.groups() == before)
