"""Calls that trap: the exception that the host names, and a module that goes on."""

import calls
import pytest
import reports
import results
from calls import Call
from recording_host import RecordingHost

TRAPPED = [call for call in calls.ALL if call.name != "Panic"]


class HostError(Exception):
    """An exception that the module cannot know."""


class HostExit(BaseException):
    """One that is no Exception."""


TRAPS = [
    (RuntimeError, "the call trapped: größe 100%s%n", 1),
    (ValueError, "", -1),
    (MemoryError, "x" * 5000, 2**31 - 1),
    (HostError, "line\nbreak", 7),
    (HostExit, "{}", -(2**31)),
]


def answer_something(host: RecordingHost, call: Call) -> None:
    told = [results.kind(output).samples()[-1].told for output in call.outputs]
    host.answer(call.name, outputs={call.output_position(i): told[i] for i in range(len(told))})


@calls.each(TRAPPED)
@pytest.mark.proves("trap")
def test_a_sprung_trap_raises_what_the_host_names_and_the_next_call_works(
    host: RecordingHost, call: Call
) -> None:
    for exception, text, value in TRAPS:
        for after_outputs in (False, True):
            host.reset()
            answer_something(host, call)
            host.spring(call.name, exception, text, nth=1, value=value, after_outputs=after_outputs)
            reports.raises(exception, text, call, *call.given())
            assert host.exception_status == value

            samples = call.plain()
            call(*(sample.given for sample in samples))
            assert host.exception_status == 0
            assert host.calls() == [(call.name, call.seen(samples))] * 2
            assert [details.exception_status for details in host.details()] == [0, 0]


@calls.each(call for call in TRAPPED if call.arguments)
def test_the_trap_is_not_armed_for_arguments_that_do_not_convert(
    host: RecordingHost, call: Call
) -> None:
    host.exception_status = 42
    value, error = call.kind(1).refused()[0]
    reports.raises(*call.refusal(1, error), call, *call.given_with(1, value))
    assert host.exception_status == 42


def test_panic_alone_does_not_arm_the_trap(host: RecordingHost) -> None:
    for call in calls.ALL:
        host.exception_status = 42
        call(*call.given())
    unarmed = [
        call.function
        for call, details in zip(host.calls(), host.details())
        if details.exception_status != 0
    ]
    assert unarmed == ["Panic"]
