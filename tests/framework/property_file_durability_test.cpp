// What a property file holds when its writer is killed, meets a full disk or another writer.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <random>
#include <thread>

#include "tests/framework/property_file_fixture.h"
#include "tests/support/texts_are.h"

namespace {

/// Told of every descriptor that is brought to the disk, just before it is.
std::function<void(int descriptor)> beforeSync;  // NOLINT(cert-err58-cpp)

/// What the disk answers for files or for directories; 0: it does its work.
int fileProblem = 0;
int directoryProblem = 0;
int refusedLocks = 0;  ///< how many locks somebody else has before one is to be had

int refuse(int problem) {
    errno = problem;
    return -1;
}

}  // namespace

extern "C" __attribute__((visibility("default"))) int fsync(int descriptor) {
    if (beforeSync) {
        beforeSync(descriptor);
    }
    struct stat status {};
    fstat(descriptor, &status);
    const int problem = S_ISDIR(status.st_mode) ? directoryProblem : fileProblem;
    return problem != 0 ? refuse(problem) : static_cast<int>(syscall(SYS_fsync, descriptor));
}

extern "C" __attribute__((visibility("default"))) int flock(int descriptor, int operation) noexcept {
    if (refusedLocks > 0) {
        --refusedLocks;
        return refuse(EWOULDBLOCK);
    }
    return static_cast<int>(syscall(SYS_flock, descriptor, operation));
}

