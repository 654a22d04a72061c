"""The bounds of each C type that crosses as a Python integer, in fields and in arguments."""

from typing import Dict, Tuple

UNSIGNED_8 = (0, 2**8 - 1)
UNSIGNED_16 = (0, 2**16 - 1)
UNSIGNED_32 = (0, 2**32 - 1)
UNSIGNED_64 = (0, 2**64 - 1)
SIGNED_32 = (-(2**31), 2**31 - 1)

BOUNDS: Dict[str, Tuple[int, int]] = {
    "int": SIGNED_32,
    "qex_uint8": UNSIGNED_8,
    "qex_uint16": UNSIGNED_16,
    "qex_uint32": UNSIGNED_32,
    "qex_uint64": UNSIGNED_64,
    "qex_VlanID": UNSIGNED_16,
    "qex_ByteCount": UNSIGNED_64,
    "qex_ByteCountSmall": UNSIGNED_32,
    "qex_IPv4Address": UNSIGNED_32,
    "qex_LinkSpeed": UNSIGNED_32,
    "qex_PortsetResPoolShares": UNSIGNED_32,
    "qex_PortsetResPoolPriorityTag": UNSIGNED_8,
    "qex_SwitchPortID": UNSIGNED_32,
    "qex_revnum": UNSIGNED_32,
    "NEBVersion": UNSIGNED_32,
    "qex_PortsetResPoolLimit": SIGNED_32,
    "qex_PortsetResPoolReservation": SIGNED_32,
    "qex_PortsetResPoolQueueDepth": SIGNED_32,
    "DVMirrorEncapType": SIGNED_32,
    "DVMirrorEntityType": SIGNED_32,
    "DVMirrorFilterType": SIGNED_32,
    "DVMirrorSessionType": SIGNED_32,
    "DVMirrorVersion": SIGNED_32,
    "DVSPortType": SIGNED_32,
    "QEX_ReturnStatus": SIGNED_32,
    "VSMACAddrType": SIGNED_32,
    "VSMcastFilterMode": SIGNED_32,
    "VSPortMACLearningLimitPolicy": SIGNED_32,
    "VSVlanTPFlags": SIGNED_32,
    "VS_PortClientType": SIGNED_32,
    "qex_IntrPolarityType": SIGNED_32,
    "qex_IntrTriggerType": SIGNED_32,
    "qex_LinkDuplex": SIGNED_32,
    "qex_LinkState": SIGNED_32,
    "qex_MgmtCallbackLocation": SIGNED_32,
    "qex_WorldletState": SIGNED_32,
}
