"""A lab with a switch of many ports, each with a wire to one far namespace."""

import json
import subprocess
import tempfile
import time
from contextlib import contextmanager
from pathlib import Path
from typing import Any, Dict, Iterable, Iterator, List

from frame_lab import Lab
from simhost._namespaces import Namespace

SWITCH = "rack"
_FIRST_INDEX, _FIRST_FAR_INDEX = 10_000, 30_000
_PATIENCE = 300.0


def _batch(namespace: Namespace, *lines: str) -> None:
    words = [*namespace.words(), "ip", "-batch", "-"]
    subprocess.run(words, input="\n".join(lines), text=True, check=True)


def lay_wires(near: Namespace, far: Namespace, wires: Iterable[int]) -> None:
    """Devices n0, n1, ... and their far ends f0, f1, ..., of these numbers."""
    numbers = list(wires)
    lines = [
        f"link add n{number} index {_FIRST_INDEX + number} up type veth"
        f" peer name f{number} index {_FIRST_FAR_INDEX + number} netns {far.pid}"
        for number in numbers
    ]
    _batch(near, *lines)
    _batch(far, *(f"link set f{number} up" for number in numbers))


class ManyPorts:
    """The lab, the devices n0, n1, ... and their far ends f0, f1, ..., and a document of a switch
    that has a port of one VLAN at each."""

    def __init__(self, lab: Lab, ports: int) -> None:
        self.lab = lab
        self.far = lab.frames.new_namespace()
        lay_wires(lab.host, self.far, range(ports))
        self.document: Dict[str, Any] = {
            "switches": [
                {
                    "alias": SWITCH,
                    "max_ports": max(ports, 8),
                    "ports": [
                        {"id": f"port-{number}", "vlan": 7, "device": f"n{number}"}
                        for number in range(ports)
                    ],
                }
            ]
        }

    def apply(self) -> float:
        """Makes the switch; seconds until all of it is in force."""
        started = time.perf_counter()
        self.lab.apply(self.document)
        self.wait()
        return time.perf_counter() - started

    def wait(self) -> None:
        """Returns when nothing is pending."""
        deadline = time.monotonic() + _PATIENCE
        while True:
            plane = self.lab.plane()
            if plane["change"] == plane["in_force"]:
                return
            if time.monotonic() > deadline:
                raise SystemExit(f"not in force: {plane}\n{self.lab.log()}")

    def received(self) -> List[int]:
        """How many frames came to each far end."""
        devices: List[Dict[str, Any]] = json.loads(self.far.run("ip", "-s", "-json", "link"))
        counts = {one["ifname"]: int(one["stats64"]["rx"]["packets"]) for one in devices}
        return [counts[f"f{number}"] for number in range(len(counts) - 1)]


@contextmanager
def many_ports(ports: int) -> Iterator[ManyPorts]:
    """Without a daemon yet."""
    with tempfile.TemporaryDirectory() as folder, Lab(Path(folder), {"switches": []}) as lab:
        yield ManyPorts(lab, ports)
