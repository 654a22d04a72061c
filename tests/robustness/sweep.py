"""Calls functions with wrong and extreme values, and notes each call before it is made.

    sweep.py BATCH NOTE REPORT [--seed N] [--seconds N] [--after N]

NOTE is a file that shows, whatever happens, the call in progress: its number and its text. REPORT
receives a line for each outcome that is neither a result nor an exception of its own. With --after,
the calls up to that number are counted but not made.
"""

import argparse
import copy
import itertools
import operator
import os
import pickle
import random
import resource
import sys
import time
from functools import partial
from pathlib import Path
from typing import Any, Callable, Iterator, List, NamedTuple, Optional, Sequence, Tuple

import _libvswitch as vs
import every
import exemptions
import faulty
import fields
import peer
import pool
from every import Function, Plain
from notes import Note
from pool import Value

DEBUG_INTERPRETER = hasattr(sys, "gettotalrefcount")


UNARY: List[Callable[[Any], object]] = [
    *(hash, int, repr, str, float, bool, len, iter, bytes, memoryview, oct, hex, dir, vars),
    *(copy.copy, copy.deepcopy, pickle.dumps),
]


class Trial(NamedTuple):
    """A call to be made."""

    text: str
    call: Callable[[], Any]
    system_error: bool = False
    """Whether it may rightly end in SystemError."""


class Target:
    """A function that is called with some of its arguments replaced."""

    def __init__(self, function: Function) -> None:
        self.function = function
        self._plain = Plain(function)
        self._call = function.function()

    def trial(self, replaced: Sequence[Tuple[int, Value]]) -> Optional[Trial]:
        """The call, or None if a rule leaves it out."""
        function = self.function
        if any(exemptions.not_tried(function, *argument) for argument in replaced):
            return None
        allowed = any(exemptions.may_be_system_error(function, *argument) for argument in replaced)
        if allowed and DEBUG_INTERPRETER:
            return None
        names = {position: value.name for position, value in replaced}
        shown = ", ".join(names.get(place, "-") for place in range(len(function.arguments)))
        return Trial(f"{function.name}({shown})", lambda: self._made(replaced), allowed)

    def _made(self, replaced: Sequence[Tuple[int, Value]]) -> None:
        every.refresh(len(self.function.arguments))
        arguments = self._plain()
        unused = arguments[0] if self.function.takes_memory and replaced[0][0] == 0 else None
        for position, value in replaced:
            arguments[position] = value.object
        try:
            result = self._call(*arguments)
            if self.function.makes_memory:
                every.release(result)
        finally:
            if unused is not None:
                every.release(unused)


def each_argument(functions: List[Function], values: List[Value]) -> Iterator[Optional[Trial]]:
    """Each argument in turn through all values."""
    for function in functions:
        target = Target(function)
        for position in range(len(function.arguments)):
            for value in values:
                yield target.trial([(position, value)])


def each_count(functions: List[Function]) -> Iterator[Optional[Trial]]:
    """Every number of arguments but the right one."""
    for function in functions:
        call, right = function.function(), len(function.arguments)
        for count in set(range(12)) - {right}:
            arguments = [None] * count
            yield Trial(
                f"{function.name}: {count} arguments",
                partial(call, *arguments),
            )
        yield Trial(
            f"{function.name}: by keyword",
            partial(call, argument=None),
        )


def random_pairs(values: List[Value], seed: int, seconds: float) -> Iterator[Optional[Trial]]:
    """Two arguments of functions that chance picks; the same ones for the same seed."""
    chance = random.Random(seed)
    wide = [f for f in every.ALL if len(f.arguments) >= 2 and f.kind != "registration"]
    targets = [Target(function) for function in wide]
    end = time.monotonic() + seconds
    while time.monotonic() < end:
        for _ in range(100):
            target = chance.choice(targets)
            positions = chance.sample(range(len(target.function.arguments)), 2)
            yield target.trial([(position, chance.choice(values)) for position in positions])


def registrations(values: List[Value]) -> Iterator[Optional[Trial]]:
    """Odd classes, and pointers that become their instances, live and die."""
    listed = [function for function in every.ALL if function.kind == "registration"]
    for number, value in enumerate(values):
        function = listed[number % len(listed)]
        record = function.name[: -len("_swigregister")]

        def use(function: Function = function, value: Value = value, record: str = record) -> None:
            function.function()(value.object)
            for _ in range(2):
                try:
                    peer.pointer_object(every.block(0), f"{record} *")
                except BaseException:
                    pass
                # Collected by Python, which asks the class to destroy it.
                made = getattr(vs, f"new_{record}")(*[1] * (record in fields.SIZED))
                made.acquire()
                del made

        yield Trial(f"{function.name}({value.name}) and use", use)


def _views() -> Tuple[Callable[[], Any], Callable[[], Any]]:
    """Makers of this module's own pointer objects, of two types, into memory of the sweep."""
    signature = every.pointer("qex_MgmtApiSignature *", 0)
    address = every.pointer("qex_SocketIPAddress *", 0)
    return (
        lambda: vs.qex_MgmtApiSignature_name_get(signature),
        lambda: vs.qex_SocketIPAddress_sin_addr_get(address),
    )


