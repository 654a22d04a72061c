"""Values of settings: frozen, compared by what they hold.

A value of a setting takes the words of documents as well as members of the enums, is checked when
it is made, and says itself in words with `words()`.
"""

import dataclasses
from dataclasses import dataclass
from typing import Any, Callable, ClassVar, Dict, List, Optional, Tuple, Type, TypeVar, Union

from libvswitch.enums import (
    Balance,
    Criteria,
    EthernetFilter,
    TeamFlags,
)
from vswitch import _table, words as _words
from vswitch._table import Form

__all__ = [
    "FrameFilter",
    "MacLearning",
    "PortMacLearning",
    "PrivateVlan",
    "Teaming",
    "Vlan",
]

V = TypeVar("V", bound="SettingValue")
Words = Any
"""A value as JSON has it."""


def to_words(form: Form, value: object, own: Optional[Callable[[Any], Any]] = None) -> Words:
    """What a value is in the words of documents; what is no value of its own kind stays as it is,
    as is a member of another family of constants."""
    kind = form["form"]
    is_own = isinstance(own, type) and isinstance(value, own)
    if kind == "choice" and is_own and isinstance(value, int):
        return _table.word_for(form["choices"], value)
    if kind == "bits":
        if is_own and isinstance(value, int):
            return [word for word, bit in form["choices"].items() if value & bit]
        if isinstance(value, str):
            return value.split(",") if value else []
        return list(value) if isinstance(value, (tuple, set, frozenset)) else value
    if isinstance(value, SettingValue):
        return value.words()
    if kind == "list" and form["element"]["form"] == "range":
        return value if value is not None else []
    if kind == "list" and isinstance(value, (list, tuple)):
        return [to_words(form["element"], one) for one in value]
    return value


_FIELDS: Dict[type, Tuple["dataclasses.Field[Any]", ...]] = {}


def _fields(kind: type) -> Tuple["dataclasses.Field[Any]", ...]:
    found = _FIELDS.get(kind)
    if found is None:
        found = _FIELDS[kind] = dataclasses.fields(kind)
    return found


class Value:
    """What frozen values have in common, once: a dataclass would write it for each of them when it
    is imported."""

    def __eq__(self, other: object) -> bool:
        if type(other) is not type(self):
            return NotImplemented
        assert isinstance(other, Value)
        return self.__dict__ == other.__dict__

    def __hash__(self) -> int:
        return hash(tuple(getattr(self, one.name) for one in _fields(type(self))))

    def __repr__(self) -> str:
        held = (f"{one.name}={getattr(self, one.name)!r}" for one in _fields(type(self)))
        return f"{type(self).__name__}({', '.join(held)})"


class SettingValue(Value):
    """What the values of settings have in common: their form in the table of settings."""

    _form: ClassVar[Form]
    _types: ClassVar[Dict[str, Callable[[Any], Any]]] = {}

    def __post_init__(self) -> None:
        given = {}
        for one in self._form["members"]:
            value = getattr(self, one["name"])
            if value is not None:
                given[one["name"]] = to_words(one, value, self._types.get(one["name"]))
        held = _words.read(self._form, given, type(self).__name__)
        for name, value in held.items():
            object.__setattr__(self, name, self._natural(name, value))

    @classmethod
    def known(cls: Type[V], **fields: Any) -> V:
        """What the host told, which nothing has to check, nor to know."""
        made = cls.__new__(cls)
        for one in _fields(cls):
            object.__setattr__(made, one.name, fields.get(one.name, one.default))
        return made

    @classmethod
    def from_words(cls: Type[V], held: Words) -> V:
        """From what `words.read` made of a document."""
        fields = {name: cls._natural(name, value) for name, value in held.items()}
        return cls.known(**fields)

    @classmethod
    def _natural(cls, name: str, held: Words) -> Any:
        """The value of a member that is said in words."""
        return natural(_table.get_member(cls._form, name), held, cls._types.get(name))

    def words(self) -> Words:
        """The value as JSON has it, and documents say it."""
        said = {}
        for one in self._form["members"]:
            name = one["name"]
            value = getattr(self, name)
            if value is None:
                continue
            if "always" in one or "required" in one or not self._is_absent(name, value):
                if name == "trunk":
                    value = _trunk_words(value)
                said[name] = to_words(one, value, self._types.get(name))
        alone = self._form.get("alone")
        if alone and set(said) <= {alone}:
            return getattr(self, alone)
        return said

    @classmethod
    def _is_absent(cls, name: str, value: object) -> bool:
        default: object = next(one.default for one in _fields(cls) if one.name == name)
        return value == default


