// What cvagent keeps and shows, by running the program.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/agent/cvagent_run.h"
#include "tests/history/kept.h"
#include "tests/support/waiting.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::MatchesRegex;
using testing::Not;
using testing::SizeIs;
using testing::StartsWith;
using Json = nlohmann::ordered_json;

std::vector<Json> objects(const std::string& text) {
    std::vector<Json> all;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        all.push_back(Json::parse(line));
    }
    return all;
}

HOST_TEST(HistoryCommand, ShowsWhoWroteWhatAndWhatCameOfIt) {
    CvagentRun run(host);
    run({"set", "computer", "OwnerContact", "room 4"});
    run.setting("SUDO_UID=4321")({"set", "computer", "OwnerContact", "somebody"});
    EXPECT_EQ(run({"set", "computer", "OwnerContact", "throw"}).status, 1);
    const auto written = objects(run({"history", "--json"}).out);
    ASSERT_THAT(written, SizeIs(3));
    EXPECT_EQ(written[0]["event"], "written");
    EXPECT_EQ(written[0]["number"], 1);
    EXPECT_EQ(written[0]["path"], "/oshw/root/computer");
    EXPECT_EQ(written[0]["verdict"], "applied");
    EXPECT_EQ(written[1]["property"].dump(),
              R"({"id":115,"name":"OwnerContact","before":"","after":"somebody"})");
    EXPECT_THAT(written[1]["caller"].get<std::string>(),
                MatchesRegex("(uid 4321|.*\\(uid [0-9]+\\)) as .*uid 0.*"));
    EXPECT_EQ(written[1]["wanted"], "somebody");
    EXPECT_THAT(written[2]["verdict"].get<std::string>(),
                StartsWith("failed: OwnerContact was not changed: "));
    EXPECT_EQ(written[2]["wanted"], "throw");
    const std::string lines = run({"history"}).out;
    EXPECT_THAT(lines, HasSubstr("     1  "));
    EXPECT_THAT(lines, HasSubstr("Z  written    /oshw/root/computer  OwnerContact: somebody  (applied; by "));
    EXPECT_THAT(lines, HasSubstr("OwnerContact: not known  (failed: OwnerContact was not changed"));
}

HOST_TEST(HistoryCommand, ShowsTheAlertThatACommandWasTold) {
    CvagentRun run(host);
    run.telling("early")({"get", "computer", "OwnerContact"});
    const auto all = objects(run.telling("")({"history", "--json", "--kind", "alert"}).out);
    ASSERT_THAT(all, SizeIs(1));
    EXPECT_EQ(all[0]["message"], "NIC is Offline ");
    EXPECT_EQ(all[0]["codes"]["event"], 12);
    EXPECT_TRUE(all[0].contains("boot"));
}

#if !defined(__SANITIZE_ADDRESS__)  // that build finds its libraries by a run path, whatever is set
/// It is loaded when a history is opened, and nothing else needs it.
HOST_TEST(HistoryCommand, TellsThatSqliteIsMissing) {
    host.file("/odd/libsqlite3.so.0", "");
    CvagentRun run(host);
    run.setting("LD_LIBRARY_PATH=/odd");
    const Finished written = run({"set", "computer", "OwnerContact", "room 4"});
    EXPECT_EQ(written.status, 0);
    EXPECT_THAT(written.err, HasSubstr("SQLite cannot be loaded: /odd/libsqlite3.so.0: file too short"));
    host.remove("/odd");
    EXPECT_EQ(run({"set", "computer", "OwnerContact", "room 4"}).status, 0);
    host.file("/odd/libsqlite3.so.0", "");
    const Finished shown = run({"history"});
    EXPECT_EQ(shown.status, 1);
    EXPECT_THAT(shown.err, HasSubstr("SQLite cannot be loaded"));
}
#endif

