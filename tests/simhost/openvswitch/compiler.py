"""What Open vSwitch would be told of switches, as text."""

import json
import os
import subprocess
from pathlib import Path
from typing import Any, Dict, List, Mapping, Optional, Sequence

COMPILER = Path(os.environ["BUILD_DIR"], "tests", "simhost", "compile_switches")


class Compiler:
    """The program that compiles a switch that a document says."""

    def __init__(self) -> None:
        self._process = subprocess.Popen(
            [str(COMPILER)], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True
        )

    def close(self) -> None:
        self._process.communicate()

    def answer(
        self,
        switch: Mapping[str, Any],
        clients: Sequence[Mapping[str, Any]],
        host: Optional[Mapping[str, Any]] = None,
        multicast: Optional[Mapping[str, Any]] = None,
        then: Sequence[Mapping[str, Any]] = (),
        heard: Optional[Mapping[str, Any]] = None,
    ) -> Dict[str, Any]:
        """What it says of a switch whose ports of those names have devices, and all uplinks, and
        whose groups have those members or what was heard of members, on a host that other documents
        are applied to then."""
        uplinks: List[str] = list(switch.get("uplinks", []))
        document = {
            "uplinks": [{"name": uplink} for uplink in uplinks],
            "switches": [{"alias": "s", **switch}],
            **(host or {}),
        }
        question = {
            "host": [document, *then],
            "uplinks": uplinks,
            "clients": list(clients),
        }
        if multicast is not None:
            question["multicast"] = multicast
        if heard is not None:
            question["heard"] = heard
        assert self._process.stdin and self._process.stdout
        self._process.stdin.write(json.dumps(question) + "\n")
        self._process.stdin.flush()
        answer: Dict[str, Any] = json.loads(self._process.stdout.readline())
        return answer

    def compile(
        self,
        switch: Mapping[str, Any],
        clients: Sequence[Mapping[str, Any]],
        multicast: Optional[Mapping[str, Any]] = None,
        then: Sequence[Mapping[str, Any]] = (),
        host: Optional[Mapping[str, Any]] = None,
        heard: Optional[Mapping[str, Any]] = None,
    ) -> Dict[str, Any]:
        """Likewise of one that it compiles."""
        answer = self.answer(switch, clients, host, multicast, then, heard)
        assert "flows" in answer, answer
        return answer
