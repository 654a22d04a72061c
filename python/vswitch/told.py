"""Values of what the host tells: frozen, compared by what they hold."""

from dataclasses import dataclass
from typing import Dict, Optional, Tuple

from libvswitch.enums import LinkState, MacType
from vswitch._describing import mac_words
from vswitch.values import Value, Words

__all__ = [
    "Change",
    "Event",
    "Group",
    "Lag",
    "MacEntry",
    "MirrorStats",
    "PortStats",
    "SwitchStats",
    "shown",
]


@dataclass(frozen=True, eq=False, repr=False)
class MacEntry(Value):
    """An address, where it is, and for how many seconds it has not been seen.

    Without a port it is beyond the uplinks.
    """

    mac: str
    type: MacType
    vlan: int
    age: int
    switch: str
    port: Optional[str] = None
    vni: int = 0
    ages: bool = False

    def words(self) -> Dict[str, Words]:
        """The entry as documents say it in the place where it is."""
        return mac_words(self.mac, self.vlan, self.vni, self.type, self.ages, self.age)


@dataclass(frozen=True, eq=False, repr=False)
class Group(Value):
    """A multicast group that a port has joined, and its sources."""

    address: str
    version: int = 0
    source_mode: str = "none"
    sources: Tuple[str, ...] = ()
    vni: int = 0


@dataclass(frozen=True, eq=False, repr=False)
class Lag(Value):
    """A link-aggregation group of a switch."""

    name: str
    link: LinkState
    uplinks: Tuple[str, ...]


@dataclass(frozen=True, eq=False, repr=False)
class Change(Value):
    """What changes: where, and both values in the words of documents; None is what is not there."""

    path: str
    before: Words
    after: Words

    def __str__(self) -> str:
        return f"{self.path}: {shown(self.before)} -> {shown(self.after)}"


@dataclass(frozen=True, eq=False, repr=False)
class Event(Value):
    """What changed on the host: when, in seconds since 1970, and what kind of thing."""

    at: float
    kind: str
    path: str
    before: Words
    after: Words

    def __str__(self) -> str:
        return f"{self.path}: {shown(self.before)} -> {shown(self.after)}"


def shown(value: Words) -> str:
    """A value in the words of documents, for people."""
    if value is None:
        return "absent"
    if isinstance(value, bool):
        return "true" if value else "false"
    if isinstance(value, dict):
        return " ".join(f"{name}={shown(one)}" for name, one in value.items()) or "none"
    if isinstance(value, (list, tuple)):
        # What has members of its own is told from what follows it.
        between = "; " if any(isinstance(one, dict) for one in value) else ","
        return between.join(shown(one) for one in value) or "none"
    return str(value)


# What is counted has the names that documents have for counters.


@dataclass(frozen=True, eq=False, repr=False)
class MirrorStats(Value):
    """What a running mirror session counted."""

    mirrorPktCnt: int = 0
    mirrorPktFailCnt: int = 0
    mirroredPkts: int = 0
    discardedPkts: int = 0
    failedPkts: int = 0


@dataclass(frozen=True, eq=False, repr=False)
class PortStats(Value):
    """What a port and its MAC learning counted."""

    pktsInUnicast: int = 0
    bytesInUnicast: int = 0
    pktsInMulticast: int = 0
    bytesInMulticast: int = 0
    pktsInBroadcast: int = 0
    bytesInBroadcast: int = 0
    pktsOutUnicast: int = 0
    bytesOutUnicast: int = 0
    pktsOutMulticast: int = 0
    bytesOutMulticast: int = 0
    pktsOutBroadcast: int = 0
    bytesOutBroadcast: int = 0
    pktsInDropped: int = 0
    pktsOutDropped: int = 0
    pktsInException: int = 0
    pktsOutException: int = 0
    numMACsLearned: int = 0
    noLearningAllowedPkts: int = 0
    noLearningDroppedPkts: int = 0
    numMACsMoved: int = 0


@dataclass(frozen=True, eq=False, repr=False)
class SwitchStats(Value):
    """What the team of a switch counted."""

    rarpPktsSent: int = 0
    maxRARPTime: int = 0
    rarpTime: int = 0
    txFromSrvPort: int = 0
    txUsingSrvPortFRP: int = 0
    txUsingPktSrcPortFRP: int = 0
    txErrors: int = 0
    rxToSrvPort: int = 0
    rxRpfOverride: int = 0
