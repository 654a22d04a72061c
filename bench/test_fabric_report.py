"""The figures of hosts that share a switch: what follows from samples, as text and as a picture."""

from typing import List
from xml.etree import ElementTree

from costs import Cost
from fabric_figures import CHANGING, IDLE, MEMORY, WAKEUPS, Sample, Spent, curves, of_hosts
from fabric_report import drawing, tables


def spent(memory: float) -> Spent:
    """Five processor's milliseconds and 20 wake-ups in ten idle seconds; eight for all changes."""
    return Spent(Cost(memory, 5.0, 20), 10, Cost(memory, 8.0, 0))


def sample(configured: int, connected: List[int], memory: float, more: float = 0) -> Sample:
    """Hosts with three programs of that memory each; the first has so much more."""
    hosts = [
        {
            "simhostd": spent(memory + (0 if number else more)),
            "ovs-vswitchd": spent(memory),
            "ovsdb-server": spent(memory),
        }
        for number in range(len(connected))
    ]
    return Sample(configured, connected, [3, 9, 4], [5, 6, 70], hosts, spent(memory), 2)


SAMPLES = [
    sample(0, [0], 10),
    sample(1_000, [0], 20),
    sample(1_000, [0, 0], 20),
    sample(1_000, [0, 0, 0, 0], 21),
    sample(1_000, [10, 0, 0, 0], 21, more=1),
    sample(1_000, [110, 0, 0, 0], 21, more=2),
    sample(1_000, [110, 110, 0, 0], 21, more=2),
]


def test_a_host_is_the_mean_of_those_that_are_alike() -> None:
    figures = of_hosts(SAMPLES[4], [0, 1])
    assert figures[MEMORY] == 63.5 and figures["  simhostd, MB"] == 21.5
    # Of three programs; three changes were made.
    assert (figures[IDLE], figures[WAKEUPS], figures[CHANGING]) == (1.5, 6, 8)


def test_curves_are_of_hosts_without_ports_and_of_ports_of_the_first() -> None:
    over_hosts, over_ports = curves(SAMPLES)
    assert list(over_hosts) == [1, 2, 4] and list(over_ports) == [0, 10, 110]
    assert [figures[MEMORY] for figures in over_ports.values()] == [63, 64, 65]


def test_what_one_more_costs_is_told_with_its_arithmetic() -> None:
    lines = list(tables(SAMPLES))
    assert (
        "a configured port on a host, memory: (61440.0 - 30720.0) / (1,000 - 0) = 30.7 kB" in lines
    )
    assert "a host more, memory of hosts: (252.0 - 120.0) / (4 - 2) = 66 MB" in lines
    assert (
        "a connected port, memory of its host: (66560.0 - 65536.0) / (110 - 10) = 10.2 kB" in lines
    )
    words = [line.split() for line in lines]
    assert ["a", "change", "at", "the", "caller,", "ms", "4.0", "4.0", "4.0"] in words


def test_a_run_that_ended_early_tells_what_it_has() -> None:
    for count in range(1, len(SAMPLES)):
        assert list(tables(SAMPLES[:count]))
        ElementTree.fromstring(drawing(SAMPLES[:count]))


def test_the_picture_has_each_curve() -> None:
    svg = ElementTree.fromstring(drawing(SAMPLES))
    lines = list(svg.iter("{http://www.w3.org/2000/svg}polyline"))
    # Four of memory and four of milliseconds, over hosts and over ports.
    assert len(lines) == 16