def natural(form: Form, held: Words, kind: Optional[Callable[[Any], Any]] = None) -> Any:
    """The value that words say, of the kind that is its own."""
    what = form["form"]
    if what == "choice":
        return kind(form["choices"][held]) if kind else held
    if what == "bits":
        return kind(sum(form["choices"][word] for word in held)) if kind else tuple(held)
    if what == "list" and form["element"]["form"] == "range":
        return ",".join(str(one) for one in held) or None
    if what == "list":
        return tuple(natural(form["element"], one, kind) for one in held)
    if what in ("record", "one_of") and kind:
        return kind(held)
    return held


def _trunk_words(trunk: Optional[str]) -> List[Union[int, str]]:
    parts = trunk.split(",") if trunk else []
    return [part if "-" in part else int(part) for part in parts]


@dataclass(frozen=True, eq=False, repr=False)
class Vlan(SettingValue):
    """The VLANs of a port, all of them.

    `trunk` are those that its client tags itself, as "10-12,20"; a list of numbers and ranges is
    taken, too. `priority` is that of its frames. With `private`, `id` is the secondary VLAN of one
    of the switch's private VLANs.
    """

    id: int = 0
    trunk: Optional[str] = None
    priority: Optional[int] = None
    private: bool = False
    guest_tagging: bool = False

    _form: ClassVar[Form] = _table.PORT["vlan"].form


@dataclass(frozen=True, eq=False, repr=False)
class Teaming(SettingValue):
    """Which uplinks carry what ports send. None named means all of the switch."""

    balance: Balance = Balance.PORT
    active: Tuple[str, ...] = ()
    standby: Tuple[str, ...] = ()
    flags: TeamFlags = TeamFlags.ALL_AVAILABLE | TeamFlags.NOTIFY
    criteria: Criteria = Criteria.LINK
    speed: int = 0
    full_duplex: bool = False
    error_percent: int = 0

    _form: ClassVar[Form] = _table.SWITCH["teaming"].form
    _types: ClassVar[Dict[str, Callable[[Any], Any]]] = {
        "balance": Balance,
        "flags": TeamFlags,
        "criteria": Criteria,
    }


@dataclass(frozen=True, eq=False, repr=False)
class MacLearning(SettingValue):
    """MAC learning of the host or of a switch; the time in seconds."""

    aging_time: int = 300
    limit: int = 65536
    learn_static: bool = False

    _form: ClassVar[Form] = _table.SWITCH["mac_learning"].form


@dataclass(frozen=True, eq=False, repr=False)
class PortMacLearning(SettingValue):
    """MAC learning of a port; `limit_policy` is `allow` or `drop`."""

    learning: bool = False
    flooding: bool = False
    limit: int = 4096
    limit_policy: str = "allow"
    mac_change: bool = False

    _form: ClassVar[Form] = _table.PORT["mac_learning"].form


@dataclass(frozen=True, eq=False, repr=False)
class FrameFilter(SettingValue):
    """Frames that a port takes beside those for its client, and multicast addresses."""

    frames: EthernetFilter = EthernetFilter(0)
    addresses: Tuple[str, ...] = ()

    _form: ClassVar[Form] = _table.PORT["ethernet_filter"].form
    _types: ClassVar[Dict[str, Callable[[Any], Any]]] = {"frames": EthernetFilter}


@dataclass(frozen=True, eq=False, repr=False)
class PrivateVlan(SettingValue):
    """A private VLAN of a switch; `type` is `promiscuous`, `isolated` or `community`."""

    primary: int
    secondary: int
    type: str

    _form: ClassVar[Form] = _table.SWITCH["private_vlans"].form["element"]
