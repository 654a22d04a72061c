"""Writes what the classes must know of the records and calls beyond the generated code:
`_layout.py` for them, `record_sizes.h` for the extension that tells the sizes.
"""

import sys
from pathlib import Path
from pprint import pformat
from typing import Any, Dict, List

import call_model
import definitions
from call_model import RESULT
from definitions import NUMBERS, Definitions, Type


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


def of_records(known: Definitions) -> Dict[str, Any]:
    return {
        "WHOLE_RECORDS": [
            one.name
            for one in known.records.values()
            if not one.is_inner and is_whole(known, Type((), one.name))
        ],
    }


def deallocators(known: Definitions) -> List[str]:
    """What releases memory that it is right to ask for by name."""
    named = {one.says("allocates", RESULT) for one in known.functions}
    for call in call_model.read(known):
        named |= {one.value.deallocator for one in call.arguments}
    return [one.name for one in known.functions if one.name in named]


def of_types(known: Definitions) -> Dict[str, Any]:
    return {
        "SCALARS": {
            name: resolved.name
            for name, type_ in known.typedefs.items()
            for resolved in [known.resolve(type_)]
            if not resolved.layers and resolved.name in NUMBERS and " " not in name
        },
        "POINTEE_RECORDS": known.pointee_records(),
        "POINTERS": sorted(
            name
            for name, type_ in known.typedefs.items()
            if known.resolve(type_).layers == ("p",) and known.resolve(type_).name == "void"
        ),
    }


def layout(known: Definitions) -> str:
    tables = {
        **of_records(known),
        "DEALLOCATORS": deallocators(known),
        **of_types(known),
    }
    text = '"""Made from the binding definitions."""\n'
    for name, value in tables.items():
        text += f"\n{name} = {pformat(value, width=98)}\n"
    return text


def sizes(known: Definitions) -> str:
    outer = [record for record in known.records.values() if not record.is_inner]
    headers = sorted({record.header for record in known.records.values() if record.header})
    includes = "".join(f'#include "{Path(*Path(name).parts[-2:])}"\n' for name in headers)
    of_records = [f'{{"{one.name}", sizeof({one.name})}}' for one in outer]
    of_arrays = [
        f'{{"{one.name}_{field.name}", offsetof({one.name}, {field.name})}}'
        for one in outer
        for field in one.fields
        if field.type.is_array or known.resolve(field.type).is_array
    ]
    return (
        f"#include <stddef.h>\n{includes}\n"
        "typedef struct NamedNumber {\n  char const *name;\n  size_t number;\n} NamedNumber;\n\n"
        f"{_rows('sizes_of_records', of_records)}{_rows('offsets_of_arrays', of_arrays)}"
    )


def _rows(name: str, rows: List[str]) -> str:
    listed = "".join(f"  {row},\n" for row in rows)
    return f"static NamedNumber const {name}[] = {{\n{listed}}};\n"


def main() -> None:
    tree, python, header = sys.argv[1:]
    known = definitions.read(Path(tree))
    Path(python).write_text(layout(known), encoding="ascii")
    Path(header).write_text(sizes(known), encoding="ascii")


if __name__ == "__main__":
    main()
