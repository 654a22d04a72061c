"""Values by themselves: what they are made of, refuse, and say."""

import copy
import dataclasses
import json
import pickle
from typing import Any, Dict, Type

import pytest
import vswitch
from vswitch import (
    Balance,
    Change,
    Criteria,
    DocumentError,
    Encapsulation,
    EthernetFilter,
    FrameFilter,
    MacLearning,
    Mirror,
    MirrorEnd,
    PortMacLearning,
    PrivateVlan,
    TeamFlags,
    Teaming,
    Vlan,
    _table,
)
from vswitch.values import SettingValue

KINDS: Dict[str, Type[SettingValue]] = {
    "teaming": Teaming,
    "vlan": Vlan,
    "mac_learning": PortMacLearning,
    "ethernet_filter": FrameFilter,
}


@pytest.mark.parametrize("name", KINDS)
def test_defaults_are_those_of_the_table(name: str) -> None:
    known = _table.PORT[name]
    assert KINDS[name]().words() == known.default


def test_defaults_of_switches_are_those_of_the_table() -> None:
    assert MacLearning().words() == _table.SWITCH["mac_learning"].default
    assert Teaming().words() == _table.SWITCH["teaming"].default


@pytest.mark.parametrize("kind", [*KINDS.values(), MacLearning, Mirror, MirrorEnd, PrivateVlan])
def test_members_are_those_of_the_table(kind: Type[SettingValue]) -> None:
    names = {one["name"] for one in kind._form["members"]}
    assert {one.name for one in dataclasses.fields(kind)} == names


@pytest.mark.parametrize(
    "given", ["10-12,20", ["10-12", 20], (10, 11), [10, "11"], "10, 11", range(10, 12), 10, "10"]
)
def test_trunks_in_every_spelling(given: Any) -> None:
    trunk = Vlan(trunk=given).trunk
    assert trunk in {"10-12,20", "10,11", "10"}
    assert Vlan(trunk=trunk) == Vlan(trunk=given)


def test_no_trunk_is_none() -> None:
    assert Vlan(trunk="").trunk is None and Vlan(trunk=[]) == Vlan()  # type: ignore[arg-type]


@pytest.mark.parametrize(
    "kind, given, words",
    [
        (Vlan, {"id": 4095}, "Vlan.id: 4095 is above 4094"),
        (Vlan, {"id": -1}, "Vlan.id: -1 is below 0"),
        (Vlan, {"id": True}, "Vlan.id: True is not a whole number from 0 to 4094"),
        (Vlan, {"priority": 8}, "Vlan.priority: 8 is above 7"),
        (Vlan, {"trunk": "5-"}, "Vlan.trunk[0]: '5-' is not a number or a range"),
        (Vlan, {"trunk": "5,5"}, "Vlan.trunk[1]: '5' is not in rising order"),
        (Vlan, {"trunk": "9-4095"}, "Vlan.trunk[0]: 4095 is above 4094"),
        (
            Teaming,
            {"balance": "worst"},
            "Teaming.balance: 'worst' is not one of none, ip, mac, port,",
        ),
        (Teaming, {"active": "nic0"}, "Teaming.active: 'nic0' is not a list"),
        (Teaming, {"active": [7]}, "Teaming.active[0]: 7 is not a text"),
        (Teaming, {"active": ["x" * 81]}, "is not a text of 80 bytes at most"),
        (Teaming, {"active": ["x"] * 33}, "Teaming.active: there is room for 32 at most"),
        (Teaming, {"error_percent": 101}, "Teaming.error_percent: 101 is above 100"),
        (
            PrivateVlan,
            {"primary": 0, "secondary": 1, "type": "isolated"},
            "PrivateVlan.primary: 0 is below 1",
        ),
        (MirrorEnd, {}, "is not an object with one of the keys port, uplink, vlan, ip"),
        (MirrorEnd, {"port": "a", "vlan": 1}, "is not an object with one of the keys"),
        (MirrorEnd, {"ip": "1.2.3"}, "MirrorEnd.ip: '1.2.3' is not an IPv4 or IPv6 address"),
        (Mirror, {"sid": "s", "to": ("web-1",)}, "Mirror.to[0]: 'web-1' is not an object"),
        (FrameFilter, {"addresses": ("x",)}, "FrameFilter.addresses[0]: 'x' is not six bytes"),
    ],
)
def test_what_no_value_is_made_of(kind: Any, given: Dict[str, Any], words: str) -> None:
    with pytest.raises(DocumentError) as raised:
        kind(**given)
    assert words in str(raised.value)


