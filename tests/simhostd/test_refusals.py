"""What no flows can be made of: taken to the last step before it, refused at that one, with the
status that says why, and with nothing changed."""

import json
from typing import Any, Dict, NamedTuple, Sequence, Tuple

from frame_lab import Lab, comes_true

Session = Dict[str, Any]


class Bound(NamedTuple):
    """Settings of a mirror session: the last ones that are done, and those past them."""

    done: Session
    refused: Sequence[Session]
    status: str
    why: str


CLIENTS = "mirrors clients of a kind, which are not told apart here"
SOME_OF_UPLINKS = "mirrors some traffic of uplinks, which is not told apart here"
TAKEN = {"type": "remote_destination", "received_by": [{"vlan": 5}]}
BOUNDS = [
    Bound(
        {"snap_length": 14},
        [{"snap_length": 13}, {"snap_length": 1}],
        "QEX_BAD_PARAM",
        "fewer than 14 bytes of a frame cannot be mirrored",
    ),
    Bound(
        {"received_from": ["uplinks"], "sent_from": ["uplinks"]},
        [
            {direction: ["uplinks", kind]}
            for direction in ("received_from", "sent_from")
            for kind in ("vmm", "cos", "tcpip", "test")
        ],
        "QEX_NOT_SUPPORTED",
        CLIENTS,
    ),
    Bound(
        {"uplink_filter": "none", "mirrors_uplinks": False},
        [
            {"mirrors_uplinks": True},
            *({"uplink_filter": kind} for kind in ("normal", "stt", "vxlan", "geneve")),
            {"uplink_filter": "encapsulated"},
        ],
        "QEX_NOT_SUPPORTED",
        SOME_OF_UPLINKS,
    ),
    Bound(
        {"stack": False},
        [{"stack": True}],
        "QEX_NOT_SUPPORTED",
        "mirrors on the side of the stack, which is not here",
    ),
    Bound(
        {"received_by": [{"vlan": 5}, {"uplink": "nic0"}, {"port": "b"}]},
        [{"received_by": [{"ip": "192.0.2.1"}]}, {"sent_by": [{"ip": "192.0.2.1"}]}],
        "QEX_NOT_SUPPORTED",
        "mirrors from an address",
    ),
    Bound(
        {"to": [{"port": "c"}, {"uplink": "nic0"}]},
        [{"to": [{"vlan": 5}]}, {"to": [{"port": "c"}, {"vlan": 5}]}],
        "QEX_NOT_SUPPORTED",
        "mirrors to a VLAN",
    ),
    Bound(
        {"to": [{"port": "c"}]},
        [{"to": [{"port": "c"}, {"ip": "192.0.2.1"}]}],
        "QEX_NOT_SUPPORTED",
        "mirrors to an address, and wraps nothing",
    ),
    Bound(
        {"type": "remote_source", "encapsulation": {"vlan": 1}},
        [{"type": "remote_source"}],
        "QEX_NOT_SUPPORTED",
        "mirrors to other hosts, and has no VLAN for that",
    ),
    Bound(
        TAKEN,
        [{**TAKEN, "to": [{"uplink": "nic0"}]}],
        "QEX_NOT_SUPPORTED",
        "takes copies from uplinks, and mirrors to others than ports",
    ),
    Bound(
        TAKEN,
        [
            {**TAKEN, "received_by": [{"port": "b"}]},
            {**TAKEN, "sent_by": [{"vlan": 5}]},
            {**TAKEN, "sent_from": ["uplinks"]},
        ],
        "QEX_NOT_SUPPORTED",
        "takes copies from",
    ),
]


def test_a_device_that_cannot_be_had_changes_nothing(lab: Lab) -> None:
    lab.client("lab", "a")
    lab.network("nic0")
    # What comes from it begins with no address.
    lab.host.run("ip", "tuntap", "add", "t0", "mode", "tun")
    # A device has up to 15 letters.
    longest = "d" * 15
    lab.host.run("ip", "link", "add", longest, "type", "veth", "peer", "name", "other")
    bridge = next(lab.run_folder().glob("vs*.mgmt")).stem
    refused = {
        longest + "d": "is no name of a network device (QEX_INVALID_NAME)",
        "../c1": "is no name of a network device (QEX_INVALID_NAME)",
        ".": "is no name of a network device (QEX_INVALID_NAME)",
        "nowhere": "simhostd sees no device nowhere (QEX_NOT_FOUND)",
        "c1": "the device c1 is at the port 'a' of the switch 'lab' (QEX_BUSY)",
        "u0": "the device u0 is at the uplink 'nic0' (QEX_BUSY)",
        "lo": "the device lo carries no frames of Ethernet (QEX_NOT_SUPPORTED)",
        "t0": "the device t0 carries no frames of Ethernet (QEX_NOT_SUPPORTED)",
        # Of Open vSwitch itself.
        bridge: f"the device {bridge} is at the bridge {bridge} (QEX_BUSY)",
        "ovs-netdev": "the device ovs-netdev is at the bridge ovs-netdev (QEX_BUSY)",
    }
    before = state_of(lab)
    for device, why in refused.items():
        for words in (["connect", "lab", "b", device], ["uplink", "nic1", "--device", device]):
            done = lab.try_ctl(*words)
            assert done.returncode == 1, words
            assert why in done.stdout, words
    assert state_of(lab) == before
    lab.ctl("connect", "lab", "b", longest)
    assert lab.is_in_force()


