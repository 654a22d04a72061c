"""Threads that make calls of a trace at once, with the interpreter and without it."""

from pathlib import Path

from recordings import RECORDING, play, program, record


def test_a_trap_with_a_class_of_the_tools_waits_for_nobody_who_waits_for_it(
    tmp_path: Path, alone: Path
) -> None:
    recorded = """
        import _libvswitch as flat
        from recording_host import RecordingHost
        class HostError(Exception): pass
        flat.QEX_ReturnStatusToString(0)
        RecordingHost().spring("VSDVS_GetMTU", HostError, "it is too late", nth=1)
        try:
            flat.VSDVS_GetMTU("lab" * 100_000, None)
        except HostError as error:
            print(error)
        """
    made = record(recorded, tmp_path / "trace.jsonl", RECORDING)
    assert (made.status, made.stdout) == (0, "it is too late\n"), made.stderr
    # The one thread keeps the interpreter while it waits for its turn; it has it by the time that
    # the long name was read. The other lets it go. Neither arms the trap, which ends the process.
    played = """
        import ctypes, threading
        import _libvswitch
        keeps, lets_go = ctypes.PyDLL("libvswitch.so"), ctypes.CDLL("libvswitch.so")
        asks = threading.Event()
        def ask():
            keeps.QEX_ReturnStatusToString(0)
            asks.set()
            while True: keeps.QEX_ReturnStatusToString(0)
        threading.Thread(target=ask, daemon=True).start()
        asks.wait()
        lets_go.VSDVS_GetMTU(b"lab" * 100_000, None)
        """
    done = play(program(played), made.trace, alone, "arguments")
    assert (done.status, done.stderr) == (125, "vswitch play: it is too late\n")


def test_a_process_ends_while_a_thread_waits_for_input(tmp_path: Path, alone: Path) -> None:
    made = record("import libvswitch", tmp_path / "trace.jsonl", RECORDING)
    assert made.status == 0, made.stderr
    # Nobody writes into the pipe that is its input, and the thread has that locked.
    played = """
        import ctypes, os, threading
        import _libvswitch
        libc, host = ctypes.CDLL(None), ctypes.CDLL("libvswitch.so")
        os.dup2(os.pipe()[0], 0)
        threading.Thread(target=libc.getchar, daemon=True).start()
        stdin = ctypes.c_void_p.in_dll(libc, "stdin")
        while libc.ftrylockfile(stdin) == 0:
            libc.funlockfile(stdin)
        libc.printf(b"printed")
        host.VSDVS_GetMTU(b"lab", None)
        """
    done = play(program(played), made.trace, alone, "arguments")
    assert (done.status, done.stdout) == (125, "printed")
    assert "VSDVS_GetMTU" in done.stderr
