"""Writes the constants of libvswitch: make_constants.py TREE FILE"""

import sys
from pathlib import Path

import definitions
from definitions import Definitions


def constants(known: Definitions) -> str:
    listed = "".join(f"    {one.name},\n" for one in known.constants)
    return (
        '"""The constants of the host. Written by python/make_constants.py."""\n\n'
        f"from _libvswitch import (\n{listed})\n"
    )


def main() -> None:
    tree, written = sys.argv[1:]
    Path(written).write_text(constants(definitions.read(Path(tree))), encoding="ascii")


if __name__ == "__main__":
    main()
