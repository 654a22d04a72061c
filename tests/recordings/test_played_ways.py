"""Whatever way a call takes, it takes again without a host."""

import json
import re
import textwrap
from pathlib import Path

import pytest
from recordings import LEAVING, SIMULATED, play, program, record, record_tool
from test_recorded_shapes import SCENARIO, TOOL
from tools import DATA_LISTS, TRAP_IN_A_WALK, WALK_IN_A_WALK
from vswitch.playing import BY

WAYS = {
    "traps": """
        import _libvswitch as flat
        for _ in range(2):
            try:
                flat.DVSData_Name(flat.DVSState_SwitchFindByAlias("vswitch0"))
            except Exception as error:
                print(type(error).__name__, str(error).split(":")[0], flat.VSDVS_SetMTU("lab", 1))
        status, uplinks = flat.VSQEX_GetUplinks("vswitch0")
        flat.VSQEX_FreeMemory(uplinks)
        try:
            flat.VSQEX_FreeMemory(uplinks)
        except RuntimeError as error:
            print(error.args[0].split(" at ")[0])
        """,
    "walks": WALK_IN_A_WALK,
    "a trap in a walk": TRAP_IN_A_WALK,
    "allocators": f"""{DATA_LISTS}
taken, given = [], []
libc.malloc.restype, libc.free.argtypes = ctypes.c_void_p, [ctypes.c_void_p]
def alloc(size):
    taken.append((libc.malloc(size), size))
    return taken[-1][0]
def release(memory):
    given.append([one for one, _ in taken].index(memory))
    libc.free(memory)
functions = (ctypes.CFUNCTYPE(ctypes.c_void_p, ctypes.c_size_t)(alloc),
             ctypes.CFUNCTYPE(None, ctypes.c_void_p)(release))
print(host.DVSData_Alloc(ctypes.byref(made), *functions))
print(host.DVSData_Update(made, b"name", b"four", 4, 16))
image, length = ctypes.c_void_p(), ctypes.c_uint()
print(host.DVSData_Serialize(made, ctypes.byref(image), ctypes.byref(length), 4),
      ctypes.string_at(image, length.value))
host.DVSData_Free(made)
print([size for _, size in taken], given)
""",
    "threads": """
        import ctypes, threading
        import _libvswitch
        host = ctypes.CDLL("libvswitch.so")  # which lets other threads run meanwhile
        host.QEX_ReturnStatusToString.restype = ctypes.c_char_p
        said = [[] for _ in range(5)]
        def ask(number):
            for at in range(50):
                said[number].append(host.QEX_ReturnStatusToString(number * 1000 + at))
        threads = [threading.Thread(target=ask, args=(one,)) for one in range(1, 5)]
        for one in threads: one.start()
        for one in threads: one.join()
        print(said)
        """,
    "children": """
        import os
        import libvswitch as vs
        vs.VSDVS_SetMTU("vswitch0", 9000)
        def visit(switch, context):
            child = os.fork()
            os.write(1, str(vs.QEX_ReturnStatusToString(0 if child else 1)).encode() + b"\\n")
            if child == 0:
                os._exit(7)
            print(os.waitpid(child, 0)[1] >> 8, flush=True)
            return True
        vs.DVSState_SwitchForEach(visit, None)
        """,
    "programs that start programs": """
        import os, subprocess, sys
        if len(sys.argv) == 1:
            import _libvswitch as flat
            print(flat.VSDVS_SetMTU("vswitch0", 9000), flush=True)
            one = [sys.executable, "-c", "import _libvswitch as v; print(v.VSDVS_SetMTU('lab', 1))"]
            subprocess.run(one, check=True)
            os.execv(sys.executable, one)
        """,
    "shapes": TOOL,
    "another process in a name": """
        import os
        import libvswitch as vs
        from libvswitch import checked
        checked.VSDVS_CreateVSwitch(f"of-{os.getpid()}", None, None, 64, True, 0, 9000, 2)
        print(checked.VSDVS_GetMTU(f"of-{os.getpid()}"))
        found = []
        vs.DVSState_SwitchForEach(lambda one, _: found.append(vs.DVS_SwitchName(one)) or True, None)
        print(f"of-{os.getpid()}" in found, len(found))
        checked.VSDVS_DestroyVSwitch(f"of-{os.getpid()}")
        """,
}


