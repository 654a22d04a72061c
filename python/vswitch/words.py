"""The words of settings: how documents, the command and people say a value, and how they are read.

There is one function for each direction, and no word about any one setting: forms come from the
table of properties. What is read comes out in one spelling, whole: members that are left out have
their defaults.
"""

from __future__ import annotations

import re
from typing import Any, Callable, Dict, Iterable, List, Optional, Tuple

from vswitch._table import Form

__all__ = ["ABSENT", "DocumentError", "mac", "printable", "read", "trunk"]

SYNONYMS = {
    "options": "runtime_options",
    "identifier": "id",
    "macs": "addresses",
    "mirrors": "mirror_sessions",
}
"""Where an object has a shorter name than documents have."""

ABSENT = "absent"
"""In place of a setting's value in a document: the setting is to be cleared."""


class DocumentError(ValueError):
    """What is wrong with a value or a document: where, and what is expected there."""

    def __init__(self, path: str, expected: str) -> None:
        super().__init__(f"{path}: {expected}" if path else expected)
        self.path = path
        self.expected = expected

    def __reduce__(self) -> Tuple[Any, ...]:
        return type(self), (self.path, self.expected)


def printable(given: object) -> str:
    """A text of one line that moves no cursor: names come from a host."""
    text = str(given)
    if text.isprintable():
        return text
    return "".join(one if one.isprintable() else _escaped(one) for one in text)


def _escaped(character: str) -> str:
    return character.encode("unicode_escape", "surrogatepass").decode("ascii")


def under(path: str, name: str) -> str:
    """The path of a member."""
    return f"{path}.{name}" if path else name


def fail(path: str, given: object, expected: str) -> DocumentError:
    """What to raise for a value that is not what is expected."""
    shown = repr(given)
    shown = shown if len(shown) <= 60 else f"{shown[:57]}..."
    return DocumentError(path, f"{shown} is not {expected}")


def text(given: object, path: str, most: Optional[int] = None, least: int = 0) -> str:
    if not isinstance(given, str):
        raise fail(path, given, "a text")
    if "\0" in given:
        raise fail(path, given, "a text without NUL")
    try:
        size = len(given.encode())
    except UnicodeEncodeError:
        raise fail(path, given, "a text that UTF-8 has bytes for") from None
    if most is not None and size > most:
        raise fail(path, given, f"a text of {most} bytes at most")
    if size < least:
        raise fail(path, given, f"a text of {least} bytes at least")
    return given


def number(given: object, path: str, least: int, greatest: int) -> int:
    if isinstance(given, bool) or not isinstance(given, int):
        raise fail(path, given, f"a whole number from {least} to {greatest}")
    if given < least:
        raise DocumentError(path, f"{int(given)} is below {least}")
    if given > greatest:
        raise DocumentError(path, f"{int(given)} is above {greatest}")
    return int(given)


def flag(given: object, path: str) -> bool:
    if not isinstance(given, bool):
        raise fail(path, given, "true or false")
    return given


def items(given: object, path: str) -> List[Any]:
    if isinstance(given, (str, bytes, dict)) or not isinstance(given, Iterable):
        raise fail(path, given, "a list")
    return list(given)


def members(given: object, path: str, known: Iterable[str]) -> Dict[str, Any]:
    """An object with no other keys than these."""
    if not isinstance(given, dict):
        raise fail(path, given, "an object")
    allowed = list(known)
    for name in given:
        if name not in allowed:
            where = under(path, str(name))
            raise DocumentError(where, f"unknown key; there are {', '.join(sorted(allowed))}")
    return dict(given)


def choice(given: object, path: str, choices: Iterable[str]) -> str:
    known = list(choices)
    if not isinstance(given, str) or given not in known:
        raise fail(path, given, f"one of {', '.join(known)}")
    return given


def mac(given: object, path: str = "mac") -> str:
    """A hardware address in any spelling, in the host's."""
    digits = re.sub(r"[:.-]", "", given) if isinstance(given, str) else ""
    if not re.fullmatch(r"[0-9A-Fa-f]{12}", digits):
        raise fail(path, given, "six bytes such as 02:00:00:00:00:01")
    return ":".join(re.findall("..", digits.lower()))


