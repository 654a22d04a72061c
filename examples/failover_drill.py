#!/usr/bin/env python3
"""Take each uplink of a switch down for a moment, and see whether another one carries its ports."""

import argparse
import signal

import vswitch

import private_host


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("switch", help="alias of the switch")
    options = parser.parse_args()
    private_host.tell("failover_drill")
    signal.signal(signal.SIGTERM, signal.default_int_handler)  # ends like Ctrl-C
    switch, lost = vswitch.Host().switches[options.switch], []
    for uplink in switch.uplinks.values():
        carried = [port for port, carrier in switch.carriers().items() if carrier == uplink]
        with uplink.taken_down():
            carriers = switch.carriers()
            moved = ", ".join(f"{port} to {carriers[port] or 'none'}" for port in carried)
        print(f"{uplink} down: {moved or 'carried no port'}", flush=True)
        lost += [port for port in carried if carriers[port] is None]
    if lost:
        raise vswitch.NoUplink(f"without an uplink for a moment: {', '.join(lost)}")


if __name__ == "__main__":
    with vswitch.exits("failover_drill"):
        main()
