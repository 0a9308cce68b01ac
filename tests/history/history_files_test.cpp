// The file of a history: who may read it, and what becomes of one that cannot be used.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>

#include "tests/history/kept.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::Database;
using cvagent::Event;
using cvagent::History;
using cvagent::HistoryError;
using cvagent::HistoryReader;
using kept::kPlace;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using testing::StartsWith;

constexpr std::size_t kAll = 1000000;
const std::string kFile = "/var/lib/corvista/history.db";

/// What opening, or what is done, fails with.
template <class Work>
std::string problem(Work work) {
    static constexpr const char* kKinds[] = {"absent",   "denied", "unsafe", "newer",   "foreign",
                                             "readOnly", "busy",   "full",   "damaged", "failed"};
    try {
        work();
        return "none";
    } catch (const HistoryError& error) {
        return kKinds[error.kind()];
    }
}

std::string openProblem() {
    return problem([] { History history(kPlace); });
}

mode_t modeOf(const std::string& file) {
    struct stat found {};
    return lstat(file.c_str(), &found) == 0 ? found.st_mode & 07777 : 0;
}

gid_t groupOf(const std::string& file) {
    struct stat found {};
    return lstat(file.c_str(), &found) == 0 ? found.st_gid : static_cast<gid_t>(-1);
}

std::vector<std::string> movedAside(const FakeHost& host) {
    std::vector<std::string> all;
    for (const std::string& name : host.listDirectory("/var/lib/corvista")) {
        if (name.starts_with("history.db.damaged-") && !name.ends_with("-wal") && !name.ends_with("-shm")) {
            all.push_back(name);
        }
    }
    return all;
}

HOST_TEST(HistoryFile, IsItsOwnersAlone) {
    umask(0);
    History history(kPlace);
    kept::append(history, kept::event("x"));
    EXPECT_EQ(modeOf("/var/lib/corvista"), 0700U);
    for (const std::string& name : host.listDirectory("/var/lib/corvista")) {
        EXPECT_EQ(modeOf("/var/lib/corvista/" + name), 0600U) << name;
    }
}

HOST_TEST(HistoryFile, CanBeReadByTheGroupWhereTheHostHasIt) {
    kept::append(*std::make_unique<History>(kPlace), kept::event("before the package came"));
    host.file("/etc/probe", "");
    if (!host.giveToStranger("/etc/probe")) {
        GTEST_SKIP() << "only root can give files away";
    }
    const gid_t readers = groupOf("/etc/probe");
    host.file("/etc/group", "root:x:0:\ncorvista:x:" + std::to_string(readers) + ":\n");
    { History history(kPlace); }
    EXPECT_EQ(modeOf(kFile), 0640U);
    EXPECT_EQ(groupOf(kFile), readers);
    EXPECT_EQ(modeOf("/var/lib/corvista"), 0750U);
    host.remove("/var/lib/corvista");
    History history(kPlace);
    kept::append(history, kept::event("x"));
    EXPECT_EQ(modeOf("/var/lib/corvista"), 0750U);
    for (const char* part : {"", "-wal", "-shm"}) {
        EXPECT_EQ(modeOf(kFile + part), 0640U) << part;
        EXPECT_EQ(groupOf(kFile + part), readers) << part;
    }
    EXPECT_EQ(modeOf("/var/lib/corvista/history.lock"), 0600U);
}

HOST_TEST(HistoryFile, LeavesWhatReadersNeedWithoutTheRightToMakeIt) {
    kept::append(*std::make_unique<History>(kPlace), kept::event("x"));
    EXPECT_TRUE(host.exists(kFile + "-wal"));
    EXPECT_TRUE(host.exists(kFile + "-shm"));
}

