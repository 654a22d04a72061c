"""A host whose frames simhostd moves, with a device at each uplink and port: what happens to
another host in place of wires happens on wires to it."""

import contextlib
import json
import sys
import time
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Optional, Set, Tuple

sys.path.append(str(Path(__file__).parents[1] / "simhostd"))

from frame_lab import Lab  # noqa: E402  (after the path is set)
from libvswitch import checked, enums  # noqa: E402
from programs import EXAMPLES  # noqa: E402
from simhost import HostRefused, SimulatedHost, frame  # noqa: E402
from simhost._in_file import InFileControl  # noqa: E402
from simhost._loaded import LoadedControl  # noqa: E402
from simhost._namespaces import Namespace  # noqa: E402
from simhost._wires import PacketSocket  # noqa: E402
from vswitch._meanings import CALLS  # noqa: E402
from vswitch._replayer import PresentHost  # noqa: E402
from vswitch.replay import Visit  # noqa: E402

__all__ = ["PresentWiredHost", "WiredHost", "Wiring", "lab_in"]

UPLINKS = [f"u{number}" for number in range(6)]
PORTS = [f"c{number}" for number in range(8)]

_PATIENCE = 10.0
"""Seconds until the other end of a wire is seen."""
_SOON = 0.1
"""Likewise, until a frame that has arrived is read."""

_DEFAULT_HOST = EXAMPLES.parent / "simhost" / "scenario" / "default_host.json"


def lab_in(folder: Path) -> Lab:
    """Of a host without anything."""
    return Lab(folder, {})


class Wiring:
    """Devices for uplinks and ports, and where their wires lead."""

    def __init__(self, lab: Lab) -> None:
        self.lab = lab
        self.connected = 0
        """How many ports were, all in all."""
        self._far = Namespace(lab.host)
        self._pulled: Set[str] = set()
        for device in [*UPLINKS, *PORTS]:
            lab.wire(device, self._far, _far_end(device))

    def close(self) -> None:
        self._far.close()

    def send(self, device: str, mac: str, vlan: int) -> None:
        """A frame to all comes over the wire of a device."""
        # One that is kept would tell that its device was down meanwhile.
        with contextlib.closing(PacketSocket(self._far, _far_end(device))) as end:
            end.send(frame("ff:ff:ff:ff:ff:ff", mac, vlan=vlan or None))

    def is_read(self) -> bool:
        """Whether Open vSwitch has read every frame; it does what it reads before it is asked the
        next question."""
        sockets = Path(f"/proc/{self.lab.host.pid}/net/packet").read_text(encoding="ascii")
        return all(line.split()[6] == "0" for line in sockets.splitlines()[1:])

    def set_cable(self, device: str, state: str) -> None:
        """The far end of its wire goes up or down."""
        self._far.run("ip", "link", "set", _far_end(device), state)
        (self._pulled.discard if state == "up" else self._pulled.add)(device)

    def plug_all(self) -> None:
        for device in list(self._pulled):
            self.set_cable(device, "up")


def _far_end(device: str) -> str:
    return f"{device}-far"


Place = Tuple[str, Optional[str]]
"""A switch and one of its ports, or none for what is beyond its uplinks."""