namespace {

namespace fs = std::filesystem;
using QX::PropertyFile;
using QX::PropertyFileError;
using testing::HasSubstr;

class PropertyFileDurability : public PropertyFileFixture {};

TEST_F(PropertyFileDurability, AFullDiskLeavesTheOldFile) {
    put("a=1\n");
    const pid_t child = fork();
    if (child == 0) {
        // No more than a few bytes a file: the write fails as on a full disk.
        signal(SIGXFSZ, SIG_IGN);
        const rlimit few{100, 100};
        setrlimit(RLIMIT_FSIZE, &few);
        try {
            write({{L"a", std::wstring(10'000, L'x')}});
            _exit(1);
        } catch (const PropertyFileError&) {
            _exit(0);
        }
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(content(), "a=1\n");
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

TEST_F(PropertyFileDurability, TheContentIsOnTheDiskBeforeItsNameAndTheNameBeforeTheEnd) {
    put("a=1\n");
    std::vector<std::string> steps;
    beforeSync = [&](int descriptor) {
        struct stat status {};
        fstat(descriptor, &status);
        steps.push_back((S_ISDIR(status.st_mode) ? "directory with " : "file beside ") + content());
    };
    write({{L"a", L"2"}});
    beforeSync = nullptr;
    EXPECT_THAT(steps, TextsAre("file beside a=1\n", "directory with a=2\n"));
}

TEST_F(PropertyFileDurability, ADiskThatFailsLeavesTheOldFile) {
    put("a=1\n");
    fileProblem = EIO;
    EXPECT_THAT(textOfFailure([this] { write({{L"a", L"2"}}); }), HasSubstr("cannot bring it to the disk"));
    fileProblem = 0;
    EXPECT_EQ(content(), "a=1\n");
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

TEST_F(PropertyFileDurability, ADirectoryThatDoesNotReachTheDiskIsAFailure) {
    directoryProblem = EIO;
    EXPECT_THAT(textOfFailure([this] {
                    write({{L"a", L"2"}});
                }),
                HasSubstr("cannot bring the directory to the disk"));
    directoryProblem = EINVAL;  // a file system that has nothing to bring
    EXPECT_EQ(textOfFailure([this] { write({{L"a", L"3"}}); }), "no failure");
    directoryProblem = 0;
    EXPECT_EQ(content(), "a=3\n");
}

TEST_F(PropertyFileDurability, ADirectoryThatTookTheFilesPlaceIsAFailure) {
    PropertyFile file(path_.string());
    file.open(3);
    file.setValue(L"a", L"1");
    fs::create_directory(path_);
    EXPECT_THAT(textOfFailure([&] { file.close(); }), HasSubstr("cannot replace"));
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

TEST_F(PropertyFileDurability, ATemporaryFileThatAnotherWriterSweepsAwayIsMadeAnew) {
    refusedLocks = 2;
    write({{L"a", L"1"}});
    EXPECT_EQ(refusedLocks, 0);
    EXPECT_EQ(content(), "a=1\n");
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

TEST_F(PropertyFileDurability, LeftoversOfItsOwnAreCleanedAtTheNextWrite) {
    const std::string ours = ".asset.dat.0123456789abcdef.tmp";
    const std::vector<std::string> strangers{
        ".asset.dat.0123456789abcde.tmp", ".asset.dat.0123456789abcdeg.tmp", ".asset.dat.tmp",
        ".other.dat.0123456789abcdef.tmp", ".asset.dat.0123456789abcdef.tmp~"};
    std::ofstream(directory_ / ours) << "half a li";
    for (const std::string& name : strangers) {
        std::ofstream(directory_ / name) << "somebody else's";
    }
    write({{L"a", L"1"}});
    EXPECT_FALSE(fs::exists(directory_ / ours));
    for (const std::string& name : strangers) {
        EXPECT_TRUE(fs::exists(directory_ / name)) << name;
    }
}

TEST_F(PropertyFileDurability, TheTemporaryFileOfALiveWriterIsLeftAlone) {
    const fs::path temporary = directory_ / ".asset.dat.0123456789abcdef.tmp";
    FILE* const writer = fopen(temporary.c_str(), "w");
    ASSERT_EQ(flock(fileno(writer), LOCK_EX), 0);
    write({{L"a", L"1"}});
    EXPECT_TRUE(fs::exists(temporary));
    fclose(writer);
    write({{L"a", L"2"}});
    EXPECT_FALSE(fs::exists(temporary));
}

TEST_F(PropertyFileDurability, ManyWritersLeaveOneWholeFile) {
    std::vector<std::thread> writers;
    for (int number = 0; number < 4; ++number) {
        writers.emplace_back([this, number] {
            for (int round = 0; round < 10; ++round) {
                write({{L"a", std::to_wstring(number)}, {L"b", std::to_wstring(number)}});
            }
        });
    }
    for (std::thread& writer : writers) {
        writer.join();
    }
    const auto values = readAll();
    EXPECT_EQ(values.at(L"a"), values.at(L"b"));
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

/// The child writes one whole content after the other until it is killed.
[[noreturn]] void writeForEver(const std::string& path) {
    for (unsigned int round = 0;; ++round) {
        PropertyFile file(path);
        file.open(3);
        for (int key = 0; key < 200; ++key) {
            file.setValue(L"key " + std::to_wstring(key), std::to_wstring(round));
        }
        file.close();
    }
}

TEST_F(PropertyFileDurability, AKillAtAnyMomentLeavesOldOrNewContentNeverAMix) {
    std::mt19937 random(4711);
    std::size_t mostLeftovers = 0;
    for (int round = 0; round < 40; ++round) {
        const pid_t child = fork();
        if (child == 0) {
            writeForEver(path_);
        }
        ASSERT_GT(child, 0);
        std::this_thread::sleep_for(std::chrono::microseconds(2000 + random() % 20'000));
        kill(child, SIGKILL);
        ASSERT_EQ(waitpid(child, nullptr, 0), child);
        if (!fs::exists(path_)) {
            continue;  // killed before the first rename
        }
        const auto values = readAll();
        ASSERT_EQ(values.size(), 200U);
        for (const auto& [key, value] : values) {
            ASSERT_EQ(value, values.begin()->second) << "a mix";
        }
        mostLeftovers = std::max(mostLeftovers, names().size() - 1);
    }
    EXPECT_LE(mostLeftovers, 1U);
    write({{L"last", L"one"}});
    EXPECT_THAT(names(), TextsAre("asset.dat"));
}

}  // namespace
