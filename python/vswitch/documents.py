"""Documents as plans read them: checked whole before anything is asked of the host.

A document has the keys of scenario documents. Where an object's name is shorter, both are taken:
`options`, `identifier`, `macs`, `mirrors`. In place of a setting's value `"absent"` clears it, and
`"state": "absent"` in place of everything else removes a switch, a port, an uplink or an address.
What is under `observed` is read over, as are learned addresses: no call sets them.
"""

import dataclasses
import typing
from dataclasses import dataclass
from typing import Any, Callable, Dict, List, Optional, Tuple

from libvswitch.enums import LinkState, MacType
from vswitch import _settings, _table, words as _words
from vswitch._of_snapshot import settable
from vswitch._properties import NUMBERS, RUNTIME_OPTIONS
from vswitch.options import read_option
from vswitch.uplink import link_state
from vswitch.values import MacLearning
from vswitch.words import ABSENT, SYNONYMS, DocumentError, under

Document = typing.Mapping[str, Any]

# What scenario documents tell a simulated host, and no call tells any.
_NO_CALL = {"clock", "faults", "groups", "counters", "mirror_counters", "stats", "device"}
_FIXED = ("id", "portset", "max_ports", "version")
_OF_SWITCH, _OF_MAC = NUMBERS["switches"], NUMBERS["addresses"]


@dataclass(frozen=True)
class Wish:
    """What a document wants of one thing; `path` is where it says so."""

    path: str
    absent: bool = False


@dataclass(frozen=True)
class PropertyWish(Wish):
    """A property by its bytes, None for one that is to be cleared."""

    key: str = ""
    data: Optional[bytes] = None
    type: int = 0


@dataclass(frozen=True)
class ThingWish(Wish):
    """Settings by their names, each a value or ABSENT."""

    settings: Dict[str, Any] = dataclasses.field(default_factory=dict)
    properties: Tuple[PropertyWish, ...] = ()


@dataclass(frozen=True)
class MacWish(Wish):
    mac: str = ""
    type: MacType = MacType.STATIC
    vlan: int = 0
    vni: int = 0


@dataclass(frozen=True)
class PortWish(ThingWish):
    id: str = ""
    external_id: Optional[str] = None
    macs: Tuple[MacWish, ...] = ()


@dataclass(frozen=True)
class UplinkPortWish(ThingWish):
    id: str = ""
    uplink: Optional[str] = None


@dataclass(frozen=True)
class UplinkWish(Wish):
    name: str = ""


@dataclass(frozen=True)
class LagWish(Wish):
    name: str = ""
    uplinks: Tuple[str, ...] = ()


@dataclass(frozen=True)
class SwitchWish(ThingWish):
    alias: str = ""
    fixed: Dict[str, Any] = dataclasses.field(default_factory=dict)
    persistent: bool = True
    running: Optional[bool] = None
    uplink_ports: Tuple[UplinkPortWish, ...] = ()
    uplinks: Tuple[UplinkWish, ...] = ()
    lags: Tuple[LagWish, ...] = ()
    ports: Tuple[PortWish, ...] = ()
    host_properties: Tuple[PropertyWish, ...] = ()
    whole: bool = False
    """Whether an uplink that is elsewhere than it says may move."""


@dataclass(frozen=True)
class LinkWish(Wish):
    name: str = ""
    link: Optional[LinkState] = None


@dataclass(frozen=True)
class HostWish(Wish):
    links: Tuple[LinkWish, ...] = ()
    options: Dict[str, Any] = dataclasses.field(default_factory=dict)
    mac_learning: Optional[MacLearning] = None
    switches: Tuple[SwitchWish, ...] = ()


Held = Dict[str, Any]
Paths = Dict[str, str]


class _Object:
    """An object of a document: its members by their one name, and where each of them is."""

    def __init__(self, given: object, path: str, known: typing.Iterable[str]) -> None:
        self.path = path
        names = {*known, "observed"}
        held = given if isinstance(given, dict) else {}
        for name in held:
            if name in _NO_CALL and SYNONYMS.get(name, name) not in names:
                raise DocumentError(under(path, name), "no call of the host sets it")
        shorter = {one for one, long in SYNONYMS.items() if long in names}
        held = _words.members(given, path, names | shorter)
        self._paths: Paths = {}
        self._held: Held = {}
        for name, value in held.items():
            one = SYNONYMS.get(name, name) if name in shorter else name
            if one in self._held:
                where = under(path, name)
                raise DocumentError(where, f"{self._paths[one]} says the same")
            self._held[one] = value
            self._paths[one] = under(path, name)

    def __contains__(self, name: str) -> bool:
        return name in self._held

    def where(self, name: str) -> str:
        return self._paths.get(name, under(self.path, name))

    def get(self, name: str, read: Callable[..., Any], *more: Any, default: Any = None) -> Any:
        return read(self._held[name], self.where(name), *more) if name in self else default

    def need(self, name: str, read: Callable[..., Any], *more: Any) -> Any:
        if name not in self:
            raise DocumentError(self.path, f"'{name}' is missing")
        return self.get(name, read, *more)

    def is_absent(self, key: str) -> bool:
        """Whether all that it says of the thing under that key is that it is to go."""
        if "state" not in self:
            return False
        self.get("state", _words.choice, (ABSENT,))
        others = set(self._held) - {"state", "observed", key}
        if others:
            name = sorted(others)[0]
            raise DocumentError(
                self.where(name), f"what is to be {ABSENT} has no more than '{key}'"
            )
        return True

    def value(self, name: str) -> Any:
        return self._held[name]