HOST_TEST(HistoryCommand, ShowsAPartOfIt) {
    CvagentRun run(host);
    for (const char* room : {"1", "2", "3"}) {
        run({"set", "computer", "OwnerContact", room});
    }
    const auto shown = [&run](std::vector<std::string> words) {
        words.insert(words.begin(), {"history", "--json"});
        std::string numbers;
        for (const Json& entry : objects(run(words).out)) {
            numbers += std::to_string(entry["number"].get<int>());
        }
        return numbers;
    };
    EXPECT_EQ(shown({"--since", "1"}), "23");
    EXPECT_EQ(shown({"--until", "2"}), "12");
    EXPECT_EQ(shown({"--since", "1h"}), "123");
    EXPECT_EQ(shown({"--until", "2026-01-01"}), "");
    EXPECT_EQ(shown({"--since", "2020-01-01T00:00:00Z", "--limit", "2"}), "23");
    EXPECT_EQ(shown({"--limit", "0"}), "");
    EXPECT_EQ(shown({"--node", "computer", "--kind", "written", "--kind", "alert"}), "123");
    EXPECT_EQ(shown({"--node", "eth0"}), "");
    EXPECT_EQ(shown({"--kind", "alert"}), "");
    EXPECT_EQ(shown({"--since", "60000d"}), "123");
    EXPECT_EQ(shown({"--since", "4294967295d", "--until", "2199-12-31"}), "123");
    EXPECT_EQ(shown({"--since", "2199-12-31"}), "");
}

HOST_TEST(HistoryCommand, PrintsNothingThatATerminalWouldObey) {
    const std::string hostile =
        "\x1b]0;x\x07\x9b"
        "2J\n\r\u202e";
    cvagent::Event event = kept::event(hostile, cvagent::Event::Kind::alert);
    event.path = "/oshw/drive:" + hostile;
    cvagent::Event written = kept::event(hostile, cvagent::Event::Kind::written);
    written.path = event.path;
    for (std::string* text : {&written.propertyName, &written.before, &written.after, &written.caller,
                              &written.wanted, &written.verdict, &written.nodeClass}) {
        *text = hostile;
    }
    cvagent::History history(kept::kPlace);
    kept::append(history, event);
    kept::append(history, written);
    CvagentRun run(host);
    for (const Finished& shown : {run({"history"}), run({"watch", "--for", "0"})}) {
        EXPECT_THAT(shown.out, Not(testing::ContainsRegex("[\x01-\x09\x0b-\x1f\x7f-\xff]"))) << shown.out;
        EXPECT_THAT(shown.out, MatchesRegex("[^\n]*\n[^\n]*\n"));
        EXPECT_THAT(shown.out, HasSubstr("/oshw/drive:\\x1b]0;x\\x07\\x9b2J\\x0a\\x0d"));
    }
    EXPECT_THAT(objects(run({"history", "--json"}).out), SizeIs(2));
}

HOST_TEST(HistoryCommand, RefusesWhatMeansNothing) {
    CvagentRun run(host);
    EXPECT_THAT(
        run({"history", "--since", "yesterday"}).err,
        StartsWith("cvagent: --since: 'yesterday' is no number, no time as 2026-11-20T21:03:00Z and not how "
                   "long ago, as 2h\n"));
    for (const auto& [option, word] :
         std::vector<std::pair<std::string, std::string>>{{"--since", ""},
                                                          {"--until", "12x"},
                                                          {"--until", "99999999999999999999"},
                                                          {"--kind", "deleted"},
                                                          {"--limit", "-1"},
                                                          {"--limit", "0x10"},
                                                          {"--keep-days", "nan"}}) {
        EXPECT_EQ(run({"history", option, word}).status, 2) << option << " " << word;
    }
}

