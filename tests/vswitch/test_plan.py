"""Documents as plans: what would change, what changes, what is refused, what is taken back."""

import copy
import json
from typing import Any, Callable, Dict, List, Optional

import libvswitch as vs
import pytest
import simhost
from conftest import LAB
from test_transaction import everything, without_numbers
from vswitch import (
    Change,
    DocumentError,
    Host,
    MacLearning,
    MacType,
    NotRestored,
    RolledBack,
    Switch,
    Vlan,
    _settings,
    _table,
    snapshot,
)
from vswitch._thing import own_properties
from vswitch._undo import kept_macs

RUNTIME = _table.PROPERTY_TYPES["runtime"]

Document = Dict[str, Any]


@pytest.fixture(autouse=True)
def stopped(host: simhost.Host) -> None:
    host.clock.stop()


def on_lab(**said: Any) -> Document:
    return {"switches": [{"alias": "lab", **said}]}


def on_desk(**said: Any) -> Document:
    return on_lab(ports=[{"id": "desk-1", **said}])


def lines(objects: Host, document: Document) -> List[str]:
    return str(objects.plan(document)).splitlines()


def test_a_plan_says_changes_and_makes_none(host: simhost.Host, lab: Switch, objects: Host) -> None:
    before = everything(host)
    plan = objects.plan(on_lab(mtu=1400, ports=[{"id": "desk-3", "vlan": 9}, {"id": "new"}]))
    assert plan.changes == (
        Change("lab/mtu", 9000, 1400),
        Change("lab/desk-3/vlan", 7, 9),
        Change("lab/new", None, {"id": "new"}),
    )
    assert everything(host) == before


