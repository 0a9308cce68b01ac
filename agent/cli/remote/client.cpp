#include "agent/cli/remote/client.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "agent/bus/writer.h"
#include "agent/cli/failure.h"
#include "agent/cli/remote/answer_errors.h"
#include "agent/cli/remote/service.h"
#include "agent/core/text.h"
#include "agent/service/names.h"

namespace cvagent::remote {

namespace {

constexpr const char* kBusObject = "/org/freedesktop/DBus";
constexpr const char* kProperties = "org.freedesktop.DBus.Properties";
constexpr const char* kPeer = "org.freedesktop.DBus.Peer";
constexpr const char* kEnded = "the service has ended before it answered";
/// Between two looks whether the service is alive.
constexpr std::chrono::seconds kPing{5};

bus::Connection opened(const std::string& address) {
    try {
        return bus::Connection(address);
    } catch (const bus::Error& error) {
        throw NoService(error.what(), true);
    }
}

/// As poll takes it, never 0 for what is left of a millisecond.
int millisecondsTo(std::chrono::steady_clock::time_point end) {
    using std::chrono::milliseconds;
    const auto left = std::chrono::ceil<milliseconds>(end - std::chrono::steady_clock::now()).count();
    return static_cast<int>(std::clamp<long long>(left, 0, 3600LL * 1000));
}

[[noreturn]] void failHanging(const char* who, std::chrono::seconds longest) {
    throw Failure(ExitStatus::failed, std::string("the ") + who + " has not answered for " +
                                          std::to_string(longest.count()) +
                                          " s\nLook at it: systemctl status corvista-agent");
}

}  // namespace

/// Who owns the name is asked once, and then whose process that is: on a bus without a policy anybody can
/// take a name.
Client::Client(const std::string& address, int stop, Question first)
    : connection_(opened(address)), stop_(stop), first_(std::move(first)) {
    const bus::Message named = askBus("GetNameOwner", service::kBusName, [this] { askFirst(); });
    if (named.isError()) {
        throw NoService("no service is there", true);
    }
    read(named, [this](bus::Reader& reader) { owner_ = reader.text(); });
    checkUser();
}

void Client::checkUser() {
    std::uint32_t user = 0;
    const bus::Message owned = askBus("GetConnectionUnixUser", owner_);
    if (owned.isError() && waitsForFirst_) {
        throw ServiceGone(kEnded);
    }
    if (owned.isError()) {
        throw NoService("the service ended", true);
    }
    read(owned, [&user](bus::Reader& reader) { user = reader.number(); });
    own_ = user == geteuid();
    if (user != 0 && !own_) {
        throw NoService("the service on the bus belongs to user " + std::to_string(user) +
                            ", neither root nor you, and is not believed",
                        false);
    }
}

bus::Message Client::askBus(const char* member, const std::string& name,
                            const std::function<void()>& behind) {
    const bus::Message call = connection_.newCall({kBusDriver, kBusObject, kBusDriver, member});
    bus::Writer(call).put(name);
    try {
        bus::Message answer = answerTo(call, kShort, behind);
        if (!answer) {
            failHanging("bus", kShort);
        }
        return answer;
    } catch (const ServiceGone& gone) {
        if (waitsForFirst_ && !owner_.empty()) {
            throw;  // what the service was asked may be what it ended of
        }
        throw NoService(gone.what(), true);
    }
}

bus::Message Client::call(const std::string& member) const {
    const std::string whose = owner_.empty() ? service::kBusName : owner_;
    return connection_.newCall({whose, service::kRootObject, service::kAgentInterface, member});
}

void Client::wait(Clock::time_point deadline) {
    pollfd stopped{stop_, POLLIN, 0};
    try {
        const auto due = connection_.deadline().value_or(deadline);
        pollfd ready[] = {{connection_.descriptor(), connection_.events(), 0}, stopped};
        poll(ready, 2, millisecondsTo(std::min(due, deadline)));
        stopped = ready[1];
        connection_.process();
    } catch (const bus::Error&) {
        throw ServiceGone("the bus is gone");
    }
    if (stopped.revents != 0) {
        throw Stopped();
    }
}

bus::Message Client::callOf(const Question& question) const {
    bus::Message made = call(question.member);
    if (question.word) {
        bus::Writer(made).put(*question.word);
    }
    if (question.words) {
        bus::Writer(made).put(*question.words);
    }
    return made;
}

/// Of whoever has the name: his answer counts when the bus says that it is the service's.
void Client::askFirst() {
    if (first_.member.empty()) {
        return;
    }
    bus::Message call = callOf(first_);
    call.startNobody();
    waitsForFirst_ =
        connection_.askLater(call, kRead + kShort, [this](const bus::Message& come) { firstAnswer_ = come; });
}

bool Client::waitFor(const bus::Message& answer, Seconds longest) {
    const auto deadline = Clock::now() + longest;
    while (!answer && Clock::now() < deadline) {
        wait(deadline);
    }
    return static_cast<bool>(answer);
}

/// None when the time is over.
/// @param behind sends something more
bus::Message Client::answerTo(const bus::Message& call, Seconds longest,
                              const std::function<void()>& behind) {
    bus::Message answer;
    const bus::Slot waiting = connection_.askLater(call, longest + Seconds(1),
                                                   [&answer](const bus::Message& come) { answer = come; });
    if (behind) {
        behind();
    }
    waitFor(answer, longest);
    return answer;
}

void Client::checkAnswer(const bus::Message& answer) {
    if (answer.isError() && !throwAnswer(answer)) {
        failOtherVersion();
    }
    if (!answer.isError() && answer.sender() != owner_) {
        throw Failure(ExitStatus::failed, "another one has answered in the service's place");
    }
}

/// The service itself answers a ping, however long the host takes. Another one who had the name for a moment
/// was asked in the place of one that came or went.
bus::Message Client::takeFirst(Seconds longest) {
    first_ = {};
    if (!waitFor(firstAnswer_, std::min(longest, Seconds(kPing)))) {
        const bus::Message ping = connection_.newCall({owner_, service::kRootObject, kPeer, "Ping"});
        if (!answerTo(ping, kShort - kPing)) {
            failHanging("service", kShort);
        }
        if (!waitFor(firstAnswer_, longest - std::min(longest, Seconds(kPing)))) {
            failHanging("service", longest);
        }
    }
    const std::string sender = firstAnswer_.sender();
    if (sender != owner_ && (sender != kBusDriver || !firstAnswer_.isError())) {
        throw ServiceGone(kEnded);
    }
    return std::move(firstAnswer_);
}

bus::Message Client::answerTo(const Question& question, Seconds longest) {
    if (first_ == question) {
        return takeFirst(longest);
    }
    bus::Message answer = answerTo(callOf(question), longest);
    if (!answer) {
        failHanging("service", longest);
    }
    return answer;
}

bus::Message Client::ask(const Question& question) {
    bus::Message answer = answerTo(question, kShort);
    checkAnswer(answer);
    return answer;
}

bus::Message Client::ask(const bus::Message& call, Seconds longest) {
    bus::Message answer = answerTo(call, longest);
    if (!answer) {
        failHanging("service", longest);
    }
    checkAnswer(answer);
    return answer;
}

bus::Message Client::askForLong(const bus::Message& call) {
    bus::Message answer = waitForLong(call);
    checkAnswer(answer);
    return answer;
}

bus::Message Client::waitForLong(const bus::Message& call) {
    constexpr std::chrono::hours kForEver{24 * 365};
    bus::Message answer;
    const bus::Slot waiting =
        connection_.askLater(call, kForEver, [&answer](const bus::Message& come) { answer = come; });
    while (!answer) {
        for (const auto look = Clock::now() + kPing; !answer && Clock::now() < look;) {
            wait(look);
        }
        if (!answer) {
            ask(connection_.newCall({owner_, service::kRootObject, kPeer, "Ping"}), kShort);
        }
    }
    return answer;
}

bus::Message Client::propertyCall(const std::string& name) const {
    bus::Message call = connection_.newCall({owner_, service::kRootObject, kProperties, "Get"});
    bus::Writer(call).put(service::kAgentInterface).put(name);
    return call;
}

bus::Message Client::askProperty(const std::string& name) {
    return ask(propertyCall(name), kShort);
}

std::string Client::textProperty(const std::string& name) {
    std::string text;
    const bus::Message answer = askProperty(name);
    read(answer, [&](bus::Reader& reader) {
        reader.variant([&](const std::string& /*type*/) { text = reader.text(); });
    });
    return text;
}

std::uint64_t Client::numberProperty(const std::string& name) {
    std::uint64_t number = 0;
    const bus::Message answer = askProperty(name);
    read(answer, [&](bus::Reader& reader) {
        reader.variant([&](const std::string& /*type*/) { number = reader.longNumber(); });
    });
    return number;
}

/// The version is asked with no trust in the answer: the service may be any.
void Client::failOtherVersion() {
    std::string version = "another version";
    try {
        const bus::Message answer = answerTo(propertyCall("Version"), kShort);
        if (answer && !answer.isError()) {
            bus::Reader reader(answer);
            reader.variant(
                [&](const std::string& /*type*/) { version = "version " + inQuotes(reader.text()); });
        }
    } catch (const bus::Error&) {  // it has not even that
    }
    throw Failure(ExitStatus::failed,
                  "the service is " + version +
                      " and this is cvagent " CORVISTA_VERSION
                      ": they do not understand each other\nInstall both from one package "
                      "and restart the service: systemctl restart corvista-agent");
}

}  // namespace cvagent::remote
