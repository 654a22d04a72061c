"""Writes the families of constants as enumerations: make_enums.py TREE FOLDER"""

import sys
from pathlib import Path
from typing import List

import definitions
import families
from definitions import Constant, Definitions
from families import Family
from stub_text import doc

_ENUMS_HEAD = '''"""Families of the host's constants, each a type of its own, with words.

The words are those of scenario documents. A number that there is no constant for is a member, too.
Written by python/make_enums.py.
"""

from typing import TYPE_CHECKING

import _libvswitch as _flat
from libvswitch._words import Word, Words

if TYPE_CHECKING:
    from libvswitch._status import Status as Status
'''

_ENUMS_TAIL = """

# A type checker that saw this would let every name pass.
if not TYPE_CHECKING:

    def __getattr__(name: str) -> object:
        # There are so many statuses that their members are made when somebody wants them.
        if name != "Status":
            raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
        from libvswitch._status import Status

        globals()[name] = Status
        return Status
"""

_STATUS_HEAD = '''"""Statuses. Written by python/make_enums.py."""

import _libvswitch as _flat
from libvswitch._words import Word


class Status(Word):
    """Why the host refused, or QEX_OK."""

    def __str__(self) -> str:
        return f"QEX_{self.name}"

'''


def enums(known: Definitions) -> str:
    families.check(known)
    names = [one.name for one in families.FAMILIES] + ["Status"]
    listed = "".join(f'    "{name}",\n' for name in sorted(names))
    classes = "".join(_class(known, one) for one in families.FAMILIES)
    return f"{_ENUMS_HEAD}\n__all__ = [\n{listed}]\n{classes}{_ENUMS_TAIL}"


def status(known: Definitions) -> str:
    lines = [_member(one.name[len("QEX_") :], one) for one in families.statuses(known)]
    return _STATUS_HEAD + "".join(lines)


def _class(known: Definitions, family: Family) -> str:
    base = "Words" if family.is_set else "Word"
    lines = "".join(_member(name, one) for name, one in families.members(known, family))
    return f"\n\nclass {family.name}({base}):\n{doc(family.doc, '    ')}\n{lines}"


def _member(name: str, constant: Constant) -> str:
    return f"    {name} = _flat.{constant.name}\n"


def main(arguments: List[str]) -> None:
    tree, folder = arguments
    known = definitions.read(Path(tree))
    for name, text in (("enums", enums(known)), ("_status", status(known))):
        Path(folder, f"{name}.py").write_text(text, encoding="ascii")


if __name__ == "__main__":
    main(sys.argv[1:])
