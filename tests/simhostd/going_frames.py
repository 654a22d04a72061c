"""Frames that go while something else happens, of which none may be lost."""

import select
import threading
import time
from typing import Callable, Optional, Set

from simhost import Client, frame
from simhost._namespaces import PATIENCE
from simhost._wires import PacketSocket

BETWEEN_FRAMES = 0.005


class GoingFrames:
    """From one client to another, a numbered one every few milliseconds, from entering to leaving
    it, which fails if one of them does not come. `made` says what the frame of a number is."""

    def __init__(
        self,
        one: Client,
        other: Client,
        made: Optional[Callable[[int], bytes]] = None,
        patience: float = PATIENCE,
    ) -> None:
        self._patience = patience
        source, destination = one.mac, other.mac
        self._made = made or (lambda n: frame(destination, source, payload=b"%046d" % n))
        # Apart from those that the test itself asks.
        self._from = PacketSocket(one.namespace, "eth0")
        self._to = other.namespace.packet_socket("eth0")
        self._to.setblocking(False)
        self._sent = 0
        self._missing: Set[bytes] = set()
        self._ends = threading.Event()
        self._thread = threading.Thread(target=self._go)

    def __enter__(self) -> "GoingFrames":
        self._thread.start()
        return self

    def __exit__(self, failed: object, *_: object) -> None:
        self._ends.set()
        self._thread.join()
        self._from.close()
        self._to.close()
        if failed is None:
            assert self._sent > 0
            assert not self._missing, f"{len(self._missing)} of {self._sent} frames did not come"

    def _go(self) -> None:
        while not self._ends.is_set():
            sent = self._made(self._sent)
            self._sent += 1
            self._missing.add(sent)
            self._from.send(sent)
            self._receive_for(BETWEEN_FRAMES)
        deadline = time.monotonic() + self._patience
        while self._missing and time.monotonic() < deadline:
            self._receive_for(BETWEEN_FRAMES)

    def _receive_for(self, seconds: float) -> None:
        deadline = time.monotonic() + seconds
        while (rest := deadline - time.monotonic()) > 0:
            if select.select([self._to], [], [], rest)[0]:
                self._missing.discard(self._to.recv(1 << 16))
