"""How simhostd is started, tells that it is ready, and ends; and who else is there."""

import os
import re
import signal
import socket
import subprocess
from pathlib import Path

import pytest

from frame_lab import ONE_SWITCH, TOOLS, Lab, comes_true
from going_frames import GoingFrames
from lasting_open_vswitch import LastingOpenVSwitch

READY = "READY=1\nSTATUS=moves the frames of "


def told_to(manager: socket.socket) -> str:
    manager.settimeout(30)
    return manager.recv(4096).decode()


def test_a_service_manager_is_told(
    idle: Lab, tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    folder = tmp_path / ("d" * 120)
    folder.mkdir()
    with socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM) as manager:
        # An address of a socket is short.
        inside = os.open(folder, os.O_PATH)
        manager.bind(f"/proc/self/fd/{inside}/notify")
        os.close(inside)
        monkeypatch.setenv("NOTIFY_SOCKET", str(folder / "notify"))
        idle.start()
        assert told_to(manager) == f"{READY}{idle.state}"
        idle.stop()
        assert told_to(manager) == "STOPPING=1"


@pytest.mark.parametrize("number", [signal.SIGTERM, signal.SIGINT])
def test_it_ends_in_order(idle: Lab, number: int) -> None:
    with open(idle.folder / "simhostd.log", "w", encoding="utf-8") as log:
        daemon = idle.simhostd(f"private:{idle.run_folder()}", stderr=log)
    assert daemon.stdout is not None and daemon.stdout.readline() == "ready\n"
    assert len(idle.processes()) == 2
    # A terminal that closes is no reason to end.
    daemon.send_signal(signal.SIGHUP)
    assert idle.plane()["in_force"] is not None
    daemon.send_signal(number)
    daemon.communicate(timeout=30)
    assert daemon.returncode == 0
    assert idle.log().endswith("simhostd: ends\n")
    assert not idle.processes()
    assert not (idle.folder / "host.db-simhostd").exists()


def test_the_open_vswitch_of_the_machine(idle: Lab) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()):
        # The daemon sees this one where the machine's own is.
        mount = (
            "mount -t tmpfs none /run && mkdir -p /run/openvswitch &&"
            ' mount --bind "$0" /run/openvswitch && exec "$@"'
        )
        daemon = idle.host.start(
            *("unshare", "--mount", "sh", "-c", mount, str(idle.run_folder())),
            *(str(TOOLS / "simhostd"), "--state", str(idle.state), "--openvswitch", "system"),
            stdout=subprocess.PIPE,
        )
        assert daemon.stdout is not None and daemon.stdout.readline() == "ready\n"
        one, other = idle.client("lab", "a"), idle.client("lab", "b")
        assert one.comes_to_reach(other)
        with GoingFrames(one, other):
            daemon.terminate()
            daemon.communicate(timeout=30)
            assert one.comes_to_reach(other)


def test_one_writes_to_an_open_vswitch(idle: Lab, tmp_path: Path) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        assert idle.daemon is not None
        (tmp_path / "second").mkdir()
        with Lab(tmp_path / "second", ONE_SWITCH) as second:
            log = open(second.folder / "simhostd.log", "w", encoding="utf-8")
            with log:
                waiting = second.simhostd(open_vswitch.where, stderr=log)
            who = f"simhostd of {idle.state}, process {idle.daemon.pid} writes to this Open vSwitch"
            assert comes_true(lambda: who in second.log()), second.log()
            assert second.log().count(who) == 1
            # It takes over when the first one ends.
            idle.stop()
            assert waiting.stdout is not None and waiting.stdout.readline() == "ready\n"
            waiting.terminate()
            waiting.communicate(timeout=30)


def test_who_takes_the_right_to_write_has_it(lab: Lab) -> None:
    database = f"unix:{lab.run_folder()}/db.sock"
    thief = lab.host.start("ovsdb-client", "steal", database, "simhostd", stdout=subprocess.DEVNULL)
    try:
        said = "another one writes to this Open vSwitch"
        assert comes_true(lambda: said in lab.log()), lab.log()
    finally:
        thief.kill()
        thief.communicate()
    assert comes_true(lambda: said not in lab.ctl("plane")), lab.log()
    lab.set_port("lab", "a", vlan=7)
    assert comes_true(lab.is_in_force)


