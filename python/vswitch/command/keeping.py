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
from typing import Any, Callable, Dict, Iterable, Optional, Tuple

from libvswitch.errors import HostError, NotRestored
from vswitch.command.meeting import Meeting
from vswitch.host import Host
from vswitch.plan import Plan
from vswitch.told import Change

__all__ = ["CONFIRMED", "LEFT", "TAKEN_BACK", "WAITING", "apply"]

WAITING, CONFIRMED, TAKEN_BACK, LEFT = "waiting", "confirmed", "taken back", "left"


_SIGNALS = (signal.SIGINT, signal.SIGTERM, signal.SIGHUP)


class _Unconfirmed(Exception):
    """The time is over, or somebody ends it before."""

    def __str__(self) -> str:
        return "it was taken back"


def apply(host: Host, make_plan: Callable[[], Plan], seconds: float) -> Tuple[Change, ...]:
    """Makes the change of a plan, which another process takes back unless it is confirmed.

    The host must not have been asked anything yet: its libraries are not made to be forked. Ctrl-C
    while the change is being made takes it back at once; the end of a terminal does not.
    """
    meeting = Meeting(host)
    reading, writing = os.pipe()
    sys.stdout.flush()
    sys.stderr.flush()
    # Until the other process can tell what a signal means to it.
    mask = signal.pthread_sigmask(signal.SIG_BLOCK, _SIGNALS)
    keeper = os.fork()
    if keeper == 0:
        _end_with(lambda: _Keeper(host, meeting, writing).keep(make_plan, seconds), writing, mask)
    os.close(writing)
    said = bytearray()
    try:
        signal.pthread_sigmask(signal.SIG_SETMASK, mask)
        _hear(reading, said)
    except KeyboardInterrupt:
        os.kill(keeper, signal.SIGTERM)
        _hear(reading, said)
        _require_taken_back(meeting, _told(said))
        raise
    finally:
        os.close(reading)
    told = _told(said)
    if "changes" in told:
        return tuple(Change(**one) for one in told["changes"])
    if told["refused"]:
        raise HostError(told["error"])
    raise NotRestored(told["error"], left=())


def _hear(pipe: int, said: bytearray) -> None:
    """All that the other process says. An interruption comes while nothing does."""
    piece = None
    while piece != b"":
        select.select([pipe], [], [])
        mask = signal.pthread_sigmask(signal.SIG_BLOCK, _SIGNALS)
        piece = os.read(pipe, 65536)
        said += piece
        signal.pthread_sigmask(signal.SIG_SETMASK, mask)


def _told(said: bytearray) -> Dict[str, Any]:
    """What the other process has said, which may be gone without a word."""
    gone = "nobody knows what became of the change: who made it is gone"
    told: Dict[str, Any] = json.loads(said) if said else {"error": gone, "refused": False}
    return told


def _require_taken_back(meeting: Meeting, told: Dict[str, Any]) -> None:
    """The change may have been made by the time that it was to be taken back."""
    if "changes" in told:
        last = meeting.last()
        if last is None or last["outcome"] != TAKEN_BACK:
            words = last["words"] if last is not None else ""
            raise NotRestored(f"interrupted, and not taken back: {words}", left=())
    elif not told["refused"]:
        raise NotRestored(told["error"], left=())


def _end_with(keep: Callable[[], None], writing: int, mask: Iterable[int]) -> None:
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
        signal.pthread_sigmask(signal.SIG_SETMASK, mask)
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
            raise
        finally:
            self._meeting.stop()

    def _wait(self, listening: Any, seconds: float) -> None:
        end = time.monotonic() + seconds
        while True:
            left = end - time.monotonic()
            if left <= 0 or not select.select([listening], [], [], left)[0]:
                self._meeting.stop()
                raise _Unconfirmed
            # What is said to be confirmed is not taken back, whatever comes then.
            signal.pthread_sigmask(signal.SIG_BLOCK, _SIGNALS)
            if self._meeting.is_confirmed(listening):
                with contextlib.suppress(OSError):
                    self._meeting.note(CONFIRMED)
                return
            signal.pthread_sigmask(signal.SIG_UNBLOCK, _SIGNALS)

    def _tell(self, what: Dict[str, Any]) -> None:
        """Once, and whole: who began it may go on then."""
        mask = signal.pthread_sigmask(signal.SIG_BLOCK, _SIGNALS)
        try:
            if self._pipe is not None:
                pipe, self._pipe = self._pipe, None
                # Who began it may be gone.
                with contextlib.suppress(OSError), open(pipe, "wb") as file:
                    file.write(json.dumps(what).encode())
        finally:
            signal.pthread_sigmask(signal.SIG_SETMASK, mask)
