#include "agent/keep/host_keepers.h"

#include <filesystem>

#include "agent/keep/host_files.h"
#include "agent/keep/host_settings.h"

namespace cvagent::keep {

namespace {

namespace fs = std::filesystem;

constexpr const char* kZoneFiles = "/usr/share/zoneinfo";

bool isThere(const char* path) {
    std::error_code unknown;
    return fs::exists(path, unknown);
}

std::string mountedOver(const std::string& path) {
    return "something is mounted over " + path;
}

HostKeeper ofName() {
    const std::string setting = "host name";
    if (isNameInOldFile()) {
        return {setting, kOldHostNameFile, "systemd does not run, and there is no /etc/hostname"};
    }
    if (isMountedOver(kHostNameFile)) {
        return {setting, "", mountedOver(kHostNameFile)};
    }
    return isHostnamedThere()
               ? HostKeeper{setting, "systemd-hostnamed", "systemd runs; it writes /etc/hostname"}
               : HostKeeper{setting, kHostNameFile, "systemd does not run, or there is no hostnamectl"};
}

/// The link is the plug-in's to make, whatever stands in its place.
HostKeeper ofZone() {
    const std::string setting = "time zone";
    for (const char* each : {kZoneLink, kZoneNameFile}) {
        if (isMountedOver(each)) {
            return {setting, "", mountedOver(each)};
        }
    }
    if (!isThere(kZoneFiles)) {
        return {setting, "", std::string("there is no ") + kZoneFiles};
    }
    std::error_code none;
    const fs::path target = fs::read_symlink(kZoneLink, none);
    const std::string evidence = !none                ? "it leads to " + target.string()
                                 : isThere(kZoneLink) ? "it is a file, and becomes a link"
                                                      : "it is not there, and is made";
    return {setting, kZoneLink + std::string(isThere(kZoneNameFile) ? " and /etc/timezone" : ""), evidence};
}

HostKeeper ofNameServers() {
    const std::string setting = "name servers";
    const Resolver resolver = resolverOfHost();
    if (resolver.isFileItself()) {
        return {setting, kResolverFile, "nobody is known who makes it"};
    }
    if (resolver.isWithInterface()) {
        return {setting, resolver.system, resolver.evidence + "; with an interface that it keeps"};
    }
    return resolver.obstacle.empty() ? HostKeeper{setting, resolver.system, resolver.evidence}
                                     : HostKeeper{setting, "", resolver.obstacle};
}

}  // namespace

std::vector<HostKeeper> hostKeepers() {
    return {ofName(), ofZone(), ofNameServers()};
}

}  // namespace cvagent::keep
