"""The command that draws: switches, their ports by VLAN, the uplinks, and what carries what.

The picture is SVG with nothing outside it, so that it can go into a report as it is.
"""

from typing import Any, Dict, List, NamedTuple, Optional, Sequence, Tuple
from xml.etree import ElementTree

import typer

from vswitch.command import completing
from vswitch.command.session import host
from vswitch.switch import Switch
from vswitch.told import shown
from vswitch.words import printable

__all__ = ["draw"]

# In pixels. Text is as wide as it may be at the most, for nobody tells which font there is.
_CHARACTER = 8.0
_LINE = 20
_BOX = 30
_GAP = 8
_MARGIN = 24
_CURVE = 180

_INK, _FAINT, _FRAME, _PAPER, _UP, _DOWN = (
    "#1f2933",
    "#66727f",
    "#c9d1d9",
    "#f6f8fa",
    "#1a7f37",
    "#cf222e",
)
# Of curves, by uplink: apart for those who tell colours badly, too.
_COLOURS = ("#0072b2", "#d55e00", "#009e73", "#cc79a7", "#56b4e9", "#e69f00")


class _Port(NamedTuple):
    name: str
    carrier: Optional[str]
    is_blocked: bool


class _Uplink(NamedTuple):
    name: str
    link: str
    port: str


class _Seen(NamedTuple):
    """What is drawn of a switch."""

    name: str
    about: str
    vlans: List[Tuple[str, List[_Port]]]
    uplinks: List[_Uplink]


def draw(
    switch: Optional[str] = typer.Argument(
        None, metavar="[SWITCH]", help="One switch only.", autocompletion=completing.switches
    )
) -> None:
    """Draw the switches as SVG: draw > picture.svg

    It shows their ports by VLAN, the uplinks with their links, and which uplink carries which port.
    """
    there = host().switches
    found = [there[switch]] if switch is not None else list(there.values())
    print(_picture([_seen(one) for one in found]))


def _seen(switch: Switch) -> _Seen:
    state = switch.state()
    vlans: Dict[Tuple[int, str], List[_Port]] = {}
    for port in state["ports"]:
        vlans.setdefault(_vlan(port.get("vlan", 0)), []).append(
            _Port(port["id"], port["observed"].get("uplink"), port.get("blocked", False))
        )
    uplinks = switch.uplinks.values() if state["running"] else ()
    about = f"MTU {switch.mtu}" + ("" if state["running"] else ", not running")
    return _Seen(
        switch.alias,
        about,
        [(label, vlans[id_, label]) for id_, label in sorted(vlans)],
        [_Uplink(one.name, str(one.link), one.port) for one in uplinks],
    )


def _vlan(said: Any) -> Tuple[int, str]:
    """A VLAN by its number, and by what it is called."""
    held = said if isinstance(said, dict) else {"id": said}
    parts = [f"VLAN {held['id']}"] if held.get("id") else []
    parts += [f"trunk {shown(held['trunk'])}"] if held.get("trunk") else []
    parts += ["private"] if held.get("private") else []
    return held.get("id", 0), ", ".join(parts) or "no VLAN"


class _Drawing:
    """An element of SVG, and what is put into it."""

    def __init__(self) -> None:
        self.root = ElementTree.Element(
            "svg",
            {"xmlns": "http://www.w3.org/2000/svg", "font-family": "sans-serif", "font-size": "13"},
        )

    def add(self, kind: str, **attributes: object) -> ElementTree.Element:
        said = {name.replace("_", "-"): _number(value) for name, value in attributes.items()}
        return ElementTree.SubElement(self.root, kind, said)

    def text(self, words: str, x: float, y: float, **more: object) -> None:
        look: Dict[str, object] = {"fill": _INK, **more}
        self.add("text", x=x, y=y, **look).text = printable(words)

    def box(self, x: float, y: float, width: float, height: float, **more: object) -> None:
        look: Dict[str, object] = {"rx": 5, "fill": "white", "stroke": _FRAME, **more}
        self.add("rect", x=x, y=y, width=width, height=height, **look)


def _number(value: object) -> str:
    return f"{value:g}" if isinstance(value, float) else str(value)


