"""Who owns what a call takes and answers, in sentences.

What the definitions leave open, the comments say: through which door memory goes back. Whether a
record is read or filled, its `const` says, or where the host has none, the name of the call.
"""

import re
from typing import Iterator, List, Optional

from comments import Comment, Header
from definitions import Definitions, Function
from prototypes import has_parameter

_VIEW = "a view of what stays the library's; nothing frees it"
_KEPT = "nothing changes hands."


def of_call(
    known: Definitions, call: Function, prototype: str, header: Optional[Header], comment: Comment
) -> List[str]:
    if re.search(r"(?i)free(memory)?($|_)|^delete_", call.name):
        return ["takes memory back; what the caller has of it is no longer to be used."]
    if call.name == "alloc_dvmirror_session_table":
        return ["the caller's, until free_dvmirror_session_table takes it back."]
    return list(_of_parameters(known, call, prototype, header, comment)) or [of_result(known, call)]


def of_result(known: Definitions, method: Function) -> str:
    """Whose is what a method, or a function like one, answers."""
    type_ = known.resolve(method.result)
    if method.owns_elements or (not type_.layers and type_.name in known.records):
        return "Python owns what is answered, and frees it."
    if type_.is_pointer and type_.name in known.records:
        return "what is answered lies in the record, and nothing frees it."
    return _KEPT


def door(prototype: str, header: Optional[Header], comment: Comment) -> Optional[str]:
    """The call through which what this one hands out goes back, as its comment or its header's
    says: in these words."""
    texts = [comment.text, *comment.parameters.values()]
    if header is not None:
        shared = header.text.parameters.items()
        texts += [text for name, text in shared if has_parameter(prototype, name)]
        texts.append(header.text.text)
    for text in texts:
        found = re.search(r"goes back through (\w+)", re.sub(r"\s+", " ", text))
        if found:
            return found[1]
    return None


def _of_parameters(
    known: Definitions, call: Function, prototype: str, header: Optional[Header], comment: Comment
) -> Iterator[str]:
    for one in call.parameters:
        type_ = known.resolve(one.type)
        if type_.layers == ("p", "p"):
            takes_back = door(prototype, header, comment)
            said = f"the library's memory, to be given back once with {takes_back}"
            yield f"`{one.name}`: {said if takes_back else _VIEW}."
        elif type_.layers == ("p",) and type_.name in known.records and header is not None:
            reads = re.search(rf"\bconst \*{one.name}\b", prototype) or re.search(
                r"_(Set|Append)", call.name
            )
            yield f"`{one.name}`: the caller's{', only read' if reads else '; the call fills it'}."
