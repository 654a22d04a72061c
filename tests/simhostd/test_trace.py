"""What simhostctl says of a frame is what becomes of it, and it names the setting that decides."""

import json
import re
import time
from pathlib import Path
from typing import Any, Dict, List, Mapping, Optional, Sequence, Tuple

import pytest
from simhost import Client, Frames, frame

from frame_lab import TOOLS
from group_frames import joins

PATIENCE = 30.0
EVERYBODY = "ff:ff:ff:ff:ff:ff"
STRANGER = "02:00:00:00:00:99"
MACS = {port: f"02:00:00:00:00:0{number}" for number, port in enumerate("abc", 1)}
SCENARIO: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
    "switches": [
        {
            "alias": "lab",
            "uplinks": ["nic0", "nic1"],
            "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
            "ports": [{"id": "a", "vlan": 7}, {"id": "b", "vlan": 7}, {"id": "c", "vlan": 8}],
        }
    ],
}
# A place and the VLANs of the tags there.
Copy = Tuple[str, Sequence[int]]
pytestmark = pytest.mark.scenario(SCENARIO)


class Traced:
    """The lab with a client at each port, and with two networks of one client each."""

    def __init__(self, frames: Frames) -> None:
        self.frames = frames
        self.clients: Dict[str, Client] = {
            port: frames.client("lab", port, mac=mac) for port, mac in MACS.items()
        }
        for uplink in ("nic0", "nic1"):
            self.clients[uplink] = frames.network(uplink).client()

    def set_switch(self, **settings: Any) -> None:
        self.frames.host.apply({"switches": [{"alias": "lab", **settings}]})

    def set_port(self, port: str, **settings: Any) -> None:
        self.set_switch(ports=[{"id": port, **settings}])

    def ctl(self, *words: str) -> str:
        done = self.frames.host.run([TOOLS / "simhostctl", *words])
        assert done.returncode == 0, done.stderr
        return str(done.stdout)

    def steps(self, at: str, sent: bytes) -> List[Dict[str, Any]]:
        steps: List[Dict[str, Any]] = json.loads(
            self.ctl("trace", f"lab/{at}", sent.hex(), "--json")
        )
        return steps

    def is_true(self, at: str, sent: bytes) -> List[Dict[str, Any]]:
        """What is said, which is what comes out when the frame is sent."""
        steps = self.steps(at, sent)
        said = sorted((step["to"], step["vlans"]) for step in steps if "to" in step)
        deadline = time.monotonic() + PATIENCE
        # What the data path remembers of other settings goes some milliseconds after them.
        while self.what_comes(at, sent) != said:
            assert time.monotonic() < deadline, (steps, self.what_comes(at, sent))
        return steps

    def what_comes(self, at: str, sent: bytes) -> List[Copy]:
        self.clients[at].send(sent)
        time.sleep(0.1)
        found: List[Copy] = []
        for place, client in self.clients.items():
            while place != at:
                try:
                    found.append((place, vlans_of(client.expect(lambda one: True, timeout=0))))
                except AssertionError:
                    break
        return sorted(found)


def vlans_of(received: bytes) -> List[int]:
    vlans = []
    at = 12
    while received[at : at + 2] == b"\x81\x00":
        vlans.append(int.from_bytes(received[at + 2 : at + 4], "big") & 0xFFF)
        at += 4
    return vlans


@pytest.fixture
def traced(frames: Frames) -> Traced:
    return Traced(frames)


def last(steps: Sequence[Mapping[str, Any]]) -> Tuple[str, Optional[str], Any]:
    """Of a frame that is dropped: why, and the setting and its value."""
    assert steps[-1]["does"] == "dropped"
    setting = steps[-1]["setting"]
    text = steps[-1]["text"].replace("is dropped: ", "")
    if setting is None:
        return text, None, None
    port = "" if setting["port"] is None else f"{setting['port']}/"
    return text, f"{port}{setting['name']}", setting["value"]


