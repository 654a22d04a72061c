"""Every call is recorded: what the tool gave, what the host returned, whatever its shape."""

import json
from typing import Any, Dict, List

import pytest
from recordings import RECORDING, Recording, record

# Makes every call with arguments that all differ, each output as the recording host is told. What
# it prints was given and told; nothing of it comes from the recorder or from its tables.
EVERY_CALL = """
import json
import calls, results
from recording_host import RecordingHost

host = RecordingHost()
told_of = []
for call in calls.ALL:
    host.reset()
    samples = call.plain()
    outputs = [results.kind(output).samples()[-1] for output in call.outputs]
    own = results.kind(call.result).samples()[-1]
    told = {call.output_position(at): one.told for at, one in enumerate(outputs)}
    status = 0 if call.result == "status" else own.told
    host.answer(call.name, status, outputs=told)
    call(*(sample.given for sample in samples))
    (seen,) = host.calls()
    told_of.append({
        "function": call.name,
        "kinds": [type(call.kind(at)).__name__ for at in call.positions()],
        "given": [one.decode() if isinstance(one, bytes) else one for one in seen.values],
        "result": status.decode() if isinstance(status, bytes) else status,
        "returns": call.result,
        "outputs": [
            one.told.split(b"\\\\0")[0].decode("utf-8", "replace") if isinstance(one.told, bytes)
            else one.told for one in outputs
        ],
        "shapes": list(call.outputs),
    })
print(json.dumps(told_of))
"""


@pytest.fixture(name="recording", scope="module")
def fixture_recording(tmp_path_factory: pytest.TempPathFactory) -> Recording:
    made = record(EVERY_CALL, tmp_path_factory.mktemp("every") / "trace.jsonl", RECORDING)
    assert made.status == 0, made.stderr
    return made


@pytest.fixture(name="told", scope="module")
def fixture_told(recording: Recording) -> List[Dict[str, Any]]:
    found: List[Dict[str, Any]] = json.loads(recording.stdout)
    return found


def test_every_call_is_there_once_and_in_order(
    recording: Recording, told: List[Dict[str, Any]]
) -> None:
    assert [call.function for call in recording.calls] == [one["function"] for one in told]
    assert len({one["function"] for one in told}) == 146
    numbers = [call.number for call in recording.calls]
    assert numbers == sorted(numbers) and all(call.has_ended for call in recording.calls)


def test_numbers_and_texts_are_as_they_were_given(
    recording: Recording, told: List[Dict[str, Any]]
) -> None:
    compared = 0
    kinds = ("IntegerKind", "BooleanKind", "TextKind")
    for call, one in zip(recording.calls, told):
        given = [value for kind, value in zip(one["kinds"], one["given"]) if kind in kinds]
        plain = [value for value in call.inputs.values() if isinstance(value, (int, str))]
        assert [value for value in plain if not str(value).startswith("array ")] == given, call
        compared += len(given)
    assert compared > 200


def test_results_are_as_the_host_returned_them(
    recording: Recording, told: List[Dict[str, Any]]
) -> None:
    for call, one in zip(recording.calls, told):
        if one["returns"] == "status":
            assert (call.status, call.result) == (0, None)
        elif one["returns"] in ("text", "int", "unsigned int") and one["result"] is not None:
            assert call.result == one["result"], call.function


def test_numbers_and_texts_that_come_out_are_as_the_host_wrote_them(
    recording: Recording, told: List[Dict[str, Any]]
) -> None:
    compared = 0
    for call, one in zip(recording.calls, told):
        # What the module adds to a result are the last parameters of the call.
        names = list(call.outputs)[len(call.outputs) - len(one["outputs"]) :]
        for name, output, shape in zip(names, one["outputs"], one["shapes"]):
            if isinstance(output, int) and "*" not in shape:
                assert call.outputs[name] == output, (call.function, name, shape)
                compared += 1
    assert compared >= 8
