"""What the tests of the classes share: a clean environment, a switch on the simulated host.

They run in a process of their own: loading the classes registers them, and from then on the flat
functions of that process return instances of them.
"""

import os
from typing import Iterator

import pytest

for _variable in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
    os.environ.pop(_variable, None)

import libvswitch as vs  # noqa: E402  (after the environment is clean)


@pytest.fixture
def switch() -> Iterator[str]:
    """The alias of a switch with two uplinks and a port `web`."""
    name = "classes"
    assert vs.VSDVS_CreateVSwitch(name, None, None, 64, 1, 0, 0, 2) == vs.QEX_OK
    assert vs.VSDVS_AddDVPort(name, "web", 7) == vs.QEX_OK
    yield name
    assert vs.VSDVS_DestroyVSwitch(name) == vs.QEX_OK


@pytest.fixture
def switch_id(switch: str) -> str:
    """The identifier of the same switch."""
    info = vs.VSInfo()
    assert vs.VSQEX_GetVSInfo(switch, info) == vs.QEX_OK
    return bytes(info.nebID).split(b"\0")[0].decode()
