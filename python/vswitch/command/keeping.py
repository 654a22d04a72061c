"""A change that is taken back unless somebody confirms it in time.

A process of its own makes the change and keeps what undoes it, in a session of its own: neither the
end of the shell nor that of its terminal reaches it. What it has to say before it waits comes
through a pipe.
"""

import contextlib
import dataclasses
import json
import os
import select
import signal
import sys
import time
from types import FrameType
from typing import Any, Callable, Dict, Optional, Tuple

from libvswitch.errors import HostError, NotRestored
from vswitch.command.meeting import Meeting
from vswitch.host import Host
from vswitch.plan import Plan
from vswitch.told import Change

__all__ = ["CONFIRMED", "LEFT", "TAKEN_BACK", "WAITING", "apply"]

WAITING, CONFIRMED, TAKEN_BACK, LEFT = "waiting", "confirmed", "taken back", "left"


class _Unconfirmed(Exception):
    """The time is over."""


def apply(host: Host, make_plan: Callable[[], Plan], seconds: float) -> Tuple[Change, ...]:
    """Makes the change of a plan, which another process takes back unless it is confirmed.

    The host must not have been asked anything yet: its libraries are not made to be forked.
    """
    meeting = Meeting(host)
    reading, writing = os.pipe()
    sys.stdout.flush()
    sys.stderr.flush()
    if os.fork() == 0:
        _end_with(lambda: _Keeper(host, meeting, writing).keep(make_plan, seconds), writing)
    os.close(writing)
    with open(reading, encoding="utf-8") as pipe:
        told: Dict[str, Any] = json.loads(pipe.read() or "{}")
    if "changes" in told:
        return tuple(Change(**one) for one in told["changes"])
    words = told.get("error", "nobody knows what became of the change: who made it is gone")
    if told.get("refused"):
        raise HostError(words)
    raise NotRestored(words, left=())


def _end_with(keep: Callable[[], None], writing: int) -> None:
    """The whole life of the other process, which has nothing of this one to clean up."""
    try:
        os.setsid()
        nothing = os.open(os.devnull, os.O_RDWR)
        for standard in (0, 1, 2):
            os.dup2(nothing, standard)
        # Whoever reads what a shell gave us would wait for our end.
        for other in {int(one) for one in os.listdir("/proc/self/fd")} - {0, 1, 2, writing}:
            with contextlib.suppress(OSError):
                os.close(other)
        signal.signal(signal.SIGHUP, signal.SIG_IGN)
        signal.signal(signal.SIGINT, signal.SIG_IGN)
        signal.signal(signal.SIGTERM, _end)
        keep()
    finally:
        os._exit(0)


def _end(number: int, _: Optional[FrameType]) -> None:
    """Takes the change back at once, and lets nothing disturb that."""
    signal.signal(number, signal.SIG_IGN)
    raise _Unconfirmed


class _Keeper:
    def __init__(self, host: Host, meeting: Meeting, writing: int) -> None:
        self._host = host
        self._meeting = meeting
        self._pipe: Optional[int] = writing

    def keep(self, make_plan: Callable[[], Plan], seconds: float) -> None:
        try:
            with self._meeting.kept() as listening:
                self._make(make_plan, listening, seconds)
        except NotRestored as error:
            self._tell({"error": str(error), "refused": False})
        except Exception as error:
            self._tell({"error": str(error) or type(error).__name__, "refused": True})

    def _make(self, make_plan: Callable[[], Plan], listening: Any, seconds: float) -> None:
        try:
            with self._host._whole():
                changes = make_plan().apply()
                if changes:
                    self._meeting.note(WAITING)
                self._tell({"changes": [dataclasses.asdict(one) for one in changes]})
                if changes:
                    self._wait(listening, seconds)
        except NotRestored as error:
            self._meeting.note(LEFT, str(error))
            raise
        except _Unconfirmed:
            self._meeting.note(TAKEN_BACK)
            raise HostError("it was taken back") from None
        finally:
            self._meeting.stop()

    def _wait(self, listening: Any, seconds: float) -> None:
        end = time.monotonic() + seconds
        while True:
            left = end - time.monotonic()
            if left <= 0 or not select.select([listening], [], [], left)[0]:
                self._meeting.stop()
                raise _Unconfirmed
            if self._meeting.is_confirmed(listening):
                # It has been said to be confirmed: nothing may take it back now.
                with contextlib.suppress(OSError):
                    self._meeting.note(CONFIRMED)
                return

    def _tell(self, what: Dict[str, Any]) -> None:
        """Once: who began it may go on then."""
        if self._pipe is None:
            return
        pipe, self._pipe = self._pipe, None
        # Who began it may be gone.
        with contextlib.suppress(OSError), open(pipe, "w", encoding="utf-8") as file:
            json.dump(what, file)
