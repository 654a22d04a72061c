"""Policies: names of a team's uplinks, VLAN ranges, private-VLAN maps, and packed fields."""

from typing import Any

import pytest

import _libvswitch as vs
import methods
import native
import reports

SLOTS, SLOT, FIRST = 32, 81, 24


# Team policies


@pytest.fixture
def team() -> methods.Block:
    """A team policy with memory in front of it, where negative indexes lead."""
    size = FIRST + SLOTS * SLOT
    return methods.Block("VSTeamPolicy *", b"\xee" * size, in_front=b"\xee" * 2 * SLOT)


def offset(index: int) -> int:
    """Where a slot begins in the record."""
    return FIRST + SLOT * index


def with_slot(team: methods.Block, index: int, stored: bytes) -> bytes:
    """The block with other bytes in a slot."""
    return methods.patched(team.bytes, 2 * SLOT + offset(index), stored)


@pytest.mark.parametrize("index", [0, 1, 31])
def test_names_are_read(capfd: Any, team: methods.Block, index: int) -> None:
    for stored, name in (
        (b"uplink1\0", "uplink1"),
        (b"\0", ""),
        (b"x" * 80 + b"\0", "x" * 80),
        (b"\xc3\xbc\xff\0", "\u00fc\udcff"),
    ):
        native.write(team.record, stored, offset(index))
        reading = (vs.VSTeamPolicy___getitem__, team.record, index)
        assert methods.said(capfd, *reading) == (name, "")


def test_a_name_without_a_terminator_is_read_up_to_the_next_nul(team: methods.Block) -> None:
    native.write(team.record, b"x" * SLOT + b"yz\0", offset(3))
    assert vs.VSTeamPolicy___getitem__(team.record, 3) == "x" * SLOT + "yz"


@pytest.mark.parametrize("index", [0, 1, 31])
def test_names_are_written(team: methods.Block, index: int) -> None:
    for length in (0, 7, 80, 81, 82, 5000):
        stored = (b"x" * length)[:SLOT].ljust(SLOT, b"\0")
        expected = with_slot(team, index, stored)
        assert vs.VSTeamPolicy___setitem__(team.record, index, "x" * length) is None
        assert team.bytes == expected


@pytest.mark.parametrize("index", [32, 33, 2**31 - 1])
def test_an_index_of_32_and_above_is_noticed(capfd: Any, team: methods.Block, index: int) -> None:
    before = team.bytes
    noticed = (None, methods.NOTICE)
    assert methods.said(capfd, vs.VSTeamPolicy___getitem__, team.record, index) == noticed
    assert methods.said(capfd, vs.VSTeamPolicy___setitem__, team.record, index, "ab") == noticed
    assert team.bytes == before


@pytest.mark.parametrize("index", [-1, -2])
def test_a_negative_index_leads_before_the_names(
    capfd: Any, team: methods.Block, index: int
) -> None:
    expected = with_slot(team, index, b"before".ljust(SLOT, b"\0"))
    writing = (vs.VSTeamPolicy___setitem__, team.record, index, "before")
    assert methods.said(capfd, *writing) == (None, "")
    assert team.bytes == expected
    reading = (vs.VSTeamPolicy___getitem__, team.record, index)
    assert methods.said(capfd, *reading) == ("before", "")


def test_the_counts_of_uplinks_bound_nothing(capfd: Any) -> None:
    with methods.owned(vs.new_VSTeamPolicy(), vs.delete_VSTeamPolicy) as team:
        assert vs.VSTeamPolicy_numActive_get(team) == 0
        vs.VSTeamPolicy___setitem__(team, 31, "uplink32")
        assert methods.said(capfd, vs.VSTeamPolicy___getitem__, team, 31) == ("uplink32", "")


def test_the_names_of_a_team_need_a_source() -> None:
    with methods.owned(vs.new_VSTeamPolicy(), vs.delete_VSTeamPolicy) as team:
        text = reports.null_variable("uplinkPortName", "char [32][81]")
        reports.raises(ValueError, text, vs.VSTeamPolicy_uplinkPortName_set, team, None)


# Ranges of VLANs


