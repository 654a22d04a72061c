"""Live mappings: what the host has now, looked up and walked over when somebody asks."""

from __future__ import annotations

import typing
from typing import Callable, Iterable, Iterator, Optional, Tuple, TypeVar

from libvswitch.errors import NotFound

T = TypeVar("T")


class Live(typing.Mapping[str, T]):
    """A mapping by name. What is not there raises the NotFound of the call that looked for it.

    `get` looks a name up; `make` takes one that was told just now, and asks for nothing.
    """

    def __init__(
        self,
        names: Callable[[], Iterable[str]],
        get: Callable[[str], T],
        shown: str,
        make: Optional[Callable[[str], T]] = None,
    ) -> None:
        self._names = names
        self._get = get
        self._make = make or get
        self._shown = shown

    def __getitem__(self, name: str) -> T:
        # No call can be asked about such a text, so it is the name of nothing.
        if isinstance(name, str) and ("\0" in name or not _is_utf_8(name)):
            raise NotFound(f"no {name!r} among the {self._shown}")
        return self._get(name)

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


def _is_utf_8(name: str) -> bool:
    try:
        name.encode()
    except UnicodeEncodeError:
        return False
    return True


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
