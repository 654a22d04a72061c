"""The servers of a fabric's database, of which one is used that has the majority with it.

The server may be a follower: what a transaction assumes is checked where it is committed.
"""

import time
from typing import Any, Dict, List, Optional, Sequence

from vswitch.fabric._errors import OtherVersion, Unreachable
from vswitch.fabric._notation import Operation, Rows, values_in
from vswitch.fabric._server import News, Server

__all__ = ["Cluster"]

_DATABASE = "fabric"
_VERSION = "1."
_COLUMNS = {
    "Fabric": ["revision"],
    "Switch": ["id", "alias", "hosts", "settings", "writers"],
    "Port": ["switch", "id", "host", "settings"],
    "Host": ["name", "in_force", "links", "errors"],
    "Drill": ["id", "reply"],
}
# For one server to accept a connection, and to say what it is.
_PATIENCE = 2.0
# For one that has done so to say what it has, which may be much.
_PATIENCE_WITH_CONTENTS = 10.0
_PAUSE = 0.1
# What ends so near to a deadline was cut short by it.
_NEAR = 0.01
# What comes without end is left for the next time after so long.
_AT_ONCE = 0.5
# One that says nothing for so long is asked whether it is there.
_SILENCE = 5.0


class Cluster:
    """All of the rows, as a server has them."""

    def __init__(self, addresses: Sequence[str]) -> None:
        self._addresses = list(addresses)
        self._server: Optional[Server] = None
        self._cluster: Any = None
        self._index = 0
        self.rows: Rows = {}

    @property
    def is_connected(self) -> bool:
        return self._server is not None

    def connect(self, deadline: float) -> None:
        """To the first server that will do; raises Unreachable if none does until then."""
        said: List[str] = []
        while not self.is_connected:
            reasons = []
            for _ in self._addresses:
                try:
                    self._connect(min(deadline, time.monotonic() + _PATIENCE))
                    return
                except OtherVersion:
                    raise
                except Unreachable as why:
                    reasons.append(str(why))
            left = deadline - time.monotonic()
            # Servers that had no time to say what is wrong hide nothing that they said before.
            if left > _NEAR or not said:
                said = reasons
            if left < _PAUSE:
                raise Unreachable("; ".join(said))
            time.sleep(_PAUSE)

    def disconnect(self) -> None:
        """The next server is another one, if there is one."""
        if self._server is not None:
            self._server.close()
            self._server = None
        self._addresses.append(self._addresses.pop(0))

    def _connect(self, deadline: float) -> None:
        try:
            self._server = server = Server(self._addresses[0], deadline)
            told = self._monitor("_Server", {"Database": None}, deadline)
            self._check(told.get("Database", {}))
            version = server.request("get_schema", [_DATABASE], deadline)["version"]
            if not version.startswith(_VERSION):
                why = f"has a schema of version {version}, which is none of {_VERSION}x"
                raise OtherVersion(f"{server.address}: its database '{_DATABASE}' {why}")
            self.rows = {table: {} for table in _COLUMNS}
            deadline = max(deadline, time.monotonic() + _PATIENCE_WITH_CONTENTS)
            self._take(News(_DATABASE, self._monitor(_DATABASE, _COLUMNS, deadline)))
        except Unreachable:
            self.disconnect()
            raise

    def _monitor(
        self, database: str, columns: Dict[str, Any], deadline: float
    ) -> Dict[str, Dict[str, Any]]:
        assert self._server is not None
        wanted = {
            table: {"columns": names} if names is not None else {}
            for table, names in columns.items()
        }
        told: Dict[str, Dict[str, Any]] = self._server.request(
            "monitor", [database, database, wanted], deadline
        )
        return told

    def _check(self, databases: Dict[str, Any]) -> None:
        """Whether the server may be used, by what it says of itself."""
        assert self._server is not None
        address = self._server.address
        row = next((one["new"] for one in databases.values() if _is_ours(one)), None)
        if row is None:
            raise Unreachable(f"{address}: it has no database '{_DATABASE}'")
        if not row["connected"]:
            raise Unreachable(f"{address}: it has lost the majority of its cluster")
        # A database that is none of a cluster has no log.
        index = max([0, *values_in(row["index"])])
        if self._cluster == row["cid"] and index < self._index:
            why = "it has not yet all that another one of its cluster said"
            raise Unreachable(f"{address}: {why}")
        self._cluster, self._index = row["cid"], index

    def transact(self, operations: Sequence[Operation], deadline: float) -> List[Any]:
        """The results; raises TransactionRefused, and Unreachable where nobody knows."""
        if self._server is None:
            raise Unreachable("no server is connected")
        try:
            results: List[Any] = self._server.transact(_DATABASE, operations, deadline)
            return results
        except Unreachable:
            self.disconnect()
            raise

    def catch_up(self) -> None:
        """Has all that the server knows by now: one that hangs tells nothing by itself."""
        assert self._server is not None
        try:
            self._server.request("echo", [], time.monotonic() + _PATIENCE)
            self._take_all(self._server.news(0))
        except Unreachable:
            self.disconnect()
            raise

    def follow(self, deadline: float) -> bool:
        """Waits for news of the rows; returns whether there were any."""
        assert self._server is not None
        try:
            while True:
                news = self._server.news(min(deadline, time.monotonic() + _SILENCE))
                if self._take_all(news):
                    return True
                # There may be no end of news of the servers themselves.
                if time.monotonic() >= deadline:
                    return False
                if news is None:
                    self._server.request("echo", [], time.monotonic() + _PATIENCE)
        except Unreachable:
            self.disconnect()
            raise

    def _take_all(self, news: Optional[News]) -> bool:
        """And what has come after it. Returns whether any is about rows of the fabric."""
        assert self._server is not None
        end = time.monotonic() + _AT_ONCE
        any_of_fabric = False
        while news is not None:
            any_of_fabric = self._take(news) or any_of_fabric
            news = self._server.news(0) if time.monotonic() < end else None
        return any_of_fabric

    def _take(self, news: News) -> bool:
        """Returns whether it is about rows of the fabric."""
        if news.monitor != _DATABASE:
            if any(_is_ours(one) for one in news.tables.get("Database", {}).values()):
                self._check(news.tables["Database"])
            return False
        for table, rows in news.tables.items():
            for uuid, row in rows.items():
                if "new" in row:
                    self.rows[table][uuid] = row["new"]
                else:
                    self.rows[table].pop(uuid, None)
        return True


def _is_ours(row: Dict[str, Any]) -> bool:
    return bool(row.get("new", {}).get("name") == _DATABASE)
