"""What was never tried is told as such wherever people read of it, and would be noticed where it
could be tried."""

from pathlib import Path

import pytest
from libvswitch import _frames_examined as examined

import untried

README = Path(__file__).parents[2] / "simhost" / "README.md"


def rows() -> str:
    said = README.read_text(encoding="utf-8")
    return said.partition("#### What was never tried")[2].partition("###")[0]


def test_the_table_has_what_the_doctor_tells() -> None:
    for what, _ in examined.UNTRIED:
        assert f"| {what}" in rows()


def test_what_could_be_tried_is_told(
    monkeypatch: pytest.MonkeyPatch, capsys: pytest.CaptureFixture[str]
) -> None:
    monkeypatch.setattr(untried, "is_there", lambda module: module == "bonding")
    assert untried.main() == 0
    complaint, count = capsys.readouterr().out.splitlines()
    assert complaint.endswith(
        "bonding of the kernel as their partner can be tried here, and no test does"
    )
    assert int(count) == len(examined.UNTRIED)


def test_a_device_that_the_kernel_has_is_there(monkeypatch: pytest.MonkeyPatch) -> None:
    monkeypatch.setattr(
        untried, "SUCCEED", {"a bridge": ["ip", "link", "add", "untried", "type", "bridge"]}
    )
    assert untried.is_there("a bridge")
