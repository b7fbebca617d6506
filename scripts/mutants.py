"""Puts small faults into C++ sources, one at a time, like those that programmers make by mistake.

A source is read as a sequence of tokens, without a grammar. This works for sources of this project, which are
formatted by clang-format. The compiler refuses a mutant that is not valid C++.

>>> text = 'bool F(int a) {\\n  if (a < 1) Log("zero", a);\\n  return true && G(a);\\n}\\n'
>>> for mutant in Source("f.cpp", text, {}).mutants():
...     print(mutant.line, mutant.change)
2 < -> <=
2 < -> >=
2 1 -> 0
2 1 -> 2
2 Log("zero", a); -> {}
2 "zero" -> "#ero"
2 "zero", a -> a, "zero"
3 return true && G(a); -> {}
3 true -> false
3 true && G(a) -> !(true && G(a))
3 true && G(a) -> ((true) || (G(a)))
3 true && G(a) -> (G(a))
3 true && G(a) -> (true)
"""
import re
from dataclasses import dataclass

TOKEN = re.compile(
    r"""(?P<space>\s+|\\\n|//[^\n]*|/\*.*?\*/)
      | (?P<directive>^[ \t]*\#(?:define[ ]\w+(?:\([^)]*\))?|(?!define)[^\n]*))
      | (?P<string>"(?:\\.|[^"\\])*")
      | (?P<char>'(?:\\.|[^'\\])')
      | (?P<number>\b\d+\b)
      | (?P<name>\w+)
      | (?P<sign>->\*?|\.\*|\+\+|--|::|&&|\|\||[=!<>+*/%|&^-]=|<<|\#\#|.)""",
    re.VERBOSE | re.DOTALL | re.MULTILINE,
)

OPENING, CLOSING = "([{", ")]}"
COMPARISONS = {  # the opposite comparison, and the one with the boundary moved
    "==": ["!="], "!=": ["=="], "<": [">=", "<="], "<=": [">", "<"], ">": ["<=", ">="], ">=": ["<", ">"],
}
REPLACED = COMPARISONS | {"+": ["-"], "-": ["+"], "true": ["false"], "false": ["true"]}
HEADS = {"if", "for", "while", "switch"}
NO_STATEMENT = HEADS | {"else", "case", "default", "public", "private", "protected", "using", "template", "do", "try"}
ENDS = {";", ",", "?", ":", "=", "return", "{", "}"}  # tokens that end an operand, besides its enclosing bracket


@dataclass(frozen=True)
class Mutant:
    path: str
    line: int
    place: str  # the position described without a line number, so that it stays valid when lines move
    old: str
    new: str
    text: str  # the whole changed file

    @property
    def change(self):
        return " ".join(f"{self.old} -> {self.new}".split())


@dataclass
class Token:
    kind: str
    text: str
    begin: int
    end: int
    match: int = -1  # the index of the other bracket of the pair
    inside: int = -1  # the index of the innermost open bracket
    in_code: bool = False  # within a function's body


def enumerators(texts):
    """Maps each enumerator that these sources declare to the next one of its enum."""
    following = {}
    for text in texts:
        text = re.sub(r"//[^\n]*", "", text)
        for body in re.findall(r"\benum\b[^{;]*\{([^}]*)\}", text):
            names = [name.split("=")[0].strip() for name in body.split(",") if name.strip()]
            for name, other in zip(names, names[1:] + names[:1]):
                following[name] = other if other != name else f"({name} + 1)"
    return following


def tokenise(text):
    tokens = []
    for found in TOKEN.finditer(text):
        if found.lastgroup not in ("space", "directive"):
            tokens.append(Token(found.lastgroup, found.group(), found.start(), found.end()))
    match_brackets(tokens)
    return tokens


def match_brackets(tokens):
    open_ones = []
    for i, token in enumerate(tokens):
        if token.text in CLOSING and open_ones:
            token.match = open_ones.pop()
            tokens[token.match].match = i
        if open_ones:
            token.inside = open_ones[-1]
            around = tokens[token.inside]
            token.in_code = around.in_code or (around.text == "{" and not is_scope(tokens, token.inside))
        if token.text in OPENING:
            open_ones.append(i)


