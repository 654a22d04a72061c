"""A scenario document with other names and addresses: the same structure, of a host that nobody
knows by it.

What is one name or address is one other, wherever it stands, in the bytes of properties too. Bytes
that nobody understands are zeroed, and said to be.
"""

from __future__ import annotations

import abc
import hmac
import ipaddress
import typing
from typing import Any, Callable, Dict, List, Mapping, Optional, Set, Tuple

from vswitch import _property_bytes, _settings, _table, documents, words as _words
from vswitch._properties import RUNTIME_OPTIONS
from vswitch._of_snapshot import NOT_TOLD
from vswitch.documents import Document
from vswitch.values import Words
from vswitch.words import under

__all__ = ["anonymized"]

KEPT = {
    "numbers": "VLANs, networks, sizes, times, counters, port numbers and keys of encapsulations "
    "of mirror sessions",
    "mac": "the bits for multicast and local addresses, which share their first three bytes; "
    "01:00:5e and 33:33 of groups, no address and all stations",
    "ip": "the family; scopes of multicast and link-local addresses; 224.0.0.0/24, well-known "
    "IPv6 groups, no address and all stations",
}
"""What is the same afterwards, as the document says it."""

Place = Dict[str, str]
Reader = Callable[[Any, str], Any]


def anonymized(document: Document, key: Optional[bytes] = None) -> Dict[str, Words]:
    """The document with other names and addresses; DocumentError for what nobody knows in it.

    What becomes what is chosen for this document, or with a key for all that are made with it.
    """
    seen = _Seen()
    _Walk(seen).document(document)
    return _Walk(_Others(seen, key)).document(document)


# Names


class _Names(abc.ABC):
    """What is asked of every name and address on the way through a document."""

    @abc.abstractmethod
    def name(self, kind: str, given: str) -> str:
        """A text; the kind is what it is called for those who read it."""

    @abc.abstractmethod
    def mac(self, given: str) -> str:
        ...

    @abc.abstractmethod
    def ip(self, given: str) -> str:
        ...

    @abc.abstractmethod
    def number(self, given: int, kind: str = "number", most: int = 0xFFFFFFFF) -> int:
        """A number that is a name, of as many bits as `most` has."""


class _Seen(_Names):
    """All that there are, which nothing is to become."""

    def __init__(self) -> None:
        self.all: Set[Any] = set()

    def name(self, kind: str, given: str) -> str:
        self.all.add(given)
        return given

    def mac(self, given: str) -> str:
        mac = _words.mac(given)
        self.all.update((mac, mac[:8]))
        return given

    def ip(self, given: str) -> str:
        self.all.add(_words.address(given, "ip"))
        return given

    def number(self, given: int, kind: str = "number", most: int = 0xFFFFFFFF) -> int:
        self.all.add(given)
        return given


# What Ethernet calls groups of either protocol.
_IP4_GROUPS, _IP6_GROUPS = "01:00:5e", "33:33"
_BENCHMARKS = int(ipaddress.ip_address("198.18.0.0"))
_UNUSED = int(ipaddress.ip_address("240.0.0.0"))
_LOCAL_GROUPS = int(ipaddress.ip_address("239.0.0.0"))
_DOCUMENTATION = int(ipaddress.ip_address("2001:db8::"))
_LINK_LOCAL = int(ipaddress.ip_address("fe80::"))
_CONTROL = ipaddress.ip_network("224.0.0.0/24")
_WELL_KNOWN = 0x100
_PATIENCE = 32


