"""Live mappings: what the host has now, looked up and walked over when somebody asks."""

from __future__ import annotations

import typing
from typing import Callable, Iterable, Iterator, TypeVar

T = TypeVar("T")


class Live(typing.Mapping[str, T]):
    """A mapping by name. What is not there raises the NotFound of the call that looked for it."""

    def __init__(
        self, names: Callable[[], Iterable[str]], get: Callable[[str], T], shown: str
    ) -> None:
        self._names = names
        self._get = get
        self._shown = shown

    def __getitem__(self, name: str) -> T:
        return self._get(name)

    def __contains__(self, name: object) -> bool:
        return isinstance(name, str) and name in set(self._names())

    def __iter__(self) -> Iterator[str]:
        return iter(tuple(self._names()))

    def __len__(self) -> int:
        return len(tuple(self._names()))

    def __repr__(self) -> str:
        return f"<{self._shown}: {', '.join(self) or 'none'}>"
