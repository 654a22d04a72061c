"""Blocks of changes: what is put back, byte for byte, and what is said of the rest."""

import asyncio
import threading
from typing import Any, Callable, Dict, Optional, Union

import libvswitch as vs
import pytest
import simhost
from libvswitch import checked
from test_settings import PORT, SWITCH, attribute
from vswitch import (
    Host,
    HostError,
    LinkState,
    MacLearning,
    NotRestored,
    Port,
    RolledBack,
    Switch,
    Trapped,
    Vlan,
    _table,
)

CONFIG = _table.PROPERTY_TYPES["config"]
RUNTIME = _table.PROPERTY_TYPES["runtime"]


class Stop(Exception):
    """What ends a block."""


def everything(host: simhost.Host) -> Dict[str, Any]:
    """The host, with all properties byte for byte."""
    described = host.describe()
    for key in ("clock", "faults"):
        described.pop(key)
    for switch in described["switches"]:
        switch["counters"].clear()
    described["bytes"] = {
        (checked.DVS_SwitchName(handle), where): sorted(items)
        for handle in checked.DVSState_SwitchForEach()
        for where, items in [
            ("", checked.DVSState_GlobalPropForEach(handle)),
            ("host", checked.DVSState_HostPropForEach(handle)),
            *[
                (checked.DVS_PortId(port), checked.DVSState_PortDataForEach(port))
                for port in checked.DVSState_PortForEach(handle)
            ],
        ]
    }
    return described


@pytest.fixture(autouse=True)
def stopped(host: simhost.Host) -> None:
    host.clock.stop()


def rolled_back(host: simhost.Host, objects: Host, change: Callable[[], object]) -> RolledBack:
    """Makes a change in a block that fails; nothing of it is left."""
    before = everything(host)
    with pytest.raises(RolledBack) as raised:
        with objects.transaction():
            change()
            assert everything(host) != before
            raise Stop("that is all")
    assert type(raised.value) is RolledBack
    assert isinstance(raised.value.__cause__, Stop)
    assert str(raised.value) == "that is all; everything is as it was before"
    assert everything(host) == before
    return raised.value


def other(thing: Union[Switch, Port], name: str, value: Any) -> Any:
    """A value that it has not."""
    return not value if getattr(thing, name) == value else value


@pytest.mark.parametrize("name", SWITCH)
@pytest.mark.parametrize("clears", [False, True])
def test_settings_of_a_switch(
    host: simhost.Host, lab: Switch, objects: Host, name: str, clears: bool
) -> None:
    if name in ("mac_learning",):
        # A shorter time would take learned addresses with it.
        change: Callable[[], object] = lambda: setattr(lab, name, MacLearning(1000, 500, True))
    elif clears:
        change = lambda: delattr(lab, name)  # noqa: E731
    else:
        change = lambda: setattr(lab, name, other(lab, name, SWITCH[name][0]))  # noqa: E731
    rolled_back(host, objects, change)


@pytest.mark.parametrize("name", PORT)
@pytest.mark.parametrize("where", ["desk-1", "desk-4"])
def test_settings_of_a_port(
    host: simhost.Host, lab: Switch, objects: Host, name: str, where: str
) -> None:
    port = lab.ports[where]
    value = other(port, attribute(name), PORT[name][0])
    rolled_back(host, objects, lambda: setattr(port, attribute(name), value))


@pytest.mark.parametrize("name", PORT)
def test_settings_of_a_port_that_are_cleared(
    host: simhost.Host, desk: Port, objects: Host, name: str
) -> None:
    rolled_back(host, objects, lambda: delattr(desk, attribute(name)))


@pytest.mark.parametrize("priority", [None, 5])
@pytest.mark.parametrize("after", [Vlan(9, "20-30", 6), Vlan(9), None])
def test_vlan_and_priority_are_undone_whole(
    host: simhost.Host, bare: Port, objects: Host, priority: Optional[int], after: Optional[Vlan]
) -> None:
    """One call sets two properties, and clears the second when there is no priority."""
    bare.vlan = Vlan(7, "10-12", priority)

    def change() -> None:
        if after is None:
            del bare.vlan
        else:
            bare.vlan = after

    rolled_back(host, objects, change)
    keys = set(bare.properties())
    assert (vs.VSPROP_PORT_PRIORITY in keys) is (priority is not None)


@pytest.mark.parametrize("before", [Vlan(7, "10-12", 5), Vlan(7), None])
def test_vlan_and_priority_come_back_in_one_call(
    host: simhost.Host, bare: Port, objects: Host, before: Optional[Vlan]
) -> None:
    """Whoever looks meanwhile, or is killed, has one without the other in no case."""
    if before is not None:
        bare.vlan = before

    def change() -> None:
        bare.vlan = Vlan(9, priority=6)
        for call in ("DVSQEX_PortDataSet", "DVSQEX_PortDataClear"):
            host.fault(call, times=0, status="QEX_BUSY")

    rolled_back(host, objects, change)
    host.clear_faults()
    assert bare.is_set("vlan") is (before is not None) and bare.vlan == (before or Vlan())


