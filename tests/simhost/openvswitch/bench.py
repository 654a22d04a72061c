"""Switches on a bridge, one after the other, and frames at them."""

import re
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
    Set,
)

from compiler import Compiler
from frames import Copy, Frame, copies
from links import Links
from open_vswitch import OpenVSwitch
from rules import Rules


class Bench:
    """A bridge with so many devices, each of which is what a switch has that number for."""

    def __init__(
        self,
        open_vswitch: OpenVSwitch,
        compiler: Compiler,
        bridge: str,
        devices: int,
        sent_to: Optional[Path] = None,
    ) -> None:
        self.ask = open_vswitch.ask
        self.set_link = open_vswitch.set_link
        self.devices: Dict[str, int] = {}
        self.more_flows: List[str] = []
        # What the hosts of all switches have.
        self.host: Dict[str, Any] = {}
        self._without_link: Set[int] = set()
        self._open_vswitch = open_vswitch
        self._compiler = compiler
        self._bridge = bridge
        numbers = range(1, devices + 1)
        names = {f"{bridge}{number}": number for number in numbers}
        open_vswitch.add_bridge(bridge, names, sent_to)

    def load(
        self,
        switch: Mapping[str, Any],
        clients: Sequence[Mapping[str, Any]],
        change: Callable[[str], Optional[str]] = str,
        links: Links = Links(),
        multicast: Optional[Mapping[str, Any]] = None,
        heard: Optional[Mapping[str, Any]] = None,
    ) -> Rules:
        """Makes the bridge that switch, with each flow and group changed or left out first, its
        links as they are after what became of them, and groups with these members, or with those
        that were heard; its rules."""
        told = links.documents()
        made = self._compiler.compile(switch, clients, multicast, told, self.host, heard)
        flows, groups = (
            [text for text in map(change, made[kind]) if text is not None]
            for kind in ("flows", "groups")
        )
        self._open_vswitch.load(self._bridge, [*flows, *self.more_flows], groups)
        self.devices = made["devices"]
        self._cut({self.devices[uplink] for uplink in links.down})
        return Rules(switch, made["numbers"], clients, links)

    def _cut(self, devices: Set[int]) -> None:
        """Those and no others have no link."""
        for number in self._without_link ^ devices:
            self.set_link(self._bridge, number, is_up=number not in devices)
        self._without_link = devices

    def send(self, at: str, frame: Frame) -> "Counts[Copy]":
        """What comes out where of a frame that comes in there, which the switch remembers."""
        return self._trace(frame, f"in_port={self.devices[at]}", frame.to_bytes().hex())

    def look(self, at: str, frame: Frame) -> "Counts[Copy]":
        """Likewise of one that it forgets."""
        device = f"{self._bridge}{self.devices[at]}"
        return self._trace(frame, frame.to_key(device))

    def _trace(self, frame: Frame, *words: str) -> "Counts[Copy]":
        # A frame by its key belongs to no bridge, but to a data path.
        where = [] if words[0].startswith("in_port(") else [self._bridge]
        traced = self.ask("ofproto/trace", "--names", *where, *words)
        found = re.search(r"^Datapath actions: (.*)$", traced, re.MULTILINE)
        assert found, traced
        names = {f"{self._bridge}{number}": name for name, number in self.devices.items()}
        return copies(found.group(1), frame, names)
