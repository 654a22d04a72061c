"""The lock that a thread may take again.

The rest of `threading` is not needed here, and takes time to import.
"""

import typing

__all__ = ["RLock"]

if typing.TYPE_CHECKING:
    from threading import RLock
else:
    from _thread import RLock
