#include "hosttools/files.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/hosttools/host_tree.h"
#include "tests/support/texts_are.h"

namespace {

using namespace hosttools;

TEST(Files, ReadsWholeFilesOfAnyLength) {
    HostTree tree;
    const std::string large(100001, 'x');
    tree.addBytes("large", large);
    tree.addBytes("empty", "");
    EXPECT_EQ(readFile(tree.root() + "/large"), large);
    EXPECT_EQ(readFile(tree.root() + "/empty"), "");
    EXPECT_EQ(readFile(tree.root() + "/missing"), std::nullopt);
    EXPECT_EQ(readFile(tree.root()), std::nullopt);  // a directory
}

TEST(Files, NumbersAtTheFrontOfAFile) {
    HostTree tree;
    tree.addBytes("number", "4294967296\n");
    tree.addBytes("word", "suspended\n");
    EXPECT_EQ(readNumber(tree.root() + "/number"), 4294967296u);
    EXPECT_EQ(readNumber(tree.root() + "/word", 7), 7u);
    EXPECT_EQ(readNumber(tree.root() + "/missing", 512), 512u);
}

TEST(Files, ParsesNumbersAndRefusesTheRest) {
    EXPECT_EQ(parseNumber("0x83", 16), 0x83u);
    EXPECT_EQ(parseNumber("c", 16), 12u);
    EXPECT_EQ(parseNumber("12 rest"), 12u);
    EXPECT_EQ(parseNumber("18446744073709551616"), std::nullopt);
    EXPECT_EQ(parseNumber(""), std::nullopt);
    EXPECT_EQ(parseNumber(" 1"), std::nullopt);
    EXPECT_EQ(parseNumber("-1"), std::nullopt);
}

TEST(Files, TakesLinesAndWords) {
    std::string_view text = "one  two\tthree\n\nlast";
    std::string_view line = takeLine(text);
    EXPECT_EQ(takeWord(line), "one");
    EXPECT_EQ(takeWord(line), "two");
    EXPECT_EQ(takeWord(line), "three");
    EXPECT_EQ(takeWord(line), "");
    EXPECT_EQ(takeLine(text), "");
    EXPECT_EQ(takeLine(text), "last");
    EXPECT_TRUE(text.empty());
    EXPECT_EQ(takeLine(text), "");
}

TEST(Files, ListsDirectories) {
    HostTree tree;
    tree.addBytes("d/b", "");
    tree.addBytes("d/.hidden", "");
    EXPECT_THAT(listDirectory(tree.root() + "/d"), testing::UnorderedElementsAre("b", ".hidden"));
    EXPECT_THAT(listDirectory(tree.root() + "/missing"), testing::IsEmpty());
    EXPECT_THAT(listDirectory(tree.root() + "/d/b"), testing::IsEmpty());
    EXPECT_EQ(readFile(tree.root() + "/d"), std::nullopt);
    EXPECT_EQ(readNumber(tree.root() + "/d", 7), 7U);
}

}  // namespace
