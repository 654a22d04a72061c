#!/usr/bin/env python3
"""Mirror a port to another one for a time, and count; whatever ends it, no session stays behind."""

import argparse
import signal

import vswitch

import private_host


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("switch", help="alias of the switch")
    parser.add_argument("port", help="what it receives and sends is mirrored")
    parser.add_argument("to", help="the port that gets it as well")
    parser.add_argument("--for", type=int, default=30, metavar="SECONDS", dest="seconds")
    options = parser.parse_args()
    private_host.tell("mirror")
    signal.signal(signal.SIGTERM, signal.default_int_handler)  # ends like Ctrl-C
    switch = vswitch.Host().switches[options.switch]
    with switch.ports[options.port].mirrored(to=switch.ports[options.to]) as mirroring:
        for stats in mirroring.sample(options.seconds):
            counted = f"{stats.discardedPkts} discarded, {stats.failedPkts} failed"
            print(f"{stats.mirroredPkts} packets mirrored, {counted}", flush=True)


if __name__ == "__main__":
    with vswitch.exits("mirror"):
        main()
