"""What can be done to a simulated host from outside, whichever way leads there."""

import abc
from pathlib import Path
from typing import Optional

# The scenario document of a host with nothing in it.
EMPTY = Path(__file__).with_name("empty.json")


class HostRefused(Exception):
    """The simulated host does not do what the test asked of it; the text says why."""


class Control(abc.ABC):
    """The functions of abi/simhost_api/simhost.h; each raises HostRefused with the host's words.

    Times are milliseconds.
    """

    @abc.abstractmethod
    def reset(self, *, empty: bool) -> None:
        """Makes the host fresh: the default host, or one with nothing in it."""

    @abc.abstractmethod
    def restart(self) -> None:
        ...

    @abc.abstractmethod
    def apply(self, document: str) -> None:
        ...

    @abc.abstractmethod
    def describe(self) -> str:
        ...

    @abc.abstractmethod
    def set_link(self, uplink: str, up: bool) -> None:
        ...

    @abc.abstractmethod
    def learn(self, switch: str, mac: str, port: Optional[str], vlan: int, vni: int) -> None:
        ...

    @abc.abstractmethod
    def set_counter(
        self, switch: str, name: str, value: int, port: Optional[str], session: Optional[str]
    ) -> None:
        ...

    @abc.abstractmethod
    def clear_faults(self, call: Optional[str]) -> None:
        ...

    @abc.abstractmethod
    def clock_now(self) -> int:
        ...

    @abc.abstractmethod
    def clock_stop(self) -> None:
        ...

    @abc.abstractmethod
    def clock_run(self) -> None:
        ...

    @abc.abstractmethod
    def clock_step(self, milliseconds: int) -> None:
        ...

    @abc.abstractmethod
    def clock_set(self, milliseconds: int) -> None:
        ...
