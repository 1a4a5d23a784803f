"""The mutation operators: every change that they make to a C++ text."""

import dataclasses
import re

from source_text import HEADS, Source

SWAPPED_SIGNS = {
    "comparison": {"<": "<=", "<=": "<", ">": ">=", ">=": ">", "==": "!=", "!=": "=="},
    "arithmetic": {"+": "-", "-": "+", "+=": "-=", "-=": "+=", "*": "/", "/": "*"},
    "logic": {"&&": "||", "||": "&&"},
}
# Statements that begin with one of these are declarations or have no effect of their own to drop.
NOT_DROPPED = {"return", "using", "static", "const", "constexpr", "auto", "struct", "class", "enum", "template",
               "typedef", "static_assert", "friend", "typename", "public", "private", "protected", "namespace", "goto",
               "volatile", "inline", "thread_local"}
TYPES = {"bool", "char", "int", "unsigned", "long", "short", "double", "float", "void", "signed"}
JUMPS = {"throw", "break", "continue"}
DEFAULTS = ({"{", "}"}, {"nullptr"}, {"std", "::", "nullopt"}, {"0"}, {'""'})
NUMBER = re.compile(r"(?:(?P<hex>0[xX])(?P<hex_digits>[\da-fA-F']+)|(?P<decimal>[\d.'eE+-]+?))(?P<suffix>[uUlLfFzZ]*)\Z")


@dataclasses.dataclass(frozen=True)
class Mutant:
    """One change. Its key stays the same when other lines of the file change."""
    file: str
    operator: str
    start: int
    end: int
    replacement: str
    before: str  # the changed lines, with single spaces
    after: str
    nth: int = 1  # among equal changes of equal lines in the file

    @property
    def key(self):
        return " | ".join((self.file, self.operator, self.before, self.after)) + \
            (f" | {self.nth}" if self.nth > 1 else "")

    def applied(self, text):
        return text[:self.start] + self.replacement + text[self.end:]


def joined(text):
    return " ".join(text.split())


