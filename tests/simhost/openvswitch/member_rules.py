"""Who is to get the frames of a group, written from what hosts want and not from how a switch
keeps account of it: hosts that join and leave, say again what they want, and die without a word;
routers that ask.

What a host wants it gets, and what nobody at its port wants comes no more once the time is over
that others had to say that they do. In between a port may get it or not.
"""

from dataclasses import dataclass, field
from typing import Any, Dict, FrozenSet, Iterator, List, Mapping, Optional, Sequence, Tuple, Union

import group_frames as frames
from group_traffic import VLAN

# Milliseconds. Until everybody had the time to say what it wants, all get all groups.
SURELY_UNDECIDED, DECIDED = 1000, 2000
BETWEEN_ASKING = 1000
# After another one left, in which a host says that it is still there.
REPLY = 300
_ROUTER_REPLY = 100


@dataclass(frozen=True)
class Wants:
    """The frames of a group from these sources, or from all others."""

    sources: FrozenSet[str]
    are_excluded: bool

    def __contains__(self, source: str) -> bool:
        return (source in self.sources) != self.are_excluded


NOTHING = Wants(frozenset(), False)
ALL = Wants(frozenset(), True)


@dataclass(frozen=True)
class Host:
    """At a port, with one group that it may want."""

    port: str
    group: str
    number: int


@dataclass(frozen=True)
class Says:
    """A host wants something else from now on."""

    host: Host
    wants: Wants


@dataclass(frozen=True)
class Dies:
    host: Host


@dataclass(frozen=True)
class Asks:
    """A router at a port says that it is there, and how often it asks."""

    port: str
    seconds: int


@dataclass(frozen=True)
class Passes:
    milliseconds: int


Event = Union[Says, Dies, Asks, Passes]


@dataclass(frozen=True)
class Timing:
    """What the options of the host say."""

    queries: int
    interval: int  # seconds

    @property
    def membership(self) -> int:
        """For how long one is a member that says nothing."""
        return self.queries * self.interval * 1000 + min(10_000, self.interval * 500)

    @property
    def leaving(self) -> int:
        """Until nobody says any more that it still wants what another one left."""
        return self.queries * min(BETWEEN_ASKING, self.interval * 500)


@dataclass
class _Known:
    """A host: what it wants, and what it wanted until when."""

    wants: Wants = NOTHING
    is_alive: bool = True
    said: int = 0
    before: List[Tuple[int, Wants]] = field(default_factory=list)


