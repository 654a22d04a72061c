"""Types that modules of one wrapper runtime share, whichever of them is loaded first."""

import ctypes
import subprocess
import sys

import pytest

import _libvswitch as vs
import native
import peer
import reports

EXCHANGE = """
info = vs.new_VSInfo()
vs.VSInfo_mtu_set(info, 9000)
assert peer.mtu_of(info) == 9000
theirs = peer.new_VSInfo()
peer.VSInfo_mtu_set(theirs, 1500)
assert vs.VSInfo_mtu_get(theirs) == 1500
again = peer.pointer_object(int(info), "VSInfo *")
assert again == info and info == again and theirs != info
print("shared")
"""


@pytest.mark.parametrize(
    "order", ["import _libvswitch as vs, peer", "import peer, _libvswitch as vs"]
)
def test_records_are_shared_in_either_order_of_loading(order: str) -> None:
    done = subprocess.run(
        [sys.executable, "-c", order + EXCHANGE], check=False, capture_output=True, text=True
    )
    assert done.stdout.startswith("shared\n"), done.stderr


def test_a_record_of_another_type_is_refused(name: object) -> None:
    reports.raises(
        TypeError,
        reports.argument("VSInfo_mtu_get", 1, "struct VSInfo *"),
        vs.VSInfo_mtu_get,
        name,
    )


@pytest.mark.parametrize(
    "spelling", ["qex_uint32 *", "unsigned int *", "NEBVersion *", "qex_revnum *"]
)
def test_any_spelling_of_a_type_is_accepted(spelling: str) -> None:
    value = ctypes.c_uint32(7)
    pointer = peer.pointer_object(ctypes.addressof(value), spelling)
    assert isinstance(vs.VSDVS_GetMTU("no-such-switch", pointer), int)
    assert peer.address_at(pointer) == 7


def test_another_width_is_refused() -> None:
    value = ctypes.c_uint16()
    pointer = peer.pointer_object(ctypes.addressof(value), "qex_uint16 *")
    reports.raises(
        TypeError,
        reports.argument("VSDVS_GetMTU", 2, "qex_uint32 *"),
        vs.VSDVS_GetMTU,
        "no-such-switch",
        pointer,
    )


def test_equal_spellings() -> None:
    """The classes of spellings that are one type."""
    spellings = [set(names) for table in native.type_tables() for names in table.values()]
    for expected in CLASSES:
        assert set(expected.split("|")) in spellings


CLASSES = """\
signed char *|qex_int8 *
qex_int16 *|short *
char *|qex_Bool *
unsigned char *|qex_uint8 *|qex_VlanPriority *|qex_PortsetResPoolPriorityTag *
qex_PortsetResPoolTag *|qex_uint16 *|unsigned short *|qex_VlanID *
int *|qex_ByteCountSmallSigned *|qex_int32 *|qex_PortsetResPoolQueueDepth *|\
qex_PortsetResPoolReservation *|qex_ModuleID *|qex_PortsetResPoolLimit *|qex_WorldID *
qex_WorldletID *|qex_uintptr_t *|qex_PortsetResPoolShares *|NEBVersion *|qex_uint32 *|\
unsigned int *|qex_revnum *|qex_VirtualNetworkID *|qex_LinkSpeed *|qex_IntrCookie *|\
qex_SwitchPortID *|qex_IPv4Address *|qex_ByteCountSmall *
qex_loff_t *|qex_ByteCountSigned *|qex_int64 *|long long *
qex_uint64 *|qex_ByteCount *|unsigned long long *|qex_NetOverlayNetworkKey *|qex_MgmtInstanceID *
qex_MgmtParmType *|enum qex_MgmtParm *
DVSwitchId *|char (*)[64]
char (*)[48]|DVPortId *|qex_DVPortId *
VSDVMirrorSID *|DVMirrorSID *|char (*)[32]
qex_NEBPortName *|VSDVMirrorDName *|DVMirrorDName *|char (*)[81]
qex_PortClientName *|char (*)[1040]
unsigned char (*)[6]|qex_EthAddress *
unsigned char (*)[16]|qex_IPv6Address *
DVSwitchHandle|DVSPortHandle|void *
DVSDataHandle *|void **|DVSDataItem *
void *(*)(size_t)|DVSData_MemAlloc
DVSData_MemFree|void (*)(void *)
char (*)(void *,void *)|DVSPortDataCallback|DVSPortCallback|DVSwitchCallback
__builtin_va_list *|__gnuc_va_list *|va_list *
struct Portset *|qex_Portset *
struct PktHandle *|qex_PktHandle *
""".splitlines()
