// What of a text may enter a command, and what becomes of a command that is refused.
#include <gmock/gmock.h>

#include "mi/command.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using namespace std::string_literals;
using Texts = std::vector<std::string>;
using IC::Command;
using IC::formatCommand;
using IC::HostCommand;
using IC::MyProcess;
using IC::textCommand;

/// The command that would be run; nothing when it is refused.
std::optional<std::string> running(const Command& command) {
    return command.toRun() != nullptr ? std::optional<std::string>(command.toRun()) : std::nullopt;
}
std::optional<std::string> bare(const std::string& text) {
    return running(formatCommand("ls %s 2> /dev/null", text));
}
std::optional<std::string> atEnd(const std::string& text) {
    return running(formatCommand("ls %s", text));
}
std::optional<std::string> quoted(const std::string& text) {
    return running(formatCommand("echo \"%s\" | cut -f1", text));
}
const std::optional<std::string> kRefused;

TEST(Gate, LetsPlainTextsStandBare) {
    for (const std::string& text :
         Texts{"", "eth0", "a.b_c:d@e%f+g=h,i/j-k", "AZaz09", "\x80\xff", "br-0", "/etc/x"}) {
        EXPECT_EQ(bare(text), "ls " + text + " 2> /dev/null");
    }
}

TEST(Gate, LetsATextEnterAsItCame) {
    EXPECT_EQ(bare(" eth0"), "ls  eth0 2> /dev/null");
    EXPECT_EQ(bare("eth0 "), "ls eth0  2> /dev/null");
    EXPECT_EQ(bare("   "), "ls     2> /dev/null");
    EXPECT_EQ(quoted("    inet6 2001:db8::1/64 scope global \n"),
              "echo \"    inet6 2001:db8::1/64 scope global \n\" | cut -f1");
}

TEST(Gate, CutsLineBreaksWhereMoreOfTheCommandComes) {
    EXPECT_EQ(bare("eth0\n\n"), "ls eth0 2> /dev/null");
    EXPECT_EQ(bare("eth0 \n"), "ls eth0  2> /dev/null");
    EXPECT_EQ(bare("\n"), "ls  2> /dev/null");
    EXPECT_EQ(atEnd("eth0\n"), "ls eth0\n");
    EXPECT_EQ(atEnd("\n\n"), "ls \n\n");
    EXPECT_EQ(running(formatCommand("hostname %s.%s", "host\n"s, "org\n"s)), "hostname host.org\n");
}

TEST(Gate, RefusesBareWhatIsMoreThanAText) {
    for (const std::string& text :
         Texts{"a b",    "-x",       " -x",   "-",   "\neth0", "eth0\n ", "a\nb", "a\tb", "\teth0",
               "eth0\t", "eth0\r\n", "a\0b"s, "\0"s, "\x01",   "\x7f",    "a#b",  "~",    "a*",
               "[a]",    "a?",       "{a,b}", "!x",  "^",      "'",       "\"",   "\\"}) {
        EXPECT_EQ(bare(text), kRefused) << testing::PrintToString(text);
        EXPECT_EQ(atEnd(text), kRefused) << testing::PrintToString(text);
    }
}

TEST(Gate, TakesAnythingInDoubleQuotesThatStaysThere) {
    for (const std::string& text :
         Texts{"", "a b", "-x", "a\tb\nc\n", "*?[a]{b,c}~!#;&|<>()'^", "\x80\xff"}) {
        EXPECT_EQ(quoted(text), "echo \"" + text + "\" | cut -f1");
    }
    for (const std::string& text :
         Texts{"\"", "$", "`", "\\", "\0"s, "a\0"s, "\x01", "\x1b", "\x7f", "a\r\n"}) {
        EXPECT_EQ(quoted(text), kRefused) << testing::PrintToString(text);
    }
}

TEST(Gate, JudgesEachTextWhereItStands) {
    EXPECT_NE(running(formatCommand("ls %s \"%s\" %s", "a", "b c", "d")), kRefused);
    EXPECT_EQ(running(formatCommand("ls %s \"%s\" %s", "a", "b", "c d")), kRefused);
    EXPECT_EQ(running(formatCommand("ls %s \"%s\" %s", "a b", "c", "d")), kRefused);
    EXPECT_EQ(running(formatCommand("ls x-`ls %s | tr '[A-Z]' \"x y\"`.b", "a b")), kRefused);
}

template <std::size_t size>
struct Literal {
    consteval Literal(const char (&text)[size]) { std::copy_n(text, size, letters); }
    char letters[size]{};
};
/// Whether such a format can be compiled.
template <std::size_t texts, Literal format>
concept Compiles = requires {
    typename std::integral_constant<std::size_t, IC::CommandFormat<texts>(format.letters).slots().size()>;
};

