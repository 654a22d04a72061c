"""Waiting calls let other threads and signals through, and an interpreter that ends."""

from typing import Callable

HOUR = """
import signal
import threading

assert simhost.simhost_delay_call(b"VSDVS_SetMTU", 1, 1, 3600000) == 0
"""


def test_ctrl_c_ends_a_call_that_waits(run: Callable[[str], str]) -> None:
    """Another thread sends the signal, so it runs while the main thread waits."""
    written = run(
        HOUR
        + """
threading.Timer(0.1, os.kill, (os.getpid(), signal.SIGINT)).start()
try:
    print(vs.VSDVS_SetMTU("vswitch0", 2000))
except KeyboardInterrupt:
    print("interrupted")
print(vs.VSDVS_SetMTU("vswitch0", 3000))
"""
    )
    assert written.split() == ["interrupted", "0"]


def test_a_signal_that_reaches_another_thread_ends_it_too(run: Callable[[str], str]) -> None:
    """The system then interrupts nothing in the thread that waits."""
    written = run(
        HOUR
        + """
def send():
    signal.pthread_kill(threading.get_ident(), signal.SIGINT)

threading.Timer(0.1, send).start()
try:
    print(vs.VSDVS_SetMTU("vswitch0", 2000))
except KeyboardInterrupt:
    print("interrupted")
"""
    )
    assert written == "interrupted\n"


def test_a_handler_that_raises_nothing_ends_no_delay(run: Callable[[str], str]) -> None:
    written = run(
        """
import signal
import threading

assert simhost.simhost_delay_call(b"VSDVS_SetMTU", 1, 1, 500) == 0
handled = []
signal.signal(signal.SIGUSR1, lambda number, frame: handled.append(number))
threading.Timer(0.1, os.kill, (os.getpid(), signal.SIGUSR1)).start()
print(vs.VSDVS_SetMTU("vswitch0", 2000), handled == [signal.SIGUSR1])
"""
    )
    assert written.split() == ["0", "True"]


def test_what_a_handler_raises_comes_out_of_the_call(run: Callable[[str], str]) -> None:
    written = run(
        HOUR
        + """
class Stop(Exception):
    pass

def stop(number, frame):
    raise Stop("at once")

signal.signal(signal.SIGUSR1, stop)
threading.Timer(0.1, os.kill, (os.getpid(), signal.SIGUSR1)).start()
try:
    vs.VSDVS_SetMTU("vswitch0", 2000)
except Stop as raised:
    print(raised)
"""
    )
    assert written == "at once\n"


def test_a_trap_after_a_delay_lands_in_its_own_thread(run: Callable[[str], str]) -> None:
    """The other thread arms the trap anew, and traps, while the first call waits."""
    written = run(
        """
import threading

for outcome in (
    simhost.simhost_delay_call(b"VSDVS_SetMTU", 1, 1, 500),
    simhost.simhost_trap_call(b"VSDVS_SetMTU", 1, 1, b"OSError", b"too late"),
):
    assert outcome == 0
raised = []


def wait():
    try:
        vs.VSDVS_SetMTU("vswitch0", 2000)
    except OSError as error:
        raised.append(str(error))


thread = threading.Thread(target=wait)
thread.start()
trapped = 0
no_switch = vs.new_VSInfo()
while thread.is_alive():
    try:
        vs.VSQEX_FreeMemory(vs.VSQEX_GetUplinks("vswitch0")[1])
        vs.DVS_SwitchName(no_switch)
    except RuntimeError:
        trapped += 1
vs.delete_VSInfo(no_switch)
print(raised, trapped > 0)
"""
    )
    assert written == "['too late'] True\n"


# What a thread waits for goes on when the interpreter is ending itself: a global that is cleared
# then sees to it, and gives the thread the time to come back to the interpreter.
ENDING = """
import threading
import time


class Ending:
    def __init__(self, act):
        self.act = act

    def __del__(self, sleep=time.sleep):
        self.act()
        sleep(0.5)
"""


def test_the_interpreter_ends_while_a_call_waits(run: Callable[[str], str]) -> None:
    written = run(
        HOUR
        + ENDING
        + """
threading.Thread(target=lambda: vs.VSDVS_SetMTU("vswitch0", 2000), daemon=True).start()
ending = Ending(lambda: None)
print("ends")
"""
    )
    assert written == "ends\n"


def test_the_interpreter_ends_while_an_allocator_runs(run: Callable[[str], str]) -> None:
    written = run(
        ENDING
        + """
import libvswitch as classes
from libvswitch import _pointers

reader, writer = os.pipe()
inside = threading.Event()


@ctypes.CFUNCTYPE(ctypes.c_void_p, ctypes.c_size_t)
def allocate(size):
    inside.set()
    os.read(reader, 1)
    return None


@ctypes.CFUNCTYPE(None, ctypes.c_void_p)
def release(block):
    pass


def pointer(function, spelling):
    return _pointers.pointer_object(ctypes.cast(function, ctypes.c_void_p).value, spelling)


functions = pointer(allocate, "DVSData_MemAlloc"), pointer(release, "DVSData_MemFree")
made = classes.Cell("DVSDataHandle")
threading.Thread(
    target=lambda: vs.DVSData_Alloc(made.pointer.this, *functions), daemon=True
).start()
inside.wait()
ending = Ending(lambda write=os.write, end=writer: write(end, b"x"))
print("ends")
"""
    )
    assert written == "ends\n"
