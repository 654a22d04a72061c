"""Nothing of libvswitch uses memory that has been released, whatever threads do."""

import os
import subprocess
import sys
from pathlib import Path
from typing import Any, List

import libvswitch as vs
import pytest
import threads
from libvswitch import _pointers


@pytest.mark.parametrize("name", threads.PROGRAMS)
def test_of_threads_some_release_and_some_read(name: str) -> None:
    """In a process of its own, which AddressSanitizer would end in a build with it."""
    done = subprocess.run(
        [sys.executable, Path(threads.__file__), name],
        env=os.environ,
        capture_output=True,
        text=True,
        timeout=300,
    )
    assert (done.returncode, done.stderr) == (0, "")


def test_reading_what_was_released_would_be_noticed(switch: str) -> None:
    """What the programs look for is there when a view does not end with its memory."""
    if "libasan" not in os.environ.get("LD_PRELOAD", ""):
        program = "import libvswitch as vs; vs.VSInfo()"
    else:
        program = (
            "import libvswitch as vs, _libvswitch as flat\n"
            "info = vs.VSPortInfo()\n"
            "stats = info.stats\n"
            "flat.delete_VSPortInfo(info)\n"
            "stats.pktsTx\n"
        )
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    is_sanitized = "libasan" in os.environ.get("LD_PRELOAD", "")
    assert ("heap-use-after-free" in done.stderr) == is_sanitized


def test_a_record_takes_memory_once() -> None:
    info = vs.VSPortInfo()
    stats = info.stats
    stats.pktsTx = 7
    with pytest.raises(TypeError, match="^this VSPortInfo has its memory already$"):
        info.__init__()  # type: ignore[misc]
    with pytest.raises(
        AttributeError, match="^the attribute 'this' of a VSPortInfo cannot be set$"
    ):
        info.this = vs.VSPortInfo().this
    with pytest.raises(AttributeError, match="cannot be deleted$"):
        del info.this
    assert stats.pktsTx == 7


def test_so_do_cells_and_callbacks() -> None:
    cell, callback = vs.Cell("int", 5), vs.Callback(print)
    anew: Any = cell, callback
    makers: List[Any] = [lambda: anew[0].__init__("int"), lambda: anew[1].__init__(print)]
    for again in makers:
        with pytest.raises(TypeError, match="already$"):
            again()
    for name in ("this", "type", "pointer", "deallocator", "nonsense"):
        with pytest.raises(
            AttributeError, match=f"^the attribute '{name}' of a Cell cannot be set"
        ):
            setattr(cell, name, None)
    assert cell.value == 5
    with pytest.raises(TypeError, match="^arrays are made by records and calls$"):
        vs.Array()


def test_memory_of_the_library_is_not_acquired(switch: str) -> None:
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    for acquire in (
        uplinks.acquire,
        lambda: uplinks.own(True),
        lambda: setattr(uplinks, "thisown", True),
        lambda: uplinks.entries[0].acquire(),
    ):
        with pytest.raises(ValueError, match="is not Python's to free$"):
            acquire()
    assert not uplinks.thisown
    vs.VSQEX_FreeMemory(uplinks)
    info = vs.VSInfo()
    assert info.own() and info.thisown
    info.disown()
    assert not info.own() and "mtu" in repr(info)
    info.acquire()
    assert info.thisown


def test_a_plain_pointer_object_is_not_released(switch: str) -> None:
    """Nothing would make the views null that lie in its memory."""
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    entry = uplinks.entries[0]
    with pytest.raises(TypeError, match="^VSQEX_FreeMemory takes a record, .* not SwigPyObject$"):
        vs.VSQEX_FreeMemory(uplinks.this)
    # A pointer that was made to the same place takes the record along.
    vs.VSQEX_FreeMemory(vs.Pointer(int(uplinks), "void *", None))
    assert repr(uplinks) == "<VSUplinks that is gone>"
    with pytest.raises(ValueError):
        entry.portID


def test_a_class_does_not_offer_the_flat_destructor() -> None:
    assert not hasattr(vs.VSInfo, "__swig_destroy__")


def test_memory_is_read_and_written_or_found_gone() -> None:
    info = vs.VSMACLearning()
    _pointers.write_memory(info, 0, (7).to_bytes(4, "little"))
    assert _pointers.read_memory(info, 0, 4) == (7).to_bytes(4, "little") and info.agingTime == 7
    taken = _pointers.take(info)
    uses: List[Any] = [
        lambda: _pointers.read_memory(info, 0, 4),
        lambda: _pointers.write_memory(info, 0, b""),
    ]
    for use in uses:
        with pytest.raises(ValueError, match="^the memory is gone: it was released$"):
            use()
    _pointers.put_back(info, taken)
    assert info.agingTime == 7 and int(taken) == 0
