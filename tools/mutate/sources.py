"""Finds the mutants of C++ sources and writes the sources with all of them in.

A site is a piece of a file that is replaced by a choice: the changed piece when its mutant runs, the piece
itself otherwise. Sites nest; a changed piece holds no further choices, because one mutant runs at a time.
"""

import bisect
import dataclasses
import itertools
import re

from clang import cindex

Kind = cindex.CursorKind
IDS_PER_FILE = 4000  # so that a mutant that is dropped renumbers none in other files

TURNED = {"<": "<=", "<=": "<", ">": ">=", ">=": ">", "==": "!=", "!=": "=="}
EXCHANGED = {"+": "-", "-": "+", "&": "|", "|": "&", "<<": ">>", ">>": "<<", "*": "+", "^": "|"}
LITERALS = {Kind.INTEGER_LITERAL, Kind.FLOATING_LITERAL, Kind.CHARACTER_LITERAL, Kind.STRING_LITERAL,
            Kind.CXX_BOOL_LITERAL_EXPR}
FUNCTIONS = {Kind.FUNCTION_DECL, Kind.CXX_METHOD, Kind.CONSTRUCTOR, Kind.DESTRUCTOR,
             Kind.CONVERSION_FUNCTION, Kind.FUNCTION_TEMPLATE}
BLOCKS = {Kind.IF_STMT, Kind.FOR_STMT, Kind.WHILE_STMT, Kind.CXX_FOR_RANGE_STMT, Kind.SWITCH_STMT,
          Kind.CXX_TRY_STMT}
INITIALIZER = re.compile(r"(\[\[gnu::constructor\]\])( void (\w+)\(\))")
NAMED = {Kind.DECL_REF_EXPR, Kind.MEMBER_REF_EXPR, Kind.CXX_THIS_EXPR}


@dataclasses.dataclass
class Mutant:
    file: str
    line: int
    what: str     # the operator
    change: str   # from what to what
    text: str     # the line
    number: int = 0
    excluded: str = ""  # why it cannot be chosen at run time

    def key(self):
        return (self.file, self.text, self.what, self.change)

    def __str__(self):
        return f"{self.file}:{self.line}: {self.what}: {self.change}"


@dataclasses.dataclass(eq=False)
class Site:
    start: int
    end: int
    form: str               # expression, statement, condition, or token
    choices: list           # (mutant, changed text)
    ask: str = "zrMutant"   # how it is decided
    replacement: str = ""   # of a token
    scope: tuple = (0, 0)   # of a token: the declaration that it changes
    name: str = ""          # of a token: what it declares
    type: str = ""          # of an expression, when both of its pieces must be made this first
    inner: list = dataclasses.field(default_factory=list)


def one_line(text):
    return re.sub(r"\s+", " ", re.sub(r"//[^\n]*", "", text)).strip()


def shorten(text, most=60):
    text = one_line(text)
    return text if len(text) <= most else text[:most - 3] + "..."