TEST(Gate, HasNoFormatInWhichATextCouldBeMore) {
    EXPECT_TRUE((Compiles<1, "ls %s">));
    EXPECT_TRUE((Compiles<2, "a | b '$x \\' \"%s\\n\" | c x-`d %s`">));
    EXPECT_FALSE((Compiles<1, "ls '%s'">)) << "where a quote would end the text";
    EXPECT_FALSE((Compiles<1, "ls `ls \"%s\"`">)) << "where quotes are read twice";
    EXPECT_FALSE((Compiles<1, "ls \"`ls %s`\"">));
    EXPECT_FALSE((Compiles<1, "ls $(ls %s)">));
    EXPECT_FALSE((Compiles<1, "ls \"$(ls %s)\"">));
    EXPECT_FALSE((Compiles<1, "ls \\%s">));
    EXPECT_FALSE((Compiles<1, "ls \"\\%s\"">));
    EXPECT_FALSE((Compiles<1, "ls ~%s">));
    EXPECT_FALSE((Compiles<1, "cat <<x\n%s">));
    EXPECT_FALSE((Compiles<1, "ls # %s">));
    EXPECT_FALSE((Compiles<1, "ls \"%s">)) << "an open quote";
    EXPECT_FALSE((Compiles<1, "ls `ls %s">));
    EXPECT_FALSE((Compiles<1, "%s">)) << "as a program";
    EXPECT_FALSE((Compiles<1, "ls | %s">));
    EXPECT_FALSE((Compiles<1, "ls; %s x">));
    EXPECT_FALSE((Compiles<1, "ls %d">));
    EXPECT_FALSE((Compiles<1, "ls %">));
    EXPECT_FALSE((Compiles<0, "ls %s">)) << "a text too few";
    EXPECT_FALSE((Compiles<1, "ls">)) << "a text too many";
}

template <class Text>
concept Runs = requires(const Text& text) {
    IC::runToEnd(text);
}
|| std::is_constructible_v<HostCommand, Text> || std::is_constructible_v<IC::PlainCommand, Text>;

TEST(Gate, IsTheOnlyWayToACommand) {
    EXPECT_TRUE(Runs<Command>);
    EXPECT_FALSE(Runs<std::string>);
    EXPECT_FALSE(Runs<std::string_view>);
    EXPECT_FALSE(Runs<const char*>);
    EXPECT_FALSE((std::is_constructible_v<Command, std::string>));
    EXPECT_FALSE((std::is_constructible_v<Command, const char*>));
    EXPECT_FALSE((std::is_constructible_v<IC::CommandFormat<1>, const char*>));
}

HOST_TEST(Gate, NamesWhatItRefusesInOneLine) {
    LogCapture capture;
    formatCommand("ls %s", " eth$(P)\n");
    formatCommand("ls %s", "-x");
    formatCommand("echo \"%s\"", "a\nb\x1b\"c");
    textCommand("ls %s %s", "a;b", "c;d");
    EXPECT_THAT(capture.messages(6000),
                TextsAre("Command refused for its text \"eth$(P)\" (the \"$\"), not run: ls  eth$(P)\\x0a",
                         "Command refused for its text \"-x\" (the \"-\"), not run: ls -x",
                         "Command refused for its text \"a\\x0ab\\x1b\\x22c\" (the \"\\x1b\"), not run: "
                         "echo \"a\\x0ab\\x1b\"c\"",
                         "Command refused for its text \"a;b\" (the \";\"), not run: ls a;b c;d"));
    EXPECT_EQ(capture.lines().front().function, "formatCommand");
    EXPECT_EQ(capture.lines().back().function, "textCommand");
}

HOST_TEST(Gate, CountsWhatItRefusesAsACommandThatCouldNotBeStarted) {
    const CommandLines commands;
    const int before = MyProcess::cnt;
    EXPECT_FALSE(HostCommand(formatCommand("ls %s", ";")).started());
    EXPECT_EQ(MyProcess::cnt, before + 1);
    EXPECT_FALSE(HostCommand(formatCommand("ls %s", std::string(600, 'x'))).started());
    EXPECT_EQ(MyProcess::cnt, before + 2);
    LogCapture capture;
    EXPECT_FALSE(HostCommand::fromText(textCommand("ls %s", ";")).started());
    EXPECT_EQ(MyProcess::cnt, before + 3);
    EXPECT_THAT(capture.messages(3000), TextsAre("mypopen():  Count value " + std::to_string(before + 3)));
    EXPECT_FALSE(IC::firstLine(formatCommand("ls %s", ";")).started);
    EXPECT_EQ(MyProcess::cnt, before + 4);
    EXPECT_FALSE(IC::PlainCommand(formatCommand("ls %s", ";")).started());
    IC::runToEnd(formatCommand("echo >%s", "/x;touch /y"));
    EXPECT_EQ(MyProcess::cnt, before + 4) << "no counted pipes";
    EXPECT_TRUE(commands.all().empty());
    EXPECT_FALSE(host.exists("/x"));
}

HOST_TEST(Gate, NamesACommandThatIsTooLongInFull) {
    const std::string name(600, 'x');
    LogCapture capture;
    const Command command = formatCommand("ls %s", name + "\n");
    EXPECT_EQ(command.toRun(), nullptr);
    EXPECT_THAT(capture.messages(6000), TextsAre("Command too long, not run: ls " + name + "\\x0a"));
    EXPECT_EQ(command.shown(), "ls " + name + "\\x0a");
}

HOST_TEST(Gate, TakesACommandThatIsHandedOverAsAStringAtAnyLength) {
    const std::string text(100000, 'x');
    EXPECT_EQ(HostCommand::fromText(textCommand("echo %s | wc -c", text)).nextLine(), "100001\n");
}

}  // namespace
