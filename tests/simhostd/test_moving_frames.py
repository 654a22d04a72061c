"""Frames go as the settings say."""

import json
import re
import subprocess
import sys
from pathlib import Path
from typing import List

import pytest

from simhost import frame

from frame_lab import ONE_SWITCH, Lab, comes_true
from lasting_open_vswitch import LastingOpenVSwitch


def test_a_vlan_cuts_and_joins(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    lab.set_port("lab", "a", vlan=7)
    assert one.ceases_to_reach(other)
    lab.set_port("lab", "b", vlan=7)
    assert one.comes_to_reach(other)
    lab.ctl("disconnect", "lab", "b")
    assert one.ceases_to_reach(other)


def test_no_frame_goes_as_before_once_a_call_has_returned(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)

    def sent(times: int) -> bytes:
        made = frame(other.mac, one.mac, payload=bytes([times]) * 46)
        one.send(made)
        return made

    other.expect(sent(1))
    # By itself Open vSwitch changes nothing any more of what it has remembered since.
    lab.control("revalidator/pause")
    lab.set_port("lab", "a", vlan=7)
    cut = sent(2)
    lab.control("revalidator/resume")
    lab.set_port("lab", "b", vlan=7)
    other.expect(sent(3))
    other.expect_none(lambda came: came == cut)


def test_it_is_said_if_nobody_can_make_open_vswitch_forget(lab: Lab) -> None:
    lab.client("lab", "a")
    control = lab.run_folder() / "ovs-vswitchd.ctl"
    hidden = control.rename(lab.run_folder() / "hidden.ctl")
    lab.set_port("lab", "a", vlan=7)
    plane = lab.plane()
    assert plane["in_force"] == plane["change"]
    assert "frames may go on for a while as they went before a change" in plane["said"]
    hidden.rename(control)
    lab.set_port("lab", "a", vlan=8)
    assert lab.plane()["said"] == ""


def test_a_client_that_says_nothing_is_known_in_another_vlan(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    # Of neither port the address is configured.
    assert one.comes_to_reach(other)
    for client in one, other:
        client.run("ip", "neighbour", "flush", "dev", "eth0")
    for vlan in 7, 8:
        lab.set_port("lab", "b", vlan=vlan)
        lab.set_port("lab", "a", vlan=vlan)
        sent = frame(other.mac, one.mac, payload=bytes([vlan]) * 46)
        one.send(sent)
        other.expect(sent)


def test_it_takes_no_privileges_where_namespaces_of_users_are_allowed(tmp_path: Path) -> None:
    with Lab(tmp_path, ONE_SWITCH, own_user=True) as lab:
        lab.start()
        one, other = lab.client("lab", "a"), lab.client("lab", "b")
        assert one.comes_to_reach(other)


def test_a_folder_may_have_a_name_longer_than_the_address_of_a_socket(tmp_path: Path) -> None:
    folder = tmp_path / ("d" * 150)
    folder.mkdir()
    with Lab(folder, ONE_SWITCH) as lab:
        lab.start()
        one, other = lab.client("lab", "a"), lab.client("lab", "b")
        assert one.comes_to_reach(other)


def test_an_uplink_fails_and_frames_go_on(lab: Lab) -> None:
    network = lab.network("nic0", "nic1")
    far, near = network.client(), lab.client("lab", "a")
    assert near.comes_to_reach(far)
    assert "sends over nic0" in lab.ctl("show")
    network.pull("nic0")
    assert near.comes_to_reach(far)
    assert "sends over nic1" in lab.ctl("show")
    network.plug("nic0")
    network.pull("nic1")
    assert near.comes_to_reach(far)
    assert "sends over nic0" in lab.ctl("show")


def test_what_the_network_floods_to_all_uplinks_comes_once(lab: Lab) -> None:
    addresses = [f"02:00:00:00:55:{number:02x}" for number in range(8)]
    said = [{"mac": address, "type": "static"} for address in addresses]
    lab.set_port("lab", "a", addresses=said)
    near, far = lab.client("lab", "a"), lab.network("nic0", "nic1").client()
    assert near.comes_to_reach(far)
    uplinks = ["nic0", "nic1"]
    explicit = {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]}
    for teaming in explicit, {"balance": "mac", "active": uplinks}, {"balance": "port"}:
        lab.apply({"switches": [{"alias": "lab", "teaming": teaming}]})
        lab.have_counted()
        sent = [frame(address, far.mac, payload=b"once" * 12) for address in addresses]
        # No switch out there has ever heard of these.
        for one in sent:
            far.send(one)
        for one in sent:
            near.expect(one)
        near.expect_none(lambda came: came in sent)


def test_an_uplink_that_the_host_switches_off_is_off(lab: Lab) -> None:
    far, near = lab.network("nic0", "nic1").client(), lab.client("lab", "a")
    assert near.comes_to_reach(far)
    lab.python(
        "from libvswitch import checked, enums\n"
        "checked.VSQEX_SetUplinkAdminLinkState('lab', 'nic0', enums.LinkState.DOWN)"
    )
    assert near.comes_to_reach(far)
    assert "sends over nic1" in lab.ctl("show")
    assert "state DOWN" in lab.host.run("ip", "link", "show", "u0")


MADE_BY_CALLS = """
from libvswitch import checked
checked.VSDVS_CreateVSwitch("made", None, None, 8, True, 0, 1500, 0)
checked.VSDVS_AddDVPort("made", "x", 0)
checked.VSDVS_AddDVPort("made", "y", 0)
"""


def test_a_switch_made_by_calls_moves_frames(lab: Lab) -> None:
    lab.python(MADE_BY_CALLS)
    one, other = lab.client("made", "x"), lab.client("made", "y")
    assert one.comes_to_reach(other)
    lab.python("from libvswitch import checked; checked.VSDVS_DestroyVSwitch('made')")
    assert one.ceases_to_reach(other)


def test_a_disabled_switch_moves_nothing_and_an_enabled_one_does(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    lab.apply({"switches": [{"alias": "lab", "disabled": True}]})
    assert one.ceases_to_reach(other)
    lab.apply({"switches": [{"alias": "lab", "disabled": False}]})
    assert one.comes_to_reach(other)


def test_a_port_that_is_removed_moves_nothing_and_a_new_one_does(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    lab.python("from libvswitch import checked; checked.VSDVS_RemoveDVPort('lab', 'b')")
    assert one.ceases_to_reach(other)
    lab.python("from libvswitch import checked; checked.VSDVS_AddDVPort('lab', 'b', 0)")
    assert one.ceases_to_reach(other)
    lab.ctl("connect", "lab", "b", "c2")
    # Who it is is known again when it speaks.
    assert other.comes_to_reach(one)


def test_a_restart_of_the_host_leaves_what_is_persistent(lab: Lab) -> None:
    transient = MADE_BY_CALLS.replace("8, True", "8, False")
    lab.python(transient)
    stays = lab.client("lab", "a"), lab.client("lab", "b")
    goes = lab.client("made", "x"), lab.client("made", "y")
    for one, other in (stays, goes):
        assert one.comes_to_reach(other)
    lab.have_counted()
    lab.ctl("restart")
    one, other = stays
    assert not one.reaches(other)
    # Who they are is known again when they have spoken.
    assert other.comes_to_reach(one)
    one, other = goes
    assert one.ceases_to_reach(other)


@pytest.mark.parametrize("is_there", [True, False])
def test_a_restart_of_the_host_forgets_what_was_learned(idle: Lab, is_there: bool) -> None:
    idle.set_port("lab", "a", mac_learning={"learning": True, "flooding": True})
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        one, other = idle.client("lab", "a"), idle.client("lab", "b")
        assert one.comes_to_reach(other)
        assert learned(idle) == [31, 32]
        for client in one, other:
            # It is not to ask who was there.
            client.run("ip", "neighbour", "flush", "dev", "eth0")
        idle.have_counted()
        if not is_there:
            idle.stop()
        idle.ctl("restart")
        if not is_there:
            idle.start(open_vswitch.where)
        assert learned(idle) == []
        assert one.comes_to_reach(other)
        # Once: whatever changes then is no reason to do so again.
        idle.set_port("lab", "c", vlan=9)
        assert learned(idle) == [31, 32]


def learned(lab: Lab) -> List[int]:
    """The tables in which there are addresses that clients sent from."""
    flows = lab.flows()
    return [table for table in (31, 32) if any(f", table={table}, " in one for one in flows)]


def shown(lab: Lab) -> str:
    return re.sub("clock .*", "", lab.ctl("show"))


def test_what_cannot_be_done_is_refused_and_nothing_has_changed(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    before, change = shown(lab), lab.plane()["change"]
    wraps = {"sid": "s", "to": [{"port": "c"}], "type": "encapsulated"}
    document = {
        "alias": "lab",
        "ports": [{"id": "b", "vlan": 7}, {"id": "a", "mirror_sessions": [wraps]}],
    }
    done = lab.try_ctl("apply", "-", given=json.dumps({"switches": [document]}))
    assert done.returncode == 1
    why = "the mirror session 's' is an encapsulated one, and mirrors to what is no address"
    assert f"{why} (QEX_NOT_SUPPORTED)" in done.stdout
    assert lab.plane()["change"] == change
    assert shown(lab) == before
    assert one.comes_to_reach(other)


def test_learned_addresses_are_asked_of_the_data_path(lab: Lab) -> None:
    management = {"learning": True, "flooding": True}
    lab.set_port("lab", "a", mac_learning=management)
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    assert f"{one.mac} learned" in lab.ctl("show")


LEARNED = """
from libvswitch import checked
print(len(checked.VSQEX_GetPortMACTable("lab", "a", 2)), end=" ")
print(len(checked.VSQEX_GetPortMACTable("lab", "a", 3)), end=" ")
print(checked.VSQEX_GetPortMACLearningStats("lab", "a").numMACsLearned, end=" ")
print(len(checked.VSQEX_GetTeamMACTable("lab", 2)))
"""


def test_addresses_that_were_learned_without_frames_are_told_of_no_device(idle: Lab) -> None:
    idle.set_port("lab", "a", mac_learning={"learning": True, "flooding": True})
    for mac in "02:00:00:00:50:01", "02:00:00:00:50:02":
        idle.ctl("learn", "lab", mac, "--port", "a")
    idle.ctl("learn", "lab", "02:00:00:00:50:03")
    assert idle.python(LEARNED) == "2 2 2 1\n"
    idle.start()
    one = idle.client("lab", "a")
    # Nobody knows what is beyond the uplinks, which have no device.
    assert idle.python(LEARNED) == "0 0 0 1\n"
    idle.network("nic0", "nic1")
    assert idle.python(LEARNED) == "0 0 0 0\n"
    one.send(frame("ff:ff:ff:ff:ff:ff", one.mac))
    assert comes_true(lambda: idle.python(LEARNED) == "1 1 1 0\n")


def test_a_mirror_shows_frames_of_others(lab: Lab) -> None:
    one, other, third = (lab.client("lab", port) for port in "abc")
    # Only what is mirrored reaches it: it is in another VLAN.
    lab.set_port("lab", "c", vlan=99)
    session = {"sid": "s", "to": [{"port": "c"}], "sent_by": [{"port": "a"}]}
    lab.set_port("lab", "a", mirror_sessions=[session])
    sent = frame("ff:ff:ff:ff:ff:ff", one.mac)
    one.send(sent)
    assert third.expect(sent) and other.expect(sent)
    third.expect_none(sent)


def test_the_demo_shows_what_it_says() -> None:
    demo = str(Path(__file__).with_name("frames_demo.py"))
    done = subprocess.run(
        [sys.executable, demo], stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True
    )
    assert done.returncode == 0, done.stdout
    joined, cut, joined_again, failed_over, mirrored = re.findall(r"(\d+) received", done.stdout)
    assert (joined, cut, joined_again, mirrored) == ("3", "0", "3", "3"), done.stdout
    # A third of them before the uplink failed.
    assert int(failed_over) >= 30, done.stdout
    assert "nic0       link down" in done.stdout and "sends over nic1" in done.stdout
    assert done.stdout.count("probe: ") == 2
