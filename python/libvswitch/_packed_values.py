"""Values of what is packed in a way that its record does not tell: link-aggregation groups, mirror
tables, multicast groups, runtime options. Here they are read from the host's memory, and written
into a caller's."""

import ctypes
import socket
import typing
from dataclasses import dataclass, fields
from typing import Any, List, Tuple, TypeVar, Union, overload

import _libvswitch as _flat
import libvswitch as _vs
from libvswitch import _pointers
from libvswitch._checking import sequence, text
from libvswitch.enums import LinkState

T = TypeVar("T")

_SIZES = _pointers.record_sizes()


class Table(typing.Sequence[T]):
    """A value that is also the sequence of its entries."""

    def _entries(self) -> Tuple[T, ...]:
        raise NotImplementedError

    def __len__(self) -> int:
        return len(self._entries())

    def __iter__(self) -> typing.Iterator[T]:
        return iter(self._entries())

    @overload
    def __getitem__(self, index: int) -> T:
        ...

    @overload
    def __getitem__(self, index: slice) -> Tuple[T, ...]:
        ...

    def __getitem__(self, index: Union[int, slice]) -> Union[T, Tuple[T, ...]]:
        return self._entries()[index]


def records_at(first: Any, kind: str, count: int) -> List[Any]:
    """Pointer objects of so many records, one after the other."""
    address, size = int(first), _SIZES[kind]
    spelling = f"{kind} *"
    return [_pointers.pointer_object(address + at * size, spelling) for at in range(count)]


def texts_at(first: Any, size: int, count: int) -> Tuple[str, ...]:
    address = int(first)
    held = (ctypes.string_at(address + at * size, size) for at in range(count))
    return tuple(one.split(b"\0", 1)[0].decode("utf-8", "surrogateescape") for one in held)


def numbers_at(first: Any, count: int) -> Tuple[int, ...]:
    """Numbers of 32 bits each."""
    return tuple((ctypes.c_uint * count).from_address(int(first)))


# Link-aggregation groups


@dataclass(frozen=True)
class VSLAGStatus:
    """A group and its uplinks."""

    state: LinkState = LinkState.DOWN
    id: int = 0
    name: str = ""
    uplinkLinkupBitmap: int = 0
    uplinkNames: Tuple[str, ...] = ()


@dataclass(frozen=True)
class VSLAGTable(Table[VSLAGStatus]):
    """The groups of a switch."""

    entries: Tuple[VSLAGStatus, ...] = ()

    def _entries(self) -> Tuple[VSLAGStatus, ...]:
        return self.entries


def read_VSLAGTable(record: Any) -> VSLAGTable:
    at = int(record) + _SIZES["VSLAGTable"]
    found = []
    for _ in range(_lag_count(_flat.VSLAGTable_numLAGs_get(record), _flat.VS_MAX_LAGS)):
        group: Any = _pointers.pointer_object(at, "VSLAGStatus *")
        count = _flat.VSLAGStatus_numUplinks_get(group)
        at += _SIZES["VSLAGStatus"]
        uplinks = texts_at(at, _SIZES["qex_Name"], _lag_count(count, _flat.VS_MAX_UPLINKS_IN_LAG))
        at += count * _SIZES["qex_Name"]
        (name,) = texts_at(_flat.VSLAGStatus_name_get(group), _flat.VS_LACP_LAG_NAME_LENGTH, 1)
        found.append(
            VSLAGStatus(
                state=LinkState(_flat.VSLAGStatus_state_get(group)),
                id=_flat.VSLAGStatus_id_get(group),
                name=name,
                uplinkLinkupBitmap=_flat.VSLAGStatus_uplinkLinkupBitmap_get(group),
                uplinkNames=uplinks,
            )
        )
    return VSLAGTable(tuple(found))


def _lag_count(count: int, most: int) -> int:
    """A count that says where the next group lies, and so has to be one that there may be."""
    if count > most:
        raise ValueError(f"the table of link-aggregation groups says {count} of at most {most}")
    return count


# Multicast


@dataclass(frozen=True)
class VSMcastFilters(Table[str]):
    """The groups of a port, as addresses in the form of the mode that was asked for."""

    totalEntries: int = 0
    entries: Tuple[str, ...] = ()

    def _entries(self) -> Tuple[str, ...]:
        return self.entries


@dataclass(frozen=True)
class VSMcastFilterStats(Table[str]):
    """One group of a port, and its sources as addresses."""

    version: int = 0
    srcIPFilterMode: int = 0
    updateTime: int = 0
    vni: int = 0
    totalEntries: int = 0
    entries: Tuple[str, ...] = ()

    def _entries(self) -> Tuple[str, ...]:
        return self.entries


_GROUPS = {
    _flat.VS_MCAST_FILTER_MODE_IGMP: _flat.VSMcastFilters_get_ip_entry,
    _flat.VS_MCAST_FILTER_MODE_MLD: _flat.VSMcastFilters_get_ipv6_entry,
}


