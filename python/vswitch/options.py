"""The runtime options of the host."""

from __future__ import annotations

import typing
from typing import Any, Dict, Iterator, Union

from libvswitch import checked
from libvswitch.errors import NotFound
from vswitch import _undo, words as _words
from vswitch._mapping import require_text
from vswitch._properties import RUNTIME_OPTIONS

if typing.TYPE_CHECKING:
    from vswitch.host import Host

__all__ = ["Options", "read_option"]

Option = Union[int, str]


class Options(typing.MutableMapping[str, Option]):
    """The runtime options of the host, by their names; to delete one sets its default."""

    def __init__(self, host: "Host") -> None:
        self._host = host

    def all(self) -> Dict[str, Option]:
        """All of them, asked for at once."""
        return {name: one.value for name, one in self._all().items()}

    def _all(self) -> Dict[str, checked.VSRuntimeOption]:
        return {one.name: one for one in checked.VSQEX_GetRuntimeOptions()}

    def _get(self, name: str) -> checked.VSRuntimeOption:
        known = self._all()
        if require_text(name, "runtime options") not in known:
            raise NotFound(f"no runtime option {name!r} (there are {', '.join(sorted(known))})")
        return known[name]

    def __getitem__(self, name: str) -> Option:
        return self._get(name).value

    def __setitem__(self, name: str, value: Option) -> None:
        type_ = self._get(name).type
        held = read_option(name, value, name)
        with self._host._writing(_undo.Options, (type_,)):
            checked.VSQEX_SetRuntimeOptions([checked.VSRuntimeOption(type_, held)])

    def __delitem__(self, name: str) -> None:
        known = self._get(name)
        self[name] = _option(known.name)["default"]

    def __contains__(self, name: object) -> bool:
        return isinstance(name, str) and name in self._all()

    def __iter__(self) -> Iterator[str]:
        return iter(self._all())

    def __len__(self) -> int:
        return len(self._all())

    def __repr__(self) -> str:
        return f"Options({self.all()!r})"


def _option(name: str) -> Dict[str, Any]:
    return next((one for one in RUNTIME_OPTIONS if one["name"] == name), {})


def read_option(name: str, value: object, path: str) -> Option:
    """The value of a runtime option, checked."""
    known = _option(name)
    if "least" in known:
        return _words.number(value, path, known["least"], known["greatest"])
    return _words.address(value, path)
