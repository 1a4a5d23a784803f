"""Collects the errors that C++ sources can return: domain, code, the code's name, and the message's format.

Everything that creates an error, and every mention of an error domain, must have a known form. Any other
raises UnknownForm, so that no error is overlooked:

    fail(out, DOMAIN, CODE, underlying, FORMAT, ...)     makeError(DOMAIN, CODE, FORMAT, ...)
    errorWithMessage(DOMAIN, CODE, MESSAGE, underlying)

DOMAIN is a constant whose name ends in ErrorDomain. CODE is an integer, a constant of the same file or of a namespace
named in the expression, an enumerator, or static_cast<std::int64_t>(...) of one. CODE and FORMAT may be parameters of
the enclosing function: then every call of that function is an error. A CODE that is a parameter of an enumeration type
stands for every enumerator that the sources mention.
"""

import dataclasses
import pathlib
import re

MAKERS = {"fail": (1, 2, 4, 5), "makeError": (0, 1, 2, 3), "errorWithMessage": (0, 1, 2, 4)}  # ..., fewest arguments
# These files declare and define the functions above.
MAKERS_FILES = {"contract/diagnostic_error.h", "contract/diagnostic_error.cpp"}
# This file recreates errors from a record.
COPIERS = {"host/error/nesting.cpp", "host/record/lossless_json.cpp"}

TOKEN = re.compile(
    r'''(?P<skip>\s+|//[^\n]*|/\*.*?\*/|^[ \t]*\#(?:[^\n\\]|\\.)*)
      | (?P<raw>R"(?P<delimiter>[^\s()\\]*)\(.*?\)(?P=delimiter)")
      | (?P<text>"(?:[^"\\\n]|\\.)*")
      | (?P<character>'(?:[^'\\\n]|\\.)+')
      | (?P<number>\.?\d(?:'?[\w.]|(?<=[eEpP])[+-])*)
      | (?P<name>[A-Za-z_]\w*(?:::[A-Za-z_]\w*)*)
      | (?P<mark>::|->|[=!<>]=|&&|\|\||.)''',
    re.VERBOSE | re.DOTALL | re.MULTILINE)
OPEN = {"(": ")", "{": "}", "[": "]"}


class UnknownForm(Exception):
    """The sources return an error in a way that this module does not support."""


@dataclasses.dataclass(frozen=True)
class Error:
    """An error that a source file can return; `message` is None if it is not a single format."""
    file: str
    domain: str
    code: int
    symbol: str | None
    message: str | None


@dataclasses.dataclass(frozen=True)
class Token:
    kind: str
    text: str
    line: int


@dataclasses.dataclass
class Function:
    name: str
    parameters: list  # of lists of tokens
    begin: int  # of the body, as an index of the file's tokens
    end: int

    def position_of(self, argument):
        """The index of the parameter that the argument is, or None."""
        if len(argument) == 1 and argument[0].kind == "name":
            for position, parameter in enumerate(self.parameters):
                if parameter and parameter[-1].text == argument[0].text:
                    return position
        return None


def tokens_of(text):
    tokens, line = [], 1
    for match in TOKEN.finditer(text):
        if match.lastgroup != "skip" and match.group("skip") is None:
            kind = next(kind for kind in ("raw", "text", "character", "number", "name", "mark") if match.group(kind))
            tokens.append(Token(kind, match.group(), line))
        line += match.group().count("\n")
    return tokens


def closing(tokens, at):
    """The index of the bracket that closes the one at `at`."""
    depth = 0
    for position in range(at, len(tokens)):
        if tokens[position].kind == "mark":
            depth += tokens[position].text in OPEN
            depth -= tokens[position].text in OPEN.values()
            if depth == 0:
                return position
    raise UnknownForm(f"line {tokens[at].line}: a bracket does not close")


def split(tokens):
    """The arguments between two brackets. Commas in template arguments of a type do not separate them."""
    parts, depth, angles = [[]], 0, 0
    for position, token in enumerate(tokens):
        if token.kind == "mark":
            depth += token.text in OPEN
            depth -= token.text in OPEN.values()
            # A "<" that is followed by a ">" counts as the bracket of template arguments.
            angles += token.text == "<" and ">" in [other.text for other in tokens[position:]]
            angles -= token.text == ">" and angles > 0
        if token.text == "," and token.kind == "mark" and depth == 0 and angles == 0:
            parts.append([])
        else:
            parts[-1].append(token)
    return parts if parts != [[]] else []


