"""Writes libvswitch.checked and the values that it returns: make_checked.py TREE FOLDER"""

import sys
from pathlib import Path
from typing import List

import call_model
import checked_calls
import checked_values
import definitions
import families


def main(arguments: List[str]) -> None:
    tree, folder = arguments
    known = definitions.read(Path(tree))
    families.check(known)
    written = {
        "values.py": checked_values.module(known),
        "checked.py": checked_calls.module(known, call_model.read(known)),
    }
    for name, text in written.items():
        Path(folder, name).write_text(text, encoding="utf-8")


if __name__ == "__main__":
    main(sys.argv[1:])
