#include "mi/line_file.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <thread>

#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"

namespace {

using IC::LineFile;
using Fate = LineFile::Fate;

Fate keepAll(std::string&) {
    return Fate::keep;
}

/// Replaces every line that contains "KEY=".
Fate replaceKey(std::string& line) {
    if (line.find("KEY=") != std::string::npos) {
        line = "KEY=new\n";
    }
    return Fate::keep;
}

void editKey(const char* path) {
    auto file = LineFile::read(path);
    ASSERT_TRUE(file);
    file->rewrite(replaceKey);
    EXPECT_TRUE(file->write(path));
}

std::string ofLength(std::size_t length, const std::string& start) {
    return start + std::string(length - start.size(), 'x');
}

HOST_TEST(LineFile, KeepsWhatNoRuleTouchesByteForByte) {
    const std::string contents[] = {
        "",
        "\n\n",
        "# comment\n\tkey = value \nlast\n",
        "dos\r\nlines\r\n",
        "no line break at the end",
        std::string("nul\0inside\n", 11),
        "\xff\xfe not UTF-8 \xc3\n",
        ofLength(511, "a") + "\n" + ofLength(512, "b") + "\n" + ofLength(513, "c") + "\n" +
            ofLength(5000, "d"),
    };
    for (const std::string& content : contents) {
        host.file("/etc/file", content);
        auto file = LineFile::read("/etc/file");
        ASSERT_TRUE(file);
        file->rewrite(keepAll);
        EXPECT_TRUE(file->write("/etc/file"));
        EXPECT_EQ(host.read("/etc/file"), content);
    }
}

HOST_TEST(LineFile, ReplacesALineInPlace) {
    host.file("/etc/file", "first\nKEY=old\r\nlast");
    editKey("/etc/file");
    EXPECT_EQ(host.read("/etc/file"), "first\nKEY=new\nlast");
}

HOST_TEST(LineFile, DropsALine) {
    host.file("/etc/file", "a\nb\nc\n");
    auto file = LineFile::read("/etc/file");
    ASSERT_TRUE(file);
    file->rewrite([](std::string& line) { return line == "b\n" ? Fate::drop : Fate::keep; });
    EXPECT_EQ(file->lines(), (std::vector<std::string>{"a\n", "c\n"}));
}

HOST_TEST(LineFile, ShowsARuleTheWholeOfEveryLine) {
    const std::string content =
        ofLength(512, "KEY=") + "\n" + ofLength(513, "KEY=") + "\n" + ofLength(100000, "KEY=");
    host.file("/etc/file", content);
    auto file = LineFile::read("/etc/file");
    ASSERT_TRUE(file);
    std::string seen;
    file->rewrite([&](const std::string& line) {
        seen += line;
        return Fate::keep;
    });
    EXPECT_TRUE(seen == content);
    EXPECT_EQ(file->lines().size(), 3U);
    editKey("/etc/file");
    EXPECT_EQ(host.read("/etc/file"), "KEY=new\nKEY=new\nKEY=new\n");
}

HOST_TEST(LineFile, AppendsBehindALastLineWithoutLineBreak) {
    host.file("/etc/file", "first\nlast");
    auto file = LineFile::read("/etc/file");
    ASSERT_TRUE(file);
    file->append("new\n");
    file->prepend("top\n");
    file->write("/etc/file");
    EXPECT_EQ(host.read("/etc/file"), "top\nfirst\nlast\nnew\n");
}

HOST_TEST(LineFile, CreatesAMissingFile) {
    EXPECT_FALSE(LineFile::read("/etc/missing"));
    LineFile file;
    file.append("only\n");
    EXPECT_TRUE(file.write("/etc/missing"));
    EXPECT_EQ(host.read("/etc/missing"), "only\n");
}

HOST_TEST(LineFile, SaysWhenAFileCannotBeOpenedForWriting) {
    host.file("/etc/keep/file", "old\n");
    host.readOnly("/etc/keep");
    LineFile file;
    file.append("new\n");
    EXPECT_FALSE(file.write("/etc/keep/file"));
    EXPECT_EQ(host.read("/etc/keep/file"), "old\n");
}

/// A file of that many bytes that finds no room.
void expectNoRoom(FakeHost& host, const char* path, std::size_t bytes) {
    LineFile file;
    file.append(std::string(bytes - 1, 'n') + "\n");
    LogCapture capture;
    EXPECT_EQ(file.replace(path), LineFile::Written::notWhole);
    EXPECT_TRUE(file.write(path)) << "a writer that goes on either way takes it for opened";
    const std::string line = std::string("Could not write all of '") + path + "'.";
    EXPECT_EQ(capture.messages(6000), (std::vector<std::string>{line, line}));
    EXPECT_EQ(host.read(path), "old\n");
}

HOST_TEST(LineFile, CannotOpenAFileThatAFullDiskDoesNotLetBeOpened) {
    host.file("/etc/full/file", "old\n");
    host.fullDisk("/etc/full");
    LineFile file;
    file.append("new\n");
    const LogCapture capture;
    EXPECT_FALSE(file.write("/etc/full/file"));
    EXPECT_TRUE(capture.messages(6000).empty()) << "the writer says it in its own words";
    EXPECT_EQ(host.read("/etc/full/file"), "old\n");
}

HOST_TEST(LineFile, LeavesTheOldFileWhenTheProcessMayNotWriteALongerOne) {
    host.file("/etc/file", "old\n");
    rlimit limit{};
    ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &limit), 0);
    const rlimit low{4096, limit.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &low), 0);
    expectNoRoom(host, "/etc/file", 4097);
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limit), 0);
}

