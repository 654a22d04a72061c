"""What the module is to reach: its time as a ratio to that of a peer."""

from typing import Dict

NOISE = 0.05
"""What a ratio may be above its target before the target counts as missed."""

CALLS: Dict[str, Dict[str, float]] = {
    "read": {"handwritten": 0.80, "stock": 1.8, "pybind11": 0.22, "cffi": 0.55, "ctypes": 0.78},
    "write": {
        "handwritten": 0.80,
        "stock": 0.80,
        "pybind11": 0.22,
        "cffi": 0.42,
        "ctypes": 0.62,
        "cython": 1.0,
    },
    "text_read": {
        "handwritten": 0.95,
        "stock": 1.5,
        "pybind11": 0.35,
        "cffi": 0.33,
        "ctypes": 0.60,
    },
    "text_write": {
        "handwritten": 0.88,
        "stock": 0.58,
        "pybind11": 0.25,
        "cffi": 0.40,
        "ctypes": 0.50,
    },
    "status": {
        "handwritten": 0.60,
        "stock": 0.66,
        "pybind11": 0.38,
        "cffi": 0.35,
        "ctypes": 0.15,
        "cython": 1.0,
    },
    "pair": {
        "handwritten": 0.60,
        "stock": 0.55,
        "pybind11": 0.41,
        "cffi": 0.22,
        "ctypes": 0.11,
        "cython": 1.0,
    },
    "filled": {
        "handwritten": 0.58,
        "stock": 0.64,
        "pybind11": 0.26,
        "cffi": 0.33,
        "ctypes": 0.18,
        "cython": 1.0,
    },
    "lifetime": {
        "handwritten": 0.70,
        "stock": 0.95,
        "pybind11": 0.16,
        "cffi": 0.48,
        "ctypes": 0.80,
        "cython": 1.0,
    },
}
"""For each figure and peer, in the form of functions."""

CLASSES: Dict[str, Dict[str, float]] = {
    "read": {"pybind11": 0.30},
    "write": {"pybind11": 0.35},
    "lifetime": {"pybind11": 0.55},
}
"""For each figure and peer, of classes."""

MODULES: Dict[str, Dict[str, float]] = {
    "import": {"handwritten": 1.4, "ctypes": 0.25},
    "memory": {"handwritten": 1.6},
    "size": {"stock": 1.1},
    "size_stripped": {"stock": 1.1},
    "compile": {"stock": 1.0},
}
"""For what is measured of whole modules."""

HOST: Dict[str, float] = {"change a link": 4.0, "ask for a port's uplink": 1.5}
"""For a figure of the simulated host: to the same with ten ports, and to a look-up of the port."""

FRAMES: Dict[str, Dict[str, float]] = {
    "throughput": {"least": 0.95},
    "round trip": {"most": 1.1},
    "added to a change": {"most": 1.0},
    "question": {"most": 1.0},
    "change, 100 ports": {"most": 2.0},
    "change, 1,000 ports": {"most": 20.0},
    "from nothing": {"most": 2.0},
    "resync": {"most": 0.2},
    "come back": {"most": 2.0},
}
"""For a figure of real frames, in its own unit: what it is to be at least, and at most."""


def met(ratio: float, target: float) -> bool:
    """Whether a ratio reaches its target, noise allowed for."""
    return ratio <= target * (1 + NOISE)
