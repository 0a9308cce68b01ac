#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "agent/bus/connection.h"
#include "agent/bus/reader.h"
#include "agent/bus/slot.h"

namespace cvagent::remote {

/// The bus itself.
inline constexpr const char* kBusDriver = "org.freedesktop.DBus";

/// There is no service, or none that could be believed.
class NoService : public std::runtime_error {
public:
    /// @param silent no service runs, which is nothing to tell
    NoService(const std::string& text, bool silent) : std::runtime_error(text), silent_(silent) {}
    bool isSilent() const { return silent_; }

private:
    bool silent_;
};

/// A call of the agent's interface with what it takes of these.
struct Question {
    std::string member;  ///< "" for no question
    std::optional<std::string> word = {};
    std::optional<std::vector<std::string>> words = {};
    bool operator==(const Question&) const = default;
};

/// A connection to the one process that had the service's name on the bus when it was made, and to no other:
/// whoever takes the name later is another service. One thread.
class Client {
public:
    using Seconds = std::chrono::seconds;

    /// What is answered from memory. Longer than a busy machine keeps the service from its turn.
    static constexpr Seconds kShort{10};
    /// What the service gives a read, and some more.
    static constexpr Seconds kRead{30};

    /// Throws NoService, ServiceGone of one that ends at the first question, or Failure when the bus does not
    /// answer.
    /// @param address "system" or a bus's own
    /// @param stop    a descriptor that ends all waiting when it can be read; -1 for none
    /// @param first   what will be asked first. It goes out while the bus is still asked who the service is;
    ///                of one that is not believed nobody sees the answer
    explicit Client(const std::string& address, int stop = -1, Question first = {});
    /// Thrown by all that waits.
    struct Stopped {};

    /// The service's own name on the bus, ":1.23".
    const std::string& owner() const { return owner_; }
    /// Whether it runs as this very user.
    bool isOwn() const { return own_; }
    bus::Connection& connection() { return connection_; }

    /// A call of the agent's interface.
    bus::Message call(const std::string& member) const;
    /// The answer to a question, which may have come already, be it an error. Throws Failure when none comes
    /// in that time or the service is at a stand, ServiceGone when it has ended.
    bus::Message answerTo(const Question& question, Seconds longest);
    /// The same, checked as below.
    bus::Message ask(const Question& question);
    /// The answer to a call. Throws what an error in place of one stands for: Problem of the service's own,
    /// Failure, ServiceGone.
    bus::Message ask(const bus::Message& call, Seconds longest);
    /// The same for what may take any time, as long as the service is alive.
    bus::Message askForLong(const bus::Message& call);
    /// The same with the error as an answer.
    bus::Message waitForLong(const bus::Message& call);
    void checkAnswer(const bus::Message& answer);
    // Properties of the agent's interface.
    std::string textProperty(const std::string& name);
    std::uint64_t numberProperty(const std::string& name);
    /// An answer with a variant.
    bus::Message askProperty(const std::string& name);

    /// Hands an answer to who reads it. Throws Failure when it holds something else.
    template <class Take>
    void read(const bus::Message& answer, const Take& take) {
        try {
            bus::Reader reader(answer);
            take(reader);
        } catch (const bus::Error&) {
            failOtherVersion();
        }
    }
    [[noreturn]] void failOtherVersion();
    /// Waits until something comes or the time is over, at most an hour; handles what came. Throws
    /// ServiceGone when the bus is gone.
    void wait(std::chrono::steady_clock::time_point deadline);

private:
    using Clock = std::chrono::steady_clock;

    bus::Message askBus(const char* member, const std::string& name,
                        const std::function<void()>& behind = nullptr);
    bus::Message propertyCall(const std::string& name) const;
    void checkUser();
    bus::Message callOf(const Question& question) const;
    void askFirst();
    bus::Message answerTo(const bus::Message& call, Seconds longest,
                          const std::function<void()>& behind = nullptr);
    bool waitFor(const bus::Message& answer, Seconds longest);
    bus::Message takeFirst(Seconds longest);

    bus::Connection connection_;
    int stop_;
    std::string owner_;
    bool own_ = false;
    Question first_;            // "" once its answer was taken
    bus::Message firstAnswer_;  // once it has come
    bus::Slot waitsForFirst_;
};

}  // namespace cvagent::remote
