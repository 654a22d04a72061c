"""The pictures and tables of records show what the reference table of all records says."""

import re
from typing import Dict, Iterator, List, Tuple

import pictures
import pytest
import records
from catalogue import Catalogue
from records import Field, Record
from segments import segments

RECORDS = records.read()


@pytest.mark.parametrize("name", RECORDS)
def test_the_layout_is_the_tables(catalogue: Catalogue, name: str) -> None:
    record = RECORDS[name]
    assert catalogue.layout.sizes[name] == record.size
    places = catalogue.layout.places[name]
    assert list(places) == [field.name for field in record.fields]
    for field in record.fields:
        place = places[field.name]
        assert (place.offset, place.size) == (field.offset, field.width), field.name
        # A whole byte of bits is a field of its own to the table.
        if field.kind == "bits":
            assert (place.first_bit, place.bits) == (field.first_bit, field.bit_count), field.name


@pytest.mark.parametrize("name", RECORDS)
def test_the_bytes_are_covered_once(catalogue: Catalogue, name: str) -> None:
    shapes = catalogue.shapes(catalogue.known.records[name])
    found = segments(shapes, RECORDS[name].size)
    assert [one.start for one in found] == [0, *[one.end for one in found[:-1]]]
    assert found[-1].end == RECORDS[name].size
    inside = [shape.name for one in found for shape in one.shapes]
    trailing = [shape.name for shape in shapes if shape.is_trailing]
    assert sorted(inside + trailing) == sorted(field.name for field in RECORDS[name].fields)
    assert all(field.width == 0 for field in RECORDS[name].fields if field.name in trailing)
    taken = {byte for field in RECORDS[name].fields for byte in bytes_of(field)}
    padding = {byte for one in found if not one.shapes for byte in range(one.start, one.end)}
    assert taken | padding == set(range(RECORDS[name].size))
    assert not taken & padding


def bytes_of(field: Field) -> range:
    return range(field.offset, field.offset + field.width)


@pytest.mark.parametrize("name", RECORDS)
def test_boxes_are_where_the_fields_are(catalogue: Catalogue, name: str) -> None:
    record = RECORDS[name]
    picture = drawn(catalogue, name)
    for field in record.fields:
        if overlaps(record, field) or field.width == 0 or is_part_of_byte(field):
            continue
        start, end = field.offset, field.offset + field.width
        last = f" to {end - 1}" if field.width > 1 else ""
        boxes = list(boxes_told(picture, rf"{field.name}: [^<]*, byte {start}{last}"))
        assert boxes, field.name
        assert boxes[0] == (start % 8, min(8 - start % 8, field.width)), field.name
        if field.width < 8 * 3:
            assert sum(width for _, width in boxes) == field.width, field.name
        else:
            assert boxes[-1][0] + boxes[-1][1] == (end - 1) % 8 + 1, field.name


def drawn(catalogue: Catalogue, name: str) -> str:
    shapes = catalogue.shapes(catalogue.known.records[name])
    return pictures.picture(name, shapes, RECORDS[name].size)


def boxes_told(picture: str, title: str) -> Iterator[Tuple[float, float]]:
    """Where the boxes with a title begin and how wide they are, in bytes."""
    number = r"([\d.]+)"
    box = rf'<rect class="[\w ]+" x="{number}" y="[\d.]+" width="{number}" [^>]*><title>{title}<'
    for left, width in re.findall(box, picture):
        yield (float(left) - 44) / 92, float(width) / 92


def overlaps(record: Record, field: Field) -> bool:
    return any(
        other is not field and set(bytes_of(other)) & set(bytes_of(field))
        for other in record.fields
    )


def is_part_of_byte(field: Field) -> bool:
    return field.bit_count is not None and bool(field.first_bit or field.bit_count % 8)


BITS: List[Tuple[str, Dict[str, Tuple[float, float]]]] = [
    # From the left, the highest bit of a byte first: where a field begins, and its bits.
    ("VSMACLearning", {"reserved": (0, 7), "learnStatic": (7, 1)}),
    ("qex_VLANHdr", {"priority": (0, 3), "dropEligible": (3, 1), "vlanIDHigh": (4, 4)}),
    (
        "qex_IPv4Hdr",
        {
            "version": (0, 4),
            "headerLength": (4, 4),
            "precedence": (0, 3),
            "tos": (3, 5),
            "dscp": (0, 6),
            "ecn": (6, 2),
            "qosFlags": (0, 8),
            "zero": (0, 1),
            "dontFragment": (1, 1),
            "moreFragments": (2, 1),
            "fragmentOffsetHigh": (3, 5),
            "fragmentOffsetLow": (8, 8),
            "fragmentInfo": (0, 16),
        },
    ),
]


@pytest.mark.parametrize("name, places", BITS)
def test_bits(catalogue: Catalogue, name: str, places: Dict[str, Tuple[float, float]]) -> None:
    picture = drawn(catalogue, name)
    whole = {"zero", "dontFragment", "moreFragments", "fragmentInfo"}
    whole |= {"fragmentOffsetHigh", "fragmentOffsetLow"}
    for field, (first, count) in places.items():
        bits = 16 if field in whole else 8  # in the row
        (left, width), *others = boxes_told(picture, rf"{field}: \w+")
        assert not others
        assert (round(left * bits / 8, 3), round(width * bits / 8, 3)) == (first, count), field


def test_long_fields_are_cut_and_say_how_long_they_are(catalogue: Catalogue) -> None:
    picture = drawn(catalogue, "VSTeamPolicy")
    assert "char [32][81]: 2,592 bytes" in picture
    assert picture.count(" cut") == 1


def test_what_trails_says_how_often(catalogue: Catalogue) -> None:
    picture = drawn(catalogue, "DVMirrorSessionTable")
    assert re.search(r"numSessions of 2\d\d bytes each", picture)
