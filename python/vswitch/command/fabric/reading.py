"""The commands that tell what a fabric has, and change nothing."""

from typing import Any, Dict, List, Union

from vswitch import _table
from vswitch._properties import DEFAULTS
from vswitch.command import files, output, places
from vswitch.command.fabric.arguments import PLACE
from vswitch.command.fabric.connection import connected
from vswitch.command.session import is_json
from vswitch.fabric import Member, SharedPort, SharedSwitch, View
from vswitch.told import shown

__all__ = ["backup", "hosts", "list_", "show"]


def _view() -> View:
    with connected() as fabric:
        return fabric.view()


def list_() -> None:
    """List the switches, with the hosts that have them."""
    view = _view()
    found = [_listed(switch) for switch in view.switches.values()]
    if is_json():
        output.write_json(found)
        return
    rows = (
        (
            one["alias"],
            one["mtu"],
            f"{len(one['ports'])} of {one['max_ports']}",
            sum(1 for host in one["ports"].values() if host is not None),
            shown(one["hosts"]),
        )
        for one in found
    )
    output.table(("switch", "mtu", "ports", "connected", "hosts"), rows)


def _listed(switch: SharedSwitch) -> Dict[str, Any]:
    settings = switch.settings
    return {
        "alias": switch.alias,
        "id": switch.id,
        "mtu": settings.get("mtu", _table.SWITCH["mtu"].default),
        "max_ports": settings.get("max_ports", DEFAULTS["switches"]["max_ports"]),
        "ports": {port.id: port.host or None for port in switch.ports.values()},
        "hosts": list(switch.hosts),
    }


def hosts() -> None:
    """List the hosts, with what they report: how far they are, their links, and what is wrong.

    A host tells how many of the changes its frames obey. One that is gone tells what was last.
    """
    view = _view()
    if is_json():
        output.write_json({"revision": view.revision, "hosts": _states(view)})
        return
    rows = [
        (one.name, f"{one.in_force} of {view.revision}", _links(one)) for one in view.hosts.values()
    ]
    output.table(("host", "in force", "links"), rows)
    for host in view.hosts.values():
        for where, why in host.errors.items():
            output.line(f"{host.name}: {where}: {why}")


def _states(view: View) -> List[Dict[str, Any]]:
    return [one.state() for one in view.hosts.values()]


def _links(host: Member) -> str:
    return ", ".join(f"{name} {link}" for name, link in host.links.items()) or "none"


def show(place: str = PLACE) -> None:
    """Show a switch with its ports, or a port: what is set, and on which hosts it is."""
    view = _view()
    alias, id_ = places.split_by(view.switches, place)
    switch = view.switches[alias]
    found: Union[SharedSwitch, SharedPort] = switch if id_ is None else switch.ports[id_]
    if is_json():
        output.write_json(found.state())
    elif isinstance(found, SharedSwitch):
        output.tree(alias, _switch_branches(found))
    else:
        at: output.Branch = (f"connected at: {found.host or 'none'}", ())
        output.tree(place, [*_branches(found), at])


def backup() -> None:
    """Write all of it as a document: YAML, or JSON with --json.

    Applied again, it has what was there then; what came since stays.
    """
    view = _view()
    document = {"switches": [_document_of(switch) for switch in view.switches.values()]}
    if is_json():
        output.write_json(document)
    else:
        print(files.write(document), end="")


def _document_of(switch: SharedSwitch) -> Dict[str, Any]:
    state = switch.state()
    for port in state["ports"]:
        # Hosts connect them, and no document does.
        del port["observed"]
    return state


def _switch_branches(switch: SharedSwitch) -> List[output.Branch]:
    ports: List[output.Branch] = [
        (port.id + (f": at {port.host}" if port.host else ""), _branches(port))
        for port in switch.ports.values()
    ]
    return [
        (f"id: {switch.id}", ()),
        (f"hosts: {shown(list(switch.hosts))}", ()),
        *_branches(switch),
        *([("ports", ports)] if ports else []),
    ]


def _branches(found: Union[SharedSwitch, SharedPort]) -> List[output.Branch]:
    """What is set."""
    state, settings = found.state(), found.settings
    said: List[output.Branch] = []
    for name, value in state.items():
        if name == "properties" and _are_bytes(value):
            said.append((name, output.properties(value)))
        elif name in settings:
            said.append((f"{name}: {shown(value) if value != '' else 'none'}", ()))
    return said


def _are_bytes(held: Any) -> bool:
    """Whether properties are as hosts write them; somebody else may write anything."""
    return isinstance(held, dict) and all(
        isinstance(one, dict) and set(one) == {"type", "hex"} for one in held.values()
    )
