"""No exception of a callback is lost, and none lets a walk go on."""

import signal
from typing import Any, Iterator, List

import libvswitch as vs
import pytest


class Undecided:
    def __bool__(self) -> bool:
        raise ArithmeticError("neither true nor false")


@pytest.fixture
def many(switch: str) -> Iterator[Any]:
    """The handle of a switch with ports enough for a walk to take a while."""
    for number in range(40):
        assert vs.VSDVS_AddDVPort(switch, f"port-{number}", 7) == vs.QEX_OK
    yield vs.DVSState_SwitchFindByAlias(switch)


def test_a_truth_that_cannot_be_told_ends_the_walk(many: Any) -> None:
    seen: List[Any] = []

    def visit(port: Any, context: Any) -> Any:
        seen.append(vs.DVS_PortId(port))
        return Undecided()

    with pytest.raises(ArithmeticError, match="^neither true nor false$"):
        vs.DVSState_PortForEach(many, visit, None)
    assert len(seen) == 1
    callback = vs.Callback(visit)
    with pytest.raises(ArithmeticError):
        vs.DVSState_PortForEach(many, callback, None)
    callback.reraise()  # once, which was in the walk


@pytest.mark.parametrize("kind", [KeyboardInterrupt, SystemExit, GeneratorExit, MemoryError])
def test_whatever_a_function_raises_ends_the_walk(many: Any, kind: Any) -> None:
    seen: List[Any] = []

    def visit(port: Any, context: Any) -> None:
        seen.append(port)
        raise kind("from inside")

    with pytest.raises(kind):
        vs.DVSState_PortForEach(many, visit, None)
    assert len(seen) == 1


@pytest.mark.parametrize("walk", range(60))
def test_an_interrupt_on_entry_is_not_lost(many: Any, walk: int) -> None:
    """The signal is pending when the library calls: nothing of the function has run by then."""
    seen: List[Any] = []

    def visit(port: Any, context: Any) -> None:
        seen.append(port)

    def interrupted(number: int, frame: Any) -> None:
        raise KeyboardInterrupt

    before = signal.signal(signal.SIGALRM, interrupted)
    try:
        with pytest.raises(KeyboardInterrupt):
            # While the first items are looked up, in C.
            signal.setitimer(signal.ITIMER_REAL, 1e-6 * (1 + walk))
            while True:
                seen.clear()
                vs.DVSState_PortForEach(many, visit, None)
                # A walk that began is whole, or its interrupt is raised.
                assert len(seen) == 41
    finally:
        signal.setitimer(signal.ITIMER_REAL, 0)
        signal.signal(signal.SIGALRM, before)


def test_an_interrupt_that_waits_is_raised_by_the_walk(many: Any) -> None:
    """Without luck: the interrupt comes from C, between the library's call and the first line."""
    seen: List[Any] = []

    class Interrupting:
        def __call__(self, port: Any, context: Any) -> None:
            seen.append(port)
            signal.raise_signal(signal.SIGINT)

    with pytest.raises(KeyboardInterrupt):
        vs.DVSState_PortForEach(many, Interrupting(), None)
    assert len(seen) == 1


def constant(answer: Any) -> Any:
    return lambda item, context: answer


def test_a_callback_without_python_returns_what_it_should(many: Any) -> None:
    """What the library gets is 0 or 1, as the thunk itself returns."""
    for answer, expected in ((None, 1), (0, 0), (7, 1), ("", 0), ([0], 1)):
        given: Any = vs.Callback(constant(answer))
        assert given._thunk(None, None) == expected
    raising: Any = vs.Callback(lambda item, context: 1 / 0)
    assert raising._thunk(None, None) == 0
    with pytest.raises(ZeroDivisionError):
        raising.reraise()
    raising.reraise()


def test_the_context_is_what_was_given(many: Any) -> None:
    """It ends with what it points to."""
    info = vs.VSInfo()
    contexts: List[Any] = []
    vs.DVSState_PortForEach(many, lambda port, context: contexts.append(context), info)
    assert {int(one) for one in contexts} == {int(info)}
    with pytest.raises(ValueError, match="lies in memory of another object"):
        vs.VSDVS_FreeMemory(contexts[0])
    _, uplinks = vs.VSQEX_GetUplinks("classes")
    vs.DVSState_PortForEach(many, lambda port, context: contexts.append(context), uplinks)
    vs.VSQEX_FreeMemory(uplinks)
    assert int(contexts[-1]) == 0


@pytest.mark.parametrize(
    "call",
    ["DVSState_PortForEach", "DVSState_GlobalPropForEach", "DVSState_HostPropForEach"],
)
def test_a_walk_over_what_is_not_there_says_so(call: str) -> None:
    nothing = vs.DVSState_SwitchFindByAlias("no such switch")
    with pytest.raises(ValueError, match=f"^{call}: handle is None, .*nothing to walk over$"):
        getattr(vs, call)(nothing, lambda item, context: None, None)


@pytest.mark.parametrize(
    "call",
    [
        "DVSState_SwitchForEach",
        "DVSState_PortForEach",
        "DVSState_GlobalPropForEach",
        "DVSState_HostPropForEach",
        "DVSState_PortDataForEach",
    ],
)
def test_a_walk_without_a_function_says_so(call: str, many: Any) -> None:
    walked = [] if call == "DVSState_SwitchForEach" else [many]
    with pytest.raises(TypeError, match=f"^{call}: callback is a function, not None$"):
        getattr(vs, call)(*walked, None, None)


def test_a_pointer_to_a_function_is_one(many: Any) -> None:
    seen: List[Any] = []
    callback = vs.Callback(lambda port, context: seen.append(vs.DVS_PortId(port)))
    vs.DVSState_PortForEach(many, callback.pointer, None)
    assert {f"port-{number}" for number in range(40)} <= set(seen)