class File:
    """One source file, its sites and what became of them."""

    def __init__(self, root, name, index):
        self.root, self.name, self.first = root, name, index * IDS_PER_FILE + 1
        self.text = (root / name).read_bytes().decode("latin-1")
        self.line_starts = [0] + [at + 1 for at, c in enumerate(self.text) if c == "\n"]
        self.lines = self.text.split("\n")
        self.sites = []
        self.mutants = []
        self.macros = []
        self.ranges = []  # (start, end, site) in the written text

    def mutant(self, start, what, change):
        line = bisect.bisect_right(self.line_starts, start)
        made = Mutant(self.name, line, what, change, self.lines[line - 1].strip())
        made.number = self.first + len(self.mutants)
        self.mutants.append(made)
        return made

    def drop(self, site, reason):
        for mutant, _ in site.choices:
            mutant.excluded = mutant.excluded or reason
        self.sites.remove(site)
        if site.form == "token":
            for inner in [s for s in self.sites if site.scope[0] <= s.start and s.end <= site.scope[1]]:
                self.drop(inner, reason)

    def written(self):
        """The text with every choice in it, line for line where the original is."""
        merged = {}
        for site in self.sites:
            site.inner = []
            merged.setdefault((site.start, site.end, site.form), []).append(site)
        # Outer before inner; of one piece: the statement, then the condition, then the expression.
        order = {"statement": 0, "condition": 1, "expression": 2, "token": 3}
        groups = sorted(merged.values(), key=lambda g: (g[0].start, -g[0].end, order[g[0].form]))
        top, open_groups = [], []
        for group in groups:
            while open_groups and open_groups[-1][0].end <= group[0].start:
                open_groups.pop()
            (open_groups[-1][0].inner if open_groups else top).append(group)
            open_groups.append(group)
        out = []
        self.ranges = []
        self._length = 0
        self._write(out, 0, len(self.text), top)
        for group in merged.values():
            if group[0].form == "token":
                for site in group:
                    start, end = (self._moved(at) for at in site.scope)
                    self.ranges.append((start, end, site))
        return "".join(out)

    def _moved(self, at):
        """Where an offset of the original went."""
        place = bisect.bisect_right(self._pieces, (at, float("inf"))) - 1
        return self._pieces[place][1] + at - self._pieces[place][0]

    def _put(self, out, text):
        out.append(text)
        self._length += len(text)

    def _write(self, out, start, end, groups):
        if start == 0 and end == len(self.text):
            self._pieces = []
        for group in groups:
            self._copy(out, start, group[0].start)
            self._write_group(out, group)
            start = group[0].end
        self._copy(out, start, end)

    def _copy(self, out, start, end):
        if end > start:
            self._pieces.append((start, self._length))
            self._put(out, self.text[start:end])

    def _write_group(self, out, group):
        site = group[0]
        began = self._length
        if site.form == "token":
            self._put(out, site.replacement)
            return
        inner = [g for s in group for g in s.inner]
        choices = [(s.ask, m, t) for s in group for m, t in s.choices]
        if site.form == "statement":
            for ask, mutant, text in choices:
                self._put(out, f"if ({ask}({mutant.number})) {{ {text} }} else ")
            self._put(out, "{ ")
            self._write(out, site.start, site.end, inner)
            self._put(out, " }")
        else:
            self._put(out, "(")
            for ask, mutant, text in choices:
                self._put(out, f"{ask}({mutant.number}) ? ({text}) : ")
            self._put(out, "static_cast<bool>(" if site.form == "condition" else f"{site.type}(")
            self._write(out, site.start, site.end, inner)
            self._put(out, "))")
        for each in group:
            self.ranges.append((began, self._length, each))

    def site_at(self, line, column):
        """The innermost site of the written text at a place that a compiler named."""
        lines = self._written_starts
        if line > len(lines):
            return None
        at = lines[line - 1] + column - 1
        held = [r for r in self.ranges if r[0] <= at < r[1]]
        return min(held, key=lambda r: r[1] - r[0])[2] if held else None

    def write(self, folder):
        # An initializer of the loader runs before the constants of its file are made, once they are chosen at
        # run time. Here it runs behind them, as the file's last.
        text = INITIALIZER.sub(lambda found: " " * len(found[1]) + found[2], self.written())
        for found in INITIALIZER.finditer(self.text):
            text += f"static const bool zrInitialized{found.start()} = ({found[3]}(), true);\n"
        self._written_starts = [0] + [at + 1 for at, c in enumerate(text) if c == "\n"]
        target = folder / self.name
        target.parent.mkdir(parents=True, exist_ok=True)
        data = text.encode("latin-1")
        if not target.exists() or target.read_bytes() != data:
            target.write_bytes(data)


