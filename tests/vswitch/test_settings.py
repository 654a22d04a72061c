"""Settings as attributes: what is assigned, cleared, refused, and what the host makes of it."""

import re
from pathlib import Path
from typing import Any, Dict, Set, Tuple, Union

import pytest
import simhost
from vswitch import (
    Balance,
    Criteria,
    DocumentError,
    EthernetFilter,
    Forbid,
    FrameFilter,
    Host,
    HostError,
    MacLearning,
    Mirror,
    MirrorEnd,
    Multicast,
    NotFound,
    Port,
    PortMacLearning,
    PrivateVlan,
    Switch,
    TeamFlags,
    Teaming,
    UplinkPort,
    Vlan,
    _table,
)
from vswitch._settings import Setting

GUIDE = Path(__file__).resolve().parents[2] / "docs/guides/objects.md"


def session(sid: str, **more: Any) -> Dict[str, Any]:
    """A mirror session as the host describes it."""
    plain = {"sid": sid, "name": "", "type": "port", "snap_length": 0, "sampling_rate": 0}
    ends: Dict[str, Any] = {"to": [], "received_by": [], "sent_by": []}
    return {**plain, "disabled": False, "promiscuous": False, **ends, **more}


TEAMING = Teaming(Balance.EXPLICIT, ("left",), ("spare",), TeamFlags.ROLLING, Criteria.ERRORS)
SWITCH: Dict[str, Tuple[Any, Any]] = {
    "mtu": (1400, 1400),
    "teaming": (
        TEAMING,
        {
            "balance": "explicit",
            "criteria": ["errors"],
            "flags": ["rolling"],
            "speed": 0,
            "full_duplex": False,
            "error_percent": 0,
            "active": ["left"],
            "standby": ["spare"],
        },
    ),
    "mac_learning": (
        MacLearning(aging_time=9),
        {"aging_time": 9, "limit": 65536, "learn_static": False},
    ),
    "multicast": (Multicast.IGMP, "igmp"),
    "private_vlans": (
        (PrivateVlan(7, 7, "promiscuous"), PrivateVlan(7, 8, "community")),
        [
            {"primary": 7, "secondary": 7, "type": "promiscuous"},
            {"primary": 7, "secondary": 8, "type": "community"},
        ],
    ),
    "disabled": (True, True),
    "uplink_mirror_sessions": ((Mirror("x"),), [session("x")]),
}
PORT: Dict[str, Tuple[Any, Any]] = {
    "vlan": (
        Vlan(7, "1-3,9", 0, guest_tagging=True),
        {"id": 7, "trunk": ["1-3", 9], "priority": 0, "guest_tagging": True},
    ),
    "forbids": (Forbid.MAC_CHANGES | Forbid.PROMISCUOUS, ["promiscuous", "mac_changes"]),
    "teaming": SWITCH["teaming"],
    "uplink": ("spare", "spare"),
    "mac_learning": (
        PortMacLearning(learning=True, limit=3, mac_change=True),
        {
            "learning": True,
            "flooding": False,
            "limit": 3,
            "limit_policy": "allow",
            "mac_change": True,
        },
    ),
    "ethernet_filter": (
        FrameFilter(EthernetFilter.BROADCAST, ("01:00:5e:00:00:02",)),
        {"frames": ["broadcast"], "addresses": ["01:00:5e:00:00:02"]},
    ),
    "transmit_uplink": (True, True),
    "nested_tag": (True, True),
    "blocked": (True, True),
    "connection": (2**32 - 1, 2**32 - 1),
    "alias": ("Büro", "Büro"),
    "mirror_sessions": (
        (Mirror("a", to=(MirrorEnd(port="desk-1"),)), Mirror("b", "bee", snap_length=64)),
        [session("a", to=[{"port": "desk-1"}]), session("b", name="bee", snap_length=64)],
    ),
}


def attribute(name: str) -> str:
    return "mirrors" if name == "mirror_sessions" else name


