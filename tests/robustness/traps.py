"""Lets one call after another trap, and reports what goes wrong or grows.

    traps.py in-turns TRAPS   all calls take turns, and each is made again after its trap
    traps.py in-a-row TRAPS   of each call so many, one right after the other

Prints a line for each thing that is wrong, and at the end how many traps there were.
"""

import gc
import itertools
import os
import sys
from typing import Any, Iterator, List, NamedTuple, Tuple, Type

import calls
import faulty
import results
from calls import Call
from recording_host import RecordingHost
from repeat import heap, say


class Failing(Exception):
    """Cannot be made."""

    def __init__(self, *arguments: object) -> None:
        raise ArithmeticError("not made")


class Demanding(Exception):
    """Wants more than a text."""

    def __init__(self, first: object, second: object) -> None:
        super().__init__(first, second)


class Impostor(Exception):
    """Makes something else of itself."""

    def __new__(cls, *arguments: object) -> Any:
        return 7


class Exit(BaseException):
    """No Exception."""


class Trap(NamedTuple):
    """What the host names in a trap, and what the call raises then."""

    type: Type[BaseException]
    text: bytes
    raised: Tuple[Type[BaseException], ...]
    """Which of these may depend on the interpreter."""


TRAPS = [
    Trap(RuntimeError, b"trapped", (RuntimeError,)),
    Trap(Exit, b"", (Exit,)),
    Trap(KeyboardInterrupt, b"trapped", (KeyboardInterrupt,)),
    Trap(SystemExit, b"3", (SystemExit,)),
    Trap(StopIteration, b"x" * 5000, (StopIteration,)),
    Trap(MemoryError, b"trapped", (MemoryError,)),
    Trap(Failing, b"trapped", (ArithmeticError,)),
    Trap(Demanding, b"trapped", (TypeError,)),
    Trap(UnicodeDecodeError, b"trapped", (TypeError,)),
    Trap(RuntimeError, b"no text: \xff", (RuntimeError, UnicodeDecodeError)),
]
if sys.version_info >= (3, 9):
    # Before, the interpreter itself crashes when it makes such an exception.
    TRAPS.append(Trap(Impostor, b"trapped", (TypeError,)))


class Target(NamedTuple):
    """A call with short texts, of which no copy is left behind."""

    call: Call
    given: List[Any]
    outputs: List[Tuple[int, Any]]


def targets() -> Iterator[Target]:
    """Every call that arms the trap."""
    for call in calls.ALL:
        if call.name != "Panic":
            told = [results.kind(output).samples()[-1].told for output in call.outputs]
            outputs = [(call.output_position(index), value) for index, value in enumerate(told)]
            yield Target(call, call.given(), outputs)


def trap(host: RecordingHost, target: Target, chosen: Trap, after_outputs: bool) -> str:
    """Trap once, then return; what is wrong, or nothing."""
    call = target.call
    host.reset()
    host.answer(call.name, outputs=dict(target.outputs))
    host.spring(call.name, chosen.type, chosen.text, nth=1, after_outputs=after_outputs)
    try:
        call(*target.given)
    except BaseException as error:
        raised: Any = type(error)
    else:
        raised = None
    try:
        call(*target.given)
    except BaseException as error:
        return f"{call}: the call after {chosen.type.__name__} raised {error!r}"
    if raised not in chosen.raised:
        return f"{call}: {chosen.type.__name__} raised {raised}"
    return ""


def all_of_them() -> Iterator[Tuple[Target, Trap, bool]]:
    """Every call with every kind of trap."""
    return itertools.product(list(targets()), TRAPS, (False, True))


def in_a_row(host: RecordingHost, target: Target, chosen: Trap, count: int) -> Iterator[str]:
    """Trap so many times, before and after the outputs; what is wrong."""
    call, leaks = target.call, os.environ.get("PLANTED")
    for after_outputs in (False, True):
        host.reset()
        host.take_no_notes()
        host.answer(call.name, outputs=dict(target.outputs))
        host.spring(call.name, chosen.type, chosen.text, after_outputs=after_outputs)
        for _ in range(count):
            try:
                call(*target.given)
            except chosen.raised:
                pass
            except BaseException as error:
                yield f"{call}: {chosen.type.__name__} raised {error!r}"
            else:
                yield f"{call}: {chosen.type.__name__} was not raised"
            if leaks:
                faulty.leak_memory()


def each_in_a_row(count: int) -> None:
    """Trap so many times on each call; the last nine tenths must not need more memory."""
    host = RecordingHost()
    each = max(10, count // len(TRAPS) // 2)
    done = 0
    for target in targets():
        sizes = []
        for share in (each - each * 9 // 10, each * 9 // 10):
            for chosen in TRAPS:
                for wrong in in_a_row(host, target, chosen, share):
                    say(wrong)
                done += 2 * share
            host.reset()
            gc.collect()
            sizes.append((heap(), sys.getallocatedblocks()))
        say_what_grows(sizes, f"{target.call}: ")
    say(str(done))


def say_what_grows(sizes: List[Tuple[int, int]], where: str = "") -> None:
    """Look at the heap and at the objects that there were, from one time to the next."""
    for index, (what, noise) in enumerate([("bytes of the heap", 8192), ("objects", 300)]):
        grown = [after[index] - before[index] for before, after in zip(sizes, sizes[1:])]
        if min(grown) > noise:
            say(f"{where}grows: {grown} {what}")


def all_in_turns(count: int) -> None:
    """Trap so many times, in three parts that must end with the same memory."""
    host = RecordingHost()
    found = list(all_of_them())
    rounds = max(1, count // 3 // len(found))
    leaks = os.environ.get("PLANTED")
    sizes = []
    for _ in range(3):
        for _ in range(rounds):
            for target, chosen, after_outputs in found:
                wrong = trap(host, target, chosen, after_outputs)
                if wrong:
                    say(wrong)
                if leaks:
                    faulty.leak_memory()
        host.reset()
        gc.collect()
        sizes.append((heap(), sys.getallocatedblocks()))
    say_what_grows(sizes)
    say(str(3 * rounds * len(found)))


if __name__ == "__main__":
    {"in-turns": all_in_turns, "in-a-row": each_in_a_row}[sys.argv[1]](int(sys.argv[2]))
