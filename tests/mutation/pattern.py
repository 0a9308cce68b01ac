"""Patterns over C++: a piece of code to look for, and the code that takes its place.

A pattern is compared token by token, so line breaks, indentation and comments do not matter. In it
  $name  stands for any one name, the same one wherever the pattern or its replacement says $name,
  ...    stands for any tokens whose brackets are closed; within a string literal, for any text.
The replacement's first ... is what the pattern's first one found, and so on.
"""

import re

from source import tokens_of

ANYTHING = "..."


class Match:
    def __init__(self, first, last, names, gaps):
        self.first, self.last, self.names, self.gaps = first, last, names, gaps


class Pattern:
    def __init__(self, before, after):
        self.before, self.after = before, after
        self.tokens = tokens_of(before)
        self.texts = [re.compile(".*?".join(map(re.escape, token.text.split(ANYTHING))), re.DOTALL)
                      if token.kind in ("string", "raw") and ANYTHING in token.text else None for token in self.tokens]

    def matches(self, source, first, last):
        """All matches in the tokens from first to before last."""
        found = []
        for at in range(first, last):
            if match := self._from(source, at, 0, last, {}, []):
                found.append(Match(at, *match))
        return found

    def _from(self, source, at, part, last, names, gaps):
        """Matches the pattern's tokens from part on at the source's from at on: the end, the names and the gaps."""
        while part < len(self.tokens):
            wanted = self.tokens[part]
            if wanted.text == ANYTHING:
                return self._gap(source, at, part, last, names, gaps)
            if at >= last:
                return None
            token = source.tokens[at]
            if wanted.text.startswith("$"):
                if token.kind != "name" or names.get(wanted.text, token.text) != token.text:
                    return None
                names = {**names, wanted.text: token.text}
            elif self.texts[part]:
                if not self.texts[part].fullmatch(token.text):
                    return None
                gaps = [*gaps, *gaps_in(token.text, wanted.text.split(ANYTHING))]
            elif wanted.text != token.text:
                return None
            at, part = at + 1, part + 1
        return at, names, gaps

    def _gap(self, source, at, part, last, names, gaps):
        start = at
        while at <= last:
            text = source.text[source.tokens[start].start:source.tokens[at - 1].end] if at > start else ""
            if match := self._from(source, at, part + 1, last, names, [*gaps, text]):
                return match
            if at == last or source.tokens[at].text in ")]}":
                return None
            at = source.closing.get(at, at) + 1
        return None

    def planted(self, source, match):
        """The source's text with the replacement in the place of the match."""
        gaps = iter(match.gaps)
        text = re.sub(r"\$[A-Za-z_]\w*|\.\.\.", lambda found: next(gaps) if found.group() == ANYTHING
                      else match.names.get(found.group(), found.group()), self.after)
        end = source.tokens[match.last - 1].end
        return source.text[:source.tokens[match.first].start] + text + source.text[end:]


def gaps_in(text, parts):
    """What stands in a string literal between the parts of its pattern."""
    gaps = re.fullmatch("(.*?)".join(map(re.escape, parts)), text, re.DOTALL)
    return list(gaps.groups())
