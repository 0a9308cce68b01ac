#include "framework/ic/node.h"

#include <atomic>
#include <mutex>

namespace IC {

namespace {

std::atomic<std::string (*)(const Node&)> pathSource{nullptr};

}  // namespace

Node::~Node() = default;

unsigned int Node::getStatus() const {
    const std::shared_lock lock(factsGuard_);
    return status_;
}

std::string Node::getDescription() const {
    const std::shared_lock lock(factsGuard_);
    return description_;
}

std::string Node::getPath() const {
    {
        const std::shared_lock lock(factsGuard_);
        if (!path_.empty()) {
            return path_;
        }
    }
    const auto source = pathSource.load();
    return source != nullptr ? source(*this) : std::string();
}

void Node::setPathSource(std::string (*source)(const Node& node)) {
    pathSource = source;
}

void Node::storePath(const std::string& path) {
    const std::unique_lock lock(factsGuard_);
    path_ = path;
}

void Node::storeStatus(unsigned int status) {
    const std::unique_lock lock(factsGuard_);
    status_ = status;
}

void Node::storeDescription(const std::string& description) {
    const std::unique_lock lock(factsGuard_);
    description_ = description;
}

}  // namespace IC
