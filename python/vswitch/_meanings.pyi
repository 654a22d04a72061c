"""What the values of a trace mean, call by call: see python/make_meanings.py."""

from typing import Any, Dict

CALLS: Dict[str, Dict[str, Any]]
