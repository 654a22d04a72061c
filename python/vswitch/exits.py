"""How a tool ends: errors in words, and a status that scripts can trust."""

from __future__ import annotations

import contextlib
import os
import sys
from types import TracebackType
from typing import Optional, Type

from libvswitch.errors import HostError, NotRestored
from vswitch.transaction import committed
from vswitch.words import DocumentError, printable

__all__ = ["exits"]

REFUSED = 1
CHANGED = 3
INTERRUPTED = 130


class exits(contextlib.ContextDecorator):
    """Ends a tool: `with exits("tool"): main()`, or as a decorator of its main function.

    What the host or the system refuses, and what is wrong with a document, is told on standard
    error, in one line, and the status is 1; 3 when something is left changed: what could not be put
    back, or what the tool had done before. A reader who closes the pipe has seen enough: that is no
    error. What else is raised is a mistake in the tool, and keeps its traceback.
    """

    def __init__(self, tool: str) -> None:
        self._tool = tool
        self._committed = 0

    def __enter__(self) -> "exits":
        _open_streams()
        self._committed = committed()
        return self

    def __exit__(
        self,
        kind: Optional[Type[BaseException]],
        raised: Optional[BaseException],
        trace: Optional[TracebackType],
    ) -> None:
        if isinstance(raised, SystemExit) and raised.code:
            # The tool has said how it ends, and that stays.
            unwritten = _flushed()
            if unwritten is not None and not isinstance(unwritten, BrokenPipeError):
                self._tell(unwritten)
            return
        if raised is None or isinstance(raised, SystemExit):
            raised = _flushed()
        if raised is None:
            return
        if isinstance(raised, BrokenPipeError):
            _close_output()
            sys.exit(0)
        status = _status(raised)
        is_left = status == REFUSED and committed() != self._committed
        if status is not None:
            self._tell(raised, "; what was changed stays changed" if is_left else "")
            _flushed()
            sys.exit(CHANGED if is_left else status)

    def _tell(self, raised: BaseException, more: str = "") -> None:
        words = "interrupted" if isinstance(raised, KeyboardInterrupt) else f"{raised}{more}"
        with contextlib.suppress(OSError):
            print(f"{self._tool}: {printable(words)}", file=sys.stderr, flush=True)


def _open_streams() -> None:
    """Standard streams that are closed lead nowhere: errors would go where results belong."""
    for name, mode in (("stdin", "r"), ("stdout", "w"), ("stderr", "w")):
        if getattr(sys, name) is None:
            setattr(sys, name, open(os.devnull, mode))


def _status(raised: BaseException) -> Optional[int]:
    if isinstance(raised, NotRestored):
        return CHANGED
    if isinstance(raised, (HostError, DocumentError, OSError)):
        return REFUSED
    return INTERRUPTED if isinstance(raised, KeyboardInterrupt) else None


def _flushed() -> Optional[OSError]:
    """Writes what is still to be written, while there is somebody to tell that it cannot be."""
    try:
        sys.stdout.flush()
    except OSError as error:
        _close_output()
        return error
    return None


def _close_output() -> None:
    """What is left goes nowhere: the interpreter would complain of it when it ends."""
    with contextlib.suppress(OSError, ValueError):
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())
