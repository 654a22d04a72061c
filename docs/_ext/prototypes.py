"""What the declaration of a call says by itself."""

import re
from typing import List


def returns_status(prototype: str) -> bool:
    return prototype.startswith("QEX_ReturnStatus ")


def has_parameter(prototype: str, parameter: str) -> bool:
    return re.search(rf"\b{parameter}\b(?:\[\w+\])?[,)]", prototype) is not None


def texts(prototype: str) -> List[str]:
    """The parameters that are texts for the call to read."""
    return re.findall(r"(?<!unsigned )\bchar const \*?(\w+)(?=[,)\[])", prototype)
