"""A lab that runs: hosts, networks, routers and clients as network namespaces, and their wires."""

import itertools
import json
from pathlib import Path
from typing import Any, Callable, Dict, List, Mapping, Optional

from simhost._control import HostRefused
from simhost._daemon import Daemon
from simhost._frames import Cabling
from simhost._host import SharedHost
from simhost._lab_document import ClientSpec, HostSpec, LabError, LabSpec, NetworkSpec, RouterSpec
from simhost._loaded import NotSimulated
from simhost._namespaces import CommandFailed, Namespace, NoFrames, own_user_needed, require_tools

Say = Callable[[str], None]
# Nothing is held back, neither at first nor because nobody asked for it.
_BRIDGE = ["type", "bridge", "forward_delay", "0", "mcast_snooping", "0"]
_DEVICE = "eth0"


class _Host:
    """A host with its state; what it is wired to comes before its daemon."""

    def __init__(self, spec: HostSpec, namespace: Namespace, folder: Path) -> None:
        self.name = spec.name
        self.cabling = Cabling(namespace)
        self.folder = folder
        folder.mkdir()
        try:
            self._shared = SharedHost(folder / "host.db", spec.document, folder)
        except HostRefused as refusal:
            raise LabError(f"the host {spec.name}: {refusal}") from None
        self._daemon: Optional[Daemon] = None

    def apply(self, document: Mapping[str, Any]) -> None:
        try:
            self._shared.apply(document)
        except HostRefused as refusal:
            raise LabError(f"the host {self.name}: {refusal}") from None

    def start(self) -> None:
        where = f"private:{self.folder / 'openvswitch'}"
        log = self.folder / "simhostd.log"
        self._daemon = Daemon(self.cabling.namespace, self.folder / "host.db", where, log)

    def stop(self) -> None:
        if self._daemon is not None:
            self._daemon.stop()


class RunningLab:
    """Everything of a lab, which lives as long as this process."""

    def __init__(self, spec: LabSpec, folder: Path, say: Say) -> None:
        self._spec = spec
        self._folder = folder
        self._say = say
        self._machines: Dict[str, Namespace] = {}
        self._hosts: Dict[str, _Host] = {}
        self._names = itertools.count()
        self._outer: Optional[Namespace] = None

    def up(self) -> None:
        """Raises LabError."""
        try:
            require_tools()
            for host in self._spec.hosts:
                self._hosts[host.name] = _Host(
                    host, self._machine(host.name), self._folder / host.name
                )
            for network in self._spec.networks:
                self._lay_network(network)
            self._join_networks()
            for router in self._spec.routers:
                self._lay_router(router)
            for name, running in self._hosts.items():
                running.start()
                self._say(f"host {name}: simhostd is ready")
            for client in self._spec.clients:
                self._lay_client(client)
        except (NoFrames, NotSimulated, CommandFailed) as error:
            raise LabError(str(error)) from None
        self._write()

    def down(self) -> None:
        for host in self._hosts.values():
            host.stop()
        for machine in reversed(list(self._machines.values())):
            machine.close()

    def _machine(self, name: str) -> Namespace:
        """Where no privileges are, the first one has a user of its own, and the others its."""
        made = Namespace(self._outer, own_user=self._outer is None and own_user_needed())
        if own_user_needed() and self._outer is None:
            self._outer = made
        self._machines[name] = made
        return made

    def _lay_network(self, spec: NetworkSpec) -> None:
        machine = self._machine(spec.name)
        machine.run("ip", "link", "add", "bridge", *_BRIDGE)
        machine.run("ip", "link", "set", "bridge", "up")
        for end in spec.uplinks:
            host = self._hosts[end.host]
            wire = host.cabling.to_network(machine, self._at_bridge())
            machine.run("ip", "link", "set", wire.name, "master", "bridge")
            host.apply({"uplinks": [{"name": end.uplink, "device": wire.near}]})
        ends = ", ".join([*map(str, spec.uplinks), *spec.joins])
        self._say(f"network {spec.name}: {ends or 'nothing yet'}")

    def _join_networks(self) -> None:
        """Between any two there is one way at most, or frames would go round for ever."""
        whole = {network.name: {network.name} for network in self._spec.networks}
        for network in self._spec.networks:
            for other in network.joins:
                if other in whole[network.name]:
                    continue
                ends = (self._machines[network.name], self._at_bridge())
                other_ends = (self._machines[other], self._at_bridge())
                Cabling(ends[0]).connect(*ends, *other_ends)
                for machine, name in (ends, other_ends):
                    machine.run("ip", "link", "set", name, "master", "bridge")
                both = whole[network.name] | whole[other]
                whole.update({name: both for name in both})

    def _at_bridge(self) -> str:
        return f"w{next(self._names)}"

    def _lay_router(self, spec: RouterSpec) -> None:
        machine = self._machine(spec.name)
        machine.run("sh", "-c", "echo 1 > /proc/sys/net/ipv4/ip_forward")
        for link in spec.links:
            name = f"r{next(self._names)}"
            self._hosts[link.host].cabling.lay(link.device, machine, name)
            machine.run("ip", "address", "add", link.address, "dev", name)
        self._say(f"router {spec.name}: {', '.join(map(str, spec.links)) or 'nothing'}")

    def _lay_client(self, spec: ClientSpec) -> None:
        machine = self._machine(spec.name)
        if spec.network:
            name, network = self._at_bridge(), self._machines[spec.network]
            Cabling(network).connect(network, name, machine, _DEVICE)
            network.run("ip", "link", "set", name, "master", "bridge")
        else:
            near = self._hosts[spec.host].cabling.to_client(machine).near
        if spec.mac:
            machine.run("ip", "link", "set", _DEVICE, "address", spec.mac)
        machine.run("ip", "address", "add", spec.address, "dev", _DEVICE)
        # No device is there to put in the checksums that the kernel leaves out.
        machine.run("ethtool", "--offload", _DEVICE, "tx", "off")
        if not spec.network:
            device = {"name": near, **({"mac": spec.mac} if spec.mac else {})}
            ports = [{"id": spec.port, "device": device}]
            self._hosts[spec.host].apply({"switches": [{"alias": spec.switch, "ports": ports}]})
        self._say(f"client {spec.name}: {spec.address} at {spec.place}")

    def _write(self) -> None:
        """For those who look for its machines."""
        kinds = {one.name: "network" for one in self._spec.networks}
        kinds.update({one.name: "router" for one in self._spec.routers})
        kinds.update({one.name: "client" for one in self._spec.clients})
        machines: List[Dict[str, Any]] = []
        for name, machine in self._machines.items():
            said = {"name": name, "kind": kinds.get(name, "host"), "words": machine.words()}
            if name in self._hosts:
                said["state"] = str(self._folder / name / "host.db")
            machines.append(said)
        whole = json.dumps({"machines": machines}, indent=1)
        (self._folder / "lab.json").write_text(whole, encoding="utf-8")