def test_a_broadcast(traced: Traced) -> None:
    session = {"sid": "s", "to": [{"port": "c"}], "sent_by": [{"port": "a"}]}
    traced.set_port("a", mirror_sessions=[session])
    steps = traced.is_true("a", frame(EVERYBODY, MACS["a"]))
    copied, to_port, to_uplink = (step for step in steps if "to" in step)
    assert (copied["does"], copied["to"]) == ("copied", "c")
    assert "the mirror session s" in copied["text"]
    assert copied["setting"]["name"] == "mirror_sessions" and copied["setting"]["port"] == "a"
    assert (to_port["does"], to_port["to"], to_port["vlans"]) == ("delivered", "b", [])
    assert (to_uplink["does"], to_uplink["to"], to_uplink["vlans"]) == ("delivered", "nic0", [7])
    (chosen,) = (step for step in steps if step["text"] == "goes over uplink nic0")
    assert chosen["setting"]["name"] == "teaming" and chosen["setting"]["port"] is None


def test_a_known_address(traced: Traced) -> None:
    steps = traced.is_true("a", frame(MACS["b"], MACS["a"]))
    assert [step["text"] for step in steps] == [
        "comes in at port a, without a tag",
        "is in VLAN 7",
        "is for an address at port b",
        "goes out at port b, without a tag",
    ]


def test_a_tag_for_a_client_that_tags(traced: Traced) -> None:
    traced.set_port("b", vlan={"trunk": [7, 9]})
    steps = traced.is_true("a", frame(MACS["b"], MACS["a"]))
    assert steps[-1]["vlans"] == [7]


def test_from_an_uplink(traced: Traced) -> None:
    steps = traced.is_true("nic0", frame(MACS["a"], STRANGER, vlan=7))
    assert "has its source learned beyond the uplinks" in [step["text"] for step in steps]
    assert (steps[-1]["to"], steps[-1]["vlans"]) == ("a", [])


def test_an_address_beyond_the_uplinks(traced: Traced) -> None:
    traced.is_true("nic0", frame(MACS["a"], STRANGER, vlan=7))
    steps = traced.is_true("a", frame(STRANGER, MACS["a"]))
    assert "is for an address beyond the uplinks" in [step["text"] for step in steps]
    assert (steps[-1]["to"], steps[-1]["vlans"]) == ("nic0", [7])


def test_the_other_uplink_of_a_port(traced: Traced) -> None:
    traced.set_port("a", uplink="nic1")
    steps = traced.is_true("a", frame(EVERYBODY, MACS["a"]))
    (chosen,) = (step for step in steps if step["text"] == "goes over uplink nic1")
    assert chosen["setting"] == {"port": "a", "name": "uplink", "value": "nic1"}


def test_a_private_vlan(traced: Traced) -> None:
    traced.set_switch(
        private_vlans=[
            {"primary": 70, "secondary": 70, "type": "promiscuous"},
            {"primary": 70, "secondary": 7, "type": "isolated"},
        ]
    )
    traced.set_port("c", vlan=70)
    steps = traced.is_true("a", frame(EVERYBODY, MACS["a"]))
    (private,) = (step for step in steps if "private" in step["text"])
    assert private["text"] == "which is isolated in the private VLAN 70"
    assert private["setting"]["name"] == "private_vlans"
    assert {step["to"] for step in steps if "to" in step} == {"c", "nic0"}
    steps = traced.is_true("a", frame(MACS["b"], MACS["a"]))
    assert last(steps)[0] == "nobody is there who may get it"