HOST_TEST(HistoryFile, OfAStrangerIsRefused) {
    host.directory("/var/lib/corvista", 0700);
    host.file(kFile, "");
    if (!host.giveToStranger(kFile)) {
        GTEST_SKIP() << "only root can give files away";
    }
    EXPECT_EQ(openProblem(), "unsafe");
    EXPECT_EQ(problem([] { HistoryReader reader(kPlace); }), "unsafe");
    EXPECT_EQ(host.read(kFile), "");
    host.remove(kFile);
    host.symlink(kFile, "/etc/elsewhere");
    EXPECT_EQ(openProblem(), "unsafe");
    EXPECT_FALSE(host.exists("/etc/elsewhere"));
    host.remove("/var/lib/corvista");
    host.directory("/etc/theirs", 0755);
    ASSERT_TRUE(host.giveToStranger("/etc/theirs"));
    host.symlink("/var/lib/corvista", "/etc/theirs");
    EXPECT_EQ(openProblem(), "unsafe");
    EXPECT_THAT(host.listDirectory("/etc/theirs"), IsEmpty());
}

HOST_TEST(HistoryFile, ThatOthersCanWriteIsRefused) {
    host.directory("/var/lib/corvista", 0700);
    for (const char* part : {"", "-wal", "-shm"}) {
        host.file(kFile + part, "", 0666);
        chmod((kFile + part).c_str(), 0666);
        EXPECT_EQ(openProblem(), "unsafe") << part;
        host.remove(kFile + part);
    }
    chmod("/var/lib/corvista", 0777);
    EXPECT_EQ(openProblem(), "unsafe");
}

HOST_TEST(HistoryFile, ThatIsNoneIsMovedAsideAndTold) {
    host.directory("/var/lib/corvista", 0700);
    const std::string text(10000, 'x');
    host.file(kFile, text, 0600);
    std::vector<std::string> told;
    History history(kPlace, [&told](const std::string& line) { told.push_back(line); });
    ASSERT_THAT(movedAside(host), SizeIs(1));
    EXPECT_EQ(host.read("/var/lib/corvista/" + movedAside(host).front()), text);
    ASSERT_THAT(told, SizeIs(1));
    EXPECT_THAT(told.front(), HasSubstr(movedAside(host).front()));
    EXPECT_GT(kept::append(history, kept::event("x")), 1700000000U) << "no number is given again";
}

/// Zeros in the middle of the file, where the entries are.
void damage() {
    std::fstream file(kFile, std::ios::in | std::ios::out | std::ios::binary);
    const auto size = std::filesystem::file_size(kFile);
    file.seekp(4096);
    file << std::string(size - 4096, '\0');
}

void fill(History& history, std::size_t count) {
    std::vector<Event> events(count, kept::event(std::string(200, 'x'), Event::Kind::changed));
    history.append(events);
}

HOST_TEST(HistoryFile, WithDamagedPagesIsMovedAsideWhileItIsInUse) {
    History history(kPlace);
    History other(kPlace);
    fill(history, 2000);
    kept::append(other, kept::event("x"));
    Database(kFile, Database::Access::write).execute("PRAGMA wal_checkpoint(TRUNCATE)");
    damage();
    const std::uint64_t number = kept::append(history, kept::event("y"));
    EXPECT_GT(number, 1700000000U) << "nobody knows what the others have given";
    EXPECT_THAT(movedAside(host), SizeIs(1));
    EXPECT_EQ(kept::append(other, kept::event("z")), number + 1) << "it goes on in the new file";
    EXPECT_THAT(kept::messages(History(kPlace).read({}, kAll)), ElementsAre("y", "z"));
}

HOST_TEST(HistoryFile, WithAHeaderOfZerosGoesOnBeyondAllNumbers) {
    {
        History history(kPlace);
        fill(history, 10);
    }
    std::filesystem::remove(kFile + "-wal");
    std::filesystem::remove(kFile + "-shm");
    {
        std::fstream file(kFile, std::ios::in | std::ios::out | std::ios::binary);
        file << std::string(4096, 'z');
    }
    History history(kPlace);
    EXPECT_GT(kept::append(history, kept::event("x")), 1700000000U);
}

