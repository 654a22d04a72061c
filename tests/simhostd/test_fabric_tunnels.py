"""The tunnels of a switch that hosts share: what one of them says of these holds for all."""

import itertools
from pathlib import Path
from typing import Any, Dict, Iterator, List, Sequence

import pytest

from fabric_lab import FabricLab, Host, are_reported, started
from frame_lab import comes_sooner_or_later, comes_true
from rack import Routers, call, check_all_get_one, hello
from simhost import Client

LAB: Dict[str, Any] = {
    "switches": [{"alias": "lab", "mtu": 1400, "ports": [{"id": "a"}, {"id": "b"}, {"id": "c"}]}]
}


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path) as lab:
        yield lab


def hosts_with(lab: FabricLab, *names: str) -> List[Host]:
    """With a network each. The first shares its switch, the second joins it, and of the others no
    daemon is started."""
    for number, name in enumerate(names, 1):
        lab.host(name, {"underlay": Routers.underlay(number), **(LAB if number == 1 else {})})
    Routers(lab, first=1)
    one, other, *_ = lab.hosts
    started(one).ctl("share", "lab")
    started(other).ctl("join", "lab")
    return lab.hosts


def tunnels(hosts: int, key: int = 4711) -> Dict[str, Any]:
    peers = [Routers.address(number) for number in range(1, hosts + 1)]
    return {"encapsulation": "vxlan", "key": key, "peers": peers}


def set_tunnels(host: Host, said: Dict[str, Any]) -> None:
    host.apply({"switches": [{"alias": "lab", "fabric": said}]})


def client(host: Host, port: str) -> Client:
    made = host.client("lab", port)
    call(made, f"10.9.0.{ord(port)}")
    return made


def reach(clients: Sequence[Client]) -> None:
    """Each comes to reach each other one."""
    for one, other in itertools.permutations(clients, 2):
        assert comes_sooner_or_later(one, other, hello(one))


def has_tunnels(host: Host, said: Dict[str, Any]) -> bool:
    return bool(host.setting("lab", "fabric") == {**said, "uplink": "fabric0"})


def errors(lab: FabricLab) -> Dict[str, Dict[str, str]]:
    return {row["name"]: dict(row["errors"][1]) for row in lab.databases.rows("Host")}


def test_hosts_share_a_switch_by_its_tunnels(lab: FabricLab) -> None:
    one, other, third = hosts_with(lab, "one", "two", "three")
    clients = [client(one, "a"), client(other, "b")]
    set_tunnels(one, tunnels(hosts=2))
    reach(clients)
    # It is no tunnel to itself that a host has.
    told = other.ctl("trace", "lab/b", "dst=ff:ff:ff:ff:ff:ff", f"src={clients[1].mac}")
    assert "goes out at uplink fabric0 to 192.0.3.1, without a tag" in told
    assert "to 192.0.4.1" not in told

    # The other's change is in force here before it returns, and there soon.
    set_tunnels(other, tunnels(hosts=2, key=4712))
    assert comes_true(lambda: has_tunnels(one, tunnels(hosts=2, key=4712)))
    reach(clients)

    set_tunnels(one, tunnels(hosts=3, key=4712))
    started(third).ctl("join", "lab")
    clients.append(client(third, "c"))
    check_all_get_one(clients)

    # What an operator writes all follow, in whatever order the peers stand.
    said = tunnels(hosts=3, key=4713)
    lab.databases.set("Switch", "fabric", {**said, "peers": said["peers"][::-1]}, alias="lab")
    assert comes_true(lambda: all(has_tunnels(host, said) for host in lab.hosts))
    reach(clients)
    assert comes_true(lambda: errors(lab) == {"one": {}, "two": {}, "three": {}}), errors(lab)

    # They are none of a host's own, and without its daemon it changes nothing of them.
    other.ctl("reset")
    other.apply({"underlay": Routers.underlay(2)})
    assert has_tunnels(other, said)
    reach(clients)
    other.stop()
    asks = "this is shared with other hosts, and no simhostd --fabric is there"
    assert asks in other.refusal({"switches": [{"alias": "lab", "fabric": {}}]})
    set_tunnels(one, {})
    assert "fabric" not in lab.databases.settings("Switch", alias="lab")
    started(other)
    assert comes_true(lambda: other.setting("lab", "fabric") is None)


def test_what_a_host_cannot_bear_of_tunnels_is_told(lab: FabricLab) -> None:
    one, other = hosts_with(lab, "one", "two")
    other.apply({"underlay": {}})
    here, beside = client(other, "b"), client(other, "c")
    set_tunnels(one, tunnels(hosts=2))
    why = "there is no route to the peer 192.0.3.1 of the switch 'lab'"

    def tells(words: str) -> bool:
        return comes_true(lambda: words in errors(lab)["two"].get("frames", ""))

    assert tells(why), errors(lab)
    # The rest is in force all the same.
    assert comes_true(lambda: are_reported(lab))
    one.set_port("lab", "b", vlan=7)
    one.set_port("lab", "c", vlan=7)
    assert comes_true(lambda: are_reported(lab))
    assert comes_sooner_or_later(here, beside, hello(here))

    other.apply({"underlay": Routers.underlay(2)})
    assert comes_true(lambda: errors(lab)["two"] == {}), errors(lab)
    other.host.run("ip", "link", "set", "eth1", "mtu", "1499")
    one.apply({"switches": [{"alias": "lab", "mtu": 1442}]})
    assert tells("bears an MTU of 1441, and the switch has 1442"), errors(lab)

    # Of two keys that are one the switch that has it keeps it, here by a host of its own.
    one.apply({"switches": [{"alias": "lab", "mtu": 1400}]})
    assert comes_true(lambda: errors(lab)["two"] == {}), errors(lab)
    own = {"encapsulation": "vxlan", "key": 4712, "peers": []}
    other.apply({"switches": [{"alias": "own", "fabric": own}]})
    set_tunnels(one, tunnels(hosts=2, key=4712))
    why = "fabric: the host refuses it: the switch 'own' has the key 4712 (QEX_EXISTS)"
    assert comes_true(lambda: errors(lab)["two"] == {"lab": why}), errors(lab)
    assert "QEX_BUSY" in other.refusal(
        {"switches": [{"alias": "lab", "fabric": tunnels(hosts=2, key=4713)}]}
    )
    other.apply({"switches": [{"alias": "own", "fabric": {}}]})
    set_tunnels(one, tunnels(hosts=2, key=4714))
    assert comes_true(lambda: errors(lab)["two"] == {}), errors(lab)
    assert has_tunnels(other, tunnels(hosts=2, key=4714))
