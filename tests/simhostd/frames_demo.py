"""Real frames between clients in network namespaces, over a switch that Python calls make."""

import itertools
import os
import tempfile
import time
from pathlib import Path

from simhost import Client

from demonstrating import ping, ping_while, say
from frame_lab import ONE_SWITCH, Lab


def show(lab: Lab, *words: str) -> None:
    print(f"$ simhostctl {' '.join(words)}")
    print(lab.ctl(*words), end="", flush=True)


MAKE = """
from libvswitch import checked
checked.VSDVS_CreateVSwitch("rack", None, None, 8, True, 0, 1500, 2)
for port in ("web-1", "web-2", "probe"):
    checked.VSDVS_AddDVPort("rack", port, 0)
"""

LISTEN = """
import socket
sniffer = socket.socket(socket.AF_PACKET, socket.SOCK_RAW, socket.htons(0x0800))
sniffer.bind(("eth0", 0))
for _ in range(2):
    frame = sniffer.recv(2000)
    text = lambda at, size, form, between: between.join(form % byte for byte in frame[at:at + size])
    print(text(6, 6, "%02x", ":"), "to", text(0, 6, "%02x", ":") + ":",
          text(26, 4, "%d", "."), "to", text(30, 4, "%d", "."), flush=True)
"""


def cut_and_join(lab: Lab, one: Client, other: Client) -> None:
    say("Two clients at ports of one VLAN reach each other:")
    ping(one, other)
    say("In different VLANs they do not:")
    lab.set_port("rack", "web-1", vlan=7)
    one.ceases_to_reach(other)
    ping(one, other)
    say("And in the same one they do again:")
    lab.set_port("rack", "web-2", vlan=7)
    one.comes_to_reach(other)
    ping(one, other)
    lab.set_port("rack", "web-1", vlan=0)
    lab.set_port("rack", "web-2", vlan=0)


def fail_over(lab: Lab, one: Client) -> None:
    network = lab.network("nic0", "nic1")
    far = network.client()
    lab.apply({"switches": [{"alias": "rack", "teaming": {"balance": "explicit"}}]})
    one.comes_to_reach(far)
    say("A client beyond the uplinks; one uplink loses its link while pings go on:")
    ping_while(one, far, lambda: network.pull("nic0"))
    show(lab, "show")


def mirror(lab: Lab, one: Client, other: Client) -> None:
    say("What web-1 sends is mirrored to a probe in a VLAN of its own:")
    probe = lab.client("rack", "probe")
    lab.set_port("rack", "probe", vlan=99)
    session = {"sid": "look", "to": [{"port": "probe"}], "sent_by": [{"port": "web-1"}]}
    lab.set_port("rack", "web-1", mirror_sessions=[session])
    with probe.start("/usr/bin/python3", "-c", LISTEN, stdout=-1) as listening:
        assert listening.stdout is not None
        time.sleep(0.3)
        ping(one, other)
        for line in itertools.islice(listening.stdout, 2):
            print(f"probe: {line}", end="", flush=True)


def main() -> None:
    with tempfile.TemporaryDirectory() as folder:
        empty = {"uplinks": ONE_SWITCH["uplinks"]}
        with Lab(Path(folder), empty) as lab:
            say("simhostd moves the frames of a host, with an Open vSwitch of its own:")
            lab.start()
            show(lab, "plane")
            say(f"Calls of the module make a switch:{MAKE}")
            lab.python(MAKE)
            one, other = lab.client("rack", "web-1"), lab.client("rack", "web-2")
            cut_and_join(lab, one, other)
            fail_over(lab, one)
            mirror(lab, one, other)
            show(lab, "plane")


if __name__ == "__main__":
    os.environ.pop("SIMHOST_SCENARIO", None)
    main()
