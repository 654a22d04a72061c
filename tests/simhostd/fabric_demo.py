"""One switch on three hosts, and what happens to it: with real frames, over a cluster of three
servers, told by the command of an operator who is at none of the hosts."""

import json
import os
import subprocess
import tempfile
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional, Tuple

from simhost import Client

from demonstrating import ping, ping_while, say
from fabric_lab import FabricLab, Host, killed, started
from frame_lab import TOOLS, comes_true
from rack import Segment, call

GUEST = "02:00:00:00:00:a1"
UPLINKS = ["nic0", "nic1"]
TEAMING = {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]}
OTHERS: Dict[str, Any] = {"uplinks": [{"name": name} for name in UPLINKS]}
FIRST = {**OTHERS, "switches": [{"alias": "rack", "teaming": TEAMING}]}
MTU = '{{"switches": [{{"alias": "rack", "mtu": {}}}]}}'
PRIVATE = """\
switches:
- alias: rack
  private_vlans:
  - {primary: 100, secondary: 100, type: promiscuous}
  - {primary: 100, secondary: 101, type: isolated}
  ports:
  - {id: gateway, vlan: {id: 100, private: true}}
  - {id: guest-1, vlan: {id: 101, private: true}}
  - {id: guest-2, vlan: {id: 101, private: true}}
"""


class Operator:
    """The command, at a machine that reaches the servers."""

    def __init__(self, lab: FabricLab) -> None:
        self._lab = lab
        program = str(TOOLS.parent / "bin" / "vswitch")
        self._words = [*lab.hub.words(), program, "--fabric", lab.databases.addresses]

    def __call__(
        self, *words: str, given: str = "", shown: bool = True, status: Optional[int] = 0
    ) -> str:
        """What it says; None stands for any status."""
        done = subprocess.run(
            [*self._words, *words],
            input=given,
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
            check=False,
        )
        if shown:
            document = f" <<< '{given}'" if given.startswith("{") else ""
            print(f"$ vswitch --fabric $SERVERS {' '.join(words)}{document}")
            print(done.stdout, end="", flush=True)
        assert status in (None, done.returncode), (words, done.returncode, done.stdout)
        return done.stdout

    def apply(self, document: Dict[str, Any]) -> None:
        self("apply", "-", "--wait", "30", given=json.dumps(document))

    def sees(self, what: Callable[[Dict[str, Any]], bool]) -> None:
        """Waits until it is true of the hosts, by their names."""

        def is_seen() -> bool:
            told = json.loads(self("hosts", "--json", shown=False))
            return bool(what({one["name"]: one for one in told["hosts"]}))

        assert comes_true(is_seen)

    def set_guest(self, **settings: Any) -> None:
        self.apply({"switches": [{"alias": "rack", "ports": [{"id": "guest-1", **settings}]}]})


def client(host: Host, port: str, address: str, **more: str) -> Client:
    made = host.frames.client("rack", port, **more)
    call(made, address)
    return made


def make(lab: FabricLab, operator: Operator) -> Segment:
    say("Three servers keep one database; three hosts come to it, and share the switch rack:")
    one, two, three = [
        lab.host(name, FIRST if name == "one" else OTHERS) for name in ("one", "two", "three")
    ]
    network = Segment(lab)
    for host in lab.hosts:
        started(host)
    print("one$ simhostctl share rack")
    one.ctl("share", "rack")
    for host in two, three:
        print(f"{host.name}$ simhostctl join rack", flush=True)
        host.ctl("join", "rack")
    for host in lab.hosts:
        host.apply({"switches": [{"alias": "rack", "uplinks": UPLINKS}]})
    operator("list")
    return network


def part(operator: Operator, hosts: List[Host]) -> Tuple[Client, Client]:
    say(
        "An operator, at none of them, makes a private VLAN: guests reach the gateway and no other."
    )
    print(PRIVATE, end="")
    operator("apply", "-", "--wait", "30", given=PRIVATE)
    say("The gateway is at host one, a guest at two, the other one at three:")
    gateway, guest, other = (
        client(hosts[0], "gateway", "10.9.0.1"),
        client(hosts[1], "guest-1", "10.9.0.11", mac=GUEST),
        client(hosts[2], "guest-2", "10.9.0.12"),
    )
    guest.comes_to_reach(gateway)
    ping(guest, gateway)
    say("Guest to guest, over the same wires:")
    ping(guest, other)
    operator("list")
    return gateway, guest


def pull(network: Segment, operator: Operator, guest: Client, gateway: Client) -> None:
    say("What would be if an uplink failed? The hosts know, and nothing is taken down for it:")
    operator("drill", "rack")
    say("Somebody pulls the first uplink of host two while pings go on:")
    ping_while(guest, gateway, network.wires["1/nic0"].pull)
    operator.sees(lambda hosts: "down" in hosts["two"]["links"].values())
    operator("hosts")
    network.wires["1/nic0"].plug()


def move(operator: Operator, three: Host, gateway: Client) -> Client:
    say("The first guest moves from host two to host three, and its settings go with it:")
    moved = client(three, "guest-1", "10.9.0.11", mac=GUEST)
    moved.comes_to_reach(gateway)
    operator("show", "rack/guest-1")
    ping(moved, gateway)
    return moved


def kill_host(operator: Operator, two: Host, guest: Client, gateway: Client) -> None:
    say("Host two dies. The others do not care, and the switch is changed without it:")
    killed(two)
    operator("apply", "-", "--wait", "1", given=MTU.format(1600), status=3)
    ping(guest, gateway)
    say("It comes back, and has what it missed:")
    started(two)
    operator.sees(lambda hosts: len({one["in_force"] for one in hosts.values()}) == 1)
    operator("hosts")
    assert two.setting("rack", "mtu") == 1600


def kill_database(lab: FabricLab, operator: Operator, guest: Client, gateway: Client) -> None:
    say("The leading one of the three servers dies; the others choose another one:")
    lab.databases.kill(lab.databases.leader())
    operator.set_guest(forbids=["forged_transmits"])
    say("A second one dies. Nobody can agree on anything now, so nothing is changed:")
    lab.databases.kill(lab.databases.running()[0])
    assert comes_true(lambda: "lost the majority" in operator("list", shown=False, status=None))
    operator("apply", "-", given=MTU.format(1500), status=1)
    say("Frames go on all the same:")
    ping(guest, gateway)
    say("The servers come back:")
    for server in {0, 1, 2} - set(lab.databases.running()):
        lab.databases.start(server)
    operator.set_guest(forbids="absent")


def main() -> None:
    with tempfile.TemporaryDirectory() as folder, FabricLab(Path(folder), servers=3) as lab:
        operator = Operator(lab)
        network = make(lab, operator)
        _, two, three = lab.hosts
        gateway, guest = part(operator, lab.hosts)
        pull(network, operator, guest, gateway)
        guest = move(operator, three, gateway)
        kill_host(operator, two, guest, gateway)
        kill_database(lab, operator, guest, gateway)
    say("Nothing of it is left: no process, namespace, device or file.")


if __name__ == "__main__":
    os.environ.pop("SIMHOST_SCENARIO", None)
    main()
