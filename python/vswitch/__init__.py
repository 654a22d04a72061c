"""The host's virtual switches as objects.

    >>> from vswitch import Host
    >>> port = Host().switches["lab"].ports["web-1"]
    >>> port.vlan = 7

A setting is an attribute: read, assigned, cleared by `del`; `is_set` tells what is unset from what
is the default. Collections are mappings of what is there now. What the host refuses is an exception
that says what was asked of what, and why not.
"""

import typing

from libvswitch.enums import (
    Balance,
    Criteria,
    EthernetFilter,
    Forbid,
    LinkState,
    MacType,
    Multicast,
    TeamFlags,
)
from libvswitch.errors import (
    BadParameter,
    Busy,
    Disconnected,
    Exists,
    HostError,
    LimitExceeded,
    NotFound,
    NotRestored,
    NotSupported,
    NoUplink,
    RolledBack,
    Trapped,
)
from vswitch.exits import exits
from vswitch.host import Host
from vswitch.port import Port, UplinkPort
from vswitch.switch import Switch
from vswitch.transaction import Transaction
from vswitch.uplink import Uplink
from vswitch.values import (
    FrameFilter,
    MacLearning,
    PortMacLearning,
    PrivateVlan,
    Teaming,
    Vlan,
)
from vswitch.words import DocumentError

if typing.TYPE_CHECKING:
    from vswitch.mirroring import Encapsulation, Mirror, MirrorEnd, Mirroring
    from vswitch.plan import Plan
    from vswitch.told import (
        Change,
        Event,
        Group,
        Lag,
        MacEntry,
        MirrorStats,
        PortStats,
        SwitchStats,
    )
else:
    _PLACES = {
        "Plan": "plan",
        **dict.fromkeys(("Encapsulation", "Mirror", "MirrorEnd", "Mirroring"), "mirroring"),
    }

    def __getattr__(name: str) -> object:
        # Only those who use them pay for them.
        from importlib import import_module

        if name not in __all__:
            raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
        return getattr(import_module(f"vswitch.{_PLACES.get(name, 'told')}"), name)


__all__ = [
    "BadParameter",
    "Balance",
    "Busy",
    "Change",
    "Criteria",
    "Disconnected",
    "DocumentError",
    "Encapsulation",
    "EthernetFilter",
    "Event",
    "Exists",
    "Forbid",
    "FrameFilter",
    "Group",
    "Host",
    "HostError",
    "Lag",
    "LimitExceeded",
    "LinkState",
    "MacEntry",
    "MacLearning",
    "MacType",
    "Mirror",
    "MirrorEnd",
    "MirrorStats",
    "Mirroring",
    "Multicast",
    "NoUplink",
    "NotFound",
    "NotRestored",
    "NotSupported",
    "Plan",
    "Port",
    "PortMacLearning",
    "PortStats",
    "PrivateVlan",
    "RolledBack",
    "Switch",
    "SwitchStats",
    "TeamFlags",
    "Teaming",
    "Transaction",
    "Trapped",
    "Uplink",
    "UplinkPort",
    "Vlan",
    "exits",
]
