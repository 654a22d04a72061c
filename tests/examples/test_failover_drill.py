"""examples/failover_drill.py: who carries what, and links that are up again or said to be down."""

from typing import Any, Callable, Dict

import pytest
from simhost import SharedHost

LONELY = {
    "uplinks": [{"name": "nic0"}],
    "switches": [{"alias": "lab", "uplinks": ["nic0"], "ports": [{"id": "a"}, {"id": "b"}]}],
}


def links(host: SharedHost) -> Dict[str, str]:
    """What each uplink is, by its cable and by the host's own switch."""
    return {
        uplink["name"]: "up" if (uplink["link"], uplink["admin"]) == ("up", "up") else "down"
        for uplink in host.describe()["uplinks"]
    }


def test_the_other_uplink_steps_in(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    before = shared_host.describe()["uplinks"]
    said = ["nic4 down: web-1 to nic5, web-2 to nic5, db-1 to nic5", "nic5 down: carried no port"]
    teaming = {"balance": "explicit", "active": ["uplink1"], "standby": ["uplink2"]}
    ports = [{"id": name, "teaming": teaming} for name in ("web-1", "web-2", "db-1")]
    shared_host.apply({"switches": [{"alias": "vswitch0", "teaming": teaming, "ports": ports}]})
    assert example("failover_drill", "vswitch0") == (0, said, "")
    assert shared_host.describe()["uplinks"] == before


@pytest.mark.scenario(LONELY)
def test_nobody_steps_in(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    said = ["nic0 down: a to none, b to none"]
    errors = "failover_drill: without an uplink for a moment: a, b\n"
    assert example("failover_drill", "lab") == (1, said, errors)
    assert links(shared_host)["nic0"] == "up"


@pytest.mark.scenario({"switches": [{"alias": "lab"}]})
def test_a_switch_without_uplinks(example: Callable[..., Any]) -> None:
    assert example("failover_drill", "lab") == (0, [], "")


def test_a_link_that_is_down_already(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    shared_host.link("nic4").down()
    errors = "failover_drill: vswitch0/nic4 is down already\n"
    assert example("failover_drill", "vswitch0") == (1, [], errors)
    assert links(shared_host)["nic4"] == "down"


def test_a_link_that_comes_up_in_spite_of_an_error(
    shared_host: SharedHost, example: Callable[..., Any]
) -> None:
    shared_host.fault("VSQEX_PortGetTeamUplinkHint", nth=4, panic=(OSError, "the device is gone"))
    status, lines, errors = example("failover_drill", "vswitch0")
    assert (status, lines) == (1, [])
    assert errors.startswith("failover_drill: ") and "the device is gone" in errors
    assert links(shared_host)["nic4"] == "up"


def test_a_link_that_stays_down_is_said(
    shared_host: SharedHost, example: Callable[..., Any]
) -> None:
    shared_host.fault("VSQEX_SetUplinkAdminLinkState", nth=2, status="QEX_BUSY")
    status, lines, errors = example("failover_drill", "vswitch0")
    assert (status, lines) == (3, [])
    assert errors == (
        "failover_drill: vswitch0/nic4 is not up again: VSQEX_SetUplinkAdminLinkState("
        "switchName='vswitch0', uplink='nic4', state=<LinkState.UP: 1>): QEX_BUSY, Busy\n"
    )
    assert links(shared_host)["nic4"] == "down"


def test_an_unknown_switch(example: Callable[..., Any]) -> None:
    errors = "failover_drill: no switch 'nope' (there are vswitch0)\n"
    assert example("failover_drill", "nope") == (1, [], errors)