class Source:
    """The tokens, functions and constants of one file."""

    def __init__(self, name, text):
        self.name = name
        self.tokens = tokens_of(text)
        self.functions = []
        self.constants = {}  # by qualified name: value
        self.domains = {}  # by name: (value, position of the name's definition)
        self.enumerations = set()
        self._read([], 0, len(self.tokens))

    def at(self, position):
        return f"{self.name}:{self.tokens[position].line}"

    def function_at(self, position):
        return next((one for one in self.functions if one.begin <= position < one.end), None)

    def _read(self, scope, position, end):
        head = position
        while position < end:
            token = self.tokens[position]
            if token.kind == "mark" and token.text == ";":
                self._constant(scope, head, position)
                head = position + 1
            elif token.kind == "mark" and token.text == "(":
                position = closing(self.tokens, position)
            elif token.kind == "mark" and token.text == "{":
                close = closing(self.tokens, position)
                head = self._braces(scope, head, position, close)
                position = close
            position += 1

    def _braces(self, scope, head, begin, close):
        """Reads the contents of braces at namespace or class level; returns where the next declaration begins."""
        header = self.tokens[head:begin]
        words = [token.text for token in header]
        for keyword in ("enum", "namespace", "class", "struct", "union", "extern"):
            if keyword not in words or "(" in words:
                continue
            names = [word for token, word in zip(header, words) if token.kind == "name"]
            after = names[names.index(keyword) + 1:]
            after = [name for name in after if name not in ("class", "struct", "inline", "final")]
            if keyword == "enum":
                self._enumeration(scope + after[:1], begin, close)
            else:
                self._read(scope + after[:1], begin + 1, close)
            return close + 1
        if "(" in words:
            opening = words.index("(")
            name = header[opening - 1].text if opening else ""
            parameters = split(header[opening + 1:closing(header, opening)])
            parameters = [parameter[:[t.text for t in parameter].index("=")]
                          if "=" in [t.text for t in parameter] else parameter for parameter in parameters]
            if "=" not in words[:opening]:
                self.functions.append(Function(name.split("::")[-1], parameters, begin, close))
                return close + 1
        return head  # an initialiser: its declaration continues

    def _enumeration(self, scope, begin, close):
        if not scope:
            return
        self.enumerations.add(scope[-1])
        value = -1
        for part in split(self.tokens[begin + 1:close]):
            if not part:
                continue
            value = value + 1 if len(part) == 1 else integer(part[2:])
            if value is None or part[0].kind != "name":
                raise UnknownForm(f"{self.at(begin)}: an enumerator of {scope[-1]} is not a number")
            self.constants["::".join(scope + [part[0].text])] = value

    def _constant(self, scope, head, end):
        words = [token.text for token in self.tokens[head:end]]
        if "constexpr" not in words or "=" not in words:
            return
        equals = head + words.index("=")
        name, value = self.tokens[equals - 1].text, self.tokens[equals + 1:end]
        if integer(value) is not None:
            self.constants["::".join(scope + [name])] = integer(value)
        elif name.endswith("ErrorDomain"):
            if len(value) != 1 or value[0].kind != "text":
                raise UnknownForm(f"{self.at(equals)}: the value of {name} is not one text")
            self.domains[name] = (value[0].text[1:-1], equals - 1)


def integer(tokens):
    """The integer that the tokens form, or None."""
    text = "".join(token.text for token in tokens).replace("'", "")
    return int(text, 0) if re.fullmatch(r"-?(0x[0-9a-fA-F]+|0|[1-9]\d*)", text) else None


def format_of(tokens):
    """The text of adjacent string literals, or None."""
    if not tokens or any(token.kind != "text" for token in tokens):
        return None
    return "".join(token.text[1:-1] for token in tokens).replace('\\"', '"')


