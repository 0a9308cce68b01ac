#include "framework/qx/property_file.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <clocale>
#include <random>

#include "framework/qx/strings.h"
#include "tests/framework/property_file_fixture.h"
#include "tests/support/texts_are.h"

namespace {

namespace fs = std::filesystem;
using QX::PropertyFile;
using QX::PropertyFileError;
using testing::ElementsAre;
using testing::HasSubstr;

class PropertyFileTest : public PropertyFileFixture {};

TEST_F(PropertyFileTest, WritesOneKeyALineInOrder) {
    write({{L"Computer.OwnerName", L"Ada"}, {L"Computer.OwnerContact", L"room 12"}});
    EXPECT_EQ(content(), "Computer.OwnerContact=room 12\nComputer.OwnerName=Ada\n");
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

TEST_F(PropertyFileTest, KeepsTheKeysItDoesNotChange) {
    put("b=2\na=1\n");
    write({{L"c", L"3"}});
    EXPECT_EQ(content(), "a=1\nb=2\nc=3\n");
}

TEST_F(PropertyFileTest, AnswersKeysAndValues) {
    put("b=2\na=1\nempty=\n");
    PropertyFile file(path_.string());
    file.open(1);
    EXPECT_THAT(file.enumerateKeys(), ElementsAre(L"a", L"b", L"empty"));
    EXPECT_EQ(file.getValue(L"a"), L"1");
    EXPECT_EQ(file.getValue(L"empty"), L"");
    EXPECT_EQ(file.getValue(L"missing"), L"");
    file.close();
    EXPECT_THAT(file.enumerateKeys(), ElementsAre());
}

TEST_F(PropertyFileTest, CreateKeyKeepsAValueThatIsThere) {
    put("a=1\n");
    PropertyFile file(path_.string());
    file.open(3);
    file.createKey(L"a");
    file.createKey(L"new");
    file.close();
    EXPECT_EQ(content(), "a=1\nnew=\n");
}

TEST_F(PropertyFileTest, EscapesWhatWouldBreakTheLine) {
    const std::map<std::wstring, std::wstring> values{
        {L"a=b", L"c=d"}, {L"line\nbreak", L"one\ntwo\n"}, {L"back\\slash", L"\\n is no \\ break"},
        {L"", L"no key"}, {L" blanks ", L"  around  "},    {L"cr\r", L"\r\n"},
    };
    write(values);
    EXPECT_EQ(readAll(), values);
    EXPECT_THAT(content(), HasSubstr("a\\=b=c=d\n"));
    EXPECT_THAT(content(), HasSubstr("line\\nbreak=one\\ntwo\\n\n"));
    EXPECT_THAT(content(), HasSubstr("back\\\\slash=\\\\n is no \\\\ break\n"));
}

TEST_F(PropertyFileTest, HoldsEveryCharacterAndEveryByte) {
    std::map<std::wstring, std::wstring> values{{L"名前", L"Ærøskøbing — 😀"},
                                                {std::wstring(L"nul\0l", 5), std::wstring(L"\0", 1)}};
    for (int byte = 0; byte < 256; ++byte) {
        const std::string text(1, static_cast<char>(byte));
        values[QX::make_wstring("byte " + text)] = QX::make_wstring(text + text);
    }
    write(values);
    EXPECT_EQ(readAll(), values);
    EXPECT_THAT(content(), HasSubstr("byte \\xff=\\xff\\xff\n"));
    EXPECT_THAT(content(), HasSubstr("名前=Ærøskøbing — 😀\n"));
}

TEST_F(PropertyFileTest, ADamagedLineCostsThatLineOnly) {
    put("first=1\n"
        "no separator\n"
        "\n"
        "broken=escape\\\n"
        "unknown=\\q\n"
        "short=\\x4\n"
        "nohex=\\xg0\n"
        "signed=\\x-1\n"
        "latin=\xE9t\xE9\n"
        "cut=\xC3\n"
        "escaped\\=only\n"
        "\\=key=value\n"
        "twice=old\n"
        "twice=new\n"
        "last=no line break");
    const std::map<std::wstring, std::wstring> expected{
        {L"first", L"1"}, {L"=key", L"value"}, {L"twice", L"new"}, {L"last", L"no line break"}};
    EXPECT_EQ(readAll(), expected);
}

TEST_F(PropertyFileTest, GarbageIsNoKeys) {
    std::string garbage;
    std::mt19937 random(20261120);
    for (int count = 0; count < 5000; ++count) {
        garbage += static_cast<char>(random() % 256);
    }
    put(garbage + "\nsane=yes\n");
    EXPECT_EQ(readAll().at(L"sane"), L"yes");
}

TEST_F(PropertyFileTest, HoldsTenThousandKeys) {
    std::map<std::wstring, std::wstring> values;
    for (int count = 0; count < 10'000; ++count) {
        values[L"key " + std::to_wstring(count)] = std::wstring(20, L'é') + std::to_wstring(count);
    }
    write(values);
    EXPECT_EQ(readAll(), values);
}

TEST_F(PropertyFileTest, ReadModeNeedsTheFile) {
    PropertyFile file(path_.string());
    EXPECT_EQ(textOfFailure([&] { file.open(1); }), path_.string() + ": no such file");
    EXPECT_THAT(names(), ElementsAre());
}

TEST_F(PropertyFileTest, WriteModeCreatesTheFile) {
    PropertyFile file(path_.string());
    file.open(3);
    EXPECT_THAT(names(), ElementsAre());
    file.close();
    EXPECT_THAT(names(), TextsAre("asset.dat"));
    EXPECT_EQ(content(), "");
}

TEST_F(PropertyFileTest, OtherModesAreRefused) {
    put("a=1\n");
    PropertyFile file(path_.string());
    for (const unsigned long mode : {0UL, 2UL, 4UL, ~0UL}) {
        EXPECT_THAT(textOfFailure([&] { file.open(mode); }),
                    HasSubstr("no such mode: " + std::to_string(mode)));
    }
}

TEST_F(PropertyFileTest, OnlyWriteModeAcceptsChanges) {
    put("a=1\n");
    PropertyFile file(path_.string());
    EXPECT_THROW(file.setValue(L"a", L"2"), PropertyFileError);
    file.open(1);
    EXPECT_THROW(file.setValue(L"a", L"2"), PropertyFileError);
    EXPECT_THROW(file.createKey(L"b"), PropertyFileError);
    file.close();
    EXPECT_EQ(content(), "a=1\n");
}

TEST_F(PropertyFileTest, WhatWasNotClosedIsDropped) {
    put("a=1\n");
    {
        PropertyFile file(path_.string());
        file.open(3);
        file.setValue(L"a", L"2");
    }
    EXPECT_EQ(content(), "a=1\n");
    PropertyFile file(path_.string());
    file.open(3);
    file.setValue(L"a", L"2");
    file.open(3);
    EXPECT_EQ(file.getValue(L"a"), L"1");
    file.close();
    EXPECT_EQ(content(), "a=1\n");
}

TEST_F(PropertyFileTest, WithoutAChangeTheFileIsNotTouched) {
    put("b=2\nwritten by hand\na=1\n");
    PropertyFile file(path_.string());
    file.open(3);
    file.setValue(L"a", L"1");
    file.createKey(L"b");
    file.close();
    EXPECT_EQ(content(), "b=2\nwritten by hand\na=1\n");
}

TEST_F(PropertyFileTest, CloseIsHarmlessWhenNothingIsOpen) {
    PropertyFile file(path_.string());
    file.close();
    EXPECT_THAT(names(), ElementsAre());
}

TEST_F(PropertyFileTest, WhatIsNoFileIsNotRead) {
    fs::create_directory(path_);
    PropertyFile directory(path_.string());
    EXPECT_THAT(textOfFailure([&] { directory.open(3); }), HasSubstr(path_.string()));
    fs::remove(path_);
    ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
    PropertyFile pipe(path_.string());
    EXPECT_THAT(textOfFailure([&] { pipe.open(1); }), HasSubstr("not a regular file"));
}

TEST_F(PropertyFileTest, AMissingDirectoryFailsAtClose) {
    PropertyFile file((directory_ / "gone" / "asset.dat").string());
    file.open(3);
    file.setValue(L"a", L"1");
    EXPECT_THAT(textOfFailure([&] { file.close(); }), HasSubstr("No such file or directory"));
    fs::create_directory(directory_ / "gone");
    file.close();  // still open: the second try goes through
    EXPECT_TRUE(fs::exists(directory_ / "gone" / "asset.dat"));
}

TEST_F(PropertyFileTest, ANameWithoutADirectoryIsInTheCurrentOne) {
    const fs::path before = fs::current_path();
    fs::current_path(directory_);
    PropertyFile file("asset.dat");
    file.open(3);
    file.close();
    fs::current_path(before);
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

TEST_F(PropertyFileTest, KeepsTheModeOfTheFile) {
    put("a=1\n");
    fs::permissions(path_, fs::perms::owner_read | fs::perms::owner_write);
    write({{L"a", L"2"}});
    EXPECT_EQ(fs::status(path_).permissions(), fs::perms::owner_read | fs::perms::owner_write);
}

TEST_F(PropertyFileTest, TheLocaleDoesNotMatter) {
    const std::map<std::wstring, std::wstring> values{{L"größe", L"1234567"}};
    const std::string cLocale = setlocale(LC_ALL, nullptr);
    setlocale(LC_ALL, "C");
    write(values);
    const std::string inC = content();
    setlocale(LC_ALL, "");
    EXPECT_EQ(readAll(), values);
    setlocale(LC_ALL, cLocale.c_str());
    EXPECT_EQ(inC, "größe=1234567\n");
}

TEST_F(PropertyFileTest, AFileBehindAFileCannotBeOpened) {
    put("a=1\n");
    PropertyFile file((path_ / "inside").string());
    EXPECT_THAT(textOfFailure([&] { file.open(1); }), HasSubstr("inside: cannot open"));
}

TEST_F(PropertyFileTest, AFileThatOpensButDoesNotReadIsAFailure) {
    PropertyFile file("/proc/self/mem");  // nothing is mapped at its beginning
    EXPECT_THAT(textOfFailure([&] { file.open(1); }), HasSubstr("/proc/self/mem: cannot read"));
}

}  // namespace
