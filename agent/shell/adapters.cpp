#include "agent/shell/adapters.h"

#include <linux/magic.h>
#include <sys/vfs.h>

#include <algorithm>
#include <chrono>
#include <map>
#include <mutex>
#include <optional>
#include <utility>
#include <vector>

#include "agent/shell/kernel_news.h"
#include "hosttools/applet.h"
#include "hosttools/wired.h"

namespace cvagent::shell {

namespace {

using Arguments = std::span<const std::string>;
using Clock = std::chrono::steady_clock;

/// What a tool has printed.
struct Printed {
    std::string out;
    int status = 0;
    bool complains = false;
};

class SharedText : public Source {
public:
    explicit SharedText(std::shared_ptr<const Printed> printed) : printed_(std::move(printed)) {}
    bool pull(std::string& out) override {
        const std::size_t size = std::min(kChunk, printed_->out.size() - at_);
        out.append(printed_->out, at_, size);
        at_ += size;
        return size > 0;
    }
    int status() const override { return printed_->status; }

private:
    std::shared_ptr<const Printed> printed_;
    std::size_t at_ = 0;
};

/// The host as one of our tools reads it here: what was read before is used again, and no disk is opened.
class KnownHost : public hosttools::Host {
public:
    int interfaces(std::string_view only, std::shared_ptr<const hosttools::Interfaces>& found) override {
        if (all_ == nullptr) {
            std::shared_ptr<const hosttools::Interfaces> read;
            if (const int error = Host::interfaces({}, read); error != 0) {
                return error;
            }
            all_ = std::move(read);
        }
        found = all_;
        const auto& links = all_->links;
        const bool there =
            only.empty() || std::ranges::find(links, only, &hosttools::Link::name) != links.end();
        return there ? 0 : Host::interfaces(only, found);  // a link can have further names
    }
    std::optional<std::vector<hosttools::Disk>> disks() override {
        auto listed = hosttools::listDisks("", hosttools::Opening::none);
        refused_ = !listed;
        return listed;
    }
    bool hasRefused() const { return refused_; }
    void forget() { all_ = nullptr; }

private:
    std::shared_ptr<const hosttools::Interfaces> all_;
    bool refused_ = false;
};

/// @return nothing when the tool would need what is not given to it here
std::shared_ptr<const Printed> run(const std::string& name, Arguments words, KnownHost& host) {
    const hosttools::Applet* const tool = hosttools::findApplet(name);
    if (tool == nullptr) {
        return nullptr;
    }
    std::vector<const char*> texts;
    std::ranges::transform(words, std::back_inserter(texts), &std::string::c_str);
    hosttools::Answer answer;
    const int status = tool->run(texts, host, answer);
    if (host.hasRefused() || answer.beyond) {
        return nullptr;
    }
    return std::make_shared<const Printed>(Printed{answer.out.str(), status, answer.errors.size() > 0});
}

/// Listings of interfaces and routes, each made once until the kernel announces a change.
class NetworkAnswers {
public:
    std::shared_ptr<const Printed> ask(const std::string& name, Arguments words) {
        const std::lock_guard lock(guard_);
        const auto now = Clock::now();
        const bool quiet = news_.isQuiet();
        const bool first = made_ == Clock::time_point();
        changed_ = quiet || first ? changed_ : now;
        if (!quiet || now - changed_ < kSettling || now - made_ > kLongest || !tablesAreTheKernels()) {
            host_.forget();
            answers_.clear();
            made_ = now;
        }
        std::vector<std::string> key{name};
        key.insert(key.end(), words.begin(), words.end());
        if (const auto known = answers_.find(key); known != answers_.end()) {
            return known->second;
        }
        auto answer = run(name, words, host_);
        if (constexpr std::size_t kMost = 4096;
            answer != nullptr && answer->status == 0 && answers_.size() < kMost) {
            answers_.emplace(std::move(key), answer);
        }
        return answer;
    }

private:
    /// Files that only stand where the kernel's stand change without news.
    static bool tablesAreTheKernels() {
        struct statfs system {};
        return statfs("/proc/net/route", &system) == 0 && system.f_type == PROC_SUPER_MAGIC;
    }

    /// A link that goes down is announced before its routes go, and these go without a word.
    static constexpr std::chrono::milliseconds kSettling{100};
    /// So long at most what changes without news is told as it was.
    static constexpr std::chrono::seconds kLongest{1};

    std::mutex guard_;
    KernelNews news_;
    Clock::time_point changed_;  ///< when news came
    Clock::time_point made_;     ///< when the first of the answers was read
    KnownHost host_;
    std::map<std::vector<std::string>, std::shared_ptr<const Printed>> answers_;
};

bool isNetworkListing(const std::string& name, Arguments words) {
    if (name == "ifconfig") {
        return words.empty() ||
               (words.size() == 1 && (words.front() == "-a" || !words.front().starts_with('-')));
    }
    const bool ipv6 = words.size() == 3 && words[0] == "-A" && words[1] == "inet6" && words[2] == "-n";
    return name == "route" && (ipv6 || (words.size() == 1 && words.front() == "-n"));
}

/// What is asked anew each time: news of a disk there are none, and those of a carrier may lag behind it.
bool isFreshListing(const std::string& name, Arguments words) {
    if (words.size() == 1) {
        return (name == "fdisk" && words.front().starts_with("-l")) ||
               (name == "ethtool" && !words.front().starts_with('-')) ||
               (name == "brctl" && words.front() == "show");
    }
    return name == "egrep" && words.size() == 2 && words[0] == "eth|bond|usb" && words[1] == "/proc/net/dev";
}

}  // namespace

std::unique_ptr<Source> askAdapter(const std::string& name, std::span<const std::string> words, bool silent) {
    std::shared_ptr<const Printed> printed;
    if (isNetworkListing(name, words)) {
        static NetworkAnswers answers;
        printed = answers.ask(name, words);
    } else if (isFreshListing(name, words)) {
        KnownHost host;
        printed = run(name, words, host);
    }
    const bool fits = printed != nullptr && (silent || !printed->complains);
    return fits ? std::make_unique<SharedText>(std::move(printed)) : nullptr;
}

bool haveClassicNames() {
    return hosttools::haveClassicNames();
}

}  // namespace cvagent::shell
