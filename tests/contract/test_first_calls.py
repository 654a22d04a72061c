"""The first calls: what reaches the host, what comes back, and what a sprung trap raises."""

import ctypes
from typing import Any, List, Tuple, Type

import _libvswitch as vs
import pytest
from peer import pointer_object
from recording_host import RecordingHost, Value

UINT32_MAX = 2**32 - 1
STATUSES = [0, 1, 0x0BAD0001, 0x2BAD0000, 2**31 - 1, -1, -(2**31)]

# Each call that can be trapped, with arguments that convert.
CALLS: List[Tuple[str, Tuple[Any, ...]]] = [
    ("VSDVS_CreateVSwitch", ("dvs0", None, None, 128, 1, 0, 1500, 0)),
    ("VSDVS_DestroyVSwitch", ("dvs0",)),
    ("VSDVS_GetMTU", ("dvs0", None)),
    ("VSDVS_SetMTU", ("dvs0", 9000)),
    ("VSDVS_FreeMemory", (None,)),
    ("VSQEX_GetVSInfo", ("dvs0", None)),
    ("VSQEX_GetUplinks", ("dvs0",)),
    ("VSQEX_FreeMemory", (None,)),
    ("QEX_ReturnStatusToString", (0,)),
]
OTHER_RESULTS = {
    "VSDVS_FreeMemory",
    "VSQEX_FreeMemory",
    "VSQEX_GetUplinks",
    "QEX_ReturnStatusToString",
}
STATUS_CALLS = [(call, arguments) for call, arguments in CALLS if call not in OTHER_RESULTS]


@pytest.mark.parametrize("text", ["", "dvs0", "größe-\N{SNOWMAN}", "x" * 100_000, None])
@pytest.mark.parametrize("number", [0, 1, 2**31, UINT32_MAX])
def test_texts_and_numbers_pass_unchanged(host: RecordingHost, text: str, number: int) -> None:
    seen: Value = None if text is None else text.encode()
    vs.VSDVS_CreateVSwitch(text, "id", text, number, 1, number, 5, number)
    vs.VSDVS_DestroyVSwitch(text)
    vs.VSDVS_SetMTU(text, number)
    assert host.calls() == [
        ("VSDVS_CreateVSwitch", (seen, b"id", seen, number, 1, number, 5, number)),
        ("VSDVS_DestroyVSwitch", (seen,)),
        ("VSDVS_SetMTU", (seen, number)),
    ]


@pytest.mark.parametrize(
    "given, seen", [(0, 0), (127, 127), (-128, -128), (True, 1), ("", 0), ("A", 65), ("\x7f", 127)]
)
def test_booleans_pass_as_their_byte(host: RecordingHost, given: object, seen: int) -> None:
    vs.VSDVS_CreateVSwitch("a", "b", "c", 0, given, 0, 0, 0)
    assert host.calls()[0].values[4] == seen


@pytest.mark.parametrize("status", STATUSES)
@pytest.mark.parametrize("call, arguments", STATUS_CALLS)
def test_statuses_are_returned_and_never_raised(
    host: RecordingHost, call: str, arguments: Tuple[Any, ...], status: int
) -> None:
    host.answer(call, status)
    result = getattr(vs, call)(*arguments)
    assert (type(result), result) == (int, status)


def test_an_argument_that_does_not_convert_makes_no_call(host: RecordingHost) -> None:
    message = "in method 'VSDVS_CreateVSwitch', argument 4 of type 'qex_uint32'"
    with pytest.raises(OverflowError) as error:
        vs.VSDVS_CreateVSwitch("a", "b", "c", -1, 0, 0, 0, 0)
    assert str(error.value) == message
    with pytest.raises(TypeError):
        vs.VSDVS_CreateVSwitch("a", "b", "c", 0, 0, 0, 0)
    assert host.calls() == []


def test_get_mtu_writes_through_the_callers_pointer(host: RecordingHost) -> None:
    mtu = ctypes.c_uint32(1)
    host.answer("VSDVS_GetMTU", outputs={2: UINT32_MAX})
    assert vs.VSDVS_GetMTU("dvs0", pointer_object(ctypes.addressof(mtu), "unsigned int *")) == 0
    assert mtu.value == UINT32_MAX
    assert host.calls() == [("VSDVS_GetMTU", (b"dvs0", ctypes.addressof(mtu)))]


def test_get_mtu_takes_no_number(host: RecordingHost) -> None:
    with pytest.raises(TypeError) as error:
        vs.VSDVS_GetMTU("dvs0", 9000)
    assert str(error.value) == "in method 'VSDVS_GetMTU', argument 2 of type 'qex_uint32 *'"
    assert host.calls() == []


def test_the_callers_record_is_passed_and_filled(host: RecordingHost) -> None:
    info = vs.new_VSInfo()
    filled = (9000).to_bytes(4, "little") + bytes(range(1, 13)) + b"n" * 128 + b"i" * 64
    host.answer("VSQEX_GetVSInfo", outputs={2: filled})
    vs.VSInfo_mtu_set(info, 1500)

    assert vs.VSQEX_GetVSInfo("dvs0", info) == 0
    assert vs.VSInfo_mtu_get(info) == 9000
    assert vs.VSQEX_GetVSInfo("dvs0", info) == 0

    before, after = (details.memory[1] for details in host.details())
    assert before == (1500).to_bytes(4, "little") + bytes(204)
    assert after == filled
    assert host.calls()[0] == ("VSQEX_GetVSInfo", (b"dvs0", int(info)))
    vs.delete_VSInfo(info)


