"""The module of frozen values: what the host's memory held when a checked call returned."""

from typing import Dict, List

import families
from definitions import Definitions, Field, Record
from stub_text import doc

PACKED = (
    "DVMirrorEntity",
    "DVMirrorSession",
    "VSLAGStatus",
    "VSLAGTable",
    "VSMcastFilterStats",
    "VSMcastFilters",
    "VSRuntimeOption",
)
"""Written by hand: what their records do not tell."""

PLAIN = (
    "qex_NEBPortVIDRange",
    "VSPortVlanPolicy",
    "VSPvlanMapEntry",
    "VSMACEntry",
    "VSMACTable",
    "VSUplinks_entries",
    "VSUplinks",
    "VSDVMirrorSessionIDs",
    "VSPromiscSessionActiveDsts",
    "DVPortData",
    "DVPortList",
    "OpaqueDVPortData",
)
"""Those that hold others after them."""

NAMES_ALONE = ("VSUplinkPorts", "VSUplinkPortIds")
"""Nothing but a counted array: these are tuples."""

READERS = (
    "DVMirrorSessionTable",
    "VSLAGTable",
    "VSMcastFilterStats",
    "VSMcastFilters",
    "VSRuntimeOptions",
)

_HEAD = '''"""Values that checked calls return for records of the host's memory.

They have the names of the records and of their fields, cannot be changed, and are equal if they
hold the same. What counts, pads or marks a record is left out: a tuple has its length. Written by
python/make_checked.py.
"""

from dataclasses import dataclass
from typing import Any, Tuple

import _libvswitch as _flat
from libvswitch import enums as _enums
from libvswitch._packed_values import (
%s)
'''


def module(known: Definitions) -> str:
    taken = [*PACKED, *(f"read_{one}" for one in READERS), "Table"]
    helpers = ["numbers_at", "records_at", "texts_at"]
    imports = "".join(f"    {name} as {name},\n" for name in sorted(taken))
    imports += "".join(f"    {name} as _{name},\n" for name in helpers)
    exported = sorted([*PACKED, *PLAIN, "Table"])
    listed = "".join(f'    "{name}",\n' for name in exported)
    parts = [_HEAD % imports, f"\n__all__ = [\n{listed}]\n"]
    parts += [_Writer(known, known.records[name]).value() for name in PLAIN]
    parts += [_Writer(known, known.records[name]).names() for name in NAMES_ALONE]
    return "".join([*parts, _ARRAY])


_ARRAY = '''

def read_VSPvlanMapEntrys(first: Any, count: int) -> Tuple[VSPvlanMapEntry, ...]:
    """The entries of an array; None stands for that of none."""
    if first is None:
        return ()
    return tuple(map(read_VSPvlanMapEntry, _records_at(first, "VSPvlanMapEntry", count)))
'''


class _Writer:
    """One record."""

    def __init__(self, known: Definitions, record: Record) -> None:
        self._known = known
        self._record = record
        counts = {field.count for field in record.fields} | {record.count}
        self._fields = [
            one
            for one in record.fields
            if one.name not in counts and not one.name.startswith("pad")
        ]

    def value(self) -> str:
        name = self._record.name
        types: Dict[str, str] = {one.name: self._type(one) for one in self._fields}
        table = [one for one in self._fields if one.count and self._record.count]
        base = (
            f"({types[table[0].name].replace('Tuple[', 'Table[').replace(', ...', '')})"
            if table
            else ""
        )
        lines = [f"    {one}: {type_} = {_default(type_)}" for one, type_ in types.items()]
        text = f"\n\n@dataclass(frozen=True)\nclass {name}{base}:\n{doc(self._record.doc, '    ')}"
        text += "\n" + "\n".join(lines) + "\n"
        if table:
            text += f"\n    def _entries(self) -> {types[table[0].name]}:\n"
            text += f"        return self.{table[0].name}\n"
        read = "".join(f"        {one.name}={self._read(one)},\n" for one in self._fields)
        head = f"\n\ndef read_{name}(record: Any) -> {name}:\n"
        return f"{text}{head}    return {name}(\n{read}    )\n"

    def names(self) -> str:
        (field,) = self._fields
        head = f"\n\ndef read_{self._record.name}(record: Any) -> Tuple[str, ...]:\n"
        return f"{head}    return {self._read(field)}\n"

    def _type(self, field: Field) -> str:
        family = families.of_field(self._record.name, field)
        type_ = self._known.resolve(field.type)
        if field.count:
            inner = type_.target
            element = "str" if inner.is_array else inner.name
            return f"Tuple[{element if element in (*PLAIN, 'str') else 'int'}, ...]"
        if family:
            return f"_enums.{family}"
        if field.type.name == "qex_Bool":
            return "bool"
        if field.reads_as_text or type_.is_array or type_.name == "qex_Name":
            return "str"
        return type_.name if type_.name in PLAIN else "int"

    def _read(self, field: Field) -> str:
        name = self._record.name
        type_, found = self._known.resolve(field.type), f"_flat.{name}_{field.name}_get(record)"
        if field.count:
            count = f"_flat.{name}_{field.count}_get(record)"
            inner = type_.target
            if inner.is_array:
                return f"_texts_at({found}, {inner.count}, {count})"
            if inner.name in PLAIN:
                return (
                    f'tuple(map(read_{inner.name}, _records_at({found}, "{inner.name}", {count})))'
                )
            return f"_numbers_at({found}, {count})"
        kind = self._type(field)
        if kind.startswith("_enums."):
            return f"{kind}({found})"
        if kind == "bool":
            return f'{found} != "\\0"'
        return f"_flat.qex_Name_string_get({found})" if type_.name == "qex_Name" else found


def _default(type_: str) -> str:
    defaults = {"int": "0", "str": '""', "bool": "False"}
    if type_.startswith("Tuple["):
        return "()"
    return defaults[type_] if type_ in defaults else f"{type_}(0)"


def value_of(record: str) -> List[str]:
    """The type of the value of a record, and its reader."""
    kinds = {
        "DVMirrorSessionTable": "Tuple[DVMirrorSession, ...]",
        "VSRuntimeOptions": "Tuple[VSRuntimeOption, ...]",
        **{name: "Tuple[str, ...]" for name in NAMES_ALONE},
    }
    return [kinds.get(record, record), f"read_{record}"]