class Members:
    """The hosts of a switch while things happen, with the frames that they send meanwhile. All at
    one port with one group speak one version: 1 for IGMP without leaving, 2 for what knows no
    sources, 3 for what does."""

    def __init__(
        self, timing: Timing, versions: Mapping[Tuple[str, str], int], macs: Mapping[str, str]
    ) -> None:
        self.now = 0
        self.said: List[Dict[str, Any]] = []
        self._timing = timing
        self._versions = versions
        self._macs = macs
        self._hosts: Dict[Host, _Known] = {}
        self._routers: Dict[str, int] = {}

    def follow(self, events: Sequence[Event]) -> None:
        for event in events:
            if isinstance(event, Says):
                self._say(event.host, event.wants)
            elif isinstance(event, Dies):
                self._host(event.host).is_alive = False
            elif isinstance(event, Asks):
                asks = frames.asks(self._macs[event.port], "10.0.0.250", event.seconds)
                self._send(event.port, asks)
                until = self.now + event.seconds * 1000
                self._routers[event.port] = max(until, self._routers.get(event.port, 0))
            else:
                self._pass(event.milliseconds)

    # Who gets a frame

    def gets(self, port: str, group: str, source: str) -> Optional[bool]:
        """Whether a port gets a frame of a group; nothing if it may."""
        if self.now < SURELY_UNDECIDED or self._has_router(port, group, 0):
            return True
        here = self._at(port, group)
        if any(known.is_alive and source in known.wants for known in here):
            return True
        if len(here) == 1 and source in here[0].wants and not self._is_forgotten(here[0], 0):
            return True
        may = self.now <= DECIDED or self._has_router(port, group, _ROUTER_REPLY)
        may = may or any(self._may_be_kept(known, source) for known in here)
        return None if may else False

    def _at(self, port: str, group: str) -> List[_Known]:
        return [
            known for host, known in self._hosts.items() if (host.port, host.group) == (port, group)
        ]

    def _has_router(self, port: str, group: str, longer: int) -> bool:
        is_heard = "." in group and port in self._routers
        return is_heard and self.now <= self._routers[port] + longer - (0 if longer else 1)

    def _is_forgotten(self, known: _Known, longer: int) -> bool:
        return self.now > known.said + self._timing.membership + longer - (0 if longer else 1)

    def _may_be_kept(self, known: _Known, source: str) -> bool:
        if not known.is_alive and source in known.wants and not self._is_forgotten(known, 1):
            return True
        return any(source in wants and self.now <= until for until, wants in known.before)

    # What is said

    def _host(self, host: Host) -> _Known:
        return self._hosts.setdefault(host, _Known())

    def _version(self, host: Host) -> int:
        return self._versions[(host.port, host.group)]

    def _say(self, host: Host, wants: Wants) -> None:
        known = self._host(host)
        if self._version(host) < 3:
            wants = ALL if wants != NOTHING else NOTHING
        known.before.append((self._kept_until(host), known.wants))
        # One that died begins anew.
        was = known.wants if known.is_alive else NOTHING
        known.wants, known.is_alive = wants, True
        for said in self._change(host, was, wants):
            self._send(host.port, said)
            known.said = self.now
        self._pass(REPLY)
        # Those who are asked about it.
        for other in self._hosts:
            if (other.port, other.group) == (host.port, host.group) and other != host:
                self._repeat(other)

    def _kept_until(self, host: Host) -> int:
        """How long a port may get what this host wanted, which now says something else. Where
        others are, a report of what they exclude is no question whether anybody wants it."""
        known = self._hosts[host]
        if self._version(host) == 1 or not known.is_alive:
            return known.said + self._timing.membership + 1
        is_alone = self._at(host.port, host.group) == [known]
        longer = 0 if is_alone else REPLY + self._timing.membership
        return self.now + self._timing.leaving + longer

    def _change(self, host: Host, was: Wants, now: Wants) -> Iterator[bytes]:
        mac, group = self._macs[host.port], host.group
        here = "10.0.0.1" if "." in group else "fe80::1"
        if self._version(host) < 3:
            if now == ALL:
                yield self._join(host)
            elif was == ALL and self._version(host) == 2:
                yield frames.leaves(mac, here, group)
            return
        if was.are_excluded != now.are_excluded:
            kind = frames.TO_EXCLUDE if now.are_excluded else frames.TO_INCLUDE
            yield frames.reports(mac, here, kind, group, sorted(now.sources))
            return
        more, less = now.sources - was.sources, was.sources - now.sources
        if now.are_excluded:
            more, less = less, more
        for kind, sources in (frames.ALLOW, more), (frames.BLOCK, less):
            if sources:
                yield frames.reports(mac, here, kind, group, sorted(sources))

    def _join(self, host: Host) -> bytes:
        here = "10.0.0.1" if "." in host.group else "fe80::1"
        as_of_old = self._version(host) == 1
        join = frames.joins_as_of_old if as_of_old else frames.joins
        return join(self._macs[host.port], here, host.group)

    def _repeat(self, host: Host) -> None:
        """It says once more what it wants."""
        known = self._hosts[host]
        if not known.is_alive or known.wants == NOTHING:
            return
        known.said = self.now
        if self._version(host) < 3:
            self._send(host.port, self._join(host))
            return
        here = "10.0.0.1" if "." in host.group else "fe80::1"
        kind = frames.IS_EXCLUDE if known.wants.are_excluded else frames.IS_INCLUDE
        sources = sorted(known.wants.sources)
        self._send(
            host.port, frames.reports(self._macs[host.port], here, kind, host.group, sources)
        )

    def _send(self, port: str, data: bytes) -> None:
        self.said.append({"at": self.now, "port": port, "vlan": VLAN, "frame": data.hex()})

    def heard(self, ports: Sequence[str]) -> Dict[str, Any]:
        """All that a switch hears at these ports, for whoever makes one of it."""
        return {
            "queries": self._timing.queries,
            "interval": self._timing.interval,
            "places": [{"port": port, "vlan": VLAN} for port in ports],
            "said": self.said,
            "until": self.now,
        }

    def _pass(self, milliseconds: int) -> None:
        """Whoever is alive is asked from time to time."""
        period = self._timing.interval * 500
        end = self.now + milliseconds
        while self.now // period < end // period:
            self.now += period - self.now % period
            for host in self._hosts:
                self._repeat(host)
        self.now = end
