"""`simhostctl lab`: hosts whose frames are real, as many as a document says, with what is between
them and their clients.

A lab is a process, and network namespaces that last as long as it does; its folder has the states
of the hosts and what their daemons said."""

import argparse
import json
import os
import select
import shutil
import signal
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from types import FrameType
from typing import Any, Dict, List, NoReturn, Optional

from simhost._lab import RunningLab
from simhost._lab_document import LabError, LabSpec, read

_READY = "ready"
_PATIENCE = 30.0


def _labs() -> Path:
    """Where the folders of this user's labs are."""
    place = os.environ.get("XDG_RUNTIME_DIR") or tempfile.gettempdir()
    folder = Path(place) / f"simhost-labs-{os.geteuid()}"
    folder.mkdir(mode=0o700, exist_ok=True)
    if folder.is_symlink() or folder.stat().st_uid != os.geteuid():
        raise LabError(f"{folder} belongs to another user")
    return folder


class _Lab:
    """One that is there, as its folder tells."""

    def __init__(self, folder: Path) -> None:
        self.folder = folder
        self.name = folder.name

    def keeper(self) -> Optional[int]:
        """The process that it lasts as long as; none if that has ended."""
        try:
            pid = int((self.folder / "pid").read_text(encoding="ascii"))
            words = Path(f"/proc/{pid}/cmdline").read_bytes().split(b"\0")
        except (OSError, ValueError):
            return None
        return pid if os.fsencode(str(self.folder)) in words else None

    def machines(self) -> List[Dict[str, Any]]:
        try:
            said = json.loads((self.folder / "lab.json").read_text(encoding="utf-8"))
        except FileNotFoundError:
            return []
        machines: List[Dict[str, Any]] = said["machines"]
        return machines

    def state(self) -> str:
        if self.keeper() is None:
            return "dead"
        return "up" if self.machines() else "coming up"

    def down(self) -> None:
        """Ends it with all that is its."""
        pid = self.keeper()
        if pid is not None:
            os.kill(pid, signal.SIGTERM)
            deadline = time.monotonic() + _PATIENCE
            while self.keeper() is not None:
                if time.monotonic() > deadline:
                    os.kill(pid, signal.SIGKILL)
                time.sleep(0.02)
        shutil.rmtree(self.folder, ignore_errors=True)


def _find(name: str) -> _Lab:
    lab = _Lab(_labs() / name)
    if not name or "/" in name or not lab.folder.is_dir():
        raise LabError(f"there is no lab '{name}'")
    return lab


def _all() -> List[_Lab]:
    return [_Lab(folder) for folder in sorted(_labs().iterdir())]


def _up(words: argparse.Namespace) -> int:
    spec = read(Path(words.file))
    folder = _labs() / spec.name
    try:
        folder.mkdir(mode=0o700)
    except FileExistsError:
        raise LabError(
            f"there is a lab '{spec.name}' already: simhostctl lab down {spec.name}"
        ) from None
    lab = _Lab(folder)
    try:
        _start(lab, Path(words.file))
    except BaseException:
        lab.down()
        raise
    print(f"lab {spec.name} is up")
    return 0


def _start(lab: _Lab, file: Path) -> None:
    """Returns when it is up. What ends this ends it, too, until then."""
    log = lab.folder / "lab.log"
    with open(log, "w", encoding="utf-8") as errors:
        keeper = subprocess.Popen(
            [sys.executable, "-m", "simhost.lab", "keep", str(lab.folder), str(file.resolve())],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE,
            stderr=errors,
            text=True,
            start_new_session=True,
        )
    (lab.folder / "pid").write_text(str(keeper.pid), encoding="ascii")
    assert keeper.stdout is not None
    for line in keeper.stdout:
        if line.strip() == _READY:
            return
        print(line, end="", flush=True)
    keeper.wait()
    said = log.read_text(encoding="utf-8").strip()
    raise LabError(said or "the lab ended before it was up")


