"""The command `vswitch`: the objects for people, on a terminal and in scripts.

Each file has the commands of one purpose; `program` puts them together and says how they end. Only
this package needs more than the standard library: typer, rich and PyYAML.
"""

import sys

__all__ = ["main"]

_INTERRUPTED = 130
_DOCTOR = "python3 -m libvswitch.doctor says what to do"


def main() -> None:
    """Runs the program with the words of its command line, and ends it."""
    try:
        if sys.argv[1:2] == ["play"]:
            # No host is needed, and the one that there may be is not asked.
            from vswitch._front import stand_in_front

            stand_in_front({})
        from vswitch.command import program
    except ModuleNotFoundError as error:
        if error.name == "_libvswitch":
            sys.exit(f"vswitch: {error}: {_DOCTOR}")
        sys.exit(f"vswitch: {error}; pip install 'libvswitch[command]' brings what is missing")
    except (ImportError, OSError) as error:
        sys.exit(f"vswitch: {error}: {_DOCTOR}")
    except KeyboardInterrupt:
        sys.exit(_INTERRUPTED)
    program.main(sys.argv[1:])