@pytest.mark.parametrize(
    "settings, at, sent, why",
    [
        (
            {"disabled": True},
            "a",
            frame(EVERYBODY, MACS["a"]),
            ("the switch is disabled", "disabled", True),
        ),
        (
            {},
            "a",
            frame("01:80:c2:00:00:00", MACS["a"]),
            ("it is malformed, or for the other end of its link only", None, None),
        ),
        (
            {"ports": [{"id": "a", "blocked": True}]},
            "a",
            frame(EVERYBODY, MACS["a"]),
            ("port a sends nothing", "a/blocked", True),
        ),
        (
            {"mtu": 1400},
            "a",
            frame(EVERYBODY, MACS["a"], payload=bytes(1401)),
            ("it is larger than the MTU", "mtu", 1400),
        ),
        (
            {"ports": [{"id": "a", "forbids": ["forged_transmits"]}]},
            "a",
            frame(EVERYBODY, STRANGER),
            ("its source is not the client's address", "a/forbids", ["forged_transmits"]),
        ),
        (
            {},
            "a",
            frame(EVERYBODY, MACS["a"], vlan=9),
            ("the port has no such VLAN", "a/vlan", 7),
        ),
        (
            {"ports": [{"id": "a", "vlan": {"guest_tagging": True}}]},
            "a",
            frame(EVERYBODY, MACS["a"], vlan=7, ethertype=0x8100, payload=bytes([0, 9, 8, 0])),
            ("it has a second tag", "a/nested_tag", None),
        ),
        (
            {},
            "nic0",
            frame(EVERYBODY, "02:00:00:00:00:99", vlan=7, ethertype=0x8100, payload=bytes(46)),
            ("it has a second tag", None, None),
        ),
        (
            {},
            "nic0",
            frame(EVERYBODY, MACS["a"], vlan=7),
            ("the switch sent it itself, and it came back", None, None),
        ),
        (
            {
                "ports": [
                    {
                        "id": "a",
                        "mac_learning": {"learning": True, "limit": 0, "limit_policy": "drop"},
                    }
                ]
            },
            "a",
            frame(EVERYBODY, STRANGER),
            ("there is no room for its source", "a/mac_learning", None),
        ),
        (
            {},
            "nic1",
            frame(EVERYBODY, STRANGER, vlan=7),
            ("it is taken where it comes in at another uplink", "teaming", None),
        ),
        (
            {},
            "nic0",
            frame(STRANGER, "02:00:00:00:00:98", vlan=7),
            ("no port takes frames for addresses that nobody knows", None, None),
        ),
        (
            {},
            "nic0",
            frame(EVERYBODY, STRANGER, vlan=77),
            ("nobody is there who may get it", None, None),
        ),
    ],
    ids=[
        "disabled",
        "reserved",
        "blocked",
        "too_large",
        "forged",
        "wrong_tag",
        "nested_tag",
        "nested_tag_outside",
        "own_frame",
        "limit",
        "another_uplink",
        "unknown",
        "nobody",
    ],
)
def test_what_is_dropped(
    traced: Traced,
    settings: Mapping[str, Any],
    at: str,
    sent: bytes,
    why: Tuple[str, Optional[str], Any],
) -> None:
    traced.set_switch(**settings)
    found = last(traced.is_true(at, sent))
    assert found[:2] == why[:2]
    assert why[2] is None or found[2] == why[2]


def port_of(traced: Traced, name: str) -> Dict[str, Any]:
    (switch,) = json.loads(traced.ctl("show", "--json"))["switches"]
    (found,) = (port for port in switch["ports"] if port["id"] == name)
    return dict(found)


def test_a_question_teaches_nothing(traced: Traced) -> None:
    """Neither who the client is, nor where an address is, nor who wants a group."""
    learns = {"learning": True, "limit": 1, "limit_policy": "drop"}
    traced.set_switch(multicast="snooping")
    without_address = {"name": port_of(traced, "a")["device"]["name"]}
    traced.set_port("a", device=without_address, forbids=["forged_transmits"], mac_learning=learns)
    forged = frame(EVERYBODY, STRANGER)
    texts = [step["text"] for step in traced.steps("a", forged)]
    assert "makes its source the client's address, if that has none" in texts
    assert "has its source learned at port a" in texts
    traced.steps("a", joins(STRANGER, "192.0.2.1", "239.1.1.1"))
    said = port_of(traced, "a")
    assert not said.get("addresses") and not said.get("groups")
    # Who was taken for another one would be forged.
    one, other = traced.clients["a"], traced.clients["b"]
    one.send(frame(EVERYBODY, one.mac))
    other.expect(frame(EVERYBODY, one.mac))
    why, setting, _ = last(traced.is_true("a", forged))
    assert (why, setting) == ("its source is not the client's address", "a/forbids")
    traced.set_port("a", forbids=[])
    why, setting, _ = last(traced.is_true("a", forged))
    assert (why, setting) == ("there is no room for its source", "a/mac_learning")


