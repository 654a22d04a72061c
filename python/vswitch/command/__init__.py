"""The command `vswitch`: the objects for people, on a terminal and in scripts.

Each file has the commands of one purpose; `program` puts them together and says how they end. Only
this package needs more than the standard library: typer, rich and PyYAML.
"""

import sys

from vswitch.exits import INTERRUPTED

__all__ = ["main"]


def main() -> None:
    """Runs the program with the words of its command line, and ends it."""
    try:
        from vswitch.command import program
    except ModuleNotFoundError as error:
        sys.exit(f"vswitch: {error}; pip install 'libvswitch[command]' brings what is missing")
    except KeyboardInterrupt:
        sys.exit(INTERRUPTED)
    program.main(sys.argv[1:])