def described(host: simhost.Host, thing: Union[Switch, Port]) -> Dict[str, Any]:
    (switch,) = [one for one in host.describe()["switches"] if one["alias"] == "lab"]
    if isinstance(thing, Switch):
        return dict(switch)
    (port,) = [one for one in switch["ports"] if one["id"] == thing.id]
    return dict(port)


def attributes(kind: type) -> Set[str]:
    return {name for name, one in vars(kind).items() if isinstance(one, Setting)}


def test_the_guide_has_every_setting() -> None:
    table = GUIDE.read_text(encoding="utf-8").split("\n|---|---|\n")[1].split("\n\n")[0]
    rows = [re.findall(r"`(\w+)`", line) for line in table.splitlines()]
    assert {first: set(names) for first, *names in rows} == {
        "Host": {"options", "mac_learning"},
        "Switch": attributes(Switch) | {"running"},
        "Port": attributes(Port),
        "UplinkPort": attributes(UplinkPort) | {"name"},
    }


def test_every_setting_is_an_attribute() -> None:
    assert set(SWITCH) == set(_table.SWITCH) and set(PORT) == set(_table.PORT)
    for kind, known in ((Switch, _table.SWITCH), (Port, _table.PORT)):
        for name, one in known.items():
            assert getattr(kind, attribute(name)).known is one
            assert getattr(kind, attribute(name)).__doc__ == one.words


def check(
    host: simhost.Host, thing: Union[Switch, Port], name: str, value: Any, words: Any
) -> None:
    # What is learned, counted and carried depends on settings.
    others = {*_table.SWITCH, *_table.PORT, "properties", "host_properties"} - {name}
    before = {key: one for key, one in described(host, thing).items() if key in others}
    setattr(thing, attribute(name), value)
    now = described(host, thing)
    assert now[name] == words
    assert {key: one for key, one in now.items() if key in others} == before
    assert getattr(thing, attribute(name)) == value and thing.is_set(name)
    assert type(getattr(thing, attribute(name))) is type(value)
    delattr(thing, attribute(name))
    assert not thing.is_set(name)
    assert name not in thing.state()
    delattr(thing, attribute(name))


@pytest.mark.parametrize("name", SWITCH)
def test_a_setting_of_a_switch(host: simhost.Host, lab: Switch, name: str) -> None:
    check(host, lab, name, *SWITCH[name])


@pytest.mark.parametrize("name", PORT)
def test_a_setting_of_a_port(host: simhost.Host, desk: Port, name: str) -> None:
    check(host, desk, name, *PORT[name])


@pytest.mark.parametrize("name", PORT)
def test_a_setting_of_a_port_without_settings(host: simhost.Host, bare: Port, name: str) -> None:
    check(host, bare, name, *PORT[name])


@pytest.mark.parametrize("name", PORT)
def test_what_was_read_can_be_assigned(host: simhost.Host, desk: Port, name: str) -> None:
    before = described(host, desk)
    setattr(desk, attribute(name), getattr(desk, attribute(name)))
    assert described(host, desk) == before


UPLINK_PORT: Dict[str, Any] = {
    "name": "Links",
    "blocked": True,
    "vlan": Vlan(7, priority=3),
    "nested_tag": True,
}


@pytest.mark.parametrize("name", _table.UPLINK_PORT)
@pytest.mark.parametrize("where", ["left", "spare"])
def test_a_setting_of_an_uplink_port(
    host: simhost.Host, lab: Switch, name: str, where: str
) -> None:
    port, value = lab.uplink_ports[where], UPLINK_PORT[name]
    delattr(port, name)
    assert not port.is_set(name)
    setattr(port, name, value)
    assert getattr(port, name) == value and port.is_set(name)
    (switch,) = [one for one in host.describe()["switches"] if one["alias"] == "lab"]
    (described,) = [one for one in switch["uplink_ports"] if one["id"] == where]
    words = getattr(value, "words", lambda: value)()
    assert described[name] == words
    delattr(port, name)
    assert not port.is_set(name) and getattr(port, name) != value


