// Changes that the service has made and that are taken back, on links of a real kernel.
#include <gmock/gmock.h>

#include <csignal>
#include <filesystem>

#include "tests/agent/linked_host.h"
#include "tests/service/service_run.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using Words = std::vector<std::string>;

constexpr unsigned kUser = 12345;
constexpr unsigned kGroup = 12345;
constexpr const char* kDenied = "org.freedesktop.DBus.Error.AccessDenied";
constexpr const char* kMove =
    R"([{"node": "ip-config:eth0", "property": "IPv4Gateway", "value": "203.0.113.1"},
                                  {"node": "ip-config:eth0", "property": "SubnetMask", "value": "255.255.255.128"},
                                  {"node": "computer", "property": "OwnerName", "value": "x"},
                                  {"node": "ip-config:eth0", "property": "IPv4Address", "value": "203.0.113.7"}])";

class ServiceTakesBack : public LinkedHost {
protected:
    void setUpHost(FakeHost& host) override {
#if defined(__SANITIZE_THREAD__)
        GTEST_SKIP() << "the sanitizer's own thread keeps the program that tries changes from its fence";
#endif
        LinkedHost::setUpHost(host);
        host.file("/root/changes", kMove);
        old_ = look(host);
    }
    /// It does not see what is mounted later.
    void serve(FakeHost& host) {
        service_.emplace(host);
        service_->plugin(CORVISTA_PLUGIN_FILE).hostTools("auto").start();
    }
    static Words asking(Words words) {
        words.insert(words.begin(), {"env", "CORVISTA_BUS=" + ServiceRun::address(), CVAGENT_PROGRAM});
        return words;
    }
    static Finished cvagent(FakeHost& host, const Words& words) {
        return host.run(asking(words));
    }
    static std::string changes(FakeHost& host) {
        return cvagent(host, {"history", "--changes"}).out;
    }
    /// All that the changes touch.
    std::string look(FakeHost& host) const {
        return host.run({"sh", "-c", "ip -4 address show dev eth0; ip -4 route show table main"}).out +
               host.read(file_).value_or("-") + host.read("/etc/sysconfig/network/routes").value_or("-");
    }
    bool comesBack(FakeHost& host) const {
        for (int i = 0; i < 6000 && look(host) != old_; ++i) {
            usleep(10'000);
        }
        EXPECT_EQ(look(host), old_);
        return look(host) == old_;
    }
    bool isLogged(const std::string& text) {
        for (int i = 0; i < 6000 && service_->program().err().find(text) == std::string::npos; ++i) {
            usleep(10'000);
        }
        return service_->program().err().find(text) != std::string::npos;
    }

    std::optional<ServiceRun> service_;
    std::string old_;
};

HOST_TEST_F(ServiceTakesBack, WhatItHasAppliedWithoutAConfirmation) {
    serve(host);
    const Finished made = cvagent(host, {"apply", "/root/changes", "--verify-within", "0.1"});
    ASSERT_EQ(made.status, 0) << made.out << made.err;
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/25"));
    EXPECT_THAT(changes(host), HasSubstr("is kept"));
    EXPECT_THAT(changes(host), HasSubstr("and 3 more  (by root (uid 0))"));
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_EQ(look(host), old_);
}

HOST_TEST_F(ServiceTakesBack, WhatASetHasChanged) {
    serve(host);
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "203.0.113.7"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/24"));
    EXPECT_THAT(changes(host), HasSubstr("IPv4Address  (by root (uid 0))"));
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_EQ(look(host), old_);
}

constexpr std::uint32_t kOwnerName = 116;

HOST_TEST_F(ServiceTakesBack, WhatACallHasWritten) {
    serve(host);
    const bus::Connection own(ServiceRun::address());
    call::ask(own, ServiceRun::kComputer, call::kNode, "Write", call::write(kOwnerName, "y"));
    EXPECT_THAT(changes(host), HasSubstr("is kept                     /oshw/root/computer OwnerName  (by "
                                         "root (uid 0))\n"));
    EXPECT_THAT(cvagent(host, {"get", "computer", "OwnerName"}).out, HasSubstr("y"));
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_FALSE(host.exists("/opt/vantrel/corvista/data/asset.dat"));
}

/// The disk for the owner's name is full for the host alone: a try finds room in memory.
HOST_TEST_F(ServiceTakesBack, AllWhenAStepFails) {
    host.directory("/opt/vantrel/corvista/data", 0700);
    host.readOnly("/opt/vantrel/corvista/data");
    serve(host);
    const Finished made = cvagent(host, {"apply", "/root/changes"});
    EXPECT_EQ(made.status, 1);
    EXPECT_THAT(made.err, HasSubstr("change 1 is taken back\n"));
    EXPECT_THAT(made.out, HasSubstr("failed     /oshw/root/computer OwnerName"));
    EXPECT_THAT(made.out, HasSubstr("not made   /oshw/root/computer/"));
    EXPECT_THAT(made.out, Not(HasSubstr("applied")));
    EXPECT_EQ(look(host), old_);
    EXPECT_THAT(cvagent(host, {"set", "computer", "OwnerName", "y"}).err, Not(HasSubstr("taken back")));
    const Finished forced = cvagent(host, {"apply", "/root/changes", "--force", "--verify-within", "0"});
    EXPECT_THAT(forced.out, HasSubstr("applied    ")) << "who knows better goes as far as he comes";
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/25"));
    EXPECT_EQ(cvagent(host, {"rollback", "2"}).status, 0);
    EXPECT_EQ(look(host), old_);
}

HOST_TEST_F(ServiceTakesBack, WhatNobodyConfirms) {
    serve(host);
    const Finished made =
        cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "203.0.113.7", "--confirm-within", "600"});
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_THAT(made.out, HasSubstr("new  203.0.113.7"));
    EXPECT_EQ(made.err,
              "cvagent: change 1 is taken back in 600 seconds unless somebody types: cvagent confirm 1\n");
    EXPECT_EQ(cvagent(host, {"confirm", "1", "--lengthen", "0"}).status, 0);
    EXPECT_TRUE(comesBack(host));
}

