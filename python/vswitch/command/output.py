"""What commands write: tables and trees for people, JSON for programs.

On a terminal there are colours and the width of the window; elsewhere neither, so that a line is a
line for the next program. Names come from a host, so what would move a terminal's cursor is shown,
not sent.
"""

import contextlib
import io
import json
import sys
from typing import Any, Callable, Iterable, Iterator, List, Mapping, Sequence, Tuple

from rich import box
from rich.console import Console, RenderableType
from rich.table import Table
from rich.text import Text
from rich.tree import Tree

from libvswitch.errors import NotRestored
from vswitch.words import printable

__all__ = [
    "Branch",
    "after_change",
    "line",
    "progress",
    "properties",
    "table",
    "tree",
    "write_json",
    "write_json_line",
]

Branch = Tuple[str, Sequence[Any]]
"""A line of a tree, and the branches below it."""


def properties(held: Mapping[str, Any]) -> List[Branch]:
    """Those that are told byte for byte."""
    return [(f"{key}: {one['type']} {one['hex']}", ()) for key, one in held.items()]


# Wide enough that nothing is wrapped or cut.
_NO_END = 100_000


def write_json(value: object) -> None:
    print(json.dumps(value, indent=2))


def write_json_line(value: object) -> None:
    """One of a stream, which its reader gets at once."""
    print(json.dumps(value), flush=True)


def line(given: object) -> None:
    """One of a stream, for people."""
    print(printable(given), flush=True)


def table(heads: Sequence[str], rows: Iterable[Sequence[object]]) -> None:
    """A table; numbers are at the right of their column."""
    is_terminal = sys.stdout.isatty()
    held = [list(row) for row in rows]
    made = Table(box=box.SIMPLE_HEAD if is_terminal else None, pad_edge=is_terminal)
    for at, head in enumerate(heads):
        are_numbers = bool(held) and all(type(row[at]) is int for row in held)
        made.add_column(head.upper(), justify="right" if are_numbers else "left", overflow="fold")
    for row in held:
        made.add_row(*(Text(printable(cell)) for cell in row))
    _render(made)


def tree(root: str, branches: Sequence[Branch]) -> None:
    made = Tree(Text(printable(root), "bold"))
    _grow(made, branches)
    _render(made)


def _grow(parent: Tree, branches: Sequence[Branch]) -> None:
    for label, below in branches:
        _grow(parent.add(_label(label)), below)


def _label(words: str) -> Text:
    """A line of a tree; what stands before a colon is the name of what follows."""
    name, colon, value = printable(words).partition(": ")
    return Text.assemble((name, "bold" if not colon else "cyan"), colon, value)


@contextlib.contextmanager
def progress(what: str) -> Iterator[Callable[[str], None]]:
    """A line on a terminal while something takes long; it goes when that is over."""
    if not sys.stderr.isatty():
        yield lambda how_far: None
        return
    console = Console(stderr=True, highlight=False)
    with console.status(Text(printable(what))) as status:
        yield lambda how_far: status.update(Text(printable(f"{what}: {how_far}")))


@contextlib.contextmanager
def after_change() -> Iterator[None]:
    """For what tells of something done: where it cannot be written, it is done all the same."""
    try:
        yield
        sys.stdout.flush()
    except BrokenPipeError:
        raise
    except OSError as error:
        words = f"it is done, which cannot be written: {error}"
        raise NotRestored(words, left=()) from None


def _render(what: RenderableType) -> None:
    if sys.stdout.isatty():
        Console(highlight=False).print(what)
        return
    plain = io.StringIO()
    Console(file=plain, width=_NO_END, color_system=None, highlight=False).print(what)
    print("\n".join(one.rstrip() for one in plain.getvalue().splitlines()))
