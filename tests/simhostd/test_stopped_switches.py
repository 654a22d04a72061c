"""Switches that calls stop and start again: their frames, and their bridges."""

import json

from simhost import frame

from frame_lab import Lab, comes_true


def bridges(lab: Lab) -> str:
    return lab.host.run("ovs-vsctl", f"--db=unix:{lab.run_folder()}/db.sock", "list-br")


def call(lab: Lab, words: str) -> None:
    """Frames obey it, however long that takes."""
    lab.python(f"import _libvswitch as vs; assert vs.{words} == vs.QEX_OK")
    assert comes_true(lab.is_in_force)


def test_frames_cease_with_a_switch_and_come_back_with_it(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    sent = frame("ff:ff:ff:ff:ff:ff", one.mac, payload=b"sent once".ljust(46))
    call(lab, f"DVSQEX_SwitchDissociate({switch['id']!r})")
    assert bridges(lab) == ""
    one.send(sent)
    other.expect_none(sent)
    call(lab, f"DVSQEX_SwitchAssociate({switch['id']!r})")
    assert bridges(lab) != ""
    one.send(sent)
    assert other.expect(sent)
    other.expect_none(sent, timeout=0.05)
    call(lab, "DVSState_ConfigReset()")
    assert bridges(lab) == ""
    one.send(sent)
    other.expect_none(sent)
