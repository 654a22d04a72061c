"""What the tests of the module share: a clean environment, records."""

import os
from typing import Any, Callable, Iterator

import pytest

# The simulated host reads these at its first call; whatever the shell has set is not under test.
for _variable in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
    os.environ.pop(_variable, None)

import _libvswitch as vs  # noqa: E402  (after the environment is clean)

import native  # noqa: E402  (it imports the module)


@pytest.fixture
def armed() -> Iterator[Callable[[Callable[[], Any]], bool]]:
    """Whether a call arms the trap: only arming sets the status back to 0."""

    def check(call: Callable[[], Any]) -> bool:
        native.exception_status.value = 77
        call()
        return native.exception_status.value == 0

    yield check
    native.exception_status.value = 0


@pytest.fixture
def info() -> Iterator[Any]:
    record = vs.new_VSInfo()
    yield record
    vs.delete_VSInfo(record)


@pytest.fixture
def name() -> Iterator[Any]:
    record = vs.new_qex_Name()
    yield record
    vs.delete_qex_Name(record)
