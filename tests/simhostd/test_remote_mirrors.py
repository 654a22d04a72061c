"""Mirror sessions whose copies leave the host: in a VLAN over its uplinks, and from there to the
ports of another one."""

import json
from pathlib import Path
from typing import Any, Dict, Iterator, Tuple

import pytest
from frame_lab import ONE_SWITCH, Lab, comes_true
from simhost import frame

BROADCAST = "ff:ff:ff:ff:ff:ff"
STRANGER = "02:00:00:00:88:01"
REMOTE_VLAN = 50
TO_UPLINK = {"type": "remote_source", "to": [{"uplink": "nic0"}]}
IN_VLAN = {"encapsulation": {"vlan": REMOTE_VLAN}}
THREE = {"mirroredPkts": 3, "mirrorPktCnt": 3}


def mirror_counters(lab: Lab) -> Dict[str, Any]:
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    found: Dict[str, Any] = switch.get("mirror_counters", {})
    return found


@pytest.fixture
def hosts(tmp_path: Path) -> Iterator[Tuple[Lab, Lab]]:
    """Two hosts whose first uplinks are the ends of a wire."""
    folders = [tmp_path / name for name in ("near", "far")]
    for folder in folders:
        folder.mkdir()
    with Lab(folders[0], ONE_SWITCH) as near, Lab(folders[1], ONE_SWITCH) as far:
        near.wire("u0", far.host, "u0")
        for lab in (near, far):
            lab.start()
            lab.ctl("uplink", "nic0", "--device", "u0")
        yield near, far


def test_a_source_on_one_host_and_a_destination_on_another(hosts: Tuple[Lab, Lab]) -> None:
    near, far = hosts
    watched, analyser, guest = (
        near.client("lab", "a"),
        far.client("lab", "a"),
        far.client("lab", "b"),
    )
    taken = {"sid": "in", "type": "remote_destination", "received_by": [{"vlan": REMOTE_VLAN}]}
    far.set_port("lab", "a", mirror_sessions=[{**taken, "to": [{"port": "a"}]}])
    far.set_port("lab", "b", vlan={"guest_tagging": True})
    source = {**TO_UPLINK, **IN_VLAN, "sid": "out", "sent_by": [{"port": "a"}], "keeps_vlan": True}
    near.set_port("lab", "a", vlan=7, mirror_sessions=[source])
    sent = frame(STRANGER, watched.mac, payload=b"watched" * 20)
    copy = frame(STRANGER, watched.mac, vlan=7, payload=b"watched" * 20)
    for _ in range(3):
        watched.send(sent)
        analyser.expect(copy)
    # Whoever tags frames by itself gets none of them, and each came once.
    guest.expect_none(lambda came: b"watched" in came)
    analyser.expect_none(lambda came: b"watched" in came, timeout=0)
    for lab, sid in ((near, "out"), (far, "in")):
        assert comes_true(lambda: mirror_counters(lab) == {sid: THREE}), mirror_counters(lab)
    # Nothing of them is learned beyond the uplinks.
    (switch,) = json.loads(far.ctl("show", "--json"))["switches"]
    assert REMOTE_VLAN not in [one["vlan"] for one in switch["addresses"]]
    trace = far.ctl("trace", "lab/nic0", f"src={watched.mac}", f"dst={STRANGER}", "vlan=50")
    assert "is a copy of a mirror session in VLAN 50" in trace
    assert "is copied by the mirror session in to port a" in trace
    back = near.ctl("trace", "lab/nic0", f"src={watched.mac}", f"dst={STRANGER}", "vlan=50")
    assert "no session here takes those" in back
    # A session that is disabled takes none.
    far.set_port("lab", "a", mirror_sessions=[{**taken, "to": [{"port": "a"}], "disabled": True}])
    watched.send(sent)
    analyser.expect_none(lambda came: b"watched" in came)
