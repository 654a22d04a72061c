"""The rules of frames by themselves, written from what the settings mean and not from how a switch
is told of them: where a frame must come out, and with which tags. Of a switch that has learned
nothing, and that was told what became of its links."""

from collections import Counter
from dataclasses import dataclass
from itertools import chain
from typing import (
    Any,
    Counter as Counts,
    Dict,
    Iterable,
    Iterator,
    List,
    Mapping,
    Optional,
    Sequence,
    Set,
    Tuple,
)

from frames import TAG, TAG_TYPES, Copy, Frame, Tag, Tags
from links import Links
from team_rules import Order, Teams

# The tag of the VLAN that a frame is in, and those that are left.
Entered = Tuple[Tag, Tags]

GREATEST_VLAN = 4094
LARGEST_TAGS = 2
HEADER = 14
# Groups that nobody has to ask for: all stations, those of the link, those of its neighbours.
FOR_EVERYBODY = ("ff:ff:ff:ff:ff:ff", "01:00:5e:00:00:", "33:33:00:00:00:", "33:33:ff:")
# Of the place of an address that is known: past the uplinks.
BEYOND = "beyond"


def is_multicast(address: str) -> bool:
    return bool(int(address[:2], 16) & 1)


def collector(address: str, encapsulation: Mapping[str, Any], leaves: bool) -> str:
    """A collector, with what wraps its copies: only ERSPAN III says which way a frame goes."""
    kind = encapsulation["type"]
    number = encapsulation["key" if kind == "gre" else "id"]
    return f"{address} in {kind} {number}{' leaving' * (leaves and kind == 'erspan3')}"


@dataclass(frozen=True)
class Inside:
    """A frame while the tag of its VLAN is off, with the tags that are left."""

    vlan: int
    priority: int
    rest: Tags
    size: int

    def cut(self, most: int, tags: Tags) -> Optional[int]:
        """The length of a copy of so many bytes, without what was added to its tags; nothing if it
        is whole."""
        return most + TAG * (len(tags) - len(self.rest)) if 0 < most < self.size else None


