"""What calls refuse before the flat function is asked, which must accept what misleads."""

from typing import Any

from libvswitch import _records

# Bytes of a multicast group's address in the form of a mode; the other mode is no form.
FORMS = {0: 6, 2: 4, 3: 16}


def refuse_nul(where: str, text: str) -> None:
    raise ValueError(f"{where} is a text without a NUL, which would cut it short, not {text!r}")


def text(where: str, given: Any) -> Any:
    """A text for a field; what else a field takes passes."""
    if isinstance(given, str) and "\0" in given:
        refuse_nul(where, given)
    return given


def truth(where: str, given: Any) -> Any:
    if isinstance(given, (str, bytes)):
        raise TypeError(f"{where} is True or False, not {given!r}")
    return given


def form(where: str, given: Any, mode: Any) -> None:
    """An address has all bytes of its form."""
    if not isinstance(given, bytes):
        raise TypeError(f"{where} is bytes, not {type(given).__name__}")
    size = FORMS.get(mode)
    if size is not None and len(given) < size:
        raise ValueError(f"{where} is {size} bytes with mode {mode}, not {len(given)}")


def address(where: str, given: Any) -> Any:
    """The bytes of a hardware address, in whatever has bytes."""
    try:
        size = memoryview(given).nbytes
    except TypeError:
        raise TypeError(f"{where} is bytes, not {type(given).__name__}") from None
    if size != 6:
        raise ValueError(f"{where} is 6 bytes, not {size}")
    return given


def fits(where: str, given: Any, of: str, length: Any, element: int) -> None:
    """Whether as many elements of so many bytes are there as a length says."""
    available = _records.room(given) if isinstance(given, _records._Pointing) else None
    if available is not None and isinstance(length, int) and length * element > available:
        raise ValueError(f"{of} is {length}, and {where} has {max(available, 0) // element}")


def cell(where: str, given: Any, size: int) -> None:
    """Whether there is room for what a call leaves at a pointer."""
    available = _records.room(given) if isinstance(given, _records._Pointing) else None
    if available is not None and available < size:
        raise ValueError(f"{where} has no element for the call to fill")


def function(where: str, given: Any) -> None:
    """A function, or a pointer to one. Without any, a walk would visit nothing and say nothing."""
    if given is None:
        raise TypeError(f"{where} is a function, not None")


def walked(where: str, given: Any) -> None:
    if given is None:
        raise ValueError(
            f"{where} is None, as of what was not found: there is nothing to walk over"
        )
