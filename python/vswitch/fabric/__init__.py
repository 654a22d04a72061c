"""The switches that many hosts share, from anywhere: a client of their database.

    >>> from vswitch.fabric import Fabric
    >>> with Fabric("tcp:192.0.2.1:6641,tcp:192.0.2.2:6641") as fabric:
    ...     fabric.plan({"switches": [{"alias": "lab", "mtu": 9000}]}).apply()

No host is needed, and none is asked. It takes Open vSwitch's module for Python, which Debian has as
python3-openvswitch.
"""

from vswitch import _front

try:
    import _libvswitch  # noqa: F401
except ImportError:
    # Settings are checked as everywhere, and for that no host has to be here.
    _front.stand_in_front({})

from vswitch.fabric._drilling import Failover
from vswitch.fabric._errors import OtherVersion, Unreachable, UnusableFile
from vswitch.fabric._fabric import Fabric
from vswitch.fabric._plan import Plan
from vswitch.fabric._view import Member, SharedPort, SharedSwitch, View

__all__ = [
    "Fabric",
    "Failover",
    "Member",
    "OtherVersion",
    "Plan",
    "SharedPort",
    "SharedSwitch",
    "Unreachable",
    "UnusableFile",
    "View",
]
