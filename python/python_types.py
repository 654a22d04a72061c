"""How C types are spelled in Python's stubs.

Pointer objects of different C types are different classes there, although the interpreter has one
class for all of them: what the module would refuse, the type checker refuses first. Their names
start with an underscore, because they exist in stubs only.
"""

from typing import List, Set, Tuple

import families
from definitions import Definitions, Field, Function, Parameter, Record, Type

CALLBACK = Type(("p", "f(p.void,p.void)"), "char")


class PythonTypes:
    """Names of Python types for C types; with `prefix`, seen from the module of the classes."""

    def __init__(self, known: Definitions, prefix: str = "") -> None:
        self.known = known
        self.prefix = prefix
        self.pointers: Set[str] = set()

    def pointer(self, given: Type) -> str:
        """The class of pointers of this type."""
        type_ = self.known.resolve(given)
        target = type_.target
        if not target.layers and target.name in self.known.records:
            if self.prefix and not self.known.records[target.name].is_inner:
                return target.name
            return self._named(f"_{target.name}")
        return self._named(f"_{self._words(type_)}")

    def _named(self, name: str) -> str:
        self.pointers.add(name)
        return f"{self.prefix}{name}"

    def _words(self, type_: Type) -> str:
        if not type_.layers:
            if type_.name in self.known.records:
                return type_.name
            return "".join(word.capitalize() for word in type_.name.split())
        layer = type_.layers[0]
        inner = self._words(type_.target)
        if layer == "p":
            return f"{inner}Pointer"
        if layer.startswith("f("):
            count = 0 if layer == "f()" else layer.count(",") + 1
            return f"{inner}Function{count}"
        return f"{inner}Array{layer[2:-1]}"

    def argument(self, one: Parameter) -> str:
        type_ = self.known.resolve(one.type)
        if one.python == "bytes":
            return "bytes"
        if one.python == "buffer":
            return "Union[bytes, bytearray, memoryview]"
        if not type_.layers and type_.name in self.known.records:
            return self.pointer(Type(("p",), type_.name))
        found = self._of_family(families.of_type(one.type)) or self.value(type_)
        is_required = one.is_required or (type_ == CALLBACK and self.prefix)
        return found if is_required else self._or_none(type_, found)

    def arguments(self, function: Function) -> List[Tuple[str, str]]:
        """Names and types; where elements are counted or picked, an array is one."""
        found = []
        for one, following in zip(function.inputs, [*function.inputs[1:], None]):
            type_ = self.argument(one)
            target = self.known.resolve(one.type).target.name
            is_array = function.name.endswith(("Array", "Array_getitem", "Array_setitem"))
            is_counted = following is not None and following.name in ("count", "numRanges")
            if self.prefix and target in self.known.records and (is_counted or is_array):
                if self.known.resolve(one.type).is_pointer:
                    type_ = type_.replace(target, f"Union[{target}, Array[{target}]]")
            found.append((one.name, type_))
        return found

    def method_arguments(self, method: Function) -> List[Tuple[str, str]]:
        """The arguments of methods must be there, whatever their type."""
        return [(one.name, not_null(self.argument(one))) for one in method.inputs]

    def value(self, type_: Type) -> str:
        """What stands for a value that goes in."""
        if not type_.layers:
            # The classes take no text as a boolean.
            return "Union[int, str]" if type_.name == "char" and not self.prefix else "int"
        if type_.name == "char" and len(type_.layers) == 1:
            return f"Union[str, {self.pointer(Type(('p',), 'char'))}]"
        if type_ == Type(("p",), "void"):
            return f"{self.prefix}_Pointer"
        if type_ == CALLBACK and self.prefix:
            return f"Union[Callable[[Any, Any], Any], {self.pointer(type_)}]"
        return self.pointer(type_)

    def _or_none(self, type_: Type, found: str) -> str:
        return f"Optional[{found}]" if type_.layers else found

    def result(self, function: Function) -> str:
        """What a function returns."""
        first = self._single_result(function)
        if not function.outputs:
            return first
        outputs = [self._output(function, one) for one in function.outputs]
        return f"Tuple[{', '.join([first, *outputs])}]"

    def _single_result(self, function: Function) -> str:
        type_ = self.known.resolve(function.result)
        if function.returns:
            return function.returns
        if not type_.layers:
            if type_.name == "void":
                return "None"
            if type_.name in self.known.records:
                return self.pointer(Type(("p",), type_.name))
            if type_.name == "char":
                return "bool" if self.prefix else "str"
            return "int"
        if function.owns_elements and self.prefix:
            return f"Array[{type_.name}]"
        found = "str" if type_ == Type(("p",), "char") else self.pointer(type_)
        if function.null == "never" or (function.null == "failure" and self.prefix):
            return found
        return f"Union[{found}, Any]" if function.null == "failure" else f"Optional[{found}]"

    def _of_family(self, family: str) -> str:
        """What a number of a family is given as: a constant, or a member of the enumeration."""
        return f"_numbers._{family}" if family and self.prefix else ""

    def _number(self, family: str) -> str:
        """What a number is returned as."""
        return f"_numbers._{family}Number" if family and self.prefix else "int"

    def _output(self, function: Function, one: Parameter) -> str:
        target = self.known.resolve(one.type).target
        if target.is_pointer:
            if self.prefix and target.name == "VSPvlanMapEntry":
                return f"Union[Array[{target.name}], Any]"
            record = one.output_record or target.name
            return f"Union[{self.pointer(Type(('p',), record))}, Any]"
        if target.name == "char" and one.type.name == "char":
            return "str"
        return self._number(families.of_output(function.name, one.name))

    def read(self, field: Field) -> str:
        """What a flat reader returns."""
        type_ = self.known.resolve(field.type)
        if field.reads_as_text or (type_.is_array and type_.layers[1:] == () and _is_text(type_)):
            return "str"
        if type_.is_array:
            return self.pointer(Type(("p", *type_.layers[1:]), type_.name))
        if not type_.layers:
            if type_.name in self.known.records:
                return self.pointer(Type(("p",), type_.name))
            return "str" if type_.name == "char" else "int"
        return f"Optional[{self.pointer(type_)}]"

    def write(self, field: Field) -> str:
        """What a flat writer takes."""
        type_ = self.known.resolve(field.type)
        if field.reads_as_text:
            return self.pointer(Type(("p",), "unsigned char"))
        found = self.read(field)
        if found == "str":
            return self.value(type_) if not type_.layers else f"Optional[{self.value(type_)}]"
        return "Optional[_Pointer]" if found == "Optional[_VoidPointer]" else found

    def property(self, record: Record, field: Field) -> str:
        """What a property of a class reads as, and takes: of a family, also a member."""
        return self._of_family(families.of_field(record.name, field)) or self.member(field)

    def member(self, field: Field) -> str:
        """What a property of a class reads as."""
        type_ = self.known.resolve(field.type)
        if field.type == Type((), "qex_Bool"):
            return "bool"
        if not type_.is_array or self.read(field) == "str":
            return self.read(field)
        inner = type_.target
        if inner.is_array:
            return "Array[str]" if inner.name == "char" else "Array[bytes]"
        return f"Array[{inner.name if inner.name in self.known.records else 'int'}]"


def not_null(hint: str) -> str:
    """A type without the null that may stand for it."""
    return hint[len("Optional[") : -1] if hint.startswith("Optional[") else hint


def _is_text(type_: Type) -> bool:
    return type_.name == "char"
