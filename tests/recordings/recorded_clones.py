#!/usr/bin/env python3
"""Records what hosts tell of themselves that chance describes, and replays it on their clones.

    recorded_clones.py [--seconds N] [--seed N]

Prints what differs, and at the end how many hosts there were.
"""

import json
import sys
import tempfile
from pathlib import Path
from typing import Any, Dict, List, Optional, Tuple

sys.path.append(str(Path(__file__).parents[1] / "vswitch"))

import drawn_documents  # noqa: E402  (after the path is set)
import seeds  # noqa: E402
import simhost  # noqa: E402
from hypothesis import given, seed  # noqa: E402
from hypothesis import strategies as st  # noqa: E402
from recordings import record_made  # noqa: E402
from saying import say  # noqa: E402
from steering import differences, replayed  # noqa: E402
from vswitch import Host  # noqa: E402


Documents = st.SearchStrategy[Dict[str, Any]]


def make(number: int, count: int, documents: Optional[Documents] = None) -> None:
    """Has so many hosts told of, and before each says what its clone is to be."""

    @seed(number)
    @seeds.options(count, shrink=False)
    @given(documents or drawn_documents.documents())
    def each(document: Dict[str, Any]) -> None:
        try:
            host = drawn_documents.host_of(document)
        except simhost.HostRefused:
            return
        # Which uplinks a switch has that does not run, no call tells.
        if not all(one["running"] for one in host.describe()["switches"]):
            return
        objects = Host(simulated=True)
        # The snapshot is made of calls, too, which come before it.
        say("begin", None)
        clone = {**json.loads(json.dumps(objects.snapshot())), "clock": drawn_documents.STOPPED}
        say("begin", clone)
        objects.snapshot()

    each()


def begun(document: Optional[Dict[str, Any]] = None) -> simhost.Host:
    return simhost.Host(document, Path())


def run(number: int, count: int = 20) -> Tuple[int, List[str]]:
    """Records so many hosts and replays them on their clones; how many there were, and what
    differed."""
    with tempfile.TemporaryDirectory() as folder:
        trace = Path(folder, "trace.jsonl")
        record_made("recorded_clones.make", number, count, trace)
        reports = list(replayed(trace, begun))[2::2]
    return len(reports), [one for report in reports for one in differences(report)]


if __name__ == "__main__":
    sys.exit(seeds.main(run))