def test_a_source_is_learned_in_one_vlan(traced: Traced) -> None:
    learns = {"learning": True, "limit": 1, "limit_policy": "drop"}
    traced.set_port("a", vlan={"trunk": [7, 9]}, mac_learning=learns)
    at_once, other = (frame(MACS["b"], STRANGER, vlan=vlan) for vlan in (7, 9))
    traced.is_true("a", at_once)
    assert [step for step in traced.is_true("a", at_once) if "to" in step]
    why, setting, _ = last(traced.is_true("a", other))
    assert (why, setting) == ("there is no room for its source", "a/mac_learning")


def test_there_may_be_no_room_for_a_source_beyond_the_uplinks(traced: Traced) -> None:
    traced.set_switch(mac_learning={"limit": 1})
    known, unknown = (frame(MACS["a"], f"02:00:00:00:01:0{n}", vlan=7) for n in (1, 2))
    learned = "has its source learned beyond the uplinks"
    texts = [step["text"] for step in traced.is_true("nic0", known)]
    assert learned in texts
    (told,) = (step for step in traced.is_true("nic0", unknown) if "room" in step["text"])
    assert told["text"] == "is let through: there is no room for its source"
    assert told["setting"]["name"] == "mac_learning" and told["setting"]["port"] is None
    assert learned in [step["text"] for step in traced.is_true("nic0", known)]


def test_words_for_frames_and_for_people(traced: Traced) -> None:
    source = f"src={MACS['a']}"
    said = traced.ctl("trace", "lab/a", f"dst={EVERYBODY}", source, "vlan=9", "size=64")
    assert said == (
        "comes in at port a, with the tag of VLAN 9\n"
        "is dropped: the port has no such VLAN (lab/a/vlan 7)\n"
    )


def test_the_guide_shows_what_is_said(traced: Traced) -> None:
    guide = Path(__file__).parents[2] / "docs" / "guides" / "frames.md"
    blocks = re.findall(r"console\n(.*?)```", guide.read_text(encoding="utf-8"), re.DOTALL)
    shown = re.findall(r"\$ simhostctl (trace .*)\n([^$]*)", "".join(blocks))
    assert len(shown) == 2
    for command, said in shown:
        assert traced.ctl(*command.split()) == said


@pytest.mark.parametrize(
    "words, why",
    [
        (["lab", "00"], "'lab' is no port such as vswitch0/web-1"),
        (["lab/x", "00" * 14], "no frames come in at 'x'"),
        (["lab/a", "00" * 13], "a frame has 14 to 65535 bytes, not 13"),
        (["lab/a", "0g"], "'0g' is no frame"),
        (["lab/a", "000"], "'000' is no frame"),
        (["lab/a", "dst=1"], "dst=1: no address"),
        (["lab/a", f"dst={STRANGER}"], "a frame has src="),
        (["lab/a", "dest=1"], "'dest=1' is none of dst="),
        (["lab/a", f"dst={STRANGER}", f"dst={STRANGER}"], "dst= is there twice"),
        (
            ["lab/a", f"dst={STRANGER}", f"src={STRANGER}", "vlan=4096"],
            "vlan=4096: no number up to 4095",
        ),
        (
            ["lab/a", f"dst={STRANGER}", f"src={STRANGER}", "size=13"],
            "size=13: the header has 14 bytes",
        ),
    ],
)
def test_what_is_no_question(frames: Frames, words: List[str], why: str) -> None:
    frames.client("lab", "a")
    done = frames.host.run([TOOLS / "simhostctl", "trace", *words])
    assert done.returncode != 0
    assert why in done.stderr
