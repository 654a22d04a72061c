"""The tunnels of switches that hosts share, in the hands of an operator."""

from pathlib import Path
from typing import Any, Dict

import pytest

from fabric_lab import Databases, FabricLab, started
from frame_lab import comes_true
from libvswitch.errors import Busy
from operating import Operator, of_lab
from vswitch.fabric import Fabric
from vswitch.words import DocumentError

TUNNELS: Dict[str, Any] = {
    "encapsulation": "vxlan",
    "key": 4711,
    "peers": ["192.0.2.1", "192.0.2.2", "2001:db8::2"],
}


def test_a_document_says_them(databases: Databases, fabric: Fabric) -> None:
    def tunnels() -> Any:
        return databases.settings("Switch", id="lab-1").get("fabric")

    said = {**TUNNELS, "peers": ["2001:DB8::2", "192.0.2.2", "192.0.2.1"]}
    plan = fabric.plan(of_lab(fabric=said))
    (change,) = plan.changes
    assert (change.path, change.before, change.after) == ("lab/fabric", None, TUNNELS)
    plan.apply()
    assert tunnels() == TUNNELS
    assert fabric.view().switches["lab"].state()["fabric"] == TUNNELS
    # What stays as it is, in whatever spelling, is no change.
    databases.set("Switch", "fabric", said, id="lab-1")
    for document in of_lab(fabric=TUNNELS), of_lab(fabric=said), of_lab(mtu="absent"):
        assert fabric.plan(document).changes == ()
    late = fabric.plan(of_lab(fabric={**TUNNELS, "key": 4712}))
    databases.set("Switch", "fabric", {**TUNNELS, "key": 4713}, id="lab-1")
    with pytest.raises(Busy):
        late.apply()
    assert tunnels()["key"] == 4713
    # What no program wrote is replaced.
    databases.set("Switch", "fabric", 7, id="lab-1")
    (change,) = fabric.plan(of_lab(fabric=TUNNELS)).changes
    assert (change.before, change.after) == (7, TUNNELS)
    for none in {}, "absent":
        fabric.plan(of_lab(fabric=TUNNELS)).apply()
        fabric.plan(of_lab(fabric=none)).apply()
        assert tunnels() is None
    new = {"alias": "new", "hosts": ["one"], "fabric": TUNNELS}
    fabric.plan({"switches": [new]}).apply()
    assert fabric.view().switches["new"].settings["fabric"] == TUNNELS


def test_what_is_wrong_of_them_is_told(fabric: Fabric) -> None:
    at = "switches[0].fabric"
    for given, said in (
        (7, f"{at}: 7 is not an object"),
        (
            {**TUNNELS, "uplink": "mesh"},
            f"{at}.uplink: each host has its own, and a fabric has none",
        ),
        (
            {**TUNNELS, "port": 1},
            f"{at}.port: unknown key; there are encapsulation, key, peers",
        ),
        ({"encapsulation": "vxlan", "peers": []}, f"{at}: 'key' is missing"),
        (
            {**TUNNELS, "encapsulation": "gre"},
            f"{at}.encapsulation: 'gre' is not one of vxlan, geneve",
        ),
        ({**TUNNELS, "key": 1 << 24}, f"{at}.key: 16777216 is above 16777215"),
        ({**TUNNELS, "key": -1}, f"{at}.key: -1 is below 0"),
        (
            {**TUNNELS, "peers": ["there"]},
            f"{at}.peers[0]: 'there' is not an IPv4 or IPv6 address",
        ),
        (
            {**TUNNELS, "peers": ["192.0.2.1", "239.0.0.1"]},
            f"{at}.peers[1]: 239.0.0.1 is the address of no host",
        ),
        ({**TUNNELS, "peers": ["::1"]}, f"{at}.peers[0]: ::1 is the address of no host"),
        (
            {**TUNNELS, "peers": ["2001:db8::1", "2001:DB8::1"]},
            f"{at}.peers[1]: the peer 2001:db8::1 is there twice",
        ),
        (
            {**TUNNELS, "peers": [f"192.0.2.{one}" for one in range(1, 66)]},
            f"{at}.peers: there is room for 64 at most",
        ),
    ):
        with pytest.raises(DocumentError) as raised:
            fabric.plan(of_lab(fabric=given))
        assert str(raised.value) == said
    with pytest.raises(DocumentError) as raised:
        fabric.plan({"underlay": {}})
    assert str(raised.value) == "underlay: each host has its own, and a fabric has none"


def test_hosts_follow_and_the_command_tells(tmp_path: Path) -> None:
    with FabricLab(tmp_path) as lab:
        one = started(lab.host("one", of_lab(ports=[{"id": "a"}])))
        one.ctl("share", "lab")
        operator = Operator(lab)
        # Nobody is there but this host, so that nothing stands in their way.
        said: Dict[str, Any] = {**TUNNELS, "peers": []}
        told = operator.told("apply", "-", "--wait", "20", given=of_lab(fabric=said))
        assert "lab/fabric" in told
        assert one.setting("lab", "fabric") == {**said, "uplink": "fabric0"}
        assert operator.json("show", "lab")["fabric"] == said
        assert "fabric: encapsulation=vxlan key=4711 peers=none" in operator.told("show", "lab")
        with Fabric(lab.databases.local_addresses) as fabric:
            watched = fabric.watch(20)
            one.apply(of_lab(fabric={**said, "key": 4712}))
            event = next(event for event in watched if event.path == "lab/fabric")
        assert (event.kind, event.before, event.after) == ("setting", said, {**said, "key": 4712})
        document = operator.json("backup")
        operator.told("apply", "-", given=of_lab(fabric={}))
        assert comes_true(lambda: one.setting("lab", "fabric") is None)
        operator.told("apply", "-", "--wait", "20", given=document)
        assert one.setting("lab", "fabric") == {**said, "key": 4712, "uplink": "fabric0"}
