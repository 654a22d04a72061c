"""examples/apply.py: a document arrives whole, or the host is as before and it is said why."""

from pathlib import Path
from typing import Any, Callable

import pytest
from simhost import SharedHost

DOCUMENT = str(Path(__file__).with_name("document.json"))
CHANGES = [
    "vswitch0/mtu: 1500 -> 9000",
    "vswitch0/web-1/vlan: absent -> 7",
    "vswitch0/web-3: absent -> id=web-3",
    "vswitch0/db-1: id=db-1 -> absent",
]


@pytest.fixture(autouse=True)
def stopped(shared_host: SharedHost) -> None:
    """Addresses age, and nothing else of the host is to change by itself."""
    shared_host.clock.stop()


def test_a_document_arrives(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    assert example("apply", DOCUMENT) == (0, CHANGES, "")
    (switch,) = shared_host.describe()["switches"]
    assert switch["mtu"] == 9000
    assert [port["id"] for port in switch["ports"]] == ["web-1", "web-2", "web-3"]
    assert example("apply", DOCUMENT) == (0, [], "")


def test_a_dry_run_changes_nothing(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    before = shared_host.describe()["switches"]
    assert example("apply", DOCUMENT, "--dry-run") == (0, CHANGES, "")
    assert shared_host.describe()["switches"] == before


def test_what_fails_is_undone(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    before = shared_host.describe()["switches"]
    shared_host.fault("DVSQEX_PortAdd", status="QEX_NO_RESOURCES")
    status, lines, errors = example("apply", DOCUMENT)
    assert (status, lines) == (1, [])
    assert errors.startswith("apply: DVSQEX_PortAdd(")
    assert errors.endswith("QEX_NO_RESOURCES, No resources; everything is as it was before\n")
    assert shared_host.describe()["switches"] == before


def test_what_cannot_be_undone_is_said(
    shared_host: SharedHost, example: Callable[..., Any]
) -> None:
    shared_host.fault("DVSQEX_PortAdd", status="QEX_NO_RESOURCES")
    # The typed call has set the MTU; this puts back what was there.
    shared_host.fault("DVSQEX_GlobalPropSet", status="QEX_BUSY")
    status, lines, errors = example("apply", DOCUMENT)
    assert (status, lines) == (3, [])
    assert errors.startswith("apply: DVSQEX_PortAdd(")
    assert "QEX_NO_RESOURCES, No resources; not as it was: vswitch0: " in errors
    assert shared_host.describe()["switches"][0]["mtu"] == 9000


@pytest.mark.parametrize(
    "text, why",
    [
        (
            "{",
            "{path}: Expecting property name enclosed in double quotes: line 1 column 2 (char 1)",
        ),
        ('{"switches": [{"mtu": 99}]}', "switches[0]: 'alias' is missing"),
        (
            '{"switches": [{"alias": "vswitch0", "mtu": 99}]}',
            "switches[0].mtu: 99 is below 1280",
        ),
    ],
)
def test_what_is_wrong_with_a_document(
    shared_host: SharedHost, example: Callable[..., Any], tmp_path: Path, text: str, why: str
) -> None:
    before = shared_host.describe()["switches"]
    path = tmp_path / "document.json"
    path.write_text(text)
    assert example("apply", str(path)) == (1, [], f"apply: {why.replace('{path}', str(path))}\n")
    assert shared_host.describe()["switches"] == before


def test_a_document_that_is_not_there(example: Callable[..., Any]) -> None:
    errors = "apply: [Errno 2] No such file or directory: '/nowhere/document.json'\n"
    assert example("apply", "/nowhere/document.json") == (1, [], errors)