def _picture(switches: Sequence[_Seen]) -> str:
    drawing = _Drawing()
    wide = max([_wide(_names(one)) for one in switches], default=0)
    width = 4 * _MARGIN + 2 * wide + _CURVE
    drawing.add("rect", width="100%", height="100%", fill="white")
    y = float(_MARGIN)
    for one in switches:
        y += _switch(drawing, one, y, width, wide) + _MARGIN
    if not switches:
        drawing.text("There are no switches.", _MARGIN, y + _LINE)
        y += _LINE + _MARGIN
    drawing.root.set("width", _number(width))
    drawing.root.set("height", _number(y))
    drawing.root.set("viewBox", f"0 0 {_number(width)} {_number(y)}")
    return ElementTree.tostring(drawing.root, encoding="unicode")


def _names(seen: _Seen) -> List[str]:
    """All that is written in a column, with room for the word that may follow it."""
    ports = [f"{port.name} blocked" for _, ports in seen.vlans for port in ports]
    labels = [label for label, _ in seen.vlans]
    return [*ports, *labels, *(f"{_uplink_label(one)} down" for one in seen.uplinks), seen.name]


def _uplink_label(uplink: _Uplink) -> str:
    return f"{uplink.name} ({uplink.port})"


def _wide(names: Sequence[str]) -> float:
    return max([160.0, *(len(printable(one)) * _CHARACTER + 40 for one in names)])


def _switch(drawing: _Drawing, seen: _Seen, top: float, width: float, wide: float) -> float:
    """Draws a switch, and returns how high it is."""
    step = _BOX + _GAP
    left = sum(_LINE + _GAP + len(ports) * step for _, ports in seen.vlans)
    right = len(seen.uplinks) * 2 * step
    inner = max(left, right, float(step))
    height = 3 * _LINE + inner + _GAP
    panel = width - 2 * _MARGIN
    drawing.box(_MARGIN, top, panel, height, fill=_PAPER, rx=8)
    x = 2.0 * _MARGIN
    drawing.text(seen.name, x, top + 28, font_size=17, font_weight="bold")
    drawing.text(seen.about, width - x, top + 28, fill=_FAINT, text_anchor="end")
    start = top + 2.5 * _LINE
    far = x + wide + _CURVE
    ends = _uplinks(drawing, seen.uplinks, far, start + (inner - right) / 2, wide)
    _ports(drawing, seen, x, start, wide, far, ends)
    return height


def _uplinks(
    drawing: _Drawing, uplinks: Sequence[_Uplink], x: float, y: float, wide: float
) -> Dict[str, Tuple[float, str]]:
    """Draws the uplinks; where the curves to each end, and in which colour."""
    ends = {}
    for at, one in enumerate(uplinks):
        middle = y + (2 * at + 1) * (_BOX + _GAP)
        is_up = one.link == "up"
        drawing.box(x, middle - _BOX / 2, wide, _BOX, stroke=_FRAME if is_up else _DOWN)
        drawing.add("circle", cx=x + 16, cy=middle, r=5, fill=_UP if is_up else _DOWN)
        drawing.text(_uplink_label(one), x + 30, middle + 5)
        if not is_up:
            drawing.text("down", x + wide - 10, middle + 5, fill=_DOWN, text_anchor="end")
        ends[one.name] = (middle, _COLOURS[at % len(_COLOURS)])
    return ends


def _ports(
    drawing: _Drawing,
    seen: _Seen,
    x: float,
    y: float,
    wide: float,
    far: float,
    ends: Dict[str, Tuple[float, str]],
) -> None:
    if not seen.vlans:
        drawing.text("no ports", x, y + _LINE - 4, fill=_FAINT)
    for label, ports in seen.vlans:
        y += _LINE
        drawing.text(label, x, y - 4, fill=_FAINT, font_weight="bold")
        for port in ports:
            middle = y + _BOX / 2 + 2
            drawing.box(
                x, middle - _BOX / 2, wide, _BOX, stroke=_DOWN if port.is_blocked else _FRAME
            )
            drawing.text(port.name, x + 12, middle + 5)
            if port.is_blocked:
                drawing.text("blocked", x + wide - 10, middle + 5, fill=_DOWN, text_anchor="end")
            if port.carrier in ends:
                end, colour = ends[port.carrier]
                bend = _CURVE / 2
                path = (
                    f"M {x + wide:g} {middle:g} C {x + wide + bend:g} {middle:g}"
                    f" {far - bend:g} {end:g} {far:g} {end:g}"
                )
                drawing.add("path", d=path, fill="none", stroke=colour, stroke_width=1.8)
            y += _BOX + _GAP
        y += _GAP
