#!/usr/bin/env python3
"""Tests of the patterns that planted defects are given by."""

import sys
import tempfile
import unittest
from pathlib import Path

sys.dont_write_bytecode = True
from defects import Defect, ListError, Tree  # noqa: E402
from pattern import Pattern  # noqa: E402
from source import Source  # noqa: E402

CODE = r"""
namespace component {
constexpr int kMost = 10'000;  // not kMost = 1
const Row kRows[] = {{"a", 1}, {"b", 2}};
struct Point { int x = 0; bool operator<(const Point& other) const { return x < other.x; } };
template <typename T, int N = (1 < 2)>
std::function<int(T)> made(T from) { return from; }
Holder::Holder(int size) : size_(size), name_{"none"}, list_{1, 2} { ++count; }
Holder::~Holder() { --count; }
Holder::operator bool() const { return size_ > 0; }
int sum(int left, int right) {
    // left + right, they say
    const auto add = [](int a, int b) { return a + b; };
    if (left < kMost && run("rm %s 2> /dev/null", left)) {
        return add(left,
                   right);
    }
    return 0;
}
int sum(int one) { return one; }
}  // namespace component
"""


class Places(unittest.TestCase):
    def test_everything_that_is_defined_has_its_name(self):
        source = Source("component/code.cpp", CODE)
        self.assertEqual([place.name for place in source.places],
                         ["kMost", "kRows", "Point", "Point::x", "Point::operator<", "made", "Holder::Holder",
                          "Holder::~Holder", "Holder::operatorbool", "sum", "sum"])

    def test_a_definition_ends_with_its_body(self):
        source = Source("component/code.cpp", CODE)
        self.assertEqual([source.line(place.last - 1) - source.line(place.first) for place in source.places if place.name == "sum"],
                         [8, 0])


class Patterns(unittest.TestCase):
    def planted(self, before, after, text=CODE):
        source = Source("component/code.cpp", text)
        pattern = Pattern(before, after)
        found = pattern.matches(source, 0, len(source.tokens))
        self.assertEqual(len(found), 1, before)
        return pattern.planted(source, found[0])

    def test_layout_and_comments_do_not_matter(self):
        self.assertIn("return add(right, left);", self.planted("add($a, $b);", "add($b, $a);"))
        self.assertIn("return x;", self.planted("return /* the sum of */ f(1,\n 2);", "return x;", "return f( 1,2 ) ; // f(1, 2)"))

    def test_a_name_is_the_same_wherever_it_stands(self):
        self.assertEqual(self.planted("$x == $x", "true", "a == b; c == c"), "a == b; true")

    def test_dots_are_anything_with_closed_brackets(self):
        self.assertEqual(self.planted("f(..., 1)", "g(...)", "f(a(b, c), {1, 2}, 1); f(2)"), "g(a(b, c), {1, 2}); f(2)")

    def test_dots_in_a_literal_are_any_text(self):
        self.assertIn('run("rm %s", left)', self.planted('"... 2> /dev/null"', '"..."'))

    def test_a_part_of_a_token_is_not_found(self):
        source = Source("code.cpp", CODE)
        self.assertEqual(Pattern("most", "").matches(source, 0, len(source.tokens)), [])


class Lists(unittest.TestCase):
    def found(self, place, *before):
        with tempfile.TemporaryDirectory() as folder:
            for component, code in (("component", CODE), ("other", "int only() { ++count; return one; }"), ("tests", "int gone() { --count; }")):
                (Path(folder) / component).mkdir()
                (Path(folder) / component / "code.cpp").write_text(code)
            defect = Defect("component", "component.txt:1", f"{place}: kind")
            defect.before = list(before)
            return defect.found(Tree(Path(folder)))

    def test_all_definitions_of_a_name_are_looked_at(self):
        self.assertEqual(self.found("component/sum", "return one;")[0].file, "component/code.cpp")

    def test_what_has_moved_or_has_another_name_is_found(self):
        self.assertEqual(self.found("component/only", "return one;")[0].file, "other/code.cpp")
        self.assertEqual(self.found("component/gone", "--count;")[0].file, "component/code.cpp")

    def test_what_does_not_stand_once_is_told_with_where_it_stands(self):
        for place, before, words in (("component/sum", "return", "stands 4 times: component/code.cpp:13 in sum"),
                                     ("component/gone", "return", "nothing is called gone.*\n.*component/code.cpp:7 in made"),
                                     ("component/only", "--count;", "does not have.*\n.*component/code.cpp:9 in Holder::~Holder"),
                                     ("component/sum", "--count;", "does not have.*\n.*component/code.cpp:9"),
                                     ("component/sum", "no such;", "nowhere"),
                                     ("component", "++count; --count", "nowhere"),
                                     ("component/sum", "// a comment", "nothing to look for")):
            with self.assertRaisesRegex(ListError, words, msg=place):
                self.found(place, before)


if __name__ == "__main__":
    unittest.main()
