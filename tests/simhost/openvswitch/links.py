"""What became of the links of uplinks before frames come, by a clock of the host that stands
between the changes; and what teams make of it."""

from dataclasses import dataclass
from typing import Any, Dict, List, Tuple

# Of the clock, in milliseconds: whatever had a link from the beginning has had it for ever.
_BEGIN = 1_000_000
_FOR_EVER = 0


@dataclass(frozen=True)
class LinkChange:
    """So many milliseconds after the last one; a link may be as it was."""

    after: int
    uplink: str
    is_up: bool


@dataclass(frozen=True)
class Links:
    """All that happened, the milliseconds that passed since, and for how many an uplink has to have
    a link before teams use it."""

    changes: Tuple[LinkChange, ...] = ()
    since: int = 0
    up_delay: int = 0

    @classmethod
    def cut(cls, *uplinks: str) -> "Links":
        """These have none, and nothing else ever happened."""
        return cls(tuple(LinkChange(0, uplink, False) for uplink in uplinks))

    @property
    def down(self) -> List[str]:
        state = {change.uplink: change.is_up for change in self.changes}
        return sorted(uplink for uplink, is_up in state.items() if not is_up)

    def up_since(self, uplink: str) -> int:
        """When it got the link that it has."""
        now, is_up, found = _BEGIN, True, _FOR_EVER
        for change in self.changes:
            now += change.after
            if change.uplink == uplink:
                if change.is_up and not is_up:
                    found = now
                is_up = change.is_up
        return found

    def is_usable(self, uplink: str) -> bool:
        now = _BEGIN + sum(change.after for change in self.changes) + self.since
        found = self.up_since(uplink)
        return uplink not in self.down and (found == _FOR_EVER or now - found >= self.up_delay)

    def documents(self) -> List[Dict[str, Any]]:
        """What a host is told of it, one after the other."""
        now = _BEGIN
        told: List[Dict[str, Any]] = [
            {**_clock(now), "runtime_options": {"TeamPolicyUpDelay": self.up_delay}}
        ]
        for change in self.changes:
            now += change.after
            link = "up" if change.is_up else "down"
            told.append({**_clock(now), "uplinks": [{"name": change.uplink, "link": link}]})
        return [*told, _clock(now + self.since)]


def _clock(now: int) -> Dict[str, Any]:
    return {"clock": {"stopped": True, "now": now / 1000}}
