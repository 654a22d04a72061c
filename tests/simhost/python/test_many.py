"""A host with many switches, and one with many ports, through the module."""

from typing import Iterator

import pytest

import _libvswitch as vs

SWITCHES = 100
PORTS = 10_000


@pytest.fixture
def big() -> Iterator[str]:
    alias = "many-ports"
    assert vs.VSDVS_CreateVSwitch(alias, None, None, PORTS, 0, 0, 0, 0) == vs.QEX_OK
    yield alias
    assert vs.VSDVS_DestroyVSwitch(alias) == vs.QEX_OK


def test_a_hundred_switches_keep_their_settings_apart() -> None:
    aliases = [f"many-{index}" for index in range(SWITCHES)]
    for index, alias in enumerate(aliases):
        assert vs.VSDVS_CreateVSwitch(alias, None, None, 8, 0, 0, 1500 + index, 0) == vs.QEX_OK
    info = vs.new_VSInfo()
    for index, alias in enumerate(aliases):
        assert vs.VSQEX_GetVSInfo(alias, info) == vs.QEX_OK
        assert vs.VSInfo_mtu_get(info) == 1500 + index
        assert vs.VSDVS_DestroyVSwitch(alias) == vs.QEX_OK
        assert vs.VSQEX_GetVSInfo(alias, info) == vs.QEX_NOT_FOUND
    vs.delete_VSInfo(info)


def test_ten_thousand_ports_are_all_found_and_no_more_are_taken(big: str) -> None:
    for index in range(PORTS):
        assert vs.VSDVS_AddDVPort(big, f"port-{index}", index) == vs.QEX_OK
    assert vs.VSDVS_AddDVPort(big, "one-more", 0) == vs.QEX_LIMIT_EXCEEDED
    numbers = set()
    for index in range(PORTS):
        status, number = vs.VSDVS_DvPortIDToPortID(big, f"port-{index}")
        assert status == vs.QEX_OK
        numbers.add(number)
    assert len(numbers) == PORTS
