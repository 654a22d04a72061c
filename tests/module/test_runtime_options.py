"""Runtime options: lists built and walked byte by byte, names, values, and the table of names."""

import ctypes
from typing import Any, Iterator, List, Tuple

import pytest

import _libvswitch as vs
import methods
import native
import peer
import reports

NAMES = """\
IGMPQueryInterval
IGMPV3MaxSrcIPNum
IGMPQueries
IGMPVersion
MLDVersion
MLDV2MaxSrcIPNum
MaxRARPsPerInterval
RARPAdvertisementDuration
ReversePathFwdCheck
ReversePathFwdCheckPromisc
AllowFastPath
TeamPolicyUpDelay
AllowMirrorStats
IGMPRouterIP
MLDRouterIP""".splitlines()

CAPACITY = 300


@pytest.fixture
def options() -> methods.Block:
    """A list with a capacity and nothing in it; bytes that change show."""
    return methods.Block(
        "VSRuntimeOptions *", CAPACITY.to_bytes(4, "little") + b"\xee" * (CAPACITY - 4)
    )


def at(options: methods.Block, offset: int) -> Any:
    """A position in a list."""
    return peer.pointer_object(options.address + offset, "VSRuntimeOptionHeader *")


def resize(options: methods.Block, size: int) -> None:
    vs.VSRuntimeOptions_totalLength_set(options.record, size)


def add(options: methods.Block, offset: int, kind: int, value: Any) -> Any:
    """Adds an option, and returns the offset of the next one or None."""
    add_option = vs.VSRuntimeOptions_add_int_option
    if isinstance(value, str):
        add_option = vs.VSRuntimeOptions_add_str_option
    following = add_option(options.record, at(options, offset), "ignored", kind, value)
    if following is None:
        return None
    assert not following.own()
    assert "'struct VSRuntimeOptionHeader *'" in repr(following)
    return int(following) - options.address


# The constructor


@pytest.mark.parametrize("size", [0, 1, 4, 12, 13, 4096])
def test_a_list_is_made_of_any_size(size: int) -> None:
    with methods.owned(vs.new_VSRuntimeOptions(size), vs.delete_VSRuntimeOptions) as made:
        assert "'struct VSRuntimeOptions *'" in repr(made)
        assert vs.VSRuntimeOptions_totalLength_get(made) == size
        assert size <= methods.usable_size(made) < max(size, 24) + methods.ROUNDING


def test_nothing_but_the_length_of_a_new_list_is_set() -> None:
    size = 4000
    with methods.fresh_memory_is_not_zero() as contents:
        expected = methods.patched(contents(size), 0, size.to_bytes(4, "little"))
        with methods.owned(vs.new_VSRuntimeOptions(size), vs.delete_VSRuntimeOptions) as made:
            assert native.read(made, size) == expected


@pytest.mark.parametrize("size", [-1, -13, -(2**31)])
def test_a_negative_size_makes_nothing(size: int) -> None:
    assert vs.new_VSRuntimeOptions(size) is None


# Building


def test_the_first_option_follows_the_length(options: methods.Block) -> None:
    for size in (0, 4, CAPACITY):
        resize(options, size)
        first = vs.VSRuntimeOptions_get_first_option(options.record)
        assert int(first) == options.address + 4
        assert not first.own()


@pytest.mark.parametrize(
    "kind, value, stored",
    [
        (12, 0x12345678, b"\x0c\0\x08\0\x78\x56\x34\x12"),
        (0, -1, b"\0\0\x08\0\xff\xff\xff\xff"),
        (0, -(2**31), b"\0\0\x08\0\0\0\0\x80"),
        (-1, 0, b"\xff\xff\x08\0\0\0\0\0"),
        (0x7FFF000C, 0, b"\x0c\0\x08\0\0\0\0\0"),
        (13, "10.1.1.1", b"\x0d\0\x0d\x0010.1.1.1\0"),
        (14, "", b"\x0e\0\x05\0\0"),
        (0x1000D, "x", b"\x0d\0\x06\0x\0"),
        (13, "\u00e9", b"\x0d\0\x07\0\xc3\xa9\0"),
        (0, "text", b"\0\0\x09\0text\0"),
        (13, "ab\0cd", b"\x0d\0\x07\0ab\0"),
    ],
)
@pytest.mark.parametrize("offset", [4, 9])
def test_an_option_is_its_header_and_value(
    options: methods.Block, kind: int, value: Any, stored: bytes, offset: int
) -> None:
    expected = methods.patched(options.bytes, offset, stored)
    assert add(options, offset, kind, value) == offset + len(stored)
    assert options.bytes == expected