class WiredHost(SimulatedHost):
    """The host of this process, whose state a daemon has."""

    def __init__(self, wiring: Wiring, scenario: Optional[Dict[str, Any]] = None) -> None:
        self._wiring = wiring
        default = json.loads(_DEFAULT_HOST.read_text(encoding="utf-8"))
        super().__init__(LoadedControl(), default if scenario is None else scenario, Path())

    def reset(self) -> None:
        InFileControl(self._wiring.lab.state).reset(empty=True)
        assert isinstance(self._scenario, dict)
        scenario = json.loads(json.dumps(self._scenario))
        # Frames go by real time.
        scenario.pop("clock", None)
        seen = list(_taken_out(scenario))
        pulled = [one["name"] for one in scenario.get("uplinks", []) if one.get("link") == "down"]
        self.apply(scenario)
        self._wiring.plug_all()
        self.connect()
        for uplink in pulled:
            self.cable(uplink, "down")
        for (switch, port), said in seen:
            self.learn(switch, said["mac"], port, vlan=said.get("vlan", 0))

    def restart(self) -> None:
        self._wiring.lab.have_counted()
        super().restart()
        self.connect()

    def connect(self) -> None:
        """Each uplink and port that has no device gets one, as long as there are any."""
        said = self.describe()
        taken = {_device_of(one) for one in said["uplinks"]}
        taken |= {_device_of(port) for one in said["switches"] for port in one["ports"]}
        of_uplinks = iter(sorted({*UPLINKS} - taken))
        of_ports = iter(sorted({*PORTS} - taken))
        uplinks = _with_devices(said["uplinks"], "name", of_uplinks)
        if uplinks:
            self.apply({"uplinks": uplinks})
        for one in said["switches"]:
            ports = _with_devices(one["ports"], "id", of_ports)
            if ports:
                self._connect({"alias": one["alias"], "ports": ports})

    def _connect(self, switch: Dict[str, Any]) -> None:
        try:
            self.apply({"switches": [switch]})
            self._wiring.connected += len(switch["ports"])
        except HostRefused as refusal:
            # No frames can be moved as it says: it stays without.
            if "QEX_NOT_SUPPORTED" not in str(refusal):
                raise

    def learn(
        self, switch: str, mac: str, port: Optional[str] = None, *, vlan: int = 0, vni: int = 0
    ) -> None:
        devices = self._devices_of(switch, port)
        if not devices:
            super().learn(switch, mac, port, vlan=vlan, vni=vni)
        for device in devices:
            self._wiring.send(device, mac, vlan)
        self._see(lambda: _knows((switch, port), mac), _SOON)

    def cable(self, uplink: str, state: str) -> None:
        """The other end of an uplink's wire goes up or down."""
        (device,) = [_device_of(one) for one in self._uplinks([uplink])]
        self._wiring.set_cable(str(device), state)
        self._see(lambda: self._link_of(uplink) == state, _PATIENCE)

    def _see(self, is_there: Callable[[], bool], patience: float) -> None:
        deadline = time.monotonic() + patience
        while not is_there() and (time.monotonic() < deadline or not self._wiring.is_read()):
            time.sleep(0.002)

    def _link_of(self, uplink: str) -> str:
        (said,) = self._uplinks([uplink])
        return str(said["observed"]["link"])

    def _uplinks(self, names: List[str]) -> List[Dict[str, Any]]:
        return [one for one in self.describe()["uplinks"] if one["name"] in names]

    def _devices_of(self, switch: str, port: Optional[str]) -> List[str]:
        (said,) = [one for one in self.describe()["switches"] if one["alias"] == switch]
        if port is None:
            holders = self._uplinks(list(said["uplinks"]))
        else:
            holders = [one for one in said["ports"] if one["id"] == port]
        return [device for device in map(_device_of, holders) if device]


class PresentWiredHost(PresentHost):
    """Where what a call makes is wired before the next one."""

    host: Optional[WiredHost] = None

    def make(self, function: str, inputs: Dict[str, Any], visit: Visit) -> Dict[str, Any]:
        end = super().make(function, inputs, visit)
        if self.host is not None and not CALLS[function]["asks"]:
            self.host.connect()
        return end


def _taken_out(scenario: Dict[str, Any]) -> Iterator[Tuple[Place, Dict[str, Any]]]:
    """What is learned, and from where; it comes by frames."""
    for switch in scenario.get("switches", []):
        for port in [None, *switch.get("ports", [])]:
            said = port or switch
            addresses = said.pop("addresses", [])
            learned = [one for one in addresses if one.get("type", "learned") == "learned"]
            said["addresses"] = [one for one in addresses if one not in learned]
            place = switch["alias"], port and port["id"]
            for one in learned:
                # No frame of a client has a tag where its port has no VLAN.
                if port is None or "vlan" not in one:
                    yield place, one


def _device_of(said: Dict[str, Any]) -> Optional[str]:
    device = said.get("device")
    return device["name"] if isinstance(device, dict) else device


def _with_devices(
    holders: List[Dict[str, Any]], name: str, devices: Iterator[str]
) -> List[Dict[str, Any]]:
    without = [one[name] for one in holders if not _device_of(one)]
    return [{name: one, "device": device} for one, device in zip(without, devices)]


def _knows(place: Place, mac: str) -> bool:
    switch, port = place
    learned = enums.MacType.LEARNED
    table = (
        checked.VSQEX_GetTeamMACTable(switch, learned)
        if port is None
        else checked.VSQEX_GetPortMACTable(switch, port, learned)
    )
    return any(str(one.macAddress) == mac for one in table.macEntries)
