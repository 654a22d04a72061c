"""How a change comes about: once, or never, and told as what it is.

A change leaves a row with its id, of which there can be but one: so a transaction can be sent again
after its server was lost, and a row that revokes it decides for good that it is not made.
"""

import time
import uuid
from typing import Any, List, Optional, Sequence

from libvswitch.errors import Busy, NotRestored
from vswitch.fabric._cluster import Cluster
from vswitch.fabric._errors import TransactionRefused, Unreachable
from vswitch.fabric._notation import Operation, insert, mutate, select, where

__all__ = ["commit", "new_change", "settle"]

# After so long another server is tried.
_PATIENCE_WITH_SERVER = 4.0
_LONGEST = 10.0
# An election takes less; without a majority nobody shall wait for long.
_ELECTION = 3.0
_PAUSE = 0.05
_INTERRUPTED = 2.0
# No host has this name: each removes its own old changes, and clients theirs.
_NO_HOST = ""
_KEPT_SECONDS = 3600


def new_change() -> str:
    return uuid.uuid4().hex


def commit(cluster: Cluster, change: str, operations: Sequence[Operation]) -> int:
    """Makes a change; returns the revision that it makes.

    Raises Busy if somebody else changed the same first, or no server can be reached: nothing is
    changed then; and NotRestored if nobody knows.
    """
    return _Commit(cluster, change, operations).run()


def settle(cluster: Cluster, change: str, deadline: float) -> bool:
    """Whether a change was made; one that was not never will be."""
    try:
        cluster.transact(_inserted(change, revoked=True), deadline)
        return False
    except TransactionRefused as refused:
        _require_final(cluster, refused)
    return bool(_is_made(cluster, change, deadline))


class _Commit:
    def __init__(self, cluster: Cluster, change: str, operations: Sequence[Operation]) -> None:
        self._cluster = cluster
        self._change = change
        self._operations = [
            *operations,
            mutate("Fabric", [], "revision", "+=", 1),
            select("Fabric", [], "revision"),
            *_inserted(change, revoked=False),
            _old_changes_deletion(),
        ]
        self._in_doubt = False

    def run(self) -> int:
        try:
            return self._decided()
        except (KeyboardInterrupt, SystemExit):
            if self._in_doubt:
                self._interrupted()
            raise

    def _decided(self) -> int:
        begun = time.monotonic()
        while True:
            try:
                self._cluster.connect(time.monotonic() + _ELECTION)
                return self._attempt(begun + _LONGEST)
            except Unreachable as why:
                if time.monotonic() >= begun + (_LONGEST if self._in_doubt else _ELECTION):
                    if self._in_doubt:
                        raise _unknown(self._change, str(why)) from None
                    raise
            time.sleep(_PAUSE)

    def _attempt(self, deadline: float) -> int:
        until = min(deadline, time.monotonic() + _PATIENCE_WITH_SERVER)
        # An attempt whose server was lost may have been made.
        if self._in_doubt and _is_made(self._cluster, self._change, until):
            return self._revision(until)
        was_in_doubt, self._in_doubt = self._in_doubt, True
        try:
            results = self._cluster.transact(self._operations, until)
        except TransactionRefused as refused:
            _require_final(self._cluster, refused)
            # A server may try a second time by itself, and refuse then what it has made.
            made = settle if was_in_doubt else _is_made
            if made(self._cluster, self._change, until):
                return self._revision(until)
            raise Busy(refused.words()) from None
        rows = next(one["rows"] for one in results if "rows" in one)
        return int(rows[0]["revision"])

    def _revision(self, deadline: float) -> int:
        """One that has the change; others may have come after it."""
        results = self._cluster.transact([select("Fabric", [], "revision")], deadline)
        return int(results[0]["rows"][0]["revision"])

    def _interrupted(self) -> None:
        """Somebody wants it to end, and is told at once what became of it, if anybody knows."""
        deadline = time.monotonic() + _INTERRUPTED
        try:
            self._cluster.disconnect()
            self._cluster.connect(deadline)
            made = settle(self._cluster, self._change, deadline)
        except Unreachable as why:
            raise _unknown(self._change, str(why)) from None
        if made:
            raise NotRestored("interrupted, and the change is made", left=()) from None


def _inserted(change: str, revoked: bool) -> List[Operation]:
    now = int(time.time())
    return [insert("Change", id=change, host=_NO_HOST, time=now, revoked=revoked)]


def _old_changes_deletion() -> Operation:
    before = int(time.time()) - _KEPT_SECONDS
    return {
        "op": "delete",
        "table": "Change",
        "where": [*where(host=_NO_HOST), ("time", "<", before)],
    }


def _is_made(cluster: Cluster, change: str, deadline: float) -> Optional[bool]:
    """None where it is neither made nor revoked."""
    asked = [select("Change", where(id=change), "revoked")]
    rows: List[Any] = cluster.transact(asked, deadline)[0]["rows"]
    return not rows[0]["revoked"] if rows else None


def _require_final(cluster: Cluster, refused: TransactionRefused) -> None:
    if not refused.is_final:
        cluster.disconnect()
        raise Unreachable(str(refused)) from None


def _unknown(change: str, why: str) -> NotRestored:
    words = f"nobody knows whether the change {change} is made, and its outcome can be asked for"
    return NotRestored(f"{words}: {why}", left=())
