"""What changes in a fabric: one view after the other, compared."""

import time
from typing import Dict, Iterator, Tuple

from vswitch import _table
from vswitch.fabric._view import View
from vswitch.told import Event
from vswitch.values import Words
from vswitch.watch import Seen, differences, settings_and_macs

__all__ = ["KINDS", "events"]

KINDS: Tuple[str, ...] = (
    "switch",
    "port",
    "hosts",
    "place",
    "setting",
    "mac",
    "host",
    "link",
    "error",
    "in_force",
)
"""What an event may be about: something that comes or goes, the hosts that have a switch, the one
where a port is connected, a setting, an address; and of a host that it comes or goes, a link, what
it cannot bear, and the revision that it has in force."""

# Beside what has a property.
_MORE = ("max_ports", "version", "fabric", "external_id")


def events(before: View, after: View) -> Iterator[Event]:
    at = time.time()
    for path, kind, was, now in differences(_seen(before), _seen(after)):
        yield Event(at, kind, path, was, now)


def _seen(view: View) -> Seen:
    found: Seen = {}
    for switch in view.switches.values():
        alias = switch.alias
        found["switch", alias] = {"id": switch.id}
        found["hosts", f"{alias}/hosts"] = list(switch.hosts)
        found.update(_settings_seen(alias, switch.settings, _table.SWITCH))
        for port in switch.ports.values():
            path = f"{alias}/{port.id}"
            found["port", path] = {"id": port.id}
            if port.host:
                found["place", f"{path}/host"] = port.host
            found.update(_settings_seen(path, port.settings, _table.PORT))
    for host in view.hosts.values():
        found["host", host.name] = {"name": host.name}
        found["in_force", f"{host.name}/in_force"] = host.in_force
        for name, link in host.links.items():
            found["link", f"{host.name}/{name}/link"] = link
        for where, why in host.errors.items():
            found["error", f"{host.name}: {where}"] = why
    return found


def _settings_seen(
    path: str, settings: Dict[str, Words], known: Dict[str, _table.Property]
) -> Seen:
    found = settings_and_macs(path, settings, known)
    for name in _MORE:
        if name in settings:
            found["setting", f"{path}/{name}"] = settings[name]
    return found
