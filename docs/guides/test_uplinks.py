"""The tests of the guide "Writing tests against the simulated host"."""

import sys
from typing import List

import libvswitch as vs
import pytest
from simhost import Host, SharedHost


def uplinks_of(switch: str) -> List[str]:
    """What is tested here: the uplinks of a switch; none if there is no such switch."""
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (status, uplinks):
        return list(uplinks) if status == vs.QEX_OK else []


def test_uplinks(host: Host) -> None:
    assert uplinks_of("vswitch0") == ["nic4", "nic5"]
    assert uplinks_of("nowhere") == []


# What comes from outside: cables, frames, time, faults.


def test_the_other_uplink_steps_in(host: Host) -> None:
    status, port = vs.VSDVS_DvPortIDToPortID("vswitch0", "web-1")
    name = vs.qex_Name()
    host.link("nic4").down()
    assert vs.VSQEX_PortGetTeamUplinkHint(port, name) == vs.QEX_OK
    assert name.string == "nic5"


def test_addresses_age(host: Host) -> None:
    host.clock.stop()
    host.learn("vswitch0", "02:00:00:00:0a:01", "web-1", vlan=10)
    assert "02:00:00:00:0a:01" in learned("web-1")
    host.clock.step(300)
    assert "02:00:00:00:0a:01" not in learned("web-1")


def learned(port: str) -> List[str]:
    kind = vs.VS_MAC_ADDR_TYPE_LEARNED
    with vs.owned(vs.VSQEX_GetPortMACTable("vswitch0", port, kind)) as (status, table):
        return [entry.macAddress for entry in table.macEntries]


def test_a_busy_host(host: Host) -> None:
    host.fault("VSDVS_SetMTU", status="QEX_BUSY")
    assert vs.VSDVS_SetMTU("vswitch0", 9000) == vs.QEX_BUSY
    assert vs.VSDVS_SetMTU("vswitch0", 9000) == vs.QEX_OK


# The host as objects.


def test_what_carries_a_port(host: Host) -> None:
    web = host.objects.switches["vswitch0"].ports["web-1"]
    assert str(web.carrier) == "nic4"
    host.link("nic4").down()
    assert str(web.carrier) == "nic5"


# A host of your own making.


@pytest.mark.scenario(
    {"uplinks": [{"name": "a"}], "switches": [{"alias": "lab", "uplinks": ["a"]}]}
)
def test_one_uplink(host: Host) -> None:
    assert uplinks_of("lab") == ["a"]
    assert uplinks_of("vswitch0") == []


# A tool that is a command.


def test_a_command(shared_host: SharedHost) -> None:
    tool = "import libvswitch as vs; print(vs.VSDVS_SetMTU('vswitch0', 9000))"
    assert shared_host.run([sys.executable, "-c", tool]).stdout == "0\n"
    assert shared_host.describe()["switches"][0]["mtu"] == 9000
