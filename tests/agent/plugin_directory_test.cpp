// The plug-ins beside the program: which are found, which are left out, one tree of all of them.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <filesystem>
#include <nlohmann/json.hpp>

#include "tests/agent/suse_host.h"
#include "tests/support/fake_host.h"

namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

const std::string kPlugins = "/srv/lib/corvista/plug-ins/";

/// The program and its plug-ins as they are installed, in a place where a test may change them.
class Installed {
public:
    explicit Installed(FakeHost& host) : host_(host), suse_(host) {
        copy(CVAGENT_PROGRAM, "/srv/bin/cvagent");
        copy(FRAMEWORK_FILE, "/srv/lib/libvantrelcvframework.so.1");
        copy(CORVISTA_PLUGIN_FILE, "/srv/lib/libvantrelcvicoshwmi.so.1");
        host.directory("/srv/lib/corvista/plug-ins");
        host.tool("ifconfig lo", "lo        Link encap:Local Loopback\n");  // what the doctor asks
    }
    void copy(const std::string& from, const std::string& to) {
        host_.directory(fs::path(to).parent_path());
        fs::copy_file(from, to);
    }
    /// The hardware plug-in with a link from its name to its version, as it is installed.
    void addHardware() {
        copy(HARDWARE_FILE, kPlugins + "libcorvistahardware.so.1.0.0");
        host_.symlink(kPlugins + "libcorvistahardware.so.1", "libcorvistahardware.so.1.0.0");
        copy(fs::path(HARDWARE_FILE).parent_path() / "libcorvistahardware.json",
             kPlugins + "libcorvistahardware.json");
    }
    void addUptime(const std::string& name = "libuptime") {
        copy(UPTIME_FILE, kPlugins + name + ".so.1");
        copy(fs::path(UPTIME_FILE).parent_path() / "libuptime.json", kPlugins + name + ".json");
    }
    Finished operator()(std::vector<std::string> words) {
        words.insert(words.begin(), {"/srv/bin/cvagent", "--host-tools", "native"});
        return host_.run(words);
    }
    std::string treeOfTheFirst() {
        return (*this)({"--plugin", "/srv/lib/libvantrelcvicoshwmi.so.1", "tree"}).out;
    }

private:
    FakeHost& host_;
    SuseHost suse_;
};

