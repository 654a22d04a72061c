"""Switches that several hosts share: what one changes the others have, and what stands in the way
is said."""

import json
import shutil
import signal
from pathlib import Path
from typing import Any, Dict, Iterator, Tuple

import pytest
from _libvswitch import QEX_BUSY, QEX_OK

from fabric_lab import (
    SCHEMA,
    FabricLab,
    Host,
    in_background,
    is_locked,
    kept,
    killed,
    restored,
    started,
)
from frame_lab import comes_true
from simhost._daemon import Daemon

LAB: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}],
    "switches": [
        {
            "alias": "lab",
            "mtu": 9000,
            "max_ports": 200,
            "uplinks": ["nic0"],
            "teaming": {"balance": "explicit", "active": ["nic0"]},
            "ports": [
                {
                    "id": "a",
                    "external_id": "vm-7",
                    "vlan": {"id": 7, "priority": 3},
                    "addresses": [{"mac": "02:00:00:00:00:aa", "vlan": 7, "type": "static"}],
                },
                {"id": "b"},
            ],
        },
        {"alias": "own", "ports": [{"id": "a"}]},
    ],
}
OTHER: Dict[str, Any] = {"uplinks": [{"name": "nic0"}], "switches": [{"alias": "mine"}]}


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path) as lab:
        yield lab


@pytest.fixture
def two(lab: FabricLab) -> Tuple[Host, Host]:
    """Two hosts that share the switch lab."""
    one, other = started(lab.host("one", LAB)), started(lab.host("two", OTHER))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    return one, other


def of_port(host: Host, port: str) -> Dict[str, Any]:
    """What hosts share of a port."""
    told = ("external_id", "vlan", "addresses", "forbids")
    said = {name: value for name, value in host.ports("lab")[port].items() if name in told}
    # When an address was seen last each host knows for itself.
    said["addresses"] = [{**address, "age": 0} for address in said["addresses"]]
    return said


def mtu(host: Host) -> Any:
    return host.setting("lab", "mtu")


