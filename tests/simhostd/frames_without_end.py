"""Frames that go on until the run is interrupted: what test_interrupted_runs.py interrupts.

In the folder IN_MID_FRAMES each process of the run says when frames go. With PLANTED in the
environment, a folder, the first of them leaves one thing of each kind that nobody ends."""

import os
import socket
import subprocess
from pathlib import Path

from frame_lab import Lab
from simhost import frame


def plant(folder: str) -> None:
    subprocess.Popen(["sleep", "infinity"], start_new_session=True)
    subprocess.run(
        ["ip", "link", "add", "planted0", "type", "veth", "peer", "planted1"], check=True
    )
    subprocess.run(["mount", "-t", "tmpfs", "planted", folder], check=True)
    with socket.socket(socket.AF_UNIX) as left:
        left.bind(f"{folder}/planted.sock")


def test_frames_without_end(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    beyond = lab.network("nic0").client()
    assert one.comes_to_reach(other) and one.comes_to_reach(beyond)
    if "PLANTED" in os.environ and os.environ["PYTEST_XDIST_WORKER"] == "gw0":
        plant(os.environ["PLANTED"])
    hello = frame(other.mac, one.mac, payload=b"hello")
    Path(os.environ["IN_MID_FRAMES"], str(os.getpid())).touch()
    while True:
        one.send(hello)
        other.expect(hello)