/// The service is killed while the change waits.
HOST_TEST_F(ServiceTakesBack, ByTheGuardWhenItIsKilled) {
    serve(host);
    ASSERT_EQ(
        cvagent(host, {"apply", "/root/changes", "--verify-within", "0", "--confirm-within", "600"}).status,
        0);
    service_->program().signal(SIGKILL);
    service_->program().wait();
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/25"));
    EXPECT_EQ(host.run({CVAGENT_PROGRAM, "confirm", "1", "--lengthen", "0"}).status, 0);
    EXPECT_TRUE(comesBack(host));
}

/// The number of a change, and what more a call takes.
call::Arguments ofChange(std::uint32_t number, const std::optional<double>& seconds = {}) {
    return [number, seconds](bus::Writer& writer) {
        writer.put(number);
        if (seconds) {
            writer.put(*seconds);
        }
    };
}

/// "done", or the name of the error.
std::string asked(const char* member, const call::Arguments& arguments) {
    const bus::Connection own(ServiceRun::address());
    const std::string error = call::errorOf(own, ServiceRun::kRoot, call::kAgent, member, arguments);
    return error.empty() ? "done" : error;
}

HOST_TEST_F(ServiceTakesBack, WhatSomebodyElseMayConfirm) {
    serve(host);
    if (call::asUser(kUser, {}, [] { return std::string("yes"); }) != "yes") {
        GTEST_SKIP() << "there is no other user";
    }
    ASSERT_EQ(
        cvagent(host, {"apply", "/root/changes", "--verify-within", "0", "--confirm-within", "600"}).status,
        0);
    const std::string made = look(host);
    using Call = std::pair<const char*, call::Arguments>;
    for (const Call& each :
         {Call("Confirm", ofChange(1)), Call("Lengthen", ofChange(1, 300)), Call("Rollback", ofChange(1))}) {
        EXPECT_EQ(call::asUser(kUser, {}, [&each] { return asked(each.first, each.second); }), kDenied)
            << each.first;
    }
    EXPECT_TRUE(isLogged("uid 12345 may not confirm change 1: without polkit this is for root"));
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return asked("Lengthen", ofChange(1, 300)); }), "done");
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return asked("Confirm", ofChange(1)); }), "done");
    EXPECT_TRUE(isLogged("alice (uid 12345) confirmed change 1"));
    EXPECT_EQ(look(host), made);
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return asked("Confirm", ofChange(1)); }),
              "com.vantrel.Corvista1.Error.Failed");
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return asked("Rollback", ofChange(0)); }), "done");
    EXPECT_EQ(look(host), old_);
}

