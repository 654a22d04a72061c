"""The package of simhostd, on a machine that has the simulated host: real frames are moved there.

The tests go on where the one before left the root: it ends as it began.
"""

import re
from pathlib import Path
from typing import Dict, Set

import pytest
from debian_packages import field, install, satisfy
from roots import Root

DAEMON = "libvswitch-simhostd"
OTHERS = ("libvswitch-simhost", "python3-libvswitch")

# Two clients of a switch that a program makes, in namespaces that end with it.
MOVES = """
set -e
# Bridges have a device of that kind, and such a system has none by itself.
mkdir -p /dev/net
test -e /dev/net/tun || mknod /dev/net/tun c 10 200
ip link set lo up
export SIMHOST_STATE=/tmp/frames.db
simhostctl show > /dev/null
mkfifo /tmp/ready
simhostd --state $SIMHOST_STATE --openvswitch private:/tmp/ovs > /tmp/ready 2> /tmp/simhostd.log &
daemon=$!
read -r word < /tmp/ready || { cat /tmp/simhostd.log; exit 1; }
test "$word" = ready
address=1
for port in web-1 web-2; do
    unshare --net sleep 1000 &
    pid=$!
    until [ "$(readlink /proc/$pid/ns/net)" != "$(readlink /proc/self/ns/net)" ]; do :; done
    # Both ends of a pair need an index of their own for a lost link to be told at once.
    ip link add c$address type veth peer name eth0 netns $pid index $((100 + address))
    ip link set c$address up
    enter="nsenter --target $pid --net"
    $enter ip link set eth0 up
    $enter ip address add 10.0.0.$address/24 dev eth0
    simhostctl connect vswitch0 $port c$address
    address=$((address + 1))
done
# The switch learns where they are from what they send.
$enter ping -c 20 -i 0.2 -W 1 10.0.0.1 || { simhostctl plane; cat /tmp/simhostd.log; exit 1; }
kill $daemon
wait $daemon
"""


@pytest.fixture(scope="module")
def before(root: Root, debs: Dict[str, Path]) -> Set[str]:
    """The files of the root with all that the package asks for."""
    install(root, [debs[name] for name in OTHERS])
    satisfy(root, [debs[DAEMON]])
    root.satisfy("iproute2, iputils-ping, man-db")
    return root.files()


@pytest.fixture(scope="module")
def machine(root: Root, debs: Dict[str, Path], before: Set[str]) -> Root:
    assert before
    assert install(root, [debs[DAEMON]]) == {DAEMON}
    return root


def test_it_brings_open_vswitch_and_no_other_package_does(debs: Dict[str, Path]) -> None:
    assert "openvswitch-switch (>= 3.1)" in field(debs[DAEMON], "Depends")
    for name, deb in debs.items():
        for kind in ("Pre-Depends", "Depends", "Recommends"):
            assert name == DAEMON or "openvswitch" not in field(deb, kind)


def test_it_moves_frames(machine: Root) -> None:
    said = machine.run("unshare", "--net", "sh", "-c", MOVES)
    assert "bytes from 10.0.0.1" in said


def test_its_unit_and_its_manual_page_are_there(machine: Root) -> None:
    unit = machine.path("/lib/systemd/system/simhostd@.service").read_text(encoding="utf-8")
    assert "ExecStart=/usr/bin/simhostd --state /var/lib/simhost/%i.db" in unit
    page = machine.run("zcat", "/usr/share/man/man8/simhostd.8.gz").replace("\\-", "-")
    said = machine.run("simhostd", "--help")
    options = {*re.findall(r"^  (?:-\w,)?(--[\w-]+)", said, re.MULTILINE)} - {"--help"}
    known = {"--state", "--openvswitch", "--datapath", "--fabric", "--host", "--version"}
    assert known <= options
    terms = {*re.findall(r"^\\fB(?:-\w,)?(--[\w-]+)(?: .*)?\\fR$", page, re.MULTILINE)}
    assert options - terms == set(), page


def test_purged_it_leaves_nothing(machine: Root, before: Set[str]) -> None:
    assert "/usr/bin/simhostd" in machine.files("/usr") - before
    machine.run("apt-get", "purge", "-q", "-y", DAEMON)
    assert machine.files() ^ before == set()
