#!/usr/bin/env python3
"""What checked calls cost beside the class module and the checks that a careful tool writes itself.

    checked.py [--quick]

Both ask the simulated host in the memory of this process, in rounds that take turns; of each the
fastest counts. A ratio above the target, and what noise may add to it, is a failure.
"""

import os
import sys
from time import thread_time_ns
from typing import Callable, Dict, List, Tuple

for _variable in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
    os.environ.pop(_variable, None)

import libvswitch as vs  # noqa: E402  (after the environment is clean)
from libvswitch import checked  # noqa: E402
from targets import NOISE  # noqa: E402

TARGET = 1.5
SWITCH, ID = "vswitch0", "5f0c7a1e-27c4-4b61-9d0e-6a5b8f3d2c10"

Ask = Callable[[], object]


class Refused(Exception):
    """A call did not succeed."""


def check(status: int) -> None:
    if status != vs.QEX_OK:
        raise Refused(vs.QEX_ReturnStatusToString(status))


def set_a_number() -> None:
    check(vs.VSDVS_SetMTU(SWITCH, 9000))


def get_a_number() -> int:
    mtu = vs.Cell("qex_uint32")
    check(vs.VSDVS_GetMTU(SWITCH, mtu.pointer))
    return int(mtu.value)


def get_an_output() -> int:
    status, mode = vs.VSDVS_GetMcastFilterMode(SWITCH)
    check(status)
    return mode


def get_a_record() -> vs.VSInfo:
    info = vs.VSInfo()
    check(vs.VSQEX_GetVSInfo(SWITCH, info))
    return info


def get_a_list() -> List[Tuple[str, int]]:
    with vs.owned(vs.VSQEX_GetUplinks(SWITCH)) as (status, uplinks):
        check(status)
        return [(one.name.string, one.portID) for one in uplinks.entries]


def get_bytes() -> bytes:
    data, length = vs.Cell("void *"), vs.Cell("int")
    check(vs.DVSQEX_GlobalPropGet(ID, vs.VSPROP_MTU, data.pointer, length.pointer))
    with vs.owned(data):
        return data.read(length.value)


def get_a_walk() -> List[str]:
    found: List[str] = []
    handle = vs.DVSState_SwitchFindByAlias(SWITCH)
    vs.DVSState_PortForEach(handle, lambda port, _: found.append(vs.DVS_PortId(port) or ""), None)
    return found


def walk_checked() -> List[str]:
    handle = checked.DVSState_SwitchFindByAlias(SWITCH)
    assert handle is not None
    return [checked.DVS_PortId(port) for port in checked.DVSState_PortForEach(handle)]


ROWS: Dict[str, Tuple[Ask, Ask]] = {
    "set a number": (set_a_number, lambda: checked.VSDVS_SetMTU(SWITCH, 9000)),
    "get a number": (get_a_number, lambda: checked.VSDVS_GetMTU(SWITCH)),
    "get an output": (get_an_output, lambda: checked.VSDVS_GetMcastFilterMode(SWITCH)),
    "get a record": (get_a_record, lambda: checked.VSQEX_GetVSInfo(SWITCH)),
    "get a list": (get_a_list, lambda: checked.VSQEX_GetUplinks(SWITCH)),
    "get bytes": (get_bytes, lambda: checked.DVSQEX_GlobalPropGet(ID, vs.VSPROP_MTU)),
    "walk": (get_a_walk, walk_checked),
}


def measure(asks: Tuple[Ask, Ask], rounds: int, loops: int) -> List[float]:
    """Microseconds of one call, of each."""
    best = [float("inf")] * len(asks)
    for _ in range(rounds):
        for at, ask in enumerate(asks):
            started = thread_time_ns()
            for _ in range(loops):
                ask()
            best[at] = min(best[at], (thread_time_ns() - started) / loops / 1e3)
    return best


def main() -> int:
    rounds, loops = (3, 200) if "--quick" in sys.argv[1:] else (15, 2_000)
    print(f"{'microseconds of a call':24}{'by hand':>10}{'checked':>10}{'ratio':>8}")
    missed = []
    for name, asks in ROWS.items():
        by_hand, ours = measure(asks, rounds, loops)
        print(f"{name:24}{by_hand:>10.2f}{ours:>10.2f}{ours / by_hand:>8.2f}")
        if ours / by_hand > TARGET * (1 + NOISE):
            missed.append(name)
    print(f"the target is {TARGET}; missed by: {', '.join(missed) or 'none'}")
    return 1 if missed and "--quick" not in sys.argv[1:] else 0


if __name__ == "__main__":
    sys.exit(main())
