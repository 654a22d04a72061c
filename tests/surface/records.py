"""Reads records.txt, the reference of every record; the format is explained at its top."""

import re
from dataclasses import dataclass
from pathlib import Path
from typing import Dict, List, Optional, Tuple

TABLE = Path(__file__).with_name("records.txt")

KINDS = frozenset(
    [
        "plain",
        "bits",
        "bool",
        "text",
        "mac",
        "array",
        "array2",
        "flexible",
        "flexible-readonly",
        "nested",
        "nested-readonly",
        "pointer",
    ]
)


@dataclass(frozen=True)
class Field:
    """A field of a record."""

    name: str
    type: str
    offset: int
    width: int
    first_bit: Optional[int]
    bit_count: Optional[int]
    kind: str

    @property
    def writable(self) -> bool:
        """Whether the field has a writer."""
        return not self.kind.endswith("-readonly")

    @property
    def element_type(self) -> str:
        """The type without its array dimensions."""
        return self.type.split("[")[0].rstrip()

    @property
    def dimensions(self) -> Tuple[Optional[int], ...]:
        """The array dimensions, outermost first; None is one that is not given."""
        return tuple(int(text) if text else None for text in re.findall(r"\[(\d*)\]", self.type))


@dataclass(frozen=True)
class Record:
    """A record and its fields in order of declaration."""

    name: str
    tag: str
    size: int
    packed: bool
    fields: Tuple[Field, ...]

    @property
    def spelled(self) -> str:
        """The record's type as accessors spell it in messages, without the ` *`."""
        return self.name if self.tag == "untagged" else f"{self.tag} {self.name}"


def read(path: Path = TABLE) -> Dict[str, Record]:
    """All records by name, in the order of the table; ValueError for a line it cannot read."""
    records: Dict[str, Record] = {}
    fields: List[Field] = []
    heading: Optional[Tuple[str, str, int, bool]] = None

    def close() -> None:
        if heading is None:
            return
        tag, name, size, packed = heading
        if not fields:
            raise ValueError(f"{path}: {name} has no fields")
        if name in records:
            raise ValueError(f"{path}: {name} stands twice")
        records[name] = Record(name, tag, size, packed, tuple(fields))
        fields.clear()

    for number, line in enumerate(path.read_text(encoding="ascii").splitlines(), start=1):
        if not line or line.startswith("#"):
            continue
        try:
            if line.startswith("  "):
                fields.append(_field(line))
            else:
                close()
                heading = _heading(line)
        except ValueError as error:
            raise ValueError(f"{path}:{number}: {error}") from None
    close()
    return records


def _heading(line: str) -> Tuple[str, str, int, bool]:
    match = re.fullmatch(r"(struct|union|untagged) (\w+)  (\d+)  (packed|natural)", line)
    if match is None:
        raise ValueError(f"not the heading of a record: {line}")
    tag, name, size, packing = match.groups()
    return tag, name, int(size), packing == "packed"


def _field(line: str) -> Field:
    name, spelling, offset, width, bits, kind = re.split(r"\s{2,}", line.strip())
    if kind not in KINDS:
        raise ValueError(f"unknown kind of field: {kind}")
    if (bits == "-") == (kind == "bits"):
        raise ValueError(f"bits {bits} for the kind {kind}")
    first, count = (None, None) if bits == "-" else map(int, bits.split(":"))
    return Field(name, spelling, int(offset), int(width), first, count, kind)
