"""examples/find_mac.py"""

from typing import Any, Callable

import pytest
from simhost import SharedHost

MAC = "02:00:00:00:00:07"
LAB = {
    "switches": [
        {
            "alias": "lab",
            "ports": [{"id": "a", "addresses": [{"mac": MAC, "vlan": 5, "type": "static"}]}],
        },
        {"alias": "zoo", "ports": [{"id": "b", "mac_learning": {"learning": True}}]},
    ]
}


@pytest.mark.scenario(LAB)
@pytest.mark.parametrize("spelling", [MAC, "02-00-00-00-00-07", "0200.0000.0007", "020000000007"])
def test_an_address_in_any_spelling(example: Callable[..., Any], spelling: str) -> None:
    assert example("find_mac", spelling) == (0, ["lab: at a, VLAN 5, static"], "")


@pytest.mark.scenario(LAB)
def test_an_address_in_several_places(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    shared_host.learn("zoo", MAC, port="b", vlan=9)
    shared_host.learn("zoo", MAC)
    status, lines, errors = example("find_mac", MAC)
    assert (status, errors) == (0, "")
    assert sorted(lines) == [
        "lab: at a, VLAN 5, static",
        "zoo: at b, VLAN 9, learned",
        "zoo: beyond the uplinks, VLAN 0, learned",
    ]


@pytest.mark.scenario(LAB)
def test_an_address_that_is_nowhere(example: Callable[..., Any]) -> None:
    errors = "find_mac: no switch knows 02:00:00:00:00:08\n"
    assert example("find_mac", "02:00:00:00:00:08") == (1, [], errors)


def test_what_is_no_address(example: Callable[..., Any]) -> None:
    errors = "find_mac: mac: '02:00' is not six bytes such as 02:00:00:00:00:01\n"
    assert example("find_mac", "02:00") == (1, [], errors)


def test_a_query_that_traps(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    shared_host.fault("VSQEX_GetPortMACTable", panic=(OSError, "the device is gone"))
    status, lines, errors = example("find_mac", MAC)
    assert (status, lines) == (1, [])
    assert errors.startswith("find_mac: ") and errors.endswith("the device is gone\n")