def test_what_is_not_set_is_the_default(lab: Switch, bare: Port, objects: Host) -> None:
    assert bare.vlan == Vlan() and bare.forbids == Forbid(0) and bare.uplink == ""
    assert bare.mac_learning == PortMacLearning() and bare.ethernet_filter == FrameFilter()
    assert bare.mirrors == () and bare.alias == "" and bare.connection == 0
    assert (bare.blocked, bare.nested_tag, bare.transmit_uplink) == (False, False, False)
    assert bare.teaming == lab.teaming
    for name in _table.SWITCH:
        delattr(lab, name)
    assert lab.mtu == 1500 and lab.teaming == Teaming() and lab.multicast is Multicast.LEGACY
    assert lab.disabled is False and lab.private_vlans == () and lab.uplink_mirror_sessions == ()
    assert lab.mac_learning == objects.mac_learning == MacLearning(60, 1000, True)


def test_what_is_set_is_told_from_the_default(bare: Port) -> None:
    assert not bare.is_set("vlan")
    bare.vlan = Vlan()
    assert bare.is_set("vlan") and bare.vlan == Vlan()
    with pytest.raises(AttributeError, match="Port has no setting 'vlans' .it has alias, blocked"):
        bare.is_set("vlans")


def test_shorter_ways_to_say_a_value(bare: Port, lab: Switch) -> None:
    bare.vlan = 7
    assert bare.vlan == Vlan(7)
    bare.forbids = "promiscuous,mac_changes"
    assert bare.forbids == Forbid.PROMISCUOUS | Forbid.MAC_CHANGES
    bare.forbids = ["forged_transmits"]
    assert bare.forbids is Forbid.FORGED_TRANSMITS
    lab.multicast = "mld"
    assert lab.multicast is Multicast.MLD


@pytest.mark.parametrize(
    "name, given, words",
    [
        ("vlan", 4095, "vlan.id: 4095 is above 4094"),
        ("vlan", "seven", "vlan.id: 'seven' is not a whole number from 0 to 4094"),
        ("vlan", {"trunk": ["10-9"]}, "vlan.trunk[0]: '10-9' is not in rising order"),
        ("forbids", "fun", "forbids[0]: 'fun' is not one of promiscuous, mac_changes, "),
        ("blocked", 1, "blocked: 1 is not true or false"),
        ("connection", True, "connection: True is not a whole number from 0 to 4294967295"),
        ("connection", -1, "connection: -1 is below 0"),
        ("alias", "x" * 81, "is not a text of 80 bytes at most"),
        ("alias", "a\0b", "alias: 'a\\x00b' is not a text without NUL"),
        ("teaming", 7, "teaming: 7 is not an object"),
        ("mirrors", [Vlan(7)], "mirror_sessions[0]: 7 is not an object"),
    ],
)
def test_what_no_setting_takes(
    host: simhost.Host, bare: Port, name: str, given: Any, words: str
) -> None:
    before = host.describe()["switches"]
    with pytest.raises(DocumentError) as raised:
        setattr(bare, name, given)
    assert words in str(raised.value)
    assert host.describe()["switches"] == before


@pytest.mark.parametrize(
    "name, given", [("forbids", TeamFlags.ROLLING), ("forbids", 1), ("mac_learning", MacLearning())]
)
def test_constants_of_another_family(bare: Port, name: str, given: Any) -> None:
    with pytest.raises(DocumentError, match=f"{name}"):
        setattr(bare, name, given)
    assert not bare.is_set(name)


def test_constants_of_another_family_in_values(lab: Switch) -> None:
    for given in (Balance.IP, 1, True):
        with pytest.raises(DocumentError, match="multicast: .* is not one of legacy, snooping"):
            lab.multicast = given  # type: ignore[assignment]
    with pytest.raises(DocumentError, match="Teaming.balance: .* is not one of none, ip"):
        Teaming(Multicast.IGMP)  # type: ignore[arg-type]
    with pytest.raises(DocumentError, match="Teaming.flags.* is not"):
        Teaming(flags=Criteria.LINK)  # type: ignore[arg-type]
    assert FrameFilter(EthernetFilter.HASHED_MULTICAST).words()["frames"] == ["hashed_multicast"]


