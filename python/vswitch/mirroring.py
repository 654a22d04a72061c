"""Mirror sessions: their values, and a session for the time of a block."""

from __future__ import annotations

import itertools
import os
import time
import typing
from dataclasses import dataclass
from typing import Any, Callable, ClassVar, Dict, Iterator, Optional, Tuple, Union

from libvswitch import checked
from libvswitch.errors import HostError, NotFound, NotRestored
from vswitch import _table
from vswitch._surely import surely
from vswitch._table import Form
from vswitch.uplink import Uplink
from vswitch.values import SettingValue, Words

if typing.TYPE_CHECKING:
    from vswitch.told import MirrorStats
    from vswitch.port import Port

__all__ = ["Encapsulation", "Mirror", "MirrorEnd", "Mirroring"]

_SESSION = _table.PORT["mirror_sessions"].form["element"]


@dataclass(frozen=True, eq=False, repr=False)
class Encapsulation(SettingValue):
    """How mirrored frames are wrapped."""

    type: str = "gre"
    key: int = 0
    vlan: int = 0
    id: int = 0
    cos: int = 0
    granularity: int = 0

    _form: ClassVar[Form] = _table.get_member(_SESSION, "encapsulation")


@dataclass(frozen=True, eq=False, repr=False)
class MirrorEnd(SettingValue):
    """What a session mirrors to or from: one of these."""

    port: Optional[str] = None
    uplink: Optional[str] = None
    vlan: Optional[int] = None
    ip: Optional[str] = None
    number: Optional[int] = None

    _form: ClassVar[Form] = _table.get_member(_SESSION, "to")["element"]


def _known_end(held: Words) -> MirrorEnd:
    return MirrorEnd.from_words(held)


@dataclass(frozen=True, eq=False, repr=False)
class Mirror(SettingValue):
    """A mirror session of a port."""

    sid: str
    name: str = ""
    type: str = "port"
    snap_length: int = 0
    sampling_rate: int = 0
    disabled: bool = False
    promiscuous: bool = False
    to: Tuple[MirrorEnd, ...] = ()
    received_by: Tuple[MirrorEnd, ...] = ()
    sent_by: Tuple[MirrorEnd, ...] = ()
    encapsulation: Encapsulation = Encapsulation()
    encapsulates: bool = False
    keeps_vlan: bool = False
    no_output: bool = False
    no_input: bool = False
    mirrors_uplinks: bool = False
    uplink_filter: str = "none"
    received_from: Tuple[str, ...] = ()
    sent_from: Tuple[str, ...] = ()
    stack: bool = False

    _form: ClassVar[Form] = _SESSION
    _types: ClassVar[Dict[str, Callable[[Any], Any]]] = {
        "to": _known_end,
        "received_by": _known_end,
        "sent_by": _known_end,
        "encapsulation": Encapsulation.from_words,
    }


_counted = itertools.count(1)


class Mirroring:
    """What `Port.mirrored` begins: what the port receives and sends goes to another, too.

    `to` is a port or an uplink; a text is the identifier of a port. Further settings are those of a
    Mirror. The session is there when the block begins, and is removed whatever happens; NotRestored
    says that it could not be.
    """

    def __init__(
        self, port: "Port", to: "Union[Port, Uplink, MirrorEnd, str]", settings: Dict[str, Any]
    ) -> None:
        source = MirrorEnd(port=port.id)
        held: Dict[str, Any] = {"received_by": (source,), "sent_by": (source,), **settings}
        # One of each block: two tools may mirror the same port.
        held.setdefault("sid", f"vswitch-{os.getpid()}-{next(_counted)}")
        self.port = port
        self.mirror = Mirror(to=(_end(to),), **held)

    @property
    def stats(self) -> MirrorStats:
        """What the session counted up to now."""
        from vswitch import _telling

        return _telling.mirror_stats(self.port.switch.alias, self.mirror.sid)

    def sample(self, seconds: float, every: float = 1.0) -> Iterator[MirrorStats]:
        """What it counted: now, every so many seconds, and when they are over."""
        end = time.monotonic() + seconds
        while True:
            yield self.stats
            left = end - time.monotonic()
            if left <= 0:
                return
            time.sleep(min(every, left))

    def __enter__(self) -> "Mirroring":
        from vswitch import _sessions

        sessions = [_sessions.session_of(self.mirror)]
        try:
            checked.VSDVS_AppendDVMirrorSessions(*self.port.owner, sessions)
        except BaseException as error:
            # What is refused is not there; what traps or is interrupted may be.
            if not isinstance(error, HostError) or error.status is None:
                surely(self._remove)
            raise
        return self

    def __exit__(self, *unused: object) -> None:
        surely(self._remove)

    def _remove(self) -> None:
        sid = self.mirror.sid
        try:
            checked.VSDVS_RemoveDVMirrorSession(*self.port.owner, sid)
        except NotFound:
            return
        except HostError as error:
            left = f"{self.port.path}: mirror session {sid}"
            raise NotRestored(f"{left} is still there: {error}", left=(left,)) from error


def _end(to: "Union[Port, Uplink, MirrorEnd, str]") -> MirrorEnd:
    if isinstance(to, MirrorEnd):
        return to
    if isinstance(to, Uplink):
        return MirrorEnd(uplink=to.name)
    # What has no identifier is refused as what it is.
    id_: Any = getattr(to, "id", to)
    return MirrorEnd(port=id_)
