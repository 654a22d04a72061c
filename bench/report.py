"""The measurements as a table for people and as a picture."""

import math
from typing import Callable, Iterator, List, Mapping, Optional
from xml.sax.saxutils import escape

from figures import PEERS
from targets import NOISE, met

Medians = Mapping[str, Mapping[str, float]]
"""For each figure and peer, what was measured."""

Ratios = Mapping[str, Mapping[str, float]]
"""For each figure and peer, our value to the peer's, as it is or as it should be."""

SHORT = {"handwritten": "by hand", "fastcall": "floor", "stock": "SWIG", "cython": "Cython"}


def table(
    title: str,
    unit: str,
    titles: Mapping[str, str],
    medians: Medians,
    ratios: Ratios,
    targets: Ratios,
    ours: str = "ours",
) -> Iterator[str]:
    """The lines of a table: for each figure our value, and its ratio to that of each peer."""
    measured = {peer for row in ratios.values() for peer in row}
    peers = [peer for peer in PEERS if peer in measured]
    width = max(len(titles[figure]) for figure in medians)
    yield f"{title:{width}}  {unit:>9}  " + "".join(
        f"{SHORT.get(peer, peer):>13}" for peer in peers
    )
    for figure, row in medians.items():
        cells = "".join(
            f"{_cell(ratios[figure].get(peer), targets.get(figure, {}).get(peer)):>13}"
            for peer in peers
        )
        yield f"{titles[figure]:{width}}  {_number(row[ours]):>9}  {cells}"


def _number(value: float) -> str:
    return f"{value:.1f}" if value < 1000 else f"{value:,.0f}"


def _cell(ratio: Optional[float], target: Optional[float]) -> str:
    if ratio is None:
        return ""
    if target is None:
        return f"{ratio:.2f}       "
    return f"{ratio:.2f} {target:.2f} {'+' if met(ratio, target) else 'X'}"


def legend() -> List[str]:
    """What the cells mean."""
    return [
        "Each cell: our value as a ratio to the peer's, less is better; the target where there is",
        f"one; + where it is met, X where it is missed by more than {NOISE:.0%}.",
    ]


_COLOURS = {
    "handwritten": "#1f77b4",
    "fastcall": "#17becf",
    "stock": "#7f7f7f",
    "pybind11": "#9467bd",
    "cffi": "#2ca02c",
    "ctypes": "#bcbd22",
    "cython": "#ff7f0e",
    "ours": "#d62728",
}
"""In the order of drawing: the module lies over the others."""


def _dots(y: int, forms: Medians, across: Callable[[float], float]) -> Iterator[str]:
    for form, row in forms.items():
        for peer, colour in _COLOURS.items():
            if peer not in row:
                continue
            x = across(row[peer])
            if form == "functions":
                yield f'<circle cx="{x:.1f}" cy="{y}" r="5" fill="{colour}" fill-opacity="0.85"/>'
            elif form == "own" and peer != "ours":
                yield (
                    f'<circle cx="{x:.1f}" cy="{y}" r="5" fill="none" stroke="{colour}"'
                    ' stroke-width="2"/>'
                )


def picture(titles: Mapping[str, str], forms: Mapping[str, Medians]) -> str:
    """An SVG picture: a line for each figure, a dot for each peer at its nanoseconds.

    A full dot is the form of functions, a ring the peer's own form.
    """
    left, right, top, step = 240, 30, 70, 34
    width, height = 900, top + step * len(titles) + 50
    values = [value for form in forms.values() for row in form.values() for value in row.values()]
    low, high = (math.log10(value) for value in (min(values) / 1.2, max(values) * 1.2))

    def across(value: float) -> float:
        return left + (math.log10(value) - low) / (high - low) * (width - left - right)

    lines = [
        f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {width} {height}"'
        ' font-family="sans-serif" font-size="12">',
        f'<rect width="{width}" height="{height}" fill="white"/>',
    ]
    place = 10.0
    for peer, colour in _COLOURS.items():
        title = PEERS[peer].title
        lines.append(f'<circle cx="{place + 5:.0f}" cy="18" r="5" fill="{colour}"/>')
        lines.append(f'<text x="{place + 14:.0f}" y="22">{escape(title)}</text>')
        place += 24 + 6.4 * len(title)
    lines.append(
        '<text x="10" y="42" fill="#555">Nanoseconds of one call, less is better. Dots: as'
        " functions like the module's own. Rings: the peer's own form.</text>"
    )
    bottom = top + step * len(titles)
    for tick in (5, 10, 20, 50, 100, 200, 500, 1000):
        if low <= math.log10(tick) <= high:
            x = across(tick)
            lines.append(
                f'<line x1="{x:.1f}" y1="{top - 14}" x2="{x:.1f}" y2="{bottom}" stroke="#ddd"/>'
            )
            lines.append(
                f'<text x="{x:.1f}" y="{bottom + 18}" text-anchor="middle">{tick} ns</text>'
            )
    for number, (figure, title) in enumerate(titles.items()):
        y = top + step * number + step // 2 - 8
        lines.append(f'<text x="{left - 12}" y="{y + 4}" text-anchor="end">{escape(title)}</text>')
        lines.append(f'<line x1="{left}" y1="{y}" x2="{width - right}" y2="{y}" stroke="#eee"/>')
        lines += _dots(y, {form: medians[figure] for form, medians in forms.items()}, across)
    lines.append("</svg>")
    return "\n".join(lines) + "\n"
