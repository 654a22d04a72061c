"""Says it when a program of this folder works on a simulated host that nobody else sees.

Without SIMHOST_STATE every process has a simulated host of its own: what one program changes, the
next one does not find. A tool that is copied from here needs none of this.
"""

import ctypes
import os
import sys


def is_simulated() -> bool:
    """Whether the host of this process is simulated; such a host brings a third library."""
    try:
        ctypes.CDLL("libsimhost.so", os.RTLD_NOLOAD | os.RTLD_LAZY)
    except OSError:
        return False
    return True


def tell(program: str) -> None:
    if is_simulated() and not os.environ.get("SIMHOST_STATE"):
        print(
            f"{program}: this host is simulated and private to this process; set SIMHOST_STATE to"
            " the path of a state file, and programs share the host in it",
            file=sys.stderr,
        )
