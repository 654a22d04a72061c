"""Runs frames_without_end.py as ./dev runs tests, interrupts that, and writes as JSON what is left:
processes, devices, mounts, and sockets of whatever runs.

It wants network and mount namespaces of its own, so that what others do meanwhile is not seen, and
adopts what loses its parent, so that no process of the run can hide."""

import argparse
import ctypes
import json
import os
import signal
import subprocess
import sys
import time
from pathlib import Path
from typing import Dict, List

ROOT = Path(__file__).resolve().parents[2]
PR_SET_CHILD_SUBREAPER = 36
WORKERS = 2
PATIENCE = 30.0
FOLDER = Path("/run")
PLANTED = FOLDER / "planted"
# With what ./dev sets before it runs a suite.
RUN = f"""
set -eu
say() {{ :; }}
step() {{ started=$(date +%s); }}
python=/usr/bin/python3 folder={FOLDER} jobs={WORKERS} sanitizers= expression=
passed=0 failed=0 summary=
. ./chores/suites.sh
pytest Interrupted interrupted.xml '' --dist each --basetemp {FOLDER}/tests \\
  tests/simhostd/frames_without_end.py
"""


def children() -> Dict[int, str]:
    """Those that have not ended, with their command lines; of the others leave is taken."""
    try:
        while os.waitpid(-1, os.WNOHANG) != (0, 0):
            pass
    except ChildProcessError:
        return {}
    (task,) = Path("/proc/self/task").iterdir()
    found = (task / "children").read_text(encoding="ascii").split()
    return {int(one): Path(f"/proc/{one}/cmdline").read_text(encoding="utf-8") for one in found}


def standing() -> Dict[str, List[str]]:
    """What a run may leave beside processes."""
    links = subprocess.run(["ip", "-json", "link"], stdout=subprocess.PIPE, text=True, check=True)
    mounts = Path("/proc/self/mountinfo").read_text(encoding="utf-8").splitlines()
    return {
        "devices": sorted(link["ifname"] for link in json.loads(links.stdout)),
        "mounts": sorted(mount.split()[4] for mount in mounts),
        "sockets": sorted(str(file) for file in FOLDER.rglob("*") if file.is_socket()),
    }


def wait_for_frames(going: Path, run: "subprocess.Popen[bytes]") -> None:
    deadline = time.monotonic() + PATIENCE
    while len(list(going.iterdir())) < WORKERS:
        if run.poll() is not None or time.monotonic() > deadline:
            sys.exit("no frames go that could be interrupted")
        time.sleep(0.01)


def interrupt(run: "subprocess.Popen[bytes]", how: str) -> None:
    if how == "terminal":
        # It tells all that it sees.
        os.killpg(run.pid, signal.SIGINT)
    else:
        run.send_signal(signal.SIGTERM)


def left_running(planted: bool) -> List[str]:
    """Processes that do not end, which are ended then."""
    deadline = time.monotonic() + PATIENCE
    expected = {"sleep\0infinity\0"} if planted else set()
    while set(children().values()) - expected and time.monotonic() < deadline:
        time.sleep(0.01)
    left = children()
    while children():
        for process in children():
            os.kill(process, signal.SIGKILL)
    return [words.replace("\0", " ").strip() for words in left.values()]


def main() -> None:
    parser = argparse.ArgumentParser()
    parser.add_argument("how", choices=["terminal", "runner"])
    parser.add_argument("--plant", action="store_true")
    options = parser.parse_args()
    ctypes.CDLL(None).prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0)
    subprocess.run(["mount", "-t", "tmpfs", "run", str(FOLDER)], check=True)
    going = FOLDER / "going"
    going.mkdir()
    environment = {**os.environ, "IN_MID_FRAMES": str(going), "TMPDIR": str(FOLDER)}
    if options.plant:
        PLANTED.mkdir()
        environment["PLANTED"] = str(PLANTED)
    before = standing()
    # Standard output is for what is found.
    run = subprocess.Popen(
        ["sh", "-c", RUN], cwd=ROOT, env=environment, stdout=2, start_new_session=True
    )
    wait_for_frames(going, run)
    interrupt(run, options.how)
    run.wait()
    found = {"processes": left_running(options.plant)}
    after = standing()
    found.update({kind: sorted(set(before[kind]) ^ set(after[kind])) for kind in after})
    print(json.dumps(found))


if __name__ == "__main__":
    main()
