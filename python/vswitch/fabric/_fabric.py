"""A fabric, over whichever of its servers can be reached."""

import re
import time
from contextlib import suppress
from typing import Callable, Iterator, List, Optional, Sequence, Tuple

import ovs.stream

from libvswitch.errors import BadParameter, NotRestored
from vswitch import transaction
from vswitch.documents import Document
from vswitch.fabric import _deciding, _documents, _tls
from vswitch.fabric._cluster import Cluster
from vswitch.fabric._drilling import Replies, drill
from vswitch.fabric._errors import OtherVersion, Unreachable
from vswitch.fabric._notation import Operation
from vswitch.fabric._plan import Difference, Plan
from vswitch.fabric._view import GENERAL, Member, View, view_of
from vswitch.fabric._watching import events
from vswitch.told import Event

__all__ = ["Fabric"]

# An election takes less.
_PATIENCE = 3.0
_LONGEST = 10.0**9


def _say_nothing(_: Optional[str]) -> None:
    pass


class Fabric:
    """The switches that hosts share, and the hosts.

    `servers` are those of the database, as "tcp:ADDRESS:PORT,tcp:ADDRESS:PORT", with ssl: or unix:
    likewise. ssl: takes the files of a private key, of its certificate, and of the authority that
    signed those of the servers; they are the same for all fabrics of a process.
    """

    def __init__(
        self,
        servers: str,
        private_key: Optional[str] = None,
        certificate: Optional[str] = None,
        ca_cert: Optional[str] = None,
    ) -> None:
        addresses = _addresses(servers)
        if any(one.startswith("ssl:") for one in addresses):
            if private_key is None or certificate is None or ca_cert is None:
                raise BadParameter("ssl: takes a private key, its certificate and an authority's")
            _tls.use(_tls.Tls(private_key, certificate, ca_cert))
        self._cluster = Cluster(addresses)

    def __enter__(self) -> "Fabric":
        return self

    def __exit__(self, *unused: object) -> None:
        self.close()

    def close(self) -> None:
        """Lets go of the server; asking again finds one."""
        self._cluster.disconnect()

    def view(self) -> View:
        """All that it has now. Raises Unreachable if no server tells."""
        if self._cluster.is_connected:
            with suppress(Unreachable):
                self._cluster.catch_up()
        self._cluster.connect(time.monotonic() + _PATIENCE)
        return view_of(self._cluster.rows)

    def plan(self, document: Document, view: Optional[View] = None) -> Plan:
        """What would change if it were as a document says; DocumentError says where that is wrong.

        Beside what documents of a host have, a switch has `hosts`; what each host has of its own is
        refused. A document that was made of a view is compared with that one: what somebody else
        changed since is then refused when the plan is applied.
        """
        wishes = _documents.read(document)
        found = Difference(view or self.view())
        for wish in wishes:
            found.add(wish)
        return Plan(self, found)

    def plan_to_forget(self, host: str) -> Plan:
        """What would change if a host were no more: the switches are not on it, its name is free.

        One that is there comes back by itself, without the switches.
        """
        found = Difference(self.view())
        found.forget(host)
        return Plan(self, found)

    def outcome(self, change: str) -> bool:
        """Whether a change was made of which nobody knew. One that was not will not be.

        To be asked within an hour: after that it is False for one that was made, too.
        """
        deadline = time.monotonic() + _PATIENCE
        self._cluster.connect(deadline)
        return _deciding.settle(self._cluster, change, deadline)

    def wait(self, revision: int, hosts: Sequence[str], seconds: float) -> View:
        """Until hosts have a revision in force; raises NotRestored, for what is changed stays so,
        if they have not after that time. Hosts that are there no longer are not waited for."""
        deadline = time.monotonic() + seconds
        while True:
            try:
                view = self.view()
            except OtherVersion:
                raise
            except Unreachable as why:
                if time.monotonic() < deadline:
                    continue
                words = "the change is made, and nobody tells where it is in force"
                raise NotRestored(f"{words}: {why}", left=list(hosts)) from None
            late = [
                name
                for name in hosts
                if name in view.hosts and view.hosts[name].in_force < revision
            ]
            if not late:
                return view
            if time.monotonic() >= deadline:
                named = ", ".join(_with_errors(view.hosts[name]) for name in late)
                words = f"the change is made, and not in force on {named}"
                raise NotRestored(f"{words} after {seconds:g} s", left=late)
            self._follow(deadline)

    def drill(self, alias: str, seconds: float = 5.0) -> Replies:
        """What would carry the connected ports of a switch on each of its hosts if an uplink
        failed, as the hosts themselves say. Nothing is taken down.

        A host that does not tell replies with a HostError that says why; None is the reply of one
        that has none until then.
        """
        switch = self.view().switches[alias]
        return drill(self._cluster, switch.id, switch.hosts, time.monotonic() + seconds)

    def watch(
        self, seconds: Optional[float] = None, lost: Callable[[Optional[str]], None] = _say_nothing
    ) -> Iterator[Event]:
        """What changes from now on: without end, or for a time.

        What changed while no server could be reached is told when one can; until then the view is
        the last one. `lost` is told why none can, once, and None when one can again.
        """
        end = time.monotonic() + (_LONGEST if seconds is None else seconds)
        # What is there when the watch begins is no event.
        return self._events(self.view(), end, lost)

    def _events(
        self, before: View, end: float, lost: Callable[[Optional[str]], None]
    ) -> Iterator[Event]:
        is_lost = False
        while time.monotonic() < end:
            self._follow(end)
            try:
                self._cluster.connect(min(end, time.monotonic() + _PATIENCE))
            except OtherVersion:
                raise
            except Unreachable as why:
                if not is_lost:
                    is_lost = True
                    lost(str(why))
                continue
            if is_lost:
                is_lost = False
                lost(None)
            after = view_of(self._cluster.rows)
            yield from events(before, after)
            before = after

    def _follow(self, deadline: float) -> None:
        """Waits for news; a server that is lost is news, too."""
        try:
            if self._cluster.is_connected:
                self._cluster.follow(deadline)
        except Unreachable:
            pass

    def _commit(self, operations: List[Operation]) -> int:
        change = _deciding.new_change()
        revision = _deciding.commit(self._cluster, change, operations)
        transaction.commit()
        return revision


def _with_errors(host: Member) -> str:
    """A host, with what may keep it from following."""
    why = [f"{where}: {host.errors[where]}" for where in GENERAL if where in host.errors]
    return f"{host.name} ({'; '.join(why)})" if why else host.name


def _addresses(servers: str) -> Tuple[str, ...]:
    """Of the forms that Open vSwitch's tools have."""
    found = tuple(one.strip() for one in servers.split(","))
    for one in found:
        is_form = re.fullmatch(r"(tcp|ssl):.+:[0-9]{1,5}|unix:.+", one)
        if not is_form or not ovs.stream.Stream.is_valid_name(one):
            raise BadParameter(f"{one!r} is no server: tcp:ADDRESS:PORT or ssl:ADDRESS:PORT")
    return found
