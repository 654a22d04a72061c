"""The curves of the simulated host as tables for people and as a picture."""

from typing import Dict, Iterator

from curves import Panel
from curves import picture as curves_picture
from targets import HOST, met

Curves = Dict[str, Dict[str, Dict[int, float]]]
"""For each place of the state, figure, and number of ports: microseconds of one call."""


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
    panels = [Panel(f"state in {place}", "us", figures) for place, figures in curves.items()]
    return curves_picture(_CAPTION, panels)


_CAPTION = (
    "Microseconds of one call through the module, less is better, over the number of ports of the"
    " switch."
)
