"""Calls that change what hosts share, each in a process of its own, and what each does if it is
made: a model of the fabric."""

import copy
import json
import random
import re
import subprocess
import sys
from dataclasses import dataclass, field
from typing import Any, Callable, Collection, Dict, List, Mapping, Optional, Sequence, Tuple

import _libvswitch

from fabric_history import Port, Switch, Switches, Transaction
from fabric_lab import Host
from frame_lab import TOOLS

Effect = Callable[[Switches], None]
"""What becomes of the switches. KeyError if nothing can."""

CTL = str(TOOLS / "simhostctl")
OPERATOR = ""
"""Is no host."""
SHARED_ANEW = {"max_ports": 100, "version": 200, "mtu": 1500}
"""The settings of switches that come and go."""

_REFUSED = ("QEX_BUSY", "QEX_NOT_FOUND", "QEX_IS_DISCONNECTED")
_KILLED = -9
# Which of the calls that may be a change is taken to be it.
_ORDER = {"made": 0, "unknown": 1, "refused": 2}


# What is wanted.


@dataclass(frozen=True)
class Wanted:
    """A call that is yet to be made."""

    what: str
    command: Sequence[str]
    effect: Effect
    given: str = ""
    is_idle: Callable[[Switches], bool] = lambda _: False
    """Whether it succeeds and is no change of what is shared."""
    shares: str = ""
    """The alias of a switch that it shares."""
    is_change: bool = False
    """Also where it makes nothing other."""
    taken_back: Optional[Effect] = None
    """By a change that follows, where its host finds that it cannot bear what is made."""


def _applied(*of_switch: Mapping[str, Any]) -> str:
    return json.dumps({"switches": of_switch})


def _python(call: str) -> Sequence[str]:
    """A call of the flat module."""
    program = f"status = vs.{call}; sys.exit(f'status {{int(status)}}' if status else 0)"
    return [sys.executable, "-c", f"import sys, _libvswitch as vs; {program}"]


def put_port(command: Sequence[str], alias: str, port: str, **settings: Any) -> Wanted:
    """Has settings in a port, which comes to be if it is not there."""

    def effect(switches: Switches) -> None:
        switches[alias].ports.setdefault(port, Port()).settings.update(settings)

    given = _applied({"alias": alias, "ports": [{"id": port, **settings}]})
    return Wanted(f"{alias}/{port} {settings}", [*command, "apply", "-"], effect, given)


def set_switch(command: Sequence[str], alias: str, **settings: Any) -> Wanted:
    def effect(switches: Switches) -> None:
        switches[alias].settings.update(settings)

    given = _applied({"alias": alias, **settings})
    return Wanted(f"{alias} {settings}", [*command, "apply", "-"], effect, given)


def add_port(host: str, alias: str, port: str) -> Wanted:
    """To a switch that may be none of the host by then."""

    def effect(switches: Switches) -> None:
        switches[alias].ports[port] = Port(settings={"connection": 0})

    command = _python(f"VSDVS_AddDVPort('{alias}', '{port}', 0)")
    return Wanted(f"add {alias}/{port}", command, effect, is_idle=_is_own(host, alias))


def remove_port(alias: str, port: str) -> Wanted:
    call = f"VSDVS_RemoveDVPort('{alias}', '{port}')"
    return Wanted(f"remove {alias}/{port}", _python(call), _port_removed(alias, port))


def operator_removes_port(command: Sequence[str], alias: str, port: str) -> Wanted:
    words = [*command, "remove", f"{alias}/{port}"]
    return Wanted(f"remove {alias}/{port}", words, _port_removed(alias, port))


def _port_removed(alias: str, port: str) -> Effect:
    def effect(switches: Switches) -> None:
        del switches[alias].ports[port]

    return effect


def connect(host: str, alias: str, port: str, device: str) -> Wanted:
    def effect(switches: Switches) -> None:
        switches[alias].ports[port].host = host

    def is_there(switches: Switches) -> bool:
        ports = switches[alias].ports
        return port in ports and ports[port].host == host

    command = [CTL, "connect", alias, port, device]
    return Wanted(f"connect {alias}/{port}", command, effect, is_idle=is_there)


def disconnect(host: str, alias: str, port: str) -> Wanted:
    def effect(switches: Switches) -> None:
        if switches[alias].ports[port].host != host:
            raise KeyError(port)
        switches[alias].ports[port].host = ""

    return Wanted(f"disconnect {alias}/{port}", [CTL, "disconnect", alias, port], effect)


