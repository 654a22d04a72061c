"""What the reference says of ownership and statuses, against the code that knows it."""

from typing import Dict

import comments
import pytest
import types_in_words
from catalogue import Catalogue


def test_doors(catalogue: Catalogue) -> None:
    """The headers' words name the door that the classes use."""
    from libvswitch import _layout, _ownership

    handing_out = [*_layout.CALLS_WITH_CELLS]
    for name, call in catalogue.calls.items():
        if any("to be given back once" in one for one in call.ownership):
            handing_out.append(name)
    assert len(set(handing_out)) > 30
    for name in handing_out:
        call = catalogue.calls[name]
        door = catalogue.door(call)
        views = [one for one in call.ownership if "nothing frees it" in one]
        if views:
            assert _ownership.door_of(name) is None, name
        elif name != "DVSData_Serialize":  # of the list's own allocator, so it may be another
            assert door == _ownership.door_of(name), name


@pytest.mark.parametrize(
    "text, statuses",
    [
        (
            "Adds a port; QEX_LIMIT_EXCEEDED if there is no room.",
            {"QEX_LIMIT_EXCEEDED": "if there is no room"},
        ),
        (
            "its name; QEX_EXISTS if the switch has it, QEX_BUSY if another does",
            {"QEX_EXISTS": "if the switch has it", "QEX_BUSY": "if another does"},
        ),
        (
            "a name the host does not know is QEX_NOT_FOUND, a null where nothing allows\n"
            "it QEX_BAD_PARAM.",
            {
                "QEX_NOT_FOUND": "a name the host does not know",
                "QEX_BAD_PARAM": "a null where nothing allows it",
            },
        ),
        ("Sets it: 0 to 7, else QEX_BAD_PARAM.", {"QEX_BAD_PARAM": "if not 0 to 7"}),
        ("Nothing at all.", {}),
    ],
)
def test_statuses_in_words(text: str, statuses: Dict[str, str]) -> None:
    assert comments.statuses_in(text) == statuses


@pytest.mark.parametrize(
    "hint, words",
    [
        ("int", "int"),
        ("None", "None"),
        ("Union[str, _flat._CharPointer, None]", "str or None"),
        ("Optional[Union[str, _CharPointer]]", "str or None"),
        ("Union[VSUplinks, Any]", "VSUplinks"),
        ("Tuple[int, Union[_VSUplinks, Any]]", "[int, VSUplinks * pointer]"),
        ("Optional[_flat._UnsignedIntPointer]", "unsigned int * pointer or None"),
        ("Optional[_VSLAGTablePointerPointer]", "VSLAGTable ** pointer or None"),
        ("_VoidPointerPointer", "void ** pointer"),
        ("Array[VSMACEntry]", "array of VSMACEntry"),
        (
            "Union[Callable[[Any, Any], Any], _flat._CharFunction2Pointer]",
            "function or function pointer",
        ),
        ("Optional[_flat._Pointer]", "any pointer or None"),
    ],
)
def test_types_in_words(hint: str, words: str) -> None:
    assert types_in_words.in_words(hint, {"VSUplinks", "VSLAGTable", "VSMACEntry"}) == words


def test_a_comment_with_an_unknown_command() -> None:
    with pytest.raises(ValueError, match="unknown command @retur"):
        comments.parted("Something.\n\n@retur nothing")


def test_families_hold_every_constant_once(catalogue: Catalogue) -> None:
    listed = [
        name
        for header in catalogue.headers.values()
        for family in header.families
        for name in family.names
    ]
    assert sorted(listed) == sorted(one.name for one in catalogue.known.constants)
