"""What a group of uplinks leads to: another Open vSwitch, in a namespace of its own, which has the
other ends of their wires as a bond, and a client."""

import json
from pathlib import Path
from typing import Dict

from frame_lab import Lab
from lasting_open_vswitch import LastingOpenVSwitch
from simhost import Client
from simhost._frames import Wire

_BOND = "bond"


class Partner:
    """Its wires are at the devices u0, u1, ... of the host. A wire is in the bond, or nothing is at
    its end although it has a link."""

    def __init__(
        self, lab: Lab, folder: Path, *uplinks: str, clock_may_stand: bool = False
    ) -> None:
        self._namespace = lab.frames.new_namespace()
        self._folder = folder
        self.open_vswitch = LastingOpenVSwitch(self._namespace, folder, clock_may_stand)
        self._wires: Dict[str, Wire] = {}
        for number, uplink in enumerate(uplinks):
            wire = lab.frames.cabling.to_network(self._namespace, f"w{number}")
            self._wires[uplink] = wire
        far = lab.frames.new_namespace()
        lab.frames.cabling.connect(self._namespace, "client", far, "eth0")
        self.client: Client = lab.frames.new_client(far)
        devices = [{"name": name, "device": wire.near} for name, wire in self._wires.items()]
        lab.apply({"uplinks": devices})

    def __enter__(self) -> "Partner":
        self.open_vswitch.__enter__()
        self._vsctl("--no-wait", "init")
        self._vsctl("add-br", "far", "--", "set", "bridge", "far", "datapath_type=netdev")
        self._vsctl("add-port", "far", "client")
        return self

    def __exit__(self, *unused: object) -> None:
        self.open_vswitch.__exit__()

    def _vsctl(self, *words: str) -> str:
        return self._namespace.run("ovs-vsctl", f"--db=unix:{self._folder}/db.sock", *words)

    def bond(self, *uplinks: str, rate: str = "fast", lacp: str = "active") -> None:
        """From now on it has these, and no others."""
        wires = [self._wires[uplink].name for uplink in uplinks]
        # A bond of one is a port, which the tool makes with another word.
        add = ["add-bond"] if len(wires) > 1 else ["add-port"]
        name = [_BOND] if len(wires) > 1 else []
        port = _BOND if len(wires) > 1 else wires[0]
        settings = [f"lacp={lacp}", f"other_config:lacp-time={rate}", "bond_mode=balance-tcp"]
        self.leave()
        self._vsctl(*add, "far", *name, *wires, "--", "set", "port", port, *settings)

    def leave(self) -> None:
        """It has none of them any more."""
        for port in self._vsctl("list-ports", "far").split():
            if port != "client":
                self._vsctl("del-port", "far", port)

    def received(self) -> Dict[str, int]:
        """How many bytes came over each wire, of whatever frames."""
        said = json.loads(self._namespace.run("ip", "-json", "-stats", "link", "show"))
        counts = {device["ifname"]: int(device["stats64"]["rx"]["bytes"]) for device in said}
        return {uplink: counts[wire.name] for uplink, wire in self._wires.items()}

    def rate_wanted(self) -> str:
        """How often the other side of a bond wants to hear of this one."""
        said = self.open_vswitch.ask("lacp/show")
        states = [line for line in said.splitlines() if "partner state:" in line]
        return "fast" if states and all("timeout" in line for line in states) else "slow"