@pytest.mark.parametrize("value", [5, "10.1.1.1", ""])
def test_one_byte_must_stay_free_behind_an_option(options: methods.Block, value: Any) -> None:
    length = 8 if isinstance(value, int) else len(value) + 5
    for size in (0, 4, 4 + length - 1, 4 + length):
        resize(options, size)
        before = options.bytes
        assert add(options, 4, 13, value) is None
        assert options.bytes == before
    resize(options, 4 + length + 1)
    assert add(options, 4, 13, value) == 4 + length


@pytest.mark.parametrize("size, following", [(12, None), (13, 12)])
def test_a_new_list_needs_13_bytes_for_an_integer(size: int, following: Any) -> None:
    with methods.owned(vs.new_VSRuntimeOptions(size), vs.delete_VSRuntimeOptions) as made:
        first = vs.VSRuntimeOptions_get_first_option(made)
        found = vs.VSRuntimeOptions_add_int_option(made, first, "IGMPQueries", 2, 5)
        assert (found and int(found) - int(made)) == following


def test_a_text_has_at_most_127_bytes(options: methods.Block) -> None:
    before = options.bytes
    for text in ("x" * 128, "x" * 70_000, "x" + "\u00e9" * 64):
        assert add(options, 4, 13, text) is None
    assert options.bytes == before

    assert add(options, 4, 13, "x" * 127) == 4 + 132
    assert options.bytes == methods.patched(before, 4, b"\x0d\0\x84\0" + b"x" * 127 + b"\0")


def test_the_name_of_an_option_is_ignored(options: methods.Block) -> None:
    for name in ("MLDVersion", "", "no such option", "x" * 5000):
        position = at(options, 4)
        assert vs.VSRuntimeOptions_add_int_option(options.record, position, name, 2, 0)
        assert vs.VSRuntimeOptionHeader_type_get(position) == 2
        assert vs.VSRuntimeOptions_add_str_option(options.record, position, name, 13, "")
        assert vs.VSRuntimeOptionHeader_type_get(position) == 13


@pytest.mark.parametrize("used, length", [(0, 4), (16, 20), (4092, 4096), (-1, 3), (-4, 0)])
def test_the_length_of_a_list_counts_itself(options: methods.Block, used: int, length: int) -> None:
    expected = methods.patched(options.bytes, 0, length.to_bytes(4, "little"))
    assert vs.VSRuntimeOptions_set_options_length(options.record, used) is None
    assert options.bytes == expected


# Walking


def walk(options: Any) -> Iterator[Tuple[int, str, Any]]:
    """The offsets, names and values of the options of a list."""
    option = vs.VSRuntimeOptions_get_first_option(options)
    while option is not None:
        name = vs.VSRuntimeOptionHeader_get_option_name(option)
        yield int(option) - int(options), name, vs.VSRuntimeOptionHeader_get_option_value(option)
        option = vs.VSRuntimeOptions_get_next_option(options, option)


def test_a_list_is_built_and_walked() -> None:
    wanted = [(0, 125), (13, "224.0.0.1"), (12, -1), (14, "fe80::1")]
    with methods.owned(vs.new_VSRuntimeOptions(100), vs.delete_VSRuntimeOptions) as made:
        first = position = vs.VSRuntimeOptions_get_first_option(made)
        for kind, value in wanted:
            add_option = vs.VSRuntimeOptions_add_int_option
            if isinstance(value, str):
                add_option = vs.VSRuntimeOptions_add_str_option
            position = add_option(made, position, NAMES[kind], kind, value)
        vs.VSRuntimeOptions_set_options_length(made, int(position) - int(first))
        assert vs.VSRuntimeOptions_totalLength_get(made) == 4 + 8 + 14 + 8 + 12
        assert list(walk(made)) == [
            (4, "IGMPQueryInterval", 125),
            (12, "IGMPRouterIP", b"224.0.0.1"),
            (26, "AllowMirrorStats", 2**32 - 1),
            (34, "MLDRouterIP", b"fe80::1"),
        ]


