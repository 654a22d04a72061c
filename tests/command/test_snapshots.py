"""A host as a scenario document: written, started from, restored, refused."""

import json
import os
import subprocess
from pathlib import Path
from typing import Any, Callable, Dict, List, Tuple

from command_line import PROGRAM, Refused, Vswitch, state
from simhost import SharedHost


SIMHOSTCTL = str(Path(os.environ["BUILD_DIR"], "simhost", "simhostctl"))


def in_clone(
    host: SharedHost, file: Path, *words: str, program: str = PROGRAM
) -> "subprocess.CompletedProcess[str]":
    """A program on a new host that starts from a document."""
    variables = {"SIMHOST_STATE": str(file.with_name("clone.db")), "SIMHOST_SCENARIO": str(file)}
    return subprocess.run(
        [program, *words],
        env={**host.environment, **variables},
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
    )


def without_ages(said: Dict[str, Any]) -> Dict[str, Any]:
    """The clock of the clone goes on."""
    for switch in said["switches"]:
        for place in (switch, *switch["ports"]):
            for entry in place.get("addresses", ()):
                del entry["age"]
    return said


def test_a_clone_starts_from_a_snapshot(vswitch: Vswitch, lab: SharedHost, tmp_path: Path) -> None:
    done = vswitch("snapshot")
    file = tmp_path / "host.json"
    file.write_text(done.stdout)
    again = in_clone(lab, file, "snapshot")
    assert again.returncode == 0, again.stderr
    assert without_ages(json.loads(again.stdout)) == without_ages(done.json)
    aliases = [one["alias"] for one in done.json["switches"]]
    assert aliases == [one["alias"] for one in state(lab)["switches"]]


def test_what_a_call_refuses(
    vswitch: Vswitch, lab: SharedHost, refused: Refused, tmp_path: Path
) -> None:
    """A snapshot goes on; a backup does not, for restoring it would take away what it lacks."""
    lab.fault("VSQEX_GetRARPStats", status="QEX_NOT_SUPPORTED", times=2)
    lab.fault("VSDVS_GetMTU", status="QEX_BUSY", times=2)
    done = vswitch("snapshot")
    assert done.status == 0
    assert [
        (one["switch"], one["what"], one["call"], one["status"], one["words"])
        for one in done.json["observed"]["refused"]
    ] == [
        (alias, *about)
        for alias in ("vswitch0", "lab")
        for about in (
            ("mtu", "VSDVS_GetMTU", "QEX_BUSY", "Busy"),
            ("counters", "VSQEX_GetRARPStats", "QEX_NOT_SUPPORTED", "Not supported"),
        )
    ]
    file = tmp_path / "host.json"
    file.write_text(done.stdout)
    lab.clear_faults()
    assert in_clone(lab, file, "show", program=SIMHOSTCTL).returncode == 0
    lab.fault("VSDVS_GetMTU", status="QEX_BUSY")
    assert "VSDVS_GetMTU" in refused("backup")


def test_a_snapshot_is_restored(vswitch: Vswitch, lab: SharedHost) -> None:
    text = vswitch("snapshot").stdout
    before = state(lab)["switches"]
    assert vswitch("set", "lab", "mtu=1500").status == 0
    assert vswitch("restore", "-", input=text).stdout == "lab/mtu: 1500 -> 9000\n"
    assert state(lab)["switches"] == before


BAD: List[Tuple[Callable[[str], str], str]] = [
    (lambda text: text[: len(text) // 2], "no JSON: "),
    (lambda text: "", "no JSON: "),
    (lambda text: "[]", "the document: must be an object"),
    (lambda text: '{"openapi": "3.0"}', "openapi: unknown key"),
    (lambda text: text.replace('"mtu": 9000', '"mtu": 99000'), "switches[1].mtu: 99000 is above"),
    (lambda text: text.replace('"left"', f'"{"x" * 99}"'), "switches[1].teaming.active[0]: has"),
]


def test_hosts_that_cannot_start_from_a_snapshot(
    vswitch: Vswitch, lab: SharedHost, tmp_path: Path
) -> None:
    text = vswitch("snapshot").stdout
    file = tmp_path / "host.json"
    for change, words in BAD:
        file.write_text(change(text))
        assert file.read_text() != text
        done = in_clone(lab, file, "show", program=SIMHOSTCTL)
        assert done.returncode != 0 and f"{file} cannot be used: {words}" in done.stderr
    # Nothing of them is left.
    file.write_text(text)
    assert in_clone(lab, file, "show", program=SIMHOSTCTL).returncode == 0


def test_other_names(vswitch: Vswitch, refused: Refused, lab: SharedHost, tmp_path: Path) -> None:
    key = tmp_path / "key"
    key.write_bytes(b"a key")
    file = tmp_path / "host.json"
    file.write_text(vswitch("snapshot", "--anonymize", "--key-file", str(key)).stdout)
    text = file.read_text()
    assert '"lab"' not in text and "web-1" not in text and "02:00:00:00:00:01" not in text
    assert in_clone(lab, file, "show", program=SIMHOSTCTL).returncode == 0
    assert "--key-file: it is for --anonymize" in refused(
        "snapshot", "--key-file", str(key), status=2
    )
