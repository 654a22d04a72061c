"""What the binding definitions say of records and calls: see python/make_layout.py."""

from typing import Dict, List

WHOLE_RECORDS: List[str]
DEALLOCATORS: List[str]
SCALARS: Dict[str, str]
POINTEE_RECORDS: List[str]
POINTERS: List[str]
