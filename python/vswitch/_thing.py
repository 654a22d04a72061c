"""What switches and ports have in common: properties, which hold exact bytes, and a path.

Settings are read and written through typed calls where there are such. What is set, and with which
bytes and property type, only raw calls and walks tell.
"""

from __future__ import annotations

import abc
import typing
from typing import Dict, Optional

from libvswitch import checked
from libvswitch.errors import HostError
from vswitch import _table
from vswitch._mapping import sought
from vswitch.words import SYNONYMS

if typing.TYPE_CHECKING:
    from vswitch.host import Host

Item = checked.DVSDataItem
Before = Dict[str, Optional[Item]]
"""Properties as they were, None for one that was not set."""


class Thing(abc.ABC):
    """A switch, the host's part of one, or a port."""

    _settings: typing.ClassVar[Dict[str, _table.Property]] = {}
    host: "Host"

    @property
    @abc.abstractmethod
    def path(self) -> str:
        """How changes and events call it."""

    @property
    @abc.abstractmethod
    def owner(self) -> "typing.Tuple[str, ...]":
        """The arguments by which typed calls know it."""

    @abc.abstractmethod
    def exists(self) -> bool:
        """Whether the host has it."""

    @abc.abstractmethod
    def properties(self) -> Dict[str, Item]:
        """All properties that are set, by their keys."""

    @abc.abstractmethod
    def read_property(self, key: str) -> bytes:
        """The bytes of a property that a call can be asked about."""

    @abc.abstractmethod
    def write_property(self, key: str, data: bytes, type_: int) -> None:
        """Sets a property, and notes nothing."""

    @abc.abstractmethod
    def erase_property(self, key: str) -> None:
        """Clears a property that is set, and notes nothing."""

    def get_property(self, key: str) -> bytes:
        """The bytes of a property; NotFound if it is not set."""
        return self.read_property(sought(key, f"properties of {self.path}"))

    def set_property(self, key: str, data: bytes, type_: int) -> None:
        """Sets a property that has no name, by its bytes and its property type."""
        with self.host._writing_properties(self, (key,)):
            self.write_property(key, data, type_)

    def clear_property(self, key: str) -> None:
        """Clears a property; one that is not set stays so."""
        if key in self.properties():
            with self.host._writing_properties(self, (key,)):
                self.erase_property(key)

    def is_set(self, name: str) -> bool:
        """Whether a setting has a value of its own, even if that is the default."""
        known = self._settings.get(SYNONYMS.get(name, name))
        if known is None:
            names = ", ".join(sorted(self._settings))
            raise AttributeError(f"{type(self).__name__} has no setting {name!r} (it has {names})")
        held = self.properties()
        return any(key in held for key in known.keys)


def own_properties(thing: Thing) -> Dict[str, Item]:
    """The properties that somebody has set."""
    held = thing.properties()
    return {key: item for key, item in held.items() if key not in _table.COMPUTED}


def restore(thing: Thing, before: Before) -> None:
    """Puts bytes and property types back, and takes away what was not there."""
    held = thing.properties()
    failed: Optional[HostError] = None
    for key, item in before.items():
        if held.get(key) == item:
            continue
        # One that fails must not keep the others from their places.
        try:
            if item is None:
                thing.erase_property(key)
            else:
                thing.write_property(key, item.data, item.propertyType)
        except HostError as error:
            failed = failed or error
    if failed is not None:
        raise failed


def restore_all(thing: Thing, before: Dict[str, Item]) -> None:
    """Likewise, and takes away whatever else somebody has set."""
    keys = {*before, *own_properties(thing)}
    restore(thing, {key: before.get(key) for key in keys})