@pytest.mark.parametrize("index, low, high", [(0, 10, 11), (1, 1, 4094), (2, 0, 65535), (-1, 7, 2)])
def test_a_range_is_a_copy_that_python_owns(capfd: Any, index: int, low: int, high: int) -> None:
    # The ranges begin after the number of ranges, which is 2 and bounds nothing.
    data = b"\1\0\x64\0\7\0\2\0" + b"\x0a\0\x0b\0" + b"\1\0\xfe\x0f" + b"\0\0\xff\xff"
    policy = methods.Block("VSPortVlanPolicy *", data)
    reading = (vs.VSPortVlanPolicy_get_vid_range, policy.record, index)
    copy, out = methods.said(capfd, *reading)
    assert out == ""
    with methods.owned(copy, vs.delete_qex_NEBPortVIDRange):
        assert "'struct qex_NEBPortVIDRange *'" in repr(copy)
        assert vs.qex_NEBPortVIDRange_minVID_get(copy) == low
        assert vs.qex_NEBPortVIDRange_maxVID_get(copy) == high
        native.write(copy, bytes(4))
    assert policy.bytes == data


# Private-VLAN maps


@pytest.mark.parametrize("index", [-1, 0, 1, 2])
def test_an_entry_of_a_map_is_a_copy_that_python_owns(capfd: Any, index: int) -> None:
    data = bytes(range(32))
    entries = methods.Block("VSPvlanMapEntry *", data[8:], in_front=data[:8])
    copy, out = methods.said(capfd, vs.VSPvlanMapEntry___getitem__, entries.record, index)
    assert out == ""
    with methods.owned(copy, vs.delete_VSPvlanMapEntry):
        assert "'struct VSPvlanMapEntry *'" in repr(copy)
        first = 8 + 8 * index
        assert native.read(copy, 8) == data[first : first + 8]
        native.write(copy, b"\xee" * 8)
    assert entries.bytes == data


# Fields whose place is a policy's own


def test_ageing_takes_24_bits_of_a_word() -> None:
    with methods.owned(vs.new_VSMACLearning(), vs.delete_VSMACLearning) as learning:
        vs.VSMACLearning_agingTime_set(learning, 300)
        vs.VSMACLearning_learnStatic_set(learning, 1)
        assert native.read(learning, 4) == (0x0100012C).to_bytes(4, "little")
        assert vs.VSMACLearning_reserved_get(learning) == 0


def test_learning_is_a_view_into_mac_management() -> None:
    with methods.owned(vs.new_VSPMACManagement(), vs.delete_VSPMACManagement) as management:
        learning = vs.VSPMACManagement_portMACLearning_get(management)
        assert int(learning) == int(management) + 1
        vs.VSPMACLearning_macLimit_set(learning, 0x01020304)
        assert native.read(management, 11) == bytes(3) + b"\4\3\2\1" + bytes(4)


def test_the_last_two_bytes_of_a_filter_follow_all_addresses() -> None:
    with methods.owned(vs.new_VSExtraEthFilter(), vs.delete_VSExtraEthFilter) as extra:
        addresses = methods.Block("qex_EthAddress *", bytes(range(192)))
        vs.VSExtraEthFilter_multicastAddrs_set(extra, addresses.record)
        vs.VSExtraEthFilter_pad_set(extra, 0xFFFE)
        assert native.read(extra, 200) == bytes(6) + bytes(range(192)) + b"\xfe\xff"
        text = reports.null_variable("multicastAddrs", "unsigned char [32][6]")
        reports.raises(ValueError, text, vs.VSExtraEthFilter_multicastAddrs_set, extra, None)


def test_ranges_are_written_after_a_policy_and_not_through_its_field() -> None:
    policy = methods.Block("VSPortVlanPolicy *", bytes(16))
    ranges = methods.Block("qex_NEBPortVIDRange *", b"\1\2\3\4")
    assert int(vs.VSPortVlanPolicy_vidRanges_get(policy.record)) == policy.address + 8
    assert vs.VSPortVlanPolicy_vidRanges_set(policy.record, ranges.record) is None
    assert policy.bytes == bytes(16)
    text = reports.null_variable("vidRanges", "qex_NEBPortVIDRange [0]")
    reports.raises(ValueError, text, vs.VSPortVlanPolicy_vidRanges_set, policy.record, None)
