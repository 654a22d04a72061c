"""What a switch counts of frames, by what its counters mean and by what came out: each frame at the
device where it comes in, as let in or as dropped, and at each where it goes out."""

from collections import Counter
from typing import Any, Counter as Counts, Dict, List, Optional, Tuple

from frames import TAG, Frame
from rules import HEADER, LARGEST_TAGS, Rules, is_multicast

LET_IN = "let in to one", "let in to several", "let in to all"
SENT = "sent to one", "sent to several", "sent to all"
DROPPED = "dropped"
# By the first bytes of cookies of flows.
KINDS: Dict[int, str] = dict(enumerate((*LET_IN, *SENT, DROPPED), 18))

# A device, and which of its counters.
Counted = Tuple[str, str]
EVERYBODY = "ff:ff:ff:ff:ff:ff"


class CountingRules:
    """Of a switch and the frames at it so far."""

    def __init__(self, rules: Rules) -> None:
        self._rules = rules
        self._came_in: Counts[str] = Counter()
        self._went_out: Counts[Counted] = Counter()
        self._bytes_out: Counts[Counted] = Counter()
        # Nobody but the switch decides whether a frame that nobody gets was let in.
        self._certain: Counts[Counted] = Counter()
        self._bytes_certain: Counts[Counted] = Counter()
        # The copy of a session counts for that.
        self._all_out = not rules.mirrors()

    def is_large(self, frame: Optional[Frame]) -> bool:
        """Whether it may be larger than the MTU, whichever of its tags are off: it goes nowhere
        then, and counts as if it did."""
        largest: int = self._rules.switch.get("mtu", 1500) + HEADER
        return frame is not None and frame.counted_size + TAG * LARGEST_TAGS > largest

    def add(self, at: str, data: bytes, out: "Counts[str]") -> None:
        """A frame came in, and so often went out at devices."""
        frame = Frame.read(data)
        to = _to_whom(frame)
        self._came_in[at] += 1
        if out or self._is_dropped(at, frame):
            counted = at, LET_IN[to] if out else DROPPED
            self._certain[counted] += 1
            self._bytes_certain[counted] += len(data)
        self._all_out = self._all_out and not self.is_large(frame)
        for device, copies in out.items():
            self._went_out[device, SENT[to]] += copies
            self._bytes_out[device, SENT[to]] += copies * len(data)

    def wrong(self, frames: "Counts[Counted]", size: "Counts[Counted]") -> List[str]:
        """What is wrong with so many frames and bytes that were counted."""
        came_in: Counts[str] = Counter()
        for (device, kind), number in frames.items():
            came_in[device] += number if kind not in SENT else 0
        said = [
            *_unlike("came in", came_in, self._came_in),
            *_unlike("came in at least", frames & self._certain, self._certain),
            *_unlike("came in at least of bytes", size & self._bytes_certain, self._bytes_certain),
        ]
        if self._all_out:
            said += _unlike("went out", _sent(frames), self._went_out)
            said += _unlike("went out of bytes", _sent(size), self._bytes_out)
        return said

    def _is_dropped(self, at: str, frame: Optional[Frame]) -> bool:
        """For certain: one that is too large counts as if it were not."""
        return frame is None or (not self.is_large(frame) and self._rules.is_refused(at, frame))


def _to_whom(frame: Optional[Frame]) -> int:
    """One, several or all."""
    if frame is None or not is_multicast(frame.destination):
        return 0
    return 2 if frame.destination == EVERYBODY else 1


def _sent(counted: "Counts[Counted]") -> "Counts[Counted]":
    return Counter({key: number for key, number in counted.items() if key[1] in SENT})


def _unlike(what: str, found: "Counts[Any]", wanted: "Counts[Any]") -> List[str]:
    return [] if found == wanted else [f"counted that {what}: {found} instead of {wanted}"]
