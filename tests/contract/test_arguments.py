"""What reaches the host: every argument as it was given, or no call at all."""

import ctypes
import sys
from signal import SIGABRT

import _libvswitch as vs
import calls
import children
import pytest
import reports
from arguments import ArrayKind, IntegerKind, Kind, PointerKind, Sample, TextKind
from calls import Call
from recording_host import RecordingHost

DEBUG_INTERPRETER = hasattr(sys, "gettotalrefcount")


def signed(kind: Kind) -> bool:
    return isinstance(kind, IntegerKind) and kind.signed


@calls.each_argument()
@pytest.mark.proves("passes")
def test_an_argument_passes_unchanged(host: RecordingHost, call: Call, position: int) -> None:
    for sample in call.kind(position).samples():
        samples = call.plain()
        samples[position - 1] = sample
        host.reset()
        for place, other in enumerate(samples, start=1):
            if other.memory is not None:
                host.capture(call.name, place, len(other.memory))
        call(*(other.given for other in samples))

        assert host.calls() == [(call.name, call.seen(samples))]
        for other, memory in zip(samples, host.details()[0].memory):
            assert other.memory is None or memory == other.memory


@calls.each([call for call in calls.ALL if not call.arguments])
def test_a_call_without_arguments_is_made(host: RecordingHost, call: Call) -> None:
    call()
    assert host.calls() == [(call.name, ())]


@calls.each_argument(lambda kind: kind.refused())
@pytest.mark.proves("refuses")
def test_what_does_not_convert_is_refused_and_not_called(
    host: RecordingHost, call: Call, position: int
) -> None:
    for value, error in call.kind(position).refused():
        reports.raises(*call.refusal(position, error), call, *call.given_with(position, value))
    assert host.calls() == []


@calls.each_argument(lambda kind: kind.refused())
def test_of_several_failures_the_first_is_reported(
    host: RecordingHost, call: Call, position: int
) -> None:
    given = call.given()
    for later in call.positions()[position - 1 :]:
        for value, _ in call.kind(later).refused()[:1]:
            given[later - 1] = value
    _, error = call.kind(position).refused()[0]
    reports.raises(*call.refusal(position, error), call, *given)
    assert host.calls() == []


@calls.each()
@pytest.mark.proves("count")
def test_any_other_count_is_refused_and_not_called(host: RecordingHost, call: Call) -> None:
    right = {len(other.arguments) for other in calls.ALL if other.name == call.name}
    for given in set(range(max(right) + 3)) - right:
        if given < min(right) or not call.ignores_more:
            reports.raises(*call.wrong_count(given), call, *(call.given() + [None] * given)[:given])
    assert host.calls() == []


@calls.each_argument(signed)
def test_beyond_64_bits_the_call_is_made_with_minus_one_and_the_error_follows(
    host: RecordingHost, call: Call, position: int
) -> None:
    if DEBUG_INTERPRETER:
        child_aborts(call, position)
        return
    for value in (2**63, -(2**63) - 1, 2**200):
        host.reset()
        with pytest.raises(SystemError, match="returned a result with an ") as caught:
            call(*call.given_with(position, value))
        assert type(caught.value.__cause__) is OverflowError

        samples = call.plain()
        samples[position - 1] = Sample(value, -1)
        assert host.calls() == [(call.name, call.seen(samples))]


def child_aborts(call: Call, position: int) -> None:
    """To a debug interpreter a result with an error pending is fatal."""
    signal, said = children.fork(lambda: call(*call.given_with(position, 2**63)))
    assert signal == SIGABRT, said
    assert f"<built-in function {call.name}> returned a result with an " in said


@calls.each_argument(calls.of_kinds(TextKind))
def test_a_str_is_copied_and_a_char_pointer_is_not(
    host: RecordingHost, call: Call, position: int
) -> None:
    utf8 = ctypes.pythonapi.PyUnicode_AsUTF8
    utf8.argtypes = [ctypes.py_object]
    utf8.restype = ctypes.c_void_p
    for sample in call.kind(position).samples():
        host.reset()
        call(*call.given_with(position, sample.given))
        place = host.details()[0].addresses[position - 1]
        if isinstance(sample.given, str):
            assert place not in (0, utf8(sample.given))
        else:
            assert place == int(getattr(sample.given, "this", sample.given) or 0)


@calls.each_argument(lambda kind: isinstance(kind, PointerKind) and " const " not in kind.type)
@pytest.mark.parametrize("traps", [False, True])
def test_what_the_host_writes_where_a_pointer_leads_is_there(
    host: RecordingHost, call: Call, position: int, traps: bool
) -> None:
    sample = call.kind(position).plain(position)
    assert sample.memory
    written = bytes(reversed(sample.memory))
    host.answer(call.name, outputs={position: written})
    if traps:
        host.spring(call.name, RuntimeError, "late", after_outputs=True)
        reports.raises(RuntimeError, "late", call, *call.given())
    else:
        call(*call.given())
    assert ctypes.string_at(sample.seen, len(written)) == written
    ctypes.memmove(sample.seen, sample.memory, len(written))


def test_a_record_of_the_module_is_passed_and_filled(host: RecordingHost) -> None:
    info = vs.new_VSInfo()
    filled = (9000).to_bytes(4, "little") + bytes(range(1, 13)) + b"n" * 128 + b"i" * 64
    host.answer("VSQEX_GetVSInfo", outputs={2: filled})
    vs.VSInfo_mtu_set(info, 1500)

    assert vs.VSQEX_GetVSInfo("dvs0", info) == 0
    assert vs.VSInfo_mtu_get(info) == 9000
    assert host.details()[0].memory[1] == (1500).to_bytes(4, "little") + bytes(204)
    assert host.calls() == [("VSQEX_GetVSInfo", (b"dvs0", int(info)))]
    vs.delete_VSInfo(info)


@calls.each_argument(calls.of_kinds(ArrayKind))
def test_what_the_host_writes_into_an_array_is_discarded(
    host: RecordingHost, call: Call, position: int
) -> None:
    kind = call.kind(position)
    assert isinstance(kind, ArrayKind)
    text = "".join(["given ", "text"])
    host.answer(call.name, 7, outputs={position: b"W" * kind.size})
    host.capture(call.name, position, kind.size)
    assert [call(*call.given_with(position, text)) for _ in range(2)] == [7, 7]
    assert text == "given text"
    seen = [details.memory[position - 1] for details in host.details()]
    assert seen == [b"given text".ljust(kind.size, b"\0")] * 2