def _keep(words: argparse.Namespace) -> int:
    """The process of a lab."""
    spec: LabSpec = read(Path(words.file))
    lab = RunningLab(spec, Path(words.folder), lambda line: print(line, flush=True))
    awake, wake = os.pipe()
    is_up = False

    def end(number: int, frame: Optional[FrameType]) -> None:
        del number, frame
        os.write(wake, b"\n")
        if not is_up:
            raise KeyboardInterrupt

    signal.signal(signal.SIGTERM, end)
    try:
        lab.up()
        is_up = True
        print(_READY, flush=True)
        with open(os.devnull, "w", encoding="ascii") as nowhere:
            os.dup2(nowhere.fileno(), sys.stdout.fileno())
        select.select([awake], [], [])
    except KeyboardInterrupt:
        pass
    except LabError as error:
        # For the one who waits for it, who says whose word it is.
        sys.stderr.write(str(error))
        return 1
    finally:
        signal.signal(signal.SIGTERM, signal.SIG_IGN)
        lab.down()
    return 0


def _down(words: argparse.Namespace) -> int:
    for lab in _all() if words.all else [_find(words.name)]:
        lab.down()
        print(f"lab {lab.name} is down")
    return 0


def _list(words: argparse.Namespace) -> int:
    del words
    for lab in _all():
        machines = lab.machines()
        kinds = [one["kind"] for one in machines]
        counts = [
            f"{kinds.count(kind)} {kind}{'' if kinds.count(kind) == 1 else 's'}"
            for kind in ("host", "network", "router", "client")
            if kind in kinds
        ]
        print(f"{lab.name}  {lab.state()}" + (f"  {', '.join(counts)}" if counts else ""))
        for machine in machines:
            print(f"  {machine['kind']} {machine['name']}")
    return 0


def _exec(words: argparse.Namespace) -> NoReturn:
    name, _, wanted = words.machine.rpartition("/")
    labs = [_find(name)] if name else _all()
    found = [
        machine
        for lab in labs
        if lab.keeper() is not None
        for machine in lab.machines()
        if machine["name"] == wanted
    ]
    if not found:
        raise LabError(f"no lab has a machine '{words.machine}'")
    if len(found) > 1:
        raise LabError(f"more than one lab has a machine '{wanted}': say LAB/{wanted}")
    (machine,) = found
    environment = dict(os.environ)
    if "state" in machine:
        environment["SIMHOST_STATE"] = machine["state"]
    command = [*machine["words"], *(words.command or [os.environ.get("SHELL", "/bin/sh")])]
    os.execvpe(command[0], command, environment)


def _parser() -> argparse.ArgumentParser:
    parser = argparse.ArgumentParser(
        prog="simhostctl lab",
        description="Hosts whose frames are real, with networks, routers and clients, from one"
        " document. Takes root, or namespaces of users.",
    )
    commands = parser.add_subparsers(metavar="COMMAND", required=True)

    up = commands.add_parser("up", help="start a lab, and return when it is up")
    up.add_argument("file", metavar="FILE", help="the document")
    up.set_defaults(run=_up)

    down = commands.add_parser("down", help="end a lab, and leave nothing of it")
    which = down.add_mutually_exclusive_group(required=True)
    which.add_argument("name", metavar="LAB", nargs="?", help="its name")
    which.add_argument("--all", action="store_true", help="all labs of this user")
    down.set_defaults(run=_down)

    listed = commands.add_parser("list", help="list labs and their machines")
    listed.set_defaults(run=_list)

    run = commands.add_parser("exec", help="run a command on a machine of a lab")
    run.add_argument("machine", metavar="[LAB/]MACHINE", help="a host, a client, ...")
    run.add_argument("command", nargs=argparse.REMAINDER, metavar="COMMAND", help="a shell if none")
    run.set_defaults(run=_exec)

    # What `up` starts; no command for people.
    keep = commands.add_parser("keep")
    keep.add_argument("folder")
    keep.add_argument("file")
    keep.set_defaults(run=_keep)
    return parser


def main() -> int:
    words = _parser().parse_args()
    try:
        status: int = words.run(words)
        return status
    except LabError as error:
        print(f"simhostctl lab: {error}", file=sys.stderr)
        return 1
    except KeyboardInterrupt:
        return 130


if __name__ == "__main__":
    sys.exit(main())
