"""Settings on a command line: NAME=VALUE, where what there is comes from the table of settings.

NAME is a setting, or a member of one: `vlan.trunk`, or `trunk` alone where one setting has it. A
member leaves the others as they are, a setting does not. A value is said as documents say it,
several with commas between them; what has members of its own as JSON, or by the member that may
stand alone.
"""

import json
import re
from typing import Any, Callable, Dict, Iterable, Iterator, List, Optional, Tuple

import click

from vswitch import _settings, words as _words
from vswitch._table import Form, Property
from vswitch.values import Words
from vswitch.words import SYNONYMS, DocumentError

__all__ = ["find_setting", "offered", "read"]

Known = Dict[str, Property]

_BOOLEANS = {"true": True, "false": False}


def read(
    known: Known, assignments: Iterable[str], current: Callable[[Property], Words]
) -> Dict[str, Words]:
    """What is assigned to each setting, in the words of documents.

    `current` tells what a setting is now, for those of which only members are said.
    """
    wanted: Dict[str, Words] = {}
    for assignment in assignments:
        name, equals, text = assignment.partition("=")
        if not equals:
            raise click.UsageError(f"{assignment!r} is not NAME=VALUE")
        setting, member = _resolve(known, name)
        try:
            if member is None:
                value = _from_text(setting.form, text, name)
            else:
                now = wanted[setting.name] if setting.name in wanted else current(setting)
                value = {
                    **_whole(setting.form, now),
                    member["name"]: _from_text(member, text, name),
                }
            checked = _settings.parse(setting, value, setting.name)
        except DocumentError as error:
            raise click.UsageError(str(error)) from None
        wanted[setting.name] = _settings.words_of(setting, checked)
    return wanted


def offered(known: Known, begun: str, uplinks: Callable[[], Iterable[str]]) -> Iterator[str]:
    """What an assignment may be of which so much is there: names first, then words of its value.

    `uplinks` has the names that the host has for them.
    """
    name, equals, text = begun.partition("=")
    if not equals:
        yield from (f"{one}=" for one in _names(known, begun))
        return
    setting, member = _resolve(known, name)
    form = _alone(member or setting.form)
    before, comma, _ = text.rpartition(",") if form["form"] in ("bits", "list") else ("", "", text)
    said = _parts(before)
    for word in _values(form, uplinks):
        if word not in said:
            yield f"{name}={before}{comma}{word}"


def _names(known: Known, begun: str) -> List[str]:
    """Settings; where none begins so, their members, which may stand alone."""
    settings = [name for name in known if name.startswith(begun)]
    if settings:
        return settings
    setting, dot, _ = begun.rpartition(".")
    members = [(of.name, member["name"]) for of, member in _members(known)]
    return [setting + dot + member for of, member in members if setting in ("", of)]


def _members(known: Known) -> Iterator[Tuple[Property, Form]]:
    """The members of settings, each with its setting."""
    for setting in known.values():
        for member in setting.form["members"] if setting.form["form"] == "record" else ():
            yield setting, member


def _values(form: Form, uplinks: Callable[[], Iterable[str]]) -> Iterable[str]:
    """The words that a value has, or an element of it."""
    kind = form["form"]
    if kind == "list":
        return _values(form["element"], uplinks)
    if kind == "boolean":
        return _BOOLEANS
    if form.get("names") == "uplinks":
        return uplinks()
    choices: Dict[str, int] = form.get("choices", {})
    return choices


def find_setting(known: Known, name: str) -> Optional[Property]:
    return known.get(name) or known.get(SYNONYMS.get(name, name))


def _resolve(known: Known, name: str) -> Tuple[Property, Optional[Form]]:
    """The setting of that name, or the one that has the member, and the member."""
    setting = find_setting(known, name)
    if setting is not None:
        return setting, None
    of, _, inner = name.rpartition(".")
    found = [
        (setting, member)
        for setting, member in _members(known)
        if member["name"] == inner and of in ("", setting.name)
    ]
    if len(found) == 1:
        return found[0]
    if found:
        which = " or ".join(f"{one.name}.{inner}" for one, _ in found)
        raise click.UsageError(f"{name!r} is of several settings: {which}")
    raise click.UsageError(f"no setting {name!r} (there are {', '.join(sorted(known))})")


def _whole(form: Form, held: Words) -> Dict[str, Words]:
    """A record by its members, of which one may stand alone."""
    return dict(held) if isinstance(held, dict) else {form["alone"]: held}


def _alone(form: Form) -> Form:
    """Of a record, the member that may stand for it."""
    if "alone" not in form:
        return form
    return next(one for one in form["members"] if one["name"] == form["alone"])


def _from_text(form: Form, text: str, path: str) -> Any:
    """The value that a text says. What says none is left to those who check values."""
    kind = form["form"]
    if kind in ("record", "one_of", "list") and text.startswith(("{", "[")):
        return _from_json(text, path)
    if "alone" in form:
        return _from_text(_alone(form), text, path)
    if kind in ("record", "one_of"):
        names = ", ".join(one["name"] for one in form["members"])
        raise DocumentError(path, f"{text!r} is not a JSON object with some of {names}")
    if kind == "bits":
        return _parts(text)
    if kind == "list" and form["element"]["form"] != "range":
        return [_from_text(form["element"], one, path) for one in _parts(text)]
    if kind == "number" and re.fullmatch("[+-]?[0-9]{1,20}", text):
        return int(text)
    if kind == "boolean":
        return _BOOLEANS.get(text, text)
    return text


def _parts(text: str) -> List[str]:
    return text.split(",") if text else []


def _from_json(text: str, path: str) -> Any:
    try:
        return json.loads(text)
    except (ValueError, RecursionError) as error:
        raise _words.fail(path, text, f"JSON: {error}") from None
