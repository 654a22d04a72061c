"""A call whose change cannot be in force by now returns after a while, and what it wrote holds: it
is pending, which is told with the reason, and in force as soon as it can be."""

import os
import signal
import sqlite3
import subprocess

from counted_frames import BROADCAST
from frame_lab import Lab, comes_sooner_or_later, comes_true
from simhost import Client, frame
from simhost._namespaces import PATIENCE

SET_VLAN = """
from libvswitch import checked
checked.VSDVS_SetPortVLANPolicy("lab", {port!r}, {vlan}, 0, False, False, [])
print("QEX_OK")
"""
LATE, GONE = "simhostd says nothing in time", "no simhostd"


class Call:
    """A process that sets a VLAN, whose change is in the state already."""

    def __init__(self, lab: Lab, port: str, vlan: int) -> None:
        before = change_of(lab)
        self.change = before + 1
        self._process = subprocess.Popen(
            ["/usr/bin/python3", "-c", SET_VLAN.format(port=port, vlan=vlan)],
            env=lab.environment,
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
        )
        assert comes_true(lambda: change_of(lab) != before)
        assert change_of(lab) == self.change

    def returns(self) -> bool:
        """Well: all other statuses are exceptions of it."""
        return self._process.communicate(timeout=PATIENCE)[0] == "QEX_OK\n"


def change_of(lab: Lab) -> int:
    """The last one of the state; to ask for it waits for nobody."""
    state = sqlite3.connect(lab.state)
    ((change,),) = state.execute("SELECT change FROM frames").fetchall()
    state.close()
    return int(change)


def is_pending(lab: Lab, call: Call, why: str) -> bool:
    return comes_true(lambda: f"change {call.change} is pending: {why}" in lab.ctl("plane"))


def only_reaches(one: Client, other: Client, others: Client) -> bool:
    """Whether what is sent to all comes there, and not to others."""
    sent = frame(BROADCAST, one.mac, payload=os.urandom(46))
    comes = comes_sooner_or_later(one, other, sent)
    others.expect_none(sent, timeout=0)
    return comes


def test_a_call_that_is_not_in_force_is_pending(lab: Lab) -> None:
    one, other, third = (lab.client("lab", port) for port in "abc")
    assert lab.daemon is not None
    # Open vSwitch does nothing any more.
    switch = lab.processes()["ovs-vswitchd"]
    os.kill(switch, signal.SIGSTOP)
    call = Call(lab, "a", 7)
    assert is_pending(lab, call, LATE) and call.returns()
    os.kill(switch, signal.SIGCONT)
    assert comes_true(lab.is_in_force)
    # Nor does the daemon.
    lab.daemon.send(signal.SIGSTOP)
    call = Call(lab, "b", 7)
    assert is_pending(lab, call, LATE) and call.returns()
    lab.daemon.send(signal.SIGCONT)
    assert comes_true(lab.is_in_force)
    assert only_reaches(one, other, third)
    # It goes while a call waits for it.
    lab.daemon.send(signal.SIGSTOP)
    call = Call(lab, "b", 8)
    lab.stop(signal.SIGKILL)
    assert call.returns() and is_pending(lab, call, GONE)
    lab.start()
    assert lab.is_in_force()
    lab.set_port("lab", "c", vlan=7)
    assert only_reaches(one, third, other)
