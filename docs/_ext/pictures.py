"""Pictures of the bytes of a record, as SVG that takes its colours from the page's style sheet.

Eight bytes stand in a row, in the order of memory. What is longer than three rows is cut short, and
says how long it is. Bytes that hold bit fields, or different fields at a time, are drawn once more
below, larger: there the highest bit of a byte stands on the left, as in the documents of protocols.
"""

import re
from dataclasses import dataclass
from html import escape
from typing import Iterator, List, Optional, Sequence

from segments import Segment, Shape, segments

BYTES = 8  # in a row
CELL = 92
GUTTER = 44
ROW = 42
GAP = 24
LANE = 36
WIDTH = GUTTER + BYTES * CELL + 1
_LONGEST = 3  # rows that are drawn whole


@dataclass(frozen=True)
class _Piece:
    segment: Segment
    start: int
    end: int
    is_cut: bool = False  # stands for rows that are left out


def picture(name: str, shapes: Sequence[Shape], size: int) -> str:
    """The picture of a record, its title first for those who do not see it."""
    parts = segments(shapes, size)
    body: List[str] = list(_columns())
    top = 18
    for row in _rows(parts):
        body.extend(_row(row, top))
        top += ROW
    for shape in shapes:
        if shape.is_trailing:
            body.extend(_trailing(shape, top))
            top += ROW
    for segment in parts:
        if segment.shapes and not segment.is_alone:
            body.extend(_detail(segment, top + GAP))
            top += GAP + LANE * len(segment.lanes()) + 20
    title = f"The {size} bytes of {name}"
    listed = ", ".join(f"{one.name} at {one.place.offset}" for one in shapes)
    return (
        f'<svg class="bytes" role="img" viewBox="0 0 {WIDTH} {top + 2}" '
        f'width="{WIDTH}" height="{top + 2}" aria-label="{escape(title)}: {escape(listed)}">'
        f"<title>{escape(title)}</title>{''.join(body)}</svg>"
    )


def _columns() -> Iterator[str]:
    for column in range(BYTES):
        x = GUTTER + column * CELL + CELL / 2
        yield f'<text class="ruler" x="{x:g}" y="11" text-anchor="middle">{column}</text>'


def _rows(parts: Sequence[Segment]) -> List[List[_Piece]]:
    rows: List[List[_Piece]] = []
    shown = -1  # the row of memory that the last row shows
    for segment in parts:
        first, last = segment.start // BYTES, (segment.end - 1) // BYTES
        is_long = last - first >= _LONGEST
        for row in [first, last] if is_long else range(first, last + 1):
            start = max(segment.start, row * BYTES)
            piece = _Piece(segment, start, min(segment.end, (row + 1) * BYTES))
            if row == shown:
                rows[-1].append(piece)
            else:
                rows.append([piece])
            shown = row
            if is_long and row == first:
                rows.append([_Piece(segment, (first + 1) * BYTES, last * BYTES, is_cut=True)])
                shown = -1
    return rows


def _row(pieces: Sequence[_Piece], top: float) -> Iterator[str]:
    first = pieces[0]
    if first.is_cut:
        yield _ruler("&#8942;", top)
        yield _box(first.segment.kind + " cut", GUTTER, top, BYTES * CELL, ROW)
        said = _type_and_size(first.segment)
        yield _label(GUTTER, top, BYTES * CELL, ROW, first.segment.name, said)
        return
    yield _ruler(str(first.start - first.start % BYTES), top)
    for piece in pieces:
        x = GUTTER + piece.start % BYTES * CELL
        width = (piece.end - piece.start) * CELL
        yield _box(piece.segment.kind, x, top, width, ROW, _told(piece.segment))
        yield from _ticks(piece, x, top)
        if piece == _labelled(piece.segment):
            yield _label(x, top, width, ROW, piece.segment.name, piece.segment.type)


def _labelled(segment: Segment) -> Optional[_Piece]:
    """The piece of a segment that bears its name: the longest one, or none if a cut row does."""
    first, last = segment.start // BYTES, (segment.end - 1) // BYTES
    if last - first >= _LONGEST:
        return None
    pieces = [
        _Piece(segment, max(segment.start, row * BYTES), min(segment.end, (row + 1) * BYTES))
        for row in range(first, last + 1)
    ]
    return max(pieces, key=lambda one: one.end - one.start)


def _ticks(piece: _Piece, x: float, top: float) -> Iterator[str]:
    """Where the elements of an array begin."""
    element = piece.segment.shapes[0].element if piece.segment.is_alone else 0
    for at in range(piece.start + 1, piece.end):
        if element and (at - piece.segment.start) % element == 0:
            place = x + (at - piece.start) * CELL
            yield (
                f'<path class="tick" d="M{place:g} {top:g}v5M{place:g} {top + ROW:g}v-5"></path>'
            )


