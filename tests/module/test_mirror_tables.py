"""Mirror session tables: made, walked and edited in place, and the texts of their entities."""

import ctypes
from typing import Any, Iterator, List, Tuple

import pytest

import _libvswitch as vs
import methods
import native

HEADER, SESSION, ENTITY = 20, 232, 52


def layout(sessions: int, entities: int) -> bytes:
    """A table as it is made."""
    numbers = (0xFACEBEEF, 0, sessions, entities)
    header = b"".join(number.to_bytes(4, "little") for number in numbers) + bytes(4)
    return header + bytes(SESSION * sessions + ENTITY * entities)


@pytest.fixture
def table() -> Iterator[Any]:
    """Two sessions and three entities."""
    made = vs.alloc_dvmirror_session_table(2, 3)
    yield made
    assert vs.free_dvmirror_session_table(made) is None


@pytest.fixture
def entity() -> methods.Block:
    """An entity whose bytes all show when they change."""
    return methods.Block("DVMirrorEntity *", b"\xee" * ENTITY)


# The table


@pytest.mark.parametrize("sessions, entities", [(0, 0), (2, 3), (1, 0), (0, 1), (40, 100)])
def test_a_table_is_made_with_its_magic_number_and_counts(sessions: int, entities: int) -> None:
    expected = layout(sessions, entities)
    with methods.fresh_memory_is_not_zero():
        table = vs.alloc_dvmirror_session_table(sessions, entities)
    assert native.read(table, len(expected)) == expected
    assert len(expected) <= methods.usable_size(table) < len(expected) + methods.ROUNDING
    vs.free_dvmirror_session_table(table)


def test_a_table_of_nothing_is_its_header() -> None:
    table = vs.alloc_dvmirror_session_table(0, 0)
    assert vs.DVMirrorSessionTable_magicNum_get(table) == 4207853295
    assert vs.DVMirrorSessionTable_version_get(table) == 0
    assert vs.DVMirrorSessionTable_numSessions_get(table) == 0
    assert vs.DVMirrorSessionTable_numEntities_get(table) == 0
    vs.free_dvmirror_session_table(table)


def test_python_does_not_own_a_table(table: Any) -> None:
    assert not table.own()
    assert "'struct DVMirrorSessionTable *'" in repr(table)


@pytest.mark.parametrize("sessions, entities", [(-1, 0), (0, -1), (0, 2**26), (-(2**31), -1)])
def test_a_table_whose_size_is_negative_is_none(sessions: int, entities: int) -> None:
    assert vs.alloc_dvmirror_session_table(sessions, entities) is None


def test_the_size_of_a_table_has_32_bits() -> None:
    # The entities take a multiple of 2**32 bytes, of which nothing is left.
    table = vs.alloc_dvmirror_session_table(1, 2**30)
    assert vs.DVMirrorSessionTable_numEntities_get(table) == 2**30
    assert methods.usable_size(table) < HEADER + SESSION + methods.ROUNDING
    vs.free_dvmirror_session_table(table)


def test_the_constructor_makes_a_header_alone() -> None:
    with methods.owned(vs.new_DVMirrorSessionTable(), vs.delete_DVMirrorSessionTable) as table:
        assert native.read(table, HEADER) == bytes(HEADER)
        assert methods.usable_size(table) < HEADER + methods.ROUNDING


def test_the_allocator_is_exported_to_c() -> None:
    exported = ctypes.CDLL(vs.__file__)
    exported.alloc_dvmirror_session_table.argtypes = [ctypes.c_int, ctypes.c_int]
    exported.alloc_dvmirror_session_table.restype = ctypes.c_void_p
    exported.free_dvmirror_session_table.argtypes = [ctypes.c_void_p]
    exported.free_dvmirror_session_table.restype = None
    address = exported.alloc_dvmirror_session_table(2, 3)
    assert ctypes.string_at(address, 640) == layout(2, 3)
    exported.free_dvmirror_session_table(address)
    exported.free_dvmirror_session_table(None)