/// The program asks the service where its user is not root.
HOST_TEST_F(ServiceTakesBack, WhatAUserTypes) {
    serve(host);
    const auto typed = [](const Words& words, std::optional<unsigned> group = kGroup) {
        return call::asUser(kUser, group, [&words] {
            std::string line;
            for (const std::string& word : asking(words)) {
                line += "'" + word + "' ";
            }
            std::string told(4096, '\0');
            FILE* const pipe = popen((line + "2>&1; echo status $?").c_str(), "r");
            told.resize(fread(told.data(), 1, told.size(), pipe));
            pclose(pipe);
            return told;
        });
    };
    if (call::asUser(kUser, {}, [] { return std::string("yes"); }) != "yes") {
        GTEST_SKIP() << "there is no other user";
    }
    EXPECT_THAT(typed({"set", "ip-config:eth0", "IPv4Address", "203.0.113.7", "--confirm-within", "600"}),
                HasSubstr("unless somebody types: cvagent confirm 1\n"));
    EXPECT_EQ(typed({"confirm", "1", "--lengthen", "300"}),
              "change 1 has 300 seconds from now on\nstatus 0\n");
    EXPECT_THAT(typed({"confirm", "1"}, {}), HasSubstr("the service does not allow it: you may not confirm"));
    EXPECT_EQ(typed({"confirm", "1"}), "change 1 is kept\nstatus 0\n");
    EXPECT_THAT(typed({"confirm", "1"}), HasSubstr("change 1 cannot be confirmed: it is kept\nstatus 1\n"));
    EXPECT_THAT(typed({"confirm", "9"}), HasSubstr("there is no change 9"));
    EXPECT_EQ(typed({"rollback"}), "change 1 is taken back\nstatus 0\n");
    EXPECT_EQ(look(host), old_);
    EXPECT_THAT(typed({"rollback"}), HasSubstr("there is no change that could be taken back\nstatus 3\n"));
    EXPECT_EQ(typed({"rollback", "--bus", "none"}),
              "cvagent: only root keeps and takes back changes of the host\nRun: sudo cvagent rollback\n"
              "status 1\n");
    EXPECT_THAT(typed({"confirm", "1", "--bus", "none"}), HasSubstr("\nRun: sudo cvagent confirm 1\n"));
    EXPECT_EQ(typed({"history", "--changes"}),
              "cvagent: only root sees the changes that can be taken back: what they have saved is not for "
              "everybody\nRun: sudo cvagent history --changes, or without --changes for what was written\n"
              "status 1\n");
    EXPECT_THAT(changes(host), HasSubstr("(by alice (uid 12345))"));
}

/// Refused before the first step where nothing can be saved.
HOST_TEST_F(ServiceTakesBack, NothingThatItCouldNotSave) {
    host.directory("/var/lib/corvista/changes", 0700);
    host.fullDisk("/var/lib/corvista/changes");
    serve(host);
    const Finished made = cvagent(host, {"apply", "/root/changes", "--confirm-within", "60"});
    EXPECT_EQ(made.status, 1);
    EXPECT_THAT(made.err, HasSubstr("the change cannot be guarded: "));
    EXPECT_THAT(made.err, HasSubstr("Nothing was done"));
    EXPECT_EQ(look(host), old_);
    const Finished unasked = cvagent(host, {"apply", "/root/changes", "--verify-within", "0"});
    EXPECT_EQ(unasked.status, 0);
    EXPECT_THAT(unasked.err, HasSubstr("the change cannot be taken back later: "));
    const Finished set = cvagent(host, {"set", "computer", "OwnerName", "y"});
    EXPECT_EQ(set.status, 0);
    EXPECT_THAT(set.err, HasSubstr("the change cannot be taken back later: "));
    const bus::Connection own(ServiceRun::address());
    call::ask(own, ServiceRun::kComputer, call::kNode, "Write", call::write(kOwnerName, "z"));
    EXPECT_TRUE(isLogged("computer OwnerName: the change cannot be taken back later: "));
    EXPECT_TRUE(std::filesystem::is_empty("/var/lib/corvista/changes")) << "half of a change";
}

HOST_TEST_F(ServiceTakesBack, ForNoTimeThatIsNone) {
    serve(host);
    for (const double seconds : {-1.0, 86'401.0, std::numeric_limits<double>::quiet_NaN()}) {
        EXPECT_EQ(asked("Lengthen", ofChange(1, seconds)), bus::kInvalidArgs);
        EXPECT_EQ(asked("Apply",
                        [seconds](bus::Writer& writer) {
                            writer.array("(ssv)", [] {});
                            writer.array("{sv}", [&] {
                                writer.entry("sv", [&] {
                                    writer.put("confirm-within").variant("d", [&] { writer.put(seconds); });
                                });
                            });
                        }),
                  bus::kInvalidArgs);
    }
    EXPECT_EQ(asked("Confirm", ofChange(0)), "com.vantrel.Corvista1.Error.NotFound");
    EXPECT_EQ(asked("Rollback", ofChange(0)), "com.vantrel.Corvista1.Error.NotFound");
}

}  // namespace