HOST_TEST(LineFile, LeavesTheOldFileWhenTheDiskHasNoRoomForALongerOne) {
    host.directory("/etc/small");
    ASSERT_EQ(mount("small", "/etc/small", "tmpfs", 0, "size=16k"), 0);
    host.file("/etc/small/file", "old\n");
    expectNoRoom(host, "/etc/small/file", 20000);
    LineFile shorter;
    shorter.append("new\n");
    EXPECT_EQ(shorter.replace("/etc/small/file"), LineFile::Written::whole);
    EXPECT_EQ(host.read("/etc/small/file"), "new\n");
}

HOST_TEST(LineFile, SaysWhenAFileThatCannotReserveRoomEndsHalfWay) {
    LineFile file;
    file.append("new\n");
    LogCapture capture;
    EXPECT_EQ(file.replace("/dev/full"), LineFile::Written::notWhole);
    EXPECT_EQ(capture.messages(6000), std::vector<std::string>{"Could not write all of '/dev/full'."});
}

HOST_TEST(LineFile, KeepsTheFilesRightsAndLinksAndCutsALongerOne) {
    host.file("/etc/real", std::string(9000, 'o'), 0640);
    host.symlink("/etc/link", "real");
    LineFile file;
    file.append("new\n");
    EXPECT_EQ(file.replace("/etc/link"), LineFile::Written::whole);
    EXPECT_EQ(host.read("/etc/real"), "new\n");
    struct stat after {};
    ASSERT_EQ(lstat("/etc/real", &after), 0);
    EXPECT_EQ(after.st_mode, S_IFREG | 0640U);
    EXPECT_TRUE(std::filesystem::is_symlink("/etc/link"));
}

HOST_TEST(LineFile, DoesNotTakeWhatCannotBeReadForAnEmptyFile) {
    host.symlink("/etc/file", "/proc/self/mem");  // opens, and its first byte is no memory
    EXPECT_FALSE(LineFile::read("/etc/file"));
}

HOST_TEST(LineFile, FindsNoLinesInADirectoryAndCannotOpenItForWriting) {
    host.directory("/etc/file");
    const auto file = LineFile::read("/etc/file");
    ASSERT_TRUE(file);
    EXPECT_TRUE(file->lines().empty());
    EXPECT_EQ(file->replace("/etc/file"), LineFile::Written::notOpened);
}

HOST_TEST(LineFile, EndsALastLineWithoutLineBreak) {
    for (const char* content : {"first\nlast", "first\nlast\n"}) {
        host.file("/etc/file", content);
        auto file = LineFile::read("/etc/file");
        ASSERT_TRUE(file);
        file->endLastLine();
        EXPECT_EQ(file->lines(), (std::vector<std::string>{"first\n", "last\n"}));
    }
    LineFile none;
    none.endLastLine();
    EXPECT_TRUE(none.lines().empty());
}

HOST_TEST(LineFile, GoesOnWritingAfterASignal) {
    ASSERT_EQ(mkfifo("/tmp/pipe", 0600), 0);
    LineFile file;
    file.append(std::string(400'000, 'x') + "\n");
    sigset_t alarms;
    sigemptyset(&alarms);
    sigaddset(&alarms, SIGALRM);
    pthread_sigmask(SIG_BLOCK, &alarms, nullptr);
    std::size_t read = 0;
    // There before the writer, whose open would otherwise wait and be interrupted; it reads once the writer
    // waits.
    const int reading = open("/tmp/pipe", O_RDONLY | O_NONBLOCK);
    std::thread reader([&] {
        for (int waiting = 0; waiting == 0; std::this_thread::sleep_for(std::chrono::milliseconds(1))) {
            ioctl(reading, FIONREAD, &waiting);
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
        fcntl(reading, F_SETFL, 0);
        std::array<char, 4096> piece{};
        for (ssize_t got = 0; (got = ::read(reading, piece.data(), piece.size())) > 0;) {
            read += static_cast<std::size_t>(got);
        }
        close(reading);
    });
    pthread_sigmask(SIG_UNBLOCK, &alarms, nullptr);
    struct sigaction interrupting {};
    interrupting.sa_handler = [](int) {};
    sigaction(SIGALRM, &interrupting, nullptr);
    const itimerval often{{0, 5000}, {0, 5000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    EXPECT_TRUE(file.write("/tmp/pipe"));
    const itimerval never{};
    setitimer(ITIMER_REAL, &never, nullptr);
    reader.join();
    EXPECT_EQ(read, 400'001U);
}

}  // namespace
