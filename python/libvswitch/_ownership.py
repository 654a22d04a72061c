"""Memory of the library: which deallocator releases it, once."""

import contextlib
import types
import typing
import weakref
from typing import Any, Callable, Dict, Optional, TypeVar, Union

import _libvswitch
from libvswitch import _arrays, _layout, _locks, _pointers, _records

__all__ = ["owned"]

T = TypeVar("T")
Deallocator = Union[str, Callable[[Any], Any]]

# What is allocated, by its place: another pointer to it must not outlive it.
_allocated: Dict[int, "weakref.ref[Any]"] = {}
# Of several threads, one at a time releases.
_releasing = _locks.RLock()


def allocated(result: Any, deallocator: Optional[str], status: int = 0) -> Any:
    """Notes on a record, an array or a pointer who releases it, and where its memory ends.

    With a failure nobody knows what is there.
    """
    if isinstance(result, _records._Pointing):
        if deallocator is not None:
            result.__dict__["_deallocator"] = deallocator
            _allocated[_pointers.address_of(result)] = weakref.ref(result)
        if status == 0 and isinstance(result, _records.Record):
            end = type(result)._end_of(result)
            if end is not None:
                result.__dict__["_end"] = end
    return result


def allocated_array(
    result: Any, element: str, count: int, deallocator: str, status: int = 0
) -> Any:
    """Likewise of elements in a row, which the flat function returns under some pointer's type."""
    if result is None:
        return None
    address = int(result)
    pointer = _pointers.pointer_object(address, f"{element} *")
    array = _arrays.made(pointer, element, count if status == 0 else 0)
    array.__dict__["_end"] = address + len(array) * array.size
    return allocated(array, deallocator)


def release(given: Any, deallocator: Callable[[Any], Any]) -> None:
    """Releases memory and makes the object null; what is refused stays as it is.

    ValueError for what is null already, and for memory that another deallocator releases.
    """
    with _releasing:
        given._require()
        _require_deallocator(given, deallocator)
        address = int(given)
        known = _allocated.pop(address, None)
        other = known() if known is not None else None
        taken = [_records.Taken(given)]
        if other is not None and other is not given:
            taken.append(_records.Taken(other))
        memory = taken[0].pointer
        if not isinstance(deallocator, types.BuiltinFunctionType):
            memory = object.__new__(type(given))
            _pointers.attach(memory, taken[0].pointer)
            memory.__dict__.update(given.__dict__, _views={}, _cells=())
        try:
            _pointers.release(deallocator, memory)
        except BaseException:
            # Nothing is put back of what was released before the exception came.
            if _pointers.address_of(memory):
                for one in taken:
                    one.put_back()
                if known is not None:
                    _allocated[address] = known
            raise


def taking_back(given: Any, deallocator: Callable[[Any], Any]) -> None:
    """What a deallocator does: it takes what calls allocated, or None."""
    if given is None:
        return
    if not isinstance(given, _records._Pointing):
        raise TypeError(
            f"{deallocator.__name__} takes a record, an array, a cell or a pointer of libvswitch, "
            f"not {_name(given)}"
        )
    for one in given._allocated():
        release(one, deallocator)


def _require_deallocator(given: Any, deallocator: Callable[[Any], Any]) -> None:
    """A library need not find out itself what was never its own, and may be damaged by it."""
    asked, right = getattr(deallocator, "__name__", ""), given.__dict__.get("_deallocator")
    if asked not in _layout.DEALLOCATORS:
        return
    if given.__dict__.get("_owner") is not None:
        raise ValueError(f"this {_name(given)} lies in memory of another object, which is released")
    if given.this.own():
        raise ValueError(
            f"this {_name(given)} is the caller's own, and {asked} releases none of that"
        )
    if right is not None and asked != right:
        raise ValueError(f"{right} releases this {_name(given)}, not {asked}")


def _name(given: Any) -> str:
    return type(given).__name__


class owned(typing.Generic[T]):
    """Library memory for the time of a block: `with owned(VSQEX_GetUplinks('tour')) as result:`.

    Takes the result of a call, or a record, an array, a cell or a pointer of one, and releases what
    the library allocated at the end of the block, each once, whatever happens in the block. Using
    it afterwards raises ValueError. The deallocator is that of the call which allocated it, unless
    `deallocator` names another or is a function. What the block released itself is left alone, and
    so is None, which a call returns where it had nothing to allocate. Whatever cannot hold memory
    of the library is a TypeError: a status alone, a pointer object that no class stands for.
    """

    def __init__(self, result: T, deallocator: Optional[Deallocator] = None) -> None:
        self._result = result
        self._deallocator = deallocator
        self._taken = list(_pointing(result))
        for one in self._taken:
            _require_deallocator(one, self._function(one))

    def __enter__(self) -> T:
        return self._result

    def __exit__(self, *unused: Any) -> None:
        # What one deallocator refuses must not keep the others from their work.
        with contextlib.ExitStack() as releases:
            for one in reversed(self._taken):
                releases.callback(self._release, one)

    def _release(self, one: Any) -> None:
        if int(one):
            release(one, self._function(one))

    def _function(self, one: Any) -> Callable[[Any], Any]:
        chosen = self._deallocator
        if chosen is None:
            chosen = one.__dict__.get("_deallocator")
        if chosen is None:
            raise ValueError("no call allocated this for the caller; name the deallocator")
        if not isinstance(chosen, str):
            return chosen
        if chosen not in _layout.DEALLOCATORS:
            known = ", ".join(_layout.DEALLOCATORS)
            raise ValueError(f"{chosen!r} releases no memory; {known} do")
        function: Callable[[Any], Any] = getattr(_libvswitch, chosen)
        return function


def _pointing(result: Any, is_output: bool = False) -> typing.Iterator[Any]:
    if isinstance(result, (tuple, list)):
        for one in result:
            yield from _pointing(one, is_output=True)
    elif isinstance(result, _records._Pointing):
        yield from result._allocated()
    elif result is not None and not (is_output and isinstance(result, (int, str))):
        raise TypeError(
            "owned takes what a call returned, a record, an array, a cell or a pointer, "
            f"not {_name(result)}"
        )
