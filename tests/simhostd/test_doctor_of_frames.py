"""What the doctor says of frames: Open vSwitch, namespaces, and the daemon of a state."""

import json
import os
import subprocess
import sys
from pathlib import Path
from typing import Dict, List, Mapping

import pytest

from frame_lab import TOOLS, Lab

Finding = Dict[str, str]


def findings(changes: Mapping[str, str]) -> List[Finding]:
    """Those about frames, of a doctor with these variables."""
    done = subprocess.run(
        [sys.executable, "-m", "libvswitch.doctor", "--json"],
        env={**os.environ, **changes},
        stdout=subprocess.PIPE,
        text=True,
        check=False,
    )
    found: List[Finding] = json.loads(done.stdout)["findings"]
    assert done.returncode == 0, found
    return [one for one in found if one["about"] == "frames"]


def test_a_machine_on_which_frames_can_move() -> None:
    vswitch, namespaces, *untried = findings({})
    assert vswitch["level"] == namespaces["level"] == "ok"
    assert vswitch["text"].startswith("Open vSwitch ")
    for found, what in zip(untried, ("the data path of the kernel", "groups of uplinks ")):
        assert found["level"] == "note" and found["text"].startswith(what)
        assert found["text"].endswith(": simhostd is untested with it")
    assert len(untried) == 2


@pytest.mark.parametrize(
    "said, level, text",
    [
        ("ovs-vswitchd (Open vSwitch) 2.17.3", "warning", "Open vSwitch 2.17, "),
        ("something else", "warning", " does not say its version"),
    ],
)
def test_an_open_vswitch_that_is_not_known(
    tmp_path: Path, said: str, level: str, text: str
) -> None:
    program(tmp_path / "ovs-vswitchd", f"echo '{said}'")
    vswitch = findings({"PATH": f"{tmp_path}:{os.environ['PATH']}"})[0]
    assert vswitch["level"] == level and text in vswitch["text"]
    assert vswitch["advice"]


def test_no_namespaces(tmp_path: Path) -> None:
    program(tmp_path / "unshare", "exit 1")
    found = findings({"PATH": f"{tmp_path}:{os.environ['PATH']}"})[1]
    assert found["level"] == "note"
    assert found["text"].startswith("no network namespace can be made")


def program(file: Path, does: str) -> None:
    file.write_text(f"#!/bin/sh\n{does}\n", encoding="ascii")
    file.chmod(0o755)


def test_no_open_vswitch(tmp_path: Path) -> None:
    hide = 'mount --bind "$0" /usr/sbin && exec "$@"'
    doctor = [sys.executable, "-m", "libvswitch.doctor", "--json"]
    user = [] if os.geteuid() == 0 else ["--user", "--map-root-user"]
    done = subprocess.run(
        ["unshare", *user, "--mount", "sh", "-c", hide, str(tmp_path), *doctor],
        stdout=subprocess.PIPE,
        text=True,
        check=False,
    )
    (found,) = (
        one for one in json.loads(done.stdout)["findings"] if "no Open vSwitch" in one["text"]
    )
    assert found["level"] == "note" and "openvswitch-switch" in found["advice"]


def test_what_bridges_are_made_with(idle: Lab) -> None:
    """Where it is not there they cannot be made, and nothing is in force."""
    hide = [
        "unshare",
        "--mount",
        "sh",
        "-c",
        'mount --bind /dev/null /dev/net/tun && exec "$@"',
        "-",
    ]
    doctor = [sys.executable, "-m", "libvswitch.doctor", "--json"]
    said = json.loads(idle.host.try_run(*hide, *doctor).stdout)["findings"]
    assert [one["level"] for one in said if "/dev/net/tun" in one["text"]] == ["warning"]
    words = [str(TOOLS / "simhostd"), "--state", str(idle.state)]
    log = open(idle.folder / "simhostd.log", "w", encoding="utf-8")
    with log:
        daemon = idle.host.start(
            *(*hide, *words, "--openvswitch", f"private:{idle.run_folder()}"),
            stdout=subprocess.PIPE,
            stderr=log,
        )
    assert daemon.stdout is not None and daemon.stdout.readline() == "ready\n"
    idle.client("lab", "a")
    why = "of the switch 'lab', for which it needs /dev/net/tun: Inappropriate ioctl for device"
    assert why in idle.ctl("plane") and " is pending" in idle.ctl("plane")
    assert idle.log().count(why) == 1
    (*_, complaint) = findings({"SIMHOST_STATE": str(idle.state)})
    assert why in complaint["text"]
    daemon.terminate()
    daemon.communicate(timeout=30)


def test_the_daemon_of_a_state(lab: Lab) -> None:
    *_, moves, checksums = findings({"SIMHOST_STATE": str(lab.state)})
    assert lab.daemon is not None
    assert moves["text"] == f"simhostd, process {lab.daemon.pid}, moves them in ovs-vswitchd"
    assert "no TCP" in checksums["text"] and "ethtool" in checksums["advice"]
    lab.stop()
    assert len(findings({"SIMHOST_STATE": str(lab.state)})) == len(findings({}))
