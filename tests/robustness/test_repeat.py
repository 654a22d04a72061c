"""Every way through every function leaves references, objects and memory as they were."""

import sys
from typing import List, Tuple

import processes
import pytest

# How many ways a kind of function has at least, or they were not looked for.
KINDS = {
    "reader": 5_000,
    "writer": 10_000,
    "call": 4_000,
    "method": 1_000,
    "constructor": 200,
    "destructor": 1_000,
    "registration": 200,
    "helper": 50,
    "runtime": 3,
    "pointer": 5,
    "class": 4,
    "refusing": 4,
}
CALLS = 20_000

# What a debug interpreter ends the process for: a result with an error, or none without.
FATAL = {
    "an int beyond 64 bits stored": "vs.VSPortInfo_clientType_set(vs.new_VSPortInfo(), 2**70)",
    "an int beyond 64 bits as an index": "vs.VSUplinks___getitem__(vs.new_VSUplinks(1), 2**70)",
    "an int beyond 64 bits passed": "vs.VSDVS_SetMcastFilterMode('a', 2**70)",
    "an index of nothing": "vs.VSDVMirrorSessionIDs___getitem__(vs.new_VSDVMirrorSessionIDs(), 0)",
}


def repeated(*command: str) -> Tuple[List[str], int]:
    """What grows, and how many ways or calls there were."""
    done = processes.run(str(processes.HERE / "repeat.py"), *command)
    assert done.returncode == 0, done.stderr
    *grown, count = done.stdout.splitlines()
    return grown, int(count)


@pytest.mark.parametrize("kind", KINDS)
def test_no_way_through_a_function_loses_anything(kind: str) -> None:
    grown, ways = repeated("references", kind)
    assert grown == []
    assert ways >= KINDS[kind]


@pytest.mark.parametrize("kind", KINDS)
def test_memory_stays_as_large_as_it_was(kind: str) -> None:
    grown, calls = repeated("memory", kind, str(CALLS))
    assert grown == []
    assert calls > CALLS // 2


def test_what_is_planted_is_found() -> None:
    # From 3.12 on None counts no references.
    of_none = ["of None"] if sys.version_info < (3, 12) else []
    names = ["a reference", *of_none, "an object", "memory"]
    assert repeated("references", "planted") == ([f"grows: {name}" for name in names], 5)
    grown, _ = repeated("memory", "planted", str(CALLS))
    # Objects are not counted where they too are on the heap.
    assert [line.split()[-1] for line in grown][:1] == ["heap"]


@pytest.mark.parametrize("program", FATAL.values(), ids=list(FATAL))
def test_what_ends_in_system_error_is_fatal_to_a_debug_interpreter(program: str) -> None:
    done = processes.run("-c", f"import _libvswitch as vs; {program}")
    assert "SystemError: <built-in function " in done.stderr
    assert done.returncode == (-6 if hasattr(sys, "gettotalrefcount") else 1)
