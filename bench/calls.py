"""Times the figures of all peers: fresh processes, and in each of them rounds that take turns."""

import json
import os
import subprocess
import sys
from contextlib import ExitStack
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional

from figures import FIGURES, FORMS, PEERS
from worker import UNROLLED

HERE = Path(__file__).resolve().parent


class PeerMissing(Exception):
    """A peer cannot be measured, so nothing can be compared with it."""


class Worker:
    """A process that measures one peer when it is told to."""

    def __init__(self, peer: str, build: Path, core: int, seed: int) -> None:
        self.peer = peer
        host = build / "bench" / "null_host"
        self._process = subprocess.Popen(
            [sys.executable, "-Es", str(HERE / "worker.py"), peer, str(core), str(seed)]
            + list(map(str, folders_of(peer, build))),
            stdin=subprocess.PIPE,
            stdout=subprocess.PIPE,
            text=True,
            env={**os.environ, "LD_LIBRARY_PATH": str(host)},
        )
        loaded = self._answer()
        if {Path(path).parent for path in loaded.values()} != {host.resolve()}:
            raise PeerMissing(f"{peer} runs on {loaded}, which is not the null host")

    def ask(self, form: str, figure: str, loops: Optional[int] = None) -> Any:
        """Return the peer's result for a figure; with loops, the nanoseconds it takes."""
        request: Dict[str, Any] = {"form": form, "figure": figure}
        if loops is not None:
            request["loops"] = loops
        assert self._process.stdin is not None
        self._process.stdin.write(json.dumps(request) + "\n")
        self._process.stdin.flush()
        return self._answer()

    def _answer(self) -> Any:
        assert self._process.stdout is not None
        line = self._process.stdout.readline()
        if not line:
            raise PeerMissing(f"{self.peer}: its process ended, status {self._process.wait()}")
        return json.loads(line)

    def __enter__(self) -> "Worker":
        return self

    def __exit__(self, *unused: object) -> None:
        assert self._process.stdin is not None and self._process.stdout is not None
        self._process.stdin.close()
        self._process.wait()
        self._process.stdout.close()


def folders_of(peer: str, build: Path) -> List[Path]:
    """Return where the modules of a peer are."""
    if peer in ("ours", "classes"):
        return [build / "python"]
    if peer == "twin":
        return [build / "bench" / "twin"]
    return [build / "bench" / "peers", HERE / "peers" / peer]


Times = Dict[str, Dict[str, Dict[str, List[float]]]]
"""For each form, figure and peer, the nanoseconds of one evaluation in each of the processes."""


def measure(
    build: Path,
    core: int,
    *,
    processes: int,
    rounds: int,
    milliseconds: float,
    progress: Callable[[str], None],
) -> Times:
    """Time every figure of every peer.

    A process of a peer counts with the best of its rounds: nothing but the figure itself makes a
    round faster. A round measures one figure of all peers, one right after the other, starting with
    another peer each time, and each for about so many milliseconds.
    """
    times: Times = {
        form: {figure: {peer: [] for peer in peers} for figure in FIGURES}
        for form, peers in FORMS.items()
    }
    for process in range(processes):
        with ExitStack() as running:
            workers = {
                peer: running.enter_context(Worker(peer, build, core, process)) for peer in PEERS
            }
            for form, peers in FORMS.items():
                for number, (figure, title) in enumerate(FIGURES.items(), start=1):
                    progress(
                        f"process {process + 1} of {processes}, {form},"
                        f" figure {number} of {len(FIGURES)}: {title}"
                    )
                    loops = {
                        peer: _loops(workers[peer], form, figure, milliseconds) for peer in peers
                    }
                    best = dict.fromkeys(peers, float("inf"))
                    for turn in range(rounds):
                        first = (turn + process) % len(peers)
                        for peer in peers[first:] + peers[:first]:
                            taken = workers[peer].ask(form, figure, loops[peer])
                            best[peer] = min(best[peer], taken)
                    for peer, taken in best.items():
                        times[form][figure][peer].append(taken)
    return times


def _loops(worker: Worker, form: str, figure: str, milliseconds: float) -> int:
    """So many loops that a measurement takes about so long; the interpreter is warm afterwards."""
    worker.ask(form, figure, 20)
    taken: float = max(worker.ask(form, figure, 40), 1.0)
    return max(1, round(milliseconds * 1e6 / taken / UNROLLED))
