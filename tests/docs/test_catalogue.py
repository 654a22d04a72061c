"""What the reference says of ownership, types and constants, against the code that knows it."""

import likeness
import pytest
import types_in_words
from catalogue import Catalogue


def test_ownership_follows_from_what_is_declared(catalogue: Catalogue) -> None:
    allocating = [
        call
        for call in catalogue.calls.values()
        if any("the library's memory" in one for one in call.ownership)
    ]
    assert len(allocating) == 31
    said = {name: list(call.ownership) for name, call in catalogue.calls.items()}
    library = "the library's memory, for {} to release once"
    assert said["VSQEX_GetUplinks"] == [f"`uplinks`: {library.format('VSQEX_FreeMemory')}."]
    assert said["DVSQEX_VendorPortPropList"] == [f"`list`: {library.format('DVSData_Free')}."]
    assert said["DVSData_Serialize"] == [
        f"`bytes`: {library.format('DVSQEX_DataFree')}, unless the list has an allocator of its"
        " own, whose counterpart frees it."
    ]
    view = "a view of what stays the library's, good until {}; nothing frees it."
    assert said["DVSData_Data"] == [f"`data`: {view.format('the item ends')}"]
    ends = view.format("a reset or a cleanup of the state")
    assert said["DVSState_PortFind"] == [f"What is returned is {ends}"]
    assert said["VSQEX_GetVSInfo"] == ["`info`: the caller's; the call fills it."]
    assert said["VSQEX_SetRuntimeOptions"] == ["`options`: the caller's, only read."]
    assert said["VSDVS_SetMTU"] == ["nothing changes hands."]
    released = ["releases memory; what the caller has of it is no longer to be used."]
    deallocators = {name for name, sentences in said.items() if sentences == released}
    assert deallocators == {
        "VSDVS_FreeMemory",
        "VSQEX_FreeMemory",
        "DVSQEX_DataFree",
        "DVSData_Free",
        "free_dvmirror_session_table",
        "delete_vidrangeArray",
        "delete_pvlanmapentryArray",
    }
    owned = ["Python owns what is returned, and frees it."]
    assert said["new_vidrangeArray"] == said["vidrangeArray_getitem"] == owned
    table = "the caller's, until free_dvmirror_session_table releases it."
    assert said["alloc_dvmirror_session_table"] == [table]


def test_what_is_each_hosts_own_follows_from_what_is_declared(catalogue: Catalogue) -> None:
    said = {name: list(call.between_hosts) for name, call in catalogue.calls.items()}
    asks = "changes nothing of the host."
    assert said["VSDVS_GetMTU"] == [asks]
    assert said["VSDVS_SetMTU"] == said["new_vidrangeArray"] == []
    identifier = "`switchId`: the identifier of a switch, each host's own."
    number = "`portID`: the number of a port, each host's own."
    assert said["VSDVS_DvPortIDToPortIDFromDVSID"] == [asks, identifier, number]
    image = "`state`: bytes in a form of the host's own."
    length = "`length`: how long those are, each host's own."
    assert said["DVSQEX_StateInit"] == [image, length]
    assert said["DVS_SwitchId"] == [
        asks,
        "what is returned: the identifier of a switch, each host's own.",
    ]
    fields = {one.name: one for one in catalogue.known.records["VSMACEntry"].fields}
    assert likeness.of_field(fields["elapsed"]) == "a time, each host's own"
    assert likeness.of_field(fields["vid"]) == ""


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
        ("_numbers._LinkState", "LinkState or int"),
        ("Tuple[int, _numbers._LinkStateNumber]", "[int, int]"),
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
