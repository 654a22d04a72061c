"""The process that a network namespace lives by: it runs in there, for as long as its standard
input, a socket, is held at the other end. Told a device, it replies with a packet socket of that
device.

It is run by itself, without the package."""

import socket
import sys
from pathlib import Path

ETH_P_ALL = 3
SOL_PACKET = 263
PACKET_AUXDATA = 8


def is_quiet() -> None:
    """Nothing is sent that nobody asked for: what neighbours discover by themselves is of IPv6."""
    for scope in ("all", "default"):
        setting = Path("/proc/sys/net/ipv6/conf", scope, "disable_ipv6")
        if setting.exists():
            setting.write_text("1", encoding="ascii")


def packet_socket(device: str) -> socket.socket:
    made = socket.socket(socket.AF_PACKET, socket.SOCK_RAW, socket.htons(ETH_P_ALL))
    made.setsockopt(SOL_PACKET, PACKET_AUXDATA, 1)
    made.bind((device, 0))
    return made


def main() -> None:
    is_quiet()
    owner = socket.socket(fileno=sys.stdin.fileno())
    owner.sendall(b"\n")
    while True:
        device = owner.recv(100)
        if not device:
            break
        with packet_socket(device.decode()) as made:
            number = made.fileno().to_bytes(4, sys.byteorder)
            owner.sendmsg([b"\n"], [(socket.SOL_SOCKET, socket.SCM_RIGHTS, number)])


if __name__ == "__main__":
    main()
