"""Switches on a bridge whose devices keep what they send: real frames pass the data path."""

import time
from collections import Counter
from pathlib import Path
from typing import (
    Any,
    Callable,
    Collection,
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
from frames import Frame, plain
from open_vswitch import PATIENCE, OpenVSwitch
from rules import Rules

# A device and a frame that it sent.
Arrived = Tuple[str, bytes]
FENCE = Frame("02:00:00:00:00:fe", "02:00:00:00:00:ff")
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
        self._seen: Dict[int, int] = {}
        fence, end = devices + 1, devices + 2
        self.more_flows = [f"priority=65535,in_port={fence} actions=output:{end}"]

    def load(
        self,
        switch: Mapping[str, Any],
        clients: Sequence[Mapping[str, Any]],
        change: Callable[[str], Optional[str]] = str,
        down: Collection[str] = (),
        multicast: Optional[Mapping[str, Any]] = None,
    ) -> Rules:
        rules = super().load(switch, clients, change, down, multicast)
        # What the data path keeps of the flows before goes with them, but not at that moment.
        self.ask("revalidator/purge")
        return rules

    def forget(self) -> None:
        """Makes the switch one that has learned nothing."""
        self._open_vswitch.forget(self._bridge)

    def transmit(self, at: str, data: bytes) -> "Counts[Arrived]":
        """What comes out where of a frame that comes in there."""
        self._receive(self.devices[at], data)
        for _ in range(2):
            self._pass_fence()
        return Counter(
            (name, plain(sent))
            for name, number in self.devices.items()
            for sent in self._newly_sent(number)
        )

    def _receive(self, number: int, data: bytes) -> None:
        self.ask("netdev-dummy/receive", f"wires{number}", data.hex())

    def _pass_fence(self) -> None:
        self._receive(self._devices + 1, FENCE.to_bytes())
        deadline = time.monotonic() + PATIENCE
        while not self._newly_sent(self._devices + 2):
            assert time.monotonic() < deadline, "no frame passes the bridge"
            time.sleep(0.0005)

    def _newly_sent(self, number: int) -> List[bytes]:
        """What a device has sent since the last time."""
        frames = []
        with open(self._folder / f"wires{number}", "rb") as capture:
            at = self._seen.get(number, _FILE_HEADER)
            capture.seek(at)
            data = capture.read()
        while len(data) >= _FRAME_HEADER:
            end = _FRAME_HEADER + int.from_bytes(data[8:12], "little")
            if len(data) < end:
                break
            frames.append(data[_FRAME_HEADER:end])
            data = data[end:]
            at += end
        self._seen[number] = at
        return frames
