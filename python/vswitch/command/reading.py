"""The commands that tell what the host has, and change nothing."""

import contextlib
import dataclasses
import datetime
import itertools
import time
from typing import Any, Dict, List, Union

import typer

from libvswitch.errors import NotFound
from vswitch import _settings, _table, words
from vswitch._thing import Thing
from vswitch.command import output, places
from vswitch.command.arguments import EVERY, PLACE, SWITCH
from vswitch.command.session import from_words, host, is_json
from vswitch.port import Port, UplinkPort
from vswitch.switch import Switch
from vswitch.told import MacEntry, shown


def list_() -> None:
    """List the switches, with their ports and uplinks."""
    found = [_listed(switch) for switch in host().switches.values()]
    if is_json():
        output.write_json(found)
        return
    rows = (
        (
            one["alias"],
            one["mtu"],
            f"{len(one['ports'])} of {one['max_ports']}",
            ", ".join(f"{up['name']} {up['link']}" for up in one["uplinks"]) or _no_uplinks(one),
        )
        for one in found
    )
    output.table(("switch", "mtu", "ports", "uplinks"), rows)


def _listed(switch: Switch) -> Dict[str, Any]:
    uplinks = switch.uplinks.values() if switch.running else ()
    return {
        "alias": switch.alias,
        "id": switch.identifier,
        "running": switch.running,
        "mtu": switch.mtu,
        "max_ports": switch.max_ports,
        "ports": list(switch.ports),
        "uplinks": [{"name": one.name, "link": str(one.link)} for one in uplinks],
    }


def _no_uplinks(listed: Dict[str, Any]) -> str:
    return "none" if listed["running"] else "not running"


def show(place: str = PLACE) -> None:
    """Show a switch with all that it has, or a port: what is set, and what is the default."""
    found = places.find(host(), place)
    if is_json():
        output.write_json(_state(found))
    elif isinstance(found, Switch):
        output.tree(found.alias, _switch_branches(found))
    else:
        output.tree(found.path, _port_branches(found))


def _state(found: Union[Switch, Port, UplinkPort]) -> Dict[str, Any]:
    if not isinstance(found, UplinkPort):
        return found.state()
    ports = found.switch.state()["uplink_ports"]
    return next(one for one in ports if one["id"] == found.id)


def _settings_branches(thing: Thing, known: Dict[str, _table.Property]) -> List[output.Branch]:
    """All settings, with what is the default said to be so."""
    held = thing.properties()
    found: List[output.Branch] = []
    for name, one in known.items():
        value = _settings.words_of(one, _settings.read(thing, one, held.get(one.key)))
        is_set = any(key in held for key in one.keys)
        found.append((f"{name}: {_said(value)}{'' if is_set else ' (default)'}", ()))
    return found


def _said(value: object) -> str:
    return shown(value) if value not in ("", None) else "none"


def _properties_branches(described: Dict[str, Any], name: str) -> List[output.Branch]:
    below = output.properties(described.get(name, {}))
    return [(name, below)] if below else []


def _switch_branches(switch: Switch) -> List[output.Branch]:
    state = switch.state()
    found: List[output.Branch] = [
        (f"{name}: {shown(state[name])}", ())
        for name in ("id", "portset", "max_ports", "version", "running")
    ]
    found += _settings_branches(switch, _table.SWITCH)
    found += _properties_branches(state, "properties")
    found += _properties_branches(state, "host_properties")
    uplinks: List[output.Branch] = [
        (f"{one.name}: {one.link}, at {one.port}", ())
        for one in (switch.uplinks.values() if state["running"] else ())
    ]
    lags: List[output.Branch] = [
        (f"{one['name']}: {one['observed']['link']}, of {shown(one['uplinks'])}", ())
        for one in state["lags"]
    ]
    uplink_ports = [(one["id"], _set(one, _table.UPLINK_PORT)) for one in state["uplink_ports"]]
    ports = [(one["id"] + _carried(one), _set(one, _table.PORT)) for one in state["ports"]]
    sections: List[output.Branch] = [
        ("uplinks", uplinks),
        ("lags", lags),
        ("uplink_ports", uplink_ports),
        ("ports", ports),
    ]
    return found + [(name, below) for name, below in sections if below]


def _set(described: Dict[str, Any], known: Dict[str, _table.Property]) -> List[output.Branch]:
    """The settings that are set."""
    return [(f"{name}: {_said(described[name])}", ()) for name in known if name in described]


