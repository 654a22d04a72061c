"""A connection to one server of a database, over Open vSwitch's module for Python."""

import errno
import os
import ssl
import time
from typing import Any, Dict, List, NamedTuple, Optional, Sequence

import ovs.jsonrpc
import ovs.poller
import ovs.stream

from vswitch.fabric._errors import TransactionRefused, Unreachable
from vswitch.fabric._notation import Operation
from vswitch.fabric._tls import expired

__all__ = ["News", "Server"]

_GONE = "it is not there, or hung up"


class News(NamedTuple):
    """What became of rows: which monitor tells it, and what each was and is by its table."""

    monitor: str
    tables: Dict[str, Dict[str, Any]]


class Server:
    """One that accepted a connection. What breaks it raises Unreachable."""

    def __init__(self, address: str, deadline: float) -> None:
        self.address = address
        self._news: List[News] = []
        left = max(int(1000 * (deadline - time.monotonic())), 0)
        try:
            error, stream = ovs.stream.Stream.open_block(ovs.stream.Stream.open(address), left)
        except (OSError, ValueError) as why:
            # A file that became none of a key, say.
            raise Unreachable(f"{address}: {why}{_of_certificate(address)}") from None
        if error:
            # The module tells what TLS says in numbers of its own.
            is_gone = error == ssl.SSL_ERROR_EOF and address.startswith("ssl:")
            words = _GONE if is_gone else _words(error)
            raise Unreachable(f"{address}: {words}{_of_certificate(address)}")
        self._rpc = ovs.jsonrpc.Connection(stream)

    def close(self) -> None:
        self._rpc.close()

    def request(self, method: str, params: Sequence[Any], deadline: float) -> Any:
        asked = ovs.jsonrpc.Message.create_request(method, params)
        self._check(self._rpc.send(asked))
        while True:
            reply = self._next(deadline)
            if reply is not None and reply.id == asked.id:
                if reply.error is not None:
                    raise Unreachable(f"{self.address}: {reply.error}")
                return reply.result
            # It may tell of other things without end.
            if reply is None or time.monotonic() >= deadline:
                raise Unreachable(f"{self.address}: it does not reply")

    def transact(self, database: str, operations: Sequence[Operation], deadline: float) -> Any:
        """The results of the operations; raises TransactionRefused if one failed."""
        results = self.request("transact", [database, *operations], deadline)
        for result in results:
            if result and "error" in result:
                raise TransactionRefused(result["error"], result.get("details") or "")
        return results

    def news(self, deadline: float) -> Optional[News]:
        """What comes next of what is monitored; None if that is nothing until then."""
        while not self._news:
            if self._next(deadline) is None:
                return None
        return self._news.pop(0)

    def _next(self, deadline: float) -> Any:
        """The next message; an update becomes news, too."""
        while True:
            self._rpc.run()
            error, message = self._rpc.recv()
            if message is not None:
                self._take(message)
                return message
            if error != errno.EAGAIN:
                self._check(error)
            left = deadline - time.monotonic()
            if left <= 0:
                return None
            poller = ovs.poller.Poller()
            self._rpc.wait(poller)
            self._rpc.recv_wait(poller)
            poller.timer_wait(int(1000 * left) + 1)
            poller.block()

    def _take(self, message: Any) -> None:
        if message.type == message.T_REQUEST and message.method == "echo":
            self._rpc.send(ovs.jsonrpc.Message.create_reply(message.params, message.id))
        elif message.type == message.T_NOTIFY and message.method == "update":
            self._news.append(News(*message.params))

    def _check(self, error: int) -> None:
        if error:
            # With TLS 1.3 a server says only after the agreement whom it will not have.
            is_shy = self.address.startswith("ssl:") and not self._rpc.get_received_bytes()
            maybe = ", as one does that does not take this certificate" if is_shy else ""
            more = _of_certificate(self.address) or maybe
            raise Unreachable(f"{self.address}: {_words(error)}{more}")


def _of_certificate(address: str) -> str:
    """What the server at an address does not like of this side's, if that is known."""
    why = expired() if address.startswith("ssl:") else ""
    return f" ({why})" if why else ""


def _words(error: int) -> str:
    return "it hung up" if error == ovs.jsonrpc.EOF else os.strerror(abs(error))
