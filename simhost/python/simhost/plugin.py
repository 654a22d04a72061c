"""What pytest loads: fixtures and marks for tests on the simulated host."""

import pytest


def pytest_configure(config: pytest.Config) -> None:
    config.addinivalue_line(
        "markers",
        "scenario(document): the host of this test is what the document describes, a dict or the"
        " name of a file beside the test",
    )
