#include "agent/plugin.h"

#include <dlfcn.h>

#include <atomic>
#include <exception>
#include <filesystem>

#include "agent/failure.h"
#include "agent/print.h"
#include "agent/program_path.h"
#include "agent/reading.h"
#include "agent/tree.h"

namespace cvagent {

namespace {

constexpr const char* kLibrary = "libvantrelcvicoshwmi.so.1";
constexpr const char* kProcessorBuilder = "_ZN2IC6OsHwMI14createCpuNodesEv";

using OpenMi = int (*)(IC::ManagementInterface**, IC::Error**);
using Builder = void (*)(IC::ManagementInterface*);

// What initialize takes: the id of the interface, of its own node, and the first of the other nodes.
constexpr unsigned int kInterfaceId = 1;
constexpr unsigned int kOwnNodeId = 1;
constexpr unsigned int kFirstNodeId = 2;

// Lookups by name and paths of nodes come without a context argument.
std::atomic<IC::ManagementInterface*> lookedUp{nullptr};

[[noreturn]] void fail(const std::string& text) {
    throw Failure(ExitStatus::failed, text);
}

template <class Function>
Function symbol(void* library, const char* name) {
    return reinterpret_cast<Function>(dlsym(library, name));
}

/// Runs a call into the plug-in; what it throws goes no further.
template <class Call>
void guarded(const std::string& what, const Call& call) {
    try {
        call();
    } catch (const Failure&) {
        throw;
    } catch (const std::exception& exception) {
        fail(what + " threw an exception: " + exception.what());
    } catch (...) {
        fail(what + " threw an unknown exception");
    }
}

/// The same at the end, when there is nothing to give up any more.
template <class Call>
void complaining(const std::string& what, const Call& call) {
    try {
        guarded(what, call);
    } catch (const Failure& failure) {
        complain(failure.what());
    }
}

}  // namespace

std::string pluginBesideProgram() {
    const auto found = besideProgram({"../" CORVISTA_LIBDIR, "../lib"}, kLibrary);
    if (!found) {
        const std::string directory = programDirectory();
        fail(directory.empty()
                 ? "cannot tell where this program lies, for there is no /proc; name the plug-in with "
                   "--plugin FILE"
                 : std::string("there is no ") + kLibrary + " beside this program, which lies in " +
                       inQuotes(directory) + "; name the plug-in with --plugin FILE");
    }
    return *found;
}

Plugin::Plugin(const std::string& file, Listener* listener) : file_(file), listener_(listener) {
    try {
        load();
        open();
        start();
    } catch (...) {
        close();
        throw;
    }
}

Plugin::~Plugin() {
    stop();
    close();
}

void Plugin::load() {
    std::error_code ignored;
    if (!std::filesystem::exists(file_, ignored)) {
        fail("there is no plug-in file " + inQuotes(file_) + "; name the right one with --plugin FILE");
    }
    library_ = dlopen(file_.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (library_ == nullptr) {
        const char* reason = dlerror();
        fail("cannot load the plug-in " + inQuotes(file_) + ": " +
             (reason != nullptr ? reason : "unknown reason") +
             "\nName another one with --plugin FILE, or build and install this one again");
    }
}

void Plugin::open() {
    const auto openMi = symbol<OpenMi>(library_, "OpenMI");
    if (openMi == nullptr) {
        fail(inQuotes(file_) +
             " is a library but no plug-in: it has no OpenMI; name another one with --plugin FILE");
    }
    IC::Error* error = nullptr;
    guarded("OpenMI of " + inQuotes(file_), [&] {
        const int result = openMi(&interface_, &error);
        if (result != 0) {
            const std::string reason =
                error != nullptr && error->getStatus() != 0 ? " (" + errorText(*error) + ")" : "";
            interface_ = nullptr;
            fail("the plug-in " + inQuotes(file_) + " refused to start: OpenMI returned " +
                 std::to_string(result) + reason);
        }
    });
    if (interface_ == nullptr) {
        fail("the plug-in " + inQuotes(file_) + " is broken: its OpenMI returned no interface");
    }
}

void Plugin::start() {
    lookedUp = interface_;
    IC::Node::setPathSource(pathOfUnseen);
    try {
        guarded("initialize of " + inQuotes(file_), [this] {
            interface_->setLoadCallBack(nodeLoaded, this, findByName);
            interface_->setWithdrawCallBack(nodeWithdrawn, this);
            interface_->registerForAlerts(alertsCame, this);
            const IC::Error result =
                interface_->initialize(kInterfaceId, IC::Number(kOwnNodeId), IC::Number(kFirstNodeId));
            if (result.getStatus() != 0) {
                fail("the plug-in " + inQuotes(file_) + " did not initialize: " + errorText(result));
            }
            if (const auto create = symbol<Builder>(library_, kProcessorBuilder)) {
                create(interface_);
            }
            setPaths(*interface_);
        });
    } catch (...) {
        stop();
        throw;
    }
}

void Plugin::stop() {
    // The callback stays until the monitors have ended: a change that they see without one they take for
    // reported, and it would never be told.
    complaining("unload of " + inQuotes(file_), [this] { interface_->unload(); });
    // The plug-in keeps its callbacks over a stop, and may outlive this object. That for names needs none.
    complaining("letting go of " + inQuotes(file_), [this] {
        interface_->deRegisterForAlerts();
        interface_->setLoadCallBack(nullptr, nullptr, findByName);
        interface_->setWithdrawCallBack(nullptr, nullptr);
    });
    IC::Node::setPathSource(nullptr);
    lookedUp = nullptr;
}

void Plugin::close() {
    if (library_ != nullptr) {
        dlclose(library_);
        library_ = nullptr;
    }
}

IC::Error Plugin::nodeLoaded(IC::Node* const& node, const void* plugin) {
    const auto* self = static_cast<const Plugin*>(plugin);
    auto* known = dynamic_cast<IC::MutableNode*>(node);
    if (known == nullptr) {
        return {IC::Error::failure, IC::Number(), "not a node of the framework"};
    }
    known->setPath(makePath(*self->interface_, *known));
    if (self->listener_ != nullptr) {
        self->listener_->hear(nodeEvent(Event::Kind::published, *known));
    }
    return {};
}

void Plugin::nodeWithdrawn(const IC::Node& node, const void* plugin) {
    const auto* self = static_cast<const Plugin*>(plugin);
    if (self->listener_ != nullptr) {
        self->listener_->hear(nodeEvent(Event::Kind::withdrawn, node));
    }
}

IC::Error Plugin::alertsCame(const std::vector<IC::Alert>& alerts, const void* plugin) {
    const auto* self = static_cast<const Plugin*>(plugin);
    for (const IC::Alert& alert : alerts) {
        if (self->listener_ != nullptr) {
            self->listener_->hear(alertEvent(alert));
        }
    }
    return {};
}

std::string Plugin::pathOfUnseen(const IC::Node& node) {
    const IC::ManagementInterface* interface = lookedUp;
    const auto* known = dynamic_cast<const IC::MutableNode*>(&node);
    return interface != nullptr && known != nullptr ? makePath(*interface, *known) : std::string();
}

IC::Error Plugin::findByName(const std::string& name, IC::Node** node) {
    try {
        IC::ManagementInterface* interface = lookedUp;
        if (interface == nullptr) {
            return {IC::Error::failure, IC::Number(), "no plug-in is loaded"};
        }
        *node = findNode(*interface, name).get();
        return {};
    } catch (const Failure& failure) {
        return {IC::Error::failure, IC::Number(), failure.what()};
    }
}

}  // namespace cvagent
