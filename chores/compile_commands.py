"""The commands that compile each source: compile_commands.py FOLDER FILE

Where CMake has a compiler read several sources as one, FOLDER/compile_commands.json has a command
for none of them. FILE gets the same list with one for each, as clang-tidy wants it.
"""

import json
import re
import sys
from pathlib import Path
from typing import Dict, Iterator, List

INCLUDED = re.compile(r'^#include "(.+)"$', re.MULTILINE)

Command = Dict[str, str]


def of_each_source(command: Command) -> Iterator[Command]:
    together = Path(command["directory"], command["file"])
    if together.parent.name != "Unity":
        yield command
        return
    for source in INCLUDED.findall(together.read_text(encoding="utf-8")):
        compiled = command["command"].replace(command["file"], source)
        yield {**command, "command": compiled, "file": source}


def compile_commands(folder: Path) -> List[Command]:
    """Of a build folder; what several sources were made into together is the output of each."""
    known = json.loads((folder / "compile_commands.json").read_text(encoding="utf-8"))
    return [one for command in known for one in of_each_source(command)]


if __name__ == "__main__":
    built, asked = map(Path, sys.argv[1:])
    asked.write_text(json.dumps(compile_commands(built), indent=0), encoding="utf-8")
