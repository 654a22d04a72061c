"""One Open vSwitch for all tests, one program that compiles for them."""

from typing import Iterator

import pytest

from compiler import Compiler
from open_vswitch import OpenVSwitch


@pytest.fixture(scope="session")
def compiler() -> Iterator[Compiler]:
    made = Compiler()
    yield made
    made.close()


@pytest.fixture(scope="session")
def open_vswitch(tmp_path_factory: pytest.TempPathFactory) -> Iterator[OpenVSwitch]:
    made = OpenVSwitch(tmp_path_factory.mktemp("ovs"))
    yield made
    made.close()