def read_VSMcastFilters(record: Any, mode: int) -> VSMcastFilters:
    read = _GROUPS.get(mode, _flat.VSMcastFilters_get_mac_entry)
    count = _flat.VSMcastFilters_numEntries_get(record)
    total = _flat.VSMcastFilters_totalEntries_get(record)
    return VSMcastFilters(total, tuple(read(record, at) for at in range(count)))


def read_VSMcastFilterStats(record: Any, group: bytes) -> VSMcastFilterStats:
    # Ethernet has groups of either family, which they begin with.
    is_v6 = len(group) == 16 or group[:2] == b"\x33\x33"
    read = (
        _flat.VSMcastFilterStats_get_ipv6_entry if is_v6 else _flat.VSMcastFilterStats_get_ip_entry
    )
    count = _flat.VSMcastFilterStats_numEntries_get(record)
    return VSMcastFilterStats(
        version=_flat.VSMcastFilterStats_version_get(record),
        srcIPFilterMode=_flat.VSMcastFilterStats_srcIPFilterMode_get(record),
        updateTime=_flat.VSMcastFilterStats_updateTime_get(record),
        vni=_flat.VSMcastFilterStats_vni_get(record),
        totalEntries=_flat.VSMcastFilterStats_totalEntries_get(record),
        entries=tuple(read(record, at) for at in range(count)),
    )


# Runtime options


@dataclass(frozen=True)
class VSRuntimeOption:
    """An option, a VSRuntimeOptionType, and its value: an int, or the text of an address."""

    type: int
    value: Union[int, str]

    @property
    def name(self) -> str:
        """What scenario documents call it."""
        return _option_names()[self.type] if self.type < len(_option_names()) else str(self.type)


_NAMES: List[str] = []


def _option_names() -> List[str]:
    if not _NAMES:
        header = _flat.new_VSRuntimeOptionHeader()
        names = []
        for number in range(_flat.VS_NUM_RT_OPT):
            _flat.VSRuntimeOptionHeader_type_set(header, number)
            names.append(_flat.VSRuntimeOptionHeader_get_option_name(header))
        _flat.delete_VSRuntimeOptionHeader(header)
        _NAMES[:] = names
    return _NAMES


def read_VSRuntimeOptions(record: Any) -> Tuple[VSRuntimeOption, ...]:
    found = []
    end = int(record) + _flat.VSRuntimeOptions_totalLength_get(record)
    option: Any = _flat.VSRuntimeOptions_get_first_option(record)
    while option is not None and int(option) < end:
        held = _flat.VSRuntimeOptionHeader_get_option_value(option)
        value: Union[int, str]
        value = held.decode("utf-8", "surrogateescape") if isinstance(held, bytes) else held
        found.append(VSRuntimeOption(_flat.VSRuntimeOptionHeader_type_get(option), value))
        if not _flat.VSRuntimeOptionHeader_length_get(option):
            break
        option = _flat.VSRuntimeOptions_get_next_option(record, option)
    return tuple(found)


def packed_options(name: str, values: Any) -> Any:
    """A list of the caller's own."""
    if isinstance(values, _vs.VSRuntimeOptions):
        return values
    options = sequence(name, values)
    made = _vs.VSRuntimeOptions(_flat.VS_CHARDEV_MAX_RUNTIME_OPTIONS_LENGTH)
    first = at = made.get_first_option()
    for one in options:
        if not isinstance(one, VSRuntimeOption):
            raise TypeError(f"{name} holds VSRuntimeOption, not {type(one).__name__}")
        if not 0 <= one.type < 2**16:
            raise OverflowError(f"{name} has no room for the type {one.type}")
        if isinstance(one.value, str):
            text(name, one.value)
            at_next = made.add_str_option(at, one.name, one.type, one.value)
        else:
            value = _signed(name, one.value)
            at_next = made.add_int_option(at, one.name, one.type, value)
        if at_next is None:
            raise ValueError(f"{name}: there is no room for {one}")
        at = at_next
    made.set_options_length(int(at) - int(first))
    return made


def _signed(name: str, value: int) -> int:
    """The bits of an unsigned number, as the module takes them."""
    if not 0 <= value < 2**32:
        raise OverflowError(f"{name} has no room for {value}")
    return value - 2**32 if value >= 2**31 else value


# Mirror sessions


@dataclass(frozen=True)
class DVMirrorEntity:
    """What a session mirrors from or to: a DVMirrorEntityType, and the name, number or address."""

    type: int
    entity: str


@dataclass(frozen=True)
class DVMirrorSession:
    """A session, and its entities."""

    sid: str
    dname: str = ""
    type: int = _flat.VS_DVMIRROR_SESSIONTYPE_DVPORT
    snapLen: int = 0
    flags: int = 0
    encapVlan: int = 0
    wildIn: int = 0
    wildOut: int = 0
    samplingRate: int = 0
    greKey: int = 0
    uplinkFilter: int = _flat.MIRROR_UPLINK_FILTER_NONE
    stack: bool = False
    encapType: int = _flat.DVMIRROR_ENCAP_GRE
    erspanID: int = 0
    erspanCOS: int = 0
    erspanGra: int = 0
    dstEntities: Tuple[DVMirrorEntity, ...] = ()
    srcInEntities: Tuple[DVMirrorEntity, ...] = ()
    srcOutEntities: Tuple[DVMirrorEntity, ...] = ()


