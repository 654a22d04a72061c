"""Addresses that were learned from frames, and are cleared or put elsewhere by calls: neither
tables nor frames know of them any more."""

import json
from typing import Any, Dict, List

from simhost import Client, frame

from frame_lab import Lab

BROADCAST = "ff:ff:ff:ff:ff:ff"
LEARNED, NEXT = "02:00:00:00:77:01", "02:00:00:00:77:02"
MACS = {port: f"02:00:00:00:00:0{number}" for number, port in enumerate("abc", 1)}
VLAN = 7
# What each change returns, and what port a has then: all of it young, and such as ages.
CHANGES = """
import json
import libvswitch as vs
from libvswitch import checked

def change(call, port, kind, mac):
    entry = vs.VSMACEntry()
    entry.macAddress, entry.macAddrType, entry.vid, entry.aging = mac, kind, VLAN, 1
    status = getattr(vs, f"VSQEX_{call}PortMACTable")("lab", port, entry)
    table = checked.VSQEX_GetPortMACTable("lab", "a", vs.VS_MAC_ADDR_TYPE_ALL)
    assert all(one.aging and one.elapsed < 60 for one in table), table
    known = [[str(one.macAddress), one.macAddrType, one.vid] for one in table]
    number = checked.VSQEX_GetPortMACLearningStats("lab", "a").numMACsLearned
    return [[vs.QEX_OK, vs.QEX_NOT_FOUND].index(status), known, number]

"""
STATIC, USER, OF_FRAMES, ALL = range(4)
DONE, NOT_FOUND = 0, 1
AT_A, NOWHERE = [[[LEARNED, OF_FRAMES, VLAN]], 1], [[], 0]


def change(lab: Lab, *changes: Any) -> List[Any]:
    program = f"{CHANGES}VLAN = {VLAN}\nprint(json.dumps([change(*one) for one in {changes}]))"
    said: List[Any] = json.loads(lab.python(program))
    return said


def learn(clients: Dict[str, Client], address: str) -> None:
    """At port a, which lets in what there is room for."""
    sent = frame(BROADCAST, address)
    clients["a"].send(sent)
    for port in "bc":
        clients[port].expect(sent)


def come_to(clients: Dict[str, Client], receiver: str, sender: str, mark: bytes) -> None:
    """Frames for the address, and to no other client."""
    sent = frame(LEARNED, MACS[sender], payload=mark.ljust(46))
    clients[sender].send(sent)
    clients[receiver].expect(sent)
    (other,) = clients.keys() - {receiver, sender}
    clients[other].expect_none(sent, timeout=0.05)


def test_what_was_learned_is_cleared_and_gives_way(lab: Lab) -> None:
    learns = {"learning": True, "limit": 1, "limit_policy": "drop"}
    for port, management in zip("abc", (learns, {}, {"flooding": True})):
        lab.set_port("lab", port, vlan=VLAN, mac_learning=management)
    # Where a client itself is, is not learned.
    clients = {port: lab.frames.client("lab", port, mac=mac) for port, mac in MACS.items()}
    learn(clients, LEARNED)
    come_to(clients, "a", "b", b"learned")
    others = ("Clear", "a", STATIC, LEARNED), ("Clear", "b", OF_FRAMES, LEARNED)
    it = ("Clear", "a", OF_FRAMES, LEARNED)
    assert change(lab, *others, it, it) == [
        [NOT_FOUND, *AT_A],
        [NOT_FOUND, *AT_A],
        [DONE, *NOWHERE],
        [NOT_FOUND, *NOWHERE],
    ]
    come_to(clients, "c", "b", b"cleared")
    learn(clients, NEXT)
    whatever_it_is = ("Clear", "a", ALL, NEXT)
    assert change(lab, whatever_it_is, whatever_it_is) == [[DONE, *NOWHERE], [NOT_FOUND, *NOWHERE]]
    learn(clients, LEARNED)
    come_to(clients, "a", "c", b"learned again")
    for kind in USER, STATIC:
        assert change(lab, ("Set", "b", kind, LEARNED)) == [[DONE, *NOWHERE]]
        come_to(clients, "b", "c", b"put elsewhere")
        assert change(lab, ("Clear", "b", kind, LEARNED)) == [[DONE, *NOWHERE]]
        come_to(clients, "c", "b", b"nowhere")
