"""Link-aggregation groups, which lie after their table in the host's memory."""

from typing import Any, Tuple

import _libvswitch as _flat
import libvswitch as _vs
from libvswitch import _checking, _packed_values, _pointers
from libvswitch.enums import LinkState
from vswitch.told import Lag

_SIZES = _pointers.record_sizes()


def of_switch(alias: str) -> Tuple[Lag, ...]:
    table = _checking.Place("VSLAGTable *")
    status, found = _checking.read_and_release(
        _flat.VSQEX_GetLAGTable,
        (alias, table.pointer),
        lambda: _read(table.pointee),
        _flat.VSQEX_FreeMemory,
        (table.pointer,),
        False,  # whether the outputs are kept
    )
    if status != 0:
        raise _checking.failure("VSQEX_GetLAGTable", status, switchName=alias)
    return found


def _read(table: Any) -> Tuple[Lag, ...]:
    at = int(table) + _SIZES["VSLAGTable"]
    found = []
    for _ in range(_bounded(_flat.VSLAGTable_numLAGs_get(table), _vs.VS_MAX_LAGS)):
        status = _pointers.pointer_object(at, "VSLAGStatus *")
        at += _SIZES["VSLAGStatus"]
        count = _bounded(_flat.VSLAGStatus_numUplinks_get(status), _vs.VS_MAX_UPLINKS_IN_LAG)
        uplinks = _packed_values.texts_at(at, _SIZES["qex_Name"], count)
        at += count * _SIZES["qex_Name"]
        text = _flat.VSLAGStatus_name_get(status)
        (name,) = _packed_values.texts_at(text, _vs.VS_LACP_LAG_NAME_LENGTH, 1)
        found.append(Lag(name, LinkState(_flat.VSLAGStatus_state_get(status)), uplinks))
    return tuple(found)


def _bounded(count: int, most: int) -> int:
    if count > most:
        raise ValueError(f"the table of link-aggregation groups says {count} of at most {most}")
    return count
