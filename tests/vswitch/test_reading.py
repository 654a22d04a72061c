"""What objects tell of a host, beside what the simulated host says of itself."""

import json
from typing import Any, Callable, Dict, List, Mapping

import pytest
import simhost
from vswitch import (
    Group,
    Host,
    HostError,
    Lag,
    LinkState,
    MacType,
    NotFound,
    NotSupported,
    Port,
    Switch,
    _table,
)

# What no call tells, or what objects have as attributes: counters, and the groups of ports.
NOT_SAID = {"persistent", "counters", "mirror_counters", "groups"}
ONLY_SIMULATED = {"clock", "faults"}


def without(described: Dict[str, Any], *names: str) -> Dict[str, Any]:
    return {key: value for key, value in described.items() if key not in {*names, "observed"}}


def by(name: str, things: List[Dict[str, Any]]) -> Dict[str, Dict[str, Any]]:
    return {thing[name]: thing for thing in things}


def test_the_state_is_what_the_host_says_of_itself(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    host.clock.stop()
    described, state = host.describe(), objects.state()
    assert json.loads(json.dumps(state)) == state
    assert set(described) - set(state) == ONLY_SIMULATED
    for key in ("runtime_options", "mac_learning"):
        assert state[key] == described[key]
    assert [one["alias"] for one in state["switches"]] == ["vswitch0", "lab"]
    for said, expected in zip(state["switches"], described["switches"]):
        told = without(said, "ports", "lags")
        assert told == without(expected, "ports", "lags", *NOT_SAID)
        lags = [without(one) for one in said["lags"]]
        assert lags == [without(one) for one in expected["lags"]]
        assert len(said["ports"]) == len(expected["ports"])
        for port, expected_port in zip(said["ports"], expected["ports"]):
            assert without(port) == without(expected_port, *NOT_SAID)
            observed = expected_port["observed"]
            assert port["observed"] == {key: observed[key] for key in ("number", "uplink")}


def test_the_lab_has_every_setting(lab: Switch) -> None:
    """What it has not, no test of all settings sees."""
    state = lab.state()
    assert set(_table.SWITCH) <= set(state)
    assert set(_table.PORT) <= set(state["ports"][0])
    assert set(_table.UPLINK_PORT) <= {
        key for port in state["uplink_ports"] for key in port if port["id"] == "left"
    }


def test_what_another_host_makes_of_the_state(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    """A state is a scenario document."""
    host.clock.stop()
    before = objects.state()
    host.reset()
    host.clock.stop()
    objects.switches["vswitch0"].remove()
    host.apply(before)
    after = objects.state()
    for state in (before, after):
        state.pop("uplinks")
        for port in (port for switch in state["switches"] for port in switch["ports"]):
            port.pop("observed")
    assert after == before


def test_uplinks(host: simhost.Host, lab: Switch, objects: Host) -> None:
    assert list(objects.uplinks) == ["nic4", "nic5", "nic0", "nic1"]
    uplink = objects.uplinks["nic0"]
    assert uplink == lab.uplinks["nic0"] and uplink.switch == lab and str(uplink) == "nic0"
    assert (uplink.port, uplink.path) == ("left", "lab/nic0")
    assert (uplink.link, uplink.lacp) == (LinkState.UP, LinkState.UP)
    host.link("nic0").down()
    assert uplink.link is LinkState.DOWN
    state = objects.state()["uplinks"]
    assert by("name", state)["nic0"]["observed"]["link"] == "down"
    with pytest.raises(NotFound, match="'nic2' is at no switch"):
        objects.uplinks["nic2"]
    with pytest.raises(NotFound, match="no uplink 'nope'"):
        objects.uplinks["nope"]
    with pytest.raises(KeyError, match=r"no uplink 'nic4' of switch 'lab' \(it has nic0, nic1\)"):
        lab.uplinks["nic4"]


def test_what_no_call_tells_of_an_uplink(lab: Switch) -> None:
    said = "lab/nic0: no call of a host tells the speed of an uplink"
    with pytest.raises(NotSupported, match=f"^{said}$"):
        lab.uplinks["nic0"].speed


def test_uplink_ports(lab: Switch) -> None:
    ports = lab.uplink_ports
    assert list(ports) == ["left", "spare"]
    assert [(port.name, str(port.uplink)) for port in ports.values()] == [
        ("Left", "nic0"),
        ("spare", "nic1"),
    ]
    with pytest.raises(NotFound, match=r"no uplink port 'x' of switch 'lab' \(it has left, spare"):
        ports["x"]


def test_lags(host: simhost.Host, lab: Switch, objects: Host) -> None:
    assert lab.lags == (Lag("lag1", LinkState.UP, ("nic0", "nic1")),)
    host.link("nic0").down()
    host.link("nic1").down()
    assert lab.lags[0].link is LinkState.DOWN
    assert objects.switches["vswitch0"].lags == ()


def test_what_a_port_tells(host: simhost.Host, desk: Port, lab: Switch) -> None:
    described = host.describe()["switches"][1]["ports"][0]
    assert desk.number == described["observed"]["number"]
    assert desk.path == "lab/desk-1" and str(desk) == "desk-1"
    assert desk.groups == (
        Group("01:00:5e:01:01:01"),
        Group("239.1.1.1", 3, "include", ("192.0.2.7",), 7),
        Group("ff02::fb", 2, "exclude"),
    )
    stats = desk.stats
    assert (stats.pktsInUnicast, stats.numMACsMoved, stats.numMACsLearned) == (100, 4, 1)
    assert desk.carrier == lab.uplinks["nic0"]
    assert desk.link is LinkState.DOWN
    ports = host.describe()["switches"][1]["ports"]
    observed = {port["id"]: port["observed"]["uplink"] for port in ports}
    assert {id_: str(uplink) for id_, uplink in lab.carriers().items()} == observed
    for name in ("nic0", "nic1"):
        host.link(name).down()
    assert desk.carrier is None and set(lab.carriers().values()) == {None}


def test_what_a_switch_tells(host: simhost.Host, lab: Switch) -> None:
    assert (lab.identifier, lab.portset, lab.version, lab.max_ports) == (
        "lab-1",
        "lab-ports",
        200,
        64,
    )
    host.set_counter("lab", "txErrors", 3)
    host.set_counter("lab", "rarpPktsSent", 12)
    assert (lab.stats.txErrors, lab.stats.rarpPktsSent) == (3, 12)
    host.set_counter("lab", "mirroredPkts", 1000, session="audit")
    assert list(lab.mirrors) == ["audit"] and lab.mirrors["audit"].mirroredPkts == 1000


def test_addresses_are_found_in_any_spelling(lab: Switch, objects: Host) -> None:
    spellings = ("02:00:00:00:00:02", "02-00-00-00-00-02", "0200.0000.0002", "020000000002")
    for spelling in spellings:
        (entry,) = objects.find_mac(spelling)
        assert (entry.switch, entry.port, entry.vlan, entry.vni) == ("lab", "desk-1", 10, 7)
        assert entry.type is MacType.LEARNED and entry.ages
    assert entry.words() in lab.ports["desk-1"].state()["addresses"]
    (beyond,) = objects.find_mac("02:00:00:00:00:09")
    assert (beyond.switch, beyond.port) == ("lab", None)
    assert objects.find_mac("02:00:00:00:00:77") == ()
    with pytest.raises(ValueError, match="mac: 'nonsense' is not six bytes"):
        objects.find_mac("nonsense")


def test_a_switch_that_does_not_run(host: simhost.Host, lab: Switch, objects: Host) -> None:
    lab.running = False
    assert not lab.running and not host.describe()["switches"][1]["running"]
    state = objects.state()
    assert [one["running"] for one in state["switches"]] == [True, False]
    assert state["switches"][1]["mtu"] == 9000 and "addresses" not in state["switches"][1]
    assert list(objects.uplinks) == ["nic4", "nic5"]
    assert objects.find_mac("02:00:00:00:00:02") == ()
    with pytest.raises(ValueError, match="running: 1 is not true or false"):
        lab.running = 1  # type: ignore[assignment]
    lab.running = True
    assert lab.running and len(objects.uplinks) == 4


def test_mappings_are_live(host: simhost.Host, objects: Host) -> None:
    switches = objects.switches
    assert list(switches) == ["vswitch0"] and "lab" not in switches and len(switches) == 1
    host.apply({"switches": [{"alias": "lab"}]})
    assert "lab" in switches and len(switches) == 2 and switches.get("nope") is None
    assert repr(switches) == "<switches: vswitch0, lab>"
    ports = switches["vswitch0"].ports
    assert list(ports) == ["web-1", "web-2", "db-1"] and ports.get("3") is None
    assert [port.path for port in objects.ports()] == [
        "vswitch0/web-1",
        "vswitch0/web-2",
        "vswitch0/db-1",
    ]


def test_what_is_not_there_says_what_is(objects: Host) -> None:
    ports = objects.switches["vswitch0"].ports
    expected: Dict[str, Callable[[], object]] = {
        "no switch 'nope' (there are vswitch0)": lambda: objects.switches["nope"],
        "no port 'nope' of switch 'vswitch0' (it has db-1, web-1, web-2)": lambda: ports["nope"],
        "'uplink1' of switch 'vswitch0' is an uplink port": lambda: ports["uplink1"],
    }
    for words, look_up in expected.items():
        with pytest.raises(KeyError) as raised:
            look_up()
        assert isinstance(raised.value, NotFound) and str(raised.value) == words


def look_ups(objects: Host, lab: Switch) -> Dict[str, Callable[[Any], object]]:
    """Every way to look something up by a name."""
    mappings: Dict[str, Mapping[str, object]] = {
        "switches": objects.switches,
        "uplinks": objects.uplinks,
        "options": objects.options,
        "ports": lab.ports,
        "uplink_ports": lab.uplink_ports,
        "uplinks of a switch": lab.uplinks,
        "mirrors": lab.mirrors,
    }
    ways: Dict[str, Callable[[Any], object]] = {
        name: mapping.__getitem__ for name, mapping in mappings.items()
    }
    ways["del options"] = lambda name: objects.options.__delitem__(name)
    ways["set options"] = lambda name: objects.options.__setitem__(name, 1)
    ways["find_port"] = lab.find_port
    for thing in (lab, lab.host_part, lab.ports["desk-1"]):
        ways[f"get_property of {thing.path}"] = thing.get_property
    for name in ("nope", 7):
        assert all(name not in mapping for mapping in mappings.values())
    return ways


@pytest.mark.parametrize("name", ["v\udcff", "a\0b", "x" * 32, "x" * 5000, "nope", ""])
def test_what_is_no_name_is_not_found(name: str, objects: Host, lab: Switch) -> None:
    """Whether a call can be asked about it or not."""
    for way, look_up in look_ups(objects, lab).items():
        with pytest.raises(NotFound) as raised:
            look_up(name)
        assert isinstance(raised.value, KeyError) and repr(name) in str(raised.value), way
    for mapping in (objects.switches, objects.uplinks, objects.options, lab.ports, lab.mirrors):
        assert name not in mapping and mapping.get(name) is None


@pytest.mark.parametrize("name", [7, None, b"desk-1", ["desk-1"]])
def test_what_is_no_text_is_a_mistake(name: Any, objects: Host, lab: Switch) -> None:
    for way, look_up in look_ups(objects, lab).items():
        with pytest.raises(TypeError, match=f"found by a str, not by {type(name).__name__}"):
            look_up(name)
    assert name not in lab.ports and name not in objects.options


def test_what_goes_while_somebody_looks(
    host: simhost.Host, lab: Switch, objects: Host, monkeypatch: pytest.MonkeyPatch
) -> None:
    from libvswitch import checked

    look = Port.properties

    def meanwhile(port: Port) -> Any:
        if "desk-2" in lab.ports:
            checked.VSDVS_RemoveDVPort("lab", "desk-2")
            checked.VSDVS_RemoveDVPort("lab", port.id)
        return look(port)

    monkeypatch.setattr(Port, "properties", meanwhile)
    assert [one["id"] for one in lab.state()["ports"]] == ["desk-3", "desk-4"]
    monkeypatch.undo()
    host.fault("DVSState_PortFind", panic=(OSError, "the device is gone"))
    with pytest.raises(HostError, match="the device is gone"):
        objects.state()


def test_objects_outlive_what_they_stand_for(lab: Switch, desk: Port) -> None:
    lab.remove()
    of_switch: List[Callable[[], object]] = [
        lambda: lab.mtu,
        lambda: lab.identifier,
        lambda: lab.max_ports,
        lab.state,
    ]
    for ask in of_switch:
        with pytest.raises(NotFound, match=r"no switch 'lab' \(there are vswitch0\)"):
            ask()
    of_port: List[Callable[[], object]] = [
        lambda: desk.vlan,
        lambda: desk.number,
        lambda: desk.is_set("vlan"),
        desk.state,
    ]
    for ask in of_port:
        with pytest.raises(NotFound, match="no switch 'lab'"):
            ask()
    assert not lab.exists() and not desk.exists()


def test_external_names(objects: Host) -> None:
    switch = objects.switches["vswitch0"]
    added = switch.add_port("opaque", external_id="7f3a", connection=9)
    assert added.external_id == "7f3a" and added.connection == 9
    assert switch.find_port("7f3a") == added and switch.find_port("7f3a").external_id == "7f3a"
    assert switch.ports["opaque"].external_id is None
    assert added.state()["external_id"] == "7f3a"
    with pytest.raises(NotFound, match="no port .* is called 'nope' by another system"):
        switch.find_port("nope")


def test_a_simulated_host_is_told(objects: Host) -> None:
    assert objects.simulated and repr(objects) == "<Host (simulated): vswitch0>"
    with pytest.raises(HostError, match="this host is simulated, and a real one is wanted"):
        Host(simulated=False)


@pytest.mark.leaves_host_memory("the test would not notice what it looks for")
def test_nothing_is_left_out(host: simhost.Host, lab: Switch, objects: Host) -> None:
    before = host.ledger()
    objects.state()
    assert host.ledger() == before
