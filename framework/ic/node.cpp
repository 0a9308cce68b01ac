#include "framework/ic/node.h"

#include <atomic>
#include <mutex>

namespace IC {

namespace {

std::atomic<std::string (*)(const Node&)> pathSource{nullptr};

}  // namespace

Node::~Node() = default;

std::string Node::getPath() const {
    {
        const std::shared_lock lock(pathGuard_);
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
    const std::unique_lock lock(pathGuard_);
    path_ = path;
}

}  // namespace IC