def is_scope(tokens, brace):
    """Whether a brace opens a namespace, a type or an extern "C" block rather than code."""
    if brace == 0 or tokens[brace - 1].text in (")", "const"):
        return False
    words = set()
    for token in reversed(tokens[:brace]):
        if token.text in (";", "{", "}"):
            break
        words.add(token.text)
    return tokens[brace - 1].kind == "string" or bool(words & {"namespace", "struct", "class", "enum"})


class Source:
    def __init__(self, path, text, codes):
        self.path, self.text, self.codes = path, text, codes
        self.tokens = tokenise(text)

    def mutants(self):
        """All mutants in the order of their positions, without duplicates."""
        found = {}
        for i, token in enumerate(self.tokens):
            for begin, end, new in self.changes(i, token):
                found.setdefault(self.text[:begin] + new + self.text[end:], (begin, end, new))
        ordered = sorted(found.items(), key=lambda item: item[1])
        return [self.mutant(text, *change) for text, change in ordered]

    def mutant(self, text, begin, end, new):
        line = self.text.count("\n", 0, begin) + 1
        line_text = self.text.splitlines()[line - 1].rstrip("\\").strip()
        place = f"{self.path}, {self.function_at(begin)}: {line_text}"
        return Mutant(self.path, line, place, self.text[begin:end], new, text)

    def function_at(self, begin):
        for i, token in enumerate(self.tokens):
            is_body = token.text == "{" and not token.in_code and self.tokens[i - 1].text in (")", "const")
            if is_body and token.begin < begin < self.tokens[token.match].begin:
                closing = i - 1 if self.tokens[i - 1].text == ")" else i - 2
                return self.tokens[self.tokens[closing].match - 1].text
        return "outside of functions"

    def changes(self, i, token):
        """(begin, end, new text) of each change that begins at this token."""
        yield from self.replacements(token)
        if not token.in_code:
            return
        yield from self.dropped_statement(i)
        yield from self.negated_condition(i)
        if token.text in ("&&", "||"):
            yield from self.changed_connection(i)
        if token.text == "?":
            yield from self.swapped_branches(i)
        if token.text == "(" and (self.tokens[i - 1].kind == "name" or self.tokens[i - 1].text == ">"):
            yield from self.swapped_arguments(i)

    def replacements(self, token):
        text = token.text
        if token.kind == "string":
            yield token.begin, token.end, changed_string(text)
        elif token.kind == "char":
            yield token.begin, token.end, "'#'"
        elif token.kind == "number":
            yield token.begin, token.end, str(int(text) + 1)
            if int(text) > 0:
                yield token.begin, token.end, str(int(text) - 1)
        elif text in self.codes:
            yield token.begin, token.end, self.codes[text]
        elif text in REPLACED and (token.kind == "name" or self.is_spaced(token)):
            for new in REPLACED[text]:
                yield token.begin, token.end, new
        elif text == "!":
            yield token.begin, token.end, ""

    def is_spaced(self, token):
        """Whether the token is a binary operator, not a template bracket or a sign."""
        return self.text[token.begin - 1].isspace() and self.text[token.end].isspace()

    def dropped_statement(self, i):
        end = self.statement_end(i)
        if end is not None:
            yield self.tokens[i].begin, self.tokens[end].end, "{}"

    def statement_end(self, i):
        """The index of the semicolon that ends the statement beginning here; None if no statement begins here."""
        if self.tokens[i].text in NO_STATEMENT or not self.begins_statement(i):
            return None
        for k in range(i, len(self.tokens)):
            token = self.tokens[k]
            if token.inside != self.tokens[i].inside:
                continue
            if token.text == ";":
                return k
            if token.text == "}" and self.tokens[k + 1].text not in ";,)":
                return None
        return None

    def begins_statement(self, i):
        before = self.tokens[i - 1]
        if self.tokens[i].text in ";)}" or self.tokens[self.tokens[i].inside].text != "{":
            return False
        if before.text in (";", "{", "}", "else"):
            return True
        if before.text == ":":
            return any(self.tokens[k].text == "case" for k in range(i - 5, i))
        return before.text == ")" and self.tokens[before.match - 1].text in HEADS

    def negated_condition(self, i):
        """Negates a condition of if and while, or a returned value. Other mutations change a lone comparison or `!`."""
        token = self.tokens[i]
        if token.text in ("if", "while"):
            first, last = i + 2, self.tokens[i + 1].match - 1
        elif token.text == "return" and self.tokens[i + 1].text != ";":
            first, last = i + 1, self.end_of_operand(i + 1, {";"})
        else:
            return
        part = [t.text for t in self.tokens[first : last + 1]]
        is_single = not {"&&", "||", "?"} & set(part)
        if is_single and (part[0] == "!" or COMPARISONS.keys() & set(part)):
            return
        if "{" in part or (token.text == "return" and "(" not in part):
            return
        begin, end = self.tokens[first].begin, self.tokens[last].end
        yield begin, end, f"!({self.text[begin:end]})"

    def changed_connection(self, i):
        """Replaces `a && b` by `a || b`, by `a` and by `b`, and `a || b` by `a && b`, by `a` and by `b`."""
        sign = self.tokens[i].text
        weaker = {"||"} if sign == "&&" else set()
        left = self.begin_of_operand(i - 1, ENDS | weaker)
        right = self.end_of_operand(i + 1, ENDS | {sign, "||"})
        begin, end = self.tokens[left].begin, self.tokens[right].end
        a = self.text[begin : self.tokens[i - 1].end]
        b = self.text[self.tokens[i + 1].begin : end]
        other = "||" if sign == "&&" else "&&"
        yield begin, end, f"(({a}) {other} ({b}))"
        yield begin, end, f"({a})"
        yield begin, end, f"({b})"

    def swapped_branches(self, i):
        colon = next(k for k in self.within(self.tokens[i].inside, i) if self.tokens[k].text == ":")
        last = self.end_of_operand(colon + 1, ENDS)
        begin, end = self.tokens[i + 1].begin, self.tokens[last].end
        a = self.text[begin : self.tokens[colon - 1].end]
        b = self.text[self.tokens[colon + 1].begin : end]
        yield begin, end, f"{b} : {a}"

    def swapped_arguments(self, i):
        """Exchanges each argument of a call with the next one."""
        commas = [k for k in self.within(i, i) if self.tokens[k].text == ","]
        bounds = [i, *commas, self.tokens[i].match]
        for before, comma, after in zip(bounds, bounds[1:], bounds[2:]):
            begin, end = self.tokens[before + 1].begin, self.tokens[after - 1].end
            a = self.text[begin : self.tokens[comma - 1].end]
            b = self.text[self.tokens[comma + 1].begin : end]
            if a != b:
                yield begin, end, f"{b}, {a}"

    def within(self, bracket, start):
        """The indexes from `start` to the closing bracket, without the content of inner brackets."""
        return (k for k in range(start, self.tokens[bracket].match) if self.tokens[k].inside == bracket)

    def begin_of_operand(self, i, ends):
        inside = self.tokens[i].match if self.tokens[i].text in CLOSING else i
        bracket = self.tokens[inside].inside
        while i - 1 > bracket and not (self.tokens[i - 1].inside == bracket and self.tokens[i - 1].text in ends):
            i -= 1
        return i

    def end_of_operand(self, i, ends):
        bracket = self.tokens[i].inside
        limit = self.tokens[bracket].match if bracket >= 0 else len(self.tokens)
        while i + 1 < limit and not (self.tokens[i + 1].inside == bracket and self.tokens[i + 1].text in ends):
            i += 1
        return i


def changed_string(text):
    """Replaces the first character of a string literal. A conversion of printf(3) at the beginning is preserved."""
    if text == '""' or text.startswith('"%'):
        return '"#' + text[1:]
    return '"#' + text[3 if text[1] == "\\" else 2 :]
