#!/usr/bin/env python3
"""How fast the simulated host is, in memory and on a file, and how that grows with its ports.

usage: host_curve.py [--quick] BUILD_FOLDER

Makes calls through the module, on switches of 10 to 10,000 ports with ten learned addresses each.
Prints calls per second, and microseconds per call for each number of ports, the best of some
rounds; leaves host.json and host_curve.svg in bench/ of the build folder.
"""

import argparse
import ctypes
import json
import os
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Callable, Dict, List

from host_report import Curves, picture, tables, verdicts

SIZES = [10, 100, 1_000, 10_000]
PLACES = ("memory", "a file")
ADDRESSES = 10


class Effort:
    """How long to measure."""

    def __init__(self, quick: bool) -> None:
        self.rounds = 2 if quick else 5
        self.seconds = 0.02 if quick else 0.2


def best(call: Callable[[int], object], effort: Effort) -> float:
    """Microseconds per call, in the best round."""
    calls, index = 1, 0
    rounds: List[float] = []
    while len(rounds) < effort.rounds:
        start = time.perf_counter()
        for index in range(index + 1, index + 1 + calls):
            call(index)
        elapsed = time.perf_counter() - start
        if elapsed < effort.seconds / 2:
            calls *= 2
        else:
            rounds.append(elapsed / calls * 1e6)
    return min(rounds)


def mac(number: int) -> str:
    return "02:00:" + ":".join(f"{byte:02x}" for byte in number.to_bytes(4, "big"))


def populate(simhost: Any, ports: int) -> None:
    """A switch with two uplinks, and so many ports with addresses that they learned."""
    learning = {"learning": True, "limit": 4096}
    document: Dict[str, Any] = {
        "clock": {"stopped": True},
        "switches": [
            {
                "alias": "curve",
                "max_ports": ports,
                "uplinks": ["nic0", "nic1"],
                "mac_learning": {"limit": 1_000_000},
                "ports": [
                    {
                        "id": f"port-{port}",
                        "mac_learning": learning,
                        "addresses": [
                            {"mac": mac(port * ADDRESSES + number), "ages": True}
                            for number in range(ADDRESSES)
                        ],
                    }
                    for port in range(ports)
                ],
            }
        ],
    }
    simhost.simhost_error.restype = ctypes.c_char_p
    if simhost.simhost_apply(json.dumps(document).encode()) != 0:
        raise SystemExit(simhost.simhost_error().decode())


def measure(build: Path, ports: int, effort: Effort) -> Dict[str, float]:
    """All figures on a switch with so many ports; the host is the one that SIMHOST_STATE names."""
    import _libvswitch as vs

    simhost = ctypes.CDLL(str(build / "simhost" / "libsimhost.so"))
    populate(simhost, ports)
    names = [f"port-{index * 7919 % ports}" for index in range(1_000)]
    numbers = [vs.VSDVS_DvPortIDToPortID("curve", name)[1] for name in names]
    security, info, uplink = vs.new_VSPropSecurity(), vs.new_VSInfo(), vs.new_qex_Name()

    def table(index: int) -> None:
        kind = vs.VS_MAC_ADDR_TYPE_LEARNED
        status, found = vs.VSQEX_GetPortMACTable("curve", names[index % 1_000], kind)
        vs.VSQEX_FreeMemory(found)

    def learn(index: int) -> None:
        # Of a port there is at last an address more; its next frame makes it young.
        sender = mac(0x80000000 + index % 4_000).encode()
        simhost.simhost_learn(b"curve", names[index % 1_000].encode(), sender, 0, 0)

    figures: Dict[str, Callable[[int], object]] = {
        "look up a port": lambda i: vs.VSDVS_DvPortIDToPortID("curve", names[i % 1_000]),
        "read a port's policy": lambda i: vs.VSDVS_GetPortSecurity(
            "curve", names[i % 1_000], security
        ),
        "set a port's policy": lambda i: vs.VSDVS_SetPortSecurity(
            "curve", names[i % 1_000], security
        ),
        "set the MTU": lambda i: vs.VSDVS_SetMTU("curve", 1500 + i % 2),
        "query the switch": lambda i: vs.VSQEX_GetVSInfo("curve", info),
        "ask for a port's uplink": lambda i: vs.VSQEX_PortGetTeamUplinkHint(
            numbers[i % 1_000], uplink
        ),
        "read a port's MAC table": table,
        "learn an address": learn,
        "change a link": lambda i: simhost.simhost_set_link(b"nic0", i % 2),
    }
    measured = {name: best(call, effort) for name, call in figures.items()}
    vs.delete_VSPropSecurity(security)
    vs.delete_VSInfo(info)
    vs.delete_qex_Name(uplink)
    return measured


def measured_apart(build: Path, place: str, ports: int, quick: bool) -> Dict[str, float]:
    """The figures, from a process and a host of their own."""
    with tempfile.TemporaryDirectory() as folder:
        clean = {name: value for name, value in os.environ.items() if name[:8] != "SIMHOST_"}
        clean["PYTHONPATH"] = str(build / "python")
        if place == "a file":
            clean["SIMHOST_STATE"] = str(Path(folder) / "host.db")
        options = ["--quick"] if quick else []
        lines = subprocess.run(
            [sys.executable, __file__, *options, "--ports", str(ports), str(build)],
            env=clean,
            check=True,
            stdout=subprocess.PIPE,
            text=True,
        ).stdout.splitlines()
    figures: Dict[str, float] = json.loads(lines[0])
    return figures


def main() -> None:
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter
    )
    parser.add_argument("build", type=Path, metavar="BUILD_FOLDER")
    parser.add_argument("--quick", action="store_true", help="seconds, and rough figures")
    parser.add_argument("--ports", type=int, help=argparse.SUPPRESS)
    given = parser.parse_args()
    build = given.build.resolve()
    if given.ports:
        print(json.dumps(measure(build, given.ports, Effort(given.quick))))
        return
    curves: Curves = {}
    for place in PLACES:
        for size in SIZES:
            for name, value in measured_apart(build, place, size, given.quick).items():
                curves.setdefault(place, {}).setdefault(name, {})[size] = value
    print("\n".join([*tables(curves), "", *verdicts(curves)]))
    folder = build / "bench"
    folder.mkdir(exist_ok=True)
    (folder / "host.json").write_text(json.dumps(curves, indent=2) + "\n", encoding="utf-8")
    (folder / "host_curve.svg").write_text(picture(curves), encoding="utf-8")
    print(f"\n{folder / 'host.json'}\n{folder / 'host_curve.svg'}")


if __name__ == "__main__":
    main()
