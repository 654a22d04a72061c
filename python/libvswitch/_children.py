"""Programs that load the module in a process of their own, which it may end as it likes."""

import json
import signal
import subprocess
import sys
from typing import Dict

_TIMEOUT = 60

# Loads the module, and tells which files that brought in and how large records are: as the
# classes know it, and as the room shows that the flat constructors make.
LOADING = """
import json, sys
sys.path[:] = json.loads(sys.argv[1])
import _libvswitch
found = {"module": _libvswitch.__file__}
with open("/proc/self/maps") as maps:
    found["files"] = sorted({line.split(None, 5)[5].strip() for line in maps if ".so" in line})
print(json.dumps(found), flush=True)
import ctypes
from libvswitch import _pointers
libc = ctypes.CDLL(None)
libc.malloc.restype = ctypes.c_void_p
libc.malloc_usable_size.restype = ctypes.c_size_t
# Memory that is used again may have some bytes to spare; the least of many has none.
def room(addresses):
    return min(libc.malloc_usable_size(ctypes.c_void_p(one)) for one in addresses)
found["sizes"] = {}
for name, size in _pointers.record_sizes().items():
    try:
        made = [getattr(_libvswitch, "new_" + name)() for _ in range(64)]
    except TypeError:
        continue  # it takes a size
    plain = [libc.malloc(ctypes.c_size_t(size)) for _ in range(64)]
    found["sizes"][name] = [room(map(int, made)), room(plain)]
    for one in made:
        getattr(_libvswitch, "delete_" + name)(one)
print(json.dumps(found), flush=True)
"""

# Reads, so that a simulated host takes up its state.
CALLING = """
import json, sys
sys.path[:] = json.loads(sys.argv[1])
import _libvswitch
_libvswitch.DVSState_SwitchFindByAlias("")
"""


def run(program: str, environment: Dict[str, str]) -> "subprocess.CompletedProcess[bytes]":
    return subprocess.run(
        [sys.executable, "-c", program, json.dumps(sys.path)],
        env=environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        timeout=_TIMEOUT,
    )


def end(status: int, errors: str) -> str:
    """Why a process did not succeed, in a line."""
    if status >= 0:
        return (errors.strip().splitlines() or ["no reason given"])[-1]
    try:
        ended = signal.Signals(-status).name
    except ValueError:
        ended = f"signal {-status}"
    return f"the process ends with {ended}"
