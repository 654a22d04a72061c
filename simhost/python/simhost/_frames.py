"""Real frames: clients at ports of a shared host and in networks beyond its uplinks."""

import itertools
import json
import subprocess
import time
from pathlib import Path
from typing import Any, Dict, List, Optional, Sequence

from simhost._daemon import Daemon
from simhost._host import SharedHost
from simhost._namespaces import PATIENCE, Namespace, own_user_needed, require_tools
from simhost._wires import PacketSocket, Wanted

_DEVICE = "eth0"


class Client:
    """A machine with one device, eth0, in a network namespace of its own."""

    def __init__(self, namespace: Namespace, address: str) -> None:
        self.namespace = namespace
        self.address = address
        """Of IPv4."""
        self.set_up()

    def set_up(self) -> None:
        """Makes its device ready, which may be another one than before."""
        run = self.namespace.run
        run("ip", "address", "add", f"{self.address}/24", "dev", _DEVICE)
        # No device is there to put in the checksums that the kernel leaves out.
        run("ethtool", "--offload", _DEVICE, "tx", "off")
        self._socket = PacketSocket(self.namespace, _DEVICE)

    @property
    def mac(self) -> str:
        """The address of its device."""
        (device,) = json.loads(self.namespace.run("ip", "-json", "link", "show", _DEVICE))
        return str(device["address"])

    def send(self, frame: bytes) -> None:
        """Sends a frame as it is.

        >>> hello = simhost.frame("ff:ff:ff:ff:ff:ff", one.mac, payload=b"hello" * 10)
        >>> one.send(hello)
        """
        self._socket.send(frame)

    def expect(self, wanted: Wanted, timeout: float = PATIENCE) -> bytes:
        """Waits for a frame, or for one of which a function is true, takes it and returns it.

        Frames that nobody takes wait for the next question.

        >>> other.expect(lambda frame: frame.endswith(b"hello")) == hello
        True
        """
        __tracebackhide__ = True
        found = self._socket.find(wanted, timeout)
        if found is None:
            raise AssertionError(
                f"{_in_words(wanted)} did not come within {timeout} s{self._what_came()}"
            )
        return found

    def expect_none(self, wanted: Wanted = lambda frame: True, timeout: float = 0.2) -> None:
        """Waits for as long, and fails if such a frame comes.

        >>> other.expect_none()
        """
        __tracebackhide__ = True
        found = self._socket.find(wanted, timeout)
        if found is not None:
            raise AssertionError(f"a frame came: {found.hex()}")

    def run(self, *words: str) -> "subprocess.CompletedProcess[str]":
        """Runs a command on this machine to its end, well or not.

        >>> one.run("ping", "-c", "1", "-W", "1", other.address).returncode
        0
        """
        return self.namespace.try_run(*words)

    def start(self, *words: str, **options: Any) -> "subprocess.Popen[str]":
        """Starts a command on this machine, with options of subprocess.Popen."""
        return self.namespace.start(*words, **options)

    def reaches(self, other: "Client") -> bool:
        """Whether a ping is replied to.

        >>> one.reaches(other)
        True
        """
        return self.run("ping", "-c", "1", "-W", "0.3", other.address).returncode == 0

    def comes_to_reach(self, other: "Client", timeout: float = PATIENCE) -> bool:
        """Likewise, at some time."""
        deadline = time.monotonic() + timeout
        while time.monotonic() < deadline:
            if self.reaches(other):
                return True
        return False

    def ceases_to_reach(self, other: "Client", timeout: float = PATIENCE) -> bool:
        """At some time no ping is replied to any more.

        What the host changes is in force when its call returns; what happens around it, such as a
        cable that is pulled, has to be noticed first.
        """
        deadline = time.monotonic() + timeout
        while self.reaches(other):
            if time.monotonic() > deadline:
                return False
        return not self.reaches(other)

    def close(self) -> None:
        """Leaves its device; the machine goes with its namespace."""
        self._socket.close()

    def _what_came(self) -> str:
        came = self._socket.waiting()
        if not came:
            return ", nor did anything else"
        return "; what came:" + "".join(f"\n    {frame.hex()}" for frame in came)


def _in_words(wanted: Wanted) -> str:
    return f"the frame {wanted.hex()}" if isinstance(wanted, bytes) else "such a frame"


class Wire:
    """From a device of the host to one in a namespace."""

    def __init__(self, near: str, far: Namespace, name: str) -> None:
        self.near = near
        self._far = far
        self.name = name

    def pull(self) -> None:
        """Takes the link from both ends."""
        self._far.run("ip", "link", "set", self.name, "down")

    def plug(self) -> None:
        """Links them again."""
        self._far.run("ip", "link", "set", self.name, "up")


class Cabling:
    """The wires of a host; each has a device of its own there."""

    # A pair whose ends have one index tells late that the link is lost; a namespace may be at the
    # ends of several hosts' wires.
    _indexes = itertools.count(1000)

    def __init__(self, namespace: Namespace) -> None:
        self.namespace = namespace
        self._clients = itertools.count(1)
        self._uplinks = itertools.count()

    def to_client(self, far: Namespace) -> Wire:
        return self.lay(f"c{next(self._clients)}", far, _DEVICE)

    def to_network(self, far: Namespace, name: str) -> Wire:
        return self.lay(f"u{next(self._uplinks)}", far, name)

    def lay(self, near: str, far: Namespace, name: str) -> Wire:
        """A wire with these devices at its ends, both switched on."""
        self.connect(self.namespace, near, far, name)
        return Wire(near, far, name)

    def connect(self, one: Namespace, name: str, other: Namespace, other_name: str) -> None:
        """A pair of devices in two namespaces, both switched on."""
        index, other_index = str(next(self._indexes)), str(next(self._indexes))
        one.run(
            *("ip", "link", "add", name, "index", index, "type", "veth"),
            *("peer", "name", other_name, "index", other_index, "netns", str(other.pid)),
        )
        one.run("ip", "link", "set", name, "up")
        other.run("ip", "link", "set", other_name, "up")


