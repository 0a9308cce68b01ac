"""The lists of defects, and where in the tree each of them goes."""

import re
from pathlib import Path

from pattern import Pattern
from source import Source

TREE = Path(__file__).resolve().parents[2]
LISTS = TREE / "tests/mutation/defects"


class ListError(Exception):
    """A list of defects that does not fit the tree."""


class Tree:
    """The sources, each read when it is first asked for."""

    def __init__(self, folder=TREE):
        self.folder, self._read = folder, {}

    def source(self, file):
        if file not in self._read:
            self._read[file] = Source(str(file.relative_to(self.folder)), file.read_text())
        return self._read[file]

    def below(self, path):
        """The sources of a file or folder."""
        files = [path] if path.is_file() else sorted(file for file in path.rglob("*") if file.suffix in (".cpp", ".h"))
        return [self.source(file) for file in files]

    def components(self):
        """The sources of all folders with sources, but for the tests' and what is built."""
        folders = [path for path in sorted(self.folder.iterdir()) if path.is_dir() and path.name[0] != "."]
        return [source for path in folders if path.name not in ("bench", "build", "tests") for source in self.below(path)]

    def split(self, place):
        """A place's folder or file, and the name that is looked for there."""
        path, name = self.folder, place
        while name and (path / name.partition("/")[0]).exists():
            first, _, name = name.partition("/")
            path = path / first
        return path, name


def matches_in(sources, name, pattern):
    """The matches in the definitions of that name by where they begin; and whether there are any such definitions."""
    matches, is_there = {}, not name
    for source in sources:
        for first, last in source.ranges(name):
            is_there = True
            for match in pattern.matches(source, first, last):
                matches[source, match.first] = match
    return matches, is_there


class Defect:
    def __init__(self, component, where, header):
        match = re.fullmatch(r"(\S+|\S+/operator \S+): (.+)", header)
        if not match:
            raise ListError(f"{where}: not PLACE: KIND: {header}")
        self.component, self.where = component, where
        self.place, self.kind = match.groups()
        self.before, self.after = [], []

    def take(self, line):
        if not re.match(r"[-+] ", line):
            raise ListError(f"{self.where}: neither '- ' nor '+ ': {line}")
        (self.before if line[0] == "-" else self.after).append(line[2:])

    @property
    def pattern(self):
        return Pattern("\n".join(self.before), "\n".join(self.after))

    @property
    def key(self):
        """What makes it the same defect in the next run."""
        return "\n".join([self.place, self.kind, *self.before, "", *self.after])

    def found(self, tree):
        """The one source and the one match in it; ListError says what is there instead."""
        pattern = self.pattern
        if not pattern.tokens:
            raise ListError(f"{self.where} {self.place}: nothing to look for")
        path, name = tree.split(self.place)
        sources = tree.below(path) if path != tree.folder else []
        matches, is_there = matches_in(sources, name, pattern)
        if not is_there:  # it has moved to another component, or is called otherwise
            matches, is_there = matches_in(tree.components(), name, pattern)
            if not is_there:
                matches, _ = matches_in(sources, "", pattern)
        if len(matches) == 1:
            (source, _), match = next(iter(matches.items()))
            return source, match
        raise ListError(f"{self.where} {self.place}: {self._problem(matches, is_there, name, sources)}")

    def _problem(self, matches, is_there, name, sources):
        def stands(found):
            return ", ".join(f"{source.file}:{source.line(first)} in {source.place_of(first) or 'no definition'}"
                             for source, first in list(found)[:5]) or "nowhere there"

        shown = self.shown()
        if matches and is_there:
            return f"{shown}\n    stands {len(matches)} times: {stands(matches)}"
        elsewhere = [(source, match.first) for source in sources
                     for match in self.pattern.matches(source, 0, len(source.tokens))]
        missing = f"does not have: {shown}" if is_there else f"nothing is called {name}; looked for: {shown}"
        return f"{missing}\n    which stands {stands(elsewhere)}"

    def shown(self):
        return " ".join(line.strip() for line in self.before)

    def planted(self, tree):
        """The file it is in, and the file's text with the defect."""
        source, match = self.found(tree)
        return source.file, self.pattern.planted(source, match)

    def __str__(self):
        return f"{self.where} {self.place}: {self.kind}: {self.shown()[:70]}"


def read_list(path):
    defects, current = [], None
    for number, line in enumerate(path.read_text().splitlines(), 1):
        if line.startswith("#"):
            continue
        if not line:
            current = None
        elif current is None:
            current = Defect(path.stem, f"{path.name}:{number}", line)
            defects.append(current)
        else:
            current.take(line)
    return defects


def check(defects, tree):
    """Raises ListError with all that does not fit: a pattern without its one place, or a defect that changes nothing."""
    problems = []
    for defect in defects:
        try:
            source, match = defect.found(tree)
            if Source("", defect.pattern.planted(source, match)).texts() == source.texts():
                raise ListError(f"{defect.where} {defect.place}: changes nothing")
        except ListError as problem:
            problems.append(str(problem))
    if problems:
        raise ListError("\n".join(problems))
