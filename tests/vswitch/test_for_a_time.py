"""What lasts for the time of a block, or is looked for again and again: sessions, links, events."""

import asyncio
from typing import Any, Callable, List

import pytest
import simhost
from vswitch import (
    DocumentError,
    Event,
    Host,
    HostError,
    LinkState,
    MirrorEnd,
    NotRestored,
    Port,
    Switch,
    Trapped,
)


class Stop(Exception):
    """What ends a block."""


# Mirror sessions


def test_a_port_is_mirrored_for_a_block(host: simhost.Host, lab: Switch, bare: Port) -> None:
    with bare.mirrored(to=lab.ports["desk-3"], snap_length=64) as mirroring:
        (mirror,) = bare.mirrors
        assert mirror == mirroring.mirror and mirror.snap_length == 64
        assert mirror.to == (MirrorEnd(port="desk-3"),)
        assert mirror.received_by == mirror.sent_by == (MirrorEnd(port="desk-4"),)
        host.set_counter("lab", "mirroredPkts", 7, session=mirror.sid)
        assert mirroring.stats.mirroredPkts == 7
        samples = list(mirroring.sample(seconds=0.05, every=0.02))
        assert 2 <= len(samples) <= 4 and {one.mirroredPkts for one in samples} == {7}
    assert bare.mirrors == ()


@pytest.mark.parametrize("raised", [Stop, KeyboardInterrupt, GeneratorExit])
def test_the_session_is_removed_whatever_happens(bare: Port, raised: Any) -> None:
    with pytest.raises(raised):
        with bare.mirrored(to="desk-3"):
            assert bare.mirrors
            raise raised
    assert bare.mirrors == ()


def test_other_sessions_stay(desk: Port) -> None:
    before = desk.mirrors
    with desk.mirrored(to=desk.switch.uplinks["nic0"]), desk.mirrored(to=MirrorEnd(vlan=7)):
        assert len(desk.mirrors) == len(before) + 2
    assert desk.mirrors == before


def test_a_session_that_is_refused(desk: Port) -> None:
    before = desk.mirrors
    with pytest.raises(HostError):
        with desk.mirrored(to="desk-2", sid="audit"):
            raise AssertionError("the block does not begin")
    assert desk.mirrors == before
    with pytest.raises(DocumentError, match="Mirror.snap_length: -1 is below 0"):
        desk.mirrored(to="desk-2", snap_length=-1)
    with pytest.raises(DocumentError, match="MirrorEnd.port: 7 is not a text"):
        desk.mirrored(to=7)  # type: ignore[arg-type]


def test_a_session_of_which_nobody_knows_whether_it_is_there(
    bare: Port, monkeypatch: pytest.MonkeyPatch
) -> None:
    from libvswitch import checked

    append = checked.VSDVS_AppendDVMirrorSessions

    def late(switch: str, port: str, sessions: Any) -> None:
        append(switch, port, sessions)
        raise Trapped("the call trapped when all was done")

    monkeypatch.setattr(checked, "VSDVS_AppendDVMirrorSessions", late)
    with pytest.raises(Trapped):
        with bare.mirrored(to="desk-3"):
            raise AssertionError("the block does not begin")
    assert bare.mirrors == ()


@pytest.mark.parametrize(
    "call, done", [("Append", True), ("Append", False), ("Remove", False), ("Remove", True)]
)
def test_a_session_that_is_interrupted(
    bare: Port, interrupt: Callable[..., None], call: str, done: bool
) -> None:
    interrupt(f"VSDVS_{call}DVMirrorSession{'s' if call == 'Append' else ''}", done=done)
    with pytest.raises(KeyboardInterrupt):
        with bare.mirrored(to="desk-3"):
            assert call == "Remove", "the block does not begin"
    assert bare.mirrors == ()


def test_a_session_that_somebody_else_removed(bare: Port) -> None:
    with bare.mirrored(to="desk-3"):
        bare.mirrors = ()
    assert bare.mirrors == ()


def test_a_session_that_cannot_be_removed_is_named(host: simhost.Host, bare: Port) -> None:
    with pytest.raises(NotRestored) as raised:
        with bare.mirrored(to="desk-3", sid="stays"):
            host.fault("VSDVS_RemoveDVMirrorSession", status="QEX_BUSY")
    assert raised.value.left == ("lab/desk-4: mirror session stays",)


# Links


def test_an_uplink_is_taken_down_for_a_block(lab: Switch) -> None:
    port = lab.ports["desk-3"]
    uplink = port.carrier
    assert uplink is not None
    other = {"nic0": "nic1", "nic1": "nic0"}[uplink.name]
    with uplink.taken_down():
        assert uplink.link is LinkState.DOWN and str(port.carrier) == other
    assert str(uplink.link) == "up" and port.carrier == uplink


@pytest.mark.parametrize("raised", [Stop, KeyboardInterrupt])
def test_an_uplink_comes_up_whatever_happens(lab: Switch, raised: Any) -> None:
    with pytest.raises(raised):
        with lab.uplinks["nic0"].taken_down():
            raise raised
    assert lab.uplinks["nic0"].link is LinkState.UP


@pytest.mark.parametrize("nth, done", [(1, True), (2, False), (2, True)])
def test_an_uplink_comes_up_though_that_is_interrupted(
    lab: Switch, interrupt: Callable[..., None], nth: int, done: bool
) -> None:
    """The first call takes it down, the second one up."""
    interrupt("VSQEX_SetUplinkAdminLinkState", nth=nth, done=done)
    with pytest.raises(KeyboardInterrupt):
        with lab.uplinks["nic0"].taken_down():
            assert nth == 2, "the block does not begin"
    assert lab.uplinks["nic0"].link is LinkState.UP


