"""Sequences of calls on the simulated host, each held to what the model of a host expects."""

import copy
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional, Tuple, Union

import _libvswitch as vs
import drawn_keys
import host_calls
import host_model
from host_calls import Allocated
from host_model import Model, Port, Refusals, Switch
from hypothesis import strategies as st
from hypothesis.stateful import Bundle, RuleBasedStateMachine, initialize, invariant, rule
from simhost import Host, HostRefused

SCENARIO: Dict[str, Any] = {
    "clock": {"stopped": True, "now": 1000},
    "uplinks": [{"name": name} for name in host_model.UPLINKS],
}

# Mostly names that are there or may be, so that calls are refused for what else is wrong with them.
aliases = st.sampled_from(["a", "b", "b", "b", "c"])
new_aliases = st.sampled_from(["a", "b", "c", "", "é" * 63, "é" * 64])
new_identifiers = st.sampled_from(["", "", "id-a", "id-b", "i" * 63, "i" * 64])
new_portsets = st.sampled_from(["", "", "ports-a", "s" * 127, "s" * 128])
ports = st.sampled_from(["p1", "p1", "p2", "p3"])
new_ports = st.sampled_from(["p1", "p2", "p3", "", "p" * 47, "p" * 48])
uplinks = st.sampled_from([*host_model.UPLINKS, "nic9"])
macs = st.sampled_from([bytes.fromhex(f"02000000000{n}") for n in (1, 2)])
odd_macs = st.sampled_from([bytes.fromhex(mac) for mac in ("0100000000ff", "000000000000")])
vlans = st.sampled_from([0, 10])
odd_vlans = st.sampled_from([4094, 4095])
kinds = st.sampled_from(["STATIC", "USER", "LEARNED"])
types = st.sampled_from(
    [host_model.CONFIG, host_model.RUNTIME, host_model.VOLATILE, host_model.POLICY]
)
numbers = st.sampled_from([0, 1, 2, 3, 4, 7, 8, 1279, 1280, 9000, 9190, 9191, 2**31 - 1])
faulty = st.sampled_from(
    [
        "VSDVS_SetMTU",
        "VSDVS_AddDVPort",
        "VSDVS_CreateVSwitch",
        "VSQEX_GetUplinks",
        "DVSQEX_GlobalPropGet",
        "DVSQEX_StateInit",
    ]
)

NO_PORT = ""
Setting = Tuple[str, str]
"""A port, or no port for the switch itself, and a key."""

_keys_of_switch = st.sampled_from([*drawn_keys.of("switch"), host_model.NOTE])
_keys_of_port = st.sampled_from([*drawn_keys.of("port"), host_model.NOTE])
settings_of_all = st.one_of(
    st.tuples(st.just(NO_PORT), _keys_of_switch),
    st.tuples(ports, _keys_of_port),
    st.tuples(ports, _keys_of_switch),
    st.tuples(st.just(NO_PORT), _keys_of_port),
)
# Numbers become as many bytes as the key takes.
data_of_all: st.SearchStrategy[Union[int, bytes]] = st.one_of(numbers, st.binary(max_size=5))


