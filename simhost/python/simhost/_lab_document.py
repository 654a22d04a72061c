"""Documents of labs: what is in them, and what is wrong with one, by the path of the key."""

import dataclasses
import ipaddress
import json
from pathlib import Path
from typing import Any, Dict, List, NoReturn, Optional, Tuple

_LONGEST_NAME = 31


class LabError(Exception):
    """A lab cannot be had; the text says why."""


@dataclasses.dataclass(frozen=True)
class HostSpec:
    """A host, with the scenario document that it begins as."""

    name: str
    document: Dict[str, Any]


@dataclasses.dataclass(frozen=True)
class UplinkEnd:
    host: str
    uplink: str

    def __str__(self) -> str:
        return f"{self.host}/{self.uplink}"


@dataclasses.dataclass(frozen=True)
class NetworkSpec:
    """A bridge that uplinks and other networks lead to."""

    name: str
    uplinks: Tuple[UplinkEnd, ...]
    joins: Tuple[str, ...]


@dataclasses.dataclass(frozen=True)
class RouterLink:
    """To a device of a host, of which the router has the other end."""

    host: str
    device: str
    address: str

    def __str__(self) -> str:
        return f"{self.host}/{self.device}"


@dataclasses.dataclass(frozen=True)
class RouterSpec:
    name: str
    links: Tuple[RouterLink, ...]


@dataclasses.dataclass(frozen=True)
class ClientSpec:
    """A machine at a port of a host, or at a network."""

    name: str
    host: str
    switch: str
    port: str
    network: str
    address: str
    mac: str

    @property
    def place(self) -> str:
        return self.network or f"{self.host}/{self.switch}/{self.port}"


@dataclasses.dataclass(frozen=True)
class LabSpec:
    name: str
    hosts: Tuple[HostSpec, ...]
    networks: Tuple[NetworkSpec, ...]
    routers: Tuple[RouterSpec, ...]
    clients: Tuple[ClientSpec, ...]


class _Node:
    """A value of a document and its path."""

    def __init__(self, value: Any, path: str = "") -> None:
        self.value = value
        self._path = path

    def fail(self, why: str) -> NoReturn:
        raise LabError(f"{self._path}: {why}" if self._path else why)

    def only(self, *keys: str) -> None:
        if not isinstance(self.value, dict):
            self.fail("must be an object")
        for key in self.value:
            if key not in keys:
                self._member(key).fail("unknown key")

    def _member(self, key: str) -> "_Node":
        return _Node(self.value[key], f"{self._path}.{key}" if self._path else key)

    def find(self, key: str) -> Optional["_Node"]:
        return self._member(key) if key in self.value else None

    def at(self, key: str) -> "_Node":
        if key not in self.value:
            self.fail(f"'{key}' is missing")
        return self._member(key)

    def items(self, key: str) -> List["_Node"]:
        found = self.find(key)
        if found is None:
            return []
        if not isinstance(found.value, list):
            found.fail("must be an array")
        return [_Node(one, f"{found._path}[{at}]") for at, one in enumerate(found.value)]

    def text(self, key: str, otherwise: Optional[str] = None) -> str:
        found = self.find(key) if otherwise is not None else self.at(key)
        if found is None:
            assert otherwise is not None
            return otherwise
        if not isinstance(found.value, str):
            found.fail("must be a text")
        return str(found.value)

    def name(self, key: str) -> str:
        name = self.text(key)
        is_one = 0 < len(name) <= _LONGEST_NAME and not name.startswith((".", "-"))
        if not is_one or not all(part.isalnum() or part in "-_." for part in name):
            self.at(key).fail(
                f"'{name}' is no name: letters, digits, '-', '_' and '.', {_LONGEST_NAME} at most"
            )
        return name

    def address(self, key: str) -> str:
        text = self.text(key)
        try:
            if "/" not in text:
                raise ValueError
            ipaddress.ip_interface(text)
        except ValueError:
            self.at(key).fail(
                "must be an address and the bits of its network, such as 192.0.2.1/24"
            )
        return text


