"""Live mappings: what the host has now, looked up and walked over when somebody asks."""

from __future__ import annotations

import typing
from typing import Callable, Iterable, Iterator, Optional, Tuple, TypeVar

from libvswitch.errors import NotFound

T = TypeVar("T")


class Live(typing.Mapping[str, T]):
    """A mapping by name. What is not there raises the NotFound of the call that looked for it.

    `get` looks a name up; `make` takes one that was told just now, and asks for nothing. A call
    takes names of so many bytes at most.
    """

    def __init__(
        self,
        names: Callable[[], Iterable[str]],
        get: Callable[[str], T],
        shown: str,
        make: Optional[Callable[[str], T]] = None,
        most_bytes: Optional[int] = None,
    ) -> None:
        self._names = names
        self._get = get
        self._make = make or get
        self._shown = shown
        self._most_bytes = most_bytes

    def __getitem__(self, name: str) -> T:
        return self._get(sought(name, self._shown, self._most_bytes))

    def __contains__(self, name: object) -> bool:
        return isinstance(name, str) and super().__contains__(name)

    def __iter__(self) -> Iterator[str]:
        return iter(tuple(self._names()))

    def __len__(self) -> int:
        return len(tuple(self._names()))

    def values(self) -> typing.ValuesView[T]:
        return _Values(self)

    def items(self) -> typing.ItemsView[str, T]:
        return _Items(self)

    def __repr__(self) -> str:
        return f"<{self._shown}: {', '.join(self) or 'none'}>"


def sought(name: object, among: str, most_bytes: Optional[int] = None) -> str:
    """A name that calls can be asked about; any other text is the name of nothing: NotFound."""
    known = require_text(name, among)
    try:
        size = len(known.encode())
    except UnicodeEncodeError:
        raise _nothing(known, among) from None
    if "\0" in known or (most_bytes is not None and size > most_bytes):
        raise _nothing(known, among)
    return known


def require_text(name: object, among: str) -> str:
    if not isinstance(name, str):
        raise TypeError(f"the {among} are found by a str, not by {type(name).__name__}")
    return name


def _nothing(name: str, among: str) -> NotFound:
    return NotFound(f"no {name!r} among the {among}")


class _Values(typing.ValuesView[T]):
    def __init__(self, live: Live[T]) -> None:
        super().__init__(live)
        self._live = live

    def __iter__(self) -> Iterator[T]:
        return map(self._live._make, self._live)


class _Items(typing.ItemsView[str, T]):
    def __init__(self, live: Live[T]) -> None:
        super().__init__(live)
        self._live = live

    def __iter__(self) -> Iterator[Tuple[str, T]]:
        return ((name, self._live._make(name)) for name in self._live)