HOST_TEST(HistoryFile, ThatLacksATableIsMovedAside) {
    for (const char* table : {"entries", "runs", "facts"}) {
        kept::append(*std::make_unique<History>(kPlace), kept::event("x"));
        Database(kFile, Database::Access::write).execute((std::string("DROP TABLE ") + table).c_str());
        const std::size_t before = movedAside(host).size();
        History history(kPlace);
        kept::append(history, kept::event("y"));
        EXPECT_THAT(kept::messages(history.read({}, kAll)), ElementsAre("y")) << table;
        EXPECT_THAT(movedAside(host), SizeIs(before + 1)) << table;
    }
}

HOST_TEST(HistoryFile, ThatWasEmptiedGoesOnBeyondAllNumbers) {
    {
        History history(kPlace);
        fill(history, 10);
    }
    std::filesystem::resize_file(kFile, 0);
    std::filesystem::resize_file(kFile + "-wal", 0);
    EXPECT_GT(kept::append(*std::make_unique<History>(kPlace), kept::event("x")), 1700000000U);
}

HOST_TEST(HistoryFile, ThatWasRemovedIsMadeAnewAndItsNumbersGoOn) {
    History history(kPlace);
    fill(history, 3);
    host.remove("/var/lib/corvista");
    EXPECT_EQ(kept::append(history, kept::event("x")), 4U);
    EXPECT_THAT(kept::messages(History(kPlace).read({}, kAll)), ElementsAre("x"));
}

HOST_TEST(HistoryFile, OfALaterVersionIsRefusedAndLeftAsItIs) {
    kept::append(*std::make_unique<History>(kPlace), kept::event("x"));
    Database(kFile, Database::Access::write)
        .execute("PRAGMA user_version = 7; PRAGMA wal_checkpoint(TRUNCATE)");
    const auto before = host.read(kFile);
    EXPECT_EQ(openProblem(), "newer");
    EXPECT_EQ(problem([] { HistoryReader reader(kPlace); }), "newer");
    EXPECT_EQ(host.read(kFile), before);
    EXPECT_THAT(movedAside(host), IsEmpty());
}

/// A history of the first form, with one entry, as its program left it.
void makeOfFirstForm(FakeHost& host) {
    host.directory("/var/lib/corvista", 0700);
    host.file(kFile, "", 0600);
    const Database database(kFile, Database::Access::write);
    database.execute(R"sql(
CREATE TABLE runs (run INTEGER PRIMARY KEY AUTOINCREMENT, boot TEXT NOT NULL, began INTEGER NOT NULL);
CREATE TABLE entries (
  number INTEGER PRIMARY KEY AUTOINCREMENT, run INTEGER NOT NULL REFERENCES runs, kind TEXT NOT NULL,
  time INTEGER NOT NULL, path TEXT NOT NULL, message TEXT NOT NULL, node INTEGER NOT NULL,
  class TEXT NOT NULL, property INTEGER NOT NULL, name TEXT NOT NULL, before TEXT NOT NULL,
  after TEXT NOT NULL, caller TEXT NOT NULL, wanted TEXT NOT NULL, verdict TEXT NOT NULL,
  first_code INTEGER NOT NULL, second_code INTEGER NOT NULL, event_code INTEGER NOT NULL);
CREATE INDEX alerts_of_paths ON entries (path, number) WHERE kind = 'alert';
CREATE TABLE marks (uid INTEGER PRIMARY KEY, number INTEGER NOT NULL);
CREATE TABLE facts (name TEXT PRIMARY KEY, value INTEGER NOT NULL);
INSERT INTO runs VALUES (1, 'a boot', 1795262400);
INSERT INTO entries VALUES (41, 1, 'written', 1795262400, '/oshw/root/computer', 'of old', 3, 'computer',
  116, 'OwnerName', 'a', 'b', 'root', 'b', 'applied', 0, 0, 0);
PRAGMA application_id = 0x43764873;
PRAGMA user_version = 1)sql");
    database.execute("PRAGMA wal_checkpoint(TRUNCATE)");
}

