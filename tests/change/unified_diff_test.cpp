// Differences of texts.
#include "agent/change/unified_diff.h"

#include <gmock/gmock.h>

#include <random>
#include <sstream>

namespace {

using cvagent::change::unifiedDiff;

TEST(UnifiedDiff, OfEqualTextsIsEmpty) {
    EXPECT_EQ(unifiedDiff("", ""), "");
    EXPECT_EQ(unifiedDiff("a\nb", "a\nb"), "");
}

TEST(UnifiedDiff, TellsWhatComesAndGoes) {
    EXPECT_EQ(unifiedDiff("1\n2\n3\n4\n5\n", "1\n2\n3\nvier\n5\n"),
              "@@ -1,5 +1,5 @@\n 1\n 2\n 3\n-4\n+vier\n 5\n");
    EXPECT_EQ(unifiedDiff("", "a\n"), "@@ -0,0 +1 @@\n+a\n");
    EXPECT_EQ(unifiedDiff("a\n", ""), "@@ -1 +0,0 @@\n-a\n");
    EXPECT_EQ(unifiedDiff("a", "a\n"), "@@ -1 +1 @@\n-a\n\\ No newline at end of file\n+a\n");
}

TEST(UnifiedDiff, CannotSteerTheTerminal) {
    EXPECT_EQ(unifiedDiff("", "\x1b[2J\u202e\xff\t\r\n"),
              "@@ -0,0 +1 @@\n+\\x1b[2J\\xe2\\x80\\xae\\xff\t\\x0d\n");
    EXPECT_EQ(unifiedDiff("", "default\t192.0.2.1\t-\n\t\n"),
              "@@ -0,0 +1,2 @@\n+default\t192.0.2.1\t-\n+\t\n")
        << "a tab steers nothing";
}

TEST(UnifiedDiff, OfHugeTextsIsToldAsAWhole) {
    std::string before;
    std::string after;
    for (int i = 0; i < 3000; ++i) {
        before += "a" + std::to_string(i) + "\n";
        after += "b" + std::to_string(i) + "\n";
    }
    EXPECT_THAT(unifiedDiff(before, after), testing::StartsWith("@@ -1,3000 +1,3000 @@\n-a0\n"));
}

/// What becomes of a text by a diff of it: the way of patch.
std::string patched(const std::string& before, const std::string& diff) {
    std::istringstream old(before);
    std::istringstream lines(diff);
    std::string result;
    std::size_t at = 0;
    for (std::string line; std::getline(lines, line);) {
        std::string oldLine;
        if (line.starts_with("@@ -")) {
            const bool isEmpty = line.find(",0 +") != std::string::npos;
            const std::size_t first = std::stoul(line.substr(4)) - (isEmpty ? 0 : 1);
            for (; at < first && std::getline(old, oldLine); ++at) {
                result += oldLine + "\n";
            }
        } else if (line.front() == '+') {
            result += line.substr(1) + "\n";
        } else {
            std::getline(old, oldLine);
            ++at;
            EXPECT_EQ(line.substr(1), oldLine);
            result += line.front() == ' ' ? oldLine + "\n" : "";
        }
    }
    for (std::string oldLine; std::getline(old, oldLine);) {
        result += oldLine + "\n";
    }
    return result;
}

TEST(UnifiedDiff, MakesTheOneTextOfTheOther) {
    std::mt19937 chance(7);
    const auto text = [&chance] {
        std::string lines;
        for (unsigned i = chance() % 40; i > 0; --i) {
            lines += std::string(1, static_cast<char>('a' + chance() % 4)) + "\n";
        }
        return lines;
    };
    for (int i = 0; i < 500; ++i) {
        const std::string before = text();
        const std::string after = text();
        EXPECT_EQ(patched(before, unifiedDiff(before, after)), after) << before << "becomes\n" << after;
    }
}

}  // namespace