class Collector:
    def __init__(self, sources):
        self.sources = sources
        self.domains = {name: value for source in sources for name, (value, _) in source.domains.items()}
        self.enumerations = {name for source in sources for name in source.enumerations}
        self.used = set()  # (file, position) of the mentions of domains that calls have explained

    def errors(self):
        found = []
        for source in self.sources:
            for position, token in enumerate(source.tokens):
                if token.kind == "name":
                    found += self._errors_at(source, position)
        for source in self.sources:
            self._check_mentions(source)
        return found

    def _errors_at(self, source, position):
        maker = source.tokens[position].text.split("::")[-1]
        if maker == "DiagnosticError" and source.name not in COPIERS:
            after = source.tokens[position + 1].text
            before = [token.text for token in source.tokens[position - 4:position]]
            if after in ("(", "{") or "std::make_shared" in before or "make_shared" in before:
                raise UnknownForm(f"{source.at(position)}: an error is made without a function that is known")
        if maker not in MAKERS:
            return []
        call = self._call(source, position)
        if call is None:
            return []
        arguments, begin = call
        domain, code, message, fewest = MAKERS[maker]
        if len(arguments) < fewest:
            if maker == "fail":  # a function named `fail` with fewer arguments is another one
                return []
            raise UnknownForm(f"{source.at(position)}: {maker} with {len(arguments)} arguments")
        if self._is_passed_on(source, arguments[domain], arguments[code]):
            return []
        if len(arguments[domain]) != 1 or arguments[domain][0].text not in self.domains:
            raise UnknownForm(f"{source.at(position)}: the domain is none of the constants that are known")
        self.used.add((source.name, begin + source.tokens[begin:].index(arguments[domain][0])))
        name = self.domains[arguments[domain][0].text]
        return self._resolved(source, position, name, arguments[code], arguments[message], 0)

    @staticmethod
    def _is_passed_on(source, domain, code):
        """An error of a scenario, whose author chose domain and code, or a copy of another error."""
        texts = ["".join(token.text for token in argument) for argument in (domain, code)]
        if source.name in COPIERS:
            return texts[0].endswith(".domain()") and texts[1] == texts[0][:-len("domain()")] + "code()"
        return (source.name.startswith(("backends/faults/", "backends/simulated/")) and texts[0].endswith(".error->domain")
                and texts[1] == texts[0][:-len("domain")] + "code")

    @staticmethod
    def _call(source, position):
        """The arguments of a call of the name at the position and where they begin, or None if it is not a call."""
        tokens, opening = source.tokens, position + 1
        if tokens[opening].text == "<":
            while tokens[opening].text != ">":
                opening += 1
            opening += 1
        if tokens[opening].text != "(" or tokens[position - 1].text in (".", "->"):
            return None
        return split(tokens[opening + 1:closing(tokens, opening)]), opening + 1

    def _resolved(self, source, position, domain, code, message, depth):
        if depth > 4:
            raise UnknownForm(f"{source.at(position)}: the code goes through too many functions")
        function = source.function_at(position)
        if len(code) > 4 and [token.text for token in code[:4]] == ["static_cast", "<", "std::int64_t", ">"]:
            code = code[5:-1]
        code_parameter = function.position_of(code) if function else None
        message_parameter = function.position_of(message) if function else None
        if code_parameter is not None:
            kind = function.parameters[code_parameter][-2].text
            if kind in self.enumerations:
                return [Error(source.name, domain, value, symbol, None) for symbol, value in self._mentioned(kind)]
        if code_parameter is None and message_parameter is None:
            value, symbol = self._constant(source, position, code)
            return [Error(source.name, domain, value, symbol, format_of(message))]
        found = []
        for caller, place, arguments in self._calls_of(source, function):
            there = arguments[code_parameter] if code_parameter is not None else None
            text = arguments[message_parameter] if message_parameter is not None else message
            if there is None:  # the code is here, the message at the call
                value, symbol = self._constant(source, position, code)
                found.append(Error(source.name, domain, value, symbol, format_of(text)))
            else:
                found += self._resolved(caller, place, domain, there, text, depth + 1)
        if not found:
            raise UnknownForm(f"{source.at(position)}: nothing calls {function.name}, which makes an error")
        return found

    def _calls_of(self, source, function):
        named = [one for other in self.sources for one in other.functions if one.name == function.name]
        if len(named) > 1:
            raise UnknownForm(f"{source.name}: several functions are named {function.name}, and one makes an error")
        for other in self.sources:
            for position, token in enumerate(other.tokens):
                if token.text.split("::")[-1] != function.name or other.function_at(position) in (None, function):
                    continue
                call = self._call(other, position)
                if call is not None:
                    yield other, position, call[0]

    def _mentioned(self, enumeration):
        """The enumerators that the sources mention outside of their definition."""
        values = {}
        for source in self.sources:
            for name, value in source.constants.items():
                if name.split("::")[-2:-1] == [enumeration]:
                    values[name.split("::")[-1]] = value
        mentions = {token.text.split("::")[-1] for source in self.sources for token in source.tokens
                    if token.kind == "name" and token.text.split("::")[-2:-1] == [enumeration]}
        unknown = mentions - set(values)
        if unknown:
            raise UnknownForm(f"{enumeration} has no enumerator {sorted(unknown)[0]}")
        return [(name, value) for name, value in values.items() if name in mentions]

    def _constant(self, source, position, code):
        number = integer(code)
        if number is not None:
            return number, None
        if len(code) == 1 and code[0].kind == "name":
            name = code[0].text
            own = {value for key, value in source.constants.items() if ("::" + key).endswith("::" + name)}
            all_of_them = {value for other in self.sources for key, value in other.constants.items()
                           if ("::" + key).endswith("::" + name)}
            values = own or (all_of_them if "::" in name else set())
            if len(values) == 1:
                return values.pop(), name.split("::")[-1]
        text = " ".join(token.text for token in code)
        raise UnknownForm(f"{source.at(position)}: '{text}' is no code that can be followed")

    def _check_mentions(self, source):
        """A mention of a domain that is not its definition, a known call or a comparison."""
        definitions = {position for _, position in source.domains.values()}
        for position, token in enumerate(source.tokens):
            is_domain = token.kind == "text" and re.fullmatch(r'".+ErrorDomain"', token.text)
            if is_domain and position - 2 not in definitions:
                raise UnknownForm(f"{source.at(position)}: the domain {token.text} is written out")
            if token.kind != "name" or not token.text.endswith("ErrorDomain"):
                continue
            around = [source.tokens[near].text for near in (position - 1, position + 1) if near < len(source.tokens)]
            compared = "==" in around or "!=" in around
            if position not in definitions and (source.name, position) not in self.used and not compared:
                raise UnknownForm(f"{source.at(position)}: {token.text} is used in a way that is not known")


