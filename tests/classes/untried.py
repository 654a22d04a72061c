#!/usr/bin/env python3
"""What no machine had that ran the tests: prints what this one has of it, so that somebody tries
it, and at the end how much was looked for."""

import os
import subprocess
import sys

from libvswitch import _frames_examined as examined

# Words that succeed where the kernel has it.
SUCCEED = {
    "openvswitch": ["ovs-dpctl", "add-dp", "untried"],
    "bonding": ["ip", "link", "add", "untried", "type", "bond"],
}


def is_there(module: str) -> bool:
    """Whether the kernel can do it in a network namespace of its own."""
    user = [] if os.geteuid() == 0 else ["--user", "--map-root-user"]
    inside = ["unshare", *user, "--net", *SUCCEED[module]]
    return (
        examined.kernel_has(module)
        or not subprocess.run(
            inside, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=False
        ).returncode
    )


def main() -> int:
    for what, module in examined.UNTRIED:
        if is_there(module):
            print(f"{what} can be tried here, and no test does")
    print(len(examined.UNTRIED))
    return 0


if __name__ == "__main__":
    sys.exit(main())
