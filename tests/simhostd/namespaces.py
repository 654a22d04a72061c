"""Network namespaces without names: each is held by a process that ends with this one, however that
ends, and the devices in it go with it."""

import os
import subprocess
from typing import Any, List, Optional

PATIENCE = 30.0


class CommandFailed(Exception):
    """A command in a namespace failed; the text says what it said."""


class Namespace:
    """A network namespace, within `outer`'s user namespace or one of its own."""

    def __init__(self, outer: Optional["Namespace"] = None, own_user: bool = False) -> None:
        words = outer.words() if outer else []
        user = ["--user", "--map-root-user"] if own_user else []
        # It ends when the pipe does.
        words += ["unshare", *user, "--net", "sh", "-c", "echo; exec cat"]
        self._enters_user: bool = own_user or (outer is not None and outer._enters_user)
        self._holder = subprocess.Popen(words, stdin=subprocess.PIPE, stdout=subprocess.PIPE)
        assert self._holder.stdout is not None
        if not self._holder.stdout.readline():
            raise CommandFailed("no namespace can be made")
        self.run("ip", "link", "set", "lo", "up")

    @property
    def pid(self) -> int:
        """Of the process that holds it."""
        return self._holder.pid

    def words(self) -> List[str]:
        """What a command begins with that runs in here."""
        user = ["--user", "--preserve-credentials"] if self._enters_user else []
        return ["nsenter", "--target", str(self.pid), *user, "--net"]

    def start(self, *words: str, **options: Any) -> "subprocess.Popen[str]":
        """Starts a program that ends with this process."""
        all_words = [*self.words(), "setpriv", "--pdeathsig", "KILL", *words]
        return subprocess.Popen(all_words, text=True, **options)

    def try_run(self, *words: str) -> "subprocess.CompletedProcess[str]":
        return subprocess.run(
            [*self.words(), *words],
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
            timeout=PATIENCE,
            check=False,
        )

    def run(self, *words: str) -> str:
        """What a command printed; raises CommandFailed."""
        done = self.try_run(*words)
        if done.returncode != 0:
            raise CommandFailed(f"{' '.join(words)}: {done.stdout}")
        return done.stdout

    def close(self) -> None:
        """Ends it with all that is in it."""
        self._holder.kill()
        self._holder.communicate()


def own_user_needed() -> bool:
    """Whether namespaces take a user namespace of their own."""
    return os.geteuid() != 0