class Mutation:
    """Collects the mutants of one file."""

    def __init__(self, file, text):
        self.file = file
        self.source = Source(text)
        self.tokens = self.source.tokens
        self.found = []

    def all(self):
        for place, token in enumerate(self.tokens):
            if not self._is_fixed(place):
                self._swap_sign(place, token)
                self._remove_not(place, token)
                self._change_number(place, token)
                self._change_string(place, token)
            self._negate_condition(place, token)
        for statement in self.source.statements:
            self._drop(statement)
            self._return_default(statement)
        for one, other in zip(self.source.statements, self.source.statements[1:]):
            self._swap_statements(one, other)
        return self._numbered()

    def _numbered(self):
        counts, numbered = {}, []
        for mutant in sorted(self.found, key=lambda one: (one.start, one.operator, one.replacement)):
            counts[mutant.key] = counts.get(mutant.key, 0) + 1
            numbered.append(dataclasses.replace(mutant, nth=counts[mutant.key]))
        return numbered

    def _add(self, operator, start, end, replacement):
        text = self.source.text
        begin, stop = self.source.lines_around(start, end)
        before = joined(text[begin:stop])
        after = joined(text[begin:start] + replacement + text[end:stop])
        if before != after:
            self.found.append(Mutant(self.file, operator, start, end, replacement, before, after))

    def _text_at(self, place):
        return self.tokens[place].text if 0 <= place < len(self.tokens) else ""

    def _is_fixed(self, place):
        """Whether the token is part of an assertion at compile time, or of a linkage."""
        if self._text_at(place - 1) == "extern":
            return True
        for back in range(place, max(-1, place - 60), -1):
            if self._text_at(back) == "static_assert":
                return True
            if self._text_at(back) in (";", "}"):
                return False
        return False

    def _is_spaced(self, token):
        text = self.source.text
        return text[token.start - 1:token.start].isspace() and text[token.end:token.end + 1].isspace()

    def _swap_sign(self, place, token):
        before, after = self.tokens[place - 1] if place else None, self._text_at(place + 1)
        if token.kind == "sign" and token.text in ("++", "--"):
            self._add("arithmetic", token.start, token.end, "--" if token.text == "++" else "++")
            return
        if token.kind != "sign" or before is None or not self._is_spaced(token):
            return
        if before.text in ("template", "operator", "return", "(", ",", "=", "{") or after.startswith("="):
            return
        for operator, signs in SWAPPED_SIGNS.items():
            if token.text not in signs:
                continue
            strings = any(self.tokens[near].kind in ("string", "raw") for near in (place - 1, place + 1)
                          if near < len(self.tokens))
            if operator != "arithmetic" or not strings:  # texts can only be added
                self._add(operator, token.start, token.end, signs[token.text])

    def _remove_not(self, place, token):
        if token.text == "!" and token.kind == "sign":
            self._add("remove not", token.start, token.end, "")

    def _change_number(self, place, token):
        parts = NUMBER.match(token.text) if token.kind == "number" else None
        pure = self._text_at(place - 1) == "=" and self._text_at(place - 2) in (")", "const", "noexcept")
        if parts is None or pure:  # a function without a body
            return
        digits = (parts["hex_digits"] or parts["decimal"]).replace("'", "")
        for difference in (1, -1):
            try:
                if parts["hex"]:
                    changed = hex(int(digits, 16) + difference)
                elif digits.isdigit():
                    changed = str(int(digits) + difference)
                else:
                    changed = repr(float(digits) + difference)
            except ValueError:
                return
            if not changed.startswith("-0x"):
                self._add("constant", token.start, token.end, changed + parts["suffix"])

    def _change_string(self, place, token):
        if token.kind == "string" and token.text.startswith('"'):
            self._add("string", token.start, token.end, token.text[:-1] + '~"')

    def _negate_condition(self, place, token):
        if token.text not in ("if", "while") or not self.source.sign(place + 1, "("):
            return
        first, last = place + 2, self.source.partner.get(place + 1)
        if last is None:
            return
        declares = False
        inner = first
        while inner < last:
            text = self._text_at(inner)
            if text == ";":
                first, declares = inner + 1, False
            declares = declares or text == "="
            inner = self.source.partner[inner] + 1 if text in "([{" and inner in self.source.partner else inner + 1
        if not declares and first < last:
            start, end = self.tokens[first].start, self.tokens[last - 1].end
            self._add("negate condition", start, end, f"!({self.source.text[start:end]})")

    def _is_expression(self, statement):
        """Whether the statement is an expression, not a declaration."""
        first = self._text_at(statement.first)
        if first in NOT_DROPPED or first in TYPES or first in HEADS or first in JUMPS or first in ("[", ";", "#"):
            return False
        place = statement.first
        while self.source.sign(place + 1, "::"):
            place += 2
        if self.tokens[place].kind != "word":
            return True
        if first == "static_cast" and "void" in (self._text_at(place + 2), self._text_at(place + 3)):
            return False
        following = self.tokens[place + 1]
        if following.text in ("<", "&", "*", "const") or following.kind == "word":
            return first == "delete"
        return True

    def _range(self, statement):
        return self.tokens[statement.first].start, self.tokens[statement.last].end

    def _drop(self, statement):
        first = self._text_at(statement.first)
        empty_return = first == "return" and statement.last == statement.first + 1
        if self._is_expression(statement) or first in JUMPS or empty_return:
            self._add("drop statement", *self._range(statement), ";")

    def _return_default(self, statement):
        if self._text_at(statement.first) != "return" or statement.last == statement.first + 1:
            return
        words = [self._text_at(place) for place in range(statement.first + 1, statement.last)]
        if set(words) in DEFAULTS:
            return
        value = {"true": "false", "false": "true"}.get(words[0], "{}") if len(words) == 1 else "{}"
        self._add("return default", *self._range(statement), f"return {value};")

    def _swap_statements(self, one, other):
        adjacent = one.block == other.block and other.first == one.last + 1 and not (one.alone or other.alone)
        if not adjacent or not (self._is_expression(one) and self._is_expression(other)):
            return
        (start, middle), (begin, end) = self._range(one), self._range(other)
        text = self.source.text
        self._add("swap statements", start, end, text[begin:end] + text[middle:begin] + text[start:middle])


def mutants_of(file, text):
    """All mutants of a file, in the order of the text."""
    return Mutation(file, text).all()