# Sessions


def test_the_first_session_follows_the_header(table: Any) -> None:
    first = vs.DVMirrorSessionTable_get_first_session(table)
    assert int(first) == int(table) + 20
    assert not first.own()
    assert "'struct DVMirrorSession *'" in repr(first)
    assert int(vs.DVMirrorSessionTable_sessions_get(table)) == int(first)
    vs.DVMirrorSessionTable_numSessions_set(table, 0)
    assert int(vs.DVMirrorSessionTable_get_first_session(table)) == int(first)


def test_sessions_are_views_into_the_table(capfd: Any, table: Any) -> None:
    for index in (0, 1):
        session, out = methods.said(capfd, vs.DVMirrorSessionTable___getitem__, table, index)
        assert int(session) == int(table) + HEADER + SESSION * index
        assert not session.own()
        assert out == ""
        vs.DVMirrorSession_sid_set(session, f"session{index}")
    assert native.read(table, 9, HEADER + SESSION) == b"session1\0"


def test_a_session_is_replaced_by_a_copy(table: Any) -> None:
    value = methods.Block("DVMirrorSession *", b"\xa5" * SESSION)
    assert vs.DVMirrorSessionTable___setitem__(table, 1, value.record) is None
    expected = methods.patched(layout(2, 3), HEADER + SESSION, b"\xa5" * SESSION)
    assert native.read(table, len(expected)) == expected
    assert value.bytes == b"\xa5" * SESSION


@pytest.mark.parametrize("index", [2, 3, 2**31 - 1, -1, -2, -(2**31)])
def test_an_index_that_is_not_below_the_number_of_sessions_is_noticed(
    capfd: Any, table: Any, index: int
) -> None:
    value = methods.Block("DVMirrorSession *", b"\xa5" * SESSION)
    noticed = (None, methods.NOTICE)
    assert methods.said(capfd, vs.DVMirrorSessionTable___getitem__, table, index) == noticed
    setting = (vs.DVMirrorSessionTable___setitem__, table, index, value.record)
    assert methods.said(capfd, *setting) == noticed
    assert native.read(table, 640) == layout(2, 3)


# Entities


def test_entities_follow_the_last_session(table: Any) -> None:
    first = vs.DVMirrorSessionTable_get_first_session_entity(table, 0)
    assert int(first) == int(table) + 484
    assert not first.own()
    assert "'struct DVMirrorEntity *'" in repr(first)
    second = vs.DVMirrorEntity_next(first)
    assert int(second) == int(table) + 484 + 52
    assert not second.own()
    assert second == vs.DVMirrorSessionTable_get_first_session_entity(table, 1)


@pytest.mark.parametrize("index", [-1, -10, 3, 100_000, 2**31 - 1, -(2**31)])
def test_nobody_checks_the_index_of_an_entity(capfd: Any, table: Any, index: int) -> None:
    method = vs.DVMirrorSessionTable_get_first_session_entity
    entity, out = methods.said(capfd, method, table, index)
    assert int(entity) == (int(table) + 484 + 52 * index) % 2**64
    assert out == ""


def test_a_walk_leads_past_the_last_entity(table: Any) -> None:
    entity = vs.DVMirrorSessionTable_get_first_session_entity(table, 2)
    assert int(vs.DVMirrorEntity_next(entity)) == int(table) + 640


def test_the_number_of_sessions_moves_the_entities(table: Any) -> None:
    vs.DVMirrorSessionTable_numSessions_set(table, 1)
    entity = vs.DVMirrorSessionTable_get_first_session_entity(table, 1)
    assert int(entity) == int(table) + HEADER + SESSION + ENTITY


