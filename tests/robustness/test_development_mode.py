"""The interpreter's development mode, with every warning an error, has nothing to say."""

import processes

DEVELOPMENT = ("-X", "dev", "-W", "error")


def test_importing_and_calling_give_no_warning() -> None:
    done = processes.run(*DEVELOPMENT, str(processes.HERE / "development.py"))
    assert (done.returncode, done.stderr) == (0, "")
    *raised, count = done.stdout.splitlines()
    assert raised == []
    assert int(count) > 1375


def test_the_classes_give_no_warning() -> None:
    program = "import libvswitch as vs; print(vs.VSInfo(), vs.VSMACLearning())"
    done = processes.run(*DEVELOPMENT, "-c", program)
    assert (done.returncode, done.stderr) == (0, "")


def test_what_is_planted_is_found() -> None:
    done = processes.run(*DEVELOPMENT, str(processes.HERE / "development.py"), "planted")
    assert done.returncode == 1
    assert done.stderr.endswith("DeprecationWarning: planted\n")
