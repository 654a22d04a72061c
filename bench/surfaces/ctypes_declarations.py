#!/usr/bin/env python3
"""Writes the whole surface of the module as declarations for ctypes: ctypes_declarations.py OUTPUT.

Readers and writers, constructors and destructors are what a structure has by itself; calls are the
library's functions with their prototypes; constants are names. The declarations are there to be
imported: where C lays bit fields or the members of a union over each other, they differ from it.
"""

import re
import sys
from pathlib import Path
from typing import Iterator, List, Set

import headers
import records as record_table

INTEGERS = {
    "char": "c_char",
    "signed char": "c_byte",
    "unsigned char": "c_ubyte",
    "short": "c_short",
    "unsigned short": "c_ushort",
    "int": "c_int",
    "unsigned int": "c_uint",
    "unsigned long": "c_ulong",
    "long long": "c_longlong",
    "unsigned long long": "c_ulonglong",
}
CALLBACKS = {
    "DVSwitchCallback": "CFUNCTYPE(c_char, c_void_p, c_void_p)",
    "DVSPortCallback": "CFUNCTYPE(c_char, c_void_p, c_void_p)",
    "DVSPortDataCallback": "CFUNCTYPE(c_char, c_void_p, c_void_p)",
    "DVSData_MemAlloc": "CFUNCTYPE(c_void_p, c_size_t)",
    "DVSData_MemFree": "CFUNCTYPE(None, c_void_p)",
}

RECORDS = record_table.read()
KNOWN = headers.integers()


def type_of(spelled: str) -> str:
    """The ctypes expression for a C type."""
    name = " ".join(re.sub(r"\b(const|struct|union|enum)\b", " ", spelled).split())
    if name == "void":
        return "None"
    if name.endswith("*") or re.fullmatch(r"char \[\d+\]", name):
        target = name[:-1].strip() if name.endswith("*") else "char"
        if target in ("char", "void"):
            return {"char": "c_char_p", "void": "c_void_p"}[target]
        return f"POINTER({type_of(target)})"
    if name in RECORDS:
        return name
    if name in CALLBACKS:
        return name
    if name in KNOWN:
        return INTEGERS[KNOWN[name]]
    return "c_void_p"


def field_type(field: record_table.Field) -> str:
    """The ctypes expression for the type of a field."""
    if field.kind == "pointer":
        return type_of(field.type)
    if field.element_type not in RECORDS and field.element_type not in KNOWN:
        return f"c_char * {field.width}"
    expression = type_of(field.element_type)
    for count in reversed(field.dimensions):
        expression = f"({expression} * {count or 0})"
    return expression


def record_class(record: record_table.Record) -> Iterator[str]:
    """The class of a record; fields follow when all classes are known."""
    yield f"class {record.name}({'Union' if record.tag == 'union' else 'Structure'}):"
    yield "    _pack_ = 1" if record.packed else "    pass"


def fields(record: record_table.Record) -> Iterator[str]:
    """The fields of a record."""
    yield f"{record.name}._fields_ = ["
    for field in record.fields:
        bits = f", {field.bit_count}" if field.kind == "bits" else ""
        yield f'    ("{field.name}", {field_type(field)}{bits}),'
    yield "]"


def in_order() -> List[record_table.Record]:
    """The records, each after those that it holds by value."""
    ordered: List[record_table.Record] = []
    seen: Set[str] = set()

    def visit(name: str) -> None:
        if name in seen:
            return
        seen.add(name)
        for field in RECORDS[name].fields:
            if field.element_type in RECORDS and field.kind != "pointer":
                visit(field.element_type)
        ordered.append(RECORDS[name])

    for name in RECORDS:
        visit(name)
    return ordered


def source() -> Iterator[str]:
    """The whole module."""
    yield "from ctypes import *\n"
    for name, kind in CALLBACKS.items():
        yield f"{name} = {kind}"
    for record in in_order():
        yield from record_class(record)
    for record in in_order():
        yield from fields(record)
    yield '_vswitch = CDLL("libvswitch.so")\n_nebpublic = CDLL("libnebPublic.so")'
    for prototype in headers.prototypes().values():
        name = prototype.name
        if not re.match(r"VSDVS_|VSQEX_|DVS|DVPort|QEX_Return|Panic", name):
            continue
        library = "_nebpublic" if name.startswith("DV") else "_vswitch"
        arguments = ", ".join(type_of(kind) for kind, _ in prototype.parameters if kind != "...")
        yield f"{name} = {library}.{name}"
        yield f"{name}.argtypes = [{arguments}]"
        yield f"{name}.restype = {type_of(prototype.result)}"
    for line in (headers.ROOT / "tests/surface/constants.txt").read_text().splitlines():
        if re.fullmatch(r"\w+ = .+", line):
            yield line


def main() -> None:
    """Write the source."""
    Path(sys.argv[1]).write_text("\n".join(source()) + "\n", encoding="utf-8")


if __name__ == "__main__":
    main()