def test_the_names_of_attributes_are_those_of_settings(desk: Port, bare: Port) -> None:
    assert desk.is_set("mirrors") and desk.is_set("mirror_sessions") and not bare.is_set("mirrors")


def test_what_the_host_refuses(host: simhost.Host, lab: Switch) -> None:
    host.fault("VSDVS_SetMTU", status="QEX_BUSY")
    with pytest.raises(HostError, match=r"VSDVS_SetMTU\(switchName='lab', mtu=1500\): QEX_BUSY"):
        lab.mtu = 1500
    assert lab.mtu == 9000


def test_the_host(host: simhost.Host, objects: Host) -> None:
    objects.mac_learning = MacLearning(60, 7, True)
    assert host.describe()["mac_learning"] == {"aging_time": 60, "limit": 7, "learn_static": True}
    options = objects.options
    options["IGMPVersion"] = 2
    options["MLDRouterIP"] = "2001:db8:0::1"
    assert options["IGMPVersion"] == 2 and options["MLDRouterIP"] == "2001:db8::1"
    assert dict(options) == host.describe()["runtime_options"]
    del options["IGMPVersion"]
    assert options["IGMPVersion"] == 3 and len(options) == 15 and "Nope" not in options
    with pytest.raises(NotFound, match="no runtime option 'Nope' .there are AllowFastPath"):
        options["Nope"] = 1
    with pytest.raises(DocumentError, match="IGMPVersion: 4 is above 3"):
        options["IGMPVersion"] = 4


def test_adding_and_removing(host: simhost.Host, objects: Host) -> None:
    switch = objects.add_switch("new", identifier="new-1", max_ports=3, uplinks=["nic0", "nic1"])
    assert switch.identifier == "new-1" and list(switch.uplinks) == ["nic0", "nic1"]
    port = switch.add_port("a")
    assert not port.is_set("connection") and switch.ports["a"] == port
    assert switch.add_port("b", connection=7).connection == 7
    uplink = switch.add_uplink("nic2")
    assert uplink.port == "uplink3" and objects.uplinks["nic2"] == uplink
    uplink.remove()
    assert "nic2" not in objects.uplinks and list(switch.uplink_ports) == ["uplink1", "uplink2"]
    port.remove()
    assert list(switch.ports) == ["b"]
    switch.set_uplink_ports({"uplink1": "Left", "third": "Third"})
    assert [one.name for one in switch.uplink_ports.values()] == ["Left", "Third"]
    assert list(switch.uplinks) == ["nic0"]
    switch.remove()
    assert list(objects.switches) == ["vswitch0"]


def test_a_switch_is_added_whole_or_not(objects: Host) -> None:
    with pytest.raises(NotFound, match="no uplink 'nope'"):
        objects.add_switch("new", uplinks=["nic0", "nope"])
    assert list(objects.switches) == ["vswitch0"] and "nic0" not in objects.uplinks
    with pytest.raises(DocumentError, match="uplinks: 'nic0' is not a list"):
        objects.add_switch("new", uplinks="nic0")
    with pytest.raises(HostError, match="QEX_EXISTS"):
        objects.add_switch("vswitch0")
    assert "vswitch0" in objects.switches


def test_properties_without_a_name(host: simhost.Host, lab: Switch, desk: Port) -> None:
    for thing in (lab, lab.host_part, desk, lab.uplink_ports["left"]):
        thing.set_property("com.example.x", b"\1\2", _table.PROPERTY_TYPES["runtime"])
        assert thing.get_property("com.example.x") == b"\1\2"
        assert thing.properties()["com.example.x"].propertyType == 32
        thing.clear_property("com.example.x")
        assert "com.example.x" not in thing.properties()
        thing.clear_property("com.example.x")


def test_a_setting_of_an_unusual_type_is_said_whole(lab: Switch, bare: Port) -> None:
    known = _table.PORT["blocked"]
    bare.set_property(known.key, b"\1", _table.PROPERTY_TYPES["runtime"])
    state = bare.state()
    assert state["blocked"] is True
    assert state["properties"] == {known.key: {"type": "runtime", "hex": "01"}}