# In the order in which they lie in a table.
_ENTITIES = ("dstEntities", "srcInEntities", "srcOutEntities")
_PLAIN = [one.name for one in fields(DVMirrorSession) if one.name not in _ENTITIES]


def read_DVMirrorSessionTable(record: Any) -> Tuple[DVMirrorSession, ...]:
    count = _flat.DVMirrorSessionTable_numSessions_get(record)
    entities = _flat.DVMirrorSessionTable_numEntities_get(record)
    first = _flat.DVMirrorSessionTable_get_first_session(record)
    listed = records_at(
        _flat.DVMirrorSessionTable_get_first_session_entity(record, 0), "DVMirrorEntity", entities
    )
    return tuple(_read_session(one, listed) for one in records_at(first, "DVMirrorSession", count))


def _read_session(record: Any, entities: List[Any]) -> DVMirrorSession:
    def read(name: str) -> Any:
        value = getattr(_flat, f"DVMirrorSession_{name}_get")(record)
        return value != "\0" if name == "stack" else value

    held = {name: read(name) for name in _PLAIN}
    at = read("startIdx")
    for name in _ENTITIES:
        end = at + read(f"num{name[0].upper()}{name[1:]}")
        held[name] = tuple(map(_read_entity, entities[at:end]))
        at = end
    return DVMirrorSession(**held)


def _read_entity(record: Any) -> DVMirrorEntity:
    type_ = _flat.DVMirrorEntity_type_get(record)
    if type_ == _flat.MIRROR_ENTTYPE_PORT:
        return DVMirrorEntity(type_, str(_flat.DVMirrorEntity_portId_get(record)))
    return DVMirrorEntity(type_, _flat.DVMirrorEntity_get_entity(record))


def packed_sessions(name: str, values: Any) -> Any:
    """A table of the caller's own; `_vs.free_dvmirror_session_table` ends it."""
    sessions: List[DVMirrorSession] = sequence(name, values)
    for one in sessions:
        if not isinstance(one, DVMirrorSession):
            raise TypeError(f"{name} holds DVMirrorSession, not {type(one).__name__}")
    entities = [one for session in sessions for part in _ENTITIES for one in getattr(session, part)]
    table = _vs.alloc_dvmirror_session_table(len(sessions), len(entities))
    try:
        table.version = _flat.VS_DVMIRROR_VERSION_V3
        _write_sessions(name, table, sessions)
        if entities:
            first = table.get_first_session_entity(0)
            for record, entity in zip(records_at(first, "DVMirrorEntity", len(entities)), entities):
                _write_entity(name, record, entity)
    except BaseException:
        _vs.free_dvmirror_session_table(table)
        raise
    return table


def _write_sessions(name: str, table: Any, sessions: typing.Iterable[DVMirrorSession]) -> None:
    start = 0
    for at, one in enumerate(sessions):
        record = table[at]
        for field in _PLAIN:
            setattr(record, field, getattr(one, field))
        record.startIdx = start
        for part in _ENTITIES:
            count = len(sequence(f"{name}[{at}].{part}", getattr(one, part)))
            setattr(record, f"num{part[0].upper()}{part[1:]}", count)
            start += count


_LONGEST = {_flat.MIRROR_ENTTYPE_DVPORT: 47, _flat.MIRROR_ENTTYPE_UPLINK: 31}


def _write_entity(name: str, record: Any, entity: DVMirrorEntity) -> None:
    if not isinstance(entity, DVMirrorEntity):
        raise TypeError(f"{name} holds DVMirrorEntity, not {type(entity).__name__}")
    type_, held = entity.type, entity.entity
    text(name, held)
    _flat.DVMirrorEntity_type_set(record, type_)
    if type_ == _flat.MIRROR_ENTTYPE_VLAN:
        _flat.DVMirrorEntity_vlan_set(record, int(held))
        return
    if type_ == _flat.MIRROR_ENTTYPE_PORT:
        _flat.DVMirrorEntity_portId_set(record, int(held))
        return
    if type_ == _flat.MIRROR_ENTTYPE_IP:
        _require_address(name, held)
    elif type_ not in _LONGEST:
        raise ValueError(f"{name}: {type_} is no DVMirrorEntityType")
    elif len(held.encode()) > _LONGEST[type_]:
        raise ValueError(f"{name}: {held!r} takes more than {_LONGEST[type_]} bytes")
    _flat.DVMirrorEntity_set_entity(record, held)


def _require_address(name: str, held: str) -> None:
    for family in (socket.AF_INET, socket.AF_INET6):
        try:
            socket.inet_pton(family, held)
            return
        except OSError:
            pass
    raise ValueError(f"{name}: {held!r} is no address")