def _carried(described: Dict[str, Any]) -> str:
    uplink = described["observed"].get("uplink")
    return f": carried by {uplink}" if uplink is not None else ""


def _port_branches(port: Union[Port, UplinkPort]) -> List[output.Branch]:
    state = _state(port)
    found = _settings_branches(port, port._settings)
    found += _properties_branches(state, "properties")
    if isinstance(port, UplinkPort):
        return found + [(f"uplink: {_said(state.get('uplink'))}", ())]
    observed = state["observed"]
    if observed:
        found.append((f"carried by: {_said(observed['uplink'])}", ()))
        found.append((f"number: {observed['number']}", ()))
    macs: List[output.Branch] = [
        (f"{one['mac']}: VLAN {one['vlan']}, {one['type']}, age {one['age']} s", ())
        for one in state.get("addresses", ())
    ]
    return found + ([("macs", macs)] if macs else [])


_WATCH = typer.Option(False, "--watch", help="Tell again and again, until interrupted.")


def stats(place: str = PLACE, watch: bool = _WATCH, every: float = EVERY) -> None:
    """Show what a switch or a port counted.

    With --watch, people get what was added since the time before; programs get all counters, a line
    of JSON each time.
    """
    found = places.find(host(), place)
    if isinstance(found, UplinkPort):
        raise NotFound(f"{found.id!r} of switch {found.switch.alias!r} is an uplink port")
    if not watch:
        _tell_counters(_counters(found))
        return
    with contextlib.suppress(KeyboardInterrupt):
        _tell_increases(found, every)


def _tell_increases(found: Union[Switch, Port], every: float) -> None:
    before: Dict[str, Dict[str, int]] = {}
    for turn in itertools.count():
        if turn:
            time.sleep(every)
        counted = _counters(found)
        if is_json():
            output.write_json_line({"at": time.time(), "counters": counted})
        else:
            _tell_increase(counted, before)
        before = counted


def _counters(found: Union[Switch, Port]) -> Dict[str, Dict[str, int]]:
    """The counters of a thing and of its ports, by their paths."""
    things: List[Union[Switch, Port]] = [found]
    if isinstance(found, Switch):
        things += found.ports.values()
    return {one.path: dataclasses.asdict(one.stats) for one in things}


def _tell_counters(counted: Dict[str, Dict[str, int]]) -> None:
    if is_json():
        output.write_json(counted)
        return
    rows = [(path, name, n) for path, held in counted.items() for name, n in held.items()]
    output.table(("of", "counter", "count"), rows)


def _tell_increase(counted: Dict[str, Dict[str, int]], before: Dict[str, Dict[str, int]]) -> None:
    now = datetime.datetime.now().strftime("%H:%M:%S")
    for path, held in counted.items():
        was = before.get(path, {})
        news = {name: n - was.get(name, 0) for name, n in held.items() if n != was.get(name, 0)}
        said = " ".join(f"{name}{n:+}" for name, n in news.items())
        if said or not before:
            output.line(f"{now} {path}: {said or 'nothing counted'}")


def lag(switch: str = SWITCH) -> None:
    """List the link-aggregation groups of a switch."""
    found = host().switches[switch].lags
    if is_json():
        output.write_json([{**dataclasses.asdict(one), "link": str(one.link)} for one in found])
        return
    rows = ((one.name, one.link, ", ".join(one.uplinks)) for one in found)
    output.table(("lag", "link", "uplinks"), rows)


def options() -> None:
    """List the runtime options of the host."""
    found = host().options.all()
    if is_json():
        output.write_json(found)
        return
    output.table(("option", "value"), found.items())


def find(
    mac: str = typer.Argument(..., metavar="MAC", help="A hardware address, in any spelling.")
) -> None:
    """Find a hardware address: the switches and ports that know it.

    The status is 1 when none does.
    """
    with from_words("MAC"):
        wanted = words.mac(mac)
    found = host().find_mac(wanted)
    if is_json():
        output.write_json([_entry(one) for one in found])
    elif found:
        rows = [(one.switch, one.port or "beyond", one.vlan, one.type, one.age) for one in found]
        output.table(("switch", "port", "vlan", "type", "age"), rows)
    if not found:
        raise NotFound(f"no switch knows the address {wanted}")


def _entry(entry: MacEntry) -> Dict[str, Any]:
    return {**dataclasses.asdict(entry), "type": str(entry.type)}
