"""A block of changes that is undone when it does not end well."""

from __future__ import annotations

import typing
from contextvars import ContextVar
from types import TracebackType
from typing import Dict, List, Optional, Tuple, Type

from libvswitch.errors import NotRestored, RolledBack
from vswitch._undo import Step

if typing.TYPE_CHECKING:
    from vswitch.host import Host

__all__ = ["Transaction", "commit", "committed", "find_transaction"]

_open: "ContextVar[Tuple[Transaction, ...]]" = ContextVar("open transactions", default=())
"""Those of this thread or task that lie in one another, whatever their hosts."""


_committed = 0


def commit() -> None:
    """A change of a host is made that stays."""
    global _committed
    _committed += 1


def committed() -> int:
    """How often this process has made such."""
    return _committed


def find_transaction(host: "Host") -> "Optional[Transaction]":
    """The innermost of a host."""
    return next((one for one in reversed(_open.get()) if one.host is host), None)


class Transaction:
    """What `Host.transaction` begins.

    Before each first write it notes what is there: of a property the exact bytes and the property
    type, or that it is not set. When the block raises, that is put back, the last write first:
    RolledBack, with what was raised as its cause. NotRestored names what could not be put back.
    Transactions may lie in one another. Only what is done through the same Host, in the same
    thread and the same task of a loop, is noted.
    """

    def __init__(self, host: "Host", raises: bool = True) -> None:
        self.host = host
        self._raises = raises
        self._steps: List[Step] = []
        self._outer: Optional[Transaction] = None

    def __enter__(self) -> "Transaction":
        self._outer = find_transaction(self.host)
        _open.set((*_open.get(), self))
        return self

    def note(self, step: Step) -> None:
        self._steps.append(step)

    def __exit__(
        self,
        kind: Optional[Type[BaseException]],
        raised: Optional[BaseException],
        trace: Optional[TracebackType],
    ) -> None:
        _open.set(tuple(one for one in _open.get() if one is not self))
        if raised is None:
            if self._outer is not None:
                self._outer._steps += self._steps
            elif self._steps:
                commit()
            return
        # The words of an error name what the host has when they are made: now.
        words = str(raised) or type(raised).__name__
        try:
            left = self._roll_back()
        except BaseException:
            # It is interrupted, as by Ctrl-C, which goes on when all is put back.
            left = self._roll_back()
            if not left:
                raise
        if left:
            raise NotRestored(f"{words}; not as it was: {'; '.join(left)}", left=left) from raised
        # What ends a program goes on doing so, and so does what is raised in `_whole`.
        if self._raises and isinstance(raised, Exception):
            raise RolledBack(f"{words}; everything is as it was before") from raised

    def _roll_back(self) -> List[str]:
        """Undoes all steps, and says what is left.

        After each it is as it was before that write, if all is well. What one could not put back,
        an earlier one about the same may have.
        """
        left: Dict[Tuple[Tuple[str, ...], str], Tuple[Step, List[str]]] = {}
        for step in reversed(self._steps):
            found = _undone(step)
            if not found and step.is_whole():
                left = {about: one for about, one in left.items() if not step.has(one[0])}
            left[step.place, step.what()] = step, found
        return [line for _, lines in reversed(list(left.values())) for line in lines]


def _undone(step: Step) -> List[str]:
    """Undoes a step; what is left of it."""
    try:
        step.undo()
    except Exception:
        pass  # what is there now says more
    try:
        return step.left()
    except Exception as error:
        return [f"{step.what()} (nobody knows: {error})"]