class _Others(_Names):
    """What each becomes: something that nothing was, and nothing else becomes."""

    def __init__(self, seen: _Seen, key: Optional[bytes]) -> None:
        self._key = key
        self._taken = set(seen.all)
        self._of: Dict[Tuple[str, Any], Any] = {}
        self._counts: Dict[str, int] = {}

    def _other(self, space: str, given: Any, make: Callable[[int, int], Any], kind: str) -> Any:
        """`make` is given a number of 64 bits, and which attempt this is."""
        found = self._of.get((space, given))
        attempt = 0
        while found is None:
            made = make(self._chosen(space, kind, given, attempt), attempt)
            if made not in self._taken:
                self._taken.add(made)
                found = self._of[space, given] = made
            attempt += 1
        return found

    def _chosen(self, space: str, kind: str, given: Any, attempt: int) -> int:
        if self._key is None:
            self._counts[kind] = self._counts.get(kind, 0) + 1
            return self._counts[kind]
        about = f"{space}\0{attempt}\0{given}".encode("utf-8", "surrogateescape")
        return int.from_bytes(hmac.digest(self._key, about, "sha256")[:8], "big")

    def name(self, kind: str, given: str) -> str:
        if not given:
            return given
        # Linux has room for fifteen bytes of a device.
        form, bits = ("{}-{:08x}", 32) if kind == "device" else ("{}-{:016x}", 64)
        if self._key is None:
            form = "{}-{}"
        made: str = self._other("name", given, lambda n, _: form.format(kind, n % 2**bits), kind)
        return made

    def mac(self, given: str) -> str:
        mac = _words.mac(given)
        if mac in ("00:00:00:00:00:00", "ff:ff:ff:ff:ff:ff"):
            return mac
        prefix = self._prefix(mac)
        # The upper bit of such a group belongs to nobody.
        bits = 0x7FFFFF if prefix == _IP4_GROUPS else 0xFFFFFF
        made: str = self._other(
            "mac", mac, lambda n, _: prefix + _octets((n & bits).to_bytes(3, "big")), prefix
        )
        return made

    def _prefix(self, mac: str) -> str:
        if mac.startswith(_IP4_GROUPS):
            return _IP4_GROUPS
        if mac.startswith(_IP6_GROUPS):
            return f"{_IP6_GROUPS}:00"
        first = int(mac[:2], 16) & 3

        def made(n: int, _: int) -> str:
            return _octets(bytes([first | n >> 14 & 0xFC, n >> 8 & 0xFF, n & 0xFF]))[1:]

        found: str = self._other("oui", mac[:8], made, "oui")
        return found

    def ip(self, given: str) -> str:
        address = ipaddress.ip_address(_words.address(given, "ip"))
        value = int(address)
        if value == 0 or given == "255.255.255.255" or address in _CONTROL:
            return str(address)
        if address.version == 6 and address.is_multicast and value & (1 << 112) - 1 < _WELL_KNOWN:
            return str(address)
        make = _ip4 if address.version == 4 else _ip6
        made: str = self._other(
            "ip", str(address), lambda n, attempt: make(address, n, attempt), _pool(address)
        )
        return made

    def number(self, given: int, kind: str = "number", most: int = 0xFFFFFFFF) -> int:
        if given == 0:
            return given
        made: int = self._other(kind, given, lambda n, _: n & most or 1, kind)
        return made


def _octets(data: bytes) -> str:
    return "".join(f":{one:02x}" for one in data)


Address = typing.Union[ipaddress.IPv4Address, ipaddress.IPv6Address]


def _pool(address: Address) -> str:
    """Those that are counted together."""
    kinds = ("multicast", address.is_multicast), ("link", address.is_link_local)
    return f"ip{address.version} {[kind for kind, has in kinds if has]}"


def _ip4(address: Address, n: int, attempt: int) -> str:
    base, bits = (_LOCAL_GROUPS, 24) if address.is_multicast else (_BENCHMARKS, 17)
    if attempt >= _PATIENCE and not address.is_multicast:
        base, bits = _UNUSED, 27
    return str(ipaddress.IPv4Address(base + n % 2**bits))


def _ip6(address: Address, n: int, attempt: int) -> str:
    if address.is_multicast:
        scope = int(address) >> 112 << 112
        return str(ipaddress.IPv6Address(scope + _WELL_KNOWN + n))
    base = _LINK_LOCAL if address.is_link_local else _DOCUMENTATION
    return str(ipaddress.IPv6Address(base + n))


# Documents

_KINDS = {
    "port": "port",
    "sid": "session",
    "uplink": "uplink",
    "active": "uplink",
    "standby": "uplink",
}
"""What a text in a setting is called, if it has not been seen elsewhere."""

