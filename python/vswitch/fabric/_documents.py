"""Documents of what hosts share: those of a host, without what each host has of its own, and with
`hosts` of a switch, which have it, and its `fabric`, the tunnels between them."""

import ipaddress
from dataclasses import dataclass
from typing import Any, Dict, Iterable, List, Mapping, Optional, Tuple

from vswitch import _table, documents, words as _words
from vswitch._properties import FABRIC
from vswitch.documents import PortWish, PropertyWish, SwitchWish
from vswitch.words import ABSENT, DocumentError, under

__all__ = ["Wish", "read", "read_fabric"]

_LAST = ("config", "policy")
_OF_HOST = ("underlay", "uplinks", "runtime_options", "options", "mac_learning")
_OF_SWITCH = (
    "host_properties",
    "lags",
    "persistent",
    "portset",
    "running",
    "uplink_ports",
    "uplinks",
)
_FABRIC: _table.Form = {
    "form": "record",
    "members": [one for one in FABRIC if one["name"] != "uplink"],
}


@dataclass(frozen=True)
class Wish:
    """What a document wants of a switch; None where it says nothing, and an empty `fabric` where
    it wants no tunnels."""

    switch: SwitchWish
    hosts: Optional[Tuple[str, ...]] = None
    fabric: Optional[Dict[str, Any]] = None


def read(document: documents.Document) -> Tuple[Wish, ...]:
    """What a document wants; DocumentError with the path of the key that is wrong."""
    if not isinstance(document, Mapping):
        raise _words.fail("", document, "an object")
    given = dict(document)
    _refuse_own(given, "", _OF_HOST)
    more: List[Dict[str, Any]] = []
    if "switches" in given:
        switches = _words.items(given["switches"], "switches")
        given["switches"] = [
            _as_of_a_host(one, f"switches[{at}]", more) for at, one in enumerate(switches)
        ]
    wishes = documents.read(given).switches
    for wish in wishes:
        _check(wish)
    return tuple(Wish(wish, **said) for wish, said in zip(wishes, more))


def read_fabric(given: object, path: str) -> Dict[str, Any]:
    """Tunnels in one spelling; empty for none."""
    if given in ({}, ABSENT):
        return {}
    if isinstance(given, dict):
        _refuse_own(given, path, ("uplink",))
    held: Dict[str, Any] = _words.read(_FABRIC, given, path)
    held["peers"] = _in_order(held["peers"], under(path, "peers"))
    return held


def _in_order(peers: Iterable[str], path: str) -> List[str]:
    """That in which they stand says nothing."""
    packed: Dict[bytes, str] = {}
    for at, peer in enumerate(peers):
        where = f"{path}[{at}]"
        address = ipaddress.ip_address(peer).packed
        if not _is_of_a_host(address):
            raise DocumentError(where, f"{peer} is the address of no host")
        if address in packed:
            raise DocumentError(where, f"the peer {peer} is there twice")
        packed[address] = peer
    return [packed[address] for address in sorted(packed, key=lambda one: (len(one), one))]


def _is_of_a_host(address: bytes) -> bool:
    """Neither of a group nor of whoever has it, nor nobody's."""
    if len(address) == 4:
        return address[0] not in (0, 127) and address[0] < 224
    return address[0] != 0xFF and any(address[:-1])


def _refuse_own(given: Mapping[str, Any], path: str, names: Iterable[str]) -> None:
    for name in names:
        if name in given:
            raise DocumentError(under(path, name), "each host has its own, and a fabric has none")


def _as_of_a_host(given: Any, path: str, more: List[Dict[str, Any]]) -> Any:
    """A switch as documents of a host have it that a call can set."""
    if not isinstance(given, dict):
        return given
    _refuse_own(given, path, _OF_SWITCH)
    held: Dict[str, Any] = dict(given)
    said: Dict[str, Any] = {}
    names, fabric = held.pop("hosts", None), held.pop("fabric", None)
    if names is not None:
        said["hosts"] = _names(names, under(path, "hosts"))
    if fabric is not None:
        said["fabric"] = read_fabric(fabric, under(path, "fabric"))
    more.append(said)
    return held


def _names(given: object, path: str) -> Tuple[str, ...]:
    found = [
        _words.text(one, f"{path}[{at}]", least=1)
        for at, one in enumerate(_words.items(given, path))
    ]
    return tuple(dict.fromkeys(found))


def _check(wish: SwitchWish) -> None:
    things = (wish, *wish.ports)
    for one in (named for thing in things for named in thing.properties):
        if not one.absent and _word_of(one) not in _LAST:
            raise DocumentError(one.path, "what a restart takes away each host has of its own")
    for port in wish.ports:
        _check_addresses(port)


def _word_of(one: PropertyWish) -> str:
    return _table.word_for(_table.PROPERTY_TYPES, one.type)


def _check_addresses(port: PortWish) -> None:
    seen = set()
    for mac in port.macs:
        name = (mac.mac, mac.vlan)
        if name in seen:
            raise DocumentError(mac.path, f"{mac.mac} is there twice")
        seen.add(name)
