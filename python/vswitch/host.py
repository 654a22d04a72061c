"""The host, and what it has."""

from __future__ import annotations

import contextlib
import ctypes
import typing
from typing import (
    Any,
    AsyncIterator,
    Callable,
    Collection,
    Dict,
    Iterable,
    Iterator,
    Mapping,
    Optional,
    Tuple,
)

import _libvswitch as _flat
import libvswitch as _vs
from libvswitch import checked
from libvswitch.errors import HostError, NotFound
from vswitch import _describing, _records, _table, _undo, words as _words
from vswitch._mapping import Live
from vswitch._thing import Thing
from vswitch.options import Options
from vswitch.port import Port
from vswitch.switch import Switch
from vswitch.transaction import Transaction, commit, find_transaction
from vswitch.uplink import Uplink, find_port_of
from vswitch.values import MacLearning, Words, to_words

if typing.TYPE_CHECKING:
    from vswitch.documents import Document
    from vswitch.plan import Plan
    from vswitch.told import Event, MacEntry


class Host:
    """The host of this process.

    `simulated=False` refuses a simulated host, `simulated=True` demands one.
    """

    def __init__(self, simulated: Optional[bool] = None) -> None:
        if simulated is not None and self.simulated is not simulated:
            raise HostError(
                "this host is simulated, and a real one is wanted"
                if self.simulated
                else "this host is a real one, and a simulated one is wanted"
            )

    @property
    def simulated(self) -> bool:
        """Whether the libraries that are loaded only simulate a host."""
        return hasattr(ctypes.CDLL(_flat.__file__), "simhost_error")

    # What it has

    @property
    def switches(self) -> "Mapping[str, Switch]":
        """Its switches, by their aliases."""
        return Live(self._aliases, self._get_switch, "switches", lambda alias: Switch(self, alias))

    def _aliases(self) -> Iterator[str]:
        for handle in checked.DVSState_SwitchForEach():
            alias = checked.DVS_SwitchName(handle)
            if alias is not None:
                yield alias

    def _get_switch(self, alias: str) -> Switch:
        checked.DVSAliasToSwitchId(alias)
        return Switch(self, alias)

    @property
    def uplinks(self) -> "Mapping[str, Uplink]":
        """The uplinks that its switches have, by their names; of others no call tells."""
        return Live(self._uplinks, self._get_uplink, "uplinks")

    def _uplinks(self) -> Dict[str, Uplink]:
        running = [one for one in self.switches.values() if one.running]
        return {name: uplink for switch in running for name, uplink in switch.uplinks.items()}

    def _get_uplink(self, name: str) -> Uplink:
        if find_port_of(name) is None:
            raise NotFound(f"the uplink {name!r} is at no switch")
        return self._uplinks()[name]

    def ports(self) -> Iterator[Port]:
        """All ports for clients, of all switches."""
        for switch in self.switches.values():
            yield from switch.ports.values()

    def find_mac(self, mac: str) -> Tuple[MacEntry, ...]:
        """Where an address is, in any spelling: the entries of all tables that have it."""
        wanted = _words.mac(mac)
        running = (one for one in self.switches.values() if one.running)
        return tuple(entry for one in running for entry in one.macs if entry.mac == wanted)

    def state(self) -> Dict[str, Words]:
        """The host as a document: ready for JSON, in the words of scenario documents."""
        return _describing.host_state(self)

    def snapshot(self, anonymize: bool = False, key: Optional[bytes] = None) -> Dict[str, Words]:
        """The host as a scenario document from which a simulated host starts as its clone.

        What a call refuses, what no document says and what no call tells is listed under
        `observed`. With `anonymize` names and addresses are others, each the same wherever it
        stands; with a key they become the same in all snapshots that are made with it.
        """
        from vswitch import anonymizing, snapshot

        said = snapshot.snapshot(self)
        return anonymizing.anonymized(said, key) if anonymize else said

    # Its own settings

    @property
    def options(self) -> Options:
        """Its runtime options, by their names."""
        return Options(self)

    @property
    def mac_learning(self) -> MacLearning:
        """MAC learning of the switches that have no setting of their own."""
        return _records.learning_from(checked.VSQEX_GetGlobalMACLearningProps())

    @mac_learning.setter
    def mac_learning(self, given: MacLearning) -> None:
        known = _table.SWITCH["mac_learning"]
        held = _words.read(known.form, to_words(known.form, given), "mac_learning")
        with self._writing(_undo.HostLearning, self):
            self._set_mac_learning(MacLearning.from_words(held))

    def _set_mac_learning(self, learning: MacLearning) -> None:
        checked.VSQEX_SetGlobalMACLearningProps(
            _vs.VSMACLearningGlobalProps(
                agingTime=learning.aging_time,
                macLimit=learning.limit,
                learnStatic=learning.learn_static,
            )
        )

    # What can be done with it

    def add_switch(
        self,
        alias: str,
        *,
        identifier: Optional[str] = None,
        portset: Optional[str] = None,
        max_ports: int = 0,
        persistent: bool = True,
        version: int = 0,
        mtu: int = 0,
        uplinks: Iterable[str] = (),
    ) -> Switch:
        """Adds a switch, with uplinks of the host. The host chooses what is not given."""
        switch = Switch(self, alias)
        named = _words.items(uplinks, "uplinks")
        with self._whole():
            with self._writing(_undo.Added, switch):
                checked.VSDVS_CreateVSwitch(
                    alias, identifier, portset, max_ports, persistent, version, mtu, 0
                )
            for name in named:
                switch.add_uplink(name)
        return switch

    def plan(self, document: "Document", whole: bool = False) -> "Plan":
        """What a document would change; with `whole`, what it does not name goes. See Plan."""
        from vswitch.plan import Plan

        return Plan(self, document, whole)

    def transaction(self) -> Transaction:
        """A block that changes everything or nothing; see Transaction."""
        return Transaction(self)

    def _whole(self) -> Transaction:
        """Several writes that are one to the caller, who gets what they raise."""
        return Transaction(self, raises=False)

    def watch(
        self,
        every: float = 1.0,
        seconds: Optional[float] = None,
        kinds: Optional[Collection[str]] = None,
    ) -> Iterator[Event]:
        """What changes from now on, looked for every so many seconds, until so many are over.

        `kinds` are some of watch.KINDS.
        """
        from vswitch import watch

        return watch.watch(self, every, seconds, kinds)

    def awatch(
        self,
        every: float = 1.0,
        seconds: Optional[float] = None,
        kinds: Optional[Collection[str]] = None,
    ) -> AsyncIterator[Event]:
        """The same for `async for`; others go on meanwhile."""
        from vswitch import watch

        return watch.awatch(self, every, seconds, kinds)

    # What transactions are told

    @contextlib.contextmanager
    def _writing(self, step: Callable[..., _undo.Step], *about: Any) -> Iterator[None]:
        """Around a write: a transaction notes what is there before it; without one it stays."""
        transaction = find_transaction(self)
        if transaction is not None:
            transaction.note(step(*about))
            yield
            return
        try:
            yield
        except HostError as error:
            # What is refused is not done; what traps may be.
            if error.status is None:
                commit()
            raise
        commit()

    def _writing_properties(
        self, thing: Thing, keys: Tuple[str, ...]
    ) -> typing.ContextManager[None]:
        return self._writing(_undo.Properties, thing, keys)

    def __repr__(self) -> str:
        return f"<Host{' (simulated)' if self.simulated else ''}: {', '.join(self.switches)}>"
