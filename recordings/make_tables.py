"""Writes the tables of the calls and those that are forwarded, from the binding definitions.

usage: make_tables.py TREE FOLDER

tables.inc has every call and the records that it takes and gives; LIBRARY_calls.inc has the
functions of one library, and how it finds the host's; invokes.inc has what makes each call.
"""

import sys
from pathlib import Path
from typing import Dict, List, Set

import call_model
import definitions
from call_model import RESULT, Argument, Call, Direction, Ownership, Unit
from definitions import Definitions, Field, Record, Type

LIBRARIES = {
    "configuration": "vswitch",
    "queries": "vswitch",
    "status_text": "vswitch",
    "data": "nebPublic",
    "kernel_state": "nebPublic",
    "names": "nebPublic",
    "state": "nebPublic",
}
"""The library of each family of calls."""

_WIDTHS = {"char": 1, "short": 2, "int": 4, "long": 8, "long long": 8}


def width(known: Definitions, given: Type) -> str:
    """Bytes of a number, of a record, or of all elements of an array."""
    type_ = known.resolve(given)
    if type_.is_array:
        return f"{type_.count or 0} * {width(known, type_.target)}"
    if type_.name in known.records:
        return f"sizeof({type_.name})"
    return str(_WIDTHS[type_.name.replace("unsigned ", "").replace("signed ", "")])


def is_signed(known: Definitions, given: Type) -> str:
    return "false" if known.resolve(given).name.startswith("unsigned") else "true"


def cxx(truth: bool) -> str:
    return "true" if truth else "false"


class Records:
    """The records that calls take and give, those first that others hold."""

    def __init__(self, known: Definitions, calls: List[Call]) -> None:
        self._known = known
        self._seen: Set[str] = set()
        self.lines: List[str] = []
        self.names: List[str] = []
        for call in calls:
            for one in call.arguments:
                self._add(known.resolve(one.type).name)

    def _add(self, name: str) -> None:
        record = self._known.records.get(name)
        if record is None or name in self._seen:
            return
        self._seen.add(name)
        for field in record.fields:
            self._add(self._known.resolve(field.type).name)
        if record.followed or record.packed:
            self._add((record.followed or record.packed)[0])
        self.lines += self._table(record)
        self.names.append(name)

    def _table(self, record: Record) -> List[str]:
        fields = [one for one in record.fields if not one.is_same_bytes]
        index = {one.name: at for at, one in enumerate(fields)}
        rows = [f"    {self._row(record, one, index)}," for one in fields]
        element, count, size, length = "nullptr", -1, -1, -1
        if record.followed:
            element = f"&record_{record.followed[0]}"
            count = index[record.followed[1]]
        if record.packed:
            element = f"&record_{record.packed[0]}"
            size = index[record.packed[1]]
            other = [one.name for one in self._known.records[record.packed[0]].fields]
            length = other.index(record.packed[2])
        return [
            f"constexpr Field fields_of_{record.name}[] = {{",
            *rows,
            "};",
            f'constexpr Record record_{record.name}{{"{record.name}", sizeof({record.name}),',
            f"    fields_of_{record.name}, {element}, {count}, {size}, {length}}};",
        ]

    def _row(self, record: Record, one: Field, index: Dict[str, int]) -> str:
        type_ = self._known.resolve(one.type)
        is_text = type_.name == "char" or one.holds_text
        is_array, element = False, type_
        if type_.is_array:
            is_inner = type_.target.is_array
            is_short = not is_inner and (is_text or type_.name == "unsigned char")
            is_array = not (is_short and type_.count is not None)
            element = type_.target if is_array else type_
        kind = "number"
        if element.name in self._known.records:
            kind = "record"
        elif element.is_array:
            kind = "text" if is_text else "bytes"
        elif is_array and element.name == "unsigned char":
            kind = "bytes"
        tag, value = "no_tag", "0"
        if one.view:
            tag = "form_tag" if one.view[0] == "FORM" else str(index[one.view[0]])
            value = one.view[1]
        bits, set_bits, offset = "nullptr", "nullptr", f"offsetof({record.name}, {one.name})"
        if one.is_bit_field:
            read = f"static_cast<{record.name} const *>(record)->{one.name}"
            bits = f"[](void const *record) {{ return static_cast<std::int64_t>({read}); }}"
            written = read.replace(" const *", " *")
            fitting = f"static_cast<decltype({record.name}::{one.name})>(value)"
            set_bits = f"[](void *record, std::int64_t value) {{ {written} = {fitting}; }}"
            offset = "0"
        of_record = f"&record_{element.name}" if kind == "record" else "nullptr"
        count = type_.count or 0 if is_array else 0
        return (
            f'{{"{one.name}", Kind::{kind}, {is_signed(self._known, element)}, {cxx(is_array)}, '
            f"{width(self._known, element)}, {offset}, {count}, {index.get(one.count, -1)}, "
            f"{index.get(one.rest, -1)}, {tag}, {value}, {of_record}, {bits}, {set_bits}}}"
        )


