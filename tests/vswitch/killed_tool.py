"""A tool that applies a document, and is killed when it has made so many changes.

usage: killed_tool.py DOCUMENT.JSON CHANGES

Without such an end it prints how many calls that change the host it made.
"""

import json
import os
import signal
import sys
from pathlib import Path
from typing import Any, Callable

import _libvswitch
from vswitch import Host, exits

CHANGES = (
    "Set",
    "Add",
    "Remove",
    "Clear",
    "Create",
    "Destroy",
    "Associate",
    "Dissociate",
    "Append",
)


class Count:
    def __init__(self, most: int) -> None:
        self.most = most
        self.made = 0

    def counted(self, call: Callable[..., Any]) -> Callable[..., Any]:
        def change(*arguments: Any) -> Any:
            if self.made == self.most:
                os.kill(os.getpid(), signal.SIGKILL)
            self.made += 1
            return call(*arguments)

        return change


def main() -> None:
    document, most = sys.argv[1:]
    count = Count(int(most))
    for name, call in list(vars(_libvswitch).items()):
        if name.startswith(("VSDVS_", "VSQEX_", "DVSQEX_")) and any(one in name for one in CHANGES):
            setattr(_libvswitch, name, count.counted(call))
    Host(simulated=True).plan(json.loads(Path(document).read_text())).apply()
    print(count.made)


if __name__ == "__main__":
    with exits("killed_tool"):
        main()