HOST_TEST(HistoryCommand, SaysThatNothingWasKept) {
    const Finished run = CvagentRun(host)({"history"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, "cvagent: nothing has been kept so far\n");
    EXPECT_FALSE(host.exists("/var/lib/corvista"));
}

HOST_TEST(HistoryCommand, LeavesNothingBehindWhereNothingHappened) {
    CvagentRun run(host);
    EXPECT_EQ(run({"get", "computer", "OwnerContact"}).err, "");
    run({"tree"});
    EXPECT_FALSE(host.exists("/var/lib/corvista"));
}

HOST_TEST(HistoryCommand, CommandsWorkWhereNothingCanBeKept) {
    host.directory("/var/lib/corvista", 0700);
    host.readOnly("/var/lib/corvista");
    const Finished run = CvagentRun(host)({"set", "computer", "OwnerContact", "room 4"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("new  room 4"));
    EXPECT_THAT(run.err,
                MatchesRegex("cvagent: the change cannot be taken back later: [^\n]*Read-only file system\n"
                             "cvagent: what happens is not kept in the history: [^\n]*Read-only file "
                             "system\n"));
}

HOST_TEST(HistoryCommand, SaysWhatIsWrongWithTheFile) {
    host.directory("/var/lib/corvista", 0700);
    host.file("/var/lib/corvista/history.db", std::string(1000, 'x'), 0600);
    const Finished run = CvagentRun(host)({"history"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(
        run.err,
        "cvagent: the history cannot be read: '/var/lib/corvista/history.db': file is not a database\n");
}

HOST_TEST(HistoryCommand, GoesWithTheDataDirectoryThatIsNamed) {
    CvagentRun run(host);
    run.setting("CORVISTA_DATA_DIR=/root/scratch")({"set", "computer", "OwnerContact", "x"});
    EXPECT_TRUE(host.exists("/root/scratch/history.db"));
    EXPECT_FALSE(host.exists("/var/lib/corvista/history.db"));
    EXPECT_THAT(objects(run({"history", "--json"}).out), SizeIs(1));
}

/// A pager that is left open: the pipe to it is full, and the program waits.
HOST_TEST(HistoryCommand, HoldsNothingWhileNobodyReads) {
    cvagent::History history(kept::kPlace);
    std::vector<cvagent::Event> events(1500,
                                       kept::event(std::string(1000, 'x'), cvagent::Event::Kind::alert));
    history.append(events);
    ASSERT_EQ(mkfifo("/tmp/pager", 0600), 0);
    const int pager = open("/tmp/pager", O_RDWR | O_CLOEXEC);
    RunningProgram program =
        host.start({"sh", "-c", std::string("exec ") + CVAGENT_PROGRAM + " history > /tmp/pager"});
    EXPECT_TRUE(eventually([pager] {
        int waiting = 0;
        return ioctl(pager, FIONREAD, &waiting) == 0 && waiting >= fcntl(pager, F_GETPIPE_SZ);
    }));
    kept::append(history, kept::event("meanwhile"));
    const cvagent::Database writer(history.file(), cvagent::Database::Access::write);
    EXPECT_EQ(writer.number("PRAGMA wal_checkpoint(TRUNCATE)"), 0) << "a reader is in the way";
    program.signal(SIGKILL);
    program.wait();
    close(pager);
}

HOST_TEST(HistoryCommand, CanBeMadeSmaller) {
    CvagentRun run(host);
    run({"set", "computer", "OwnerContact", "x"});
    EXPECT_EQ(run({"history", "--keep-megabytes", "0"}).out, "");
    EXPECT_EQ(run({"history"}).out, "");
    run({"history", "--keep-megabytes", "1", "--keep-days", "30"});
    run({"set", "computer", "OwnerContact", "y"});
    EXPECT_THAT(objects(run({"history", "--json"}).out), SizeIs(1));
}

HOST_TEST(WatchedHistory, BeginsWithWhatTheUserWasNotShown) {
    CvagentRun run(host);
    run({"set", "computer", "OwnerContact", "room 1"});
    run({"set", "computer", "OwnerContact", "room 2"});
    const std::string first = run({"watch", "--for", "0"}).out;
    EXPECT_THAT(first, MatchesRegex("[^\n]*written[^\n]*room 1\n[^\n]*written[^\n]*room 2\n"));
    EXPECT_EQ(run({"watch", "--for", "0"}).out, "");
    run({"set", "computer", "OwnerContact", "room 3"});
    EXPECT_THAT(objects(run({"watch", "--for", "0", "--json"}).out), SizeIs(1));
}

HOST_TEST(WatchedHistory, ShowsEachEventOnce) {
    CvagentRun run(host);
    run.telling("early late");
    EXPECT_THAT(objects(run({"watch", "--for", "0", "--json"}).out), SizeIs(2));
    const auto again = objects(run({"watch", "--for", "0", "--json"}).out);
    ASSERT_THAT(again, SizeIs(2));
    EXPECT_EQ(again[0]["number"], 3);
    EXPECT_EQ(again[1]["number"], 4);
}

HOST_TEST(WatchedHistory, WhatWasNotPrintedIsShownTheNextTime) {
    CvagentRun run(host);
    run({"set", "computer", "OwnerContact", "room 1"});
    std::string line;
    for (const std::string& word : run.commandLine({"watch", "--for", "0"})) {
        line += "'" + word + "' ";
    }
    EXPECT_EQ(host.run({"sh", "-c", line + "> /dev/full"}).status, 1);
    EXPECT_THAT(run({"watch", "--for", "0"}).out, HasSubstr("room 1"));
}

}  // namespace
