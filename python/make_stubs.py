"""Writes the type stubs of `_libvswitch` and `libvswitch`: make_stubs.py TREE FOLDER"""

import sys
from pathlib import Path

import cell_stub
import class_stubs
import definitions
import flat_stub
from python_types import PythonTypes


def main() -> None:
    tree, folder = sys.argv[1:]
    known = definitions.read(Path(tree))
    types = PythonTypes(known, "_flat.")
    written = {
        "libvswitch/__init__.pyi": class_stubs.package(known),
        "libvswitch/_calls.pyi": class_stubs.calls(types),
        "libvswitch/_classes.pyi": class_stubs.classes(types),
        "libvswitch/_constants.pyi": class_stubs.constants_of(known),
        "libvswitch/cells.pyi": cell_stub.cells(types),
    }
    # Last: it has the classes of all pointers that the others name.
    written["_libvswitch.pyi"] = flat_stub.flat(known, types.pointers)
    for name, text in written.items():
        Path(folder, name).write_text(text, encoding="utf-8")


if __name__ == "__main__":
    main()
