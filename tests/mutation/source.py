"""Reads C++ as far as planting a defect needs it: its tokens, and where the things that have a name are defined."""

import bisect
import re
from typing import NamedTuple

TOKEN = re.compile(r"""
    (?P<blank>\s+|//(?:\\\n|[^\n])*|/\*.*?\*/|^[ \t]*\#(?:\\\n|[^\n])*)
  | (?P<raw>(?:u8|[uUL])?R"(?P<delimiter>[^\s()\\]*)\(.*?\)(?P=delimiter)")
  | (?P<string>(?:u8|[uUL])?"(?:\\.|[^"\\\n])*"(?:_?[A-Za-z]\w*)?)
  | (?P<character>(?:u8|[uUL])?'(?:\\.|[^'\\\n])+')
  | (?P<name>\$?[A-Za-z_]\w*)
  | (?P<number>\.?\d(?:[eEpP][-+]|'?[\w.])*)
  | (?P<other>\.\.\.|<=>|->\*|<<=|::|->|\+\+|--|<<|<=|>=|==|!=|&&|\|\||[-+*/%&|^]=|.)
""", re.VERBOSE | re.DOTALL | re.MULTILINE)
PAIRS = {"(": ")", "[": "]", "{": "}"}


class Token(NamedTuple):
    kind: str
    text: str
    start: int
    end: int


class Place(NamedTuple):
    """A definition: its full name, and its tokens from the first to the one after the last."""
    name: str
    first: int
    last: int


def tokens_of(text):
    return [Token(match.lastgroup if match.lastgroup != "delimiter" else "raw", match.group(), *match.span())
            for match in TOKEN.finditer(text) if match.lastgroup != "blank"]


class Source:
    def __init__(self, file, text):
        self.file, self.text = file, text
        self.tokens = tokens_of(text)
        self.closing = self._closing()
        self._lines = [match.end() for match in re.finditer("\n", text)]
        self._places = None

    def texts(self):
        return [token.text for token in self.tokens]

    def ranges(self, name):
        """From where to where the definitions of that name go: all of them when it is overloaded, all there is when it is empty."""
        if not name:
            return [(0, len(self.tokens))]
        return [(place.first, place.last) for place in self.places if f"::{place.name}".endswith(f"::{name}")]

    def line(self, token):
        return bisect.bisect_right(self._lines, self.tokens[token].start) + 1

    @property
    def places(self):
        if self._places is None:
            self._places = []
            self._read_scope(0, len(self.tokens), [])
        return self._places

    def place_of(self, token):
        """The name of the innermost definition that a token is in."""
        around = [place for place in self.places if place.first <= token < place.last]
        return min(around, key=lambda place: place.last - place.first).name if around else ""

    def _closing(self):
        """Opening bracket: its closing one."""
        closing, opened = {}, []
        for index, token in enumerate(self.tokens):
            if token.text in PAIRS:
                opened.append(index)
            elif token.text in PAIRS.values() and opened:
                closing[opened.pop()] = index
        return closing

    def _read_scope(self, at, end, scope):
        while at < end:
            at = self._read_declaration(at, end, scope)

    def _read_declaration(self, at, end, scope):
        """Reads one declaration of a namespace or a class; gives what follows it."""
        first, named = at, ""
        heads = set()  # the words so far, outside of brackets
        while at < end:
            text = self.tokens[at].text
            if text == ";":
                self._note(scope, named, first, at + 1)
                return at + 1
            if text == ":" and self.tokens[at - 1].text in ("public", "private", "protected"):
                return at + 1
            if text == "{" and not named and "=" not in heads:
                return self._read_braces(first, at, heads, scope)
            if text == "{" and "(" in heads:  # a function's body; a variable goes on to its semicolon
                at = self._behind(at)
                self._note(scope, named, first, at)
                return at
            at, named = self._step(at, end, named, heads)
        return end

    def _step(self, at, end, named, heads):
        """One step on within a declaration, and its name once that is known."""
        text = self.tokens[at].text
        if text == "template":
            return self._behind_angles(at + 1), named
        if text == "operator":
            heads.add("(")
            return self._read_operator(at, end)
        if not named and "=" not in heads:
            if text == "(":
                heads.add("(")
                named = self._name_before(at)
                return self._behind_initialisers(self._behind(at), end) if named else self._behind(at), named
            if self.tokens[at - 1].kind == "name":
                if text == "<":
                    return self._behind_angles(at), named
                if text in ("=", "["):
                    named = self._name_before(at)
        heads.add(text)
        return self._behind(at), named

    def _read_operator(self, at, end):
        named = self._qualified(at, "operator" + self.tokens[at + 1].text)
        at += 2  # of operator() its own brackets are no parameters
        while at < end and self.tokens[at].text != "(":
            at += 1
        return self._behind_initialisers(self._behind(at), end), named

    def _behind(self, at):
        """What follows a token, or the whole bracket that it opens."""
        return self.closing.get(at, at) + 1

    def _read_braces(self, first, brace, heads, scope):
        """What is in braces without a name and a parameter list before them: a scope or the values of a variable."""
        end = self.closing.get(brace, len(self.tokens) - 1)
        named = self._name_before(brace)
        if heads & {"namespace", "extern"}:
            self._read_scope(brace + 1, end, scope)
            return end + 1
        if heads & {"class", "struct", "union"}:
            words = [token.text for token in self.tokens[first:brace]]
            words = words[next(i for i, word in enumerate(words) if word in ("class", "struct", "union")) + 1:]
            bases = words.index(":") if ":" in words else len(words)
            named = ([word for word in words[:bases] if re.match(r"\w", word) and word != "final"] or [""])[-1]
            self._note(scope, named, first, end + 1)
            self._read_scope(brace + 1, end, [*scope, named] if named else scope)
            return end + 1
        self._note(scope, named, first, end + 1)
        return end + 1

    def _behind_angles(self, at):
        depth = 0
        while at < len(self.tokens):
            text = self.tokens[at].text
            depth += (text == "<") + 2 * (text == "<<") - (text == ">")
            at = self._behind(at)
            if depth <= 0:
                return at
        return at

    def _behind_initialisers(self, at, end):
        """From behind the parameters to the body: past what initialises the members."""
        colon = False
        while at < end and self.tokens[at].text != ";":
            text = self.tokens[at].text
            if text == "{" and not (colon and (self.tokens[at - 1].kind == "name" or self.tokens[at - 1].text == ">")):
                return at
            if text == "=":
                return at
            colon = colon or text == ":"
            at = self._behind(at)
        return at

    def _name_before(self, at):
        if at == 0 or self.tokens[at - 1].kind != "name" or self.tokens[at - 1].text in ("decltype", "alignas", "noexcept", "__attribute__"):
            return ""
        at -= 1
        name = self.tokens[at].text
        if self.tokens[at - 1].text == "~":
            at, name = at - 1, "~" + name
        return self._qualified(at, name)

    def _qualified(self, at, name):
        while at >= 2 and self.tokens[at - 1].text == "::" and self.tokens[at - 2].kind == "name":
            at, name = at - 2, f"{self.tokens[at - 2].text}::{name}"
        return name

    def _note(self, scope, name, first, last):
        if name:
            self._places.append(Place("::".join([*scope, name]), first, last))
