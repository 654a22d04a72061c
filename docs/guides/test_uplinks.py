"""The tests of the guide "Writing tests against the simulated host"."""

import sys
from typing import List

import libvswitch as vs
import pytest
import vswitch
from simhost import Host, SharedHost


def stranded(host: vswitch.Host) -> List[str]:
    """What is tested here: the ports that no uplink carries."""
    return [port.path for port in host.ports() if port.carrier is None]


def test_a_port_without_links_is_stranded(host: Host) -> None:
    host.objects.add_switch("lab").add_port("desk-1")
    assert stranded(host.objects) == ["lab/desk-1"]


# What comes from outside: cables, frames, time, faults.


def test_the_other_uplink_steps_in(host: Host) -> None:
    port = host.objects.switches["vswitch0"].ports["web-1"]
    assert str(port.carrier) == "nic4"
    host.link("nic4").down()
    assert str(port.carrier) == "nic5"


def test_addresses_age(host: Host) -> None:
    host.clock.stop()
    host.learn("vswitch0", "02:00:00:00:0a:01", "web-1", vlan=10)
    (entry,) = host.objects.find_mac("02:00:00:00:0a:01")
    assert (entry.port, entry.vlan, entry.age) == ("web-1", 10, 0)
    host.clock.step(300)
    assert host.objects.find_mac("02:00:00:00:0a:01") == ()


def test_a_busy_host(host: Host) -> None:
    switch = host.objects.switches["vswitch0"]
    host.fault("VSDVS_SetMTU", status="QEX_BUSY")
    with pytest.raises(vswitch.Busy):
        switch.mtu = 9000
    switch.mtu = 9000
    assert switch.mtu == 9000


# A host of your own making.


@pytest.mark.scenario(
    {"uplinks": [{"name": "a"}], "switches": [{"alias": "lab", "uplinks": ["a"]}]}
)
def test_one_uplink(host: Host) -> None:
    assert list(host.objects.switches) == ["lab"]
    assert list(host.objects.switches["lab"].uplinks) == ["a"]


# A tool that is a command.


def test_a_command(shared_host: SharedHost) -> None:
    tool = "import vswitch; vswitch.Host().switches['vswitch0'].mtu = 9000"
    assert shared_host.run([sys.executable, "-c", tool]).returncode == 0
    assert shared_host.describe()["switches"][0]["mtu"] == 9000


# Underneath: a tool over the classes.


def uplinks_of(switch: str) -> List[str]:
    """What is tested here: the uplinks of a switch; none if there is no such switch."""
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (status, uplinks):
        return list(uplinks) if status == vs.QEX_OK else []


def test_uplinks_by_their_status(host: Host) -> None:
    assert uplinks_of("vswitch0") == ["nic4", "nic5"]
    assert uplinks_of("nowhere") == []
