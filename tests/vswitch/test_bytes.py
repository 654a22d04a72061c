"""Bytes of properties and tables, which a host may have from elsewhere: nothing past their end is
believed."""

import struct

import pytest
from vswitch import Mirror, MirrorEnd, PortMacLearning, _records, _sessions

LEARNING = PortMacLearning(learning=True, limit=7, limit_policy="drop", mac_change=True)
MIRRORS = (
    Mirror("a", to=(MirrorEnd(port="x"), MirrorEnd(number=9))),
    Mirror("b", sent_by=(MirrorEnd(ip="192.0.2.1"),), received_from=("cos",)),
)


def test_what_is_written_is_read() -> None:
    assert _records.port_learning_from(_records.port_learning_bytes(LEARNING)) == LEARNING
    for mirrors in ((), MIRRORS, MIRRORS[:1]):
        assert _sessions.mirrors_from(_sessions.mirror_bytes(mirrors)) == mirrors


@pytest.mark.parametrize("cut", [-1, 1, 5])
def test_records_of_another_size(cut: int) -> None:
    data = _records.port_learning_bytes(LEARNING)
    other = data + b"\0" if cut < 0 else data[:-cut]
    with pytest.raises(ValueError, match=f"VSPMACManagement has 11 bytes, not {len(other)}"):
        _records.port_learning_from(other)


@pytest.mark.parametrize(
    "sessions, entities", [(3, 3), (2, 4), (0, 3), (2**32 - 1, 3), (2, 2**31)]
)
def test_tables_that_say_more_than_they_have(sessions: int, entities: int) -> None:
    data = bytearray(_sessions.mirror_bytes(MIRRORS))
    assert struct.unpack_from("=II", data, 8) == (2, 3)
    struct.pack_into("=II", data, 8, sessions, entities)
    with pytest.raises(ValueError, match="a table of mirror sessions says .* bytes of itself"):
        _sessions.mirrors_from(bytes(data))


@pytest.mark.parametrize("size", [0, 1, 19])
def test_tables_without_a_header(size: int) -> None:
    with pytest.raises(ValueError, match=f"has 20 bytes, not {size}"):
        _sessions.mirrors_from(bytes(size))


def test_entities_of_a_kind_that_nobody_knows() -> None:
    data = bytearray(_sessions.mirror_bytes(MIRRORS))
    sizes = _sessions._SIZES
    first = sizes["DVMirrorSessionTable"] + 2 * sizes["DVMirrorSession"]
    struct.pack_into("=I", data, first, 77)
    with pytest.raises(ValueError, match="an entity of the unknown kind 77"):
        _sessions.mirrors_from(bytes(data))
