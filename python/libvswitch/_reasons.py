"""Why a call was refused, in words: what was asked of what, why not, and what there is instead.

The words are made when somebody reads an error, from its call and arguments: for a name that the
host does not know, from what it does know; else from what the call's documentation says of the
status.
"""

import inspect
import re
import typing
from typing import Any, Callable, Dict, List, Optional, Tuple

from libvswitch import checked, errors

# How many names are listed.
_LISTED = 12

# Arguments that name a switch, each with its kind of name and how a handle tells it.
_SWITCHES: Dict[str, Tuple[str, Callable[[Any], Optional[str]]]] = {
    "switchName": ("switch", checked.DVS_SwitchName),
    "alias": ("switch", checked.DVS_SwitchName),
    "switchId": ("switch with the identifier", checked.DVS_SwitchId),
    "portsetName": ("switch with the ports", lambda handle: _portset(handle)),
}


def what(error: errors.HostError) -> str:
    """What an error says."""
    asked = _asked(error)
    if isinstance(error, errors.Trapped):
        return f"{asked}: the call trapped: {error.__cause__}"
    if error.status is None:
        return f"{asked}: the host gave nothing" if error.call else "the host refused"
    found = ""
    if isinstance(error, errors.NotFound):
        try:
            found = _missing(error.call, error.arguments)
        except Exception:
            # What the host has is no more to be had than what was asked for.
            found = ""
    return found or f"{asked}: {_documented(error.call, str(error.status)) or _own_words(error)}"


def _asked(error: errors.HostError) -> str:
    given = ", ".join(f"{name}={value!r}" for name, value in error.arguments.items())
    return f"{error.call}({given})"


def _own_words(error: errors.HostError) -> str:
    status = error.status
    words = checked.QEX_ReturnStatusToString(int(status)) if status is not None else None
    return f"{status}, {words}" if words else str(status)


def _documented(call: str, status: str) -> str:
    """What a call's documentation says of a status, as `QEX_EXISTS if the port is taken`."""
    text = inspect.getdoc(getattr(checked, call)) or ""
    found = re.search(rf"^- {status} (.*(?:\n  .*)*)", text, re.M)
    return f"{status} {' '.join(found[1].split())}" if found else ""


def _missing(call: str, arguments: Dict[str, object]) -> str:
    """Which name the host does not know; empty if it knows them all."""
    switch = None
    for name, (kind, tell) in _SWITCHES.items():
        given = arguments.get(name)
        if isinstance(given, str) and not (name == "alias" and "switchId" in arguments):
            handles = {tell(one): one for one in checked.DVSState_SwitchForEach()}
            if given not in handles:
                return f"no {kind} {given!r} ({_there_are(handles)})"
            switch = handles[given]
            break
    if switch is None:
        return _missing_alone(arguments)
    where = f"of switch {(checked.DVS_SwitchName(switch) or checked.DVS_SwitchId(switch))!r}"
    return _missing_part(switch, where, arguments)


def _missing_alone(arguments: Dict[str, object]) -> str:
    if isinstance(arguments.get("port"), int):
        return f"no port has the number {arguments['port']}"
    if "uplink" in arguments:
        return f"no uplink {arguments['uplink']!r}"
    return ""


def _missing_part(switch: checked.DVSwitchHandle, where: str, arguments: Dict[str, object]) -> str:
    alias = checked.DVS_SwitchName(switch) or ""
    port, owner = arguments.get("port"), where
    if isinstance(port, str):
        ports = {checked.DVS_PortId(one) for one in checked.DVSState_PortForEach(switch)}
        if port not in ports:
            ports.difference_update(checked.VSDVS_GetSwitchUplinkPorts(alias).ids)
            return f"no port {port!r} {where} ({_it_has(ports)})"
        owner = f"of port {port!r} {where}"
    if "externalId" in arguments:
        return f"no port {where} is called {arguments['externalId']!r} by another system"
    if "key" in arguments:
        return f"no property {arguments['key']!r} is set {owner}"
    if "sid" in arguments and isinstance(port, str):
        kept = [one.sid for one in checked.VSDVS_GetDVMirrorSessions(alias, port)]
        return f"no mirror session {arguments['sid']!r} {owner} ({_it_has(kept)})"
    return _missing_running(switch, where, owner, arguments)


def _missing_running(
    switch: checked.DVSwitchHandle, where: str, owner: str, arguments: Dict[str, object]
) -> str:
    """What there is only while a switch runs."""
    alias = checked.DVS_SwitchName(switch) or ""
    port = arguments.get("port")
    if not _runs(alias):
        return f"switch {alias!r} does not run on this host"
    if isinstance(port, int) and port not in _numbers(switch, alias):
        return f"no port {where} has the number {port}"
    if "uplink" in arguments:
        uplinks = [one.name for one in checked.VSQEX_GetUplinks(alias)]
        return f"no uplink {arguments['uplink']!r} {where} ({_it_has(uplinks)})"
    if "sid" in arguments:
        sessions = checked.VSQEX_GetDVMirrorSessionIDs(alias)
        return f"no mirror session {arguments['sid']!r} {owner} ({_it_has(sessions)})"
    if "group" in arguments:
        return f"port {port} {where} has not joined the group {arguments['group']!r}"
    if "entry" in arguments:
        address = getattr(arguments["entry"], "macAddress", "")
        return f"no address {address!r} of that kind in the table {owner}"
    return ""


def _runs(alias: str) -> bool:
    try:
        checked.VSQEX_GetVSInfo(alias)
    except errors.NotFound:
        return False
    return True


def _numbers(switch: checked.DVSwitchHandle, alias: str) -> List[int]:
    ids = [checked.DVS_PortId(one) for one in checked.DVSState_PortForEach(switch)]
    return [checked.VSDVS_DvPortIDToPortID(alias, one) for one in ids]


def _portset(handle: checked.DVSwitchHandle) -> str:
    return checked.DVSAliasToPortsetName(checked.DVS_SwitchName(handle) or "")


def _there_are(names: typing.Iterable[Optional[str]]) -> str:
    listed = _listed(names)
    return f"there are {listed}" if listed else "there are none"


def _it_has(names: typing.Iterable[Optional[str]]) -> str:
    listed = _listed(names)
    return f"it has {listed}" if listed else "it has none"


def _listed(names: typing.Iterable[Optional[str]]) -> str:
    known = sorted(name for name in names if name)
    more = len(known) - _LISTED
    return ", ".join(known[:_LISTED]) + (f" and {more} more" if more > 0 else "")
