"""What changes on a host: one state after the other, compared."""

from __future__ import annotations

import time
import typing
from typing import AsyncIterator, Collection, Dict, Iterator, List, Optional, Tuple

from vswitch import _table, words as _words
from vswitch.told import Event
from vswitch.values import Words

if typing.TYPE_CHECKING:
    from vswitch.host import Host

__all__ = ["KINDS", "Seen", "awatch", "differences", "settings_and_macs", "watch"]

KINDS: Tuple[str, ...] = ("switch", "port", "uplink", "link", "carrier", "setting", "mac")
"""What an event may be about: something that comes or goes, a link, the uplink that carries a port,
a setting, an address."""

Seen = Dict[Tuple[str, str], Words]
"""What there is to see, by its kind and its path."""


def watch(
    host: "Host",
    every: float = 1.0,
    seconds: Optional[float] = None,
    kinds: Optional[Collection[str]] = None,
) -> Iterator[Event]:
    return _events(_Watching(host, every, seconds, kinds))


def awatch(
    host: "Host",
    every: float = 1.0,
    seconds: Optional[float] = None,
    kinds: Optional[Collection[str]] = None,
) -> AsyncIterator[Event]:
    return _events_meanwhile(_Watching(host, every, seconds, kinds))


def _events(watching: "_Watching") -> Iterator[Event]:
    while True:
        yield from watching.look()
        pause = watching.pause()
        if pause is None:
            return
        time.sleep(pause)


async def _events_meanwhile(watching: "_Watching") -> AsyncIterator[Event]:
    # Half of what this package would cost to import, for those who have it imported already.
    import asyncio

    loop = asyncio.get_running_loop()
    while True:
        # A large host takes a while to tell all, in which others go on.
        for event in await loop.run_in_executor(None, watching.look):
            yield event
        pause = watching.pause()
        if pause is None:
            return
        await asyncio.sleep(pause)


class _Watching:
    def __init__(
        self,
        host: "Host",
        every: float,
        seconds: Optional[float],
        kinds: Optional[Collection[str]],
    ) -> None:
        for kind in () if kinds is None else _words.items(kinds, "kinds"):
            _words.choice(kind, "kinds", KINDS)
        if every <= 0:
            raise _words.fail("every", every, "a time that passes")
        self._host = host
        self._kinds = frozenset(KINDS if kinds is None else kinds)
        self._every = every
        self._next = time.monotonic()
        self._end = None if seconds is None else self._next + seconds
        # What is there when the watch begins is no event.
        self._before = seen(host, self._kinds)

    def look(self) -> List[Event]:
        """What has changed since."""
        now, at = seen(self._host, self._kinds), time.time()
        events = [
            Event(at, kind, path, before, after)
            for path, kind, before, after in differences(self._before, now)
        ]
        self._before = now
        return events

    def pause(self) -> Optional[float]:
        """How long to wait for the next look; None when the time is over."""
        now = time.monotonic()
        if self._end is not None and now >= self._end:
            return None
        self._next = max(self._next + self._every, now)
        until = self._next if self._end is None else min(self._next, self._end)
        return max(until - now, 0)


def differences(before: Seen, now: Seen) -> Iterator[Tuple[str, str, Words, Words]]:
    """What goes first, then what comes or changes, in the order of the host."""
    for (kind, path), value in before.items():
        if (kind, path) not in now:
            yield path, kind, value, None
    for (kind, path), value in now.items():
        was = before.get((kind, path))
        if was != value:
            yield path, kind, was, value


def seen(host: "Host", kinds: Collection[str]) -> Seen:
    """What there is to see of some kinds."""
    found: Seen = {}
    state = host.state()
    for uplink in state["uplinks"]:
        observed = uplink["observed"]
        path = f"{observed['switch']}/{uplink['name']}"
        found["uplink", path] = {"name": uplink["name"], "port": observed["port"]}
        found["link", f"{path}/link"] = observed["link"]
    for name, value in state["runtime_options"].items():
        found["setting", f"options/{name}"] = value
    found["setting", "mac_learning"] = state["mac_learning"]
    for switch in state["switches"]:
        found.update(_seen_of_switch(switch))
    return {about: value for about, value in found.items() if about[0] in kinds}


def _seen_of_switch(switch: Dict[str, Words]) -> Seen:
    alias = switch["alias"]
    found: Seen = {("switch", alias): {"alias": alias, "id": switch["id"]}}
    found["setting", f"{alias}/running"] = switch["running"]
    found.update(settings_and_macs(alias, switch, _table.SWITCH))
    for port in switch["uplink_ports"]:
        found.update(settings_and_macs(f"{alias}/{port['id']}", port, _table.UPLINK_PORT))
    for port in switch["ports"]:
        path = f"{alias}/{port['id']}"
        found["port", path] = {"id": port["id"]}
        found["carrier", f"{path}/carrier"] = port["observed"].get("uplink")
        found.update(settings_and_macs(path, port, _table.PORT))
    return found


def settings_and_macs(
    path: str, described: Dict[str, Words], known: Dict[str, _table.Property]
) -> Seen:
    found: Seen = {}
    for name, value in described.items():
        if name in ("properties", "host_properties"):
            found.update({("setting", f"{path}/{key}"): one for key, one in value.items()})
        elif name in known:
            found["setting", f"{path}/{name}"] = value
    for entry in described.get("addresses", ()):
        where = f"{path}/macs/{entry['mac']}" + (f"/{entry['vlan']}" if entry["vlan"] else "")
        # Its age changes all the time.
        found["mac", where] = {key: entry[key] for key in ("mac", "type", "vlan")}
    return found
