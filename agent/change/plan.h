#pragma once

#include <sys/types.h>

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "agent/change/change.h"

/// What a change will do to the host, found out by having the plug-in do it where nothing of the host can be
/// reached.
namespace cvagent::change {

struct FileState {
    enum class Type { file, link, directory, other };
    Type type = Type::file;
    /// The content of a file, the target of a link; nothing of others.
    std::string content;
    mode_t mode = 0;  ///< without the type
    uid_t owner = 0;
    gid_t group = 0;
    /// The content is not told: it is too long, could not be read, or is not for who sees the plan.
    bool withheld = false;

    bool operator==(const FileState&) const = default;
};

struct FileChange {
    std::string path;
    std::optional<FileState> before;  ///< nothing: there is none
    std::optional<FileState> after;   ///< the same
};

struct PlannedCommand {
    std::string text;        ///< as the plug-in gave it, or the words of a call: "settimeofday 1795262400"
    bool recorded = false;   ///< it did not run: it would have reached the host
    std::size_t change = 0;  ///< index of the change that it belongs to
};

/// What a change came to where it was tried.
struct Answer {
    std::string node;                 ///< the path
    std::string property;             ///< the name
    std::string problem;              ///< why it fails; "" when the plug-in took it
    std::vector<std::string> errors;  ///< that the plug-in reported
    std::string before;               ///< printable values; "" where nothing could be read
    std::string after;
    std::string lacking;  ///< see WriteResult

    /// Why the change does not come about; "" when it does.
    const std::string& failure() const { return problem.empty() ? lacking : problem; }
};

/// What the kernel holds, in lines that a person understands, sorted: "link eth0 mtu 1500 up address
/// 52:54:00:12:34:56", "address eth0 192.0.2.7/24", "route default via 192.0.2.1 dev eth0 table main",
/// "rule 32766: from all lookup main", "host name db1", "domain name (none)".
using KernelState = std::vector<std::string>;

struct Plan {
    std::vector<Change> changes;
    std::vector<Answer> answers;           ///< one for each change
    std::vector<FileChange> files;         ///< by path
    std::vector<PlannedCommand> commands;  ///< in their order
    KernelState kernelBefore;
    KernelState kernelAfter;
    /// Sentences on what cannot be known before.
    std::vector<std::string> unforeseen;
};

/// A text that is no plan, or one with parts that cannot be: what another process has told may be anything.
class BadPlan : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// A JSON document without a line break at its end. A content that is no UTF-8 is told as "base64".
std::string toJson(const Plan& plan);
/// Throws BadPlan.
Plan planFromJson(std::string_view json);

/// The plan as everybody on the host may see it: without the contents of files that not everybody may read.
Plan withoutSecrets(Plan plan);

}  // namespace cvagent::change
