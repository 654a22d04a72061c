"""Up to which limits addresses are learned, and what counts as what: by the rules alone."""

from collections import Counter as Counts
from typing import Any, Counter, Dict, Mapping, Tuple

BROADCAST = "ff:ff:ff:ff:ff:ff"
PORTS = (1, 2)
# The kinds of cookies that count what is looked at here.
LET_IN, SENT, DROPPED, NO_ROOM_ALLOWED, NO_ROOM_DROPPED = 20, 23, 24, 10, 11
LET_IN_FOR_ONE, SENT_TO_ONE = 18, 21
COUNTED = (
    LET_IN,
    SENT,
    DROPPED,
    NO_ROOM_ALLOWED,
    NO_ROOM_DROPPED,
    LET_IN_FOR_ONE,
    SENT_TO_ONE,
)

Place = Tuple[int, int]  # of a kind, at a port


class Learner:
    """By the rules alone, what becomes of one frame after the other."""

    def __init__(self, ports: Mapping[int, Mapping[str, Any]], limit: int) -> None:
        self._ports = ports
        self._limit = limit
        self._places: Dict[str, int] = {}
        self._first: Dict[int, str] = {}
        self.counted: Counter[Place] = Counts()

    @property
    def places(self) -> Mapping[str, int]:
        """Where the addresses are."""
        return self._places

    def moves(self, source: str, port: int) -> bool:
        """Whether it would, if there is room."""
        return self._places.get(source, port) != port

    def is_elsewhere_first(self, source: str, port: int) -> bool:
        """Whether another client without a known address has this one."""
        return any(first == source for at, first in self._first.items() if at != port)

    def send(self, port: int, source: str, frames: int, to: str = BROADCAST) -> None:
        first = self._first.setdefault(port, source)
        if self._ports[port]["forbids"] and source != first:
            self.counted[DROPPED, port] += frames
            return
        learning = self._ports[port]["mac_learning"]
        at_port = sum(place == port for place in self._places.values())
        is_full = at_port >= learning["limit"] or (
            source not in self._places and len(self._places) >= self._limit
        )
        if self._places.get(source) != port and is_full:
            if learning.get("limit_policy") == "drop":
                self.counted[DROPPED, port] += frames
                self.counted[NO_ROOM_DROPPED, port] += frames
                return
            self.counted[NO_ROOM_ALLOWED, port] += frames
        else:
            self._places[source] = port
        let_in, sent = (LET_IN, SENT) if to == BROADCAST else (LET_IN_FOR_ONE, SENT_TO_ONE)
        self.counted[let_in, port] += frames
        self.counted[sent, sum(PORTS) - port] += frames