def _trailing(shape: Shape, top: float) -> Iterator[str]:
    yield _ruler(str(shape.place.offset), top)
    yield _box(shape.kind + " trailing", GUTTER, top, BYTES * CELL, ROW)
    said = f"{shape.count} of {shape.element} {'bytes' if shape.element > 1 else 'byte'} each"
    yield _label(GUTTER, top, BYTES * CELL, ROW, shape.name, f"{shape.type}: {said}")


def _detail(segment: Segment, top: float) -> Iterator[str]:
    """The fields that share bytes, in bits if they are few, each lane in a row of its own."""
    heading = f"byte {segment.start}"
    if segment.size > 1:
        heading = f"bytes {segment.start} to {segment.end - 1}"
    if len(segment.lanes()) > 1:
        heading += ", one of these at a time"
    yield f'<text class="heading" x="{GUTTER}" y="{top:g}">{heading}</text>'
    width = BYTES * CELL / (8 * segment.size)
    has_bits = any(shape.is_part_of_byte for shape in segment.shapes)
    for number, lane in enumerate(segment.lanes()):
        y = top + (20 if has_bits else 8) + number * LANE
        for shape in lane:
            yield from _lane_box(segment, shape, y, width)
        if number == 0 and has_bits:
            for bit in range(8 * segment.size):
                x = GUTTER + (bit + 0.5) * width
                yield (
                    f'<text class="ruler" x="{x:g}" y="{y - 5:g}" text-anchor="middle">'
                    f"{7 - bit % 8}</text>"
                )


def _lane_box(segment: Segment, shape: Shape, y: float, width: float) -> Iterator[str]:
    first, end = (bit - 8 * segment.start for bit in shape.bits)
    x = first
    if shape.is_part_of_byte:
        x = first // 8 * 8 + 7 - (end - 1) % 8
    said = shape.type
    if shape.place.bits:
        said = f"{shape.place.bits} {'bits' if shape.place.bits > 1 else 'bit'}"
    left, wide = GUTTER + x * width, (end - first) * width
    yield _box(shape.kind, left, y, wide, LANE - 4, f"{shape.name}: {shape.type}")
    is_narrow = wide < 7 * len(shape.name) and wide <= 300
    has_room_beside = left + wide + 8 * (len(shape.name) + len(said)) < WIDTH
    if is_narrow and has_room_beside and not shape.place.bits:
        yield (
            f'<text class="name" x="{left + wide + 8:g}" y="{y + LANE / 2 + 2:g}" '
            f'font-size="12">{escape(shape.name)}<tspan class="type" dx="8" font-size="11">'
            f"{escape(said)}</tspan></text>"
        )
    else:
        yield _label(left, y, wide, LANE - 4, shape.name, said)


def _type_and_size(segment: Segment) -> str:
    return f"{segment.type}: {segment.size:,} bytes" if segment.is_alone else segment.type


def _told(segment: Segment) -> str:
    """What is shown of a box when the mouse rests on it."""
    last = f" to {segment.end - 1}" if segment.size > 1 else ""
    return f"{segment.name}: {segment.type}, byte {segment.start}{last}"


def _ruler(text: str, top: float) -> str:
    return (
        f'<text class="ruler" x="{GUTTER - 8}" y="{top + ROW / 2 + 4:g}" text-anchor="end">'
        f"{text}</text>"
    )


def _box(kind: str, x: float, y: float, width: float, height: float, told: str = "") -> str:
    title = f"<title>{escape(told)}</title>" if told else ""
    return (
        f'<rect class="{kind}" x="{x:g}" y="{y:g}" width="{width:g}" height="{height:g}">'
        f"{title}</rect>"
    )


def _label(x: float, y: float, width: float, height: float, name: str, said: str) -> str:
    """A name, and below it what there is to say if there is room; or a long name in two lines."""
    middle = x + width / 2
    parts = re.fullmatch(r"([a-z]+)([A-Z][a-z]+)", name)
    if parts and _fitting(name, width, 13) < 7:
        name, said = parts[1], parts[2]
    size = _fitting(name, width, 13)
    said_size = _fitting(said, width, 11)
    has_room = said_size >= 7 and height >= 30
    y_name = y + height / 2 + (-2 if has_room else 4)
    text = (
        f'<text class="name" x="{middle:g}" y="{y_name:g}" text-anchor="middle" '
        f'font-size="{size:g}">{escape(name)}</text>'
    )
    if has_room:
        text += (
            f'<text class="type" x="{middle:g}" y="{y + height / 2 + 12:g}" text-anchor="middle" '
            f'font-size="{said_size:g}">{escape(said)}</text>'
        )
    return text


def _fitting(text: str, width: float, largest: float) -> float:
    """The size in which a text of this font, whose letters are 0.6 wide, fits."""
    return min(largest, round((width - 6) / (0.6 * max(len(text), 1)), 1))
