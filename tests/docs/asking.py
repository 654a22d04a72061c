"""What the default host has, and what it takes to ask it: arguments, and the status alone."""

from typing import Any, Callable, List

import libvswitch as vs
from simhost import Host

SWITCH = "vswitch0"
ID = "5f0c7a1e-27c4-4b61-9d0e-6a5b8f3d2c10"
PORT = "web-1"
KEY = "com.example.key"
# The number of no port.
UNKNOWN = 4711

# Asks the host for one call, and returns that call's status.
Act = Callable[[Host], int]


def made(record: Any, **fields: Any) -> Any:
    for name, value in fields.items():
        setattr(record, name, value)
    return record


def create(alias: Any = "new", *given: Any) -> int:
    rest: List[Any] = [None, None, 0, 1, 0, 0, 0]
    rest[: len(given)] = given
    return int(vs.VSDVS_CreateVSwitch(alias, *rest))


def number(port: str = PORT, switch: str = SWITCH) -> int:
    return int(vs.VSDVS_DvPortIDToPortID(switch, port)[1])


def uplink_number() -> int:
    with vs.owned(vs.VSQEX_GetUplinks(SWITCH)) as (_, uplinks):
        return int(uplinks.entries[0].portID)


def status_of(call: Callable[..., Any], *arguments: Any) -> int:
    """The status of a call; what it allocates is released."""
    result = call(*arguments)
    if not isinstance(result, tuple):
        return int(result)
    with vs.owned(result) as (status, *_):
        return int(status)


def mirror(sids: List[str], **fields: Any) -> int:
    table = vs.alloc_dvmirror_session_table(len(sids), 0)
    made(table, **{"version": vs.VS_DVMIRROR_VERSION_V3, **fields})
    for at in range(len(sids)):
        table[at].sid = sids[at]
        table[at].type = vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
    status = int(vs.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, table))
    vs.free_dvmirror_session_table(table)
    return status


def fill(host: Host, act: Callable[[str], int]) -> int:
    host.apply({"switches": [{"alias": "full", "max_ports": 1}]})
    assert vs.VSDVS_AddDVPort("full", "one", 0) == vs.QEX_OK
    return act("full")