@pytest.mark.parametrize("status", STATUSES)
def test_the_hosts_record_comes_with_the_status_whatever_that_is(
    host: RecordingHost, status: int
) -> None:
    record = ctypes.create_string_buffer(64)
    host.answer("VSQEX_GetUplinks", status, outputs={2: ctypes.addressof(record)})
    result = vs.VSQEX_GetUplinks("dvs0")
    assert type(result) is list
    assert result[0] == status
    assert int(result[1]) == ctypes.addressof(record)
    assert "VSUplinks *'" in repr(result[1])
    assert not result[1].own()
    assert len(result) == 2

    (call,) = host.calls()
    assert (call.function, call.values[0]) == ("VSQEX_GetUplinks", b"dvs0")
    assert host.details()[0].types == ("const char*", "VSUplinks**")


def test_a_null_record_of_the_host_is_none(host: RecordingHost) -> None:
    host.answer("VSQEX_GetUplinks", 0x0BAD0003, outputs={2: 0})
    assert vs.VSQEX_GetUplinks("dvs0") == [0x0BAD0003, None]


@pytest.mark.parametrize("call", ["VSDVS_FreeMemory", "VSQEX_FreeMemory"])
def test_memory_of_any_type_goes_back(host: RecordingHost, call: str) -> None:
    info = vs.new_VSInfo()
    number = pointer_object(0x1234, "unsigned int *")
    results = [getattr(vs, call)(memory) for memory in (info, number, None)]
    assert results == [None, None, None]
    assert host.calls() == [(call, (int(info),)), (call, (0x1234,)), (call, (None,))]
    vs.delete_VSInfo(info)


@pytest.mark.parametrize(
    "text, result",
    [
        (b"Success", "Success"),
        (b"", ""),
        ("größe".encode(), "größe"),
        (b"bad \xff byte", "bad \udcff byte"),
        (None, None),
    ],
)
def test_the_text_of_a_status(host: RecordingHost, text: Value, result: str) -> None:
    host.answer("QEX_ReturnStatusToString", text)
    assert vs.QEX_ReturnStatusToString(0x0BAD0001) == result


@pytest.mark.parametrize("status", STATUSES)
def test_a_status_passes_with_its_sign(host: RecordingHost, status: int) -> None:
    vs.QEX_ReturnStatusToString(status)
    assert host.calls() == [("QEX_ReturnStatusToString", (status,))]


class OwnError(Exception):
    """An exception that the module cannot know."""


@pytest.mark.parametrize("exception", [RuntimeError, OSError, MemoryError, OwnError])
@pytest.mark.parametrize("call, arguments", CALLS)
def test_a_sprung_trap_raises_and_the_next_call_works(
    host: RecordingHost, call: str, arguments: Tuple[Any, ...], exception: Type[Exception]
) -> None:
    text = "the host gave up: größe 100%s"
    host.spring(call, exception, text, nth=1, value=7)
    with pytest.raises(exception) as error:
        getattr(vs, call)(*arguments)
    assert (type(error.value), str(error.value)) == (exception, text)
    assert host.exception_status == 7

    getattr(vs, call)(*arguments)
    assert host.exception_status == 0
    assert [details.exception_status for details in host.details()] == [0, 0]


def test_outputs_written_before_the_trap_springs_stay(host: RecordingHost) -> None:
    mtu = ctypes.c_uint32(1)
    host.answer("VSDVS_GetMTU", outputs={2: 9000})
    host.spring("VSDVS_GetMTU", RuntimeError, "late", after_outputs=True)
    with pytest.raises(RuntimeError, match="^late$"):
        vs.VSDVS_GetMTU("dvs0", pointer_object(ctypes.addressof(mtu), "unsigned int *"))
    assert mtu.value == 9000


def test_panic_passes_its_first_text_and_a_null_pointer(host: RecordingHost) -> None:
    assert vs.Panic("x") is None
    assert vs.Panic("x %s %n", 1, object()) is None
    assert vs.Panic(None) is None
    assert host.calls() == [
        ("Panic", (b"x", None)),
        ("Panic", (b"x %s %n", None)),
        ("Panic", (None, None)),
    ]


def test_panic_takes_a_text(host: RecordingHost) -> None:
    with pytest.raises(TypeError) as error:
        vs.Panic(5)
    assert str(error.value) == "in method 'Panic', argument 1 of type 'char const *'"
    with pytest.raises(TypeError):
        vs.Panic()
    assert host.calls() == []


def test_panic_alone_does_not_arm_the_trap(host: RecordingHost) -> None:
    host.exception_status = 42
    vs.Panic("x")
    vs.VSDVS_DestroyVSwitch("dvs0")
    assert [details.exception_status for details in host.details()] == [42, 0]
