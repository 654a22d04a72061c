"""The curves of the simulated host as text and as a picture."""

from typing import List
from xml.etree import ElementTree

from host_report import Curves, picture, tables, verdicts

CURVES: Curves = {
    "memory": {"look up": {10: 2.0, 1_000: 4.0}, "change": {10: 20.0, 1_000: 2_500.0}},
    "a file": {"look up": {10: 3.0, 1_000: 5.0}, "change": {10: 30.0, 1_000: 3_000.0}},
}


def test_tables_have_calls_per_second_and_the_curve() -> None:
    lines = [line.split() for line in tables(CURVES)]
    assert ["look", "up", "250,000", "2.0", "4.0"] in lines
    assert ["change", "333", "30.0", "3,000"] in lines
    assert ["second", "10", "1,000"] in lines


def test_the_picture_has_a_line_for_each_figure_and_place() -> None:
    svg = ElementTree.fromstring(picture(CURVES))
    space = "{http://www.w3.org/2000/svg}"
    lines = list(svg.iter(f"{space}polyline"))
    assert len(lines) == 4
    for line in lines:
        xs, ys = zip(*(map(float, point.split(",")) for point in line.get("points", "").split()))
        assert 0 <= min(xs) < max(xs) <= 900
        assert 420 >= max(ys) > min(ys) >= 0, "what takes longer is higher up"
        assert ys[0] > ys[-1]


def test_a_target_is_missed_by_more_than_noise() -> None:
    steady = {10: 10.0, 10_000: 10.0}

    def said(**others: float) -> List[str]:
        figures = {"look up a port": steady, "change a link": steady}
        figures["ask for a port's uplink"] = {10: 1.0, 10_000: others.get("uplink", 10.0)}
        figures["change a link"] = {10: 10.0, 10_000: others.get("link", 10.0)}
        return [line.rpartition(" ")[2] for line in verdicts({"memory": figures})]

    assert said() == ["met", "met"]
    assert said(link=40 * 1.04, uplink=15 * 1.04) == ["met", "met"]
    assert said(link=40 * 1.06) == ["missed", "met"]
    assert said(uplink=15 * 1.06) == ["met", "missed"]
