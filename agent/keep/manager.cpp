#include "agent/keep/manager.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <memory>
#include <utility>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/core/text.h"
#include "agent/keep/bus.h"
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/lost_manager.h"
#include "agent/keep/manager_settings.h"

namespace cvagent::keep {

namespace {

constexpr const char* kManager = "org.freedesktop.NetworkManager";
constexpr const char* kProfileInterface = "org.freedesktop.NetworkManager.Settings.Connection";
constexpr const char* kDeviceInterface = "org.freedesktop.NetworkManager.Device";
constexpr const char* kSettingsInterface = "org.freedesktop.NetworkManager.Settings";
constexpr const char* kSettingsPath = "/org/freedesktop/NetworkManager/Settings";
constexpr const char* kProfileFiles = "/etc/NetworkManager/system-connections/";
/// For what changes the host; a question is waited for as long as any other daemon's answer.
constexpr std::chrono::seconds kLongestDeed{20};
constexpr std::uint32_t kToDisk = 1;
/// Unsaved, made by NetworkManager itself, volatile, external: none of these is the file's.
constexpr std::uint32_t kNotOfFile = 0xf;

constexpr const char* kNoSecrets = "org.freedesktop.NetworkManager.AgentManager.NoSecrets";
constexpr std::array kWithSecrets = {
    "802-1x", "802-11-wireless-security", "adsl", "cdma", "gsm", "macsec", "pppoe", "vpn", "wireguard"};

/// Its name is that of the connection, which can be anything, and is told to people.
bool isFileOfIts(const std::string& file) {
    std::error_code unknown;
    const std::string name = lastPart(file);
    return file == kProfileFiles + name && !name.empty() && printable(name) == name &&
           !std::filesystem::is_symlink(file, unknown);
}

/// One profile on the bus, as NetworkManager has it.
class Profile {
public:
    /// Throws NoAnswer, and CannotKeep when nothing is active on the link.
    explicit Profile(const std::string& link) : bus_("system") {
        const auto told = Daemons().networkManagerOn(link);
        if (!told || told->profile.empty()) {
            throw CannotKeep("NetworkManager has no connection active on " + inQuotes(link));
        }
        link_ = *told;
    }

    /// Throws CannotKeep for one that is no file's.
    void check() {
        if (link_.file.empty()) {
            throw CannotKeep("the connection " + inQuotes(link_.connection) + " is in memory only");
        }
        if (!isFileOfIts(link_.file)) {
            throw CannotKeep("the connection " + inQuotes(link_.connection) + " is not from a file in " +
                             kProfileFiles + ": " + inQuotes(link_.file));
        }
        if ((bus_.number({kManager, link_.profile, kProfileInterface, "Flags"}) & kNotOfFile) != 0) {
            throw CannotKeep("the connection " + inQuotes(link_.connection) +
                             " is another one in memory than in " + link_.file);
        }
    }

    bus::Message settings() { return askProfile("GetSettings"); }
    ManagerProfile asTold() { return {link_.connection, link_.file, ipIn(settings())}; }

    /// Those that it has itself; nobody is asked for one. Throws bus::Error.
    std::map<std::string, std::string> secrets(const std::map<std::string, std::string>& settings) {
        std::map<std::string, std::string> all;
        for (const char* setting : kWithSecrets) {
            const auto first = settings.lower_bound(setting + std::string("."));
            if (first != settings.end() && first->first.starts_with(setting + std::string("."))) {
                all.merge(secretsOf(setting));
            }
        }
        return all;
    }

    /// Without secrets in what it is given it keeps those that it has.
    void update(const bus::Message& settings, const ProfileIp& before, const ProfileIp& wanted) {
        const bus::Message call = bus_.call({kManager, link_.profile, kProfileInterface, "Update2"});
        writeSettings(settings, before, wanted, call);
        bus::Writer(call).put(kToDisk).array("{sv}", [] {});
        bus_.ask(call, kManager, kLongestDeed);
    }

    void load() {
        const bus::Message call = bus_.call({kManager, kSettingsPath, kSettingsInterface, "LoadConnections"});
        bus::Writer(call).put(std::vector{link_.file});
        if (const bus::Message answer = bus_.ask(call, kManager, kLongestDeed); !bus::Reader(answer).flag()) {
            throw CannotKeep("NetworkManager does not take " + inQuotes(link_.file));
        }
    }

