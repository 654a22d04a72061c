"""What the binding definitions say of records and calls: see python/make_layout.py."""

from typing import Dict, List, Tuple, Union

RECORDS: List[str]
WHOLE_RECORDS: List[str]
ARRAYS: Dict[str, Tuple[str, int, Union[None, int, str]]]
VIEWS: List[str]
BOOLEANS: List[str]
ADDRESSES: List[str]
METHODS_WITH_VIEWS: List[str]
METHODS_WITH_NUMBERS: List[str]
TABLES: Dict[str, str]
ELEMENTS: Dict[str, str]
CALLS_WITH_OUTPUTS: List[str]
CALLS_WITH_CELLS: Dict[str, List[int]]
CALLS_WITH_CALLBACKS: Dict[str, List[int]]
CALLS_WITH_TRUTHS: List[str]
SCALARS: Dict[str, str]
RECORDS_BEHIND_POINTERS: List[str]
POINTERS: List[str]
