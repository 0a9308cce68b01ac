#include <gtest/gtest.h>

#include <cstdlib>
#include <optional>
#include <string>

#include "framework/qx/corvista_utilities.h"
#include "framework/qx/path.h"

namespace {

using QX::CorvistaUtilities;

class DataDirectory : public testing::Test {
protected:
    DataDirectory() {
        if (const char* const old = getenv("CORVISTA_DATA_DIR")) {
            old_ = old;
        }
    }
    ~DataDirectory() override {
        old_ ? setenv("CORVISTA_DATA_DIR", old_->c_str(), 1) : unsetenv("CORVISTA_DATA_DIR");
    }

private:
    std::optional<std::string> old_;
};

TEST_F(DataDirectory, IsTheFixedOneByItself) {
    unsetenv("CORVISTA_DATA_DIR");
    EXPECT_STREQ(CorvistaUtilities::getMoraineDataDir(), "/opt/vantrel/corvista/data/");
}

TEST_F(DataDirectory, EndsWithASlashHoweverItIsNamed) {
    setenv("CORVISTA_DATA_DIR", "/tmp/data", 1);
    EXPECT_STREQ(CorvistaUtilities::getMoraineDataDir(), "/tmp/data/");
    setenv("CORVISTA_DATA_DIR", "/tmp/data/", 1);
    EXPECT_STREQ(CorvistaUtilities::getMoraineDataDir(), "/tmp/data/");
    setenv("CORVISTA_DATA_DIR", "/", 1);
    EXPECT_STREQ(CorvistaUtilities::getMoraineDataDir(), "/");
}

TEST_F(DataDirectory, SetToNothingIsNone) {
    setenv("CORVISTA_DATA_DIR", "", 1);
    EXPECT_EQ(CorvistaUtilities::getMoraineDataDir(), nullptr);
}

TEST_F(DataDirectory, TheTextStaysGood) {
    setenv("CORVISTA_DATA_DIR", "/first", 1);
    const char* const first = CorvistaUtilities::getMoraineDataDir();
    setenv("CORVISTA_DATA_DIR", "/second", 1);
    EXPECT_STREQ(CorvistaUtilities::getMoraineDataDir(), "/second/");
    EXPECT_STREQ(first, "/first/");
}

TEST(Path, IsMadeFromEitherText) {
    EXPECT_EQ(QX::File::Path("/a/b").str(), "/a/b");
    EXPECT_EQ(QX::File::Path(std::string("/a/b")).str(), "/a/b");
    const char* const nothing = nullptr;
    EXPECT_EQ(QX::File::Path(nothing).str(), "");
}

}  // namespace
