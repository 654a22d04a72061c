"""The rules of teams by themselves: over which uplinks frames of a port go, and what comes in over
which for it."""

from itertools import combinations
from typing import Any, List, Mapping, Optional, Set, Tuple

from links import Links

# Uplinks, the first one first.
Order = Tuple[str, ...]


class Teams:
    """Of a switch as a scenario document says it, with the numbers of its ports."""

    def __init__(self, switch: Mapping[str, Any], numbers: Mapping[str, int], links: Links) -> None:
        self.uplinks: List[str] = list(switch.get("uplinks", []))
        self._links = links
        self._numbers = numbers
        shared = switch.get("teaming", {})
        self._policies = {
            port["id"]: port.get("teaming", shared) for port in switch.get("ports", [])
        }

    def balance(self, port: str) -> str:
        return str(self._policies[port].get("balance", "port"))

    def uplinks_of(self, port: str) -> List[str]:
        """Where a port's frames may go: one of them, the first if the balance has it so."""
        policy = self._policies[port]
        named = policy.get("active", []) + policy.get("standby", [])
        count = len(policy.get("active", [])) or (1 if named else len(self.uplinks))
        usable = [uplink for uplink in named or self.uplinks if self._links.is_usable(uplink)]
        if "rolling" in policy.get("flags", []):
            # Who stays in use is who was first.
            usable.sort(key=self._links.up_since)
        used = usable[:count]
        balance = self.balance(port)
        if balance in ("mac", "ip") or not used:
            return used
        first = 0 if balance in ("explicit", "none") else self._numbers[port] % len(used)
        return [used[first]]

    def receives_at(self, port: str, uplink: str, choosing: Optional[Set[Order]]) -> bool:
        """Whether what comes in at an uplink is for a port; what is for a client, for those whose
        sources choose that uplink for it."""
        uplinks = self.uplinks_of(port)
        if self.balance(port) == "ip":
            return uplink in uplinks
        if self.balance(port) == "mac" and choosing is not None and len(uplinks) > 1:
            return uplink in uplinks and (*uplinks,) in choosing
        return uplinks[:1] == [uplink]

    def choices(self) -> List[Set[Order]]:
        """By which orders of uplinks a frame for a client may have come in: nobody here knows what
        is made of its address."""
        orders = {
            (*self.uplinks_of(port),) for port in self._policies if self.balance(port) == "mac"
        }
        return [
            set(some)
            for count in range(len(orders) + 1)
            for some in combinations(sorted(orders), count)
        ]
