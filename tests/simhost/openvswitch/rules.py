"""The rules of frames by themselves, written from what the settings mean and not from how a switch
is told of them: where a frame must come out, and with which tags. Of a switch that has learned
nothing, all of whose links are up."""

from collections import Counter
from typing import Any, Counter as Counts, Dict, List, Mapping, Optional, Set, Tuple

from frames import TAG, Copy, Frame, Tags

GREATEST_VLAN = 4094
LARGEST_TAGS = 2
HEADER = 14


def is_multicast(address: str) -> bool:
    return bool(int(address[:2], 16) & 1)


class Rules:
    """A switch as a scenario document says it, with the numbers and the addresses of its ports."""

    def __init__(
        self, switch: Mapping[str, Any], numbers: Mapping[str, int], macs: Mapping[str, str]
    ) -> None:
        self.switch = switch
        self.numbers = numbers
        self.macs = macs
        self.uplinks: List[str] = list(switch.get("uplinks", []))
        self.ports: Dict[str, Mapping[str, Any]] = {
            port["id"]: port for port in switch.get("ports", [])
        }

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

    def enters(self, at: str, frame: Frame) -> Optional[Tuple[int, int, Tags]]:
        """The VLAN and the priority of a frame, and the tags that are left."""
        if self.switch.get("disabled"):
            return None
        if frame.destination.startswith("01:80:c2:00:00:0") or is_multicast(frame.source):
            return None
        if len(frame.tags) > LARGEST_TAGS or frame.source == "00:00:00:00:00:00":
            return None
        if frame.tags and frame.tags[0][0] > GREATEST_VLAN:
            return None
        if at in self.uplinks:
            entered = (*frame.tags[0], frame.tags[1:]) if frame.tags else (0, 0, ())
        else:
            found = self._enters_port(at, frame)
            if found is None:
                return None
            entered = found
        # The tag of its VLAN is no part of a packet, the next one is.
        size = frame.size + TAG * len(entered[2])
        if size > self.switch.get("mtu", 1500) + HEADER:
            return None
        return None if entered[2] and entered[0] == 0 else entered

    def _enters_port(self, at: str, frame: Frame) -> Optional[Tuple[int, int, Tags]]:
        port = self.ports[at]
        forged = at in self.macs and frame.source != self.macs[at]
        if port.get("blocked") or (forged and "forged_transmits" in port.get("forbids", [])):
            return None
        nested = port.get("nested_tag", False)
        vid, incoming = frame.tags[0] if frame.tags else (0, 0)
        priority = self.vlans(at).get("priority", incoming)
        if vid == 0:
            native = self.native(at)
            rest = frame.tags[1:]
            if native is None or (rest and not nested):
                return None
            return native, priority, rest
        carried = self.carried(at)
        if carried is None:
            # The client's tag is the second one.
            allowed = nested and self.vlan(at) != 0 and len(frame.tags) == 1
            return (self.vlan(at), priority, frame.tags) if allowed else None
        if vid not in carried or (frame.tags[1:] and not nested):
            return None
        return vid, priority, frame.tags[1:]

    # Out

    def leaves(self, port: str, vlan: int, priority: int, rest: Tags) -> Optional[Tags]:
        """The tags with which a port gets a frame; nothing if it does not."""
        if self.ports[port].get("blocked") or (rest and not self.ports[port].get("nested_tag")):
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

    def wire(self, vlan: int, priority: int, rest: Tags) -> Tags:
        return ((vlan, priority), *rest) if vlan or priority else rest

    # Teams

    def uplinks_of(self, port: str) -> List[str]:
        """Where a port's frames may go: one of them, the first if the balance has it so."""
        teaming = self.ports[port].get("teaming", self.switch.get("teaming", {}))
        named = teaming.get("active", []) + teaming.get("standby", [])
        usable = named or self.uplinks
        used = usable[: len(teaming.get("active", [])) or (1 if named else len(usable))]
        balance = teaming.get("balance", "port")
        if balance in ("mac", "ip") or not used:
            return used
        first = 0 if balance in ("explicit", "none") else self.numbers[port] % len(used)
        return [used[first]]

    def receives_at(self, port: str, uplink: str, may_be_a_copy: bool) -> bool:
        """Whether what comes in at an uplink is for a port."""
        teaming = self.ports[port].get("teaming", self.switch.get("teaming", {}))
        uplinks = self.uplinks_of(port)
        if teaming.get("balance") == "ip" or not may_be_a_copy:
            return uplink in uplinks
        return uplinks[:1] == [uplink]

    # All of it

    def _takes_all(self, port: str) -> bool:
        said = self.ports[port]
        wanted = "promiscuous" in said.get("ethernet_filter", {}).get("frames", [])
        return wanted and "promiscuous" not in said.get("forbids", [])

    def _takes_unknown(self, port: str) -> bool:
        said = self.ports[port]
        sink = "sink" in said.get("ethernet_filter", {}).get("frames", [])
        floods = said.get("mac_learning", {}).get("flooding", False)
        return bool(sink or floods or self._takes_all(port))

    def _owner(self, address: str, vlan: int) -> Optional[str]:
        """The port whose client has an address."""
        domain = self.private(vlan)[1]
        owners = [port for port, mac in self.macs.items() if mac == address and port in self.ports]
        for port in owners:
            if self.carried(port) is None and self.private(self.vlan(port))[1] == domain:
                return port
        for port in owners:
            if self.carried(port) is not None:
                return port
        return None

    def _is_back(self, frame: Frame, vlan: int) -> bool:
        """Whether a frame from an uplink is one of this switch's."""
        domain = self.private(vlan)[1]
        for port, mac in self.macs.items():
            if mac == frame.source and not self.ports[port].get("transmit_uplink"):
                if self.carried(port) is not None:
                    return True
                if self.private(self.vlan(port))[1] == domain:
                    return True
        return False

    def _sent_by_wire(self, port: str, frame: Frame) -> bool:
        """Whether a frame from an uplink is one that a port had to send there."""
        by_wire_only = self.ports[port].get("transmit_uplink", False)
        return bool(by_wire_only and self.macs.get(port) == frame.source)

    def comes_out(self, at: str, frame: Frame) -> Tuple[Counts[Copy], Set[str]]:
        """What each port gets, and the uplinks of which one gets the frame; its tags there are
        under the name "wire"."""
        out: Counts[Copy] = Counter()
        entered = self.enters(at, frame)
        if entered is None:
            return out, set()
        vlan, priority, rest = entered
        from_uplink = at in self.uplinks
        if from_uplink and self._is_back(frame, vlan):
            return out, set()
        to_many = is_multicast(frame.destination)
        owner = None if to_many else self._owner(frame.destination, vlan)
        by_wire_only = not from_uplink and self.ports[at].get("transmit_uplink", False)
        for port in [] if by_wire_only else self.ports:
            wanted = to_many or port == owner or self._takes_all(port)
            wanted = wanted or (owner is None and self._takes_unknown(port))
            if not wanted or port == at:
                continue
            if from_uplink and not self.receives_at(port, at, to_many or owner is None):
                continue
            if from_uplink and self._sent_by_wire(port, frame):
                continue
            tags = self.leaves(port, vlan, priority, rest)
            if tags is not None:
                out[(port, tags, None)] += 1
        uplinks: Set[str] = set()
        if not from_uplink and (by_wire_only or owner is None):
            uplinks = set(self.uplinks_of(at))
            if uplinks:
                out[("wire", self.wire(vlan, priority, rest), None)] += 1
        return out, uplinks
