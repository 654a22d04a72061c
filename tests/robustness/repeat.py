"""Repeats functions in every way they go, and reports what grows.

    repeat.py references KIND        each way some rounds: references, objects, the heap
    repeat.py memory KIND CALLS      all ways in turn, so many calls: objects, the heap

Prints a line for each way that grows, and at the end how many ways or calls there were.
"""

import ctypes
import gc
import os
import sys
from functools import partial
from typing import Any, Callable, Dict, Iterator, List, NamedTuple, Sequence, Tuple

import _libvswitch as vs
import every
import faulty
import fields
import peer
from arguments import AnyPointerKind, IntegerKind, Kind
from every import AnyObject, Function, Plain
from recording_host import RecordingHost

WARM_UP = 3
ROUNDS = 20

# The interpreter keeps some freed objects of its own, of some types up to 80, and a sanitizer some
# freed memory: only what still grows after that is lost.
PASSES = 60
DEBUG_INTERPRETER = hasattr(sys, "gettotalrefcount")

# Of the values that an argument refuses, more are alike.
REFUSED = 12


class Way(NamedTuple):
    """A way through a function."""

    kind: str
    text: str
    go: Callable[[], Any]
    given: Sequence[Any]
    """What it is given, whose references are counted."""


def _go(function: Function, call: Callable[..., Any], plain: Plain, changed: Dict[int, Any]) -> Any:
    every.refresh(len(function.arguments))
    arguments = plain()
    made = arguments[0] if function.takes_memory else None
    for position, value in changed.items():
        arguments[position] = value
    try:
        result = call(*arguments)
        if function.makes_memory:
            every.release(result)
    except Exception:
        # The error may be the pending one of a call that was made.
        pass
    finally:
        if made is not None and changed:
            every.release(made)


