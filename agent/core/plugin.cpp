#include "agent/core/plugin.h"

#include <dlfcn.h>

#include <algorithm>
#include <exception>
#include <filesystem>

#include "agent/core/problem.h"
#include "agent/core/reading.h"
#include "agent/core/text.h"
#include "agent/core/tree.h"

namespace cvagent {

namespace {

constexpr const char* kProcessorBuilder = "_ZN2IC6OsHwMI14createCpuNodesEv";

using OpenMi = int (*)(IC::ManagementInterface**, IC::Error**);
using Builder = void (*)(IC::ManagementInterface*);

[[noreturn]] void fail(const std::string& text, Problem::Subject subject = Problem::none) {
    throw Problem(Problem::failed, text, subject);
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
    } catch (const Problem&) {
        throw;
    } catch (const std::exception& exception) {
        fail(what + " threw an exception: " + exception.what());
    } catch (...) {
        fail(what + " threw an unknown exception");
    }
}

/// The same at the end, when there is nothing to give up any more.
template <class Call>
void complaining(const Tell& tell, const std::string& what, const Call& call) {
    try {
        guarded(what, call);
    } catch (const Problem& problem) {
        tell(problem.what());
    }
}

}  // namespace

void tellNobody(const std::string& /*text*/) {}

Plugin::Plugin(std::string file, Listener* listener, Tell tell)
    : file_(std::move(file)), events_(listener), tell_(std::move(tell)) {
    load();
    open();
    takePlace();
}

Plugin::~Plugin() {
    if (begun_) {
        stop();
    }
}

void Plugin::load() {
    std::error_code ignored;
    if (!std::filesystem::exists(file_, ignored)) {
        fail("there is no plug-in file " + inQuotes(file_), Problem::pluginFile);
    }
    library_.reset(dlopen(file_.c_str(), RTLD_NOW | RTLD_LOCAL));
    if (library_ == nullptr) {
        const char* reason = dlerror();
        fail("cannot load the plug-in " + inQuotes(file_) + ": " +
                 (reason != nullptr ? reason : "unknown reason"),
             Problem::pluginLoad);
    }
}

void Plugin::open() {
    const auto openMi = symbol<OpenMi>(library_.get(), "OpenMI");
    if (openMi == nullptr) {
        fail(inQuotes(file_) + " is a library but no plug-in: it has no OpenMI", Problem::pluginEntry);
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

void Plugin::takePlace() {
    try {
        running_.emplace(*interface_);
    } catch (const Problem& problem) {
        throw Problem(problem.kind(), inQuotes(file_) + ": " + problem.what());
    }
}

void Plugin::start(bool processors) {
    begun_ = true;
    processors_ = processors;
    events_.startHere();
    try {
        guarded("initialize of " + inQuotes(file_),
                [this, processors] { initialize(processors, running_->ids().firstNode); });
    } catch (...) {
        events_.abandon();
        throw;
    }
}

void Plugin::noteIds() {
    for (const Handle& node : interface_->holdAll()) {
        lastId_ = std::max(lastId_, node->getNodeId());
    }
}

void Plugin::startAgain() {
    noteIds();
    const std::vector<Handle> former = interface_->holdAll();
    guarded("unload of " + inQuotes(file_), [this] { interface_->unload(); });
    for (const Handle& node : former) {
        interface_->deleteNode(
            node.get());  // no longer listed: nobody is told, and it goes with its last holder
    }
    guarded("initialize of " + inQuotes(file_), [this] { initialize(processors_, lastId_ + 1); });
    noteIds();
}

void Plugin::initialize(bool processors, unsigned int firstNode) {
    const IdRange ids = running_->ids();
    interface_->setLoadCallBack(nodeLoaded, this, running_->finder());
    interface_->setWithdrawCallBack(nodeWithdrawn, this);
    interface_->registerForAlerts(alertsCame, this);
    const IC::Error result =
        interface_->initialize(ids.interfaceId, IC::Number(ids.ownNode), IC::Number(firstNode));
    if (result.getStatus() != 0) {
        fail("the plug-in " + inQuotes(file_) + " did not initialize: " + errorText(result));
    }
    const auto create = symbol<Builder>(library_.get(), kProcessorBuilder);
    if (create != nullptr && processors) {
        create(interface_);
    }
    checkIds();
    setPaths(*interface_);
}

void Plugin::checkIds() const {
    for (const Handle& node : interface_->holdAll()) {
        if (!isOwnId(*node)) {
            fail("the plug-in " + inQuotes(file_) +
                 " gives its nodes ids of other plug-ins: " + std::to_string(node->getNodeId()));
        }
    }
}

bool Plugin::isOwnId(const IC::MutableNode& node) const {
    const IdRange ids = running_->ids();
    return node.getNodeId() >= ids.ownNode && node.getNodeId() <= ids.last;
}

void Plugin::stop() {
    // The callback stays until the monitors have ended: a change that they see without one they take for
    // reported, and it would never be told.
    complaining(tell_, "unload of " + inQuotes(file_), [this] { interface_->unload(); });
    // The plug-in keeps its callbacks over a stop, and may outlive this object. That for names needs none.
    complaining(tell_, "letting go of " + inQuotes(file_), [this] {
        interface_->deRegisterForAlerts();
        interface_->setLoadCallBack(nullptr, nullptr, running_->finder());
        interface_->setWithdrawCallBack(nullptr, nullptr);
    });
    running_.reset();
}

IC::Error Plugin::nodeLoaded(IC::Node* const& node, const void* plugin) {
    const auto* self = static_cast<const Plugin*>(plugin);
    auto* known = dynamic_cast<IC::MutableNode*>(node);
    if (known == nullptr) {
        return {IC::Error::failure, IC::Number(), "not a node of the framework"};
    }
    if (!self->isOwnId(*known)) {
        return {IC::Error::failure, IC::Number(), "the id of another plug-in's node"};
    }
    known->setPath(makePath(*self->interface_, *known));
    self->events_.hear(nodeEvent(Event::Kind::published, *known));
    return {};
}

void Plugin::nodeWithdrawn(const IC::Node& node, const void* plugin) {
    const auto* self = static_cast<const Plugin*>(plugin);
    self->events_.hear(nodeEvent(Event::Kind::withdrawn, node));
}

IC::Error Plugin::alertsCame(const std::vector<IC::Alert>& alerts, const void* plugin) {
    const auto* self = static_cast<const Plugin*>(plugin);
    for (const IC::Alert& alert : alerts) {
        self->events_.hear(alertEvent(alert, self->interface_->holdAll()));
    }
    return {};
}

}  // namespace cvagent
