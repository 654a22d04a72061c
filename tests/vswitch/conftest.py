"""What the tests of the objects share: a clean environment, the objects of the test's host.

They run in a process with no tests of the flat module: the objects load the classes.
"""

import os
from typing import Any, Callable, Dict

import pytest

for _variable in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
    os.environ.pop(_variable, None)

import simhost  # noqa: E402  (after the environment is clean)
from vswitch import Host, Port, Switch  # noqa: E402

# Every setting, and what else a document says, at values that are no defaults.
LAB: Dict[str, Any] = {
    "runtime_options": {"IGMPVersion": 2, "IGMPRouterIP": "192.0.2.1"},
    "mac_learning": {"aging_time": 60, "limit": 1000, "learn_static": True},
    "switches": [
        {
            "alias": "lab",
            "id": "lab-1",
            "portset": "lab-ports",
            "max_ports": 64,
            "mtu": 9000,
            "uplink_ports": [
                {
                    "id": "left",
                    "name": "Left",
                    "uplink": "nic0",
                    "blocked": True,
                    "vlan": {"id": 5, "trunk": ["10-12"], "guest_tagging": True},
                    "nested_tag": True,
                },
                {"id": "spare", "properties": {"com.example.a": {"type": "config", "hex": "01"}}},
            ],
            "uplinks": ["nic1"],
            "lags": [{"name": "lag1", "uplinks": ["nic0", "nic1"]}],
            "teaming": {
                "balance": "explicit",
                "active": ["lag1"],
                "standby": ["Left"],
                "flags": ["notify", "rolling"],
                "criteria": ["link", "speed_at_least", "errors"],
                "speed": 1000,
                "full_duplex": True,
                "error_percent": 5,
            },
            "mac_learning": {"aging_time": 30, "limit": 500, "learn_static": True},
            "multicast": "snooping",
            "disabled": True,
            "private_vlans": [
                {"primary": 100, "secondary": 100, "type": "promiscuous"},
                {"primary": 100, "secondary": 101, "type": "isolated"},
            ],
            "uplink_mirror_sessions": [{"sid": "edge", "to": [{"vlan": 5}]}],
            "properties": {"com.example.note": {"type": "config", "text": "a lab"}},
            "host_properties": {"com.example.rack": {"type": "runtime", "hex": "0007"}},
            "addresses": [{"mac": "02:00:00:00:00:09"}],
            "ports": [
                {
                    "id": "desk-1",
                    "alias": "the desk",
                    "connection": 7,
                    "blocked": True,
                    "vlan": {
                        "id": 100,
                        "trunk": ["10-12", 20],
                        "priority": 5,
                        "guest_tagging": True,
                    },
                    "nested_tag": True,
                    "forbids": ["promiscuous", "forged_transmits"],
                    "ethernet_filter": {
                        "frames": ["unicast", "hashed_multicast", "sink"],
                        "addresses": ["01:00:5e:00:00:01"],
                    },
                    "teaming": {"active": ["left"]},
                    "uplink": "left",
                    "transmit_uplink": True,
                    "mac_learning": {
                        "learning": True,
                        "flooding": True,
                        "limit": 2,
                        "limit_policy": "drop",
                        "mac_change": True,
                    },
                    "addresses": [
                        {"mac": "02:00:00:00:00:01", "type": "static"},
                        {"mac": "02:00:00:00:00:02", "vlan": 10, "vni": 7, "age": 20},
                    ],
                    "groups": [
                        {
                            "address": "239.1.1.1",
                            "version": 3,
                            "source_mode": "include",
                            "sources": ["192.0.2.7"],
                            "vni": 7,
                        },
                        {"address": "01:00:5e:01:01:01"},
                        {"address": "ff02::fb", "version": 2, "source_mode": "exclude"},
                    ],
                    "mirror_sessions": [
                        {
                            "sid": "audit",
                            "name": "audit of the desk",
                            "snap_length": 128,
                            "sampling_rate": 10,
                            "to": [{"port": "desk-2"}],
                            "received_by": [{"port": "desk-1"}, {"vlan": 5}],
                            "sent_by": [{"uplink": "nic0"}, {"ip": "192.0.2.9"}, {"number": 7}],
                        },
                        {
                            "sid": "far",
                            "type": "encapsulated",
                            "disabled": True,
                            "promiscuous": True,
                            "to": [{"ip": "2001:db8::1"}],
                            "encapsulation": {
                                "type": "erspan2",
                                "key": 9,
                                "vlan": 30,
                                "id": 4,
                                "cos": 1,
                                "granularity": 2,
                            },
                            "encapsulates": True,
                            "keeps_vlan": True,
                            "no_output": True,
                            "no_input": True,
                            "mirrors_uplinks": True,
                            "uplink_filter": "vxlan",
                            "received_from": ["uplinks"],
                            "sent_from": ["vmm", "test"],
                            "stack": True,
                        },
                    ],
                    "counters": {"numMACsMoved": 4, "pktsInUnicast": 100},
                    "properties": {"com.example.note": {"type": "policy", "hex": "01000000"}},
                },
                {"id": "desk-2", "vlan": {"id": 101, "private": True}},
                {"id": "desk-3", "vlan": 7},
                {"id": "desk-4"},
            ],
        },
    ],
}


@pytest.fixture
def objects(host: simhost.Host) -> Host:
    """The objects of a fresh host."""
    return Host(simulated=True)


@pytest.fixture
def lab(host: simhost.Host, objects: Host) -> Switch:
    """A switch with every setting."""
    host.apply(LAB)
    return objects.switches["lab"]


@pytest.fixture
def desk(lab: Switch) -> Port:
    """A port with every setting."""
    return lab.ports["desk-1"]


@pytest.fixture
def bare(lab: Switch) -> Port:
    """A port with no setting."""
    return lab.ports["desk-4"]


@pytest.fixture
def interrupt(monkeypatch: pytest.MonkeyPatch) -> Callable[..., None]:
    """Lets Ctrl-C come in a call, before or after it is done, as it does the first time."""
    from libvswitch import checked

    def patch(name: str, *, nth: int = 1, done: bool) -> None:
        call, turns = getattr(checked, name), iter(range(1, 100))

        def interrupted(*arguments: Any) -> Any:
            is_now = next(turns) == nth
            if is_now and not done:
                raise KeyboardInterrupt
            result = call(*arguments)
            if is_now:
                raise KeyboardInterrupt
            return result

        monkeypatch.setattr(checked, name, interrupted)

    return patch