def test_a_walk_ends_after_the_options_that_the_length_counts(options: methods.Block) -> None:
    add(options, 4, 0, 1)
    add(options, 12, 1, 2)
    vs.VSRuntimeOptions_set_options_length(options.record, 16)
    assert vs.VSRuntimeOptions_totalLength_get(options.record) == 20
    assert [offset for offset, _, _ in walk(options.record)] == [4, 12]


@pytest.mark.parametrize("size, following", [(0, None), (12, None), (13, 12)])
def test_the_next_option_begins_below_the_length(
    options: methods.Block, size: int, following: Any
) -> None:
    add(options, 4, 0, 1)
    resize(options, size)
    found = vs.VSRuntimeOptions_get_next_option(options.record, at(options, 4))
    assert (found and int(found) - options.address) == following
    assert found is None or not found.own()


def test_an_option_without_length_is_its_own_successor(options: methods.Block) -> None:
    option = at(options, 4)
    vs.VSRuntimeOptionHeader_length_set(option, 0)
    assert vs.VSRuntimeOptions_get_next_option(options.record, option) == option


# Names and values


@pytest.mark.parametrize("kind", range(15))
def test_an_option_is_named_by_its_type(options: methods.Block, kind: int) -> None:
    option = at(options, 5)
    vs.VSRuntimeOptionHeader_type_set(option, kind)
    assert vs.VSRuntimeOptionHeader_get_option_name(option) == NAMES[kind]


@pytest.mark.parametrize("kind", [0, 11, 12])
@pytest.mark.parametrize("value", [0, 1, 2**31 - 1, -1, -(2**31)])
def test_integers_are_read_without_a_sign(options: methods.Block, kind: int, value: int) -> None:
    add(options, 5, kind, value)
    read = vs.VSRuntimeOptionHeader_get_option_value(at(options, 5))
    assert type(read) is int
    assert read == value % 2**32


@pytest.mark.parametrize("kind", [13, 14, 15, 65535])
@pytest.mark.parametrize("value", [b"224.0.0.1", b"", b"\xff\x80", b"x" * 127])
def test_texts_are_read_as_bytes_up_to_the_first_nul(
    options: methods.Block, kind: int, value: bytes
) -> None:
    native.write(options.record, kind.to_bytes(2, "little") + b"\xff\xff" + value + b"\0yz\0", 5)
    assert vs.VSRuntimeOptionHeader_get_option_value(at(options, 5)) == value


@pytest.mark.parametrize("kind", range(15))
def test_a_name_leads_to_its_type(kind: int) -> None:
    assert vs.get_runtime_option_type_from_name(NAMES[kind]) == kind


@pytest.mark.parametrize(
    "name",
    ["", "allowmirrorstats", "AllowMirrorStat", "AllowMirrorStatsX", " MLDVersion", "\u00e9"],
)
def test_another_name_is_one_past_the_last_type(name: str) -> None:
    assert vs.get_runtime_option_type_from_name(name) == vs.VS_NUM_RT_OPT == 15


def test_the_search_for_a_name_is_exported_to_c() -> None:
    search = ctypes.CDLL(vs.__file__).get_runtime_option_type_from_name
    search.argtypes = [ctypes.c_char_p]
    search.restype = ctypes.c_int
    found: List[int] = [search(name.encode()) for name in NAMES]
    assert found == list(range(15))
    assert search(b"igmpqueries") == 15


# The table of names


def test_the_table_of_names_is_a_pointer() -> None:
    table = vs.cvar.runtimeOptionNames
    assert "'char **'" in repr(table)
    assert not table.own()
    names = (ctypes.c_char_p * 15).from_address(int(table))
    assert [name.decode() for name in names if name] == NAMES


def test_the_table_of_names_cannot_be_set() -> None:
    before = int(vs.cvar.runtimeOptionNames)
    text = "in variable 'read-only runtimeOptionNames' of type 'char const *[]'"
    for value in (vs.cvar.runtimeOptionNames, None, "IGMPQueries", 1):
        reports.raises(AttributeError, text, setattr, vs.cvar, "runtimeOptionNames", value)
    assert int(vs.cvar.runtimeOptionNames) == before
