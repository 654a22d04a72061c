"""An Open vSwitch that no daemon starts: it is there before a daemon comes, and stays when that
goes."""

import os
import subprocess
from pathlib import Path
from typing import Dict

from simhost._namespaces import Namespace


class LastingOpenVSwitch:
    """Its two processes, which a namespace has, with their files in a folder that they make.

    One whose clock may stand ages what it learned when it is told to."""

    def __init__(self, namespace: Namespace, folder: Path, clock_may_stand: bool = False) -> None:
        self._namespace = namespace
        self._folder = folder
        self._options = ["--enable-dummy"] if clock_may_stand else []
        self._processes: Dict[str, "subprocess.Popen[str]"] = {}

    @property
    def where(self) -> str:
        """What a daemon is told of it."""
        return f"unix:{self._folder}/db.sock"

    def __enter__(self) -> "LastingOpenVSwitch":
        folder = self._folder
        folder.mkdir()
        schema = "/usr/share/openvswitch/vswitch.ovsschema"
        subprocess.run(["ovsdb-tool", "create", f"{folder}/conf.db", schema], check=True)
        self._start_database()
        self._start_switch()
        return self

    def start_anew(self, *programs: str) -> None:
        """Kills these of its two programs at once, and then starts them."""
        for program in programs:
            self._end(program)
        if "ovsdb-server" in programs:
            os.unlink(f"{self._folder}/db.sock")
            self._start_database()
        if "ovs-vswitchd" in programs:
            self._start_switch()

    def stop_clock(self) -> None:
        """Which goes on no more but by warp()."""
        self.ask("time/stop")

    def warp(self, seconds: int) -> None:
        """Lets so much time pass, and all that is due then happen."""
        self.ask("time/warp", str(seconds * 1000), str(max(1000, seconds * 50)))
        self.ask("revalidator/wait")

    def ask(self, *words: str) -> str:
        """What the switch says to a command of its own."""
        control = f"{self._folder}/ovs-vswitchd.ctl"
        return self._namespace.run("ovs-appctl", "-t", control, *words)

    def _start_database(self) -> None:
        socket = f"{self._folder}/db.sock"
        self._start("ovsdb-server", f"{self._folder}/conf.db", f"--remote=punix:{socket}")
        while not os.path.exists(socket):
            assert self._processes["ovsdb-server"].poll() is None

    def _start_switch(self) -> None:
        self._start("ovs-vswitchd", self.where, "--disable-system", *self._options)

    def _start(self, program: str, *words: str) -> None:
        folder = str(self._folder)
        options = [f"--unixctl={folder}/{program}.ctl", f"--log-file={folder}/{program}.log"]
        environment = {**os.environ, "OVS_RUNDIR": folder}
        self._processes[program] = self._namespace.start(
            program, "-vconsole:off", "-vsyslog:off", *words, *options, env=environment
        )

    def _end(self, program: str) -> None:
        process = self._processes.pop(program)
        process.kill()
        process.communicate()

    def __exit__(self, *_: object) -> None:
        for program in reversed(list(self._processes)):
            self._end(program)
