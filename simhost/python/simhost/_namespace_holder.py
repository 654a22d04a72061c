"""The process that a network namespace lives by: it runs in there, for as long as its standard
input, a socket, is held at the other end. It switches the loopback on; told a device, it replies
with a packet socket of that device.

It is run by itself, without the package. There are many, so that it imports little: what `socket`
adds to this takes longer than all the rest."""

import _socket as socket
import fcntl
import struct
import sys

ETH_P_ALL = 3
SOL_PACKET = 263
PACKET_AUXDATA = 8
SIOCSIFFLAGS = 0x8914
IFF_UP = 1


def is_quiet() -> None:
    """Nothing is sent that nobody asked for: what neighbours discover by themselves is of IPv6."""
    for scope in ("all", "default"):
        try:
            with open(
                f"/proc/sys/net/ipv6/conf/{scope}/disable_ipv6", "w", encoding="ascii"
            ) as file:
                file.write("1")
        except FileNotFoundError:
            pass


def switch_on(device: str) -> None:
    any_socket = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
    request = struct.pack("16sh14x", device.encode(), IFF_UP)
    fcntl.ioctl(any_socket.fileno(), SIOCSIFFLAGS, request)
    any_socket.close()


def packet_socket(device: str) -> socket.socket:
    made = socket.socket(socket.AF_PACKET, socket.SOCK_RAW, socket.htons(ETH_P_ALL))
    made.setsockopt(SOL_PACKET, PACKET_AUXDATA, 1)
    made.bind((device, 0))
    return made


def main() -> None:
    is_quiet()
    switch_on("lo")
    owner = socket.socket(fileno=sys.stdin.fileno())
    owner.sendall(b"\n")
    while True:
        device = owner.recv(100)
        if not device:
            break
        made = packet_socket(device.decode())
        number = made.fileno().to_bytes(4, sys.byteorder)
        owner.sendmsg([b"\n"], [(socket.SOL_SOCKET, socket.SCM_RIGHTS, number)])
        made.close()


if __name__ == "__main__":
    main()
