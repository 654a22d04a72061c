"""Uplinks of the host, at the switches that have them."""

from __future__ import annotations

import contextlib
import time
import typing
from typing import Iterator, Optional, Tuple, Union

from libvswitch import checked
from libvswitch.enums import LinkState
from libvswitch.errors import HostError, NotRestored, NotSupported
from vswitch import _undo, words as _words
from vswitch._surely import surely

if typing.TYPE_CHECKING:
    from vswitch.host import Host
    from vswitch.switch import Switch

_POLL = 0.05


class Uplink:
    """An uplink of a switch. Its text is its name."""

    def __init__(self, switch: "Switch", name: str) -> None:
        self.switch = switch
        self.name = name

    @property
    def host(self) -> "Host":
        return self.switch.host

    @property
    def path(self) -> str:
        return f"{self.switch.alias}/{self.name}"

    @property
    def port(self) -> str:
        """The identifier of the uplink port that it is attached to."""
        return checked.VSQEX_GetUplinkDVPortID(self.name)

    @property
    def link(self) -> LinkState:
        """Whether its link is up."""
        return checked.VSQEX_GetUplinkLinkState(self.switch.alias, self.name)

    @property
    def lacp(self) -> LinkState:
        """Whether link aggregation sees it up."""
        return checked.VSQEX_GetUplinkLACPLinkState(self.switch.alias, self.name)

    @property
    def speed(self) -> typing.NoReturn:
        """No call of a host tells it: NotSupported."""
        raise NotSupported(f"{self.path}: no call of a host tells the speed of an uplink")

    def set_link(self, state: Union[LinkState, str]) -> None:
        """Takes it up or down. The link is up when its cable and its other end are so, too."""
        wanted = link_state(state)
        with self.host._writing(_undo.Link, self):
            self._set(wanted)

    def _set(self, state: LinkState) -> None:
        checked.VSQEX_SetUplinkAdminLinkState(self.switch.alias, self.name, state)

    def wait(self, state: Union[LinkState, str], timeout: float = 5) -> None:
        """Waits until the link is up or down; TimeoutError if it is not within so many seconds."""
        wanted = link_state(state)
        end = time.monotonic() + timeout
        while self.link is not wanted:
            left = end - time.monotonic()
            if left <= 0:
                raise TimeoutError(f"{self.path} is not {wanted} within {timeout:g} s")
            time.sleep(min(_POLL, left))

    @contextlib.contextmanager
    def taken_down(self, timeout: float = 5) -> Iterator["Uplink"]:
        """Down for the time of a block, and up again whatever happens.

        Each way it waits for the link. NotRestored says that it did not come up again.
        """
        if self.link is not LinkState.UP:
            raise HostError(f"{self.path} is down already")
        try:
            self._set(LinkState.DOWN)
            self.wait(LinkState.DOWN, timeout)
            yield self
        finally:
            surely(lambda: self._bring_up(timeout))

    def _bring_up(self, timeout: float) -> None:
        try:
            self._set(LinkState.UP)
            self.wait(LinkState.UP, timeout)
        except (HostError, TimeoutError) as error:
            raise NotRestored(
                f"{self.path} is not up again: {error}", left=(f"{self.path}: link",)
            ) from error

    def remove(self) -> None:
        """Takes it from its switch, with its uplink port."""
        with self.host._writing(_undo.UplinkPorts, self.switch):
            checked.VSDVS_RemoveSwitchUplinkPort(self.switch.alias, self.name)

    def __str__(self) -> str:
        return self.name

    def __repr__(self) -> str:
        return f"Uplink({self.path!r})"

    def __eq__(self, other: object) -> bool:
        return isinstance(other, Uplink) and self._identity == other._identity

    def __hash__(self) -> int:
        return hash(self._identity)

    @property
    def _identity(self) -> Tuple[str, str]:
        return self.switch.alias, self.name


def link_state(given: Union[LinkState, str]) -> LinkState:
    """A state that is given as a word or as itself."""
    if isinstance(given, str):
        return LinkState[_words.choice(given, "state", ("up", "down")).upper()]
    if given not in (LinkState.UP, LinkState.DOWN):
        raise _words.fail("state", given, "up or down")
    return LinkState(given)


def find_port_of(name: str) -> Optional[str]:
    """The uplink port that an uplink of the host is at, None if it is at none."""
    try:
        return checked.VSQEX_GetUplinkDVPortID(name)
    except checked.Disconnected:
        return None