def _name(given: object, path: str) -> str:
    return _words.text(given, path, least=1)


def _each(given: object, path: str, read: Callable[[object, str], Any], key: str) -> Any:
    """What a list holds, each thing once."""
    found: List[Any] = []
    seen: Dict[str, str] = {}
    for at, one in enumerate(_words.items(given, path)):
        wish = read(one, f"{path}[{at}]")
        name = getattr(wish, key)
        if name in seen:
            raise DocumentError(wish.path, f"{seen[name]} is about {name!r}, too")
        seen[name] = wish.path
        found.append(wish)
    return tuple(found)


def _settings_of(held: _Object, known: Dict[str, _table.Property]) -> Dict[str, Any]:
    found = {}
    for name, one in known.items():
        if name in held:
            value = held.value(name)
            is_absent = isinstance(value, str) and value == ABSENT
            found[name] = ABSENT if is_absent else _settings.parse(one, value, held.where(name))
    return found


def _properties(given: object, path: str) -> Tuple[PropertyWish, ...]:
    if not isinstance(given, dict):
        raise _words.fail(path, given, "an object")
    return tuple(read_property(key, one, under(path, str(key))) for key, one in given.items())


def read_property(key: str, given: object, path: str) -> PropertyWish:
    if given == ABSENT:
        return PropertyWish(path, True, _name(key, path))
    held = _Object(given, path, ("type", "hex", "text"))
    type_ = _table.PROPERTY_TYPES[held.need("type", _words.choice, _table.PROPERTY_TYPES)]
    if ("hex" in held) is ("text" in held):
        raise DocumentError(path, "must have one of the keys hex, text")
    if "text" in held:
        data: bytes = held.get("text", _words.text).encode() + b"\0"
    else:
        data = held.get("hex", _bytes)
    return PropertyWish(path, False, _name(key, path), data, type_)


def _bytes(given: object, path: str) -> bytes:
    try:
        return bytes.fromhex(_words.text(given, path))
    except ValueError as error:
        if isinstance(error, DocumentError):
            raise
        raise _words.fail(path, given, "hexadecimal digits, two for each byte") from None


def _thing(held: _Object, known: Dict[str, _table.Property]) -> Dict[str, Any]:
    properties = held.get("properties", _properties, default=())
    by_bytes = {one.key for one in properties}
    settings = {
        name: value
        for name, value in _settings_of(held, known).items()
        # Where a document has both, the bytes win.
        if known[name].key not in by_bytes
    }
    return {"path": held.path, "settings": settings, "properties": properties}


def read_mac(given: object, path: str) -> MacWish:
    held = _Object(given, path, ("mac", "vlan", "vni", "type", "ages", "age", "state"))
    absent = "state" in held and bool(held.get("state", _words.choice, (ABSENT,)))
    types = [str(one) for one in (MacType.STATIC, MacType.USER, MacType.LEARNED)]
    return MacWish(
        path,
        absent,
        held.need("mac", _words.mac),
        MacType[held.get("type", _words.choice, types, default="learned").upper()],
        held.get("vlan", _words.number, *_OF_MAC["vlan"], default=0),
        held.get("vni", _words.number, *_OF_MAC["vni"], default=0),
    )


def _macs(given: object, path: str) -> Tuple[MacWish, ...]:
    found = [read_mac(one, f"{path}[{at}]") for at, one in enumerate(_words.items(given, path))]
    return tuple(one for one in found if one.type is not MacType.LEARNED or one.absent)


def _port(given: object, path: str) -> PortWish:
    keys = ("id", "external_id", "addresses", "properties", "state")
    held = _Object(given, path, (*keys, *_table.PORT))
    id_ = held.need("id", _name)
    if held.is_absent("id"):
        return PortWish(path, True, id=id_)
    return PortWish(
        id=id_,
        external_id=held.get("external_id", _name),
        macs=held.get("addresses", _macs, default=()),
        **_thing(held, _table.PORT),
    )


