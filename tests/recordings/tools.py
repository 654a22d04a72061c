"""Programs of which some tests look at the recording, and others at what a player makes of it."""

__all__ = ["DATA_LISTS", "TRAP_IN_A_WALK", "WALK_IN_A_WALK"]

WALK_IN_A_WALK = """
import libvswitch as vs
names = []
def visit(switch, context):
    def visit_port(port, context):
        names.append(vs.DVS_PortId(port))
        return len(names) < 2
    vs.DVSState_PortForEach(switch, visit_port, None)
    names.append(vs.DVS_SwitchName(switch))
    return True
vs.DVSState_SwitchForEach(visit, None)
print(names)
"""

TRAP_IN_A_WALK = """
import libvswitch as vs
def visit(switch, context):
    flat = __import__("_libvswitch")
    memory = vs.VSQEX_GetUplinks("vswitch0")[1].this
    flat.VSQEX_FreeMemory(memory)
    try:
        flat.VSQEX_FreeMemory(memory)
    except RuntimeError as error:
        print(str(error).split(":")[0])
    return True
vs.DVSState_SwitchForEach(visit, None)
print(vs.VSDVS_SetMTU("vswitch0", 9000))
"""

DATA_LISTS = """
import ctypes
from libvswitch import checked
libc = ctypes.CDLL(None)
host = ctypes.CDLL("libnebPublic.so")
host.DVSData_Update.argtypes = [ctypes.c_void_p, ctypes.c_char_p, ctypes.c_char_p,
                                ctypes.c_uint, ctypes.c_uint]
host.DVSData_Free.argtypes = [ctypes.c_void_p]
made = ctypes.c_void_p()
"""
"""The begin of programs that have the host fill a list, `made`, with the allocators of theirs."""