@pytest.mark.parametrize("way", WAYS)
def test_a_way(way: str, tmp_path: Path, alone: Path) -> None:
    environment = {}
    if way == "shapes":
        (tmp_path / "host.json").write_text(json.dumps(SCENARIO))
        environment["SIMHOST_SCENARIO"] = str(tmp_path / "host.json")
    source = WAYS[way]
    made = record(source, tmp_path / "trace.jsonl", SIMULATED, **environment)
    assert made.status == 0, made.stderr
    assert made.stdout or way == "shapes"
    done = play(program(source), made.trace, alone)
    # What a process writes while another one does may stand before that.
    assert sorted(done.stdout.splitlines()) == sorted(made.stdout.splitlines()), done.stderr
    assert (done.status, done.stderr) == (0, made.stderr)
    assert (done.left, done.has_failed) == ([], False)


def test_a_tool_is_not_to_release_what_it_has_not_allocated(tmp_path: Path, alone: Path) -> None:
    source = f"""{DATA_LISTS}
host.DVSData_Alloc(ctypes.byref(made), libc.malloc, libc.free)
host.DVSData_Free(made)
"""
    trace = record(source, tmp_path / "trace.jsonl").trace
    text = re.sub(r'"memory":{"at":\d+}', '"memory":{"at":99}', trace.read_text())
    trace.write_text(text)
    done = play(program(source), trace, alone)
    assert (done.status, done.has_failed) == (125, True)
    assert "the tool is to release what it has not allocated" in done.stderr


@pytest.mark.parametrize("by", BY)
def test_a_tool_that_jumps_out_of_walks_and_makes_a_call_when_it_exits(
    by: str, tmp_path: Path, alone: Path
) -> None:
    made = record_tool([str(LEAVING)], tmp_path / "trace.jsonl")
    done = play([str(LEAVING)], made.trace, alone, by)
    assert (done.status, done.stdout, done.stderr) == (0, made.stdout, "")
    assert (done.left, done.has_failed) == ([], False)


def test_by_arguments_calls_come_in_any_order_and_as_often_as_wanted(
    tmp_path: Path, alone: Path
) -> None:
    source = """
        import sys
        from libvswitch import checked
        mtus = {name: checked.VSDVS_GetMTU(name) for name in sys.argv[1:]}
        print(sorted(mtus.items()))
        uplinks = [checked.VSQEX_GetUplinks("vswitch0") for _ in sys.argv]
        print([one.name for one in uplinks[-1]])
        """
    made_first = """
        from libvswitch import checked
        checked.VSDVS_CreateVSwitch("b", None, None, 8, True, 0, 9000, 2)
        """
    recorded = [*program(textwrap.dedent(made_first) + textwrap.dedent(source)), "vswitch0", "b"]
    made = record_tool(recorded, tmp_path / "trace.jsonl")
    assert made.status == 0, made.stderr
    done = play([*program(source), "b", "vswitch0", "b", "b"], made.trace, alone, "arguments")
    assert (done.status, done.stdout) == (0, made.stdout), done.stderr
    assert [one.function for one in done.left] == ["VSDVS_CreateVSwitch"]


def test_the_last_of_several_is_the_one_that_repeats(tmp_path: Path, alone: Path) -> None:
    source = """
        import _libvswitch as flat, libvswitch as vs
        def mtu():
            cell = vs.Cell("qex_uint32")
            vs.VSDVS_GetMTU("vswitch0", cell.pointer)
            return cell.value
        print(mtu(), flat.VSDVS_SetMTU("vswitch0", 9000), mtu())
        """
    made = record(source, tmp_path / "trace.jsonl")
    assert made.stdout == "1500 0 9000\n", made.stderr
    again = textwrap.dedent(source).replace("print(mtu()", "print(mtu(), mtu(), mtu()")
    done = play(program(again), made.trace, alone, "arguments")
    assert (done.status, done.stdout) == (0, "1500 9000 9000 0 9000\n"), done.stderr
