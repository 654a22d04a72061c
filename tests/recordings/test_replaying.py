"""Calls of a trace are made again on the simulated host, and what differs is told."""

import json
from pathlib import Path
from typing import Any, Dict, List, Optional, Tuple

import pytest
from libvswitch.errors import HostError
from recordings import Recording, record
from simhost import Host
from test_recorded_shapes import SCENARIO, TOOL
from vswitch import _front
from vswitch._replayer import PresentHost
from vswitch.likeness import Difference
from vswitch.replay import NOT_MADE, Report, Visit, check, replay
from vswitch.trace import TraceError

UNKNOWN = "it is given what no call that was made has returned, or what is released"

WALKS = """
import libvswitch as vs
from libvswitch import checked

checked.VSQEX_GetGlobalMACLearningProps()
checked.VSDVS_CreateVSwitch("own", None, None, 64, True, 0, 9000, 0)
handle = vs.DVSState_SwitchFindByAlias("own")
identifier = vs.DVS_SwitchId(handle)
checked.VSDVS_AddDVPort("own", "p", 7)
checked.VSDVS_AddDVPort("own", "q", 7)

def visit(port, context):
    name = vs.DVS_PortId(port)
    number = checked.VSDVS_DvPortIDToPortIDFromDVSID(identifier, name)
    vs.VSQEX_PortGetTeamUplinkHint(number, vs.qex_Name())
    vs.DVSState_PortDataForEach(port, lambda item, context: vs.DVSData_PropType(item) != 0, None)
    return name != "q"

vs.DVSState_PortForEach(handle, visit, None)
image = checked.DVSQEX_StateGet()
checked.VSDVS_DestroyVSwitch("own")
checked.DVSQEX_StateInit(image)
assert vs.DVS_SwitchId(vs.DVSState_SwitchFindByAlias("own")) == identifier
"""


@pytest.fixture(name="present", scope="module")
def fixture_present() -> PresentHost:
    return PresentHost()


def recorded(folder: Path, tool: str) -> Recording:
    scenario = folder / "host.json"
    scenario.write_text(json.dumps(SCENARIO))
    made = record(tool, folder / "trace.jsonl", SIMHOST_SCENARIO=str(scenario))
    assert made.status == 0, made.stderr
    return made


@pytest.fixture(name="shapes", scope="module")
def fixture_shapes(tmp_path_factory: pytest.TempPathFactory) -> Recording:
    return recorded(tmp_path_factory.mktemp("shapes"), TOOL)


@pytest.fixture(name="walks", scope="module")
def fixture_walks(tmp_path_factory: pytest.TempPathFactory) -> Recording:
    return recorded(tmp_path_factory.mktemp("walks"), WALKS)


def first(report: Report) -> Dict[str, Tuple[str, Any, Any]]:
    """Of each function what differed first."""
    differing = {name: of.first for name, of in report.functions.items() if of.first is not None}
    return {
        name: (found.path, found.recorded, found.present) for name, (_, found) in differing.items()
    }


@pytest.mark.scenario(SCENARIO)
def test_on_the_same_host_every_call_goes_as_it_was_recorded(
    host: Host, present: PresentHost, shapes: Recording, walks: Recording
) -> None:
    for recording in (shapes, walks):
        host.reset()
        count = check(recording.trace, present)
        report = replay(recording.trace, present)
        assert first(report) == {} and report.is_alike
        assert sum(of.alike for of in report.functions.values()) == count > 30


@pytest.mark.scenario(SCENARIO)
def test_a_setting_that_is_another_is_found(
    host: Host, present: PresentHost, shapes: Recording
) -> None:
    host.apply({"switches": [{"alias": "lab", "ports": [{"id": "web-1", "vlan": {"id": 8}}]}]})
    report = replay(shapes.trace, present)
    path = "out.policy.VSPortVlanPolicy.vlanID"
    assert first(report)["VSDVS_GetPortVLANPolicy"] == (path, 7, 8)
    assert not report.is_alike


@pytest.mark.scenario(SCENARIO)
def test_a_default_that_is_another_is_found(
    host: Host, present: PresentHost, walks: Recording
) -> None:
    host.apply({"mac_learning": {"aging_time": 299}})
    report = replay(walks.trace, present)
    assert first(report) == {"VSQEX_GetGlobalMACLearningProps": ("out.props.agingTime", 300, 299)}


