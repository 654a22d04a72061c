"""The contract tests need the recording host under the module, or they stop right here."""

from typing import Iterator

import _libvswitch  # noqa: F401 (the host is loaded by the module, so that it finds the trap)
import pytest
from recording_host import RecordingHost, WrongHost


def pytest_configure(config: pytest.Config) -> None:
    """Keep count of what the tests prove."""
    config.addinivalue_line("markers", "proves(aspect): shows this of `call`, and of `position`")
    # Only now: it looks for what the plugins that come first make findable.
    from proof import Proof

    config.pluginmanager.register(Proof())


def pytest_sessionstart() -> None:
    """Refuse to run on another host: what it returns would prove nothing."""
    try:
        RecordingHost()
    except WrongHost as error:
        pytest.exit(f"contract tests: {error}", returncode=3)


@pytest.fixture(name="host")
def fixture_host() -> Iterator[RecordingHost]:
    """Give each test the recording host with nothing recorded and nothing told."""
    host = RecordingHost()
    host.reset()
    yield host
    host.reset()