def test_hosts_have_what_they_share_and_what_is_their_own(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    one, other = two
    assert (mtu(other), other.setting("lab", "max_ports")) == (9000, 200)
    assert other.setting("lab", "id") == one.setting("lab", "id")
    assert of_port(other, "a") == of_port(one, "a")
    assert of_port(other, "a")["addresses"][0]["mac"] == "02:00:00:00:00:aa"
    # Uplinks are those of each host.
    assert (one.setting("lab", "uplinks"), other.setting("lab", "uplinks")) == (["nic0"], [])
    assert other.setting("own", "id") is None and one.setting("mine", "id") is None

    # It is here when the call returns, and there soon.
    assert other.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    assert mtu(other) == 1600
    assert comes_true(lambda: mtu(one) == 1600)
    other.set_port("lab", "c", vlan={"id": 9}, forbids=["forged_transmits"])
    assert comes_true(lambda: "c" in one.ports("lab"))
    assert of_port(one, "c") == of_port(other, "c")
    assert one.call("VSDVS_RemoveDVPort", "lab", "b") == QEX_OK
    assert comes_true(lambda: "b" not in other.ports("lab"))
    # What an operator writes is followed by all.
    lab.databases.set("Port", "vlan", 12, id="c")
    assert comes_true(lambda: of_port(one, "c")["vlan"] == of_port(other, "c")["vlan"] == 12)
    # A property that a restart takes away is none that others have.
    raw = {"x.y": {"type": "runtime", "text": "here"}, "x.z": {"type": "config", "text": "there"}}
    one.set_port("lab", "a", properties=raw)
    assert comes_true(lambda: "x.z" in other.ports("lab")["a"]["properties"])
    assert "x.y" not in other.ports("lab")["a"]["properties"]
    assert "x.y" in one.ports("lab")["a"]["properties"]


# Each call that replaces the state, and the switches that are there then.
REPLACED = """
import json
import libvswitch as vs
from vswitch import Host

data, length = vs.Cell("void *"), vs.Cell("int")
assert vs.DVSQEX_PersistentStateGet(data.pointer, length.pointer) == vs.QEX_OK
image = vs.Cell("qex_uint8", list(data.read(length.value)))

def replaces(name, *words, how=""):
    status = getattr(vs, name)(*words)
    assert status == vs.QEX_OK, (name, status)
    switches = Host().switches
    there = [f"{one.alias} {one.mtu} {','.join(sorted(one.ports))}" for one in switches.values()]
    print(f"{name}{how}: {json.dumps(sorted(there))}")

replaces("DVSQEX_StateSanitize")
replaces("DVSQEX_StateCleanup")
replaces("DVSQEX_StateInit", image.pointer, length.value, how=" with an image")
replaces("DVSState_ConfigReset")
replaces("DVSQEX_StateInit", image.pointer, length.value, how=" with an image")
replaces("DVSQEX_StateInit", None, 0, how=" with nothing")
"""


def test_what_replaces_the_state_leaves_what_is_shared(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    one, other = two
    tunnels = {"encapsulation": "vxlan", "key": 4711, "peers": []}
    one.apply({"switches": [{"alias": "lab", "fabric": tunnels}]})
    assert comes_true(lambda: other.setting("lab", "fabric") is not None)
    before = lab.databases.rows("Switch"), lab.databases.rows("Port")
    for host, own in ((one, "own"), (other, "mine")):
        shared = ["lab 9000 a,b"]
        both = sorted([*shared, f"{own} 1500 a" if host is one else f"{own} 1500 "])
        seen = [line.split(": ") for line in host.python(REPLACED).splitlines()]
        assert [(what, json.loads(switches)) for what, switches in seen] == [
            ("DVSQEX_StateSanitize", both),
            ("DVSQEX_StateCleanup", shared),
            ("DVSQEX_StateInit with an image", both),
            ("DVSState_ConfigReset", shared),
            ("DVSQEX_StateInit with an image", both),
            ("DVSQEX_StateInit with nothing", shared),
        ]
        host.ctl("restart")
        host.ctl("reset")
        assert host.setting("lab", "mtu") == 9000
        assert host.call("DVSState_ConfigReset") == QEX_OK
        assert sorted(host.ports("lab")) == ["a", "b"]
    assert one.setting("own", "id") is None
    assert (lab.databases.rows("Switch"), lab.databases.rows("Port")) == before
    # Who destroys it leaves it to the others.
    assert other.call("VSDVS_DestroyVSwitch", "lab") == QEX_OK
    assert lab.databases.rows("Switch")[0]["hosts"] == "one"
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    other.ctl("join", "lab")
    assert mtu(other) == 1600


# Each with the image in hexadecimal.
KEPT = """
import libvswitch as vs
data, length = vs.Cell("void *"), vs.Cell("int")
assert vs.DVSQEX_PersistentStateGet(data.pointer, length.pointer) == vs.QEX_OK
print(bytes(data.read(length.value)).hex())
"""
LOADED = """
import libvswitch as vs
image = list(bytes.fromhex({image!r}))
print(int(vs.DVSState_ConfigDeserialize(vs.Cell("qex_uint8", image).pointer, len(image))))
"""


def test_an_old_image_brings_back_what_is_the_host_s_own(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    one, other = two
    assert one.call("VSDVS_SetMTU", "own", 1600) == QEX_OK
    image = one.python(KEPT).strip()
    # What came after: of its own, and of what is shared, by itself and by the other.
    assert one.call("VSDVS_SetMTU", "own", 1700) == QEX_OK
    assert one.call("VSDVS_SetMTU", "lab", 1800) == QEX_OK
    other.set_port("lab", "a", vlan={"id": 9})
    assert other.call("VSDVS_RemoveDVPort", "lab", "b") == QEX_OK
    assert comes_true(lambda: "b" not in one.ports("lab"))
    shared = of_port(one, "a"), lab.databases.rows("Switch"), lab.databases.rows("Port")
    assert one.python(LOADED.format(image=image)) == f"{QEX_OK}\n"
    assert one.setting("own", "mtu") == 1600
    assert mtu(one) == 1800 and sorted(one.ports("lab")) == ["a"]
    now = of_port(one, "a"), lab.databases.rows("Switch"), lab.databases.rows("Port")
    assert now == shared
    # It is a member as before.
    assert other.call("VSDVS_SetMTU", "lab", 1900) == QEX_OK
    assert comes_true(lambda: mtu(one) == 1900)


def test_one_of_two_changes_of_the_same_thing_wins(two: Tuple[Host, Host]) -> None:
    one, other = two
    assert other.daemon is not None
    pause(other.daemon, other)
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    # It has asked when its daemon hears of both.
    late = in_background(other, "vs.VSDVS_SetMTU('lab', 1700)")
    assert comes_true(lambda: is_locked(other))
    other.daemon.send(signal.SIGCONT)
    assert late.communicate(timeout=30)[0] == f"{QEX_BUSY}\n"
    assert comes_true(lambda: mtu(other) == 1600)
    assert mtu(one) == 1600
    # Different things do not meet.
    assert one.call("VSDVS_SetMTU", "lab", 1800) == QEX_OK
    other.set_port("lab", "b", vlan={"id": 9})
    assert comes_true(lambda: mtu(other) == 1800 and of_port(one, "b")["vlan"] == 9)


def pause(daemon: Daemon, host: Host) -> None:
    """Until it goes on, nobody but callers writes to the state."""
    daemon.send(signal.SIGSTOP)
    while is_locked(host):
        daemon.send(signal.SIGCONT)
        assert comes_true(lambda: not is_locked(host))
        daemon.send(signal.SIGSTOP)


def test_a_host_without_its_daemon_changes_nothing_shared(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    one, other = two
    killed(other)
    assert other.call("VSDVS_SetMTU", "lab", 1700) == QEX_BUSY
    assert mtu(other) == 9000
    assert other.call("VSDVS_SetMTU", "mine", 1700) == QEX_OK
    asks = "this is shared with other hosts, and no simhostd --fabric is there"
    assert asks in other.refusal({"switches": [{"alias": "lab", "mtu": 1700}]})
    other.ctl("reset")
    for replaced in "DVSState_ConfigReset", "DVSQEX_StateCleanup":
        assert other.call(replaced) == QEX_OK
        assert mtu(other) == 9000 and sorted(other.ports("lab")) == ["a", "b"]
    # It catches up after its absence, also from a state of long ago.
    kept(other, "old")
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    assert one.call("VSDVS_RemoveDVPort", "lab", "a") == QEX_OK
    one.set_port("lab", "new")
    started(other)
    assert comes_true(lambda: mtu(other) == 1600 and sorted(other.ports("lab")) == ["b", "new"])
    other.stop()
    restored(other, "old")
    started(other)
    assert comes_true(lambda: mtu(other) == 1600 and sorted(other.ports("lab")) == ["b", "new"])
    assert sorted(row["name"] for row in lab.databases.rows("Host")) == ["one", "two"]


def test_what_a_host_cannot_bear_is_told(lab: FabricLab, two: Tuple[Host, Host]) -> None:
    one, other = two
    lab.databases.set("Port", "vlan", 5000, id="a")
    lab.databases.set("Port", "vlan", 11, id="b")
    assert comes_true(lambda: of_port(other, "b")["vlan"] == 11)
    assert of_port(other, "a")["vlan"] == of_port(one, "a")["vlan"]
    why = "vlan: 5000 is above 4094"
    errors = {"lab/a": why}

    def told() -> Any:
        return [dict(row["errors"][1]) for row in lab.databases.rows("Host")]

    assert comes_true(lambda: told() == [errors, errors]), told()
    # Nobody overwrites what is not here.
    document = {"switches": [{"alias": "lab", "ports": [{"id": "a", "vlan": 8}]}]}
    asks = "the port 'a' is other in the fabric than this host can bear"
    assert asks in other.refusal(document)
    lab.databases.set("Port", "vlan", 8, id="a")
    assert comes_true(lambda: told() == [{}, {}])
    assert of_port(other, "a")["vlan"] == 8

    # A limit that it has passed, as no host could write it.
    lab.databases.set("Switch", "max_ports", 1)
    lab.databases.set("Port", "vlan", 12, id="b")
    assert comes_true(lambda: of_port(one, "b")["vlan"] == of_port(other, "b")["vlan"] == 12)
    why = "max_ports: 1 is below the 2 ports that there are (QEX_LIMIT_EXCEEDED)"
    passed = {"lab": why}
    assert comes_true(lambda: told() == [passed, passed]), told()
    assert one.setting("lab", "max_ports") == other.setting("lab", "max_ports") == 200
    assert one.call("VSDVS_RemoveDVPort", "lab", "b") == QEX_OK
    assert comes_true(lambda: told() == [{}, {}]), told()
    assert one.setting("lab", "max_ports") == other.setting("lab", "max_ports") == 1

    # An alias that a switch of the host's own has.
    third = started(lab.host("three", {"switches": [{"alias": "lab"}]}))
    done = third.try_ctl("join", "lab")
    assert done.returncode == 1 and "QEX_BUSY" in done.stdout
    assert third.setting("lab", "mtu") == 1500
    # Nothing has changed.
    (shared,) = lab.databases.rows("Switch")
    assert shared["hosts"] == ["set", ["one", "two"]]
    assert comes_true(lambda: told() == [{}, {}, {}]), told()


def test_a_switch_that_the_fabric_has_not_cannot_be_joined(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    (before,) = lab.databases.rows("Fabric")
    done = two[1].try_ctl("join", "nowhere")
    assert done.returncode == 1
    assert "the fabric has no switch 'nowhere'" in done.stdout
    (now,) = lab.databases.rows("Fabric")
    assert now["revision"] == before["revision"]


def test_a_name_is_one_host_s(lab: FabricLab) -> None:
    one = started(lab.host("one", LAB))
    thief = lab.host("two", OTHER)
    thief.options = [*thief.options[:-1], "one"]
    thief.start()
    taken = "the name 'one' is taken by another host"
    assert comes_true(lambda: taken in thief.log()), thief.log()
    assert thief.log().count(taken) == 1
    thief.stop()
    one.stop()
    one.options = [*one.options[:-1], "other"]
    with pytest.raises(Exception, match="belongs to a fabric as 'one', not as 'other'"):
        one.start()


def test_a_host_that_is_there_twice_speaks_once(lab: FabricLab) -> None:
    one = started(lab.host("one", LAB))
    one.ctl("share", "lab")
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    one.stop()
    twin = lab.host("two")
    twin.options = one.options
    shutil.copy(one.state, twin.state)
    started(one)
    assert one.daemon is not None
    pause(one.daemon, one)
    started(twin)
    assert twin.call("VSDVS_SetMTU", "lab", 1700) == QEX_OK
    # What it is asked it does when it goes on, and is the host no longer then.
    late = in_background(one, "vs.VSDVS_AddDVPort('lab', 'late', 7)")
    assert comes_true(lambda: is_locked(one))
    one.daemon.send(signal.SIGCONT)
    assert late.communicate(timeout=30)[0] == f"{QEX_BUSY}\n"
    assert comes_true(lambda: gave_way(one)), one.log()
    for _ in range(2):
        assert one.call("VSDVS_SetMTU", "lab", 1800) == QEX_BUSY
        assert twin.call("VSDVS_SetMTU", "lab", 1900) == QEX_OK
    # What is its own the first goes on with.
    assert one.call("VSDVS_SetMTU", "own", 1800) == QEX_OK
    assert "late" not in one.ports("lab") and "late" not in twin.ports("lab")
    assert sorted(row["id"] for row in lab.databases.rows("Port")) == ["a", "b"]
    assert len(lab.databases.rows("Host")) == 1

    # Who lost the servers meanwhile does not take the name back, for the other would do the same.
    assert twin.daemon is not None
    lab.databases.kill(0)
    assert comes_true(lambda: "the fabric cannot be used" in twin.log())
    twin.daemon.send(signal.SIGSTOP)
    lab.databases.start(0)
    one.stop()
    started(one)
    twin.daemon.send(signal.SIGCONT)
    assert comes_true(lambda: gave_way(twin)), twin.log()
    assert twin.call("VSDVS_SetMTU", "lab", 1800) == QEX_BUSY
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK


def gave_way(host: Host) -> bool:
    return "another simhostd is this host by now" in host.log()


def test_a_fabric_of_another_version_is_none(tmp_path: Path) -> None:
    schema = tmp_path / "other.ovsschema"
    text = SCHEMA.read_text(encoding="utf-8")
    schema.write_text(json.dumps({**json.loads(text), "version": "2.0.0"}), encoding="utf-8")
    with FabricLab(tmp_path, schema=schema) as lab:
        one = lab.host("one", LAB)
        one.start()
        why = "its database 'fabric' has a schema of version 2.0.0, which is none of 1.x"
        assert comes_true(lambda: why in one.log()), one.log()
        assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
        assert one.try_ctl("share", "lab").returncode == 1
