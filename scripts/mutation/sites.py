"""Finds the places of a C++ source where one small thing can be broken, by clang's own reading of it."""

import bisect
import re
import sys
from dataclasses import dataclass, field

try:
    import clang.cindex as cindex
except ImportError:  # another Python than the one that the system's packages are for
    sys.path.append("/usr/lib/python3/dist-packages")
    import clang.cindex as cindex

Kind = cindex.CursorKind
Type = cindex.TypeKind

COMPARISONS = {"<": "<=", "<=": "<", ">": ">=", ">=": ">", "==": "!=", "!=": "=="}
CONNECTIVES = {"&&": "||", "||": "&&"}
SUMS = {"+": "-", "-": "+", "+=": "-=", "-=": "+="}

FUNCTIONS = {Kind.FUNCTION_DECL, Kind.CXX_METHOD, Kind.CONSTRUCTOR, Kind.DESTRUCTOR, Kind.CONVERSION_FUNCTION,
             Kind.FUNCTION_TEMPLATE}
# What the compiler decides, so that nothing in it can be chosen later.
CONSTANT = {Kind.STATIC_ASSERT, Kind.ENUM_DECL, Kind.CXX_UNARY_EXPR, Kind.TEMPLATE_TYPE_PARAMETER,
            Kind.TEMPLATE_NON_TYPE_PARAMETER, Kind.TYPE_ALIAS_DECL, Kind.TYPEDEF_DECL, Kind.USING_DECLARATION,
            Kind.CXX_BASE_SPECIFIER}
BODIES = {Kind.COMPOUND_STMT, Kind.CASE_STMT, Kind.DEFAULT_STMT, Kind.IF_STMT, Kind.FOR_STMT, Kind.WHILE_STMT,
          Kind.CXX_FOR_RANGE_STMT, Kind.DO_STMT}
# Calls that only time or memory could miss.
HINT = re.compile(r"\b(reserve|shrink_to_fit|keepFreedMemory|mallopt) \([^;]*\)$")
INTEGERS = {Type.INT, Type.UINT, Type.LONG, Type.ULONG, Type.LONGLONG, Type.ULONGLONG, Type.SHORT, Type.USHORT,
            Type.CHAR_S, Type.CHAR_U, Type.SCHAR, Type.UCHAR, Type.CHAR16, Type.CHAR32}
NUMBERS = INTEGERS | {Type.FLOAT, Type.DOUBLE, Type.LONGDOUBLE}


@dataclass
class Site:
    """One fault: what stands between the two offsets is replaced by an expression of the same type."""

    path: str      # from the root
    start: int     # offsets of bytes
    end: int
    line: int
    function: str  # the innermost one around it; empty outside of functions
    kind: str
    before: str    # for people
    after: str     # for people, and for the compiler
    kept: str      # the expression that is kept where the fault is not chosen, with {} for its text
    may_be_constant: bool  # it stands in a constexpr function
    children: list = field(default_factory=list, repr=False, compare=False)

    @property
    def name(self):
        return f"{self.path}:{self.start}:{self.end}:{self.kind}"


class _Source:
    def __init__(self, root, path, arguments):
        self.path = path
        self.bytes = (root / path).read_bytes()
        unit = cindex.Index.create().parse(str(root / path), args=["-xc++", *arguments])
        errors = [str(fault) for fault in unit.diagnostics if fault.severity >= cindex.Diagnostic.Error]
        if errors:
            raise RuntimeError(f"{path} is not understood: {errors[0]}")
        self.cursor = unit.cursor
        whole = unit.get_extent(str(root / path), (0, len(self.bytes)))
        self.tokens = [(token.extent.start.offset, token.extent.end.offset, token.spelling)
                       for token in unit.get_tokens(extent=whole) if token.kind != cindex.TokenKind.COMMENT]
        self.starts = [start for start, _, _ in self.tokens]

    def between(self, start, end):
        """The tokens that lie wholly between two offsets."""
        first = bisect.bisect_left(self.starts, start)
        found = []
        for token in self.tokens[first:]:
            if token[0] >= end:
                break
            if token[1] <= end:
                found.append(token)
        return found

    def is_negated(self, start):
        """Whether a sign stands before the number there, and not a minus between two operands."""
        index = bisect.bisect_left(self.starts, start)
        before = [spelling for _, _, spelling in self.tokens[max(index - 2, 0):index]]
        return before[-1:] == ["-"] and (before[0] == "return" or not before[0][-1].isalnum() and before[0] not in ")]")

    def text(self, start, end):
        """On one line, without comments."""
        return " ".join(spelling for _, _, spelling in self.between(start, end))


