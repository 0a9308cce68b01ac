#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <functional>

class FakeHost;

/// How long a body may take before it is killed: CORVISTA_TEST_SECONDS, or 900.
std::chrono::seconds bodyLimit();

/// Runs the body in a child process on a fresh host. Failed assertions, skips, exceptions, crashes, sanitizer
/// reports and running out of time become failures of the calling test. The child leaves through exit, so
/// leak checks and coverage work; what the body changes in memory stays in the child. Call it from
/// single-threaded code.
void inFakeHost(const std::function<void(FakeHost&)>& body, std::chrono::seconds limit = bodyLimit());

/// A base for fixtures: the members run on the fake host, around the body of HOST_TEST_F.
class HostFixture : public ::testing::Test {
protected:
    virtual void setUpHost(FakeHost&) {}
    virtual void tearDownHost(FakeHost&) {}
};

#define HOST_TEST_F(Fixture, Name)                                                           \
    class Fixture##_##Name##_OnHost : public Fixture {                                       \
        void TestBody() override {                                                           \
            inFakeHost([this](FakeHost& host) {                                              \
                setUpHost(host);                                                             \
                if (!HasFatalFailure() && !IsSkipped()) body(host);                          \
                tearDownHost(host);                                                          \
            });                                                                              \
        }                                                                                    \
        void body(FakeHost& host);                                                           \
    };                                                                                       \
    [[maybe_unused]] static ::testing::TestInfo* const Fixture##_##Name##_registered =       \
        ::testing::RegisterTest(#Fixture, #Name, nullptr, nullptr, __FILE__, __LINE__,       \
                                []() -> Fixture* { return new Fixture##_##Name##_OnHost; }); \
    void Fixture##_##Name##_OnHost::body([[maybe_unused]] FakeHost& host)

#define HOST_TEST(Suite, Name)                           \
    static void Suite##_##Name##_onHost(FakeHost& host); \
    TEST(Suite, Name) {                                  \
        inFakeHost(Suite##_##Name##_onHost);             \
    }                                                    \
    static void Suite##_##Name##_onHost([[maybe_unused]] FakeHost& host)
