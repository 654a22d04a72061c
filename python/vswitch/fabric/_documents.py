"""Documents of what hosts share: those of a host, without what each host has of its own, and with
`hosts` of a switch, which have it."""

from dataclasses import dataclass
from typing import Any, Dict, Iterable, List, Mapping, Optional, Tuple

from vswitch import _table, documents, words as _words
from vswitch.documents import PortWish, PropertyWish, SwitchWish
from vswitch.words import DocumentError, under

__all__ = ["Wish", "read"]

_LAST = ("config", "policy")
_OF_HOST = ("uplinks", "runtime_options", "options", "mac_learning")
_OF_SWITCH = (
    "host_properties",
    "lags",
    "persistent",
    "portset",
    "running",
    "uplink_ports",
    "uplinks",
)


@dataclass(frozen=True)
class Wish:
    """What a document wants of a switch; `hosts` is None where it says nothing of them."""

    switch: SwitchWish
    hosts: Optional[Tuple[str, ...]] = None


def read(document: documents.Document) -> Tuple[Wish, ...]:
    """What a document wants; DocumentError with the path of the key that is wrong."""
    if not isinstance(document, Mapping):
        raise _words.fail("", document, "an object")
    given = dict(document)
    _refuse_own(given, "", _OF_HOST)
    hosts: List[Optional[Tuple[str, ...]]] = []
    if "switches" in given:
        switches = _words.items(given["switches"], "switches")
        given["switches"] = [
            _without_hosts(one, f"switches[{at}]", hosts) for at, one in enumerate(switches)
        ]
    wishes = documents.read(given).switches
    for wish in wishes:
        _check(wish)
    return tuple(Wish(wish, names) for wish, names in zip(wishes, hosts))


def _refuse_own(given: Mapping[str, Any], path: str, names: Iterable[str]) -> None:
    for name in names:
        if name in given:
            raise DocumentError(under(path, name), "each host has its own, and a fabric has none")


def _without_hosts(given: Any, path: str, hosts: List[Optional[Tuple[str, ...]]]) -> Any:
    """A switch as documents of a host have it."""
    if not isinstance(given, dict):
        return given
    _refuse_own(given, path, _OF_SWITCH)
    held: Dict[str, Any] = dict(given)
    names = held.pop("hosts", None)
    hosts.append(None if names is None else _names(names, under(path, "hosts")))
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
