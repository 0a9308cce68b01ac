// Every function of the plug-in that puts a text into a command, with every byte that means something to a
// shell.
#include <gmock/gmock.h>

#include <cctype>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <regex>
#include <set>
#include <sstream>

#include "framework/cvlog/logger.h"
#include "network/address_queries.h"
#include "network/link_queries.h"
#include "network/teaming_queries.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/shell_stub.h"
#include "tests/support/text_takers.h"

namespace {

using Texts = std::vector<std::string>;

/// What the gate promises, said once more: whether a text may stand there.
bool mayStand(std::string text, bool quoted) {
    while (text.ends_with('\n')) text.pop_back();
    while (text.ends_with(' ')) text.pop_back();
    while (text.starts_with(' ')) text.erase(0, 1);
    if (!quoted && text.starts_with('-')) return false;
    for (const char letter : text) {
        const int byte = static_cast<unsigned char>(letter);
        const bool shown = byte > 127 || (byte >= 32 && byte < 127) || letter == '\t' || letter == '\n';
        const bool plain = byte > 127 || isalnum(byte) || (letter != 0 && strchr("._:@%+=,/-", letter));
        if (quoted ? !shown || strchr("\"$`\\", letter) : !plain) return false;
    }
    return true;
}

/// The command with another text in the place of `base`; nothing when that text may not stand there.
std::optional<std::string> withText(const std::string& command, const std::string& base, std::string text) {
    std::string made;
    std::size_t from = 0;
    for (auto at = command.find(base); at != command.npos; at = command.find(base, from)) {
        const bool quoted =
            std::count(command.begin(), command.begin() + static_cast<long>(at), '"') % 2 != 0;
        if (!mayStand(text, quoted)) return std::nullopt;
        made += command.substr(from, at - from);
        from = at + base.size();
        std::string entering = text;
        while (!quoted && from < command.size() && entering.ends_with('\n')) entering.pop_back();
        made += entering;
    }
    return made + command.substr(from);
}

/// The commands that a function runs with a text; none of them is really run.
Texts commandsWith(const TextTaker& taker, const std::string& text) {
    shell_stub::answerWith([&](const std::string& command) { return taker.answer(command, text); });
    const CommandLines commands;
    taker.run(text);
    return commands.all();
}

/// Compares what runs with a text with what ran with `base`.
void expectOnlyTheText(const TextTaker& taker, const Texts& usual, const std::string& base,
                       const std::string& text) {
    Texts allowed;
    for (const std::string& command : usual) {
        if (const auto made = withText(command, taker.entering(base), taker.entering(text))) {
            allowed.push_back(*made);
        }
    }
    const Texts run = commandsWith(taker, text);
    if (allowed.size() == usual.size() && text.find_first_of(taker.passesOver) == text.npos) {
        ASSERT_EQ(run, allowed) << taker.name << ": " << testing::PrintToString(text);
    }
    for (const std::string& command : run) {
        ASSERT_THAT(allowed, testing::Contains(command))
            << taker.name << ": " << testing::PrintToString(text);
    }
}

/// The byte in front of, inside and behind a name.
Texts around(const std::string& name, int byte) {
    const char letter = static_cast<char>(byte);
    return {letter + name, name.substr(0, name.size() - 1) + letter + name.back(), name + letter};
}

HOST_TEST(TextsInCommands, AreNothingButTheText) {
    host.directory("/proc/net/bonding");
    host.file("/tmp/fdisk_tmp", "");  // its lines are asked of the commands alone
    CVLog::CVLogger::setLog(nullptr, 0);
    for (const TextTaker& taker : textTakers()) {
        for (const std::string base : {"eth0", "bond0"}) {
            const bool printed = taker.printedBy != nullptr;
            if (printed && base == "bond0") continue;  // no bond has a bond for a member
            const Texts usual = commandsWith(taker, base);
            ASSERT_THAT(usual, testing::Contains(testing::HasSubstr(taker.entering(base)))) << taker.name;
            for (int byte = 0; byte < 256; ++byte) {
                if (printed && (byte == 0 || byte == '\n')) continue;  // ends the line
                for (const std::string& text : around(base, byte)) {
                    expectOnlyTheText(taker, usual, base, text);
                }
            }
        }
    }
}

/// It must name a file to get into a command.
HOST_TEST(TextsInCommands, AreNothingButTheTextThatNamesABond) {
    CVLog::CVLogger::setLog(nullptr, 0);
    const TextTaker taker = {"activeMember, the master",
                             [](const std::string& text) {
                                 std::string result;
                                 std::string master = text;
                                 IC::getNICTeamingInformation("eth0", 194, result, master);
                             },
                             false,
                             nullptr,
                             "",
                             " \t\"'"};
    host.file("/proc/net/bonding/bond0", "");
    const Texts usual = commandsWith(taker, "bond0");
    ASSERT_EQ(usual.size(), 1U);
    for (int byte = 1; byte < 256; ++byte) {
        if (byte == '/') continue;
        for (const std::string& text : around("bond0", byte)) {
            host.file("/proc/net/bonding/" + text, "");
            expectOnlyTheText(taker, usual, "bond0", text);
        }
    }
}

std::string replaced(std::string text, const std::string& what, const std::string& with) {
    for (auto at = text.find(what); at != text.npos; at = text.find(what, at + with.size())) {
        text.replace(at, what.size(), with);
    }
    return text;
}

/// The formats of the plug-in's sources that have a place for a text.
std::set<std::string> formats() {
    static const std::regex call(R"re((?:formatCommand|textCommand)\(\s*((?:"(?:\\.|[^"\\])*"\s*)+))re");
    static const std::regex literal(R"re("((?:\\.|[^"\\])*)")re");
    std::set<std::string> found;
    for (const std::string component : {"mi", "computer", "storage", "network", "indications", "cpu"}) {
        for (const auto& file : std::filesystem::directory_iterator(testsDirectory() + "/../" + component)) {
            std::ostringstream source;
            source << std::ifstream(file.path()).rdbuf();
            const std::string text = source.str();
            for (std::sregex_iterator at(text.begin(), text.end(), call), end; at != end; ++at) {
                const std::string literals = (*at)[1];
                std::string format;
                for (std::sregex_iterator part(literals.begin(), literals.end(), literal); part != end;
                     ++part) {
                    format += (*part)[1];
                }
                format = replaced(replaced(format, "\\\"", "\""), "\\\\", "\\");
                if (format.find("%s") != format.npos) found.insert(format);
            }
        }
    }
    return found;
}

bool isMadeOf(const std::string& command, const std::string& format) {
    std::size_t at = 0;
    for (std::size_t from = 0; from != format.npos;) {
        const auto place = format.find("%s", from);
        const std::string piece = format.substr(from, place == format.npos ? place : place - from);
        at = command.find(piece, at);
        if (at == command.npos || (from == 0 && at != 0)) return false;
        at += piece.size();
        from = place == format.npos ? place : place + 2;
    }
    return format.ends_with("%s") || at == command.size();
}

TEST(TextsInCommands, AreTriedInEveryFormat) {
    std::set<std::string> untried = formats();
    EXPECT_GT(untried.size(), 30U);
    for (const std::string ofConstants : {"/bin/cp %s %s", "ifconfig > %s", "rm -rf %s"}) {
        EXPECT_EQ(untried.erase(ofConstants), 1U) << ofConstants;
    }
    inFakeHost([&](FakeHost& host) {
        CVLog::CVLogger::setLog(nullptr, 0);
        host.directory("/proc/net/bonding");
        host.file("/tmp/fdisk_tmp", "");
        for (const bool walk : {false, true}) {
            if (walk) host.file("/tmp/CVIfconfig.txt", "");
            for (const TextTaker& taker : textTakers()) {
                for (const std::string name : {"eth0", "bond0"}) {
                    if (taker.printedBy != nullptr && name == "bond0") continue;
                    for (const std::string& command : commandsWith(taker, name)) {
                        std::erase_if(untried, [&](const auto& format) { return isMadeOf(command, format); });
                    }
                }
            }
        }
        EXPECT_THAT(untried, testing::IsEmpty()) << "they want rows in tests/support/text_takers.cpp";
    });
}

/// Each would run P if a shell read it.
const Texts kAttacks = {"eth$(P)", "eth`P`",     "eth;P",     "eth|P",    "eth&P",     "eth\nP",  "eth\nP\n",
                        "eth&&P",  "eth||P",     "\";P;\"",   "';P;'",    "\"$(P)\"",  "\"`P`\"", "eth\\\n;P",
                        "x\";P #", "x';P #",     "eth0\n ;P", "eth0 ;P ", "$(P)",      "`P`",     "P>/marker",
                        ";P;",     "x\n\nP\n\n", "x)P(",      "<(P)",     "eth0\x01;P"};

HOST_TEST(TextsInCommands, RunNothingOfTheirOwnInARealShell) {
    CVLog::CVLogger::setLog(nullptr, 0);
    host.tool("P %any", ToolAnswer{.out = "", .action = "echo >/marker"});
    for (const std::string tool : {"ifconfig", "ethtool", "route", "ip", "brctl", "hostname"}) {
        host.recordOnly(tool);
    }
    for (const TextTaker& taker : textTakers()) {
        for (const std::string& attack : kAttacks) {
            shell_stub::answerWith([&](const std::string& command) -> std::optional<std::string> {
                const std::string printed = taker.answer(command, attack);
                return printed.empty() ? std::nullopt : std::optional(printed);
            });
            taker.run(attack);
            ASSERT_THAT(host.callsOf("P"), testing::IsEmpty()) << taker.name << ": " << attack;
        }
    }
    EXPECT_FALSE(host.exists("/marker"));
}

HOST_TEST(TextsInCommands, ComeOutOfARealShellAsTheyWentIn) {
    host.recordOnly("ethtool");
    std::string bare;
    std::string quoted = "1 2 ";  // the third field is asked for
    for (int byte = 1; byte < 256; ++byte) {
        const std::string letter(1, static_cast<char>(byte));
        bare += mayStand(letter + "x", false) && byte != ' ' && byte != '\n' ? letter : "";
        quoted += mayStand(letter + "x", true) && byte != ' ' && byte != '\n' && byte != '/' ? letter : "";
    }
    IC::getAutoSense(bare);
    IC::getAutoSense(" " + bare + " \n");
    EXPECT_EQ(host.calls(), (Texts{"ethtool " + bare, "ethtool " + bare}));
    std::string address;
    unsigned int prefixLength = 0;
    EXPECT_TRUE(IC::getAddressDetails(quoted + "/64 last\n", address, prefixLength));
    EXPECT_EQ(address, quoted.substr(4));
    EXPECT_EQ(prefixLength, 64U);
}

}  // namespace
