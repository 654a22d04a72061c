"""Count the tests in a JUnit report: prints "PASSED FAILED".

A test that was skipped, or that could not run, was not shown to work and counts as failed.
"""

import sys
from typing import Tuple
from xml.etree import ElementTree


def count(path: str) -> Tuple[int, int]:
    """Return how many test cases of the report passed, and how many did not."""
    passed = failed = 0
    for case in ElementTree.parse(path).iter("testcase"):
        if any(case.find(verdict) is not None for verdict in ("failure", "error", "skipped")):
            failed += 1
        else:
            passed += 1
    return passed, failed


if __name__ == "__main__":
    print(*count(sys.argv[1]))
