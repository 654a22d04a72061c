#!/usr/bin/env python3
"""How fast the simulated host answers, in memory and on a file, and how that grows with its ports.

usage: host_curve.py [PORTS...]   (10 100 1000 10000 unless given)

Prints microseconds per call through the module, the best of five rounds of 2,000 calls. Run it with
build/python in PYTHONPATH.
"""

import json
import os
import subprocess
import sys
import tempfile
import time
from typing import Callable, Dict, List

ROUNDS = 5
CALLS = 2_000


def best(call: Callable[[int], object]) -> float:
    """Microseconds per call, in the best round."""
    rounds: List[float] = []
    for _ in range(ROUNDS):
        start = time.perf_counter()
        for index in range(CALLS):
            call(index)
        rounds.append((time.perf_counter() - start) / CALLS * 1e6)
    return min(rounds)


def measure(ports: int) -> Dict[str, float]:
    """A switch with so many ports; the host is the one that SIMHOST_STATE names."""
    import _libvswitch as vs

    assert vs.VSDVS_CreateVSwitch("curve", None, None, max(ports, 1), 1, 0, 0, 0) == vs.QEX_OK
    for index in range(ports):
        assert vs.VSDVS_AddDVPort("curve", f"port-{index}", index) == vs.QEX_OK
    names = [f"port-{index * 7919 % ports}" for index in range(CALLS)]
    security = vs.new_VSPropSecurity()
    info = vs.new_VSInfo()
    return {
        "look up a port": best(lambda i: vs.VSDVS_DvPortIDToPortID("curve", names[i])),
        "read a port's policy": best(
            lambda i: vs.VSDVS_GetPortSecurity("curve", names[i], security)
        ),
        "set a port's policy": best(
            lambda i: vs.VSDVS_SetPortSecurity("curve", names[i], security)
        ),
        "set the MTU": best(lambda i: vs.VSDVS_SetMTU("curve", 1500 + i % 2)),
        "query the switch": best(lambda i: vs.VSQEX_GetVSInfo("curve", info)),
    }


def main() -> None:
    if sys.argv[1:2] == ["--one"]:
        print(json.dumps(measure(int(sys.argv[2]))))
        return
    sizes = [int(text) for text in sys.argv[1:]] or [10, 100, 1_000, 10_000]
    for where in ("memory", "file"):
        columns: List[Dict[str, float]] = []
        for size in sizes:
            with tempfile.TemporaryDirectory() as folder:
                clean = {n: v for n, v in os.environ.items() if not n.startswith("SIMHOST_")}
                if where == "file":
                    clean["SIMHOST_STATE"] = os.path.join(folder, "host.db")
                lines = subprocess.run(
                    [sys.executable, __file__, "--one", str(size)],
                    env=clean,
                    check=True,
                    stdout=subprocess.PIPE,
                    text=True,
                ).stdout.splitlines()
            columns.append(json.loads(lines[-1]))
        print(f"\nin {where}, us per call{'':<6}" + "".join(f"{size:>9} ports" for size in sizes))
        for name in columns[0]:
            print(f"{name:<28}" + "".join(f"{column[name]:>15.1f}" for column in columns))


if __name__ == "__main__":
    main()