class Rules:
    """A switch as a scenario document says it, with the numbers of its ports and their clients: the
    address that is configured for one, and the one that was seen."""

    def __init__(
        self,
        switch: Mapping[str, Any],
        numbers: Mapping[str, int],
        clients: Sequence[Mapping[str, Any]],
        links: Links = Links(),
    ) -> None:
        self.switch = switch
        self.links = links
        self.teams = Teams(switch, numbers, links)
        self.blocked = [
            port["uplink"] for port in switch.get("uplink_ports", []) if port.get("blocked")
        ]
        self.numbers = numbers
        self.uplinks = self.teams.uplinks
        self.ports: Dict[str, Mapping[str, Any]] = {
            port["id"]: port for port in switch.get("ports", [])
        }
        self.macs: Dict[str, str] = {}
        self.changed: Set[str] = set()
        for client in clients:
            seen = client.get("seen", client.get("mac"))
            if seen is not None:
                self.macs[client["port"]] = seen
            if "mac" in client and seen != client["mac"]:
                self.changed.add(client["port"])
        self.connected = [client["port"] for client in clients]

    # VLANs

    def vlans(self, port: str) -> Mapping[str, Any]:
        said = self.ports[port].get("vlan", 0)
        return said if isinstance(said, dict) else {"id": said}

    def vlan(self, port: str) -> int:
        return int(self.vlans(port).get("id", 0))

    def carried(self, port: str) -> Optional[Set[int]]:
        """The VLANs that a client tags itself, 0 for no tag; nothing if it tags nothing."""
        vlans = self.vlans(port)
        if "trunk" in vlans:
            found: Set[int] = set()
            for part in vlans["trunk"]:
                first, _, last = str(part).partition("-")
                found.update(range(int(first), int(last or first) + 1))
            return found
        return set(range(GREATEST_VLAN + 1)) if vlans.get("guest_tagging") else None

    def native(self, port: str) -> Optional[int]:
        """Where frames without a tag are."""
        carried = self.carried(port)
        if carried is None or self.vlan(port) or 0 in carried:
            return self.vlan(port)
        return None

    def private(self, vlan: int) -> Tuple[str, int]:
        """The kind of a VLAN and its primary one."""
        for entry in self.switch.get("private_vlans", []):
            if entry["secondary"] == vlan:
                return entry["type"], entry["primary"]
        for entry in self.switch.get("private_vlans", []):
            if entry["primary"] == vlan:
                return "promiscuous", vlan
        return "none", vlan

    def seen_as(self, vlan: int) -> List[int]:
        """The VLANs that a frame is one of to a port, what is like its own first."""
        kind, primary = self.private(vlan)
        if kind == "promiscuous":
            inside = [
                entry["secondary"]
                for entry in self.switch["private_vlans"]
                if entry["primary"] == vlan and entry["secondary"] != vlan
            ]
            return [vlan, *inside]
        return {"isolated": [primary], "community": [vlan, primary]}.get(kind, [vlan])

    # In

    def enters(self, at: str, frame: Frame) -> Optional[Inside]:
        """A frame as one of the switch's; nothing if it is none."""
        if self._is_for_nobody(frame):
            return None
        if at in self.uplinks:
            entered: Optional[Entered] = ((frame.tags or ((0, 0),))[0], frame.tags[1:])
            if frame.tags[1:] and not self._has_use_for_second_tags():
                return None
        else:
            entered = self._enters_port(at, frame)
        if entered is None:
            return None
        (vlan, priority), rest = entered
        # The tag of its VLAN is no part of a packet, the next one is.
        tags = TAG * len(rest)
        too_large = frame.counted_size + tags > self.switch.get("mtu", 1500) + HEADER
        if (rest and vlan == 0) or too_large:
            return None
        return Inside(vlan, priority, rest, frame.size + tags)

    def mirrors(self) -> bool:
        return bool(self.switch.get("uplink_mirror_sessions")) or any(self._sessions())

    def _is_for_nobody(self, frame: Frame) -> bool:
        """Wherever it comes from."""
        if self.switch.get("disabled") or _is_malformed(frame):
            return True
        return frame.destination.startswith("01:80:c2:00:00:0")

    def _has_use_for_second_tags(self) -> bool:
        """A port that may have them, or a mirror session."""
        nested = (self.ports[port].get("nested_tag") for port in self.connected)
        return any(nested) or any(self._sessions())

    def _enters_port(self, at: str, frame: Frame) -> Optional[Entered]:
        forged = at in self.macs and frame.source != self.macs[at]
        if not self._sends(at) or (forged and self._forbids(at, "forged_transmits")):
            return None
        nested = self.ports[at].get("nested_tag", False)
        vid, incoming = frame.tags[0] if frame.tags else (0, 0)
        priority = self.vlans(at).get("priority", incoming)
        if vid == 0:
            native = self.native(at)
            rest = frame.tags[1:]
            if native is None or (rest and not nested):
                return None
            return (native, priority), rest
        carried = self.carried(at)
        if carried is None:
            # The client's tag is the second one.
            allowed = nested and self.vlan(at) != 0 and len(frame.tags) == 1
            return ((self.vlan(at), priority), frame.tags) if allowed else None
        if vid not in carried or (frame.tags[1:] and not nested):
            return None
        return (vid, priority), frame.tags[1:]

    def _has_vlan(self, port: str) -> bool:
        must_be_private = self.vlans(port).get("private", False)
        return not must_be_private or self.private(self.vlan(port))[0] != "none"

    def _forbids(self, port: str, what: str) -> bool:
        return what in self.ports[port].get("forbids", [])

    def _is_cut_off(self, port: str) -> bool:
        """Whether nothing passes a port."""
        management = self.ports[port].get("mac_learning")
        may_change = management is None or management.get("mac_change", False)
        forbidden = not may_change or self._forbids(port, "mac_changes")
        return bool(self.ports[port].get("blocked") or (port in self.changed and forbidden))

    def _sends(self, port: str) -> bool:
        return not self._is_cut_off(port) and not self._is_destination(port, "no_input")

    def _takes(self, port: str) -> bool:
        return not self._is_cut_off(port) and not self._is_destination(port, "no_output")

    # Out

    def leaves(self, port: str, inside: Inside) -> Optional[Tags]:
        """The tags with which a port gets a frame; nothing if it does not."""
        vlan, priority, rest = inside.vlan, inside.priority, inside.rest
        if not self._takes(port) or (rest and not self.ports[port].get("nested_tag")):
            return None
        carried = self.carried(port)
        if carried is None:
            return rest if self.vlan(port) in self.seen_as(vlan) else None
        # A client that tags sees a private VLAN as its own or as the primary one.
        kind, primary = self.private(vlan)
        candidates = {"isolated": [primary], "community": [vlan, primary]}.get(kind, [vlan])
        for candidate in candidates:
            if candidate == self.native(port):
                return ((0, priority), *rest) if priority else rest
            if candidate in carried and candidate != 0:
                return ((candidate, priority), *rest)
        return None

    @staticmethod
    def wire(inside: Inside) -> Tags:
        if inside.vlan == 0 and inside.priority == 0:
            return inside.rest
        return ((inside.vlan, inside.priority), *inside.rest)

    # What ports want

    def _takes_all(self, port: str) -> bool:
        said = self.ports[port]
        wanted = "promiscuous" in said.get("ethernet_filter", {}).get("frames", [])
        wanted = wanted or self._is_destination(port, "promiscuous")
        return wanted and not self._forbids(port, "promiscuous")

    def _takes_unknown(self, port: str) -> bool:
        said = self.ports[port]
        sink = "sink" in said.get("ethernet_filter", {}).get("frames", [])
        floods = said.get("mac_learning", {}).get("flooding", False)
        return bool(sink or floods or self._takes_all(port))

    def _asks_for(self, port: str, group: str) -> bool:
        """Whether a port has nothing against the frames of a group: who says which ones it wants
        gets no others, but those without which nothing works."""
        said = self.ports[port].get("ethernet_filter", {})
        frames = set(said.get("frames", []))
        is_choosy = frames & {"multicast", "hashed_multicast"} and "all_multicast" not in frames
        return not is_choosy or group.startswith(FOR_EVERYBODY) or group in said["addresses"]

    # Addresses

    def _domains(self, port: str) -> Set[int]:
        """The VLANs in which a client's address is known."""
        carried = self.carried(port)
        if carried is None:
            return {self.private(self.vlan(port))[1]}
        native = self.native(port)
        vlans = carried - {0} | ({native} if native is not None else set())
        return {self.private(vlan)[1] for vlan in vlans}

    def _own(self) -> Iterator[Tuple[str, Set[int], str]]:
        """Addresses of clients, with the VLANs in which they are known, and places."""
        for port in self.ports:
            if port in self.macs and self._has_vlan(port):
                yield self.macs[port], self._domains(port), port

    def _fixed(self) -> Iterator[Tuple[str, Set[int], str]]:
        """Likewise those that stay where they are put."""
        for port, said in self.ports.items():
            for entry in said.get("addresses", []):
                yield entry["mac"], {self.private(entry.get("vlan", 0))[1]}, port
        for entry in self.switch.get("addresses", []):
            yield entry["mac"], {self.private(entry.get("vlan", 0))[1]}, BEYOND

    def _place(
        self, address: str, vlan: int, known: Iterable[Tuple[str, Set[int], str]]
    ) -> Optional[str]:
        """The port at which an address is, or BEYOND."""
        domain = self.private(vlan)[1]
        places = (place for mac, domains, place in known if mac == address and domain in domains)
        return next(places, None)

    def _is_back(self, frame: Frame, vlan: int) -> bool:
        """Whether a frame from an uplink is one of this switch: its address is here."""
        moves = self.switch.get("mac_learning", {}).get("learn_static", False)
        known = chain(() if moves else self._fixed(), self._own())
        place = self._place(frame.source, vlan, known)
        is_here = place is not None and place in self.connected
        return is_here and not self.ports[str(place)].get("transmit_uplink")

    def _sent_by_wire(self, port: str, frame: Frame) -> bool:
        """Whether a frame from an uplink is one that a port had to send there."""
        by_wire_only = self.ports[port].get("transmit_uplink", False)
        return bool(by_wire_only and self.macs.get(port) == frame.source)

    def _choosing(self, place: Optional[str]) -> List[Optional[Set[Order]]]:
        """By which orders of uplinks what is for a place may have come in."""
        return [*self.teams.choices()] if place in self.connected else [None]

    # Mirrors

    def _sessions(self) -> Iterator[Mapping[str, Any]]:
        for said in self.ports.values():
            for session in said.get("mirror_sessions", []):
                if not session.get("disabled"):
                    yield session

    def _is_destination(self, port: str, flag: str) -> bool:
        return any(
            session.get(flag) and {"port": port} in session["to"] for session in self._sessions()
        )

    def _mirrored(
        self, direction: str, source: Mapping[str, Any], inside: Inside, at: str
    ) -> Counts[Copy]:
        """The copies of a frame that came in at `at`, for what mirrors that source."""
        out: Counts[Copy] = Counter()
        leaves = ("port" if direction == "received_by" else "uplink") in source
        for session in self._sessions():
            if not self._is_taker(session) and source in session.get(direction, []):
                out += self._copied(session, inside, at, leaves)
        return out

    def _copied(
        self, session: Mapping[str, Any], inside: Inside, at: str, leaves: bool = False
    ) -> Counts[Copy]:
        """The copies of a frame that comes in, or that leaves the switch."""
        out: Counts[Copy] = Counter()
        most = session.get("snap_length", 0)
        for to in session["to"]:
            place = to.get("port", to.get("uplink"))
            if "ip" in to:
                place = collector(to["ip"], session["encapsulation"], leaves)
            tags = inside.rest
            remote = self._encapsulation(session) if "uplink" in to else 0
            # No frame has three tags.
            if session.get("keeps_vlan") and inside.vlan and not (remote and inside.rest):
                tags = ((inside.vlan, inside.priority), *tags)
            if remote:
                tags = ((remote, 0), *tags)
            # The switch sends nothing to where it came from.
            if self._may_get_copies(to) and place != at:
                out[(place, tags, inside.cut(most, tags))] += 1
        return out

    def _may_get_copies(self, to: Mapping[str, str]) -> bool:
        if "port" in to:
            return to["port"] in self.connected and not self._is_cut_off(to["port"])
        return to.get("uplink") not in self.blocked

    @staticmethod
    def _encapsulation(session: Mapping[str, Any]) -> int:
        """The VLAN of its copies on uplinks."""
        return int(session.get("encapsulation", {}).get("vlan", 0))

    @staticmethod
    def _is_taker(session: Mapping[str, Any]) -> bool:
        return bool(session.get("type") == "remote_destination")

    def _taken(self, session: Mapping[str, Any]) -> Set[int]:
        """The VLANs that hold nothing but copies, for a session that takes or makes them."""
        vlans = {self._encapsulation(session)}
        if self._is_taker(session):
            vlans |= {source["vlan"] for source in session["received_by"]}
        elif not any(to.get("uplink") in self.uplinks for to in session["to"]):
            vlans = set()
        return vlans - {0}

    def _copies_of_others(self, at: str, frame: Frame) -> Optional[Counts[Copy]]:
        """What comes out of a copy that comes in at an uplink; nothing if it is none."""
        vlan, priority = frame.tags[0] if frame.tags else (0, 0)
        if self._is_for_nobody(frame) or not any(
            vlan in self._taken(session) for session in self._sessions()
        ):
            return None
        out: Counts[Copy] = Counter()
        inside = Inside(vlan, priority, frame.tags[1:], frame.size + TAG * len(frame.tags[1:]))
        for session in self._sessions():
            if self._is_taker(session) and vlan in self._taken(session):
                ports = [to["port"] for to in session["to"] if to["port"] in self.connected]
                if ports and self.teams.receives_at(ports[0], at, None):
                    out += self._copied(session, inside, at)
        return out

    # All of it

    def is_refused(self, at: str, frame: Frame) -> bool:
        """Whether it is not let in there, and is no copy that another switch made."""
        if at in self.uplinks and self._copies_of_others(at, frame) is not None:
            return False
        return at in self.blocked or self._let_in(at, frame) is None

    def _let_in(self, at: str, frame: Frame) -> Optional[Inside]:
        inside = self.enters(at, frame)
        is_back = at in self.uplinks and inside and self._is_back(frame, inside.vlan)
        return None if is_back else inside

    def comes_out(self, at: str, frame: Frame) -> List[Counts[Copy]]:
        """What comes out of a frame: one of these, for the uplink that carries it may be one of
        several."""
        if at in self.blocked:
            return [Counter()]
        from_uplink = at in self.uplinks
        copies = self._copies_of_others(at, frame) if from_uplink else None
        if copies is not None:
            return [copies]
        inside = self._let_in(at, frame)
        if inside is None:
            return [Counter()]
        direction, source = ("received_by", "uplink") if from_uplink else ("sent_by", "port")
        out = self._mirrored(direction, {source: at}, inside, at)
        out += self._mirrored(direction, {"vlan": inside.vlan}, inside, at)
        to_many = is_multicast(frame.destination)
        known = chain(self._fixed(), self._own())
        place = None if to_many else self._place(frame.destination, inside.vlan, known)
        if from_uplink:
            return [
                out + self._to_ports(at, frame, inside, place, choosing)
                for choosing in self._choosing(place)
            ]
        by_wire_only = self.ports[at].get("transmit_uplink", False)
        if not by_wire_only:
            out += self._to_ports(at, frame, inside, place, None)
        uplinks = self.teams.uplinks_of(at)
        if not uplinks or (place not in (None, BEYOND) and not by_wire_only):
            return [out]
        return [out + self._over(uplink, inside, at) for uplink in uplinks]

    def _over(self, uplink: str, inside: Inside, at: str) -> Counts[Copy]:
        if uplink in self.blocked:
            return Counter()
        sent: Counts[Copy] = Counter({(uplink, self.wire(inside), None): 1})
        return sent + self._mirrored("sent_by", {"uplink": uplink}, inside, at)

    def _to_ports(
        self,
        at: str,
        frame: Frame,
        inside: Inside,
        place: Optional[str],
        choosing: Optional[Set[Order]],
    ) -> Counts[Copy]:
        out: Counts[Copy] = Counter()
        for port in self.ports:
            if self._is_for(port, at, frame, place, choosing):
                tags = self.leaves(port, inside)
                if tags is not None:
                    out[(port, tags, None)] += 1
                    out += self._mirrored("received_by", {"port": port}, inside, at)
        return out

    def _is_for(
        self,
        port: str,
        at: str,
        frame: Frame,
        place: Optional[str],
        choosing: Optional[Set[Order]],
    ) -> bool:
        """Whether a port wants a frame, and is one for which it may come in there."""
        to_many = is_multicast(frame.destination)
        wanted = to_many and self._asks_for(port, frame.destination)
        wanted = wanted or port == place or self._takes_all(port)
        wanted = wanted or (place is None and not to_many and self._takes_unknown(port))
        if not wanted or port == at or port not in self.connected:
            return False
        if at not in self.uplinks:
            return True
        return self.teams.receives_at(port, at, choosing) and not self._sent_by_wire(port, frame)


def _is_malformed(frame: Frame) -> bool:
    if is_multicast(frame.source) or frame.source == "00:00:00:00:00:00":
        return True
    if len(frame.tags) > LARGEST_TAGS or frame.type in TAG_TYPES:
        return True
    return bool(frame.tags and frame.tags[0][0] > GREATEST_VLAN)
