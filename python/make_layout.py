"""Writes what the classes must know of the records and calls beyond the generated code:
`_layout.py` for them, `record_sizes.h` for the extension that tells the sizes.
"""

import sys
from pathlib import Path
from pprint import pformat
from typing import Any, Dict, List, Optional, Tuple

import definitions
from definitions import NUMBERS, Definitions, Field, Function, Type


def array(known: Definitions, field: Field) -> Optional[Tuple[str, int, Any]]:
    """Of an array that is not a text: its element, the size of that if an array, and its count."""
    type_ = known.resolve(field.type)
    if not type_.is_array or field.reads_as_text:
        return None
    inner = type_.target
    if inner.is_array:
        return inner.name, inner.count or 0, field.count or type_.count
    if type_.name == "char":
        return None
    return inner.name, 0, field.count or type_.count


def readers(known: Definitions) -> Tuple[Dict[str, Any], List[str], List[str], List[str]]:
    arrays: Dict[str, Any] = {}
    views, booleans, addresses = [], [], []
    for record in known.records.values():
        for field in record.fields if not record.is_inner else ():
            name = f"{record.name}_{field.name}"
            found = array(known, field)
            if found is not None:
                arrays[name] = found
            elif field.reads_as_text:
                addresses.append(name)
            elif not field.type.layers and field.type.name in known.records:
                views.append(name)
            elif not field.type.layers and field.type.name == "qex_Bool":
                booleans.append(name)
    return arrays, views, booleans, addresses


def is_whole(known: Definitions, given: Type) -> bool:
    """Whether the bytes of a value are all of it: no pointer among them, and nothing after them."""
    type_ = known.resolve(given)
    if type_.is_array:
        return type_.count is not None and is_whole(known, type_.target)
    record = known.records.get(type_.name)
    if type_.layers or record is None:
        return not type_.layers
    if record.constructor:  # it takes the size
        return False
    return all(is_whole(known, one.type) and not one.count for one in record.fields)


def methods(known: Definitions) -> Dict[str, List[str]]:
    """Methods that answer a place in their record, and those that answer a pointer to a number."""
    found: Dict[str, List[str]] = {"views": [], "numbers": []}
    for record in known.records.values():
        for method in record.methods:
            type_ = known.resolve(method.result)
            if not type_.is_pointer or type_.name in ("char", "PyObject"):
                continue
            kind = "views" if type_.name in known.records else "numbers"
            found[kind].append(f"{record.name}_{method.name}")
    return found


def is_handed_out(known: Definitions, type_: Type) -> bool:
    """Whether a call answers behind such a pointer what belongs to the library."""
    return known.resolve(type_).layers == ("p", "p")


def cells(known: Definitions, call: Function) -> List[int]:
    return [i for i, one in enumerate(call.inputs) if is_handed_out(known, one.type)]


def callbacks(known: Definitions, call: Function) -> List[int]:
    return [
        i
        for i, one in enumerate(call.inputs)
        if known.resolve(one.type).layers == ("p", "f(p.void,p.void)")
    ]


def of_records(known: Definitions) -> Dict[str, Any]:
    arrays, views, booleans, addresses = readers(known)
    inner = methods(known)
    return {
        "RECORDS": [one.name for one in known.records.values() if not one.is_inner],
        "WHOLE_RECORDS": [
            one.name
            for one in known.records.values()
            if not one.is_inner and is_whole(known, Type((), one.name))
        ],
        "ARRAYS": arrays,
        "VIEWS": views,
        "BOOLEANS": booleans,
        "ADDRESSES": addresses,
        "METHODS_WITH_VIEWS": inner["views"],
        "METHODS_WITH_NUMBERS": inner["numbers"],
        "TABLES": {one.name: one.count for one in known.records.values() if one.count},
        "ELEMENTS": {
            one.name: field.name
            for one in known.records.values()
            for field in one.fields
            if one.count and field.count == one.count
        },
    }


def of_calls(known: Definitions) -> Dict[str, Any]:
    calls = [call for call in known.functions if call.name.startswith(("VS", "DVS", "DVP"))]
    return {
        "CALLS_WITH_OUTPUTS": sorted({call.name for call in calls if call.outputs}),
        "CALLS_WITH_CELLS": {one.name: cells(known, one) for one in calls if cells(known, one)},
        "CALLS_WITH_CALLBACKS": {
            one.name: callbacks(known, one) for one in calls if callbacks(known, one)
        },
        "CALLS_WITH_TRUTHS": [
            one.name for one in calls if not one.result.layers and one.result.name == "char"
        ],
    }


def of_types(known: Definitions) -> Dict[str, Any]:
    return {
        "SCALARS": {
            name: resolved.name
            for name, type_ in known.typedefs.items()
            for resolved in [known.resolve(type_)]
            if not resolved.layers and resolved.name in NUMBERS and " " not in name
        },
        "RECORDS_BEHIND_POINTERS": known.records_behind_pointers(),
        "POINTERS": sorted(
            name
            for name, type_ in known.typedefs.items()
            if known.resolve(type_).layers == ("p",) and known.resolve(type_).name == "void"
        ),
    }


def layout(known: Definitions) -> str:
    tables = {**of_records(known), **of_calls(known), **of_types(known)}
    text = '"""Made from the binding definitions."""\n'
    for name, value in tables.items():
        text += f"\n{name} = {pformat(value, width=98)}\n"
    return text


def sizes(known: Definitions) -> str:
    headers = sorted({record.header for record in known.records.values() if record.header})
    includes = "".join(f'#include "{Path(*Path(name).parts[-2:])}"\n' for name in headers)
    rows = "".join(
        f'  {{"{record.name}", sizeof({record.name})}},\n'
        for record in known.records.values()
        if not record.is_inner
    )
    table = "static struct { char const *name; size_t size; } const sizes_of_records[] = {\n"
    return f"{includes}\n{table}{rows}}};\n"


def main() -> None:
    tree, python, header = sys.argv[1:]
    known = definitions.read(Path(tree))
    Path(python).write_text(layout(known), encoding="ascii")
    Path(header).write_text(sizes(known), encoding="ascii")


if __name__ == "__main__":
    main()
