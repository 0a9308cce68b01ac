#include "agent/service/consent.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <utility>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/service/users.h"

namespace cvagent::service {

namespace {

constexpr std::chrono::seconds kUserTime{300};  // a person finds the password
constexpr std::chrono::seconds kPolkitTime{10};
constexpr std::size_t kMostOfOne = 8;  // questions about one user at a time

/// One row an audience, in the order of the enumeration.
struct Rule {
    bool everybody;
    const char* action;  ///< what polkit is asked; null: it is not
};
constexpr std::array<Rule, 6> kRules = {{
    {true, nullptr},
    {false, nullptr},
    {false, "com.vantrel.corvista1.write"},
    {false, "com.vantrel.corvista1.power"},
    {false, "com.vantrel.corvista1.plan"},
    {false, "com.vantrel.corvista1.confirm"},
}};

constexpr const char* kPolkit = "org.freedesktop.PolicyKit1";

bool isNowhere(const bus::Error& error) {
    const std::string& name = error.name();
    return name == bus::kServiceUnknown || name == bus::kNameHasNoOwner ||
           name.starts_with("org.freedesktop.DBus.Error.Spawn.");
}

bool isOurs(const Caller& caller) {
    return caller.user == 0 || caller.user == geteuid();
}

}  // namespace

void Consent::setTrustedGroup(const std::string& group) {
    groupName_ = group;
    group_ = groupNamed(group);
}

bool Consent::isTrusted(const Caller& caller) const {
    return isOurs(caller) || (group_ && caller.isIn(*group_));
}

bool Consent::isOwn(const Caller& caller) {
    return isOurs(caller);
}

void Consent::ask(const Caller& caller, const Question& question, Decided decided) {
    const Rule& rule = kRules.at(static_cast<std::size_t>(question.audience));
    if (rule.everybody || isOurs(caller)) {
        decided(true, "");
    } else if (rule.action == nullptr) {
        decided(isTrusted(caller), "this is told to root and the group " + groupName_ + " only");
    } else {
        askPolkit(caller, question, std::move(decided));
    }
}

void Consent::askPolkit(const Caller& caller, const Question& question, Decided decided) {
    if (pendingOf_[caller.user] >= kMostOfOne) {
        decided(false, "polkit has not decided about earlier calls yet");
        return;
    }
    const bus::Message call =
        connection_.newCall({kPolkit, "/org/freedesktop/PolicyKit1/Authority",
                             "org.freedesktop.PolicyKit1.Authority", "CheckAuthorization"});
    bus::Writer writer(call);
    writer.structure("sa{sv}", [&] {
        writer.put("system-bus-name").array("{sv}", [&] {
            writer.entry("sv", [&] { writer.put("name").variant("s", [&] { writer.put(caller.name); }); });
        });
    });
    writer.put(kRules.at(static_cast<std::size_t>(question.audience)).action);
    writer.array("{ss}", [&] {
        if (geteuid() == 0) {  // polkit takes details from root only
            writer.entry("ss", [&] { writer.put("deed").put(question.deed); });
        }
    });
    writer.put(std::uint32_t{question.mayAskUser ? 1U : 0U}).put("");
    const std::uint64_t number = ++asked_;
    ++pendingOf_[caller.user];
    pending_[number] =
        connection_.askLater(call, question.mayAskUser ? kUserTime : kPolkitTime,
                             [this, number, caller, held = std::move(decided)](const bus::Message& answer) {
                                 const bus::Slot slot = std::move(pending_.extract(number).mapped());
                                 if (--pendingOf_[caller.user] == 0) {
                                     pendingOf_.erase(caller.user);
                                 }
                                 polkitAnswered(caller, answer, held);
                             });
}

void Consent::polkitAnswered(const Caller& caller, const bus::Message& answer, const Decided& decided) {
    if (answer.isError()) {
        const bus::Error error = answer.error();
        polkitFound_ = !isNowhere(error);
        if (polkitFound_) {
            decided(false, "polkit does not decide: " + std::string(error.what()));
        } else {
            decided(isTrusted(caller), "without polkit this is for root and the group " + groupName_);
        }
        return;
    }
    polkitFound_ = true;
    bool allowed = false;
    bool couldAsk = false;
    bus::Reader reader(answer);
    reader.structure("bba{ss}", [&] {
        allowed = reader.flag();
        couldAsk = reader.flag();
        reader.skip();
    });
    decided(allowed, couldAsk ? "polkit would have to ask the user, and the call does not let it"
                              : "polkit does not let this user");
}

void Consent::lookForPolkit() {
    const bus::Message call = connection_.newCall(
        {"org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "ListActivatableNames"});
    const bus::Message owner = connection_.newCall(
        {"org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "NameHasOwner"});
    bus::Writer(owner).put(kPolkit);
    look_ = connection_.askLater(owner, kPolkitTime, [this, call](const bus::Message& answer) {
        if (!answer.isError() && bus::Reader(answer).flag()) {
            polkitFound_ = true;
            return;
        }
        look_ = connection_.askLater(call, kPolkitTime, [this](const bus::Message& list) {
            if (!list.isError()) {
                const auto names = bus::Reader(list).texts();
                polkitFound_ = std::ranges::find(names, kPolkit) != names.end();
            }
        });
    });
}

}  // namespace cvagent::service
