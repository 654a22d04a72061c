"""The command `vswitch`: the objects for people, on a terminal and in scripts.

Each file has the commands of one purpose; `program` puts them together and says how they end. Only
this package needs more than the standard library: typer, rich and PyYAML.
"""

import os
import shlex
import sys
from typing import List

__all__ = ["main"]

_INTERRUPTED = 130
# Before them there may be others with values of their own.
_FABRIC = "--fabric"
_WITH_VALUE = ("-p", "--private-key", "-c", "--certificate", "-C", "--ca-cert")
_DOCTOR = "python3 -m libvswitch.doctor says what to do"


def main() -> None:
    """Runs the program with the words of its command line, and ends it."""
    try:
        if sys.argv[1:2] == ["play"]:
            # No host is needed, and the one that there may be is not asked.
            from vswitch._front import stand_in_front

            stand_in_front({})
        if _is_of_fabric(_asked()):
            from vswitch.command.fabric import program as of_fabric

            of_fabric.main(sys.argv[1:])
            return
        from vswitch.command import program
    except ModuleNotFoundError as error:
        if error.name == "_libvswitch":
            sys.exit(f"vswitch: {error}: {_DOCTOR}")
        if (error.name or "").partition(".")[0] == "ovs":
            sys.exit(f"vswitch: {error}; --fabric takes Debian's python3-openvswitch")
        sys.exit(f"vswitch: {error}; pip install 'libvswitch[command]' brings what is missing")
    except (ImportError, OSError) as error:
        sys.exit(f"vswitch: {error}: {_DOCTOR}")
    except KeyboardInterrupt:
        sys.exit(_INTERRUPTED)
    program.main(sys.argv[1:])


def _asked() -> List[str]:
    """The words of the command line, of which a shell that completes them has its own."""
    from vswitch.command.shells import VARIABLE

    line = os.environ.get("COMP_WORDS", "") if VARIABLE in os.environ else ""
    try:
        return shlex.split(line)[1:] if line else sys.argv[1:]
    except ValueError:
        return line.split()[1:]


def _is_of_fabric(words: List[str]) -> bool:
    """Whether the switches that many hosts share are meant, and no host is needed."""
    left = iter(words)
    for word in left:
        if word.partition("=")[0] == _FABRIC:
            return True
        if word in _WITH_VALUE:
            next(left, None)
        elif not word.startswith("-"):
            return False
    return False
