"""Families of constants that have a type and words: which, and what has a value of one.

The words are those of scenario documents; a member is its word in capitals. Numbers stand in the
headers only.
"""

from dataclasses import dataclass
from typing import Dict, List, Tuple

from definitions import Constant, Definitions, Field, Type


@dataclass(frozen=True)
class Family:
    name: str
    doc: str
    prefix: str  # of its constants
    members: Dict[str, str]  # by what follows the prefix; all constants with the prefix
    is_set: bool = False  # of bits


FAMILIES = (
    Family("LinkState", "Whether a link is up.", "QEX_LINK_STATE_", {"DOWN": "DOWN", "UP": "UP"}),
    Family(
        "MacType",
        "How an address came into a table.",
        "VS_MAC_ADDR_TYPE_",
        {name: name for name in ("STATIC", "USER", "LEARNED", "ALL")},
    ),
    Family(
        "Balance",
        "By what a team of uplinks chooses one.",
        "TEAM_FRP_TYPE_",
        {
            "NONE": "NONE",
            "LB_IP": "IP",
            "LB_SRCMAC": "MAC",
            "LB_SRCID": "PORT",
            "FO_EXPLICIT": "EXPLICIT",
            "LB_LBT": "LOAD",
        },
    ),
    Family(
        "Multicast",
        "How a switch filters multicast, and which protocol's filters a query asks for.",
        "VS_MCAST_FILTER_MODE_",
        {name: name for name in ("LEGACY", "SNOOPING", "IGMP", "MLD")},
    ),
    Family(
        "Forbid",
        "What the client of a port may not do.",
        "VSPORT_SECURITY_DISALLOW_",
        {"PROMISC": "PROMISCUOUS", "MAC_CHANGE": "MAC_CHANGES", "FORGED_SRC": "FORGED_TRANSMITS"},
        is_set=True,
    ),
    Family(
        "Criteria",
        "What takes an uplink of a team out of use.",
        "TEAM_FRP_CRIT_",
        {
            "LINK_SPEED": "SPEED",
            "LINK_SPEED_GTE": "SPEED_AT_LEAST",
            "LINK_DUPLEX": "DUPLEX",
            "LACP_PORT_DOWN": "LACP",
            "BEACON_STATE": "BEACON",
            "LINK_ERR": "ERRORS",
            "LINK_STATE": "LINK",
            "PORT_BLOCKED": "BLOCKED",
            "DRV_PRESENT": "DRIVER",
        },
        is_set=True,
    ),
    Family(
        "TeamFlags",
        "How a team of uplinks behaves beside that.",
        "TEAM_FRP_FLAG_",
        {
            "ALL_AVAILABLE": "ALL_AVAILABLE",
            "REVERSE": "REVERSE",
            "BEST_EFFORT": "BEST_EFFORT",
            "ROLLING": "ROLLING",
            "SHOTGUN": "SHOTGUN",
            "NOTIFY_SWITCH": "NOTIFY",
            "BLOCK_OUTPUT": "BLOCK_OUTPUT",
            "LACP_CLIENT": "LACP_CLIENT",
            "LST": "LST",
        },
        is_set=True,
    ),
    Family(
        "EthernetFilter",
        "Which frames a port accepts beside those for its client.",
        "QEX_ETH_FILTER_",
        {
            "UNICAST": "UNICAST",
            "MULTICAST": "MULTICAST",
            "ALLMULTI": "ALL_MULTICAST",
            "BROADCAST": "BROADCAST",
            "PROMISC": "PROMISCUOUS",
            "USE_LADRF": "HASHED_MULTICAST",
            "SINK": "SINK",
        },
        is_set=True,
    ),
)

STATUS = "QEX_ReturnStatus"

# What C's own names of types say.
_TYPES = {
    "qex_LinkState": "LinkState",
    "VSMACAddrType": "MacType",
    "VSMcastFilterMode": "Multicast",
}

# Where C has but an integer.
_FIELDS = {
    ("VSTeamPolicy", "loadBalance"): "Balance",
    ("VSTeamPolicy", "linkCriteria"): "Criteria",
    ("VSTeamPolicy", "flags"): "TeamFlags",
    ("VSPropSecurity", "flags"): "Forbid",
    ("VSExtraEthFilter", "flags"): "EthernetFilter",
}
_OUTPUTS = {
    ("VSQEX_GetUplinkLinkState", "state"): "LinkState",
    ("VSQEX_GetUplinkLACPLinkState", "state"): "LinkState",
    ("VSDVS_GetMcastFilterMode", "mode"): "Multicast",
    ("VSQEX_GetMcastFilterMode", "mode"): "Multicast",
}


def of_type(given: Type) -> str:
    """The family of a C type, or nothing."""
    return _TYPES.get(given.name, "") if not given.layers else ""


def of_field(record: str, field: Field) -> str:
    return of_type(field.type) or _FIELDS.get((record, field.name), "")


def of_output(call: str, name: str) -> str:
    return _OUTPUTS.get((call, name), "")


def of_constants(known: Definitions) -> Dict[str, str]:
    """The families, by the names of their constants; all but that of statuses."""
    return {one.name: family.name for family in FAMILIES for _, one in members(known, family)}


def members(known: Definitions, family: Family) -> List[Tuple[str, Constant]]:
    """The members and their constants; ValueError where the headers have others."""
    found = {
        one.name[len(family.prefix) :]: one
        for one in known.constants
        if one.name.startswith(family.prefix)
    }
    if set(found) != set(family.members):
        raise ValueError(f"{family.name}: {set(found) ^ set(family.members)} is on one side only")
    return [(family.members[rest], one) for rest, one in found.items()]


def statuses(known: Definitions) -> List[Constant]:
    return [one for one in known.constants if one.family == STATUS]


def check(known: Definitions) -> None:
    """Refuses what is said of nothing."""
    names = {
        (record.name, field.name) for record in known.records.values() for field in record.fields
    }
    names |= {(call.name, one.name) for call in known.functions for one in call.parameters}
    unknown = {*_FIELDS, *_OUTPUTS} - names
    if unknown or not set(_TYPES) <= set(known.typedefs):
        raise ValueError(f"families of nothing: {sorted(unknown)}")
