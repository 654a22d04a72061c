"""While settings change again and again, each frame obeys the old ones or the new ones, whatever
becomes of those who change them."""

import itertools
import json
import signal
import subprocess
from collections import Counter
from typing import Counter as Counts
from typing import Dict, List

from frame_lab import Lab, comes_true
from simhost import Client, frame

BROADCAST = "ff:ff:ff:ff:ff:ff"
# The ports of two clients, of which one is in VLAN 7 and the other one in 8: both change at once.
SWAPPING = """
import itertools, json
from simhost._loaded import LoadedControl
control = LoadedControl()
for vlans in itertools.cycle(((8, 7), (7, 8))):
    ports = [{"id": port, "vlan": vlan} for port, vlan in zip("bc", vlans)]
    control.apply(json.dumps({"switches": [{"alias": "lab", "ports": ports}]}))
    print(flush=True)
"""


class Traffic:
    """Numbered frames to all of a VLAN, of which each receiver says which ones came."""

    def __init__(self, sender: Client, receivers: Dict[str, Client]) -> None:
        self.sender = sender
        self.receivers = receivers
        self.came: Dict[str, Counts[int]] = {port: Counter() for port in receivers}
        self._numbers = itertools.count()

    def send(self, vlan: int = 7) -> int:
        number = next(self._numbers)
        payload = number.to_bytes(4, "big") + bytes(42)
        self.sender.send(frame(BROADCAST, self.sender.mac, vlan=vlan, payload=payload))
        return number

    def await_all(self, numbers: List[int]) -> None:
        """Until each of them came to somebody."""

        def have_come() -> bool:
            for port, client in self.receivers.items():
                self.came[port].update(taken(client))
            return all(any(number in came for came in self.came.values()) for number in numbers)

        assert comes_true(have_come), self.came


def taken(client: Client) -> List[int]:
    """Of the frames that have come."""
    numbers: List[int] = []
    while True:
        try:
            came = client.expect(lambda _: True, timeout=0.005)
        except AssertionError:
            return numbers
        numbers.append(int.from_bytes(came[14:18], "big"))


def vlans(lab: Lab) -> Dict[str, int]:
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    return {port["id"]: port["vlan"] for port in switch["ports"] if port["id"] != "a"}


def test_each_frame_obeys_old_or_new_settings_while_callers_are_killed(lab: Lab) -> None:
    lab.set_port("lab", "a", vlan={"trunk": ["7-8"]})
    lab.set_port("lab", "b", vlan=7)
    lab.set_port("lab", "c", vlan=8)
    sender, *receivers = (lab.client("lab", port) for port in "abc")
    traffic = Traffic(sender, dict(zip("bc", receivers)))
    for _ in range(3):
        before = {port: len(came) for port, came in traffic.came.items()}
        caller = subprocess.Popen(
            ["/usr/bin/python3", "-c", SWAPPING], env=lab.environment, stdout=subprocess.PIPE
        )
        assert caller.stdout is not None and caller.stdout.readline()

        def both_had_some() -> bool:
            traffic.await_all([traffic.send() for _ in range(10)])
            return all(len(traffic.came[port]) >= before[port] + 20 for port in before)

        assert comes_true(both_had_some)
        caller.send_signal(signal.SIGKILL)
        caller.communicate()
        assert comes_true(lab.is_in_force)
        shown = vlans(lab)
        assert sorted(shown.values()) == [7, 8]
        # Frames go where the settings say, each to one.
        sent = {vlan: traffic.send(vlan) for vlan in (7, 8)}
        traffic.await_all(list(sent.values()))
        assert all(sent[vlan] in traffic.came[port] for port, vlan in shown.items())
    copies: Counts[int] = sum(traffic.came.values(), Counter())
    assert len(copies) == sum(copies.values()) == traffic.send()