class Calls:
    """The table of the calls."""

    def __init__(self, known: Definitions, calls: List[Call]) -> None:
        self._known = known
        self.lines = [line for call in calls for line in self._arguments(call)]
        self.lines.append("constexpr Call table_of_calls[] = {")
        self.lines += [f"    {self._row(call)}," for call in calls]
        self.lines.append("};")

    def _arguments(self, call: Call) -> List[str]:
        if not call.arguments:
            return []
        return [
            f"constexpr Argument arguments_of_{call.name}[] = {{",
            *(f"    {self._argument(call, one)}," for one in call.arguments),
            "};",
        ]

    def _row(self, call: Call) -> str:
        arguments = f"arguments_of_{call.name}" if call.arguments else "{}"
        return (
            f'{{"{call.name}", "lib{LIBRARIES[call.family]}.so", Result::{self._result(call)}, '
            # What takes any number of arguments reports, and never traps.
            f"{cxx(not call.takes_more)}, {arguments}}}"
        )

    def _result(self, call: Call) -> str:
        type_ = self._known.resolve(call.result.type)
        if call.has_status:
            return "status"
        if type_.is_pointer:
            return "text" if type_.name == "char" else "handle"
        return "nothing" if type_.name == "void" else "number"

    def _argument(self, call: Call, one: Argument) -> str:
        size, signed, record, length = "0", "false", "nullptr", "no_length"
        type_ = self._known.resolve(one.type)
        passing = self._passing(call, one)
        element = type_.target if type_.is_pointer else type_
        if passing in ("number", "out_number", "memory"):
            size = "1" if element.name == "void" else width(self._known, element)
            signed = is_signed(self._known, element)
        elif passing in ("array_text", "out_text"):
            size = str(type_.count if type_.is_array else one.room + 1)
        elif passing == "out_memory":
            size = "1"
        if type_.name in self._known.records:
            record = f"&record_{type_.name}"
        is_form = one.length is not None and one.length.unit is Unit.FORM
        if one.length is not None:
            names = [other.name for other in call.arguments]
            of_result = one.length.of == RESULT
            length = "length_is_result" if of_result else str(names.index(one.length.of))
        return (
            f'{{"{one.name}", Passing::{passing}, {signed}, {cxx(is_form)}, {size}, {length}, '
            f"{record}}}"
        )

    def _passing(self, call: Call, one: Argument) -> str:
        type_ = self._known.resolve(one.type)
        is_record = type_.name in self._known.records
        if one.direction is Direction.OUT:
            if type_.target.is_pointer:
                if is_record:
                    return "out_pointee"
                return "out_handle" if one.length is None else "out_memory"
            if is_record:
                return "out_record"
            return "out_text" if one.room or type_.is_array else "out_number"
        if one.value.ownership is Ownership.RELEASED:
            return "released"
        if not type_.layers:
            return "number"
        if type_.layers[1:2] and type_.layers[1].startswith("f("):
            return "function"
        if type_.is_array:
            return "array_text"
        if one.length is not None:
            return "memory"
        if type_.name == "char":
            return "text"
        return "record" if is_record else "handle"


def spelled(one: Argument) -> str:
    """A parameter as a definition has it."""
    text, bracket, size = one.c_type.partition("[")
    return f"{text.rstrip()} {one.name}{bracket}{size}".replace("* ", "*")


def forwarded(call: Call, number: int) -> List[str]:
    parameters = ", ".join(map(spelled, call.arguments)) or "void"
    given = "".join(f", {one.name}" for one in call.arguments)
    return [
        f"RECORDINGS_API {call.result.c_type} {call.name}({parameters}) {{".replace("* ", "*"),
        f"  return recordings::forward<{number}>(&{call.name}{given});",
        "}",
    ]


def library(calls: List[Call], name: str) -> str:
    numbers = [at for at, call in enumerate(calls) if LIBRARIES[call.family] == name]
    lines = ["// Written by recordings/make_tables.py."]
    lines += [
        line
        for number in numbers
        if not calls[number].takes_more
        for line in forwarded(calls[number], number)
    ]
    # From within the library: the host's is what comes after it.
    lines.append("[[gnu::constructor]] static void find_the_hosts_functions() {")
    lines += [
        f'  recordings::host_functions[{number}] = dlsym(RTLD_NEXT, "{calls[number].name}");'
        for number in numbers
    ]
    lines.append("}")
    return "\n".join(lines) + "\n"


def tables(known: Definitions, calls: List[Call]) -> str:
    lines = ["// Written by recordings/make_tables.py.", "namespace recordings {", "namespace {"]
    records = Records(known, calls)
    lines += records.lines
    lines += Calls(known, calls).lines
    lines.append("constexpr Record const *table_of_records[] = {")
    lines += [f"    &record_{name}," for name in records.names]
    lines += ["};", "}  // namespace"]
    lines.append("std::span<Record const *const> const records{table_of_records};")
    lines += ["std::span<Call const> const calls{table_of_calls};", "}  // namespace recordings"]
    return "\n".join(lines) + "\n"


def main() -> None:
    tree, folder = sys.argv[1:]
    known = definitions.read(Path(tree))
    calls = call_model.read(known)
    written = {"tables.inc": tables(known, calls)}
    written["numbers.inc"] = f"inline constexpr std::size_t number_of_calls = {len(calls)};\n"
    written["numbers.inc"] += "".join(
        f"inline constexpr std::size_t number_of_{call.name} = {number};\n"
        for number, call in enumerate(calls)
        if call.takes_more
    )
    written["invokes.inc"] = "".join(
        f"    Typed<decltype({call.name})>::invoke,\n" for call in calls
    )
    for name in sorted(set(LIBRARIES.values())):
        written[f"{name}_calls.inc"] = library(calls, name)
    for name, text in written.items():
        Path(folder, name).write_text(text, encoding="ascii")


if __name__ == "__main__":
    main()
