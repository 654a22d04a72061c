"""An endless row of changes to a host, of every kind, and the same from one seed every time.

usage: churn.py run SEED FIRST     makes the changes from FIRST on, and writes the number of each
                                   when its call has returned
       churn.py replay SEED A B    makes the changes 0 to B-1 on a host in memory; what the host
                                   was before A and is at last
       churn.py show               what the host of SIMHOST_STATE is

Each change is one call, so that whoever is killed at it has made it or has not.
"""

import ctypes
import hashlib
import json
import os
import random
import sys
from pathlib import Path
from typing import Any, Callable, Counter, Dict, List, Tuple

import libvswitch as vs
from libvswitch.enums import Balance, Forbid

SIMHOST = ctypes.CDLL(str(Path(os.environ["BUILD_DIR"]) / "simhost" / "libsimhost.so"))
DEFAULT_HOST = Path(__file__).parents[3] / "simhost" / "scenario" / "default_host.json"
Change = Callable[[random.Random], Any]
CHANGES: Dict[str, Change] = {}

UPLINKS = [f"nic{number}" for number in range(6)]
KEYS = [f"com.example.{number}" for number in range(2)]
TYPES = [vs.CONFIG_PROP_TYPE, vs.RUNTIME_PROP_TYPE, vs.VOLATILE_PROP_TYPE, vs.POLICY_PROP_TYPE]


def change(function: Change) -> Change:
    CHANGES[function.__name__] = function
    return function


def switch(chance: random.Random) -> str:
    return f"s{chance.randrange(2)}"


def port(chance: random.Random) -> str:
    return f"p{chance.randrange(3)}"


def noise(chance: random.Random) -> Any:
    """Bytes of a length that is now and then more than a page of the file."""
    length = chance.choice([0, 1, 60, 3000, 9000])
    return vs.Cell("qex_uint8", chance.choices(range(256), k=max(length, 1))), length


def mac(chance: random.Random) -> str:
    return f"02:00:00:00:00:{chance.randrange(2):02x}"


@change
def create_switch(chance: random.Random) -> Any:
    name = switch(chance)
    lasts, uplinks = chance.random() < 0.8, chance.randrange(3)
    return vs.VSDVS_CreateVSwitch(name, f"{name}-id", f"{name}-ports", 5, lasts, 0, 0, uplinks)


@change
def add_kernel_switch(chance: random.Random) -> Any:
    name = switch(chance)
    return vs.DVSQEX_SwitchAdd(f"{name}-id", name, 5, 200)


@change
def associate(chance: random.Random) -> Any:
    return vs.DVSQEX_SwitchAssociate(f"{switch(chance)}-id")


@change
def destroy_switch(chance: random.Random) -> Any:
    if chance.random() < 0.7:
        return None
    return vs.VSDVS_DestroyVSwitch(switch(chance))


@change
def limit_ports(chance: random.Random) -> Any:
    return vs.DVSQEX_SwitchSetMaxPorts(f"{switch(chance)}-id", chance.randrange(2, 8))


@change
def add_port(chance: random.Random) -> Any:
    return vs.VSDVS_AddDVPort(switch(chance), port(chance), chance.randrange(100))


@change
def add_opaque_port(chance: random.Random) -> Any:
    name = port(chance)
    return vs.VSDVS_AddOpaqueDVPort(switch(chance), name, f"theirs-{name}")


@change
def remove_port(chance: random.Random) -> Any:
    return vs.VSDVS_RemoveDVPort(switch(chance), port(chance))


@change
def set_mtu(chance: random.Random) -> Any:
    return vs.VSDVS_SetMTU(switch(chance), chance.randrange(1280, 9190))


@change
def set_teaming(chance: random.Random) -> Any:
    policy = vs.VSTeamPolicy()
    policy.loadBalance = Balance(chance.randrange(6))
    policy.linkCriteria = vs.TEAM_FRP_CRIT_LINK_STATE
    policy.flags = vs.TEAM_FRP_FLAG_NOTIFY_SWITCH
    policy.numActive = 1
    policy[0] = chance.choice(UPLINKS)
    if chance.random() < 0.5:
        return vs.VSDVS_SetTeamingPolicy(switch(chance), policy)
    return vs.VSDVS_SetPortTeamingPolicy(switch(chance), port(chance), policy)


@change
def clear_teaming(chance: random.Random) -> Any:
    return vs.VSDVS_ClearPortTeamingPolicy(switch(chance), port(chance))


@change
def set_vlan(chance: random.Random) -> Any:
    vlan = chance.randrange(4095)
    return vs.VSDVS_SetPortVLANPolicy(switch(chance), port(chance), vlan, 3, 0, 0, None, 0)