def test_an_uplink_whose_cable_goes_meanwhile(host: simhost.Host, lab: Switch) -> None:
    with pytest.raises(NotRestored) as raised:
        with lab.uplinks["nic0"].taken_down(timeout=0.01):
            host.link("nic0").down()
    assert raised.value.left == ("lab/nic0: link",)


def test_an_uplink_that_is_down_already(host: simhost.Host, lab: Switch) -> None:
    host.link("nic0").down()
    with pytest.raises(HostError, match="lab/nic0 is down already"):
        with lab.uplinks["nic0"].taken_down():
            raise AssertionError("the block does not begin")
    host.link("nic0").up()
    assert lab.uplinks["nic0"].link is LinkState.UP


def test_an_uplink_that_does_not_go_down(host: simhost.Host, lab: Switch) -> None:
    host.fault("VSQEX_SetUplinkAdminLinkState", panic=(OSError, "the device is gone"))
    with pytest.raises(Trapped):
        with lab.uplinks["nic0"].taken_down():
            raise AssertionError("the block does not begin")
    assert lab.uplinks["nic0"].link is LinkState.UP


def test_waiting_for_a_link(lab: Switch) -> None:
    lab.uplinks["nic0"].wait("up")
    with pytest.raises(TimeoutError, match="lab/nic0 is not down within 0.01 s"):
        lab.uplinks["nic0"].wait(LinkState.DOWN, timeout=0.01)
    with pytest.raises(DocumentError, match="state: 'sideways' is not one of up, down"):
        lab.uplinks["nic0"].wait("sideways")


# Events


def told(events: List[Event]) -> List[str]:
    return [f"{event.kind}: {event}" for event in events]


def test_what_changes_is_an_event(host: simhost.Host, lab: Switch, objects: Host) -> None:
    events = objects.watch(every=0.01, seconds=0)
    lab.mtu = 1400
    lab.ports["desk-3"].remove()
    lab.add_port("new").alias = "x"
    host.link("nic0").down()
    host.learn("lab", "02:00:00:00:0a:01", "desk-1", vlan=10)
    objects.options["IGMPVersion"] = 1
    found = told(list(events))
    assert [line for line in found if not line.startswith("carrier")] == [
        "port: lab/desk-3: id=desk-3 -> absent",
        "setting: lab/desk-3/vlan: 7 -> absent",
        "link: lab/nic0/link: up -> down",
        "setting: options/IGMPVersion: 2 -> 1",
        "setting: lab/mtu: 9000 -> 1400",
        "mac: lab/desk-1/macs/02:00:00:00:0a:01/10: absent -> mac=02:00:00:00:0a:01 type=learned"
        " vlan=10",
        "port: lab/new: absent -> id=new",
        "setting: lab/new/alias: absent -> x",
    ]
    assert "carrier: lab/desk-1/carrier: nic0 -> absent" in found


def test_switches_come_and_go(lab: Switch, objects: Host) -> None:
    events = objects.watch(seconds=0, kinds=["switch", "uplink"])
    lab.remove()
    objects.add_switch("new", identifier="n", uplinks=["nic0"])
    assert told(list(events)) == [
        "uplink: lab/nic0: name=nic0 port=left -> absent",
        "uplink: lab/nic1: name=nic1 port=spare -> absent",
        "switch: lab: alias=lab id=lab-1 -> absent",
        "uplink: new/nic0: absent -> name=nic0 port=uplink1",
        "switch: new: absent -> alias=new id=n",
    ]


def test_a_port_with_the_name_of_an_uplink(host: simhost.Host, lab: Switch, objects: Host) -> None:
    events = objects.watch(seconds=0, kinds=["port", "uplink", "link"])
    lab.add_port("nic0")
    host.link("nic0").down()
    assert told(list(events)) == [
        "link: lab/nic0/link: up -> down",
        "port: lab/nic0: absent -> id=nic0",
    ]


def test_a_watch_goes_on_until_its_time_is_over(host: simhost.Host, objects: Host) -> None:
    found = []
    events = objects.watch(every=0.01, seconds=60, kinds=["link"])
    host.link("nic4").down()
    for event in events:
        found.append(str(event))
        if len(found) == 2:
            break
        host.link("nic4").up()
    assert found == ["vswitch0/nic4/link: up -> down", "vswitch0/nic4/link: down -> up"]
    assert list(objects.watch(every=0.01, seconds=0.05)) == []


def test_nothing_changes_by_itself(host: simhost.Host, lab: Switch, objects: Host) -> None:
    """Neither does an address get older, nor a counter count."""
    host.clock.stop()
    events = objects.watch(every=0.01, seconds=0.05)
    host.clock.step(5)
    assert list(events) == []


def test_watching_while_others_go_on(host: simhost.Host, lab: Switch, objects: Host) -> None:
    async def main() -> List[str]:
        found = []
        events = objects.awatch(every=0.01, seconds=30, kinds=["link"])
        lab.uplinks["nic0"].set_link("down")
        async for event in events:
            found.append(str(event))
            if len(found) == 2:
                break
            # A change in the same loop, between two looks.
            lab.uplinks["nic0"].set_link("up")
        return found

    assert asyncio.run(main()) == ["lab/nic0/link: up -> down", "lab/nic0/link: down -> up"]


def test_what_cannot_be_watched(objects: Host) -> None:
    with pytest.raises(DocumentError, match="kinds: 'links' is not one of switch, port"):
        objects.watch(kinds=["links"])
    with pytest.raises(DocumentError, match="kinds: 'link' is not a list"):
        objects.watch(kinds="link")
    with pytest.raises(DocumentError, match="every: 0 is not a time that passes"):
        objects.watch(every=0)