class Network:
    """What is beyond uplinks: a bridge that they all lead to, and clients at it."""

    def __init__(self, frames: "Frames", namespace: Namespace, uplinks: Sequence[str]) -> None:
        self._frames = frames
        self._namespace = namespace
        self._clients = itertools.count(1)
        self._bridge = ["master", "bridge"]
        # Nothing is held back, neither at first nor because nobody asked for it.
        quick = ["forward_delay", "0", "mcast_snooping", "0"]
        namespace.run("ip", "link", "add", "bridge", "type", "bridge", *quick)
        namespace.run("ip", "link", "set", "bridge", "up")
        self._wires = {uplink: self._wire(f"w{n}") for n, uplink in enumerate(uplinks)}

    def _wire(self, name: str) -> Wire:
        wire = self._frames.cabling.to_network(self._namespace, name)
        self._namespace.run("ip", "link", "set", name, *self._bridge)
        return wire

    def devices(self) -> Dict[str, str]:
        """Of the uplinks, at the host."""
        return {uplink: wire.near for uplink, wire in self._wires.items()}

    def client(self) -> Client:
        """A machine in this network."""
        far, name = self._frames.new_namespace(), f"c{next(self._clients)}"
        self._frames.cabling.connect(self._namespace, name, far, _DEVICE)
        self._namespace.run("ip", "link", "set", name, *self._bridge)
        return self._frames.new_client(far)

    def came_over(self, mac: str) -> str:
        """The uplink over which the last frame from an address came; empty if none did."""
        said = self._namespace.run("bridge", "-json", "fdb", "show", "br", "bridge")
        wires = [entry["ifname"] for entry in json.loads(said) if entry["mac"] == mac]
        return "".join(name for name, wire in self._wires.items() if wire.name in wires)

    def pull(self, uplink: str) -> None:
        """Pulls the cable of an uplink.

        >>> network.pull("nic0")
        """
        self._wires[uplink].pull()

    def plug(self, uplink: str) -> None:
        """Plugs it in.

        >>> network.plug("nic0")
        """
        self._wires[uplink].plug()


class Frames:
    """What is around a host whose frames are real; gone when it is closed."""

    def __init__(self, host: SharedHost, cabling: Cabling, own_user: bool) -> None:
        self.host = host
        self.cabling = cabling
        self._own_user = own_user
        self._namespaces: List[Namespace] = []
        self._clients: List[Client] = []

    def client(self, switch: str, port: str, *, mac: Optional[str] = None) -> Client:
        """A machine at a port, which has the address `mac` or one of its own.

        >>> one, other = frames.client("lab", "a"), frames.client("lab", "b")
        """
        far = self.new_namespace()
        wire = self.cabling.to_client(far)
        device = {"name": wire.near}
        if mac is not None:
            far.run("ip", "link", "set", _DEVICE, "address", mac)
            device["mac"] = mac
        client = self.new_client(far)
        ports = [{"id": port, "device": device}]
        self.host.apply({"switches": [{"alias": switch, "ports": ports}]})
        return client

    def network(self, *uplinks: str) -> Network:
        """A network that these uplinks lead to.

        >>> network = frames.network("nic0", "nic1")
        >>> far = network.client()
        >>> one.send(hello)
        >>> far.expect(lambda frame: frame.endswith(b"hello"))[12:16].hex()
        '81000007'
        """
        network = Network(self, self.new_namespace(), uplinks)
        devices = network.devices().items()
        self.host.apply({"uplinks": [{"name": name, "device": device} for name, device in devices]})
        return network

    def new_namespace(self) -> Namespace:
        """One that goes with this."""
        outer = self.cabling.namespace if self._own_user else None
        self._namespaces.append(Namespace(outer))
        return self._namespaces[-1]

    def new_client(self, namespace: Namespace) -> Client:
        client = Client(namespace, f"10.9.0.{len(self._clients) + 1}")
        self._clients.append(client)
        return client

    def close(self) -> None:
        for client in self._clients:
            client.close()
        for namespace in reversed(self._namespaces):
            namespace.close()


class FramesHost:
    """What tests share: a daemon with an Open vSwitch in a namespace, and the state of one host."""

    def __init__(self, folder: Path) -> None:
        require_tools()
        self.state = folder / "host.db"
        self._own_user = own_user_needed()
        self._cabling = Cabling(Namespace(own_user=self._own_user))
        try:
            where = f"private:{folder}/openvswitch"
            log = folder / "simhostd.log"
            self._daemon = Daemon(self._cabling.namespace, self.state, where, log)
        except BaseException:
            self._cabling.namespace.close()
            raise

    def frames(self, host: SharedHost) -> Frames:
        return Frames(host, self._cabling, self._own_user)

    def close(self) -> None:
        self._daemon.stop()
        self._cabling.namespace.close()
