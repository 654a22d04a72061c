"""Several hosts whose frames are real, and what is between them: a common network, or routers."""

import itertools
from pathlib import Path
from types import TracebackType
from typing import Any, Dict, List, Mapping, Optional, Sequence, Type

from frame_lab import Lab
from simhost import Client
from simhost._frames import Cabling, Wire
from simhost._namespaces import Namespace

_QUICK = ["type", "bridge", "forward_delay", "0", "mcast_snooping", "0"]


class Rack:
    """Hosts that are made of one document each; gone when it is left."""

    def __init__(self, folder: Path, documents: Sequence[Mapping[str, Any]]) -> None:
        self.hosts: List[Lab] = []
        self._namespaces: List[Namespace] = []
        self._addresses = itertools.count(1)
        self._folder = folder
        for number, document in enumerate(documents):
            place = folder / f"h{number}"
            place.mkdir()
            self.hosts.append(Lab(place, document))

    def __enter__(self) -> "Rack":
        return self

    def __exit__(
        self,
        kind: Optional[Type[BaseException]],
        error: Optional[BaseException],
        trace: Optional[TracebackType],
    ) -> None:
        for host in self.hosts:
            host.__exit__(kind, error, trace)
        for namespace in self._namespaces:
            namespace.close()

    def start(self) -> None:
        for host in self.hosts:
            host.start()

    def namespace(self) -> Namespace:
        """One that goes with this."""
        self._namespaces.append(Namespace())
        return self._namespaces[-1]

    def client(self, host: int, port: str, switch: str = "lab") -> Client:
        """A client at a port of a host, whose address no other client of the rack has."""
        client = self.hosts[host].client(switch, port)
        client.run("ip", "address", "flush", "dev", "eth0")
        client.address = f"10.9.0.{next(self._addresses)}"
        client.run("ip", "address", "add", f"{client.address}/24", "dev", "eth0")
        return client


class Segment:
    """A network of two bridges, joined: each host has its first uplink at the one, and its second
    at the other."""

    def __init__(self, rack: Rack) -> None:
        self.namespace = rack.namespace()
        self.wires: Dict[str, Wire] = {}
        """By host and uplink, such as "0/nic1"."""
        for bridge in "b0", "b1":
            self.namespace.run("ip", "link", "add", bridge, *_QUICK)
            self.namespace.run("ip", "link", "set", bridge, "up")
        Cabling(self.namespace).connect(self.namespace, "j0", self.namespace, "j1")
        for bridge, end in (("b0", "j0"), ("b1", "j1")):
            self.namespace.run("ip", "link", "set", end, "master", bridge)
        for number, host in enumerate(rack.hosts):
            for which, bridge in enumerate(("b0", "b1")):
                wire = host.frames.cabling.to_network(self.namespace, f"h{number}n{which}")
                self.namespace.run("ip", "link", "set", wire.name, "master", bridge)
                self.wires[f"{number}/nic{which}"] = wire
                host.apply({"uplinks": [{"name": f"nic{which}", "device": wire.near}]})


class Routers:
    """A network of each host, 192.0.2.0/24, 192.0.3.0/24, ..., and a router between them. A host
    reaches it over its device eth1."""

    def __init__(self, rack: Rack) -> None:
        self.namespace = rack.namespace()
        self.namespace.run("sh", "-c", "echo 1 > /proc/sys/net/ipv4/ip_forward")
        for number, host in enumerate(rack.hosts):
            wire = f"r{number}"
            host.wire("eth1", self.namespace, wire)
            address = f"192.0.{2 + number}.254/24"
            self.namespace.run("ip", "address", "add", address, "dev", wire)

    @staticmethod
    def address(host: int) -> str:
        return f"192.0.{2 + host}.1"

    @classmethod
    def underlay(cls, host: int) -> Dict[str, str]:
        """What a document says of it."""
        return {
            "device": "eth1",
            "address": f"{cls.address(host)}/24",
            "gateway": f"192.0.{2 + host}.254",
        }