HOST_TEST(HistoryFile, OfTheFormWithoutPlansIsReadAsItIs) {
    makeOfFirstForm(host);
    const auto before = host.read(kFile);
    const auto entries = HistoryReader(kPlace).read({}, kAll);
    ASSERT_THAT(kept::messages(entries), ElementsAre("of old"));
    EXPECT_EQ(entries[0].event.verdict, "applied");
    EXPECT_EQ(entries[0].event.plan, "");
    EXPECT_EQ(entries[0].boot, "a boot");
    EXPECT_EQ(host.read(kFile), before);
}

HOST_TEST(HistoryFile, OfTheFormWithoutPlansGetsThemWithTheNextEntry) {
    makeOfFirstForm(host);
    History history(kPlace);
    Event planned = kept::event("new");
    planned.plan = R"({"files": []})";
    EXPECT_EQ(kept::append(history, planned), 42U);
    const auto entries = HistoryReader(kPlace).read({}, kAll);
    ASSERT_THAT(kept::messages(entries), ElementsAre("of old", "new"));
    EXPECT_EQ(entries[0].event.plan, "");
    EXPECT_EQ(entries[1].event.plan, planned.plan);
    EXPECT_EQ(Database(kFile, Database::Access::read).number("PRAGMA user_version"), 2);
}

HOST_TEST(HistoryFile, OfAnotherProgramIsRefusedAndLeftAsItIs) {
    host.directory("/var/lib/corvista", 0700);
    host.file(kFile, "", 0600);
    Database(kFile, Database::Access::write).execute("CREATE TABLE pages (url)");
    const auto before = host.read(kFile);
    EXPECT_EQ(openProblem(), "foreign");
    EXPECT_EQ(host.read(kFile), before);
}

HOST_TEST(HistoryFile, OnAFullDiskKeepsWhatItHas) {
    host.directory("/var/lib/corvista", 0700);
    host.mountOver("/var/lib/corvista", [] {
        if (mount("small", "/var/lib/corvista", "tmpfs", 0, "size=400k,mode=700") != 0) {
            throw std::runtime_error("cannot mount a small disk");
        }
    });
    History history(kPlace);
    host.file("/var/lib/corvista/others", std::string(100000, 'x'));
    std::size_t appended = 0;
    std::string found = "none";
    while (found == "none" && appended < 10000) {
        found = problem([&] { fill(history, 10); });
        appended += found == "none" ? 10 : 0;
    }
    EXPECT_EQ(found, "full");
    EXPECT_THAT(history.read({}, kAll), SizeIs(appended));
    EXPECT_THAT(HistoryReader(kPlace).read({}, kAll), SizeIs(appended));
    host.remove("/var/lib/corvista/others");
    EXPECT_EQ(kept::append(history, kept::event("room again")), appended + 1);
}

HOST_TEST(HistoryFile, ThatMayNotGrowTellsThatItIsFull) {
    History history(kPlace);
    kept::append(history, kept::event("before"));
    std::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{100000, 100000};
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limit), 0);
    EXPECT_EQ(problem([&] { fill(history, 2000); }), "full");
    EXPECT_THAT(kept::messages(history.read({}, kAll)), ElementsAre("before"));
    EXPECT_EQ(kept::append(history, kept::event("short")), 2U);
}

HOST_TEST(HistoryFile, ThatCannotBeWrittenIsRead) {
    kept::append(*std::make_unique<History>(kPlace), kept::event("x"));
    host.readOnly("/var/lib/corvista");
    EXPECT_EQ(openProblem(), "readOnly");
    EXPECT_THAT(kept::messages(HistoryReader(kPlace).read({}, kAll)), ElementsAre("x"));
}

HOST_TEST(HistoryFile, ThatIsMissingIsNotMadeByAReader) {
    EXPECT_EQ(problem([] { HistoryReader reader(kPlace); }), "absent");
    EXPECT_FALSE(host.exists("/var/lib/corvista"));
}

HOST_TEST(HistoryFile, ThatAnotherWritesAllTheTimeIsBusy) {
    History history(kPlace);
    kept::append(history, kept::event("x"));
    const Database other(kFile, Database::Access::write);
    cvagent::Transaction transaction(other);
    EXPECT_EQ(problem([&] { fill(history, 1); }), "busy");
}

}  // namespace
