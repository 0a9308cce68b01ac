#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <thread>
#include <variant>
#include <vector>

#include "agent/bus/connection.h"
#include "agent/bus/writer.h"

/// A NetworkManager that tells of its links what it was told to, on a bus of the test's.
class MockManager {
public:
    struct Path {
        std::string text;
    };
    using Value = std::variant<bool, std::uint32_t, std::string, Path>;
    /// What there is: "PATH PROPERTY".
    using Objects = std::map<std::string, Value>;

    /// What it does when it is asked for more than properties. All of it is called in its own thread.
    struct Deeds {
        std::function<void(cvagent::bus::Writer&)> settings{};  ///< until it was given others
        /// Of a setting, before and after that; none where there are none.
        std::map<std::string, std::function<void(cvagent::bus::Writer&, bool isUpdated)>> secrets{};
        std::function<void()> onUpdate = [] {};  ///< before it answers
        std::function<void()> onReapply = [] {};
        bool takes = true;                            ///< what it was given becomes its settings
        bool loads = true;                            ///< what LoadConnections answers
        std::map<std::string, std::string> errors{};  ///< the members that fail, with the text
        std::set<std::string> silent{};               ///< the members that it does not answer
    };

    /// @param silent it has its name and answers nothing
    MockManager(const std::string& address, std::map<std::string, std::string> devices, Objects objects,
                bool silent = false);
    MockManager(const std::string& address, std::map<std::string, std::string> devices, Objects objects,
                Deeds deeds);
    MockManager(const MockManager&) = delete;
    MockManager& operator=(const MockManager&) = delete;
    ~MockManager();

    /// What changed something, in its order: "Update2 /path to-disk", "Reapply /path", "LoadConnections
    /// FILE".
    std::vector<std::string> calls() const;
    /// The settings that it was given last: "ipv4.method" and so on, in the form of flatSettings(), with
    /// blanks for its zeros.
    std::map<std::string, std::string> given() const;

private:
    void serve(const std::string& address);
    void answer(const cvagent::bus::Message& call);
    void answerDeed(const cvagent::bus::Message& call);
    void answerQuestion(const cvagent::bus::Message& call);
    void update(const cvagent::bus::Message& call);
    void note(const std::string& call);

    const std::map<std::string, std::string> devices_;
    const Objects objects_;
    const bool silent_;
    const Deeds deeds_;
    cvagent::bus::Message updated_;  ///< the call that gave it its settings
    mutable std::mutex guard_;
    std::vector<std::string> calls_;            // guarded by guard_
    std::map<std::string, std::string> given_;  // guarded by guard_
    std::atomic<bool> ready_ = false;
    std::atomic<bool> stopped_ = false;
    std::thread thread_;
};
