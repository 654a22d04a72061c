"""What settings there are: the table that the build compiles into this package, looked up."""

import typing
from typing import Any, Dict, FrozenSet, Tuple

import _libvswitch as _flat
from vswitch._properties import PROPERTIES

Form = Dict[str, Any]
"""What values there are, as documents say them: `form`, and what belongs to it."""

PROPERTY_TYPES: Dict[str, int] = {
    "config": _flat.CONFIG_PROP_TYPE,
    "runtime": _flat.RUNTIME_PROP_TYPE,
    "volatile": _flat.VOLATILE_PROP_TYPE,
    "policy": _flat.POLICY_PROP_TYPE,
}


class Property(typing.NamedTuple):
    """A setting that has a name."""

    name: str
    scope: str
    key: str
    companions: Tuple[str, ...]
    """Keys of what is said as a part of it."""
    type: int
    form: Form
    bytes: str
    default: Any
    words: str

    @property
    def keys(self) -> Tuple[str, ...]:
        return (self.key, *self.companions)


def _named(scope: str, under: str) -> Dict[str, Property]:
    found = {}
    for known in PROPERTIES:
        if known["scope"] == scope and under in known:
            companions = [
                other["key"]
                for other in PROPERTIES
                if other["scope"] == scope and other.get("part_of", {}).get("name") == known["name"]
            ]
            found[known[under]] = _property(known, known[under], tuple(companions))
    return found


def _property(known: Dict[str, Any], name: str, companions: Tuple[str, ...]) -> Property:
    return Property(
        name,
        known["scope"],
        known["key"],
        companions,
        PROPERTY_TYPES[known["type"]],
        known["value"],
        known["bytes"],
        known.get("default"),
        known["words"],
    )


SWITCH = _named("switch", "name")
PORT = _named("port", "name")
UPLINK_PORT = _named("port", "uplink_port_name")

# All, those without a name too, which their keys stand for.
BY_KEY = {known["key"]: _property(known, known["key"], ()) for known in PROPERTIES}

# What the host works out by itself, and what no document has to say.
COMPUTED: FrozenSet[str] = frozenset(known["key"] for known in PROPERTIES if known["computed"])


def get_member(form: Form, name: str) -> Form:
    """The form of a member of a record."""
    return next(one for one in form["members"] if one["name"] == name)


def choices(form: Form, name: str) -> Dict[str, int]:
    """The words that there are for a member of a record, and what they stand for."""
    found: Dict[str, int] = get_member(form, name)["choices"]
    return found


def word_for(choices: Dict[str, int], number: int) -> str:
    """The word for a number; of one that has none, the digits."""
    return next((word for word, one in choices.items() if one == number), str(number))
