"""The tables of the pipeline: each has a number of its own, which nothing else names."""

import re
from collections import Counter
from pathlib import Path
from typing import Dict, List

SIMHOST = Path(__file__).resolve().parents[3] / "simhost"
PIPELINE = SIMHOST / "planes" / "openvswitch" / "compile" / "pipeline.h"


def tables_in(text: str) -> Dict[str, int]:
    """The numbers by the names that a header gives them."""
    (tables,) = re.findall(r"^namespace table \{$(.*?)^\}  // namespace table$", text, re.M | re.S)
    found = re.findall(r"^inline constexpr std::uint8_t (k\w+) = (\d+);$", tables, re.M)
    # None is written in a way that this does not see.
    assert len(found) == tables.count("constexpr std::uint8_t k")
    return {name: int(number) for name, number in found}


def shared(tables: Dict[str, int]) -> List[int]:
    """Numbers that several tables have."""
    return [number for number, count in Counter(tables.values()).items() if count > 1]


def bare_numbers(text: str) -> List[str]:
    """Where a table is named by a number, which may be another one's."""
    return re.findall(r"\.table = \d+|go_to\(\d+\)|\.add\(\d+,", text)


def test_each_table_has_a_number_of_its_own() -> None:
    tables = tables_in(PIPELINE.read_text(encoding="utf-8"))
    assert len(tables) > 30
    assert shared(tables) == []
    # 254 is the last one that a switch of OpenFlow has, and some of Open vSwitch's are hidden.
    assert max(tables.values()) <= 253


def test_two_tables_of_one_number_would_be_found() -> None:
    text = PIPELINE.read_text(encoding="utf-8")
    planted = re.sub(r"(kHearing = )\d+;", r"\g<1>26;", text)
    assert planted != text
    assert shared(tables_in(planted)) == [26]


def test_tables_are_named_by_their_names() -> None:
    assert bare_numbers("flow.table = 7; go_to(8); program.add(9, x)") != []
    found = {
        str(path): numbers
        for path in [*SIMHOST.rglob("*.cpp"), *SIMHOST.rglob("*.h")]
        for numbers in [bare_numbers(path.read_text(encoding="utf-8"))]
        if numbers
    }
    assert found == {}