@pytest.mark.scenario(SCENARIO)
def test_a_status_that_is_another_is_found(
    host: Host, present: PresentHost, shapes: Recording
) -> None:
    host.fault("VSQEX_GetLAGTable", status="QEX_BUSY")
    report = replay(shapes.trace, present)
    assert first(report) == {
        "VSQEX_GetLAGTable": ("status", "QEX_OK", "QEX_BUSY"),
        "VSQEX_FreeMemory": (
            NOT_MADE,
            "an end",
            UNKNOWN,
        ),
    }


@pytest.mark.scenario(SCENARIO)
def test_a_trap_is_found_and_the_next_call_works(
    host: Host, present: PresentHost, walks: Recording
) -> None:
    host.fault("VSDVS_AddDVPort", nth=2, panic=(OSError, "planned"))
    report = replay(walks.trace, present)
    found = first(report)
    assert found["VSDVS_AddDVPort"] == ("trap", "QEX_OK", "OSError: planned")
    assert found["DVSState_PortForEach"] == ("callbacks", 2, 1)
    # What the tool asked of the port that is missing.
    why = "the host did not call back so often"
    assert found["DVS_PortId"] == (NOT_MADE, "an end", why)


@pytest.mark.scenario(SCENARIO)
def test_identifiers_and_images_are_the_present_hosts(
    host: Host, present: PresentHost, walks: Recording
) -> None:
    created = [one for one in walks.calls if one.function == "DVS_SwitchId"]
    replay(walks.trace, present)
    (own,) = [one for one in host.describe()["switches"] if one["alias"] == "own"]
    assert own["id"] != created[0].result


@pytest.mark.scenario(SCENARIO)
def test_only_questions(host: Host, present: PresentHost, walks: Recording) -> None:
    before = host.describe()["switches"]
    report = replay(walks.trace, present, questions_only=True)
    assert host.describe()["switches"] == before
    assert report.functions["VSDVS_CreateVSwitch"].left_out == 1
    assert report.functions["VSDVS_CreateVSwitch"].calls == 1
    # There is no such switch to ask of.
    assert first(report)["DVSState_SwitchFindByAlias"][::2] == ("result", None)


@pytest.mark.scenario(SCENARIO)
def test_what_is_known_is_allowed(host: Host, present: PresentHost, shapes: Recording) -> None:
    host.apply({"switches": [{"alias": "lab", "ports": [{"id": "web-1", "vlan": {"id": 8}}]}]})

    def allows(function: str, difference: Difference) -> bool:
        return difference.pattern.startswith("out.policy")

    report = replay(shapes.trace, present, allows)
    assert report.functions["VSDVS_GetPortVLANPolicy"].allowed == 1
    assert first(report) == {} and report.is_alike


def test_threads_and_processes_are_replayed_one_after_the_other(
    host: Host, present: PresentHost, tmp_path: Path
) -> None:
    tool = """
    import os, threading
    import libvswitch as vs
    from libvswitch import checked

    def work(name):
        for mtu in range(1500, 1510):
            checked.VSDVS_CreateVSwitch(name, None, None, 8, True, 0, mtu, 0)
            handle = vs.DVSState_SwitchFindByAlias(name)
            assert vs.DVS_SwitchName(handle) == name
            checked.VSDVS_DestroyVSwitch(name)

    threads = [threading.Thread(target=work, args=[name]) for name in "ab"]
    for one in threads:
        one.start()
    for one in threads:
        one.join()
    handle = vs.DVSState_SwitchFindByAlias("vswitch0")
    if os.fork() == 0:
        vs.DVS_SwitchName(handle)
        vs.DVS_SwitchName(vs.DVSState_SwitchFindByAlias("vswitch0"))
        os._exit(0)
    os.wait()
    vs.DVS_SwitchName(handle)
    """
    made = record(tool, tmp_path / "trace.jsonl")
    assert made.status == 0, made.stderr
    assert len({(one.process, one.thread) for one in made.calls}) == 4
    report = replay(made.trace, present)
    # The child was given the handle before it was one.
    assert first(report) == {"DVS_SwitchName": (NOT_MADE, "an end", UNKNOWN)}
    assert report.functions["DVS_SwitchName"].reasons == {UNKNOWN: 1}


