"""Tunnels of IPv6, what cannot be beside tunnels, and what the underlay leaves behind."""

import json
import signal
from pathlib import Path
from typing import Any, Dict, List

import pytest
from frame_lab import Lab, comes_sooner_or_later, comes_true
from rack import Rack, hello
from simhost._frames import Cabling

ADDRESSES = ["2001:db8::1", "2001:db8::2"]


def tunnels(encapsulation: str = "vxlan", *peers: str) -> Dict[str, Any]:
    return {"encapsulation": encapsulation, "key": 4711, "peers": list(peers)}


def switch(**settings: Any) -> Dict[str, Any]:
    return {"switches": [{"alias": "lab", **settings}]}


def test_tunnels_go_over_ipv6(tmp_path: Path) -> None:
    documents = [
        {
            "underlay": {"device": "eth1", "address": f"{address}/64"},
            **switch(mtu=1400, ports=[{"id": "a"}]),
        }
        for address in ADDRESSES
    ]
    with Rack(tmp_path, documents) as rack:
        first, second = rack.hosts
        Cabling(first.host).connect(first.host, "eth1", second.host, "eth1")
        for host in rack.hosts:
            for devices in "all", "default":
                host.host.run("sysctl", "-w", f"net.ipv6.conf.{devices}.disable_ipv6=0")
        rack.start()
        one, other = (rack.client(host, "a") for host in range(2))
        for encapsulation in "vxlan", "geneve":
            for host, peer in zip(rack.hosts, reversed(ADDRESSES)):
                host.apply(switch(fabric=tunnels(encapsulation, peer)))
            assert comes_sooner_or_later(one, other, hello(one))
            assert comes_sooner_or_later(other, one, hello(other, one.mac))
            assert [host.plane()["said"] for host in rack.hosts] == ["", ""]
        # With two tags, a packet has 20 bytes less than one of IPv4 has.
        first.apply(switch(mtu=1422))
        assert "bears an MTU of 1422, and the switch would have 1423" in refusal(
            first, switch(mtu=1423)
        )


@pytest.fixture
def beside(idle: Lab) -> Lab:
    """A switch with tunnels, and an uplink that has no device."""
    idle.start()
    idle.client("lab", "a")
    idle.apply(switch(fabric=tunnels("vxlan", "192.0.2.2")))
    return idle


def refusal(lab: Lab, document: Dict[str, Any]) -> str:
    before = lab.plane()
    refused = lab.try_ctl("apply", "-", given=json.dumps(document))
    assert refused.returncode != 0
    assert lab.plane() == before
    return refused.stdout


def sessions(*, port: str = "a", **said: Any) -> Dict[str, Any]:
    return switch(ports=[{"id": port, "mirror_sessions": [{"sid": "s", **said}]}])


def test_beside_tunnels_no_uplink_has_a_device(beside: Lab) -> None:
    beside.wire("u0", beside.frames.new_namespace(), "far")
    said = refusal(beside, {"uplinks": [{"name": "nic0", "device": "u0"}]})
    assert "beside tunnels, a switch has no uplink with a device (QEX_NOT_SUPPORTED)" in said
    to: List[Dict[str, Any]] = [{"uplink": "fabric0"}]
    for session in (
        sessions(type="remote_source", to=to, encapsulation={"vlan": 50}),
        sessions(type="port", to=[{"port": "b"}], received_by=to),
    ):
        said = refusal(beside, session)
        assert "names an uplink that is tunnels" in said


def flags(lab: Lab, device: str) -> List[str]:
    (said,) = json.loads(lab.host.run("ip", "-json", "link", "show", device))
    return list(said["flags"])


def test_a_device_replies_for_itself_when_it_is_no_underlay_any_more(idle: Lab) -> None:
    for device in "under", "other":
        idle.wire(device, idle.frames.new_namespace(), "far")
    idle.start()

    def silent() -> List[str]:
        return [device for device in ("under", "other") if "NOARP" in flags(idle, device)]

    for device, address in (("under", "192.0.2.1/24"), ("other", "192.0.2.1/24")):
        idle.apply({"underlay": {"device": device, "address": address}})
        assert comes_true(lambda: silent() == [device])
    idle.apply({"underlay": {}})
    assert comes_true(lambda: silent() == [])
    # So it does without a daemon, however that ended.
    idle.apply({"underlay": {"device": "under", "address": "192.0.2.1/24"}})
    assert comes_true(lambda: silent() == ["under"])
    idle.stop()
    assert silent() == []
    idle.start()
    assert silent() == ["under"]
    idle.stop(signal.SIGKILL)
    assert silent() == ["under"]
    idle.apply({"underlay": {}})
    idle.start()
    assert silent() == []


def test_a_device_that_never_replied_for_itself_does_not_afterwards(idle: Lab) -> None:
    for device in "under", "other":
        idle.wire(device, idle.frames.new_namespace(), "far")
    idle.host.run("ip", "link", "set", "under", "arp", "off")
    idle.start()
    for device in "under", "other":
        idle.apply({"underlay": {"device": device, "address": "192.0.2.1/24"}})
        assert comes_true(idle.is_in_force)
        assert "NOARP" in flags(idle, device)
    idle.apply({"underlay": {}})
    assert comes_true(idle.is_in_force)
    assert "NOARP" not in flags(idle, "other")
    assert "NOARP" in flags(idle, "under")