    /// As the profile is now, whatever its version is.
    void reapply() {
        const bus::Message call = bus_.call({kManager, link_.device, kDeviceInterface, "Reapply"});
        bus::Writer(call).array("{sa{sv}}", [] {}).put(std::uint64_t{0}).put(std::uint32_t{0});
        bus_.ask(call, kManager, kLongestDeed);
    }

    std::string fileNow() { return bus_.text({kManager, link_.profile, kProfileInterface, "Filename"}); }

private:
    std::map<std::string, std::string> secretsOf(const char* setting) {
        const bus::Message call = bus_.call({kManager, link_.profile, kProfileInterface, "GetSecrets"});
        bus::Writer(call).put(setting);
        try {
            return flatSettings(bus_.ask(call, kManager));
        } catch (const bus::Error& error) {
            if (error.name() == kNoSecrets) {
                return {};
            }
            throw;
        }
    }

    bus::Message askProfile(const char* what) {
        return bus_.ask(bus_.call({kManager, link_.profile, kProfileInterface, what}), kManager);
    }

    PatientBus bus_;
    ManagedLink link_;
};

/// What the bus and the daemon say against it becomes the reason.
/// @tparam Refused when it has answered
/// @tparam Unknown when it has not, and may be at it still
template <class Refused, class Unknown = Refused, class Act>
auto asking(const Act& act) {
    try {
        return act();
    } catch (const CannotKeep& cannot) {
        throw Refused(cannot.what());
    } catch (const bus::Error& error) {
        throw Refused("NetworkManager: " + inQuotes(error.what()));
    } catch (const NoAnswer& none) {
        throw Unknown(none.what());
    }
}

/// "" when they are the same, but for what was to be changed.
std::string otherwise(const std::map<std::string, std::string>& before,
                      const std::map<std::string, std::string>& after) {
    for (const auto& [some, others] : {std::pair(&before, &after), {&after, &before}}) {
        for (const auto& [name, value] : *some) {
            const auto other = others->find(name);
            if (!isWrittenOtherwise(name) && (other == others->end() || other->second != value)) {
                return name;
            }
        }
    }
    return "";
}

/// The profile with all that it holds.
struct Whole {
    bus::Message settings;
    std::map<std::string, std::string> flat;
    std::map<std::string, std::string> secrets;

    explicit Whole(Profile& profile)
        : settings(profile.settings()), flat(flatSettings(settings)), secrets(profile.secrets(flat)) {}
};

/// Throws CannotKeep when it is not the wanted one, or more of it is another one.
void checkUpdated(const Whole& was, const Whole& is, const ProfileIp& wanted) {
    std::string other = otherwise(was.flat, is.flat);
    other = other.empty() ? otherwise(was.secrets, is.secrets) : other;
    if (!other.empty()) {
        throw CannotKeep("NetworkManager has changed " + inQuotes(other) + " of the connection, too");
    }
    if (ipIn(is.settings) != wanted) {
        throw CannotKeep("NetworkManager has not taken what it was given");
    }
}

}  // namespace

ManagerProfile profileOn(const std::string& link) {
    if (const LostManager* lost = lostManager()) {
        return lost->profileOn(link);
    }
    return asking<CannotKeep>([&link] {
        Profile profile(link);
        profile.check();
        return profile.asTold();
    });
}

void updateProfile(const std::string& link, const ManagerProfile& before, const ProfileIp& wanted) {
    const auto content = smallFile(before.file);
    auto profile = asking<NotBegun>([&link] { return std::make_unique<Profile>(link); });
    const Whole was = asking<NotBegun>([&] {
        profile->check();
        if (profile->asTold() != before) {
            throw CannotKeep("the connection " + inQuotes(before.id) + " has been changed meanwhile");
        }
        return Whole(*profile);
    });
    asking<NotBegun, CannotKeep>([&] { profile->update(was.settings, before.ip, wanted); });
    asking<CannotKeep>([&] {
        checkUpdated(was, Whole(*profile), wanted);
        if (profile->fileNow() != before.file || smallFile(before.file) == content) {
            throw CannotKeep("NetworkManager has not written " + before.file);
        }
        profile->reapply();
    });
}

void rereadProfile(const std::string& link) {
    asking<CannotKeep>([&link] {
        Profile profile(link);
        profile.load();
        profile.reapply();
    });
}

}  // namespace cvagent::keep
