"""All functions of the module: those of functions.txt and those that follow from records.txt."""

import re
from dataclasses import dataclass
from pathlib import Path
from typing import Iterator, List, Tuple

import records

TABLE = Path(__file__).with_name("functions.txt")


@dataclass(frozen=True)
class Function:
    """A function of the module, or one form of it."""

    kind: str
    name: str
    arguments: Tuple[str, ...]
    result: str


def read(path: Path = TABLE) -> List[Function]:
    """The functions of the table, then those of the records; ValueError for an unreadable line."""
    listed = []
    for number, line in enumerate(path.read_text(encoding="ascii").splitlines(), start=1):
        if not line or line.startswith("#"):
            continue
        match = re.fullmatch(r"(\w+) +(\w+)\((.*)\) -> (.+)", line)
        if match is None:
            raise ValueError(f"{path}:{number}: not a function: {line}")
        kind, name, arguments, result = match.groups()
        listed.append(Function(kind, name, _split(arguments), result))
    known = {function.name for function in listed}
    derived = [function for function in _derived() if function.name not in known]
    return listed + derived


def _split(arguments: str) -> Tuple[str, ...]:
    """The arguments, parted at the commas that no parentheses enclose."""
    found = re.findall(r"(?:\([^()]*\)|[^,()])+", arguments)
    return tuple(argument.strip() for argument in found)


def _derived() -> Iterator[Function]:
    for record in records.read().values():
        name, pointer = record.name, f"{record.spelled} *"
        yield Function("constructor", f"new_{name}", (), f"own {name} *")
        yield Function("destructor", f"delete_{name}", (pointer,), "None")
        yield Function("registration", f"{name}_swigregister", ("object",), "None")
        for field in record.fields:
            yield Function("reader", f"{name}_{field.name}_get", (pointer,), "field")
            if field.writable:
                spelled = f"{field.type} *" if field.kind == "nested" else field.type
                yield Function("writer", f"{name}_{field.name}_set", (pointer, spelled), "None")
