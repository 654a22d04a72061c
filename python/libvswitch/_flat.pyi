"""The flat functions as the generated classes want them; nobody else imports them."""

from typing import Any, List

__all__: List[str] = []

def __getattr__(name: str) -> Any: ...