def share(host: str, alias: str) -> Wanted:
    """A switch that comes to be for that."""

    def effect(switches: Switches) -> None:
        if alias in switches:
            raise KeyError(alias)
        switches[alias] = Switch({host}, dict(SHARED_ANEW))

    command = ["sh", "-c", f"{CTL} apply - && exec {CTL} share {alias}"]
    given = _applied({"alias": alias, **SHARED_ANEW})
    return Wanted(f"share {alias}", command, effect, given, shares=alias)


def join(host: str, alias: str) -> Wanted:
    def effect(switches: Switches) -> None:
        switches[alias].hosts.add(host)

    def taken_back(switches: Switches) -> None:
        if alias in switches:
            switches[alias].hosts.discard(host)

    command = [CTL, "join", alias]
    return Wanted(f"join {alias}", command, effect, is_change=True, taken_back=taken_back)


def leave(host: str, alias: str) -> Wanted:
    """Its ports there are connected no longer."""

    def effect(switches: Switches) -> None:
        switches[alias].hosts.remove(host)
        for port in switches[alias].ports.values():
            if port.host == host:
                port.host = ""

    command = _python(f"VSDVS_DestroyVSwitch('{alias}')")
    return Wanted(f"leave {alias}", command, effect, is_idle=_is_own(host, alias))


def _is_own(host: str, alias: str) -> Callable[[Switches], bool]:
    """A host may have one of that name that it does not share, or no longer."""
    return lambda switches: alias not in switches or host not in switches[alias].hosts


def operator_removes_switch(command: Sequence[str], alias: str) -> Wanted:
    def effect(switches: Switches) -> None:
        del switches[alias]

    return Wanted(f"remove {alias}", [*command, "remove", alias], effect)


# What was made of it.


@dataclass
class Call:
    """One that was begun, and what was said of it."""

    host: str
    wanted: Wanted
    outcome: str = "unknown"
    change: str = ""
    """Its id, where it was told."""
    said: str = ""

    def __str__(self) -> str:
        return f"{self.host or 'operator'}: {self.wanted.what}"

    def may_be(self, transaction: Transaction, before: Switches, may_leave: bool = False) -> bool:
        """Whether it is that change, to all that is known; and ports that its host leaves with it,
        if that may be."""
        if self.host != transaction.host or not self._may_be_made():
            return False
        if self.change and self.change != transaction.change:
            return False
        expected = copy.deepcopy(before)
        try:
            self.wanted.effect(expected)
        except KeyError:
            return False
        now, is_other = transaction.switches, expected != before
        if expected == now:
            return is_other or self.wanted.is_change
        return may_leave and is_other and left(expected, transaction) == now

    def _may_be_made(self) -> bool:
        return self.outcome != "refused" or self.wanted.taken_back is not None

    def is_taken_back(self, transaction: Transaction, before: Switches) -> bool:
        """Whether it was made, and is no more with that change."""
        if self.host != transaction.host or self.outcome == "made":
            return False
        expected = copy.deepcopy(before)
        assert self.wanted.taken_back is not None
        self.wanted.taken_back(expected)
        return expected == transaction.switches

    def hear(self, status: int, said: str) -> None:
        """Of its end."""
        self.said = said.strip()
        found = re.search(r"nobody knows whether the change (\w+)", said)
        if status == 0:
            self.outcome = "made"
        elif status == _KILLED:
            self.outcome = "unknown"
        elif found:
            self.outcome, self.change = "unknown", found[1]
        elif any(word in _in_words(said) for word in ("QEX_TIMEOUT", "interrupted")):
            self.outcome = "unknown"
        else:
            refused = self.host == OPERATOR and status == 1
            assert refused or any(word in _in_words(said) for word in _REFUSED), f"{self}: {said}"
            self.outcome = "refused"


def _in_words(said: str) -> str:
    """A status that the flat module gave has a number."""
    found = re.search(r"^status (\d+)$", said, re.MULTILINE)
    if not found:
        return said
    status = int(found[1])
    known = [name for name in dir(_libvswitch) if name.startswith("QEX_")]
    return " ".join(name for name in known if getattr(_libvswitch, name) == status)


