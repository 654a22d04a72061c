"""Every call is played: what came back comes back again, whatever its shape, and how it ended."""

import json
from pathlib import Path
from typing import Any, Dict, List

import pytest
from recordings import RECORDING, Playing, Recording, play, program, record

# Makes every call: with each result and each output, refused, and with a trap. It prints what it
# gets; the host that tells it what to get is there only while it is recorded.
EVERY_CALL = """
import json, os
import calls, results
from recording_host import RecordingHost

host = None if os.environ["IS_PLAYED"] else RecordingHost()
said = []

def shown(value):
    told = results.described(value)
    if isinstance(value, list):
        return [shown(one) for one in value]
    return "pointer" if isinstance(told, results.PointerTo) else [type(value).__name__, value]

def make(call, **wanted):
    if host is not None:
        host.reset()
        outputs = {**places(call), **wanted["outputs"]} if wanted["outputs"] is not None else {}
        host.answer(call.name, wanted["result"], outputs=outputs)
        if wanted.get("trap"):
            host.spring(call.name, RuntimeError, wanted["trap"], nth=1)
    try:
        said.append([call.name, shown(call(*call.given()))])
    except RuntimeError as error:
        said.append([call.name, "trap", str(error)])

def samples(kind):
    # An address that leads nowhere cannot be followed, and what does not fit is no text.
    found = [one.told for one in results.kind(kind).samples()]
    if type(results.kind(kind)).__name__ == "PointerResult":
        return [0]
    limit = getattr(results.kind(kind), "limit", None)
    return [one for one in found if limit is None or len(one.split(b"\\0")[0]) <= limit]

# A sample of one form of address, with the name of a longer one, and options that say that they are
# longer than their memory: what lies beyond it is chance.
LEFT_OUT = {"VSQEX_GetMcastFilterStats", "VSQEX_SetRuntimeOptions"}

def places(call):
    # Where a caller has room for a pointer, nothing comes out; else it would be one to nowhere.
    types = host.functions[call.name].parameters
    return {at: bytes(8) for at, one in enumerate(types, 1) if one.endswith("**")}

for call in calls.ALL:
    if call.name in LEFT_OUT:
        continue
    outputs = [samples(output) for output in call.outputs]
    own = [one.told for one in results.kind(call.result).samples()]
    is_status = call.result == "status"
    for turn in range(max([len(own)] + [len(one) for one in outputs])):
        chosen = [one[(turn + at) % len(one)] for at, one in enumerate(outputs)]
        told = {call.output_position(at): one for at, one in enumerate(chosen)}
        make(call, result=0 if is_status else own[turn % len(own)], outputs=told)
    for result in [one for one in own if is_status and one != 0]:
        make(call, result=result, outputs=None)
    if call.name != "Panic":  # which never traps
        make(call, result=own[0], outputs=None, trap=f"{call.name} is too late: größe")
print(json.dumps(said))
"""


@pytest.fixture(name="recording", scope="module")
def fixture_recording(tmp_path_factory: pytest.TempPathFactory) -> Recording:
    trace = tmp_path_factory.mktemp("every") / "trace.jsonl"
    made = record(EVERY_CALL, trace, RECORDING, IS_PLAYED="")
    assert made.status == 0, made.stderr
    return made


@pytest.fixture(name="playing", scope="module")
def fixture_playing(recording: Recording, alone: Path) -> Playing:
    return play(program(EVERY_CALL), recording.trace, alone, IS_PLAYED="1")


def by_call(said: str) -> Dict[str, List[Any]]:
    found: Dict[str, List[Any]] = {}
    for name, *rest in json.loads(said):
        found.setdefault(name, []).append(rest)
    return found


def test_every_call_gets_what_it_got(recording: Recording, playing: Playing) -> None:
    assert playing.stderr == ""
    assert playing.status == 0
    before, now = by_call(recording.stdout), by_call(playing.stdout)
    assert len(before) == 144 and sum(map(len, before.values())) > 1500
    for name, results in before.items():
        assert now[name] == results, name
    assert (playing.left, playing.has_failed) == ([], False)


def test_what_it_prints_shows_a_difference(recording: Recording) -> None:
    results = by_call(recording.stdout)
    assert [["int", 9000]] not in results["VSDVS_SetMTU"]
    assert len({json.dumps(one) for one in results["VSDVS_GetMTU"]}) > 5
    assert results["VSDVS_GetMTU"][-1] == ["trap", "VSDVS_GetMTU is too late: größe"]