def test_words_are_taken_for_members_of_enums() -> None:
    teaming = Teaming(
        "explicit",  # type: ignore[arg-type]
        ["a"],  # type: ignore[arg-type]
        flags="notify,rolling",  # type: ignore[arg-type]
        criteria=[],  # type: ignore[arg-type]
    )
    assert teaming == Teaming(
        Balance.EXPLICIT, ("a",), (), TeamFlags.ROLLING | TeamFlags.NOTIFY, Criteria(0)
    )
    assert isinstance(teaming.balance, Balance) and isinstance(teaming.flags, TeamFlags)
    assert hash(teaming) == hash(Teaming(Balance.EXPLICIT, ("a",), (), teaming.flags, Criteria(0)))


def test_addresses_have_one_spelling() -> None:
    frames = FrameFilter(EthernetFilter.SINK, ("01-00-5E-00-00-01", "0100.5e00.0002"))
    assert frames.addresses == ("01:00:5e:00:00:01", "01:00:5e:00:00:02")
    assert MirrorEnd(ip="2001:DB8:0::1").ip == "2001:db8::1"


def test_values_in_words() -> None:
    assert Vlan(7).words() == 7 and Vlan().words() == 0
    assert Vlan(7, "1-3,9").words() == {"id": 7, "trunk": ["1-3", 9]}
    mirror = Mirror("s", to=(MirrorEnd(port="a"),), encapsulation=Encapsulation(key=9))
    words = mirror.words()
    assert words["to"] == [{"port": "a"}] and words["encapsulation"] == {"key": 9}
    assert words["name"] == "" and "stack" not in words
    assert json.loads(json.dumps(Teaming().words())) == Teaming().words()


def test_changes_in_words() -> None:
    assert str(Change("lab/mtu", None, 9000)) == "lab/mtu: absent -> 9000"
    changed = Change("lab/web/vlan", 7, {"id": 7, "trunk": ["1-3", 9], "private": True})
    assert str(changed) == "lab/web/vlan: 7 -> id=7 trunk=1-3,9 private=true"
    ends = [{"port": "a"}, {"vlan": 7}]
    assert str(Change("x", [], {"sid": "s", "to": ends})) == "x: none -> sid=s to=port=a; vlan=7"


VALUES = [
    Vlan(7, "1-3", 5),
    Teaming(Balance.EXPLICIT, ("a",)),
    FrameFilter(EthernetFilter.SINK),
    Mirror("s", to=(MirrorEnd(vlan=7),)),
    Change("lab/mtu", 1, 2),
]


@pytest.mark.parametrize("value", VALUES, ids=lambda value: type(value).__name__)
def test_values_are_frozen_dataclasses(value: Any) -> None:
    again = pickle.loads(pickle.dumps(value))
    assert again == value == copy.deepcopy(value) and hash(again) == hash(value)
    assert value != Vlan(8) and value != 7 and repr(again) == repr(value)
    assert dataclasses.replace(value) == value
    (name, *_) = dataclasses.asdict(value)
    with pytest.raises(dataclasses.FrozenInstanceError):
        setattr(value, name, None)
    with pytest.raises(dataclasses.FrozenInstanceError):
        delattr(value, name)


def test_errors_go_into_other_processes() -> None:
    with pytest.raises(DocumentError) as raised:
        Vlan(4095)
    again = pickle.loads(pickle.dumps(raised.value))
    assert (str(again), again.path) == ("Vlan.id: 4095 is above 4094", "Vlan.id")


def test_the_public_names() -> None:
    for name in vswitch.__all__:
        assert getattr(vswitch, name).__module__.split(".")[0] in ("vswitch", "libvswitch")
    assert vswitch.__all__ == sorted(vswitch.__all__)