@dataclass
class Calls:
    """All that were begun."""

    all: List[Call] = field(default_factory=list)
    _running: "List[Tuple[Call, subprocess.Popen[str]]]" = field(default_factory=list)

    def begin(
        self, host: str, wanted: Wanted, environment: Optional[Dict[str, str]]
    ) -> "subprocess.Popen[str]":
        process = subprocess.Popen(
            wanted.command,
            env=environment,
            stdin=subprocess.PIPE,
            stdout=subprocess.DEVNULL,
            stderr=subprocess.PIPE,
            text=True,
        )
        assert process.stdin is not None
        process.stdin.write(wanted.given)
        process.stdin.close()
        process.stdin = None
        call = Call(host, wanted)
        self.all.append(call)
        self._running.append((call, process))
        return process

    def on(self, host: Host, wanted: Wanted) -> "subprocess.Popen[str]":
        return self.begin(host.name, wanted, host.environment)

    def kill_one(self, chance: random.Random) -> None:
        if self._running:
            chance.choice(self._running)[1].kill()

    def end(self, host: Optional[str] = None) -> None:
        """Of one host, or all."""
        left = []
        for call, process in self._running:
            if host in (None, call.host):
                said = process.communicate(timeout=60)[1]
                call.hear(process.returncode, said)
            else:
                left.append((call, process))
        self._running = left


def left(switches: Switches, transaction: Transaction) -> Switches:
    """With the ports left that were connected at its host, and are nowhere after it."""
    found = copy.deepcopy(switches)
    for alias, switch in found.items():
        now = transaction.switches.get(alias, Switch()).ports
        for name, port in switch.ports.items():
            if port.host == transaction.host and name in now and not now[name].host:
                port.host = ""
    return found


def wrong(
    calls: Sequence[Call],
    made: Sequence[Transaction],
    first: Transaction,
    forgetful: Collection[str] = (),
) -> List[str]:
    """What cannot be: `made` are all changes after `first`. Hosts that forget what they have
    connected leave these ports."""
    found: List[str] = []
    open_, before = list(calls), first
    taken_back: List[Call] = []
    unknown = {one.host for one in calls if one.outcome == "unknown"}
    for transaction in made:
        if transaction.revision != before.revision + 1:
            found.append(f"revision {before.revision} is followed by {transaction.revision}")
        # Whose callers are killed, that may have connected what it does not know of.
        may_leave = transaction.host in {*forgetful, *unknown}
        fitting = [one for one in open_ if one.may_be(transaction, before.switches, may_leave)]
        ended = [one for one in taken_back if one.is_taken_back(transaction, before.switches)]
        # Nothing else can be that change, while one of which nobody knows may stay.
        refused = [one for one in ended if one.outcome == "refused"]
        if refused or (ended and not fitting):
            taken_back.remove((refused or ended)[0])
        elif fitting:
            # Of those of which nobody knows, any may be none.
            alone = [one for one in fitting if one.may_be(transaction, before.switches)]
            chosen = min(alone or fitting, key=lambda one: (not one.change, _ORDER[one.outcome]))
            open_.remove(chosen)
            if chosen.wanted.taken_back and transaction.switches != before.switches:
                taken_back.append(chosen)
        elif not may_leave or not _only_leaves(transaction, before.switches):
            no = [str(one) for one in open_ if _would_be(one, transaction, before.switches)]
            why = f", as was refused to {', '.join(no)}" if no else ""
            whose = f"revision {transaction.revision} of {transaction.host or 'an operator'}"
            found.append(f"{whose} is no call's{why}: {difference(before.switches, transaction)}")
        before = transaction
    seen = [first.switches, *(transaction.switches for transaction in made)]
    return (
        found
        + [
            f"made, and lost: {one}"
            for one in open_
            if one.outcome == "made" and not any(map(one.wanted.is_idle, seen))
        ]
        + [f"refused, and made: {one}" for one in taken_back if one.outcome == "refused"]
    )


def _only_leaves(transaction: Transaction, before: Switches) -> bool:
    return before != transaction.switches == left(before, transaction)


def _would_be(call: Call, transaction: Transaction, before: Switches) -> bool:
    if call.outcome != "refused":
        return False
    asked = Call(call.host, call.wanted)
    return asked.may_be(transaction, before)


def difference(before: Switches, transaction: Transaction) -> str:
    """Of what became of the switches."""
    now = transaction.switches
    aliases = sorted({*before, *now})
    return "; ".join(
        f"{alias} was {before.get(alias)} and is {now.get(alias)}"
        for alias in aliases
        if before.get(alias) != now.get(alias)
    )
