"""A learned address is known until nothing came from it for the ageing time, however long that is
and whatever ends meanwhile."""

import os
import signal
import sqlite3
import time
from typing import Any, Dict, Tuple

from frame_lab import Lab, comes_true, learned_ages
from lasting_open_vswitch import LastingOpenVSwitch
from simhost import Client, frame

EVERYBODY = "ff:ff:ff:ff:ff:ff"
LEARNS: Dict[str, Any] = {"mac_learning": {"learning": True, "flooding": True}}
SEEN = "02:00:00:00:77:01"
# What a timeout of Open vSwitch cannot say.
LONG = 70000

LearnersAndSpectator = Tuple[Client, Client, Client]


def set_aging(lab: Lab, seconds: int) -> None:
    lab.apply({"switches": [{"alias": "lab", "mac_learning": {"aging_time": seconds}}]})


def clients(lab: Lab) -> LearnersAndSpectator:
    """Who gets a frame for an address that nobody knows: all of them."""
    for port in "abc":
        lab.set_port("lab", port, **LEARNS)
    found = lab.client("lab", "a"), lab.client("lab", "b"), lab.client("lab", "c")
    for client in found:
        # Its own address is the one that it sends from first, and stays.
        client.send(frame(EVERYBODY, client.mac))
    assert comes_true(lambda: sum("table=31, " in flow for flow in lab.flows()) == len(found))
    return found


def speak(lab: Lab, client: Client) -> None:
    """As SEEN, twice: the first frame teaches, and the next ones count."""
    for _ in range(2):
        client.send(frame(EVERYBODY, SEEN))
        lab.have_counted()
    assert ages(lab)[SEEN] < 10


def is_known(asking: Client, at: Client, elsewhere: Client) -> bool:
    """Whether a frame for SEEN goes to where it is alone."""
    sent = frame(SEEN, asking.mac, payload=b"%d" % time.monotonic_ns())
    asking.send(sent)
    at.expect(sent)
    # What nobody is to get goes to all at once.
    after = frame(EVERYBODY, asking.mac, payload=sent[-8:])
    asking.send(after)
    elsewhere.expect(after)
    try:
        elsewhere.expect_none(sent, timeout=0)
    except AssertionError:
        return False
    return True


def ages(lab: Lab) -> Dict[str, int]:
    return learned_ages(lab, "b")


def test_an_address_ages_beyond_what_open_vswitch_can_time(
    idle: Lab, clock: LastingOpenVSwitch
) -> None:
    set_aging(idle, LONG)
    one, other, third = clients(idle)
    clock.stop_clock()
    speak(idle, other)
    clock.warp(LONG - 1000)
    assert LONG - 1000 <= ages(idle)[SEEN] < LONG
    assert is_known(one, other, third)
    # What is seen again is young again.
    speak(idle, other)
    clock.warp(LONG - 1000)
    assert LONG - 1000 <= ages(idle)[SEEN] < LONG
    assert is_known(one, other, third)
    clock.warp(1000)
    assert SEEN not in ages(idle)
    # Without which Open vSwitch does not look at what it knew of such frames.
    clock.warp(1)
    assert not is_known(one, other, third)


def test_what_is_learned_ages_by_the_time_that_is_set_now(
    idle: Lab, clock: LastingOpenVSwitch
) -> None:
    set_aging(idle, 20)
    one, other, third = clients(idle)
    clock.stop_clock()
    speak(idle, other)
    clock.warp(15)
    set_aging(idle, 300)
    clock.warp(15)
    assert 30 <= ages(idle)[SEEN] < 40
    assert is_known(one, other, third)
    # It had this time for long.
    set_aging(idle, 25)
    assert SEEN not in ages(idle)
    # Without which Open vSwitch does not look at what it knew of such frames.
    clock.warp(1)
    assert not is_known(one, other, third)


def test_the_host_s_ageing_is_that_of_switches_without_their_own(
    idle: Lab, clock: LastingOpenVSwitch
) -> None:
    one, other, third = clients(idle)
    set_aging_of_host(idle, 20)
    clock.stop_clock()
    speak(idle, other)
    clock.warp(15)
    assert is_known(one, other, third)
    clock.warp(10)
    assert not is_known(one, other, third)
    set_aging_of_host(idle, 300)
    speak(idle, other)
    clock.warp(25)
    assert is_known(one, other, third)


def set_aging_of_host(lab: Lab, seconds: int) -> None:
    lab.python(
        "from libvswitch import VSMACLearningGlobalProps, checked\n"
        "props = VSMACLearningGlobalProps("
        f"agingTime={seconds}, macLimit=65536, learnStatic=False)\n"
        "checked.VSQEX_SetGlobalMACLearningProps(props)"
    )


def test_it_ages_while_nobody_is_there(idle: Lab) -> None:
    set_aging(idle, 300)
    idle.start()
    one, other, third = clients(idle)
    speak(idle, other)
    idle.stop()
    pass_by(idle, 250)
    idle.start()
    assert 250 <= ages(idle)[SEEN] < 300
    assert is_known(one, other, third)
    os.kill(idle.processes()["ovs-vswitchd"], signal.SIGKILL)
    assert comes_true(lambda: 250 <= age_if_known(idle, SEEN) < 300)
    idle.stop()
    pass_by(idle, 50)
    idle.start()
    assert SEEN not in ages(idle)
    assert not is_known(one, other, third)


def age_if_known(lab: Lab, mac: str) -> int:
    """0 while Open vSwitch is started anew."""
    try:
        return ages(lab).get(mac, 0)
    except AssertionError:
        return 0


def pass_by(lab: Lab, seconds: int) -> None:
    """Makes it so much longer ago that anything was seen."""
    state = sqlite3.connect(lab.state)
    passed = state.execute("UPDATE remembered SET seen = seen - ?", (seconds * 1000,))
    assert passed.rowcount > 0
    state.commit()
    state.close()
