"""A simulated host in a file, through simhostctl."""

import os
import subprocess
from pathlib import Path
from typing import Dict, List, Optional

from simhost import _loaded
from simhost._control import EMPTY, Control, HostRefused


class InFileControl(Control):
    """The host whose state is in a file; any number of processes use it at the same time."""

    def __init__(self, state_file: Path) -> None:
        self.environment = {
            name: value for name, value in os.environ.items() if not name.startswith("SIMHOST_")
        }
        self.environment["SIMHOST_STATE"] = str(state_file)
        self._simhostctl = _loaded.program("simhostctl", package="libvswitch-simhost")

    def reset(self, *, empty: bool) -> None:
        more = {"SIMHOST_SCENARIO": str(EMPTY)} if empty else {}
        self._run(["reset"], {**self.environment, **more})

    def restart(self) -> None:
        self._do("restart")

    def apply(self, document: str) -> None:
        try:
            self._run(["apply", "-"], self.environment, given=document)
        except HostRefused as refusal:
            # simhostctl puts the document's name in front, which is - here.
            raise HostRefused(str(refusal).replace("-: ", "", 1)) from None

    def describe(self) -> str:
        return self._do("show", "--json")

    def set_link(self, uplink: str, up: bool) -> None:
        self._do("link", "--", uplink, "up" if up else "down")

    def learn(self, switch: str, mac: str, port: Optional[str], vlan: int, vni: int) -> None:
        options = [*_option("port", port), f"--vlan={vlan}", f"--vni={vni}"]
        self._do("learn", *options, "--", switch, mac)

    def set_counter(
        self, switch: str, name: str, value: int, port: Optional[str], session: Optional[str]
    ) -> None:
        options = [*_option("port", port), *_option("session", session)]
        self._do("counter", *options, "--", switch, name, str(value))

    def clear_faults(self, call: Optional[str]) -> None:
        self._do("fault", "clear", *([] if call is None else ["--", call]))

    def clock_now(self) -> int:
        seconds, thousandths = self._do("clock", "show").split(".")
        return int(seconds) * 1000 + int(thousandths)

    def clock_stop(self) -> None:
        self._do("clock", "stop")

    def clock_run(self) -> None:
        self._do("clock", "run")

    def clock_step(self, milliseconds: int) -> None:
        self._do("clock", "step", "--", _seconds(milliseconds))

    def clock_set(self, milliseconds: int) -> None:
        self._do("clock", "set", "--", _seconds(milliseconds))

    def _do(self, *words: str) -> str:
        return self._run(list(words), self.environment)

    def _run(self, words: List[str], environment: Dict[str, str], given: str = "") -> str:
        done = subprocess.run(
            [self._simhostctl, *words],
            env=environment,
            input=given,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            encoding="utf-8",
        )
        if done.returncode != 0:
            why = done.stderr.replace("simhostctl: ", "", 1)
            raise HostRefused(why.replace("Run with --help for more information.", "").strip())
        return done.stdout


def _option(name: str, value: Optional[str]) -> List[str]:
    return [] if value is None else [f"--{name}={value}"]


def _seconds(milliseconds: int) -> str:
    return f"{milliseconds / 1000:.3f}"
