"""Devices that come, vanish and return: Open vSwitch has a port for each that is connected, frames
go over it again when it is back, and nothing that was counted is lost."""

from typing import Callable, Set

from counted_frames import BROADCAST, come_to, counters, send
from frame_lab import Lab, comes_sooner_or_later, comes_true
from simhost import Client, frame

SENT_BY_UPLINK = """
from vswitch import Host, Port
print(Port(Host().switches["lab"], "uplink1").stats.pktsOutBroadcast)
"""


def ports_of_open_vswitch(lab: Lab) -> Set[str]:
    """Those of all its bridges, but for what each bridge has by itself."""
    database = f"--db=unix:{lab.run_folder()}/db.sock"
    bridges = lab.host.run("ovs-vsctl", database, "list-br").split()
    return {
        port
        for bridge in bridges
        for port in lab.host.run("ovs-vsctl", database, "list-ports", bridge).split()
    }


def test_a_port_is_in_open_vswitch_while_a_device_is_connected(lab: Lab) -> None:
    assert ports_of_open_vswitch(lab) == set()
    lab.client("lab", "a")
    assert ports_of_open_vswitch(lab) == {"c1"}
    lab.network("nic0")
    assert ports_of_open_vswitch(lab) == {"c1", "u0"}
    lab.ctl("disconnect", "lab", "a")
    assert ports_of_open_vswitch(lab) == {"u0"}
    lab.ctl("uplink", "nic0", "--device", "")
    assert ports_of_open_vswitch(lab) == set()
    # As far as the state goes there is a device, and none for Open vSwitch.
    lab.ctl("connect", "lab", "a", "c1")
    assert ports_of_open_vswitch(lab) == {"c1"}
    lab.host.run("ip", "link", "delete", "c1")
    assert comes_true(lambda: ports_of_open_vswitch(lab) == set())


class WireEnd:
    """What is at the other end of an uplink's wire, whose device can be made anew."""

    def __init__(self, lab: Lab, uplink: str) -> None:
        self._lab = lab
        self._far = lab.frames.new_namespace()
        self.device = lab.frames.cabling.to_network(self._far, "eth0").near
        lab.ctl("uplink", uplink, "--device", self.device)
        self.client = lab.frames.new_client(self._far)

    def delete(self) -> None:
        self._lab.host.run("ip", "link", "delete", self.device)

    def make(self) -> None:
        self._lab.wire(self.device, self._far, "eth0")
        self.client.set_up()


def counts_on(lab: Lab, read: Callable[[], int], one: Client, other: Client) -> None:
    """From what was counted before, exactly, what is sent to all."""
    before, sends = read(), 0

    def comes() -> bool:
        nonlocal sends
        send(one, 1, BROADCAST)
        sends += 1
        try:
            other.expect(lambda came: came[6:12].hex(":") == one.mac, timeout=0.1)
        except AssertionError:
            return False
        return True

    assert comes_true(comes)
    # Of the first ones nobody knows whether the device was there.
    lab.have_counted()
    counted = read()
    assert before < counted <= before + sends
    send(one, 4, BROADCAST)
    come_to(read, counted + 4)


def test_the_device_of_an_only_uplink_may_vanish_and_return(lab: Lab) -> None:
    near, wire = lab.client("lab", "a"), WireEnd(lab, "nic0")

    def sent_by_uplink() -> int:
        return int(lab.python(SENT_BY_UPLINK))

    def sent_by_port() -> int:
        return counters(lab, "a").get("pktsInBroadcast", 0)

    send(near, 3, BROADCAST)
    come_to(sent_by_uplink, 3)
    wire.delete()
    assert comes_true(lambda: "nic0       link down" in lab.ctl("show"))
    send(near, 2, BROADCAST)
    come_to(sent_by_port, 5)
    assert sent_by_uplink() == 3
    wire.make()
    counts_on(lab, sent_by_uplink, near, wire.client)
    assert near.comes_to_reach(wire.client)
    assert wire.client.comes_to_reach(near)


def test_a_standby_takes_over_while_the_device_of_an_uplink_is_gone(lab: Lab) -> None:
    near = lab.client("lab", "a")
    first, second = WireEnd(lab, "nic0"), WireEnd(lab, "nic1")
    assert comes_sooner_or_later(near, first.client, frame(BROADCAST, near.mac))
    first.delete()
    assert comes_sooner_or_later(near, second.client, frame(BROADCAST, near.mac))
    first.make()
    assert comes_sooner_or_later(near, first.client, frame(BROADCAST, near.mac))
    at_last = frame(BROADCAST, near.mac, payload=b"at last".ljust(46))
    near.send(at_last)
    first.client.expect(at_last)
    second.client.expect_none(at_last, timeout=0)


def test_a_port_counts_on_when_its_device_is_made_anew(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")

    def sent() -> int:
        return counters(lab, "a").get("pktsInBroadcast", 0)

    send(one, 3, BROADCAST)
    come_to(sent, 3)
    lab.host.run("ip", "link", "delete", "c1")
    assert comes_true(lambda: "c1" not in ports_of_open_vswitch(lab))
    assert sent() == 3
    lab.wire("c1", one.namespace, "eth0")
    one.set_up()
    counts_on(lab, sent, one, other)
