"""Where the fields of records lie, as the compiler told (../make_probe.py)."""

from dataclasses import dataclass, field
from pathlib import Path
from typing import Dict, Union


@dataclass(frozen=True)
class Place:
    """In a record; of a field in bytes, of a bit field in bits, the lowest of a byte first."""

    offset: int
    size: int
    first_bit: int = 0
    bits: int = 0  # 0 of what is no bit field

    @property
    def end(self) -> int:
        return self.offset + self.size


@dataclass
class Layout:
    sizes: Dict[str, int] = field(default_factory=dict)
    places: Dict[str, Dict[str, Place]] = field(default_factory=dict)
    values: Dict[str, Union[int, str]] = field(default_factory=dict)


def read(path: Path) -> Layout:
    found = Layout()
    for line in path.read_text(encoding="ascii").splitlines():
        kind, name, *rest = line.split("\t")
        if kind == "record":
            found.sizes[name] = int(rest[0])
            found.places[name] = {}
        elif kind == "field":
            found.places[name][rest[0]] = Place(int(rest[1]), int(rest[2]))
        elif kind == "bits":
            found.places[name][rest[0]] = _bits(int(rest[1]), int(rest[2]))
        elif kind == "number":
            found.values[name] = int(rest[0])
        elif kind == "text":
            found.values[name] = rest[0]
        else:
            raise ValueError(f"{path}: not a line of a layout: {line}")
    return found


def _bits(first: int, count: int) -> Place:
    """The bytes that a bit field touches, and its bits from the first of them on."""
    offset = first // 8
    return Place(offset, (first + count + 7) // 8 - offset, first - 8 * offset, count)
