#!/usr/bin/env python3
"""Writes the layout checks that the table of records calls for, valid in C and in C++.

    layout_checks.py CHECKS WRITERS

CHECKS receives the assertions on sizes, offsets, widths and types. WRITERS receives, for each bit
field, a line BIT_FIELD(record, field, type, ones, size, offset, first, count).
"""

import sys
from pathlib import Path
from typing import Iterator, List

import records as surface


def checks(record: surface.Record) -> Iterator[str]:
    """The assertions on one record."""
    spelled = record.spelled
    yield f"\n/* {record.name} */"
    yield f'static_assert(sizeof({spelled}) == {record.size}, "bytes of {record.name}");'
    yield f"SAME_TYPE({record.name}, {spelled});"
    if record.packed:
        yield f'static_assert(alignof({spelled}) == 1, "{record.name} may lie at any byte");'
    for field in record.fields:
        name = f"{record.name}.{field.name}"
        yield f"FIELD_TYPE({record.name}, {field.name}, {field.type});"
        if field.kind == "bits":
            continue
        yield (
            f"static_assert(offsetof({spelled}, {field.name}) == {field.offset}, "
            f'"offset of {name}");'
        )
        if None not in field.dimensions:
            yield (
                f"static_assert(sizeof((({spelled} *)0)->{field.name}) == {field.width}, "
                f'"bytes of {name}");'
            )


def writers(record: surface.Record) -> Iterator[str]:
    """One line for each bit field of a record."""
    for field in record.fields:
        if field.first_bit is None or field.bit_count is None:
            continue
        ones = (1 << field.bit_count) - 1
        yield (
            f"BIT_FIELD({record.name}, {field.name}, {field.type}, {ones:#x}u, {record.size}, "
            f"{field.offset}, {field.first_bit}, {field.bit_count})"
        )


def main(arguments: List[str]) -> int:
    """Writes both files."""
    if len(arguments) != 2:
        print(__doc__, file=sys.stderr)
        return 2
    table = surface.read().values()
    for path, lines in zip(arguments, (checks, writers)):
        text = "\n".join(line for record in table for line in lines(record))
        Path(path).write_text(text + "\n", encoding="ascii")
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
