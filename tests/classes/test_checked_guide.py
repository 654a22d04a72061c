"""The guide of the checked calls has the whole table of statuses, and all words."""

import json
import os
import re
from pathlib import Path
from typing import Any, Dict, List, Tuple, Type

import pytest
from libvswitch import enums, errors
from simhost import Host

GUIDE = Path(__file__).resolve().parents[2] / "docs/guides/checked.md"
SETTINGS = Path(os.environ["BUILD_DIR"], "simhost", "properties.json")

# What documents say with the words of a family: the object or setting, and its member.
SAID: Dict[Type[Any], List[Tuple[str, ...]]] = {
    enums.Balance: [("teaming", "balance")],
    enums.Criteria: [("teaming", "criteria")],
    enums.EthernetFilter: [("ethernet_filter", "frames")],
    enums.Forbid: [("forbids",)],
    enums.LinkState: [("uplinks", "link"), ("uplinks", "admin"), ("uplinks", "lacp")],
    enums.MacType: [("addresses", "type")],
    enums.Multicast: [("multicast",)],
    enums.TeamFlags: [("teaming", "flags")],
}


def rows(heading: str) -> Dict[str, List[str]]:
    """The rows of a table: the first name in code font, and those of the second column."""
    text = GUIDE.read_text(encoding="utf-8")
    table = text.split(f"{heading}\n|---|---|\n")[1].split("\n\n")[0]
    found = {}
    for line in table.splitlines():
        first, second = line.strip("|").split("|")
        for name in re.findall(r"`([A-Za-z]+)`", first.split(", also")[0]):
            found[name] = re.findall(r"`(\w+)`", second)
    return found


def test_the_table_of_statuses() -> None:
    expected: Dict[str, List[str]] = {}
    for status, kind in errors.STATUSES.items():
        expected.setdefault(kind.__name__, []).append(status)
    raised = rows("| Raised | For |")
    assert {kind: one for kind, one in raised.items() if kind in expected} == expected
    assert set(raised) == set(errors.__all__)


def test_the_words() -> None:
    listed = rows("| | Words |")
    assert set(listed) == set(enums.__all__)
    for name, words in listed.items():
        if name != "Status":
            assert words == [str(one) for one in getattr(enums, name).__members__.values()], name


def choices(said: Tuple[str, ...]) -> Dict[str, int]:
    """The words that documents have there, and their numbers."""
    known = json.loads(SETTINGS.read_text(encoding="utf-8"))
    first, *member = said
    (value, *more) = [one["value"] for one in known["properties"] if one.get("name") == first] or [
        {"members": known["objects"][first]}
    ]
    assert all(one == value for one in more)
    for name in member:
        (value,) = [one for one in value["members"] if one["name"] == name]
    found: Dict[str, int] = value["choices"]
    return found


def test_every_family_is_in_documents() -> None:
    assert {family.__name__ for family in SAID} == set(enums.__all__) - {"Status"}


@pytest.mark.parametrize(
    "family, said",
    [(family, said) for family, places in SAID.items() for said in places],
    ids=lambda one: ".".join(one) if isinstance(one, tuple) else one.__name__,
)
def test_every_constant_has_the_word_of_documents(family: Type[Any], said: Tuple[str, ...]) -> None:
    # Only questions have the type ALL: no address is of all types.
    constants = [one for one in family.__members__.values() if one is not enums.MacType.ALL]
    assert {str(one): int(one) for one in constants} == choices(said)


@pytest.mark.parametrize("balance", enums.Balance)
@pytest.mark.parametrize("flags", enums.TeamFlags)
def test_words_of_teaming_are_those_of_documents(
    host: Host, balance: enums.Balance, flags: enums.TeamFlags
) -> None:
    from libvswitch import checked

    host.apply(
        {
            "switches": [
                {"alias": "vswitch0", "teaming": {"balance": str(balance), "flags": [str(flags)]}}
            ]
        }
    )
    policy = checked.VSDVS_GetTeamingPolicy("vswitch0")
    assert (policy.loadBalance, policy.flags) == (balance, flags)


@pytest.mark.parametrize("criterion", enums.Criteria)
def test_words_of_criteria_are_those_of_documents(host: Host, criterion: enums.Criteria) -> None:
    from libvswitch import checked

    host.apply({"switches": [{"alias": "vswitch0", "teaming": {"criteria": [str(criterion)]}}]})
    assert checked.VSDVS_GetTeamingPolicy("vswitch0").linkCriteria == criterion


@pytest.mark.parametrize("mode", enums.Multicast)
def test_words_of_multicast_are_those_of_documents(host: Host, mode: enums.Multicast) -> None:
    from libvswitch import checked

    host.apply({"switches": [{"alias": "vswitch0", "multicast": str(mode)}]})
    assert checked.VSDVS_GetMcastFilterMode("vswitch0") is mode


def test_words_of_sets() -> None:
    both = enums.Forbid.PROMISCUOUS | enums.Forbid.FORGED_TRANSMITS
    assert str(both) == "promiscuous,forged_transmits"
    assert both.words == ("promiscuous", "forged_transmits")
    assert str(enums.Forbid(0)) == "none" and enums.Forbid(0).words == ()
    assert enums.TeamFlags(0x41000).words == ("lacp_client", "0x1000")
    assert f"{both}|{both:d}|{enums.LinkState.UP:>4}" == "promiscuous,forged_transmits|5|  up"


def test_numbers_without_a_constant_are_members_too() -> None:
    unknown = enums.Multicast(9)
    assert unknown == 9 and str(unknown) == "unknown_9"
    assert str(enums.Status(3)) == "QEX_UNKNOWN_3" and str(enums.Status.BUSY) == "QEX_BUSY"
    with pytest.raises(ValueError):
        enums.Multicast("igmp")  # type: ignore[arg-type]  # a word is no number
