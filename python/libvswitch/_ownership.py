"""Memory of the library: through which door it goes back, once."""

import contextlib
import typing
from typing import Any, Callable, Optional, TypeVar, Union

import _libvswitch
from libvswitch import _records

__all__ = ["DOORS", "door_of", "hand_out", "owned", "release"]

T = TypeVar("T")
Door = Union[str, Callable[[Any], Any]]

DOORS = (
    "VSQEX_FreeMemory",
    "VSDVS_FreeMemory",
    "DVSQEX_DataFree",
    "DVSData_Free",
    "free_dvmirror_session_table",
)


def door_of(call: str) -> Optional[str]:
    """The call that takes back what `call` hands out; None for what it only lets see."""
    if call == "DVSData_Alloc" or call.endswith("PropList"):
        return "DVSData_Free"
    if call.startswith("VSQEX_"):
        return "VSQEX_FreeMemory"
    if call.startswith("VSDVS_"):
        return "VSDVS_FreeMemory"
    if call.startswith("DVSQEX_"):
        return "DVSQEX_DataFree"
    return None


def hand_out(result: Any, door: Optional[str]) -> None:
    """Notes the door on a record, an array or a pointer."""
    if isinstance(result, _records._Pointing) and door is not None:
        result.__dict__["_door"] = door


def release(given: Any, free: Callable[[Any], Any]) -> None:
    """Gives memory back and makes the object null; what is refused stays as it is.

    ValueError for what is null already, and where `free` is a door for memory of another kind.
    """
    if not int(given):
        raise ValueError(f"this {_name(given)} is gone: its memory was given back")
    _require_door(given, free)
    free(given)
    _records.end(given)


def _require_door(given: Any, free: Callable[[Any], Any]) -> None:
    """A library need not find out itself what was never its own, and may be damaged by it."""
    asked, right = getattr(free, "__name__", ""), given.__dict__.get("_door")
    if asked not in DOORS:
        return
    if given.__dict__.get("_owner") is not None:
        raise ValueError(f"this {_name(given)} lies in memory of another object, which goes back")
    if given.this.own():
        raise ValueError(f"this {_name(given)} is the caller's own, and {asked} takes none of that")
    if right is not None and asked != right:
        raise ValueError(f"this {_name(given)} goes back through {right}, not {asked}")


def _name(given: Any) -> str:
    return type(given).__name__


class owned(typing.Generic[T]):
    """Library memory for the time of a block: `with owned(VSQEX_GetUplinks('tour')) as result:`.

    Takes the result of a call, or a record, an array, a cell or a pointer of one, and gives what
    the library allocated back at the end of the block, each once, whatever happens in the block.
    Using it afterwards raises ValueError. The door is that of the call which handed it out, unless
    `door` names another or is a function. What the block gave back itself is left alone, and so is
    None, which a call answers where it had nothing to hand out. Whatever cannot hold memory of the
    library is a TypeError: a status alone, a pointer object that no class stands for.
    """

    def __init__(self, result: T, door: Optional[Door] = None) -> None:
        self._result = result
        self._door = door
        self._handed_out = list(_pointing(result))
        for one in self._handed_out:
            _require_door(one, self._free(one))

    def __enter__(self) -> T:
        return self._result

    def __exit__(self, *unused: Any) -> None:
        # What one door refuses must not keep the others shut.
        with contextlib.ExitStack() as doors:
            for one in reversed(self._handed_out):
                doors.callback(self._give_back, one)

    def _give_back(self, one: Any) -> None:
        if int(one):
            release(one, self._free(one))

    def _free(self, one: Any) -> Callable[[Any], Any]:
        door = self._door if self._door is not None else one.__dict__.get("_door")
        if door is None:
            raise ValueError("no call handed this out for the caller to give back; name the door")
        if not isinstance(door, str):
            function: Callable[[Any], Any] = door
            return function
        if door not in DOORS:
            raise ValueError(f"{door!r} takes no memory back; {', '.join(DOORS)} do")
        free: Callable[[Any], Any] = getattr(_libvswitch, door)
        return free


def _pointing(result: Any, is_output: bool = False) -> typing.Iterator[Any]:
    if isinstance(result, (tuple, list)):
        for one in result:
            yield from _pointing(one, is_output=True)
    elif isinstance(result, _records._Pointing):
        yield from result._handed_out()
    elif result is not None and not (is_output and isinstance(result, (int, str))):
        raise TypeError(
            "owned takes what a call answered, a record, an array, a cell or a pointer, "
            f"not {_name(result)}"
        )
