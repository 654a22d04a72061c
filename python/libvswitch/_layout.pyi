"""What the binding definitions say of records and calls: see python/make_layout.py."""

from typing import Dict, List

WHOLE_RECORDS: List[str]
DEALLOCATORS: List[str]
SCALARS: Dict[str, str]
RECORDS_BEHIND_POINTERS: List[str]
POINTERS: List[str]