def _span(cursor):
    return cursor.extent.start.offset, cursor.extent.end.offset


def _kind_of(cursor):
    return cursor.type.get_canonical().kind


def _without_wrapping(cursor):
    """What a compiler's own conversion stands around."""
    while cursor.kind == Kind.UNEXPOSED_EXPR:
        children = list(cursor.get_children())
        if len(children) != 1 or _span(children[0]) != _span(cursor):
            break
        cursor = children[0]
    return cursor


class _Finder:
    def __init__(self, root, path, arguments):
        self.source = _Source(root, path, arguments)
        self.file = str(root / path)
        self.found = {}

    def add(self, span, context, kind, before, after, kept="({})"):
        function, may_be_constant = context
        line = self.source.bytes.count(b"\n", 0, span[0]) + 1
        site = Site(self.source.path, *span, line, function, kind, before, after, kept, may_be_constant)
        self.found.setdefault((span, kind), site)

    def is_whole(self, span):
        """Whether the span begins and ends with tokens of the file, which no part of a macro does."""
        tokens = self.source.between(*span)
        return tokens and tokens[0][0] == span[0] and tokens[-1][1] == span[1]

    def walk(self, cursor, context, parent_kind=None):
        if cursor.location.file and cursor.location.file.name != self.file:
            return
        kind = cursor.kind
        if kind in CONSTANT or (kind == Kind.FIELD_DECL and cursor.is_bitfield()):
            return
        span = _span(cursor)
        head = []
        if kind in FUNCTIONS or kind == Kind.VAR_DECL:
            head = [spelling for _, _, spelling in self.source.between(*span)][:12]
        if kind == Kind.VAR_DECL:
            declared = head[:head.index(cursor.spelling)] if cursor.spelling in head else head
            if "constexpr" in declared or (context[1] and cursor.type.is_const_qualified()):
                return
        if kind in FUNCTIONS:
            owner = cursor.semantic_parent.spelling if cursor.semantic_parent else ""
            name = f"{owner}::{cursor.spelling}" if owner and kind != Kind.FUNCTION_DECL else cursor.spelling
            context = (name, "constexpr" in head or "consteval" in head)
        if parent_kind in BODIES and HINT.search(self.source.text(*span)):
            return
        if span[0] < span[1] and self.is_whole(span):
            self.look(cursor, kind, span, context, parent_kind)
        children = list(cursor.get_children())
        if kind == Kind.CASE_STMT:
            children = children[1:]
        for child in children:
            self.walk(child, context, kind)

    def look(self, cursor, kind, span, context, parent_kind):
        if kind in (Kind.BINARY_OPERATOR, Kind.COMPOUND_ASSIGNMENT_OPERATOR, Kind.CALL_EXPR):
            self.look_at_operator(cursor, kind, span, context)
        if parent_kind in BODIES and cursor.kind.is_expression():
            self.look_at_statement(cursor, span, context)
        if kind in (Kind.IF_STMT, Kind.WHILE_STMT, Kind.FOR_STMT, Kind.DO_STMT, Kind.CONDITIONAL_OPERATOR):
            self.look_at_condition(cursor, kind, context)
        self.look_at_constant(cursor, kind, span, context)

    def look_at_operator(self, cursor, kind, span, context):
        operands = list(cursor.get_arguments() if kind == Kind.CALL_EXPR else cursor.get_children())
        if len(operands) != 2 or not all(operands):
            return
        left, right = map(_span, operands)
        between = self.source.between(left[1], right[0])
        while between and between[0][2] == ")":
            between.pop(0)
        if not between:
            return
        sign = between[0][2]
        is_built_in = kind != Kind.CALL_EXPR
        if sign in COMPARISONS and (is_built_in or sign in ("==", "!=")):
            name, changed = "comparison", COMPARISONS[sign]
        elif sign in CONNECTIVES and is_built_in:
            name, changed = "connective", CONNECTIVES[sign]
        elif sign in SUMS and is_built_in and _kind_of(operands[1]) in NUMBERS and \
                _kind_of(operands[0]) in NUMBERS | {Type.POINTER}:
            name, changed = "sum", SUMS[sign]
        else:
            return
        start, end, _ = between[0]
        after = f"({self.source.text(span[0], start)}) {changed} ({self.source.text(end, span[1])})"
        self.add(span, context, name, self.source.text(*span), after)

    def look_at_statement(self, cursor, span, context):
        inner = _without_wrapping(cursor)
        after = self.source.between(span[1], span[1] + 200)
        if not after or after[0][2] != ";":
            return
        if inner.kind == Kind.BINARY_OPERATOR:
            if "=" not in [token[2] for token in self.source.between(*span)]:
                return
        elif inner.kind not in (Kind.CALL_EXPR, Kind.COMPOUND_ASSIGNMENT_OPERATOR, Kind.UNARY_OPERATOR):
            return
        self.add(span, context, "statement", self.source.text(*span), "void()", kept="void({})")

    def look_at_condition(self, cursor, kind, context):
        children = list(cursor.get_children())
        if kind == Kind.CONDITIONAL_OPERATOR:
            span = _span(children[0])
        else:
            start, end = _span(cursor)
            if kind == Kind.DO_STMT:
                start = _span(children[0])[1]
            tokens = self.source.between(start, end)
            if len(tokens) < 3 or tokens[1][2] == "constexpr":
                return
            depth = 0
            bounds = []
            for token in tokens[1:]:
                depth += (token[2] in "([{") - (token[2] in ")]}")
                if (depth == 1 and token[2] in "(;") or depth == 0:
                    bounds.append(token)
                if depth == 0:
                    break
            if len(bounds) < 2:
                return
            last = -2 if kind == Kind.FOR_STMT else -1
            span = bounds[last - 1][1], bounds[last][0]
            inside = self.source.between(*span)
            if not inside:
                return
            span = inside[0][0], inside[-1][1]
            if any(child.kind in (Kind.DECL_STMT, Kind.VAR_DECL) and span[0] <= _span(child)[0] < span[1]
                   for child in children):
                return
        if not self.is_whole(span):
            return
        text = self.source.text(*span)
        self.add(span, context, "condition", text, f"!({text})", kept="static_cast<bool>({})")

    def look_at_constant(self, cursor, kind, span, context):
        text = self.source.text(*span)
        if kind == Kind.CXX_BOOL_LITERAL_EXPR and text in ("true", "false"):
            self.add(span, context, "truth", text, "false" if text == "true" else "true")
        elif kind == Kind.INTEGER_LITERAL and text[:1].isdigit():
            # Of -1 and -2 one is as negative as the other, so often nobody could tell them apart.
            self.add(span, context, "constant", text, f"{text} {'-' if self.source.is_negated(span[0]) else '+'} 1")
        elif kind == Kind.CHARACTER_LITERAL and text.startswith("'"):
            self.add(span, context, "constant", text, f"static_cast<decltype({text})>({text} + 1)")
        elif kind == Kind.DECL_REF_EXPR and cursor.referenced and cursor.referenced.kind == Kind.VAR_DECL:
            constant = cursor.referenced
            if constant.type.is_const_qualified() and _kind_of(constant) in INTEGERS and \
                    constant.spelling.startswith("k") and text.endswith(constant.spelling):
                self.add(span, context, "constant", text,
                         f"static_cast<std::remove_cvref_t<decltype({text})>>({text} + 1)")


def sites_of(root, path, arguments):
    """All sites of a source or a header, in their order; `arguments` are the compiler's."""
    finder = _Finder(root, path, arguments)
    for cursor in finder.source.cursor.get_children():
        finder.walk(cursor, ("", False))
    # To turn == into != is to negate it.
    negated = {span for (span, kind), site in finder.found.items() if kind == "comparison" and
               (") == (" in site.after or ") != (" in site.after)}
    return sorted((site for (span, kind), site in finder.found.items() if kind != "condition" or span not in negated),
                  key=lambda site: (site.start, -site.end, site.kind))
