"""The host's virtual switches as objects.

    >>> from vswitch import Host
    >>> port = Host().switches["lab"].ports["web-1"]
    >>> port.vlan = 7

A setting is an attribute: read, assigned, cleared by `del`; `is_set` tells what is unset from what
is the default. Collections are mappings of what is there now. What the host refuses is an exception
that says what was asked of what, and why not.
"""

import typing

if typing.TYPE_CHECKING:
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
    from vswitch.mirroring import Encapsulation, Mirror, MirrorEnd, Mirroring
    from vswitch.plan import Plan
    from vswitch.port import Port, UplinkPort
    from vswitch.switch import Switch
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
else:
    # Traces are read and played where no host can be loaded, and who uses little pays for little.
    _PLACES = {
        "libvswitch.enums": "Balance Criteria EthernetFilter Forbid LinkState MacType Multicast"
        " TeamFlags",
        "libvswitch.errors": "BadParameter Busy Disconnected Exists HostError LimitExceeded"
        " NotFound NotRestored NotSupported NoUplink RolledBack Trapped",
        "vswitch.exits": "exits",
        "vswitch.host": "Host",
        "vswitch.mirroring": "Encapsulation Mirror MirrorEnd Mirroring",
        "vswitch.plan": "Plan",
        "vswitch.port": "Port UplinkPort",
        "vswitch.switch": "Switch",
        "vswitch.told": "Change Event Group Lag MacEntry MirrorStats PortStats SwitchStats",
        "vswitch.transaction": "Transaction",
        "vswitch.uplink": "Uplink",
        "vswitch.values": "FrameFilter MacLearning PortMacLearning PrivateVlan Teaming Vlan",
        "vswitch.words": "DocumentError",
    }

    def __getattr__(name: str) -> object:
        from importlib import import_module

        for module, names in _PLACES.items():
            if name in names.split():
                found = globals()[name] = getattr(import_module(module), name)
                return found
        raise AttributeError(f"module {__name__!r} has no attribute {name!r}")


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
