"""Whether real frames can move on this machine, and what moves those of a state."""

import errno
import fcntl
import json
import os
import re
import shutil
import socket
import subprocess
import typing
from pathlib import Path
from typing import Any, Dict, List, Optional, Tuple

NOTE, OK, WARNING = "note", "ok", "warning"
_ABOUT = "frames"
_OLDEST = (3, 1)
_INSTALL = "install Debian's package openvswitch-switch where frames are to move"
_PATIENCE = 10.0
_TUN = "/dev/net/tun"
# What the kernel has of its own for frames, with the module that does it.
UNTRIED = (
    ("the data path of the kernel", "openvswitch"),
    ("groups of uplinks with the bonding of the kernel as their partner", "bonding"),
)
# _IOR('T', 207, unsigned), as Linux has it on x86 and ARM.
_TUNGETFEATURES = 0x800454CF
# Root's own, and where users may have one.
_USERS: Tuple[List[str], ...] = ([], ["--user", "--map-root-user"])


class Found(typing.NamedTuple):
    level: str
    about: str
    text: str
    advice: str = ""


def examine(state: Optional[str]) -> typing.Iterator[Found]:
    """What holds on this machine, and of the host that is kept in `state`."""
    yield _open_vswitch()
    yield _namespaces()
    if not _has_tun():
        yield Found(
            WARNING,
            _ABOUT,
            f"{_TUN} is no device of this machine, so that ovs-vswitchd can make no bridge",
            "load the module tun, or give it to the container",
        )
    for what, module in UNTRIED:
        there = "has" if kernel_has(module) else "has not"
        yield Found(
            NOTE, _ABOUT, f"{what}, which this kernel {there}: simhostd is untested with it"
        )
    status = _status(Path(state)) if state else None
    if status is not None:
        yield from _daemon(status)


def _has_tun() -> bool:
    try:
        with open(_TUN, "r+b", buffering=0) as tun:
            fcntl.ioctl(tun, _TUNGETFEATURES, b"\0" * 4)
    except OSError as error:
        # Whoever may not open it may not run Open vSwitch either.
        return error.errno in (errno.EACCES, errno.EPERM)
    return True


def kernel_has(module: str) -> bool:
    """Whether it is part of the kernel, or could be."""
    if Path("/sys/module", module).exists():
        return True
    known = Path("/lib/modules", os.uname().release)
    lists = (known / "modules.builtin", known / "modules.dep")
    return any(f"/{module}.ko" in _text_of(file) for file in lists)


def _text_of(file: Path) -> str:
    try:
        return file.read_text(encoding="utf-8", errors="replace")
    except OSError:
        return ""


def _open_vswitch() -> Found:
    program = shutil.which("ovs-vswitchd", path=f"{os.environ.get('PATH', '')}:/usr/sbin")
    if program is None:
        return Found(NOTE, _ABOUT, "there is no Open vSwitch, so no frames can move", _INSTALL)
    said = _said_by(program, "--version")
    found = re.search(r"\(Open vSwitch\) (\d+)\.(\d+)", said)
    if found is None:
        return Found(WARNING, _ABOUT, f"{program} does not say its version", _INSTALL)
    version = int(found.group(1)), int(found.group(2))
    text = f"Open vSwitch {_in_words(version)}, {program}"
    if version < _OLDEST:
        advice = f"get {_in_words(_OLDEST)} or later: simhostd was tried with no older one"
        return Found(WARNING, _ABOUT, f"{text}, is too old", advice)
    return Found(OK, _ABOUT, text)


def _in_words(version: Tuple[int, int]) -> str:
    return ".".join(str(number) for number in version)


def _said_by(*words: str) -> str:
    try:
        done = subprocess.run(
            words, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, timeout=_PATIENCE, check=False
        )
    except (OSError, subprocess.SubprocessError):
        return ""
    return done.stdout.decode("utf-8", "replace")


def _namespaces() -> Found:
    for user in _USERS:
        if _said_by("unshare", *user, "--net", "echo", "made"):
            how = "namespaces of users" if user else "root"
            return Found(OK, _ABOUT, f"network namespaces can be made, by {how}")
    return Found(
        NOTE,
        _ABOUT,
        "no network namespace can be made, so tests have no clients for frames",
        "be root, or have the system allow namespaces of users",
    )


def _status(state: Path) -> Optional[Dict[str, Any]]:
    """What the daemon of a state says of itself; None if there is none."""
    try:
        folder = os.open(str(state.resolve().parent), os.O_PATH | os.O_DIRECTORY)
        try:
            with socket.socket(socket.AF_UNIX) as line:
                line.settimeout(_PATIENCE)
                # The address of a socket has room for short names only.
                line.connect(f"/proc/self/fd/{folder}/{state.resolve().name}-simhostd")
                line.sendall(b'{"ask": "status"}\n')
                said = line.makefile().readline()
        finally:
            os.close(folder)
        status: Dict[str, Any] = json.loads(said)
        return status
    except (OSError, ValueError):
        return None


def _daemon(status: Dict[str, Any]) -> typing.Iterator[Found]:
    text = f"simhostd, process {status.get('process')}, moves them"
    if status.get("datapath") == "system":
        yield Found(
            WARNING,
            _ABOUT,
            f"{text} in the kernel, which is untested",
            "--datapath netdev has ovs-vswitchd move them",
        )
    else:
        yield Found(OK, _ABOUT, f"{text} in ovs-vswitchd")
        yield Found(
            NOTE,
            _ABOUT,
            "clients whose devices leave checksums to others get no TCP through it",
            "run ethtool --offload DEVICE tx off at each client",
        )
    if status.get("said"):
        yield Found(WARNING, _ABOUT, f"it says: {status['said']}", "simhostctl plane has more")