class Finder:
    """Walks what libclang read of a file."""

    def __init__(self, file):
        self.file = file
        self.text = file.text

    def piece(self, cursor):
        return self.text[cursor.extent.start.offset:cursor.extent.end.offset]

    def add(self, context, start, end, form, what, change, text):
        mutant = self.file.mutant(start, what, change)
        reason = context.get("excluded", "")
        if any(a <= start and end <= b for a, b in self.file.macros):
            reason = "inside a macro"
        elif "\n#" in self.text[start:end]:
            reason = "holds preprocessor lines"
        if reason:
            mutant.excluded = reason
            return
        self.file.sites.append(Site(start, end, form, [(mutant, one_line(text))], context["ask"],
                                    type=context.get("format", "") if text[:1].isalpha() else ""))

    def visit(self, cursor, context):
        start, end = cursor.extent.start.offset, cursor.extent.end.offset
        kind = cursor.kind
        children = [c for c in cursor.get_children()
                    if c.extent.start.file and self.is_here(c.extent.start.file.name)]
        if kind == Kind.STATIC_ASSERT or kind == Kind.ENUM_CONSTANT_DECL or kind.name == "CONCEPT_DECL":
            context = dict(context, excluded="constant expression")
        elif kind in FUNCTIONS:
            head = self.text[start:end].split("{")[0]
            if re.search(r"\bconsteval\b", head):
                context = dict(context, excluded="consteval")
            elif re.search(r"\bconstexpr\b", head):
                context = dict(context, ask="zrMutantUnlessConstant")
        elif kind == Kind.VAR_DECL:
            self.constant(cursor, context, start, end)
        elif kind in LITERALS:
            self.literal(cursor, context, start, end)
        elif kind == Kind.DECL_REF_EXPR:
            self.enumerator(cursor, context, start, end)
            return  # below it there are only names and template arguments
        elif kind == Kind.BINARY_OPERATOR or kind == Kind.CALL_EXPR:
            self.binary(cursor, children, context)
        elif kind == Kind.UNARY_OPERATOR:
            self.step(cursor, children, context)
        elif kind == Kind.CONDITIONAL_OPERATOR:
            self.condition(children[0], context)
        elif kind in BLOCKS or kind == Kind.CXX_CATCH_STMT:
            self.block(cursor, children, context)
        elif kind == Kind.COMPOUND_STMT:
            self.statements(children, context)
        elif kind == Kind.CASE_STMT and children:
            self.visit(children[0], dict(context, excluded="constant expression"))
            children = children[1:]
        for child in children:
            self.visit(child, self.of_child(cursor, child, context))

    def is_here(self, name):
        return name.endswith("/" + self.file.name)

    def of_child(self, cursor, child, context):
        """Array bounds and the condition of `if constexpr` are the compiler's business."""
        if cursor.kind == Kind.CALL_EXPR:
            type_ = cursor.type.get_canonical().spelling
            context = dict(context, format=type_ if type_.startswith("platform::FormatText<") else "")
        at = child.extent.start.offset
        if cursor.kind in (Kind.VAR_DECL, Kind.FIELD_DECL):
            if self.text[:at].rstrip().endswith("[") or at < cursor.location.offset:
                return dict(context, excluded="constant expression")
        if cursor.kind == Kind.IF_STMT and re.match(r"if\s+constexpr", self.piece(cursor)) \
                and child.kind != Kind.COMPOUND_STMT and child.kind != Kind.IF_STMT:
            return dict(context, excluded="constant expression")
        return context

    def constant(self, cursor, context, start, end):
        """A constexpr variable becomes a const one, if nothing needs it before the program runs."""
        head = self.text[start:cursor.location.offset]
        found = re.search(r"\bconstexpr\b", head)
        if not found or context.get("excluded") or "template" in head:
            return
        member = cursor.semantic_parent.kind in (Kind.CLASS_DECL, Kind.STRUCT_DECL, Kind.CLASS_TEMPLATE)
        already = re.search(r"\bconst\b", head) is not None and "*" not in head
        replacement = ("inline " if member and "inline" not in head else "") + ("" if already else "const")
        self.file.sites.append(Site(start + found.start(), start + found.end(), "token", [],
                                    replacement=replacement, scope=(start, end),
                                    name=cursor.spelling))

    def literal(self, cursor, context, start, end):
        text = self.piece(cursor)
        if cursor.kind == Kind.CXX_BOOL_LITERAL_EXPR:
            changed = {"true": "false", "false": "true"}.get(text)
        elif cursor.kind == Kind.STRING_LITERAL:
            changed = '"~' + text[1:] if text.startswith('"') else None
            if changed and context.get("format"):
                changed = f"{context['format']}({changed})"
        elif cursor.kind == Kind.CHARACTER_LITERAL:
            changed = f"static_cast<char>({text} + 1)"
        else:
            # The compiler's own 0 in a rewritten a < b has the operator's place.
            changed = f"{text} + 1" if text[:1].isdigit() or text[:1] == "." else None
        if changed:
            self.add(context, start, end, "expression", "constant",
                     f"{shorten(text)} -> {'~' if cursor.kind == Kind.STRING_LITERAL else shorten(changed)}",
                     changed)

    def enumerator(self, cursor, context, start, end):
        named = cursor.referenced
        if named is None or named.kind != Kind.ENUM_CONSTANT_DECL:
            return
        names = [c.spelling for c in named.semantic_parent.get_children()
                 if c.kind == Kind.ENUM_CONSTANT_DECL]
        text = self.piece(cursor)
        if len(names) > 1 and text.endswith(named.spelling):
            other = names[(names.index(named.spelling) + 1) % len(names)]
            changed = text[:-len(named.spelling)] + other
            self.add(context, start, end, "expression", "constant", f"{text} -> {changed}", changed)

    def operator(self, children):
        """The operator between two operands, with its offset."""
        left, right = children[0].extent.end.offset, children[-1].extent.start.offset
        between = self.text[left:right]
        found = re.fullmatch(r"(\s*)([-+*/%<>=!&|^]+)(\s*)", between)
        return (found.group(2), left + found.start(2)) if found else (None, 0)

    def binary(self, cursor, children, context):
        if cursor.kind == Kind.CALL_EXPR:
            # An overloaded operator's children are its left side, itself and its right side.
            if not cursor.spelling.startswith("operator") or len(children) != 3:
                return
            children = [children[0], children[2]] if children[1].kind != Kind.CALL_EXPR else children
        if len(children) < 2:
            return
        sign, at = self.operator([children[0], children[-1]])
        start, end = cursor.extent.start.offset, cursor.extent.end.offset
        left = self.text[start:at]
        right = self.text[at + len(sign or ""):end]
        if sign in TURNED:
            self.add(context, start, end, "expression", "comparison",
                     f"{shorten(self.text[start:end])} -> {TURNED[sign]}", left + TURNED[sign] + right)
        elif sign in ("&&", "||"):
            for kept, name in ((left, "left"), (right, "right")):
                self.add(context, start, end, "condition", "operand removed",
                         f"{shorten(self.text[start:end])} -> {name} side only",
                         f"static_cast<bool>({kept})")
        elif sign in EXCHANGED and cursor.kind == Kind.BINARY_OPERATOR:
            self.add(context, start, end, "expression", "operator",
                     f"{shorten(self.text[start:end])} -> {EXCHANGED[sign]}",
                     f"{left}{EXCHANGED[sign]}{right}")

    def step(self, cursor, children, context):
        text = self.piece(cursor)
        for sign, other in (("++", "--"), ("--", "++")):
            if text.startswith(sign) or text.endswith(sign):
                start, end = cursor.extent.start.offset, cursor.extent.end.offset
                self.add(context, start, end, "expression", "operator", f"{shorten(text)} -> {other}",
                         text.replace(sign, other))

    def condition(self, cursor, context, loop=False):
        """Negated; a loop's is false instead, for its negation would rarely end."""
        text = self.piece(cursor)
        start, end = cursor.extent.start.offset, cursor.extent.end.offset
        if loop:
            if text != "true":
                self.add(context, start, end, "condition", "branch removed",
                         f"while ({shorten(text)}) -> while (false)", "false")
            return
        if not re.search(r"[^=!<>][=!]=[^=]", text) or "&&" in text or "||" in text:
            self.add(context, start, end, "condition", "condition negated", f"!({shorten(text)})",
                     f"!({text})")

    def block(self, cursor, children, context):
        bodies = [c for c in children if c.kind == Kind.COMPOUND_STMT]
        declared = [c for c in children if c.kind in (Kind.VAR_DECL, Kind.DECL_STMT)]
        before = [c for c in children if c.kind.is_expression()
                  and not any(d.extent.start.offset <= c.extent.start.offset < d.extent.end.offset
                              for d in declared)]
        if cursor.kind == Kind.IF_STMT and before:
            self.condition(before[-1], self.of_child(cursor, before[-1], context))
        elif cursor.kind == Kind.WHILE_STMT and before:
            self.condition(before[-1], context, loop=True)
        if cursor.kind in (Kind.WHILE_STMT, Kind.SWITCH_STMT, Kind.CXX_TRY_STMT):
            return
        for body in bodies:
            inside = list(body.get_children())
            # One expression alone is dropped as such.
            if not inside or (len(inside) == 1 and self.is_expression(inside[0])):
                continue
            start, end = body.extent.start.offset + 1, body.extent.end.offset - 1
            self.add(context, start, end, "statement", "branch removed",
                     f"{{ {shorten(self.text[start:end])} }}", "")

    @staticmethod
    def is_expression(cursor):
        return cursor.kind.is_expression() and cursor.kind != Kind.LAMBDA_EXPR

    def statement_end(self, cursor):
        end = cursor.extent.end.offset
        return end + re.match(r"(\s*;)?", self.text[end:]).end() if self.is_expression(cursor) else end

    def statements(self, children, context):
        for at, child in enumerate(children):
            start, end = child.extent.start.offset, self.statement_end(child)
            if self.is_expression(child):
                self.add(context, start, end, "statement", "statement dropped",
                         shorten(self.text[start:end]), "")
            if at + 1 == len(children):
                continue
            after = children[at + 1]
            movable = [c for c in (child, after) if self.is_expression(c) or c.kind in BLOCKS]
            if len(movable) == 2 and self.touch(child, after):
                next_start, next_end = after.extent.start.offset, self.statement_end(after)
                first, second = self.text[start:end], self.text[next_start:next_end]
                before = len(self.file.sites)
                self.add(context, start, end, "statement", "statements swapped",
                         f"{shorten(first, 40)} <-> {shorten(second, 40)}", second)
                if len(self.file.sites) > before:
                    mutant = self.file.sites[-1].choices[0][0]
                    self.file.sites.append(Site(next_start, next_end, "statement",
                                                [(mutant, one_line(first))], context["ask"]))

    def touch(self, first, second):
        """Whether one of the statements may change what the other one names."""
        (named, written), (other_named, other_written) = map(self.names, (first, second))
        return any(a == b or a.startswith((b + ".", b + "->")) or b.startswith((a + ".", a + "->"))
                   for a, b in [*itertools.product(written, other_named),
                                *itertools.product(named, other_written)])

    def names(self, cursor):
        """The variables and fields that a statement names, with their paths, and those it may change."""
        def paths(part):
            found = {self.piece(c) for c in part.walk_preorder() if c.kind in NAMED
                     and c.referenced is not None and c.referenced.kind not in FUNCTIONS}
            found = {n for n in found if re.fullmatch(r"[\w.\->]+", n)}
            return {n for n in found if not any(m.startswith((n + ".", n + "->")) for m in found)}

        written = set()
        for call in cursor.walk_preorder():
            parts = list(call.get_children())
            called = call.referenced if call.kind == Kind.CALL_EXPR else None
            if call.kind in (Kind.COMPOUND_ASSIGNMENT_OPERATOR, Kind.UNARY_OPERATOR, Kind.BINARY_OPERATOR):
                if call.kind != Kind.BINARY_OPERATOR or self.operator(parts)[0] == "=":
                    written |= paths(parts[0])
            elif called is not None:
                if called.kind == Kind.CXX_METHOD and not called.is_const_method() and parts:
                    written |= paths(parts[0])
                for argument, parameter in zip(call.get_arguments(), called.get_arguments()):
                    type_ = parameter.type.get_canonical()
                    if type_.kind in (cindex.TypeKind.LVALUEREFERENCE, cindex.TypeKind.RVALUEREFERENCE) \
                            and not type_.get_pointee().is_const_qualified():
                        written |= paths(argument)
            elif call.kind == Kind.CALL_EXPR:  # of what a template's argument decides
                written |= paths(call)
        return paths(cursor), written