@change
def set_security(chance: random.Random) -> Any:
    security = vs.VSPropSecurity()
    security.flags = Forbid(chance.randrange(8))
    return vs.VSDVS_SetPortSecurity(switch(chance), port(chance), security)


@change
def set_mac_learning(chance: random.Random) -> Any:
    learning = vs.VSPMACLearning()
    learning.learning, learning.macLimit = True, chance.randrange(1, 10)
    return vs.VSDVS_SetPortMACLearning(switch(chance), port(chance), learning)


@change
def set_global_property(chance: random.Random) -> Any:
    data, length = noise(chance)
    key, kind = chance.choice(KEYS), chance.choice(TYPES)
    return vs.DVSQEX_GlobalPropSet(f"{switch(chance)}-id", key, data.pointer, length, kind)


@change
def set_host_property(chance: random.Random) -> Any:
    data, length = noise(chance)
    key, kind = chance.choice(KEYS), chance.choice(TYPES)
    return vs.DVSQEX_HostPropSet(f"{switch(chance)}-id", key, data.pointer, length, kind)


@change
def set_port_property(chance: random.Random) -> Any:
    data, length = noise(chance)
    where = (f"{switch(chance)}-id", port(chance), chance.choice(KEYS))
    return vs.DVSQEX_PortDataSet(*where, data.pointer, length, chance.choice(TYPES))


@change
def clear_property(chance: random.Random) -> Any:
    return vs.DVSQEX_PortDataClear(f"{switch(chance)}-id", port(chance), chance.choice(KEYS))


@change
def add_uplink(chance: random.Random) -> Any:
    return vs.VSDVS_AddSwitchUplinkPort(switch(chance), chance.choice(UPLINKS))


@change
def remove_uplink(chance: random.Random) -> Any:
    return vs.VSDVS_RemoveSwitchUplinkPort(switch(chance), chance.choice(UPLINKS))


@change
def switch_link(chance: random.Random) -> Any:
    state = chance.choice([vs.QEX_LINK_STATE_UP, vs.QEX_LINK_STATE_DOWN])
    return vs.VSQEX_SetUplinkAdminLinkState(switch(chance), chance.choice(UPLINKS), state)


@change
def pull_cable(chance: random.Random) -> Any:
    return SIMHOST.simhost_set_link(chance.choice(UPLINKS).encode(), chance.randrange(2))


@change
def put_address(chance: random.Random) -> Any:
    entry = vs.VSMACEntry()
    entry.macAddress, entry.macAddrType = mac(chance), vs.VS_MAC_ADDR_TYPE_STATIC
    return vs.VSQEX_SetPortMACTable(switch(chance), port(chance), entry)


@change
def remove_address(chance: random.Random) -> Any:
    entry = vs.VSMACEntry()
    entry.macAddress, entry.macAddrType = mac(chance), vs.VS_MAC_ADDR_TYPE_ALL
    return vs.VSQEX_ClearPortMACTable(switch(chance), port(chance), entry)


@change
def learn_address(chance: random.Random) -> Any:
    where = (switch(chance).encode(), chance.choice([None, port(chance).encode()]))
    return SIMHOST.simhost_learn(*where, mac(chance).encode(), 0, 0)


@change
def mirror(chance: random.Random) -> Any:
    table = vs.alloc_dvmirror_session_table(1, 1)
    table.version = vs.VS_DVMIRROR_VERSION_V3
    session = table[0]
    session.sid, session.type = f"m{chance.randrange(2)}", vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
    session.numDstEntities = 1
    entity = table.get_first_session_entity(0)
    entity.type = vs.MIRROR_ENTTYPE_DVPORT
    entity.set_entity(port(chance))
    status = vs.VSDVS_AppendDVMirrorSessions(switch(chance), port(chance), table)
    vs.free_dvmirror_session_table(table)
    return status


@change
def end_mirror(chance: random.Random) -> Any:
    return vs.VSDVS_RemoveDVMirrorSession(switch(chance), port(chance), f"m{chance.randrange(2)}")


@change
def set_option(chance: random.Random) -> Any:
    name = "MaxRARPsPerInterval"
    kind = vs.get_runtime_option_type_from_name(name)
    options: Any = vs.VSRuntimeOptions(64)
    first = options.get_first_option()
    end = options.add_int_option(first, name, kind, chance.randrange(1000))
    options.set_options_length(int(end) - int(first))
    return vs.VSQEX_SetRuntimeOptions(options)


@change
def set_learning_of_the_host(chance: random.Random) -> Any:
    props = vs.VSMACLearningGlobalProps()
    props.agingTime, props.macLimit = chance.randrange(1, 1000), chance.randrange(1, 1000)
    return vs.VSQEX_SetGlobalMACLearningProps(props)


