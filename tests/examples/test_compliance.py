"""examples/compliance.py: what breaks the rules is told, and mended whole or not at all."""

from typing import Any, Callable

import pytest
from simhost import SharedHost

LAB = {
    "switches": [
        {
            "alias": "lab",
            "mtu": 9000,
            "ports": [
                {"id": "a"},
                {"id": "b", "forbids": ["mac_changes", "forged_transmits"]},
                {"id": "c", "forbids": ["promiscuous"]},
            ],
        }
    ]
}
BROKEN = [
    "lab/mtu: 9000 -> 1500",
    "lab/a/forbids: absent -> mac_changes,forged_transmits",
    "lab/c/forbids: promiscuous -> mac_changes,forged_transmits",
]


@pytest.mark.scenario(LAB)
def test_what_breaks_the_rules_is_told(
    shared_host: SharedHost, example: Callable[..., Any]
) -> None:
    before = shared_host.describe()["switches"]
    errors = "compliance: 3 settings break the rules\n"
    assert example("compliance") == (1, BROKEN, errors)
    assert shared_host.describe()["switches"] == before


@pytest.mark.scenario(LAB)
def test_a_fix(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    assert example("compliance", "--fix") == (0, BROKEN, "")
    (lab,) = shared_host.describe()["switches"]
    assert lab["mtu"] == 1500
    forbids = [sorted(port["forbids"]) for port in lab["ports"]]
    assert forbids == [["forged_transmits", "mac_changes"]] * 3
    assert example("compliance") == (0, [], "")
    assert example("compliance", "--fix") == (0, [], "")


@pytest.mark.scenario(LAB)
def test_other_rules(example: Callable[..., Any]) -> None:
    rules = ["--mtu", "9000", "--forbids", "promiscuous"]
    said = [
        "lab/a/forbids: absent -> promiscuous",
        "lab/b/forbids: mac_changes,forged_transmits -> promiscuous",
    ]
    errors = "compliance: 2 settings break the rules\n"
    assert example("compliance", *rules) == (1, said, errors)


@pytest.mark.scenario(LAB)
def test_a_fix_that_fails_is_undone(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    before = shared_host.describe()["switches"]
    shared_host.fault("VSDVS_SetPortSecurity", nth=2, status="QEX_BUSY")
    status, lines, errors = example("compliance", "--fix")
    assert (status, lines) == (1, [])
    assert errors.startswith("compliance: VSDVS_SetPortSecurity(switchName='lab', port='c', ")
    assert errors.endswith("): QEX_BUSY, Busy; everything is as it was before\n")
    assert shared_host.describe()["switches"] == before


@pytest.mark.parametrize(
    "rule, why",
    [
        ("--mtu=3", "switches[0].mtu: 3 is below 1280"),
        (
            "--forbids=everything",
            "switches[0].ports[0].forbids[0]: 'everything' is not one of promiscuous, mac_changes,"
            " forged_transmits",
        ),
    ],
)
def test_a_rule_that_no_host_can_keep(example: Callable[..., Any], rule: str, why: str) -> None:
    assert example("compliance", rule) == (1, [], f"compliance: {why}\n")


@pytest.mark.scenario({})
def test_a_host_without_switches(example: Callable[..., Any]) -> None:
    assert example("compliance") == (0, [], "")