def test_a_priority_alone_is_undone_whole(host: simhost.Host, bare: Port, objects: Host) -> None:
    bare.set_property(vs.VSPROP_PORT_PRIORITY, b"\3\0\0\0", RUNTIME)
    assert bare.is_set("vlan") and bare.vlan == Vlan(priority=3)
    rolled_back(host, objects, lambda: setattr(bare, "vlan", Vlan(7, priority=1)))


def test_bytes_and_types_that_no_typed_call_writes(
    host: simhost.Host, bare: Port, lab: Switch, objects: Host
) -> None:
    known = _table.PORT["uplink"]
    bare.set_property(known.key, b"left\0", RUNTIME)
    rolled_back(host, objects, lambda: setattr(bare, "uplink", "spare"))
    rolled_back(host, objects, lambda: bare.set_property(known.key, b"left\0", CONFIG))
    for thing in (lab, lab.host_part, bare, lab.uplink_ports["left"]):
        thing.set_property("com.example.x", b"\1", RUNTIME)
        rolled_back(host, objects, lambda: thing.set_property("com.example.x", b"", CONFIG))
        rolled_back(host, objects, lambda: thing.clear_property("com.example.x"))
        rolled_back(host, objects, lambda: thing.set_property("com.example.y", b"1", CONFIG))


def test_what_is_written_twice(host: simhost.Host, bare: Port, desk: Port, objects: Host) -> None:
    def change() -> None:
        for vlan in (1, 2, 3):
            bare.vlan = desk.vlan = Vlan(vlan)
        del bare.vlan
        bare.vlan = Vlan(4)

    rolled_back(host, objects, change)


def test_the_host_itself(host: simhost.Host, lab: Switch, objects: Host) -> None:
    rolled_back(host, objects, lambda: objects.options.update({"IGMPVersion": 1, "IGMPQueries": 3}))
    rolled_back(host, objects, lambda: setattr(objects, "mac_learning", MacLearning()))


def test_what_is_added(host: simhost.Host, lab: Switch, objects: Host) -> None:
    def add() -> None:
        lab.add_port("new", external_id="7f", connection=3).vlan = Vlan(7)
        lab.ports["new"].mirrors = lab.ports["desk-1"].mirrors
        switch = objects.add_switch("new", mtu=9000, uplinks=["nic2", "nic3"])
        switch.add_port("a").forbids = "promiscuous"
        switch.uplinks["nic2"].remove()

    rolled_back(host, objects, add)


def test_uplinks_that_come_and_go(host: simhost.Host, lab: Switch, objects: Host) -> None:
    rolled_back(host, objects, lambda: lab.add_uplink("nic2"))


