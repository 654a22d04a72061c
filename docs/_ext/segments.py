"""The bytes of a record from the first to the last: which fields have them, alone or together."""

from dataclasses import dataclass, field
from typing import List, Sequence, Tuple

from layout import Place


@dataclass(frozen=True)
class Shape:
    """A field as it is drawn."""

    name: str
    type: str
    kind: str  # number, text, array, record, pointer, bits: a class of the style sheet
    place: Place
    element: int = 0  # bytes of an array's element
    count: str = ""  # of a trailing array: how many

    @property
    def is_trailing(self) -> bool:
        return bool(self.count)

    @property
    def bits(self) -> Tuple[int, int]:
        """First and one past the last, counted from the record's first byte."""
        first = 8 * self.place.offset + self.place.first_bit
        return first, first + (self.place.bits or 8 * self.place.size)

    @property
    def is_part_of_byte(self) -> bool:
        first, end = self.bits
        return first % 8 != 0 or end % 8 != 0


@dataclass
class Segment:
    """Bytes that one field has to itself, several share, or none has."""

    start: int
    end: int
    shapes: List[Shape] = field(default_factory=list)

    @property
    def size(self) -> int:
        return self.end - self.start

    @property
    def is_alone(self) -> bool:
        return len(self.shapes) == 1 and not self.shapes[0].is_part_of_byte

    @property
    def kind(self) -> str:
        if not self.shapes:
            return "padding"
        if self.is_alone:
            return self.shapes[0].kind
        return "bits" if len(self.lanes()) == 1 else "union"

    @property
    def name(self) -> str:
        if not self.shapes:
            return "padding"
        if self.is_alone:
            return self.shapes[0].name
        return "bits, see below" if len(self.lanes()) == 1 else f"one of {len(self.lanes())}"

    @property
    def type(self) -> str:
        if self.is_alone:
            return self.shapes[0].type
        return f"{self.size} bytes" if self.size > 1 else "1 byte"

    def lanes(self) -> List[List[Shape]]:
        """The fields by what can hold at the same time, each lane in the order of declaration."""
        found: List[List[Shape]] = []
        for shape in self.shapes:
            if found and found[-1][-1].bits[1] <= shape.bits[0]:
                found[-1].append(shape)
            else:
                found.append([shape])
        return found


def segments(shapes: Sequence[Shape], size: int) -> List[Segment]:
    """The record from its first byte to its last, padding included."""
    found: List[Segment] = []
    for shape in sorted(shapes, key=lambda one: one.place.offset):
        if shape.is_trailing:
            continue
        end = found[-1].end if found else 0
        if found and shape.place.offset < end:
            found[-1].end = max(end, shape.place.end)
            found[-1].shapes.append(shape)
            continue
        if shape.place.offset > end:
            found.append(Segment(end, shape.place.offset))
        found.append(Segment(shape.place.offset, shape.place.end, [shape]))
    end = found[-1].end if found else 0
    if end < size:
        found.append(Segment(end, size))
    order = {id(shape): at for at, shape in enumerate(shapes)}
    for segment in found:
        segment.shapes.sort(key=lambda one: order[id(one)])
    return found