def is_shipped(path):
    return not (path.name.endswith(("_test.cpp", "_for_tests.h", "_conformance.h")) or "testing" in path.parts
                or path.name.startswith("test_"))


def read_sources(root, folders):
    sources = []
    for folder in folders:
        for path in sorted(pathlib.Path(root, folder).rglob("*")):
            name = path.relative_to(root).as_posix()
            if path.suffix in (".h", ".cpp") and is_shipped(path) and name not in MAKERS_FILES:
                sources.append(Source(name, path.read_text(encoding="utf-8")))
    return sources


def errors_of(root, folders):
    """The errors that the files of the folders can return."""
    collector = Collector(read_sources(root, folders))
    for name in MAKERS_FILES:
        path = pathlib.Path(root, name)
        if path.is_file():
            domains = Source(name, path.read_text(encoding="utf-8")).domains
            collector.domains.update({domain: value for domain, (value, _) in domains.items()})
    return collector.errors()


def registered(root, folders):
    """The names that the plug-ins of the folders register, by kind: "experiment", "analysis", "diagnostic"."""
    names = {"experiment": [], "analysis": [], "diagnostic": []}
    for source in read_sources(root, folders):
        if source.name in ("contract/lab.h", "contract/lab.cpp"):
            continue
        for position, token in enumerate(source.tokens):
            match = re.fullmatch(r"add(Experiment|Analysis|Diagnostic)WithName", token.text.split("::")[-1])
            if match is None:
                continue
            opening = position + 1
            name = source.tokens[opening + 1]
            if source.tokens[opening].text != "(" or name.kind != "text" or source.tokens[opening + 2].text != ",":
                raise UnknownForm(f"{source.at(position)}: the name that is registered is not one text")
            names[match.group(1).lower()].append(name.text[1:-1])
    return names