def find(root, names, commands):
    """The files of `names`, each with its sites. `commands` gives a source file's compiler arguments."""
    files = {name: File(root, name, at) for at, name in enumerate(sorted(names))}
    index = cindex.Index.create()
    left = set(names)
    known = set()  # what libclang has against the healthy sources; the compiler has nothing
    options = cindex.TranslationUnit.PARSE_DETAILED_PROCESSING_RECORD
    for source, arguments in commands.items():
        unit = index.parse(str(root / source), args=arguments, options=options)
        known.update(d.spelling for d in unit.diagnostics if d.severity >= cindex.Diagnostic.Error)
        here = {}
        for cursor in unit.cursor.get_children():
            place = cursor.extent.start.file
            if place is None or not place.name.startswith(str(root) + "/"):
                continue
            name = place.name[len(str(root)) + 1:]
            if name not in left:
                continue
            if cursor.kind == Kind.MACRO_INSTANTIATION:
                files[name].macros.append((cursor.extent.start.offset, cursor.extent.end.offset))
            elif not cursor.kind.is_preprocessing():
                here.setdefault(name, []).append(cursor)
        for name, cursors in here.items():
            finder = Finder(files[name])
            for cursor in cursors:
                finder.visit(cursor, {"ask": "zrMutant"})
        left -= set(here) | {source}
    return files, left, known
