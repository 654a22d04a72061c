"""Sessions in a document: blocks of ```console whose commands the tests can run.

A command begins with `$ `; what follows it, up to the next command, is what it prints. Of commands,
those run that the simulated host needs nothing else for: the programs of examples/, and simhostctl.
"""

import re
import shlex
import sys
from typing import Iterator, List, NamedTuple, Optional

from programs import EXAMPLES


class Shown(NamedTuple):
    """A command of a document, and what it prints there."""

    command: str
    output: str

    def arguments(self, simhostctl: str) -> Optional[List[str]]:
        """The command as it can be run; None for one that cannot."""
        program, *words = shlex.split(self.command)
        if program == "simhostctl":
            return [simhostctl, *words]
        if program.startswith("./examples/"):
            return [sys.executable, str(EXAMPLES.parent / program), *words]
        return None


def sessions(document: str) -> Iterator[List[Shown]]:
    """The sessions of a document, each a list of its commands."""
    for block in re.findall(r"^```console\n(.*?)^```$", document, re.M | re.S):
        commands = re.findall(r"^\$ (.*)\n((?:(?!\$ ).*\n)*)", block, re.M)
        yield [Shown(command, output) for command, output in commands]