def test_a_table_is_filled_and_walked(table: Any) -> None:
    entities = [
        [(vs.MIRROR_ENTTYPE_DVPORT, "port-7")],
        [(vs.MIRROR_ENTTYPE_IP, "fe80::1"), (vs.MIRROR_ENTTYPE_VLAN, "4094")],
    ]
    start = 0
    for index, of_session in enumerate(entities):
        session = vs.DVMirrorSessionTable___getitem__(table, index)
        vs.DVMirrorSession_startIdx_set(session, start)
        vs.DVMirrorSession_numDstEntities_set(session, len(of_session))
        entity = vs.DVMirrorSessionTable_get_first_session_entity(table, start)
        for kind, text in of_session:
            vs.DVMirrorEntity_type_set(entity, kind)
            vs.DVMirrorEntity_set_entity(entity, text)
            entity = vs.DVMirrorEntity_next(entity)
        start += len(of_session)

    found: List[List[Tuple[int, str]]] = []
    for index in range(vs.DVMirrorSessionTable_numSessions_get(table)):
        session = vs.DVMirrorSessionTable___getitem__(table, index)
        start = vs.DVMirrorSession_startIdx_get(session)
        entity = vs.DVMirrorSessionTable_get_first_session_entity(table, start)
        found.append([])
        for _ in range(vs.DVMirrorSession_numDstEntities_get(session)):
            kind = vs.DVMirrorEntity_type_get(entity)
            found[-1].append((kind, vs.DVMirrorEntity_get_entity(entity)))
            entity = vs.DVMirrorEntity_next(entity)
    assert found == entities


# The texts of entities


def set_entity(entity: methods.Block, kind: int, text: str) -> Tuple[bytes, Any]:
    """The value's 48 bytes and its text, after a text has been set over a filling."""
    native.write(entity.record, kind.to_bytes(4, "little", signed=True) + b"\xee" * 48)
    assert vs.DVMirrorEntity_set_entity(entity.record, text) is None
    return entity.bytes[4:], vs.DVMirrorEntity_get_entity(entity.record)


@pytest.mark.parametrize(
    "text, stored, read",
    [
        ("port-7", b"port-7", "port-7"),
        ("", b"", ""),
        ("x" * 47, b"x" * 47, "x" * 47),
        ("x" * 48, b"x" * 48, "x" * 48),
        ("x" * 49, b"x" * 48, "x" * 48),
        ("\u00e9" * 24 + "x", b"\xc3\xa9" * 24, "\u00e9" * 24),
        ("x" + "\u00e9" * 24, b"x" + b"\xc3\xa9" * 23 + b"\xc3", "x" + "\u00e9" * 23 + "\udcc3"),
    ],
)
def test_a_port_identifier_takes_48_bytes_without_a_terminator(
    entity: methods.Block, text: str, stored: bytes, read: str
) -> None:
    expected = (stored.ljust(48, b"\0"), read)
    assert set_entity(entity, vs.MIRROR_ENTTYPE_DVPORT, text) == expected


@pytest.mark.parametrize("length", [0, 7, 31, 32, 40, 500])
def test_an_uplink_keeps_31_bytes(entity: methods.Block, length: int) -> None:
    kept = min(length, 31)
    expected = (b"x" * kept + bytes(32 - kept) + b"\xee" * 16, "x" * kept)
    assert set_entity(entity, vs.MIRROR_ENTTYPE_UPLINK, "x" * length) == expected


def test_an_uplink_without_a_terminator_reads_32_bytes(entity: methods.Block) -> None:
    native.write(entity.record, b"\1\0\0\0" + b"y" * 48)
    assert vs.DVMirrorEntity_get_entity(entity.record) == "y" * 32


@pytest.mark.parametrize(
    "text, number",
    [
        ("4097", 4097),
        ("65535", 65535),
        ("65536", 0),
        ("70000", 4464),
        ("-1", 65535),
        (" +12abc", 12),
        ("0x10", 0),
        ("", 0),
        ("vlan", 0),
        ("99999999999999999999", 65535),
    ],
)
def test_a_vlan_is_cut_to_16_bits(entity: methods.Block, text: str, number: int) -> None:
    expected = (number.to_bytes(2, "little") + b"\xee" * 46, str(number))
    assert set_entity(entity, vs.MIRROR_ENTTYPE_VLAN, text) == expected
    assert vs.DVMirrorEntity_vlan_get(entity.record) == number


