"""The settings, options, bounds and defaults that there are: see python/make_property_module.py."""

from typing import Any, Dict, List, Tuple

PROPERTIES: Tuple[Dict[str, Any], ...]
RUNTIME_OPTIONS: Tuple[Dict[str, Any], ...]
NUMBERS: Dict[str, Dict[str, Tuple[int, int]]]
DEFAULTS: Dict[str, Dict[str, Any]]
FABRIC: List[Dict[str, Any]]
LONGEST_KEY: int
