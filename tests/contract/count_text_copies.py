"""Prints, as JSON, how many copies of its texts each way through each call leaves on the heap.

Runs in a process that the counting allocator was preloaded into.
"""

import ctypes
import gc
import json
import sys
from typing import Any, Callable, Dict, Iterator, List, Tuple

import _libvswitch
import calls
from arguments import BytesKind, IntegerKind, TextKind
from calls import Call
from recording_host import RecordingHost

# Long enough that no wrapper keeps the copy in its own frame, and each of a size of its own.
SIZES = [4096 + 64 * position for position in range(9)]
TEXTS = ["x" * (size - 1) for size in SIZES]

FAILURE = 0x0BAD0001

_allocations_like = ctypes.CDLL(None).allocations_like
_allocations_like.argtypes = [ctypes.c_size_t]
_allocations_like.restype = ctypes.c_long


def left_behind(call: Call, given: List[Any]) -> List[int]:
    """How many blocks more than before there are of each size that a text of the call has."""
    sizes = [SIZES[position] for position in call.positions(TextKind)]
    before = [_allocations_like(size) for size in sizes]
    try:
        call(*given)
    except Exception:
        # What it raises is for other tests to say.
        pass
    return [_allocations_like(size) - count for size, count in zip(sizes, before)]


Way = Tuple[str, Callable[[RecordingHost], None], List[Any]]


def ways_through(call: Call) -> Iterator[Way]:
    """Each way: its name, what the host is told for it, the arguments."""

    texts = call.given()
    for place in call.positions(TextKind):
        texts[place - 1] = TEXTS[place]

    def texts_but(position: int, value: object) -> List[Any]:
        given = list(texts)
        given[position - 1] = value
        return given

    def nothing(_: RecordingHost) -> None:
        pass

    yield "success", nothing, texts
    if call.result == "status":
        yield "failure", lambda host: host.answer(call.name, FAILURE), texts
    for position in call.positions():
        for value, error in call.kind(position).refused():
            yield f"argument {position}: {error.__name__}", nothing, texts_but(position, value)
    if not hasattr(sys, "gettotalrefcount"):
        # To a debug interpreter this way is fatal.
        for position in call.positions(IntegerKind):
            yield f"argument {position}: beyond", nothing, texts_but(position, 2**200)
    for position in call.positions(BytesKind):
        yield f"argument {position}: no bytes", nothing, texts_but(position, 1)
    if call.name != "Panic":
        yield "sprung", lambda host: host.spring(call.name, RuntimeError, "sprung"), texts


def main() -> None:
    """Take every way and add up what it leaves."""
    host = RecordingHost()
    # Nothing else may come or go while a call is counted: not what the interpreter collects, nor
    # more of the host's own record, which reaches its final size with this.
    gc.disable()
    _libvswitch.VSDVS_AddOpaqueDVPort(*["x" * 100_000] * 3)
    found: Dict[str, Dict[str, List[int]]] = {}
    for call in calls.ALL:
        if call.positions(TextKind):
            left = found.setdefault(str(call), {})
            for name, tell, given in ways_through(call):
                host.reset()
                tell(host)
                counts = left_behind(call, given)
                left[name] = [a + b for a, b in zip(counts, left.get(name, [0] * len(counts)))]
    json.dump(found, sys.stdout)


if __name__ == "__main__":
    main()