def refused(kind: Kind) -> List[Any]:
    """What an argument refuses, and what its position may refuse: null."""
    values = [value for value, _ in kind.refused()]
    # A registration that gives way to another stays: an instance may be being made of it.
    null = [] if isinstance(kind, AnyObject) else [None]
    return [*values[: REFUSED // 2], *values[-REFUSED // 2 :], *null]


def own_record(function: Function) -> Any:
    """A record of the module's own making, if the first argument is one."""
    if not function.arguments or function.takes_memory:
        return None
    for spelling in every.spellings(function.arguments[0]):
        record = spelling[: -len(" *")]
        if record in fields.RECORDS and record not in fields.SIZED:
            return getattr(vs, f"new_{record}")()
    return None


def through(function: Function) -> Iterator[Way]:
    """All ways through a function that a wrapper tells apart."""
    plain, call = Plain(function), function.function()

    def way(text: str, changed: Dict[int, Any]) -> Way:
        go = partial(_go, function, call, plain, changed)
        return Way(function.kind, f"{function.name}: {text}", go, list(changed.values()))

    yield way("success", {})
    record = own_record(function)
    if record is not None and function.kind in ("reader", "writer"):
        yield way("on a record of its own", {0: record})
    for position, kind in enumerate(function.arguments):
        for value in refused(kind):
            yield way(f"argument {position + 1} is {value!r:.40}", {position: value})
        # The call is made, and what it made is lost with the result.
        beyond = isinstance(kind, IntegerKind) and kind.low < 0 and not function.makes_memory
        if beyond and not DEBUG_INTERPRETER:
            yield way(f"argument {position + 1} is beyond", {position: 2**70})
        if isinstance(kind, AnyPointerKind):
            yield way(f"argument {position + 1} is a record", {position: vs.new_VSInfo()})
    for count in {0, len(function.arguments) + 1} - {len(function.arguments)}:
        wrong = [None] * count
        go = partial(_quietly, call, wrong)
        yield Way(function.kind, f"{function.name}: {count} arguments", go, [])


def _quietly(call: Callable[..., Any], arguments: Sequence[Any]) -> None:
    try:
        call(*arguments)
    except Exception:
        pass


def shadowed(cls: Any) -> Iterator[Way]:
    """What becomes of pointers while a class is registered."""
    vs.qex_Name_swigregister(cls)
    signature = vs.new_qex_MgmtApiSignature()

    def read() -> None:
        vs.qex_Name___repr__(vs.qex_MgmtApiSignature_name_get(signature))

    def drop() -> None:
        shadow = cls.__new__(cls)
        object.__setattr__(shadow, "this", vs.new_qex_Name())

    def collect() -> None:
        vs.new_qex_Name()

    def register_again() -> None:
        vs.qex_Name_swigregister(cls)

    for go in (read, drop, collect, register_again):
        yield Way("class", f"{cls.__name__}: {go.__name__}", partial(_quietly, go, ()), [cls])


class Shadow:
    __swig_destroy__ = vs.delete_qex_Name


class Refusing(Shadow):
    """Cannot be given the pointer that it would stand for."""

    def __setattr__(self, name: str, value: object) -> None:
        raise AttributeError(name)


def pointers() -> Iterator[Way]:
    """The methods of pointer objects, more of them at a time than the module keeps."""
    signature = vs.new_qex_MgmtApiSignature()

    def made() -> Any:
        return vs.qex_MgmtApiSignature_name_get(signature)

    def chain() -> None:
        links = [made() for _ in range(50)]
        for link in links[1:]:
            links[0].append(link)
        repr(links[0]), links[0].next()

    def appended_twice() -> None:
        first, second, third = made(), made(), made()
        first.append(second)
        second.append(third)
        third.append(first)
        _quietly(first.append, (first,))

    def methods() -> None:
        pointer = made()
        pointer.own(), pointer.disown(), int(pointer), pointer == pointer, pointer != 1
        _quietly(pointer.append, (1,))
        _quietly(hash, (pointer,))
        _quietly(pointer.own, (1, 2))

    def many() -> None:
        assert len([made() for _ in range(100)]) == 100

    def foreign() -> None:
        vs.qex_Name___repr__(peer.pointer_object(int(made()), "qex_Name *"))

    for go in (chain, appended_twice, methods, many, foreign):
        yield Way("pointer", go.__name__, go, [])


def ways(kind: str) -> Iterator[Way]:
    """The ways of a kind."""
    for function in every.ALL:
        if function.kind == kind:
            yield from through(function)
    if kind == "pointer":
        yield from pointers()
    # What these register stays for the rest of the process.
    if kind == "class":
        yield from shadowed(Shadow)
    if kind == "refusing":
        yield from shadowed(Refusing)
    if kind == "planted":
        thing = object()
        yield Way(kind, "nothing", faulty.nothing, [])
        yield Way(kind, "a reference", lambda: faulty.leak_a_reference(thing), [thing])
        yield Way(kind, "of None", lambda: faulty.leak_a_reference(None), [])
        yield Way(kind, "an object", faulty.leak_an_object, [])
        yield Way(kind, "memory", faulty.leak_memory, [])


class _Mallinfo(ctypes.Structure):
    _fields_ = [
        (name, ctypes.c_size_t)
        for name in "arena ordblks smblks hblks hblkhd usmblks fsmblks uordblks fordblks".split()
    ] + [("keepcost", ctypes.c_size_t)]


_c = ctypes.CDLL(None)


def heap() -> int:
    """The bytes that the process has from the C library's heap."""
    if hasattr(_c, "__sanitizer_get_current_allocated_bytes"):
        _c.__sanitizer_get_current_allocated_bytes.restype = ctypes.c_size_t
        return int(_c.__sanitizer_get_current_allocated_bytes())
    _c.mallinfo2.restype = _Mallinfo
    info = _c.mallinfo2()
    return int(info.uordblks + info.hblkhd)


# What the C library gives for a single byte.
SMALLEST_BLOCK = 32

_COMMON = (None, True, False, NotImplemented, (), "", b"", 0, 1, -1)
_counted: Callable[[], int] = getattr(sys, "gettotalrefcount", lambda: 0)


def _count(given: Sequence[Any]) -> Tuple[int, ...]:
    return (
        heap() // SMALLEST_BLOCK,
        _counted(),
        sys.getallocatedblocks(),
        *map(sys.getrefcount, _COMMON),
        *map(sys.getrefcount, given),
    )


def grows(way: Way) -> bool:
    """Whether something is more, or less, after some rounds, however often this is looked at."""
    go = way.go
    for _ in range(WARM_UP):
        go()
    for _ in range(PASSES):
        before = _count(way.given)
        for _ in range(ROUNDS):
            go()
        after = _count(way.given)
        if all(abs(b - a) < ROUNDS // 2 for a, b in zip(before, after)):
            return False
    return True


def references(kind: str) -> None:
    count = 0
    for way in ways(kind):
        count += 1
        if grows(way):
            say(f"grows: {way.text}")
    say(str(count))


def memory(kind: str, calls: int) -> None:
    """Whether the heap, or Python's share of it, is larger after each third of the calls."""
    host, found = RecordingHost(), list(ways(kind))
    rounds = max(1, calls // 3 // len(found))
    sizes = []
    for _ in range(3):
        for _ in range(rounds):
            for way in found:
                way.go()
            # The host keeps a record of its calls.
            host.reset()
        gc.collect()
        sizes.append((heap(), sys.getallocatedblocks()))
    # The first part fills caches. What each call loses for good shows in every part.
    for index, (what, noise) in enumerate([("bytes of the heap", 4096), ("objects", 300)]):
        grown = [after[index] - before[index] for before, after in zip(sizes, sizes[1:])]
        if min(grown) > noise:
            say(f"grows: {kind}: {grown} {what}")
    say(str(3 * rounds * len(found)))


_output = os.dup(1)


def say(line: str) -> None:
    os.write(_output, line.encode("utf-8", "backslashreplace") + b"\n")


if __name__ == "__main__":
    # What records leave behind when they are collected is said on C's standard output.
    os.dup2(os.open(os.devnull, os.O_WRONLY), 1)
    sys.unraisablehook = lambda _: None
    gc.collect()
    gc.disable()
    if sys.argv[1] == "references":
        references(sys.argv[2])
    else:
        memory(sys.argv[2], int(sys.argv[3]))
