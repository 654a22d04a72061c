"""Curves as an SVG picture: panels side by side, each with a line for each figure over a size."""

import math
from typing import Iterator, List, Mapping, NamedTuple, Sequence, Tuple
from xml.sax.saxutils import escape

_COLOURS = [
    "#1f77b4",
    "#17becf",
    "#7f7f7f",
    "#9467bd",
    "#2ca02c",
    "#bcbd22",
    "#ff7f0e",
    "#d62728",
    "#8c564b",
]

_LEFT, _RIGHT, _TOP, _BOTTOM = 70, 10, 96, 50
_WIDTH, _HEIGHT = 900, 420

Rows = Mapping[str, Mapping[int, float]]
"""For each figure, its value at each size."""


class Panel(NamedTuple):
    """Rows with what stands above them, and the unit of their values."""

    title: str
    unit: str
    rows: Rows


def picture(caption: str, panels: Sequence[Panel]) -> str:
    """Both directions are logarithmic. Panels of one unit have one scale."""
    figures = list(dict.fromkeys(name for panel in panels for name in panel.rows))
    colours = dict(zip(figures, _COLOURS))
    lines = [
        f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {_WIDTH} {_HEIGHT}"'
        ' font-family="sans-serif" font-size="12">',
        f'<rect width="{_WIDTH}" height="{_HEIGHT}" fill="white"/>',
        *_legend(colours),
        f'<text x="10" y="58" fill="#555">{escape(caption)}</text>',
    ]
    width = (_WIDTH - _LEFT - _RIGHT) / max(len(panels), 1)
    for number, panel in enumerate(panels):
        alike = [other for other in panels if other.unit == panel.unit]
        lines += _panel(panel, colours, _LEFT + number * width, width - 70, _bounds(alike))
    lines.append("</svg>")
    return "\n".join(lines) + "\n"


def _bounds(panels: Sequence[Panel]) -> Tuple[float, float]:
    values = [value for panel in panels for row in panel.rows.values() for value in row.values()]
    return math.log10(min(values) / 1.3), math.log10(max(values) * 1.3)


def _legend(colours: Mapping[str, str]) -> Iterator[str]:
    place, y = 10.0, 18
    for name, colour in colours.items():
        if place + 30 + 6.4 * len(name) > _WIDTH:
            place, y = 10.0, y + 18
        yield f'<circle cx="{place + 5:.0f}" cy="{y}" r="5" fill="{colour}"/>'
        yield f'<text x="{place + 14:.0f}" y="{y + 4}">{escape(name)}</text>'
        place += 24 + 6.4 * len(name)


def _panel(
    panel: Panel,
    colours: Mapping[str, str],
    left: float,
    width: float,
    bounds: Tuple[float, float],
) -> Iterator[str]:
    sizes = sorted({size for row in panel.rows.values() for size in row})
    low, high = bounds
    bottom = _HEIGHT - _BOTTOM

    def across(size: int) -> float:
        span = math.log10(sizes[-1]) - math.log10(sizes[0])
        return left + (math.log10(size) - math.log10(sizes[0])) / (span or 1) * width

    def down(value: float) -> float:
        return bottom - (math.log10(value) - low) / (high - low) * (bottom - _TOP)

    yield f'<text x="{left:.1f}" y="{_TOP - 14}" font-weight="bold">{escape(panel.title)}</text>'
    for tick in (10 ** math.ceil(low) * 10**step for step in range(math.floor(high - low) + 1)):
        if low <= math.log10(tick) <= high:
            y = down(tick)
            yield (
                f'<line x1="{left:.1f}" y1="{y:.1f}" x2="{left + width:.1f}" y2="{y:.1f}"'
                ' stroke="#ddd"/>'
            )
            yield (
                f'<text x="{left - 6:.1f}" y="{y + 4:.1f}" text-anchor="end">'
                f"{_tick(tick)} {panel.unit}</text>"
            )
    for size in sizes:
        x = across(size)
        yield f'<line x1="{x:.1f}" y1="{_TOP}" x2="{x:.1f}" y2="{bottom}" stroke="#eee"/>'
        yield f'<text x="{x:.1f}" y="{bottom + 18}" text-anchor="middle">{size:,}</text>'
    for name, row in panel.rows.items():
        yield from _line(name, colours[name], [(across(at), down(row[at])) for at in sorted(row)])


def _tick(value: float) -> str:
    return f"{value:,.0f}" if value >= 1 else f"{value:g}"


def _line(name: str, colour: str, points: List[Tuple[float, float]]) -> Iterator[str]:
    words = " ".join(f"{x:.1f},{y:.1f}" for x, y in points)
    yield f'<polyline points="{words}" fill="none" stroke="{colour}" stroke-width="2">'
    yield f"<title>{escape(name)}</title></polyline>"
    for x, y in points:
        yield f'<circle cx="{x:.1f}" cy="{y:.1f}" r="4" fill="{colour}"/>'
