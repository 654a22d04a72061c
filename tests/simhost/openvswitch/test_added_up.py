"""What flows count of frames that Open vSwitch adds up later: all of them, whatever the limits of
learned addresses are."""

import re
from typing import Callable, Iterator, Optional

import pytest

from added_up_by_chance import Change, Path, run_limits, run_moves
from compiler import Compiler
from open_vswitch import OpenVSwitch
from seeds import Outcome


@pytest.fixture(scope="module")
def path(tmp_path_factory: pytest.TempPathFactory, compiler: Compiler) -> Iterator[Path]:
    often = OpenVSwitch(tmp_path_factory.mktemp("often"))
    yield Path(often, compiler)
    often.close()


def test_all_frames_count_as_what_became_of_them(path: Path) -> None:
    passed, wrong = run_limits(path, 3)
    assert wrong == [] and passed > 10


def test_what_came_before_a_move_moves_nothing_back(path: Path) -> None:
    passed, wrong = run_moves(path, 1)
    assert wrong == [] and passed > 10


@pytest.mark.parametrize(
    "run, first, found",
    [
        # A frame that is added up would have found room.
        (run_limits, 10, "table=37, priority=[12]00,"),
        # Who moved since stays.
        (run_moves, 1, "table=39, priority=2[01]0,"),
    ],
)
def test_what_is_wrong_would_be_noticed(
    path: Path, run: Callable[[Path, int, Change], Outcome], first: int, found: str
) -> None:
    def change(flow: str) -> Optional[str]:
        return None if re.search(found, flow) else flow

    # Nothing is wrong with what was added up before the next one came.
    assert any(run(path, seed, change)[1] for seed in range(first, first + 20))