def pointer_objects(values: List[Value]) -> Iterator[Optional[Trial]]:
    """The methods and operators of pointer objects, with anything."""

    made = _views()[0]
    compare = [operator.eq, operator.ne, operator.lt, operator.gt, operator.le, operator.ge]
    for value in values:
        for name in ("own", "append", "disown", "acquire", "next", "__int__", "__repr__", "__eq__"):

            def call(name: str = name, other: Any = value.object) -> None:
                pointer = made()
                try:
                    getattr(pointer, name)(other)
                    repr(pointer)
                finally:
                    pointer.disown()

            yield Trial(f"pointer.{name}({value.name})", call)
        for compared in compare:
            operands = [(made(), value.object), (value.object, made())]
            for left, right in operands:
                yield Trial(
                    f"{compared.__name__} of a pointer and {value.name}",
                    partial(compared, left, right),
                )
        yield Trial(
            f"pointer in a set with {value.name}",
            partial(operator.contains, [value.object], made()),
        )
        if issubclass(type(value.object), str):
            yield Trial(
                f"pointer: attribute {value.name}",
                partial(getattr, made(), value.object),
            )
            yield Trial(
                f"pointer: set attribute {value.name}",
                partial(setattr, made(), value.object, 1),
            )
    for unary in UNARY:
        yield Trial(f"{unary!r} of a pointer", partial(unary, made()))
    kind = type(made())
    yield Trial("pointer type called", lambda: kind())
    yield Trial("pointer type by object.__new__", lambda: object.__new__(kind))
    yield Trial("pointer type derived", lambda: type("Derived", (kind,), {}))
    yield Trial("pointer: class changed", lambda: setattr(made(), "__class__", object))


def chains() -> Iterator[Optional[Trial]]:
    """Pointer objects appended to each other, used and dropped."""
    name, address = _views()

    def use(pointer: Any) -> None:
        # The second wants a type that no pointer of the chain has.
        for call in (repr, vs.VSInfo_mtu_get, vs.VSDVS_FreeMemory, lambda p: p.next()):
            try:
                call(pointer)
            except (TypeError, RecursionError, ValueError):
                pass

    def appended(order: Sequence[Tuple[int, int]]) -> None:
        pointers = [name(), address(), name()]
        for first, second in order:
            try:
                pointers[first].append(pointers[second])
            except ValueError:
                pass
            for pointer in pointers:
                use(pointer)

    steps = list(itertools.product(range(3), repeat=2))
    for order in itertools.product(steps, repeat=3):
        yield Trial(f"appended: {order}", partial(appended, order))

    def long(length: int) -> None:
        first = last = name()
        for _ in range(length):
            following = address()
            last.append(following)
            last = following
        use(first)

    for length in (10, 1000, 300_000):
        yield Trial(f"a chain of {length}", partial(long, length))


def variables(values: List[Value]) -> Iterator[Optional[Trial]]:
    """The object with the module's variables."""
    cvar, names = vs.cvar, [
        "qex_ModuleCurrentID",
        "runtimeOptionNames",
        "none",
        "",
        "\ud800",
        "__x",
    ]
    for name in names:
        yield Trial(f"cvar.{name!a}", partial(getattr, cvar, name))
        yield Trial(f"del cvar.{name!a}", partial(delattr, cvar, name))
        for value in values:
            yield Trial(
                f"cvar.{name!a} = {value.name}",
                partial(setattr, cvar, name, value.object),
            )
    for unary in UNARY:
        yield Trial(f"{unary!r} of cvar", partial(unary, cvar))
    yield Trial("cvar type called", lambda: type(cvar)())
    yield Trial("cvar type by object.__new__", lambda: repr(object.__new__(type(cvar))))
    yield Trial("cvar type derived", lambda: type("Derived", (type(cvar),), {}))


def planted() -> Iterator[Optional[Trial]]:
    """What a sweep must find, between calls that are as they should be."""
    for name in ("nothing", "leave_an_error", "crash", "nothing", "hang", "fail", "end_by_abort"):
        yield Trial(f"faulty.{name}()", getattr(faulty, name))


BATCHES = ["reader", "writer", "call", "other", "registration", "pointers", "counts", "pairs"]


def trials(batch: str, seed: int, seconds: float) -> Iterator[Optional[Trial]]:
    """All calls of a batch; None for one that a rule leaves out."""
    values = pool.read()
    if batch in ("reader", "writer", "call"):
        return each_argument([f for f in every.ALL if f.kind == batch], values)
    if batch == "other":
        apart = ("reader", "writer", "call", "registration")
        return each_argument([f for f in every.ALL if f.kind not in apart], values)
    if batch == "registration":
        return registrations(values + pool.classes())
    if batch == "pointers":
        return itertools.chain(pointer_objects(values), chains(), variables(values))
    if batch == "counts":
        return each_count(every.ALL)
    if batch == "planted":
        return planted()
    return random_pairs(values, seed, seconds)


def sweep(found: Iterator[Optional[Trial]], note: Note, after: int) -> Iterator[str]:
    """Make the calls; yields what is neither a result nor an exception of its own."""
    for number, trial in enumerate(found, start=1):
        if trial is None or number <= after:
            continue
        note.show(number, trial.text)
        try:
            trial.call()
        except SystemError as error:
            if not trial.system_error:
                yield f"{trial.text}: {error} ({error.__cause__!r})"
        except BaseException:
            pass


def main() -> None:
    """Sweep one batch."""
    parser = argparse.ArgumentParser()
    parser.add_argument("batch", choices=[*BATCHES, "planted"])
    parser.add_argument("note", type=Path)
    parser.add_argument("report", type=Path)
    parser.add_argument("--seed", type=int, default=0)
    parser.add_argument("--seconds", type=float, default=1.0)
    parser.add_argument("--after", type=int, default=0)
    options = parser.parse_args()
    resource.setrlimit(resource.RLIMIT_CORE, (0, 0))
    # What records leave behind when they are collected is said on C's standard output.
    os.dup2(os.open(os.devnull, os.O_WRONLY), 1)
    sys.unraisablehook = lambda _: None
    found = trials(options.batch, options.seed, options.seconds)
    with open(options.report, "a", encoding="utf-8") as report:
        for line in sweep(found, Note(options.note), options.after):
            print(line, file=report, flush=True)


if __name__ == "__main__":
    main()
