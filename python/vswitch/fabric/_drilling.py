"""Hosts are asked what would carry their ports if an uplink failed.

A row of the database is the question to one host, which writes its reply into it. Nothing is taken
down.
"""

import json
import time
import uuid
from dataclasses import dataclass
from typing import Dict, Iterable, Mapping, Optional, Sequence, Union

from libvswitch.errors import Busy, HostError
from vswitch.fabric._cluster import Cluster
from vswitch.fabric._errors import TransactionRefused, Unreachable
from vswitch.fabric._notation import Operation, delete, insert, select, where

__all__ = ["Failover", "Replies", "Reply", "drill"]

_KEPT_SECONDS = 3600
_LAST_WORDS = 2.0


@dataclass(frozen=True)
class Failover:
    """A port of a host that an uplink carries, and what would carry it without that one."""

    host: str
    uplink: str
    port: str
    meanwhile: Optional[str]


Reply = Union[Sequence[Failover], HostError, None]
"""Why a host does not tell is a HostError; None is of one that did not reply."""
Replies = Mapping[str, Reply]
"""By the names of hosts."""


def drill(cluster: Cluster, switch: str, hosts: Sequence[str], deadline: float) -> Replies:
    """Asks hosts about a switch, by its identifier."""
    asked = {uuid.uuid4().hex: host for host in hosts}
    now = int(time.time())
    # Whoever asked and was killed has left its rows.
    old = delete("Drill", [("time", "<", now - _KEPT_SECONDS)])
    rows = [
        insert("Drill", id=id_, host=host, switch=switch, time=now) for id_, host in asked.items()
    ]
    cluster.connect(deadline)
    try:
        _ask(cluster, [old, *rows], asked, deadline)
        while len(_replied(cluster, asked)) < len(asked) and time.monotonic() < deadline:
            cluster.follow(deadline)
        found = _replied(cluster, asked)
        return {
            host: _reply(host, found[id_]) if id_ in found else None for id_, host in asked.items()
        }
    finally:
        _withdraw(cluster, asked)


def _ask(
    cluster: Cluster, operations: Sequence[Operation], asked: Iterable[str], deadline: float
) -> None:
    try:
        cluster.transact(operations, deadline)
    except TransactionRefused as refused:
        # A server may try a second time by itself, and refuse then what it has made.
        if not _are_there(cluster, asked, deadline):
            raise Busy(refused.words()) from None


def _are_there(cluster: Cluster, asked: Iterable[str], deadline: float) -> bool:
    which = [select("Drill", where(id=id_), "id") for id_ in asked]
    try:
        return all(one["rows"] for one in cluster.transact(which, deadline))
    except TransactionRefused:
        return False


def _replied(cluster: Cluster, asked: Mapping[str, str]) -> Dict[str, str]:
    """The replies that there are, by their questions."""
    rows = cluster.rows["Drill"].values()
    return {row["id"]: row["reply"] for row in rows if row["id"] in asked and row["reply"]}


def _reply(host: str, reply: str) -> Reply:
    said = json.loads(reply)
    if "refused" in said:
        return HostError(said["refused"])
    return [
        Failover(host, one["uplink"], one["port"], one["meanwhile"]) for one in said["failovers"]
    ]


def _withdraw(cluster: Cluster, asked: Mapping[str, str]) -> None:
    if cluster.is_connected:
        try:
            gone = [delete("Drill", where(id=id_)) for id_ in asked]
            cluster.transact(gone, time.monotonic() + _LAST_WORDS)
        except (TransactionRefused, Unreachable):
            # Whoever drills next removes what is old.
            pass
