#pragma once

#include <stdexcept>
#include <string>
#include <utility>

namespace cvagent::bus {

/// A failure as the bus knows it: the error's name and a message for people.
class Error : public std::runtime_error {
public:
    Error(std::string name, const std::string& message)
        : std::runtime_error(message), name_(std::move(name)) {}
    /// Of a call into the library. @param error an errno, negative as it gives them or not
    static Error ofErrno(const std::string& what, int error);

    const std::string& name() const { return name_; }

private:
    std::string name_;
};

// Names that every bus knows.
inline constexpr const char* kFailed = "org.freedesktop.DBus.Error.Failed";
inline constexpr const char* kInvalidArgs = "org.freedesktop.DBus.Error.InvalidArgs";
inline constexpr const char* kAccessDenied = "org.freedesktop.DBus.Error.AccessDenied";
inline constexpr const char* kUnknownMethod = "org.freedesktop.DBus.Error.UnknownMethod";
inline constexpr const char* kUnknownObject = "org.freedesktop.DBus.Error.UnknownObject";
inline constexpr const char* kUnknownInterface = "org.freedesktop.DBus.Error.UnknownInterface";
inline constexpr const char* kUnknownProperty = "org.freedesktop.DBus.Error.UnknownProperty";
inline constexpr const char* kPropertyReadOnly = "org.freedesktop.DBus.Error.PropertyReadOnly";
inline constexpr const char* kLimitsExceeded = "org.freedesktop.DBus.Error.LimitsExceeded";
inline constexpr const char* kServiceUnknown = "org.freedesktop.DBus.Error.ServiceUnknown";
inline constexpr const char* kNameHasNoOwner = "org.freedesktop.DBus.Error.NameHasNoOwner";

}  // namespace cvagent::bus
