"""The picture: well-formed, with all that it shows, inside its own edges."""

from typing import Dict, List
from xml.etree import ElementTree

from command_line import SIMULATED, Refused, Vswitch
from simhost import SharedHost

SVG = "{http://www.w3.org/2000/svg}"


def drawn(vswitch: Vswitch, *words: str) -> ElementTree.Element:
    done = vswitch("draw", *words)
    assert (done.status, done.stderr) == (0, SIMULATED)
    return ElementTree.fromstring(done.stdout)


def texts(picture: ElementTree.Element) -> List[str]:
    return [one.text or "" for one in picture.iter(f"{SVG}text")]


def curves(picture: ElementTree.Element) -> Dict[str, int]:
    """How many curves there are of each colour."""
    found: Dict[str, int] = {}
    for one in picture.iter(f"{SVG}path"):
        found[one.attrib["stroke"]] = found.get(one.attrib["stroke"], 0) + 1
    return found


def test_a_switch(vswitch: Vswitch) -> None:
    picture = drawn(vswitch, "lab")
    assert picture.tag == f"{SVG}svg"
    assert texts(picture) == [
        "lab",
        "MTU 9000",
        "nic0 (left)",
        "nic1 (right)",
        "no VLAN",
        "web-2",
        "VLAN 7, trunk 10-12",
        "web-1",
    ]
    assert list(curves(picture).values()) == [2]


def test_all_switches(vswitch: Vswitch) -> None:
    said = texts(drawn(vswitch))
    assert {"lab", "vswitch0", "web-1", "db-1", "nic5 (uplink2)"} <= set(said)


def test_links_and_blocks(vswitch: Vswitch, lab: SharedHost) -> None:
    lab.link("nic0").down()
    assert vswitch("set", "lab/web-1", "blocked=true").status == 0
    said = texts(drawn(vswitch, "lab"))
    assert said.count("down") == 1 and said.count("blocked") == 1


def test_ports_have_the_colour_of_their_carrier(vswitch: Vswitch) -> None:
    assert vswitch("set", "lab/web-2", "active=right", "standby=left").status == 0
    assert sorted(curves(drawn(vswitch, "lab")).values()) == [1, 1]


def test_names_are_no_markup(vswitch: Vswitch, lab: SharedHost) -> None:
    lab.apply({"switches": [{"alias": "<a>&\x1b'\"", "running": False, "ports": [{"id": "]]>"}]}]})
    said = texts(drawn(vswitch))
    assert "<a>&\\x1b'\"" in said and "]]>" in said and "MTU 1500, not running" in said


def test_all_lies_within_its_edges(vswitch: Vswitch, lab: SharedHost) -> None:
    lab.apply({"switches": [{"alias": "long", "ports": [{"id": "x" * 31}]}]})
    picture = drawn(vswitch)
    width, height = (float(picture.attrib[name]) for name in ("width", "height"))
    boxes = [one for one in picture.iter(f"{SVG}rect") if "x" in one.attrib]
    assert len(boxes) > 10
    for one in boxes:
        at = {name: float(one.attrib[name]) for name in ("x", "y", "width", "height")}
        assert 0 <= at["x"] and at["x"] + at["width"] <= width
        assert 0 <= at["y"] and at["y"] + at["height"] <= height


def test_no_switches(vswitch: Vswitch) -> None:
    for alias in ("lab", "vswitch0"):
        assert vswitch("remove", alias).status == 0
    assert texts(drawn(vswitch)) == ["There are no switches."]


def test_no_ports(vswitch: Vswitch) -> None:
    assert vswitch("add", "bare").status == 0
    assert texts(drawn(vswitch, "bare")) == ["bare", "MTU 1500", "no ports"]


def test_no_such_switch(refused: Refused) -> None:
    assert refused("draw", "nope") == "vswitch: no switch 'nope' (there are lab, vswitch0)\n"
