"""Writes a copy of C++ sources with faults seeded into them, all at once; which one is alive is chosen when a program runs.

libclang finds the expressions, and calls of the functions in Mutant.h are written around them. A fault is one of
  true, false, negated      a condition
  left out                  one side of && or ||
  dropped                   an argument, a member of an initializer, a returned value, the value of a variable: it becomes none,
                            empty, the other boolean, the next number or the other enumerator
  not done                  a statement that is one expression

Not seeded: code that is evaluated when it is compiled, and values of types that have no empty one.
"""

import dataclasses
import hashlib
import pathlib
import re

from clang import cindex
from clang.cindex import CursorKind as Kind

ARGUMENTS = ["-x", "c++", "-std=c++20", "-w"]

_EMPTY_CLASSES = re.compile(
    r"^(std::(__cxx11::)?(optional|shared_ptr|basic_string|basic_string_view|unordered_set|set|vector|map)<.*>"
    r"|palisade::(Dictionary|Value))$")
_NUMBERS = {"bool", "int", "unsigned int", "long", "unsigned long", "long long", "unsigned long long", "double", "char"}
_NOTHING_TO_DROP = {"std::nullopt", "nullptr", '""', "{}", "std::string()", "PermissionSet()", "0", "this"}
_DECLARATION = re.compile(r"(const )?[\w:<>*&]+ [*&]*\w+ = ")
_FUNCTIONS = {Kind.FUNCTION_DECL, Kind.CXX_METHOD, Kind.CONSTRUCTOR, Kind.DESTRUCTOR, Kind.FUNCTION_TEMPLATE,
              Kind.CONVERSION_FUNCTION}


@dataclasses.dataclass(frozen=True)
class Fault:
    number: int
    file: str
    line: int
    function: str
    change: str
    text: str

    def place(self):
        """What names the fault in the list of equivalent ones: it survives edits elsewhere in the file."""
        return (self.file, self.function, self.change, self.text)


