"""A simulated host of a test's own, and the ways to it."""

import json
import os
import subprocess
import sys
from pathlib import Path
from typing import Any, Dict, List, Optional

SIMHOST = Path(os.environ["BUILD_DIR"]) / "simhost"

PRELUDE = """
import ctypes
import os
import _libvswitch as vs
simhost = ctypes.CDLL(os.path.join(os.environ["BUILD_DIR"], "simhost", "libsimhost.so"))
"""


class Host:
    """A host in a state file, reached through simhostctl and through processes with the module."""

    def __init__(self, folder: Path) -> None:
        self.environment: Dict[str, str] = {
            name: value for name, value in os.environ.items() if not name.startswith("SIMHOST_")
        }
        self.environment["SIMHOST_STATE"] = str(folder / "host.db")

    def run(self, *words: str, given: Optional[str] = None) -> "subprocess.CompletedProcess[str]":
        """simhostctl as it ends, well or not."""
        return subprocess.run(
            [str(SIMHOST / "simhostctl"), *words],
            env=self.environment,
            input=given,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            encoding="utf-8",
            check=False,
        )

    def ctl(self, *words: str, given: Optional[str] = None) -> str:
        """What simhostctl writes; it must end well."""
        done = self.run(*words, given=given)
        assert (done.returncode, done.stderr) == (0, ""), words
        return done.stdout

    def refusal(self, *words: str, given: Optional[str] = None) -> str:
        """What simhostctl says against the words; it must say so."""
        done = self.run(*words, given=given)
        assert done.returncode == 1 and done.stdout == "", words
        return done.stderr

    def complaint(self, *words: str) -> str:
        """What simhostctl finds wrong with the words themselves; it must find something."""
        done = self.run(*words)
        assert (done.returncode, done.stdout) == (2, ""), words
        found, more = done.stderr.splitlines()
        assert more == "Run with --help for more information."
        assert found.startswith("simhostctl: ")
        return found[len("simhostctl: ") :]

    def apply(self, document: Dict[str, Any]) -> None:
        self.ctl("apply", "-", given=json.dumps(document))

    def described(self) -> Any:
        return json.loads(self.ctl("show", "--json"))

    def python(self, code: str) -> str:
        """What a process with the module writes; it must end well."""
        done = subprocess.run(
            [sys.executable, "-c", PRELUDE + code],
            env=self.environment,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            encoding="utf-8",
            check=False,
        )
        assert (done.returncode, done.stderr) == (0, ""), done.stderr
        return done.stdout

    def lines(self, code: str) -> List[str]:
        return self.python(code).splitlines()
