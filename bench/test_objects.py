"""Whether what objects and the flat module find is the same: a difference anywhere is noticed."""

import subprocess
import sys
from pathlib import Path

PROGRAM = """
import copy, sys
sys.path.insert(0, sys.argv[1])
import objects


def leaves(found):
    if not isinstance(found, (dict, list)):
        return [()]
    parts = found.items() if isinstance(found, dict) else enumerate(found)
    return [(at, *below) for at, one in parts for below in leaves(one)]


objects.populate(1, 1)
ours, theirs = objects.objects_state(), objects.in_words(objects.flat_state())
assert objects.same(ours, theirs)
for *path, last in leaves(theirs):
    changed = place = copy.deepcopy(theirs)
    for at in path:
        place = place[at]
    place[last] = "another"
    assert not objects.same(ours, changed), (path, last)
    del place[last]
    assert isinstance(place, dict) or not objects.same(ours, changed), (path, last)
print(len(leaves(theirs)))
"""


def test_a_difference_would_be_noticed() -> None:
    # The objects load the classes, and the peers are measured beside the flat module alone.
    command = [sys.executable, "-c", PROGRAM, str(Path(__file__).parent)]
    done = subprocess.run(command, stdout=subprocess.PIPE, check=True, text=True)
    assert int(done.stdout) > 40