class Source:
    """One file that is to be seeded."""

    def __init__(self, root, name, first_number):
        self.root, self.name = root, str(name)
        self.content = (root / name).read_bytes()
        self.next_number = first_number
        self.faults = []
        self._around = []  # (start, end, order, text before, text after)
        self._seen = set()
        unit = cindex.Index.create().parse(str(root / name), [*ARGUMENTS, f"-I{root}"])
        errors = [str(each) for each in unit.diagnostics if each.severity >= cindex.Diagnostic.Error]
        if errors:
            raise SystemExit("\n".join(["The sources cannot be read:", *errors]))
        for cursor in unit.cursor.get_children():
            if cursor.location.file and cursor.location.file.name == str(root / name):
                self._walk(cursor, [], "")

    def written(self):
        """The copy's text."""
        starts, ends = {}, {}
        for start, end, order, before, after in self._around:
            starts.setdefault(start, []).append((-end, order, before))
            ends.setdefault(end, []).append((-start, -order, after))
        places = sorted({*starts, *ends})
        pieces, done = [b'#include "Tools/Mutants/Mutant.h"\n#line 1 "%s"\n' % self.name.encode()], 0
        if self.name.endswith(".h"):
            pieces.insert(0, b"#pragma once\n")
        for place in places:
            pieces.append(self.content[done:place])
            pieces += [after.encode() for _, _, after in sorted(ends.get(place, []))]
            pieces += [before.encode() for _, _, before in sorted(starts.get(place, []))]
            done = place
        return b"".join([*pieces, self.content[done:]])

    # Adding faults

    def _extent(self, cursor):
        return cursor.extent.start.offset, cursor.extent.end.offset

    def _text(self, cursor):
        start, end = self._extent(cursor)
        return " ".join(self.content[start:end].decode().split())

    def _add(self, cursor, function, changes, before, after):
        start, end = self._extent(cursor)
        if start >= end or cursor.location.file is None or cursor.location.file.name != str(self.root / self.name):
            return
        if (start, end, changes) in self._seen:
            return
        self._seen.add((start, end, changes))
        number = self.next_number
        for change in changes:
            self.faults.append(Fault(self.next_number, self.name, cursor.extent.start.line, function, change,
                                     self._text(cursor)))
            self.next_number += 1
        self._around.append((start, end, len(self._around), before.replace("#", str(number)), after))

    def _condition(self, cursor, function):
        while cursor.kind in (Kind.UNEXPOSED_EXPR, Kind.PAREN_EXPR) and len(list(cursor.get_children())) == 1:
            inner = next(cursor.get_children())
            if self._extent(inner) != self._extent(cursor) and cursor.kind != Kind.PAREN_EXPR:
                break
            cursor = inner
        text = self._text(cursor)
        if text in ("true", "false", "") or _DECLARATION.match(text):
            return
        self._add(cursor, function, ("true", "false", "negated"), "mutants::condition(#, bool(", "))")

    def _drop(self, cursor, function, kind):
        """Seeds the loss of a value that is passed on as `kind` says, if values of that type can be lost."""
        text = self._text(cursor)
        if not text or text in _NOTHING_TO_DROP or text.startswith(("{", "[", ".")):
            return
        kind = kind.get_canonical()
        is_reference = kind.kind == cindex.TypeKind.LVALUEREFERENCE
        if is_reference and not kind.get_pointee().is_const_qualified():
            return
        if kind.kind in (cindex.TypeKind.LVALUEREFERENCE, cindex.TypeKind.RVALUEREFERENCE):
            kind = kind.get_pointee()
        name = re.sub(r"^const ", "", kind.spelling) if kind.kind != cindex.TypeKind.POINTER else kind.spelling
        if kind.kind == cindex.TypeKind.POINTER:
            name = re.sub(r"(\*) ?const$", r"\1", name)
            if "(" in name:
                return
        can_be_lost = (kind.kind in (cindex.TypeKind.POINTER, cindex.TypeKind.ENUM) or name in _NUMBERS
                       or _EMPTY_CLASSES.match(name))
        if not can_be_lost or "lambda" in name or "anonymous" in name or "type-parameter" in name:
            return
        if name.startswith("char["):
            name = "const char *"
        by_reference = is_reference and kind.kind == cindex.TypeKind.RECORD
        helper = "reference" if by_reference else "value"
        change = "the other way round" if name == "bool" else "dropped"
        self._add(cursor, function, (change,), f"mutants::{helper}<{name}>(#, ", ")")

    # Finding expressions

    def _walk(self, cursor, above, function):
        kind = cursor.kind
        if kind in _FUNCTIONS:
            tokens = {token.spelling for token, _ in zip(cursor.get_tokens(), range(12))}
            if "constexpr" in tokens or "static_assert" in tokens:
                return
            function = cursor.spelling
        if kind in (Kind.STATIC_ASSERT, Kind.TEMPLATE_TYPE_PARAMETER, Kind.PARM_DECL, Kind.FIELD_DECL, Kind.ENUM_DECL):
            return
        children = list(cursor.get_children())
        if kind == Kind.VAR_DECL:
            if any(token.spelling in ("constexpr", "constinit") for token, _ in zip(cursor.get_tokens(), range(6))):
                return
            self._variable(cursor, children, above, function)
        elif kind in (Kind.IF_STMT, Kind.WHILE_STMT) and children and children[0].kind.is_expression():
            self._condition(children[0], function)
        elif kind == Kind.CONDITIONAL_OPERATOR:
            self._condition(children[0], function)
        elif kind == Kind.CXX_FOR_RANGE_STMT:
            self._range(cursor, children, function)
        elif kind == Kind.FOR_STMT:
            for child in children[:-1]:
                if child.kind.is_expression() and child.type.get_canonical().spelling == "bool":
                    self._condition(child, function)
        elif kind == Kind.BINARY_OPERATOR:
            self._binary(cursor, children, function)
        elif kind == Kind.CALL_EXPR:
            self._call(cursor, function)
        elif kind == Kind.RETURN_STMT and children:
            self._returned(children[0], above, function)
        elif kind == Kind.INIT_LIST_EXPR:
            self._initializers(children, function)
        if kind == Kind.COMPOUND_STMT:
            for child in children:
                self._statement(child, function)
        elif kind in (Kind.IF_STMT, Kind.WHILE_STMT):
            # A condition that declares a variable comes as two.
            for child in children[1 if children[0].kind.is_expression() else 2:]:
                self._statement(child, function)
        elif kind in (Kind.FOR_STMT, Kind.CXX_FOR_RANGE_STMT):
            self._statement(children[-1], function)
        for child in children:
            self._walk(child, [*above, cursor], function)

    def _statement(self, cursor, function):
        while cursor.kind == Kind.UNEXPOSED_EXPR and len(list(cursor.get_children())) == 1:
            cursor = next(cursor.get_children())
        kinds = (Kind.CALL_EXPR, Kind.BINARY_OPERATOR, Kind.COMPOUND_ASSIGNMENT_OPERATOR, Kind.UNARY_OPERATOR)
        if cursor.kind in kinds:
            self._add(cursor, function, ("not done",), "(mutants::isAlive(#) ? void() : void(", "))")

    def _binary(self, cursor, children, function):
        if len(children) != 2:
            return
        start, end = children[0].extent.end.offset, children[1].extent.start.offset
        operator = self.content[start:end].decode().strip()
        if operator in ("&&", "||"):
            neutral = "true" if operator == "&&" else "false"
            for side in children:
                self._add(side, function, ("left out",), "mutants::side(#, bool(", f"), {neutral})")
        elif operator in ("+", "-") and cursor.type.get_canonical().spelling in _NUMBERS:
            self._drop(cursor, function, cursor.type)

    def _call(self, cursor, function):
        callee = cursor.referenced
        if callee is None or callee.spelling in ("move", "forward", "ref", "exchange", "current_exception"):
            return
        parameters = [each.type for each in callee.get_arguments() if each is not None]
        arguments = list(cursor.get_arguments())
        # The first argument of an operator that is a function is its left side.
        if callee.spelling.startswith("operator") and callee.kind in (Kind.CXX_METHOD, Kind.CONVERSION_FUNCTION):
            arguments = arguments[1:] if callee.spelling not in ("operator bool",) else []
        for argument, parameter in zip(arguments, parameters):
            if argument is None or argument.kind == Kind.LAMBDA_EXPR:
                continue
            # A conversion that nobody wrote has the extent of what is converted.
            if self._extent(argument) == self._extent(cursor):
                continue
            if self._is_default(argument):
                continue
            self._drop(argument, function, parameter)

    def _is_default(self, argument):
        start, end = self._extent(argument)
        return start >= end

    def _returned(self, value, above, function):
        for owner in reversed(above):
            if owner.kind == Kind.LAMBDA_EXPR:
                kind = value.type
                break
            if owner.kind in _FUNCTIONS:
                kind = owner.result_type
                break
        else:
            return
        if kind.get_canonical().spelling == "bool":
            self._condition(value, function)
        else:
            self._drop(value, function, kind)

    def _variable(self, cursor, children, above, function):
        values = [child for child in children if child.kind.is_expression()]
        is_condition = above and above[-1].kind in (Kind.IF_STMT, Kind.WHILE_STMT)
        kind = cursor.type.get_canonical()
        if not values or kind.kind == cindex.TypeKind.LVALUEREFERENCE or not function:
            return
        start = cursor.extent.start.offset
        if "=" not in self.content[start:values[-1].extent.start.offset].decode() or (above and above[-1].kind == Kind.CXX_FOR_RANGE_STMT):
            return
        if kind.spelling in ("bool", "const bool"):
            self._condition(values[-1], function)
        elif not is_condition or kind.kind != cindex.TypeKind.POINTER:
            self._drop(values[-1], function, kind)

    def _range(self, cursor, children, function):
        element = children[0].type.get_canonical()
        ranges = [child for child in children[:-1] if child.kind.is_expression()]
        if not ranges or element.kind == cindex.TypeKind.LVALUEREFERENCE and not element.get_pointee().is_const_qualified():
            return
        whole = ranges[0]
        kind = re.sub(r"^const ", "", whole.type.get_canonical().spelling)
        if whole.kind == Kind.INIT_LIST_EXPR or self._text(whole).startswith("{") or not _EMPTY_CLASSES.match(kind):
            return
        while whole.kind == Kind.UNEXPOSED_EXPR:
            whole = next(whole.get_children())
        # What a function makes lives as long as the loop only if the loop itself is given it.
        is_made = whole.kind == Kind.CALL_EXPR and whole.referenced is not None and \
            whole.referenced.result_type.get_canonical().kind != cindex.TypeKind.LVALUEREFERENCE
        self._add(whole, function, ("dropped",), f"mutants::{'value' if is_made else 'reference'}<{kind}>(#, ", ")")

    def _initializers(self, children, function):
        if not function:
            return
        for child in children:
            value = child
            parts = list(child.get_children())
            # A designated initializer is the member and its value.
            if len(parts) == 2 and parts[0].kind == Kind.MEMBER_REF:
                value = parts[1]
            if value.kind in (Kind.LAMBDA_EXPR, Kind.INIT_LIST_EXPR) or not value.kind.is_expression():
                continue
            kind = value.type.get_canonical()
            if kind.kind == cindex.TypeKind.CONSTANTARRAY:
                if self._text(value) != '""':
                    self._add(value, function, ("dropped",), "mutants::value<const char *>(#, ", ")")
            else:
                self._drop(value, function, kind)


def seed(root, names, destination):
    """Writes the copies of the sources `names` into `destination`; answers their faults, numbered from 0."""
    faults = []
    for name in names:
        source = Source(root, name, len(faults))
        faults += source.faults
        copy = destination / name
        copy.parent.mkdir(parents=True, exist_ok=True)
        text = source.written()
        if not copy.exists() or copy.read_bytes() != text:
            copy.write_bytes(text)
    return faults


def fingerprint(*contents):
    digest = hashlib.sha256()
    for content in contents:
        digest.update(content)
    return digest.hexdigest()


def sources(root, folder):
    found = sorted(each.relative_to(root) for each in (root / folder).glob("*") if each.suffix in (".cpp", ".h"))
    return [pathlib.Path(each) for each in found]
