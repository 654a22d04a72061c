"""What comes back: in the same shape whatever the host's status says."""

from itertools import product

import _libvswitch as vs
import calls
import peer
import pytest
import results
from calls import Call
from recording_host import RecordingHost
from results import BufferResult


@calls.each()
@pytest.mark.proves("result")
def test_a_result_comes_back_in_its_shape(host: RecordingHost, call: Call) -> None:
    own = results.kind(call.result).samples()
    outputs = [results.kind(output).samples() for output in call.outputs]
    rounds = max(map(len, outputs), default=1)
    for answer, turn in product(own, range(rounds)):
        # Outputs of one call differ, or it would not show which is which.
        chosen = [samples[(turn + index) % len(samples)] for index, samples in enumerate(outputs)]
        host.reset()
        told = {call.output_position(index): output.told for index, output in enumerate(chosen)}
        host.answer(call.name, answer.told, outputs=told)
        expected = [results.expected(item) for item in (answer, *chosen)]
        result = call(*call.given())
        assert results.described(result) == (expected if outputs else expected[0])


@calls.each(call for call in calls.ALL if any("text [" in output for output in call.outputs))
def test_a_buffer_that_the_host_leaves_alone_is_an_empty_text(
    host: RecordingHost, call: Call
) -> None:
    (kind,) = map(results.kind, call.outputs)
    assert isinstance(kind, BufferResult)
    position = call.output_position(0)
    host.capture(call.name, position, kind.limit + 1)
    function, given = getattr(vs, call.name), tuple(call.given())
    status, text = peer.call_on_used_stack("L", function, given)

    found = host.details()[0].memory[position - 1]
    assert found is not None
    assert found[:1] == b"\0"
    assert (status, text) == (0, "")
    # Nothing else is cleared, though choosing one of several forms uses the same stack.
    assert b"L" in found


@calls.each(call for call in calls.ALL if call.outputs)
def test_lists_are_new_each_time(host: RecordingHost, call: Call) -> None:
    first, second = call(*call.given()), call(*call.given())
    assert first is not second and type(first) is list