class HostMachine(RuleBasedStateMachine):
    """A host with four uplinks, and what tools do to it."""

    images: Bundle[Any] = Bundle("images")

    def __init__(self) -> None:
        super().__init__()
        self.host = Host(SCENARIO, Path())
        self.model = Model()
        self.out: List[int] = []
        self.faults: Dict[str, List[Any]] = {}

    def teardown(self) -> None:
        self.host.clear_faults()
        for address in self.out:
            host_calls.release(address)
        assert self.host.ledger() == []

    @invariant()
    def the_ledger_lists_what_is_out(self) -> None:
        assert [block.address for block in self.host.ledger()] == self.out

    # Making a call, and what becomes of it.

    def call(
        self, name: str, refusals: Refusals, make: Callable[..., Any], *arguments: Any
    ) -> Optional[Tuple[Any, ...]]:
        """Makes a call; what it returns beside its status, or None if it did nothing."""
        fault = self._fault_that_hits(name)
        if isinstance(fault, type) and issubclass(fault, Exception):
            try:
                make(*arguments)
            except fault as error:
                assert str(error) == "planned"
                return None
            raise AssertionError(f"{name} does not raise {fault}")
        made = make(*arguments)
        returned = list(made) if isinstance(made, (list, tuple)) else [made]
        expected: Refusals = {str(fault)} if fault else refusals or {"QEX_OK"}
        said = vs.QEX_ReturnStatusToString(returned[0])
        assert returned[0] in {
            getattr(vs, known) for known in expected
        }, f"{name}{arguments} returns {said!r} and not {' or '.join(sorted(expected))}"
        return None if fault or refusals else tuple(returned[1:])

    def _fault_that_hits(self, name: str) -> Any:
        if name not in self.faults:
            return None
        self.faults[name][0] -= 1
        left, outcome = self.faults[name]
        if left > 0:
            return None
        del self.faults[name]
        return outcome

    @rule(name=faulty, nth=st.integers(1, 2), outcome=st.sampled_from(["QEX_BUSY", OSError]))
    def inject_a_fault(self, name: str, nth: int, outcome: Any) -> None:
        if name in self.faults:
            return
        if isinstance(outcome, str):
            self.host.fault(name, nth=nth, status=outcome)
        else:
            self.host.fault(name, nth=nth, panic=(outcome, "planned"))
        self.faults[name] = [nth, outcome]

    def _identifier(self, alias: str) -> str:
        switch = self.model.switches.get(alias)
        return switch.identifier if switch else f"not-{alias}"

    # Switches.

    @rule(
        alias=new_aliases,
        identifier=new_identifiers,
        portset=new_portsets,
        max_ports=st.sampled_from([0, 1, 2, 65_535, 65_536]),
        persistent=st.booleans(),
        mtu=st.sampled_from([0, 1279, 1280, 9190, 9191]),
        count=st.integers(0, 5),
    )
    def create(
        self,
        alias: str,
        identifier: str,
        portset: str,
        max_ports: int,
        persistent: bool,
        mtu: int,
        count: int,
    ) -> None:
        model = self.model
        names = alias, identifier, portset
        refusals = model.refusals_to_create(*names, max_ports, mtu, count)
        given = (*names, max_ports, int(persistent), 0, mtu, count)
        self._create(refusals, given, model.free_uplinks()[:count])

    @initialize(persistent=st.booleans())
    def begin(self, persistent: bool) -> None:
        self.create_with_ports("a", 1, True)
        self.create_with_ports("b", 1, persistent)

    @rule(alias=aliases, count=st.integers(0, 2), persistent=st.booleans())
    def create_with_ports(self, alias: str, count: int, persistent: bool) -> None:
        refusals = self.model.refusals_to_create(alias, "", "", 0, 0, count)
        given = (alias, None, None, 0, int(persistent), 0, 0, count)
        self._create(refusals, given, self.model.free_uplinks()[:count])
        for port in ("p1", "p2"):
            self.add_port(alias, port)

    def _create(self, refusals: Refusals, given: Tuple[Any, ...], uplinks: List[str]) -> None:
        if self.call("VSDVS_CreateVSwitch", refusals, vs.VSDVS_CreateVSwitch, *given) is None:
            return
        alias, identifier, portset, max_ports, persistent, _, mtu, _ = given
        described = self._described(alias)
        # What was left to the host is the host's to choose.
        switch = Switch(
            identifier or described["id"],
            portset or described["portset"],
            max_ports or host_model.DEFAULT_PORTS,
            bool(persistent),
            True,
            uplinks,
        )
        held = host_model.MTU.encoded(mtu or host_model.DEFAULT_MTU), host_model.CONFIG
        switch.properties.all[host_model.MTU.key] = held
        self.model.switches[alias] = switch

    def _described(self, alias: str) -> Dict[str, Any]:
        switches = self.host.describe()["switches"]
        (found,) = [switch for switch in switches if switch["alias"] == alias]
        return dict(found)

    @rule(alias=aliases)
    def destroy(self, alias: str) -> None:
        refusals = self.model.refusals_of_switch(alias)
        if self.call("VSDVS_DestroyVSwitch", refusals, vs.VSDVS_DestroyVSwitch, alias) is not None:
            del self.model.switches[alias]

    @rule(alias=aliases, run=st.booleans())
    def run_or_stop(self, alias: str, run: bool) -> None:
        name = "DVSQEX_SwitchAssociate" if run else "DVSQEX_SwitchDissociate"
        refusals = self.model.refusals_of_switch(alias)
        if self.call(name, refusals, getattr(vs, name), self._identifier(alias)) is not None:
            self.model.switches[alias].running = run

    # Ports and uplinks.

    @rule(alias=aliases, port=new_ports)
    def add_port(self, alias: str, port: str) -> None:
        refusals = self.model.refusals_to_add_port(alias, port, None)
        if self.call("VSDVS_AddDVPort", refusals, vs.VSDVS_AddDVPort, alias, port, 7) is not None:
            added = self.model.switches[alias].ports[port] = Port()
            connection = host_model.CONNECTION
            added.properties.all[connection.key] = connection.encoded(7), host_model.CONFIG

    @rule(alias=aliases, port=new_ports, external=st.sampled_from(["x1", "x2", "", "x" * 48]))
    def add_opaque_port(self, alias: str, port: str, external: str) -> None:
        refusals = self.model.refusals_to_add_port(alias, port, external)
        name, make = "VSDVS_AddOpaqueDVPort", vs.VSDVS_AddOpaqueDVPort
        if self.call(name, refusals, make, alias, port, external) is not None:
            self.model.switches[alias].ports[port] = Port(external)

    @rule(alias=aliases, port=ports)
    def remove_port(self, alias: str, port: str) -> None:
        refusals = self.model.refusals_of_port(alias, port)
        if (
            self.call("VSDVS_RemoveDVPort", refusals, vs.VSDVS_RemoveDVPort, alias, port)
            is not None
        ):
            self.model.remove_port(alias, port)

    @rule(alias=aliases, uplink=uplinks)
    def attach(self, alias: str, uplink: str) -> None:
        name, make = "VSDVS_AddSwitchUplinkPort", vs.VSDVS_AddSwitchUplinkPort
        refusals = self.model.refusals_to_attach(alias, uplink)
        if self.call(name, refusals, make, alias, uplink) is not None:
            self.model.switches[alias].uplinks.append(uplink)

    @rule(alias=aliases, uplink=uplinks)
    def detach(self, alias: str, uplink: str) -> None:
        name, make = "VSDVS_RemoveSwitchUplinkPort", vs.VSDVS_RemoveSwitchUplinkPort
        refusals = self.model.refusals_to_detach(alias, uplink)
        if self.call(name, refusals, make, alias, uplink) is not None:
            self.model.switches[alias].uplinks.remove(uplink)

    @rule(alias=aliases)
    def list_uplinks(self, alias: str) -> None:
        refusals = self.model.refusals_of_running(alias)
        answer = self.call("VSQEX_GetUplinks", refusals, host_calls.uplinks_of, alias)
        if answer is not None:
            assert sorted(answer[0]) == sorted(self.model.switches[alias].uplinks)

    # Properties, by the typed calls and the raw ones.

    @rule(alias=aliases, key=st.sampled_from(list(host_calls.TYPED_OF_SWITCH)), value=numbers)
    def set_and_get_of_switch(self, alias: str, key: str, value: int) -> None:
        known, typed = host_model.OF_SWITCH[key], host_calls.TYPED_OF_SWITCH[key]
        owner = self._owner(alias, NO_PORT)
        self._set_and_get(owner, known, typed, host_model.CONFIG, (alias,), value)

    @rule(
        alias=aliases,
        port=ports,
        key=st.sampled_from(list(host_calls.TYPED_OF_PORT)),
        value=numbers,
    )
    def set_and_get_of_port(self, alias: str, port: str, key: str, value: int) -> None:
        known, typed = host_model.OF_PORT[key], host_calls.TYPED_OF_PORT[key]
        if known.form == "<B":
            value %= 2
        owner = self._owner(alias, port)
        self._set_and_get(owner, known, typed, host_model.POLICY, (alias, port), value)

    def _set_and_get(
        self,
        owner: Tuple[Refusals, host_model.Properties],
        known: host_model.Property,
        typed: host_calls.TypedCall,
        kind: str,
        names: Tuple[str, ...],
        value: int,
    ) -> None:
        refusals, held = owner
        data = known.encoded(value)
        refusals_to_set = refusals | held.refusals_to_set(known.key, data)
        if self.call(typed.setter, refusals_to_set, typed.set, *names, value) is not None:
            held.all[known.key] = (data, kind)
        answer = self.call(typed.getter, refusals, typed.get, *names)
        if answer is not None:
            assert answer[0] == held.value(known)

    @rule(alias=aliases, setting=settings_of_all, kind=types, value=data_of_all)
    def set_raw(self, alias: str, setting: Setting, kind: str, value: Union[int, bytes]) -> None:
        port, key = setting
        data = value if isinstance(value, bytes) else host_model.encoded(key, value)
        refusals, held = self._owner(alias, port)
        name, names = self._raw("Set", alias, port)
        pointer, length = host_calls.buffer(data)
        given = *names, key, pointer, length, getattr(vs, f"{kind}_PROP_TYPE")
        refusals = refusals | held.refusals_to_set(key, data)
        if self.call(name, refusals, getattr(vs, name), *given) is not None:
            held.all[key] = (data, kind)

    @rule(alias=aliases, setting=settings_of_all, keep=st.booleans())
    def get_raw(self, alias: str, setting: Setting, keep: bool) -> None:
        port, key = setting
        refusals, held = self._owner(alias, port)
        name, names = self._raw("Get", alias, port)
        refusals = refusals | held.refusals_to_find(key)
        answer = self.call(name, refusals, host_calls.block_of, getattr(vs, name), *names, key)
        if answer is not None:
            assert answer[0].data == held.all[key][0]
            self._hold(answer[0], keep)

    @rule(alias=aliases, setting=settings_of_all)
    def clear_raw(self, alias: str, setting: Setting) -> None:
        port, key = setting
        refusals, held = self._owner(alias, port)
        name, names = self._raw("Clear", alias, port)
        refusals = refusals | held.refusals_to_find(key)
        if self.call(name, refusals, getattr(vs, name), *names, key) is not None:
            del held.all[key]

    def _owner(self, alias: str, port: str) -> Tuple[Refusals, host_model.Properties]:
        """Why there is no such owner, and its properties; nobody's if there is none."""
        if port == NO_PORT:
            refusals = self.model.refusals_of_switch(alias)
            nobody = host_model.Properties(host_model.OF_SWITCH)
            return refusals, nobody if refusals else self.model.switches[alias].properties
        refusals = self.model.refusals_of_port(alias, port)
        nobody = host_model.Properties(host_model.OF_PORT)
        return refusals, nobody if refusals else self.model.switches[alias].ports[port].properties

    def _raw(self, verb: str, alias: str, port: str) -> Tuple[str, Tuple[str, ...]]:
        identifier = self._identifier(alias)
        if port == NO_PORT:
            return f"DVSQEX_GlobalProp{verb}", (identifier,)
        return f"DVSQEX_PortData{verb}", (identifier, port)

    # Memory.

    def _hold(self, block: Allocated, keep: bool) -> None:
        if keep and block.address:
            self.out.append(block.address)
        else:
            host_calls.release(block.address)

    @rule(deallocator=st.sampled_from(host_calls.DEALLOCATORS), which=st.integers(0, 99))
    def release(self, deallocator: str, which: int) -> None:
        if self.out:
            address = self.out.pop(which % len(self.out))
            host_calls.release(address, deallocator)
            self._release_again(address, deallocator)

    def _release_again(self, address: int, deallocator: str) -> None:
        try:
            host_calls.release(address, deallocator)
        except RuntimeError as error:
            assert f"{deallocator}: the memory at {address:#x} is given back twice" in str(error)
        else:
            raise AssertionError("memory is given back twice without a word")

    # Addresses and the clock.

    @rule(
        alias=aliases,
        port=ports,
        mac=macs | macs | odd_macs,
        vlan=vlans | vlans | odd_vlans,
        kind=kinds,
    )
    def fix_address(self, alias: str, port: str, mac: bytes, vlan: int, kind: str) -> None:
        refusals = self.model.refusals_to_fix(alias, port, (mac, vlan), kind)
        make, number = host_calls.with_entry(vs.VSQEX_SetPortMACTable), self._kind(kind)
        given = alias, port, mac, vlan, number
        if self.call("VSQEX_SetPortMACTable", refusals, make, *given) is not None:
            self.model.switches[alias].addresses[mac, vlan] = host_model.Seen(
                port, kind, self.model.now
            )

    @rule(alias=aliases, port=ports, mac=macs, vlan=vlans, kind=kinds | st.just("ALL"))
    def clear_address(self, alias: str, port: str, mac: bytes, vlan: int, kind: str) -> None:
        refusals = self.model.refusals_to_clear(alias, port, (mac, vlan), kind)
        make, number = host_calls.with_entry(vs.VSQEX_ClearPortMACTable), self._kind(kind)
        given = alias, port, mac, vlan, number
        if self.call("VSQEX_ClearPortMACTable", refusals, make, *given) is not None:
            del self.model.switches[alias].addresses[mac, vlan]

    @rule(alias=aliases, which=st.integers(0, 9))
    def clear_a_fixed_address(self, alias: str, which: int) -> None:
        switch = self.model.switches.get(alias)
        fixed = [(a, s) for a, s in switch.addresses.items() if s.place] if switch else []
        if fixed:
            (mac, vlan), seen = fixed[which % len(fixed)]
            self.clear_address(alias, seen.place or "", mac, vlan, seen.type)

    @rule(alias=aliases, mac=st.sampled_from([1, 2]), vlan=st.sampled_from([0, 10]))
    def a_frame_arrives(self, alias: str, mac: int, vlan: int) -> None:
        if self.model.refusals_of_running(alias):
            return
        address = bytes([2, 0, 0, 0, 0, mac]), vlan
        kept = self.model.fixed_elsewhere(alias, None, address)
        try:
            self.host.learn(alias, f"02:00:00:00:00:0{mac}", vlan=vlan)
        except HostRefused as error:
            assert kept, str(error)
        else:
            assert not kept
            self.model.learn(alias, None, address)

    @rule(alias=aliases, port=st.none() | ports, kind=kinds | st.just("ALL"))
    def list_addresses(self, alias: str, port: Optional[str], kind: str) -> None:
        refusals = self.model.refusals_of_running(alias)
        number = self._kind(kind)
        if port is None:
            answer = self.call(
                "VSQEX_GetTeamMACTable", refusals, host_calls.team_table, alias, number
            )
        else:
            refusals = refusals | self.model.refusals_of_port(alias, port)
            given = alias, port, number
            answer = self.call("VSQEX_GetPortMACTable", refusals, host_calls.port_table, *given)
        if answer is not None:
            assert answer[0] == self._expected_table(alias, port, kind)

    def _expected_table(
        self, alias: str, port: Optional[str], kind: str
    ) -> List[Tuple[bytes, int, int, int]]:
        table = []
        for (mac, vlan), seen in self.model.addresses(alias, port).items():
            if kind in ("ALL", seen.type):
                elapsed = (self.model.now - seen.since) // 1000
                table.append((mac, vlan, self._kind(seen.type), elapsed))
        return sorted(table)

    @staticmethod
    def _kind(kind: str) -> int:
        return int(getattr(vs, f"VS_MAC_ADDR_TYPE_{kind}"))

    @rule(milliseconds=st.sampled_from([1, 999, 1000, 299_999, 300_000]))
    def step_the_clock(self, milliseconds: int) -> None:
        self.host.clock.step(milliseconds / 1000)
        self.model.now += milliseconds
        assert self.host.clock.now == self.model.now / 1000
        for alias in self.model.switches:
            self.list_addresses(alias, None, "ALL")

    # The host as a whole.

    @rule()
    def restart(self) -> None:
        self.host.restart()
        self.model.restart()

    @rule(target=images, persistent=st.booleans())
    def write_an_image(self, persistent: bool) -> Tuple[bytes, bool, Dict[str, Switch]]:
        make = vs.DVSQEX_PersistentStateGet if persistent else vs.DVSQEX_StateGet
        status, block = host_calls.block_of(make)
        assert status == vs.QEX_OK
        host_calls.release(block.address)
        return block.data, persistent, self.model.image(persistent)

    @rule(image=images, by_kernel=st.booleans())
    def read_an_image(self, image: Tuple[bytes, bool, Dict[str, Switch]], by_kernel: bool) -> None:
        data, persistent, switches = image
        pointer, length = host_calls.buffer(data)
        name = "DVSQEX_StateInit" if by_kernel else "DVSState_ConfigDeserialize"
        refusals = set() if by_kernel or persistent else {"QEX_BAD_PARAM"}
        if self.call(name, refusals, getattr(vs, name), pointer, length) is not None:
            self.model.switches = copy.deepcopy(switches)

    @rule(image=images, cut=st.integers(1, 40))
    def read_a_damaged_image(self, image: Tuple[bytes, bool, Dict[str, Switch]], cut: int) -> None:
        pointer, length = host_calls.buffer(image[0][:-cut])
        refusals = {"QEX_INVALID_METADATA"}
        self.call("DVSQEX_StateInit", refusals, vs.DVSQEX_StateInit, pointer, length)

    @invariant()
    def the_switches_are_those_of_the_model(self) -> None:
        described = self.host.describe()["switches"]
        shown = {
            switch["alias"]: (
                switch["id"],
                switch["max_ports"],
                switch["persistent"],
                sorted(switch["uplinks"]),
                sorted(port["id"] for port in switch["ports"]),
            )
            for switch in described
        }
        assert shown == {
            alias: (
                switch.identifier,
                switch.max_ports,
                switch.persistent,
                sorted(switch.uplinks),
                sorted(switch.ports),
            )
            for alias, switch in self.model.switches.items()
        }