HOST_TEST(PluginDirectory, AddsTreesBelowTheFirstOne) {
    Installed cvagent(host);
    const std::string first = cvagent.treeOfTheFirst();
    cvagent.addHardware();
    cvagent.addUptime();
    const Finished run = cvagent({"tree"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err, "");
    EXPECT_THAT(run.out, StartsWith(first));
    EXPECT_THAT(run.out, HasSubstr("\nhardware [100000001]\n"));
    EXPECT_THAT(run.out, HasSubstr("\nuptime [200000001]\n"));
    EXPECT_THAT(first, StartsWith("oshw [1]"));
}

HOST_TEST(PluginDirectory, IsReplacedByThePluginsNamed) {
    Installed cvagent(host);
    cvagent.addUptime();
    EXPECT_THAT(cvagent.treeOfTheFirst(), Not(HasSubstr("uptime")));
    const Finished alone = cvagent({"--plugin", kPlugins + "libuptime.so.1", "tree"});
    EXPECT_EQ(alone.out, "uptime [1]\n");
}

HOST_TEST(PluginDirectory, ThePluginOfTheDocumentIsReadByItsNames) {
    Installed cvagent(host);
    cvagent.addUptime();
    EXPECT_THAT(cvagent({"get", "uptime", "Uptime"}).out,
                testing::MatchesRegex("/uptime \\[100000001\\]\n  90001  Uptime  [0-9.]+ s\n"));
    const auto json = nlohmann::json::parse(cvagent({"get", "uptime", "90001", "--json"}).out);
    EXPECT_EQ(json["class"], "uptime");
    const nlohmann::json& uptime = json["properties"]["90001"];
    EXPECT_EQ(uptime["name"], "Uptime");
    EXPECT_EQ(uptime["unit"], "s");
    EXPECT_GT(uptime["value"].get<double>(), 0);
    const Finished properties = cvagent({"properties", "uptime"});
    EXPECT_THAT(properties.out, AllOf(StartsWith("uptime\n"), HasSubstr("number, s"),
                                      HasSubstr("for how long the host has been running"),
                                      HasSubstr("source: /proc/uptime\n")));
    EXPECT_THAT(cvagent({"properties"}).out, AllOf(HasSubstr("network-port\n"), HasSubstr("\nuptime\n")));
}

HOST_TEST(PluginDirectory, ANameAloneMeansTheFirstPluginsNode) {
    Installed cvagent(host);
    cvagent.addHardware();
    host.file("/sys/class/net/eth0/address", "00:14:5e:00:00:01\n");
    host.file("/sys/class/net/eth0/type", "1\n");
    host.file("/sys/class/net/eth7/address", "00:14:5e:00:00:07\n");
    host.file("/sys/class/net/eth7/type", "1\n");
    EXPECT_THAT(cvagent({"get", "link:eth0", "Name"}).out, StartsWith("/hardware/link:eth0 ["));
    const Finished bare = cvagent({"get", "eth0"});
    EXPECT_EQ(bare.status, 3);
    EXPECT_THAT(bare.err, AllOf(HasSubstr("network-port:eth0"), Not(HasSubstr("link:eth0"))));
    EXPECT_THAT(cvagent({"get", "eth7", "Name"}).out, StartsWith("/hardware/link:eth7 ["));
    EXPECT_THAT(cvagent({"get", "/hardware/link:eth0", "Name"}).out, StartsWith("/hardware/link:eth0 ["));
    EXPECT_THAT(cvagent({"get", "computer", "HostName"}).out, StartsWith("/oshw/root/computer ["));
}

HOST_TEST(PluginDirectory, OneThatFailsIsToldAndCostsNothingOfTheOthers) {
    Installed cvagent(host);
    cvagent.addUptime();
    const std::string good = cvagent({"tree"}).out;
    host.file(kPlugins + "libzempty.so.1", "");
    cvagent.copy(FRAMEWORK_FILE, kPlugins + "libznone.so.1");
    const Finished tree = cvagent({"tree"});
    EXPECT_EQ(tree.status, 1);
    EXPECT_EQ(tree.out, good);
    EXPECT_THAT(tree.err, AllOf(HasSubstr("libzempty.so.1: file too short"), HasSubstr("has no OpenMI")));
    EXPECT_EQ(cvagent({"get", "computer", "HostName"}).status, 0);
    cvagent.copy(FAKE_PLUGIN_FILE, kPlugins + "libzfake.so.1");
    for (const std::string words : {"fail", "throwstart", "badstart", "foreignids"}) {
        setenv("CORVISTA_FAKE_PLUGIN", words.c_str(), 1);
        EXPECT_EQ(cvagent({"tree"}).out, good) << words;
    }
}

HOST_TEST(PluginDirectory, TheOthersWorkWithoutTheFirst) {
    Installed cvagent(host);
    cvagent.addUptime();
    host.remove("/srv/lib/libvantrelcvicoshwmi.so.1");
    const Finished run = cvagent({"tree"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.out, "uptime [1]\n");
    EXPECT_THAT(run.err, HasSubstr("there is no libvantrelcvicoshwmi.so.1 beside this program"));
}

HOST_TEST(PluginDirectory, OtherFilesInItAreNoPlugins) {
    Installed cvagent(host);
    cvagent.addUptime();
    for (const std::string name : {"README", ".libhidden.so.1", "libx.so", "libx.so.2", "libx.so.1~"}) {
        host.file(kPlugins + name, "no library");
    }
    const Finished run = cvagent({"tree"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err, "");
}

/// A file there that must not be used; the marker is what its code would leave behind.
void expectLeftOut(Installed& cvagent, const std::string& reason) {
    const Finished run = cvagent({"tree"});
    EXPECT_EQ(run.status, 1) << reason;
    EXPECT_THAT(run.out, AllOf(StartsWith("oshw [1]"), Not(HasSubstr("uptime")), Not(HasSubstr("type-900"))));
    EXPECT_THAT(run.err, AllOf(HasSubstr("libuptime.so.1' is left out: "), HasSubstr(reason)));
    EXPECT_EQ(cvagent({"get", "computer", "HostName"}).status, 0);
    EXPECT_THAT(cvagent({"doctor"}).out, HasSubstr("libuptime.so.1' is left out: "));
    EXPECT_THAT(cvagent({"properties"}).out, Not(HasSubstr("uptime\n")));
}

HOST_TEST(StrangersPlugin, ThatOthersCanWriteIsLeftOut) {
    Installed cvagent(host);
    cvagent.addUptime();
    const std::string file = kPlugins + "libuptime.so.1";
    for (const std::string& place : {file, kPlugins}) {
        ASSERT_EQ(chmod(place.c_str(), 0777), 0);
        expectLeftOut(cvagent, "can be written by others");
        ASSERT_EQ(chmod(place.c_str(), 0755), 0);
    }
    host.directory("/srv/elsewhere");
    fs::rename(file, "/srv/elsewhere/lib.so");
    host.symlink(file, "/srv/elsewhere/lib.so");
    ASSERT_EQ(chmod(kPlugins.c_str(), 0777), 0);  // who has made the link is not known, wherever it leads
    expectLeftOut(cvagent, "can be written by others");
    ASSERT_EQ(chmod(kPlugins.c_str(), 01777), 0);  // keeps who is there, not who comes
    expectLeftOut(cvagent, "can be written by others");
    ASSERT_EQ(chmod(kPlugins.c_str(), 0755), 0);
    ASSERT_EQ(chmod("/srv/lib/corvista", 0777), 0);
    expectLeftOut(cvagent, "'/srv/lib/corvista' can be written by others");
    ASSERT_EQ(chmod("/srv/lib/corvista", 0755), 0);
    EXPECT_EQ(cvagent({"tree"}).status, 0);
}

HOST_TEST(StrangersPlugin, ThatBelongsToAnotherIsLeftOut) {
    Installed cvagent(host);
    cvagent.addUptime();
    if (!host.giveToStranger(kPlugins + "libuptime.so.1")) {
        GTEST_SKIP() << "the tests do not run as root";
    }
    expectLeftOut(cvagent, "belongs to somebody else");
    // A link of ours to a file of his, and to one in a directory of his.
    host.remove(kPlugins + "libuptime.so.1");
    host.directory("/home/x");
    cvagent.copy(UPTIME_FILE, "/home/x/lib.so");
    host.symlink(kPlugins + "libuptime.so.1", "/home/x/lib.so");
    ASSERT_TRUE(host.giveToStranger("/home/x"));
    expectLeftOut(cvagent, "'/home/x' belongs to somebody else");
}

// Root that runs a user's build trusts that user already.
HOST_TEST(StrangersPlugin, OfWhoOwnsTheProgramIsNone) {
    Installed cvagent(host);
    cvagent.addUptime();
    if (!host.giveToStranger(kPlugins + "libuptime.so.1") || !host.giveToStranger("/srv/bin/cvagent")) {
        GTEST_SKIP() << "the tests do not run as root";
    }
    const Finished run = cvagent({"tree"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("\nuptime ["));
}

HOST_TEST(StrangersPlugin, ThatIsNoFileHangsNobody) {
    Installed cvagent(host);
    ASSERT_EQ(mkfifo((kPlugins + "libuptime.so.1").c_str(), 0600), 0);
    expectLeftOut(cvagent, "it is no regular file");
    host.remove(kPlugins + "libuptime.so.1");
    host.directory(kPlugins + "libuptime.so.1");
    expectLeftOut(cvagent, "it is no regular file");
    host.remove(kPlugins + "libuptime.so.1");
    host.symlink(kPlugins + "libuptime.so.1", "nowhere");
    expectLeftOut(cvagent, "it leads nowhere");
}

HOST_TEST(StrangersPlugin, ANameCannotSteerTheTerminal) {
    Installed cvagent(host);
    host.file(kPlugins + "lib\x1b[2J\nevil.so.1", "", 0777);
    ASSERT_EQ(chmod((kPlugins + "lib\x1b[2J\nevil.so.1").c_str(), 0777), 0);
    for (const std::string command : {"tree", "doctor"}) {
        const Finished run = cvagent({command});
        EXPECT_THAT(run.out + run.err, HasSubstr("lib\\x1b[2J\\x0aevil.so.1"));
        EXPECT_THAT(run.out + run.err, Not(HasSubstr("\x1b[2J")));
    }
}

HOST_TEST(StrangersNames, CostOnlyNames) {
    Installed cvagent(host);
    cvagent.addUptime();
    const std::string file = kPlugins + "libuptime.json";
    const std::string good = *host.read(file);
    ASSERT_EQ(chmod(file.c_str(), 0666), 0);
    const Finished open = cvagent({"tree"});
    EXPECT_EQ(open.status, 0);
    EXPECT_THAT(open.out, HasSubstr("\ntype-900:0 [100000001]\n"));
    EXPECT_THAT(open.err, HasSubstr("libuptime.json' are left out: '" + file + "' can be written by others"));
    for (const std::string& damaged : {std::string(), std::string("{"), good.substr(0, good.size() / 2),
                                       std::string("[1]"), std::string(1U << 21U, '[')}) {
        host.remove(file);
        host.file(file, damaged);
        const Finished run = cvagent({"tree"});
        EXPECT_EQ(run.status, 0);
        EXPECT_THAT(run.out, HasSubstr("\ntype-900:0 [100000001]\n"));
        EXPECT_THAT(run.err, HasSubstr("libuptime.json' are left out: "));
    }
    host.remove(file);
    ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
    EXPECT_THAT(cvagent({"tree"}).err, HasSubstr("are left out: it is no regular file"));
    EXPECT_EQ(cvagent({"doctor"}).status, 0);
    host.remove(file);
    EXPECT_EQ(cvagent({"tree"}).err, "");
}

HOST_TEST(StrangersNames, CannotRenameWhatOthersShow) {
    Installed cvagent(host);
    cvagent.addUptime();
    const std::string names = cvagent({"properties", "computer"}).out;
    host.file(kPlugins + "libuptime.json",
              R"({"classes": [{"type": 40, "name": "mine"}, {"type": 901, "name": "computer"},
                  {"type": 900, "name": "uptime"}], "properties": [
                  {"class": 40, "id": 108, "name": "Fake", "kind": "text"},
                  {"class": 12, "id": 57, "name": "Fake", "kind": "text"}]})");
    const Finished run = cvagent({"tree"});
    EXPECT_THAT(run.err, AllOf(HasSubstr("the class 40 'mine' is another's already"),
                               HasSubstr("the class 901 'computer' is another's already"),
                               HasSubstr("the property Fake of a class that is not the plug-in's own")));
    EXPECT_THAT(run.out, HasSubstr("\nuptime [100000001]\n"));
    EXPECT_EQ(cvagent({"properties", "computer"}).out, names);
    // Two plug-ins with the same names: the second one's are told.
    cvagent.addUptime("libuptime2");
    const Finished both = cvagent({"properties", "uptime"});
    EXPECT_THAT(both.err, HasSubstr("libuptime2.json' are left out: the class 900 'uptime' is another's"));
}

HOST_TEST(PluginDirectory, IsNamedByTheDoctor) {
    Installed cvagent(host);
    cvagent.addHardware();
    EXPECT_THAT(cvagent({"doctor"}).out,
                HasSubstr("PLUG-INS\n  /srv/lib/libvantrelcvicoshwmi.so.1\n  " + kPlugins +
                          "libcorvistahardware.so.1  with names of its own\n"));
}

HOST_TEST(TrustedProperties, AreToldToRootOnly) {
    Installed cvagent(host);
    cvagent.addHardware();
    host.file("/sys/class/dmi/id/product_serial", "S3CR3T\n", 0644);  // even where everybody could read it
    host.file("/sys/class/dmi/id/product_name", "Model 1\n");
    for (const std::vector<std::string>& words :
         {std::vector<std::string>{"get", "system"}, {"get", "system", "--json"}, {"tree", "--json"}}) {
        EXPECT_THAT(cvagent(words).out, HasSubstr("S3CR3T"));
    }
    host.directory("/home/x");
    if (!host.giveToStranger("/home/x")) {
        GTEST_SKIP() << "the tests do not run as root";
    }
    host.realTool("setpriv");
    const auto asStranger = [&host](const std::vector<std::string>& words) {
        std::vector<std::string> line = {"setpriv",          "--reuid=12345", "--regid=12345",
                                         "--keep-groups",    "env",           "HOME=/home/x",
                                         "/srv/bin/cvagent", "--host-tools",  "native"};
        line.insert(line.end(), words.begin(), words.end());
        return host.run(line).out;
    };
    for (const std::vector<std::string>& words :
         {std::vector<std::string>{"get", "system"}, {"get", "system", "--json"}, {"tree", "--json"}}) {
        EXPECT_THAT(asStranger(words), AllOf(HasSubstr("Model 1"), Not(HasSubstr("S3CR3T"))));
    }
    EXPECT_THAT(asStranger({"get", "system", "SerialNumber"}), HasSubstr("SerialNumber  told to root only"));
}

}  // namespace
