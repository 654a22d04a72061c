"""Whatever way a call takes, the tool cannot tell, and the trace is whole up to there."""

import json
import signal
from pathlib import Path
from typing import Any, List

import pytest
from recordings import FORMATTING, LEAVING, RECORDING, record, record_tool
from tools import DATA_LISTS, TRAP_IN_A_WALK, WALK_IN_A_WALK
from vswitch.trace import Trace, Trap


@pytest.fixture(name="trace")
def fixture_trace(tmp_path: Path) -> Path:
    return tmp_path / "trace.jsonl"


def test_a_trap_passes_through_and_the_next_call_works(trace: Path) -> None:
    program = """
    import _libvswitch as flat
    from recording_host import RecordingHost
    class HostError(Exception): pass
    host = RecordingHost()
    for value in (1, -7):
        host.spring("VSDVS_GetMTU", HostError, "it is too late: größe", nth=1, value=value)
        try:
            flat.VSDVS_GetMTU("lab", None)
        except HostError as error:
            print(error, host.exception_status)
        host.reset()
    print(flat.VSDVS_SetMTU("lab", 1), host.exception_status)
    """
    made = record(program, trace, RECORDING)
    said = "it is too late: größe"
    assert (made.status, made.stdout) == (0, f"{said} 1\n{said} -7\n0 0\n"), made.stderr
    assert [one.trap for one in made.calls] == [
        Trap("HostError", said, 1),
        Trap("HostError", said, -7),
        None,
    ]
    assert [one.status for one in made.calls] == [None, None, 0]


def test_callbacks_are_there_with_what_was_called_meanwhile(trace: Path) -> None:
    made = record(WALK_IN_A_WALK, trace)
    assert made.status == 0, made.stderr
    calls = {one.number: one for one in made.calls}
    outer, inner = made.call("DVSState_SwitchForEach"), made.call("DVSState_PortForEach")
    (switch,) = outer.callbacks
    named = made.call("DVS_SwitchName")
    assert (switch.argument, switch.result) == ("callback", 1)
    assert switch.calls == [inner.number, named.number]
    assert inner.inputs["handle"] == switch.inputs["reached"]
    # The tool ends the walk at the second port.
    assert [one.result for one in inner.callbacks] == [1, 0]
    asked = [calls[number] for one in inner.callbacks for number in one.calls]
    assert [one.function for one in asked] == ["DVS_PortId"] * 2
    assert [one.inputs["handle"] for one in asked] == [
        one.inputs["reached"] for one in inner.callbacks
    ]
    assert str([one.result for one in [*asked, named]]) == made.stdout.strip()


def test_a_trap_in_a_callback_ends_the_inner_call_alone(trace: Path) -> None:
    made = record(TRAP_IN_A_WALK, trace)
    assert (made.status, made.stdout) == (0, "VSQEX_FreeMemory\n0\n"), made.stderr
    second = made.call("VSQEX_FreeMemory", 1)
    assert second.trap is not None and second.trap.type == "RuntimeError"
    assert "is given back twice" in (second.trap.text or "")
    walk = made.call("DVSState_SwitchForEach")
    assert walk.trap is None and not walk.was_left and walk.callbacks[0].result == 1


def test_no_call_is_lost_after_jumps_of_the_tools_own_and_at_its_exit(trace: Path) -> None:
    made = record_tool([str(LEAVING)], trace)
    assert made.status == 0, made.stderr
    walks = [one for one in made.calls if one.function == "DVSState_SwitchForEach"]
    assert [one.was_left for one in walks] == [True, True, True, False]
    assert [one.within for one in made.calls] == [None] * 6
    set_to = [one.inputs["mtu"] for one in made.calls if one.function == "VSDVS_SetMTU"]
    assert set_to == [1, 9000]
    assert {one.thread for one in made.calls} == {1}


