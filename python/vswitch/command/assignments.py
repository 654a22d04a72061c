"""Settings on a command line: NAME=VALUE, where what there is comes from the table of settings.

NAME is a setting, or a member of one: `vlan.trunk`, or `trunk` alone where one setting has it. A
member leaves the others as they are, a setting does not. A value is said as documents say it,
several with commas between them; what has members of its own as JSON, or by the member that may
stand alone.
"""

import json
import re
from typing import Any, Callable, Dict, Iterable, List, Optional, Tuple

import click

from vswitch import _settings, words as _words
from vswitch._table import Form, Property
from vswitch.values import Words
from vswitch.words import SYNONYMS, DocumentError

__all__ = ["find_setting", "read"]

Known = Dict[str, Property]


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


def find_setting(known: Known, name: str) -> Optional[Property]:
    return known.get(name) or known.get(SYNONYMS.get(name, name))


def _resolve(known: Known, name: str) -> Tuple[Property, Optional[Form]]:
    """The setting of that name, or the one that has the member, and the member."""
    setting = find_setting(known, name)
    if setting is not None:
        return setting, None
    of, _, inner = name.rpartition(".")
    found = [
        (one, member)
        for one in known.values()
        for member in (one.form["members"] if one.form["form"] == "record" else ())
        if member["name"] == inner and of in ("", one.name)
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


def _from_text(form: Form, text: str, path: str) -> Any:
    """The value that a text says. What says none is left to those who check values."""
    kind = form["form"]
    if kind in ("record", "one_of", "list") and text.startswith(("{", "[")):
        return _from_json(text, path)
    if kind == "record" and "alone" in form:
        alone = next(one for one in form["members"] if one["name"] == form["alone"])
        return _from_text(alone, text, path)
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
        return {"true": True, "false": False}.get(text, text)
    return text


def _parts(text: str) -> List[str]:
    return text.split(",") if text else []


def _from_json(text: str, path: str) -> Any:
    try:
        return json.loads(text)
    except (ValueError, RecursionError) as error:
        raise _words.fail(path, text, f"JSON: {error}") from None