class _Reader:
    def __init__(self, folder: Path) -> None:
        self._folder = folder
        self._machines: List[str] = []
        self._hosts: List[str] = []
        self._networks: List[str] = []
        self._taken: Dict[str, str] = {}

    def lab(self, node: _Node, name: str) -> LabSpec:
        node.only("name", "hosts", "networks", "routers", "clients")
        if node.find("name"):
            name = node.name("name")
        hosts = tuple(map(self._host, node.items("hosts")))
        if not hosts:
            node.fail("'hosts' is missing")
        self._networks = [one.name("name") for one in node.items("networks") if _has_name(one)]
        return LabSpec(
            name=name,
            hosts=hosts,
            networks=tuple(map(self._network, node.items("networks"))),
            routers=tuple(map(self._router, node.items("routers"))),
            clients=tuple(map(self._client, node.items("clients"))),
        )

    def _new_name(self, node: _Node) -> str:
        name = node.name("name")
        if name in self._machines:
            node.at("name").fail(f"there are two machines '{name}'")
        self._machines.append(name)
        return name

    def _host(self, node: _Node) -> HostSpec:
        node.only("name", "document")
        name = self._new_name(node)
        self._hosts.append(name)
        said = node.at("document")
        if isinstance(said.value, str):
            return HostSpec(name, self._read(said))
        if not isinstance(said.value, dict):
            said.fail("must be a scenario document, or the name of a file with one")
        return HostSpec(name, said.value)

    def _read(self, node: _Node) -> Dict[str, Any]:
        try:
            said = json.loads((self._folder / node.value).read_text(encoding="utf-8"))
        except (OSError, ValueError) as error:
            node.fail(f"{node.value} cannot be read: {error}")
        if not isinstance(said, dict):
            node.fail(f"{node.value} is no scenario document")
        return said

    def _network(self, node: _Node) -> NetworkSpec:
        node.only("name", "uplinks", "joins")
        name = self._new_name(node)
        joined = []
        for one in node.items("joins"):
            if one.value not in self._networks or one.value == name:
                one.fail(f"there is no other network '{one.value}'")
            joined.append(str(one.value))
        return NetworkSpec(
            name, tuple(self._uplink(one) for one in node.items("uplinks")), tuple(joined)
        )

    def _uplink(self, node: _Node) -> UplinkEnd:
        if not isinstance(node.value, str) or node.value.count("/") != 1:
            node.fail('must be a host and an uplink, such as "h1/nic0"')
        host, uplink = node.value.split("/")
        self._require(node, host, self._hosts, "host")
        self._take(node, node.value, "uplink")
        return UplinkEnd(host, uplink)

    def _router(self, node: _Node) -> RouterSpec:
        node.only("name", "links")
        return RouterSpec(self._new_name(node), tuple(map(self._link, node.items("links"))))

    def _link(self, node: _Node) -> RouterLink:
        node.only("host", "device", "address")
        link = RouterLink(node.text("host"), node.name("device"), node.address("address"))
        self._require(node.at("host"), link.host, self._hosts, "host")
        self._take(node.at("device"), str(link), "device")
        return link

    def _client(self, node: _Node) -> ClientSpec:
        node.only("name", "host", "switch", "port", "network", "address", "mac")
        name = self._new_name(node)
        network = node.text("network", "")
        if network:
            self._require(node.at("network"), network, self._networks, "network")
            for key in ("host", "switch", "port"):
                if node.find(key):
                    node.at(key).fail("a client of a network is at no port")
            host = switch = port = ""
        else:
            host, switch, port = (node.text(key) for key in ("host", "switch", "port"))
            self._require(node.at("host"), host, self._hosts, "host")
            self._take(node.at("port"), f"{host}/{switch}/{port}", "port")
        return ClientSpec(
            name, host, switch, port, network, node.address("address"), node.text("mac", "")
        )

    @staticmethod
    def _require(node: _Node, name: str, known: List[str], what: str) -> None:
        if name not in known:
            node.fail(f"there is no {what} '{name}'")

    def _take(self, node: _Node, what: str, kind: str) -> None:
        if self._taken.setdefault(f"{kind} {what}", node._path) != node._path:
            node.fail(f"the {kind} '{what}' is at {self._taken[f'{kind} {what}']} already")


def _has_name(node: _Node) -> bool:
    return isinstance(node.value, dict) and "name" in node.value


def _no_key_twice(pairs: List[Tuple[str, Any]]) -> Dict[str, Any]:
    found: Dict[str, Any] = {}
    for key, value in pairs:
        if key in found:
            raise LabError(f"the key '{key}' is there twice in one object")
        found[key] = value
    return found


def read(file: Path) -> LabSpec:
    """The lab that a file describes, which has the file's name unless it says another one."""
    try:
        said = json.loads(file.read_text(encoding="utf-8"), object_pairs_hook=_no_key_twice)
    except OSError as error:
        raise LabError(f"{file} cannot be read: {error.strerror}") from None
    except ValueError as error:
        raise LabError(f"{file}: {error}") from None
    except LabError as error:
        raise LabError(f"{file}: {error}") from None
    try:
        return _Reader(file.parent).lab(_Node(said), file.stem)
    except LabError as error:
        raise LabError(f"{file}: {error}") from None
