"""Whole frames at a device: made, sent, received as they were on the wire."""

import errno
import socket
import struct
import time
from typing import Callable, List, Optional, Sequence, Tuple, Union

from simhost._namespaces import Namespace

Wanted = Union[bytes, Callable[[bytes], bool]]
"""A frame, or what is true of one."""

_LONGEST = 1 << 16
_PACKET_OUTGOING = 4
_SOL_PACKET = 263
_PACKET_AUXDATA = 8
# status, length, captured, offset of the frame, of the packet, tag, type of the tag
_AUXDATA = struct.Struct("=IIIHHHH")
_ROOM_FOR_AUXDATA = socket.CMSG_SPACE(_AUXDATA.size)
_HAS_TAG = 0x10
_ADDRESSES = 12


def frame(
    destination: str,
    source: str,
    *,
    vlan: Optional[int] = None,
    priority: int = 0,
    ethertype: int = 0x88B5,
    payload: bytes = bytes(46),
) -> bytes:
    """A frame, with a tag if it has a VLAN; the default type is the one for experiments.

    >>> frame("ff:ff:ff:ff:ff:ff", "02:00:00:00:00:01", vlan=7, payload=b"hello").hex(" ", 2)
    'ffff ffff ffff 0200 0000 0001 8100 0007 88b5 6865 6c6c 6f'
    """
    tag = b"" if vlan is None else struct.pack("!HH", 0x8100, priority << 13 | vlan)
    addresses = _address(destination) + _address(source)
    return addresses + tag + struct.pack("!H", ethertype) + payload


def _address(text: str) -> bytes:
    parts = text.split(":")
    if len(parts) != 6:
        raise ValueError(f"an address is six numbers as in 02:00:00:00:00:01, not {text!r}")
    return bytes(int(part, 16) for part in parts)


class PacketSocket:
    """A device as the one end of a wire. What came before anybody asked is kept in the kernel."""

    def __init__(self, namespace: Namespace, device: str) -> None:
        self._socket = namespace.packet_socket(device)
        self._waiting: List[bytes] = []

    def close(self) -> None:
        self._socket.close()

    def send(self, sent: bytes) -> None:
        self._socket.send(sent)

    def find(self, wanted: Wanted, timeout: float) -> Optional[bytes]:
        """The first frame that is wanted, which is then taken; others stay for the next one."""
        deadline = time.monotonic() + timeout
        looked_at = 0
        while True:
            while looked_at < len(self._waiting):
                if _is_wanted(wanted, self._waiting[looked_at]):
                    return self._waiting.pop(looked_at)
                looked_at += 1
            received = self._receive(deadline)
            if received is None:
                return None
            self._waiting.append(received)

    def waiting(self) -> List[bytes]:
        """What came and nobody took."""
        while True:
            received = self._receive(time.monotonic())
            if received is None:
                return list(self._waiting)
            self._waiting.append(received)

    def _receive(self, deadline: float) -> Optional[bytes]:
        while True:
            self._socket.settimeout(max(0.0, deadline - time.monotonic()))
            try:
                received, more, _, address = self._socket.recvmsg(_LONGEST, _ROOM_FOR_AUXDATA)
            except (BlockingIOError, socket.timeout):
                return None
            except OSError as error:
                # Told once when the device is switched off; it may be on again.
                if error.errno != errno.ENETDOWN:
                    raise
                continue
            if address[2] != _PACKET_OUTGOING:
                return _with_tag(received, more)


def _is_wanted(wanted: Wanted, received: bytes) -> bool:
    return received == wanted if isinstance(wanted, bytes) else wanted(received)


def _with_tag(received: bytes, more: Sequence[Tuple[int, int, bytes]]) -> bytes:
    """The kernel has taken the outermost tag out of a frame, and tells it beside it."""
    for level, kind, data in more:
        if (level, kind) == (_SOL_PACKET, _PACKET_AUXDATA):
            status, _, _, _, _, tag, tag_type = _AUXDATA.unpack(data[: _AUXDATA.size])
            if status & _HAS_TAG:
                whole = struct.pack("!HH", tag_type, tag)
                return received[:_ADDRESSES] + whole + received[_ADDRESSES:]
    return received
