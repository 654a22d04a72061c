"""What a checked call raises: HostError, and below it what tells one reason from another.

    try:
        mtu = checked.VSDVS_GetMTU("lab")
    except NotFound as error:
        print(error)    # no switch 'lab' (there are vswitch0)
"""

import typing
from typing import TYPE_CHECKING, Any, Dict, Optional, Tuple, Type

if TYPE_CHECKING:
    from libvswitch.enums import Status as _Status

__all__ = [
    "BadParameter",
    "Busy",
    "Disconnected",
    "Exists",
    "HostError",
    "LimitExceeded",
    "NoUplink",
    "NotFound",
    "NotRestored",
    "NotSupported",
    "RolledBack",
    "Trapped",
]


class HostError(Exception):
    """The host did not do what was asked of it.

    `call` and `arguments` are what was asked, `status` is the result, None where there was none,
    and `what` says in words what was asked of what, and why not. The words that a refused call has
    are made when somebody first asks for them, and name what the host has then.
    """

    def __init__(
        self,
        what: str = "",
        *,
        call: str = "",
        arguments: Optional[typing.Mapping[str, object]] = None,
        status: Optional[int] = None,
    ) -> None:
        super().__init__()
        self.call = call
        self.arguments: Dict[str, object] = dict(arguments or {})
        self._status = status
        self._what = what

    @property
    def status(self) -> "Optional[_Status]":
        if self._status is None:
            return None
        from libvswitch.enums import Status

        return Status(self._status)

    @property
    def what(self) -> str:
        if not self._what:
            from libvswitch import _reasons

            self._what = _reasons.what(self)
        return self._what

    def __str__(self) -> str:
        return self.what

    def __repr__(self) -> str:
        return f"{type(self).__name__}({self.what!r})"

    def __reduce__(self) -> Tuple[Any, ...]:
        """Into another process goes what was asked as it prints, where it is memory of this one."""
        arguments = {
            name: value if isinstance(value, _PLAIN) else repr(value)
            for name, value in self.arguments.items()
        }
        return _again, (type(self), {**self.__dict__, "_what": self.what, "arguments": arguments})


class NotFound(HostError, KeyError):
    """There is nothing of that name."""


class Exists(HostError):
    """There is something of that name."""


class Busy(HostError):
    """What was asked for is in use."""


class BadParameter(HostError, ValueError):
    """The host does not take that value."""


class LimitExceeded(HostError):
    """There is no room for more."""


class NotSupported(HostError):
    """The host, or what was asked, cannot do that."""


class Disconnected(HostError):
    """What was asked is at no port."""


class NoUplink(HostError):
    """No uplink carries it."""


class Trapped(HostError):
    """The call trapped: what it raised is the cause of this, and nothing of the call holds."""


class RolledBack(HostError):
    """A change failed, and everything is as it was before it."""


class NotRestored(RolledBack):
    """A change failed, and what `left` names is not as it was before it."""

    def __init__(self, what: str = "", *, left: typing.Sequence[str] = (), **asked: Any) -> None:
        super().__init__(what, **asked)
        self.left: Tuple[str, ...] = tuple(left)


# Every other status is a HostError itself.
STATUSES: Dict[str, Type[HostError]] = {
    "QEX_NOT_FOUND": NotFound,
    "QEX_EXISTS": Exists,
    "QEX_BUSY": Busy,
    "QEX_WOULD_BLOCK": Busy,
    "QEX_BAD_PARAM": BadParameter,
    "QEX_NAME_TOO_LONG": BadParameter,
    "QEX_INVALID_NAME": BadParameter,
    "QEX_INVALID_ADDRESS": BadParameter,
    "QEX_BAD_VLANID": BadParameter,
    "QEX_LIMIT_EXCEEDED": LimitExceeded,
    "QEX_NO_RESOURCES": LimitExceeded,
    "QEX_NO_SPACE": LimitExceeded,
    "QEX_NOT_SUPPORTED": NotSupported,
    "QEX_READ_ONLY": NotSupported,
    "QEX_IS_DISABLED": NotSupported,
    "QEX_IS_DISCONNECTED": Disconnected,
    "QEX_ENETDOWN": NoUplink,
    "QEX_ENETUNREACH": NoUplink,
}

_by_status: Dict[int, Type[HostError]] = {}

_PLAIN: Tuple[Any, ...] = (str, int, bytes, type(None))


def class_of(status: int) -> Type[HostError]:
    """What a status is raised as."""
    if not _by_status:
        import _libvswitch

        _by_status.update({getattr(_libvswitch, name): one for name, one in STATUSES.items()})
    return _by_status.get(status, HostError)


def _again(kind: Type[HostError], state: Dict[str, Any]) -> HostError:
    made = kind.__new__(kind)
    made.__dict__.update(state)
    return made