def address(given: object, path: str) -> str:
    import ipaddress

    try:
        if not isinstance(given, str):
            raise ValueError
        return str(ipaddress.ip_address(given))
    except ValueError:
        raise fail(path, given, "an IPv4 or IPv6 address") from None


def _range(form: Form, given: object, path: str) -> Tuple[int, int]:
    least, greatest = form["least"], form["greatest"]
    ends = re.fullmatch(r"\s*([0-9]+)\s*-\s*([0-9]+)\s*", given) if isinstance(given, str) else None
    if ends:
        first, last = (number(int(end), path, least, greatest) for end in ends.groups())
        return first, last
    if isinstance(given, str) and re.fullmatch(r"\s*[0-9]+\s*", given):
        given = int(given)
    if isinstance(given, str):
        expected = f'a number or a range such as "10-12", {least} to {greatest}'
        raise fail(path, given, expected)
    value = number(given, path, least, greatest)
    return value, value


def trunk(form: Form, given: object, path: str) -> List[Tuple[int, int]]:
    """Ranges of VLANs in rising order, from a list of them or from a text as "10-12,20"."""
    if isinstance(given, str):
        given = given.split(",") if given.strip() else []
    elif isinstance(given, int) and not isinstance(given, bool):
        given = [given]
    found: List[Tuple[int, int]] = []
    for at, one in enumerate(items(given, path)):
        where = f"{path}[{at}]"
        first, last = _range(form, one, where)
        if first > last or (found and first <= found[-1][1]):
            raise fail(where, one, "in rising order")
        found.append((first, last))
    return found


def _record(form: Form, given: object, path: str) -> Dict[str, Any]:
    known = {one["name"]: one for one in form["members"]}
    if "alone" in form and not isinstance(given, dict):
        given = {form["alone"]: given}
    held = members(given, path, known)
    found: Dict[str, Any] = {}
    for name, inner in known.items():
        if name in held:
            found[name] = read(inner, held[name], under(path, name))
        elif inner.get("required"):
            raise DocumentError(path, f"'{name}' is missing")
        elif "default" in inner:
            found[name] = read(inner, inner["default"], under(path, name))
    return found


def _one_of(form: Form, given: object, path: str) -> Dict[str, Any]:
    known = {one["name"]: one for one in form["members"]}
    held = members(given, path, known)
    if len(held) != 1:
        raise fail(path, given, f"an object with one of the keys {', '.join(known)}")
    ((name, value),) = held.items()
    return {name: read(known[name], value, under(path, name))}


def _list(form: Form, given: object, path: str) -> List[Any]:
    element = form["element"]
    if element["form"] == "range":
        ranges = trunk(element, given, path)
        found: List[Any] = [a if a == b else f"{a}-{b}" for a, b in ranges]
    else:
        held = items(given, path)
        found = [read(element, one, f"{path}[{at}]") for at, one in enumerate(held)]
    if len(found) > form["most"]:
        raise DocumentError(path, f"there is room for {form['most']} at most")
    return found


def _bits(form: Form, given: object, path: str) -> List[str]:
    known = list(form["choices"])
    held = [choice(one, f"{path}[{at}]", known) for at, one in enumerate(items(given, path))]
    return [word for word in known if word in held]


_READERS: Dict[str, Callable[[Form, Any, str], Any]] = {
    "number": lambda form, given, path: number(given, path, form["least"], form["greatest"]),
    "boolean": lambda form, given, path: flag(given, path),
    "choice": lambda form, given, path: choice(given, path, form["choices"]),
    "bits": _bits,
    "text": lambda form, given, path: text(given, path, form["most_bytes"]),
    "mac": lambda form, given, path: mac(given, path),
    "ip": lambda form, given, path: address(given, path),
    "range": lambda form, given, path: trunk(form, [given], path),
    "record": _record,
    "one_of": _one_of,
    "list": _list,
}


def read(form: Form, given: object, path: str) -> Any:
    """A value in the words of documents: checked, and in one spelling."""
    return _READERS[form["form"]](form, given, path)
