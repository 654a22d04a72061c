"""What the reference says of ownership, types and constants, against the code that knows it."""

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


def test_families_hold_every_constant_once(catalogue: Catalogue) -> None:
    listed = [
        name
        for header in catalogue.headers.values()
        for family in header.families
        for name in family.names
    ]
    assert sorted(listed) == sorted(one.name for one in catalogue.known.constants)


def test_places_of_constants(catalogue: Catalogue) -> None:
    assert catalogue.places_of("VSPROP_MTU") == ["VSDVS_GetMTU"]
    assert catalogue.places_of("QEX_SOCKET_AF_INET") == ["qex_SocketIPAddress.sin_family"]
    assert catalogue.places_of("VSPROP_PORT_MAC_MANAGEMENT") == [
        "VSDVS_GetPortMACLearning",
        "VSPMACManagement",
    ]
    assert catalogue.places_of("VS_DVMIRROR_WILDCARD_TEST") == []
