"""The curves of the simulated host as tables for people and as a picture."""

import math
from typing import Dict, Iterator, List, Tuple
from xml.sax.saxutils import escape

from targets import HOST, met

Curves = Dict[str, Dict[str, Dict[int, float]]]
"""For each place of the state, figure, and number of ports: microseconds of one call."""

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


def tables(curves: Curves) -> Iterator[str]:
    """A table for each place: calls per second on the largest switch, and the curve to it."""
    for place, figures in curves.items():
        sizes = list(next(iter(figures.values())))
        width = max(len(name) for name in figures)
        yield ""
        yield (
            f"{'state in ' + place:{width}}  {'calls per':>10}  "
            f"{'microseconds of a call, with so many ports':>{12 * len(sizes)}}"
        )
        yield f"{'':{width}}  {'second':>10}  " + "".join(f"{size:>12,}" for size in sizes)
        for name, curve in figures.items():
            cells = "".join(f"{_number(curve[size]):>12}" for size in sizes)
            yield f"{name:{width}}  {1e6 / curve[sizes[-1]]:>10,.0f}  {cells}"


def verdicts(curves: Curves) -> Iterator[str]:
    """How each target fares in each place."""
    for place, figures in curves.items():
        link, uplink = figures["change a link"], figures["ask for a port's uplink"]
        least, most = min(link), max(link)
        ratios = {
            "change a link": (link[most] / link[least], f"{most:,} ports to {least:,}"),
            "ask for a port's uplink": (
                uplink[most] / figures["look up a port"][most],
                "to a look-up of the port",
            ),
        }
        for name, target in HOST.items():
            ratio, compared = ratios[name]
            verdict = "met" if met(ratio, target) else "missed"
            yield f"state in {place}: {name}, {compared}: {ratio:.2f}, at most {target}: {verdict}"


def _number(value: float) -> str:
    return f"{value:.1f}" if value < 1_000 else f"{value:,.0f}"


def picture(curves: Curves) -> str:
    """An SVG picture: a line for each figure over the number of ports, a panel for each place."""
    figures = list(next(iter(curves.values())))
    lines = [
        f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {_WIDTH} {_HEIGHT}"'
        ' font-family="sans-serif" font-size="12">',
        f'<rect width="{_WIDTH}" height="{_HEIGHT}" fill="white"/>',
        *_legend(figures),
        f'<text x="10" y="58" fill="#555">{escape(_CAPTION)}</text>',
    ]
    values = [
        value for place in curves.values() for row in place.values() for value in row.values()
    ]
    bounds = (math.log10(min(values) / 1.3), math.log10(max(values) * 1.3))
    panel = (_WIDTH - _LEFT - _RIGHT) / len(curves)
    for number, (place, rows) in enumerate(curves.items()):
        lines += _panel(place, rows, _LEFT + number * panel, panel - 70, bounds)
    lines.append("</svg>")
    return "\n".join(lines) + "\n"


_CAPTION = (
    "Microseconds of one call through the module, less is better, over the number of ports of the"
    " switch."
)


def _legend(figures: List[str]) -> Iterator[str]:
    place, y = 10.0, 18
    for name, colour in zip(figures, _COLOURS):
        if place + 30 + 6.4 * len(name) > _WIDTH:
            place, y = 10.0, y + 18
        yield f'<circle cx="{place + 5:.0f}" cy="{y}" r="5" fill="{colour}"/>'
        yield f'<text x="{place + 14:.0f}" y="{y + 4}">{escape(name)}</text>'
        place += 24 + 6.4 * len(name)


def _panel(
    place: str,
    rows: Dict[str, Dict[int, float]],
    left: float,
    width: float,
    bounds: Tuple[float, float],
) -> Iterator[str]:
    sizes = list(next(iter(rows.values())))
    low, high = bounds
    bottom = _HEIGHT - _BOTTOM

    def across(size: int) -> float:
        span = math.log10(sizes[-1]) - math.log10(sizes[0])
        return left + (math.log10(size) - math.log10(sizes[0])) / span * width

    def down(value: float) -> float:
        return bottom - (math.log10(value) - low) / (high - low) * (bottom - _TOP)

    yield f'<text x="{left:.1f}" y="{_TOP - 14}" font-weight="bold">state in {place}</text>'
    for tick in (10 ** math.ceil(low) * 10**step for step in range(math.floor(high - low) + 1)):
        if low <= math.log10(tick) <= high:
            y = down(tick)
            yield (
                f'<line x1="{left:.1f}" y1="{y:.1f}" x2="{left + width:.1f}" y2="{y:.1f}"'
                ' stroke="#ddd"/>'
            )
            yield (
                f'<text x="{left - 6:.1f}" y="{y + 4:.1f}" text-anchor="end">{tick:,.0f} us</text>'
            )
    for size in sizes:
        x = across(size)
        yield f'<line x1="{x:.1f}" y1="{_TOP}" x2="{x:.1f}" y2="{bottom}" stroke="#eee"/>'
        yield f'<text x="{x:.1f}" y="{bottom + 18}" text-anchor="middle">{size:,}</text>'
    for (name, row), colour in zip(rows.items(), _COLOURS):
        points = " ".join(f"{across(size):.1f},{down(value):.1f}" for size, value in row.items())
        yield f'<polyline points="{points}" fill="none" stroke="{colour}" stroke-width="2">'
        yield f"<title>{escape(name)}</title></polyline>"
        for point in points.split():
            x_text, y_text = point.split(",")
            yield f'<circle cx="{x_text}" cy="{y_text}" r="4" fill="{colour}"/>'