def test_applying_twice_changes_nothing_the_second_time(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    plan = objects.plan(on_lab(mtu=1400, ports=[{"id": "desk-3", "vlan": 9}, {"id": "new"}]))
    changes = plan.changes
    assert plan.apply() == changes
    assert lab.mtu == 1400 and lab.ports["desk-3"].vlan == Vlan(9) and "new" in lab.ports
    after = everything(host)
    assert plan.apply() == () == plan.changes and str(plan) == "no changes"
    assert everything(host) == after


def test_the_state_is_a_plan_that_changes_nothing(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    before = everything(host)
    plan = objects.plan(objects.state())
    assert plan.changes == () == plan.apply()
    assert everything(host) == before


def portable(state: Document) -> Document:
    """A state without what differs between two hosts that are set alike."""
    state = copy.deepcopy(state)
    state.pop("uplinks")
    for switch in state["switches"]:
        switch["addresses"] = []
        for port in switch["ports"]:
            port.pop("observed")
            port["addresses"] = [one for one in port["addresses"] if one["type"] == "static"]
            for one in port["addresses"]:
                one.pop("age")
    return state


def test_a_state_is_a_plan_for_an_empty_host(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    lab.add_port("opaque", external_id="7f3a")
    state = objects.state()
    for switch in state["switches"]:
        switch["lags"] = []
    host.reset()
    objects.switches["vswitch0"].remove()
    plan = objects.plan(state)
    plan.apply()
    assert plan.changes == () and portable(objects.state()) == portable(state)


def all_that_is_set(host: Host) -> Dict[str, Any]:
    """Byte for byte where there are bytes."""
    held: Dict[str, Any] = {"options": host.options.all(), "mac_learning": host.mac_learning}
    for switch in host.switches.values():
        held[f"{switch}: lags"] = switch.lags
        held[f"{switch}: uplinks"] = {name: one.port for name, one in switch.uplinks.items()}
        for port in switch.ports.values():
            held[f"{port.path}: macs"] = kept_macs(port)
        things = (switch, switch.host_part, *switch.ports.values(), *switch.uplink_ports.values())
        held.update((one.path, own_properties(one)) for one in things)
    return held


def clear(host: Host) -> None:
    """Takes away what somebody has set, and moves an uplink."""
    for switch in host.switches.values():
        for thing in (*switch.ports.values(), *switch.uplink_ports.values(), switch):
            for name, known in thing._settings.items():
                if thing.is_set(name):
                    _settings.clear(thing, known)
            for key in own_properties(thing):
                thing.clear_property(key)
        for key in own_properties(switch.host_part):
            switch.host_part.clear_property(key)
    for port in host.ports():
        for mac, vlan in kept_macs(port):
            port.remove_mac(mac, vlan=vlan)
    for name in host.options:
        del host.options[name]
    host.mac_learning = MacLearning()
    host.switches["vswitch0"].uplinks["nic5"].remove()
    host.add_switch("new", uplinks=["nic5"]).add_port("a")


def test_a_backup_brings_every_byte_back(host: simhost.Host, lab: Switch, objects: Host) -> None:
    lab.ports["desk-3"].set_property("com.example.raw", b"\0\xff", RUNTIME)
    vlan = lab.ports["desk-3"].get_property(vs.VSPROP_PORT_VLAN)
    lab.ports["desk-4"].set_property(vs.VSPROP_PORT_VLAN, vlan, RUNTIME)
    before = all_that_is_set(objects)
    document = json.loads(json.dumps(snapshot.backup(objects)))
    clear(objects)
    left = all_that_is_set(objects)
    assert {name for name, held in left.items() if held and held == before.get(name)} == {
        "lab: lags",
        "lab: uplinks",
    }
    objects.plan(document, whole=True).apply()
    assert all_that_is_set(objects) == before
    assert objects.plan(document, whole=True).changes == ()


def test_every_key_of_the_lab(host: simhost.Host, objects: Host) -> None:
    """The same document, through the calls and as a scenario."""
    document = copy.deepcopy(LAB)
    switch = document["switches"][0]
    switch.pop("addresses")
    switch["lags"] = []
    for port in switch["ports"]:
        for key in ("groups", "counters"):
            port.pop(key, None)
    objects.plan(document).apply()
    through_calls = without_numbers(everything(host))
    host.reset()
    host.apply(document)
    assert through_calls == without_numbers(everything(host))


def test_shorter_names(lab: Switch, objects: Host) -> None:
    long: Document = {
        "runtime_options": {"IGMPVersion": 1},
        **on_lab(id="lab-1", ports=[{"id": "desk-1", "mirror_sessions": [], "addresses": []}]),
    }
    short: Document = {
        "options": {"IGMPVersion": 1},
        **on_lab(identifier="lab-1", ports=[{"id": "desk-1", "mirrors": [], "macs": []}]),
    }
    assert objects.plan(long).changes == objects.plan(short).changes
    assert [one.path for one in objects.plan(short).changes] == [
        "options/IGMPVersion",
        "lab/desk-1/mirror_sessions",
    ]
    with pytest.raises(DocumentError, match="switches.0..identifier: switches.0..id says the same"):
        objects.plan(on_lab(id="lab-1", identifier="lab-1"))


def test_absent_clears_and_removes(lab: Switch, objects: Host) -> None:
    document = on_lab(
        multicast="absent",
        uplinks=[{"name": "nic1", "state": "absent"}],
        properties={"com.example.note": "absent"},
        ports=[
            {"id": "desk-1", "vlan": "absent", "alias": "absent"},
            {"id": "desk-2", "state": "absent"},
            {"id": "nope", "state": "absent"},
        ],
    )
    document["switches"].append({"alias": "vswitch0", "state": "absent"})
    document["switches"].append({"alias": "nope", "state": "absent"})
    plan = objects.plan(document)
    assert [one.path for one in plan.changes if one.after is None] == [
        "lab/com.example.note",
        "lab/multicast",
        "lab/desk-1/vlan",
        "lab/desk-1/alias",
        "lab/nic1",
        "lab/desk-2",
        "vswitch0",
    ]
    assert len(plan.apply()) == 7 and plan.changes == ()
    assert list(objects.switches) == ["lab"] and list(lab.uplinks) == ["nic0"]
    assert "desk-2" not in lab.ports and not lab.ports["desk-1"].is_set("vlan")
    assert not lab.is_set("multicast") and not lab.ports["desk-1"].is_set("alias")


def test_a_text_that_would_clear_a_setting(lab: Switch, objects: Host) -> None:
    lab.ports["desk-4"].alias = "absent"
    state = objects.state()
    assert objects.plan(state).changes == ()
    lab.ports["desk-4"].alias = "other"
    objects.plan(state).apply()
    assert lab.ports["desk-4"].alias == "absent"


def test_bytes_win(lab: Switch, objects: Host) -> None:
    key = "com.quorix.common.port.alias"
    raw = {key: {"type": "runtime", "hex": "6100"}}
    objects.plan(on_desk(alias="b", properties=raw)).apply()
    item = lab.ports["desk-1"].properties()[key]
    assert (item.data, item.propertyType) == (b"a\0", 32)
    assert objects.plan(on_desk(alias="b", properties=raw)).changes == ()


def test_uplinks_move_from_switch_to_switch(lab: Switch, objects: Host) -> None:
    document: Document = {
        "switches": [
            {"alias": "new", "mtu": 1400, "uplinks": ["nic4", "nic1"]},
            {"alias": "lab", "uplinks": [{"name": "nic1", "state": "absent"}]},
            {"alias": "vswitch0", "state": "absent"},
        ]
    }
    plan = objects.plan(document)
    assert [one.path for one in plan.changes] == [
        "lab/nic1",
        "vswitch0",
        "new",
        "new/nic4",
        "new/nic1",
        "new/mtu",
    ]
    plan.apply()
    assert list(objects.switches["new"].uplinks) == ["nic4", "nic1"] and plan.changes == ()


def test_uplink_ports(lab: Switch, objects: Host) -> None:
    document = on_lab(
        uplink_ports=[
            {"id": "third", "name": "Third", "uplink": "nic2"},
            {"id": "fourth"},
            {"id": "left", "name": "Links", "uplink": "nic0"},
        ],
        uplinks=["nic0", "nic3"],
    )
    plan = objects.plan(document)
    plan.apply()
    ports = lab.uplink_ports
    assert {id_: (port.name, str(port.uplink)) for id_, port in ports.items()} == {
        "left": ("Links", "nic0"),
        "spare": ("spare", "nic1"),
        "third": ("Third", "nic2"),
        "fourth": ("fourth", "nic3"),
    }
    assert plan.changes == ()
    objects.plan(on_lab(uplink_ports=[{"id": "fifth"}])).apply()
    assert str(ports["fifth"].uplink) == "None"
    objects.plan(on_lab(uplink_ports=[{"id": "fifth", "state": "absent"}])).apply()
    assert "fifth" not in ports


def test_an_uplink_that_leaves_a_port_that_stays(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    """The host takes an uplink with its port."""
    port = lab.uplink_ports["left"]
    port.set_property("com.example.a", b"\1", _table.PROPERTY_TYPES["config"])
    held = port.properties()
    document = on_lab(
        uplink_ports=[{"id": "left"}, {"id": "new"}],
        uplinks=[{"name": "nic0", "state": "absent"}],
    )
    plan = objects.plan(document)
    assert [one.path for one in plan.changes] == ["lab/new", "lab/nic0"]
    plan.apply()
    assert plan.changes == () and at(lab) == {"left": None, "spare": "nic1", "new": None}
    now = lab.uplink_ports["left"].properties()
    assert {key: now.get(key) for key in _own(held)} == _own(held)


def _own(held: Dict[str, Any]) -> Dict[str, Any]:
    return {key: item for key, item in held.items() if key not in _table.COMPUTED}


def test_an_uplink_whose_port_goes(lab: Switch, objects: Host) -> None:
    document = on_lab(uplink_ports=[{"id": "spare", "state": "absent"}], uplinks=["nic1"])
    plan = objects.plan(document)
    assert [one.path for one in plan.changes] == ["lab/nic1", "lab/nic1"]
    plan.apply()
    assert plan.changes == () and list(at(lab).values()) == ["nic0", "nic1"]
    assert "spare" not in lab.uplink_ports


def at(switch: Switch) -> Dict[str, Optional[str]]:
    """The uplink at each uplink port."""
    ports = switch.uplink_ports.items()
    return {id_: None if port.uplink is None else port.uplink.name for id_, port in ports}


CABLES = {
    "a vacant port gets one": "plug nic2",
    "a port is left": "unplug nic1",
    "one comes back elsewhere": "unplug nic0, plug nic0",
    "two change places": "unplug nic0, unplug nic1, plug nic2, plug nic1, plug nic0",
    "one goes to another switch": "unplug nic1, lend nic1",
    "all ports are others": "rename x",
}


def recable(changes: str, here: Switch, there: Switch) -> None:
    ways: Dict[str, Callable[[str], object]] = {
        "plug": here.add_uplink,
        "unplug": lambda name: here.uplinks[name].remove(),
        "lend": there.add_uplink,
        "rename": lambda id_: here.set_uplink_ports({id_: id_}),
    }
    for change in changes.split(", "):
        way, name = change.split()
        ways[way](name)


@pytest.mark.parametrize("change", CABLES)
def test_uplinks_come_back_to_their_ports(host: simhost.Host, objects: Host, change: str) -> None:
    there = objects.switches["vswitch0"]
    here = objects.add_switch("here", uplinks=["nic0"])
    here.set_uplink_ports({"vacant": "Vacant", "uplink1": "Left", "right": "Right"})
    here.set_uplink_ports({"uplink1": "Left", "right": "Right"})
    here.add_uplink("nic1")
    here.set_uplink_ports({"vacant": "Vacant", "uplink1": "Left", "right": "Right"})
    here.uplink_ports["vacant"].nested_tag = here.uplink_ports["right"].blocked = True
    before = at(here)
    assert before == {"vacant": None, "uplink1": "nic0", "right": "nic1"}
    backup, everything_before = objects.state(), without_numbers(everything(host))
    recable(CABLES[change], here, there)
    assert at(here) != before
    plan = objects.plan(backup, whole=True)
    plan.apply()
    assert at(here) == before and plan.changes == ()
    assert without_numbers(everything(host)) == everything_before


def test_room_for_a_port(host: simhost.Host, objects: Host) -> None:
    switch = objects.add_switch("small", max_ports=1)
    switch.add_port("a")
    ports = [{"id": "b"}, {"id": "a", "state": "absent"}]
    objects.plan({"switches": [{"alias": "small", "ports": ports}]}).apply()
    assert list(switch.ports) == ["b"]


def test_links(host: simhost.Host, lab: Switch, objects: Host) -> None:
    down = objects.plan({"uplinks": [{"name": "nic0", "link": "down"}]})
    assert down.changes == (Change("uplinks/nic0/link", "up", "down"),)
    down.apply()
    assert str(lab.uplinks["nic0"].link) == "down" and down.changes == ()
    objects.plan({"uplinks": [{"name": "nic0", "link": "up"}]}).apply()
    assert str(lab.uplinks["nic0"].link) == "up"


def test_addresses(lab: Switch, objects: Host) -> None:
    entries = [
        {"mac": "02-00-00-00-00-0A", "type": "static"},
        {"mac": "02:00:00:00:00:0b", "type": "user", "vlan": 7},
        {"mac": "02:00:00:00:00:0c"},
        {"mac": "02:00:00:00:00:01", "state": "absent"},
    ]
    plan = objects.plan(on_desk(macs=entries))
    assert [one.path for one in plan.changes] == [
        "lab/desk-1/macs/02:00:00:00:00:0a",
        "lab/desk-1/macs/02:00:00:00:00:0b/7",
        "lab/desk-1/macs/02:00:00:00:00:01",
    ]
    plan.apply()
    kept = {one.mac: one.type for one in lab.ports["desk-1"].macs}
    assert kept == {
        "02:00:00:00:00:02": MacType.LEARNED,
        "02:00:00:00:00:0a": MacType.STATIC,
        "02:00:00:00:00:0b": MacType.USER,
    }


def test_addresses_move_from_port_to_port(lab: Switch, objects: Host) -> None:
    static = {"mac": "02:00:00:00:00:01", "type": "static"}
    moves: Dict[str, Document] = {
        "desk-4": {"id": "desk-1", "macs": [{"mac": static["mac"], "state": "absent"}]},
        "desk-3": {"id": "desk-4", "state": "absent"},
    }
    for to, gone in moves.items():
        plan = objects.plan(on_lab(ports=[{"id": to, "macs": [static]}, gone]))
        plan.apply()
        assert [one.mac for one in lab.ports[to].macs] == [static["mac"]]


WRONG = {
    "switches[0].mtuu: unknown key; there are addresses, alias,": on_lab(mtuu=1),
    "swiches: unknown key; there are mac_learning, observed, options,": {"swiches": []},
    "switches[0].mtu: 99 is below 1280": on_lab(mtu=99),
    "switches[0].mtu: '1500' is not a whole number from 1280 to 9190": on_lab(mtu="1500"),
    "switches: {} is not a list": {"switches": {}},
    "switches[0]: 'lab' is not an object": {"switches": ["lab"]},
    "switches[0]: 'alias' is missing": {"switches": [{"mtu": 1500}]},
    "switches[0].alias: '' is not a text of 1 bytes at least": {"switches": [{"alias": ""}]},
    "switches[1]: switches[0] is about 'lab', too": {"switches": on_lab()["switches"] * 2},
    "switches[0].max_ports: 65 cannot be while the switch exists: it is 64": on_lab(max_ports=65),
    "switches[0].id: 'x' cannot be while the switch exists: it is 'lab-1'": on_lab(id="x"),
    "switches[0].uplinks[1]: the host has no uplink 'nic9'": on_lab(uplinks=["nic0", "nic9"]),
    "switches[0].uplinks[0]: the uplink 'nic4' is at switch 'vswitch0'": on_lab(uplinks=["nic4"]),
    "switches[0].uplink_ports[0]: 'left' and 'nic1' must be without one another first": on_lab(
        uplink_ports=[{"id": "left", "uplink": "nic1"}]
    ),
    "switches[0].uplinks[0]: switches[0].uplink_ports[0] has 'nic0'": on_lab(
        uplinks=[{"name": "nic0", "state": "absent"}],
        uplink_ports=[{"id": "left", "uplink": "nic0"}],
    ),
    "switches[0].lags[0]: no call makes link-aggregation groups": on_lab(
        lags=[{"name": "lag9", "uplinks": ["nic0"]}]
    ),
    "switches[0].counters: no call of the host sets it": on_lab(counters={}),
    "faults: no call of the host sets it": {"faults": []},
    "switches[0].mtu: what is to be absent has no more than 'alias'": on_lab(
        mtu=1500, state="absent"
    ),
    "switches[0].state: 'gone' is not one of absent": on_lab(state="gone"),
    "switches[0].running: 1 is not true or false": on_lab(running=1),
    "switches[0].teaming.balance: 'worst' is not one of none, ip, mac": on_lab(
        teaming={"balance": "worst"}
    ),
    "switches[0].ports[0].vlan.trunk[1]: 12 is not in rising order": on_desk(
        vlan={"trunk": ["10-12", 12]}
    ),
    "switches[0].ports[0].mirrors[0].to[0]: {} is not an object with one of": on_desk(
        mirrors=[{"sid": "x", "to": [{}]}]
    ),
    "switches[0].ports[0].mirrors[0]: 'sid' is missing": on_desk(mirrors=[{}]),
    "switches[0].ports[0].external_id: 'x' cannot be given while the port": on_desk(
        external_id="x"
    ),
    "switches[0].ports[0].macs[0].mac: 'x' is not six bytes": on_desk(macs=[{"mac": "x"}]),
    "switches[0].addresses[0]: beyond the uplinks there are only learned": on_lab(
        addresses=[{"mac": "02:00:00:00:00:0a", "type": "static"}]
    ),
    "switches[0].properties.k: must have one of the keys hex, text": on_lab(
        properties={"k": {"type": "config"}}
    ),
    "switches[0].properties.k.hex: '0' is not hexadecimal digits": on_lab(
        properties={"k": {"type": "config", "hex": "0"}}
    ),
    "options.Nope: unknown key; there are AllowFastPath": {"options": {"Nope": 1}},
    "options.IGMPVersion: 4 is above 3": {"options": {"IGMPVersion": 4}},
    "mac_learning.aging_time: 0 is below 1": {"mac_learning": {"aging_time": 0}},
    "uplinks[0]: no switch has the uplink 'nic3'": {"uplinks": [{"name": "nic3", "link": "up"}]},
    "uplinks[0].speed: unknown key; there are link, name, observed": {
        "uplinks": [{"name": "nic0", "speed": 7}]
    },
    "7 is not an object": 7,
}


@pytest.mark.parametrize("words", WRONG)
def test_what_is_wrong_with_a_document(
    host: simhost.Host, lab: Switch, objects: Host, words: str
) -> None:
    before = everything(host)
    with pytest.raises(DocumentError) as raised:
        objects.plan(WRONG[words])  # type: ignore[arg-type]
    assert str(raised.value).startswith(words)
    assert everything(host) == before


def test_what_the_host_refuses_is_rolled_back(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    before = everything(host)
    document = on_lab(mtu=1400, ports=[{"id": "new"}, {"id": "desk-4", "vlan": {"private": True}}])
    document["switches"][0]["ports"][1]["vlan"]["id"] = 999
    with pytest.raises(RolledBack, match="QEX_BAD_VLANID.*; everything is as it was before"):
        objects.plan(document).apply()
    assert everything(host) == before


def test_what_does_not_arrive_is_rolled_back(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    host.link("nic0").down()
    before = everything(host)
    plan = objects.plan(
        {"options": {"IGMPVersion": 1}, "uplinks": [{"name": "nic0", "link": "up"}]}
    )
    with pytest.raises(RolledBack, match="lab/nic0 is not up within 5 s"):
        plan.apply()
    assert everything(host) == before


def test_what_is_taken_back_is_read_back_too(
    host: simhost.Host, lab: Switch, objects: Host, monkeypatch: pytest.MonkeyPatch
) -> None:
    """A host that says yes, and does something else."""
    from libvswitch import checked
    from vswitch import _settings, _table

    def half_hearted(switch: str, mtu: int) -> None:
        checked.VSDVS_SetMTU(switch, mtu - 1)

    key = _table.SWITCH["mtu"].key
    monkeypatch.setitem(
        _settings.CROSSINGS, key, _settings.CROSSINGS[key]._replace(set=half_hearted)
    )
    before = everything(host)
    with pytest.raises(RolledBack, match="the host did not take it: lab/mtu: 1399 -> 1400; every"):
        objects.plan(on_lab(mtu=1400)).apply()
    assert everything(host) == before


def test_a_removal_that_is_taken_back_is_named(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    host.fault("VSDVS_DestroyVSwitch", status="QEX_BUSY")
    document: Document = {
        "switches": [
            {"alias": "lab", "ports": [{"id": "desk-2", "state": "absent"}]},
            {"alias": "vswitch0", "state": "absent"},
        ]
    }
    with pytest.raises(NotRestored) as raised:
        objects.plan(document).apply()
    (left,) = raised.value.left
    assert left.startswith("lab/desk-2: it was removed and added again")