_HOST_KEYS = ("clock", "mac_learning")
_UPLINK_KEYS = ("link", "admin", "lacp", "speed", "duplex", "beacons", "error_percent", "driver")
_SWITCH_KEYS = ("max_ports", "persistent", "version", "running", "counters")
_GROUP_KEYS = ("version", "source_mode", "vni")
_MAC_KEYS = ("vlan", "vni", "type", "ages", "age")
_FAULT_KEYS = ("call", "nth", "times", "status", "exception", "delay")
_GREATEST_TUNNEL_KEY = 0xFFFFFF
_BY_KEY = {known.key: known for known in (*_table.SWITCH.values(), *_table.PORT.values())}


def _kept(given: Any, path: str) -> Any:
    return given


class _Walk:
    """A document, with each of its names through `names`. What has no reader is a DocumentError:
    nobody knows whether it says a name."""

    def __init__(self, names: _Names) -> None:
        self._names = names
        self._zeroed: List[Dict[str, Words]] = []
        self._dropped: List[Dict[str, Words]] = []

    def document(self, document: Any) -> Dict[str, Words]:
        said = self._object(
            document,
            "",
            dict.fromkeys(_HOST_KEYS, _kept),
            uplinks=self._each(self._uplink),
            underlay=self._underlay,
            runtime_options=self._options,
            switches=self._each(self._switch),
            faults=self._each(self._fault),
        )
        observed = document.get("observed")
        said["observed"] = self._observed(observed if isinstance(observed, dict) else {})
        return said

    # Readers

    def _object(
        self, given: Any, path: str, kept: Mapping[str, Reader], **more: Reader
    ) -> Dict[str, Words]:
        readers = {**kept, **more, "observed": _kept}
        held = _words.members(given, path, readers)
        held.pop("observed", None)
        # Those that have a name of their own come first: it is called by what it is.
        order = sorted(held, key=lambda name: list(readers).index(name))
        made = {name: readers[name](held[name], under(path, name)) for name in order}
        return {name: made[name] for name in held}

    def _each(self, read: Reader) -> Reader:
        def each(given: Any, path: str) -> List[Words]:
            return [read(one, f"{path}[{at}]") for at, one in enumerate(_words.items(given, path))]

        return each

    def _name(self, kind: str) -> Reader:
        return lambda given, path: self._names.name(kind, _words.text(given, path))

    def _mac(self, given: Any, path: str) -> str:
        return self._names.mac(_words.mac(given, path))

    def _ip(self, given: Any, path: str) -> str:
        return self._names.ip(_words.address(given, path))

    def _either(self, given: Any, path: str) -> str:
        """The address of a group, of whichever form."""
        return (self._mac if str(given).count(":") == 5 and len(given) == 17 else self._ip)(
            given, path
        )

    def _options(self, given: Any, path: str) -> Dict[str, Words]:
        kinds: Dict[str, Reader] = {
            one["name"]: _kept if "least" in one else self._ip for one in RUNTIME_OPTIONS
        }
        return self._object(given, path, kinds)

    def _form(self, form: _table.Form) -> Reader:
        """Whatever a setting has that is a name."""
        kind = form["form"]
        if kind == "text":
            return self._name(_KINDS.get(form.get("name", ""), "text"))
        if kind == "mac":
            return self._mac
        if kind == "ip":
            return self._ip
        if kind == "list" and form["element"]["form"] != "range":
            element = {**form["element"], "name": form.get("name", "")}
            return self._each(self._form(element))
        if kind in ("record", "one_of"):
            return self._record(form)
        return _kept

    def _record(self, form: _table.Form) -> Reader:
        members = {one["name"]: self._form(one) for one in form["members"]}

        def record(given: Any, path: str) -> Words:
            if "alone" in form and not isinstance(given, dict):
                return members[form["alone"]](given, path)
            return self._object(given, path, members)

        return record

    def _settings(self, known: Dict[str, _table.Property]) -> Dict[str, Reader]:
        return {name: self._setting(one) for name, one in known.items()}

    def _setting(self, known: _table.Property) -> Reader:
        if known.name == "connection":
            bounds = known.form["least"], known.form["greatest"]
            return lambda given, path: self._names.number(_words.number(given, path, *bounds))
        return self._form({"name": known.name, **known.form})

    # What there is

    def _uplink(self, given: Any, path: str) -> Dict[str, Words]:
        kept = dict.fromkeys(_UPLINK_KEYS, _kept)
        return self._object(
            given, path, kept, name=self._name("uplink"), device=self._name("device")
        )

    def _underlay(self, given: Any, path: str) -> Dict[str, Words]:
        return self._object(
            given, path, {}, device=self._name("device"), address=self._network, gateway=self._ip
        )

    def _network(self, given: Any, path: str) -> str:
        """An address, with the bits of its network."""
        address, slash, bits = _words.text(given, path).partition("/")
        return self._ip(address, path) + slash + bits

    def _fabric(self, given: Any, path: str) -> Dict[str, Words]:
        uplink, peers = self._name("uplink"), self._each(self._ip)
        kept = {"encapsulation": _kept}
        return self._object(given, path, kept, key=self._tunnel_key, uplink=uplink, peers=peers)

    def _tunnel_key(self, given: Any, path: str) -> int:
        key = _words.number(given, path, 0, _GREATEST_TUNNEL_KEY)
        return self._names.number(key, "tunnel key", _GREATEST_TUNNEL_KEY)

    def _device(self, given: Any, path: str) -> Words:
        """A client's: its name, or that with its address."""
        if not isinstance(given, dict):
            return self._name("device")(given, path)
        return self._object(given, path, {}, name=self._name("device"), mac=self._mac)

    def _switch(self, given: Any, path: str) -> Dict[str, Words]:
        alias = given.get("alias") if isinstance(given, dict) else None
        place = {"switch": self._names.name("switch", _words.text(alias, f"{path}.alias"))}
        names: Dict[str, Reader] = {
            "alias": self._name("switch"),
            "id": self._name("id"),
            "portset": self._name("portset"),
            "lags": self._each(self._lag),
            "uplink_ports": self._each(lambda one, at: self._uplink_port(one, at, place)),
            "ports": self._each(lambda one, at: self._port(one, at, place)),
        }
        return self._object(
            given,
            path,
            names,
            **dict.fromkeys(_SWITCH_KEYS, _kept),
            fabric=self._fabric,
            uplinks=self._each(self._name("uplink")),
            addresses=self._each(self._entry),
            mirror_counters=self._sessions,
            properties=lambda held, at: self._properties(held, at, "switch", place),
            host_properties=lambda held, at: self._properties(held, at, "host", place),
            **self._settings(_table.SWITCH),
        )

    def _lag(self, given: Any, path: str) -> Dict[str, Words]:
        names: Dict[str, Reader] = {"name": self._name("lag")}
        uplinks = self._each(self._name("uplink"))
        return self._object(given, path, names, uplinks=uplinks, rate=_kept)

    def _uplink_port(self, given: Any, path: str, place: Place) -> Dict[str, Words]:
        return self._any_port(
            given, path, place, "uplink-port", _table.UPLINK_PORT, uplink=self._name("uplink")
        )

    def _port(self, given: Any, path: str, place: Place) -> Dict[str, Words]:
        return self._any_port(
            given,
            path,
            place,
            "port",
            _table.PORT,
            external_id=self._name("external"),
            device=self._device,
            addresses=self._each(self._entry),
            groups=self._each(self._group),
            counters=_kept,
        )

    def _any_port(
        self,
        given: Any,
        path: str,
        place: Place,
        kind: str,
        known: Dict[str, _table.Property],
        **more: Reader,
    ) -> Dict[str, Words]:
        id_ = given.get("id") if isinstance(given, dict) else None
        at = {**place, "port": self._names.name(kind, _words.text(id_, f"{path}.id"))}
        return self._object(
            given,
            path,
            {"id": self._name(kind)},
            properties=lambda held, where: self._properties(held, where, "port", at),
            **{**self._settings(known), **more},
        )

    def _entry(self, given: Any, path: str) -> Dict[str, Words]:
        return self._object(given, path, dict.fromkeys(_MAC_KEYS, _kept), mac=self._mac)

    def _group(self, given: Any, path: str) -> Dict[str, Words]:
        kept = dict.fromkeys(_GROUP_KEYS, _kept)
        return self._object(
            given, path, kept, address=self._either, sources=self._each(self._either)
        )

    def _sessions(self, given: Any, path: str) -> Dict[str, Words]:
        """Counters of mirror sessions, by their identifiers."""
        name = self._name("session")
        return {name(sid, path): counters for sid, counters in _members(given, path)}

    def _fault(self, given: Any, path: str) -> Dict[str, Words]:
        kept = dict.fromkeys(_FAULT_KEYS, _kept)
        return self._object(given, path, kept, message=self._name("text"))

    # Bytes

    def _properties(self, given: Any, path: str, scope: str, place: Place) -> Dict[str, Words]:
        made: Dict[str, Words] = {}
        zeroed: List[str] = []
        dropped: List[str] = []
        for key, one in _members(given, path):
            where = under(path, key)
            data = documents.read_property(key, one, where).data or b""
            named = key if key in _table.BY_KEY else self._names.name("property", key)
            try:
                other = self._other_bytes(scope, key, data, where)
            except ValueError:
                dropped.append(named)
                continue
            if other is None:
                zeroed.append(named)
                other = bytes(len(data))
            made[named] = {"type": one["type"], "hex": other.hex()}
        for said, keys in ((self._zeroed, zeroed), (self._dropped, dropped)):
            if keys:
                part = "host_properties" if scope == "host" else "properties"
                said.append({**place, "what": part, "keys": keys})
        return made

    def _other_bytes(self, scope: str, key: str, data: bytes, path: str) -> Optional[bytes]:
        """The bytes with other names in them; None for what nobody understands, ValueError for what
        nobody may give that key."""
        known = _BY_KEY.get(key)
        if known is not None and known.form["form"] == "text":
            given = data.split(b"\0", 1)[0].decode("utf-8", "surrogateescape")
            return self._names.name(_KINDS.get(known.name, "text"), given).encode() + b"\0"
        if known is not None:
            words = _settings.words_of(known, _property_bytes.value_of(known, {key: data}))
            other = self._setting(known)(words, path)
            made = _property_bytes.bytes_of(known, _settings.parse(known, other, path))
            return made[key]
        if key not in _table.BY_KEY or _table.BY_KEY[key].form["form"] == "none":
            return None
        _property_bytes.check(scope, key, {key: data})
        return data if _table.BY_KEY[key].form["form"] != "text" else None

    # What is listed

    def _observed(self, given: Dict[str, Any]) -> Dict[str, Words]:
        said: Dict[str, Words] = {}
        if "snapshot" in given:
            said["snapshot"] = given["snapshot"]
        for name in ("refused", "left_out"):
            if name in given:
                said[name] = [self._listed(one) for one in _words.items(given[name], name)]
        if "not_told" in given:
            said["not_told"] = NOT_TOLD
        said["anonymized"] = {"kept": KEPT, "zeroed": self._zeroed, "dropped": self._dropped}
        return said

    def _listed(self, given: Any) -> Dict[str, Words]:
        """Where something was refused, which call it was and its status; the words of others are
        anybody's."""
        held = given if isinstance(given, dict) else {}
        names = {"switch": "switch", "port": "port", "uplink": "uplink"}
        said: Dict[str, Words] = {
            key: self._names.name(kind, str(held[key]))
            for key, kind in names.items()
            if key in held
        }
        status = str(held.get("status", ""))
        for key in ("what", "call", "status"):
            if key in held:
                said[key] = held[key]
        if status.startswith("QEX_"):
            said["words"] = held.get("words", "")
        return said


def _members(given: Any, path: str) -> List[Tuple[str, Any]]:
    if not isinstance(given, dict):
        raise _words.fail(path, given, "an object")
    return list(given.items())
