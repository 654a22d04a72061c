"""Writes a C program that prints what the compiler made of the headers: sizes, places, values.

Its lines have tabs between the words:

    record <name> <bytes>
    field <record> <field> <offset> <bytes>
    bits <record> <field> <first bit of the record> <bits>
    number <constant> <value>
    text <constant> <value>
"""

import sys
from pathlib import Path
from typing import Iterator

import definitions
from definitions import Definitions, Record

_HEAD = r"""// Prints the layout of all records and the values of all constants.
#include <stddef.h>
#include <stdio.h>
#include <string.h>

%(includes)s
static void print_bits(char const *record, char const *field, unsigned char const *memory,
                       size_t size) {
  size_t first = 0, count = 0;
  for (size_t bit = 0; bit < 8 * size; ++bit) {
    if (!(memory[bit / 8] >> bit %% 8 & 1)) continue;
    if (count++ == 0) first = bit;
  }
  printf("bits\t%%s\t%%s\t%%zu\t%%zu\n", record, field, first, count);
}

int main(void) {
  unsigned volatile const all_ones = ~0u;
"""


def program(known: Definitions) -> str:
    headers = sorted({record.header for record in known.records.values() if record.header})
    headers += sorted({one.header for one in known.constants if one.header} - set(headers))
    includes = "".join(f'#include "{Path(*Path(name).parts[-2:])}"\n' for name in headers)
    lines = [line for record in known.records.values() for line in _record(record)]
    for one in known.constants:
        if one.is_text:
            lines.append(f'printf("text\\t%s\\t%s\\n", "{one.name}", {one.name});')
        else:
            value = f"(long long)({one.type.spelled()}){one.name}"
            lines.append(f'printf("number\\t%s\\t%lld\\n", "{one.name}", {value});')
    body = "".join(f"  {line}\n" for line in lines)
    return f"{_HEAD % {'includes': includes}}{body}  return 0;\n}}\n"


def _record(record: Record) -> Iterator[str]:
    name = record.name
    yield f'printf("record\\t%s\\t%zu\\n", "{name}", sizeof({name}));'
    for field in record.fields:
        if field.is_bit_field:
            yield (
                f"{{ union {{ {name} record; unsigned char bytes[sizeof({name})]; }} seen; "
                f"memset(&seen, 0, sizeof(seen)); seen.record.{field.name} = all_ones; "
                f'print_bits("{name}", "{field.name}", seen.bytes, sizeof({name})); }}'
            )
        else:
            size = f"sizeof((({name} *)0)->{field.name})"
            if field.type.is_array and field.type.count is None:
                size = "(size_t)0"
            yield (
                f'printf("field\\t%s\\t%s\\t%zu\\t%zu\\n", "{name}", "{field.name}", '
                f"offsetof({name}, {field.name}), {size});"
            )


def main() -> None:
    tree, written = sys.argv[1:]
    Path(written).write_text(program(definitions.read(Path(tree))), encoding="ascii")


if __name__ == "__main__":
    main()
