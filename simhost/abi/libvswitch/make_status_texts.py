"""Makes the table of status texts from the names in the status header.

usage: make_status_texts.py STATUS_HEADER OUTPUT

The header is the only list of the statuses; a text is its name in readable form. A name that the C
library knows as an error number has that error's text.
"""

import errno
import os
import re
import sys
from typing import List

ACRONYMS = {
    "acpi",
    "ats",
    "cow",
    "cpu",
    "dma",
    "elf",
    "fifo",
    "fs",
    "ft",
    "hba",
    "hw",
    "id",
    "io",
    "ioctl",
    "lv",
    "lvm",
    "nfs",
    "pi",
    "pmem",
    "pty",
    "rpc",
    "scsi",
    "svm",
    "tar",
    "uid",
    "vcpu",
    "vlan",
    "vmm",
    "vsi",
    "vt",
    "wlx",
}
RESPELLED = {
    "addr": "address",
    "asyncio": "async IO",
    "bufferspace": "buffer space",
    "buf": "buffer",
    "conn": "connection",
    "dev": "device",
    "dir": "directory",
    "err": "error",
    "fmt": "format",
    "gt": "greater than",
    "info": "information",
    "init": "initialization",
    "lpage": "large page",
    "lt": "less than",
    "mem": "memory",
    "num": "number of",
    "param": "parameter",
    "perm": "permanent",
    "ptr": "pointer",
    "res": "resource",
    "unsupp": "unsupported",
    "vlanid": "VLAN id",
    "wont": "won't",
}


def readable(name: str) -> str:
    """The text of the status QEX_<name>."""
    if name == "OK":
        return "Success"
    if hasattr(errno, name):
        return os.strerror(getattr(errno, name))
    words = [
        word.upper() if word in ACRONYMS else RESPELLED.get(word, word)
        for word in name.lower().split("_")
    ]
    text = " ".join(words)
    return text[0].upper() + text[1:]


def status_names(header: str) -> List[str]:
    """The enumerators of QEX_ReturnStatus, in their order and without their prefix."""
    body = re.search(r"enum QEX_ReturnStatus \{(.*?)\}", header, re.DOTALL)
    if body is None:
        sys.exit("the status header declares no enum QEX_ReturnStatus")
    declarations = re.sub(r"/\*.*?\*/|//[^\n]*", "", body.group(1), flags=re.DOTALL)
    return re.findall(r"^\s*QEX_(\w+)", declarations, re.MULTILINE)


def main() -> None:
    """Reads the header and writes the table."""
    header_path, output_path = sys.argv[1:]
    with open(header_path, encoding="utf-8") as header:
        names = status_names(header.read())
    with open(output_path, "w", encoding="utf-8") as output:
        for name in names:
            output.write(f'STATUS_TEXT(QEX_{name}, "{readable(name)}")\n')


if __name__ == "__main__":
    main()