def test_allocators_are_recorded_beyond_the_call_that_they_were_given_with(trace: Path) -> None:
    filled = """
print(host.DVSData_Alloc(ctypes.byref(made), libc.malloc, libc.free))
print(host.DVSData_Update(made, b"name", b"four", 4, 16))
host.DVSData_Free(made)
"""
    made = record(DATA_LISTS + filled, trace)
    assert (made.status, made.stdout) == (0, "0\n0\n"), made.stderr
    allocated = [one for call in made.calls for one in call.callbacks if one.argument == "alloc"]
    released = made.call("DVSData_Free").callbacks
    assert made.call("DVSData_Update").callbacks
    assert {one.argument for one in released} == {"release"}
    assert len(released) == len(allocated)
    # The list among them, which ends with the call.
    numbers = {one.inputs["memory"]["at"] for one in released}
    assert numbers == {one.result["at"] for one in allocated}


def test_threads_are_told_apart(trace: Path) -> None:
    program = """
    import ctypes, threading
    import _libvswitch
    host = ctypes.CDLL("libvswitch.so")  # which lets other threads run meanwhile
    def ask(number):
        for at in range(200):
            host.QEX_ReturnStatusToString(number * 1000 + at)
    threads = [threading.Thread(target=ask, args=(one,)) for one in range(1, 5)]
    for one in threads: one.start()
    for one in threads: one.join()
    """
    made = record(program, trace)
    assert made.status == 0, made.stderr
    asked = [(one.thread, one.inputs["status"]) for one in made.calls]
    assert len(asked) == 800 and len({one.number for one in made.calls}) == 800
    for thread in {thread for thread, _ in asked}:
        of_thread = [status for one, status in asked if one == thread]
        assert of_thread == list(range(of_thread[0], of_thread[0] + 200))


def test_a_crash_leaves_all_up_to_it(trace: Path) -> None:
    program = """
    import os, signal
    import libvswitch as vs
    vs.VSDVS_SetMTU("vswitch0", 9000)
    def visit(switch, context):
        os.kill(os.getpid(), signal.SIGKILL)
    vs.DVSState_SwitchForEach(visit, None)
    """
    made = record(program, trace)
    assert made.status == -signal.SIGKILL
    assert [one.function for one in made.calls] == ["VSDVS_SetMTU", "DVSState_SwitchForEach"]
    assert [one.has_ended for one in made.calls] == [True, False]
    assert [one.has_ended for one in made.calls[1].callbacks] == [False]


def test_a_child_has_a_part_of_its_own(trace: Path) -> None:
    program = """
    import os
    import libvswitch as vs
    vs.VSDVS_SetMTU("vswitch0", 9000)
    def visit(switch, context):
        child = os.fork()
        vs.QEX_ReturnStatusToString(0)
        if child == 0:
            os._exit(7)
        print(os.waitpid(child, 0)[1] >> 8)
        return True
    vs.DVSState_SwitchForEach(visit, None)
    """
    made = record(program, trace)
    assert (made.status, made.stdout) == (0, "7\n"), made.stderr
    with Trace(trace) as read:
        calls = list(read)
        parents = {one.id: one.parent for one in read.processes.values()}
    child = next(one for one in parents if parents[one] in parents)
    of_child = [one.function for one in calls if one.process == child]
    assert of_child == ["QEX_ReturnStatusToString"]
    assert [one.function for one in calls if one.process == parents[child]] == [
        "VSDVS_SetMTU",
        "QEX_ReturnStatusToString",
        "DVSState_SwitchForEach",
    ]


def test_a_tool_may_close_all_files(trace: Path) -> None:
    program = """
    import os
    import _libvswitch as flat
    flat.VSDVS_SetMTU("vswitch0", 9000)
    os.closerange(3, 5000)
    # Every number that there was is another file's now.
    others = [os.open("/dev/null", os.O_RDONLY) for _ in range(600)]
    flat.VSDVS_SetMTU("vswitch0", 1500)
    """
    made = record(program, trace)
    assert made.status == 0, made.stderr
    assert [one.inputs["mtu"] for one in made.calls] == [9000, 1500]