def test_an_uplink_at_a_port_that_was_vacant(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    """The host takes an uplink with its port."""
    lab.set_uplink_ports({"left": "Left", "spare": "spare", "vacant": "Vacant"})
    before, number = without_numbers(everything(host)), lab.uplink_ports["vacant"].number
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            assert lab.add_uplink("nic2").port == "vacant"
            raise Stop("that is all")
    assert without_numbers(everything(host)) == before
    now = lab.uplink_ports["vacant"].number
    assert raised.value.left == (f"lab/vacant: its number was {number} and is {now}",)


def test_links(host: simhost.Host, lab: Switch, objects: Host) -> None:
    rolled_back(host, objects, lambda: lab.uplinks["nic0"].set_link("down"))
    lab.uplinks["nic0"].set_link(LinkState.DOWN)
    rolled_back(host, objects, lambda: lab.uplinks["nic0"].set_link("up"))


def test_whether_a_switch_runs(host: simhost.Host, objects: Host) -> None:
    switch = objects.add_switch("quiet")
    rolled_back(host, objects, lambda: setattr(switch, "running", False))
    switch.running = False
    rolled_back(host, objects, lambda: setattr(switch, "running", True))


def test_what_a_switch_has_that_does_not_run(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    """No port of it has a number."""
    lab.running = False
    names = {"left": "Links", "spare": "spare", "new": "new"}
    rolled_back(host, objects, lambda: lab.set_uplink_ports(names))
    rolled_back(host, objects, lambda: lab.add_port("new", external_id="7f"))
    lab.ports["desk-4"].vlan = Vlan(7, priority=3)
    before = lab.state()
    removals: Dict[str, Callable[[], None]] = {
        "lab/spare: the uplink that it has": lambda: lab.set_uplink_ports({"left": "Left"}),
        "lab/desk-4: it was removed and added again: what it": lab.ports["desk-4"].remove,
        "lab: it was removed and added again": lab.remove,
    }
    for words, remove in removals.items():
        with pytest.raises(NotRestored) as raised:
            with objects.transaction():
                remove()
                raise Stop("that is all")
        assert lab.state() == before
        assert raised.value.left[0].startswith(words)
    assert raised.value.left[-2:] == (
        "lab/left: the uplink that it has when it runs",
        "lab/spare: the uplink that it has when it runs",
    )
    # No call tells of them before.
    lab.running = True
    assert list(lab.uplinks) == []


def without_numbers(described: Dict[str, Any]) -> Dict[str, Any]:
    """What is set; a port that is added again has learned and counted nothing."""
    described.pop("bytes")
    for switch in described["switches"]:
        switch["addresses"] = []
        switch["counters"] = switch["mirror_counters"] = {}
        for port in switch["ports"]:
            port["addresses"] = [one for one in port["addresses"] if one["type"] == "static"]
            port["groups"], port["counters"], port["observed"] = [], {}, {}
        for ports in ("ports", "uplink_ports"):
            switch[ports].sort(key=lambda port: port["id"])
        switch["uplinks"].sort()
        switch["lags"] = []
    for uplink in described["uplinks"]:
        uplink.pop("observed", None)
    return described


def test_a_port_that_was_removed(host: simhost.Host, desk: Port, objects: Host) -> None:
    before = without_numbers(everything(host))
    number = desk.number
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            desk.remove()
            raise Stop("that is all")
    assert without_numbers(everything(host)) == before
    (left,) = raised.value.left
    assert left.startswith(
        f"lab/desk-1: it was removed and added again: its number was {number} and is {desk.number};"
    )
    assert str(raised.value) == f"that is all; not as it was: {left}"


def test_what_fails_while_a_port_comes_back(host: simhost.Host, desk: Port, objects: Host) -> None:
    """What can be put back is, and what cannot is named."""
    before = everything(host)["bytes"]["lab", "desk-1"]
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            desk.remove()
            host.fault("DVSQEX_PortDataSet", nth=3, status="QEX_BUSY")
            host.fault("VSQEX_SetPortMACTable", times=0, status="QEX_BUSY")
            raise Stop("that is all")
    now = everything(host)["bytes"]["lab", "desk-1"]
    assert len([item for item in before if item in now]) > 10
    assert [line.split(": ")[1] for line in raised.value.left[1:]] == ["blocked", "macs"]


def test_a_switch_that_was_removed(host: simhost.Host, lab: Switch, objects: Host) -> None:
    before = without_numbers(everything(host))
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            lab.remove()
            raise Stop("that is all")
    assert without_numbers(everything(host)) == before
    left = raised.value.left
    assert left[0].startswith("lab: it was removed and added again")
    assert any(line.startswith("lab: lags") for line in left)
    assert any(line.startswith("lab/desk-1: it was removed") for line in left)


def test_an_uplink_that_was_removed(host: simhost.Host, lab: Switch, objects: Host) -> None:
    before = without_numbers(everything(host))
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            lab.uplinks["nic0"].remove()
            raise Stop("that is all")
    assert without_numbers(everything(host)) == before
    assert any("lab/left: its number was" in line for line in raised.value.left)


def test_transactions_in_transactions(host: simhost.Host, bare: Port, objects: Host) -> None:
    def change() -> None:
        with objects.transaction():
            bare.vlan = 1
        with pytest.raises(RolledBack):
            with objects.transaction():
                bare.vlan = 2
                bare.alias = "x"
                raise Stop("inside")
        assert bare.vlan == Vlan(1) and not bare.is_set("alias")

    rolled_back(host, objects, change)


def test_what_goes_and_comes_and_goes(host: simhost.Host, lab: Switch, objects: Host) -> None:
    def change() -> None:
        lab.add_port("new").vlan = 7
        lab.ports["new"].remove()
        lab.add_port("new").vlan = 8

    rolled_back(host, objects, change)
    before = without_numbers(everything(host))
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            lab.ports["desk-1"].vlan = 1
            lab.ports["desk-1"].remove()
            lab.add_port("desk-1").vlan = 2
            raise Stop("that is all")
    assert without_numbers(everything(host)) == before
    (left,) = raised.value.left
    assert left.startswith("lab/desk-1: it was removed and added again: its number was ")


def test_a_block_that_ends_well(bare: Port, objects: Host) -> None:
    with objects.transaction():
        bare.vlan = 7
    assert bare.vlan == Vlan(7)
    with pytest.raises(HostError):
        with objects.transaction():
            bare.switch.ports["nope"]
    assert bare.vlan == Vlan(7)


def test_what_ends_the_program_goes_on_doing_so(
    host: simhost.Host, bare: Port, objects: Host
) -> None:
    before = everything(host)
    with pytest.raises(KeyboardInterrupt):
        with objects.transaction():
            bare.vlan = 7
            raise KeyboardInterrupt
    assert everything(host) == before


@pytest.mark.parametrize("done", [False, True])
def test_putting_back_goes_on_to_its_end(
    host: simhost.Host, bare: Port, objects: Host, interrupt: Callable[..., None], done: bool
) -> None:
    """Whoever interrupts it sees the program end, when everything is as it was."""
    before = everything(host)
    interrupt("DVSQEX_PortDataClear", done=done)
    with pytest.raises(KeyboardInterrupt):
        with objects.transaction():
            bare.blocked = True
            bare.vlan = 7
            raise Stop("that is all")
    assert everything(host) == before


def test_what_others_do_meanwhile_stays(host: simhost.Host, lab: Switch, objects: Host) -> None:
    """In another thread, or in another task of the same."""
    desk, bare = lab.ports["desk-3"], lab.ports["desk-4"]
    with pytest.raises(RolledBack):
        with objects.transaction():
            bare.vlan = 8
            other = threading.Thread(target=setattr, args=(desk, "vlan", 9))
            other.start()
            other.join()
            raise Stop
    assert desk.vlan == Vlan(9) and not bare.is_set("vlan")

    async def first(there: asyncio.Event, done: asyncio.Event) -> None:
        with objects.transaction():
            bare.vlan = 8
            there.set()
            await done.wait()
            bare.alias = "x"
            raise Stop

    async def second(there: asyncio.Event, done: asyncio.Event) -> None:
        await there.wait()
        with objects.transaction():
            desk.vlan = 10
        desk.alias = "y"
        done.set()

    async def main() -> None:
        events = asyncio.Event(), asyncio.Event()
        raised, nothing = await asyncio.gather(
            first(*events), second(*events), return_exceptions=True
        )
        assert type(raised) is RolledBack and nothing is None

    asyncio.run(main())
    assert desk.vlan == Vlan(10) and desk.alias == "y"
    assert not bare.is_set("vlan") and not bare.is_set("alias")


def test_errors_keep_the_words_of_their_time(lab: Switch, objects: Host) -> None:
    with pytest.raises(RolledBack, match=r"no port 'x' of switch 'lab' \(it has a, desk-1, "):
        with objects.transaction():
            lab.add_port("a")
            lab.ports["x"]


def test_what_cannot_be_put_back_is_named(host: simhost.Host, bare: Port, objects: Host) -> None:
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            bare.vlan = Vlan(7)
            bare.alias = "x"
            host.fault("VSDVS_ClearPortVLANPolicy", times=0, status="QEX_BUSY")
            host.fault("DVSQEX_PortDataClear", times=0, panic=(OSError, "the device is gone"))
            raise Stop("that is all")
    assert raised.value.left == ("lab/desk-4: vlan", "lab/desk-4: alias")
    assert isinstance(raised.value.__cause__, Stop) and isinstance(raised.value, RolledBack)
    assert str(raised.value).startswith("that is all; not as it was: lab/desk-4: vlan; lab/desk-4:")


def test_a_switch_with_the_path_of_a_port(host: simhost.Host, objects: Host) -> None:
    """What is left of one is not hidden by the other, which is gone as it should be."""
    other = objects.add_switch("new/a")
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            objects.add_switch("new").add_port("a")
            other.disabled = True
            host.fault("DVSQEX_GlobalPropClear", times=0, status="QEX_BUSY")
            raise Stop("that is all")
    assert raised.value.left == ("new/a: disabled",)
    assert list(objects.switches) == ["vswitch0", "new/a"]


def test_what_nobody_can_tell_is_named(host: simhost.Host, bare: Port, objects: Host) -> None:
    with pytest.raises(NotRestored) as raised:
        with objects.transaction():
            bare.alias = "x"
            host.fault("DVSState_PortDataForEach", times=0, panic=(OSError, "the device is gone"))
            raise Stop("that is all")
    (left,) = raised.value.left
    assert left.startswith("lab/desk-4: alias (nobody knows: DVSState_PortDataForEach(")


def test_a_trap_is_the_cause(host: simhost.Host, bare: Port, objects: Host) -> None:
    before = everything(host)
    host.fault("VSDVS_SetPortTeamingOverride", panic=(OSError, "the device is gone"))
    with pytest.raises(RolledBack) as raised:
        with objects.transaction():
            bare.vlan = Vlan(7)
            bare.uplink = "left"
    assert isinstance(raised.value.__cause__, Trapped)
    assert everything(host) == before
