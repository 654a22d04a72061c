"""Writes vswitch/_meanings.py: what the values of a trace mean, from the binding definitions.

usage: make_meanings.py TREE _MEANINGS.PY

CALLS has every call, in the order of the headers. The path of a value in a trace, without the
places in lists, leads to its kind where it is each host's own, and to its family where it is one of
several constants.
"""

import pprint
import sys
from pathlib import Path
from typing import Any, Dict, Iterator, List, Optional, Tuple

import call_model
import definitions
import families
from call_model import Argument, Call, Direction, Unit, Volatile
from definitions import Definitions, Type

HEAD = '''"""What the values of a trace mean, call by call. Written by python/make_meanings.py."""
'''

_Found = Tuple[str, Optional[Volatile], str]  # a path, its kind, its family


class Meanings:
    def __init__(self, known: Definitions) -> None:
        self._known = known

    def of(self, number: int, call: Call) -> Dict[str, Any]:
        found = [*self._values(call)]
        return {
            "number": number,
            "asks": call.asks,
            "takes_more": call.takes_more,
            "releases": call.releases.name if call.releases else "",
            "volatile": {path: kind.name for path, kind, _ in found if kind},
            "families": {path: family for path, _, family in found if family},
            "required": [one.name for one in call.arguments if self._is_required(one)],
            "lengths": dict(_lengths(call)),
        }

    def _is_required(self, one: Argument) -> bool:
        """Whether a host may rely on it that something is there."""
        return self._known.resolve(one.type).layers != () and not one.is_nullable

    def _values(self, call: Call) -> Iterator[_Found]:
        yield "result", call.result.volatile, families.of_type(call.result.type)
        for one in call.arguments:
            is_output = one.direction is Direction.OUT
            path = f"{'out' if is_output else 'in'}.{one.name}"
            family = families.of_type(one.type) or families.of_output(call.name, one.name)
            if one.volatile is Volatile.IMAGE:
                yield f"{path}.bytes", one.volatile, ""
            elif call_model.is_function(self._known.resolve(one.type)):
                yield path, Volatile.CALLERS_OWN, ""
            else:
                yield path, one.volatile, family
            yield from self._in_records(self._place(path, one), one.type)

    def _place(self, path: str, one: Argument) -> str:
        """Where the records of an argument are: what a call leaves has a member of their name."""
        type_ = self._known.resolve(one.type)
        is_left = one.direction is Direction.OUT and type_.target.is_pointer
        return f"{path}.{type_.name}" if is_left else path

    def _in_records(self, path: str, given: Type) -> Iterator[_Found]:
        record = self._known.records.get(self._known.resolve(given).name)
        if record is None:
            return
        for one in record.fields:
            kind = call_model.kind_of(one.volatile)
            yield f"{path}.{one.name}", kind, families.of_field(record.name, one)
            yield from self._in_records(f"{path}.{one.name}", one.type)
        for name in (record.followed or record.packed)[:1]:
            yield from self._in_records(f"{path}.{name}", Type((), name))


def _lengths(call: Call) -> Iterator[Tuple[str, str]]:
    """Of memory that a caller gives, which argument says how long it is."""
    for one in call.inputs:
        if one.length is not None and one.length.unit is not Unit.FORM:
            yield one.name, one.length.of


def module(known: Definitions) -> str:
    meanings = Meanings(known)
    calls = call_model.read(known)
    held = {call.name: meanings.of(at, call) for at, call in enumerate(calls)}
    return f"{HEAD}\nCALLS = {pprint.pformat(held, width=100, sort_dicts=False)}\n"


def main() -> None:
    """Reads one and writes the other."""
    arguments: List[str] = sys.argv[1:]
    tree, target = (Path(one) for one in arguments)
    target.write_text(module(definitions.read(tree)), encoding="ascii")


if __name__ == "__main__":
    main()
