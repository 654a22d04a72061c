"""Faults of calls that find the state locked by the writer of another process."""

import sqlite3

from simulated_host import Host


def test_no_fault_is_passed_over_because_the_state_is_busy(host: Host) -> None:
    host.ctl("fault", "add", "VSDVS_GetMTU", "--exception", "OSError", "--message", "gone")
    other = sqlite3.connect(host.environment["SIMHOST_STATE"], isolation_level=None)
    other.execute("BEGIN IMMEDIATE")
    code = """
import libvswitch as classes

mtu = classes.Cell("qex_uint32")
try:
    print(vs.VSDVS_GetMTU("vswitch0", mtu.pointer.this) == vs.QEX_BUSY)
except OSError as error:
    print(error)
"""
    assert host.lines(code) == ["True"]
    other.execute("ROLLBACK")
    other.close()
    assert host.lines(code) == ["gone"]
