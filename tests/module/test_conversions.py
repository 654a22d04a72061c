"""Value conversions as calls and accessors make them."""

import ctypes
from typing import Any

import pytest

import _libvswitch as vs
import native
import peer
import reports


class Integer(int):
    """An integer object that is no plain int."""


class Text(str):
    """A str that is no plain str."""


class Index:
    """Converts with __index__, which makes it no integer object."""

    def __index__(self) -> int:
        return 1


def test_derived_types_are_what_they_derive_from(info: Any, name: Any) -> None:
    vs.VSInfo_mtu_set(info, Integer(9000))
    assert vs.VSInfo_mtu_get(info) == 9000
    vs.qex_Name_string_set(name, Text("derived"))
    assert vs.qex_Name_string_get(name) == "derived"


def test_an_object_with_an_index_is_no_integer(info: Any) -> None:
    text = reports.argument("VSInfo_mtu_set", 2, "qex_uint32")
    reports.raises(TypeError, text, vs.VSInfo_mtu_set, info, Index())


@pytest.mark.parametrize("value", [2**31, -(2**31) - 1, 2**63 - 1, -(2**63)])
def test_an_int_argument_outside_32_bits_is_an_overflow(value: int) -> None:
    text = reports.argument("QEX_ReturnStatusToString", 1, "QEX_ReturnStatus")
    reports.raises(OverflowError, text, vs.QEX_ReturnStatusToString, value)


def test_an_int_argument_takes_booleans_but_no_floats() -> None:
    assert vs.QEX_ReturnStatusToString(False) == vs.QEX_ReturnStatusToString(0)
    text = reports.argument("QEX_ReturnStatusToString", 1, "QEX_ReturnStatus")
    reports.raises(TypeError, text, vs.QEX_ReturnStatusToString, 0.0)


@pytest.mark.parametrize("value", [b"a", bytearray(b"a"), 1, [], object()])
def test_a_text_argument_takes_nothing_but_texts(value: Any) -> None:
    text = reports.argument("VSDVS_DestroyVSwitch", 1, "char const *")
    reports.raises(TypeError, text, vs.VSDVS_DestroyVSwitch, value)


def test_a_text_that_utf8_cannot_encode_is_refused_before_the_call() -> None:
    native.exception_status.value = 77
    text = reports.argument("VSDVS_DestroyVSwitch", 1, "char const *")
    reports.raises(TypeError, text, vs.VSDVS_DestroyVSwitch, "\ud800")
    assert native.exception_status.value == 77
    native.exception_status.value = 0


def test_the_failing_argument_is_named_by_its_position() -> None:
    text = reports.argument("VSDVS_SetMTU", 2, "qex_uint32")
    reports.raises(TypeError, text, vs.VSDVS_SetMTU, "a", "b")
    text = reports.argument("VSDVS_SetMTU", 1, "char const *")
    reports.raises(TypeError, text, vs.VSDVS_SetMTU, 1, "b")


def test_a_char_pointer_is_a_text_argument_without_a_copy() -> None:
    source = ctypes.create_string_buffer(b"no-such-switch")
    pointer = peer.pointer_object(ctypes.addressof(source), "char *")
    assert vs.VSDVS_DestroyVSwitch(pointer) == vs.QEX_NOT_FOUND


def test_no_text_is_null_and_the_host_returns_a_status() -> None:
    assert vs.VSDVS_DestroyVSwitch(None) == vs.QEX_BAD_PARAM


def test_64_bits_come_back_unsigned() -> None:
    status = vs.new_qex_NEBPortStatus()
    for value in (2**63 - 1, 2**63, 2**64 - 1):
        vs.qex_NEBPortStatus_flags_set(status, value)
        assert vs.qex_NEBPortStatus_flags_get(status) == value
    vs.delete_qex_NEBPortStatus(status)


def test_a_hardware_address_is_taken_as_bytes() -> None:
    entry = vs.new_VSMACEntry()
    for value in (bytes.fromhex("001122334455"), bytearray.fromhex("021122aabbcc")):
        assert vs.VSMACEntry_set_mac_address(entry, value) is None
        assert vs.VSMACEntry_macAddress_get(entry) == ":".join(f"{byte:02x}" for byte in value)
    text = reports.argument("VSMACEntry_set_mac_address", 2, "(unsigned char *mac_str, SIZE)")
    for other in ("00:11:22:33:44:55", 1, None):
        reports.raises(TypeError, text, vs.VSMACEntry_set_mac_address, entry, other)
    vs.delete_VSMACEntry(entry)
