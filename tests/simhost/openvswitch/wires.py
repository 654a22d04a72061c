"""Switches on a bridge whose devices keep what they send: real frames pass the data path."""

import time
from collections import Counter
from pathlib import Path
from typing import Any, Counter as Counts, List, Mapping, Sequence, Tuple

from bench import Bench
from compiler import Compiler
from frames import Copy, Frame, from_bytes
from open_vswitch import PATIENCE, OpenVSwitch
from rules import Rules

_FILE_HEADER = 24
_FRAME_HEADER = 16


class Wires(Bench):
    """One whose frames are no traces. Two devices more than switches have tell when a frame must
    have passed: each frame is followed by two others from one to the other."""

    def __init__(
        self, open_vswitch: OpenVSwitch, compiler: Compiler, folder: Path, devices: int
    ) -> None:
        super().__init__(open_vswitch, compiler, "wires", devices + 2, sent_to=folder)
        self._folder = folder
        self._devices = devices
        self._last: Tuple[Mapping[str, Any], Sequence[Mapping[str, Any]]] = ({}, ())

    def load(self, switch: Mapping[str, Any], clients: Sequence[Mapping[str, Any]]) -> Rules:
        self._last = (switch, clients)
        fence, end = self._devices + 1, self._devices + 2
        self.more_flows = [f"priority=65535,in_port={fence} actions=output:{end}"]
        rules = super().load(switch, clients)
        # What the data path keeps of the flows before goes with them, but not at that moment.
        self.ask("revalidator/purge")
        return rules

    def forget(self) -> None:
        """Makes the switch one that has learned nothing."""
        self.load(*self._last)

    def transmit(self, at: str, frame: Frame) -> "Counts[Copy]":
        """What comes out where of a frame that comes in there."""
        before = {name: self._sent(number) for name, number in self.devices.items()}
        self._receive(self.devices[at], frame)
        for _ in range(2):
            self._pass_fence()
        found: Counts[Copy] = Counter()
        for name, number in self.devices.items():
            for sent in self._sent(number)[len(before[name]) :]:
                found[(name, from_bytes(frame, sent), None)] += 1
        return found

    def _receive(self, number: int, frame: Frame) -> None:
        self.ask("netdev-dummy/receive", f"wires{number}", frame.to_bytes().hex())

    def _pass_fence(self) -> None:
        end = self._devices + 2
        passed = len(self._sent(end))
        self._receive(self._devices + 1, Frame("02:00:00:00:00:fe", "02:00:00:00:00:ff"))
        deadline = time.monotonic() + PATIENCE
        while len(self._sent(end)) == passed:
            assert time.monotonic() < deadline, "no frame passes the bridge"
            time.sleep(0.001)

    def _sent(self, number: int) -> List[bytes]:
        """All that a device has sent."""
        data = (self._folder / f"wires{number}").read_bytes()
        frames = []
        at = _FILE_HEADER
        while at < len(data):
            length = int.from_bytes(data[at + 8 : at + 12], "little")
            frames.append(data[at + _FRAME_HEADER : at + _FRAME_HEADER + length])
            at += _FRAME_HEADER + length
        return frames