def _uplink_port(given: object, path: str) -> UplinkPortWish:
    held = _Object(given, path, ("id", "uplink", "properties", "state", *_table.UPLINK_PORT))
    id_ = held.need("id", _name)
    if held.is_absent("id"):
        return UplinkPortWish(path, True, id=id_)
    uplink = held.get("uplink", _name)
    return UplinkPortWish(id=id_, uplink=uplink, **_thing(held, _table.UPLINK_PORT))


def _uplink(given: object, path: str) -> UplinkWish:
    if isinstance(given, str):
        return UplinkWish(path, False, _name(given, path))
    held = _Object(given, path, ("name", "state"))
    name = held.need("name", _name)
    return UplinkWish(path, held.is_absent("name"), name)


def _lag(given: object, path: str) -> LagWish:
    held = _Object(given, path, ("name", "uplinks", "rate"))
    # Which no call can read or change.
    held.get("rate", _words.choice, ("slow", "fast"))
    uplinks = held.need("uplinks", _words.items)
    names = [_name(one, f"{held.where('uplinks')}[{at}]") for at, one in enumerate(uplinks)]
    return LagWish(path, False, held.need("name", _name), tuple(names))


def _switch(given: object, path: str) -> SwitchWish:
    keys = ("alias", *_FIXED, "persistent", "running", "uplink_ports", "uplinks", "lags")
    more = ("ports", "addresses", "properties", "host_properties", "state")
    held = _Object(given, path, (*keys, *more, *_table.SWITCH))
    alias = held.need("alias", _name)
    if held.is_absent("alias"):
        return SwitchWish(path, True, alias=alias)
    held.get("addresses", _team_macs)
    readers: Dict[str, Tuple[Callable[..., Any], Tuple[Any, ...]]] = {
        "id": (_name, ()),
        "portset": (_name, ()),
        "max_ports": (_words.number, _OF_SWITCH["max_ports"]),
        "version": (_words.number, _OF_SWITCH["version"]),
    }
    fixed = {name: held.get(name, read, *how) for name, (read, how) in readers.items()}
    uplink_ports = held.get("uplink_ports", _each, _uplink_port, "id", default=())
    uplinks = held.get("uplinks", _each, _uplink, "name", default=())
    at = {one.uplink: one.path for one in uplink_ports}
    for one in uplinks:
        if one.absent and one.name in at:
            raise DocumentError(one.path, f"{at[one.name]} has {one.name!r}")
    return SwitchWish(
        alias=alias,
        fixed={name: value for name, value in fixed.items() if value is not None},
        persistent=held.get("persistent", _words.flag, default=True),
        running=held.get("running", _words.flag),
        uplink_ports=uplink_ports,
        uplinks=uplinks,
        lags=held.get("lags", _each, _lag, "name", default=()),
        ports=held.get("ports", _each, _port, "id", default=()),
        host_properties=held.get("host_properties", _properties, default=()),
        **_thing(held, _table.SWITCH),
    )


def _team_macs(given: object, path: str) -> None:
    for one in _macs(given, path):
        raise DocumentError(one.path, "beyond the uplinks there are only learned addresses")


def _link(given: object, path: str) -> LinkWish:
    held = _Object(given, path, ("name", "link"))
    link = held.get("link", _words.choice, ("up", "down"))
    return LinkWish(path, False, held.need("name", _name), link_state(link) if link else None)


def _options(given: object, path: str) -> Dict[str, Any]:
    held = _words.members(given, path, [one["name"] for one in RUNTIME_OPTIONS])
    return {name: read_option(name, value, under(path, name)) for name, value in held.items()}


def _host_learning(given: object, path: str) -> MacLearning:
    read: MacLearning = _settings.parse(_table.SWITCH["mac_learning"], given, path)
    if read.aging_time == 0:
        raise DocumentError(under(path, "aging_time"), "0 is below 1")
    return read


def read(document: Document, whole: bool = False) -> HostWish:
    """What a document wants; DocumentError with the path of the key that is wrong.

    With `whole` it says all of a host, which a snapshot may not know.
    """
    given = dict(document) if isinstance(document, typing.Mapping) else document
    given = settable(given, whole)
    held = _Object(given, "", ("uplinks", "runtime_options", "mac_learning", "switches"))
    return HostWish(
        "",
        links=held.get("uplinks", _each, _link, "name", default=()),
        options=held.get("runtime_options", _options, default={}),
        mac_learning=held.get("mac_learning", _host_learning),
        switches=held.get("switches", _each, _switch, "alias", default=()),
    )