@pytest.mark.parametrize(
    "text, number",
    [
        ("0", 0),
        ("50331654", 50331654),
        ("2147483647", 2147483647),
        ("2147483648", -(2**31)),
        ("4294967295", -1),
        ("4294967296", 0),
        ("4294967301", 5),
        ("-1", -1),
        ("7 and more", 7),
        ("port", 0),
        ("99999999999999999999", -1),
        ("-99999999999999999999", 0),
    ],
)
def test_a_port_is_cut_to_32_bits_and_read_with_a_sign(
    entity: methods.Block, text: str, number: int
) -> None:
    expected = (number.to_bytes(4, "little", signed=True) + b"\xee" * 44, str(number))
    assert set_entity(entity, vs.MIRROR_ENTTYPE_PORT, text) == expected
    assert vs.DVMirrorEntity_portId_get(entity.record) == number % 2**32


IPV6_1 = bytes.fromhex("fe80" + "00" * 13 + "01")


@pytest.mark.parametrize(
    "text, flag, stored, read",
    [
        ("10.0.0.1", b"\0", b"\x0a\0\0\1" + b"\xee" * 12, "10.0.0.1"),
        ("255.255.255.255", b"\0", b"\xff" * 4 + b"\xee" * 12, "255.255.255.255"),
        ("fe80::1", b"\1", IPV6_1, "fe80::1"),
        ("FE80:0:0::0001", b"\1", IPV6_1, "fe80::1"),
        ("::", b"\1", bytes(16), "::"),
        ("::ffff:10.0.0.1", b"\1", bytes(10) + b"\xff\xff\x0a\0\0\1", "::ffff:10.0.0.1"),
        (":".join(["ffff"] * 8), b"\1", b"\xff" * 16, ":".join(["ffff"] * 8)),
    ],
)
def test_an_address_is_of_either_family(
    entity: methods.Block, text: str, flag: bytes, stored: bytes, read: str
) -> None:
    expected = (flag + b"\xee" * 3 + stored + b"\xee" * 28, read)
    assert set_entity(entity, vs.MIRROR_ENTTYPE_IP, text) == expected
    ip = vs.DVMirrorEntity_ip_get(entity.record)
    assert vs.DVMirrorIP_isIPv6_get(ip) == flag.decode()


@pytest.mark.parametrize("before", ["10.0.0.1", "fe80::1"])
@pytest.mark.parametrize("text", ["", "host", "10.0.0", "10.0.0.256", "10.0.0.2 ", ":::", "::2%0"])
def test_what_is_no_address_changes_nothing(entity: methods.Block, before: str, text: str) -> None:
    stored = set_entity(entity, vs.MIRROR_ENTTYPE_IP, before)
    assert vs.DVMirrorEntity_set_entity(entity.record, text) is None
    assert (entity.bytes[4:], vs.DVMirrorEntity_get_entity(entity.record)) == stored


def test_any_flag_but_zero_means_ipv6(entity: methods.Block) -> None:
    set_entity(entity, vs.MIRROR_ENTTYPE_IP, "fe80::1")
    for flag, text in ((b"\2", "fe80::1"), (b"\x80", "fe80::1"), (b"\0", "254.128.0.0")):
        native.write(entity.record, flag, 4)
        assert vs.DVMirrorEntity_get_entity(entity.record) == text


@pytest.mark.parametrize("kind", [5, 7, 2**31 - 1, -1, -(2**31)])
def test_an_unknown_type_is_empty_and_takes_nothing(entity: methods.Block, kind: int) -> None:
    assert set_entity(entity, kind, "10.0.0.1") == (b"\xee" * 48, "")


# What stands for macros of the host


def test_macros_do_nothing(capfd: Any) -> None:
    assert methods.said(capfd, vs.MIRROR_ASSERT) == (None, "")
    assert methods.said(capfd, vs.MIRROR_ENCAP_TYPE) == (None, "")
