// A second front end, to show what one costs: its source, its lines in the build list, and this.
#include <gmock/gmock.h>

#include "tests/support/fake_host.h"

namespace {

using testing::HasSubstr;

HOST_TEST(TinyFrontEnd, HasTheWholeAgent) {
    EXPECT_THAT(host.run({TINY_FRONT_END, FAKE_PLUGIN_FILE}).out, HasSubstr("\n/oshw/root/computer\n"));
    const Finished one = host.run({TINY_FRONT_END, FAKE_PLUGIN_FILE, "computer", "HostName"});
    EXPECT_EQ(one.out, "fake\n");
    EXPECT_EQ(one.status, 0);
}

HOST_TEST(TinyFrontEnd, HasItsOwnWordsForProblems) {
    const Finished none = host.run({TINY_FRONT_END, FAKE_PLUGIN_FILE, "nowhere", "HostName"});
    EXPECT_EQ(none.out, "kind 0: there is no node 'nowhere'\n");
    EXPECT_EQ(none.status, 10);
    EXPECT_EQ(host.run({TINY_FRONT_END, "/nowhere.so"}).out,
              "kind 5: there is no plug-in file '/nowhere.so'\n");
}

HOST_TEST(TinyFrontEnd, HasAPreparedProcess) {
    host.directory("/srv");
    const auto run = [&](const std::string& data) {
        return host.run({"sh", "-c",
                         "cd /srv && CORVISTA_DATA_DIR=" + data +
                             " exec '" TINY_FRONT_END "' '" FAKE_PLUGIN_FILE "' computer HostName"});
    };
    EXPECT_EQ(run("data").out, "fake\n");
    EXPECT_TRUE(host.read("/srv/data/.lock")) << "the name is meant from where the program was started";
    EXPECT_EQ(run("").out, "kind 2: CORVISTA_DATA_DIR is empty\n");
    EXPECT_EQ(run("").status, 12);
}

}  // namespace