def test_why_it_connects_anew_is_told(idle: Lab) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        os.kill(idle.processes()["ovsdb-server"], signal.SIGKILL)
        # Of what was under way then, the kernel says it in one way or another.
        why = re.compile(
            re.escape(f"{idle.run_folder()}/db.sock: ")
            + "(the other side closed the connection|Connection reset by peer|Broken pipe)"
        )
        assert comes_true(lambda: why.search(idle.log())), idle.log()


def test_a_data_path_that_the_kernel_has_not_is_told(idle: Lab) -> None:
    idle.client("lab", "a")
    where, options = f"private:{idle.run_folder()}", ["--datapath", "system"]
    with open(idle.folder / "simhostd.log", "w", encoding="utf-8") as log:
        daemon = idle.simhostd(where, more=options, stderr=log)
    told = "Open vSwitch does not make the bridge vs[0-9a-f]{12} of the switch 'lab'"
    wanted = ", for which it needs the kernel's module openvswitch\n"

    def is_told() -> bool:
        if idle.plane()["in_force"] is not None:
            return True
        # The kernel may load it once it is asked for; whether that lets it be used nobody knows.
        is_there = Path("/sys/module/openvswitch").exists()
        return bool(re.search(told if is_there else told + wanted, idle.log()))

    try:
        assert comes_true(is_told), idle.log()
    finally:
        daemon.terminate()
        daemon.communicate(timeout=30)


def test_a_private_open_vswitch_is_one_daemon_s(lab: Lab, tmp_path: Path) -> None:
    assert lab.daemon is not None
    (tmp_path / "second").mkdir()
    with Lab(tmp_path / "second", ONE_SWITCH) as second:
        refused = second.simhostd(f"private:{lab.run_folder()}", stderr=subprocess.PIPE)
        said = refused.communicate(timeout=30)[1]
    assert refused.returncode == 1
    where = lab.run_folder()
    assert said == f"simhostd: the process {lab.daemon.pid} runs an Open vSwitch in {where}\n"
    assert len(lab.processes()) == 2


def test_a_folder_that_cannot_be_used_is_told(idle: Lab) -> None:
    file, folder = idle.folder / "file", idle.folder / "folder"
    file.write_text("kept\n")
    folder.mkdir()
    unusable = {
        "/proc/no": "No such file or directory",
        str(file): "Not a directory",
        f"{file}/in": "Not a directory",
        str(folder): "Read-only file system",
        f"{folder}/in": "Read-only file system",
    }
    # The daemon sees a medium there that can only be read; that binds root, too.
    mount = 'mount -t tmpfs -o ro none "$0" && exec "$@"'
    for path, why in unusable.items():
        done = idle.host.try_run(
            *("unshare", "--mount", "sh", "-c", mount, str(folder)),
            *(str(TOOLS / "simhostd"), "--state", str(idle.state)),
            *("--openvswitch", f"private:{path}"),
        )
        assert done.returncode == 1, path
        told = f"simhostd: the folder {path} of the Open vSwitch cannot be used: {why}\n"
        assert done.stdout == told
    assert file.read_text() == "kept\n" and not list(folder.iterdir())
    assert idle.plane()["change"] is None and not idle.processes()


def test_paths_are_of_any_bytes(tmp_path: Path) -> None:
    folder = tmp_path / os.fsdecode(b"no \xff text")
    folder.mkdir()
    with Lab(folder, ONE_SWITCH) as lab:
        lab.start()
        one, other = lab.client("lab", "a"), lab.client("lab", "b")
        assert one.comes_to_reach(other)
        frame = [f"dst={other.mac}", f"src={one.mac}"]
        assert "goes out at port b" in lab.ctl("trace", "lab/a", *frame)
        assert lab.is_in_force()
