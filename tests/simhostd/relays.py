#!/usr/bin/env python3
"""A relay between a host and the servers of its databases, which delays what it passes on, holds it
back, cuts a connection in the middle of a message, or has transactions made twice.

    relays.py ADDRESS FIRST_PORT TO_ADDRESS TO_FIRST_PORT SERVERS

obeys a command in each line of its standard input, and says when it does.
"""

import asyncio
import codecs
import json
import subprocess
import sys
from contextlib import suppress
from typing import Any, Dict, Iterator, List, Set, Tuple

from simhost._namespaces import PATIENCE, Namespace

FROM_HOST, TO_HOST = "from_host", "to_host"
# No client numbers its requests so.
_FIRST = "first"


class Relay:
    """One that runs in a namespace."""

    def __init__(
        self, namespace: Namespace, listens: Tuple[str, int], to: Tuple[str, int], servers: int
    ) -> None:
        address, first = listens
        self.addresses = ",".join(f"tcp:{address}:{first + server}" for server in range(servers))
        words = [address, str(first), to[0], str(to[1]), str(servers)]
        self._process = namespace.start(
            sys.executable, __file__, *words, stdin=subprocess.PIPE, stdout=subprocess.PIPE
        )
        self._heard()

    def delay(self, seconds: float) -> None:
        """Passes on later what comes from now on; 0 as before."""
        self._tell(f"delay {seconds}")

    def hold(self, *directions: str) -> None:
        """Passes on nothing in them, or in any if none is named, and goes on listening."""
        self._tell(" ".join(["hold", *(directions or (FROM_HOST, TO_HOST))]))

    def release(self) -> None:
        """Passes on what was held back, too."""
        self._tell("release")

    def cut(self, direction: str) -> None:
        """Passes on half of what comes next in a direction over each connection, and ends it."""
        self._tell(f"cut {direction}")

    def repeat(self, on: bool = True) -> None:
        """Has each transaction made twice from now on, and passes on what became of it the second
        time: as a server does that lost sight of its leader meanwhile."""
        self._tell(f"repeat {int(on)}")

    def close(self) -> None:
        self._process.kill()
        self._process.communicate(timeout=PATIENCE)

    def _tell(self, command: str) -> None:
        assert self._process.stdin is not None
        self._process.stdin.write(command + "\n")
        self._process.stdin.flush()
        self._heard()

    def _heard(self) -> None:
        assert self._process.stdout is not None
        said = self._process.stdout.readline()
        assert said == "obeyed\n", said


class _Passing:
    """What becomes of all connections."""

    def __init__(self) -> None:
        self.delay = 0.0
        self.goes = {direction: asyncio.Event() for direction in (FROM_HOST, TO_HOST)}
        self.obey("release")
        self.repeats = False
        self.connections: List["_Connection"] = []

    def obey(self, command: str, *values: str) -> None:
        if command == "delay":
            self.delay = float(values[0])
        elif command == "hold":
            for direction in values:
                self.goes[direction].clear()
        elif command == "release":
            for goes in self.goes.values():
                goes.set()
        elif command == "repeat":
            self.repeats = values == ("1",)
        else:
            for one in self.connections:
                one.is_cut.add(values[0])


class _Connection:
    def __init__(self, passing: _Passing) -> None:
        self._passing = passing
        self._is_made = asyncio.Event()
        self.is_cut: Set[str] = set()

    async def run(
        self, reader: asyncio.StreamReader, writer: asyncio.StreamWriter, to: Tuple[str, int]
    ) -> None:
        self._passing.connections.append(self)
        writers = [writer]
        try:
            far_reader, far_writer = await asyncio.open_connection(*to)
            writers.append(far_writer)
            ways = [
                self._pass(reader, far_writer, FROM_HOST),
                self._pass(far_reader, writer, TO_HOST),
            ]
            tasks = [asyncio.ensure_future(way) for way in ways]
            # Whichever side ends it ends it for both.
            _, left = await asyncio.wait(tasks, return_when=asyncio.FIRST_COMPLETED)
            for task in left:
                task.cancel()
            await asyncio.gather(*tasks, return_exceptions=True)
        except OSError:
            # The server is away.
            pass
        finally:
            self._passing.connections.remove(self)
            for one in writers:
                one.close()

    async def _pass(
        self, reader: asyncio.StreamReader, writer: asyncio.StreamWriter, direction: str
    ) -> None:
        messages = _Messages()
        while data := await reader.read(65536):
            await asyncio.sleep(self._passing.delay)
            await self._passing.goes[direction].wait()
            for text, said in messages.add(data):
                if said.get("id") == _FIRST:
                    self._is_made.set()
                    continue
                if self._passing.repeats and said.get("method") == "transact":
                    await self._make(said, writer)
                is_cut = direction in self.is_cut
                writer.write(text[: len(text) // 2] if is_cut else text)
                await writer.drain()
                if is_cut:
                    return

    async def _make(self, said: Dict[str, Any], writer: asyncio.StreamWriter) -> None:
        """Has a transaction made of which nobody is told."""
        self._is_made.clear()
        writer.write(json.dumps({**said, "id": _FIRST}).encode())
        await self._is_made.wait()


class _Messages:
    """The objects that a stream is made of."""

    def __init__(self) -> None:
        self._decoder = codecs.getincrementaldecoder("utf-8")()
        self._left = ""

    def add(self, data: bytes) -> Iterator[Tuple[bytes, Dict[str, Any]]]:
        """Those that are whole by now: as they came, and what they say."""
        self._left += self._decoder.decode(data)
        while self._left:
            try:
                said, end = json.JSONDecoder().raw_decode(self._left)
            except ValueError:
                return
            text, self._left = self._left[:end], self._left[end:].lstrip()
            yield text.encode(), said


async def _relay(address: str, first: str, to_address: str, to_first: str, servers: str) -> None:
    passing = _Passing()

    async def listen(server: int) -> None:
        to = (to_address, int(to_first) + server)

        async def accept(reader: asyncio.StreamReader, writer: asyncio.StreamWriter) -> None:
            await _Connection(passing).run(reader, writer, to)

        await asyncio.start_server(accept, address, int(first) + server)

    for server in range(int(servers)):
        await listen(server)
    print("obeyed", flush=True)
    loop = asyncio.get_running_loop()
    while line := await loop.run_in_executor(None, sys.stdin.readline):
        passing.obey(*line.split())
        print("obeyed", flush=True)


if __name__ == "__main__":
    with suppress(KeyboardInterrupt):
        asyncio.run(_relay(*sys.argv[1:]))