def test_a_full_disk_ends_the_recording_and_not_the_tool(trace: Path) -> None:
    program = """
    import _libvswitch as flat
    print(flat.VSDVS_SetMTU("vswitch0", 9000), flat.VSDVS_SetMTU("vswitch0", 1500))
    """
    made = record(program, trace, VSWITCH_RECORD_TRACE="/dev/full")
    assert (made.status, made.stdout) == (0, "0 0\n")
    said = "vswitch record: /dev/full: No space left on device: what follows is not recorded\n"
    assert made.stderr == said


def test_errno_is_the_tools(trace: Path) -> None:
    program = """
    import ctypes
    import _libvswitch
    host = ctypes.CDLL("libnebPublic.so", use_errno=True)
    ctypes.set_errno(77)
    # Memory that is not there, which reading it says through errno.
    print(host.DVSData_Update(None, b"n", ctypes.c_void_p(0x2000), 16, 16), ctypes.get_errno())
    """
    made = record(program, trace, RECORDING)
    assert (made.status, made.stdout) == (0, "0 77\n"), made.stderr


def test_a_report_takes_with_it_whatever_follows_its_format(trace: Path) -> None:
    program = """
    import ctypes
    host = ctypes.CDLL("libvswitch.so")
    seven = [ctypes.c_int(one) for one in range(1, 8)]
    host.Panic(b"%d %d %d %d %d %d %d %s %.1f", *seven, b"text", ctypes.c_double(2.5))
    """
    made = record(program, trace, FORMATTING)
    assert (made.status, made.stderr) == (0, "1 2 3 4 5 6 7 text 2.5")
    assert made.call("Panic").inputs["format"] == "%d %d %d %d %d %d %d %s %.1f"


def test_what_a_tool_asks_the_loader_for_is_still_the_hosts(trace: Path) -> None:
    program = """
    import ctypes, json
    import _libvswitch
    module = ctypes.CDLL(_libvswitch.__file__)
    print(json.dumps([hasattr(module, "simhost_error"), hasattr(module, "exception_buffer")]))
    """
    made = record(program, trace)
    assert json.loads(made.stdout) == [True, True]


def test_without_a_trace_calls_are_only_forwarded(trace: Path) -> None:
    program = """
    import _libvswitch as flat
    print(flat.VSDVS_SetMTU("vswitch0", 9000), flat.VSDVS_SetMTU("nowhere", 9000) != 0)
    """
    made = record(program, trace, VSWITCH_RECORD_TRACE="")
    assert (made.status, made.stdout, made.stderr) == (0, "0 True\n", "")
    assert made.calls == []


@pytest.mark.parametrize(
    "options, there",
    [
        # All bytes, then a type and a length for each option.
        ("4, 0, 0, 0", []),
        ("12, 0, 0, 0,  1, 0, 8, 0, 20, 0, 0, 0", [8]),
        ("0, 0, 0, 0", ["unread"]),
        ("12, 0, 0, 0,  1, 0, 0, 0, 20, 0, 0, 0", [0, "unread"]),
        ("12, 0, 0, 0,  1, 0, 3, 0, 20, 0, 0, 0", [3, "unread"]),
        ("12, 0, 0, 0,  1, 0, 9, 0, 20, 0, 0, 0, 0", [9, "unread"]),
    ],
)
def test_a_packed_list_that_does_not_end_where_it_says(
    trace: Path, options: str, there: List[Any]
) -> None:
    program = f"""
    import ctypes
    import _libvswitch
    ctypes.CDLL("libvswitch.so").VSQEX_SetRuntimeOptions(bytes([{options}]))
    """
    made = record(program, trace, RECORDING)
    assert made.status == 0, made.stderr
    given = made.call("VSQEX_SetRuntimeOptions").inputs["options"]["VSRuntimeOptionHeader"]
    assert [one.get("length", "unread") for one in given] == there
    if "unread" in there:
        assert given[-1] == {"unread": "its lengths contradict each other"}