def test_a_device_of_another_kind_is_left_out_and_told(idle: Lab) -> None:
    # Nobody looks at devices before there is a daemon.
    idle.ctl("connect", "lab", "c", "lo")
    idle.start()
    one, other = idle.client("lab", "a"), idle.client("lab", "b")
    assert one.comes_to_reach(other)
    assert idle.plane()["said"] == "the device lo carries no frames of Ethernet"
    assert idle.log().count("the device lo carries") == 1
    idle.ctl("disconnect", "lab", "c")
    assert comes_true(lambda: not idle.plane()["said"])


def test_a_device_that_open_vswitch_cannot_use_is_told(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    # It has its own of that name.
    lab.host.run("ip", "link", "add", "vxlan_sys_4789", "type", "veth", "peer", "name", "other")
    lab.ctl("connect", "lab", "c", "vxlan_sys_4789")
    said = "Open vSwitch cannot use the device vxlan_sys_4789: its log says why"
    assert comes_true(lambda: lab.plane()["said"] == said)
    assert said in lab.ctl("plane") and lab.is_in_force()
    assert lab.log().count(said) == 1
    assert one.comes_to_reach(other)
    lab.ctl("disconnect", "lab", "c")
    assert comes_true(lambda: not lab.plane()["said"])


def document(session: Session) -> str:
    """With something else that could be done."""
    said = {"sid": "s", "to": [{"port": "c"}], **session}
    ports = [{"id": "b", "vlan": 7}, {"id": "a", "mirror_sessions": [said]}]
    return json.dumps({"switches": [{"alias": "lab", "ports": ports}]})


def state_of(lab: Lab) -> Tuple[Any, Any]:
    """What the ports have, and what is in force."""
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    settings: Any = [{**port, "addresses": [], "counters": {}} for port in switch["ports"]]
    return settings, lab.plane()


def test_a_mirror_session_past_a_bound_changes_nothing(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    lab.network("nic0", "nic1")
    assert one.comes_to_reach(other)
    for bound in BOUNDS:
        before = state_of(lab)
        for session in bound.refused:
            done = lab.try_ctl("apply", "-", given=document(session))
            assert done.returncode == 1, session
            assert bound.why in done.stdout, session
            assert f"({bound.status})" in done.stdout, session
        assert state_of(lab) == before
        lab.ctl("apply", "-", given=document(bound.done))
        assert lab.is_in_force()
        lab.set_port("lab", "a", mirror_sessions=[])
        lab.set_port("lab", "b", vlan=0)
    assert one.comes_to_reach(other)


def test_what_stands_in_for_wires_is_refused_for_devices(lab: Lab) -> None:
    one = lab.client("lab", "a")
    far = lab.network("nic0").client()
    assert one.comes_to_reach(far)
    of_uplink = "the uplink 'nic0' has the device u0: what comes over it cannot be set"
    of_port = "the port 'a' of the switch 'lab' has the device c1: what comes over it cannot be set"
    of_clock = "the frames of the device c1 go by real time"
    mac = "02:00:00:00:50:01"
    commands = {
        ("link", "nic0", "down"): of_uplink,
        ("link", "nic0", "up"): of_uplink,
        ("learn", "lab", mac): of_uplink,
        ("learn", "lab", mac, "--port", "a"): of_port,
        ("counter", "lab", "pktsInUnicast", "3", "--port", "a"): of_port,
        ("counter", "lab", "pktsInUnicast", "3", "--port", "uplink1"): of_uplink,
        ("clock", "stop"): of_clock,
    }
    said = {
        **{"link": "down", "lacp": "up", "speed": 1000, "duplex": "half", "beacons": "down"},
        **{"error_percent": 3, "driver": False},
    }
    learned = {"mac": mac, "type": "learned"}
    switches: Dict[str, Dict[str, Any]] = {
        of_port: {"ports": [{"id": "a", "addresses": [learned]}]},
        of_uplink: {"addresses": [learned]},
    }
    documents: Sequence[Tuple[Any, str]] = [
        *(({"uplinks": [{"name": "nic0", key: said[key]}]}, of_uplink) for key in said),
        *(({"switches": [{"alias": "lab", **it}]}, why) for why, it in switches.items()),
        ({"clock": {"stopped": True}}, of_clock),
    ]

    def host() -> Any:
        whole = json.loads(lab.ctl("show", "--json"))
        return state_of(lab), whole["uplinks"], whole["clock"]["stopped"]

    before = host()
    for words, why in commands.items():
        done = lab.try_ctl(*words)
        assert (done.returncode, f"{why} (QEX_NOT_SUPPORTED)" in done.stdout) == (1, True), words
    for whole, why in documents:
        done = lab.try_ctl("apply", "-", given=json.dumps(whole))
        assert (done.returncode, f"{why} (QEX_NOT_SUPPORTED)" in done.stdout) == (1, True), whole
    assert host() == before
    # What has no device has none of it refused.
    lab.ctl("uplink", "nic1", "--link", "down", "--speed", "1000", "--duplex", "half")
    assert one.comes_to_reach(far)