def test_a_library_that_is_not_there_is_missed(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setattr(_front, "folder", lambda: tmp_path)
    with pytest.raises(HostError) as caught:
        PresentHost()
    assert str(caught.value) == f"replay is not installed: there is no {tmp_path}/libreplayer.so"


class Unasked:
    """A host that nothing may be asked of."""

    def check(self, function: str, inputs: Dict[str, Any]) -> Optional[str]:
        return None

    def make(self, function: str, inputs: Dict[str, Any], visit: Visit) -> Dict[str, Any]:
        raise AssertionError("nothing was to be made")


HEADER = {"vswitch trace": 1, "module": "1.0", "time": "", "command": ["x"], "libraries": {}}
PROCESS = {"process": 7, "parent": 1, "time": "", "program": "/x", "libraries": {}}


def event(number: int, function: str, inputs: Any, **more: Any) -> Dict[str, Any]:
    begin = {"call": number, "process": 7, "thread": 1, "function": function, "at": 0}
    return {**begin, "in": inputs, **more}


def written(path: Path, *events: Dict[str, Any]) -> Path:
    path.write_text("".join(f"{json.dumps(one)}\n" for one in (HEADER, PROCESS, *events)))
    return path


def end(number: int, **more: Any) -> Dict[str, Any]:
    return {"end": number, "process": 7, "took": 1, **more}


class Finding(Unasked):
    """A host that finds every port at an address of its own."""

    def __init__(self) -> None:
        self.given: List[Any] = []

    def make(self, function: str, inputs: Dict[str, Any], visit: Visit) -> Dict[str, Any]:
        if function == "DVSState_PortFind":
            return {"result": {"at": 1000 + len(self.given)}}
        if "handle" in inputs:
            self.given.append(inputs["handle"])
        return {"result": "p"}


def test_a_program_that_a_process_runs_next_has_other_memory(tmp_path: Path) -> None:
    def find(number: int) -> List[Dict[str, Any]]:
        begin = event(number, "DVSState_PortFind", {"switchId": "s", "port": "p"})
        return [begin, end(number, result={"at": 1})]

    def ask(number: int) -> List[Dict[str, Any]]:
        return [event(number, "DVS_PortId", {"handle": {"at": 1}}), end(number, result="p")]

    events = [*find(1), *ask(2), *find(3), *ask(4), PROCESS, *ask(1), *find(2), *ask(3)]
    finding = Finding()
    report = replay(written(tmp_path / "trace.jsonl", *events), finding)
    assert finding.given == [{"at": 1000}, {"at": 1001}, {"at": 1002}]
    assert first(report) == {"DVS_PortId": (NOT_MADE, "an end", UNKNOWN)}


def test_calls_of_a_walk_that_ended_its_program_are_not_those_of_the_next(tmp_path: Path) -> None:
    def walk(last: Dict[str, Any]) -> List[Dict[str, Any]]:
        callback = {"callback": 2, "process": 7, "thread": 1, "argument": "callback", "at": 1}
        return [
            event(1, "DVSState_SwitchForEach", {"callback": {"at": 5}, "context": None}),
            {**callback, "in": {"reached": {"at": 2}}, "within": 1},
            event(3, "DVS_PortId", {"handle": {"at": 2}}, within=2),
            end(3, result="p"),
            last,
        ]

    events = [*walk(PROCESS), *walk({"end": 2, "process": 7, "result": 1}), end(1)]
    path = written(tmp_path / "trace.jsonl", *events)
    assert check(path, Unasked()) == 4
    report = replay(path, Finding())
    assert report.functions["DVS_PortId"].reasons == {
        "it was made in a callback of no walk that ended": 1,
        "the host did not call back so often": 1,
    }
    assert sum(of.calls for of in report.functions.values()) == 4


def test_walks_within_walks_without_end(tmp_path: Path) -> None:
    begins: List[Dict[str, Any]] = []
    ends: List[Dict[str, Any]] = []
    callback = {"process": 7, "thread": 1, "argument": "callback", "at": 1, "in": {}}
    for number in range(1, 10_000, 2):
        inner = {"within": number - 1} if number > 1 else {}
        begins.append(event(number, "DVSState_PortForEach", {"handle": {"at": 9}}, **inner))
        begins.append({"callback": number + 1, **callback, "within": number})
        ends += [end(number), {"end": number + 1, "process": 7, "result": 1}]
    path = written(tmp_path / "trace.jsonl", *begins, *reversed(ends))
    assert check(path, Unasked()) == 5_000
    assert replay(path, Unasked()).functions["DVSState_PortForEach"].not_made == 5_000


def test_what_cannot_be_made_is_told_with_its_reason(tmp_path: Path) -> None:
    callback = {"callback": 12, "process": 7, "thread": 1, "argument": "callback", "at": 1}
    events: List[Dict[str, Any]] = [
        event(1, "Panic", {"format": "%s"}),
        end(1),
        event(2, "VSDVS_FreeMemory", {"memory": {"at": 9}}),
        end(2),
        event(3, "DVSQEX_CmdExec", {"switchId": "x", "input": {"unread": "it is gone"}}),
        end(3, status=0),
        event(4, "DVSQEX_StateSanitize", {}),
        end(4, left=True),
        event(11, "DVSState_PortForEach", {"handle": {"at": 9}}),
        {**callback, "in": {"reached": {"at": 2}}, "within": 11},
        event(13, "DVS_PortId", {"handle": {"at": 2}}, within=12),
        end(13, result="p"),
        {"end": 12, "process": 7, "result": 1},
        end(11),
        event(20, "DVSQEX_StateCleanup", {}),
    ]
    path = written(tmp_path / "trace.jsonl", *events)
    assert check(path, Unasked()) == 7
    report = replay(path, Unasked())
    assert {name: found[2] for name, found in first(report).items()} == {
        "Panic": "what follows its format is not recorded",
        "VSDVS_FreeMemory": UNKNOWN,
        "DVSQEX_CmdExec": "in.input was not recorded: it is gone",
        "DVSQEX_StateSanitize": "the tool left it by a jump",
        "DVSState_PortForEach": UNKNOWN,
        "DVS_PortId": "the walk that it was made in was not made",
        "DVSQEX_StateCleanup": "its process ended during it",
    }
    assert sum(of.not_made for of in report.functions.values()) == 7


@pytest.mark.parametrize(
    "function, inputs, said",
    [
        ("VSDVS_Get", {}, "call 1: there is no call 'VSDVS_Get'"),
        ("VSDVS_GetMTU", {}, "call 1: in: lacks switchName"),
        ("VSDVS_GetMTU", {"switchName": 7}, "call 1: in.switchName: is no object: 7"),
        (
            "VSDVS_GetMTU",
            {"switchName": "x\0y"},
            "call 1: in.switchName: is a text with a NUL in it",
        ),
        (
            "VSDVS_SetMTU",
            {"switchName": "x", "mtu": 2**32},
            "call 1: in.mtu: 4294967296 is not from 0 to 4294967295",
        ),
        (
            "DVSQEX_StateInit",
            {"state": {"bytes": "00"}, "length": 4096},
            "call 1: in.state.bytes: has 1 bytes, and not 4096",
        ),
        (
            "DVSData_Free",
            {"list": {"at": [1]}},
            "call 1: in.list.at: is no whole number: [1]",
        ),
    ],
)
def test_hostile_calls_are_refused_with_their_line(
    tmp_path: Path, present: PresentHost, function: str, inputs: Any, said: str
) -> None:
    path = written(tmp_path / "trace.jsonl", event(1, function, inputs), end(1, status=0))
    with pytest.raises(TraceError) as caught:
        check(path, present)
    assert (caught.value.line, caught.value.what) == (4, said)


def test_nesting_is_refused(tmp_path: Path) -> None:
    deep: Any = 1
    for _ in range(200):
        deep = {"x": deep}
    events = event(1, "VSDVS_GetMTU", {"switchName": "x"}), end(1, status=0, out=deep)
    with pytest.raises(TraceError, match="line 4: call 1: its values are nested too deeply"):
        check(written(tmp_path / "trace.jsonl", *events), Unasked())
