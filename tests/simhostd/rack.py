"""Several hosts whose frames are real, and what is between them: a common network, or routers."""

import itertools
from pathlib import Path
from typing import Any, Dict, List, Mapping, Protocol, Sequence

from frame_lab import Lab, comes_sooner_or_later
from simhost import Client, frame
from simhost._frames import Cabling, Wire
from simhost._namespaces import Namespace

ALL = "ff:ff:ff:ff:ff:ff"
_numbers = itertools.count()
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

    def __exit__(self, *error: object) -> None:
        for host in self.hosts:
            host.__exit__(*error)
        for namespace in self._namespaces:
            namespace.close()

    def start(self) -> None:
        for host in self.hosts:
            host.start()

    def three_clients(self) -> List[Client]:
        """One at the port "a" of each of three hosts, which are started."""
        self.start()
        return [self.client(host, "a") for host in range(3)]

    def set_all(self, **settings: Any) -> None:
        """What the port "a" has at each host."""
        for host in self.hosts:
            host.set_port("lab", "a", **settings)

    def namespace(self) -> Namespace:
        """One that goes with this."""
        self._namespaces.append(Namespace())
        return self._namespaces[-1]

    def client(self, host: int, port: str, switch: str = "lab") -> Client:
        """A client at a port of a host, whose address no other client of the rack has."""
        client = self.hosts[host].client(switch, port)
        call(client, f"10.9.0.{next(self._addresses)}")
        return client


def call(client: Client, address: str) -> None:
    """Gives a client an address that clients of other hosts do not have."""
    client.run("ip", "address", "flush", "dev", "eth0")
    client.address = address
    client.run("ip", "address", "add", f"{address}/24", "dev", "eth0")


def hello(sender: Client, receiver: str = ALL, **more: Any) -> bytes:
    """A frame that no other one is like."""
    return frame(receiver, sender.mac, payload=b"%08d" % next(_numbers) * 6, **more)


def all_reach(clients: Sequence[Client]) -> None:
    """Each comes to reach each other one, and has got nothing yet when this returns.

    Until then Open vSwitch may be asking for the addresses of its peers.
    """
    for one, other in itertools.permutations(clients, 2):
        assert comes_sooner_or_later(one, other, hello(one))
    for client in clients:
        while client._socket.find(lambda frame: True, 0.2):
            pass


def check_all_get_one(clients: Sequence[Client]) -> None:
    """What each sends to all comes to each other one once, and not back."""
    all_reach(clients)
    for sender in clients:
        sent = hello(sender)
        sender.send(sent)
        for client in clients:
            if client is not sender:
                client.expect(sent)
        for client in clients:
            client.expect_none(sent)


class Hosts(Protocol):
    """What has hosts, and namespaces that go with it."""

    @property
    def hosts(self) -> Sequence[Lab]:
        ...

    def namespace(self) -> Namespace:
        ...


class Segment:
    """A network of two bridges, joined: each host has its first uplink at the one, and its second
    at the other."""

    def __init__(self, rack: Hosts) -> None:
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
    """A network of each host, 192.0.2.0/24, 192.0.3.0/24, ... by the numbers of the hosts, and a
    router between them. A host reaches it over its device eth1."""

    def __init__(self, rack: Hosts, first: int = 0) -> None:
        self.namespace = rack.namespace()
        self.namespace.run("sh", "-c", "echo 1 > /proc/sys/net/ipv4/ip_forward")
        for number, host in enumerate(rack.hosts, first):
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
