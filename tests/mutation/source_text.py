"""C++ text as tokens, blocks and simple statements: as much of the grammar as the mutation operators need.

It relies on the formatting of the tree: binary operators have a space on either side.
"""

import dataclasses
import re

TOKEN = re.compile(r"""
    (?P<comment>//[^\n]*|/\*.*?\*/)
  | (?P<directive>(?:(?<=\n)|\A)[ \t]*\#(?:\\\n|[^\n])*)
  | (?P<raw>(?:u8|[uUL])?R"(?P<mark>[^(\s]*)\(.*?\)(?P=mark)")
  | (?P<string>(?:u8|[uUL])?"(?:\\.|[^"\\\n])*")
  | (?P<character>'(?:\\.|[^'\\\n])+')
  | (?P<number>(?:\d|\.\d)(?:'?[\w.]|(?<=[eE])[+-])*)
  | (?P<word>[A-Za-z_]\w*)
  | (?P<sign><=>|->\*|\.\.\.|<<=|>>=|::|->|\+\+|--|&&|\|\||[<>=!+\-*/%&|^]=|<<|[^\s\w])
""", re.VERBOSE | re.DOTALL)
CLOSING = {"(": ")", "[": "]", "{": "}"}
# What stands before the brace of a body.
BEFORE_BODY = {")", "]", "else", "do", "try", "const", "override", "final", "noexcept", "mutable"}
HEADS = {"if", "for", "while", "switch", "catch"}


@dataclasses.dataclass(frozen=True)
class Token:
    kind: str
    text: str
    start: int
    end: int


@dataclasses.dataclass(frozen=True)
class Statement:
    """A statement without a body of its own, as positions of its first token and its semicolon."""
    first: int
    last: int
    block: int  # the position of the brace that opens its block
    alone: bool  # it is the whole body of an `if` or a loop, or follows a label


def tokens_of(text):
    """The tokens of code: no comments, no preprocessor directives."""
    kinds = ("comment", "directive", "raw", "string", "character", "number", "word", "sign")
    tokens = []
    for match in TOKEN.finditer(text):
        kind = next(one for one in kinds if match[one] is not None)
        if kind not in ("comment", "directive"):
            tokens.append(Token(kind, match.group(), match.start(), match.end()))
    return tokens


class Source:
    """A C++ file that is going to be mutated."""

    def __init__(self, text):
        self.text = text
        self.tokens = tokens_of(text)
        self.partner = self._partners()
        self.statements = []
        self._find_bodies()

    def _partners(self):
        partner, open_ = {}, []
        for place, token in enumerate(self.tokens):
            if token.kind != "sign":
                continue
            if token.text in CLOSING:
                open_.append(place)
            elif open_ and CLOSING.get(self.tokens[open_[-1]].text) == token.text:
                partner[open_[-1]] = place
                partner[place] = open_.pop()
        return partner

    def sign(self, place, text):
        return 0 <= place < len(self.tokens) and self.tokens[place].text == text and \
            self.tokens[place].kind in ("sign", "word")

    def _is_body(self, place):
        """Whether the brace opens a body of code, seen from outside of any body."""
        return place > 0 and self.tokens[place].text == "{" and self.tokens[place - 1].text in BEFORE_BODY

    def _find_bodies(self):
        place = 0
        while place < len(self.tokens):
            if self.sign(place, "{") and self._is_body(place) and place in self.partner:
                self._parse_block(place)
                place = self.partner[place]
            place += 1

    def _parse_block(self, opening):
        place, end = opening + 1, self.partner[opening]
        while place < end:
            place = self._parse_statement(place, end, opening, False)

    def _parse_statement(self, place, end, block, alone):
        """Returns the position after the statement."""
        word = self.tokens[place].text
        if self.sign(place, "{") and place in self.partner:
            self._parse_block(place)
            return self.partner[place] + 1
        if word in HEADS:
            head = place + 2 if self.sign(place + 1, "constexpr") else place + 1
            if not self.sign(head, "(") or head not in self.partner:
                return place + 1
            self._parse_nested(head + 1, self.partner[head])
            after = self.partner[head] + 1
            return self._parse_statement(after, end, block, True) if after < end else end
        if word in ("else", "do", "try") and place + 1 < end:
            return self._parse_statement(place + 1, end, block, True)
        if word in ("case", "default"):
            while place < end and not self.sign(place, ":"):
                place += 1
            return self._parse_statement(place + 1, end, block, True) if place + 1 < end else end
        last = place
        while last < end and not self.sign(last, ";"):
            last = self.partner[last] + 1 if self.tokens[last].text in CLOSING and last in self.partner else last + 1
        if last >= end:
            return end
        self.statements.append(Statement(place, last, block, alone))
        self._parse_nested(place, last)
        return last + 1

    def _parse_nested(self, first, last):
        """The bodies of lambdas in an expression."""
        place = first
        while place < last:
            if self.sign(place, "{") and place in self.partner and \
                    self.tokens[place - 1].text in (")", "]", "mutable", "noexcept"):
                self._parse_block(place)
                place = self.partner[place]
            place += 1

    def line_of(self, offset):
        return self.text.count("\n", 0, offset) + 1

    def lines_around(self, start, end):
        """The range of the whole lines that contain the range."""
        begin = self.text.rfind("\n", 0, start) + 1
        stop = self.text.find("\n", end)
        return begin, len(self.text) if stop < 0 else stop