@change
def set_counter(chance: random.Random) -> Any:
    value = ctypes.c_uint64(chance.randrange(1000))
    return SIMHOST.simhost_set_counter(switch(chance).encode(), None, None, b"txErrors", value)


@change
def apply_document(chance: random.Random) -> Any:
    ports = [{"id": port(chance), "groups": [{"address": "239.1.1.1"}]} for _ in range(2)]
    document = {"switches": [{"alias": switch(chance), "max_ports": 5, "ports": ports}]}
    document["switches"][0]["id"] = f"{document['switches'][0]['alias']}-id"
    return SIMHOST.simhost_apply(json.dumps(document).encode())


@change
def set_clock(chance: random.Random) -> Any:
    return SIMHOST.simhost_clock_set(ctypes.c_int64(chance.randrange(1_000_000_000)))


@change
def step_clock(chance: random.Random) -> Any:
    return SIMHOST.simhost_clock_step(ctypes.c_int64(chance.randrange(100_000)))


def image(get: Callable[[Any, Any], int]) -> Any:
    data, length = vs.Cell("void *"), vs.Cell("int")
    assert get(data.pointer, length.pointer) == vs.QEX_OK
    copy = vs.Cell("qex_uint8", list(data.read(length.value)))
    vs.DVSQEX_DataFree(data.value)
    return copy, length.value


@change
def load_configuration(chance: random.Random) -> Any:
    kept, length = image(vs.DVSQEX_PersistentStateGet)
    return vs.DVSState_ConfigDeserialize(kept.pointer, length)


@change
def load_state(chance: random.Random) -> Any:
    whole, length = image(vs.DVSQEX_StateGet)
    return vs.DVSQEX_StateInit(whole.pointer, length)


@change
def sanitize(chance: random.Random) -> Any:
    return vs.DVSQEX_StateSanitize()


@change
def restart(chance: random.Random) -> Any:
    return SIMHOST.simhost_restart() if chance.random() < 0.3 else None


@change
def empty_everything(chance: random.Random) -> Any:
    if chance.random() < 0.8:
        return None
    return chance.choice([vs.DVSState_ConfigReset, vs.DVSQEX_StateCleanup])()


def make(seed: str, number: int) -> Tuple[str, Any]:
    """The change of that number: what it was, and its status; None if it left the host alone."""
    chance = random.Random(f"{seed}-{number}")
    # Some changes have nothing to work on without these, so these come more often.
    names = [*CHANGES, "create_switch", "create_switch", "add_port", "add_port", "add_uplink"]
    name = chance.choice(names)
    return name, CHANGES[name](chance)


def described() -> bytes:
    """All that the host is: the data plane's part in words, and the configuration in bytes."""
    size = SIMHOST.simhost_describe(None, ctypes.c_size_t(0)) + 1
    text = ctypes.create_string_buffer(size)
    SIMHOST.simhost_describe(text, ctypes.c_size_t(size))
    data, length = vs.Cell("void *"), vs.Cell("int")
    assert vs.DVSQEX_StateGet(data.pointer, length.pointer) == vs.QEX_OK
    whole = text.value + data.read(length.value)
    vs.DVSQEX_DataFree(data.value)
    return whole


def digest() -> str:
    return hashlib.sha256(described()).hexdigest()


def run(seed: str, first: int) -> None:
    number = first
    while True:
        make(seed, number)
        os.write(1, f"{number}\n".encode())
        number += 1


def replay(seed: str, before: int, after: int) -> None:
    succeeded: Counter[str] = Counter()
    digests: List[str] = []
    for number in range(after):
        if number == before:
            digests.append(digest())
        name, status = make(seed, number)
        succeeded[name] += status == vs.QEX_OK
    digests.append(digest())
    print(json.dumps({"digests": digests, "succeeded": succeeded}))


def begin_with_a_clock_that_stands() -> None:
    """A new host notes what time it is, which would be another in every run."""
    host = json.loads(DEFAULT_HOST.read_text())
    host["clock"] = {"stopped": True, "now": 1000}
    scenario = os.memfd_create("scenario")
    os.write(scenario, json.dumps(host).encode())
    os.environ["SIMHOST_SCENARIO"] = f"/proc/self/fd/{scenario}"


def main() -> None:
    begin_with_a_clock_that_stands()
    what, *words = sys.argv[1:]
    if what == "run":
        run(words[0], int(words[1]))
    elif what == "replay":
        replay(words[0], int(words[1]), int(words[2]))
    else:
        print(digest())


if __name__ == "__main__":
    main()
