"""The simulated host for tests: a pytest plug-in that gives each test a host of its own.

    def test_a_busy_host_is_reported(host):
        host.fault("VSDVS_SetMTU", status="QEX_BUSY")
        assert my_tool.set_mtu("vswitch0", 9000) == "busy, try again"

Where the simulated host is installed, pytest finds the plug-in by itself. The fixtures are `host`,
in the memory of the test's process, `shared_host`, in a file for the commands that the test runs,
and `frames`, for real frames. Here are their classes, for annotations.
"""

from simhost._control import HostRefused
from simhost._frames import Client, Frames, Network
from simhost._host import Clock, Host, Link, SharedHost, SimulatedHost
from simhost._ledger import Block, MemoryLeftOut
from simhost._loaded import NotSimulated
from simhost._namespaces import CommandFailed
from simhost._wires import frame

__all__ = [
    "Block",
    "Client",
    "Clock",
    "CommandFailed",
    "Frames",
    "Host",
    "HostRefused",
    "Link",
    "MemoryLeftOut",
    "Network",
    "NotSimulated",
    "SharedHost",
    "SimulatedHost",
    "frame",
]
