"""Switches on a bridge whose devices keep what they send: real frames pass the data path, and so
do their copies for collectors."""

import time
from collections import Counter
from pathlib import Path
from typing import (
    Any,
    Callable,
    Counter as Counts,
    Dict,
    List,
    Mapping,
    Optional,
    Sequence,
    Tuple,
)

from bench import Bench
from compiler import Compiler
from counting_rules import KINDS as COUNTED_KINDS, Counted
from drawn_switches import COLLECTORS
from frames import Frame, plain
from links import Links
from open_vswitch import PATIENCE, OpenVSwitch
from rules import Rules, collector
from wrapped_copies import ERSPAN_2, ERSPAN_3, ETHERNET, is_wrapped, read

# A device and a frame that it sent, or a collector with what wraps its copies and one of them.
Arrived = Tuple[str, bytes]
# Of a network that no machine is in, for Open vSwitch knows the ways of the machine as well.
HERE = "198.18.0.1"
KINDS = {ETHERNET: "gre", ERSPAN_2: "erspan2", ERSPAN_3: "erspan3"}
FENCE = Frame("02:00:00:00:00:fe", "02:00:00:00:00:ff")
_FILE_HEADER = 24
_FRAME_HEADER = 16


def collected(sent: bytes) -> Arrived:
    """What was sent over the underlay."""
    assert is_wrapped(sent), sent.hex()
    packet = read(sent)
    assert packet.source == HERE, packet
    wraps = {"type": KINDS[packet.kind], "key": packet.key, "id": packet.key}
    return collector(packet.destination, wraps, packet.leaves), plain(packet.copy)


class Wires(Bench):
    """One whose frames are no traces. Two devices more than switches have tell when a frame must
    have passed: each frame is followed by two others from one to the other."""

    def __init__(
        self,
        open_vswitch: OpenVSwitch,
        compiler: Compiler,
        folder: Path,
        devices: int,
        bridge: str = "wires",
    ) -> None:
        super().__init__(open_vswitch, compiler, bridge, devices + 2, sent_to=folder)
        self._folder = folder
        self._underlay = ""
        self._devices = devices
        self._seen: Dict[str, int] = {}
        # Devices by the numbers in cookies.
        self._counting: Dict[int, str] = {}
        fence, end = devices + 1, devices + 2
        self.more_flows = [f"priority=65535,in_port={fence} actions=output:{end}"]
        self.host = {"underlay": {"device": "eth9", "address": f"{HERE}/24"}}

    def load(
        self,
        switch: Mapping[str, Any],
        clients: Sequence[Mapping[str, Any]],
        change: Callable[[str], Optional[str]] = str,
        links: Links = Links(),
        multicast: Optional[Mapping[str, Any]] = None,
        heard: Optional[Mapping[str, Any]] = None,
    ) -> Rules:
        rules = super().load(switch, clients, change, links, multicast, heard)
        at = {port["id"]: port["uplink"] for port in switch.get("uplink_ports", [])}
        self._counting = {number: at.get(port, port) for port, number in rules.numbers.items()}
        # What the data path keeps of the flows before goes with them, but not at that moment.
        self.ask("revalidator/purge")
        return rules

    def lead_to_collectors(self) -> None:
        """What is wrapped for them goes out at a device of its own. One bridge may have that."""
        self._underlay = f"{self._bridge}-out"
        self._open_vswitch.add_wrapping(
            self._bridge, self._underlay, self._folder, HERE, COLLECTORS
        )

    def forget(self) -> None:
        """Makes the switch one that has learned nothing."""
        self._open_vswitch.forget(self._bridge)

    def counted(self) -> "Tuple[Counts[Counted], Counts[Counted]]":
        """The frames that its flows counted, none of which went like another, and the bytes of
        these."""
        frames: Counts[Counted] = Counter()
        size: Counts[Counted] = Counter()
        for cookie, (number, length) in self._open_vswitch.counts(self._bridge).items():
            device, kind = self._counting.get(cookie & 0xFFFFFFFF), COUNTED_KINDS.get(cookie >> 56)
            if device is not None and kind is not None:
                frames[device, kind] += number
                size[device, kind] += length
        return frames, size

    def transmit(self, at: str, data: bytes) -> "Counts[Arrived]":
        """What comes out where of a frame that comes in there."""
        self._receive(self.devices[at], data)
        for _ in range(2):
            self._pass_fence()
        found = Counter(
            (name, plain(sent))
            for name, number in self.devices.items()
            for sent in self._newly_sent(f"{self._bridge}{number}")
        )
        if self._underlay:
            found.update(collected(sent) for sent in self._newly_sent(self._underlay))
        return found

    def _receive(self, number: int, data: bytes) -> None:
        self.ask("netdev-dummy/receive", f"{self._bridge}{number}", data.hex())

    def _pass_fence(self) -> None:
        self._receive(self._devices + 1, FENCE.to_bytes())
        deadline = time.monotonic() + PATIENCE
        while not self._newly_sent(f"{self._bridge}{self._devices + 2}"):
            assert time.monotonic() < deadline, "no frame passes the bridge"
            time.sleep(0.0005)

    def _newly_sent(self, device: str) -> List[bytes]:
        """What a device has sent since the last time."""
        frames = []
        with open(self._folder / device, "rb") as capture:
            at = self._seen.get(device, _FILE_HEADER)
            capture.seek(at)
            data = capture.read()
        while len(data) >= _FRAME_HEADER:
            end = _FRAME_HEADER + int.from_bytes(data[8:12], "little")
            if len(data) < end:
                break
            frames.append(data[_FRAME_HEADER:end])
            data = data[end:]
            at += end
        self._seen[device] = at
        return frames
